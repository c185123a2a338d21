#include <cmath>
#include <cstring>

#include "color/SpaceCommon.h"
#include "color/LazyCache.h"

namespace vexel {

void ConvertPowerToPower(const float* src, float* dst, int count, const PowerExponent& decode,
                         const PowerExponent& encode, const VX::CSMatrix& matrix, bool compressGamut,
                         const float* lumaCoeffs) noexcept {
  if (count < 1) return;
  const TransferJob job{decode, encode, Matrix3(matrix), LumaWeights(lumaCoeffs)};
  const GamutStep step = matrix.IsUnity() ? GamutStep::None
                         : compressGamut  ? GamutStep::MatrixAndCompression
                                          : GamutStep::Matrix;
  PowerToPowerKernel(ActiveKernelVariant(), job, step)(src, dst, PixelCount(count), job);
}

const VX::CSMatrix& Rec709ToRec2020() noexcept {
  static const VX::CSMatrix matrix(0.627402f, 0.329292f, 0.043306f, 0.069095f, 0.919544f, 0.011360f, 0.016394f,
                                   0.088028f, 0.895578f);
  return matrix;
}

const VX::CSMatrix& Rec2020ToRec709() noexcept {
  static const VX::CSMatrix matrix(1.6605f, -0.587657f, -0.07284f, -0.124547f, 1.1329f, -0.008348f, -0.018154f,
                                   -0.100597f, 1.11875f);
  return matrix;
}

const float* Rec709Luma() { return VX::ColorSpace::WorkingSpace(VX_WorkingSpaceRec709).LuminanceCoeffs(); }

namespace {

const VX::CSMatrix& Identity() {
  static const VX::CSMatrix identity;
  return identity;
}

constexpr float kSrgbDecodeThreshold = 0.04045f;
constexpr float kSrgbEncodeThreshold = 0.0031308f;

constexpr ToneCurve kSrgbToneDecode{kSrgbDecodeThreshold, 1.0f / 1.055f, 0.055f, kPower2_4, 1.0f / 12.92f};
constexpr ToneCurve kSrgbToneEncode{kSrgbEncodeThreshold, 1.055f, -0.055f, kPower1Over2_4, 12.92f};

constexpr ToneCurve PurePower(const PowerExponent& exponent) { return {0.0f, 1.0f, 0.0f, exponent, 1.0f}; }
constexpr ToneCurve kDecode2_4 = PurePower(kPower2_4), kEncode2_4 = PurePower(kPower1Over2_4);
constexpr ToneCurve kDecode2_6 = PurePower(kPower2_6), kEncode2_6 = PurePower(kPower1Over2_6);

struct ToneParameters {
  float a, b, c;
};

void CompressPixels(const VX::ColorSpace& space, const float* src, float* dst, int count, const ToneCurve& decode,
                    const ToneCurve& encode, const ToneParameters& p) {
  VX::ColorSpace::WorkingSpace(VX_WorkingSpaceRec709);  // Exists from here on.
  if (count < 1) return;
  const float* white = space.WhitePoint();
  const float k = p.c / p.b;
  const float e = (1.0f - k) / (1.0f - p.c);
  const ToneJob job{decode, encode, Matrix3(space.RGBtoXYZ()), Matrix3(space.XYZtoRGB()), white[0], white[1], p.a, p.b,
                    p.c,    k,      PowerExponent(e * p.b)};
  kCompressTones[ActiveKernelVariant()](src, dst, PixelCount(count), job);
}

void CopyPixels(const float* src, float* dst, int count) {
  if (src != dst && count > 0) std::memcpy(dst, src, PixelCount(count) * 4 * sizeof(float));
}

constexpr float kRec709Primaries[6] = {0.64f, 0.33f, 0.30f, 0.60f, 0.15f, 0.06f};
constexpr float kRec709LumaCoeffs[3] = {0.2126f, 0.7152f, 0.0722f};
constexpr float kRec2020Primaries[6] = {0.708f, 0.292f, 0.170f, 0.797f, 0.131f, 0.046f};
constexpr float kRec2020LumaCoeffs[3] = {0.2627f, 0.6780f, 0.0593f};
constexpr float kDciP3Primaries[6] = {0.680f, 0.320f, 0.265f, 0.690f, 0.150f, 0.060f};

}  // namespace
}  // namespace vexel

namespace VX {

using namespace vexel;

void PureGammaToPureGamma(const float* src, float* dst, int count, float decodeExponent, float encodeExponent,
                          const CSMatrix& matrix, bool compressGamut, const float* lumaCoeffs) {
  ConvertPowerToPower(src, dst, count, PowerExponent(decodeExponent), PowerExponent(encodeExponent), matrix,
                      compressGamut, lumaCoeffs);
}

void ClampFloatPixels(const float* src, float* dst, int rows, int rowBytes, float lo, float hi) {
  if (rowBytes < static_cast<int>(sizeof(float))) return;
  const ClampKernel clamp = kClampFloats[ActiveKernelVariant()];
  const size_t floats = static_cast<size_t>(rowBytes) / sizeof(float);
  for (int pass = 0; pass < rows; ++pass) {
    // One row behind, as callers expect: row 0 twice, the last row never.
    const ptrdiff_t offset = static_cast<ptrdiff_t>(pass > 0 ? pass - 1 : 0) * rowBytes;
    clamp(reinterpret_cast<const char*>(src) + offset, reinterpret_cast<char*>(dst) + offset, floats, lo, hi);
  }
}

SRGBColorSpace::SRGBColorSpace() = default;
const float* SRGBColorSpace::Primaries() const { return kRec709Primaries; }
const float* SRGBColorSpace::WhitePoint() const { return Illuminant(VX_IlluminantD65); }
const float* SRGBColorSpace::LuminanceCoeffs() const { return kRec709LumaCoeffs; }

// The thresholds are compared with the signed value on purpose: negative values, whatever their size, stay linear.
float SRGBColorSpace::LinearToEOTF(float linear) const {
  const float magnitude = std::fabs(linear);
  const float signal =
      linear > kSrgbEncodeThreshold ? 1.055f * Power(magnitude, kPower1Over2_4) - 0.055f : 12.92f * magnitude;
  return linear < 0.0f ? -signal : signal;
}

float SRGBColorSpace::EOTFToLinear(float signal) const {
  const float magnitude = std::fabs(signal);
  const float linear =
      signal > kSrgbDecodeThreshold ? Power((magnitude + 0.055f) / 1.055f, kPower2_4) : magnitude / 12.92f;
  return signal < 0.0f ? -linear : linear;
}

void SRGBColorSpace::ConvertPixelsFromRec709(const float* src, float* dst, int count, bool) const {
  kPowerToSrgb[ActiveKernelVariant()](src, dst, PixelCount(count), TransferJob{kPower2_4, kPower1Over2_4});
}

void SRGBColorSpace::ConvertPixelsToRec709(const float* src, float* dst, int count, bool) const {
  kSrgbToPower[ActiveKernelVariant()](src, dst, PixelCount(count), TransferJob{kPower2_4, kPower1Over2_4});
}

void SRGBColorSpace::CompressPixelsToSDR(const float* src, float* dst, int count, float a, float b, float c) const {
  CompressPixels(*this, src, dst, count, kSrgbToneDecode, kSrgbToneEncode, {a, b, c});
}

GammaColorSpace::GammaColorSpace(float gamma) : mGamma(gamma) {}

float GammaColorSpace::LinearToEOTF(float linear) const {
  return linear >= 0.0f ? Power(linear, mGamma) : -Power(-linear, mGamma);
}

float GammaColorSpace::EOTFToLinear(float signal) const {
  return signal >= 0.0f ? Power(signal, 1.0f / mGamma) : -Power(-signal, 1.0f / mGamma);
}

void GammaColorSpace::ConvertPixelsFromRec709(const float* src, float* dst, int count, bool compressGamut) const {
  ConvertPowerToPower(src, dst, count, kPower2_4, PowerExponent(mGamma), Identity(), compressGamut, LuminanceCoeffs());
}

void GammaColorSpace::ConvertPixelsToRec709(const float* src, float* dst, int count, bool compressGamut) const {
  ConvertPowerToPower(src, dst, count, PowerExponent(1.0f / mGamma), kPower1Over2_4, Identity(), compressGamut,
                      Rec709Luma());
}

void GammaColorSpace::CompressPixelsToSDR(const float*, float*, int, float, float, float) const {}

Rec709ColorSpace::Rec709ColorSpace() : GammaColorSpace(1.0f / 2.4f) {}

void Rec709ColorSpace::ConvertPixelsFromRec709(const float* src, float* dst, int count, bool) const {
  CopyPixels(src, dst, count);
}

void Rec709ColorSpace::ConvertPixelsToRec709(const float* src, float* dst, int count, bool) const {
  CopyPixels(src, dst, count);
}

void Rec709ColorSpace::CompressPixelsToSDR(const float* src, float* dst, int count, float a, float b, float c) const {
  CompressPixels(*this, src, dst, count, kDecode2_4, kEncode2_4, {a, b, c});
}

Rec2020ColorSpace::Rec2020ColorSpace() = default;
const float* Rec2020ColorSpace::Primaries() const { return kRec2020Primaries; }
const float* Rec2020ColorSpace::WhitePoint() const { return Illuminant(VX_IlluminantD65); }
const float* Rec2020ColorSpace::LuminanceCoeffs() const { return kRec2020LumaCoeffs; }

void Rec2020ColorSpace::ConvertPixelsFromRec709(const float* src, float* dst, int count, bool compressGamut) const {
  ConvertPowerToPower(src, dst, count, kPower2_4, kPower1Over2_4, Rec709ToRec2020(), compressGamut, LuminanceCoeffs());
}

void Rec2020ColorSpace::ConvertPixelsToRec709(const float* src, float* dst, int count, bool compressGamut) const {
  ConvertPowerToPower(src, dst, count, kPower2_4, kPower1Over2_4, Rec2020ToRec709(), compressGamut, Rec709Luma());
}

void Rec2020ColorSpace::CompressPixelsToSDR(const float* src, float* dst, int count, float a, float b, float c) const {
  CompressPixels(*this, src, dst, count, kDecode2_4, kEncode2_4, {a, b, c});
}

void Rec2020ColorSpace::ConvertPixelsFromYUVtoRGB(const float* src, float* dst, int count) const {
  kYuv2020ToRgb[ActiveKernelVariant()](src, dst, PixelCount(count));
}

void Rec2020ColorSpace::ConvertPixelsFromRGBtoYUV(const float* src, float* dst, int count) const {
  kRgbToYuv2020[ActiveKernelVariant()](src, dst, PixelCount(count));
}

void Rec2020ColorSpace::Convert2RowsFromP010toRGB(const uint16_t* luma0, const uint16_t* luma1, const uint16_t* chroma,
                                                  float* out0, float* out1, int width) const {
  if (width < 1) return;
  const size_t paired = static_cast<size_t>(width) & ~size_t{1};
  const P010Kernel convert = kP010ToRgb2020[ActiveKernelVariant()];
  convert(luma0, chroma, out0, paired);
  convert(luma1, chroma, out1, paired);
  if (width % 2 == 0) return;
  // A last pixel without a partner is read as full range, on purpose: existing pictures were written that way.
  constexpr float kFullRange = 1.0f / 65472.0f;
  const float cb = static_cast<float>(chroma[paired]) * kFullRange - 0.5f;
  const float cr = static_cast<float>(chroma[paired + 1]) * kFullRange - 0.5f;
  const uint16_t* luma[2] = {luma0, luma1};
  float* out[2] = {out0, out1};
  for (int row = 0; row < 2; ++row) {
    const float yuv[4] = {cr, cb, static_cast<float>(luma[row][paired]) * kFullRange, 1.0f};
    kYuv2020ToRgb[KernelVariant::Plain](yuv, out[row] + 4 * paired, 1);
  }
}

DCIP3ColorSpace::DCIP3ColorSpace(VX_Illuminant illuminant)
    : GammaColorSpace(1.0f / 2.6f),
      mIlluminant(illuminant),
      mLumaCoeffs{0, 0, 0},
      mFromRec709Valid(false),
      mToRec709Valid(false) {}

DCIP3ColorSpace::DCIP3ColorSpace(const DCIP3ColorSpace& other) : GammaColorSpace(other) { *this = other; }
DCIP3ColorSpace::DCIP3ColorSpace(DCIP3ColorSpace&& other) : GammaColorSpace(other) { *this = other; }

DCIP3ColorSpace& DCIP3ColorSpace::operator=(const DCIP3ColorSpace& other) {
  if (this == &other) return *this;
  GammaColorSpace::operator=(other);
  const std::lock_guard<std::mutex> lock(LazyCacheMutex());
  mIlluminant = other.mIlluminant;
  std::memcpy(mLumaCoeffs, other.mLumaCoeffs, sizeof mLumaCoeffs);
  mFromRec709 = other.mFromRec709;
  mToRec709 = other.mToRec709;
  mFromRec709Valid = other.mFromRec709Valid;
  mToRec709Valid = other.mToRec709Valid;
  return *this;
}

DCIP3ColorSpace& DCIP3ColorSpace::operator=(DCIP3ColorSpace&& other) { return *this = other; }

const float* DCIP3ColorSpace::Primaries() const { return kDciP3Primaries; }
const float* DCIP3ColorSpace::WhitePoint() const { return Illuminant(mIlluminant); }

const float* DCIP3ColorSpace::LuminanceCoeffs() const {
  return CachedCoeffs(mLumaCoeffs, [this](float* coeffs) { CalculateLumaCoeffs(coeffs); });
}

void DCIP3ColorSpace::ConvertPixelsFromRec709(const float* src, float* dst, int count, bool compressGamut) const {
  const CSMatrix& matrix = CachedMatrix(mFromRec709, mFromRec709Valid, [this] {
    return CalculateConversionMatrix(WorkingSpace(VX_WorkingSpaceRec709), *this);
  });
  ConvertPowerToPower(src, dst, count, kPower2_4, kPower1Over2_6, matrix, compressGamut, LuminanceCoeffs());
}

void DCIP3ColorSpace::ConvertPixelsToRec709(const float* src, float* dst, int count, bool compressGamut) const {
  const CSMatrix& matrix = CachedMatrix(mToRec709, mToRec709Valid, [this] {
    return CalculateConversionMatrix(*this, WorkingSpace(VX_WorkingSpaceRec709));
  });
  ConvertPowerToPower(src, dst, count, kPower2_6, kPower1Over2_4, matrix, compressGamut, Rec709Luma());
}

void DCIP3ColorSpace::CompressPixelsToSDR(const float* src, float* dst, int count, float a, float b, float c) const {
  CompressPixels(*this, src, dst, count, kDecode2_6, kEncode2_6, {a, b, c});
}

}  // namespace VX
