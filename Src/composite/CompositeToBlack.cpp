// VX_CompositeToBlack and its testing sibling: the working format by destination, opacity and precision hint; rows
// that are opaque or clear as a whole.
#include <algorithm>
#include <atomic>

#include "composite/Opacity.h"
#include "composite/RowJob.h"
#include "composite/ToBlackKernels.h"
#include "formats/FormatBits.h"
#include "frame/FpModeGuard.h"
#include "vexel/compositing.h"

namespace vexel {
namespace {

using F = VX_PixelFormat;

// At partial opacity the 709 formats are worked on as 601, in the depth that the hint asks for.
F WorkingFormat(F dst, bool fullOpacity, int32_t precisionHint) noexcept {
  switch (dst) {
    case F::BGRA_4444_8u:
    case F::ARGB_4444_8u:
    case F::VUYA_4444_8u:
    case F::BGRA_4444_32f:
    case F::ARGB_4444_32f:
    case F::VUYA_4444_32f:
      return dst;
    case F::VUYA_4444_8u_709:
    case F::VUYA_4444_32f_709:
      if (fullOpacity) return dst;
      break;
    default:
      break;
  }
  const bool wide = precisionHint > 2;
  if (!IsYuv(dst)) return wide ? F::BGRA_4444_32f : F::BGRA_4444_8u;
  if (fullOpacity && Colorimetry(dst) == kColorimetry709) return wide ? F::VUYA_4444_32f_709 : F::VUYA_4444_8u_709;
  return wide ? F::VUYA_4444_32f : F::VUYA_4444_8u;
}

struct Kernels {
  ToBlackKernel toBlack;
  AlphaTest test;
};
Kernels KernelsFor(F working, KernelVariant variant) noexcept {
  const bool first = IsReversed(working);
  if (Depth(working) == kDepth32f)
    return {(first ? kToBlackFirst32f : kToBlackLast32f)[variant],
            (first ? kTestAlphaFirst32f : kTestAlphaLast32f)[variant]};
  return {(IsYuv(working) ? kToBlackVuya8u
           : first        ? kToBlackFirst8u
                          : kToBlackLast8u)[variant],
          (first ? kTestAlphaFirst8u : kTestAlphaLast8u)[variant]};
}

VX_Result ToBlack(const SourceImage& src, const TargetImage& dst, int32_t width, int32_t height, float opacity,
                  int32_t precisionHint) noexcept {
  if (IsSpecial(src.format)) return VX_ErrUnsupportedFormat;
  if (IsSpecial(dst.format)) return VX_ErrUnsupportedDestinationFormat;
  opacity = UsableOpacity(opacity);
  if (opacity == 0.0f) return VX_FillWithOpaqueBlack(dst.base, dst.rowBytes, width, height, dst.format);
  const F working = WorkingFormat(dst.format, opacity == 1.0f, precisionHint);
  RowJob job(width, height, precisionHint);
  if (job.AddSource(src, working)) return VX_ErrUnsupportedFormat;
  if (job.SetTarget(dst, working)) return VX_ErrUnsupportedDestinationFormat;
  bool done;
  const VX_Result check = job.CheckBuffers(&done);
  if (check != VX_Success || done) return check;
  const ToBlackKernel toBlack = KernelsFor(working, job.Variant()).toBlack;
  return job.Run([=](const RowSpan& span) { toBlack(span.src[0], span.dst, span.count, opacity); });
}

// The picture row by row: what a row needs depends on its alpha as a whole.
class TestedRows {
 public:
  TestedRows(const SourceImage& src, const TargetImage& dst, int32_t width, int32_t height) noexcept
      : mSrc(src),
        mDst(dst),
        mWidth(width),
        mHeight(height),
        mInPlace(src.base == dst.base && src.rowBytes == dst.rowBytes && src.format == dst.format),
        mUpsideDown(VX_IsOriginTopLeft(src.format) != VX_IsOriginTopLeft(dst.format)),
        mHasAlpha(HasAlpha(src.format)) {}

  VX_Result Prepare(F working, int32_t quality, KernelVariant variant) noexcept {
    mKernels = KernelsFor(working, variant);
    mFromSource = mSrc.format != working;
    mToTarget = mDst.format != working;
    if (mToWorking.Prepare(mSrc.format, working, quality, mWidth, variant)) return VX_ErrUnsupportedFormat;
    if (mFromWorking.Prepare(working, mDst.format, quality, mWidth, variant)) return VX_ErrUnsupportedDestinationFormat;
    // Where no direct way leads, opaque rows go through the working format like others.
    mHasDirect = mDirect.Prepare(mSrc.format, mDst.format, quality, mWidth, variant) == VX_Success;
    mConverterBytes = std::max(
        {mToWorking.ScratchBytes(), mFromWorking.ScratchBytes(), mHasDirect ? mDirect.ScratchBytes() : size_t{0}});
    return VX_Success;
  }

  VX_Result Run() noexcept {
    return RunInBands(mHeight, [this](int first, int end) { return RunBand(first, end); });
  }

  AlphaState State() const noexcept {
    return mAllOpaque.load() ? AlphaState::Opaque : mAllClear.load() ? AlphaState::Clear : AlphaState::Mixed;
  }

 private:
  VX_Result RunBand(int32_t first, int32_t end) noexcept {
    const size_t row = mFromSource || mToTarget ? static_cast<size_t>(mWidth) * 16 : 0;
    VX_SCRATCH(scratch, mConverterBytes + row);
    if (!scratch && mConverterBytes + row != 0) return VX_ErrOutOfMemory;
    Converters converters{mToWorking, mFromWorking, mDirect};
    converters.UseScratch(scratch.get());
    for (int32_t i = first; i < end; ++i) RunRow(i, converters, scratch.get() + mConverterBytes);
    return VX_Success;
  }

  struct Converters {
    RowConverter toWorking, fromWorking, direct;
    void UseScratch(uint8_t* memory) noexcept {
      for (RowConverter* converter : {&toWorking, &fromWorking, &direct}) converter->UseScratch(memory);
    }
  };

  void RunRow(int32_t row, const Converters& converters, uint8_t* scratch) noexcept {
    const ptrdiff_t stored = mUpsideDown ? mHeight - 1 - row : row;
    const uint8_t* const from = static_cast<const uint8_t*>(mSrc.base) + stored * mSrc.rowBytes;
    uint8_t* const to = static_cast<uint8_t*>(mDst.base) + ptrdiff_t{row} * mDst.rowBytes;
    const uint8_t* pixels = from;
    AlphaState state = AlphaState::Opaque;
    if (mHasAlpha || !mHasDirect) {
      if (mFromSource) {
        converters.toWorking.Convert(from, scratch);
        pixels = scratch;
      }
      state = mKernels.test(pixels, static_cast<size_t>(mWidth));
    }
    if (state != AlphaState::Opaque) mAllOpaque.store(false, std::memory_order_relaxed);
    if (state != AlphaState::Clear) mAllClear.store(false, std::memory_order_relaxed);
    if (state == AlphaState::Clear && FillRow(to)) return;
    if (state == AlphaState::Opaque && mHasDirect) {
      if (!mInPlace) converters.direct.Convert(from, to);
      return;
    }
    uint8_t* const result = mToTarget ? scratch : to;
    mKernels.toBlack(pixels, result, static_cast<size_t>(mWidth), 1.0f);
    if (mToTarget) converters.fromWorking.Convert(result, to);
  }

  bool FillRow(uint8_t* row) const noexcept {
    const auto rowBytes = static_cast<int32_t>(UnpaddedRowBytes(mDst.format, mWidth));
    return VX_FillWithOpaqueBlack(row, rowBytes, mWidth, 1, mDst.format) == VX_Success;
  }

  const SourceImage mSrc;
  const TargetImage mDst;
  const int32_t mWidth, mHeight;
  const bool mInPlace, mUpsideDown, mHasAlpha;
  bool mFromSource = false, mToTarget = false, mHasDirect = false;
  Kernels mKernels{};
  RowConverter mToWorking, mFromWorking, mDirect;
  size_t mConverterBytes = 0;
  std::atomic<bool> mAllOpaque{true}, mAllClear{true};
};

VX_Result ToBlackTested(const SourceImage& src, const TargetImage& dst, int32_t width, int32_t height,
                        int32_t* alphaState, int32_t precisionHint) noexcept {
  if (IsSpecial(src.format)) return VX_ErrUnsupportedFormat;
  if (IsSpecial(dst.format)) return VX_ErrUnsupportedDestinationFormat;
  const F working = WorkingFormat(dst.format, true, precisionHint);
  RowJob job(width, height, precisionHint);
  if (job.AddSource(src, working)) return VX_ErrUnsupportedFormat;
  if (job.SetTarget(dst, working)) return VX_ErrUnsupportedDestinationFormat;
  bool done;
  const VX_Result check = job.CheckBuffers(&done);
  if (check != VX_Success) return check;
  TestedRows rows(src, dst, width, height);
  if (!done) {
    if (const VX_Result result = rows.Prepare(working, precisionHint, job.Variant())) return result;
    if (const VX_Result result = rows.Run()) return result;
  }
  if (alphaState) *alphaState = static_cast<int32_t>(rows.State());
  return VX_Success;
}

}  // namespace
}  // namespace vexel

VX_Result VX_CompositeToBlack(const void* src, int32_t srcRowBytes, VX_PixelFormat srcFormat, void* dst,
                              int32_t dstRowBytes, VX_PixelFormat dstFormat, int32_t width, int32_t height,
                              float opacity, int32_t precisionHint) noexcept {
  const vexel::FpModeGuard fpMode;
  return vexel::ToBlack({src, srcRowBytes, srcFormat}, {dst, dstRowBytes, dstFormat}, width, height, opacity,
                        precisionHint);
}

VX_Result VX_CompositeToBlackAndTestSourceAlpha(const void* src, int32_t srcRowBytes, VX_PixelFormat srcFormat,
                                                void* dst, int32_t dstRowBytes, VX_PixelFormat dstFormat, int32_t width,
                                                int32_t height, int32_t* alphaState, int32_t precisionHint) noexcept {
  const vexel::FpModeGuard fpMode;
  return vexel::ToBlackTested({src, srcRowBytes, srcFormat}, {dst, dstRowBytes, dstFormat}, width, height, alphaState,
                              precisionHint);
}
