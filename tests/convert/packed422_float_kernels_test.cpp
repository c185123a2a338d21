// Packed 4:2:2 in single precision, and its chroma filters.
#include <cmath>
#include <cstring>
#include <vector>

#include <gtest/gtest.h>

#include "convert/RowKernelCheck.h"
#include "convert/YuvKernels.h"
#include "support/Random.h"

namespace vexel::testing {
namespace {

std::vector<float> RandomFloats(size_t count, uint64_t seed) {
  Random random(seed);
  std::vector<float> values(count);
  for (float& value : values) value = random.Float(-0.75f, 0.75f);
  return values;
}

// Sample `index` of every fourth, the ends repeated.
double Clamped(const std::vector<float>& row, ptrdiff_t index, size_t first, size_t stride = 4) {
  const auto last = static_cast<ptrdiff_t>((row.size() - 1 - first) / stride);
  return row[first + stride * static_cast<size_t>(index < 0 ? 0 : index > last ? last : index)];
}

TEST(Packed422FloatKernels, OddPixelsTakeTheFourTapMiddle) {
  constexpr size_t kChroma[] = {2, 0};  // V and U of a UYVY pair
  for (size_t count = 1; count <= 40; ++count) {
    const std::vector<float> uyvy = RandomFloats((count + 1) / 2 * 4, count);
    const auto smooth = RunKernel<float>(kUyvy32fToVuyx32f, uyvy, count, 4 * count);
    const auto nearest = RunKernel<float>(kUyvy32fToVuyx32fNearest, uyvy, count, 4 * count);
    for (size_t x = 0; x < count; ++x) {
      const auto pair = static_cast<ptrdiff_t>(x / 2);
      for (size_t c = 0; c < 2; ++c) {
        const auto tap = [&](ptrdiff_t offset) { return Clamped(uyvy, pair + offset, kChroma[c]); };
        const double middle = 9 / 16. * (tap(0) + tap(1)) - 1 / 16. * (tap(-1) + tap(2));
        ASSERT_NEAR(smooth[4 * x + c], x % 2 ? middle : tap(0), x % 2 ? 3e-7 : 0) << x << " of " << count;
        ASSERT_EQ(nearest[4 * x + c], tap(0)) << x << " of " << count;
      }
      for (const auto* row : {&smooth, &nearest}) {
        ASSERT_EQ((*row)[4 * x + 2], uyvy[4 * (x / 2) + 1 + 2 * (x % 2)]);
        ASSERT_EQ((*row)[4 * x + 3], 1.0f);
      }
    }
  }
}

// The nine taps that the two lifting steps amount to, where the row reaches far enough to both sides.
TEST(Packed422FloatKernels, ChromaIsLowPassed) {
  constexpr double kTaps[9] = {1 / 64., 0, -1 / 8., 1 / 4., 23 / 32., 1 / 4., -1 / 8., 0, 1 / 64.};
  constexpr size_t kCount = 301;
  const std::vector<float> vuyx = RandomFloats(4 * kCount, 5);
  const auto uyvy = RunKernel<float>(kVuyx32fToUyvy32f, vuyx, kCount, (kCount + 1) / 2 * 4);
  for (size_t pair = 2; 2 * pair + 4 < kCount; ++pair) {
    double v = 0, u = 0;
    for (size_t tap = 0; tap < 9; ++tap) {
      v += kTaps[tap] * vuyx[4 * (2 * pair + tap - 4)];
      u += kTaps[tap] * vuyx[4 * (2 * pair + tap - 4) + 1];
    }
    ASSERT_NEAR(uyvy[4 * pair], u, 5e-7) << pair;
    ASSERT_NEAR(uyvy[4 * pair + 2], v, 5e-7) << pair;
  }
  for (size_t x = 0; x < kCount; ++x) ASSERT_EQ(uyvy[4 * (x / 2) + 1 + 2 * (x % 2)], vuyx[4 * x + 2]) << x;
  EXPECT_EQ(uyvy.back(), vuyx[4 * (kCount - 1) + 2]) << "the missing luma repeats the last";
}

TEST(Packed422FloatKernels, FlatChromaStaysFlatToTheEnds) {
  for (size_t count = 1; count <= 40; ++count) {
    std::vector<float> vuyx(4 * count, 0.3f);
    for (const float value : RunKernel<float>(kVuyx32fToUyvy32f, vuyx, count, (count + 1) / 2 * 4))
      ASSERT_NEAR(value, 0.3f, 1e-7) << count;
  }
}

TEST(Packed422FloatKernels, InterpolatedRowsComeBackBitForBit) {
  for (size_t count = 1; count <= 300; ++count) {
    std::vector<float> uyvy = RandomFloats((count + 1) / 2 * 4, count);
    uyvy[count % uyvy.size() / 2 * 2] = -0.0f;
    if (count % 3 == 0) uyvy[0] = 1e30f;
    if (count % 2 != 0) uyvy.back() = uyvy[uyvy.size() - 3];
    const auto back = RunKernel<float>(kVuyx32fToUyvy32f, RunKernel<float>(kUyvy32fToVuyx32f, uyvy, count, 4 * count),
                                       count, uyvy.size());
    ASSERT_EQ(std::memcmp(back.data(), uyvy.data(), 4 * uyvy.size()), 0) << count << " pixels";
  }
}

TEST(Packed422FloatKernels, EveryCodeWidensAndComesBack) {
  std::vector<uint8_t> codes(4 * 256);
  for (size_t i = 0; i < codes.size(); ++i) codes[i] = static_cast<uint8_t>(i / 4);
  const auto wide = RunKernel<float>(kUyvy8To32f, codes, 512, 1024);
  for (size_t i = 0; i < wide.size(); ++i) {
    const double expected = i % 2 ? (codes[i] - 16) / 219.0 : (codes[i] - 128) / 224.0;
    ASSERT_NEAR(wide[i], expected, 1.2e-7 * std::abs(expected)) << i;
  }
  EXPECT_EQ(RunKernel<uint8_t>(kUyvy32fTo8, wide, 512, 1024), codes);
  const float nan = std::numeric_limits<float>::quiet_NaN();
  const std::vector<float> extremes = {nan, nan, nan, nan, 2, 2, 2, 2, -2, -2, -2, -2, 1e30f, 1e30f, 1e30f, 1e30f};
  EXPECT_EQ(RunKernel<uint8_t>(kUyvy32fTo8, extremes, 8, 16),
            (std::vector<uint8_t>{0, 0, 0, 0, 255, 255, 255, 255, 0, 0, 0, 0, 0, 0, 0, 0}));
}

}  // namespace
}  // namespace vexel::testing
