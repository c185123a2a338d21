#include "convert/RowConverter.h"

#include <algorithm>

#include "convert/RgbKernels.h"
#include "formats/FormatBits.h"
#include "frame/Scratch.h"
#include "frame/StreamCopy.h"

namespace vexel {
namespace {

// Six pixels are a whole number of pairs and groups, so blocks of them have exact byte counts in every format.
uint32_t BytesPerSixPixels(VX_PixelFormat format) {
  return static_cast<uint32_t>(UnpaddedRowBytes(format, kBlockMultiple));
}

// Powers take longer than memory does, so that nothing is gained by staging what they write.
bool OutlastsMemory(const RowKernelSet* kernel) {
  return kernel == &kBgra32fToLinear || kernel == &kBgrx32fToLinear || kernel == &kLinearToBgra32f ||
         kernel == &kLinearToBgrx32f;
}

// Steps that leave pixels as they are where alpha is 1.
bool ScalesByAlpha(const RowKernelSet* kernel) {
  return kernel == &kPremultiplyLast32f || kernel == &kPremultiplyFirst32f || kernel == &kUnpremultiplyLast32f ||
         kernel == &kUnpremultiplyFirst32f;
}

}  // namespace

VX_Result RowConverter::Prepare(VX_PixelFormat src, VX_PixelFormat dst, int32_t renderQuality, int32_t width,
                                KernelVariant variant) noexcept {
  Plan plan;
  if (const VX_Result result = MakePlan(src, dst, renderQuality, &plan)) return result;
  mWidth = static_cast<size_t>(std::max(width, 0));
  mDstFormat = dst;
  mSrcBytesPerSixPixels = BytesPerSixPixels(src);
  mDstBytesPerSixPixels = BytesPerSixPixels(dst);
  mVariant = variant;
  mIsCopy = src == dst;
  mStream = false;
  mReach = 0;
  mOutlastsMemory = false;
  // What had no alpha gets an opaque one on its way. Numbers that come from floats are left to their steps, which may
  // flush or quiet them.
  const bool opaque = !HasAlpha(src) && Depth(src) != kDepth32f;
  const RowKernelSet* before = nullptr;
  mStepCount = 0;
  for (int i = 0; i < plan.stepCount; ++i) {
    const RowKernelSet* kernel = plan.steps[i].kernel;
    if (opaque && ScalesByAlpha(kernel)) continue;
    if (before == &kWiden8uTo32f && kernel == &kBgra32fToLinear) {
      kernel = &kBgra8ToLinear;
      --mStepCount;
    }
    mSteps[mStepCount++] = (*kernel)[variant];
    if (plan.steps[i].span == StepSpan::Row) mReach += kReach;
    mOutlastsMemory |= OutlastsMemory(kernel);
    before = kernel;
  }
  if (const RowKernelSet* fused = FusedKernelFor(src, dst)) {
    mSteps[0] = (*fused)[variant];
    mStepCount = 1;
    mReach = kReach;
  }
  return VX_Success;
}

size_t RowConverter::ScratchRowBytes() const noexcept {
  // One 4 x 32-bit float pixel per pixel; V210 groups and pairs of the last few pixels fit in the rounding.
  return ScratchRounded(UnitPixels() * 16);
}

size_t RowConverter::ScratchBytes() const noexcept {
  const size_t rows = mIsCopy ? 0 : static_cast<size_t>(std::min(mStepCount - 1, 2)) + (mStream ? 1 : 0);
  return rows * ScratchRowBytes();
}

void RowConverter::RunSteps(const uint8_t* src, uint8_t* dst, size_t count) const noexcept {
  uint8_t* const ping = mScratch;
  uint8_t* const pong = mScratch + ScratchRowBytes();
  const uint8_t* from = src;
  for (int i = 0; i < mStepCount; ++i) {
    uint8_t* const to = i == mStepCount - 1 ? dst : i % 2 == 0 ? ping : pong;
    mSteps[i](from, to, count);
    from = to;
  }
}

void RowConverter::StreamInBlocks(const uint8_t* src, uint8_t* dst) const noexcept {
  const size_t block = StreamBlock();
  uint8_t* const staging = Staging();
  for (size_t done = 0; done < mWidth; done += block) {
    const size_t first = done - std::min(done, mReach), end = std::min(mWidth, done + block + mReach);
    RunSteps(src + first / kBlockMultiple * mSrcBytesPerSixPixels, staging, end - first);
    const auto count = static_cast<int64_t>(std::min(block, mWidth - done));
    StreamCopy(dst + done / kBlockMultiple * mDstBytesPerSixPixels,
               staging + (done - first) / kBlockMultiple * mDstBytesPerSixPixels,
               static_cast<size_t>(UnpaddedRowBytes(mDstFormat, count)), mVariant);
  }
}

void RowConverter::Convert(const void* srcRow, void* dstRow) const noexcept {
  const uint8_t* src = static_cast<const uint8_t*>(srcRow);
  uint8_t* dst = static_cast<uint8_t*>(dstRow);
  if (mIsCopy && mStream) {
    StreamCopy(dst, src, static_cast<size_t>(UnpaddedRowBytes(mDstFormat, static_cast<int64_t>(mWidth))), mVariant);
    return;
  }
  if (StreamsInBlocks()) return StreamInBlocks(src, dst);
  if (mStepCount == 1 && !mStream) {
    mSteps[0](src, dst, mWidth);
    return;
  }
  const size_t unit = UnitPixels();
  uint8_t* const staging = Staging();
  for (size_t done = 0; done < mWidth; done += unit) {
    const size_t count = std::min(unit, mWidth - done);
    const uint8_t* from = src + done / kBlockMultiple * mSrcBytesPerSixPixels;
    uint8_t* to = dst + done / kBlockMultiple * mDstBytesPerSixPixels;
    RunSteps(from, mStream ? staging : to, count);
    if (mStream)
      StreamCopy(to, staging, static_cast<size_t>(UnpaddedRowBytes(mDstFormat, static_cast<int64_t>(count))), mVariant);
  }
}

}  // namespace vexel
