#include "frame/ImagePrimitives.h"

#include <gtest/gtest.h>

#include <climits>
#include <cmath>
#include <vector>

#include "support/SmallCache.h"

namespace vexel::primitives {
namespace {

// Large enough to go over several threads, with a cache that holds nothing, all but a part, and all of it.
template <class T>
void CheckLargeFill() {
  std::vector<T> want(4 * 501 * 301 + 1, T(9));
  for (size_t i = 0; i < want.size() - 1; ++i) want[i] = static_cast<T>(i % 4 + 100);
  const size_t bytes = want.size() * sizeof(T);
  for (const size_t cache : {size_t{1024}, bytes, 4 * bytes}) {
    const testing::SmallCache small(static_cast<uint32_t>(cache));
    std::vector<T> large(want.size(), T(9));
    EXPECT_EQ(Fill4({T(100), T(101), T(102), T(103)}, large.data(), 501 * 4 * sizeof(T), 501, 301), Status::Ok);
    EXPECT_EQ(large, want) << cache;
  }
}

// Fills and channels one by one: fills_test.cpp, operations_test.cpp.
TEST(ImagePrimitives, LargeFillsInBandsPastTheCache) {
  CheckLargeFill<uint16_t>();
  CheckLargeFill<float>();
}

// All products, against exact arithmetic rounded by the processor in its default mode.
TEST(ImagePrimitives, MultiplyRoundsToNearestEvenAndSaturates) {
  for (const int scale : {INT_MIN, -40, -9, -8, -7, -1, 0, 1, 2, 7, 8, 9, 14, 15, 16, 17, 18, 40, INT_MAX})
    for (int constant = 0; constant < 256; ++constant) {
      uint8_t src[256], dst[256 + 4];
      for (int i = 0; i < 256; ++i) src[i] = static_cast<uint8_t>(i);
      std::fill(std::begin(dst), std::end(dst), 0xEE);
      const uint8_t constants[4] = {static_cast<uint8_t>(constant), static_cast<uint8_t>(255 - constant), 255,
                                    static_cast<uint8_t>(constant / 2)};
      ASSERT_EQ(MultiplyByConstants4(src, 256, constants, dst, 256, 64, 1, scale), Status::Ok);
      for (int i = 0; i < 256; ++i) {
        const double exact = std::ldexp(i * constants[i % 4], -std::max(std::min(scale, 100), -100));
        ASSERT_EQ(dst[i], std::min(std::nearbyint(exact), 255.0))
            << i << " * " << int{constants[i % 4]} << " >> " << scale;
      }
      ASSERT_EQ(dst[256], 0xEE);
    }
}

TEST(ImagePrimitives, BadArgumentsWriteNothing) {
  uint8_t image[64];
  std::fill(std::begin(image), std::end(image), 5);
  const uint8_t pixel[4] = {1, 2, 3, 4};
  EXPECT_EQ(Fill(uint8_t{1}, nullptr, 8, 8, 8), Status::NullPointer);
  for (const int bad : {0, -1, INT_MIN}) {
    EXPECT_EQ(Fill4(pixel, image, 16, bad, 1), Status::Size);
    EXPECT_EQ(Fill4(pixel, image, 16, 1, bad), Status::Size);
  }
  for (const ptrdiff_t step : {0, 15, -15}) {
    EXPECT_EQ(Fill4(pixel, image, step, 4, 2), Status::Step);
    EXPECT_EQ(SetChannel(0, uint8_t{1}, image, step, 4, 2), Status::Step);
    EXPECT_EQ(MultiplyByConstants4(image, 16, pixel, image, step, 4, 2, 0), Status::Step);
  }
  EXPECT_EQ(SetChannel(-1, uint8_t{1}, image, 16, 4, 2), Status::Channel);
  EXPECT_EQ(SetChannel(4, uint8_t{1}, image, 16, 4, 2), Status::Channel);
  EXPECT_EQ(MultiplyByConstants4(nullptr, 16, pixel, image, 16, 4, 2, 0), Status::NullPointer);
  for (const uint8_t byte : image) EXPECT_EQ(byte, 5);
  EXPECT_EQ(Fill4(pixel, image, 0, 4, 1), Status::Ok) << "one row needs no step";
}

}  // namespace
}  // namespace vexel::primitives
