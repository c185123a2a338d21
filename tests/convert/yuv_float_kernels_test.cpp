// Depths and matrices of 4:4:4:4 Y'CbCr in single precision.
#include <cmath>
#include <cstring>
#include <vector>

#include <gtest/gtest.h>

#include "convert/RgbKernels.h"
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

std::vector<float> RandomPixels(size_t count, float least, float most) {
  Random random(7);
  std::vector<float> pixels(4 * count);
  for (float& value : pixels) value = random.Float(least, most);
  return pixels;
}

TEST(YuvFloatKernels, MatricesFollowTheEquations) {
  struct {
    const RowKernelSet* kernels;
    Triple (*expected)(const Triple&);
    bool opaque;
  } const kMatrices[] = {
      {&kBgra32fToVuya32f_601, [](const Triple& p) { return ToYuv(k601, p); }, false},
      {&kBgra32fToVuya32f_709, [](const Triple& p) { return ToYuv(k709, p); }, false},
      {&kBgrx32fToVuyx32f_601, [](const Triple& p) { return ToYuv(k601, p); }, true},
      {&kBgrx32fToVuyx32f_709, [](const Triple& p) { return ToYuv(k709, p); }, true},
      {&kVuya32fToBgra32f_601, [](const Triple& p) { return ToBgr(k601, p); }, false},
      {&kVuya32fToBgra32f_709, [](const Triple& p) { return ToBgr(k709, p); }, false},
      {&kVuyx32fToBgrx32f_601, [](const Triple& p) { return ToBgr(k601, p); }, true},
      {&kVuyx32fToBgrx32f_709, [](const Triple& p) { return ToBgr(k709, p); }, true},
      {&kVuya32f_601To709, [](const Triple& p) { return ToYuv(k709, ToBgr(k601, p)); }, false},
      {&kVuya32f_709To601, [](const Triple& p) { return ToYuv(k601, ToBgr(k709, p)); }, false},
      {&kVuyx32f_601To709, [](const Triple& p) { return ToYuv(k709, ToBgr(k601, p)); }, true},
      {&kVuyx32f_709To601, [](const Triple& p) { return ToYuv(k601, ToBgr(k709, p)); }, true},
  };
  constexpr size_t kCount = 1000;
  const std::vector<float> source = RandomPixels(kCount, -0.5f, 1.5f);
  for (size_t m = 0; m < std::size(kMatrices); ++m) {
    const auto got = RunKernel<float>(*kMatrices[m].kernels, source, kCount, 4 * kCount);
    for (size_t i = 0; i < kCount; ++i) {
      const float* p = &source[4 * i];
      const Triple expected = kMatrices[m].expected({{p[0], p[1], p[2]}});
      for (size_t c = 0; c < 3; ++c)
        ASSERT_NEAR(got[4 * i + c], expected.c[c], 2.5e-6) << "matrix " << m << " channel " << c;
      ASSERT_EQ(got[4 * i + 3], kMatrices[m].opaque ? 1.0f : p[3]) << "matrix " << m;
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

std::vector<uint8_t> AllCodes() {
  std::vector<uint8_t> codes(4 * 256);
  for (size_t i = 0; i < codes.size(); ++i) codes[i] = static_cast<uint8_t>(i / 4);
  return codes;
}

TEST(YuvFloatKernels, EveryCodeWidensAndComesBack) {
  const std::vector<uint8_t> codes = AllCodes();
  const auto wide = RunKernel<float>(kVuya8To32f, codes, 256, 1024);
  const auto opaque = RunKernel<float>(kVuyx8To32f, codes, 256, 1024);
  for (int code = 0; code < 256; ++code) {
    const double expected[4] = {(code - 128) / 224.0, (code - 128) / 224.0, (code - 16) / 219.0, code / 255.0};
    for (int c = 0; c < 4; ++c) {
      const size_t i = static_cast<size_t>(4 * code + c);
      EXPECT_NEAR(wide[i], expected[c], 1.2e-7 * std::abs(expected[c]));
      EXPECT_EQ(opaque[i], c == 3 ? 1.0f : wide[i]);
    }
  }
  EXPECT_EQ(wide[4 * 16 + 2], 0.0f);
  EXPECT_EQ(wide[4 * 255 + 3], 1.0f);

  EXPECT_EQ(RunKernel<uint8_t>(kVuya32fTo8, wide, 256, 1024), codes);
  auto opaqueCodes = codes;
  for (size_t i = 3; i < 1024; i += 4) opaqueCodes[i] = 255;
  EXPECT_EQ(RunKernel<uint8_t>(kVuyx32fTo8, wide, 256, 1024), opaqueCodes);
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

TEST(YuvFloatKernels, MixedDepthsAreTheirTwoSteps) {
  struct {
    const RowKernelSet *direct, *first, *second;
  } const kWidening[] = {{&kVuya8ToVuyp32f, &kVuya8To32f, &kPremultiplyLast32f},
                         {&kVuya8ToBgra32f_601, &kVuya8To32f, &kVuya32fToBgra32f_601},
                         {&kVuya8ToBgra32f_709, &kVuya8To32f, &kVuya32fToBgra32f_709},
                         {&kVuyx8ToBgrx32f_601, &kVuyx8To32f, &kVuyx32fToBgrx32f_601},
                         {&kVuyx8ToBgrx32f_709, &kVuyx8To32f, &kVuyx32fToBgrx32f_709}},
          kNarrowing[] = {{&kBgra32fToVuya8_601, &kBgra32fToVuya32f_601, &kVuya32fTo8},
                          {&kBgra32fToVuya8_709, &kBgra32fToVuya32f_709, &kVuya32fTo8}};
  constexpr size_t kCount = 4099;
  std::vector<uint8_t> codes(4 * kCount);
  Random random(3);
  random.Fill(codes.data(), codes.size());
  for (const auto& steps : kWidening)
    EXPECT_EQ(
        RunKernel<float>(*steps.direct, codes, kCount, 4 * kCount),
        RunKernel<float>(*steps.second, RunKernel<float>(*steps.first, codes, kCount, 4 * kCount), kCount, 4 * kCount));
  std::vector<float> pixels(4 * kCount);
  for (const auto& [contents, half] : {std::pair(Contents::Random, 0), {Contents::Extremes, 1}})
    FillSamples(reinterpret_cast<uint8_t*>(pixels.data()) + half * (kCount / 2) * 16, 16 * (kCount / 2 + half),
                VX_PixelFormat::VUYA_4444_32f, contents, random);
  for (const auto& steps : kNarrowing)
    EXPECT_EQ(RunKernel<uint8_t>(*steps.direct, pixels, kCount, 4 * kCount),
              RunKernel<uint8_t>(*steps.second, RunKernel<float>(*steps.first, pixels, kCount, 4 * kCount), kCount,
                                 4 * kCount));
}

}  // namespace
}  // namespace vexel::testing
