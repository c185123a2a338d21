// Vexel: colour spaces. C++ only; the flat interface is vexel.h.
//
// Units: linear 1.0 is 100 cd/m2 (the white of a standard-range picture). Pixels are arrays of four floats in the order
// B, G, R, A; counts are in pixels; alpha is copied unchanged. Source and destination may be the same array; other
// overlap is undefined. Arrays need the alignment of float only. Matrices act on (R, G, B) or (X, Y, Z) columns.
//
// The hub is the Rec.709 working space: Rec.709 primaries with a pure 2.4 power law, odd-symmetric for negative values,
// so that colours outside the gamut survive a round trip.
//
// Nothing here reports an error or throws: counts below 1 do nothing, a singular matrix inverts to the identity, NaN
// and infinities follow the formulas. Every kernel variant gives the same bits; powers, logarithms and exponentials are
// within 1 ulp of correctly rounded. The functions leave the floating-point mode of the calling thread alone (rounding
// must be to nearest). All operations are reentrant, first use of the lazily filled caches included, as long as nobody
// assigns to the object meanwhile.
#ifndef VEXEL_COLOR_SPACE_H
#define VEXEL_COLOR_SPACE_H

#include <stdint.h>

#include "vexel/vexel.h"

// Standard white points, for ColorSpace::Illuminant.
enum VX_Illuminant : int32_t {
  VX_IlluminantD50 = 0,
  VX_IlluminantD55 = 1,
  VX_IlluminantD60 = 2,
  VX_IlluminantDCI = 3,
  VX_IlluminantD65 = 4,
  VX_IlluminantD75 = 5
};

// The shared objects of ColorSpace::WorkingSpace.
enum VX_WorkingSpace : int32_t {
  VX_WorkingSpaceRec709 = 0,
  VX_WorkingSpaceRec2020 = 1,
  VX_WorkingSpaceDCIP3D60 = 2,
  VX_WorkingSpaceDCIP3D65 = 3,
  VX_WorkingSpacePQRec2020 = 4,
  VX_WorkingSpacePQDCIP3 = 5
};

namespace VX {

// A row-major 3x3 matrix of floats.
class VX_API CSMatrix {
 public:
  CSMatrix() noexcept;  // The identity.
  CSMatrix(float m00, float m01, float m02, float m10, float m11, float m12, float m20, float m21, float m22) noexcept;
  CSMatrix(const CSMatrix& other) noexcept;
  CSMatrix(CSMatrix&& other) noexcept;
  CSMatrix& operator=(const CSMatrix& other) noexcept;
  CSMatrix& operator=(CSMatrix&& other) noexcept;

  // The three floats of a row; no bounds check.
  float* operator[](int row) noexcept;
  const float* operator[](int row) const noexcept;

  // Exact comparison of the elements; a NaN makes matrices unequal.
  bool operator==(const CSMatrix& other) const noexcept;
  // Exactly the identity, without tolerance.
  bool IsUnity() const noexcept;

  CSMatrix operator*(const CSMatrix& b) const noexcept;
  CSMatrix Transposed() const noexcept;

  // The inverse; the identity when the magnitude of the determinant is below 1e-6. `ok`, which may be null, receives
  // whether the matrix could be inverted.
  CSMatrix Inverted(bool* ok = nullptr) const noexcept;

  // v <- M * v, in place.
  void Transform(float* v) const noexcept;

 protected:
  explicit CSMatrix(int) noexcept;  // Elements uninitialised, for results that are written at once.

 private:
  float mElements[9];
};

// A colour space: primaries, white point, transfer function and conversions from and to the Rec.709 working space.
// The order of the virtual functions is part of the interface; there is no virtual destructor.
class VX_API ColorSpace {
 public:
  // CIE 1931 x, y of red, green and blue (six floats) and of white (two floats). They live as long as the object.
  virtual const float* Primaries() const = 0;
  virtual const float* WhitePoint() const = 0;
  // Weights of R, G and B in luma (three floats, which live as long as the object), or null.
  virtual const float* LuminanceCoeffs() const = 0;
  // Linear light to the signal value and back, for one channel value.
  virtual float LinearToEOTF(float linear) const = 0;
  virtual float EOTFToLinear(float signal) const = 0;
  // `count` pixels from or to the Rec.709 working space. `compressGamut`: pull colours outside the destination's gamut
  // into it (see PureGammaToPureGamma); not every space honours it.
  virtual void ConvertPixelsFromRec709(const float* src, float* dst, int count, bool compressGamut) const = 0;
  virtual void ConvertPixelsToRec709(const float* src, float* dst, int count, bool compressGamut) const = 0;
  // Compresses the tones of pixels of this space into standard range, colour kept by its chromaticity. a scales
  // luminance before the logarithmic curve, b is the slope of the curve's straight part, c the height where it ends.
  virtual void CompressPixelsToSDR(const float* src, float* dst, int count, float a, float b, float c) const = 0;

  // Linear RGB to CIE XYZ, white having Y = 1, and back. The reference stays valid for the life of the object.
  const CSMatrix& RGBtoXYZ() const;
  const CSMatrix& XYZtoRGB() const;

  // x, y of a standard illuminant (two floats; a third may be read, see below). No range check.
  static const float* Illuminant(VX_Illuminant illuminant);

  // Bradford adaptation: XYZ under the source white to XYZ under the destination white. Whites whose first *three*
  // floats agree within 1e-6 give exactly the identity, so arrays of your own need a third float that can be read.
  static CSMatrix CalculateAdaptationMatrix(const float* sourceWhite, const float* destinationWhite);

  // Linear RGB of one space to linear RGB of another, with Bradford adaptation where the white points differ by more
  // than 1e-6 in x or y.
  static CSMatrix CalculateConversionMatrix(const ColorSpace& source, const ColorSpace& destination);

  // A shared space, made on first request and never destroyed; sRGB for values that are not enumerated.
  static const ColorSpace& WorkingSpace(VX_WorkingSpace space);

 protected:
  ColorSpace();
  ColorSpace(const ColorSpace& other);
  ColorSpace(ColorSpace&& other);
  ColorSpace& operator=(const ColorSpace& other);
  ColorSpace& operator=(ColorSpace&& other);
  ~ColorSpace() = default;

  void CalculateMatrices() const;
  // Writes the weights of R, G and B in luma: the Y row of RGBtoXYZ().
  void CalculateLumaCoeffs(float* coeffs) const;

  mutable CSMatrix mRGBtoXYZ;
  mutable CSMatrix mXYZtoRGB;
  mutable bool mMatricesValid;  // Honoured, but never raised: the matrices follow the primaries at every call.
};

// IEC 61966-2-1 sRGB, also the base of the spaces on the Rec.709 primaries. The scalar functions test their thresholds
// against the signed value: every negative input takes the linear segment. The pixel converters test the magnitude.
class VX_API SRGBColorSpace : public ColorSpace {
 public:
  SRGBColorSpace();
  const float* Primaries() const override;
  const float* WhitePoint() const override;
  const float* LuminanceCoeffs() const override;
  float LinearToEOTF(float linear) const override;
  float EOTFToLinear(float signal) const override;
  void ConvertPixelsFromRec709(const float* src, float* dst, int count, bool compressGamut) const override;
  void ConvertPixelsToRec709(const float* src, float* dst, int count, bool compressGamut) const override;
  void CompressPixelsToSDR(const float* src, float* dst, int count, float a, float b, float c) const override;
};

// Rec.709 primaries with the pure power law signal = linear^gamma, odd-symmetric. CompressPixelsToSDR does nothing.
class VX_API GammaColorSpace : public SRGBColorSpace {
 public:
  explicit GammaColorSpace(float gamma);
  float LinearToEOTF(float linear) const override;
  float EOTFToLinear(float signal) const override;
  void ConvertPixelsFromRec709(const float* src, float* dst, int count, bool compressGamut) const override;
  void ConvertPixelsToRec709(const float* src, float* dst, int count, bool compressGamut) const override;
  void CompressPixelsToSDR(const float* src, float* dst, int count, float a, float b, float c) const override;

 protected:
  float mGamma;  // The encoding exponent.
};

// ITU-R BT.709 primaries, encoding exponent 1/2.4 (the display law of BT.1886): the working space itself. Conversions
// copy.
class VX_API Rec709ColorSpace : public GammaColorSpace {
 public:
  Rec709ColorSpace();
  void ConvertPixelsFromRec709(const float* src, float* dst, int count, bool compressGamut) const override;
  void ConvertPixelsToRec709(const float* src, float* dst, int count, bool compressGamut) const override;
  void CompressPixelsToSDR(const float* src, float* dst, int count, float a, float b, float c) const override;
};

// ITU-R BT.2020 primaries, encoding exponent 1/2.4, and its non-constant-luminance Y'CbCr.
class VX_API Rec2020ColorSpace : public Rec709ColorSpace {
 public:
  Rec2020ColorSpace();
  const float* Primaries() const override;
  const float* WhitePoint() const override;
  const float* LuminanceCoeffs() const override;
  void ConvertPixelsFromRec709(const float* src, float* dst, int count, bool compressGamut) const override;
  void ConvertPixelsToRec709(const float* src, float* dst, int count, bool compressGamut) const override;
  void CompressPixelsToSDR(const float* src, float* dst, int count, float a, float b, float c) const override;

  // Pixels V, U, Y, A (Cr, Cb, Y', alpha; chroma centred on 0) to B, G, R, A and back.
  virtual void ConvertPixelsFromYUVtoRGB(const float* src, float* dst, int count) const;
  virtual void ConvertPixelsFromRGBtoYUV(const float* src, float* dst, int count) const;

  // Two rows of P010 codes (10 bits at the top of 16, video range) that share a row of U, V pairs, one pair for two
  // pixels, to rows of B, G, R, A with A = 1. With an odd width the last pixel is taken as full range (see
  // docs/color.md), and `chroma` holds width + 1 codes.
  void Convert2RowsFromP010toRGB(const uint16_t* luma0, const uint16_t* luma1, const uint16_t* chroma, float* out0,
                                 float* out1, int width) const;
};

// SMPTE RP 431-2 (DCI-P3) primaries under a white point of choice, encoding exponent 1/2.6.
class VX_API DCIP3ColorSpace : public GammaColorSpace {
 public:
  explicit DCIP3ColorSpace(VX_Illuminant illuminant);
  DCIP3ColorSpace(const DCIP3ColorSpace& other);
  DCIP3ColorSpace(DCIP3ColorSpace&& other);
  DCIP3ColorSpace& operator=(const DCIP3ColorSpace& other);
  DCIP3ColorSpace& operator=(DCIP3ColorSpace&& other);
  const float* Primaries() const override;
  const float* WhitePoint() const override;
  const float* LuminanceCoeffs() const override;
  void ConvertPixelsFromRec709(const float* src, float* dst, int count, bool compressGamut) const override;
  void ConvertPixelsToRec709(const float* src, float* dst, int count, bool compressGamut) const override;
  void CompressPixelsToSDR(const float* src, float* dst, int count, float a, float b, float c) const override;

 protected:
  VX_Illuminant mIlluminant;
  mutable float mLumaCoeffs[3];  // First element 0: not computed yet.
  mutable CSMatrix mFromRec709;
  mutable CSMatrix mToRec709;
  mutable bool mFromRec709Valid;
  mutable bool mToRec709Valid;
};

// ITU-R BT.2100 hybrid log-gamma on the Rec.2020 primaries, for a display of ten times reference white and system gamma
// 1.2. The scalar functions return their argument, the conversions ignore the gamut switch, and CompressPixelsToSDR
// does nothing.
class VX_API HLGColorSpace : public Rec2020ColorSpace {
 public:
  HLGColorSpace();
  float LinearToEOTF(float linear) const override;
  float EOTFToLinear(float signal) const override;
  void ConvertPixelsFromRec709(const float* src, float* dst, int count, bool compressGamut) const override;
  void ConvertPixelsToRec709(const float* src, float* dst, int count, bool compressGamut) const override;
  void CompressPixelsToSDR(const float* src, float* dst, int count, float a, float b, float c) const override;
};

// SMPTE ST 2084 (perceptual quantiser) with the white D65. With a reference white the signal is scaled so that 100
// cd/m2 becomes 1. The scalar functions do not clamp. ConvertPixelsToRec709 without reference white and gamut
// compression looks signals up in 4,096 steps of [0, 1], without interpolation; otherwise it computes, for any signal.
// ConvertPixelsFromRec709 ignores the gamut switch, and CompressPixelsToSDR does nothing.
class VX_API PQColorSpace : public ColorSpace {
 public:
  // DCI-P3 D65 or Rec.2020 primaries.
  PQColorSpace(bool useDCIP3Primaries, bool useRefWhite);
  // Six floats of primaries (null counts as zeros).
  PQColorSpace(const float* primaries, bool useRefWhite);
  PQColorSpace(const PQColorSpace& other);
  PQColorSpace(PQColorSpace&& other);
  PQColorSpace& operator=(const PQColorSpace& other);
  PQColorSpace& operator=(PQColorSpace&& other);
  const float* Primaries() const override;
  const float* WhitePoint() const override;
  const float* LuminanceCoeffs() const override;
  float LinearToEOTF(float linear) const override;
  float EOTFToLinear(float signal) const override;
  void ConvertPixelsFromRec709(const float* src, float* dst, int count, bool compressGamut) const override;
  void ConvertPixelsToRec709(const float* src, float* dst, int count, bool compressGamut) const override;
  void CompressPixelsToSDR(const float* src, float* dst, int count, float a, float b, float c) const override;

 protected:
  void SetRefWhite();

  float mPrimaries[6];
  mutable float mLumaCoeffs[3];  // First element 0: not computed yet.
  float mRefWhite;               // The signal of reference white.
  bool mRefWhiteSet;
  DCIP3ColorSpace mDCIP3;
  mutable CSMatrix mFromRec709;
  mutable bool mFromRec709Valid;
  mutable CSMatrix mToRec709;
  mutable bool mToRec709Valid;
};

// Primaries and white point of your own, for matrices only: no luma coefficients (null), transfer functions that return
// their argument, conversions that do nothing. Unless both pointers are given with counts 6 and 2, primaries and white
// point stay uninitialised and must not be read.
class VX_API CustomColorSpace : public ColorSpace {
 public:
  CustomColorSpace(const float* primaries, uint8_t primariesCount, const float* whitePoint, uint8_t whitePointCount);
  const float* Primaries() const override;
  const float* WhitePoint() const override;
  const float* LuminanceCoeffs() const override;
  float LinearToEOTF(float linear) const override;
  float EOTFToLinear(float signal) const override;
  void ConvertPixelsFromRec709(const float* src, float* dst, int count, bool compressGamut) const override;
  void ConvertPixelsToRec709(const float* src, float* dst, int count, bool compressGamut) const override;
  void CompressPixelsToSDR(const float* src, float* dst, int count, float a, float b, float c) const override;

 protected:
  float mPrimaries[6];
  float mWhitePoint[2];
};

// Per channel, linear = sign(c)|c|^decodeExponent; (R, G, B) <- matrix; signal = sign(c)|c|^encodeExponent.
//
// With `compressGamut` and a matrix that is not exactly the identity, linear colours outside [0, 1] are brought inside
// between the two: negative channels by moving the colour toward its luma until the least one is 0 (lumaCoeffs: three
// weights of R, G and B; null counts as zeros), then channels above 1 by scaling about a pivot between 0.15 and 0.9,
// which makes the largest exactly 1. A colour that has no luma to move toward stays as it is.
VX_API void PureGammaToPureGamma(const float* src, float* dst, int count, float decodeExponent, float encodeExponent,
                                 const CSMatrix& matrix, bool compressGamut, const float* lumaCoeffs);

// Clamps floats to [lo, hi], NaN to lo, in rows of rowBytes / 4 floats at steps of rowBytes. The row walk is one
// behind: the first two of the `rows` passes both work on row 0 and the last row is left alone, so callers pass one row
// more than they want clamped; a single row is clamped.
VX_API void ClampFloatPixels(const float* src, float* dst, int rows, int rowBytes, float lo, float hi);

}  // namespace VX

#endif
