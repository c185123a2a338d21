// Source-over, over black, cross-dissolves and sums against their formulas and their own rules.
#include "support/Arena.h"
#include "support/FailingAllocations.h"
#include "support/Formats.h"
#include "support/Image.h"
#include "support/Operations.h"
#include "support/Test.h"

namespace vexel::testing {
namespace {

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
    const Exact exact(HasAlpha(src) ? sp[3] / 255.0 * opaque : opaque, HasAlpha(background) ? dp[3] / 255.0 : 1);
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
                                 !isStraight(background) && !(HasAlpha(background) && isStraight(working));
      const auto input = [&](F format) {
        const uint32_t kind = premultiplied ? kAlphaPremultiplied : kAlphaStraight;
        return FromBits((Bits(working) & ~kAlphaMask) | (HasAlpha(format) ? kind : kAlphaIgnored));
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
      for (const float none : {0.0f, 7.9e-6f, -1.0f, kNaN}) {
        ASSERT_EQ(Composite(s, d, out, none), VX_Success);
        ASSERT_EQ(out.bytes, plain.bytes);
      }
      Image one = out;
      ASSERT_EQ(Composite(s, d, one, 1.0f), VX_Success);
      if (!HasAlpha(src)) {
        ASSERT_EQ(Convert(s, plain), VX_Success);
        ASSERT_EQ(one.bytes, plain.bytes);
      }
      for (const float full : {0.999995f, 7.0f, kInfinity}) {
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
          EXPECT_TRUE(RunArena(
              {.name = "composite at " + std::to_string(opacity),
               .sources = {input(1), input(2)},
               .destination = dst,
               .run = [=](const ArenaFrame* s, const ArenaFrame& to) { return Composite(s[0], s[1], to, opacity); },
               .widths = {1, 2, 3, 4, 5, 7, 8, 9, 15, 16, 17, 31, 32, 33, 63, 64, 65, 129},
               .everyContents = true}));
        }
}

// ---- Compositing over black: the integer rules code by code, the table of working formats, rows tested for their
// alpha

// Values: AlphaUtilities.WholeDomains.

// What a destination is worked on in, by its name.
F WorkingByName(F dst, bool full, bool wide) {
  const std::string name = FormatName(dst);
  const bool yuv = name.find("VUY") == 0 || name.find("UYV") != std::string::npos || name.find("V210") == 0;
  const bool is709 = name.find("709") != std::string::npos;
  for (const char* const direct :
       {"BGRA_4444_8u", "ARGB_4444_8u", "VUYA_4444_8u", "BGRA_4444_32f", "ARGB_4444_32f", "VUYA_4444_32f"})
    if (name == direct || (full && name == std::string(direct) + "_709")) return dst;
  return FormatByName(std::string(yuv ? "VUYA" : "BGRA") + (wide ? "_4444_32f" : "_4444_8u") +
                      (yuv && is709 && full ? "_709" : ""));
}

TEST(CompositeToBlack, ConvertsIntoAndOutOfTheWorkingFormat) {
  for (const F dst : RasterFormats())
    for (const F src : {F::BGRA_4444_8u, F::PRGB_4444_15u, F::V210_422_10u, F::VUYA_4444_32f_709, F::UYVY_422_8u})
      for (const float opacity : {1.0f, 0.6f})
        for (const int32_t hint : {-1, 2, 3}) {
          SCOPED_TRACE(FormatName(src) + " in " + FormatName(dst) + " at " + std::to_string(opacity) + ", hint " +
                       std::to_string(hint));
          const Image s(src, 391, 2);
          Image out(dst, 391, 2), w = s.Converted(WorkingByName(dst, opacity == 1, hint > 2), hint);
          ASSERT_EQ(ToBlack(w, w, opacity), VX_Success);
          ASSERT_EQ(ToBlack(s, out, opacity, hint), VX_Success);
          ASSERT_EQ(out.bytes, w.Converted(dst, hint).bytes);
          Image black(dst, 391, 2);
          ASSERT_EQ(FillWith(VX_FillWithOpaqueBlack, black), VX_Success);
          for (const float none : {0.0f, 7e-6f, -1.0f, kNaN}) {
            ASSERT_EQ(ToBlack(s, out, none, hint), VX_Success);
            ASSERT_EQ(out.bytes, black.bytes);
          }
        }
}

// Rows by their alpha: '1' opaque, '0' clear, 'm' mixed. Opaque rows arrive as a plain conversion brings them, clear
// ones as a fill, mixed ones composited; the call in place gives the same.
TEST(CompositeToBlack, RowsAreTestedForTheirAlpha) {
  const struct {
    const char* rows;
    int32_t state;
  } cases[] = {{"111", 0}, {"000", 1}, {"0", 1}, {"1", 0}, {"m", 2}, {"101", 2}, {"0m1", 2}, {"11m", 2}};
  const struct {
    F src, dst;
  } pairs[] = {{F::BGRA_4444_8u, F::BGRA_4444_8u},   {F::ARGB_4444_8u, F::ARGB_4444_8u},
               {F::VUYA_4444_8u, F::VUYA_4444_8u},   {F::BGRA_4444_32f, F::BGRA_4444_32f},
               {F::ARGB_4444_32f, F::ARGB_4444_32f}, {F::PRGB_4444_8u, F::PRGB_4444_8u},
               {F::BGRA_4444_15u, F::BGRA_4444_15u}, {F::ARGB_4444_15u, F::V210_422_10u},
               {F::VUYP_4444_32f, F::BGRX_4444_8u},  {F::BGRA_4444_32f, F::UYVY_422_8u_709}};
  for (const auto& pair : pairs)
    for (const auto& c : cases)
      for (const int32_t hint : {0, 3})
        for (const int width : {1, 2, 17, 65, 400}) {
          SCOPED_TRACE(FormatName(pair.src) + " in " + FormatName(pair.dst) + " rows " + c.rows + " of " +
                       std::to_string(width));
          const int height = static_cast<int>(std::strlen(c.rows));
          Image straight(F::BGRA_4444_32f, width, height), out(pair.dst, width, height);
          for (int row = 0; row < height; ++row)
            for (int i = 0; i < width; ++i)
              reinterpret_cast<float*>(straight.UprightRow(row))[4 * i + 3] =
                  static_cast<float>(c.rows[row] == 'm' ? (i == width - 1 ? 0.5 : width % 2) : c.rows[row] - '0');
          const Image s = straight.Converted(pair.src);
          Image converted = s.Converted(pair.dst, hint), black = out, composited = out;
          ASSERT_EQ(ToBlack(s, composited, 1, hint), VX_Success);
          ASSERT_EQ(FillWith(VX_FillWithOpaqueBlack, black), VX_Success);
          int32_t state = -1;
          ASSERT_EQ(ToBlackTested(s, out, &state, hint), VX_Success);
          EXPECT_EQ(state, c.state);
          for (int row = 0; row < height; ++row) {
            Image& wanted = c.rows[row] == '1' ? converted : c.rows[row] == '0' ? black : composited;
            EXPECT_EQ(std::memcmp(out.UprightRow(row), wanted.UprightRow(row), static_cast<size_t>(out.rowBytes)), 0);
          }
        }
  // Opaque rows keep what the working format could not hold.
  Image s(F::V210_422_10u, 100, 3), out(F::V210_422_10u, 100, 3);
  int32_t state = -1;
  ASSERT_EQ(ToBlackTested(s, out, &state), VX_Success);
  EXPECT_EQ(out.bytes, s.bytes);
  EXPECT_EQ(state, 0);
}

TEST(CompositeToBlack, TellsAStateWhenNothingIsRefused) {
  Image s(F::BGRA_4444_8u, 4, 4), out = s;
  int32_t state = 77;
  EXPECT_EQ(ToBlackTested({nullptr, 16, s.format}, out, &state), VX_ErrNullSource);
  EXPECT_EQ(state, 77);
  EXPECT_EQ(ToBlackTested(s, {out.bytes.data(), 16, out.format, 4, 0}, &state), VX_Success);
  EXPECT_EQ(state, 0);
}

using Bytes = decltype(Image::bytes);

constexpr float kMixes[] = {1.0f / 256, 0.25f, 0.3f, 0.5f, 0.7f, 0.999f};

F InFloats(F format) { return format == kRgb10Format ? F::BGRX_4444_32f : FromBits((Bits(format) & ~0x1C0u) | 0x100u); }

// Whether `code` is `exact` rounded to nearest even; where single precision cannot tell, either neighbour is right.
bool IsRounded(double exact, double code) {
  const double fraction = exact - std::floor(exact);
  if (fraction == 0.5) return code == std::nearbyint(exact);
  return std::abs(code - exact) <= 0.5 + 3e-7 * (1 + std::abs(exact));
}

TEST(CrossDissolve, EveryPairOfBytes) {
  Bytes a(65536 * 4), b(a.size());
  for (size_t i = 0; i < a.size(); ++i) {
    a[i] = static_cast<uint8_t>(i / 4 >> (i % 2 ? 8 : 0));
    b[i] = static_cast<uint8_t>(i / 4 >> (i % 2 ? 0 : 8));
  }
  for (const F format :
       {F::PRGB_4444_8u, F::VUYP_4444_8u_709, F::BGRX_4444_8u, F::XRGB_4444_8u, F::UYVY_422_8u, F::YUYV_422_8u_709})
    for (const float mix : kMixes) {
      Image out(format, Layout(format) == kLayout422 ? 512 : 256, 256);
      ASSERT_EQ(Dissolve({a.data(), 1024, format}, {b.data(), 1024, format}, out, mix), VX_Success);
      const bool opaque = AlphaKind(format) == kAlphaIgnored;
      for (size_t i = 0; i < out.bytes.size(); ++i) {
        const double exact = a[i] * (1 - double{mix}) + b[i] * double{mix};
        ASSERT_TRUE(opaque && i % 4 == AlphaAt(format) ? out.bytes[i] == 255 : IsRounded(exact, out.bytes[i]))
            << int{a[i]} << " " << int{b[i]} << " at " << mix << ": " << int{out.bytes[i]};
      }
    }
}

// The colour of two straight pixels over each other's gaps, in double precision.
template <class T>
void ExpectStraight(const T* a, const T* b, const T* out, size_t alpha, double full, const double (&black)[4],
                    double mix) {
  const double wa = a[alpha] * (1 - mix), wb = b[alpha] * mix, sum = wa + wb;
  for (size_t k = 0; k < 4; ++k) {
    const bool clear = sum / full < 8e-6;
    const double exact = k == alpha ? sum : clear ? black[k] : (a[k] * wa + b[k] * wb) / sum;
    const double slack = full == 1 ? 1e-5 : 0.5 + full * 4e-7;
    ASSERT_NEAR(out[k], exact, slack) << "channel " << k << ", alphas " << +a[alpha] << " and " << +b[alpha] << ", mix "
                                      << mix;
  }
}

template <class T>
void CheckStraight(F format, double full, const double (&black)[4]) {
  Image a(format, 64, 64), b(format, 64, 64), out(format, 64, 64);
  Random random(7);
  const size_t alpha = AlphaAt(format);
  for (size_t i = 0; i < 4 * 4096; ++i)
    for (Image* image : {&a, &b}) {
      const double unit = i % 4 == alpha && random.OneIn(3) ? random.Int(0, 1) : random.Unit();
      image->As<T>()[i] = static_cast<T>(full == 1 ? unit : std::nearbyint(unit * full));
    }
  for (const float mix : kMixes) {
    ASSERT_EQ(Dissolve(a, b, out, mix), VX_Success);
    for (size_t i = 0; i < 4 * 4096; i += 4)
      ExpectStraight(a.As<T>() + i, b.As<T>() + i, out.As<T>() + i, alpha, full, black, double{mix});
  }
}

TEST(CrossDissolve, StraightAlphaWeighsColours) {
  CheckStraight<uint8_t>(F::BGRA_4444_8u, 255, {0, 0, 0, 0});
  CheckStraight<uint8_t>(F::ARGB_4444_8u, 255, {0, 0, 0, 0});
  CheckStraight<uint8_t>(F::VUYA_4444_8u_709, 255, {128, 128, 16, 0});
  CheckStraight<uint16_t>(F::BGRA_4444_15u, 32768, {0, 0, 0, 0});
  CheckStraight<uint16_t>(F::ARGB_4444_15u, 32768, {0, 0, 0, 0});
  CheckStraight<float>(F::BGRA_4444_32f, 1, {0, 0, 0, 0});
  CheckStraight<float>(F::ARGB_4444_32f_Linear, 1, {0, 0, 0, 0});
  CheckStraight<float>(F::VUYA_4444_32f, 1, {0, 0, 0, 0});
}

// Pixels of equal alpha mix like those without, so that opaque pictures do not depend on the kind of their alpha.
TEST(CrossDissolve, EqualAlphaMixesChannelByChannel) {
  Image a(F::BGRA_4444_8u, 16, 64, 1), b(F::BGRA_4444_8u, 16, 64, 2), straight = a, channels = a;
  for (size_t i = 3; i < a.bytes.size(); i += 4)
    a.bytes[i] = b.bytes[i] = static_cast<uint8_t>(i % 8 == 3 ? 255 : i % 255 + 1);
  for (const float mix : kMixes) {
    a.format = b.format = straight.format = F::BGRA_4444_8u;
    ASSERT_EQ(Dissolve(a, b, straight, mix), VX_Success);
    a.format = b.format = channels.format = F::BGRP_4444_8u;
    ASSERT_EQ(Dissolve(a, b, channels, mix), VX_Success);
    ASSERT_EQ(straight.bytes, channels.bytes);
  }
}

TEST(CrossDissolve, TenBitCodes) {
  for (const F format : {F::V210_422_10u, F::V210_422_10u_709, kRgb10Format})
    for (const float mix : kMixes) {
      const Image a(format, 96, 64, 5), b(format, 96, 64, 6);
      Image out(format, 96, 64);
      ASSERT_EQ(Dissolve(a, b, out, mix), VX_Success);
      for (size_t i = 0; i < SampleCount(out); ++i) {
        const auto at = [&](const Image& image) { return SampleAt(image.bytes.data(), i, format); };
        ASSERT_TRUE(IsRounded(at(a) * (1 - double{mix}) + at(b) * double{mix}, at(out)));
      }
      for (size_t i = 0; i < out.bytes.size() / 4; ++i)
        ASSERT_EQ(out.As<uint32_t>()[i] & (format == kRgb10Format ? 3u : 0xC0000000u), 0u);
    }
}

// Mixed formats go through the destination's own depth, or through floats where depths differ and the hint is not 2.
TEST(CrossDissolve, MixesInTheWorkingFormat) {
  constexpr int32_t kWidth = 391, kHeight = 5;
  const std::vector<F> formats = RasterFormats();
  for (size_t i = 0; i < formats.size(); ++i)
    for (const int32_t hint : {0, 2, 3}) {
      const F fa = formats[(7 * i + 3) % formats.size()], fb = hint ? formats[(11 * i + 5) % formats.size()] : fa;
      const Image a(fa, kWidth, kHeight, 1), b(fb, kWidth, kHeight, 2);
      Image out(formats[i], kWidth, kHeight, 3);
      SCOPED_TRACE(FormatName(fa) + " and " + FormatName(fb) + " to " + FormatName(out.format) + ", hint " +
                   std::to_string(hint));
      const bool inFloats = hint != 2 && (Depth(fa) != Depth(out.format) || Depth(fb) != Depth(out.format));
      Image mixed(inFloats ? InFloats(out.format) : out.format, kWidth, kHeight, 4);
      ASSERT_EQ(Dissolve(a.Converted(mixed.format, hint), b.Converted(mixed.format, hint), mixed, 0.4f, hint),
                VX_Success);
      ASSERT_EQ(Dissolve(a, b, out, 0.4f, hint), VX_Success);
      ASSERT_EQ(out.bytes, mixed.Converted(out.format, hint).bytes);
    }
}

TEST(CrossDissolve, EndsAreConversions) {
  constexpr float kInf = kInfinity;
  const Image a(F::VUYA_4444_8u, 33, 4, 1), b(F::UYVY_422_8u_709, 33, 4, 2);
  Image out(F::ARGB_4444_15u, 33, 4, 3), place = out;
  const Image isA = a.Converted(out.format), isB = b.Converted(out.format);
  for (const float mix : {0.0f, 7.9e-6f, -0.5f, -kInf, kNaN, 1e-3f, 0.999f, 1.0f, 1 - 5e-6f, 2.0f, kInf}) {
    ASSERT_EQ(Dissolve(a, b, out, mix), VX_Success);
    EXPECT_EQ(out.bytes == isA.bytes, !(mix >= 8e-6f)) << mix;
    EXPECT_EQ(out.bytes == isB.bytes, mix > 0.9999f) << mix;
  }
  // The other image is not looked at.
  const View none(nullptr, 0, F::PALDV25);
  EXPECT_EQ(Dissolve(a, none, out, 0), VX_Success);
  EXPECT_EQ(out.bytes, isA.bytes);
  EXPECT_EQ(Dissolve(none, place, place, 1), VX_Success);
  for (const float mix : {0.0f, 1.0f})
    for (const auto& [width, height, code] : {std::tuple{-1, 4, VX_ErrArgumentOutOfRange},
                                              {4, INT_MIN, VX_ErrArgumentOutOfRange},
                                              {4, 4, VX_ErrNullDestination},
                                              {0, 4, VX_Success}})
      EXPECT_EQ(Dissolve(a, a, {nullptr, 64, out.format, width, height}, mix), code) << mix;
  EXPECT_EQ(Dissolve(a, a, {nullptr, 0, F::PALDV25, 4, 4}, 1), VX_ErrFormatNotHandled);
}

// ---- Sums

// Five images of as many formats, summed as floats in the test.
TEST(Accumulate, SumsInFloatsAndRoundsOnce) {
  constexpr int32_t kWidth = 391, kHeight = 3;
  const std::vector<F> formats = RasterFormats();
  const std::vector<float> weights = {0.25f, 0.5f, -0.125f, 0, 0.4f};
  for (size_t i = 0; i < formats.size(); ++i) {
    SCOPED_TRACE(FormatName(formats[i]));
    Image out(formats[i], kWidth, kHeight, 0), sum(InFloats(formats[i]), kWidth, kHeight, Contents::Zeros);
    const size_t count = sum.bytes.size() / 4;
    std::vector<Image> images;
    for (size_t k = 0; k < 5; ++k) {
      images.emplace_back(formats[(i + 9 * k) % formats.size()], kWidth, kHeight, k);
      Image wide = images[k].Converted(sum.format);
      for (size_t s = 0; s < count && weights[k] != 0; ++s) sum.As<float>()[s] += wide.As<float>()[s] * weights[k];
    }
    if (AlphaKind(sum.format) == kAlphaIgnored)
      for (size_t s = AlphaAt(sum.format); s < count; s += 4) sum.As<float>()[s] = 1;
    ASSERT_EQ(Accumulate({images.begin(), images.end()}, out, weights), VX_Success);
    ASSERT_EQ(out.bytes, sum.Converted(out.format).bytes);
  }
}

TEST(Accumulate, WholeWeightsSaturateAndNoneGivesZero) {
  const uint8_t a[] = {100, 200, 3, 255, 0, 16, 255, 128}, b[] = {50, 100, 4, 255, 1, 16, 255, 127};
  const std::vector<float> unread(8, NAN);  // of weight 0
  const View first(a, 8, F::BGRA_4444_8u), second(b, 8, F::BGRA_4444_8u);
  const auto sum = [](F format, const std::vector<View>& images, const std::vector<float>& weights = {}) {
    Image out(format, 2, 1);
    EXPECT_EQ(Accumulate(images, out, weights), VX_Success);
    return out.bytes;
  };
  EXPECT_EQ(sum(F::BGRA_4444_8u, {first, second}), (Bytes{150, 255, 7, 255, 1, 32, 255, 255}));
  EXPECT_EQ(sum(F::BGRA_4444_8u, {{unread.data(), 32, F::BGRA_4444_32f}, second}, {0, 1}), Bytes(b, b + 8));
  EXPECT_EQ(sum(F::BGRP_4444_8u, {}), Bytes(8, 0));
  EXPECT_EQ(sum(F::VUYX_4444_8u, {}), (Bytes{128, 128, 16, 255, 128, 128, 16, 255}));
}

TEST(Accumulate, RefusesCountsAndArrays) {
  constexpr F kGood = F::BGRA_4444_8u;
  const struct {
    int32_t count;
    bool arrays;
    F dst;
    int32_t height;
    VX_Result expected;
  } cases[] = {{-1, true, kGood, 4, VX_ErrArgumentOutOfRange},
               {2, false, kGood, 4, VX_ErrNullSource},
               {0, false, F::NTSCDV25, 4, VX_ErrUnsupportedDestinationFormat},
               {0, true, F::Invalid, 4, VX_ErrFailed},
               {0, false, kGood, -4, VX_ErrArgumentOutOfRange},
               {0, false, kGood, 4, VX_ErrNullDestination}};
  for (const auto& c : cases)
    ExpectRefusal("case " + std::to_string(&c - cases), c.expected, [&](void* p) {
      const void* const bases[] = {p, p};
      const int32_t rowBytes[] = {64, -64};
      const F formats[] = {kGood, kGood};
      return VX_Accumulate(c.arrays ? bases : nullptr, rowBytes, formats, c.count, nullptr, 64, c.dst, 4, c.height,
                           nullptr, 3);
    });
}

// The converters of so many do not fit on the stack either.
TEST(Accumulate, SurvivesFailingAllocations) {
  const Image a(F::UYVY_422_32f, 40000, 2, 1);
  Image out(F::BGRA_4444_8u, 40000, 2, 3);
  std::vector<float> weights(4000);
  weights[7] = 1;
  EXPECT_EQ(ExpectSurvivesFailingAllocations("accumulate",
                                             [&] { return Accumulate(std::vector<View>(4000, a), out, weights); }),
            2);
}

// ---- Products; their values: ImagePrimitives

TEST(MultiplyByConstant, Refusals) {
  const uint8_t constants[] = {255, 1, 0, 77};
  const struct {
    int32_t width = 4, height = 4, rowBytes = 64;
    bool nullSrc = false, nullDst = false, nullConstant = false;
  } cases[] = {{.width = 0},      {.height = 0},     {.width = -1},         {.rowBytes = 15},
               {.nullSrc = true}, {.nullDst = true}, {.nullConstant = true}};
  for (const auto& c : cases)
    ExpectRefusal("case " + std::to_string(&c - cases), VX_ErrFailed, [&](void* p) {
      return VX_MultiplyByConstant(c.width, c.height, c.nullSrc ? nullptr : p, c.rowBytes, c.nullDst ? nullptr : p,
                                   c.rowBytes, c.nullConstant ? nullptr : constants, 0);
    });
}

}  // namespace
}  // namespace vexel::testing
