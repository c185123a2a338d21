// Every pair of raster formats against a second, double-precision account of what a pixel means: catches a step wired
// to the wrong kernel, a swapped channel, a wrong matrix, a chain that loses precision.
#include <array>

#include "convert/YuvReference.h"
#include "support/Formats.h"
#include "support/Image.h"
#include "support/Test.h"

namespace vexel::testing {
namespace {

// Straight, gamma-coded RGB and alpha.
struct Colour {
  double r, g, b, a;
  Colour OverBlack() const { return {r * a, g * a, b * a, 1}; }
};

// Codes of 0..255 (Y'CbCr: studio video) in the memory order of a BGRA or VUYA pixel, unrounded.
using Codes = std::array<double, 4>;

Codes CodesOf(F format, Colour c) {
  if (!HasAlpha(format)) c = c.OverBlack();
  if (IsLinear(format))
    for (double* v : {&c.r, &c.g, &c.b}) *v = std::pow(*v, 2.4);
  if (AlphaKind(format) == kAlphaPremultiplied) c = {c.r * c.a, c.g * c.a, c.b * c.a, c.a};
  Triple pixel{{c.b * 255, c.g * 255, c.r * 255}};
  if (IsYuv(format)) pixel = BgrToVuy(Colorimetry(format) == kColorimetry709 ? k709 : k601, pixel);
  return {pixel.c[0], pixel.c[1], pixel.c[2], c.a * 255};
}

// A code at the format's own depth.
double AtDepth(F format, int channel, double code) {
  const bool isYuv = IsYuv(format) && channel < 3, is32f = Depth(format) == kDepth32f;
  if (isYuv && is32f) return channel < 2 ? (code - 128) / 224 : (code - 16) / 219;
  if (Depth(format) == kDepth10u) return std::nearbyint(isYuv ? code * 4 : code * 1023 / 255);
  return is32f ? code / 255 : std::nearbyint(code * FullScale(format) / 255);
}

Image Encode(F format, const Colour& colour) {
  Image image(format, 12, 2);
  Codes codes = CodesOf(format, colour);
  for (int i = 0; i < 4; ++i) codes[i] = AtDepth(format, i, codes[i]);
  constexpr int kPairs[2][4] = {{1, 2, 0, 2}, {2, 1, 2, 0}}, kPixels[2][4] = {{0, 1, 2, 3}, {3, 2, 1, 0}};
  const auto& order = (Layout(format) == kLayout422 ? kPairs : kPixels)[IsReversed(format)];
  for (size_t i = 0; i < SampleCount(image) && Depth(format) != kDepth10u; ++i)
    PutSample(image.bytes.data(), i, format, codes[order[i % 4]]);
  for (size_t i = 0; i < image.bytes.size() / 4 && Depth(format) == kDepth10u; ++i) {
    uint32_t& word = image.As<uint32_t>()[i] = 0;
    for (size_t k = 0; k < 3; ++k)
      word |= static_cast<uint32_t>(codes[IsYuv(format) ? order[(3 * i + k) % 4] : 2 - k])
              << (10 * k + 2 * !IsYuv(format));
  }
  return image;
}

// The largest difference in units of full scale.
double Difference(const Image& a, const Image& b) {
  double worst = 0;
  for (size_t i = 0; i < SampleCount(a); ++i) {
    const double x = SampleAt(a.bytes.data(), i, a.format), y = SampleAt(b.bytes.data(), i, b.format);
    worst = std::max(worst, std::isfinite(y) ? std::abs(x - y) / FullScale(a.format) : HUGE_VAL);
  }
  return worst;
}

TEST(Meaning, EveryPairOfFormats) {
  for (const Colour& colour :
       {Colour{0.75, 0.5, 0.25, 1}, {0.1, 0.35, 0.8, 1}, {0.9, 0.2, 0.6, 0.7}, {0, 0, 0, 1}, {1, 1, 1, 1}})
    for (const F src : RasterFormats())
      for (const F dst : RasterFormats()) {
        // Whether light is added over black before or after linearisation depends on the chain.
        if (colour.a < 1 && (IsLinear(src) || IsLinear(dst)) && HasAlpha(src) != HasAlpha(dst)) continue;
        // Alpha that the source dropped cannot come back.
        const Image expected = Encode(dst, HasAlpha(src) ? colour : colour.OverBlack());
        const Image result = Encode(src, colour).Converted(dst, 2);
        // Half a code of the coarser end, amplified by Cb's gain of 2 and by division by alpha, once for what comes in
        // and a few times for what is rounded on the way.
        const int depth = std::min(DepthBits(src), DepthBits(dst));
        const double bound = depth == 32 ? 4e-6 : 4.5 / ((1 << depth) - 1) / colour.a + 4e-6;
        ASSERT_LE(Difference(expected, result), bound) << FormatName(src) << " to " << FormatName(dst);
      }
}

}  // namespace
}  // namespace vexel::testing
