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

// kVectorPairs pixel pairs from their even and their odd pixels.
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

// Between of all lanes of four vectors.
template <class V>
HWY_INLINE V VectorBetween(V before, V c0, V c1, V after) {
  const hn::DFromV<V> d;
  return hn::Mul(hn::Sub(hn::Mul(hn::Set(d, 9.0f), hn::Add(c0, c1)), hn::Add(before, after)), hn::Set(d, 0.0625f));
}

struct Interpolated {
  static constexpr size_t kBefore = 1, kAfter = 2;
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
  static constexpr size_t kBefore = 0, kAfter = 0;
  static HWY_INLINE void Apply(const uint8_t* HWY_RESTRICT src, uint8_t* HWY_RESTRICT dst) {
    const auto own = LoadVector<float>(src);
    const auto even = PermuteChannels<2, 0, 1, 3>(own), odd = PermuteChannels<2, 0, 3, 3>(own);
    StorePixelPairs(FinishAlpha<true>(even, even), FinishAlpha<true>(odd, odd), dst);
  }
};

// Calls Step::Apply for blocks of pairs that may look at their neighbours; where those are not in the row, on a copy
// that continues beyond its ends.
template <class Step>
HWY_INLINE void UpsampleRow(const uint8_t* HWY_RESTRICT src, uint8_t* HWY_RESTRICT dst, size_t count) {
  constexpr size_t kBlock = kVectorPairs, kSeen = Step::kBefore + kBlock + Step::kAfter;
  for (size_t pair = 0; 2 * pair < count; pair += kBlock) {
    if (pair >= Step::kBefore)
      for (; 2 * (pair + kBlock + Step::kAfter) <= count; pair += kBlock) Step::Apply(src + 16 * pair, dst + 32 * pair);
    if (2 * pair >= count) break;
    alignas(64) uint8_t in[16 * kSeen];
    alignas(64) uint8_t out[32 * kBlock];
    ExtendPairs(src, count, static_cast<ptrdiff_t>(pair) - static_cast<ptrdiff_t>(Step::kBefore), kSeen, in);
    Step::Apply(in + 16 * Step::kBefore, out);
    const size_t left = 16 * (count - 2 * pair);
    std::memcpy(dst + 32 * pair, out, left < sizeof out ? left : sizeof out);
  }
}

void Uyvy32fToVuyx32f(const uint8_t* src, uint8_t* dst, size_t count) { UpsampleRow<Interpolated>(src, dst, count); }
void Uyvy32fToVuyx32fNearest(const uint8_t* src, uint8_t* dst, size_t count) { UpsampleRow<Nearest>(src, dst, count); }

// Channels 0 and 1 of the even and of the odd pixels of two pairs, or channels 2 and 3.
struct PixelHalves {
  hn::Vec128<float> even, odd;
};
template <bool kUpper>
HWY_INLINE PixelHalves LoadHalves(const uint8_t* HWY_RESTRICT p) {
#if HWY_TARGET <= HWY_AVX2
  const auto* doubles = reinterpret_cast<const double*>(p);
  const __m256d first = _mm256_loadu_pd(doubles), second = _mm256_loadu_pd(doubles + 4);
  const __m256 both = _mm256_castpd_ps(kUpper ? _mm256_unpackhi_pd(first, second) : _mm256_unpacklo_pd(first, second));
  return {hn::Vec128<float>{_mm256_castps256_ps128(both)}, hn::Vec128<float>{_mm256_extractf128_ps(both, 1)}};
#else
  const hn::Full128<double> d;
  const hn::Full128<float> df;
  const auto* doubles = reinterpret_cast<const double*>(p);
  const auto join = [d](const double* first, const double* second) HWY_ATTR {
    const auto a = hn::LoadU(d, first), b = hn::LoadU(d, second);
    return kUpper ? hn::InterleaveUpper(d, a, b) : hn::InterleaveLower(d, a, b);
  };
  return {hn::BitCast(df, join(doubles, doubles + 4)), hn::BitCast(df, join(doubles + 2, doubles + 6))};
#endif
}

// Runs of a row in planes of V U V U ... that stay in the cache, so that every lane of the filter has work. The planes
// have room for a last vector that is not full.
class ChromaFilter {
 public:
  void Row(const uint8_t* HWY_RESTRICT src, uint8_t* HWY_RESTRICT dst, size_t count) {
    const size_t pairs = PairsOf(count), wholePairs = count / 2;
    if (count > 0) Move(src, Even(-1));
    for (size_t first = 0; first < pairs; first += kRun, src += 32 * kRun, dst += 16 * kRun) {
      mRun = pairs - first < kRun ? pairs - first : kRun;
      mWhole = wholePairs - first < kRun ? wholePairs - first : kRun;
      if (first > 0) {
        Move(Even(kRun - 1), Even(-1));
        Move(Detail(kRun - 1), Detail(-1));
      }
      Split(src);
      for (size_t i = mRun; i < mRun + 2; ++i)
        Move(src + 32 * (first + i < pairs ? i : pairs - 1 - first), Even(static_cast<ptrdiff_t>(i)));
      Filter();
      Join(src, dst);
    }
  }

 private:
  static constexpr size_t kRun = 64, kPair = 2 * sizeof(float), kSpare = HWY_MAX_BYTES;

  uint8_t* Even(ptrdiff_t pair) { return mEven + kPair * static_cast<size_t>(pair + 1); }
  uint8_t* Odd(ptrdiff_t pair) { return mOdd + kPair * static_cast<size_t>(pair); }
  uint8_t* Detail(ptrdiff_t pair) { return mDetail + kPair * static_cast<size_t>(pair + 1); }
  static void Move(const uint8_t* from, uint8_t* to) { std::memcpy(to, from, kPair); }

  HWY_INLINE void Split(const uint8_t* HWY_RESTRICT src) {
    const hn::Full128<float> d;
    const size_t paired = mWhole / 2 * 2;
    size_t i = 0;
    for (; i < paired; i += 2) {
      const PixelHalves chroma = LoadHalves<false>(src + 32 * i);
      hn::StoreU(chroma.even, d, reinterpret_cast<float*>(Even(static_cast<ptrdiff_t>(i))));
      hn::StoreU(chroma.odd, d, reinterpret_cast<float*>(Odd(static_cast<ptrdiff_t>(i))));
    }
    for (; i < mRun; ++i) {
      Move(src + 32 * i, Even(static_cast<ptrdiff_t>(i)));
      if (i < mWhole) Move(src + 32 * i + 16, Odd(static_cast<ptrdiff_t>(i)));
    }
  }

  // Leaves the row's chroma where that of the odd pixels was.
  HWY_INLINE void Filter() {
    const size_t vectors = (mRun * kPair + HWY_MAX_BYTES - 1) / HWY_MAX_BYTES;
    for (size_t i = 0; i < vectors; ++i) {
      const auto middle = VectorBetween(LoadVector<float>(Even(-1), i), LoadVector<float>(Even(0), i),
                                        LoadVector<float>(Even(1), i), LoadVector<float>(Even(2), i));
      StoreVector(hn::Sub(middle, LoadVector<float>(mOdd, i)), Detail(0), i);
    }
    if (mWhole < mRun) std::memset(Detail(static_cast<ptrdiff_t>(mWhole)), 0, kPair);
    const auto quarter = hn::Set(FloatTag(), 0.25f);
    for (size_t i = 0; i < vectors; ++i) {
      const auto details = hn::Add(LoadVector<float>(Detail(-1), i), LoadVector<float>(Detail(0), i));
      StoreVector(hn::Sub(LoadVector<float>(Even(0), i), hn::Mul(details, quarter)), mOdd, i);
    }
  }

  HWY_INLINE void Join(const uint8_t* HWY_RESTRICT src, uint8_t* HWY_RESTRICT dst) {
    const hn::Full128<float> d;
    const size_t paired = mWhole / 2 * 2;
    size_t i = 0;
    for (; i < paired; i += 2) {
      const PixelHalves upper = LoadHalves<true>(src + 32 * i);
      const auto luma = hn::OddEven(hn::DupEven(upper.odd), upper.even);
      const auto chroma = hn::Shuffle2301(hn::LoadU(d, reinterpret_cast<const float*>(Odd(static_cast<ptrdiff_t>(i)))));
      auto* out = reinterpret_cast<float*>(dst + 16 * i);
      hn::StoreU(hn::InterleaveLower(d, chroma, luma), d, out);
      hn::StoreU(hn::InterleaveUpper(d, chroma, luma), d, out + 4);
    }
    for (; i < mRun; ++i) {
      const uint8_t* parts[4] = {mOdd + kPair * i + 4, src + 32 * i + 8, mOdd + kPair * i,
                                 src + 32 * i + (i < mWhole ? 24 : 8)};
      for (size_t c = 0; c < 4; ++c) std::memcpy(dst + 16 * i + 4 * c, parts[c], 4);
    }
  }

  alignas(64) uint8_t mEven[kPair * (kRun + 3) + kSpare] = {};
  alignas(64) uint8_t mOdd[kPair * kRun + kSpare] = {};
  alignas(64) uint8_t mDetail[kPair * (kRun + 1) + kSpare] = {};
  size_t mRun = 0, mWhole = 0;
};

void Vuyx32fToUyvy32f(const uint8_t* src, uint8_t* dst, size_t count) { ChromaFilter().Row(src, dst, count); }

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

// Channel `c` (V or U) of the even pixel of a pair, or the end's.
float EvenChroma(const uint8_t* row, size_t pixels, ptrdiff_t pair, size_t c) {
  const auto last = static_cast<ptrdiff_t>(PairsOf(pixels)) - 1;
  return LoadQuad(row + 32 * (pair < 0 ? 0 : pair > last ? last : pair)).c[c];
}

// What interpolation gets wrong at the odd pixel of a pair; nothing where there is none.
float Detail(const uint8_t* row, size_t pixels, ptrdiff_t pair, size_t c) {
  if (pair < 0 || 2 * static_cast<size_t>(pair) + 1 >= pixels) return 0.0f;
  const auto even = [=](ptrdiff_t offset) { return EvenChroma(row, pixels, pair + offset, c); };
  return Between(even(-1), even(0), even(1), even(2)) - LoadQuad(row + 32 * pair + 16).c[c];
}

void Vuyx32fToUyvy32f(const uint8_t* src, uint8_t* dst, size_t count) {
  for (size_t i = 0; i < PairsOf(count); ++i) {
    const auto chroma = [=](size_t c) {
      const auto pair = static_cast<ptrdiff_t>(i);
      return EvenChroma(src, count, pair, c) - (Detail(src, count, pair - 1, c) + Detail(src, count, pair, c)) * 0.25f;
    };
    const float luma = LoadQuad(src + 32 * i).c[2];
    StoreQuad({{chroma(1), luma, chroma(0), 2 * i + 1 < count ? LoadQuad(src + 32 * i + 16).c[2] : luma}},
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
