// The pixel engines of the colour spaces: `count` pixels of four floats (B, G, R, A), in all kernel variants. Source
// and destination are the same array or do not overlap.
#pragma once

#include <cstddef>
#include <cstdint>
#include <cstring>

#include "frame/KernelVariant.h"
#include "frame/Power.h"
#include "vexel/color_space.h"

namespace vexel {

inline constexpr PowerExponent kPower2_4{2.4f};
inline constexpr PowerExponent kPower1Over2_4{1.0f / 2.4f};
inline constexpr PowerExponent kPower2_6{2.6f};
inline constexpr PowerExponent kPower1Over2_6{1.0f / 2.6f};

// Row-major, acting on (R, G, B).
struct Matrix3 {
  Matrix3() = default;
  explicit Matrix3(const VX::CSMatrix& matrix) { std::memcpy(m, matrix[0], sizeof m); }
  float m[9] = {1, 0, 0, 0, 1, 0, 0, 0, 1};
};

struct LumaWeights {
  LumaWeights() = default;
  explicit LumaWeights(const float* rgb) {  // Null counts as zeros.
    if (rgb) r = rgb[0], g = rgb[1], b = rgb[2];
  }
  float r = 0, g = 0, b = 0;
};

// What happens to linear light between decoding and encoding.
enum class GamutStep : uint8_t { None, Matrix, MatrixAndCompression };

// ---- Power laws and sRGB ----

struct TransferJob {
  PowerExponent decode, encode;
  Matrix3 matrix = {};
  LumaWeights luma = {};
};
using TransferKernel = void (*)(const float* src, float* dst, size_t count, const TransferJob& job);

// Decode by a power, `step`, encode by a power; any exponents.
TransferKernel PowerToPowerKernel(KernelVariant variant, const TransferJob& job, GamutStep step) noexcept;

// The piecewise curve of IEC 61966-2-1 on one side, a power on the other.
extern const KernelVariants<TransferKernel> kPowerToSrgb;  // decode: 2.4; encode: 1/2.4, within the sRGB curve.
extern const KernelVariants<TransferKernel> kSrgbToPower;

// ---- Tone compression ----

// decoded = |v| > threshold ? ((|v| + offset) * scale)^exponent : |v| * slope
// encoded = |v| > threshold ? |v|^exponent * scale + offset : |v| * slope
struct ToneCurve {
  float threshold, scale, offset;
  PowerExponent exponent;
  float slope;
};

struct ToneJob {
  ToneCurve decode, encode;
  Matrix3 toXyz, fromXyz;
  float whiteX, whiteY;
  float a, b, c;
  float k;              // c / b
  PowerExponent shape;  // (1 - k) / (1 - c) * b
};
using ToneKernel = void (*)(const float* src, float* dst, size_t count, const ToneJob& job);
extern const KernelVariants<ToneKernel> kCompressTones;

// ---- SMPTE ST 2084 ----

inline constexpr int kPqTableSize = 4096;
inline constexpr int kHlgTableSize = 2048;

struct PqJob {
  Matrix3 matrix;
  float scale = 1;               // Of the signal: multiplied after encoding and before decoding.
  const float* table = nullptr;  // kPqTableSize entries, for kPqTableToRec709.
  LumaWeights luma = {};
  bool applyMatrix = true;  // kPqToRec709, kPqToRec709Compressed: false leaves linear light as it is.
};
using PqKernel = void (*)(const float* src, float* dst, size_t count, const PqJob& job);
extern const KernelVariants<PqKernel> kRec709ToPq;
extern const KernelVariants<PqKernel> kPqTableToRec709;
extern const KernelVariants<PqKernel> kPqToRec709;
extern const KernelVariants<PqKernel> kPqToRec709Compressed;

// ---- Hybrid log-gamma ----

struct HlgJob {
  Matrix3 matrix;
  const float* table = nullptr;  // kHlgTableSize entries, for kHlgToRec709.
};
using HlgKernel = void (*)(const float* src, float* dst, size_t count, const HlgJob& job);
extern const KernelVariants<HlgKernel> kRec709ToHlg;
extern const KernelVariants<HlgKernel> kHlgToRec709;

// ---- Y'CbCr and clamping ----

using PixelKernel = void (*)(const float* src, float* dst, size_t count);
extern const KernelVariants<PixelKernel> kYuv2020ToRgb;
extern const KernelVariants<PixelKernel> kRgbToYuv2020;

// `count` pixels, even, of one row of P010.
using P010Kernel = void (*)(const uint16_t* luma, const uint16_t* chroma, float* dst, size_t count);
extern const KernelVariants<P010Kernel> kP010ToRgb2020;

// `count` floats, at any address.
using ClampKernel = void (*)(const void* src, void* dst, size_t count, float lo, float hi);
extern const KernelVariants<ClampKernel> kClampFloats;

}  // namespace vexel
