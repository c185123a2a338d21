// Rows of up to three images brought into working formats, given to a row kernel, and its result brought into the
// format of the destination; in bands. Everything that mixes images runs through it.
#pragma once

#include <atomic>
#include <cstddef>
#include <cstdint>

#include "convert/RowConverter.h"
#include "frame/Bands.h"
#include "frame/Scratch.h"

namespace vexel {

struct SourceImage {
  const void* base;
  int32_t rowBytes;
  VX_PixelFormat format;
};
struct TargetImage {
  void* base;
  int32_t rowBytes;
  VX_PixelFormat format;
};

// Where one image is all of the result: VX_Convert, whose codes count, but for sizes as CheckBuffers has them. Nothing
// is done where the image is the destination itself.
VX_Result CopyPicture(const SourceImage& image, const TargetImage& target, int32_t width, int32_t height,
                      int32_t renderQuality) noexcept;

// What a row kernel gets: `count` pixels of every image in its working format. `row` counts from the destination's
// first stored row, `column` from its first pixel. The destination may be one of the sources. `stream`: dst is the
// destination itself, aligned to kStreamAlignment, and better written past the cache.
inline constexpr size_t kStreamAlignment = 64;
struct RowSpan {
  const uint8_t* src[3];
  uint8_t* dst;
  size_t count;
  int32_t row, column;
  bool stream;
};

// Pictures of up to so many rows are worked on by the calling thread.
inline constexpr int32_t kInlineRows = 64;

// Calls rows(first, end) for the rows of a picture in bands. The result of a band that failed, if there is one; -999
// when the host's fan-out failed.
template <class Rows>
VX_Result RunInBands(int32_t height, const Rows& rows) noexcept {
  std::atomic<int32_t> result{VX_Success};
  const auto band = [&](int first, int end) {
    if (const VX_Result failure = rows(first, end)) result.store(failure, std::memory_order_relaxed);
  };
  if (height <= kInlineRows)
    band(0, height);
  else if (!ForEachBand(height, band))
    return VX_ErrFailed;
  return static_cast<VX_Result>(result.load(std::memory_order_relaxed));
}

// Use: AddSource for each source, SetTarget, CheckBuffers, Run.
//
// Pictures meet upright: a source whose origin differs from the destination's is walked from its last row. The
// destination may be exactly one of the sources (base, row bytes and format); any other overlap is undefined.
class RowJob {
 public:
  RowJob(int32_t width, int32_t height, int32_t renderQuality, KernelVariant variant = ActiveKernelVariant()) noexcept
      : mWidth(width), mHeight(height), mRenderQuality(renderQuality), mVariant(variant) {}

  // Codes as MakePlan.
  VX_Result AddSource(const SourceImage& image, VX_PixelFormat working) noexcept;
  VX_Result SetTarget(const TargetImage& image, VX_PixelFormat working) noexcept;

  // Whether sizes and pointers can be worked with: -17 for a negative size or a row beyond 2^31 - 1 bytes, -11 and -12
  // for null buffers. Success with *done set means that there is nothing to do.
  VX_Result CheckBuffers(bool* done) noexcept;

  // Says that the kernel heeds RowSpan::stream; otherwise a big destination is written by way of the scratch memory.
  void KernelStreams() noexcept { mKernelStreams = true; }

  // Calls kernel(const RowSpan&) for the whole picture: whole rows in order of the band, and within a row blocks from
  // left to right. -16 when there is no memory for the rows between, -999 when the host's fan-out failed; the
  // destination may then be partly written.
  template <class Kernel>
  VX_Result Run(const Kernel& kernel) noexcept {
    Layout();
    return RunInBands(mHeight, [&](int first, int end) { return RunBand(first, end, kernel); });
  }

  KernelVariant Variant() const noexcept { return mVariant; }

 private:
  struct Side {
    uint8_t* base = nullptr;
    ptrdiff_t rowBytes = 0;
    VX_PixelFormat format{}, working{};
    RowConverter converter;
    size_t scratchOffset = 0;  // of its working pixels
    uint32_t bytesPerSixPixels = 0;
    bool converts = false, upsideDown = false;
  };

  VX_Result Prepare(Side& side, const void* base, int32_t rowBytes, VX_PixelFormat format, VX_PixelFormat from,
                    VX_PixelFormat to) noexcept;
  // Decides between blocks and whole rows, and where in the scratch memory everything lies.
  void Layout() noexcept;
  bool TargetIsASource() const noexcept;
  // Where a block begins in memory.
  uint8_t* Stored(const Side& side, int32_t row, int32_t column) const noexcept;
  void PrefetchNext(const RowSpan& span) const noexcept;
  const uint8_t* Fetch(const Side& side, uint8_t* scratch, int32_t row, int32_t column, size_t count) const noexcept;
  uint8_t* Place(uint8_t* scratch, int32_t row, int32_t column) const noexcept;
  void Deliver(const RowSpan& span) const noexcept;
  void Finish() const noexcept;

  template <class Kernel>
  VX_Result RunBand(int32_t first, int32_t end, const Kernel& kernel) noexcept {
    VX_SCRATCH(scratch, mScratchBytes);
    if (!scratch && mScratchBytes != 0) return VX_ErrOutOfMemory;
    RowJob band(*this);
    for (int i = 0; i < mSourceCount; ++i) band.mSources[i].converter.UseScratch(scratch.get());
    band.mTarget.converter.UseScratch(scratch.get());
    RowSpan span;
    span.stream = mStream && !mStages;
    for (span.row = first; span.row < end; ++span.row)
      for (int32_t column = 0; column < mWidth; column += mBlock) {
        span.column = column;
        span.count = static_cast<size_t>(mWidth - column < mBlock ? mWidth - column : mBlock);
        for (int i = 0; i < mSourceCount; ++i)
          span.src[i] = band.Fetch(band.mSources[i], scratch.get(), span.row, column, span.count);
        span.dst = band.Place(scratch.get(), span.row, column);
        kernel(static_cast<const RowSpan&>(span));
        band.Deliver(span);
      }
    band.Finish();
    return VX_Success;
  }

  int32_t mWidth, mHeight, mRenderQuality;
  KernelVariant mVariant;
  Side mSources[3], mTarget;
  int mSourceCount = 0;
  int32_t mBlock = 0;
  size_t mScratchBytes = 0, mStagingOffset = 0;  // staging: a converted block on its way past the cache
  bool mKernelStreams = false;
  bool mStream = false, mStages = false;  // past the cache; by way of the scratch memory
};

}  // namespace vexel
