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
  static constexpr size_t kChromaBytes = kChroma == ChromaKind::Bytes ? 1 : 2;
};
using Nearest = Samples<false, ChromaKind::Nearest>;
using Linear = Samples<false, ChromaKind::Linear>;
using WideNearest = Samples<true, ChromaKind::Nearest>;
using WideLinear = Samples<true, ChromaKind::Linear>;
using Full = Samples<true, ChromaKind::Full>;
using Bytes = Samples<false, ChromaKind::Bytes>;
using Pairs = Samples<false, ChromaKind::Pairs>;
using SwappedPairs = Samples<false, ChromaKind::SwappedPairs>;

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

HWY_INLINE void StoreBlocks(U32 v0, U32 v1, U32 v2, U32 v3, uint8_t* dst) {
#if HWY_TARGET == HWY_AVX2
  const ScalableTag<uint32_t> d;
  StoreVector(hn::ConcatLowerLower(d, v1, v0), dst, 0);
  StoreVector(hn::ConcatLowerLower(d, v3, v2), dst, 1);
  StoreVector(hn::ConcatUpperUpper(d, v1, v0), dst, 2);
  StoreVector(hn::ConcatUpperUpper(d, v3, v2), dst, 3);
#else
  StoreVector(v0, dst, 0);
  StoreVector(v1, dst, 1);
  StoreVector(v2, dst, 2);
  StoreVector(v3, dst, 3);
#endif
}

// Luma codes times 128.
template <class S>
HWY_INLINE EvenOdd LoadLuma(const uint8_t* y) {
  const ScalableTag<uint16_t> d;
  if constexpr (S::kWideLuma) {
    const U16 low = LoadVector<uint16_t>(y, 0), high = LoadVector<uint16_t>(y, 1);
    return {Signed(DealToBlocks(hn::ShiftRight<1>(hn::ConcatEven(d, high, low)))),
            Signed(DealToBlocks(hn::ShiftRight<1>(hn::ConcatOdd(d, high, low))))};
  } else {
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
  const ScalableTag<uint16_t> d;
  if constexpr (S::kIsFull) {
    const U16 low = LoadVector<uint16_t>(c, 0), high = LoadVector<uint16_t>(c, 1);
    return {AboutZero(DealToBlocks(hn::ConcatEven(d, high, low))),
            AboutZero(DealToBlocks(hn::ConcatOdd(d, high, low)))};
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
    const U16 pairs = DealToBlocks(LoadVector<uint16_t>(u));
    const I16 first = AboutZero(hn::ShiftLeft<8>(pairs));
    const I16 second = AboutZero(hn::And(pairs, hn::Set(ScalableTag<uint16_t>(), 0xFF00)));
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
  StoreBlocks(hn::InterleaveLower(d32, even0, odd0), hn::InterleaveUpper(d32, even0, odd0),
              hn::InterleaveLower(d32, even1, odd1), hn::InterleaveUpper(d32, even1, odd1), dst);
}

template <class S, class Op>
HWY_INLINE void Block(const uint8_t* y, const uint8_t* u, const uint8_t* v, const Op& op, uint8_t* dst) {
  const EvenOdd luma = LoadLuma<S>(y);
  const Chroma chroma = LoadChroma<S>(u, v);
  const Channels even = op.Chroma(chroma.u.even, chroma.v.even);
  if constexpr (S::kIsShared)
    StorePixels(op.Add(luma.even, even), op.Add(luma.odd, even), dst);
  else
    StorePixels(op.Add(luma.even, even), op.Add(luma.odd, op.Chroma(chroma.u.odd, chroma.v.odd)), dst);
}

// Rows of the picture itself are read exactly, like the destination is written; scratch rows have slack.
template <class S, class Op>
HWY_INLINE void Row(const void* yRow, const void* uRow, const void* vRow, const Matrix& matrix, uint8_t* dst,
                    size_t count) {
  constexpr size_t kChromaStep = (S::kIsFull ? kBlock : kPairs) * S::kChromaBytes;
  const Op op(matrix);
  const auto* y = static_cast<const uint8_t*>(yRow);
  const auto* u = static_cast<const uint8_t*>(uRow);
  const auto* v = static_cast<const uint8_t*>(vRow);
  for (; count >= kBlock; count -= kBlock) {
    Block<S>(y, u, v, op, dst);
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
  Block<S>(tail, u, v, op, out);
  std::memcpy(dst, out, count * 4);
}

template <class S>
void ToBgrx(const void* y, const void* u, const void* v, const Matrix& matrix, uint8_t* dst, size_t count) {
  Row<S, BgrOp>(y, u, v, matrix, dst, count);
}
template <class S>
void ToVuyx(const void* y, const void* u, const void* v, const Matrix& matrix, uint8_t* dst, size_t count) {
  Row<S, VuyOp>(y, u, v, matrix, dst, count);
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
int32_t Luma(const void* y, size_t x) {
  const auto* bytes = static_cast<const uint8_t*>(y);
  if constexpr (!S::kWideLuma) return bytes[x] << 7;
  return (bytes[2 * x] | bytes[2 * x + 1] << 8) >> 1;
}

// Code - 128, times 256; plane 0 is U.
template <class S>
int32_t Chroma(const void* c, size_t x, size_t plane) {
  const auto* bytes = static_cast<const uint8_t*>(c);
  const auto* words = static_cast<const uint16_t*>(c);
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
      code = bytes[x / 2 * 2 + plane] << 8;
      break;
    case ChromaKind::SwappedPairs:
      code = bytes[x / 2 * 2 + 1 - plane] << 8;
      break;
  }
  return code - 0x8000;
}

// kLumaChannels: bit k is set if channel k has luma; the others are chroma about 128.
template <class S, unsigned kLumaChannels>
void Row(const void* y, const void* u, const void* v, const Matrix& matrix, uint8_t* dst, size_t count) {
  for (size_t x = 0; x < count; ++x) {
    const int32_t luma = Scale(Luma<S>(y, x), matrix.luma) + matrix.lumaBias;
    const int32_t chromaU = Chroma<S>(u, x, 0), chromaV = Chroma<S>(S::kIsPairs ? u : v, x, 1);
    for (unsigned k = 0; k < 3; ++k) {
      const bool hasLuma = (kLumaChannels >> k & 1) != 0;
      const int32_t base = hasLuma ? luma : (128 << kFractionBits) + (1 << kFractionBits) / 2;
      dst[4 * x + k] = ToByte(base + Scale(chromaU, matrix.chroma[k][0]) + Scale(chromaV, matrix.chroma[k][1]));
    }
    dst[4 * x + 3] = 255;
  }
}

template <class S>
void ToBgrx(const void* y, const void* u, const void* v, const Matrix& matrix, uint8_t* dst, size_t count) {
  Row<S, 7>(y, u, v, matrix, dst, count);
}
template <class S>
void ToVuyx(const void* y, const void* u, const void* v, const Matrix& matrix, uint8_t* dst, size_t count) {
  Row<S, 4>(y, u, v, matrix, dst, count);
}

}  // namespace
}  // namespace plain

#define VX_PIXEL_KERNELS(To)                                                                              \
  {                                                                                                       \
    VX_KERNEL_VARIANTS(To<Nearest>), VX_KERNEL_VARIANTS(To<Linear>), VX_KERNEL_VARIANTS(To<WideNearest>), \
        VX_KERNEL_VARIANTS(To<WideLinear>), VX_KERNEL_VARIANTS(To<Full>), VX_KERNEL_VARIANTS(To<Bytes>),  \
        VX_KERNEL_VARIANTS(To<Pairs>), VX_KERNEL_VARIANTS(To<SwappedPairs>)                               \
  }
const PixelKernels kToBgrx = VX_PIXEL_KERNELS(ToBgrx);
const PixelKernels kToVuyx = VX_PIXEL_KERNELS(ToVuyx);
#undef VX_PIXEL_KERNELS

}  // namespace vexel::decode420
#endif
