// VX_Composite against the formula in double precision and against its own rules.
#include <gtest/gtest.h>

#include <cmath>
#include <cstring>
#include <limits>
#include <string>
#include <vector>

#include "formats/FormatBits.h"
#include "support/Arena.h"
#include "support/Formats.h"
#include "support/Image.h"

namespace vexel::testing {
namespace {

using F = VX_PixelFormat;

// Source-over by the definition; codes and alphas in 0..1. The two pictures' parts of a channel are premultiplied and
// count from black.
struct Exact {
  Exact(double sourceAlpha, double backgroundAlpha) : as(sourceAlpha), ab(backgroundAlpha), ao(as + ab * (1 - as)) {}
  double Colour(double sourcePart, double backgroundPart, bool straight) const {
    const double sum = sourcePart + backgroundPart * (1 - as);
    return !straight ? sum : ao > 7.6293945e-6 ? sum / ao : 0;
  }
  double as, ab, ao;
};

bool IsPremultiplied(F format) { return AlphaKind(format) == kAlphaPremultiplied; }

// All alphas over all alphas, with a few thousand pairs of colours among them.
void ExpectNearExact8(F src, F background, F dst, float opacity) {
  SCOPED_TRACE(std::string(VX_PixelFormatName(src)) + " over " + VX_PixelFormatName(background) + " in " +
               VX_PixelFormatName(dst) + " at " + std::to_string(opacity));
  Image s(src, 256, 256), d(background, 256, 256, Contents::Extremes, 2), out(dst, 256, 256);
  for (int i = 0; i < 256 * 256; ++i) s.bytes[4 * i + 3] = static_cast<uint8_t>(i), d.bytes[4 * i + 3] = i >> 8;
  ASSERT_EQ(Composite(s, d, out, opacity), VX_Success);
  const bool straight = AlphaKind(dst) == kAlphaStraight;
  double worst = 0;
  for (int i = 0; i < 256 * 256; ++i) {
    const uint8_t *sp = &s.bytes[4 * i], *dp = &d.bytes[4 * i], *op = &out.bytes[4 * i];
    const double opaque = opacity >= 0.999992f ? 1 : double{opacity};
    const Exact exact(CarriesAlpha(src) ? sp[3] / 255.0 * opaque : opaque,
                      CarriesAlpha(background) ? dp[3] / 255.0 : 1);
    for (int k = 0; k < 3; ++k) {
      const double black = !IsYuv(dst) ? 0 : k == 2 ? 16 : 128;
      const double colour =
          black + exact.Colour((sp[k] - black) * (IsPremultiplied(src) ? opaque : exact.as),
                               (dp[k] - black) * (IsPremultiplied(background) ? 1 : exact.ab), straight);
      worst = std::max(worst, std::abs(op[k] - std::min(std::max(colour, 0.0), 255.0)));
    }
    worst = std::max(worst, std::abs(op[3] - 255 * exact.ao));
  }
  EXPECT_LE(worst, IsPremultiplied(src) || IsPremultiplied(background) ? 0.54 : opacity >= 1 ? 0.508 : 0.52);
}

TEST(Composite, EveryEightBitKernelIsTheFormulaRounded) {
  for (const float opacity : {1.0f, 0.6f, 0.5f, 0.999f, 0.01f, 1e-5f})
    for (const bool yuv : {false, true})
      for (const bool straight : {false, true})
        for (const bool sourceAlpha : {false, true})
          for (const bool backgroundAlpha : {false, true}) {
            if (opacity == 1 && !sourceAlpha) continue;  // a conversion
            const F with = yuv ? F::VUYA_4444_8u : F::BGRA_4444_8u, without = yuv ? F::VUYX_4444_8u : F::BGRX_4444_8u;
            const F premultiplied = yuv ? F::VUYP_4444_8u : F::BGRP_4444_8u;
            ExpectNearExact8(sourceAlpha ? with : without, backgroundAlpha ? with : without,
                             straight ? with : premultiplied, opacity);
            // The same of premultiplied pictures, where they are composited as such.
            if ((straight && backgroundAlpha) || (!sourceAlpha && !backgroundAlpha)) continue;
            ExpectNearExact8(sourceAlpha ? premultiplied : without, backgroundAlpha ? premultiplied : without,
                             straight ? with : premultiplied, opacity);
          }
}

// Every alpha, source and background code over opaque pixels at opacity 1; clear and opaque sources change nothing and
// everything. Pixels that are not opaque beside them change nothing, at any opacity.
TEST(Composite, OpaqueBackgroundsCodeByCodeAndWhateverIsBesideThem) {
  Image s(F::BGRA_4444_8u, 86, 256), d(F::BGRA_4444_8u, 86, 256), out(F::BGRA_4444_8u, 86, 256), mixed = out;
  for (const float opacity : {1.0f, 0.6f})
    for (int alpha = 0; alpha < 256; ++alpha) {
      for (int row = 0; row < 256; ++row)
        for (int i = 0; i < 86; ++i)
          for (int k = 0; k < 4; ++k) {
            s.Row(row)[4 * i + k] = static_cast<uint8_t>(k == 3 ? alpha : row);
            d.Row(row)[4 * i + k] = static_cast<uint8_t>(k == 3 ? 255 : std::min(3 * i + k, 255));
          }
      ASSERT_EQ(Composite(s, d, out, opacity), VX_Success);
      for (int row = 0; row < 256 && opacity == 1; ++row)
        for (int i = 0; i < 86 * 4; ++i) {
          const double code = i % 4 == 3 ? 255 : (row * alpha + d.Row(row)[i] * (255 - alpha)) / 255.0;
          ASSERT_NEAR(out.Row(row)[i], code, alpha % 255 == 0 ? 0 : 0.508)
              << "alpha " << alpha << " source " << row << " background " << i;
        }
      for (int row = 0; row < 256; ++row) d.Row(row)[4 * (row % 86) + 3] = 254;
      ASSERT_EQ(Composite(s, d, mixed, opacity), VX_Success);
      for (int row = 0; row < 256; ++row)
        std::memcpy(mixed.Row(row) + 4 * (row % 86), out.Row(row) + 4 * (row % 86), 4);
      ASSERT_EQ(mixed.bytes, out.bytes) << "alpha " << alpha;
    }
}

TEST(Composite, EveryFloatKernelIsTheFormula) {
  for (const float opacity : {1.0f, 0.6f, 1e-4f})
    for (const F dst :
         {F::BGRA_4444_32f, F::BGRP_4444_32f, F::VUYA_4444_32f_709, F::VUYP_4444_32f, F::BGRA_4444_32f_Linear})
      for (const bool sourceAlpha : {false, true})
        for (const bool backgroundAlpha : {false, true}) {
          if (opacity == 1 && !sourceAlpha) continue;
          const bool straight = AlphaKind(dst) == kAlphaStraight, premultiplied = dst == F::VUYP_4444_32f;
          const auto input = [&](bool alpha) {
            const uint32_t kind = premultiplied ? kAlphaPremultiplied : kAlphaStraight;
            return FromBits((Bits(dst) & ~kAlphaMask) | (alpha ? kind : kAlphaIgnored));
          };
          Image s(input(sourceAlpha), 1000, 3), d(input(backgroundAlpha), 1000, 3, Contents::Random, 2),
              out(dst, 1000, 3);
          for (int i = 0; i < 50; ++i) d.As<float>()[4 * i + 3] = 0;  // and some with hardly a source either
          for (int i = 0; i < 25; ++i) s.As<float>()[4 * i + 3] = i % 2 ? 0 : 4e-6f;
          ASSERT_EQ(Composite(s, d, out, opacity), VX_Success);
          for (int i = 0; i < 3000; ++i) {
            const float *sp = s.As<float>() + 4 * i, *dp = d.As<float>() + 4 * i, *op = out.As<float>() + 4 * i;
            const Exact exact(sourceAlpha ? double{sp[3]} * opacity : double{opacity}, backgroundAlpha ? dp[3] : 1.0);
            ASSERT_NEAR(op[3], exact.ao, 1e-6);
            for (int k = 0; k < 3; ++k) {
              const double t = exact.as / exact.ao;
              const double value = !straight ? exact.Colour(sp[k] * (premultiplied ? double{opacity} : exact.as),
                                                            dp[k] * (premultiplied ? 1 : exact.ab), false)
                                   : std::abs(exact.ao) < 8e-6 ? 0
                                                               : (1 - t) * dp[k] + t * sp[k];
              // Where alphas cancel each other, the quotient carries the rounding of a small sum.
              ASSERT_NEAR(op[k], value, 2e-6 * (straight ? 1 + 1 / std::abs(exact.ao) / std::abs(exact.ao) : 1))
                  << VX_PixelFormatName(dst) << " at " << opacity << ", pixel " << i;
            }
          }
        }
}

// Opaque pixels of one code over another at a share that floats hold exactly: halves of a code go up.
TEST(Composite, OpaquePicturesAtExactShares) {
  for (const uint32_t kind : {kAlphaStraight, kAlphaIgnored, kAlphaPremultiplied})
    for (const float opacity : {0.5f, 0.25f, 0.75f, 0.125f}) {
      const F format = FromBits((Bits(F::BGRA_4444_8u) & ~kAlphaMask) | kind);
      Image s(format, 256, 256), d(format, 256, 256), out(F::BGRA_4444_8u, 256, 256);
      for (int i = 0; i < 256 * 256; ++i)
        for (int k = 0; k < 4; ++k) {
          s.bytes[4 * i + k] = static_cast<uint8_t>(k == 3 ? 255 : i >> 8);
          d.bytes[4 * i + k] = static_cast<uint8_t>(k == 3 ? 255 : i & 255);
        }
      ASSERT_EQ(Composite(s, d, out, opacity), VX_Success);
      for (int i = 0; i < 4 * 256 * 256; ++i)
        ASSERT_EQ(out.bytes[i], std::floor(s.bytes[i] * opacity + d.bytes[i] * (1 - opacity) + 0.5f))
            << VX_PixelFormatName(format) << " at " << opacity << ": " << int{s.bytes[i]} << " over "
            << int{d.bytes[i]};
    }
}

// The format in which a result is computed, by the destination's name.
F WorkingByName(F dst) {
  const std::string name = FormatName(dst);
  if (name.find("422") != std::string::npos)
    return name.find("422_8u") != std::string::npos ? F::VUYP_4444_8u : F::VUYP_4444_32f;
  if (dst == kRgb10Format) return F::BGRP_4444_32f;
  const bool yuv = name.substr(0, 3) == "VUY", narrow = name.find("8u") != std::string::npos;
  const bool straight = name.substr(0, 4).find('A') != std::string::npos;
  std::string working = std::string(yuv ? "VUY" : "BGR") + (straight ? "A" : "P") + "_4444_" + (narrow ? "8u" : "32f");
  if (name.find("709") != std::string::npos) working += "_709";
  if (name.find("Linear") != std::string::npos) working += "_Linear";
  return FormatByName(working);
}

TEST(Composite, ConvertsIntoAndOutOfTheWorkingFormat) {
  constexpr int kWidth = 773, kHeight = 3;
  const F inputs[] = {F::BGRA_4444_8u,  F::PRGB_4444_8u, F::UYVY_422_8u_709, F::V210_422_10u,  F::VUYP_4444_8u,
                      F::ARGB_4444_15u, kRgb10Format,    F::XRGB_4444_32f,   F::VUYA_4444_32f, F::BGRP_4444_32f_Linear};
  const F alphaFirst[] = {F::ARGB_4444_8u, F::PRGB_4444_8u, F::XRGB_4444_8u, F::ARGB_4444_32f, F::XRGB_4444_32f};
  int pair = 0;
  for (const F dst : RasterFormats())
    for (int repeat = 0; repeat < 37; ++repeat, ++pair) {
      const bool first = repeat >= 12;
      const F src = first ? alphaFirst[pair % 5] : inputs[pair % 10];
      const F background = first ? alphaFirst[repeat / 5 % 5] : inputs[(pair / 10 + 3 * repeat) % 10];
      SCOPED_TRACE(FormatName(src) + " over " + FormatName(background) + " in " + FormatName(dst));
      const F working = WorkingByName(dst);
      // Straight inputs, unless none is and the result can do without.
      const auto isStraight = [](F format) { return AlphaKind(format) == kAlphaStraight; };
      const bool premultiplied = (IsPremultiplied(src) || IsPremultiplied(background)) && !isStraight(src) &&
                                 !isStraight(background) && !(CarriesAlpha(background) && isStraight(working));
      const auto input = [&](F format) {
        const uint32_t kind = premultiplied ? kAlphaPremultiplied : kAlphaStraight;
        return FromBits((Bits(working) & ~kAlphaMask) | (CarriesAlpha(format) ? kind : kAlphaIgnored));
      };
      Image s(src, kWidth, kHeight), d(background, kWidth, kHeight, Contents::Random, 2), out(dst, kWidth, kHeight);
      Image ws(input(src), kWidth, kHeight), wd(input(background), kWidth, kHeight), wout(working, kWidth, kHeight);
      Image expected(dst, kWidth, kHeight);
      ASSERT_EQ(Convert(s, ws), VX_Success);
      ASSERT_EQ(Convert(d, wd), VX_Success);
      ASSERT_EQ(Composite(ws, wd, wout, 0.6f), VX_Success);
      ASSERT_EQ(Convert(wout, expected), VX_Success);
      ASSERT_EQ(Composite(s, d, out, 0.6f), VX_Success);
      ASSERT_EQ(out.bytes, expected.bytes);

      Image plain(dst, kWidth, kHeight);
      ASSERT_EQ(Convert(d, plain), VX_Success);
      for (const float none : {0.0f, 7.9e-6f, -1.0f, std::numeric_limits<float>::quiet_NaN()}) {
        ASSERT_EQ(Composite(s, d, out, none), VX_Success);
        ASSERT_EQ(out.bytes, plain.bytes);
      }
      Image one = out;
      ASSERT_EQ(Composite(s, d, one, 1.0f), VX_Success);
      if (!CarriesAlpha(src)) {
        ASSERT_EQ(Convert(s, plain), VX_Success);
        ASSERT_EQ(one.bytes, plain.bytes);
      }
      for (const float full : {0.999995f, 7.0f, std::numeric_limits<float>::infinity()}) {
        ASSERT_EQ(Composite(s, d, out, full), VX_Success);
        ASSERT_EQ(out.bytes, one.bytes);
      }
    }
}

// What the result does not show is not looked at, except that frames instead of rasters are refused; then the codes are
// those of the conversion or the fill.
TEST(Composite, CodesWhereOnePictureIsTheResult) {
  constexpr F kX = F::BGRX_4444_8u, kFrame = F::PALDV25, kUnknown = FromBits(0xFFF7);
  Image image(F::BGRA_4444_8u, 4, 4), out(F::BGRA_4444_8u, 4, 4);
  const View there(image), none(nullptr, 0, kUnknown);
  const auto as = [](const View& view, F format) { return View(view.base, view.rowBytes, format); };
  const struct {
    View source, background;
    float opacity;
    VX_Result expected;
  } cases[] = {{none, there, 0, VX_Success},
               {none, as(there, kX), 0, VX_Success},
               {as(none, kFrame), there, 0, VX_ErrUnsupportedFormat},
               {none, as(there, kFrame), 0, VX_ErrUnsupportedFormat},
               {none, as(there, kUnknown), 0, VX_ErrFailed},
               {there, as(none, there.format), 0, VX_ErrNullSource},
               {as(there, kX), none, 1, VX_Success},
               {there, none, 1, VX_ErrFormatNotHandled},
               {as(none, kX), there, 1, VX_ErrNullSource},
               {none, there, 0.5f, VX_ErrFormatNotHandled}};
  for (const auto& c : cases) EXPECT_EQ(Composite(c.source, c.background, out, c.opacity), c.expected);
  const auto sized = [&](int32_t width, int32_t height) {
    return Composite(none, there, {out.bytes.data(), 16, out.format, width, height}, 0);
  };
  EXPECT_EQ(sized(4, 0), VX_Success);
  EXPECT_EQ(sized(4, -1), VX_ErrArgumentOutOfRange);
  EXPECT_EQ(sized(-1, 4), VX_ErrArgumentOutOfRange);

  EXPECT_EQ(ToBlack(none, out, 0), VX_Success);
  EXPECT_EQ(ToBlack(as(none, kFrame), out, 0), VX_ErrUnsupportedFormat);
  EXPECT_EQ(ToBlack(none, {out.bytes.data(), 16, kFrame, 4, 4}, 0), VX_ErrUnsupportedDestinationFormat);
  EXPECT_EQ(ToBlack(none, {out.bytes.data(), 16, kUnknown, 4, 4}, 0), VX_ErrFormatNotHandled);
}

// The kernels without any conversion around them.
TEST(Composite, KernelsInTheArena) {
  for (const F dst : {F::BGRA_4444_8u, F::BGRP_4444_8u, F::PRGB_4444_8u, F::VUYA_4444_8u, F::VUYP_4444_8u,
                      F::BGRA_4444_32f, F::ARGB_4444_32f, F::BGRP_4444_32f})
    for (const uint32_t kind : {kAlphaStraight, kAlphaPremultiplied})
      for (const int usable : {0, 1, 2, 3})
        for (const float opacity : {1.0f, 0.6f}) {
          const auto input = [&](int bit) {
            return FromBits((Bits(dst) & ~kAlphaMask) | (usable & bit ? kind : kAlphaIgnored));
          };
          ArenaCase arenaCase;
          arenaCase.name = "composite at " + std::to_string(opacity);
          arenaCase.sources = {input(1), input(2)};
          arenaCase.destination = dst;
          arenaCase.everyContents = true;
          arenaCase.widths = {1, 2, 3, 4, 5, 7, 8, 9, 15, 16, 17, 31, 32, 33, 63, 64, 65, 129};
          arenaCase.run = [=](const ArenaFrame* s, const ArenaFrame& to) { return Composite(s[0], s[1], to, opacity); };
          EXPECT_TRUE(RunArena(arenaCase));
        }
}

}  // namespace
}  // namespace vexel::testing
