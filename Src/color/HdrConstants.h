// SMPTE ST 2084 and ITU-R BT.2100 HLG, as the kernels and the scalar functions use them.
#pragma once

#include "frame/Power.h"

namespace vexel {

inline constexpr float kPqC1 = 0.8359375f, kPqC2 = 18.8515625f, kPqC3 = 18.6875f;
inline constexpr PowerExponent kPqM1{0.1593017578125f}, kPqM2{78.84375f};

// Decoding never rounds E = N^(1/m2), the differences of which with c1 and c2 / c3 would magnify the error up to a
// hundredfold: (E - c1) / (c2 - c3 E) is a ratio of parabolas in t = 8 log2(N), here times 100^m1, so that its power
// is light in units of 100 cd/m2. To 4e-8 of itself where N is not next to the black end, 2e-9 of E there.
inline constexpr float kPqRatioAbove[3] = {1923243.7771591693f, 11810.526157367001f, 0.10135333582981935f};
inline constexpr float kPqRatioBelow[2] = {923487.07243405178f, -116110.12874195988f};  // And t^2 itself.
// The float form, since its argument is not exact to the last bit. The factor makes up for the rounding of 100^m1.
inline constexpr PowerExponent kPqInverseM1{6.2773946360153255, PowerCore::Float, 2.86209e-07};
// Signals from where E < c1 to where E > c2 / c3; beyond both there is no light.
inline constexpr float kPqLeastSignal = 0x1p-21f, kPqMostSignal = 2.0f, kPqMostUsualSignal = 1.875f;
inline constexpr float kPqLeastRatio = 0x1p-20f;  // Light below 1e-35 is black.

inline float PqRatio(float signal) {
  const float t = Log2InEighths(signal), *n = kPqRatioAbove, *m = kPqRatioBelow;
  return ((n[2] * t + n[1]) * t + n[0]) / ((t + m[1]) * t + m[0]);
}
inline float PqLightOf(float ratio) { return ratio > kPqLeastRatio ? Power(ratio, kPqInverseM1) : 0.0f; }
// The light of any signal at all, without its sign.
inline float PqLight(float signal) {
  const float least = signal > kPqLeastSignal ? signal : kPqLeastSignal;
  return PqLightOf(PqRatio(least < kPqMostSignal ? least : kPqMostSignal));
}

// The ratio of ST 2084 whose power is the signal, (c2 y + c1) / (c3 y + 1), is 1 less this: near 1 it needs more digits
// than a float has, because the exponent multiplies its error by 79. For the same reason y, light in units of 10,000
// cd/m2 to m1, is not rounded to a float, nor what is made of it.
inline constexpr float kPqBelowOne = 1.0f - kPqC1;  // And c2 - c3.
inline float PqRatioBelowOne(float light) {
  const double y = UnroundedPower(light, kPqM1), below = kPqBelowOne, c3 = kPqC3;
  return static_cast<float>(below * (1.0 - y) / (c3 * y + 1.0));
}

// BT.2100 writes the logarithmic segment for 12 E; here the 12 is folded into the constants.
inline constexpr float kHlgA = 0.17883277f, kHlgB = 0.02372241f, kHlgC = 1.0042934f, kHlgInverseA = 5.5918164f;
inline constexpr float kHlgThreshold = 0.083333336f;
inline constexpr float kHlgLumaR = 0.2627f, kHlgLumaG = 0.678f, kHlgLumaB = 0.0593f;
inline constexpr float kHlgLeastGain = 0.0001f;
inline constexpr PowerExponent kHlgSystemGamma{0.2f}, kHlgInverseGamma{1.0f / 6.0f};  // Of 1.2, less the linear part.

}  // namespace vexel
