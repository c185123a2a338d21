// Distances between floats in units in the last place.
#pragma once

#include <algorithm>
#include <bit>
#include <cmath>
#include <cstdint>

namespace vexel::testing {

// Maps floats to integers so that neighbours differ by 1; both zeros are 0.
inline int64_t OrderedBits(float value) {
  const auto bits = std::bit_cast<uint32_t>(value);
  return bits >> 31 ? -int64_t{bits & 0x7FFFFFFF} : int64_t{bits};
}

// Steps between two floats: 0 for equal values and for two NaNs, INT64_MAX if only one is a NaN.
inline int64_t UlpDistance(float a, float b) {
  if (std::isnan(a) || std::isnan(b)) return std::isnan(a) && std::isnan(b) ? 0 : INT64_MAX;
  const int64_t distance = OrderedBits(a) - OrderedBits(b);
  return distance < 0 ? -distance : distance;
}

// The error of `value` against a reference of higher precision, in units in the last place of the float nearest to it.
// Infinite if exactly one of them is a NaN or an infinity.
inline double UlpError(float value, double reference) {
  if (std::isnan(value) && std::isnan(reference)) return 0;
  const auto nearest = static_cast<float>(reference);
  if (value == nearest && std::isinf(nearest)) return 0;
  if (!std::isfinite(value) || !std::isfinite(nearest)) return HUGE_VAL;
  const int exponent = std::max(std::ilogb(nearest == 0 ? 0x1p-126f : nearest), -126);
  return std::abs(static_cast<double>(value) - reference) / std::ldexp(1.0, exponent - 23);
}

// Equal in all bits, so that NaNs equal themselves and the zeros differ.
inline bool SameBits(float a, float b) { return std::bit_cast<uint32_t>(a) == std::bit_cast<uint32_t>(b); }

}  // namespace vexel::testing
