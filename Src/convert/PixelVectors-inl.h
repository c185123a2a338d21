// Vector helpers shared by the four-channel row kernels: row maps, opaque alpha, packing in memory order.
#if defined(VEXEL_CONVERT_PIXELVECTORS_INL_H_) == defined(HWY_TARGET_TOGGLE)
#ifdef VEXEL_CONVERT_PIXELVECTORS_INL_H_
#undef VEXEL_CONVERT_PIXELVECTORS_INL_H_
#else
#define VEXEL_CONVERT_PIXELVECTORS_INL_H_
#endif

#include <cstddef>
#include <cstdint>

#include <hwy/highway.h>

#include "convert/PlainPixels.h"
#include "frame/RowLoop-inl.h"
#include "frame/StreamStore-inl.h"

// Highway's scalar fallback target is never chosen (the plain definitions serve there), so it gets no kernels.
#if HWY_TARGET != HWY_SCALAR
HWY_BEFORE_NAMESPACE();
namespace vexel {
namespace HWY_NAMESPACE {
namespace hn = hwy::HWY_NAMESPACE;

// Full vectors by lane type.
template <class T>
using Full = hn::Vec<hn::ScalableTag<T>>;
using U8 = Full<uint8_t>;
using U16 = Full<uint16_t>;
using I16 = Full<int16_t>;
using U32 = Full<uint32_t>;
using I32 = Full<int32_t>;
using F32 = Full<float>;

template <class T>
inline constexpr size_t kLanes = HWY_MAX_BYTES / sizeof(T);

template <class T>
HWY_INLINE Full<T> LoadVector(const uint8_t* p, size_t index = 0) {
  return hn::BitCast(hn::ScalableTag<T>(), hn::LoadU(hn::ScalableTag<uint8_t>(), p + index * HWY_MAX_BYTES));
}

// Past the cache if kStream; p is aligned to a vector then.
template <bool kStream, class V>
HWY_INLINE void WriteVector(V v, uint8_t* p, size_t index) {
  StoreBytes<kStream>(v, p + index * HWY_MAX_BYTES);
}
template <class V>
HWY_INLINE void StoreVector(V v, uint8_t* p, size_t index = 0) {
  WriteVector<false>(v, p, index);
}

// Half and quarter vectors of bytes or words, widened to a full vector.
template <class T, class From>
HWY_INLINE Full<T> LoadPromoted(const uint8_t* p) {
  const hn::ScalableTag<T> d;
  const hn::Rebind<From, decltype(d)> dFrom;
  const hn::Repartition<uint8_t, decltype(dFrom)> d8;
  return hn::PromoteTo(d, hn::BitCast(dFrom, hn::LoadU(d8, p)));
}

// Calls op(in, out) for four vectors of lane type T at a time; the pixels have four channels of type T on both sides.
template <class T, class Op>
HWY_INLINE void MapRow(const uint8_t* src, uint8_t* dst, size_t count, const Op& op) {
  constexpr size_t kPixel = 4 * sizeof(T);
  RowLoop<4 * HWY_MAX_BYTES / kPixel, kPixel, kPixel>(src, dst, count, op);
}

// Body of MapRow for an op of one vector: every vector on its own.
template <class T, class Op>
struct EachVector {
  Op op;
  HWY_INLINE void operator()(const uint8_t* in, uint8_t* out) const {
    const auto v0 = LoadVector<T>(in, 0), v1 = LoadVector<T>(in, 1);
    const auto v2 = LoadVector<T>(in, 2), v3 = LoadVector<T>(in, 3);
    StoreVector(op(v0), out, 0);
    StoreVector(op(v1), out, 1);
    StoreVector(op(v2), out, 2);
    StoreVector(op(v3), out, 3);
  }
};

// 128 bits with `value` in channel `index` of each pixel and 0 in the rest. Constants made of it must be static: not
// all of them become constants by themselves.
template <class T>
struct ChannelLanes {
  constexpr ChannelLanes(size_t index, T value) {
    for (size_t i = index; i < 16 / sizeof(T); i += 4) lanes[i] = value;
  }
  alignas(16) T lanes[16 / sizeof(T)] = {};
};

// Opaque alpha in channel kIndex, 0 in the others.
template <size_t kIndex, class T>
HWY_INLINE Full<T> OpaqueVector() {
  static constexpr ChannelLanes<T> kOpaque(kIndex, kFullScale<T>);
  return hn::LoadDup128(hn::ScalableTag<T>(), kOpaque.lanes);
}

// All bits of channel kIndex.
template <size_t kIndex, class T>
HWY_INLINE Full<T> ChannelMask() {
  using TU = hwy::MakeUnsigned<T>;
  static constexpr ChannelLanes<TU> kMask(kIndex, static_cast<TU>(~TU{0}));
  return hn::BitCast(hn::ScalableTag<T>(), hn::LoadDup128(hn::ScalableTag<TU>(), kMask.lanes));
}

// The vector with its alpha channel opaque, if kAlpha says so.
template <AlphaWrite kAlpha, class T>
HWY_INLINE Full<T> WriteAlpha(Full<T> v) {
  if constexpr (kAlpha == AlphaWrite::Keep) {
    return v;
  } else {
    constexpr size_t kIndex = AlphaIndex(kAlpha);
    const auto opaque = OpaqueVector<kIndex, T>();
    if constexpr (sizeof(T) == 1) return hn::Or(v, opaque);
    return hn::Or(hn::AndNot(ChannelMask<kIndex, T>(), v), opaque);
  }
}

// int16 -> uint8, saturating, within each 128-bit block: its 8 lanes of `a`, then its 8 of `b`.
HWY_INLINE U8 PackBlocks(I16 a, I16 b) {
#if HWY_TARGET == HWY_AVX3
  return U8{_mm512_packus_epi16(a.raw, b.raw)};
#elif HWY_TARGET == HWY_AVX2
  return U8{_mm256_packus_epi16(a.raw, b.raw)};
#else
  return U8{_mm_packus_epi16(a.raw, b.raw)};
#endif
}

// int32 -> uint16, saturating, within each 128-bit block.
HWY_INLINE U16 PackBlocks(I32 a, I32 b) {
#if HWY_TARGET == HWY_AVX3
  return U16{_mm512_packus_epi32(a.raw, b.raw)};
#elif HWY_TARGET == HWY_AVX2
  return U16{_mm256_packus_epi32(a.raw, b.raw)};
#elif HWY_TARGET == HWY_SSE4
  return U16{_mm_packus_epi32(a.raw, b.raw)};
#else
  // 0..65535 as -32768..32767, which packs signed.
  const auto biased = [](I32 v) HWY_ATTR {
    return hn::Sub(hn::AndNot(hn::ShiftRight<31>(v), v), hn::Set(hn::ScalableTag<int32_t>(), 32768));
  };
  const hn::ScalableTag<int16_t> d;
  const auto packed = hn::ReorderDemote2To(d, biased(a), biased(b));
  return hn::BitCast(hn::ScalableTag<uint16_t>(), hn::Xor(packed, hn::Set(d, INT16_MIN)));
#endif
}

// Byte 0 of each word times a weight, plus byte 1 times another; the caller knows that the sums fit.
HWY_INLINE I16 WeighBytes(U8 unsignedBytes, U8 signedBytes) {
#if HWY_TARGET == HWY_AVX3
  return I16{_mm512_maddubs_epi16(unsignedBytes.raw, signedBytes.raw)};
#elif HWY_TARGET == HWY_AVX2
  return I16{_mm256_maddubs_epi16(unsignedBytes.raw, signedBytes.raw)};
#else
  return I16{_mm_maddubs_epi16(unsignedBytes.raw, signedBytes.raw)};
#endif
}

// Undoes the block order of packing two vectors: 64-bit groups a0 b0 a1 b1 ... become a0 a1 ... b0 b1 ...
template <class V>
HWY_INLINE V OrderPacked2(V v) {
#if HWY_TARGET == HWY_AVX3
  return V{_mm512_permutexvar_epi64(_mm512_setr_epi64(0, 2, 4, 6, 1, 3, 5, 7), v.raw)};
#elif HWY_TARGET == HWY_AVX2
  return V{_mm256_permute4x64_epi64(v.raw, 0xD8)};
#else
  return v;
#endif
}

// The same for four vectors and 32-bit groups.
HWY_INLINE U8 OrderPacked4(U8 v) {
#if HWY_TARGET == HWY_AVX3
  return U8{_mm512_permutexvar_epi32(_mm512_setr_epi32(0, 4, 8, 12, 1, 5, 9, 13, 2, 6, 10, 14, 3, 7, 11, 15), v.raw)};
#elif HWY_TARGET == HWY_AVX2
  return U8{_mm256_permutevar8x32_epi32(v.raw, _mm256_setr_epi32(0, 4, 1, 5, 2, 6, 3, 7))};
#else
  return v;
#endif
}

// Float to int32 toward zero, whatever the rounding mode, for values known to fit.
HWY_INLINE I32 Truncate(F32 v) {
#if HWY_TARGET == HWY_AVX3
  return I32{_mm512_cvttps_epi32(v.raw)};
#elif HWY_TARGET == HWY_AVX2
  return I32{_mm256_cvttps_epi32(v.raw)};
#else
  return I32{_mm_cvttps_epi32(v.raw)};
#endif
}

// int32 -> uint16, saturating, in memory order.
HWY_INLINE U16 PackToU16(I32 a, I32 b) { return OrderPacked2(PackBlocks(a, b)); }

// int32 -> uint8, saturating, in memory order.
HWY_INLINE U8 PackTo8(I32 a, I32 b, I32 c, I32 d) {
  const hn::ScalableTag<int16_t> d16;
  return OrderPacked4(PackBlocks(hn::ReorderDemote2To(d16, a, b), hn::ReorderDemote2To(d16, c, d)));
}

// int16 -> uint8, saturating, in memory order.
HWY_INLINE U8 PackTo8(I16 a, I16 b) { return OrderPacked2(PackBlocks(a, b)); }

}  // namespace HWY_NAMESPACE
}  // namespace vexel
HWY_AFTER_NAMESPACE();
#endif  // HWY_TARGET

#endif
