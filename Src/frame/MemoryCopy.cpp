#include <emmintrin.h>

#include <cstdint>
#include <cstring>

#include "frame/Lifecycle.h"
#include "frame/StreamCopy.h"
#include "vexel/vexel.h"

#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "frame/MemoryCopy.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

#include "frame/KernelTable.h"

HWY_BEFORE_NAMESPACE();
namespace vexel {
namespace HWY_NAMESPACE {
namespace hn = hwy::HWY_NAMESPACE;

// 32-byte vectors at most: wider ones gain only on a few hundred bytes and lower the clock of some processors.
using D = hn::CappedTag<uint8_t, 32>;
using V = hn::VFromD<D>;
constexpr size_t kLanes = hn::MaxLanes(D());
constexpr size_t kLine = 64;

// kCount vectors held in registers.
template <size_t kCount>
struct Block {
  Block<kCount / 2> low, high;
  HWY_INLINE explicit Block(const uint8_t* src) : low(src), high(src + kCount / 2 * kLanes) {}
  HWY_INLINE void StoreU(uint8_t* dst) const {
    low.StoreU(dst);
    high.StoreU(dst + kCount / 2 * kLanes);
  }
  HWY_INLINE void Store(uint8_t* dst) const {
    low.Store(dst);
    high.Store(dst + kCount / 2 * kLanes);
  }
  HWY_INLINE void Stream(uint8_t* dst) const {
    low.Stream(dst);
    high.Stream(dst + kCount / 2 * kLanes);
  }
};

template <>
struct Block<1> {
  V v;
  HWY_INLINE explicit Block(const uint8_t* src) : v(hn::LoadU(D(), src)) {}
  HWY_INLINE void StoreU(uint8_t* dst) const { hn::StoreU(v, D(), dst); }
  HWY_INLINE void Store(uint8_t* dst) const { hn::Store(v, D(), dst); }
  HWY_INLINE void Stream(uint8_t* dst) const { hn::Stream(v, D(), dst); }
};

constexpr size_t kStep = 4 * kLanes;

// The first and the last kCount vectors of an area of kCount to 2 kCount vectors, all read before any is written.
template <size_t kCount>
HWY_INLINE void CopyEnds(uint8_t* dst, const uint8_t* src, size_t n) {
  const Block<kCount> head(src), tail(src + n - kCount * kLanes);
  head.StoreU(dst);
  tail.StoreU(dst + n - kCount * kLanes);
}

// The ends are copied as whole vectors and overlap the aligned middle.
HWY_INLINE void CopyCached(uint8_t* HWY_RESTRICT dst, const uint8_t* HWY_RESTRICT src, size_t n) {
  const Block<1> first(src);
  const Block<4> last(src + n - kStep);
  uint8_t* const lastDst = dst + n - kStep;
  const size_t skip = kLanes - (reinterpret_cast<uintptr_t>(dst) & (kLanes - 1));
  first.StoreU(dst);
  src += skip;
  for (dst += skip; dst < lastDst; dst += kStep, src += kStep) Block<4>(src).Store(dst);
  last.StoreU(lastDst);
}

// See StreamCopy.
void StreamAll(uint8_t* HWY_RESTRICT dst, const uint8_t* HWY_RESTRICT src, size_t n) {
  const size_t head = -reinterpret_cast<uintptr_t>(dst) % kLine;
  if (n < head + kLine) {
    if (n != 0) std::memcpy(dst, src, n);
    return;
  }
  if (head != 0) std::memcpy(dst, src, head);
  const size_t tail = (n - head) % kLine, end = n - tail;
  size_t i = head;
  for (; i + kStep <= end; i += kStep) Block<4>(src + i).Stream(dst + i);
  for (; i < end; i += kLanes) Block<1>(src + i).Stream(dst + i);
  if (tail != 0) std::memcpy(dst + end, src + end, tail);
}

// Whether the C library is slower than the loop here: it has wider vectors, but takes longer to choose among them, and
// copies with the processor's string instructions from the size of the first-level cache on.
HWY_INLINE bool IsForLoop(size_t n) { return n <= 512 || (n >= 1536 && n <= 16384); }

HWY_NOINLINE VX_Result CopyLong(uint8_t* dst, const uint8_t* src, size_t n) {
  if (n >= UnifiedCache().bytes / 2) {
    StreamAll(dst, src, n);
    StreamFence();
  } else if (IsForLoop(n)) {
    CopyCached(dst, src, n);
  } else {
    std::memcpy(dst, src, n);
  }
  return VX_Success;
}

// Lengths that a caller may ask for in a tight loop come first: a taken branch more or less shows there.
VX_Result CopyAll(uint8_t* dst, const uint8_t* src, size_t n) noexcept {
  if (n >= 2 * kLanes) {
    if (n <= 4 * kLanes)
      CopyEnds<2>(dst, src, n);
    else if (n <= 8 * kLanes)
      CopyEnds<4>(dst, src, n);
    else
      return CopyLong(dst, src, n);
  } else if (n >= kLanes) {
    CopyEnds<1>(dst, src, n);
  } else if (n != 0) {
    std::memcpy(dst, src, n);
  }
  return VX_Success;
}

}  // namespace HWY_NAMESPACE
}  // namespace vexel
HWY_AFTER_NAMESPACE();

#if HWY_ONCE
namespace vexel {
namespace {

namespace plain {

void StreamAll(uint8_t* dst, const uint8_t* src, size_t n) {
  if (n != 0) std::memcpy(dst, src, n);
}

VX_Result CopyAll(uint8_t* dst, const uint8_t* src, size_t n) noexcept {
  if (n != 0) std::memcpy(dst, src, n);
  return VX_Success;
}

}  // namespace plain

constinit const KernelVariants<VX_Result (*)(uint8_t*, const uint8_t*, size_t) noexcept> kCopyAll =
    VX_KERNEL_VARIANTS(CopyAll);
constinit const KernelVariants<void (*)(uint8_t*, const uint8_t*, size_t)> kStreamAll = VX_KERNEL_VARIANTS(StreamAll);

}  // namespace

void StreamCopy(void* dst, const void* src, size_t bytes, KernelVariant variant) noexcept {
  kStreamAll[variant](static_cast<uint8_t*>(dst), static_cast<const uint8_t*>(src), bytes);
}

void StreamFence() noexcept { _mm_sfence(); }

}  // namespace vexel

// Nothing but jumps (which they are only because the kernels cannot throw), the usual one direct: a call, or an
// indirect jump, would cost as much as a short copy. The AVX-512 variant of the kernel is the same.
VX_Result VX_CopyMemory(void* dst, const void* src, size_t bytes) noexcept {
  using namespace vexel;
  auto* const to = static_cast<uint8_t*>(dst);
  auto* const from = static_cast<const uint8_t*>(src);
  const KernelVariant variant = ActiveKernelVariant();
  if (variant >= KernelVariant::Avx2) [[likely]]
    return N_AVX2::CopyAll(to, from, bytes);
  return kCopyAll[variant](to, from, bytes);
}
#endif
