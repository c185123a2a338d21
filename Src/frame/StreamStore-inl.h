// Stores that may go past the cache.
#if defined(VEXEL_FRAME_STREAMSTORE_INL_H_) == defined(HWY_TARGET_TOGGLE)
#ifdef VEXEL_FRAME_STREAMSTORE_INL_H_
#undef VEXEL_FRAME_STREAMSTORE_INL_H_
#else
#define VEXEL_FRAME_STREAMSTORE_INL_H_
#endif

#include <cstdint>

#include <hwy/highway.h>

#if HWY_TARGET != HWY_SCALAR
HWY_BEFORE_NAMESPACE();
namespace vexel {
namespace HWY_NAMESPACE {
namespace hn = hwy::HWY_NAMESPACE;

// To any place; where streamed, to a multiple of the vector's size.
template <bool kStream, class V>
HWY_INLINE void StoreBytes(V v, uint8_t* dst) {
  const hn::Repartition<uint8_t, hn::DFromV<V>> d8;
  if constexpr (kStream)
    hn::Stream(hn::BitCast(d8, v), d8, dst);
  else
    hn::StoreU(hn::BitCast(d8, v), d8, dst);
}

}  // namespace HWY_NAMESPACE
}  // namespace vexel
HWY_AFTER_NAMESPACE();
#endif  // HWY_TARGET

#endif
