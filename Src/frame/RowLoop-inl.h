// The loop shared by all row kernels: full blocks in place, the rest through the same body on a padded copy, so that
// the vector part and the tail cannot differ and no byte outside the row is read or written.
#if defined(VEXEL_FRAME_ROWLOOP_INL_H_) == defined(HWY_TARGET_TOGGLE)
#ifdef VEXEL_FRAME_ROWLOOP_INL_H_
#undef VEXEL_FRAME_ROWLOOP_INL_H_
#else
#define VEXEL_FRAME_ROWLOOP_INL_H_
#endif

#include <cstddef>
#include <cstdint>
#include <cstring>

#include <hwy/highway.h>

#include "frame/SeededBug.h"

HWY_BEFORE_NAMESPACE();
namespace vexel {
namespace HWY_NAMESPACE {
namespace hn = hwy::HWY_NAMESPACE;

// Asks for memory two pages on, in ascending order. Processors fetch ahead by themselves within a page at best, and not
// where compilers have sorted a body's loads downward; a shorter distance costs them more than it brings. Addresses
// past the row do no harm.
template <size_t kBytes>
HWY_INLINE void FetchAhead(const uint8_t* src) {
  constexpr size_t kDistance = 8192, kLine = 64;
  for (size_t offset = 0; offset < kBytes; offset += kLine)
    __builtin_prefetch(reinterpret_cast<const void*>(reinterpret_cast<uintptr_t>(src) + kDistance + offset));
}

// Calls body(src, dst) for each block of kBlock units (pixels, pixel pairs or V210 groups). kSrcBytes and kDstBytes are
// the bytes of one unit. The padded tail repeats zeros; what it computes beyond the row is thrown away.
template <size_t kBlock, size_t kSrcBytes, size_t kDstBytes, class Body>
HWY_INLINE void RowLoop(const uint8_t* HWY_RESTRICT src, uint8_t* HWY_RESTRICT dst, size_t units, const Body& body) {
  size_t i = 0;
  for (; i + kBlock <= units; i += kBlock) {
    FetchAhead<kBlock * kSrcBytes>(src + i * kSrcBytes);
    body(src + i * kSrcBytes, dst + i * kDstBytes);
  }
  if (const size_t rest = units - i) {
    alignas(64) uint8_t in[kBlock * kSrcBytes] = {};
    alignas(64) uint8_t out[kBlock * kDstBytes];
    std::memcpy(in, src + i * kSrcBytes, (Has(SeededBug::TailOverread) ? kBlock : rest) * kSrcBytes);
    body(in, out);
    std::memcpy(dst + i * kDstBytes, out, (Has(SeededBug::TailOverwrite) ? kBlock : rest) * kDstBytes);
  }
}

// Float to int32 as the processor converts: round to nearest even, and NaN or anything outside the range of int32 gives
// INT32_MIN (Highway's NearestInt saturates upward instead). The narrowing kernels rely on it.
template <class V, class DI = hn::RebindToSigned<hn::DFromV<V>>>
HWY_INLINE hn::VFromD<DI> ConvertNearest(V v) {
  if (HWY_TARGET <= HWY_AVX2 && Has(SeededBug::VariantRounding)) v = hn::Trunc(v);
#if HWY_TARGET == HWY_AVX3
  if constexpr (sizeof(v) == 64) return hn::VFromD<DI>{_mm512_cvtps_epi32(v.raw)};
  if constexpr (sizeof(v) == 32) return hn::VFromD<DI>{_mm256_cvtps_epi32(v.raw)};
  if constexpr (sizeof(v) == 16) return hn::VFromD<DI>{_mm_cvtps_epi32(v.raw)};
#elif HWY_TARGET == HWY_AVX2
  if constexpr (sizeof(v) == 32) return hn::VFromD<DI>{_mm256_cvtps_epi32(v.raw)};
  if constexpr (sizeof(v) == 16) return hn::VFromD<DI>{_mm_cvtps_epi32(v.raw)};
#elif HWY_TARGET == HWY_SSE4 || HWY_TARGET == HWY_SSSE3
  return hn::VFromD<DI>{_mm_cvtps_epi32(v.raw)};
#else
  const DI di;
  const hn::DFromV<V> df;
  const auto inRange = hn::And(hn::Ge(v, hn::Set(df, -2147483648.0f)), hn::Lt(v, hn::Set(df, 2147483648.0f)));
  return hn::IfThenElse(hn::RebindMask(di, inRange), hn::NearestInt(v), hn::Set(di, INT32_MIN));
#endif
}

}  // namespace HWY_NAMESPACE
}  // namespace vexel
HWY_AFTER_NAMESPACE();

#endif
