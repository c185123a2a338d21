// 4:2:0 samples to pixels.
#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <type_traits>

#include "convert/Decode420Kernels.h"

#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "convert/Decode420PixelKernels.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

#include "convert/YuvVectors8-inl.h"
#include "frame/KernelTable.h"

#ifndef VEXEL_CONVERT_DECODE420PIXELKERNELS_TYPES
#define VEXEL_CONVERT_DECODE420PIXELKERNELS_TYPES
namespace vexel::decode420 {
namespace {

// What the samples of a row are.
enum class ChromaKind : uint8_t {
  Full,          // 16-bit, one sample for each pixel
  Linear,        // 16-bit, one for two pixels, interpolated for the second
  Nearest,       // the same without interpolation
  Bytes,         // of a picture's own rows
  Pairs,         // (U, V) of a picture's own rows
  SwappedPairs,  // (V, U)
};
// Of a picture's own rows chroma is the nearest sample, or mixed of two rows and interpolated.
template <bool kIsWideLuma, ChromaKind kChromaKind, bool kMixesRows = false>
struct Samples {
  static constexpr bool kWideLuma = kIsWideLuma, kMixes = kMixesRows;
  static constexpr ChromaKind kChroma = kChromaKind;
  static constexpr bool kIsFull = kChroma == ChromaKind::Full, kIsLinear = kChroma == ChromaKind::Linear;
  static constexpr bool kIsSwapped = kChroma == ChromaKind::SwappedPairs;
  static constexpr bool kIsPairs = kChroma == ChromaKind::Pairs || kIsSwapped;
  static constexpr bool kIsDirect = kChroma == ChromaKind::Bytes || kIsPairs;
  static constexpr bool kIsShared = !kIsFull && !kIsLinear && !kMixes;  // by the pixels of a pair
  static constexpr size_t kLumaBytes = kWideLuma ? 2 : 1;
  // Of one or two pixels' chroma in a row.
  static constexpr size_t kChromaBytes = kChroma == ChromaKind::Bytes ? 1 : kIsPairs ? 2 * kLumaBytes : 2;
};
using WideNearest = Samples<true, ChromaKind::Nearest>;
using WideLinear = Samples<true, ChromaKind::Linear>;
using Full = Samples<true, ChromaKind::Full>;
using Bytes = Samples<false, ChromaKind::Bytes>;
using Pairs = Samples<false, ChromaKind::Pairs>;
using SwappedPairs = Samples<false, ChromaKind::SwappedPairs>;
using WidePairs = Samples<true, ChromaKind::Pairs>;
using SwappedWidePairs = Samples<true, ChromaKind::SwappedPairs>;
using MixedBytes = Samples<false, ChromaKind::Bytes, true>;
using MixedPairs = Samples<false, ChromaKind::Pairs, true>;
using MixedSwappedPairs = Samples<false, ChromaKind::SwappedPairs, true>;
using MixedWidePairs = Samples<true, ChromaKind::Pairs, true>;
using MixedSwappedWidePairs = Samples<true, ChromaKind::SwappedPairs, true>;

// The bits of a 10-bit word that are read of chroma.
inline constexpr uint16_t kWideBits = 0xFFC0;

// Sums are in 64ths, so that a channel may run to twice its range before it is clamped.
inline constexpr int kFractionBits = 6;

}  // namespace
}  // namespace vexel::decode420
#endif

#if HWY_TARGET != HWY_SCALAR
HWY_BEFORE_NAMESPACE();
namespace vexel::decode420 {
namespace HWY_NAMESPACE {
namespace {
using namespace vexel::HWY_NAMESPACE;
using hwy::HWY_NAMESPACE::ScalableTag;

// A block is two vectors of pixels: the even and the odd ones, or where nothing is shared, one behind the other.
constexpr size_t kPairs = kLanes<uint16_t>;
constexpr size_t kBlock = 2 * kPairs;

struct EvenOdd {
  I16 even, odd;
};

HWY_INLINE I16 Set(int value) { return hn::Set(ScalableTag<int16_t>(), static_cast<int16_t>(value)); }
HWY_INLINE U16 SetWord(uint32_t value) { return hn::Set(ScalableTag<uint16_t>(), static_cast<uint16_t>(value)); }
HWY_INLINE I16 Scale(I16 v, I16 factor) { return hn::MulFixedPoint15(v, factor); }
HWY_INLINE U16 LoadWords(const uint8_t* p) { return LoadVector<uint16_t>(p); }

// Interleaving at the end works within 128-bit blocks: block k of the first vector of pixels gets the first four pixels
// of block k, of the second vector the next four. Either the samples are dealt out to the blocks in fours of pixels (32
// bits of luma bytes, 32 of chroma words) beforehand, or the blocks of the pixels are put in order at the end.
enum class Order : uint8_t {
  Dealt,
  Natural,      // pixels one after another
  Alternate,    // pairs of pixels by turns of the block's first and second half
  Consecutive,  // not even and odd pixels, but one vector behind the other
};
template <class S>
constexpr Order OrderOf() {
  if (S::kIsFull) return Order::Consecutive;
  if (HWY_TARGET == HWY_AVX3) return Order::Dealt;
  if (S::kWideLuma && S::kIsPairs) return Order::Alternate;
  return S::kIsDirect && !S::kMixes ? Order::Dealt : Order::Natural;
}

template <Order kOrder>
HWY_INLINE U16 Deal(U16 v) {
#if HWY_TARGET == HWY_AVX3
  if constexpr (kOrder == Order::Dealt) return AsU16(OrderPacked4(AsU8(v)));
  if constexpr (kOrder == Order::Consecutive)
    return U16{_mm512_permutexvar_epi64(_mm512_setr_epi64(0, 4, 1, 5, 2, 6, 3, 7), v.raw)};
#elif HWY_TARGET == HWY_AVX2
  if constexpr (kOrder == Order::Dealt)
    return U16{_mm256_permutevar8x32_epi32(v.raw, _mm256_setr_epi32(0, 2, 4, 6, 1, 3, 5, 7))};
#endif
  return v;
}

// Every second word of two vectors, from the first and from the second one on.
struct Alternating {
  U16 first, second;
};
#if HWY_TARGET == HWY_AVX3
struct DealtWords {
  constexpr explicit DealtWords(uint16_t first) : order() {
    for (uint16_t i = 0; i < 32; ++i) {
      const uint16_t dword = i / 2 % 4 * 4 + i / 8;
      order[i] = static_cast<uint16_t>(2 * (2 * dword + i % 2) + first);
    }
  }
  alignas(64) uint16_t order[32];
};
#endif
template <Order kOrder>
HWY_INLINE Alternating LoadAlternating(const uint8_t* p) {
  const U16 low = LoadWords(p), high = LoadWords(p + HWY_MAX_BYTES);
#if HWY_TARGET == HWY_AVX3
  static constexpr DealtWords kFirst(0), kSecond(1);
  return {U16{_mm512_permutex2var_epi16(low.raw, _mm512_load_si512(kFirst.order), high.raw)},
          U16{_mm512_permutex2var_epi16(low.raw, _mm512_load_si512(kSecond.order), high.raw)}};
#else
  const ScalableTag<uint16_t> d;
  if constexpr (kOrder == Order::Alternate) {
#if HWY_TARGET == HWY_SSSE3  // has no blends
    const __m128 start = _mm_castsi128_ps(hn::InterleaveLower(d, low, high).raw);
    const __m128 end = _mm_castsi128_ps(hn::InterleaveUpper(d, low, high).raw);
    return {U16{_mm_castps_si128(_mm_shuffle_ps(start, end, 0x88))},
            U16{_mm_castps_si128(_mm_shuffle_ps(start, end, 0xDD))}};
#else
    return {hn::OddEven(LoadWords(p + HWY_MAX_BYTES - 2), low), hn::OddEven(high, LoadWords(p + 2))};
#endif
  }
  return {hn::ConcatEven(d, high, low), hn::ConcatOdd(d, high, low)};
#endif
}

template <Order kOrder, bool kStream>
HWY_INLINE void StoreBlocks(U32 v0, U32 v1, U32 v2, U32 v3, uint8_t* dst) {
#if HWY_TARGET == HWY_AVX2
  if constexpr (kOrder != Order::Dealt) {
    constexpr size_t kUpper = kOrder == Order::Natural ? 2 : 1;
    const ScalableTag<uint32_t> d;
    WriteVector<kStream>(hn::ConcatLowerLower(d, v1, v0), dst, 0);
    WriteVector<kStream>(hn::ConcatLowerLower(d, v3, v2), dst, 3 - kUpper);
    WriteVector<kStream>(hn::ConcatUpperUpper(d, v1, v0), dst, kUpper);
    WriteVector<kStream>(hn::ConcatUpperUpper(d, v3, v2), dst, 3);
    return;
  }
#endif
  WriteVector<kStream>(v0, dst, 0);
  WriteVector<kStream>(v1, dst, 1);
  WriteVector<kStream>(v2, dst, 2);
  WriteVector<kStream>(v3, dst, 3);
}

// Luma codes times 128, of bytes negative: signed factors reach no further. The matrix knows.
template <class S>
constexpr int kLumaSign = S::kWideLuma ? 1 : -1;
template <class S>
HWY_INLINE EvenOdd LoadLuma(const uint8_t* y) {
  constexpr Order kOrder = OrderOf<S>();
  // As a product, for shuffles and shifts compete.
  const auto halve = [](U16 v) HWY_ATTR { return AsI16(hn::MulHigh(v, SetWord(0x8000))); };
  if constexpr (S::kIsFull) {
    return {halve(Deal<kOrder>(LoadWords(y))), halve(Deal<kOrder>(LoadWords(y + HWY_MAX_BYTES)))};
  } else if constexpr (S::kWideLuma) {
    const Alternating words = LoadAlternating<kOrder>(y);
    return {halve(words.first), halve(words.second)};
  } else {
    const U8 pairs = AsU8(Deal<kOrder>(LoadWords(y)));
    return {WeighBytes(pairs, AsU8(SetWord(0x0080))), WeighBytes(pairs, AsU8(SetWord(0x8000)))};
  }
}

// Chroma codes - 128, times 256, of the even and the odd pixels. Two pixels that share theirs have it in `even`.
struct Chroma {
  EvenOdd u, v;
};

HWY_INLINE I16 AboutZero(U16 v) { return AsI16(hn::Xor(v, SetWord(0x8000))); }

// Bytes at the top of words.
template <Order kOrder>
HWY_INLINE U16 LoadHighBytes(const uint8_t* c) {
#if HWY_TARGET == HWY_AVX2
  static_assert(kOrder == Order::Dealt);
  alignas(32) static constexpr uint8_t kWords[32] = {128, 0,   128, 1,   128, 4,   128, 5,   128, 8,   128,
                                                     9,   128, 12,  128, 13,  128, 2,   128, 3,   128, 6,
                                                     128, 7,   128, 10,  128, 11,  128, 14,  128, 15};
  const __m256i both = _mm256_broadcastsi128_si256(_mm_loadu_si128(reinterpret_cast<const __m128i*>(c)));
  return U16{_mm256_shuffle_epi8(both, _mm256_load_si256(reinterpret_cast<const __m256i*>(kWords)))};
#else
  return hn::Mul(Deal<kOrder>(LoadPromoted<uint16_t, uint8_t>(c)), SetWord(256));
#endif
}

template <class S>
HWY_INLINE EvenOdd LoadPlane(const uint8_t* c) {
  constexpr Order kOrder = OrderOf<S>();
  if constexpr (S::kIsFull) {
    return {AboutZero(Deal<kOrder>(LoadWords(c))), AboutZero(Deal<kOrder>(LoadWords(c + HWY_MAX_BYTES)))};
  } else if constexpr (S::kMixes) {
    const U16 half = Deal<kOrder>(LoadWords(c)), next = Deal<kOrder>(LoadWords(c + 2));
    return {AsI16(hn::Add(half, half)), AsI16(hn::Add(half, next))};
  } else if constexpr (S::kChroma == ChromaKind::Bytes) {
    const I16 shared = AboutZero(LoadHighBytes<kOrder>(c));
    return {shared, shared};
  } else {
    const U16 even = Deal<kOrder>(LoadWords(c));
    const U16 odd = S::kIsLinear ? hn::AverageRound(even, Deal<kOrder>(LoadWords(c + 2))) : even;
    return {AboutZero(even), AboutZero(odd)};
  }
}

// Of pairs in memory, the first and the second samples.
template <class S>
HWY_INLINE Chroma LoadPairs(const uint8_t* pairs) {
  constexpr Order kOrder = OrderOf<S>();
  if constexpr (S::kMixes) {
    const Alternating half = LoadAlternating<kOrder>(pairs), next = LoadAlternating<kOrder>(pairs + 4);
    return {{AsI16(hn::Add(half.first, half.first)), AsI16(hn::Add(half.first, next.first))},
            {AsI16(hn::Add(half.second, half.second)), AsI16(hn::Add(half.second, next.second))}};
  } else if constexpr (S::kWideLuma) {
    const Alternating words = LoadAlternating<kOrder>(pairs);
    const I16 first = AboutZero(hn::And(words.first, SetWord(kWideBits)));
    const I16 second = AboutZero(hn::And(words.second, SetWord(kWideBits)));
    return {{first, first}, {second, second}};
  } else {
    const U16 words = hn::Xor(Deal<kOrder>(LoadWords(pairs)), SetWord(0x8080));
    const I16 first = AsI16(hn::Mul(words, SetWord(256))), second = AsI16(hn::And(words, SetWord(0xFF00)));
    return {{first, first}, {second, second}};
  }
}

template <class S>
HWY_INLINE Chroma LoadChroma(const uint8_t* u, const uint8_t* v) {
  if constexpr (S::kIsPairs && !(S::kMixes && !S::kWideLuma)) {
    const Chroma pairs = LoadPairs<S>(u);
    if constexpr (S::kIsSwapped) return {pairs.v, pairs.u};
    return pairs;
  } else {
    return {LoadPlane<S>(u), LoadPlane<S>(v)};
  }
}

// Three channels of even or odd pixels in 64ths.
struct Channels {
  I16 c0, c1, c2;
};

struct BgrOp {
  I16 luma, bias, bU, gU, gV, rV;
  HWY_INLINE BgrOp(const Matrix& m, int lumaSign)
      : luma(Set(lumaSign * m.luma)),
        bias(Set(m.lumaBias)),
        bU(Set(m.chroma[0][0])),
        gU(Set(m.chroma[1][0])),
        gV(Set(m.chroma[1][1])),
        rV(Set(m.chroma[2][1])) {}
  // The chroma terms alone, then with luma: pixels that share chroma share the first step.
  HWY_INLINE Channels Chroma(I16 u, I16 v) const {
    return {Scale(u, bU), hn::Add(Scale(u, gU), Scale(v, gV)), Scale(v, rV)};
  }
  HWY_INLINE Channels Add(I16 y, const Channels& chroma) const {
    const I16 base = hn::Add(Scale(y, luma), bias);
    return {hn::SaturatedAdd(base, chroma.c0), hn::SaturatedAdd(base, chroma.c1), hn::SaturatedAdd(base, chroma.c2)};
  }
};

struct VuyOp {
  I16 luma, bias, chromaBias, vU, vV, uU, uV, yU, yV;
  HWY_INLINE VuyOp(const Matrix& m, int lumaSign)
      : luma(Set(lumaSign * m.luma)),
        bias(Set(m.lumaBias)),
        chromaBias(Set((128 << kFractionBits) + (1 << kFractionBits) / 2)),
        vU(Set(m.chroma[0][0])),
        vV(Set(m.chroma[0][1])),
        uU(Set(m.chroma[1][0])),
        uV(Set(m.chroma[1][1])),
        yU(Set(m.chroma[2][0])),
        yV(Set(m.chroma[2][1])) {}
  HWY_INLINE Channels Chroma(I16 u, I16 v) const {
    return {hn::Add(hn::Add(Scale(u, vU), Scale(v, vV)), chromaBias),
            hn::Add(hn::Add(Scale(u, uU), Scale(v, uV)), chromaBias), hn::Add(Scale(u, yU), Scale(v, yV))};
  }
  HWY_INLINE Channels Add(I16 y, const Channels& chroma) const {
    return {chroma.c0, chroma.c1, hn::SaturatedAdd(hn::Add(Scale(y, luma), bias), chroma.c2)};
  }
};

// Where the bytes of a 128-bit block belong whose words have been packed, those of the even pixels first.
template <Order kOrder>
HWY_INLINE U8 InOrder(U8 packed) {
  if constexpr (kOrder == Order::Consecutive) return packed;
  static constexpr ShuffleTable kInTurn({0, 8, 1, 9, 2, 10, 3, 11, 4, 12, 5, 13, 6, 14, 7, 15});
  static constexpr ShuffleTable kHalves({0, 8, 2, 10, 4, 12, 6, 14, 1, 9, 3, 11, 5, 13, 7, 15});
  return hn::TableLookupBytes(packed, (kOrder == Order::Alternate ? kHalves : kInTurn).Load());
}

// Bytes of a channel. One of the shifts is a product, which other units of the processor do meanwhile.
template <Order kOrder>
HWY_INLINE U8 Narrow(I16 even, I16 odd) {
  return InOrder<kOrder>(
      PackBlocks(hn::ShiftRight<kFractionBits>(even), hn::MulHigh(odd, Set(1 << (16 - kFractionBits)))));
}

// Bytes of the channels, in the order of their pixels within the 128-bit blocks.
template <Order kOrder, bool kStream>
HWY_INLINE void StoreBytes(U8 c0, U8 c1, U8 c2, uint8_t* dst) {
  const ScalableTag<uint8_t> d8;
  const ScalableTag<uint16_t> d16;
  const U8 opaque = hn::Set(d8, 255);
  const U16 low01 = AsU16(hn::InterleaveLower(d8, c0, c1)), high01 = AsU16(hn::InterleaveUpper(d8, c0, c1));
  const U16 low23 = AsU16(hn::InterleaveLower(d8, c2, opaque)), high23 = AsU16(hn::InterleaveUpper(d8, c2, opaque));
  const auto pixels = [](U16 v) HWY_ATTR { return hn::BitCast(ScalableTag<uint32_t>(), v); };
  StoreBlocks<kOrder, kStream>(
      pixels(hn::InterleaveLower(d16, low01, low23)), pixels(hn::InterleaveUpper(d16, low01, low23)),
      pixels(hn::InterleaveLower(d16, high01, high23)), pixels(hn::InterleaveUpper(d16, high01, high23)), dst);
}

template <Order kOrder, bool kStream>
HWY_INLINE void StorePixels(const Channels& even, const Channels& odd, uint8_t* dst) {
  StoreBytes<kOrder, kStream>(Narrow<kOrder>(even.c0, odd.c0), Narrow<kOrder>(even.c1, odd.c1),
                              Narrow<kOrder>(even.c2, odd.c2), dst);
}

// What VuyOp makes where the matrix is the identity: luma as it is, and chroma mixed of bytes, rounded.
struct CodesOp {
  HWY_INLINE CodesOp(const Matrix&, int) {}
  // Of even and odd pixels, from halves as a mixer makes them.
  static HWY_INLINE U8 Chroma(const uint8_t* halves) {
    const U16 half = LoadWords(halves), biased = hn::Add(half, SetWord(128 * 256 + 128));
    const U16 even = hn::Add(biased, half), odd = hn::Add(biased, LoadWords(halves + 2));
    return AsU8(Deal<Order::Dealt>(hn::OrAnd(hn::ShiftRight<8>(even), odd, SetWord(0xFF00))));
  }
  template <bool kStream>
  static HWY_INLINE void Block(const uint8_t* y, const uint8_t* u, const uint8_t* v, uint8_t* dst) {
    StoreBytes<Order::Dealt, kStream>(Chroma(v), Chroma(u), AsU8(Deal<Order::Dealt>(LoadWords(y))), dst);
  }
};

template <class S, bool kStream, class Op>
HWY_INLINE void Block(const uint8_t* y, const uint8_t* u, const uint8_t* v, const Op& op, uint8_t* dst) {
  if constexpr (std::is_same_v<Op, CodesOp>) {
    Op::template Block<kStream>(y, u, v, dst);
  } else {
    constexpr Order kOrder = OrderOf<S>();
    const EvenOdd luma = LoadLuma<S>(y);
    const Chroma chroma = LoadChroma<S>(u, v);
    const Channels even = op.Chroma(chroma.u.even, chroma.v.even);
    const Channels odd = S::kIsShared ? even : op.Chroma(chroma.u.odd, chroma.v.odd);
    StorePixels<kOrder, kStream>(op.Add(luma.even, even), op.Add(luma.odd, odd), dst);
  }
}

// Rows of the picture itself are read exactly, like the destination is written; scratch rows have slack.
template <class S, bool kStream, class Op>
HWY_INLINE void Blocks(const uint8_t* y, const uint8_t* u, const uint8_t* v, const Op& op, uint8_t* dst, size_t count) {
  constexpr bool kIsExact = S::kIsDirect && !S::kMixes;
  constexpr size_t kChromaStep = (S::kIsFull ? kBlock : kPairs) * (S::kMixes ? 2 * S::kLumaBytes : S::kChromaBytes);
  for (; count >= kBlock; count -= kBlock) {
    // Beside stores past the cache processors do not keep up with three rows of words.
    if constexpr (kStream && S::kWideLuma && S::kMixes) FetchAhead<kBlock * S::kLumaBytes>(y);
    Block<S, kStream>(y, u, v, op, dst);
    y += kBlock * S::kLumaBytes, dst += kBlock * 4;
    u += kChromaStep, v += kChromaStep;
  }
  if (count == 0) return;
  alignas(64) uint8_t tail[kBlock * S::kLumaBytes] = {};
  alignas(64) uint8_t tailU[kIsExact ? kChromaStep : 1] = {};
  alignas(64) uint8_t tailV[kIsExact ? kChromaStep : 1] = {};
  alignas(64) uint8_t out[kBlock * 4];
  std::memcpy(tail, y, count * S::kLumaBytes);
  if constexpr (kIsExact) {
    std::memcpy(tailU, u, (count + 1) / 2 * S::kChromaBytes);
    if constexpr (!S::kIsPairs) std::memcpy(tailV, v, (count + 1) / 2 * S::kChromaBytes);
    u = tailU, v = tailV;
  }
  Block<S, false>(tail, u, v, op, out);
  std::memcpy(dst, out, count * 4);
}

// Samples that a mixer takes at once.
template <class S>
constexpr size_t kMixStep = HWY_MAX_BYTES / S::kChromaBytes;

// A row of chroma mixed of two, in halves: of a mixture m, 128 (m - 128). Two of them, of one sample or of neighbours,
// make what the pixels need, and no bit is lost: weights are in eighths. Wide pairs stay pairs.
template <class S>
struct Mixer {
  U16 a, b, secondA, secondB;
  explicit HWY_INLINE Mixer(const PixelRow& row) {
    const uint32_t weightA = row.weightA, weightB = row.weightB;
    if constexpr (S::kChroma == ChromaKind::Bytes) {
      a = b = secondA = secondB = SetWord(16 * weightA | 16 * weightB << 8);
    } else if constexpr (S::kWideLuma) {
      a = secondA = SetWord(weightA << 12), b = secondB = SetWord(weightB << 12);
    } else {
      a = SetWord(16 * weightA), b = SetWord(16 * weightB);
      secondA = hn::ShiftLeft<8>(a), secondB = hn::ShiftLeft<8>(b);
    }
  }
  // kMixStep samples of both rows.
  HWY_INLINE void operator()(const uint8_t* rowA, const uint8_t* rowB, uint16_t* out, uint16_t* second) const {
    if constexpr (S::kChroma == ChromaKind::Bytes) {
      const ScalableTag<uint8_t> d;
      const U8 bytesA = InterleaveOrder(Signed(rowA)), bytesB = InterleaveOrder(Signed(rowB));
      Store(WeighBytes(AsU8(a), hn::InterleaveLower(d, bytesA, bytesB)), out);
      Store(WeighBytes(AsU8(a), hn::InterleaveUpper(d, bytesA, bytesB)), out + kPairs);
    } else if constexpr (S::kWideLuma) {
      const U16 bits = SetWord(kWideBits);
      const U16 sum =
          hn::Add(hn::MulHigh(hn::And(LoadWords(rowA), bits), a), hn::MulHigh(hn::And(LoadWords(rowB), bits), b));
      Store(AsI16(hn::Sub(sum, SetWord(128 * 128))), out);
    } else {
      const U8 bytesA = Signed(rowA), bytesB = Signed(rowB);
      Store(hn::Add(WeighBytes(AsU8(a), bytesA), WeighBytes(AsU8(b), bytesB)), out);
      Store(hn::Add(WeighBytes(AsU8(secondA), bytesA), WeighBytes(AsU8(secondB), bytesB)), second);
    }
  }
  static HWY_INLINE U8 Signed(const uint8_t* bytes) {
    return hn::Xor(LoadVector<uint8_t>(bytes), hn::Set(ScalableTag<uint8_t>(), 0x80));
  }
  static HWY_INLINE void Store(I16 v, uint16_t* out) { StoreVector(v, reinterpret_cast<uint8_t*>(out)); }
  // So that the lower and the upper halves of all 128-bit blocks are those of the vector.
  static HWY_INLINE U8 InterleaveOrder(U8 v) {
#if HWY_TARGET == HWY_AVX3
    return AsU8(Deal<Order::Consecutive>(AsU16(v)));
#elif HWY_TARGET == HWY_AVX2
    return OrderPacked2(v);
#else
    return v;
#endif
  }
};

// Whole vectors; the last one overlaps the one before, or is padded if there is none.
template <class S>
HWY_INLINE void MixSamples(const Mixer<S>& mix, const uint8_t* a, const uint8_t* b, size_t samples, uint16_t* out,
                           uint16_t* second) {
  constexpr size_t kStep = kMixStep<S>, kBytes = S::kChromaBytes, kWords = S::kIsPairs && S::kWideLuma ? 2 : 1;
  if (samples < kStep) {
    alignas(64) uint8_t paddedA[HWY_MAX_BYTES] = {}, paddedB[HWY_MAX_BYTES] = {};
    std::memcpy(paddedA, a, samples * kBytes);
    std::memcpy(paddedB, b, samples * kBytes);
    return mix(paddedA, paddedB, out, second);
  }
  for (size_t i = 0; i < samples; i += kStep) {
    const size_t at = HWY_MIN(i, samples - kStep);
    mix(a + at * kBytes, b + at * kBytes, out + at * kWords, second + at * kWords);
  }
}

// Pixels in pieces whose chroma stays in the first-level cache; with the sample behind them, which repeats the row's
// last one.
template <class S, bool kStream, class Op>
HWY_INLINE void MixedRow(const PixelRow& row, const Op& op) {
  constexpr size_t kPiece = 2048, kSamples = kPiece / 2 + HWY_MAX_BYTES;
  constexpr bool kKeepsPairs = S::kIsPairs && S::kWideLuma;
  alignas(64) uint16_t mixed[2 * kSamples];
  uint16_t *const u = mixed, *const v = mixed + kSamples;
  const Mixer<S> mix(row);
  for (size_t x = 0; x < row.count; x += kPiece) {
    const size_t pixels = HWY_MIN(row.count - x, kPiece), needed = (pixels + 1) / 2 + 1, available = row.chroma - x / 2;
    const size_t offset = x / 2 * S::kChromaBytes, whole = (needed + kMixStep<S> - 1) / kMixStep<S> * kMixStep<S>;
    const size_t samples = HWY_MIN(available, whole);
    if constexpr (S::kIsPairs) {
      MixSamples<S>(mix, row.u + offset, row.uB + offset, samples, S::kIsSwapped && !kKeepsPairs ? v : u,
                    S::kIsSwapped && !kKeepsPairs ? u : v);
    } else {
      MixSamples<S>(mix, row.u + offset, row.uB + offset, samples, u, u);
      MixSamples<S>(mix, row.v + offset, row.vB + offset, samples, v, v);
    }
    if (available < needed) {
      if constexpr (kKeepsPairs)
        std::memcpy(mixed + 2 * available, mixed + 2 * available - 2, 4);
      else
        u[available] = u[available - 1], v[available] = v[available - 1];
    }
    Blocks<S, kStream>(row.y + x * S::kLumaBytes, reinterpret_cast<const uint8_t*>(u),
                       reinterpret_cast<const uint8_t*>(v), op, row.dst + 4 * x, pixels);
  }
}

template <class S, bool kStream, class Op>
HWY_INLINE void Row(const PixelRow& row, const Op& op) {
  if constexpr (S::kMixes)
    MixedRow<S, kStream>(row, op);
  else
    Blocks<S, kStream>(row.y, row.u, row.v, op, row.dst, row.count);
}

template <class S, class Op>
HWY_INLINE void Row(const PixelRow& row, const Matrix& matrix) {
  const Op op(matrix, kLumaSign<S>);
  if (row.stream)
    Row<S, true>(row, op);
  else
    Row<S, false>(row, op);
}

template <class S>
void ToBgrx(const PixelRow& row, const Matrix& matrix) {
  Row<S, BgrOp>(row, matrix);
}
template <class S>
void ToVuyx(const PixelRow& row, const Matrix& matrix) {
  Row<S, VuyOp>(row, matrix);
}
template <class S>
void ToCodes(const PixelRow& row, const Matrix& matrix) {
  Row<S, CodesOp>(row, matrix);
}

}  // namespace
}  // namespace HWY_NAMESPACE
}  // namespace vexel::decode420
HWY_AFTER_NAMESPACE();
#endif  // HWY_TARGET

#if HWY_ONCE
namespace vexel::decode420 {
namespace plain {
namespace {

int32_t Saturate16(int32_t value) { return value < INT16_MIN ? INT16_MIN : value > INT16_MAX ? INT16_MAX : value; }
int32_t Scale(int32_t value, int32_t factor) { return (value * factor + 0x4000) >> 15; }

uint8_t ToByte(int32_t sum) {
  const int32_t code = Saturate16(sum) >> kFractionBits;
  return static_cast<uint8_t>(code < 0 ? 0 : code > 255 ? 255 : code);
}

// Code times 128.
template <class S>
int32_t Luma(const uint8_t* y, size_t x) {
  if constexpr (!S::kWideLuma) return y[x] << 7;
  return (y[2 * x] | y[2 * x + 1] << 8) >> 1;
}

// Samples times 256 of a picture's own row; plane 0 is U.
template <class S>
int32_t OwnSample(const uint8_t* row, size_t i, size_t plane) {
  if constexpr (S::kIsPairs) i = 2 * i + (S::kIsSwapped ? 1 - plane : plane);
  return S::kWideLuma ? (row[2 * i] | row[2 * i + 1] << 8) & kWideBits : row[i] << 8;
}

// Code - 128, times 256, of a pixel.
template <class S>
int32_t Chroma(const PixelRow& row, size_t x, size_t plane) {
  const bool isSecond = plane == 1 && !S::kIsPairs;
  const uint8_t *const bytes = isSecond ? row.v : row.u, *const bytesB = isSecond ? row.vB : row.uB;
  const auto* words = reinterpret_cast<const uint16_t*>(bytes);
  const auto own = [&](size_t i) {
    const int32_t a = OwnSample<S>(bytes, i, plane);
    if constexpr (!S::kMixes) return a;
    const int32_t b = OwnSample<S>(bytesB, i, plane);
    return (a * static_cast<int32_t>(row.weightA) + b * static_cast<int32_t>(row.weightB)) / 8;
  };
  const size_t i = S::kIsFull ? x : x / 2;
  int32_t code = S::kIsDirect ? own(i) : words[i];
  if (S::kIsLinear && x % 2 != 0) code = (code + words[i + 1] + 1) >> 1;
  if (S::kMixes && x % 2 != 0) code = (code + own(std::min(i + 1, row.chroma - 1))) / 2;
  return code - 0x8000;
}

// kLumaChannels: bit k is set if channel k has luma; the others are chroma about 128.
template <class S, unsigned kLumaChannels>
void Row(const PixelRow& row, const Matrix& matrix) {
  for (size_t x = 0; x < row.count; ++x) {
    const int32_t luma = Scale(Luma<S>(row.y, x), matrix.luma) + matrix.lumaBias;
    const int32_t u = Chroma<S>(row, x, 0), v = Chroma<S>(row, x, 1);
    uint8_t* const pixel = row.dst + 4 * x;
    for (unsigned k = 0; k < 3; ++k) {
      const bool hasLuma = (kLumaChannels >> k & 1) != 0;
      const int32_t base = hasLuma ? luma : (128 << kFractionBits) + (1 << kFractionBits) / 2;
      pixel[k] = ToByte(base + Scale(u, matrix.chroma[k][0]) + Scale(v, matrix.chroma[k][1]));
    }
    pixel[3] = 255;
  }
}

template <class S>
void ToBgrx(const PixelRow& row, const Matrix& matrix) {
  Row<S, 7>(row, matrix);
}
template <class S>
void ToVuyx(const PixelRow& row, const Matrix& matrix) {
  Row<S, 4>(row, matrix);
}
template <class S>
void ToCodes(const PixelRow& row, const Matrix& matrix) {
  ToVuyx<S>(row, matrix);
}

}  // namespace
}  // namespace plain

#define VX_PIXEL_KERNELS(To)                                                                                 \
  {                                                                                                          \
    VX_KERNEL_VARIANTS(To<WideNearest>), VX_KERNEL_VARIANTS(To<WideLinear>), VX_KERNEL_VARIANTS(To<Full>),   \
        {VX_KERNEL_VARIANTS(To<Bytes>), VX_KERNEL_VARIANTS(To<Pairs>), VX_KERNEL_VARIANTS(To<SwappedPairs>), \
         VX_KERNEL_VARIANTS(To<WidePairs>), VX_KERNEL_VARIANTS(To<SwappedWidePairs>)},                       \
    {                                                                                                        \
      VX_KERNEL_VARIANTS(To<MixedBytes>), VX_KERNEL_VARIANTS(To<MixedPairs>),                                \
          VX_KERNEL_VARIANTS(To<MixedSwappedPairs>), VX_KERNEL_VARIANTS(To<MixedWidePairs>),                 \
          VX_KERNEL_VARIANTS(To<MixedSwappedWidePairs>)                                                      \
    }                                                                                                        \
  }
const PixelKernels kToBgrx = VX_PIXEL_KERNELS(ToBgrx);
const PixelKernels kToVuyx = VX_PIXEL_KERNELS(ToVuyx);
#undef VX_PIXEL_KERNELS
const ByteKernels kToCodes = {{VX_KERNEL_VARIANTS(ToCodes<MixedBytes>), VX_KERNEL_VARIANTS(ToCodes<MixedPairs>),
                               VX_KERNEL_VARIANTS(ToCodes<MixedSwappedPairs>)}};

}  // namespace vexel::decode420
#endif
