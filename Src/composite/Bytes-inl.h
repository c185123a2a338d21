// 8-bit pixels in 16-bit lanes: products of bytes, mixtures, spread alphas. Bytes at even and odd places are worked on
// apart.
#if defined(VEXEL_COMPOSITE_BYTES_INL_H_) == defined(HWY_TARGET_TOGGLE)
#ifdef VEXEL_COMPOSITE_BYTES_INL_H_
#undef VEXEL_COMPOSITE_BYTES_INL_H_
#else
#define VEXEL_COMPOSITE_BYTES_INL_H_
#endif

#include <cstdint>

#include <hwy/highway.h>

#include "convert/PixelVectors-inl.h"

#if HWY_TARGET != HWY_SCALAR
HWY_BEFORE_NAMESPACE();
namespace vexel {
namespace HWY_NAMESPACE {

HWY_INLINE U8 ShuffleBytes(U8 v, const uint8_t (&order)[16]) {
  return hn::TableLookupBytesOr0(v, hn::LoadDup128(hn::ScalableTag<uint8_t>(), order));
}

// The bytes at even and at odd places, in 16-bit lanes: two lanes for each pixel, so that what is the same for all
// channels of a pixel is the same for both.
struct EvenOdd {
  I16 even, odd;
};
HWY_INLINE EvenOdd SplitBytes(U8 v) {
  const hn::ScalableTag<uint16_t> d;
  const hn::ScalableTag<int16_t> di;
  const auto words = hn::BitCast(d, v);
  return {hn::BitCast(di, hn::And(words, hn::Set(d, 255))), hn::BitCast(di, hn::ShiftRight<8>(words))};
}
// The lower byte of each lane.
HWY_INLINE U8 JoinBytes(I16 even, I16 odd) {
  const hn::ScalableTag<int16_t> d;
  return hn::BitCast(hn::ScalableTag<uint8_t>(), hn::OrAnd(hn::ShiftLeft<8>(odd), even, hn::Set(d, 255)));
}

// The same with saturation.
HWY_INLINE U8 JoinSaturated(I16 even, I16 odd) {
  alignas(16) static constexpr uint8_t kOrder[16] = {0, 8, 1, 9, 2, 10, 3, 11, 4, 12, 5, 13, 6, 14, 7, 15};
  return ShuffleBytes(PackBlocks(even, odd), kOrder);
}

// Byte kByte of each 32-bit pixel in its two 16-bit lanes, times 256 if kHigh.
template <uint8_t kByte, bool kHigh>
HWY_INLINE I16 SpreadByte(U8 v) {
  constexpr uint8_t none = 0x80;
  constexpr auto low = [](uint8_t pixel) { return kHigh ? none : static_cast<uint8_t>(kByte + 4 * pixel); };
  constexpr auto high = [](uint8_t pixel) { return kHigh ? static_cast<uint8_t>(kByte + 4 * pixel) : none; };
  alignas(16) static constexpr uint8_t kOrder[16] = {low(0), high(0), low(0), high(0), low(1), high(1),
                                                     low(1), high(1), low(2), high(2), low(2), high(2),
                                                     low(3), high(3), low(3), high(3)};
  return hn::BitCast(hn::ScalableTag<int16_t>(), ShuffleBytes(v, kOrder));
}

// The lower 16 bits of each 32-bit lane in both of its halves.
HWY_INLINE I16 SpreadWord(I32 v) {
  alignas(16) static constexpr uint8_t kOrder[16] = {0, 1, 0, 1, 4, 5, 4, 5, 8, 9, 8, 9, 12, 13, 12, 13};
  return hn::BitCast(hn::ScalableTag<int16_t>(), ShuffleBytes(hn::BitCast(hn::ScalableTag<uint8_t>(), v), kOrder));
}

// d + (s - d) weight for weights of 0..32767 in 1/32768. The change needs nine bits, its last eight are enough.
HWY_INLINE U8 Mix15(U8 s, U8 d, I16 weight) {
  const EvenOdd from = SplitBytes(d), to = SplitBytes(s);
  return hn::Add(d, JoinBytes(hn::MulFixedPoint15(hn::Sub(to.even, from.even), weight),
                              hn::MulFixedPoint15(hn::Sub(to.odd, from.odd), weight)));
}

}  // namespace HWY_NAMESPACE
}  // namespace vexel
HWY_AFTER_NAMESPACE();
#endif  // HWY_TARGET

#endif
