#include "convert/Encode420Kernels.h"

#include <cstddef>
#include <cstdint>
#include <cstring>

#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "convert/Encode420Kernels.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

#include "convert/YuvVectors8-inl.h"
#include "frame/KernelTable.h"

#ifndef VEXEL_CONVERT_ENCODE420KERNELS_SCALES
#define VEXEL_CONVERT_ENCODE420KERNELS_SCALES
namespace vexel::encode420 {
namespace {

// Fractional bits of luma sums, and of chroma sums: those of the factors and of weights that total 16.
inline constexpr int kLumaBits = 15, kWeightBits = 4, kChromaBits = kLumaBits + kWeightBits;

}  // namespace
}  // namespace vexel::encode420
#endif

#if HWY_TARGET != HWY_BASELINE_SCALAR
HWY_BEFORE_NAMESPACE();
namespace vexel::encode420 {
namespace HWY_NAMESPACE {
namespace {
using namespace vexel::HWY_NAMESPACE;
using hwy::HWY_NAMESPACE::ScalableTag;

constexpr size_t kPixels = kLanes<uint32_t>;  // in a vector
constexpr size_t kOutputs = 4 * kPixels;      // bytes in a vector

HWY_INLINE I32 Set(int32_t value) { return hn::Set(ScalableTag<int32_t>(), value); }

// Channels 0 and 2, or 1 and 3, of each pixel as words.
HWY_INLINE U16 Outer(U8 pixels) { return AsU16(hn::And(pixels, Dwords(0x00FF00FF))); }
HWY_INLINE U16 Inner(U8 pixels) { return hn::ShiftRight<8>(AsU16(pixels)); }

// The product of factors and a pixel's channels.
struct Dot {
  I16 outer, inner;
  explicit HWY_INLINE Dot(const BgrFactors& f) : outer(WordPair(f.b, f.r)), inner(WordPair(f.g, 0)) {}
  HWY_INLINE I32 operator()(U16 outerPixels, U16 innerPixels) const {
    return hn::Add(MultiplyPairs(AsI16(outerPixels), outer), MultiplyPairs(AsI16(innerPixels), inner));
  }
};

void LumaFromBgrx(const uint8_t* pixels, const BgrFactors& factors, uint8_t* luma, size_t count) {
  const Dot dot(factors);
  const auto make = [&](const uint8_t* in, size_t index) HWY_ATTR {
    const U8 p = LoadVector<uint8_t>(in, index);
    return hn::ShiftRight<kLumaBits>(hn::Add(dot(Outer(p), Inner(p)), Set(1 << (kLumaBits - 1))));
  };
  RowLoop<kOutputs, 4, 1>(pixels, luma, count, [&](const uint8_t* in, uint8_t* out) HWY_ATTR {
    StoreVector(PackTo8(make(in, 0), make(in, 1), make(in, 2), make(in, 3)), out);
  });
}

void LumaFromVuyx(const uint8_t* pixels, const BgrFactors&, uint8_t* luma, size_t count) {
  const auto take = [](const uint8_t* in, size_t index) HWY_ATTR {
    return AsI32(hn::And(hn::ShiftRight<16>(LoadVector<uint32_t>(in, index)), hn::Set(ScalableTag<uint32_t>(), 255)));
  };
  RowLoop<kOutputs, 4, 1>(pixels, luma, count, [&](const uint8_t* in, uint8_t* out) HWY_ATTR {
    StoreVector(PackTo8(take(in, 0), take(in, 1), take(in, 2), take(in, 3)), out);
  });
}

void SumLines(const uint8_t* a, const uint8_t* b, int weightA, int weightB, const SumRows& sums, size_t count) {
  const ScalableTag<uint16_t> d;
  const U16 wa = hn::Set(d, static_cast<uint16_t>(weightA)), wb = hn::Set(d, static_cast<uint16_t>(weightB));
  const auto sum = [&](const uint8_t* inA, const uint8_t* inB, size_t i) HWY_ATTR {
    const U8 pa = LoadVector<uint8_t>(inA), pb = LoadVector<uint8_t>(inB);
    hn::StoreU(hn::Add(hn::Mul(Outer(pa), wa), hn::Mul(Outer(pb), wb)), d, sums.outer + 2 * i);
    hn::StoreU(hn::Add(hn::Mul(Inner(pa), wa), hn::Mul(Inner(pb), wb)), d, sums.inner + 2 * i);
  };
  size_t i = 0;
  for (; i + kPixels <= count; i += kPixels) sum(a + 4 * i, b + 4 * i, i);
  if (i == count) return;
  alignas(64) uint8_t tailA[4 * kPixels] = {};
  alignas(64) uint8_t tailB[4 * kPixels] = {};
  std::memcpy(tailA, a + 4 * i, 4 * (count - i));
  std::memcpy(tailB, b + 4 * i, 4 * (count - i));
  sum(tailA, tailB, i);
}

// (1, 2, 1) about the even ones of the pixels from `sums` on.
HWY_INLINE U16 Filter(const uint16_t* sums) {
  const ScalableTag<uint16_t> d;
  const ScalableTag<uint32_t> d32;
  const auto load = [&](ptrdiff_t pixel) HWY_ATTR { return hn::BitCast(d32, hn::LoadU(d, sums + 2 * pixel)); };
  const U32 low = load(0), high = load(kPixels);
  const U16 even = AsU16(hn::ConcatEven(d32, high, low)), odd = AsU16(hn::ConcatOdd(d32, high, low));
  const U16 before = AsU16(hn::ConcatEven(d32, load(kPixels - 1), load(-1)));
  return hn::Add(hn::Add(even, even), hn::Add(odd, before));
}

// Two filtered vectors of words, channels by pairs, of kPixels chroma samples.
struct Filtered {
  U16 outer, inner;
  HWY_INLINE Filtered(const SumRows& sums, size_t sample)
      : outer(Filter(sums.outer + 4 * sample)), inner(Filter(sums.inner + 4 * sample)) {}
};

// make(filtered, u, v) for each vector of sums, then bytes.
template <class Make>
HWY_INLINE void ChromaLoop(const SumRows& sums, uint8_t* u, uint8_t* v, size_t count, const Make& make) {
  for (size_t i = 0; i < count; i += kOutputs) {
    I32 us[4], vs[4];
    for (size_t k = 0; k < 4; ++k) {
      // Past the end of the row there is nothing to read.
      if (k != 0 && i + k * kPixels >= count)
        us[k] = vs[k] = Set(0);
      else
        make(Filtered(sums, i + k * kPixels), us[k], vs[k]);
    }
    const U8 bytesU = PackTo8(us[0], us[1], us[2], us[3]), bytesV = PackTo8(vs[0], vs[1], vs[2], vs[3]);
    if (count - i >= kOutputs) {
      StoreVector(bytesU, u + i);
      StoreVector(bytesV, v + i);
    } else {
      alignas(64) uint8_t tail[kOutputs];
      StoreVector(bytesU, tail);
      std::memcpy(u + i, tail, count - i);
      StoreVector(bytesV, tail);
      std::memcpy(v + i, tail, count - i);
    }
  }
}

void ChromaFromBgrx(const SumRows& sums, const ChromaFactors& factors, uint8_t* u, uint8_t* v, size_t count) {
  const Dot dotU(factors.u), dotV(factors.v);
  const I32 bias = Set((128 << kChromaBits) + (1 << (kChromaBits - 1)));
  ChromaLoop(sums, u, v, count, [&](const Filtered& f, I32& outU, I32& outV) HWY_ATTR {
    outU = hn::ShiftRight<kChromaBits>(hn::Add(dotU(f.outer, f.inner), bias));
    outV = hn::ShiftRight<kChromaBits>(hn::Add(dotV(f.outer, f.inner), bias));
  });
}

void ChromaFromVuyx(const SumRows& sums, const ChromaFactors&, uint8_t* u, uint8_t* v, size_t count) {
  const auto take = [](U16 pairs) HWY_ATTR {
    const I32 low = hn::And(AsI32(pairs), Set(0xFFFF));
    return hn::ShiftRight<kWeightBits>(hn::Add(low, Set(1 << (kWeightBits - 1))));
  };
  ChromaLoop(sums, u, v, count, [&](const Filtered& f, I32& outU, I32& outV) HWY_ATTR {
    outU = take(f.inner);
    outV = take(f.outer);
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

template <int kBits>
uint8_t Round(int32_t sum) {
  const int32_t code = (sum + (1 << (kBits - 1))) >> kBits;
  return static_cast<uint8_t>(code < 0 ? 0 : code > 255 ? 255 : code);
}

void LumaFromBgrx(const uint8_t* pixels, const BgrFactors& f, uint8_t* luma, size_t count) {
  for (size_t x = 0; x < count; ++x) {
    const uint8_t* p = pixels + 4 * x;
    luma[x] = Round<kLumaBits>(p[0] * f.b + p[1] * f.g + p[2] * f.r);
  }
}

void LumaFromVuyx(const uint8_t* pixels, const BgrFactors&, uint8_t* luma, size_t count) {
  for (size_t x = 0; x < count; ++x) luma[x] = pixels[4 * x + 2];
}

void SumLines(const uint8_t* a, const uint8_t* b, int weightA, int weightB, const SumRows& sums, size_t count) {
  for (size_t i = 0; i < 2 * count; ++i) {
    sums.outer[i] = static_cast<uint16_t>(weightA * a[2 * i] + weightB * b[2 * i]);
    sums.inner[i] = static_cast<uint16_t>(weightA * a[2 * i + 1] + weightB * b[2 * i + 1]);
  }
}

// (1, 2, 1) about pixel 2 i of every second word.
int32_t Filter(const uint16_t* words, size_t i) { return *(words + 4 * i - 2) + 2 * words[4 * i] + words[4 * i + 2]; }

void ChromaFromBgrx(const SumRows& sums, const ChromaFactors& f, uint8_t* u, uint8_t* v, size_t count) {
  for (size_t i = 0; i < count; ++i) {
    const int32_t b = Filter(sums.outer, i), g = Filter(sums.inner, i), r = Filter(sums.outer + 1, i);
    u[i] = Round<kChromaBits>(b * f.u.b + g * f.u.g + r * f.u.r + (128 << kChromaBits));
    v[i] = Round<kChromaBits>(b * f.v.b + g * f.v.g + r * f.v.r + (128 << kChromaBits));
  }
}

void ChromaFromVuyx(const SumRows& sums, const ChromaFactors&, uint8_t* u, uint8_t* v, size_t count) {
  for (size_t i = 0; i < count; ++i) {
    u[i] = Round<kWeightBits>(Filter(sums.inner, i));
    v[i] = Round<kWeightBits>(Filter(sums.outer, i));
  }
}

}  // namespace
}  // namespace plain

const KernelVariants<MakeLuma> kLumaFromBgrx = VX_KERNEL_VARIANTS(LumaFromBgrx);
const KernelVariants<MakeLuma> kLumaFromVuyx = VX_KERNEL_VARIANTS(LumaFromVuyx);
const KernelVariants<encode420::SumLines> kSumLines = VX_KERNEL_VARIANTS(SumLines);
const KernelVariants<MakeChroma> kChromaFromBgrx = VX_KERNEL_VARIANTS(ChromaFromBgrx);
const KernelVariants<MakeChroma> kChromaFromVuyx = VX_KERNEL_VARIANTS(ChromaFromVuyx);

}  // namespace vexel::encode420
#endif
