// Converts rows from one raster format to another: a plan and the scratch rows between its steps. The one way in which
// every operation converts rows.
#pragma once

#include <algorithm>
#include <cstddef>
#include <cstdint>

#include "convert/Planner.h"
#include "frame/KernelVariant.h"

namespace vexel {

// Pixels per block of a chain whose steps are all point-wise: two blocks of 16-byte pixels stay in the first-level
// cache.
inline constexpr size_t kChainBlock = 384;
static_assert(kChainBlock % kBlockMultiple == 0);

// Pixels per block of a kernel that needs its neighbours, and how far it may look to either side; and pixels per block
// of a chain with such a kernel, which with that reach is a whole number of vectors.
inline constexpr size_t kStreamBlock = 1920, kReach = 12, kStreamChainBlock = 408;
static_assert(kStreamBlock % kBlockMultiple == 0 && kReach % kBlockMultiple == 0 &&
              kStreamChainBlock % kBlockMultiple == 0);

// Use: Prepare, then give it ScratchBytes() bytes with UseScratch (none needed when 0), then Convert any number of
// rows. A prepared converter is read-only but for its scratch memory: copies with scratch of their own may run in
// parallel.
class RowConverter {
 public:
  // Plans for rows of `width` pixels. Codes as MakePlan.
  VX_Result Prepare(VX_PixelFormat src, VX_PixelFormat dst, int32_t renderQuality, int32_t width,
                    KernelVariant variant = ActiveKernelVariant()) noexcept;

  // For destinations too large for the cache: the last step's output goes past the cache, unless the chain is too slow
  // to gain from it. Before ScratchBytes. Call StreamFence (frame/StreamCopy.h) after the last row.
  void StreamOutput() noexcept { mStream = !mOutlastsMemory; }

  size_t ScratchBytes() const noexcept;
  void UseScratch(uint8_t* scratch) noexcept { mScratch = scratch; }

  // Whether every pixel stands for itself, so that ConvertBlock may be used.
  bool IsPointWise() const noexcept { return mReach == 0; }

  // Converts one row. Source and destination must not overlap.
  void Convert(const void* srcRow, void* dstRow) const noexcept;

  // Converts `count` <= kChainBlock pixels that begin at src. Only for point-wise chains without StreamOutput.
  void ConvertBlock(const void* src, void* dst, size_t count) const noexcept {
    RunSteps(static_cast<const uint8_t*>(src), static_cast<uint8_t*>(dst), count);
  }

 private:
  // Runs the chain on `count` pixels; the last step writes to dst.
  void RunSteps(const uint8_t* src, uint8_t* dst, size_t count) const noexcept;
  // Kernels that need their neighbours, in overlapping blocks that are staged in the first-level cache.
  void StreamInBlocks(const uint8_t* src, uint8_t* dst) const noexcept;
  bool StreamsInBlocks() const noexcept { return mStream && mReach != 0; }
  size_t StreamBlock() const noexcept { return mStepCount == 1 ? kStreamBlock : kStreamChainBlock; }
  size_t UnitPixels() const noexcept {
    return StreamsInBlocks() ? StreamBlock() + 2 * mReach : mReach != 0 ? mWidth : kChainBlock;
  }
  uint8_t* Staging() const noexcept {
    return mScratch + static_cast<size_t>(std::min(mStepCount - 1, 2)) * ScratchRowBytes();
  }
  size_t ScratchRowBytes() const noexcept;

  RowKernel mSteps[kMaxSteps] = {};
  int mStepCount = 0;
  size_t mWidth = 0;
  size_t mReach = 0;  // how far the steps together may look to either side
  VX_PixelFormat mDstFormat{};
  uint32_t mSrcBytesPerSixPixels = 0, mDstBytesPerSixPixels = 0;
  bool mStream = false, mIsCopy = false, mOutlastsMemory = false;
  KernelVariant mVariant = KernelVariant::Plain;
  uint8_t* mScratch = nullptr;
};

}  // namespace vexel
