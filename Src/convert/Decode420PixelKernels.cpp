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
struct Nearest {
  static constexpr bool kWideLuma = false, kHalfChroma = true, kLinear = false;
};
struct Linear {
  static constexpr bool kWideLuma = false, kHalfChroma = true, kLinear = true;
};
struct WideNearest {
  static constexpr bool kWideLuma = true, kHalfChroma = true, kLinear = false;
};
struct WideLinear {
  static constexpr bool kWideLuma = true, kHalfChroma = true, kLinear = true;
};
struct Full {
  static constexpr bool kWideLuma = true, kHalfChroma = false, kLinear = false;
};

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

HWY_INLINE U16 LoadU16(const uint16_t* p) { return hn::LoadU(ScalableTag<uint16_t>(), p); }
HWY_INLINE U16 LoadU16(const void* p, size_t index) {
  return LoadVector<uint16_t>(static_cast<const uint8_t*>(p), index);
}

// Luma codes times 128.
template <class Samples>
HWY_INLINE EvenOdd LoadLuma(const void* y) {
  const ScalableTag<uint16_t> d;
  if constexpr (Samples::kWideLuma) {
    const U16 low = LoadU16(y, 0), high = LoadU16(y, 1);
    return {Signed(hn::ShiftRight<1>(hn::ConcatEven(d, high, low))),
            Signed(hn::ShiftRight<1>(hn::ConcatOdd(d, high, low)))};
  } else {
    const U16 pairs = LoadU16(y, 0);
    return {Signed(hn::ShiftLeft<7>(hn::And(pairs, hn::Set(d, 255)))),
            Signed(hn::And(hn::ShiftRight<1>(pairs), hn::Set(d, 255 << 7)))};
  }
}

// Chroma codes - 128, times 256.
template <class Samples>
HWY_INLINE EvenOdd LoadChroma(const uint16_t* c) {
  const ScalableTag<uint16_t> d;
  const U16 zero = hn::Set(d, 0x8000);
  if constexpr (Samples::kHalfChroma) {
    const U16 even = LoadU16(c);
    const U16 odd = Samples::kLinear ? hn::AverageRound(even, LoadU16(c + 1)) : even;
    return {Signed(hn::Xor(even, zero)), Signed(hn::Xor(odd, zero))};
  } else {
    const U16 low = LoadU16(c), high = LoadU16(c + kPairs);
    return {Signed(hn::Xor(hn::ConcatEven(d, high, low), zero)), Signed(hn::Xor(hn::ConcatOdd(d, high, low), zero))};
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

// Four vectors whose 128-bit blocks follow one another across the vectors: block 0 of each, block 1 of each ...
HWY_INLINE void StoreBlocks(U8 v0, U8 v1, U8 v2, U8 v3, uint8_t* dst) {
#if HWY_TARGET == HWY_AVX3
  const __m512i a = _mm512_shuffle_i32x4(v0.raw, v1.raw, 0x44), b = _mm512_shuffle_i32x4(v2.raw, v3.raw, 0x44);
  const __m512i c = _mm512_shuffle_i32x4(v0.raw, v1.raw, 0xEE), e = _mm512_shuffle_i32x4(v2.raw, v3.raw, 0xEE);
  StoreVector(U8{_mm512_shuffle_i32x4(a, b, 0x88)}, dst, 0);
  StoreVector(U8{_mm512_shuffle_i32x4(a, b, 0xDD)}, dst, 1);
  StoreVector(U8{_mm512_shuffle_i32x4(c, e, 0x88)}, dst, 2);
  StoreVector(U8{_mm512_shuffle_i32x4(c, e, 0xDD)}, dst, 3);
#elif HWY_TARGET == HWY_AVX2
  const ScalableTag<uint8_t> d;
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
  StoreBlocks(hn::BitCast(d8, hn::InterleaveLower(d32, even0, odd0)),
              hn::BitCast(d8, hn::InterleaveUpper(d32, even0, odd0)),
              hn::BitCast(d8, hn::InterleaveLower(d32, even1, odd1)),
              hn::BitCast(d8, hn::InterleaveUpper(d32, even1, odd1)), dst);
}

template <class Samples, class Op>
HWY_INLINE void Block(const void* y, const uint16_t* u, const uint16_t* v, const Op& op, uint8_t* dst) {
  const EvenOdd luma = LoadLuma<Samples>(y);
  const EvenOdd chromaU = LoadChroma<Samples>(u), chromaV = LoadChroma<Samples>(v);
  const Channels even = op.Chroma(chromaU.even, chromaV.even);
  if constexpr (Samples::kHalfChroma && !Samples::kLinear)
    StorePixels(op.Add(luma.even, even), op.Add(luma.odd, even), dst);
  else
    StorePixels(op.Add(luma.even, even), op.Add(luma.odd, op.Chroma(chromaU.odd, chromaV.odd)), dst);
}

// Luma may be a picture's own row and is read exactly, like the destination is written; chroma rows have slack.
template <class Samples, class Op>
HWY_INLINE void Row(const void* y, const uint16_t* u, const uint16_t* v, const Matrix& matrix, uint8_t* dst,
                    size_t count) {
  constexpr size_t kLumaBytes = Samples::kWideLuma ? 2 : 1;
  constexpr size_t kChromaPerBlock = Samples::kHalfChroma ? kPairs : kBlock;
  const Op op(matrix);
  const auto* luma = static_cast<const uint8_t*>(y);
  for (; count >= kBlock; count -= kBlock) {
    Block<Samples>(luma, u, v, op, dst);
    luma += kBlock * kLumaBytes, dst += kBlock * 4;
    u += kChromaPerBlock, v += kChromaPerBlock;
  }
  if (count == 0) return;
  alignas(64) uint8_t in[kBlock * kLumaBytes] = {};
  alignas(64) uint8_t out[kBlock * 4];
  std::memcpy(in, luma, count * kLumaBytes);
  Block<Samples>(in, u, v, op, out);
  std::memcpy(dst, out, count * 4);
}

template <class Samples>
void ToBgrx(const void* y, const uint16_t* u, const uint16_t* v, const Matrix& matrix, uint8_t* dst, size_t count) {
  Row<Samples, BgrOp>(y, u, v, matrix, dst, count);
}
template <class Samples>
void ToVuyx(const void* y, const uint16_t* u, const uint16_t* v, const Matrix& matrix, uint8_t* dst, size_t count) {
  Row<Samples, VuyOp>(y, u, v, matrix, dst, count);
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
template <class Samples>
int32_t Luma(const void* y, size_t x) {
  const auto* bytes = static_cast<const uint8_t*>(y);
  if constexpr (!Samples::kWideLuma) return bytes[x] << 7;
  return (bytes[2 * x] | bytes[2 * x + 1] << 8) >> 1;
}

// Code - 128, times 256.
template <class Samples>
int32_t Chroma(const uint16_t* c, size_t x) {
  if constexpr (!Samples::kHalfChroma) return c[x] - 0x8000;
  const bool between = Samples::kLinear && x % 2 != 0;
  return (between ? (c[x / 2] + c[x / 2 + 1] + 1) >> 1 : c[x / 2]) - 0x8000;
}

// kLumaChannels: bit k is set if channel k has luma; the others are chroma about 128.
template <class Samples, unsigned kLumaChannels>
void Row(const void* y, const uint16_t* u, const uint16_t* v, const Matrix& matrix, uint8_t* dst, size_t count) {
  for (size_t x = 0; x < count; ++x) {
    const int32_t luma = Scale(Luma<Samples>(y, x), matrix.luma) + matrix.lumaBias;
    const int32_t chromaU = Chroma<Samples>(u, x), chromaV = Chroma<Samples>(v, x);
    for (unsigned k = 0; k < 3; ++k) {
      const bool hasLuma = (kLumaChannels >> k & 1) != 0;
      const int32_t base = hasLuma ? luma : (128 << kFractionBits) + (1 << kFractionBits) / 2;
      dst[4 * x + k] = ToByte(base + Scale(chromaU, matrix.chroma[k][0]) + Scale(chromaV, matrix.chroma[k][1]));
    }
    dst[4 * x + 3] = 255;
  }
}

template <class Samples>
void ToBgrx(const void* y, const uint16_t* u, const uint16_t* v, const Matrix& matrix, uint8_t* dst, size_t count) {
  Row<Samples, 7>(y, u, v, matrix, dst, count);
}
template <class Samples>
void ToVuyx(const void* y, const uint16_t* u, const uint16_t* v, const Matrix& matrix, uint8_t* dst, size_t count) {
  Row<Samples, 4>(y, u, v, matrix, dst, count);
}

}  // namespace
}  // namespace plain

const PixelKernels kToBgrx = {VX_KERNEL_VARIANTS(ToBgrx<Nearest>), VX_KERNEL_VARIANTS(ToBgrx<Linear>),
                              VX_KERNEL_VARIANTS(ToBgrx<WideNearest>), VX_KERNEL_VARIANTS(ToBgrx<WideLinear>),
                              VX_KERNEL_VARIANTS(ToBgrx<Full>)};
const PixelKernels kToVuyx = {VX_KERNEL_VARIANTS(ToVuyx<Nearest>), VX_KERNEL_VARIANTS(ToVuyx<Linear>),
                              VX_KERNEL_VARIANTS(ToVuyx<WideNearest>), VX_KERNEL_VARIANTS(ToVuyx<WideLinear>),
                              VX_KERNEL_VARIANTS(ToVuyx<Full>)};

}  // namespace vexel::decode420
#endif
