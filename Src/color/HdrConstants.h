// SMPTE ST 2084 and ITU-R BT.2100 HLG, as the kernels and the scalar functions use them.
#pragma once

#include "frame/Power.h"

namespace vexel {

inline constexpr float kPqC1 = 0.8359375f, kPqC2 = 18.8515625f, kPqC3 = 18.6875f;
inline constexpr PowerExponent kPqM1{0.1593017578125f}, kPqM2{78.84375f};
inline constexpr PowerExponent kPqInverseM1{6.277395f}, kPqInverseM2{0.012683313f};

// The ratio of ST 2084 whose power is the signal, (c2 y + c1) / (c3 y + 1), is 1 less this: near 1 it needs more digits
// than a float has, because the exponent multiplies its error by 79.
inline constexpr float kPqBelowOne = 1.0f - kPqC1;  // And c2 - c3.
inline float PqRatioBelowOne(float y) { return kPqBelowOne * (1.0f - y) / (kPqC3 * y + 1.0f); }

// BT.2100 writes the logarithmic segment for 12 E; here the 12 is folded into the constants.
inline constexpr float kHlgA = 0.17883277f, kHlgB = 0.02372241f, kHlgC = 1.0042934f, kHlgInverseA = 5.5918164f;
inline constexpr float kHlgThreshold = 0.083333336f;
inline constexpr float kHlgLumaR = 0.2627f, kHlgLumaG = 0.678f, kHlgLumaB = 0.0593f;
inline constexpr float kHlgLeastGain = 0.0001f;
inline constexpr PowerExponent kHlgSystemGamma{0.2f}, kHlgInverseGamma{1.0f / 6.0f};  // Of 1.2, less the linear part.

}  // namespace vexel
