// Depths and matrices of 4:4:4:4 Y'CbCr in single precision.
#include <cmath>
#include <cstring>
#include <vector>

#include <gtest/gtest.h>

#include "convert/RowKernelCheck.h"
#include "convert/YuvKernels.h"
#include "convert/YuvReference.h"
#include "support/Random.h"

namespace vexel::testing {
namespace {

constexpr float kNan = std::numeric_limits<float>::quiet_NaN(), kInfinity = std::numeric_limits<float>::infinity();

// The equations hold for codes; floats go there and back.
Triple ToYuv(const Luma& k, const Triple& bgr) {
  const Triple codes = BgrToVuy(k, {{bgr.c[0] * 255, bgr.c[1] * 255, bgr.c[2] * 255}});
  return {{(codes.c[0] - 128) / 224, (codes.c[1] - 128) / 224, (codes.c[2] - 16) / 219}};
}
Triple ToBgr(const Luma& k, const Triple& vuy) {
  const Triple codes = VuyToBgr(k, {{vuy.c[0] * 224 + 128, vuy.c[1] * 224 + 128, vuy.c[2] * 219 + 16}});
  return {{codes.c[0] / 255, codes.c[1] / 255, codes.c[2] / 255}};
}

TEST(YuvFloatKernels, MatricesFollowTheEquations) {
  struct {
    const RowKernelSet* kernels;
    Triple (*expected)(const Triple&);
  } const kMatrices[] = {
      {&kBgra32fToVuya32f_601, [](const Triple& p) { return ToYuv(k601, p); }},
      {&kBgra32fToVuya32f_709, [](const Triple& p) { return ToYuv(k709, p); }},
      {&kVuya32fToBgra32f_601, [](const Triple& p) { return ToBgr(k601, p); }},
      {&kVuya32fToBgra32f_709, [](const Triple& p) { return ToBgr(k709, p); }},
      {&kVuya32f_601To709, [](const Triple& p) { return ToYuv(k709, ToBgr(k601, p)); }},
      {&kVuya32f_709To601, [](const Triple& p) { return ToYuv(k601, ToBgr(k709, p)); }},
  };
  constexpr size_t kCount = 1000;
  Random random(7);
  std::vector<float> source(4 * kCount);
  for (float& value : source) value = random.Float(-0.5f, 1.5f);
  for (size_t m = 0; m < std::size(kMatrices); ++m) {
    const auto got = RunKernel<float>(*kMatrices[m].kernels, source, kCount, 4 * kCount);
    for (size_t i = 0; i < kCount; ++i) {
      const float* p = &source[4 * i];
      const Triple expected = kMatrices[m].expected({{p[0], p[1], p[2]}});
      for (size_t c = 0; c < 3; ++c)
        ASSERT_NEAR(got[4 * i + c], expected.c[c], 2.5e-6) << "matrix " << m << " channel " << c;
      ASSERT_EQ(got[4 * i + 3], p[3]) << "matrix " << m;
    }
  }
}

TEST(YuvFloatKernels, GreyStaysGreyBetweenColorimetries) {
  const std::vector<float> source = {0, 0, 0.3f, 0.25f, 0, 0, 1.0f, 0, 0, 0, -0.7f, 1, 0, 0, 1e20f, 2};
  for (const RowKernelSet* kernels : {&kVuya32f_601To709, &kVuya32f_709To601})
    EXPECT_EQ(RunKernel<float>(*kernels, source, 4, 16), source);
}

// An infinite or undefined channel reaches only those channels whose formula names it.
TEST(YuvFloatKernels, SpecialValuesReachOnlyTheirChannels) {
  for (const float bad : {kInfinity, kNan}) {
    const std::vector<float> badV = {bad, 0.25f, 0.5f, 1}, badU = {0.25f, bad, 0.5f, 1},
                             badA = {0.25f, 0.25f, 0.5f, bad};
    for (const RowKernelSet* kernels : {&kVuya32fToBgra32f_601, &kVuya32fToBgra32f_709}) {
      const auto fromV = RunKernel<float>(*kernels, badV, 1, 4), fromU = RunKernel<float>(*kernels, badU, 1, 4);
      EXPECT_TRUE(std::isfinite(fromV[0]) && !std::isfinite(fromV[1]) && !std::isfinite(fromV[2]) && fromV[3] == 1);
      EXPECT_TRUE(!std::isfinite(fromU[0]) && !std::isfinite(fromU[1]) && std::isfinite(fromU[2]) && fromU[3] == 1);
    }
    for (const RowKernelSet* kernels : {&kBgra32fToVuya32f_601, &kVuya32fToBgra32f_709, &kVuya32f_601To709}) {
      const auto got = RunKernel<float>(*kernels, badA, 1, 4);
      for (int c = 0; c < 3; ++c) EXPECT_TRUE(std::isfinite(got[c]));
      EXPECT_FALSE(std::isfinite(got[3]));
    }
  }
}

TEST(YuvFloatKernels, EveryCodeWidensAndComesBack) {
  std::vector<uint8_t> codes(4 * 256);
  for (size_t i = 0; i < codes.size(); ++i) codes[i] = static_cast<uint8_t>(i / 4);
  const auto wide = RunKernel<float>(kVuya8To32f, codes, 256, 1024);
  for (int code = 0; code < 256; ++code) {
    const double expected[4] = {(code - 128) / 224.0, (code - 128) / 224.0, (code - 16) / 219.0, code / 255.0};
    for (int c = 0; c < 4; ++c) {
      const size_t i = static_cast<size_t>(4 * code + c);
      EXPECT_NEAR(wide[i], expected[c], 1.2e-7 * std::abs(expected[c]));
    }
  }
  EXPECT_EQ(wide[4 * 16 + 2], 0.0f);
  EXPECT_EQ(wide[4 * 255 + 3], 1.0f);
  EXPECT_EQ(RunKernel<uint8_t>(kVuya32fTo8, wide, 256, 1024), codes);
}

TEST(YuvFloatKernels, NarrowingSaturates) {
  struct {
    float value;
    uint8_t chroma, luma, alpha;
  } const kValues[] = {{-1, 0, 0, 0},         {1, 255, 235, 255},    {2, 255, 255, 255},   {-100, 0, 0, 0},
                       {0.5f, 240, 126, 128}, {kNan, 0, 0, 0},       {kInfinity, 0, 0, 0}, {-kInfinity, 0, 0, 0},
                       {1e10f, 0, 0, 0},      {8e6f, 255, 255, 255}, {-1e10f, 0, 0, 0},    {1e-40f, 128, 16, 0}};
  for (const auto& [value, chroma, luma, alpha] : kValues) {
    const std::vector<uint8_t> expected = {chroma, chroma, luma, alpha};
    EXPECT_EQ(RunKernel<uint8_t>(kVuya32fTo8, std::vector<float>(4, value), 1, 4), expected) << value;
  }
}

}  // namespace
}  // namespace vexel::testing
