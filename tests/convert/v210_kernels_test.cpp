// V210: packing, depths and 4:4:4 output.
#include <algorithm>
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

std::vector<uint32_t> PackCodes(const std::vector<int>& codes) {
  std::vector<uint32_t> words((codes.size() + 11) / 12 * 4);
  for (size_t i = 0; i < codes.size(); ++i) words[i / 3] |= static_cast<uint32_t>(codes[i]) << (i % 3 * 10);
  return words;
}

// The samples of a group have the places that the layout names, and the last group continues in black.
TEST(V210Kernels, Layout) {
  const std::vector<uint8_t> uyvy = {1, 2, 3, 4, 5, 6, 7, 8, 9, 10, 11, 12, 201, 202, 203, 204};
  const auto words = RunKernel<uint32_t>(kUyvy8ToV210, uyvy, 7, 8);
  const auto word = [](uint32_t a, uint32_t b, uint32_t c) { return a | b << 10 | c << 20; };
  EXPECT_EQ(words,
            (std::vector<uint32_t>{word(4, 8, 12), word(16, 20, 24), word(28, 32, 36), word(40, 44, 48),
                                   word(804, 808, 812), word(816, 512, 64), word(512, 64, 512), word(64, 512, 64)}));
  const std::vector<float> black(8, 0.0f);
  EXPECT_EQ(RunKernel<uint32_t>(kUyvy32fToV210, black, 3, 4),
            (std::vector<uint32_t>{word(512, 64, 512), word(64, 512, 64), word(512, 64, 512), word(64, 512, 64)}));
}

TEST(V210Kernels, EveryCode) {
  std::vector<int> codes(12 * 1024);
  for (size_t i = 0; i < codes.size(); ++i) codes[i] = static_cast<int>(i / 12);
  const std::vector<uint32_t> v210 = PackCodes(codes);
  const size_t count = codes.size() / 2;
  const auto bytes = RunKernel<uint8_t>(kV210ToUyvy8, v210, count, codes.size());
  const auto floats = RunKernel<float>(kV210ToUyvy32f, v210, count, codes.size());
  for (size_t i = 0; i < codes.size(); ++i) {
    ASSERT_EQ(bytes[i], std::min(255.0, std::floor(codes[i] / 4.0 + 0.5))) << codes[i];
    const double expected = i % 2 ? (codes[i] - 64) / 876.0 : (codes[i] - 512) / 896.0;
    ASSERT_NEAR(floats[i], expected, 1.2e-7 * std::abs(expected)) << codes[i];
  }
  EXPECT_EQ(RunKernel<uint32_t>(kUyvy32fToV210, floats, count, v210.size()), v210) << "floats keep every code";
}

TEST(V210Kernels, BytesSurviveBothWays) {
  for (size_t count = 1; count < 64; ++count) {
    std::vector<uint8_t> uyvy((count + 1) / 2 * 4);
    Random(count).Fill(uyvy.data(), uyvy.size());
    const auto v210 = RunKernel<uint32_t>(kUyvy8ToV210, uyvy, count, (count + 5) / 6 * 4);
    EXPECT_EQ(RunKernel<uint8_t>(kV210ToUyvy8, v210, count, uyvy.size()), uyvy);
    const auto floats = RunKernel<float>(kUyvy8To32f, uyvy, count, uyvy.size());
    EXPECT_EQ(RunKernel<uint32_t>(kUyvy32fToV210, floats, count, v210.size()), v210) << "either way to ten bits";
  }
}

TEST(V210Kernels, FloatsSaturate) {
  const float nan = std::numeric_limits<float>::quiet_NaN(), infinity = std::numeric_limits<float>::infinity();
  const std::vector<float> uyvy = {nan, nan, 1, 2, -1, -1, infinity, 1, 0.5f, -infinity, -0.5f, 1e20f};
  EXPECT_EQ(RunKernel<uint32_t>(kUyvy32fToV210, uyvy, 6, 4),
            PackCodes({0, 0, 1023, 1023, 0, 0, 0, 940, 960, 0, 64, 0}));
}

// Chroma of odd pixels is the mean of two samples before anything is rounded; the row's end repeats the last. Results
// are the nearest codes, but for what a sixteenth of a code can tip over.
TEST(V210Kernels, PixelsFollowTheEquations) {
  struct {
    const RowKernelSet* kernels;
    Triple (*expected)(const Triple& vuy);
    double tolerance;
  } const kOutputs[] = {
      {&kV210ToBgrx8_601, [](const Triple& vuy) { return VuyToBgr(k601, vuy); }, 0.5625},
      {&kV210ToBgrx8_709, [](const Triple& vuy) { return VuyToBgr(k709, vuy); }, 0.5625},
      {&kV210ToVuyx8, [](const Triple& vuy) { return vuy; }, 0.5},
      {&kV210_709ToVuyx8_601, [](const Triple& vuy) { return BgrToVuy(k601, VuyToBgr(k709, vuy)); }, 0.5625},
  };
  Random random(11);
  for (const auto& output : kOutputs)
    for (size_t count = 1; count < 700; count += count < 40 ? 1 : 23) {
      std::vector<int> codes((count + 1) / 2 * 4);
      for (int& code : codes)
        code = random.OneIn(8) ? static_cast<int>(random.Int(0, 1) * 1023) : static_cast<int>(random.Int(0, 1023));
      std::vector<uint32_t> v210 = PackCodes(codes);
      const auto got = RunKernel<uint8_t>(*output.kernels, v210, count, 4 * count);
      for (size_t x = 0; x < count; ++x) {
        const size_t own = x / 2 * 4, next = x % 2 && own + 4 < codes.size() ? own + 4 : own;
        const Triple expected =
            output.expected({{(codes[own + 2] + codes[next + 2]) / 8.0, (codes[own] + codes[next]) / 8.0,
                              codes[own + 1 + 2 * (x % 2)] / 4.0}});
        for (size_t c = 0; c < 3; ++c)
          ASSERT_NEAR(got[4 * x + c], Code8(expected.c[c]), output.tolerance)
              << x << " of " << count << " channel " << c;
        ASSERT_EQ(got[4 * x + 3], 255);
      }
    }
}

TEST(V210Kernels, GreyStaysGrey) {
  for (int code = 64; code <= 940; ++code) {
    const std::vector<uint32_t> v210 = PackCodes({512, code, 512, code, 512, code, 512, code, 512, code, 512, code});
    for (const RowKernelSet* kernels : {&kV210ToBgrx8_601, &kV210ToBgrx8_709}) {
      const auto got = RunKernel<uint8_t>(*kernels, v210, 1, 4);
      ASSERT_EQ(got, (std::vector<uint8_t>{got[1], got[1], got[1], 255})) << code;
    }
  }
}

}  // namespace
}  // namespace vexel::testing
