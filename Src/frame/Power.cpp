#include "frame/Power.h"

#include <cmath>
#include <limits>

#include <emmintrin.h>

namespace vexel {
namespace {

using power::kEighthsMagic;
using power::kEighthsMagicDouble;

constexpr float kInfinity = std::numeric_limits<float>::infinity();
constexpr uint32_t kInfinityBits = 0x7f800000;
constexpr float kQuietNaN = std::numeric_limits<float>::quiet_NaN();

struct SplitArgument {
  int32_t eighths;  // Of an octave; the low three bits number the segment.
  float mantissa;
};

// For finite x > 0. The integer conversion renormalises a denormal whatever the floating-point mode.
SplitArgument Split(float x) {
  int32_t i = std::bit_cast<int32_t>(x);
  if (i < 0x00800000) i = std::bit_cast<int32_t>(static_cast<float>(i)) - (149 << 23);
  i -= static_cast<int32_t>(power::kFirstBits);
  return {i >> 20, std::bit_cast<float>((static_cast<uint32_t>(i) & power::kMantissaMask) + power::kFirstBits)};
}

// 2^(eighths + kRootShift + f) as (root + rest) * 2^octaves, where eighths is a whole number of eighths below 2^18 in
// magnitude.
struct Exp2Terms {
  float root, rest;
  int32_t octaves;
};
Exp2Terms Exp2TermsOf(float eighths, float f) {
  const uint32_t count = std::bit_cast<uint32_t>(eighths + kEighthsMagic);
  const float* c = power::kExp2;
  const float series = (c[0] + f * c[1]) + (f * f) * (c[2] + f * c[3]);
  const float root = power::kRoot[count & 7];
  return {root, root * (f * series), static_cast<int32_t>(count - power::kEighthsMagicBits) >> 3};
}

float Exp2Tail(float eighths, float f) {
  const Exp2Terms terms = Exp2TermsOf(eighths, f);
  const float mantissa = terms.root + terms.rest;
  const int32_t n = terms.octaves;
  if (n > 128) return kInfinity;
  if (n < -125) {
    // The integer part of the result in units of the smallest denormal is its bit pattern.
    const float unit = std::bit_cast<float>((n < -151 ? -2 + 127 : n + 149 + 127) << 23);
    return std::bit_cast<float>(_mm_cvtss_si32(_mm_set_ss(mantissa * unit)));
  }
  const uint32_t bits = std::bit_cast<uint32_t>(mantissa) + (static_cast<uint32_t>(n) << 23);
  return std::bit_cast<float>(bits < kInfinityBits ? bits : kInfinityBits);
}

// An exponent of 2 in two parts, of which `high` has enough trailing zeros that taking eighths off it is exact.
struct ExponentPair {
  float high, low;
  float Eighths() const { return ((high + low) + kEighthsMagic) - kEighthsMagic; }
};
float Exp2Pair(const ExponentPair& t) {
  const float eighths = t.Eighths();
  return Exp2Tail(eighths, (t.high - eighths) + t.low);
}

double Log2Double(float x) {
  const SplitArgument s = Split(x);
  const int j = s.eighths & 7;
  const double r = static_cast<double>(s.mantissa) * power::kReciprocal[j] - 1.0;
  const double* c = power::kLog2;
  const double r2 = r * r;
  const double series = ((c[0] + r * c[1]) + r2 * (c[2] + r * c[3])) + (r2 * r2) * (c[4] + r * c[5]);
  return static_cast<double>(s.eighths) * 0.125 + (power::kReciprocalOffset[j] + r * series);
}

float Series(const power::ScaledLog2& log, float w) {
  return (log.series[0] + w * log.series[1]) + (w * w) * (log.series[2] + w * log.series[3]);
}

ExponentPair LogFloat(float x, const power::ScaledLog2& log) {
  const SplitArgument s = Split(x);
  const int j = s.eighths & 7;
  const float k = static_cast<float>(s.eighths);
  const float w = (s.mantissa - power::kCentre[j]) * log.slopes[j];
  const float rest = w + (w * w) * Series(log, w);
  return {log.eighthHigh * k, (log.eighthLow * k + log.offsets[j]) + rest};
}

// scale * log2(x) as the sum of three: `large` and `middle` exact and with trailing zeros, `small` below 2^-8 of the
// scale.
struct LongLog {
  float large, middle, small;
};

// `rest` belongs to x; it counts where x is near 1, and is taken for small elsewhere.
LongLog LogLong(float x, const power::ScaledLog2& log, float rest = 0.0f) {
  const SplitArgument s = Split(x);
  const int j = s.eighths & 7;
  const float k = static_cast<float>(s.eighths);
  const float r = (s.mantissa - power::kCentre[j]) + rest;
  const float top = std::bit_cast<float>(std::bit_cast<uint32_t>(r) & 0xfffff000);
  const float middle = top * log.slopes[j];
  const float low = (r - top) * log.slopes[j] + r * log.slopeRests[j];
  const float w = middle + low;
  const float curve = low + (w * w) * Series(log, w);
  return {log.eighthHigh * k + log.offsetsHigh[j], middle, (log.eighthLow * k + log.offsets[j]) + curve};
}

float PowerLong(float x, const power::ScaledLog2& log, float rest = 0.0f) {
  const LongLog t = LogLong(x, log, rest);
  const float eighths = (((t.large + t.middle) + t.small) + kEighthsMagic) - kEighthsMagic;
  return Exp2Tail(eighths, ((t.large - eighths) + t.middle) + t.small);
}

float PowerDouble(float x, float y) {
  double t = static_cast<double>(y) * Log2Double(x);
  t = t < 1024.0 ? t : 1024.0;
  t = (t > -1024.0 ? t : -1024.0) - power::kRootShift;
  const double eighths = (t + kEighthsMagicDouble) - kEighthsMagicDouble;
  return Exp2Tail(static_cast<float>(eighths), static_cast<float>(t - eighths));
}

// What the exponents give that have no form of their own.
float PowerScalar(float x, float y) {
  if (y == 0.0f || x == 1.0f) return 1.0f;
  if (x != x || y != y || x < 0.0f) return kQuietNaN;
  if (y == kInfinity) return x > 1.0f ? kInfinity : 0.0f;
  if (y == -kInfinity) return x > 1.0f ? 0.0f : kInfinity;
  if (x == 0.0f) return y > 0.0f ? 0.0f : kInfinity;
  if (x == kInfinity) return y > 0.0f ? kInfinity : 0.0f;
  return PowerDouble(x, y);
}

bool IsNaN(float x) { return (std::bit_cast<uint32_t>(x) & 0x7fffffff) > kInfinityBits; }

// e^x or 10^x: x is cut into two short halves so that the large product with log2(base) is exact.
float ExpOfBase(float x, const power::SplitFloat& log2Base) {
  if (IsNaN(x)) return kQuietNaN;
  x = x < 256.0f ? x : 256.0f;
  x = x > -256.0f ? x : -256.0f;
  const float top = std::bit_cast<float>(std::bit_cast<uint32_t>(x) & 0xfffff000);
  const float bottom = x - top;
  const float low = top * log2Base.low + bottom * (log2Base.high + log2Base.low);
  return Exp2Pair({top * log2Base.high, low - static_cast<float>(power::kRootShift)});
}

float LogOfBase(float x, const power::ScaledLog2& log) {
  if (IsNaN(x)) return kQuietNaN;
  if (x == 0.0f) return -kInfinity;
  if (x < 0.0f) return kQuietNaN;
  if (x == kInfinity) return kInfinity;
  const LongLog t = LogLong(x, log);
  const float sum = t.large + t.middle;
  return sum + ((t.middle - (sum - t.large)) + t.small);
}

}  // namespace

float Power(float x, const PowerExponent& y) noexcept {
  if (y.core == PowerCore::Scalar) return PowerScalar(x, y.exponent);
  const uint32_t bits = std::bit_cast<uint32_t>(x);
  if ((bits & 0x7fffffff) == 0) return 0.0f;
  if (bits == kInfinityBits) return kInfinity;
  if (bits > kInfinityBits) return kQuietNaN;
  return y.core == PowerCore::Float ? Exp2Pair(LogFloat(x, y.log)) : PowerLong(x, y.log);
}

float Power(float x, float y) noexcept { return Power(x, PowerExponent(y)); }

double UnroundedPower(float x, const PowerExponent& y) noexcept {
  const uint32_t bits = std::bit_cast<uint32_t>(x);
  if (bits < y.firstBits || bits > y.lastBits) return static_cast<double>(Power(x, y));
  const ExponentPair t = LogFloat(x, y.log);
  const float eighths = t.Eighths();
  const Exp2Terms terms = Exp2TermsOf(eighths, (t.high - eighths) + t.low);
  return std::ldexp(static_cast<double>(terms.root) + static_cast<double>(terms.rest), terms.octaves);
}

float PowerOfOneLess(float u, const PowerExponent& y) noexcept {
  const float x = 1.0f - u;
  const uint32_t bits = std::bit_cast<uint32_t>(x);
  return bits >= y.firstBits && bits <= y.lastBits ? PowerLong(x, y.log, (1.0f - x) - u) : Power(x, y);
}

float SignedPower(float x, const PowerExponent& y) noexcept {
  if (IsNaN(x)) return kQuietNaN;
  const uint32_t sign = std::bit_cast<uint32_t>(x) & 0x80000000;
  const float magnitude = Power(std::bit_cast<float>(std::bit_cast<uint32_t>(x) ^ sign), y);
  return std::bit_cast<float>(std::bit_cast<uint32_t>(magnitude) | sign);
}

float Log2InEighths(float x) noexcept {
  const power::EighthsLog2& log = power::kEighthsLog2;
  const SplitArgument s = Split(x);
  const int j = s.eighths & 7;
  const float w = (s.mantissa - power::kCentre[j]) * log.slopes[j], square = w * w;
  const float curve = w + square * ((log.series[0] + w * log.series[1]) + square * log.series[2]);
  return static_cast<float>(s.eighths) + (log.offsets[j] + curve);
}

float Log(float x) noexcept { return LogOfBase(x, power::kNaturalLog); }
float Log10(float x) noexcept { return LogOfBase(x, power::kDecimalLog); }
float Exp(float x) noexcept { return ExpOfBase(x, power::kLog2EShort); }
float Exp10(float x) noexcept { return ExpOfBase(x, power::kLog2Of10Short); }

}  // namespace vexel
