#include "frame/ImagePrimitives.h"

#include <gtest/gtest.h>

#include <climits>
#include <cmath>
#include <functional>
#include <limits>
#include <vector>

#include "support/Random.h"
#include "support/SmallCache.h"

namespace vexel::primitives {
namespace {

constexpr int kPadding = 5;

// A small image with padded rows, upright or upside down.
template <class T>
struct Image {
  Image(int w, int h, int channels, bool negative) : width(w), height(h), pitch(w * channels + kPadding) {
    samples.resize(static_cast<size_t>(pitch * h + 16));
    testing::Random(7).Fill(samples.data(), samples.size() * sizeof(T));
    for (T& s : samples)
      if (s != s) s = T(0);
    base = samples.data() + 3 + (negative ? pitch * (h - 1) : 0);
    rowBytes = static_cast<ptrdiff_t>(sizeof(T)) * (negative ? -pitch : pitch);
  }
  int width, height, pitch;
  std::vector<T> samples;
  T* base;
  ptrdiff_t rowBytes;
};

// Runs `operation` on images of many sizes and compares every sample, padding included, with expected(old, channel).
template <class T>
void CheckInPlace(int channels, const std::function<Status(Image<T>&)>& operation,
                  const std::function<T(T, int)>& expected) {
  for (const bool negative : {false, true})
    for (const int h : {1, 2, 33, 70})
      for (int w = 1; w <= 75; w += h < 3 ? 1 : 37) {
        Image<T> image(w, h, channels, negative);
        std::vector<T> want = image.samples;
        for (int r = 0; r < h; ++r)
          for (int i = 0; i < w * channels; ++i) {
            T& sample = want[static_cast<size_t>(3 + r * image.pitch + i)];
            sample = expected(sample, i % channels);
          }
        ASSERT_EQ(operation(image), Status::Ok);
        ASSERT_EQ(image.samples, want) << w << " x " << h;
      }
}

template <class T>
void CheckFillsAndChannels(const T (&v)[4]) {
  CheckInPlace<T>(
      1, [&](auto& m) { return Fill(v[0], m.base, m.rowBytes, m.width, m.height); }, [&](T, int) { return v[0]; });
  CheckInPlace<T>(
      4, [&](auto& m) { return Fill4(v, m.base, m.rowBytes, m.width, m.height); }, [&](T, int c) { return v[c]; });
  for (int channel = 0; channel < 4; ++channel)
    CheckInPlace<T>(
        4, [&](auto& m) { return SetChannel(channel, v[1], m.base, m.rowBytes, m.width, m.height); },
        [&](T old, int c) { return c == channel ? v[1] : old; });
}

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

TEST(ImagePrimitives, FillsAndChannels) {
  CheckFillsAndChannels<uint8_t>({1, 250, 3, 77});
  CheckFillsAndChannels<uint16_t>({0x1234, 0x8000, 0xFFFF, 5});
  CheckFillsAndChannels<float>({0.1f, -0.0f, 1e-40f, std::numeric_limits<float>::infinity()});
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
  const uint8_t constants[4] = {3, 128, 255, 1};
  CheckInPlace<uint8_t>(
      4,
      [&](auto& m) {
        return MultiplyByConstants4(m.base, m.rowBytes, constants, m.base, m.rowBytes, m.width, m.height, 7);
      },
      [&](uint8_t old, int c) {
        return static_cast<uint8_t>(std::min(std::nearbyint(old * constants[c] / 128.0), 255.0));
      });
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
