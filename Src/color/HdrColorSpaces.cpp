#include <cstring>
#include <limits>

#include "color/SpaceCommon.h"
#include "color/HdrConstants.h"
#include "color/LazyCache.h"
#include "color/PlainPixels.h"
#include "frame/FpModeGuard.h"

namespace vexel {
namespace {

constexpr float kReferenceWhiteSignal = 0.50807786f;  // ST 2084 of 100 cd/m2
constexpr float kInverseReferenceWhiteSignal = 1.9682022f;

// NaN outside the curve, as its powers give.
float PqToLinear(float signal) {
  if (!(signal >= kPqLeastSignal && signal <= kPqMostSignal)) return std::numeric_limits<float>::quiet_NaN();
  const float ratio = PqRatio(signal);
  return ratio < 0.0f ? std::numeric_limits<float>::quiet_NaN() : PqLightOf(ratio);
}

// Built on first use, under the guard of its static object, and never freed.
struct PqTable {
  PqTable() {
    const DefaultFpMode mode;
    for (int i = 0; i < kPqTableSize; ++i) light[i] = PqLight(static_cast<float>(i) * (1.0f / (kPqTableSize - 1)));
  }
  float light[kPqTableSize];
};

const float* PqTableLight() {
  static const PqTable table;
  return table.light;
}

struct HlgTable {
  HlgTable() {
    const DefaultFpMode mode;
    for (int i = 0; i < kHlgTableSize; ++i) {
      const float x = static_cast<float>(i) * (1.0f / (kHlgTableSize - 1));
      light[i] = x < 0.5f ? x * x * (1.0f / 3.0f) : Exp((x - kHlgC) * kHlgInverseA) + kHlgB;
    }
  }
  float light[kHlgTableSize];
};

const float* HlgTableLight() {
  static const HlgTable table;
  return table.light;
}

}  // namespace
}  // namespace vexel

namespace VX {

using namespace vexel;

PQColorSpace::PQColorSpace(bool useDCIP3Primaries, bool useRefWhite)
    : PQColorSpace(WorkingSpace(useDCIP3Primaries ? VX_WorkingSpaceDCIP3D65 : VX_WorkingSpaceRec2020).Primaries(),
                   useRefWhite) {
  if (!useDCIP3Primaries)
    std::memcpy(mLumaCoeffs, WorkingSpace(VX_WorkingSpaceRec2020).LuminanceCoeffs(), sizeof mLumaCoeffs);
}

PQColorSpace::PQColorSpace(const float* primaries, bool useRefWhite)
    : mPrimaries{},
      mLumaCoeffs{0, 0, 0},
      mRefWhite(kReferenceWhiteSignal),
      mRefWhiteSet(false),
      mDCIP3(VX_IlluminantD65),
      mFromRec709Valid(false),
      mToRec709Valid(false) {
  if (primaries) std::memmove(mPrimaries, primaries, sizeof mPrimaries);
  if (useRefWhite) SetRefWhite();
}

void PQColorSpace::SetRefWhite() {
  mRefWhite = mRefWhiteSet ? kReferenceWhiteSignal / mRefWhite : kReferenceWhiteSignal;
  mRefWhiteSet = true;
}

PQColorSpace::PQColorSpace(const PQColorSpace& other) : ColorSpace(other), mDCIP3(other.mDCIP3) { *this = other; }
PQColorSpace::PQColorSpace(PQColorSpace&& other) : ColorSpace(other), mDCIP3(other.mDCIP3) { *this = other; }

PQColorSpace& PQColorSpace::operator=(const PQColorSpace& other) {
  if (this == &other) return *this;
  ColorSpace::operator=(other);
  mDCIP3 = other.mDCIP3;
  const std::lock_guard<std::mutex> lock(LazyCacheMutex());
  std::memcpy(mPrimaries, other.mPrimaries, sizeof mPrimaries);
  std::memcpy(mLumaCoeffs, other.mLumaCoeffs, sizeof mLumaCoeffs);
  mRefWhite = other.mRefWhite;
  mRefWhiteSet = other.mRefWhiteSet;
  mFromRec709 = other.mFromRec709;
  mFromRec709Valid = other.mFromRec709Valid;
  mToRec709 = other.mToRec709;
  mToRec709Valid = other.mToRec709Valid;
  return *this;
}

PQColorSpace& PQColorSpace::operator=(PQColorSpace&& other) { return *this = other; }

const float* PQColorSpace::Primaries() const { return mPrimaries; }
const float* PQColorSpace::WhitePoint() const { return Illuminant(VX_IlluminantD65); }

const float* PQColorSpace::LuminanceCoeffs() const {
  return CachedCoeffs(mLumaCoeffs, [this](float* coeffs) { CalculateLumaCoeffs(coeffs); });
}

// Neither function clamps: negative light and signals outside the curve give NaN, as the powers do.
float PQColorSpace::LinearToEOTF(float linear) const {
  const float signal = PowerOfOneLess(PqRatioBelowOne(linear * 0.01f), kPqM2);
  return mRefWhiteSet ? signal / mRefWhite : signal;
}

float PQColorSpace::EOTFToLinear(float signal) const { return PqToLinear(mRefWhiteSet ? signal * mRefWhite : signal); }

void PQColorSpace::ConvertPixelsFromRec709(const float* src, float* dst, int count, bool) const {
  PqJob job;
  job.matrix = Matrix3(CachedMatrix(mFromRec709, mFromRec709Valid, [this] {
    return CalculateConversionMatrix(WorkingSpace(VX_WorkingSpaceRec709), *this);
  }));
  job.scale = mRefWhiteSet ? kInverseReferenceWhiteSignal : 1.0f;
  kRec709ToPq[ActiveKernelVariant()](src, dst, PixelCount(count), job);
}

void PQColorSpace::ConvertPixelsToRec709(const float* src, float* dst, int count, bool compressGamut) const {
  const CSMatrix& matrix = CachedMatrix(mToRec709, mToRec709Valid, [this] {
    return CalculateConversionMatrix(*this, WorkingSpace(VX_WorkingSpaceRec709));
  });
  if (count < 1) return;
  PqJob job;
  job.matrix = Matrix3(matrix);
  job.scale = mRefWhiteSet ? mRefWhite : 1.0f;
  const KernelVariant variant = ActiveKernelVariant();
  if (job.scale == 1.0f && !compressGamut) {
    job.table = PqTableLight();
    kPqTableToRec709[variant](src, dst, PixelCount(count), job);
    return;
  }
  job.applyMatrix = !matrix.IsUnity();
  job.luma = LumaWeights(Rec709Luma());
  (compressGamut ? kPqToRec709Compressed : kPqToRec709)[variant](src, dst, PixelCount(count), job);
}

void PQColorSpace::CompressPixelsToSDR(const float*, float*, int, float, float, float) const {}

HLGColorSpace::HLGColorSpace() { mGamma = 1.0f / 2.4f; }

float HLGColorSpace::LinearToEOTF(float linear) const { return linear; }
float HLGColorSpace::EOTFToLinear(float signal) const { return signal; }

void HLGColorSpace::ConvertPixelsFromRec709(const float* src, float* dst, int count, bool) const {
  HlgJob job;
  job.matrix = Matrix3(Rec709ToRec2020());
  kRec709ToHlg[ActiveKernelVariant()](src, dst, PixelCount(count), job);
}

void HLGColorSpace::ConvertPixelsToRec709(const float* src, float* dst, int count, bool) const {
  if (count < 1) return;
  HlgJob job;
  job.matrix = Matrix3(Rec2020ToRec709());
  job.table = HlgTableLight();
  kHlgToRec709[ActiveKernelVariant()](src, dst, PixelCount(count), job);
}

void HLGColorSpace::CompressPixelsToSDR(const float*, float*, int, float, float, float) const {}

}  // namespace VX
