// The loop of kernels that lay one row over another: full blocks in place, the rest through the same body on padded
// copies (as frame/RowLoop-inl.h). The destination may be one of the rows.
#if defined(VEXEL_COMPOSITE_TWOROWS_INL_H_) == defined(HWY_TARGET_TOGGLE)
#ifdef VEXEL_COMPOSITE_TWOROWS_INL_H_
#undef VEXEL_COMPOSITE_TWOROWS_INL_H_
#else
#define VEXEL_COMPOSITE_TWOROWS_INL_H_
#endif

#include <cstddef>
#include <cstdint>
#include <cstring>

#include <hwy/highway.h>

#include "convert/PixelVectors-inl.h"

#if HWY_TARGET != HWY_SCALAR
HWY_BEFORE_NAMESPACE();
namespace vexel {
namespace HWY_NAMESPACE {

// Calls body(a, b, dst) for each block of kBlock bytes, and `last` for what is left of the row. The padding of the tail
// is zero; what is computed there is thrown away.
template <size_t kBlock, class Body, class Last>
HWY_INLINE void TwoRowLoop(const uint8_t* a, const uint8_t* b, uint8_t* dst, size_t bytes, const Body& body,
                           const Last& last) {
  size_t i = 0;
  for (; i + kBlock <= bytes; i += kBlock) body(a + i, b + i, dst + i);
  if (const size_t rest = bytes - i) {
    alignas(64) uint8_t in[2][kBlock] = {};
    alignas(64) uint8_t out[kBlock];
    std::memcpy(in[0], a + i, rest);
    std::memcpy(in[1], b + i, rest);
    last(in[0], in[1], out);
    std::memcpy(dst + i, out, rest);
  }
}
template <size_t kBlock, class Body>
HWY_INLINE void TwoRowLoop(const uint8_t* a, const uint8_t* b, uint8_t* dst, size_t bytes, const Body& body) {
  TwoRowLoop<kBlock>(a, b, dst, bytes, body, body);
}

// Writes a block's vectors, past the cache if kStream; `out` is aligned to a vector then.
template <bool kStream>
struct Put {
  uint8_t* out;
  template <class V>
  HWY_INLINE void operator()(V v, size_t index) const {
    WriteVector<kStream>(v, out, index);
  }
};

// The same with body(a, b, put), for a destination that may be streamed.
template <size_t kBlock, class Body>
HWY_INLINE void TwoRowLoop(bool stream, const uint8_t* a, const uint8_t* b, uint8_t* dst, size_t bytes,
                           const Body& body) {
  const auto put = [&](const uint8_t* inA, const uint8_t* inB, uint8_t* out)
                       HWY_ATTR { body(inA, inB, Put<false>{out}); };
  const auto past = [&](const uint8_t* inA, const uint8_t* inB, uint8_t* out)
                        HWY_ATTR { body(inA, inB, Put<true>{out}); };
  if (stream)
    TwoRowLoop<kBlock>(a, b, dst, bytes, past, put);
  else
    TwoRowLoop<kBlock>(a, b, dst, bytes, put);
}

}  // namespace HWY_NAMESPACE
}  // namespace vexel
HWY_AFTER_NAMESPACE();
#endif  // HWY_TARGET

#endif
