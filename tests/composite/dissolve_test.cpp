#include <gtest/gtest.h>

#include <climits>
#include <cmath>
#include <cstring>
#include <limits>
#include <string>
#include <vector>

#include "support/Arena.h"
#include "support/FailingAllocations.h"
#include "support/Formats.h"
#include "support/Image.h"
#include "support/Operations.h"

namespace vexel::testing {
namespace {

using F = VX_PixelFormat;
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
      const int pixels = format == kRgb10Format ? 64 : 96, first = format == kRgb10Format ? 2 : 0;
      Image a(format, pixels, 64, 5), b(format, pixels, 64, 6), out(format, pixels, 64);
      ASSERT_EQ(Dissolve(a, b, out, mix), VX_Success);
      for (size_t i = 0; i < 64 * 64; ++i) {
        const uint32_t wordA = a.As<uint32_t>()[i], wordB = b.As<uint32_t>()[i], word = out.As<uint32_t>()[i];
        for (int bit = first; bit < first + 30; bit += 10) {
          const double x = wordA >> bit & 1023, y = wordB >> bit & 1023;
          ASSERT_TRUE(IsRounded(x * (1 - double{mix}) + y * double{mix}, word >> bit & 1023));
        }
        ASSERT_EQ(word & (first ? 3u : 0xC0000000u), 0u);
      }
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
  constexpr float kInf = std::numeric_limits<float>::infinity();
  const Image a(F::VUYA_4444_8u, 33, 4, 1), b(F::UYVY_422_8u_709, 33, 4, 2);
  Image out(F::ARGB_4444_15u, 33, 4, 3), place = out;
  const Image isA = a.Converted(out.format), isB = b.Converted(out.format);
  for (const float mix : {0.0f, 7.9e-6f, -0.5f, -kInf, std::numeric_limits<float>::quiet_NaN(), 1e-3f, 0.999f, 1.0f,
                          1 - 5e-6f, 2.0f, kInf}) {
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

// ---- Products; their values: image_primitives_test.cpp

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
