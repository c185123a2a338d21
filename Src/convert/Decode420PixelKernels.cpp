// 4:2:0 samples to pixels.
#include <cstddef>
#include <cstdint>
#include <cstring>

#include "convert/Decode420Kernels.h"

#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "convert/Decode420PixelKernels.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

#include "convert/PixelVectors-inl.h"
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
  Bytes,         // of a picture's own rows, nearest
  Pairs,         // (U, V) of a picture's own row, nearest
  SwappedPairs,  // (V, U)
};
template <bool kIsWideLuma, ChromaKind kChromaKind>
struct Samples {
  static constexpr bool kWideLuma = kIsWideLuma;
  static constexpr ChromaKind kChroma = kChromaKind;
  static constexpr bool kIsFull = kChroma == ChromaKind::Full, kIsLinear = kChroma == ChromaKind::Linear;
  static constexpr bool kIsPairs = kChroma == ChromaKind::Pairs || kChroma == ChromaKind::SwappedPairs;
  static constexpr bool kIsDirect = kChroma == ChromaKind::Bytes || kIsPairs;
  static constexpr bool kIsShared = !kIsFull && !kIsLinear;  // by the pixels of a pair
  static constexpr size_t kLumaBytes = kWideLuma ? 2 : 1;
  // Of one or two pixels' chroma in a row.
  static constexpr size_t kChromaBytes = kChroma == ChromaKind::Bytes ? 1 : kIsPairs ? 2 * kLumaBytes : 2;
};
using Nearest = Samples<false, ChromaKind::Nearest>;
using Linear = Samples<false, ChromaKind::Linear>;
using WideNearest = Samples<true, ChromaKind::Nearest>;
using WideLinear = Samples<true, ChromaKind::Linear>;
using Full = Samples<true, ChromaKind::Full>;
using Bytes = Samples<false, ChromaKind::Bytes>;
using Pairs = Samples<false, ChromaKind::Pairs>;
using SwappedPairs = Samples<false, ChromaKind::SwappedPairs>;
using WidePairs = Samples<true, ChromaKind::Pairs>;
using SwappedWidePairs = Samples<true, ChromaKind::SwappedPairs>;

// The bits of a 10-bit word that are read of chroma.
inline constexpr uint16_t kWideBits = 0xFFC0;

// Sums are in 64ths, so that a channel may run to twice its range before it is clamped.
inline constexpr int kFractionBits = 6;

}  // namespace
}  // namespace vexel::decode420
#endif

#if HWY_TARGET != HWY_BASELINE_SCALAR
HWY_BEFORE_NAMESPACE();
namespace vexel::decode420 {
namespace HWY_NAMESPACE {
namespace {
using namespace vexel::HWY_NAMESPACE;
using hwy::HWY_NAMESPACE::ScalableTag;

// A block is one vector of even and one of odd pixels.
constexpr size_t kPairs = kLanes<uint16_t>;
constexpr size_t kBlock = 2 * kPairs;

struct EvenOdd {
  I16 even, odd;
};

HWY_INLINE I16 Set(int16_t value) { return hn::Set(ScalableTag<int16_t>(), value); }
HWY_INLINE I16 Signed(U16 v) { return hn::BitCast(ScalableTag<int16_t>(), v); }
HWY_INLINE I16 Scale(I16 v, I16 factor) { return hn::MulFixedPoint15(v, factor); }

// Interleaving at the end works within 128-bit blocks: block k of the first vector of pixels gets the first four pixels
// of block k, of the second vector the next four. Either the samples are dealt out to the blocks in fours of pixels (32
// bits of luma bytes, 32 of chroma words) beforehand, which four blocks do with fewer shuffles, or the blocks of the
// pixels are put in order at the end.
HWY_INLINE U16 DealToBlocks(U16 v) {
#if HWY_TARGET == HWY_AVX3
  return U16{_mm512_permutexvar_epi32(_mm512_setr_epi32(0, 4, 8, 12, 1, 5, 9, 13, 2, 6, 10, 14, 3, 7, 11, 15), v.raw)};
#else
  return v;
#endif
}

// Every second word of two vectors, from the first or the second one on, dealt out like that.
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
template <int kFirst>
HWY_INLINE U16 DealAlternate(U16 low, U16 high) {
#if HWY_TARGET == HWY_AVX3
  static constexpr DealtWords kWords(kFirst);
  return U16{_mm512_permutex2var_epi16(low.raw, _mm512_load_si512(kWords.order), high.raw)};
#else
  const ScalableTag<uint16_t> d;
  return kFirst == 0 ? hn::ConcatEven(d, high, low) : hn::ConcatOdd(d, high, low);
#endif
}

// Into the cache, or past it where dst is aligned.
template <bool kStream>
HWY_INLINE void Write(U32 v, uint8_t* dst, size_t index) {
  const ScalableTag<uint8_t> d;
  if constexpr (kStream)
    hn::Stream(hn::BitCast(d, v), d, dst + index * HWY_MAX_BYTES);
  else
    StoreVector(v, dst, index);
}

template <bool kStream>
HWY_INLINE void StoreBlocks(U32 v0, U32 v1, U32 v2, U32 v3, uint8_t* dst) {
#if HWY_TARGET == HWY_AVX2
  const ScalableTag<uint32_t> d;
  Write<kStream>(hn::ConcatLowerLower(d, v1, v0), dst, 0);
  Write<kStream>(hn::ConcatLowerLower(d, v3, v2), dst, 1);
  Write<kStream>(hn::ConcatUpperUpper(d, v1, v0), dst, 2);
  Write<kStream>(hn::ConcatUpperUpper(d, v3, v2), dst, 3);
#else
  Write<kStream>(v0, dst, 0);
  Write<kStream>(v1, dst, 1);
  Write<kStream>(v2, dst, 2);
  Write<kStream>(v3, dst, 3);
#endif
}

// Luma codes times 128.
template <class S>
HWY_INLINE EvenOdd LoadLuma(const uint8_t* y) {
  if constexpr (S::kWideLuma) {
    const U16 low = LoadVector<uint16_t>(y, 0), high = LoadVector<uint16_t>(y, 1);
    return {Signed(hn::ShiftRight<1>(DealAlternate<0>(low, high))),
            Signed(hn::ShiftRight<1>(DealAlternate<1>(low, high)))};
  } else {
    const ScalableTag<uint16_t> d;
    const U16 pairs = DealToBlocks(LoadVector<uint16_t>(y, 0));
    return {Signed(hn::ShiftLeft<7>(hn::And(pairs, hn::Set(d, 255)))),
            Signed(hn::And(hn::ShiftRight<1>(pairs), hn::Set(d, 255 << 7)))};
  }
}

// Chroma codes - 128, times 256, of the even and the odd pixels. Two pixels that share theirs have it in `even`.
struct Chroma {
  EvenOdd u, v;
};

HWY_INLINE I16 AboutZero(U16 v) { return Signed(hn::Xor(v, hn::Set(ScalableTag<uint16_t>(), 0x8000))); }

template <class S>
HWY_INLINE EvenOdd LoadPlane(const uint8_t* c) {
  if constexpr (S::kIsFull) {
    const U16 low = LoadVector<uint16_t>(c, 0), high = LoadVector<uint16_t>(c, 1);
    return {AboutZero(DealAlternate<0>(low, high)), AboutZero(DealAlternate<1>(low, high))};
  } else if constexpr (S::kChroma == ChromaKind::Bytes) {
    const I16 shared = AboutZero(hn::ShiftLeft<8>(DealToBlocks(LoadPromoted<uint16_t, uint8_t>(c))));
    return {shared, shared};
  } else {
    const U16 even = DealToBlocks(LoadVector<uint16_t>(c));
    if constexpr (S::kIsLinear)
      return {AboutZero(even), AboutZero(hn::AverageRound(even, DealToBlocks(LoadVector<uint16_t>(c + 2))))};
    else
      return {AboutZero(even), AboutZero(even)};
  }
}

template <class S>
HWY_INLINE Chroma LoadChroma(const uint8_t* u, const uint8_t* v) {
  if constexpr (S::kIsPairs) {
    const ScalableTag<uint16_t> d;
    I16 first, second;
    if constexpr (S::kWideLuma) {
      const U16 low = LoadVector<uint16_t>(u, 0), high = LoadVector<uint16_t>(u, 1), bits = hn::Set(d, kWideBits);
      first = AboutZero(hn::And(DealAlternate<0>(low, high), bits));
      second = AboutZero(hn::And(DealAlternate<1>(low, high), bits));
    } else {
      const U16 pairs = DealToBlocks(LoadVector<uint16_t>(u));
      first = AboutZero(hn::ShiftLeft<8>(pairs));
      second = AboutZero(hn::And(pairs, hn::Set(d, 0xFF00)));
    }
    if constexpr (S::kChroma == ChromaKind::SwappedPairs) return {{second, second}, {first, first}};
    return {{first, first}, {second, second}};
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
  explicit HWY_INLINE BgrOp(const Matrix& m)
      : luma(Set(m.luma)),
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
  explicit HWY_INLINE VuyOp(const Matrix& m)
      : luma(Set(m.luma)),
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

// Bytes of a channel, in each 128-bit block its 8 even pixels before its 8 odd ones.
HWY_INLINE U8 Narrow(I16 even, I16 odd) {
  return PackBlocks(hn::ShiftRight<kFractionBits>(even), hn::ShiftRight<kFractionBits>(odd));
}

template <bool kStream>
HWY_INLINE void StorePixels(const Channels& even, const Channels& odd, uint8_t* dst) {
  const ScalableTag<uint8_t> d8;
  const ScalableTag<uint16_t> d16;
  const ScalableTag<uint32_t> d32;
  const U8 c0 = Narrow(even.c0, odd.c0), c1 = Narrow(even.c1, odd.c1), c2 = Narrow(even.c2, odd.c2);
  const U8 opaque = hn::Set(d8, 255);
  const U16 evenLow = hn::BitCast(d16, hn::InterleaveLower(d8, c0, c1));
  const U16 oddLow = hn::BitCast(d16, hn::InterleaveUpper(d8, c0, c1));
  const U16 evenHigh = hn::BitCast(d16, hn::InterleaveLower(d8, c2, opaque));
  const U16 oddHigh = hn::BitCast(d16, hn::InterleaveUpper(d8, c2, opaque));
  const U32 even0 = hn::BitCast(d32, hn::InterleaveLower(d16, evenLow, evenHigh));
  const U32 even1 = hn::BitCast(d32, hn::InterleaveUpper(d16, evenLow, evenHigh));
  const U32 odd0 = hn::BitCast(d32, hn::InterleaveLower(d16, oddLow, oddHigh));
  const U32 odd1 = hn::BitCast(d32, hn::InterleaveUpper(d16, oddLow, oddHigh));
  StoreBlocks<kStream>(hn::InterleaveLower(d32, even0, odd0), hn::InterleaveUpper(d32, even0, odd0),
                       hn::InterleaveLower(d32, even1, odd1), hn::InterleaveUpper(d32, even1, odd1), dst);
}

template <class S, bool kStream, class Op>
HWY_INLINE void Block(const uint8_t* y, const uint8_t* u, const uint8_t* v, const Op& op, uint8_t* dst) {
  const EvenOdd luma = LoadLuma<S>(y);
  const Chroma chroma = LoadChroma<S>(u, v);
  const Channels even = op.Chroma(chroma.u.even, chroma.v.even);
  if constexpr (S::kIsShared)
    StorePixels<kStream>(op.Add(luma.even, even), op.Add(luma.odd, even), dst);
  else
    StorePixels<kStream>(op.Add(luma.even, even), op.Add(luma.odd, op.Chroma(chroma.u.odd, chroma.v.odd)), dst);
}

// Rows of the picture itself are read exactly, like the destination is written; scratch rows have slack.
template <class S, bool kStream, class Op>
HWY_INLINE void Row(const uint8_t* y, const uint8_t* u, const uint8_t* v, const Op& op, uint8_t* dst, size_t count) {
  constexpr size_t kChromaStep = (S::kIsFull ? kBlock : kPairs) * S::kChromaBytes;
  for (; count >= kBlock; count -= kBlock) {
    Block<S, kStream>(y, u, v, op, dst);
    y += kBlock * S::kLumaBytes, dst += kBlock * 4;
    u += kChromaStep, v += kChromaStep;
  }
  if (count == 0) return;
  alignas(64) uint8_t tail[kBlock * S::kLumaBytes] = {};
  alignas(64) uint8_t tailU[S::kIsDirect ? kChromaStep : 1] = {};
  alignas(64) uint8_t tailV[S::kIsDirect ? kChromaStep : 1] = {};
  alignas(64) uint8_t out[kBlock * 4];
  std::memcpy(tail, y, count * S::kLumaBytes);
  if constexpr (S::kIsDirect) {
    std::memcpy(tailU, u, (count + 1) / 2 * S::kChromaBytes);
    if constexpr (!S::kIsPairs) std::memcpy(tailV, v, (count + 1) / 2 * S::kChromaBytes);
    u = tailU, v = tailV;
  }
  Block<S, false>(tail, u, v, op, out);
  std::memcpy(dst, out, count * 4);
}

template <class S, class Op>
HWY_INLINE void Row(const PixelRow& row, const Matrix& matrix) {
  const Op op(matrix);
  if (row.stream)
    Row<S, true>(row.y, row.u, row.v, op, row.dst, row.count);
  else
    Row<S, false>(row.y, row.u, row.v, op, row.dst, row.count);
}

template <class S>
void ToBgrx(const PixelRow& row, const Matrix& matrix) {
  Row<S, BgrOp>(row, matrix);
}
template <class S>
void ToVuyx(const PixelRow& row, const Matrix& matrix) {
  Row<S, VuyOp>(row, matrix);
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

// Code - 128, times 256; plane 0 is U.
template <class S>
int32_t Chroma(const uint8_t* bytes, size_t x, size_t plane) {
  const auto* words = reinterpret_cast<const uint16_t*>(bytes);
  // Of a picture's pairs.
  const auto code16 = [&](size_t i) {
    return S::kWideLuma ? (bytes[2 * i] | bytes[2 * i + 1] << 8) & kWideBits : bytes[i] << 8;
  };
  int32_t code = 0;
  switch (S::kChroma) {
    case ChromaKind::Full:
      code = words[x];
      break;
    case ChromaKind::Linear:
      code = x % 2 != 0 ? (words[x / 2] + words[x / 2 + 1] + 1) >> 1 : words[x / 2];
      break;
    case ChromaKind::Nearest:
      code = words[x / 2];
      break;
    case ChromaKind::Bytes:
      code = bytes[x / 2] << 8;
      break;
    case ChromaKind::Pairs:
      code = code16(x / 2 * 2 + plane);
      break;
    case ChromaKind::SwappedPairs:
      code = code16(x / 2 * 2 + 1 - plane);
      break;
  }
  return code - 0x8000;
}

// kLumaChannels: bit k is set if channel k has luma; the others are chroma about 128.
template <class S, unsigned kLumaChannels>
void Row(const PixelRow& row, const Matrix& matrix) {
  for (size_t x = 0; x < row.count; ++x) {
    const int32_t luma = Scale(Luma<S>(row.y, x), matrix.luma) + matrix.lumaBias;
    const int32_t u = Chroma<S>(row.u, x, 0), v = Chroma<S>(S::kIsPairs ? row.u : row.v, x, 1);
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

}  // namespace
}  // namespace plain

#define VX_PIXEL_KERNELS(To)                                                                                    \
  {                                                                                                             \
    VX_KERNEL_VARIANTS(To<Nearest>), VX_KERNEL_VARIANTS(To<Linear>), VX_KERNEL_VARIANTS(To<WideNearest>),       \
        VX_KERNEL_VARIANTS(To<WideLinear>), VX_KERNEL_VARIANTS(To<Full>), VX_KERNEL_VARIANTS(To<Bytes>),        \
        VX_KERNEL_VARIANTS(To<Pairs>), VX_KERNEL_VARIANTS(To<SwappedPairs>), VX_KERNEL_VARIANTS(To<WidePairs>), \
        VX_KERNEL_VARIANTS(To<SwappedWidePairs>)                                                                \
  }
const PixelKernels kToBgrx = VX_PIXEL_KERNELS(ToBgrx);
const PixelKernels kToVuyx = VX_PIXEL_KERNELS(ToVuyx);
#undef VX_PIXEL_KERNELS

}  // namespace vexel::decode420
#endif
