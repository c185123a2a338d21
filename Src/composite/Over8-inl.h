// 8-bit compositing over opaque pixels, in 16-bit lanes. Alpha is in the fourth channel, or in the first.
#if defined(VEXEL_COMPOSITE_OVER8_INL_H_) == defined(HWY_TARGET_TOGGLE)
#ifdef VEXEL_COMPOSITE_OVER8_INL_H_
#undef VEXEL_COMPOSITE_OVER8_INL_H_
#else
#define VEXEL_COMPOSITE_OVER8_INL_H_
#endif

#include <cstddef>
#include <cstdint>

#include <hwy/highway.h>

#include "convert/PixelVectors-inl.h"

#if HWY_TARGET != HWY_BASELINE_SCALAR
HWY_BEFORE_NAMESPACE();
namespace vexel {
namespace HWY_NAMESPACE {

// Each pixel's channel kChannel in all four.
template <size_t kChannel>
HWY_INLINE U8 SpreadChannel(U8 v) {
  constexpr uint8_t c = kChannel;
  alignas(16) static constexpr uint8_t kSpread[16] = {c,     c,     c,     c,     c + 4,  c + 4,  c + 4,  c + 4,
                                                      c + 8, c + 8, c + 8, c + 8, c + 12, c + 12, c + 12, c + 12};
  return hn::TableLookupBytes(v, hn::LoadDup128(hn::ScalableTag<uint8_t>(), kSpread));
}

// Sums of neighbours of unsigned times signed bytes; the caller knows that they fit.
HWY_INLINE U16 MultiplyAddBytes(U8 u, U8 s) {
#if HWY_TARGET == HWY_AVX3
  return U16{_mm512_maddubs_epi16(u.raw, s.raw)};
#elif HWY_TARGET == HWY_AVX2
  return U16{_mm256_maddubs_epi16(u.raw, s.raw)};
#else
  return U16{_mm_maddubs_epi16(u.raw, s.raw)};
#endif
}

HWY_INLINE U8 PackBytes(U16 a, U16 b) {
  const hn::ScalableTag<int16_t> di;
  return PackBlocks(hn::BitCast(di, a), hn::BitCast(di, b));
}

// (s a + d (255 - a)) / 255 to nearest, for alphas in all four channels. With pixels less 128 the sum fits 16 signed
// bits; adding 128 * 255 + 128 gives the n + 128 of 128..65153 for which (n + 128) * 257 >> 16 is the rounded quotient.
HWY_INLINE U8 OverOpaque(U8 s, U8 d, U8 alpha) {
  const hn::ScalableTag<uint8_t> d8;
  const hn::ScalableTag<uint16_t> d16;
  const auto flip = hn::Set(d8, 0x80);
  s = hn::Xor(s, flip);
  d = hn::Xor(d, flip);
  const auto rest = hn::Not(alpha);
  const auto quotient = [&](U8 weights, U8 pixels) HWY_ATTR {
    const auto sum = hn::Xor(MultiplyAddBytes(weights, pixels), hn::Set(d16, 0x8000));
    return hn::MulHigh(sum, hn::Set(d16, 257));
  };
  return PackBytes(quotient(hn::InterleaveLower(alpha, rest), hn::InterleaveLower(s, d)),
                   quotient(hn::InterleaveUpper(d8, alpha, rest), hn::InterleaveUpper(d8, s, d)));
}

// Alphas times a fixed-point opacity (1/65536) in 1/32768, each of the 8-bit lanes' halves.
struct Weights15 {
  U16 lower, upper;
};
HWY_INLINE U16 Weight15(U16 alpha257, U16 fixedOpacity) {
  return hn::AverageRound(hn::MulHigh(alpha257, fixedOpacity), hn::Zero(hn::ScalableTag<uint16_t>()));
}
HWY_INLINE Weights15 WeightsOf(U8 alpha, U16 fixedOpacity) {
  const hn::ScalableTag<uint16_t> d16;
  const auto pair = [&](U8 v) HWY_ATTR { return hn::BitCast(d16, v); };
  return {Weight15(pair(hn::InterleaveLower(alpha, alpha)), fixedOpacity),
          Weight15(pair(hn::InterleaveUpper(hn::ScalableTag<uint8_t>(), alpha, alpha)), fixedOpacity)};
}

// d + (s - d) weight with seven bits between.
HWY_INLINE U8 OverOpaqueWeighted(U8 s, U8 d, Weights15 weights) {
  const hn::ScalableTag<uint8_t> d8;
  const hn::ScalableTag<int16_t> d16;
  const auto zero = hn::Zero(d8);
  const auto times128 = [&](U8 bytesAboveZeros) HWY_ATTR {
    return hn::BitCast(d16, hn::ShiftRight<1>(hn::BitCast(hn::ScalableTag<uint16_t>(), bytesAboveZeros)));
  };
  const auto mixed = [&](I16 from, I16 to, U16 weight) HWY_ATTR {
    const auto difference = hn::MulFixedPoint15(hn::Sub(to, from), hn::BitCast(d16, weight));
    return hn::MulFixedPoint15(hn::Add(from, difference), hn::Set(d16, 256));
  };
  return PackBlocks(
      mixed(times128(hn::InterleaveLower(zero, d)), times128(hn::InterleaveLower(zero, s)), weights.lower),
      mixed(times128(hn::InterleaveUpper(d8, zero, d)), times128(hn::InterleaveUpper(d8, zero, s)), weights.upper));
}

}  // namespace HWY_NAMESPACE
}  // namespace vexel
HWY_AFTER_NAMESPACE();
#endif  // HWY_TARGET

#endif
