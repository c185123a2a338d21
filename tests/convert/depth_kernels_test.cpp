// Depths of RGB channels, 10-bit words included, over their whole domains against quotients in double precision.
#include <algorithm>
#include <bit>
#include <cmath>
#include <cstdint>
#include <limits>
#include <numeric>
#include <vector>

#include <gtest/gtest.h>

#include "convert/RgbKernels.h"
#include "convert/RowKernelCheck.h"

namespace vexel::testing {
namespace {

template <class T>
std::vector<T> Codes(size_t count) {
  std::vector<T> codes(count);
  std::iota(codes.begin(), codes.end(), T{0});
  return codes;
}

// Values around every tie of a narrowing to `most`, and all that is special about floats.
std::vector<float> NarrowingValues(int most) {
  constexpr float kInfinity = std::numeric_limits<float>::infinity(), kNaN = std::numeric_limits<float>::quiet_NaN();
  std::vector<float> values = {0.0f,       -0.0f, 1e-45f,         -1e-45f,         kInfinity,
                               -kInfinity, kNaN,  -kNaN,          3e38f,           -3e38f,
                               1e9f,       -1e9f, 0x1p31f / most, -0x1p31f / most, 8e6f,
                               -0.5f,      1.0f,  2.0f,           0x1p30f / most,  std::nextafter(0x1p31f / most, 0.0f),
                               12345.678f, 0.5f};
  for (int code = -1; code <= most; ++code) {
    const float tie = (code + 0.5f) / most;
    values.insert(values.end(), {std::nextafter(tie, -kInfinity), tie, std::nextafter(tie, kInfinity)});
  }
  values.resize((values.size() + 3) / 4 * 4);
  return values;
}

// The scaling is a float product; what the processor cannot convert counts as the least int32.
int NarrowedFloat(float value, int most) {
  const double product = value * static_cast<float>(most);
  const double rounded = std::nearbyint(product);
  if (!(rounded >= -2147483648.0 && rounded <= 2147483647.0)) return 0;
  return static_cast<int>(std::clamp(rounded, 0.0, static_cast<double>(most)));
}

TEST(DepthKernels, WideningToFloat) {
  const auto bytes = RunKernel<float>(kWiden8uTo32f, Codes<uint8_t>(256), 64, 256);
  for (int c = 0; c < 256; ++c) {
    ASSERT_EQ(bytes[c], static_cast<float>(c * static_cast<double>(0.003921569f))) << c;
    ASSERT_NEAR(bytes[c], c / 255.0, 1.2e-7);  // two roundings
  }
  EXPECT_EQ(bytes[255], 1.0f);
  const auto words = RunKernel<float>(kWiden15uTo32f, Codes<uint16_t>(65536), 16384, 65536);
  for (int c = 0; c < 65536; ++c) ASSERT_EQ(words[c], c / 32768.0) << c;
}

TEST(DepthKernels, IntegerDepths) {
  const auto widened = RunKernel<uint16_t>(kWiden8uTo15u, Codes<uint8_t>(256), 64, 256);
  for (int c = 0; c < 256; ++c) ASSERT_EQ(widened[c], std::floor(c * 32768.0 / 255 + 0.5)) << c;
  const auto narrowed = RunKernel<uint8_t>(kNarrow15uTo8u, Codes<uint16_t>(65536), 16384, 65536);
  for (int c = 0; c < 65536; ++c) ASSERT_EQ(narrowed[c], std::floor(std::min(c, 32768) * 255.0 / 32768 + 0.5)) << c;
}

TEST(DepthKernels, NarrowingFromFloat) {
  const auto to8 = NarrowingValues(255);
  const auto bytes = RunKernel<uint8_t>(kNarrow32fTo8u, to8, to8.size() / 4, to8.size());
  for (size_t i = 0; i < to8.size(); ++i) ASSERT_EQ(bytes[i], NarrowedFloat(to8[i], 255)) << to8[i];
  const auto to15 = NarrowingValues(32768);
  const auto words = RunKernel<uint16_t>(kNarrow32fTo15u, to15, to15.size() / 4, to15.size());
  for (size_t i = 0; i < to15.size(); ++i) ASSERT_EQ(words[i], NarrowedFloat(to15[i], 32768)) << to15[i];
}

uint32_t Word(uint32_t red, uint32_t green, uint32_t blue) { return red << 2 | green << 12 | blue << 22; }

// The channels of BGRX pixels, each code of 0..size-1 in each channel, with neighbours that must not leak into it.
template <class T>
std::vector<T> Pixels(const std::vector<T>& codes) {
  std::vector<T> pixels;
  const size_t n = codes.size();
  for (size_t i = 0; i < n; ++i)
    pixels.insert(pixels.end(), {codes[i], codes[(i * 7 + 3) % n], codes[n - 1 - i], codes[(i * 5 + 1) % n]});
  return pixels;
}

TEST(Rgb10Kernels, FromWords) {
  std::vector<uint32_t> words;
  std::vector<uint32_t> codes;  // in the order of BGRX
  for (uint32_t i = 0; i < 1024; ++i) {
    const uint32_t green = i * 7 % 1024, red = 1023 - i;
    words.push_back(Word(red, green, i) | i % 4);  // the low two bits carry nothing
    codes.insert(codes.end(), {i, green, red, 1023});
  }
  const auto bytes = RunKernel<uint8_t>(kRgb10ToBgrx8, words, 1024, 4096);
  const auto halves = RunKernel<uint16_t>(kRgb10ToBgrx15, words, 1024, 4096);
  const auto floats = RunKernel<float>(kRgb10ToBgrx32f, words, 1024, 4096);
  for (size_t i = 0; i < codes.size(); ++i) {
    ASSERT_EQ(bytes[i], std::floor(codes[i] * 255.0 / 1023 + 0.5)) << codes[i];
    ASSERT_EQ(halves[i], std::floor(codes[i] * 32768.0 / 1023 + 0.5)) << codes[i];
    ASSERT_EQ(floats[i], static_cast<float>(codes[i] / 1023.0)) << codes[i];
  }
}

template <class T, class Code>
void ExpectWords(const RowKernelSet& kernels, const std::vector<T>& codes, const Code& code) {
  const std::vector<T> pixels = Pixels(codes);
  const auto words = RunKernel<uint32_t>(kernels, pixels, codes.size(), codes.size());
  for (size_t i = 0; i < words.size(); ++i)
    ASSERT_EQ(words[i], Word(code(pixels[4 * i + 2]), code(pixels[4 * i + 1]), code(pixels[4 * i]))) << i;
}

TEST(Rgb10Kernels, ToWords) {
  const auto rounded = [](double code) { return static_cast<uint32_t>(std::floor(code + 0.5)); };
  ExpectWords(kBgrx8ToRgb10, Codes<uint8_t>(256), [&](uint8_t c) { return rounded(c * 1023.0 / 255); });
  ExpectWords(kBgrx15ToRgb10, Codes<uint16_t>(65536),
              [&](uint16_t c) { return rounded(std::min<int>(c, 32768) * 1023.0 / 32768); });
  ExpectWords(kBgrx32fToRgb10, NarrowingValues(1023), [](float c) { return NarrowedFloat(c, 1023); });
}

}  // namespace
}  // namespace vexel::testing
