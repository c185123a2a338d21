// The matrices of 8-bit Y'CbCr in fixed point, and the scalar definition of what they compute.
//
// Every coefficient is the product of a matrix and the code scalings in double precision, rounded once. Over all 2^24
// colours results lie within 0.52 code values of the exact ones clamped to 0..255 (RGB to Y'CbCr and between the
// colorimetries within 0.507), and more than 99.6 % of them are the nearest codes.
#pragma once

#include <cstdint>

#include "convert/YuvMatrices.h"

namespace vexel {

constexpr int RoundFixed(double value) { return static_cast<int>(value < 0 ? value - 0.5 : value + 0.5); }

// Three channels c of a pixel, in memory order, to three others:
//
//   out[j] = clamp((c0[j] c[0] + c1[j] 2 c[1] + c2[j] c[2] + biasUnit bias[j]) >> shift)
//
// The middle channel counts double, which gives its coefficient one bit more. All numbers fit int16: two
// multiplications of 16-bit pairs, (c[0], c[2]) and (2 c[1], biasUnit), make one result.
struct FixedMatrix8 {
  int c0[3], c1[3], c2[3], bias[3];
  int biasUnit, shift;
};

// BGR to VUY with 16 fractional bits. Grey gives chroma 128 exactly: the coefficients of a chroma row sum to 0.
constexpr FixedMatrix8 MakeRgbToYuv8(const YuvMatrix& m) {
  constexpr double kChroma = 65536.0 * kChromaRange8 / 255, kLuma = 65536.0 * kLumaRange8 / 255;
  FixedMatrix8 f{};
  f.shift = 16;
  f.biasUnit = 1 << 14;
  f.c0[0] = RoundFixed(kChroma * m.vB), f.c0[1] = RoundFixed(kChroma * m.uB), f.c0[2] = RoundFixed(kLuma * m.yB);
  f.c1[0] = RoundFixed(kChroma * m.vG / 2), f.c1[1] = RoundFixed(kChroma * m.uG / 2);
  f.c1[2] = RoundFixed(kLuma * m.yG / 2);
  f.c2[0] = -f.c0[0] - 2 * f.c1[0], f.c2[1] = -f.c0[1] - 2 * f.c1[1], f.c2[2] = RoundFixed(kLuma * m.yR);
  f.bias[0] = f.bias[1] = 4 * kChromaZero8 + 2, f.bias[2] = 4 * kLumaBlack8 + 2;
  return f;
}

// VUY to VUY of the other colorimetry with 14 fractional bits, about (128, 128, 16). Grey stays what it is, and scaling
// about black (premultiplying) commutes with it but for rounding.
constexpr FixedMatrix8 MakeYuvToYuv8(const YuvRecoding& r) {
  constexpr double kOne = 16384, kToLuma = kOne * kLumaRange8 / kChromaRange8;
  FixedMatrix8 f{};
  f.shift = 14;
  f.biasUnit = 32;
  f.c0[0] = RoundFixed(kOne * r.vV), f.c0[1] = RoundFixed(kOne * r.uV), f.c0[2] = RoundFixed(kToLuma * r.yV);
  f.c1[0] = RoundFixed(kOne * r.vU / 2), f.c1[1] = RoundFixed(kOne * r.uU / 2),
  f.c1[2] = RoundFixed(kToLuma * r.yU / 2);
  f.c2[2] = 1 << 14;
  for (int j = 0; j < 3; ++j) {
    const int offset = kChromaZero8 * ((j < 2 ? 1 << 14 : 0) - f.c0[j] - 2 * f.c1[j]);
    f.bias[j] = (offset + (1 << 13)) / f.biasUnit;
  }
  return f;
}

// VUY to BGR in 16-bit steps with 6 fractional bits:
//
//   y = (256 Y luma >> 16) + lumaBias          u = 256 (U - 128), v likewise
//   B = clamp((y + (u blueU + 2^14 >> 15)) >> 6)
//   G = clamp((y + (u greenU + v greenV >> 16)) >> 6)
//   R = clamp((y + (v redV + 2^14 >> 15)) >> 6)
//
// Sums that leave int16 are far above 255 and may saturate.
struct FixedYuvToRgb8 {
  int luma, lumaBias, blueU, greenU, greenV, redV;
};

constexpr FixedYuvToRgb8 MakeYuvToRgb8(const YuvMatrix& m) {
  constexpr double kLuma = 255.0 / kLumaRange8, kChroma = 255.0 / kChromaRange8;
  FixedYuvToRgb8 f{};
  f.luma = RoundFixed(16384 * kLuma);
  // Half a code to round, and half a step for what the shift of the luma product cuts off on average.
  f.lumaBias = RoundFixed(-64 * kLumaBlack8 * kLuma + 32 + 0.5);
  f.blueU = RoundFixed(8192 * kChroma * m.bU), f.redV = RoundFixed(8192 * kChroma * m.rV);
  f.greenU = RoundFixed(16384 * kChroma * m.gU), f.greenV = RoundFixed(16384 * kChroma * m.gV);
  return f;
}

inline constexpr FixedMatrix8 kRgbToYuv8_601 = MakeRgbToYuv8(kBt601), kRgbToYuv8_709 = MakeRgbToYuv8(kBt709);
inline constexpr FixedMatrix8 kYuv8_601To709 = MakeYuvToYuv8(k601To709), kYuv8_709To601 = MakeYuvToYuv8(k709To601);
inline constexpr FixedYuvToRgb8 kYuvToRgb8_601 = MakeYuvToRgb8(kBt601), kYuvToRgb8_709 = MakeYuvToRgb8(kBt709);

namespace plain {

inline uint8_t Clamp8(int value) { return static_cast<uint8_t>(value < 0 ? 0 : value > 255 ? 255 : value); }

inline void MultiplyMatrix8(const FixedMatrix8& m, const uint8_t* in, uint8_t* out) {
  for (int j = 0; j < 3; ++j)
    out[j] = Clamp8((m.c0[j] * in[0] + m.c1[j] * 2 * in[1] + m.c2[j] * in[2] + m.biasUnit * m.bias[j]) >> m.shift);
}

// u and v are 256 times the chroma about 0, so that half codes have their place.
inline void Yuv8ToBgr8(const FixedYuvToRgb8& f, int luma, int u, int v, uint8_t* bgr) {
  const int y = (luma * 256 * f.luma >> 16) + f.lumaBias;
  bgr[0] = Clamp8((y + ((u * f.blueU + (1 << 14)) >> 15)) >> 6);
  bgr[1] = Clamp8((y + ((u * f.greenU + v * f.greenV) >> 16)) >> 6);
  bgr[2] = Clamp8((y + ((v * f.redV + (1 << 14)) >> 15)) >> 6);
}

}  // namespace plain
}  // namespace vexel
