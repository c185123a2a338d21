#include <bit>
#include <cmath>
#include <cstdint>
#include <cstring>

#include "color/LazyCache.h"
#include "vexel/color_space.h"

namespace vexel {

std::mutex& LazyCacheMutex() noexcept {
  static std::mutex mutex;
  return mutex;
}

namespace {

bool SameBits(float* target, float value, std::memory_order order) {
  return std::bit_cast<uint32_t>(std::atomic_ref<float>(*target).load(order)) == std::bit_cast<uint32_t>(value);
}

}  // namespace

void WriteOnce(float* target, const float* values, int count) noexcept {
  int same = 0;
  while (same < count && SameBits(target + same, values[same], std::memory_order_acquire)) ++same;
  if (same == count) return;
  const std::lock_guard<std::mutex> lock(LazyCacheMutex());
  for (int i = count - 1; i >= 0; --i)
    if (!SameBits(target + i, values[i], std::memory_order_relaxed))
      std::atomic_ref<float>(target[i]).store(values[i], std::memory_order_release);
}

}  // namespace vexel

namespace VX {
namespace {

// One float more than the entries need: the adaptation's test reads three.
constexpr float kIlluminants[] = {0.34567f, 0.3585f,  0.33242f, 0.34743f, 0.32168f, 0.33767f, 0.314f,
                                  0.351f,   0.31271f, 0.32902f, 0.29902f, 0.31485f, 0.0f};

constexpr float kWhiteTolerance = 1e-6f;

struct Xyz {
  float v[3];
};

Xyz FromChromaticity(const float* xy) { return {{xy[0] / xy[1], 1.0f, (1.0f - xy[0] - xy[1]) / xy[1]}}; }

bool NearlyEqual(float a, float b) { return std::fabs(a - b) <= kWhiteTolerance; }

}  // namespace

ColorSpace::ColorSpace() : mMatricesValid(false) {}

ColorSpace::ColorSpace(const ColorSpace& other) { *this = other; }
ColorSpace::ColorSpace(ColorSpace&& other) { *this = other; }

ColorSpace& ColorSpace::operator=(const ColorSpace& other) {
  if (this == &other) return *this;
  const std::lock_guard<std::mutex> lock(vexel::LazyCacheMutex());
  mRGBtoXYZ = other.mRGBtoXYZ;
  mXYZtoRGB = other.mXYZtoRGB;
  mMatricesValid = other.mMatricesValid;
  return *this;
}

ColorSpace& ColorSpace::operator=(ColorSpace&& other) { return *this = other; }

void ColorSpace::CalculateMatrices() const {
  const vexel::DefaultFpMode mode;
  const float* primaries = Primaries();
  CSMatrix toXyz;
  for (int i = 0; i < 3; ++i) {
    const Xyz column = FromChromaticity(primaries + 2 * i);
    for (int r = 0; r < 3; ++r) toXyz[r][i] = column.v[r];
  }
  Xyz scale = FromChromaticity(WhitePoint());
  toXyz.Inverted().Transform(scale.v);
  for (int r = 0; r < 3; ++r)
    for (int i = 0; i < 3; ++i) toXyz[r][i] *= scale.v[i];
  const CSMatrix fromXyz = toXyz.Inverted();
  vexel::WriteOnce(mRGBtoXYZ[0], toXyz[0], 9);
  vexel::WriteOnce(mXYZtoRGB[0], fromXyz[0], 9);
}

const CSMatrix& ColorSpace::RGBtoXYZ() const {
  if (!mMatricesValid) CalculateMatrices();
  return mRGBtoXYZ;
}

const CSMatrix& ColorSpace::XYZtoRGB() const {
  if (!mMatricesValid) CalculateMatrices();
  return mXYZtoRGB;
}

void ColorSpace::CalculateLumaCoeffs(float* coeffs) const {
  for (int i = 0; i < 3; ++i) coeffs[i] = RGBtoXYZ()[1][i];
}

const float* ColorSpace::Illuminant(VX_Illuminant illuminant) {
  return kIlluminants + 2 * static_cast<ptrdiff_t>(illuminant);
}

CSMatrix ColorSpace::CalculateAdaptationMatrix(const float* sourceWhite, const float* destinationWhite) {
  // Three floats on purpose: whites of the illuminant table are told apart by entry, not by chromaticity alone.
  if (NearlyEqual(sourceWhite[0], destinationWhite[0]) && NearlyEqual(sourceWhite[1], destinationWhite[1]) &&
      NearlyEqual(sourceWhite[2], destinationWhite[2]))
    return CSMatrix();

  const CSMatrix toCones(0.8951f, 0.2664f, -0.1614f, -0.7502f, 1.7135f, 0.0367f, 0.0389f, -0.0685f, 1.0296f);
  Xyz source = FromChromaticity(sourceWhite);
  Xyz destination = FromChromaticity(destinationWhite);
  toCones.Transform(source.v);
  toCones.Transform(destination.v);
  CSMatrix gain;
  for (int i = 0; i < 3; ++i) gain[i][i] = destination.v[i] / source.v[i];
  return toCones.Inverted() * gain * toCones;
}

CSMatrix ColorSpace::CalculateConversionMatrix(const ColorSpace& source, const ColorSpace& destination) {
  const float* sourceWhite = source.WhitePoint();
  const float* destinationWhite = destination.WhitePoint();
  const CSMatrix& toXyz = source.RGBtoXYZ();
  const CSMatrix& fromXyz = destination.XYZtoRGB();
  const bool differ = std::fabs(sourceWhite[0] - destinationWhite[0]) > kWhiteTolerance ||
                      std::fabs(sourceWhite[1] - destinationWhite[1]) > kWhiteTolerance;
  if (!differ) return fromXyz * toXyz;
  return fromXyz * CalculateAdaptationMatrix(sourceWhite, destinationWhite) * toXyz;
}

const ColorSpace& ColorSpace::WorkingSpace(VX_WorkingSpace space) {
  switch (space) {
    case VX_WorkingSpaceRec709: {
      static const Rec709ColorSpace rec709;
      return rec709;
    }
    case VX_WorkingSpaceRec2020: {
      static const Rec2020ColorSpace rec2020;
      return rec2020;
    }
    case VX_WorkingSpaceDCIP3D60: {
      static const DCIP3ColorSpace p3d60(VX_IlluminantD60);
      return p3d60;
    }
    case VX_WorkingSpaceDCIP3D65: {
      static const DCIP3ColorSpace p3d65(VX_IlluminantD65);
      return p3d65;
    }
    case VX_WorkingSpacePQRec2020: {
      static const PQColorSpace pqRec2020(false, true);
      return pqRec2020;
    }
    case VX_WorkingSpacePQDCIP3: {
      static const PQColorSpace pqP3(true, true);
      return pqP3;
    }
  }
  static const SRGBColorSpace srgb;
  return srgb;
}

CustomColorSpace::CustomColorSpace(const float* primaries, uint8_t primariesCount, const float* whitePoint,
                                   uint8_t whitePointCount) {
  if (!primaries || !whitePoint || primariesCount != 6 || whitePointCount != 2) return;
  std::memcpy(mPrimaries, primaries, sizeof mPrimaries);
  std::memcpy(mWhitePoint, whitePoint, sizeof mWhitePoint);
}

const float* CustomColorSpace::Primaries() const { return mPrimaries; }
const float* CustomColorSpace::WhitePoint() const { return mWhitePoint; }
const float* CustomColorSpace::LuminanceCoeffs() const { return nullptr; }
float CustomColorSpace::LinearToEOTF(float linear) const { return linear; }
float CustomColorSpace::EOTFToLinear(float signal) const { return signal; }
void CustomColorSpace::ConvertPixelsFromRec709(const float*, float*, int, bool) const {}
void CustomColorSpace::ConvertPixelsToRec709(const float*, float*, int, bool) const {}
void CustomColorSpace::CompressPixelsToSDR(const float*, float*, int, float, float, float) const {}

}  // namespace VX
