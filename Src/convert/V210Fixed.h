// Where the samples of V210 are, and the fixed-point numbers that make 8-bit pixels of them.
//
// Products are those of a 16-bit value and a coefficient in units of 2^-15, rounded. Factors are 10-bit codes times 64
// less 2^15, which is zero chroma; results are 8-bit codes times 64.
#pragma once

#include <cstddef>
#include <cstdint>

#include "convert/YuvMatrices.h"

namespace vexel {

// The two bytes that hold sample `index` of a row or a group, and the factor that moves it to the top of their 16 bits,
// where the bits above it fall out.
constexpr uint8_t FirstByte(size_t index) { return static_cast<uint8_t>(index / 3 * 4 + index % 3); }
constexpr uint16_t ToTop(size_t index) { return static_cast<uint16_t>(64 >> 2 * (index % 3)); }

constexpr int16_t ToFixed10(double factor) {
  const double v = factor / 4 * 32768;
  return static_cast<int16_t>(v < 0 ? v - 0.5 : v + 0.5);
}

struct BgrFixed {
  int16_t y, offset, bU, gU, gV, rV;
};
constexpr BgrFixed MakeBgrFixed(const YuvMatrix& m) {
  constexpr double kLuma = 255.0 / kLumaRange8, kChroma = 255.0 / kChromaRange8;
  constexpr double kOffset = (128 - kLumaBlack8) * kLuma * 64 + 0.5;
  return {ToFixed10(kLuma),          static_cast<int16_t>(kOffset), ToFixed10(m.bU * kChroma),
          ToFixed10(m.gU * kChroma), ToFixed10(m.gV * kChroma),     ToFixed10(m.rV * kChroma)};
}
inline constexpr BgrFixed kBgrFixed601 = MakeBgrFixed(kBt601), kBgrFixed709 = MakeBgrFixed(kBt709);

struct RecodingFixed {
  int16_t vU, vV, uU, uV, yU, yV;
};
constexpr RecodingFixed MakeRecodingFixed(const YuvRecoding& r) {
  constexpr double kLuma = double{kLumaRange8} / kChromaRange8;
  return {ToFixed10(r.vU), ToFixed10(r.vV),         ToFixed10(r.uU),
          ToFixed10(r.uV), ToFixed10(r.yU * kLuma), ToFixed10(r.yV * kLuma)};
}
inline constexpr RecodingFixed kRecodingFixed709To601 = MakeRecodingFixed(k709To601);

}  // namespace vexel
