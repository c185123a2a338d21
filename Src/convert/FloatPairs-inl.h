// Float pixels of 4:2:2 as planes: one vector of chroma, (V, U) of each pair, and one of luma, two of each pair.
#if defined(VEXEL_CONVERT_FLOATPAIRS_INL_H_) == defined(HWY_TARGET_TOGGLE)
#ifdef VEXEL_CONVERT_FLOATPAIRS_INL_H_
#undef VEXEL_CONVERT_FLOATPAIRS_INL_H_
#else
#define VEXEL_CONVERT_FLOATPAIRS_INL_H_
#endif

#include <cstddef>
#include <cstdint>

#include <hwy/highway.h>

#include "convert/FloatPixels-inl.h"

#if HWY_TARGET != HWY_SCALAR
HWY_BEFORE_NAMESPACE();
namespace vexel {
namespace HWY_NAMESPACE {

// Pairs per vector of chroma: as many as two vectors of UYVY have, or four of VUYX.
constexpr size_t kPlanePairs = kLanes<float> / 2;

// Lower or upper halves of the blocks of a and b side by side, and the channels of those halves in turn.
template <bool kUpper>
HWY_INLINE F32 JoinHalves(F32 a, F32 b) {
  const hn::ScalableTag<double> d;
  const auto x = hn::BitCast(d, a), y = hn::BitCast(d, b);
  return hn::BitCast(FloatTag(), kUpper ? hn::InterleaveUpper(d, x, y) : hn::InterleaveLower(d, x, y));
}
template <bool kUpper>
HWY_INLINE F32 ZipHalves(F32 a, F32 b) {
  const FloatTag d;
  return kUpper ? hn::InterleaveUpper(d, a, b) : hn::InterleaveLower(d, a, b);
}

#if HWY_TARGET == HWY_AVX3
using PlaneOrder = int32_t[16];
HWY_INLINE F32 Permute(F32 v, const PlaneOrder& order) {
  return F32{_mm512_permutexvar_ps(_mm512_load_si512(order), v.raw)};
}
HWY_INLINE F32 Permute(F32 a, F32 b, const PlaneOrder& order) {
  return F32{_mm512_permutex2var_ps(a.raw, _mm512_load_si512(order), b.raw)};
}
// Halves of blocks, that is chroma of pairs, of a (0 to 7) and b (8 to 15).
template <int k0, int k1, int k2, int k3, int k4, int k5, int k6, int k7>
HWY_INLINE F32 PermutePairs(F32 a, F32 b) {
  const __m512i order = _mm512_setr_epi64(k0, k1, k2, k3, k4, k5, k6, k7);
  return F32{_mm512_castpd_ps(_mm512_permutex2var_pd(_mm512_castps_pd(a.raw), order, _mm512_castps_pd(b.raw)))};
}
#elif HWY_TARGET == HWY_AVX2
HWY_INLINE F32 Permute(F32 v, int k0, int k1, int k2, int k3, int k4, int k5, int k6, int k7) {
  return F32{_mm256_permutevar8x32_ps(v.raw, _mm256_setr_epi32(k0, k1, k2, k3, k4, k5, k6, k7))};
}
// Lower or upper blocks of a and b.
template <bool kUpper>
HWY_INLINE F32 JoinBlocks(F32 a, F32 b) {
  return F32{_mm256_permute2f128_ps(a.raw, b.raw, kUpper ? 0x31 : 0x20)};
}
#endif

// The chroma of the pairs after those of `v`, whose successors are in `next`: one or two on.
template <int kPairs>
HWY_INLINE F32 ShiftPairsIn(F32 v, F32 next) {
#if HWY_TARGET == HWY_AVX3
  return F32{
      _mm512_castsi512_ps(_mm512_alignr_epi64(_mm512_castps_si512(next.raw), _mm512_castps_si512(v.raw), kPairs))};
#elif HWY_TARGET == HWY_AVX2
  const __m256 two = _mm256_permute2f128_ps(v.raw, next.raw, 0x21);
  return F32{kPairs == 2 ? two : _mm256_shuffle_ps(v.raw, two, 0x4E)};
#else
  return kPairs == 2 ? next : F32{_mm_shuffle_ps(v.raw, next.raw, 0x4E)};
#endif
}
// The chroma of the pairs before those of `v`, the first of which follows the last of `before`.
HWY_INLINE F32 ShiftPairsOut(F32 before, F32 v) {
#if HWY_TARGET == HWY_AVX3
  return F32{_mm512_castsi512_ps(_mm512_alignr_epi64(_mm512_castps_si512(v.raw), _mm512_castps_si512(before.raw), 7))};
#elif HWY_TARGET == HWY_AVX2
  return F32{_mm256_shuffle_ps(_mm256_permute2f128_ps(before.raw, v.raw, 0x21), v.raw, 0x4E)};
#else
  return F32{_mm_shuffle_ps(before.raw, v.raw, 0x4E)};
#endif
}

// ---- UYVY

// The chroma of kPlanePairs pairs.
HWY_INLINE F32 LoadPairChroma(const uint8_t* HWY_RESTRICT src) {
  const F32 a = LoadVector<float>(src, 0), b = LoadVector<float>(src, 1);
#if HWY_TARGET == HWY_AVX3
  alignas(64) static constexpr PlaneOrder kOrder = {2, 0, 6, 4, 10, 8, 14, 12, 18, 16, 22, 20, 26, 24, 30, 28};
  return Permute(a, b, kOrder);
#elif HWY_TARGET == HWY_AVX2
  const __m256d joined = _mm256_castps_pd(_mm256_shuffle_ps(a.raw, b.raw, 0x22));
  return F32{_mm256_castpd_ps(_mm256_permute4x64_pd(joined, 0xD8))};
#else
  return F32{_mm_shuffle_ps(a.raw, b.raw, 0x22)};
#endif
}

// Luma of pairs as StorePairs takes it: two of them that stand in one block go to different vectors.
HWY_INLINE void StorePairs(F32 chroma, F32 luma, uint8_t* HWY_RESTRICT dst) {
#if HWY_TARGET == HWY_AVX3
  alignas(64) static constexpr PlaneOrder kOrder = {1, 0, 9, 8, 3, 2, 11, 10, 5, 4, 13, 12, 7, 6, 15, 14};
  const F32 swapped = Permute(chroma, kOrder);
#elif HWY_TARGET == HWY_AVX2
  const F32 swapped = Permute(chroma, 1, 0, 5, 4, 3, 2, 7, 6);
#else
  const F32 swapped = PermuteChannels<1, 0, 3, 2>(chroma);
#endif
  StoreVector(ZipHalves<false>(swapped, luma), dst, 0);
  StoreVector(ZipHalves<true>(swapped, luma), dst, 1);
}

// ---- VUYX

struct PixelPlanes {
  F32 even, odd;  // chroma of the even and of the odd pixels
  F32 luma;       // in the order that StorePairs takes
};
HWY_INLINE PixelPlanes LoadPixelPlanes(const uint8_t* HWY_RESTRICT src) {
  const F32 a = LoadVector<float>(src, 0), b = LoadVector<float>(src, 1);
  const F32 c = LoadVector<float>(src, 2), d = LoadVector<float>(src, 3);
#if HWY_TARGET == HWY_AVX3
  alignas(64) static constexpr PlaneOrder kOrder = {0, 4, 1, 5, 8, 12, 9, 13, 16, 20, 17, 21, 24, 28, 25, 29};
  const F32 first = JoinHalves<false>(a, b), last = JoinHalves<false>(c, d);
  return {PermutePairs<0, 4, 1, 5, 8, 12, 9, 13>(first, last), PermutePairs<2, 6, 3, 7, 10, 14, 11, 15>(first, last),
          Permute(ZipHalves<true>(a, c), ZipHalves<true>(b, d), kOrder)};
#elif HWY_TARGET == HWY_AVX2
  const F32 first = JoinHalves<false>(a, b), last = JoinHalves<false>(c, d);
  const F32 luma = JoinHalves<false>(ZipHalves<true>(a, b), ZipHalves<true>(c, d));
  return {JoinBlocks<false>(first, last), JoinBlocks<true>(first, last), Permute(luma, 0, 4, 2, 6, 1, 5, 3, 7)};
#else
  return {JoinHalves<false>(a, c), JoinHalves<false>(b, d),
          JoinHalves<false>(ZipHalves<true>(a, b), ZipHalves<true>(c, d))};
#endif
}

// (Y, 1) of the pixels of a vector of UYVY: two that stand in one block go to different vectors of VUYX.
HWY_INLINE F32 LumaOfPairs(F32 pairs) {
#if HWY_TARGET == HWY_AVX3
  const __m512i order = _mm512_setr_epi32(1, 0, 9, 0, 3, 0, 11, 0, 5, 0, 13, 0, 7, 0, 15, 0);
  return F32{_mm512_mask_permutexvar_ps(_mm512_set1_ps(1.0f), 0x5555, order, pairs.raw)};
#else
#if HWY_TARGET == HWY_AVX2
  const F32 luma = Permute(pairs, 1, 0, 5, 0, 3, 0, 7, 0);
#else
  const F32 luma = PermuteChannels<1, 0, 3, 0>(pairs);
#endif
  return TakeChannels<10>(luma, hn::Set(FloatTag(), 1.0f));
#endif
}

// Pixels with the luma of `pairs`, opaque.
HWY_INLINE void StorePixelPlanes(F32 even, F32 odd, const uint8_t* HWY_RESTRICT pairs, uint8_t* HWY_RESTRICT dst) {
#if HWY_TARGET == HWY_AVX3
  const F32 lower = PermutePairs<0, 2, 8, 10, 1, 3, 9, 11>(even, odd),
            upper = PermutePairs<4, 6, 12, 14, 5, 7, 13, 15>(even, odd);
#elif HWY_TARGET == HWY_AVX2
  const F32 lower = JoinBlocks<false>(even, odd), upper = JoinBlocks<true>(even, odd);
#else
  const F32 lower = JoinHalves<false>(even, odd), upper = JoinHalves<true>(even, odd);
#endif
  const F32 lowerLuma = LumaOfPairs(LoadVector<float>(pairs, 0)), upperLuma = LumaOfPairs(LoadVector<float>(pairs, 1));
  StoreVector(JoinHalves<false>(lower, lowerLuma), dst, 0);
  StoreVector(JoinHalves<true>(lower, lowerLuma), dst, 1);
  StoreVector(JoinHalves<false>(upper, upperLuma), dst, 2);
  StoreVector(JoinHalves<true>(upper, upperLuma), dst, 3);
}

}  // namespace HWY_NAMESPACE
}  // namespace vexel
HWY_AFTER_NAMESPACE();
#endif  // HWY_TARGET

#endif
