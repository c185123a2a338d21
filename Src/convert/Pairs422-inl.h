// Vector helpers of packed 8-bit 4:2:2: a vector holds as many pairs as it has 32-bit lanes, a pair two 16-bit words.
#if defined(VEXEL_CONVERT_PAIRS422_INL_H_) == defined(HWY_TARGET_TOGGLE)
#ifdef VEXEL_CONVERT_PAIRS422_INL_H_
#undef VEXEL_CONVERT_PAIRS422_INL_H_
#else
#define VEXEL_CONVERT_PAIRS422_INL_H_
#endif

#include <cstddef>
#include <cstdint>
#include <cstring>

#include <hwy/highway.h>

#include "convert/PairOrder.h"
#include "convert/YuvVectors8-inl.h"

#if HWY_TARGET != HWY_SCALAR
HWY_BEFORE_NAMESPACE();
namespace vexel {
namespace HWY_NAMESPACE {

inline constexpr size_t kVectorPairs = kLanes<uint32_t>;

// Byte 0 of each word (or byte 1) as words 0..255, and as words 256 times that.
template <int kByte>
HWY_INLINE U16 WordBytes(U8 v) {
  return kByte == 1 ? hn::ShiftRight<8>(AsU16(v)) : AsU16(hn::And(v, Dwords(0x00FF00FF)));
}
template <int kByte>
HWY_INLINE U16 WordBytes256(U8 v) {
  return kByte == 0 ? hn::ShiftLeft<8>(AsU16(v)) : AsU16(hn::And(v, Dwords(0xFF00FF00)));
}

// Stores low[0] high[0] low[1] high[1] ...
template <bool kStream = false>
HWY_INLINE void StoreWordPairs(U8 low, U8 high, uint8_t* out) {
#if HWY_TARGET == HWY_AVX3
  alignas(64) static constexpr uint16_t kFirst[32] = {0, 32, 1, 33, 2,  34, 3,  35, 4,  36, 5,  37, 6,  38, 7,  39,
                                                      8, 40, 9, 41, 10, 42, 11, 43, 12, 44, 13, 45, 14, 46, 15, 47};
  const __m512i first = _mm512_load_si512(kFirst);
  const __m512i second = _mm512_add_epi16(first, _mm512_set1_epi16(16));
  WriteVector<kStream>(U8{_mm512_permutex2var_epi16(low.raw, first, high.raw)}, out, 0);
  WriteVector<kStream>(U8{_mm512_permutex2var_epi16(low.raw, second, high.raw)}, out, 1);
#else
  const hn::ScalableTag<uint16_t> d;
  const auto a = hn::InterleaveLower(d, AsU16(low), AsU16(high)), b = hn::InterleaveUpper(d, AsU16(low), AsU16(high));
#if HWY_TARGET == HWY_AVX2
  WriteVector<kStream>(U16{_mm256_permute2x128_si256(a.raw, b.raw, 0x20)}, out, 0);
  WriteVector<kStream>(U16{_mm256_permute2x128_si256(a.raw, b.raw, 0x31)}, out, 1);
#else
  WriteVector<kStream>(a, out, 0);
  WriteVector<kStream>(b, out, 1);
#endif
#endif
}

// Lanes of 32 bits 1, 2, ... of `v`, then lane 0 of `next`.
template <class V>
HWY_INLINE V ShiftLaneIn(V v, V next) {
#if HWY_TARGET == HWY_AVX3
  return V{_mm512_alignr_epi32(next.raw, v.raw, 1)};
#elif HWY_TARGET == HWY_AVX2
  return V{_mm256_alignr_epi8(_mm256_permute2x128_si256(v.raw, next.raw, 0x21), v.raw, 4)};
#else
  return V{_mm_alignr_epi8(next.raw, v.raw, 4)};
#endif
}
// The last lane of `before`, then lanes 0, 1, ... of `v`.
template <class V>
HWY_INLINE V ShiftLaneOut(V before, V v) {
#if HWY_TARGET == HWY_AVX3
  return V{_mm512_alignr_epi32(v.raw, before.raw, 15)};
#elif HWY_TARGET == HWY_AVX2
  return V{_mm256_alignr_epi8(v.raw, _mm256_permute2x128_si256(before.raw, v.raw, 0x21), 12)};
#else
  return V{_mm_alignr_epi8(v.raw, before.raw, 12)};
#endif
}

// Stores pairs of chroma words (u, v) and luma words (y0, y1), both clamped to 0..255.
template <PairOrder kOrder>
HWY_INLINE void StorePairs(I16 uv, I16 y, uint8_t* out) {
  static constexpr ShuffleTable kUyvy({0, 8, 1, 9, 2, 10, 3, 11, 4, 12, 5, 13, 6, 14, 7, 15});
  static constexpr ShuffleTable kYuyv({8, 0, 9, 1, 10, 2, 11, 3, 12, 4, 13, 5, 14, 6, 15, 7});
  const U8 order = kOrder == PairOrder::Uyvy ? kUyvy.Load() : kYuyv.Load();
  StoreVector(hn::TableLookupBytes(PackBlocks(uv, y), order), out);
}

// Runs body(pairs, next, out) over a 4:2:2 row of `count` pixels, a vector of pairs at a time. `next` holds for each
// pair the one after it; the last pair of the row follows itself. Every pixel makes kDstPixelBytes bytes of the
// destination; where kWholePairs is set the destination is 4:2:2 too and ends with a whole pair. The last vector ends
// with the row and may do some pairs again, which source and destination, being different rows, allow.
template <size_t kDstPixelBytes, bool kWholePairs, class Body>
HWY_INLINE void PairLoop(const uint8_t* HWY_RESTRICT src, uint8_t* HWY_RESTRICT dst, size_t count, const Body& body) {
  constexpr size_t kPairs = kVectorPairs, kDstPairBytes = 2 * kDstPixelBytes;
  const size_t pairs = (count + 1) / 2;
  size_t i = 0;
  for (; i + kPairs < pairs; i += kPairs) {
    FetchAhead<4 * kPairs>(src + 4 * i);
    body(LoadVector<uint8_t>(src + 4 * i), LoadVector<uint8_t>(src + 4 * i + 4), dst + i * kDstPairBytes);
  }
  if (count == 0) return;

  uint32_t last;
  std::memcpy(&last, src + 4 * (pairs - 1), 4);
  const U8 repeated = Dwords(last);
  if (pairs >= kPairs && (kWholePairs || count % 2 == 0)) {
    const U8 vector = LoadVector<uint8_t>(src + 4 * (pairs - kPairs));
    body(vector, ShiftLaneIn(vector, repeated), dst + (pairs - kPairs) * kDstPairBytes);
    return;
  }
  alignas(64) uint8_t in[4 * kPairs], out[kDstPairBytes * kPairs];
  StoreVector(repeated, in);
  std::memcpy(in, src + 4 * i, 4 * (pairs - i));
  const U8 vector = LoadVector<uint8_t>(in);
  body(vector, ShiftLaneIn(vector, repeated), out);
  std::memcpy(dst + i * kDstPairBytes, out, kDstPixelBytes * ((kWholePairs ? 2 * pairs : count) - 2 * i));
}

}  // namespace HWY_NAMESPACE
}  // namespace vexel
HWY_AFTER_NAMESPACE();
#endif  // HWY_TARGET

#endif
