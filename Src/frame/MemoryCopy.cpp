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

#if HWY_TARGET != HWY_SCALAR  // compiled by foreach_target as the baseline, never chosen
HWY_BEFORE_NAMESPACE();
namespace vexel {
namespace HWY_NAMESPACE {
namespace hn = hwy::HWY_NAMESPACE;

constexpr size_t kVector = hn::MaxLanes(hn::ScalableTag<uint8_t>()), kStep = 4 * kVector;
constexpr size_t kLine = 64;

// As many bytes held in registers, in vectors of kEach bytes.
template <size_t kBytes, size_t kEach = kVector>
struct Block {
  static constexpr size_t kHalf = kBytes / 2;
  Block<kHalf, kEach> low, high;
  HWY_INLINE explicit Block(const uint8_t* src) : low(src), high(src + kHalf) {}
  HWY_INLINE void StoreU(uint8_t* dst) const {
    low.StoreU(dst);
    high.StoreU(dst + kHalf);
  }
  HWY_INLINE void Store(uint8_t* dst) const {
    low.Store(dst);
    high.Store(dst + kHalf);
  }
  HWY_INLINE void Stream(uint8_t* dst) const {
    low.Stream(dst);
    high.Stream(dst + kHalf);
  }
};

template <size_t kEach>
struct Block<kEach, kEach> {
  using D = hn::CappedTag<uint8_t, kEach>;
  hn::VFromD<D> v;
  HWY_INLINE explicit Block(const uint8_t* src) : v(hn::LoadU(D(), src)) {}
  HWY_INLINE void StoreU(uint8_t* dst) const { hn::StoreU(v, D(), dst); }
  HWY_INLINE void Store(uint8_t* dst) const { hn::Store(v, D(), dst); }
  HWY_INLINE void Stream(uint8_t* dst) const { hn::Stream(v, D(), dst); }
};

// The first and the last kBytes of an area of kBytes to twice as many, all read before any is written.
template <size_t kBytes>
HWY_INLINE void CopyEnds(uint8_t* dst, const uint8_t* src, size_t n) {
  const Block<kBytes> head(src), tail(src + n - kBytes);
  head.StoreU(dst);
  tail.StoreU(dst + n - kBytes);
}

// The ends are copied as whole vectors and overlap the aligned middle.
HWY_INLINE void CopyCached(uint8_t* HWY_RESTRICT dst, const uint8_t* HWY_RESTRICT src, size_t n) {
  const Block<kVector> first(src);
  const Block<kStep> last(src + n - kStep);
  uint8_t* const lastDst = dst + n - kStep;
  const size_t skip = kVector - (reinterpret_cast<uintptr_t>(dst) & (kVector - 1));
  first.StoreU(dst);
  src += skip;
  for (dst += skip; dst < lastDst; dst += kStep, src += kStep) Block<kStep>(src).Store(dst);
  last.StoreU(lastDst);
}

// See StreamCopy. Lines in two halves are written faster than whole ones.
void StreamAll(uint8_t* HWY_RESTRICT dst, const uint8_t* HWY_RESTRICT src, size_t n) {
  const size_t head = -reinterpret_cast<uintptr_t>(dst) % kLine;
  if (n < head + kLine) {
    if (n != 0) std::memcpy(dst, src, n);
    return;
  }
  if (head != 0) std::memcpy(dst, src, head);
  const size_t tail = (n - head) % kLine, end = n - tail;
  constexpr size_t kEach = kVector < 32 ? kVector : 32;
  size_t i = head;
  for (; i + 4 * kEach <= end; i += 4 * kEach) Block<4 * kEach, kEach>(src + i).Stream(dst + i);
  for (; i < end; i += kEach) Block<kEach, kEach>(src + i).Stream(dst + i);
  if (tail != 0) std::memcpy(dst + end, src + end, tail);
}

// Whether the C library is slower than the loop here. From about 2 KiB on it copies with the processor's string
// instructions; below it has vectors as wide as ours or wider.
HWY_INLINE bool IsForLoop(size_t n) {
  constexpr size_t kFewTo = kVector == 64 ? 1024 : 512, kManyFrom = kVector == 64 ? 2304 : 1536, kManyTo = 16384;
  return n <= kFewTo || (n >= kManyFrom && n <= kManyTo);
}

HWY_NOINLINE VX_Result CopyHuge(uint8_t* dst, const uint8_t* src, size_t n) {
  if (n >= UnifiedCache().bytes / 2) {
    StreamAll(dst, src, n);
    StreamFence();
  } else {
    std::memcpy(dst, src, n);
  }
  return VX_Success;
}

// More than 128 bytes. The compiler has the upper halves of the registers cleared at the end.
VX_Result CopyMore(uint8_t* dst, const uint8_t* src, size_t n) noexcept {
  if (kVector >= 32 && n <= 256) {
    CopyEnds<128>(dst, src, n);
  } else if (kVector == 64 && n <= 512) {
    CopyEnds<256>(dst, src, n);
  } else if (n < UnifiedCache().bytes / 2 && IsForLoop(n)) {
    CopyCached(dst, src, n);
  } else {
    return CopyHuge(dst, src, n);
  }
  return VX_Success;
}

}  // namespace HWY_NAMESPACE
}  // namespace vexel
HWY_AFTER_NAMESPACE();
#endif  // HWY_TARGET

#if HWY_ONCE
namespace vexel {
namespace {

namespace plain {

void StreamAll(uint8_t* dst, const uint8_t* src, size_t n) {
  if (n != 0) std::memcpy(dst, src, n);
}

VX_Result CopyMore(uint8_t* dst, const uint8_t* src, size_t n) noexcept {
  std::memcpy(dst, src, n);
  return VX_Success;
}

}  // namespace plain

constinit const KernelVariants<VX_Result (*)(uint8_t*, const uint8_t*, size_t) noexcept> kCopyMore =
    VX_KERNEL_VARIANTS(CopyMore);
constinit const KernelVariants<void (*)(uint8_t*, const uint8_t*, size_t)> kStreamAll = VX_KERNEL_VARIANTS(StreamAll);

// The first and the last 16 kCount bytes of an area of that many to twice as many.
template <int kCount>
inline __attribute__((always_inline)) void CopyEnds(uint8_t* dst, const uint8_t* src, size_t n) {
  const auto vectorsAt = [](auto* at) { return reinterpret_cast<__m128i*>(const_cast<uint8_t*>(at)); };
  __m128i *const from = vectorsAt(src), *const lastFrom = vectorsAt(src + n) - kCount;
  __m128i *const to = vectorsAt(dst), *const lastTo = vectorsAt(dst + n) - kCount;
  __m128i head[kCount], tail[kCount];
#pragma GCC unroll 4
  for (int i = 0; i < kCount; ++i) head[i] = _mm_loadu_si128(from + i), tail[i] = _mm_loadu_si128(lastFrom + i);
#pragma GCC unroll 4
  for (int i = 0; i < kCount; ++i) _mm_storeu_si128(to + i, head[i]), _mm_storeu_si128(lastTo + i, tail[i]);
}

}  // namespace

void StreamCopy(void* dst, const void* src, size_t bytes, KernelVariant variant) noexcept {
  kStreamAll[variant](static_cast<uint8_t*>(dst), static_cast<const uint8_t*>(src), bytes);
}

void StreamFence() noexcept { _mm_sfence(); }

}  // namespace vexel

// Short copies, which a caller may ask for in a tight loop, need neither a variant nor a call: either would cost as
// much as the copy. The longer ones are nothing but jumps (which they are only because the kernels cannot throw), the
// usual ones direct.
VX_Result VX_CopyMemory(void* dst, const void* src, size_t bytes) noexcept {
  using namespace vexel;
  auto* const to = static_cast<uint8_t*>(dst);
  auto* const from = static_cast<const uint8_t*>(src);
  if (bytes > 128) {
    const KernelVariant variant = ActiveKernelVariant();
    if (variant == KernelVariant::Avx512) [[likely]]
      return N_AVX3::CopyMore(to, from, bytes);
    if (variant == KernelVariant::Avx2) [[likely]]
      return N_AVX2::CopyMore(to, from, bytes);
    return kCopyMore[variant](to, from, bytes);
  }
  if (bytes >= 64)
    CopyEnds<4>(to, from, bytes);
  else if (bytes >= 32)
    CopyEnds<2>(to, from, bytes);
  else if (bytes >= 16)
    CopyEnds<1>(to, from, bytes);
  else if (bytes != 0)
    std::memcpy(to, from, bytes);
  return VX_Success;
}
#endif
