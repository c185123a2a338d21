#include <gtest/gtest.h>

#include <climits>
#include <cmath>
#include <cstring>
#include <limits>
#include <string>
#include <vector>

#include "formats/FormatBits.h"
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

VX_Result Dissolve(const void* a, const void* b, void* dst, int32_t rowBytes, F format, int32_t width, int32_t height,
                   float mix, int32_t hint = 3) {
  return VX_CrossDissolve(a, rowBytes, format, b, rowBytes, format, dst, rowBytes, format, width, height, mix, hint);
}

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
      ASSERT_EQ(Dissolve(a.data(), b.data(), out.data(), 1024, format, pixels, 256, mix), VX_Success);
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
    ASSERT_EQ(Dissolve(a.data(), b.data(), out.data(), 64 * 4 * sizeof(T), format, 64, 64, mix), VX_Success);
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
  Bytes a(4096), b(4096), straight(4096), channels(4096);
  Random random(3);
  random.Fill(a.data(), a.size()), random.Fill(b.data(), b.size());
  for (size_t i = 3; i < a.size(); i += 4) a[i] = b[i] = static_cast<uint8_t>(i % 8 == 3 ? 255 : i % 255 + 1);
  for (const float mix : kMixes) {
    Dissolve(a.data(), b.data(), straight.data(), 64, F::BGRA_4444_8u, 16, 64, mix);
    Dissolve(a.data(), b.data(), channels.data(), 64, F::BGRP_4444_8u, 16, 64, mix);
    ASSERT_EQ(straight, channels);
  }
}

TEST(CrossDissolve, TenBitCodes) {
  std::vector<uint32_t> a(4 * 1024), b(a.size()), out(a.size());
  Random random(5);
  random.Fill(a.data(), a.size() * 4), random.Fill(b.data(), b.size() * 4);
  for (const F format : {F::V210_422_10u, F::V210_422_10u_709, kRgb10Format})
    for (const float mix : kMixes) {
      const int pixels = format == kRgb10Format ? 64 : 96, first = format == kRgb10Format ? 2 : 0;
      ASSERT_EQ(Dissolve(a.data(), b.data(), out.data(), 256, format, pixels, 64, mix), VX_Success);
      for (size_t i = 0; i < a.size(); ++i) {
        for (int bit = first; bit < first + 30; bit += 10) {
          const double x = a[i] >> bit & 1023, y = b[i] >> bit & 1023;
          ASSERT_TRUE(IsRounded(x * (1 - double{mix}) + y * double{mix}, out[i] >> bit & 1023));
        }
        ASSERT_EQ(out[i] & (first ? 3u : 0xC0000000u), 0u);
      }
    }
}

// A picture with a top and a left edge to tell it from its mirror images.
struct Image {
  Image(F f, int32_t w, int32_t h, uint64_t seed)
      : format(f), rowBytes(static_cast<int32_t>(UnpaddedRowBytes(f, w))), bytes(static_cast<size_t>(rowBytes) * h) {
    Random random(seed);
    for (int32_t row = 0; row < h; ++row)
      FillSamples(&bytes[static_cast<size_t>(row * rowBytes)], static_cast<size_t>(rowBytes), f, Contents::Random,
                  random);
  }
  F format;
  int32_t rowBytes;
  Bytes bytes;
};

Image Converted(const Image& image, F format, int32_t width, int32_t height, int32_t quality) {
  Image out(format, width, height, 0);
  EXPECT_EQ(VX_Convert(image.bytes.data(), image.rowBytes, image.format, out.bytes.data(), out.rowBytes, format, width,
                       height, quality),
            VX_Success);
  return out;
}

// Mixed formats go through the destination's own depth, or through floats where depths differ and the hint is not 2.
TEST(CrossDissolve, MixesInTheWorkingFormat) {
  constexpr int32_t kWidth = 391, kHeight = 5;
  const std::vector<F> formats = RasterFormats();
  for (size_t i = 0; i < formats.size(); ++i)
    for (const int32_t hint : {0, 2, 3}) {
      const F dst = formats[i], fa = formats[(7 * i + 3) % formats.size()],
              fb = hint ? formats[(11 * i + 5) % formats.size()] : fa;
      SCOPED_TRACE(std::string(FormatName(fa)) + " and " + FormatName(fb) + " to " + FormatName(dst) + ", hint " +
                   std::to_string(hint));
      const bool inFloat = hint != 2 && (Depth(fa) != Depth(dst) || Depth(fb) != Depth(dst));
      const F working = !inFloat              ? dst
                        : dst == kRgb10Format ? F::BGRX_4444_32f
                                              : FromBits((Bits(dst) & ~0x1C0u) | 0x100u);
      const Image a(fa, kWidth, kHeight, 1), b(fb, kWidth, kHeight, 2);
      const Image workingA = Converted(a, working, kWidth, kHeight, hint),
                  workingB = Converted(b, working, kWidth, kHeight, hint);
      Image mixed(working, kWidth, kHeight, 3), out(dst, kWidth, kHeight, 4);
      ASSERT_EQ(Dissolve(workingA.bytes.data(), workingB.bytes.data(), mixed.bytes.data(), mixed.rowBytes, working,
                         kWidth, kHeight, 0.4f, hint),
                VX_Success);
      ASSERT_EQ(VX_CrossDissolve(a.bytes.data(), a.rowBytes, fa, b.bytes.data(), b.rowBytes, fb, out.bytes.data(),
                                 out.rowBytes, dst, kWidth, kHeight, 0.4f, hint),
                VX_Success);
      ASSERT_EQ(out.bytes, Converted(mixed, dst, kWidth, kHeight, hint).bytes);
    }
}

TEST(CrossDissolve, EndsAreConversions) {
  constexpr float kNan = std::numeric_limits<float>::quiet_NaN(), kInf = std::numeric_limits<float>::infinity();
  const Image a(F::VUYA_4444_8u, 33, 4, 1), b(F::UYVY_422_8u_709, 33, 4, 2);
  const Image isA = Converted(a, F::ARGB_4444_15u, 33, 4, 3), isB = Converted(b, F::ARGB_4444_15u, 33, 4, 3);
  const struct {
    float mix;
    const Image* expected;
  } cases[] = {{0, &isA},         {7.9e-6f, &isA}, {-0.5f, &isA}, {-kInf, &isA},    {kNan, &isA},     {1, &isB},
               {1 - 5e-6f, &isB}, {2, &isB},       {kInf, &isB},  {1e-3f, nullptr}, {0.999f, nullptr}};
  for (const auto& c : cases) {
    Image out(F::ARGB_4444_15u, 33, 4, 3);
    ASSERT_EQ(VX_CrossDissolve(a.bytes.data(), a.rowBytes, a.format, b.bytes.data(), b.rowBytes, b.format,
                               out.bytes.data(), out.rowBytes, out.format, 33, 4, c.mix, 3),
              VX_Success);
    EXPECT_EQ(out.bytes == isA.bytes, c.expected == &isA) << c.mix;
    EXPECT_EQ(out.bytes == isB.bytes, c.expected == &isB) << c.mix;
  }
  // The other image is not looked at.
  Image out(F::ARGB_4444_15u, 33, 4, 3);
  EXPECT_EQ(VX_CrossDissolve(a.bytes.data(), a.rowBytes, a.format, nullptr, 0, F::PALDV25, out.bytes.data(),
                             out.rowBytes, out.format, 33, 4, 0, 3),
            VX_Success);
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
        return VX_CrossDissolve(a.base, a.rowBytes, a.format, b.base, b.rowBytes, b.format, to.base, to.rowBytes,
                                to.format, to.width, to.height, mix, 3 - place);
      };
      EXPECT_TRUE(RunArena(c));
    }
}

TEST(CrossDissolve, AnyNumberOfWorkersAndLargePictures) {
  for (const F format : {F::BGRA_4444_8u, F::V210_422_10u, F::XRGB_4444_32f, F::UYVY_422_8u}) {
    const int32_t width = 2311, height = 1203;
    const Image a(format, width, height, 1), b(F::BGRA_4444_8u, width, height, 2);
    Bytes first;
    for (const int threads : {1, 2, 3, 7, 16}) {
      vexel_host::SetThreadLimit(threads);
      Image out(format, width, height, 3);
      ASSERT_EQ(VX_CrossDissolve(a.bytes.data(), a.rowBytes, format, b.bytes.data(), b.rowBytes, b.format,
                                 out.bytes.data(), out.rowBytes, format, width, height, 0.3f, 3),
                VX_Success);
      if (first.empty()) first = out.bytes;
      ASSERT_EQ(out.bytes, first) << threads;
    }
    vexel_host::SetThreadLimit(0);
  }
}

TEST(CrossDissolve, Refusals) {
  constexpr F kFrame = FromBits(0x7F000004), good = F::BGRA_4444_8u;
  const struct {
    F a, b, dst;
    int32_t width, height;
    float mix;
    bool nullA, nullB, nullDst;
    VX_Result expected;
  } cases[] = {
      {F::PALDV25, good, good, 4, 4, 0.5f, false, false, false, VX_ErrUnsupportedFormat},
      {good, F::YUV_420_MPEG2_FRAME, good, 4, 0, 0.5f, false, false, false, VX_ErrUnsupportedFormat},
      {good, good, kFrame, 4, -1, 0.5f, false, false, false, VX_ErrUnsupportedDestinationFormat},
      {F::Invalid, F::Invalid, F::Invalid, 4, 4, 0.5f, false, false, false, VX_ErrFailed},
      {F::Invalid, good, F::BGRA_4444_32f, 4, 4, 0.5f, false, false, false, VX_ErrFailed},
      {good, good, good, -1, 4, 0.5f, false, false, false, VX_ErrArgumentOutOfRange},
      {good, good, good, 4, INT_MIN, 0, false, false, false, VX_ErrArgumentOutOfRange},
      {good, good, good, -1, 4, 1, false, false, false, VX_ErrArgumentOutOfRange},
      {good, good, good, INT_MAX, 4, 0.5f, false, false, false, VX_ErrArgumentOutOfRange},
      {good, good, good, 0, 4, 0.5f, true, true, true, VX_Success},
      {good, good, good, 4, 0, 0.5f, true, true, true, VX_Success},
      {good, good, good, 4, 4, 0.5f, true, false, false, VX_ErrNullSource},
      {good, good, good, 4, 4, 0.5f, false, true, false, VX_ErrNullSource},
      {good, good, good, 4, 4, 0.5f, false, false, true, VX_ErrNullDestination},
      {good, good, good, 4, 4, 0, true, false, true, VX_ErrNullSource},
      {good, good, kFrame, 4, 4, 1, false, false, false, VX_ErrFormatNotHandled},
  };
  for (const auto& c : cases)
    ExpectRefusal("case " + std::to_string(&c - cases), c.expected, [&](void* p) {
      return VX_CrossDissolve(c.nullA ? nullptr : p, 64, c.a, c.nullB ? nullptr : p, 64, c.b, c.nullDst ? nullptr : p,
                              -64, c.dst, c.width, c.height, c.mix, 3);
    });
}

TEST(CrossDissolve, FailingAllocations) {
  constexpr int32_t kWidth = 40000;
  const Image a(F::UYVY_422_32f, kWidth, 2, 1), b(F::V210_422_10u, kWidth, 2, 2);
  Image out(F::BGRA_4444_8u, kWidth, 2, 3);
  const int count = ExpectSurvivesFailingAllocations("dissolve", [&] {
    return VX_CrossDissolve(a.bytes.data(), a.rowBytes, a.format, b.bytes.data(), b.rowBytes, b.format,
                            out.bytes.data(), out.rowBytes, out.format, kWidth, 2, 0.5f, 3);
  });
  EXPECT_GT(count, 0);
}

// ---- Sums

struct SumCall {
  std::vector<const void*> bases;
  std::vector<int32_t> rowBytes;
  std::vector<F> formats;
  std::vector<float> weights;

  void Add(const void* base, int32_t bytes, F format) {
    bases.push_back(base), rowBytes.push_back(bytes), formats.push_back(format);
  }
  VX_Result operator()(void* dst, int32_t dstRowBytes, F format, int32_t width, int32_t height) const {
    return VX_Accumulate(bases.data(), rowBytes.data(), formats.data(), static_cast<int32_t>(bases.size()), dst,
                         dstRowBytes, format, width, height, weights.empty() ? nullptr : weights.data(), 3);
  }
};

// Five images of as many formats, summed as floats in the test.
TEST(Accumulate, SumsInFloatsAndRoundsOnce) {
  constexpr int32_t kWidth = 391, kHeight = 3;
  const std::vector<F> formats = RasterFormats();
  for (size_t i = 0; i < formats.size(); ++i) {
    const F dst = formats[i],
            sumFormat = dst == kRgb10Format ? F::BGRX_4444_32f : FromBits((Bits(dst) & ~0x1C0u) | 0x100u);
    SCOPED_TRACE(FormatName(dst));
    SumCall call;
    call.weights = {0.25f, 0.5f, -0.125f, 0, 0.4f};
    std::vector<Image> images;
    Image sum(sumFormat, kWidth, kHeight, 0), out(dst, kWidth, kHeight, 0);
    std::vector<float> sums(sum.bytes.size() / 4);
    for (size_t k = 0; k < 5; ++k) images.emplace_back(formats[(i + 9 * k) % formats.size()], kWidth, kHeight, k);
    for (size_t k = 0; k < 5; ++k) {
      call.Add(images[k].bytes.data(), images[k].rowBytes, images[k].format);
      const Image wide = Converted(images[k], sumFormat, kWidth, kHeight, 3);
      for (size_t s = 0; s < sums.size() && call.weights[k] != 0; ++s) {
        float value;
        std::memcpy(&value, &wide.bytes[4 * s], 4);
        sums[s] += value * call.weights[k];
      }
    }
    const size_t alpha = IsReversed(sumFormat) ? 0 : 3;
    for (size_t s = alpha; AlphaKind(sumFormat) == kAlphaIgnored && s < sums.size(); s += 4) sums[s] = 1;
    std::memcpy(sum.bytes.data(), sums.data(), sum.bytes.size());
    ASSERT_EQ(call(out.bytes.data(), out.rowBytes, dst, kWidth, kHeight), VX_Success);
    ASSERT_EQ(out.bytes, Converted(sum, dst, kWidth, kHeight, 3).bytes);
  }
}

TEST(Accumulate, WholeWeightsSaturateAndNoneGivesZero) {
  const uint8_t a[] = {100, 200, 3, 255, 0, 16, 255, 128}, b[] = {50, 100, 4, 255, 1, 16, 255, 127};
  SumCall call;
  call.Add(a, 8, F::BGRA_4444_8u), call.Add(b, 8, F::BGRA_4444_8u);
  Bytes out(8, 9);
  ASSERT_EQ(call(out.data(), 8, F::BGRA_4444_8u, 2, 1), VX_Success);
  EXPECT_EQ(out, (Bytes{150, 255, 7, 255, 1, 32, 255, 255}));
  ASSERT_EQ(SumCall()(out.data(), 8, F::BGRP_4444_8u, 2, 1), VX_Success);
  EXPECT_EQ(out, Bytes(8, 0));
  ASSERT_EQ(SumCall()(out.data(), 8, F::VUYX_4444_8u, 2, 1), VX_Success);
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
        SumCall call;
        for (int k = 0; k < 3; ++k) call.Add(sources[k].base, sources[k].rowBytes, sources[k].format);
        if (inPlace) call.Add(to.base, to.rowBytes, to.format);
        call.weights = {0.5f, 0.25f, 0.125f, 0.3f};
        return call(to.base, to.rowBytes, to.format, to.width, to.height);
      };
      EXPECT_TRUE(RunArena(c));
    }
}

TEST(Accumulate, WorkersRefusalsAndFailingAllocations) {
  const Image a(F::UYVY_422_8u, 701, 333, 1), b(F::PRGB_4444_15u, 701, 333, 2);
  SumCall call;
  call.Add(a.bytes.data(), a.rowBytes, a.format), call.Add(b.bytes.data(), b.rowBytes, b.format);
  Bytes first;
  for (const int threads : {1, 2, 3, 7, 16}) {
    vexel_host::SetThreadLimit(threads);
    Image out(F::BGRA_4444_8u, 701, 333, 3);
    ASSERT_EQ(call(out.bytes.data(), out.rowBytes, out.format, 701, 333), VX_Success);
    if (first.empty()) first = out.bytes;
    ASSERT_EQ(out.bytes, first);
  }
  vexel_host::SetThreadLimit(0);

  constexpr F good = F::BGRA_4444_8u;
  const struct {
    F src, dst;
    int32_t count, width, height;
    bool nullArrays, nullSource, nullDst;
    VX_Result expected;
  } cases[] = {{F::PALDV25, good, 2, 4, 4, false, false, false, VX_ErrUnsupportedFormat},
               {good, F::YUV_420_MPEG4_FIELD, 2, 4, 4, false, false, false, VX_ErrUnsupportedDestinationFormat},
               {good, F::NTSCDV25, 0, 4, 4, true, false, false, VX_ErrUnsupportedDestinationFormat},
               {F::Invalid, F::BGRA_4444_32f, 2, 4, 4, false, false, false, VX_ErrFailed},
               {good, F::Invalid, 0, 4, 4, false, false, false, VX_ErrFailed},
               {good, good, -1, 4, 4, false, false, false, VX_ErrArgumentOutOfRange},
               {good, good, 2, -4, 4, false, false, false, VX_ErrArgumentOutOfRange},
               {good, good, 0, 4, -4, true, false, false, VX_ErrArgumentOutOfRange},
               {good, good, 2, INT_MAX, 4, false, false, false, VX_ErrArgumentOutOfRange},
               {good, good, 2, 0, 4, false, true, true, VX_Success},
               {good, good, 2, 4, 4, true, false, false, VX_ErrNullSource},
               {good, good, 2, 4, 4, false, true, false, VX_ErrNullSource},
               {good, good, 2, 4, 4, false, false, true, VX_ErrNullDestination},
               {good, good, 0, 4, 4, true, false, true, VX_ErrNullDestination}};
  for (const auto& c : cases)
    ExpectRefusal("case " + std::to_string(&c - cases), c.expected, [&](void* p) {
      const void* const bases[] = {p, c.nullSource ? nullptr : p};
      const int32_t rowBytes[] = {64, -64};
      const F formats[] = {good, c.src};
      return c.nullArrays ? VX_Accumulate(nullptr, nullptr, nullptr, c.count, c.nullDst ? nullptr : p, 64, c.dst,
                                          c.width, c.height, nullptr, 3)
                          : VX_Accumulate(bases, rowBytes, formats, c.count, c.nullDst ? nullptr : p, 64, c.dst,
                                          c.width, c.height, nullptr, 3);
    });

  constexpr int32_t kWidth = 40000;
  const Image wide(F::UYVY_422_32f, kWidth, 2, 1);
  Image out(F::BGRA_4444_8u, kWidth, 2, 3);
  SumCall many;
  for (int i = 0; i < 4000; ++i)
    many.Add(wide.bytes.data(), wide.rowBytes, wide.format), many.weights.push_back(i == 7);
  EXPECT_EQ(ExpectSurvivesFailingAllocations(
                "accumulate", [&] { return many(out.bytes.data(), out.rowBytes, out.format, kWidth, 2); }),
            2);
}

// ---- Products

TEST(MultiplyByConstant, IsTheScaledProduct) {
  const uint8_t constants[] = {255, 1, 0, 77};
  Bytes src(256 * 4), out(src.size());
  for (size_t i = 0; i < src.size(); ++i) src[i] = static_cast<uint8_t>(i / 4);
  for (const int32_t scale : {-9, -1, 0, 1, 7, 8, 16, 17, 40}) {
    ASSERT_EQ(VX_MultiplyByConstant(64, 4, src.data(), 256, out.data(), 256, constants, scale), VX_Success);
    for (size_t i = 0; i < src.size(); ++i)
      ASSERT_EQ(out[i], std::min(255.0, std::nearbyint(src[i] * constants[i % 4] * std::exp2(-scale)))) << scale;
  }
  Bytes inPlace = src;
  VX_MultiplyByConstant(64, 4, src.data(), 256, out.data(), 256, constants, 8);
  ASSERT_EQ(VX_MultiplyByConstant(64, 4, inPlace.data(), 256, inPlace.data(), 256, constants, 8), VX_Success);
  EXPECT_EQ(inPlace, out);

  ArenaCase c;
  c.name = "multiply by constant";
  c.sources = {F::BGRA_4444_8u};
  c.destination = F::BGRA_4444_8u;
  c.run = [&](const ArenaFrame* from, const ArenaFrame& to) {
    return VX_MultiplyByConstant(to.width, to.height, from->base, from->rowBytes, to.base, to.rowBytes, constants, 7);
  };
  EXPECT_TRUE(RunArena(c));
  for (const auto& [width, height, rowBytes, null] : {std::tuple{0, 4, 64, 0},
                                                      {4, 0, 64, 0},
                                                      {-1, 4, 64, 0},
                                                      {4, 4, 15, 0},
                                                      {4, 4, 64, 1},
                                                      {4, 4, 64, 2},
                                                      {4, 4, 64, 3}})
    ExpectRefusal("multiply", VX_ErrFailed, [&, w = width, h = height, r = rowBytes, n = null](void* p) {
      return VX_MultiplyByConstant(w, h, n == 1 ? nullptr : p, r, n == 2 ? nullptr : p, r, n == 3 ? nullptr : constants,
                                   0);
    });
}

}  // namespace
}  // namespace vexel::testing
