// Every pair of raster formats against a second, double-precision account of what a pixel means: catches a step wired
// to the wrong kernel, a swapped channel, a wrong matrix, a chain that loses precision.
#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <cmath>
#include <cstring>
#include <vector>

#include "convert/YuvReference.h"
#include "support/Formats.h"

namespace vexel {
namespace {

using F = VX_PixelFormat;
using testing::FormatName;
using testing::Luma;
using testing::RasterFormats;

constexpr int kWidth = 12, kHeight = 2;

// Straight, gamma-coded RGB and alpha.
struct Colour {
  double r, g, b, a;
};

Luma LumaOf(F format) { return Colorimetry(format) == kColorimetry709 ? testing::k709 : testing::k601; }

using Channels = std::array<double, 4>;  // memory order of a BGRA or VUYA pixel, normalised

bool HasAlpha(F f) {
  return Layout(f) == kLayout4444 && (AlphaKind(f) == kAlphaStraight || AlphaKind(f) == kAlphaPremultiplied);
}

Channels ToChannels(F format, Colour c) {
  if (!HasAlpha(format)) c = {c.r * c.a, c.g * c.a, c.b * c.a, 1};
  if (IsLinear(format))
    for (double* v : {&c.r, &c.g, &c.b}) *v = std::pow(*v, 2.4);
  if (AlphaKind(format) == kAlphaPremultiplied)
    for (double* v : {&c.r, &c.g, &c.b}) *v *= c.a;
  if (!IsYuv(format)) return {c.b, c.g, c.r, c.a};
  const Luma k = LumaOf(format);
  const double y = k.r * c.r + k.g() * c.g + k.b * c.b;
  return {(c.r - y) / (2 * (1 - k.r)), (c.b - y) / (2 * (1 - k.b)), y, c.a};
}

double Code(F format, int channel, double v) {
  const bool chroma = IsYuv(format) && channel < 2, alpha = channel == 3;
  const double ten = Depth(format) == kDepth10u ? 4 : 1;
  switch (Depth(format)) {
    case kDepth32f:
      return v;
    case kDepth15u:
      return v * 32768;
    case kDepth10u:
      if (!IsYuv(format)) return v * 1023;
      [[fallthrough]];
    default:
      if (!IsYuv(format) || alpha) return v * 255;
      return (chroma ? v * 224 + 128 : v * 219 + 16) * ten;
  }
}

// One row of one colour.
std::vector<uint8_t> Encode(F format, const Channels& channels) {
  std::vector<uint8_t> row(static_cast<size_t>(UnpaddedRowBytes(format, kWidth)));
  double codes[4];
  for (int i = 0; i < 4; ++i) codes[i] = Code(format, i, channels[i]);
  const auto put = [&](size_t index, double code) {
    const float asFloat = static_cast<float>(code);
    const auto asInt = static_cast<uint16_t>(std::lrint(code));
    if (Depth(format) == kDepth32f)
      std::memcpy(&row[4 * index], &asFloat, 4);
    else if (Depth(format) == kDepth15u)
      std::memcpy(&row[2 * index], &asInt, 2);
    else
      row[index] = static_cast<uint8_t>(asInt);
  };
  const auto code10 = [&](int i) { return static_cast<uint32_t>(std::lrint(codes[i])); };
  if (IsV210(format)) {
    const uint32_t v = code10(0), u = code10(1), y = code10(2);
    const uint32_t words[4] = {u | y << 10 | v << 20, y | u << 10 | y << 20, v | y << 10 | u << 20,
                               y | v << 10 | y << 20};
    for (size_t group = 0; group < row.size() / 16; ++group) std::memcpy(&row[16 * group], words, 16);
  } else if (Depth(format) == kDepth10u) {
    const uint32_t word = code10(2) << 2 | code10(1) << 12 | code10(0) << 22;
    for (int i = 0; i < kWidth; ++i) std::memcpy(&row[4 * i], &word, 4);
  } else if (Layout(format) == kLayout422) {
    const int order[2][4] = {{1, 2, 0, 2}, {2, 1, 2, 0}};  // UYVY, YUYV
    for (int i = 0; i < 2 * kWidth; ++i) put(i, codes[order[IsReversed(format)][i % 4]]);
  } else {
    for (int i = 0; i < 4 * kWidth; ++i) put(i, codes[IsReversed(format) ? 3 - i % 4 : i % 4]);
  }
  return row;
}

// The largest difference of two rows in units of full scale.
double Difference(F format, const std::vector<uint8_t>& a, const uint8_t* b) {
  double worst = 0;
  const auto consider = [&](double x, double y, double scale) {
    worst = std::max(worst, std::isfinite(y) ? std::abs(x - y) / scale : HUGE_VAL);
  };
  const auto each = [&](auto x, const auto& compare) {
    for (size_t i = 0; i < a.size(); i += sizeof x) {
      auto y = x;
      std::memcpy(&x, &a[i], sizeof x), std::memcpy(&y, &b[i], sizeof y);
      compare(x, y);
    }
  };
  if (Depth(format) == kDepth32f) each(0.0f, [&](float x, float y) { consider(x, y, 1); });
  if (Depth(format) == kDepth15u) each(uint16_t{0}, [&](int x, int y) { consider(x, y, 32768); });
  if (Depth(format) == kDepth8u) each(uint8_t{0}, [&](int x, int y) { consider(x, y, 255); });
  if (Depth(format) == kDepth10u)
    each(0u, [&](uint32_t x, uint32_t y) {
      for (int shift = IsYuv(format) ? 0 : 2; shift < 30; shift += 10)
        consider(x >> shift & 1023, y >> shift & 1023, 1023);
    });
  return worst;
}

int LeastDepth(F src, F dst) {
  const auto rank = [](F f) {
    return Depth(f) == kDepth8u ? 8 : Depth(f) == kDepth10u ? 10 : Depth(f) == kDepth15u ? 15 : 24;
  };
  return std::min(rank(src), rank(dst));
}

class Meaning : public ::testing::TestWithParam<Colour> {};

TEST_P(Meaning, EveryPairOfFormats) {
  const Colour colour = GetParam();
  for (F src : RasterFormats()) {
    const auto row = Encode(src, ToChannels(src, colour));
    std::vector<uint8_t> source(row);
    source.insert(source.end(), row.begin(), row.end());
    for (F dst : RasterFormats()) {
      // Whether light is added over black before or after linearisation depends on the chain.
      if (colour.a < 1 && (IsLinear(src) || IsLinear(dst)) && HasAlpha(src) != HasAlpha(dst)) continue;
      // Alpha that the source dropped cannot come back.
      Colour kept = colour;
      if (!HasAlpha(src)) {
        kept = {colour.r * colour.a, colour.g * colour.a, colour.b * colour.a, 1};
      }
      const auto expected = Encode(dst, ToChannels(dst, kept));
      std::vector<uint8_t> result(expected.size() * kHeight, 0xA5);
      ASSERT_EQ(VX_Convert(source.data(), static_cast<int32_t>(row.size()), src, result.data(),
                           static_cast<int32_t>(expected.size()), dst, kWidth, kHeight, 2),
                VX_Success);
      // Half a code of the coarser end, amplified by Cb's gain of 2 and by division by alpha, once for what comes in
      // and a few times for what is rounded on the way.
      const double code = 1.0 / ((1 << LeastDepth(src, dst)) - 1);
      const double bound = LeastDepth(src, dst) == 24 ? 4e-6 : 4.5 * code / colour.a + 4e-6;
      for (int y = 0; y < kHeight; ++y)
        ASSERT_LE(Difference(dst, expected, &result[expected.size() * y]), bound)
            << FormatName(src) << " to " << FormatName(dst);
    }
  }
}

INSTANTIATE_TEST_SUITE_P(Colours, Meaning,
                         ::testing::Values(Colour{0.75, 0.5, 0.25, 1}, Colour{0.1, 0.35, 0.8, 1},
                                           Colour{0.9, 0.2, 0.6, 0.7}, Colour{0, 0, 0, 1}, Colour{1, 1, 1, 1}));

}  // namespace
}  // namespace vexel
