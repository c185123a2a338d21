#include <gtest/gtest.h>

#include <climits>
#include <cmath>
#include <cstring>
#include <limits>
#include <string>
#include <vector>

#include "composite/composite_image.h"
#include "support/Arena.h"
#include "support/FailingAllocations.h"
#include "support/Formats.h"
#include "vexel/compositing.h"
#include "vexel_host/host.h"

namespace vexel::testing {
namespace {

using F = VX_PixelFormat;
using Bytes = std::vector<uint8_t>;

constexpr float kMixes[] = {1.0f / 256, 0.25f, 0.3f, 0.5f, 0.7f, 0.999f};

VX_Result Dissolve(const View& a, const View& b, const View& dst, int32_t width, int32_t height, float mix,
                   int32_t hint = 3) {
  return VX_CrossDissolve(a.base, a.rowBytes, a.format, b.base, b.rowBytes, b.format, dst.Target(), dst.rowBytes,
                          dst.format, width, height, mix, hint);
}

VX_Result Accumulate(const std::vector<View>& sources, const View& dst, int32_t width, int32_t height,
                     const std::vector<float>& weights = {}) {
  std::vector<const void*> bases;
  std::vector<int32_t> rowBytes;
  std::vector<F> formats;
  for (const View& v : sources) bases.push_back(v.base), rowBytes.push_back(v.rowBytes), formats.push_back(v.format);
  return VX_Accumulate(bases.data(), rowBytes.data(), formats.data(), static_cast<int32_t>(sources.size()),
                       dst.Target(), dst.rowBytes, dst.format, width, height,
                       weights.empty() ? nullptr : weights.data(), 3);
}

Image Converted(const Image& image, F format, int32_t width, int32_t height, int32_t quality) {
  Image out(format, width, height, 0);
  EXPECT_EQ(Convert(image, out, quality), VX_Success);
  return out;
}

F InFloats(F format) { return format == kRgb10Format ? F::BGRX_4444_32f : FromBits((Bits(format) & ~0x1C0u) | 0x100u); }

// Whether `code` is `exact` rounded to nearest even; where single precision cannot tell, either neighbour is right.
bool IsRounded(double exact, double code) {
  const double fraction = exact - std::floor(exact);
  if (fraction == 0.5) return code == std::nearbyint(exact);
  return std::abs(code - exact) <= 0.5 + 3e-7 * (1 + std::abs(exact));
}

TEST(CrossDissolve, EveryPairOfBytes) {
  Bytes a(65536 * 4), b(a.size()), out(a.size());
  for (size_t i = 0; i < a.size(); ++i) {
    a[i] = static_cast<uint8_t>(i / 4 >> (i % 2 ? 8 : 0));
    b[i] = static_cast<uint8_t>(i / 4 >> (i % 2 ? 0 : 8));
  }
  for (const F format :
       {F::PRGB_4444_8u, F::VUYP_4444_8u_709, F::BGRX_4444_8u, F::XRGB_4444_8u, F::UYVY_422_8u, F::YUYV_422_8u_709})
    for (const float mix : kMixes) {
      const int pixels = Layout(format) == kLayout422 ? 512 : 256;
      ASSERT_EQ(
          Dissolve({a.data(), 1024, format}, {b.data(), 1024, format}, {out.data(), 1024, format}, pixels, 256, mix),
          VX_Success);
      const bool opaque = AlphaKind(format) == kAlphaIgnored;
      for (size_t i = 0; i < out.size(); ++i) {
        if (opaque && i % 4 == (IsReversed(format) ? 0 : 3)) {
          ASSERT_EQ(out[i], 255);
        } else {
          const double exact = a[i] * (1 - double{mix}) + b[i] * double{mix};
          ASSERT_TRUE(IsRounded(exact, out[i]))
              << int{a[i]} << " " << int{b[i]} << " at " << mix << ": " << int{out[i]};
        }
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
  constexpr int32_t kPitch = 64 * 4 * sizeof(T);
  std::vector<T> a(4 * 4096), b(a.size()), out(a.size());
  Random random(7);
  const size_t alpha = IsReversed(format) ? 0 : 3;
  for (size_t i = 0; i < a.size(); ++i) {
    const bool isAlpha = i % 4 == alpha;
    const auto draw = [&] {
      const double unit = isAlpha && random.OneIn(3) ? random.Int(0, 1) : random.Unit();
      return static_cast<T>(full == 1 ? unit : std::nearbyint(unit * full));
    };
    a[i] = draw(), b[i] = draw();
  }
  for (const float mix : kMixes) {
    ASSERT_EQ(
        Dissolve({a.data(), kPitch, format}, {b.data(), kPitch, format}, {out.data(), kPitch, format}, 64, 64, mix),
        VX_Success);
    for (size_t i = 0; i < a.size(); i += 4) ExpectStraight(&a[i], &b[i], &out[i], alpha, full, black, double{mix});
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
    ASSERT_EQ(Dissolve(a, b, straight, 16, 64, mix), VX_Success);
    a.format = b.format = channels.format = F::BGRP_4444_8u;
    ASSERT_EQ(Dissolve(a, b, channels, 16, 64, mix), VX_Success);
    ASSERT_EQ(straight.bytes, channels.bytes);
  }
}

TEST(CrossDissolve, TenBitCodes) {
  std::vector<uint32_t> a(4 * 1024), b(a.size()), out(a.size());
  Random random(5);
  random.Fill(a.data(), a.size() * 4), random.Fill(b.data(), b.size() * 4);
  for (const F format : {F::V210_422_10u, F::V210_422_10u_709, kRgb10Format})
    for (const float mix : kMixes) {
      const int pixels = format == kRgb10Format ? 64 : 96, first = format == kRgb10Format ? 2 : 0;
      ASSERT_EQ(Dissolve({a.data(), 256, format}, {b.data(), 256, format}, {out.data(), 256, format}, pixels, 64, mix),
                VX_Success);
      for (size_t i = 0; i < a.size(); ++i) {
        for (int bit = first; bit < first + 30; bit += 10) {
          const double x = a[i] >> bit & 1023, y = b[i] >> bit & 1023;
          ASSERT_TRUE(IsRounded(x * (1 - double{mix}) + y * double{mix}, out[i] >> bit & 1023));
        }
        ASSERT_EQ(out[i] & (first ? 3u : 0xC0000000u), 0u);
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
      const Image a(fa, kWidth, kHeight, 1), b(fb, kWidth, kHeight, 2), out(formats[i], kWidth, kHeight, 3);
      SCOPED_TRACE(std::string(FormatName(fa)) + " and " + FormatName(fb) + " to " + FormatName(out.format) +
                   ", hint " + std::to_string(hint));
      const bool inFloats = hint != 2 && (Depth(fa) != Depth(out.format) || Depth(fb) != Depth(out.format));
      const Image mixed(inFloats ? InFloats(out.format) : out.format, kWidth, kHeight, 4);
      ASSERT_EQ(Dissolve(Converted(a, mixed.format, kWidth, kHeight, hint),
                         Converted(b, mixed.format, kWidth, kHeight, hint), mixed, kWidth, kHeight, 0.4f, hint),
                VX_Success);
      ASSERT_EQ(Dissolve(a, b, out, kWidth, kHeight, 0.4f, hint), VX_Success);
      ASSERT_EQ(out.bytes, Converted(mixed, out.format, kWidth, kHeight, hint).bytes);
    }
}

TEST(CrossDissolve, EndsAreConversions) {
  constexpr float kInf = std::numeric_limits<float>::infinity();
  const Image a(F::VUYA_4444_8u, 33, 4, 1), b(F::UYVY_422_8u_709, 33, 4, 2), out(F::ARGB_4444_15u, 33, 4, 3);
  const Image isA = Converted(a, out.format, 33, 4, 3), isB = Converted(b, out.format, 33, 4, 3);
  for (const float mix : {0.0f, 7.9e-6f, -0.5f, -kInf, std::numeric_limits<float>::quiet_NaN(), 1e-3f, 0.999f, 1.0f,
                          1 - 5e-6f, 2.0f, kInf}) {
    ASSERT_EQ(Dissolve(a, b, out, 33, 4, mix), VX_Success);
    EXPECT_EQ(out.bytes == isA.bytes, !(mix >= 8e-6f)) << mix;
    EXPECT_EQ(out.bytes == isB.bytes, mix > 0.9999f) << mix;
  }
  // The other image is not looked at.
  EXPECT_EQ(Dissolve(a, {nullptr, 0, F::PALDV25}, out, 33, 4, 0), VX_Success);
  EXPECT_EQ(out.bytes, isA.bytes);
}

TEST(CrossDissolve, Arena) {
  const std::vector<F> formats = RasterFormats();
  for (size_t i = 0; i < formats.size(); ++i)
    for (int place = 0; place < 4; ++place) {  // two other buffers, in place of A, of B, other formats
      const F dst = formats[i];
      ArenaCase c;
      c.name = std::string("dissolve into ") + FormatName(dst) + ", place " + std::to_string(place);
      c.sources = {dst, dst};
      if (place == 3) c.sources = {formats[(5 * i + 1) % formats.size()], formats[(3 * i + 7) % formats.size()]};
      if (place == 1 || place == 2) c.sources = {dst}, c.destinationIsInput = true;
      c.destination = dst;
      c.seed = i + 1;
      if (place == 0) c.everyContents = true;
      c.run = [place](const ArenaFrame* sources, const ArenaFrame& to) {
        const ArenaFrame& a = place == 1 ? to : sources[0];
        const ArenaFrame& b = place == 0 || place == 3 ? sources[1] : place == 1 ? sources[0] : to;
        const float mix = place == 2 && to.width % 5 == 0 ? static_cast<float>(to.width / 5 % 2)
                                                          : 0.1f + static_cast<float>(to.width) / 200;
        return Dissolve(View(a), View(b), View(to), to.width, to.height, mix, 3 - place);
      };
      EXPECT_TRUE(RunArena(c));
    }
}

TEST(CrossDissolve, Refusals) {
  constexpr F kFrame = FromBits(0x7F000004), good = F::BGRA_4444_8u;
  const struct {
    F a = good, b = good, dst = good;
    int32_t width = 4, height = 4;
    float mix = 0.5f;
    bool nullA = false, nullB = false, nullDst = false;
    VX_Result expected;
  } cases[] = {
      {.a = F::PALDV25, .expected = VX_ErrUnsupportedFormat},
      {.b = F::YUV_420_MPEG2_FRAME, .height = 0, .expected = VX_ErrUnsupportedFormat},
      {.dst = kFrame, .height = -1, .expected = VX_ErrUnsupportedDestinationFormat},
      {.dst = kFrame, .mix = 1, .expected = VX_ErrFormatNotHandled},
      {.a = F::Invalid, .b = F::Invalid, .dst = F::Invalid, .expected = VX_ErrFailed},
      {.a = F::Invalid, .dst = F::BGRA_4444_32f, .expected = VX_ErrFailed},
      {.width = -1, .expected = VX_ErrArgumentOutOfRange},
      {.width = -1, .mix = 1, .expected = VX_ErrArgumentOutOfRange},
      {.height = INT_MIN, .mix = 0, .expected = VX_ErrArgumentOutOfRange},
      {.width = INT_MAX, .expected = VX_ErrArgumentOutOfRange},
      {.width = 0, .nullA = true, .nullB = true, .nullDst = true, .expected = VX_Success},
      {.height = 0, .nullA = true, .nullB = true, .nullDst = true, .expected = VX_Success},
      {.nullA = true, .expected = VX_ErrNullSource},
      {.mix = 0, .nullA = true, .nullDst = true, .expected = VX_ErrNullSource},
      {.nullB = true, .expected = VX_ErrNullSource},
      {.nullDst = true, .expected = VX_ErrNullDestination},
  };
  for (const auto& c : cases)
    ExpectRefusal("case " + std::to_string(&c - cases), c.expected, [&](void* p) {
      return Dissolve({c.nullA ? nullptr : p, 64, c.a}, {c.nullB ? nullptr : p, 64, c.b},
                      {c.nullDst ? nullptr : p, -64, c.dst}, c.width, c.height, c.mix);
    });
}

// ---- Sums

// Five images of as many formats, summed as floats in the test.
TEST(Accumulate, SumsInFloatsAndRoundsOnce) {
  constexpr int32_t kWidth = 391, kHeight = 3;
  const std::vector<F> formats = RasterFormats();
  const std::vector<float> weights = {0.25f, 0.5f, -0.125f, 0, 0.4f};
  for (size_t i = 0; i < formats.size(); ++i) {
    SCOPED_TRACE(FormatName(formats[i]));
    Image out(formats[i], kWidth, kHeight, 0), sum(InFloats(formats[i]), kWidth, kHeight, 0);
    std::vector<float> sums(sum.bytes.size() / 4), values(sums.size());
    std::vector<Image> images;
    for (size_t k = 0; k < 5; ++k) {
      images.emplace_back(formats[(i + 9 * k) % formats.size()], kWidth, kHeight, k);
      std::memcpy(values.data(), Converted(images[k], sum.format, kWidth, kHeight, 3).bytes.data(), sum.bytes.size());
      for (size_t s = 0; s < sums.size() && weights[k] != 0; ++s) sums[s] += values[s] * weights[k];
    }
    if (AlphaKind(sum.format) == kAlphaIgnored)
      for (size_t s = IsReversed(sum.format) ? 0 : 3; s < sums.size(); s += 4) sums[s] = 1;
    std::memcpy(sum.bytes.data(), sums.data(), sum.bytes.size());
    ASSERT_EQ(Accumulate({images.begin(), images.end()}, out, kWidth, kHeight, weights), VX_Success);
    ASSERT_EQ(out.bytes, Converted(sum, out.format, kWidth, kHeight, 3).bytes);
  }
}

TEST(Accumulate, WholeWeightsSaturateAndNoneGivesZero) {
  const uint8_t a[] = {100, 200, 3, 255, 0, 16, 255, 128}, b[] = {50, 100, 4, 255, 1, 16, 255, 127};
  Bytes out(8, 9);
  ASSERT_EQ(Accumulate({{a, 8, F::BGRA_4444_8u}, {b, 8, F::BGRA_4444_8u}}, {out.data(), 8, F::BGRA_4444_8u}, 2, 1),
            VX_Success);
  EXPECT_EQ(out, (Bytes{150, 255, 7, 255, 1, 32, 255, 255}));
  const std::vector<float> unread(8, NAN);  // of weight 0
  ASSERT_EQ(Accumulate({{unread.data(), 32, F::BGRA_4444_32f}, {b, 8, F::BGRA_4444_8u}},
                       {out.data(), 8, F::BGRA_4444_8u}, 2, 1, {0, 1}),
            VX_Success);
  EXPECT_EQ(out, Bytes(b, b + 8));
  ASSERT_EQ(Accumulate({}, {out.data(), 8, F::BGRP_4444_8u}, 2, 1), VX_Success);
  EXPECT_EQ(out, Bytes(8, 0));
  ASSERT_EQ(Accumulate({}, {out.data(), 8, F::VUYX_4444_8u}, 2, 1), VX_Success);
  EXPECT_EQ(out, (Bytes{128, 128, 16, 255, 128, 128, 16, 255}));
}

TEST(Accumulate, Arena) {
  const std::vector<F> formats = RasterFormats();
  for (size_t i = 0; i < formats.size(); ++i)
    for (const bool inPlace : {false, true}) {
      ArenaCase c;
      c.name = std::string("accumulate into ") + FormatName(formats[i]);
      c.sources = {formats[i], formats[(5 * i + 1) % formats.size()], formats[(3 * i + 7) % formats.size()]};
      c.destination = formats[i];
      c.destinationIsInput = inPlace;
      c.seed = i + 1;
      c.run = [inPlace](const ArenaFrame* sources, const ArenaFrame& to) {
        std::vector<View> views = {View(sources[0]), View(sources[1]), View(sources[2])};
        if (inPlace) views.push_back(View(to));
        return Accumulate(views, View(to), to.width, to.height, {0.5f, 0.25f, 0.125f, 0.3f});
      };
      EXPECT_TRUE(RunArena(c));
    }
}

TEST(Accumulate, Refusals) {
  constexpr F good = F::BGRA_4444_8u;
  const struct {
    F src = good, dst = good;
    int32_t count = 2, width = 4, height = 4;
    bool nullArrays = false, nullSource = false, nullDst = false;
    VX_Result expected;
  } cases[] = {{.src = F::PALDV25, .expected = VX_ErrUnsupportedFormat},
               {.dst = F::YUV_420_MPEG4_FIELD, .expected = VX_ErrUnsupportedDestinationFormat},
               {.dst = F::NTSCDV25, .count = 0, .nullArrays = true, .expected = VX_ErrUnsupportedDestinationFormat},
               {.src = F::Invalid, .dst = F::BGRA_4444_32f, .expected = VX_ErrFailed},
               {.dst = F::Invalid, .count = 0, .expected = VX_ErrFailed},
               {.count = -1, .expected = VX_ErrArgumentOutOfRange},
               {.width = -4, .expected = VX_ErrArgumentOutOfRange},
               {.count = 0, .height = -4, .nullArrays = true, .expected = VX_ErrArgumentOutOfRange},
               {.width = INT_MAX, .expected = VX_ErrArgumentOutOfRange},
               {.width = 0, .nullSource = true, .nullDst = true, .expected = VX_Success},
               {.nullArrays = true, .expected = VX_ErrNullSource},
               {.nullSource = true, .expected = VX_ErrNullSource},
               {.nullDst = true, .expected = VX_ErrNullDestination},
               {.count = 0, .nullArrays = true, .nullDst = true, .expected = VX_ErrNullDestination}};
  for (const auto& c : cases)
    ExpectRefusal("case " + std::to_string(&c - cases), c.expected, [&](void* p) {
      const void* const bases[] = {p, c.nullSource ? nullptr : p};
      const int32_t rowBytes[] = {64, -64};
      const F formats[] = {good, c.src};
      return VX_Accumulate(c.nullArrays ? nullptr : bases, rowBytes, formats, c.count, c.nullDst ? nullptr : p, 64,
                           c.dst, c.width, c.height, nullptr, 3);
    });
}

// ---- Both

TEST(CrossDissolve, AndSumsWithAnyNumberOfWorkers) {
  const int32_t width = 703, height = 603;  // past the cache in floats
  for (const F format : {F::BGRA_4444_8u, F::V210_422_10u, F::XRGB_4444_32f, F::UYVY_422_8u}) {
    const Image a(format, width, height, 1), b(F::BGRA_4444_8u, width, height, 2);
    Bytes mix, sum;
    for (const int threads : {1, 2, 3, 7, 16}) {
      vexel_host::SetThreadLimit(threads);
      const Image mixed(format, width, height, 3), summed(format, width, height, 4);
      ASSERT_EQ(Dissolve(a, b, mixed, width, height, 0.3f), VX_Success);
      ASSERT_EQ(Accumulate({a, b}, summed, width, height, {0.5f, 0.25f}), VX_Success);
      if (threads == 1) mix = mixed.bytes, sum = summed.bytes;
      ASSERT_TRUE(mixed.bytes == mix && summed.bytes == sum) << threads;
    }
  }
  vexel_host::SetThreadLimit(0);
}

TEST(CrossDissolve, AndSumsSurviveFailingAllocations) {
  constexpr int32_t kWidth = 40000;
  const Image a(F::UYVY_422_32f, kWidth, 2, 1), b(F::V210_422_10u, kWidth, 2, 2), out(F::BGRA_4444_8u, kWidth, 2, 3);
  EXPECT_EQ(ExpectSurvivesFailingAllocations("dissolve", [&] { return Dissolve(a, b, out, kWidth, 2, 0.5f); }), 1);
  const std::vector<View> many(4000, a);  // their converters do not fit on the stack either
  std::vector<float> weights(4000);
  weights[7] = 1;
  EXPECT_EQ(ExpectSurvivesFailingAllocations("accumulate", [&] { return Accumulate(many, out, kWidth, 2, weights); }),
            2);
}

// ---- Products

TEST(MultiplyByConstant, IsTheScaledProduct) {
  const uint8_t constants[] = {255, 1, 0, 77};
  Bytes src(256 * 4), out(src.size());
  for (size_t i = 0; i < src.size(); ++i) src[i] = static_cast<uint8_t>(i / 4);
  for (const int32_t scale : {-1, 0, 7, 17}) {
    ASSERT_EQ(VX_MultiplyByConstant(64, 4, &src[768], -256, &out[768], -256, constants, scale), VX_Success);
    for (size_t i = 0; i < src.size(); ++i)
      ASSERT_EQ(out[i], std::min(255.0, std::nearbyint(src[i] * constants[i % 4] * std::exp2(-scale)))) << scale;
  }
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
