// Premultiplied alpha against exact quotients in double precision.
#include <bit>
#include <cmath>
#include <cstdint>
#include <limits>
#include <vector>

#include <gtest/gtest.h>

#include "convert/RgbKernels.h"
#include "convert/RowKernelCheck.h"
#include "support/Random.h"

namespace vexel::testing {
namespace {

struct AlphaCase {
  const char* name;
  const RowKernelSet* kernels;
  bool premultiplies;
  size_t alphaAt;
  int black[4];
};

double Expected(const AlphaCase& test, int channel, int alpha, int black, double most) {
  if (alpha == 0) return black;
  const double ratio = test.premultiplies ? alpha / most : most / alpha;
  // Exact where it is a tie: small integers times or over small integers.
  const double exact = test.premultiplies ? (channel - black) * double(alpha) / most : (channel - black) * most / alpha;
  EXPECT_NEAR(exact, (channel - black) * ratio, 1e-6 * most * most);
  return std::min(std::max(black + std::floor(exact + 0.5), 0.0), most);
}

// All 65,536 pairs of a channel and an alpha, the pair in each channel in turn, with other pixels beside them.
TEST(AlphaKernels, EightBitDomain) {
  const AlphaCase cases[] = {
      {"PremultiplyLast8u", &kPremultiplyLast8u, true, 3, {0, 0, 0, 0}},
      {"PremultiplyFirst8u", &kPremultiplyFirst8u, true, 0, {0, 0, 0, 0}},
      {"PremultiplyVuya8", &kPremultiplyVuya8, true, 3, {128, 128, 16, 0}},
      {"UnpremultiplyLast8u", &kUnpremultiplyLast8u, false, 3, {0, 0, 0, 0}},
      {"UnpremultiplyFirst8u", &kUnpremultiplyFirst8u, false, 0, {0, 0, 0, 0}},
      {"UnpremultiplyVuyp8", &kUnpremultiplyVuyp8, false, 3, {128, 128, 16, 0}},
  };
  for (const AlphaCase& test : cases) {
    std::vector<uint8_t> source(65536 * 4);
    for (size_t i = 0; i < 65536; ++i)
      for (size_t k = 0; k < 4; ++k) source[4 * i + k] = static_cast<uint8_t>(k == test.alphaAt ? i >> 8 : i + 85 * k);
    const auto result = RunKernel<uint8_t>(*test.kernels, source, 65536, source.size());
    for (size_t i = 0; i < source.size(); ++i) {
      const int alpha = source[i / 4 * 4 + test.alphaAt];
      const double expected = i % 4 == test.alphaAt ? alpha : Expected(test, source[i], alpha, test.black[i % 4], 255);
      ASSERT_EQ(result[i], expected) << test.name << ": " << int{source[i]} << " under " << alpha;
    }
  }
}

// Every alpha with the channels where quotients are closest to ties, and random ones.
TEST(AlphaKernels, FifteenBitQuotients) {
  const AlphaCase cases[] = {
      {"PremultiplyLast15u", &kPremultiplyLast15u, true, 3, {}},
      {"PremultiplyFirst15u", &kPremultiplyFirst15u, true, 0, {}},
      {"UnpremultiplyLast15u", &kUnpremultiplyLast15u, false, 3, {}},
      {"UnpremultiplyFirst15u", &kUnpremultiplyFirst15u, false, 0, {}},
  };
  for (const AlphaCase& test : cases) {
    Random random(15);
    std::vector<uint16_t> source;
    for (int a = 0; a < 65536; a += a <= 32768 ? 1 : 77) {
      // 32768 c = a q + (a - 1) / 2 has its quotient just below a tie; c as near to `most` as possible.
      const int most = std::min(a, 32768);
      int near = most;
      for (int c = most; c > 0 && c > most - 64; --c)
        if (std::abs(32768LL * c % most - most / 2) < std::abs(32768LL * near % most - most / 2)) near = c;
      const auto below = [&](int last) { return static_cast<int>(random.Int(0, last)); };
      const int channels[] = {
          0, 1, most / 2, most - 1, most, near, most + 1, 32768, a ? below(most) : 0, below(most), below(65535), 16384};
      for (size_t k = 0; k < std::size(channels); k += 3) {
        uint16_t pixel[4];
        for (size_t n = 0, m = k; n < 4; ++n) pixel[n] = static_cast<uint16_t>(n == test.alphaAt ? a : channels[m++]);
        source.insert(source.end(), pixel, pixel + 4);
      }
    }
    const auto result = RunKernel<uint16_t>(*test.kernels, source, source.size() / 4, source.size());
    for (size_t i = 0; i < source.size(); ++i) {
      const int alpha = std::min<int>(source[i / 4 * 4 + test.alphaAt], 32768),
                channel = std::min<int>(source[i], 32768);
      const double expected = i % 4 == test.alphaAt ? alpha : Expected(test, channel, alpha, 0, 32768);
      ASSERT_EQ(result[i], expected) << test.name << ": " << channel << " under " << alpha;
    }
  }
}

TEST(AlphaKernels, Float) {
  constexpr float kInfinity = std::numeric_limits<float>::infinity();
  const float kNaN = std::bit_cast<float>(0x7FC01234u);
  struct {
    float channel, alpha, premultiplied, unpremultiplied;
  } const cases[] = {
      {0.5f, 0.25f, 0.125f, 2.0f},       {0.3f, 1.0f, 0.3f, 0.3f},         {-2.0f, 0.5f, -1.0f, -4.0f},
      {0.5f, 0.0f, 0.0f, 0.0f},          {0.5f, -0.0f, -0.0f, 0.0f},       {kNaN, 0.5f, kNaN, kNaN},
      {kNaN, 0.0f, kNaN, 0.0f},          {kInfinity, 0.0f, NAN, 0.0f},     {1.0f, kInfinity, kInfinity, 0.0f},
      {3e38f, 2.0f, kInfinity, 1.5e38f}, {0.1f, 3.0f, 0.1f * 3, 0.1f / 3}, {kNaN, kNaN, kNaN, kNaN},
  };
  const auto same = [](float a, float b) {
    return std::isnan(b) ? std::isnan(a) : std::bit_cast<uint32_t>(a) == std::bit_cast<uint32_t>(b);
  };
  for (const size_t alphaAt : {0, 3})
    for (const bool premultiplies : {true, false}) {
      std::vector<float> source, expected;
      for (const auto& test : cases)
        for (size_t k = 0; k < 4; ++k) {
          source.push_back(k == alphaAt ? test.alpha : test.channel);
          expected.push_back(k == alphaAt ? test.alpha : premultiplies ? test.premultiplied : test.unpremultiplied);
        }
      const RowKernelSet& kernels = premultiplies  ? alphaAt == 3 ? kPremultiplyLast32f : kPremultiplyFirst32f
                                    : alphaAt == 3 ? kUnpremultiplyLast32f
                                                   : kUnpremultiplyFirst32f;
      const auto result = RunKernel<float>(kernels, source, std::size(cases), source.size());
      for (size_t i = 0; i < source.size(); ++i)
        EXPECT_PRED2(same, result[i], expected[i])
            << "channel " << i % 4 << " of case " << i / 4 << ", " << premultiplies;
    }
}

}  // namespace
}  // namespace vexel::testing
