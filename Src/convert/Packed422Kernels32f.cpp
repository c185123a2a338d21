// Packed 4:2:2 in single precision: U Y0 V Y1 (UYVY) or Y0 U Y1 V (YUYV), chroma co-sited with the even pixel.
#include <cstddef>
#include <cstdint>
#include <cstring>

#include "convert/PlainYuv.h"
#include "convert/StudioScale.h"
#include "convert/YuvKernels.h"

#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "convert/Packed422Kernels32f.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

#include "convert/FloatPixels-inl.h"
#include "frame/KernelTable.h"

#ifndef VEXEL_CONVERT_PACKED422KERNELS32F_ONCE
#define VEXEL_CONVERT_PACKED422KERNELS32F_ONCE
namespace vexel {
namespace {

constexpr size_t PairsOf(size_t pixels) { return (pixels + 1) / 2; }

// The interpolated chroma between c0 and c1.
inline float Between(float before, float c0, float c1, float after) {
  return (9.0f * (c0 + c1) - (before + after)) * 0.0625f;
}

// A row as it continues beyond its ends: pairs first ... first + count - 1, whose indices may lie outside of the row.
inline void ExtendPairs(const uint8_t* row, size_t pixels, ptrdiff_t first, size_t count, uint8_t* out) {
  const auto last = static_cast<ptrdiff_t>(PairsOf(pixels)) - 1;
  for (size_t i = 0; i < count; ++i) {
    const ptrdiff_t pair = first + static_cast<ptrdiff_t>(i);
    std::memcpy(out + 16 * i, row + 16 * (pair < 0 ? 0 : pair > last ? last : pair), 16);
  }
}

// The same for pixels. Even pixels repeat the first or last one. Odd pixels that the row does not have are those that
// interpolation would make, so that they pull on no chroma; their luma is that of the even pixel.
inline void ExtendPixels(const uint8_t* row, size_t pixels, ptrdiff_t first, size_t count, uint8_t* out) {
  const auto last = static_cast<ptrdiff_t>(PairsOf(pixels)) - 1;
  const auto even = [row, last](ptrdiff_t pair) {
    return plain::LoadQuad(row + 32 * (pair < 0 ? 0 : pair > last ? last : pair));
  };
  for (size_t i = 0; i < count; ++i) {
    const ptrdiff_t pair = first + static_cast<ptrdiff_t>(i);
    const plain::Quad own = even(pair);
    plain::Quad odd = own;
    if (pair >= 0 && 2 * static_cast<size_t>(pair) + 1 < pixels) {
      odd = plain::LoadQuad(row + 32 * pair + 16);
    } else {
      const plain::Quad before = even(pair - 1), next = even(pair + 1), after = even(pair + 2);
      for (int c = 0; c < 2; ++c) odd.c[c] = Between(before.c[c], own.c[c], next.c[c], after.c[c]);
    }
    plain::StoreQuad(own, out + 32 * i);
    plain::StoreQuad(odd, out + 32 * i + 16);
  }
}

}  // namespace
}  // namespace vexel
#endif

#if HWY_TARGET != HWY_BASELINE_SCALAR
HWY_BEFORE_NAMESPACE();
namespace vexel {
namespace HWY_NAMESPACE {
namespace {

constexpr size_t kVectorPairs = kVectorPixels;

constexpr size_t kBlockPairs = 4 * kVectorPairs;

struct SwapBlock {
  HWY_INLINE void operator()(const uint8_t* HWY_RESTRICT in, uint8_t* HWY_RESTRICT out) const {
    for (size_t i = 0; i < 4; ++i) StoreVector(hn::Shuffle2301(LoadVector<int32_t>(in, i)), out, i);
  }
};

template <const StudioScale& kScale>
struct WidenBlock {
  HWY_INLINE void operator()(const uint8_t* HWY_RESTRICT in, uint8_t* HWY_RESTRICT out) const {
    for (size_t i = 0; i < 4; ++i) StoreVector(WidenCodes<kScale>(in + i * kLanes<float>), out, i);
  }
};

template <const StudioScale& kScale>
struct NarrowBlock {
  static HWY_INLINE I32 Codes(const uint8_t* HWY_RESTRICT in, size_t index) {
    return ScaleToCodes<kScale>(LoadVector<float>(in, index));
  }
  HWY_INLINE void operator()(const uint8_t* HWY_RESTRICT in, uint8_t* HWY_RESTRICT out) const {
    StoreVector(PackTo8(Codes(in, 0), Codes(in, 1), Codes(in, 2), Codes(in, 3)), out);
  }
};

void Swap422_32f(const uint8_t* src, uint8_t* dst, size_t count) {
  RowLoop<kBlockPairs, 16, 16>(src, dst, PairsOf(count), SwapBlock());
}
void Uyvy8To32f(const uint8_t* src, uint8_t* dst, size_t count) {
  RowLoop<kBlockPairs, 4, 16>(src, dst, PairsOf(count), WidenBlock<kUyvy8Scale>());
}
void Yuyv8To32f(const uint8_t* src, uint8_t* dst, size_t count) {
  RowLoop<kBlockPairs, 4, 16>(src, dst, PairsOf(count), WidenBlock<kYuyv8Scale>());
}
void Uyvy32fTo8(const uint8_t* src, uint8_t* dst, size_t count) {
  RowLoop<kBlockPairs, 16, 4>(src, dst, PairsOf(count), NarrowBlock<kUyvy8Scale>());
}
void Yuyv32fTo8(const uint8_t* src, uint8_t* dst, size_t count) {
  RowLoop<kBlockPairs, 16, 4>(src, dst, PairsOf(count), NarrowBlock<kYuyv8Scale>());
}

// The even pixels of kVectorPairs pixel pairs, or the odd ones.
HWY_INLINE F32 LoadEvenPixels(const uint8_t* HWY_RESTRICT p) {
#if HWY_TARGET == HWY_AVX3
  return F32{_mm512_shuffle_f32x4(LoadVector<float>(p, 0).raw, LoadVector<float>(p, 1).raw, 0x88)};
#elif HWY_TARGET == HWY_AVX2
  return F32{_mm256_permute2f128_ps(LoadVector<float>(p, 0).raw, LoadVector<float>(p, 1).raw, 0x20)};
#else
  return LoadVector<float>(p, 0);
#endif
}
HWY_INLINE F32 LoadOddPixels(const uint8_t* HWY_RESTRICT p) {
#if HWY_TARGET == HWY_AVX3
  return F32{_mm512_shuffle_f32x4(LoadVector<float>(p, 0).raw, LoadVector<float>(p, 1).raw, 0xDD)};
#elif HWY_TARGET == HWY_AVX2
  return F32{_mm256_permute2f128_ps(LoadVector<float>(p, 0).raw, LoadVector<float>(p, 1).raw, 0x31)};
#else
  return LoadVector<float>(p, 1);
#endif
}

HWY_INLINE void StorePixelPairs(F32 even, F32 odd, uint8_t* HWY_RESTRICT p) {
#if HWY_TARGET == HWY_AVX3
  const __m512i lower = _mm512_setr_epi64(0, 1, 8, 9, 2, 3, 10, 11),
                upper = _mm512_setr_epi64(4, 5, 12, 13, 6, 7, 14, 15);
  const __m512d e = _mm512_castps_pd(even.raw), o = _mm512_castps_pd(odd.raw);
  StoreVector(F32{_mm512_castpd_ps(_mm512_permutex2var_pd(e, lower, o))}, p, 0);
  StoreVector(F32{_mm512_castpd_ps(_mm512_permutex2var_pd(e, upper, o))}, p, 1);
#elif HWY_TARGET == HWY_AVX2
  StoreVector(F32{_mm256_permute2f128_ps(even.raw, odd.raw, 0x20)}, p, 0);
  StoreVector(F32{_mm256_permute2f128_ps(even.raw, odd.raw, 0x31)}, p, 1);
#else
  StoreVector(even, p, 0);
  StoreVector(odd, p, 1);
#endif
}

// Between of all channels of four vectors.
HWY_INLINE F32 VectorBetween(F32 before, F32 c0, F32 c1, F32 after) {
  const FloatTag d;
  return hn::Mul(hn::Sub(hn::Mul(hn::Set(d, 9.0f), hn::Add(c0, c1)), hn::Add(before, after)), hn::Set(d, 0.0625f));
}

struct Interpolated {
  static constexpr size_t kBefore = 1, kAfter = 2, kSrcPair = 16, kDstPair = 32;
  static constexpr auto kExtend = ExtendPairs;
  static size_t DstBytes(size_t count) { return 16 * count; }
  static HWY_INLINE void Apply(const uint8_t* HWY_RESTRICT src, uint8_t* HWY_RESTRICT dst) {
    const auto own = LoadVector<float>(src);
    const auto between =
        VectorBetween(LoadVector<float>(src - 16), own, LoadVector<float>(src + 16), LoadVector<float>(src + 32));
    const auto even = PermuteChannels<2, 0, 1, 3>(own);
    const auto odd = PermuteChannels<2, 0, 3, 3>(TakeChannels<8>(between, own));
    StorePixelPairs(FinishAlpha<true>(even, even), FinishAlpha<true>(odd, odd), dst);
  }
};

struct Nearest {
  static constexpr size_t kBefore = 0, kAfter = 0, kSrcPair = 16, kDstPair = 32;
  static constexpr auto kExtend = ExtendPairs;
  static size_t DstBytes(size_t count) { return 16 * count; }
  static HWY_INLINE void Apply(const uint8_t* HWY_RESTRICT src, uint8_t* HWY_RESTRICT dst) {
    const auto own = LoadVector<float>(src);
    const auto even = PermuteChannels<2, 0, 1, 3>(own), odd = PermuteChannels<2, 0, 3, 3>(own);
    StorePixelPairs(FinishAlpha<true>(even, even), FinishAlpha<true>(odd, odd), dst);
  }
};

struct Filtered {
  static constexpr size_t kBefore = 2, kAfter = 2, kSrcPair = 32, kDstPair = 16;
  static constexpr auto kExtend = ExtendPixels;
  static size_t DstBytes(size_t count) { return 16 * PairsOf(count); }
  static HWY_INLINE void Apply(const uint8_t* HWY_RESTRICT src, uint8_t* HWY_RESTRICT dst) {
    const FloatTag d;
    const auto before2 = LoadEvenPixels(src - 64), before = LoadEvenPixels(src - 32), own = LoadEvenPixels(src);
    const auto after = LoadEvenPixels(src + 32), after2 = LoadEvenPixels(src + 64);
    const auto oddBefore = LoadOddPixels(src - 32), odd = LoadOddPixels(src);
    const auto left = hn::Sub(VectorBetween(before2, before, own, after), oddBefore);
    const auto right = hn::Sub(VectorBetween(before, own, after, after2), odd);
    const auto chroma = hn::Sub(own, hn::Mul(hn::Add(left, right), hn::Set(d, 0.25f)));
    const auto luma = hn::InterleaveUpper(d, own, odd);  // Y0 Y1 in the lower half
    StoreVector(hn::InterleaveLower(d, hn::Shuffle2301(chroma), luma), dst);
  }
};

// Calls Step::Apply for blocks of pairs that may look at their neighbours; where those are not in the row, on a copy
// that continues beyond its ends.
template <class Step>
HWY_INLINE void NeighbourLoop(const uint8_t* HWY_RESTRICT src, uint8_t* HWY_RESTRICT dst, size_t count) {
  constexpr size_t kBlock = kVectorPairs, kSeen = Step::kBefore + kBlock + Step::kAfter;
  const size_t dstBytes = Step::DstBytes(count);
  for (size_t pair = 0; 2 * pair < count; pair += kBlock) {
    if (pair >= Step::kBefore)
      for (; 2 * (pair + kBlock + Step::kAfter) <= count; pair += kBlock)
        Step::Apply(src + pair * Step::kSrcPair, dst + pair * Step::kDstPair);
    if (2 * pair >= count) break;
    alignas(64) uint8_t in[kSeen * Step::kSrcPair];
    alignas(64) uint8_t out[kBlock * Step::kDstPair];
    Step::kExtend(src, count, static_cast<ptrdiff_t>(pair) - static_cast<ptrdiff_t>(Step::kBefore), kSeen, in);
    Step::Apply(in + Step::kBefore * Step::kSrcPair, out);
    const size_t at = pair * Step::kDstPair;
    std::memcpy(dst + at, out, dstBytes - at < sizeof out ? dstBytes - at : sizeof out);
  }
}

void Uyvy32fToVuyx32f(const uint8_t* src, uint8_t* dst, size_t count) { NeighbourLoop<Interpolated>(src, dst, count); }
void Uyvy32fToVuyx32fNearest(const uint8_t* src, uint8_t* dst, size_t count) {
  NeighbourLoop<Nearest>(src, dst, count);
}
void Vuyx32fToUyvy32f(const uint8_t* src, uint8_t* dst, size_t count) { NeighbourLoop<Filtered>(src, dst, count); }

}  // namespace
}  // namespace HWY_NAMESPACE
}  // namespace vexel
HWY_AFTER_NAMESPACE();
#endif  // HWY_TARGET

#if HWY_ONCE
namespace vexel {
namespace plain {
namespace {

void Swap422_32f(const uint8_t* src, uint8_t* dst, size_t count) {
  for (size_t word = 0; word < 4 * PairsOf(count); ++word) std::memcpy(dst + 4 * word, src + 4 * (word ^ 1), 4);
}

void Uyvy8To32f(const uint8_t* src, uint8_t* dst, size_t count) {
  for (size_t i = 0; i < PairsOf(count); ++i, src += 4, dst += 16)
    StoreQuad({{ChromaToFloat(src[0]), LumaToFloat(src[1]), ChromaToFloat(src[2]), LumaToFloat(src[3])}}, dst);
}

void Yuyv8To32f(const uint8_t* src, uint8_t* dst, size_t count) {
  for (size_t i = 0; i < PairsOf(count); ++i, src += 4, dst += 16)
    StoreQuad({{LumaToFloat(src[0]), ChromaToFloat(src[1]), LumaToFloat(src[2]), ChromaToFloat(src[3])}}, dst);
}

// kLuma is the index of the first luma sample.
template <int kLuma>
void NarrowPairs(const uint8_t* src, uint8_t* dst, size_t count) {
  for (size_t i = 0; i < PairsOf(count); ++i, src += 16, dst += 4) {
    const Quad pair = LoadQuad(src);
    for (int c = 0; c < 4; ++c) dst[c] = c % 2 == kLuma ? LumaTo8(pair.c[c]) : ChromaTo8(pair.c[c]);
  }
}

void Uyvy32fTo8(const uint8_t* src, uint8_t* dst, size_t count) { NarrowPairs<1>(src, dst, count); }
void Yuyv32fTo8(const uint8_t* src, uint8_t* dst, size_t count) { NarrowPairs<0>(src, dst, count); }

struct Chroma {
  float v, u;
};

// Chroma of a pair of a UYVY row that continues beyond its ends.
Chroma PairChroma(const uint8_t* row, size_t pixels, ptrdiff_t pair) {
  uint8_t bytes[16];
  ExtendPairs(row, pixels, pair, 1, bytes);
  const Quad quad = LoadQuad(bytes);
  return {quad.c[2], quad.c[0]};
}

void Uyvy32fToVuyx32f(const uint8_t* src, uint8_t* dst, size_t count) {
  for (size_t x = 0; x < count; ++x) {
    const auto pair = static_cast<ptrdiff_t>(x / 2);
    Chroma c = PairChroma(src, count, pair);
    if (x % 2 != 0) {
      const Chroma before = PairChroma(src, count, pair - 1), next = PairChroma(src, count, pair + 1),
                   after = PairChroma(src, count, pair + 2);
      c = {Between(before.v, c.v, next.v, after.v), Between(before.u, c.u, next.u, after.u)};
    }
    StoreQuad({{c.v, c.u, LoadQuad(src + 16 * pair).c[1 + 2 * (x % 2)], 1.0f}}, dst + 16 * x);
  }
}

void Uyvy32fToVuyx32fNearest(const uint8_t* src, uint8_t* dst, size_t count) {
  for (size_t x = 0; x < count; ++x) {
    const Quad pair = LoadQuad(src + 16 * (x / 2));
    StoreQuad({{pair.c[2], pair.c[0], pair.c[1 + 2 * (x % 2)], 1.0f}}, dst + 16 * x);
  }
}

// What interpolation gets wrong at the odd pixel of a pair, per chroma channel.
Chroma Detail(const Quad* pairs) {
  const auto detail = [pairs](int c) {
    return Between(pairs[-2].c[c], pairs[0].c[c], pairs[2].c[c], pairs[4].c[c]) - pairs[1].c[c];
  };
  return {detail(0), detail(1)};
}

void Vuyx32fToUyvy32f(const uint8_t* src, uint8_t* dst, size_t count) {
  for (size_t i = 0; i < PairsOf(count); ++i) {
    uint8_t bytes[5 * 32];
    ExtendPixels(src, count, static_cast<ptrdiff_t>(i) - 2, 5, bytes);
    Quad near[10];
    std::memcpy(near, bytes, sizeof near);
    const Quad *even = near + 4, *odd = even + 1;
    const Chroma left = Detail(even - 2), right = Detail(even);
    StoreQuad(
        {{even->c[1] - (left.u + right.u) * 0.25f, even->c[2], even->c[0] - (left.v + right.v) * 0.25f, odd->c[2]}},
        dst + 16 * i);
  }
}

}  // namespace
}  // namespace plain

const RowKernelSet kSwap422_32f = VX_KERNEL_VARIANTS(Swap422_32f);
const RowKernelSet kUyvy8To32f = VX_KERNEL_VARIANTS(Uyvy8To32f);
const RowKernelSet kYuyv8To32f = VX_KERNEL_VARIANTS(Yuyv8To32f);
const RowKernelSet kUyvy32fTo8 = VX_KERNEL_VARIANTS(Uyvy32fTo8);
const RowKernelSet kYuyv32fTo8 = VX_KERNEL_VARIANTS(Yuyv32fTo8);
const RowKernelSet kUyvy32fToVuyx32f = VX_KERNEL_VARIANTS(Uyvy32fToVuyx32f);
const RowKernelSet kUyvy32fToVuyx32fNearest = VX_KERNEL_VARIANTS(Uyvy32fToVuyx32fNearest);
const RowKernelSet kVuyx32fToUyvy32f = VX_KERNEL_VARIANTS(Vuyx32fToUyvy32f);

}  // namespace vexel
#endif
