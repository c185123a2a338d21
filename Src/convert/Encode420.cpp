// Encoding of rasters into planar 4:2:0 blocks.
#include <algorithm>

#include "convert/Encode420Kernels.h"
#include "convert/Planar420.h"
#include "convert/RowConverter.h"
#include "convert/YuvMatrices.h"
#include "frame/FpModeGuard.h"
#include "frame/Scratch.h"

namespace vexel {

using namespace encode420;

namespace {

// Quality of conversions on the way: chroma of 4:2:2 sources is interpolated before it is filtered.
constexpr int32_t kRowQuality = 2;

bool CanEncode(VX_PixelFormat format) noexcept {
  if (!Is420(format) || IsBiplanar(format) || Depth(format) != kDepth8u) return false;
  return Colorimetry(format) == kColorimetry709 || (Colorimetry(format) == 0 && !IsVideoRange(format));
}

constexpr int16_t Factor(double value) { return static_cast<int16_t>(value * 32768 + (value < 0 ? -0.5 : 0.5)); }

// The green factor takes the rounding of the others, so that grey keeps its code and has no chroma.
constexpr BgrFactors Factors(double b, double r, int total) {
  return {Factor(b), static_cast<int16_t>(total - Factor(b) - Factor(r)), Factor(r)};
}

struct Encoding {
  BgrFactors luma;
  ChromaFactors chroma;
};
constexpr Encoding EncodingOf(const YuvMatrix& m) {
  return {Factors(m.yB, m.yR, 32768), {Factors(m.uB, m.uR, 0), Factors(m.vB, m.vR, 0)}};
}
constexpr Encoding kEncoding601 = EncodingOf(kBt601), kEncoding709 = EncodingOf(kBt709);

// The lines that make a chroma row, and their weights in quarters. Each line belongs to one pair; a picture of an odd
// number of line pairs in fields has a pair more than chroma rows.
struct LinePair {
  int64_t a, b;
  int weightA, weightB;
};

LinePair PairOf(int64_t row, bool oneField) noexcept {
  if (!oneField) return {2 * row, 2 * row + 1, 2, 2};
  const int64_t parity = row % 2, first = row / 2 * 4 + parity;
  return parity == 0 ? LinePair{first, first + 2, 3, 1} : LinePair{first, first + 2, 1, 3};
}

class Encoder {
 public:
  Encoder(VX_PixelFormat dstFormat, void* dst, int32_t width, int32_t height) noexcept
      : mWidth(width),
        mHeight(height),
        mMakeLuma((IsVideoRange(dstFormat) ? kLumaFromVuyx : kLumaFromBgrx)[mVariant]),
        mMakeChroma((IsVideoRange(dstFormat) ? kChromaFromVuyx : kChromaFromBgrx)[mVariant]),
        mEncoding(Colorimetry(dstFormat) == 0 ? kEncoding601 : kEncoding709),
        mOneField(IsFieldPicture(dstFormat)),
        mChromaWidth(ChromaWidth(PictureFromBlock(dst, dstFormat, width, height))) {
    VX_GetPlanarBuffers(dst, dstFormat, width, height, mPlanes, mRowBytes);
    if (IsReversed(dstFormat)) std::swap(mPlanes[1], mPlanes[2]);
  }

  VX_Result Run(const uint8_t* top, ptrdiff_t rowBytes, RowConverter* converter) noexcept;

 private:
  const uint8_t* Line(int64_t line, uint8_t* converted) const noexcept;
  uint8_t* PlaneRow(int plane, int64_t row) const noexcept {
    return static_cast<uint8_t*>(mPlanes[plane]) + row * mRowBytes[plane];
  }
  void WriteChroma(const uint8_t* a, const uint8_t* b, const LinePair& pair, int64_t row,
                   const SumRows& sums) const noexcept;

  KernelVariant mVariant = ActiveKernelVariant();
  int32_t mWidth, mHeight;
  MakeLuma mMakeLuma;
  MakeChroma mMakeChroma;
  const Encoding& mEncoding;
  bool mOneField;
  int32_t mChromaWidth;
  void* mPlanes[3];
  int32_t mRowBytes[3];
  const uint8_t* mTop = nullptr;
  ptrdiff_t mSrcRowBytes = 0;
  const RowConverter* mConverter = nullptr;
};

const uint8_t* Encoder::Line(int64_t line, uint8_t* converted) const noexcept {
  const uint8_t* row = mTop + line * mSrcRowBytes;
  if (!mConverter) return row;
  mConverter->Convert(row, converted);
  return converted;
}

void Encoder::WriteChroma(const uint8_t* a, const uint8_t* b, const LinePair& pair, int64_t row,
                          const SumRows& sums) const noexcept {
  kSumLines[mVariant](a, b, pair.weightA, pair.weightB, sums, static_cast<size_t>(mWidth));
  for (uint16_t* const pixels : {sums.outer, sums.inner}) {  // the edges go on
    std::copy_n(pixels, 2, pixels - 2);
    std::copy_n(pixels + 2 * ptrdiff_t{mWidth} - 2, 2, pixels + 2 * ptrdiff_t{mWidth});
  }
  mMakeChroma(sums, mEncoding.chroma, PlaneRow(1, row), PlaneRow(2, row), static_cast<size_t>(mChromaWidth));
}

VX_Result Encoder::Run(const uint8_t* top, ptrdiff_t rowBytes, RowConverter* converter) noexcept {
  mTop = top;
  mSrcRowBytes = rowBytes;
  mConverter = converter;
  const auto pad = [](size_t bytes) { return (bytes + 63) & ~size_t{63}; };
  const auto width = static_cast<size_t>(mWidth);
  const size_t pixelBytes = converter ? pad(4 * width) : 0, converterBytes = converter ? converter->ScratchBytes() : 0;
  const size_t sumWords = pad(2 * width + 2 * kSumSlack);
  VX_SCRATCH(scratch, 2 * pixelBytes + 4 * sumWords + converterBytes);
  if (!scratch) return VX_ErrOutOfMemory;
  uint8_t* const rows[2] = {scratch.get(), scratch.get() + pixelBytes};
  auto* const words = reinterpret_cast<uint16_t*>(scratch.get() + 2 * pixelBytes) + kSumSlack;
  const SumRows sums = {words, words + sumWords};
  if (converter) converter->UseScratch(scratch.get() + 2 * pixelBytes + 4 * sumWords);

  const int64_t chromaRows = mHeight / 2 + mHeight % 2, pairs = chromaRows + (mOneField ? 1 : 0);
  for (int64_t row = 0; row < pairs; ++row) {
    const LinePair pair = PairOf(row, mOneField);
    if (pair.a >= mHeight) continue;
    const uint8_t* const a = Line(pair.a, rows[0]);
    const uint8_t* const b = pair.b < mHeight ? Line(pair.b, rows[1]) : a;
    mMakeLuma(a, mEncoding.luma, PlaneRow(0, pair.a), width);
    if (b != a) mMakeLuma(b, mEncoding.luma, PlaneRow(0, pair.b), width);
    if (row < chromaRows && mChromaWidth > 0) WriteChroma(a, b, pair, row, sums);
  }
  return VX_Success;
}

}  // namespace

VX_Result Encode420(const void* src, int32_t srcRowBytes, VX_PixelFormat srcFormat, void* dst, VX_PixelFormat dstFormat,
                    int32_t width, int32_t height) noexcept {
  if (IsSpecial(srcFormat) || !CanEncode(dstFormat)) return VX_ErrFormatNotHandled;
  const FpModeGuard fpMode;
  const VX_PixelFormat working =
      IsVideoRange(dstFormat) ? VX_PixelFormat::VUYX_4444_8u_709 : VX_PixelFormat::BGRX_4444_8u;
  RowConverter converter;
  if (const VX_Result result = converter.Prepare(srcFormat, working, kRowQuality, width)) return result;
  if (width < 1 || height < 1) return VX_Success;
  if (!src) return VX_ErrNullSource;
  if (!dst) return VX_ErrNullDestination;
  const auto* top = static_cast<const uint8_t*>(src);
  ptrdiff_t rowBytes = srcRowBytes;
  if (VX_IsOriginBottomLeft(srcFormat)) {
    top += (height - 1) * rowBytes;
    rowBytes = -rowBytes;
  }
  return Encoder(dstFormat, dst, width, height).Run(top, rowBytes, srcFormat == working ? nullptr : &converter);
}

}  // namespace vexel
