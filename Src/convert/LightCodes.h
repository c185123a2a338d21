// The working curve of linear light, and its way back to 8u codes as a table.
#pragma once

#include <bit>
#include <cstddef>
#include <cstdint>

#include "convert/PlainPixels.h"
#include "frame/FpModeGuard.h"
#include "frame/Power.h"

namespace vexel {

// The working curve: linear = sign(c) |c|^2.4.
inline constexpr PowerExponent kToLinear(2.4f), kFromLinear(1 / 2.4f);

// 32f to an 8u code; of light that means the definition of LinearToBgra8.
inline int32_t NarrowTo8(float c) { return plain::Clamp(plain::ConvertNearest(c * 255.0f), 0, 255); }
inline int32_t NarrowLightTo8(float c) { return NarrowTo8(SignedPower(c, kFromLinear)); }

// The light of each 8u code as a colour, and what it is as alpha, each twice in a row: so a pixel is put together from
// four unaligned loads of 16 bytes, which may begin one entry early or end one late. Made by the first caller; others
// wait for it.
class LinearCodes {
 public:
  static const LinearCodes& Get() noexcept {
    static const LinearCodes codes;
    return codes;
  }
  float Light(size_t code) const { return mLight[code + 1][0]; }
  float Alpha(size_t code) const { return mAlpha[code + 1][0]; }
  const float* Lights() const { return mLight[1]; }
  const float* Alphas() const { return mAlpha[1]; }

 private:
  LinearCodes() noexcept {
    const DefaultFpMode mode;
    for (int c = 0; c < 256; ++c) {
      mLight[c + 1][0] = mLight[c + 1][1] = SignedPower(c * k8uTo32f, kToLinear);
      mAlpha[c + 1][0] = mAlpha[c + 1][1] = c * k8uTo32f;
    }
  }
  alignas(64) float mLight[258][2] = {};
  alignas(64) float mAlpha[258][2] = {};
};

// NarrowLightTo8 as a look-up that gives exactly its results. The function rises from 0 to 255 between 2^-23 and 1,
// at 255 thresholds, and falls back to 0 where its argument leaves the range of int32. A bucket is 1/128 of an octave
// and holds one threshold at most, so with x the bits of a float, the code is (entry + x) >> kLowBits for entry =
// (code at the start << kLowBits) - start + (distance from the threshold to the end, or 0 without one).
class LightCodes {
 public:
  static constexpr int kLowBits = 16;
  static constexpr int32_t kFirst = 0x34000000, kLast = 0x3F800000;  // 2^-23 and 1 as bits

  // Made by the first caller; others wait for it.
  static const LightCodes& Get() noexcept {
    static const LightCodes table;
    return table;
  }
  const int32_t* Entries() const { return mEntries; }
  // From these bits on (NaN included) the code is 0.
  int32_t OverflowBits() const { return mOverflow; }

  // The same function, unrounded, unlimited and up to kLast off by less than kMostError, between kFirst and kScalesEnd,
  // in two factors: Scales by the low bits of the exponent, and a parabola of the rest of the mantissa (as 1 to 33/32)
  // by its five high bits.
  static constexpr float kMostError = 1.0f / 12288;
  static constexpr int32_t kScalesEnd = kFirst + (32 << 23);
  const float* Scales() const { return mScales; }
  const float* Coefficients(int power) const { return mCoefficients[power]; }

 private:
  LightCodes() noexcept {
    const DefaultFpMode mode;
    for (int32_t i = 0; i < kBuckets; ++i) {
      const int32_t start = kFirst + (i << kLowBits), code = CodeOfBits(start);
      mEntries[i] = (code << kLowBits) - start;
      if (CodeOfBits(start + kLowMask) == code) continue;
      const int32_t threshold = Bisect(start, start + kLowMask, [&](int32_t bits) { return CodeOfBits(bits) > code; });
      mEntries[i] += start + kLowMask + 1 - threshold;
    }
    for (int exponent = kFirst >> 23; exponent < kScalesEnd >> 23; ++exponent)
      mScales[exponent & 31] = 255.0f * SignedPower(std::bit_cast<float>(exponent << 23), kFromLinear);
    for (int i = 0; i < 32; ++i) FitParabola(i);
    mOverflow = Bisect(kLast, 0x7F800000, [](int32_t bits) { return CodeOfBits(bits) == 0; });
  }
  static constexpr int32_t kLowMask = (1 << kLowBits) - 1;
  static constexpr int32_t kBuckets = ((kLast - kFirst) >> kLowBits) + 1;
  static int32_t CodeOfBits(int32_t bits) { return NarrowLightTo8(std::bit_cast<float>(bits)); }
  // Through the three Chebyshev nodes of a segment.
  void FitParabola(int i) noexcept {
    constexpr double kMiddle = 1 + 1 / 64.0, kStep = 0.86602540378443865 / 64;
    const auto at = [&](double x) { return double{SignedPower(static_cast<float>(x + i / 32.0), kFromLinear)}; };
    const double before = at(kMiddle - kStep), middle = at(kMiddle), after = at(kMiddle + kStep);
    const double curvature = (before - 2 * middle + after) / (2 * kStep * kStep),
                 slope = (after - before) / (2 * kStep);
    mCoefficients[2][i] = static_cast<float>(curvature);
    mCoefficients[1][i] = static_cast<float>(slope - 2 * curvature * kMiddle);
    mCoefficients[0][i] = static_cast<float>(middle - slope * kMiddle + curvature * kMiddle * kMiddle);
  }
  // The first value for which `isPast` holds; it does for `past` and not for `before`.
  template <class IsPast>
  static int32_t Bisect(int32_t before, int32_t past, const IsPast& isPast) {
    while (past - before > 1) {
      const int32_t middle = before + (past - before) / 2;
      (isPast(middle) ? past : before) = middle;
    }
    return past;
  }

  alignas(64) float mScales[32] = {};
  alignas(64) float mCoefficients[3][32];
  int32_t mEntries[kBuckets];
  int32_t mOverflow;
};

}  // namespace vexel
