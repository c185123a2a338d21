#include "convert/Encode420Kernels.h"

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <cstring>

#include "convert/PairOrder.h"

#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "convert/Encode420Kernels.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

#include "convert/Pairs422-inl.h"
#include "frame/KernelTable.h"

#ifndef VEXEL_CONVERT_ENCODE420KERNELS_SCALES
#define VEXEL_CONVERT_ENCODE420KERNELS_SCALES
namespace vexel::encode420 {
namespace {

using decode420::PixelRow;

// Fractional bits of the factors.
inline constexpr int kFactorBits = 15;

// Weights of the two lines that make a chroma row; kBits are the fractional bits of their sums, filtered across.
template <int kWeightA, int kWeightB>
struct Weights {
  static constexpr int kA = kWeightA, kB = kWeightB;
  static constexpr int kBits = kA + kB == 4 ? 4 : 3;
  static_assert(4 * (kA + kB) == 1 << kBits);
};
using Even = Weights<1, 1>;
using NearFirst = Weights<3, 1>;
using NearSecond = Weights<1, 3>;

}  // namespace
}  // namespace vexel::encode420
#endif

#if HWY_TARGET != HWY_SCALAR
HWY_BEFORE_NAMESPACE();
namespace vexel::encode420 {
namespace HWY_NAMESPACE {
namespace {
using namespace vexel::HWY_NAMESPACE;
using hwy::HWY_NAMESPACE::ScalableTag;

constexpr size_t kPixels = kLanes<uint32_t>;  // in a vector
constexpr size_t kBlock = 4 * kPixels;

HWY_INLINE I32 Set(int32_t value) { return hn::Set(ScalableTag<int32_t>(), value); }

template <class W>
HWY_INLINE I16 WeightedSum(I16 a, I16 b) {
  const I16 sum = hn::Add(a, b);
  if constexpr (W::kA == 3) return hn::Add(sum, hn::Add(a, a));
  if constexpr (W::kB == 3) return hn::Add(sum, hn::Add(b, b));
  return sum;
}

// Even and odd pixels of two vectors. In each 128-bit block those of `low` come before those of `high`.
struct EvenOdd {
  I16 even, odd;
};
HWY_INLINE EvenOdd TakeApart(I16 low, I16 high) {
#if HWY_TARGET == HWY_AVX3
  const __m512 a = _mm512_castsi512_ps(low.raw), b = _mm512_castsi512_ps(high.raw);
  return {I16{_mm512_castps_si512(_mm512_shuffle_ps(a, b, 0x88))},
          I16{_mm512_castps_si512(_mm512_shuffle_ps(a, b, 0xDD))}};
#elif HWY_TARGET == HWY_AVX2
  const __m256 a = _mm256_castsi256_ps(low.raw), b = _mm256_castsi256_ps(high.raw);
  return {I16{_mm256_castps_si256(_mm256_shuffle_ps(a, b, 0x88))},
          I16{_mm256_castps_si256(_mm256_shuffle_ps(a, b, 0xDD))}};
#else
  const __m128 a = _mm_castsi128_ps(low.raw), b = _mm_castsi128_ps(high.raw);
  return {I16{_mm_castps_si128(_mm_shuffle_ps(a, b, 0x88))}, I16{_mm_castps_si128(_mm_shuffle_ps(a, b, 0xDD))}};
#endif
}

// Odd pixels in the places of the even ones behind them, the last one in the first place.
HWY_INLINE I16 MoveBehind(I16 odd) {
#if HWY_TARGET == HWY_AVX3
  return I16{
      _mm512_permutexvar_epi32(_mm512_setr_epi32(15, 0, 13, 2, 1, 4, 3, 6, 5, 8, 7, 10, 9, 12, 11, 14), odd.raw)};
#elif HWY_TARGET == HWY_AVX2
  return I16{_mm256_permutevar8x32_epi32(odd.raw, _mm256_setr_epi32(7, 0, 5, 2, 1, 4, 3, 6))};
#else
  return I16{_mm_shuffle_epi32(odd.raw, 0x93)};
#endif
}

// The first pixel of one vector, the others of another.
HWY_INLINE I16 ReplaceFirst(I16 first, I16 others) {
#if HWY_TARGET == HWY_AVX3
  return I16{_mm512_mask_mov_epi32(others.raw, 1, first.raw)};
#elif HWY_TARGET == HWY_AVX2
  return I16{_mm256_blend_epi32(others.raw, first.raw, 1)};
#else
  return I16{_mm_castps_si128(_mm_move_ss(_mm_castsi128_ps(others.raw), _mm_castsi128_ps(first.raw)))};
#endif
}

// U in the lower half, V in the upper one. Nothing shorter than 16 bytes goes past the cache.
template <bool kStream>
HWY_INLINE void WriteChroma(U8 chroma, uint8_t* u, uint8_t* v) {
  const hn::Half<ScalableTag<uint8_t>> d;
  const auto low = hn::LowerHalf(d, chroma), high = hn::UpperHalf(d, chroma);
  if constexpr (kStream && HWY_MAX_BYTES > 16) {
    hn::Stream(low, d, u);
    hn::Stream(high, d, v);
  } else {
    hn::StoreU(low, d, u);
    hn::StoreU(high, d, v);
  }
}

// Bytes of two vectors of words (u, v), U in the lower half.
HWY_INLINE U8 PackPlanes(I16 low, I16 high) {
  static constexpr ShuffleTable kPlanes({0, 2, 4, 6, 8, 10, 12, 14, 1, 3, 5, 7, 9, 11, 13, 15});
  return OrderPacked4(hn::TableLookupBytes(PackBlocks(low, high), kPlanes.Load()));
}

// Bytes of four vectors of pixels, from words (0, 1) and (2, 3) side by side, to memory order.
HWY_INLINE U8 PackLuma(I16 words01, I16 words23) {
  static constexpr ShuffleTable kOrder({0, 2, 4, 6, 1, 3, 5, 7, 8, 10, 12, 14, 9, 11, 13, 15});
  return OrderPacked4(hn::TableLookupBytes(PackBlocks(words01, words23), kOrder.Load()));
}

// Bytes of chroma, in each 128-bit block of U and then of V, to memory order, U in the lower half.
HWY_INLINE U8 OrderChroma(U8 packed) {
#if HWY_TARGET == HWY_AVX3
  alignas(64) static constexpr uint16_t kOrder[32] = {0, 8,  16, 24, 1, 9,  17, 25, 2, 10, 18, 26, 3, 11, 19, 27,
                                                      4, 12, 20, 28, 5, 13, 21, 29, 6, 14, 22, 30, 7, 15, 23, 31};
  return U8{_mm512_permutexvar_epi16(_mm512_load_si512(kOrder), packed.raw)};
#elif HWY_TARGET == HWY_AVX2
  static constexpr ShuffleTable kOrder({0, 1, 8, 9, 2, 3, 10, 11, 4, 5, 12, 13, 6, 7, 14, 15});
  return hn::TableLookupBytes(OrderPacked2(packed), kOrder.Load());
#else
  return packed;
#endif
}

// By the differences of blue and red from green: the factors of chroma sum to 0, those of luma to 1. Of BGR as it is,
// or of straight alpha over black.
template <bool kPremultiply>
struct FromBgr {
  static constexpr bool kHasAlpha = kPremultiply;
  struct Pixels {
    U16 green;   // in both words of a pixel; of BGR as it is, in their high bytes, over others
    I16 chroma;  // (b - g, r - g)
  };
  I16 luma, u, v;
  explicit HWY_INLINE FromBgr(const Factors& f)
      : luma(WordPair(2 * f.luma.b, 2 * f.luma.r)), u(WordPair(f.u.b, f.u.r)), v(WordPair(f.v.b, f.v.r)) {}
  static HWY_INLINE Pixels SplitOpaque(U8 pixels) {
    const U8 bgrg = hn::TableLookupBytes(pixels, ByteOrder<0x1210>());
    return {kPremultiply ? hn::ShiftRight<8>(AsU16(bgrg)) : AsU16(bgrg), SubtractOddBytes(bgrg)};
  }
  static HWY_INLINE Pixels Split(U8 pixels) {
    if constexpr (!kPremultiply) return SplitOpaque(pixels);
    const U16 alpha = AsU16(hn::TableLookupBytes(pixels, ByteOrder<0x8383>()));
    const U16 green = Scale(AsU16(hn::TableLookupBytes(pixels, ByteOrder<0x8181>())), alpha);
    return {green, AsI16(hn::Sub(Scale(AsU16(hn::And(pixels, Dwords(0x00FF00FF))), alpha), green))};
  }
  // c a / 255 to nearest: (t + 128) 257 >> 16 of t = c a.
  static HWY_INLINE U16 Scale(U16 channels, U16 alpha) {
    const ScalableTag<uint16_t> d;
    return hn::MulHigh(hn::Add(hn::Mul(channels, alpha), hn::Set(d, uint16_t{128})), hn::Set(d, uint16_t{257}));
  }
  // What luma has besides green, in the high words.
  HWY_INLINE I16 LumaDifference(const Pixels& p) const {
    return AsI16(hn::Add(MultiplyPairs(p.chroma, luma), Set(1 << kFactorBits)));
  }
  // Words of two vectors side by side.
  HWY_INLINE I16 Luma(const Pixels& p0, const Pixels& p1) const {
    const U16 words = hn::OddEven(p1.green, p0.green), green = kPremultiply ? words : hn::ShiftRight<8>(words);
    return hn::Add(AsI16(green), JoinHighWords(LumaDifference(p0), LumaDifference(p1)));
  }
  template <int kBits>
  static HWY_INLINE I32 Dot(I16 sums, I16 factors) {
    constexpr int kShift = kFactorBits + kBits;
    return hn::ShiftRight<kShift>(hn::Add(MultiplyPairs(sums, factors), Set((128 << kShift) + (1 << (kShift - 1)))));
  }
  // Of the filtered sums of two vectors.
  template <int kBits>
  HWY_INLINE U8 Chroma(I16 low, I16 high) const {
    const ScalableTag<int16_t> d;
    return OrderChroma(PackBlocks(hn::ReorderDemote2To(d, Dot<kBits>(low, u), Dot<kBits>(high, u)),
                                  hn::ReorderDemote2To(d, Dot<kBits>(low, v), Dot<kBits>(high, v))));
  }
};

struct FromVuy {
  static constexpr bool kHasAlpha = false;
  struct Pixels {
    U8 vuya;
    I16 chroma;  // (u, v)
  };
  explicit HWY_INLINE FromVuy(const Factors&) {}
  static HWY_INLINE Pixels Split(U8 pixels) {
    return {pixels, AsI16(hn::TableLookupBytes(pixels, ByteOrder<0x8081>()))};
  }
  HWY_INLINE I16 Luma(const Pixels& p0, const Pixels& p1) const {
    return hn::And(JoinHighWords(AsI16(p0.vuya), AsI16(p1.vuya)), AsI16(Dwords(0x00FF00FF)));
  }
  template <int kBits>
  HWY_INLINE U8 Chroma(I16 low, I16 high) const {
    static constexpr ShuffleTable kPlanes({0, 2, 4, 6, 8, 10, 12, 14, 1, 3, 5, 7, 9, 11, 13, 15});
    const auto round = [](I16 sums) HWY_ATTR {
      return hn::ShiftRight<kBits>(hn::Add(sums, hn::Set(ScalableTag<int16_t>(), 1 << (kBits - 1))));
    };
    return OrderChroma(hn::TableLookupBytes(PackBlocks(round(low), round(high)), kPlanes.Load()));
  }
};

template <class W, class Op>
class Encoder {
 public:
  // From the pixels before, or the first ones, which go on to the left.
  HWY_INLINE Encoder(const Factors& factors, const uint8_t* a, const uint8_t* b) : mOp(factors) {
    uint32_t pixelA, pixelB;
    std::memcpy(&pixelA, a, 4);
    std::memcpy(&pixelB, b, 4);
    mBefore = WeightedSum<W>(Op::Split(Dwords(pixelA)).chroma, Op::Split(Dwords(pixelB)).chroma);
  }

  template <bool kStream>
  HWY_INLINE void Block(const uint8_t* a, const uint8_t* b, uint8_t* lumaA, uint8_t* lumaB, uint8_t* u, uint8_t* v) {
    const Step low = Next(a, b), high = Next(a + 2 * HWY_MAX_BYTES, b + 2 * HWY_MAX_BYTES);
    WriteVector<kStream>(PackLuma(low.lumaA, high.lumaA), lumaA, 0);
    WriteVector<kStream>(PackLuma(low.lumaB, high.lumaB), lumaB, 0);
    WriteChroma<kStream>(mOp.template Chroma<W::kBits>(low.chroma, high.chroma), u, v);
  }

 private:
  using Pixels = typename Op::Pixels;
  // Of two vectors of pixels of either line: luma, and the filtered sums of chroma.
  struct Step {
    I16 lumaA, lumaB, chroma;
  };
  HWY_INLINE Step Next(const uint8_t* a, const uint8_t* b) {
    const U8 a0 = LoadVector<uint8_t>(a, 0), a1 = LoadVector<uint8_t>(a, 1);
    const U8 b0 = LoadVector<uint8_t>(b, 0), b1 = LoadVector<uint8_t>(b, 1);
    if constexpr (Op::kHasAlpha) {
      const ScalableTag<uint32_t> d;
      const auto opaque = hn::BitCast(d, Dwords(0xFF000000)),
                 all = hn::BitCast(d, hn::And(hn::And(a0, a1), hn::And(b0, b1)));
      if (hn::AllTrue(d, hn::Eq(hn::And(all, opaque), opaque)))
        return Next(Op::SplitOpaque(a0), Op::SplitOpaque(a1), Op::SplitOpaque(b0), Op::SplitOpaque(b1));
    }
    return Next(Op::Split(a0), Op::Split(a1), Op::Split(b0), Op::Split(b1));
  }
  HWY_INLINE Step Next(const Pixels& a0, const Pixels& a1, const Pixels& b0, const Pixels& b1) {
    return {mOp.Luma(a0, a1), mOp.Luma(b0, b1),
            Filter(WeightedSum<W>(a0.chroma, b0.chroma), WeightedSum<W>(a1.chroma, b1.chroma))};
  }
  // (1, 2, 1) about the even pixels.
  HWY_INLINE I16 Filter(I16 low, I16 high) {
    const EvenOdd sums = TakeApart(low, high);
    const I16 moved = MoveBehind(sums.odd), before = ReplaceFirst(mBefore, moved);
    mBefore = moved;
    return hn::Add(hn::Add(sums.even, sums.even), hn::Add(sums.odd, before));
  }

  const Op mOp;
  I16 mBefore;  // the odd pixel before, in the first place
};

// Asks for memory. Addresses past its end do no harm.
template <size_t kBytes>
HWY_INLINE void Fetch(uintptr_t address) {
  for (size_t offset = 0; offset < kBytes; offset += 64)
    __builtin_prefetch(reinterpret_cast<const void*>(address + offset));
}

template <class W, class Op, bool kStream>
HWY_INLINE void EncodeRows(const LinePair& lines, const Factors& factors) {
  const size_t before = lines.continues ? 4 : 0;
  Encoder<W, Op> encoder(factors, lines.a - before, lines.b - before);
  size_t x = 0;
  for (; x + kBlock <= lines.width; x += kBlock) {
    Fetch<4 * kBlock>(lines.nextA + 4 * x);
    Fetch<4 * kBlock>(lines.nextB + 4 * x);
    encoder.template Block<kStream>(lines.a + 4 * x, lines.b + 4 * x, lines.lumaA + x, lines.lumaB + x, lines.u + x / 2,
                                    lines.v + x / 2);
  }
  const size_t rest = lines.width - x;
  if (rest == 0) return;
  // The last pixel goes on to the right.
  alignas(64) uint8_t a[4 * kBlock] = {};
  alignas(64) uint8_t b[4 * kBlock] = {};
  std::memcpy(a, lines.a + 4 * x, 4 * rest);
  std::memcpy(b, lines.b + 4 * x, 4 * rest);
  std::memcpy(a + 4 * rest, lines.a + 4 * (lines.width - 1), 4);
  std::memcpy(b + 4 * rest, lines.b + 4 * (lines.width - 1), 4);
  alignas(64) uint8_t lumaA[kBlock], lumaB[kBlock], u[kBlock / 2], v[kBlock / 2];
  encoder.template Block<false>(a, b, lumaA, lumaB, u, v);
  std::memcpy(lines.lumaA + x, lumaA, rest);
  std::memcpy(lines.lumaB + x, lumaB, rest);
  std::memcpy(lines.u + x / 2, u, lines.chromaWidth - x / 2);
  std::memcpy(lines.v + x / 2, v, lines.chromaWidth - x / 2);
}

// Two lines of packed 4:2:2. An odd pixel has the mean of its neighbours' chroma, rounded up.
template <class W, PairOrder kOrder>
class PairEncoder {
 public:
  // Pixels of two vectors of pairs. A step takes the luma of a block and, as its chroma needs the pairs after it, makes
  // the chroma of the block before.
  static constexpr size_t kStep = 4 * kVectorPairs, kStepBytes = 2 * kStep;

  // The first pair goes on to the left.
  HWY_INLINE PairEncoder(uint32_t pairA, uint32_t pairB) { mBefore = Join(Dwords(pairA), Dwords(pairB)); }

  template <bool kStream>
  HWY_INLINE void Luma(const uint8_t* pairs, uint8_t* luma) const {
    constexpr int kByte = LumaByte(kOrder);
    const auto words = [&](size_t i) HWY_ATTR { return AsI16(WordBytes<kByte>(LoadVector<uint8_t>(pairs, i))); };
    WriteVector<kStream>(OrderPacked2(PackBlocks(words(0), words(1))), luma, 0);
  }
  HWY_INLINE void Take(const uint8_t* a, const uint8_t* b) {
    mNext[0] = Join(LoadVector<uint8_t>(a, 0), LoadVector<uint8_t>(b, 0));
    mNext[1] = Join(LoadVector<uint8_t>(a, 1), LoadVector<uint8_t>(b, 1));
  }
  template <bool kStream>
  HWY_INLINE void Chroma(uint8_t* u, uint8_t* v) {
    const I16 low = Filter(mNow[0], mNow[1]), high = Filter(mNow[1], mNext[0]);
    WriteChroma<kStream>(PackPlanes(low, high), u, v);
    Advance();
  }
  HWY_INLINE void Advance() { mNow[0] = mNext[0], mNow[1] = mNext[1]; }

 private:
  // Chroma of line a in the low bytes of words, of line b in the high ones.
  static HWY_INLINE U8 Join(U8 a, U8 b) {
    const U16 high = AsU16(Dwords(0xFF00FF00)), wordsA = AsU16(a), wordsB = AsU16(b);
    if constexpr (kOrder == PairOrder::Uyvy) return AsU8(hn::Or(hn::AndNot(high, wordsA), hn::ShiftLeft<8>(wordsB)));
    return AsU8(hn::OrAnd(hn::ShiftRight<8>(wordsA), wordsB, high));
  }
  // (1, 2, 1) about the even pixels, in all 2^kBits.
  HWY_INLINE I16 Filter(U8 even, U8 following) {
    const U8 weights = Dwords(W::kA * 0x00010001 + W::kB * 0x01000100), twice = hn::Add(weights, weights);
    const U8 odd = hn::AverageRound(even, ShiftLaneIn(even, following)), before = ShiftLaneOut(mBefore, odd);
    mBefore = odd;
    const I16 sum = hn::Add(WeighBytes(even, twice), hn::Add(WeighBytes(odd, weights), WeighBytes(before, weights)));
    return hn::ShiftRight<W::kBits>(hn::Add(sum, hn::Set(ScalableTag<int16_t>(), 1 << (W::kBits - 1))));
  }

  U8 mNow[2], mNext[2];
  U8 mBefore;  // the odd pixels before, the last one in the last place
};

template <class W, PairOrder kOrder, bool kStream>
HWY_INLINE void EncodePairs(const LinePair& lines) {
  using Pairs = PairEncoder<W, kOrder>;
  constexpr size_t kStep = Pairs::kStep, kStepBytes = Pairs::kStepBytes;
  const size_t steps = lines.width / kStep, rest = lines.width % kStep, pairs = (lines.width + 1) / 2;
  // The last pair goes on to the right.
  alignas(64) uint8_t a[2 * kStepBytes], b[2 * kStepBytes];
  uint32_t firstA, firstB, lastA, lastB;
  std::memcpy(&firstA, lines.a, 4);
  std::memcpy(&firstB, lines.b, 4);
  std::memcpy(&lastA, lines.a + 4 * (pairs - 1), 4);
  std::memcpy(&lastB, lines.b + 4 * (pairs - 1), 4);
  for (size_t i = 0; i < 4; ++i) StoreVector(Dwords(lastA), a, i), StoreVector(Dwords(lastB), b, i);
  std::memcpy(a, lines.a + steps * kStepBytes, (rest + 1) / 2 * 4);
  std::memcpy(b, lines.b + steps * kStepBytes, (rest + 1) / 2 * 4);

  Pairs encoder(firstA, firstB);
  const auto take = [&](size_t i) HWY_ATTR {
    encoder.Take(lines.a + i * kStepBytes, lines.b + i * kStepBytes);
    encoder.template Luma<kStream>(lines.a + i * kStepBytes, lines.lumaA + i * kStep);
    encoder.template Luma<kStream>(lines.b + i * kStepBytes, lines.lumaB + i * kStep);
  };
  const auto finish = [&](size_t i) HWY_ATTR {
    encoder.template Chroma<kStream>(lines.u + i * kStep / 2, lines.v + i * kStep / 2);
  };
  if (steps > 0) {
    take(0);
    encoder.Advance();
    for (size_t i = 1; i < steps; ++i) {
      Fetch<kStepBytes>(lines.nextA + i * kStepBytes);
      Fetch<kStepBytes>(lines.nextB + i * kStepBytes);
      take(i);
      finish(i - 1);
    }
    encoder.Take(a, b);
    finish(steps - 1);
  } else {
    encoder.Take(a, b);
    encoder.Advance();
  }
  if (rest == 0) return;
  alignas(64) uint8_t luma[kStep], u[kStep / 2], v[kStep / 2];
  encoder.template Luma<false>(a, luma);
  std::memcpy(lines.lumaA + steps * kStep, luma, rest);
  encoder.template Luma<false>(b, luma);
  std::memcpy(lines.lumaB + steps * kStep, luma, rest);
  encoder.Take(a + kStepBytes, b + kStepBytes);
  encoder.template Chroma<false>(u, v);
  std::memcpy(lines.u + steps * kStep / 2, u, lines.chromaWidth - steps * kStep / 2);
  std::memcpy(lines.v + steps * kStep / 2, v, lines.chromaWidth - steps * kStep / 2);
}

template <class W>
void EncodeUyvy(const LinePair& lines, const Factors&) {
  lines.stream ? EncodePairs<W, PairOrder::Uyvy, true>(lines) : EncodePairs<W, PairOrder::Uyvy, false>(lines);
}
template <class W>
void EncodeYuyv(const LinePair& lines, const Factors&) {
  lines.stream ? EncodePairs<W, PairOrder::Yuyv, true>(lines) : EncodePairs<W, PairOrder::Yuyv, false>(lines);
}
template <class W>
void EncodeBgrx(const LinePair& lines, const Factors& factors) {
  lines.stream ? EncodeRows<W, FromBgr<false>, true>(lines, factors)
               : EncodeRows<W, FromBgr<false>, false>(lines, factors);
}
template <class W>
void EncodeBgra(const LinePair& lines, const Factors& factors) {
  lines.stream ? EncodeRows<W, FromBgr<true>, true>(lines, factors)
               : EncodeRows<W, FromBgr<true>, false>(lines, factors);
}
template <class W>
void EncodeVuyx(const LinePair& lines, const Factors& factors) {
  lines.stream ? EncodeRows<W, FromVuy, true>(lines, factors) : EncodeRows<W, FromVuy, false>(lines, factors);
}

// Chroma between 4:2:0 pictures, in words (u, v). Even pixels have a mixture of two rows, odd ones the mean of two
// mixtures, rounded as pixels are.
template <class W, bool kPlanes>
class ChromaRecoder {
 public:
  static constexpr size_t kStep = 2 * kVectorPairs, kBytes = kPlanes ? 1 : 2;  // samples, and bytes of one in a row
  static constexpr size_t kRows = kPlanes ? 8 : 4;                             // rows of line a and b, of V likewise

  // The first sample goes on to the left.
  HWY_INLINE ChromaRecoder(const PixelRow& a, const PixelRow& b)
      : mA{Weight(a.weightA), Weight(a.weightB)}, mB{Weight(b.weightA), Weight(b.weightB)} {
    const auto first = [&](size_t plane) HWY_ATTR {
      const auto even = [&](const PixelRow& row) {
        const uint8_t *const p = kPlanes && plane == 1 ? row.v : row.u, *const q =
                                                                            kPlanes && plane == 1 ? row.vB : row.uB;
        const size_t at = kPlanes ? 0 : plane;
        return (row.weightA * p[at] + row.weightB * q[at] + 4) / 8;
      };
      return W::kA * even(a) + W::kB * even(b);
    };
    mBefore = AsI16(Dwords(first(0) | first(1) << 16));
  }

  HWY_INLINE void Take(const uint8_t* const (&rows)[kRows], size_t first) {
    const size_t low = first * kBytes, high = (first + kVectorPairs) * kBytes;  // by hand: loops keep vectors in memory
    mNextA[0] = Mix(rows, 0, low, mA), mNextA[1] = Mix(rows, 0, high, mA);
    mNextB[0] = Mix(rows, 2, low, mB), mNextB[1] = Mix(rows, 2, high, mB);
  }
  HWY_INLINE void Advance() { mNowA[0] = mNextA[0], mNowA[1] = mNextA[1], mNowB[0] = mNextB[0], mNowB[1] = mNextB[1]; }
  HWY_INLINE void Make(uint8_t* u, uint8_t* v) {
    const I16 low = Filter(mNowA[0], mNowA[1], mNowB[0], mNowB[1]);
    WriteChroma<false>(PackPlanes(low, Filter(mNowA[1], mNextA[0], mNowB[1], mNextB[0])), u, v);
    Advance();
  }

 private:
  static HWY_INLINE U16 Weight(uint32_t weight) {
    return hn::Set(ScalableTag<uint16_t>(), static_cast<uint16_t>(weight));
  }
  static HWY_INLINE U16 Load(const uint8_t* const (&rows)[kRows], size_t row, size_t offset) {
    if constexpr (!kPlanes) return LoadPromoted<uint16_t, uint8_t>(rows[row] + offset);
    return AsU16(hn::Or(LoadPromoted<uint32_t, uint8_t>(rows[row] + offset),
                        hn::ShiftLeft<16>(LoadPromoted<uint32_t, uint8_t>(rows[row + kRows / 2] + offset))));
  }
  // In eighths, with half a unit for rounding.
  static HWY_INLINE U16 Mix(const uint8_t* const (&rows)[kRows], size_t row, size_t offset, const U16 (&weights)[2]) {
    const U16 sum =
        hn::Add(hn::Mul(Load(rows, row, offset), weights[0]), hn::Mul(Load(rows, row + 1, offset), weights[1]));
    return hn::Add(sum, Weight(4));
  }
  // (1, 2, 1) about the even pixels, in all 2^kBits.
  HWY_INLINE I16 Filter(U16 a, U16 followingA, U16 b, U16 followingB) {
    const auto odd = [](U16 own, U16 following)
                         HWY_ATTR { return AsI16(hn::ShiftRight<4>(hn::Add(own, ShiftLaneIn(own, following)))); };
    const I16 evens = WeightedSum<W>(AsI16(hn::ShiftRight<3>(a)), AsI16(hn::ShiftRight<3>(b)));
    const I16 odds = WeightedSum<W>(odd(a, followingA), odd(b, followingB)), before = ShiftLaneOut(mBefore, odds);
    mBefore = odds;
    const I16 sum = hn::Add(hn::Add(evens, evens), hn::Add(odds, before));
    return hn::ShiftRight<W::kBits>(hn::Add(sum, AsI16(Weight(1 << (W::kBits - 1)))));
  }

  U16 mA[2], mB[2];
  U16 mNowA[2], mNextA[2], mNowB[2], mNextB[2];
  I16 mBefore;  // the odd pixels before, weighted, the last ones in the last place
};

template <class W, bool kPlanes>
HWY_INLINE void RecodeRows(const PixelRow& a, const PixelRow& b, uint8_t* u, uint8_t* v, size_t count) {
  using Recoder = ChromaRecoder<W, kPlanes>;
  constexpr size_t kStep = Recoder::kStep, kBytes = Recoder::kBytes, kRows = Recoder::kRows;
  const uint8_t* const all[] = {a.u, a.uB, b.u, b.uB, a.v, a.vB, b.v, b.vB};
  const size_t steps = a.chroma / kStep, rest = a.chroma % kStep, done = steps * kStep;
  // The last sample goes on to the right.
  const uint8_t *rows[kRows], *ends[kRows];
  alignas(64) uint8_t tails[kRows][2 * kStep * kBytes];
  for (size_t k = 0; k < kRows; ++k) {
    rows[k] = all[k], ends[k] = tails[k];
    uint16_t last = all[k][(a.chroma - 1) * kBytes];
    if (kPlanes)
      last = static_cast<uint16_t>(last * 0x101);
    else
      std::memcpy(&last, all[k] + (a.chroma - 1) * kBytes, 2);
    for (size_t i = 0; i < sizeof tails[k] / HWY_MAX_BYTES; ++i)
      StoreVector(hn::Set(ScalableTag<uint16_t>(), last), tails[k], i);
    std::memcpy(tails[k], all[k] + done * kBytes, rest * kBytes);
  }
  Recoder recoder(a, b);
  if (steps > 0) {
    recoder.Take(rows, 0);
    recoder.Advance();
    for (size_t i = 1; i < steps; ++i) {
      recoder.Take(rows, i * kStep);
      recoder.Make(u + (i - 1) * kStep, v + (i - 1) * kStep);
    }
    recoder.Take(ends, 0);
    recoder.Make(u + done - kStep, v + done - kStep);
  } else {
    recoder.Take(ends, 0);
    recoder.Advance();
  }
  if (count == done) return;
  alignas(64) uint8_t lastU[kStep], lastV[kStep];
  recoder.Take(ends, kStep);
  recoder.Make(lastU, lastV);
  std::memcpy(u + done, lastU, count - done);
  std::memcpy(v + done, lastV, count - done);
}

template <class W>
void RecodePlanes(const PixelRow& a, const PixelRow& b, uint8_t* u, uint8_t* v, size_t count) {
  RecodeRows<W, true>(a, b, u, v, count);
}
template <class W>
void RecodePairs(const PixelRow& a, const PixelRow& b, uint8_t* u, uint8_t* v, size_t count) {
  RecodeRows<W, false>(a, b, u, v, count);
}

}  // namespace
}  // namespace HWY_NAMESPACE
}  // namespace vexel::encode420
HWY_AFTER_NAMESPACE();
#endif  // HWY_TARGET

#if HWY_ONCE
namespace vexel::encode420 {
namespace plain {
namespace {

template <int kBits>
uint8_t Round(int32_t sum) {
  const int32_t code = (sum + (1 << (kBits - 1))) >> kBits;
  return static_cast<uint8_t>(code < 0 ? 0 : code > 255 ? 255 : code);
}

template <bool kPremultiply>
struct FromBgr {
  const Factors& factors;
  static int32_t Channel(const uint8_t* pixel, size_t k) {
    return kPremultiply ? (2 * pixel[k] * pixel[3] + 255) / 510 : pixel[k];
  }
  static int32_t Dot(const BgrFactors& f, const int32_t* p) { return p[0] * f.b + p[1] * f.g + p[2] * f.r; }
  uint8_t Luma(const int32_t* pixel) const { return Round<kFactorBits>(Dot(factors.luma, pixel)); }
  template <int kBits>
  uint8_t Chroma(const BgrFactors& f, const int32_t* sums) const {
    return Round<kFactorBits + kBits>(Dot(f, sums) + (128 << (kFactorBits + kBits)));
  }
  template <int kBits>
  uint8_t U(const int32_t* sums) const {
    return Chroma<kBits>(factors.u, sums);
  }
  template <int kBits>
  uint8_t V(const int32_t* sums) const {
    return Chroma<kBits>(factors.v, sums);
  }
};

struct FromVuy {
  explicit FromVuy(const Factors&) {}
  static int32_t Channel(const uint8_t* pixel, size_t k) { return pixel[k]; }
  uint8_t Luma(const int32_t* pixel) const { return static_cast<uint8_t>(pixel[2]); }
  template <int kBits>
  uint8_t U(const int32_t* sums) const {
    return Round<kBits>(sums[1]);
  }
  template <int kBits>
  uint8_t V(const int32_t* sums) const {
    return Round<kBits>(sums[0]);
  }
};

template <class Op>
void LumaRow(const uint8_t* pixels, uint8_t* luma, size_t width, const Op& op) {
  for (size_t x = 0; x < width; ++x) {
    int32_t pixel[3];
    for (size_t k = 0; k < 3; ++k) pixel[k] = Op::Channel(pixels + 4 * x, k);
    luma[x] = op.Luma(pixel);
  }
}

template <class W, class Op>
void EncodeRows(const LinePair& lines, const Factors& factors) {
  const Op op{factors};
  LumaRow(lines.a, lines.lumaA, lines.width, op);
  LumaRow(lines.b, lines.lumaB, lines.width, op);
  for (size_t i = 0; i < lines.chromaWidth; ++i) {
    const size_t x = 2 * i, left = x == 0 ? 0 : x - 1, right = std::min(x + 1, lines.width - 1);
    int32_t sums[3];
    for (size_t k = 0; k < 3; ++k) {
      const auto across = [&](const uint8_t* line) {
        const auto at = [&](size_t column) { return Op::Channel(line + 4 * column, k); };
        return (x == 0 && lines.continues ? Op::Channel(line - 4, k) : at(left)) + 2 * at(x) + at(right);
      };
      sums[k] = W::kA * across(lines.a) + W::kB * across(lines.b);
    }
    lines.u[i] = op.template U<W::kBits>(sums);
    lines.v[i] = op.template V<W::kBits>(sums);
  }
}

template <class W, PairOrder kOrder>
void EncodePairs(const LinePair& lines) {
  const size_t pairs = (lines.width + 1) / 2;
  const auto at = [&](const uint8_t* line, size_t i) {
    return vexel::plain::LoadPair(kOrder, line + 4 * std::min(i, pairs - 1));
  };
  for (size_t x = 0; x < lines.width; ++x) {
    lines.lumaA[x] = static_cast<uint8_t>(at(lines.a, x / 2).y[x % 2]);
    lines.lumaB[x] = static_cast<uint8_t>(at(lines.b, x / 2).y[x % 2]);
  }
  for (size_t i = 0; i < lines.chromaWidth; ++i) {
    int32_t u = 0, v = 0;
    const auto add = [&](const uint8_t* line, int32_t weight) {
      const auto left = at(line, i == 0 ? 0 : i - 1), own = at(line, i), right = at(line, i + 1);
      const auto across = [](int l, int c, int r) { return (l + c + 1) / 2 + 2 * c + (c + r + 1) / 2; };
      u += weight * across(left.u, own.u, right.u);
      v += weight * across(left.v, own.v, right.v);
    };
    add(lines.a, W::kA);
    add(lines.b, W::kB);
    lines.u[i] = Round<W::kBits>(u);
    lines.v[i] = Round<W::kBits>(v);
  }
}

template <class W>
void EncodeUyvy(const LinePair& lines, const Factors&) {
  EncodePairs<W, PairOrder::Uyvy>(lines);
}
template <class W>
void EncodeYuyv(const LinePair& lines, const Factors&) {
  EncodePairs<W, PairOrder::Yuyv>(lines);
}
template <class W>
void EncodeBgrx(const LinePair& lines, const Factors& factors) {
  EncodeRows<W, FromBgr<false>>(lines, factors);
}
template <class W>
void EncodeBgra(const LinePair& lines, const Factors& factors) {
  EncodeRows<W, FromBgr<true>>(lines, factors);
}
template <class W>
void EncodeVuyx(const LinePair& lines, const Factors& factors) {
  EncodeRows<W, FromVuy>(lines, factors);
}

template <class W, bool kPlanes>
void RecodePlane(const PixelRow& a, const PixelRow& b, size_t plane, uint8_t* out, size_t count) {
  const auto code = [&](const PixelRow& row, size_t x) {
    const uint8_t *const p = kPlanes && plane == 1 ? row.v : row.u, *const q = kPlanes && plane == 1 ? row.vB : row.uB;
    const auto mixed = [&](size_t i) {
      const size_t at = kPlanes ? i : 2 * i + plane;
      return static_cast<int32_t>(row.weightA * p[at] + row.weightB * q[at]);
    };
    return (mixed(x / 2) + mixed(std::min((x + 1) / 2, row.chroma - 1)) + 8) / 16;
  };
  for (size_t i = 0; i < count; ++i) {
    const auto across = [&](const PixelRow& row) {
      return code(row, i == 0 ? 0 : 2 * i - 1) + 2 * code(row, 2 * i) + code(row, 2 * i + 1);
    };
    out[i] = Round<W::kBits>(W::kA * across(a) + W::kB * across(b));
  }
}
template <class W>
void RecodePlanes(const PixelRow& a, const PixelRow& b, uint8_t* u, uint8_t* v, size_t count) {
  RecodePlane<W, true>(a, b, 0, u, count);
  RecodePlane<W, true>(a, b, 1, v, count);
}
template <class W>
void RecodePairs(const PixelRow& a, const PixelRow& b, uint8_t* u, uint8_t* v, size_t count) {
  RecodePlane<W, false>(a, b, 0, u, count);
  RecodePlane<W, false>(a, b, 1, v, count);
}

}  // namespace
}  // namespace plain

#define VX_PAIR_KERNELS(Encode) \
  { VX_KERNEL_VARIANTS(Encode<Even>), VX_KERNEL_VARIANTS(Encode<NearFirst>), VX_KERNEL_VARIANTS(Encode<NearSecond>) }
const PairKernels kFromBgrx = VX_PAIR_KERNELS(EncodeBgrx);
const PairKernels kFromBgra = VX_PAIR_KERNELS(EncodeBgra);
const PairKernels kFromVuyx = VX_PAIR_KERNELS(EncodeVuyx);
const PairKernels kFromUyvy = VX_PAIR_KERNELS(EncodeUyvy);
const PairKernels kFromYuyv = VX_PAIR_KERNELS(EncodeYuyv);
const ByWeights<RecodeChroma> kRecodePlanes = VX_PAIR_KERNELS(RecodePlanes);
const ByWeights<RecodeChroma> kRecodePairs = VX_PAIR_KERNELS(RecodePairs);
#undef VX_PAIR_KERNELS

}  // namespace vexel::encode420
#endif
