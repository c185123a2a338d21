#include "composite/RowJob.h"

#include <algorithm>

#include "formats/FormatBits.h"
#include "frame/StreamCopy.h"

namespace vexel {
VX_Result CopyPicture(const SourceImage& image, const TargetImage& target, int32_t width, int32_t height,
                      int32_t renderQuality) noexcept {
  const bool isThere =
      image.base && image.base == target.base && image.rowBytes == target.rowBytes && image.format == target.format;
  const bool refused = width < 0 || height < 0;
  const VX_Result result = VX_Convert(image.base, image.rowBytes, image.format, target.base, target.rowBytes,
                                      target.format, width, isThere || refused ? 0 : height, renderQuality);
  return result == VX_Success && refused ? VX_ErrArgumentOutOfRange : result;
}

VX_Result RowJob::Prepare(Side& side, const void* base, int32_t rowBytes, VX_PixelFormat format, VX_PixelFormat from,
                          VX_PixelFormat to) noexcept {
  side.base = static_cast<uint8_t*>(const_cast<void*>(base));  // sources are only read
  side.rowBytes = rowBytes;
  side.format = format;
  side.working = format == from ? to : from;
  side.bytesPerSixPixels = static_cast<uint32_t>(UnpaddedRowBytes(format, kBlockMultiple));
  side.converts = from != to;
  return side.converts ? side.converter.Prepare(from, to, mRenderQuality, mWidth, mVariant) : VX_Success;
}

VX_Result RowJob::AddSource(const SourceImage& image, VX_PixelFormat working) noexcept {
  return Prepare(mSources[mSourceCount++], image.base, image.rowBytes, image.format, image.format, working);
}

VX_Result RowJob::SetTarget(const TargetImage& image, VX_PixelFormat working) noexcept {
  return Prepare(mTarget, image.base, image.rowBytes, image.format, working, image.format);
}

VX_Result RowJob::CheckBuffers(bool* done) noexcept {
  *done = false;
  if (mWidth < 0 || mHeight < 0) return VX_ErrArgumentOutOfRange;
  *done = mWidth == 0 || mHeight == 0;
  if (*done) return VX_Success;
  const auto fits = [this](const Side& side) { return UnpaddedRowBytes(side.format, mWidth) <= INT32_MAX; };
  if (!fits(mTarget) || !std::all_of(mSources, mSources + mSourceCount, fits)) return VX_ErrArgumentOutOfRange;
  for (int i = 0; i < mSourceCount; ++i)
    if (!mSources[i].base) return VX_ErrNullSource;
  return mTarget.base ? VX_Success : VX_ErrNullDestination;
}

bool RowJob::TargetIsASource() const noexcept {
  return std::any_of(mSources, mSources + mSourceCount, [this](const Side& side) { return side.base == mTarget.base; });
}

void RowJob::Layout() noexcept {
  int64_t bytes = UnpaddedRowBytes(mTarget.format, mWidth);
  bool whole = mTarget.converts && !mTarget.converter.IsPointWise(), converts = mTarget.converts;
  for (int i = 0; i < mSourceCount; ++i) {
    Side& side = mSources[i];
    side.upsideDown = VX_IsOriginTopLeft(side.format) != VX_IsOriginTopLeft(mTarget.format);
    bytes += UnpaddedRowBytes(side.format, mWidth);
    whole |= side.converts && !side.converter.IsPointWise();
    converts |= side.converts;
  }
  // Small pixels gain from longer blocks; much longer ones keep reads and writes to memory too far apart.
  const bool isLong = !converts && mTarget.bytesPerSixPixels <= 4 * kBlockMultiple;
  mBlock = whole ? mWidth : std::min(mWidth, static_cast<int32_t>(isLong ? 2 * kChainBlock : kChainBlock));
  // A destination that is also read is in the cache already, and gains nothing from going past it.
  const uint32_t cache = VX_GetCacheSize();
  mStream = cache != 0 && bytes * mHeight >= static_cast<int64_t>(cache / 2) && !TargetIsASource();
  if (mStream && mTarget.converts && whole) mTarget.converter.StreamOutput();
  const auto isAligned = [](auto address) { return static_cast<uintptr_t>(address) % kStreamAlignment == 0; };
  mStages = mStream && (!mKernelStreams || mTarget.converts || !isAligned(mTarget.rowBytes) ||
                        !isAligned(reinterpret_cast<uintptr_t>(mTarget.base)));

  // The converters' own rows come first and are shared: conversions run one after the other.
  size_t own = mTarget.converts ? mTarget.converter.ScratchBytes() : 0;
  for (int i = 0; i < mSourceCount; ++i)
    if (mSources[i].converts) own = std::max(own, mSources[i].converter.ScratchBytes());
  size_t end = ScratchRounded(own);
  const auto take = [&](VX_PixelFormat format) {
    const size_t offset = end;
    end += ScratchRounded(static_cast<size_t>(UnpaddedRowBytes(format, mBlock)));
    return offset;
  };
  for (int i = 0; i < mSourceCount; ++i)
    if (mSources[i].converts) mSources[i].scratchOffset = take(mSources[i].working);
  if (mTarget.converts || mStages) mTarget.scratchOffset = take(mTarget.working);
  if (mTarget.converts && mStream) mStagingOffset = take(mTarget.format);
  mScratchBytes = end;
}

uint8_t* RowJob::Stored(const Side& side, int32_t row, int32_t column) const noexcept {
  return side.base + ptrdiff_t{side.upsideDown ? mHeight - 1 - row : row} * side.rowBytes +
         static_cast<size_t>(column) / kBlockMultiple * side.bytesPerSixPixels;
}

const uint8_t* RowJob::Fetch(const Side& side, uint8_t* scratch, int32_t row, int32_t column,
                             size_t count) const noexcept {
  const uint8_t* from = Stored(side, row, column);
  if (!side.converts) return from;
  uint8_t* const to = scratch + side.scratchOffset;
  if (side.converter.IsPointWise() && mBlock <= static_cast<int32_t>(kChainBlock))
    side.converter.ConvertBlock(from, to, count);
  else
    side.converter.Convert(from, to);
  return to;
}

void RowJob::PrefetchNext(const RowSpan& span) const noexcept {
  for (int i = 0; i < mSourceCount; ++i) {
    const Side& side = mSources[i];
    const size_t bytes = span.count / kBlockMultiple * side.bytesPerSixPixels;
    PrefetchBlock(Stored(side, span.row, span.column) + bytes, bytes);
  }
}

uint8_t* RowJob::Place(uint8_t* scratch, int32_t row, int32_t column) const noexcept {
  if (mTarget.converts || mStages) return scratch + mTarget.scratchOffset;
  return Stored(mTarget, row, column);
}

void RowJob::Deliver(const RowSpan& span) const noexcept {
  if (!mTarget.converts && !mStages) return;
  uint8_t* const to = Stored(mTarget, span.row, span.column);
  const size_t bytes = static_cast<size_t>(UnpaddedRowBytes(mTarget.format, static_cast<int64_t>(span.count)));
  if (mStream) PrefetchNext(span);
  const bool block = mTarget.converter.IsPointWise() && mBlock <= static_cast<int32_t>(kChainBlock);
  if (!mTarget.converts) {
    StreamCopy(to, span.dst, bytes, mVariant);
  } else if (!block) {
    mTarget.converter.Convert(span.dst, to);
  } else if (!mStream) {
    mTarget.converter.ConvertBlock(span.dst, to, span.count);
  } else {
    uint8_t* const staging = span.dst + (mStagingOffset - mTarget.scratchOffset);
    mTarget.converter.ConvertBlock(span.dst, staging, span.count);
    StreamCopy(to, staging, bytes, mVariant);
  }
}

void RowJob::Finish() const noexcept {
  if (mStream) StreamFence();
}

}  // namespace vexel
