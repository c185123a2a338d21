#include "convert/Encode420Kernels.h"

#include <cstddef>
#include <cstdint>
#include <cstring>

#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "convert/Encode420Kernels.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

#include "convert/PixelVectors-inl.h"
#include "frame/KernelTable.h"

#if HWY_TARGET != HWY_BASELINE_SCALAR
HWY_BEFORE_NAMESPACE();
namespace vexel::encode420 {
namespace HWY_NAMESPACE {
namespace {
using namespace vexel::HWY_NAMESPACE;
using hwy::HWY_NAMESPACE::ScalableTag;

constexpr size_t kN = kLanes<uint16_t>;

struct Channels {
  U16 c[3];
};

// The channels of kN pixels, widened.
HWY_INLINE Channels LoadPixels(const uint8_t* pixels) {
  const ScalableTag<uint16_t> d16;
  const hn::Rebind<uint8_t, decltype(d16)> d8;
  hn::VFromD<decltype(d8)> c0, c1, c2, c3;
  hn::LoadInterleaved4(d8, pixels, c0, c1, c2, c3);
  return {{hn::PromoteTo(d16, c0), hn::PromoteTo(d16, c1), hn::PromoteTo(d16, c2)}};
}

HWY_INLINE I16 Set(int16_t value) { return hn::Set(ScalableTag<int16_t>(), value); }
template <int kShift>
HWY_INLINE I16 Scale(U16 v, int16_t factor) {
  return hn::MulFixedPoint15(hn::BitCast(ScalableTag<int16_t>(), hn::ShiftLeft<kShift>(v)), Set(factor));
}
template <int kShift>
HWY_INLINE I16 Dot(const Channels& bgr, const BgrFactors& f) {
  return hn::Add(hn::Add(Scale<kShift>(bgr.c[0], f.b), Scale<kShift>(bgr.c[1], f.g)), Scale<kShift>(bgr.c[2], f.r));
}

HWY_INLINE void StoreBytes(I16 v, uint8_t* p) {
  const ScalableTag<int16_t> d16;
  const hn::Rebind<uint8_t, decltype(d16)> d8;
  hn::StoreU(hn::DemoteTo(d8, v), d8, p);
}

// body(pixels, luma) for kN pixels at a time.
template <class Body>
HWY_INLINE void LumaLoop(const uint8_t* pixels, uint8_t* luma, size_t count, const Body& body) {
  RowLoop<kN, 4, 1>(pixels, luma, count, body);
}

void TakeLuma(const uint8_t* pixels, uint8_t* luma, size_t count) {
  LumaLoop(pixels, luma, count, [](const uint8_t* in, uint8_t* out) HWY_ATTR {
    StoreBytes(hn::BitCast(ScalableTag<int16_t>(), LoadPixels(in).c[2]), out);
  });
}

void MakeLuma(const uint8_t* pixels, const BgrFactors& factors, uint8_t* luma, size_t count) {
  LumaLoop(pixels, luma, count, [&](const uint8_t* in, uint8_t* out) HWY_ATTR {
    StoreBytes(hn::ShiftRight<7>(hn::SaturatedAdd(Dot<7>(LoadPixels(in), factors), Set(64))), out);
  });
}

void SumLines(const uint8_t* a, const uint8_t* b, int weightA, int weightB, uint16_t* const sums[3], size_t count) {
  const ScalableTag<uint16_t> d;
  const U16 wa = hn::Set(d, static_cast<uint16_t>(weightA)), wb = hn::Set(d, static_cast<uint16_t>(weightB));
  alignas(64) uint8_t tailA[kN * 4] = {};
  alignas(64) uint8_t tailB[kN * 4] = {};
  for (size_t i = 0; i < count; i += kN) {
    const bool isTail = count - i < kN;
    if (isTail) {
      std::memcpy(tailA, a + 4 * i, 4 * (count - i));
      std::memcpy(tailB, b + 4 * i, 4 * (count - i));
    }
    const Channels pa = LoadPixels(isTail ? tailA : a + 4 * i), pb = LoadPixels(isTail ? tailB : b + 4 * i);
    for (int k = 0; k < 3; ++k) hn::StoreU(hn::Add(hn::Mul(pa.c[k], wa), hn::Mul(pb.c[k], wb)), d, sums[k] + i);
  }
}

// (1, 2, 1) about the even columns from `sums` on: 16 times the codes.
HWY_INLINE U16 Filter(const uint16_t* sums) {
  const ScalableTag<uint16_t> d;
  const U16 low = hn::LoadU(d, sums), high = hn::LoadU(d, sums + kN);
  const U16 lowBefore = hn::LoadU(d, sums - 1), highBefore = hn::LoadU(d, sums + kN - 1);
  const U16 even = hn::ConcatEven(d, high, low), odd = hn::ConcatOdd(d, high, low);
  return hn::Add(hn::Add(even, even), hn::Add(odd, hn::ConcatEven(d, highBefore, lowBefore)));
}

template <class Make>
HWY_INLINE void ChromaLoop(uint8_t* chroma, size_t count, const Make& make) {
  size_t i = 0;
  for (; i + kN <= count; i += kN) StoreBytes(make(2 * i), chroma + i);
  if (i == count) return;
  alignas(64) uint8_t tail[kN];
  StoreBytes(make(2 * i), tail);
  std::memcpy(chroma + i, tail, count - i);
}

void FilterChroma(const uint16_t* sums, uint8_t* chroma, size_t count) {
  const ScalableTag<uint16_t> d;
  ChromaLoop(chroma, count, [&](size_t x) HWY_ATTR {
    return hn::BitCast(ScalableTag<int16_t>(), hn::ShiftRight<4>(hn::Add(Filter(sums + x), hn::Set(d, 8))));
  });
}

void MakeChroma(const uint16_t* const sums[3], const BgrFactors& factors, uint8_t* chroma, size_t count) {
  ChromaLoop(chroma, count, [&](size_t x) HWY_ATTR {
    const Channels bgr = {{Filter(sums[0] + x), Filter(sums[1] + x), Filter(sums[2] + x)}};
    return hn::ShiftRight<7>(hn::SaturatedAdd(Dot<3>(bgr, factors), Set((128 << 7) + 64)));
  });
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

int32_t Scale(int32_t value, int32_t factor) { return (value * factor + 0x4000) >> 15; }
uint8_t ToByte(int32_t sum) {
  const int32_t code = sum >> 7;
  return static_cast<uint8_t>(code < 0 ? 0 : code > 255 ? 255 : code);
}

void TakeLuma(const uint8_t* pixels, uint8_t* luma, size_t count) {
  for (size_t x = 0; x < count; ++x) luma[x] = pixels[4 * x + 2];
}

void MakeLuma(const uint8_t* pixels, const BgrFactors& f, uint8_t* luma, size_t count) {
  for (size_t x = 0; x < count; ++x) {
    const uint8_t* p = pixels + 4 * x;
    luma[x] = ToByte(Scale(p[0] << 7, f.b) + Scale(p[1] << 7, f.g) + Scale(p[2] << 7, f.r) + 64);
  }
}

void SumLines(const uint8_t* a, const uint8_t* b, int weightA, int weightB, uint16_t* const sums[3], size_t count) {
  for (size_t x = 0; x < count; ++x)
    for (size_t k = 0; k < 3; ++k) sums[k][x] = static_cast<uint16_t>(weightA * a[4 * x + k] + weightB * b[4 * x + k]);
}

int32_t Filter(const uint16_t* sums) { return *(sums - 1) + 2 * sums[0] + sums[1]; }

void FilterChroma(const uint16_t* sums, uint8_t* chroma, size_t count) {
  for (size_t i = 0; i < count; ++i) chroma[i] = static_cast<uint8_t>((Filter(sums + 2 * i) + 8) >> 4);
}

void MakeChroma(const uint16_t* const sums[3], const BgrFactors& f, uint8_t* chroma, size_t count) {
  for (size_t i = 0; i < count; ++i) {
    const int32_t b = Filter(sums[0] + 2 * i) << 3, g = Filter(sums[1] + 2 * i) << 3, r = Filter(sums[2] + 2 * i) << 3;
    chroma[i] = ToByte(Scale(b, f.b) + Scale(g, f.g) + Scale(r, f.r) + (128 << 7) + 64);
  }
}

}  // namespace
}  // namespace plain

const KernelVariants<encode420::TakeLuma> kTakeLuma = VX_KERNEL_VARIANTS(TakeLuma);
const KernelVariants<encode420::MakeLuma> kMakeLuma = VX_KERNEL_VARIANTS(MakeLuma);
const KernelVariants<encode420::SumLines> kSumLines = VX_KERNEL_VARIANTS(SumLines);
const KernelVariants<encode420::FilterChroma> kFilterChroma = VX_KERNEL_VARIANTS(FilterChroma);
const KernelVariants<encode420::MakeChroma> kMakeChroma = VX_KERNEL_VARIANTS(MakeChroma);

}  // namespace vexel::encode420
#endif
