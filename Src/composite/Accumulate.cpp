// Weighted sums of images.
#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <new>

#include "composite/DissolveKernels.h"
#include "composite/RowJob.h"
#include "convert/RgbKernels.h"
#include "formats/FormatBits.h"
#include "frame/FpModeGuard.h"
#include "frame/Scratch.h"
#include "vexel/compositing.h"

namespace vexel {
namespace {

struct Sources {
  const void* const* bases;
  const int32_t* rowBytes;
  const VX_PixelFormat* formats;
  const float* weights;
  int32_t count;

  float Weight(int32_t i) const noexcept { return weights ? weights[i] : 1.0f; }
};

const RowKernelSet* OpaqueKernelFor(VX_PixelFormat format) noexcept {
  if (AlphaKind(format) != kAlphaIgnored) return nullptr;
  return IsReversed(format) ? &kOpaqueFirst32f : &kOpaqueLast32f;
}

// Sums up block by block in floats and brings each sum into the destination once. Unlike a RowJob it takes any number
// of images.
class Accumulation {
 public:
  Accumulation(const Sources& sources, const TargetImage& target, int32_t width, int32_t height) noexcept
      : mSources(sources),
        mTarget(target),
        mSumFormat(InFloat(target.format)),
        mWidth(width),
        mHeight(height),
        mOpaque(OpaqueKernelFor(mSumFormat)) {}

  // Takes memory for as many converters as there are sources. Codes as MakePlan.
  VX_Result Prepare(uint8_t* converters, int32_t quality) noexcept {
    mConverters = reinterpret_cast<RowConverter*>(converters);
    if (const VX_Result result = mOut.Prepare(mSumFormat, mTarget.format, quality, mWidth, mVariant)) return result;
    bool whole = !mOut.IsPointWise();
    size_t own = mOut.ScratchBytes();
    for (int32_t i = 0; i < mSources.count; ++i) {
      RowConverter* const converter = new (mConverters + i) RowConverter;
      if (const VX_Result result = converter->Prepare(mSources.formats[i], mSumFormat, quality, mWidth, mVariant))
        return result;
      whole |= !converter->IsPointWise();
      own = std::max(own, converter->ScratchBytes());
    }
    mBlock = whole ? mWidth : std::min(mWidth, static_cast<int32_t>(kChainBlock));
    mConverterBytes = ScratchRounded(own);
    mRowBytes = ScratchRounded(static_cast<size_t>(mBlock) * 16);
    return VX_Success;
  }

  VX_Result Run() noexcept {
    return RunInBands(mHeight, [this](int first, int end) { return RunBand(first, end); });
  }

 private:
  VX_Result RunBand(int32_t first, int32_t end) noexcept {
    VX_SCRATCH(scratch, mConverterBytes + 2 * mRowBytes);
    if (!scratch) return VX_ErrOutOfMemory;
    for (int32_t row = first; row < end; ++row)
      for (int32_t column = 0; column < mWidth; column += mBlock)
        SumBlock(row, column, std::min(mBlock, mWidth - column), scratch.get());
    return VX_Success;
  }

  void SumBlock(int32_t row, int32_t column, int32_t pixels, uint8_t* scratch) const noexcept {
    uint8_t* const values = scratch + mConverterBytes;
    uint8_t* const sums = values + mRowBytes;
    const auto bytes = static_cast<size_t>(UnpaddedRowBytes(mSumFormat, pixels));
    std::memset(sums, 0, bytes);
    for (int32_t i = 0; i < mSources.count; ++i) {
      const float weight = mSources.Weight(i);
      if (weight == 0) continue;
      const VX_PixelFormat format = mSources.formats[i];
      const bool upsideDown = VX_IsOriginTopLeft(format) != VX_IsOriginTopLeft(mTarget.format);
      const uint8_t* from = static_cast<const uint8_t*>(mSources.bases[i]) + UnpaddedRowBytes(format, column) +
                            static_cast<ptrdiff_t>(upsideDown ? mHeight - 1 - row : row) * mSources.rowBytes[i];
      if (format != mSumFormat) from = Convert(mConverters[i], from, values, pixels, scratch);
      kAddScaled[mVariant](from, sums, sums, bytes, weight);
    }
    const uint8_t* sum = sums;
    if (mOpaque) (*mOpaque)[mVariant](sums, values, static_cast<size_t>(pixels)), sum = values;
    uint8_t* const to = static_cast<uint8_t*>(mTarget.base) + UnpaddedRowBytes(mTarget.format, column) +
                        static_cast<ptrdiff_t>(row) * mTarget.rowBytes;
    Convert(mOut, sum, to, pixels, scratch);
  }

  const uint8_t* Convert(const RowConverter& prepared, const uint8_t* from, uint8_t* to, int32_t pixels,
                         uint8_t* scratch) const noexcept {
    RowConverter converter(prepared);
    converter.UseScratch(scratch);
    if (converter.IsPointWise() && mBlock <= static_cast<int32_t>(kChainBlock))
      converter.ConvertBlock(from, to, static_cast<size_t>(pixels));
    else
      converter.Convert(from, to);
    return to;
  }

  const Sources mSources;
  const TargetImage mTarget;
  const VX_PixelFormat mSumFormat;
  const int32_t mWidth, mHeight;
  const RowKernelSet* const mOpaque;
  const KernelVariant mVariant = ActiveKernelVariant();
  RowConverter* mConverters = nullptr;
  RowConverter mOut;
  int32_t mBlock = 0;
  size_t mConverterBytes = 0, mRowBytes = 0;
};

VX_Result CheckFormats(const Sources& sources, VX_PixelFormat dst, int32_t quality) noexcept {
  if (std::any_of(sources.formats, sources.formats + sources.count, IsSpecial)) return VX_ErrUnsupportedFormat;
  if (IsSpecial(dst)) return VX_ErrUnsupportedDestinationFormat;
  Plan plan;
  VX_Result result = MakePlan(dst, dst, quality, &plan);
  for (int32_t i = 0; i < sources.count && result == VX_Success; ++i)
    result = MakePlan(sources.formats[i], InFloat(dst), quality, &plan);
  return result;
}

VX_Result CheckBuffers(const Sources& sources, const TargetImage& target, int32_t width, int32_t height,
                       bool* done) noexcept {
  if (width < 0 || height < 0) return VX_ErrArgumentOutOfRange;
  *done = width == 0 || height == 0;
  if (*done) return VX_Success;
  const auto fits = [&](VX_PixelFormat format) { return UnpaddedRowBytes(format, width) <= INT32_MAX; };
  if (!fits(target.format) || !std::all_of(sources.formats, sources.formats + sources.count, fits))
    return VX_ErrArgumentOutOfRange;
  if (std::find(sources.bases, sources.bases + sources.count, nullptr) != sources.bases + sources.count)
    return VX_ErrNullSource;
  return target.base ? VX_Success : VX_ErrNullDestination;
}

// The sum of no images.
VX_Result FillWithZeros(const TargetImage& target, int32_t width, int32_t height) noexcept {
  return (HasAlpha(target.format) ? VX_FillWithTransparentBlack : VX_FillWithOpaqueBlack)(target.base, target.rowBytes,
                                                                                          width, height, target.format);
}

}  // namespace
}  // namespace vexel

using namespace vexel;

VX_Result VX_Accumulate(const void* const* srcs, const int32_t* srcRowBytes, const VX_PixelFormat* srcFormats,
                        int32_t count, void* dst, int32_t dstRowBytes, VX_PixelFormat dstFormat, int32_t width,
                        int32_t height, const float* weights, int32_t precisionHint) noexcept {
  const FpModeGuard fpMode;
  if (count < 0) return VX_ErrArgumentOutOfRange;
  if (count > 0 && (!srcs || !srcRowBytes || !srcFormats)) return VX_ErrNullSource;
  const Sources sources{srcs, srcRowBytes, srcFormats, weights, count};
  const TargetImage target{dst, dstRowBytes, dstFormat};
  if (const VX_Result result = CheckFormats(sources, dstFormat, precisionHint)) return result;
  bool done;
  const VX_Result check = CheckBuffers(sources, target, width, height, &done);
  if (check != VX_Success || done) return check;
  if (count == 0) return FillWithZeros(target, width, height);

  VX_SCRATCH(converters, static_cast<size_t>(count) * sizeof(RowConverter));
  if (!converters) return VX_ErrOutOfMemory;
  Accumulation accumulation(sources, target, width, height);
  if (const VX_Result result = accumulation.Prepare(converters.get(), precisionHint)) return result;
  return accumulation.Run();
}
