// 8-bit pixels in 16-bit lanes: products of bytes, mixtures, spread alphas. The lower and upper halves of each 128-bit
// block are worked on apart.
#if defined(VEXEL_COMPOSITE_BYTES_INL_H_) == defined(HWY_TARGET_TOGGLE)
#ifdef VEXEL_COMPOSITE_BYTES_INL_H_
#undef VEXEL_COMPOSITE_BYTES_INL_H_
#else
#define VEXEL_COMPOSITE_BYTES_INL_H_
#endif

#include <cstddef>
#include <cstdint>

#include <hwy/highway.h>

#include "convert/PixelVectors-inl.h"

#if HWY_TARGET != HWY_BASELINE_SCALAR
HWY_BEFORE_NAMESPACE();
namespace vexel {
namespace HWY_NAMESPACE {

// Four pixels of four 16-bit channels from each block: those of its lower half and those of its upper half.
struct Halves {
  I16 lower, upper;
};

// Sums of neighbours of unsigned times signed bytes; the caller knows that they fit.
HWY_INLINE I16 MultiplyAddBytes(U8 u, U8 s) {
#if HWY_TARGET == HWY_AVX3
  return I16{_mm512_maddubs_epi16(u.raw, s.raw)};
#elif HWY_TARGET == HWY_AVX2
  return I16{_mm256_maddubs_epi16(u.raw, s.raw)};
#else
  return I16{_mm_maddubs_epi16(u.raw, s.raw)};
#endif
}

HWY_INLINE U8 ShuffleBytes(U8 v, const uint8_t (&order)[16]) {
  return hn::TableLookupBytesOr0(v, hn::LoadDup128(hn::ScalableTag<uint8_t>(), order));
}

// Byte kByte of each 32-bit pixel in its four 16-bit channels, times 256 if kHigh.
template <uint8_t kByte, bool kHigh>
HWY_INLINE Halves SpreadByte(U8 v) {
  constexpr uint8_t none = 0x80;
  constexpr auto low = [](uint8_t pixel) { return kHigh ? none : static_cast<uint8_t>(kByte + 4 * pixel); };
  constexpr auto high = [](uint8_t pixel) { return kHigh ? static_cast<uint8_t>(kByte + 4 * pixel) : none; };
  alignas(16) static constexpr uint8_t kLower[16] = {low(0), high(0), low(0), high(0), low(0), high(0),
                                                     low(0), high(0), low(1), high(1), low(1), high(1),
                                                     low(1), high(1), low(1), high(1)};
  alignas(16) static constexpr uint8_t kUpper[16] = {low(2), high(2), low(2), high(2), low(2), high(2),
                                                     low(2), high(2), low(3), high(3), low(3), high(3),
                                                     low(3), high(3), low(3), high(3)};
  const hn::ScalableTag<int16_t> d;
  return {hn::BitCast(d, ShuffleBytes(v, kLower)), hn::BitCast(d, ShuffleBytes(v, kUpper))};
}

// The lower 16 bits of each 32-bit lane in four channels.
HWY_INLINE Halves SpreadWords(I32 v) {
  alignas(16) static constexpr uint8_t kLower[16] = {0, 1, 0, 1, 0, 1, 0, 1, 4, 5, 4, 5, 4, 5, 4, 5};
  alignas(16) static constexpr uint8_t kUpper[16] = {8, 9, 8, 9, 8, 9, 8, 9, 12, 13, 12, 13, 12, 13, 12, 13};
  const hn::ScalableTag<int16_t> d;
  const auto bytes = hn::BitCast(hn::ScalableTag<uint8_t>(), v);
  return {hn::BitCast(d, ShuffleBytes(bytes, kLower)), hn::BitCast(d, ShuffleBytes(bytes, kUpper))};
}

// d + (s - d) weight for weights of 0..32767 in 1/32768. The difference needs nine bits, its last eight are enough.
HWY_INLINE U8 Mix15(U8 s, U8 d, Halves weights) {
  const hn::ScalableTag<uint8_t> d8;
  const hn::ScalableTag<int16_t> d16;
  const auto plusMinus = hn::BitCast(d8, hn::Set(hn::ScalableTag<uint16_t>(), 0xFF01));
  const auto change = [&](U8 pairs, I16 weight) HWY_ATTR {
    return hn::And(hn::MulFixedPoint15(MultiplyAddBytes(pairs, plusMinus), weight), hn::Set(d16, 0xFF));
  };
  return hn::Add(d, PackBlocks(change(hn::InterleaveLower(s, d), weights.lower),
                               change(hn::InterleaveUpper(d8, s, d), weights.upper)));
}

}  // namespace HWY_NAMESPACE
}  // namespace vexel
HWY_AFTER_NAMESPACE();
#endif  // HWY_TARGET

#endif
