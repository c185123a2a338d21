// The working curve of linear light against pow in double precision, and its 8u kernels against the walk through 32f.
#include <algorithm>
#include <bit>
#include <cmath>
#include <cstdint>
#include <limits>
#include <vector>

#include <gtest/gtest.h>

#include "convert/RgbKernels.h"
#include "convert/RowKernelCheck.h"
#include "support/Random.h"
#include "support/Ulp.h"

namespace vexel::testing {
namespace {

constexpr float kInfinity = std::numeric_limits<float>::infinity();

double SignedPow(float x, float exponent) { return std::copysign(std::pow(std::abs(double{x}), double{exponent}), x); }

TEST(LinearKernels, CurveBothWays) {
  std::vector<float> source = {0.0f,  -0.0f,  1.0f,      -1.0f,      1e-45f, -1e-30f,
                               3e38f, -3e38f, kInfinity, -kInfinity, 0.5f,   2.0f};
  Random random(24);
  while (source.size() < 40000) source.push_back(random.Float(-0.5f, 1.5f));
  while (source.size() < 48000)
    source.push_back(std::ldexp(random.Float(-2.0f, 2.0f), static_cast<int>(random.Int(-60, 40))));
  for (const auto& [kernels, exponent] : {std::pair{&kBgra32fToLinear, 2.4f}, {&kLinearToBgra32f, 1 / 2.4f}}) {
    const auto got = RunKernel<float>(*kernels, source, source.size() / 4, source.size());
    for (size_t i = 0; i < source.size(); ++i) {
      const double expected = i % 4 == 3 ? double{source[i]} : SignedPow(source[i], exponent);
      ASSERT_LE(UlpError(got[i], expected), i % 4 == 3 ? 0 : 1.5) << source[i] << " to " << exponent;
      ASSERT_EQ(std::signbit(got[i]), std::signbit(source[i]));
    }
  }
}

TEST(LinearKernels, NaNStaysNaN) {
  const std::vector<float> source(4 * 19, std::bit_cast<float>(0x7F800001));
  for (const RowKernelSet* kernels : {&kBgra32fToLinear, &kLinearToBgra32f})
    for (const float value : RunKernel<float>(*kernels, source, 19, source.size())) EXPECT_TRUE(std::isnan(value));
  EXPECT_EQ(RunKernel<uint8_t>(kLinearToBgra8, source, 19, source.size()), std::vector<uint8_t>(source.size(), 0));
}

TEST(LinearKernels, EightBitCodes) {
  std::vector<uint8_t> codes;
  for (int c = 0; c < 256; ++c)
    codes.insert(codes.end(), {static_cast<uint8_t>(c), static_cast<uint8_t>(255 - c), static_cast<uint8_t>(c * 3),
                               static_cast<uint8_t>(c * 7)});
  const auto light = RunKernel<float>(kBgra8ToLinear, codes, 256, codes.size());
  for (size_t i = 0; i < codes.size(); ++i) {
    if (i % 4 == 3) continue;
    ASSERT_NEAR(light[i], std::pow(codes[i] / 255.0, 2.4), 1e-6) << int{codes[i]};
  }
  EXPECT_EQ(RunKernel<uint8_t>(kLinearToBgra8, light, 256, codes.size()), codes);
}

// Light to 8u is the curve and the narrowing of 32f, exactly so beside every threshold between two codes, where the
// range of int32 ends, and anywhere else.
TEST(LinearKernels, LightToCodesEqualsTheWalkThroughFloat) {
  std::vector<float> source;
  const auto addAround = [&](double value, int steps, int stride) {
    const int32_t bits = std::bit_cast<int32_t>(static_cast<float>(value));
    for (int i = -steps; i <= steps; ++i) source.push_back(std::bit_cast<float>(bits + i * stride));
  };
  for (int code = 1; code < 256; ++code) {
    const double threshold = std::pow((code - 0.5) / 255, 2.4);
    addAround(threshold, 300, 1);
    addAround(threshold, 300, 1997);  // past the neighbouring thresholds
    addAround(-threshold, 2, 1);
  }
  addAround(std::pow(2147483648.0 / 255, 2.4), 300, 1);
  addAround(std::pow(2147483648.0 / 255, 2.4), 300, 1 << 16);
  addAround(0x1p-23, 20, 1);
  addAround(1.0, 20, 1);
  addAround(20.0, 300, 1 << 17);  // all below 512, from where another form takes over
  addAround(512.0, 300, 1);
  Random random(8);
  for (int i = 0; i < 200000; ++i) source.push_back(i % 2 ? random.Unit() : std::bit_cast<float>(random.Bits32()));
  source.resize(source.size() / 4 * 4);
  const size_t count = source.size() / 4;
  const auto codes = RunKernel<uint8_t>(kLinearToBgra8, source, count, source.size());
  const auto floats = RunKernel<float>(kLinearToBgra32f, source, count, source.size());
  const auto expected = RunKernel<uint8_t>(kNarrow32fTo8u, floats, count, source.size());
  for (size_t i = 0; i < source.size(); ++i)
    ASSERT_EQ(codes[i], expected[i]) << source[i] << ", bits " << std::hex << std::bit_cast<uint32_t>(source[i]);
}

}  // namespace
}  // namespace vexel::testing
