// The library's one implementation of powers, logarithms and exponentials of floats. Scalar code uses the functions
// here, row kernels the vector forms of Power-inl.h; both perform the same operations in the same order, so that every
// kernel variant gives the same bits on every processor (the C library's powf does not promise that).
//
// Results are within 1 ulp of the correctly rounded float, denormal arguments and results included, whatever
// flush-to-zero says; denormals-are-zero is not supported. Rounding must be to nearest.
//
// How: the bits of x split into k, the number of eighths of an octave, and a mantissa in one of eight segments;
// y log2(x) = y / 8 * k + (what is left of the segment, below y / 12), 2^t = 2^(n / 8 + s) * (1 + f * polynomial), |f|
// <= 1/16, with a small s that makes the eight roots floats almost exactly. The large term is exact, because y / 8 is
// cut into a short number that k multiplies exactly and a small rest. Exponents above 4 carry more digits of what is
// left (the long form); the rare ones beyond both forms are computed in double.
#pragma once

#include <bit>
#include <cstdint>

namespace vexel {

namespace power {

// Segment j holds mantissas from kFirstBits + (j << 20); segment 0 is centred on 1, where logarithms vanish.
inline constexpr uint32_t kFirstBits = 0x3f755555;
inline constexpr uint32_t kMantissaMask = 0x007fffff;

// Short centres of the segments, and log2(centre) - j / 8.
alignas(32) inline constexpr float kCentre[8] = {1.0f,        1.10424805f, 1.22924805f, 1.35424805f,
                                                 1.47924805f, 1.60424805f, 1.72924805f, 1.85424805f};
inline constexpr double kCentreOffset[8] = {0.0,
                                            0.018064280631411165,
                                            0.047776062894147021,
                                            0.062492010125352063,
                                            0.064863990226941989,
                                            0.056897226786234635,
                                            0.040144826949798755,
                                            0.015834249389445772};
// ln(1 + r) = r + r^2 * (...), |r| < 0.0569, to 2^-32.
inline constexpr double kLn[4] = {-0.49999925580796534, 0.33333223612080437, -0.25074945919769887, 0.20080257931802578};

// For the double form: reciprocals whose logarithm is a float to 2^-41, and log2(1 + r) = r * (...) to 2^-36.
inline constexpr float kReciprocal[8] = {1.0f,         0.905404091f, 0.813294947f, 0.738525391f,
                                         0.675993145f, 0.623168707f, 0.578119814f, 0.539312065f};
inline constexpr float kReciprocalOffset[8] = {0.0f,          0.0183662698f, 0.0481494442f, 0.062280573f,
                                               0.0649194792f, 0.0573053062f, 0.040559575f,  0.015807787f};
inline constexpr double kLog2[6] = {1.4426950411084996,   -0.72134752104861699, 0.48089712699959069,
                                    -0.36067218359279224, 0.28954285675094638,  -0.24145339859794785};

// 2^f - 1 = f * (...), |f| <= 1/16, to 2^-32.
inline constexpr float kExp2[4] = {0.693147182464599609375f, 0.2402265071868896484375f, 5.5508099496364593505859375e-2f,
                                   9.6186101436614990234375e-3f};
// 2^(j / 8 + kRootShift); with this shift all eight are floats to 2^-28.
inline constexpr double kRootShift = -0.0036995260014282961;
alignas(32) inline constexpr float kRoot[8] = {0.997438967f, 1.08771491f, 1.18616152f, 1.2935183f,
                                               1.41059172f,  1.53826118f, 1.6774857f,  1.82931113f};

// Adding these rounds a float or double to eighths, which then stand in the low bits.
inline constexpr float kEighthsMagic = 1572864.0f;                // 1.5 * 2^20
inline constexpr double kEighthsMagicDouble = 844424930131968.0;  // 1.5 * 2^49
inline constexpr uint32_t kEighthsMagicBits = 0x49c00000;

inline constexpr double kLog2E = 1.4426950408889634;
inline constexpr double kLn2 = 0.69314718055994531;
inline constexpr double kLog10Of2 = 0.30102999566398120;

// A constant as a float of at most `bits` mantissa bits and the rest, so that products with short numbers are exact.
struct SplitFloat {
  float high, low;
  constexpr SplitFloat(double value, int bits)
      : high(std::bit_cast<float>(std::bit_cast<uint32_t>(static_cast<float>(value)) & (0xffffffffu << (24 - bits)))),
        low(static_cast<float>(value - high)) {}
};
inline constexpr SplitFloat kLog2EShort{kLog2E, 12};
inline constexpr SplitFloat kLog2Of10Short{3.3219280948873623, 12};

// What scale * log2(x) - shift needs. In the long form slopes and offsets are a short number and its rest; in the other
// the high offsets and low slopes are not used.
struct ScaledLog2 {
  constexpr ScaledLog2() = default;
  constexpr ScaledLog2(double scale, bool isLong, double shift) {
    const SplitFloat eighth(scale * 0.125, 13);
    eighthHigh = eighth.high;
    eighthLow = eighth.low;
    double factor = 1.0;
    for (int i = 0; i < 4; ++i) {
      factor /= scale * kLog2E;
      series[i] = static_cast<float>(kLn[i] * factor);
    }
    for (int j = 0; j < 8; ++j) {
      const double slope = scale * kLog2E / kCentre[j], offset = scale * kCentreOffset[j] - shift;
      if (isLong) {
        const SplitFloat shortSlope(slope, 12);
        slopes[j] = shortSlope.high;
        slopeRests[j] = shortSlope.low;
        // A multiple of 2^-16 below 2^7, like the large term that it joins.
        offsetsHigh[j] = static_cast<float>(static_cast<int>(offset * 65536.0)) * (1.0f / 65536.0f);
        offsets[j] = static_cast<float>(offset - offsetsHigh[j]);
      } else {
        slopes[j] = static_cast<float>(slope);
        offsets[j] = static_cast<float>(offset);
      }
    }
  }

  float eighthHigh = 0, eighthLow = 0;
  float series[4] = {};
  alignas(32) float slopes[8] = {};
  alignas(32) float offsets[8] = {};
  alignas(32) float slopeRests[8] = {};
  alignas(32) float offsetsHigh[8] = {};
};
// What 8 log2(x) needs as one float: eighths of an octave cost no multiplication.
struct EighthsLog2 {
  // ln(1 + r) = r + r^2 * (...), |r| < 0.0569, to 2^-26.
  static constexpr double kShortLn[3] = {-0.49999908545838467, 0.33389728174625966, -0.25082336360937946};
  constexpr EighthsLog2() {
    double factor = 1.0;
    for (int i = 0; i < 3; ++i) {
      factor /= 8 * kLog2E;
      series[i] = static_cast<float>(kShortLn[i] * factor);
    }
    for (int j = 0; j < 8; ++j) {
      slopes[j] = static_cast<float>(8 * kLog2E / kCentre[j]);
      offsets[j] = static_cast<float>(8 * kCentreOffset[j]);
    }
  }
  float series[3] = {};
  alignas(32) float slopes[8] = {};
  alignas(32) float offsets[8] = {};
};
inline constexpr EighthsLog2 kEighthsLog2;

inline constexpr ScaledLog2 kNaturalLog{kLn2, true, 0.0};
inline constexpr ScaledLog2 kDecimalLog{kLog10Of2, true, 0.0};

}  // namespace power

// How x^y is computed, from y alone: Float for 2^-10 <= y <= 4, Long up to 80; Scalar, which has no vector form, for
// the other exponents.
enum class PowerCore : uint8_t { Float, Long, Scalar };

// An exponent with all that is derived from it. Making one costs a few dozen operations: make it once per call.
struct PowerExponent {
  constexpr explicit PowerExponent(float y)
      : PowerExponent(y, y >= 0x1p-10f && y <= 4.0f ? PowerCore::Float
                         : y > 4.0f && y <= 80.0f   ? PowerCore::Long
                                                    : PowerCore::Scalar) {}
  // A core of choice, and powers times 2^log2Factor. The float form keeps to 2 ulp up to y = 8.
  constexpr PowerExponent(double y, PowerCore how, double log2Factor = 0.0)
      : exponent(static_cast<float>(y)), core(how) {
    if (core == PowerCore::Scalar) return;
    log = power::ScaledLog2(y, core == PowerCore::Long, power::kRootShift - log2Factor);
    // Every x between these powers of two gives a result whose smallest terms are normal numbers too.
    if (y > 0.75f) {
      const int down = static_cast<int>(95.0f / y);
      const int up = static_cast<int>(126.0f / y);
      if (down < 126) firstBits = static_cast<uint32_t>(127 - down) << 23;
      if (up < 128) lastBits = static_cast<uint32_t>(127 + up) << 23;
    }
  }

  float exponent;
  PowerCore core;
  uint32_t firstBits = 0x00800000, lastBits = 0x7f7fffff;
  power::ScaledLog2 log;
};

// x^y for x >= 0 (-0 counts as 0); NaN for negative x. As in C: x^0 = 1, 1^y = 1, NaN otherwise stays NaN.
float Power(float x, const PowerExponent& y) noexcept;
float Power(float x, float y) noexcept;

// The float form before its last rounding, for normal x and results; Power otherwise. To 2^-27 of itself.
double UnroundedPower(float x, const PowerExponent& y) noexcept;

// (1 - u)^y for exponents with the long core and |u| below 1/2, without the error of rounding 1 - u where that is
// near 1.
float PowerOfOneLess(float u, const PowerExponent& y) noexcept;

// sign(x) * |x|^y: a power law kept odd-symmetric. NaN gives NaN without a sign.
float SignedPower(float x, const PowerExponent& y) noexcept;

// Natural and decimal logarithm: -inf for 0, NaN for negative x.
float Log(float x) noexcept;
float Log10(float x) noexcept;

// 8 log2(x) for finite x > 0: within 2^-22, near 1 within 2^-22 of itself, and within half an ulp more.
float Log2InEighths(float x) noexcept;

// e^x and 10^x.
float Exp(float x) noexcept;
float Exp10(float x) noexcept;

}  // namespace vexel
