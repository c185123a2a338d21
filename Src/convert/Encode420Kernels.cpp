#include "convert/Encode420Kernels.h"

#include <algorithm>
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

#if HWY_TARGET != HWY_BASELINE_SCALAR
HWY_BEFORE_NAMESPACE();
namespace vexel::encode420 {
namespace HWY_NAMESPACE {
namespace {
using namespace vexel::HWY_NAMESPACE;
using hwy::HWY_NAMESPACE::ScalableTag;

constexpr size_t kPixels = kLanes<uint32_t>;  // in a vector
constexpr size_t kBlock = 4 * kPixels;

HWY_INLINE I32 Set(int32_t value) { return hn::Set(ScalableTag<int32_t>(), value); }

// Words of pixels: channels 0 and 2, and channels 1 and 3, side by side.
struct Words {
  U16 outer, inner;
  static HWY_INLINE Words Of(U8 pixels) {
    return {AsU16(hn::And(pixels, Dwords(0x00FF00FF))), hn::ShiftRight<8>(AsU16(pixels))};
  }
};

template <class W>
HWY_INLINE U16 WeightedSum(U16 a, U16 b) {
  const U16 sum = hn::Add(a, b);
  if constexpr (W::kA == 3) return hn::Add(sum, hn::Add(a, a));
  if constexpr (W::kB == 3) return hn::Add(sum, hn::Add(b, b));
  return sum;
}

// The pixels one to the left: the last one of `before`, then all but the last.
HWY_INLINE U16 PixelBefore(U16 before, U16 v) {
#if HWY_TARGET == HWY_AVX3
  return U16{_mm512_alignr_epi32(v.raw, before.raw, 15)};
#elif HWY_TARGET == HWY_AVX2
  return U16{_mm256_alignr_epi8(v.raw, _mm256_permute2x128_si256(before.raw, v.raw, 0x21), 12)};
#else
  return U16{_mm_alignr_epi8(v.raw, before.raw, 12)};
#endif
}

// Sums of two neighbouring pixels each: those of an even one and the one before, and those with the one behind, meet
// in the filter about the even pixel. In each 128-bit block the results of `low` come before those of `high`.
HWY_INLINE U16 AddNeighbours(U16 low, U16 high) {
#if HWY_TARGET == HWY_AVX3
  const __m512 a = _mm512_castsi512_ps(low.raw), b = _mm512_castsi512_ps(high.raw);
  const U16 even{_mm512_castps_si512(_mm512_shuffle_ps(a, b, 0x88))};
  const U16 odd{_mm512_castps_si512(_mm512_shuffle_ps(a, b, 0xDD))};
#elif HWY_TARGET == HWY_AVX2
  const __m256 a = _mm256_castsi256_ps(low.raw), b = _mm256_castsi256_ps(high.raw);
  const U16 even{_mm256_castps_si256(_mm256_shuffle_ps(a, b, 0x88))};
  const U16 odd{_mm256_castps_si256(_mm256_shuffle_ps(a, b, 0xDD))};
#else
  const __m128 a = _mm_castsi128_ps(low.raw), b = _mm_castsi128_ps(high.raw);
  const U16 even{_mm_castps_si128(_mm_shuffle_ps(a, b, 0x88))};
  const U16 odd{_mm_castps_si128(_mm_shuffle_ps(a, b, 0xDD))};
#endif
  return hn::Add(even, odd);
}

// 32-bit results of two vectors of samples each for U and V to bytes in memory order, U in the lower half.
HWY_INLINE U8 PackChroma(I32 u0, I32 u1, I32 v0, I32 v1) {
  const ScalableTag<int16_t> d;
  const U8 packed = PackBlocks(hn::ReorderDemote2To(d, u0, u1), hn::ReorderDemote2To(d, v0, v1));
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

// Luma of a vector of pixels, and chroma of a vector of filtered ones.
struct FromBgr {
  I16 lumaOuter, lumaInner, uOuter, uInner, vOuter, vInner;
  explicit HWY_INLINE FromBgr(const Factors& f)
      : lumaOuter(WordPair(f.luma.b, f.luma.r)),
        lumaInner(WordPair(f.luma.g, 0)),
        uOuter(WordPair(f.u.b, f.u.r)),
        uInner(WordPair(f.u.g, 0)),
        vOuter(WordPair(f.v.b, f.v.r)),
        vInner(WordPair(f.v.g, 0)) {}
  template <int kBits>
  static HWY_INLINE I32 Dot(const Words& pixels, I16 outer, I16 inner, int32_t base) {
    const I32 sum = hn::Add(MultiplyPairs(AsI16(pixels.outer), outer), MultiplyPairs(AsI16(pixels.inner), inner));
    return hn::ShiftRight<kBits>(hn::Add(sum, Set((base << kBits) + (1 << (kBits - 1)))));
  }
  HWY_INLINE I32 Luma(const Words& pixels) const { return Dot<kFactorBits>(pixels, lumaOuter, lumaInner, 0); }
  template <int kBits>
  HWY_INLINE I32 U(const Words& sums) const {
    return Dot<kFactorBits + kBits>(sums, uOuter, uInner, 128);
  }
  template <int kBits>
  HWY_INLINE I32 V(const Words& sums) const {
    return Dot<kFactorBits + kBits>(sums, vOuter, vInner, 128);
  }
};

struct FromVuy {
  explicit HWY_INLINE FromVuy(const Factors&) {}
  template <int kBits>
  static HWY_INLINE I32 Round(U16 words) {
    return hn::ShiftRight<kBits>(hn::Add(hn::And(AsI32(words), Set(0xFFFF)), Set(1 << (kBits - 1))));
  }
  HWY_INLINE I32 Luma(const Words& pixels) const { return hn::ShiftRight<16>(AsI32(pixels.outer)); }
  template <int kBits>
  HWY_INLINE I32 U(const Words& sums) const {
    return Round<kBits>(sums.inner);
  }
  template <int kBits>
  HWY_INLINE I32 V(const Words& sums) const {
    return Round<kBits>(sums.outer);
  }
};

template <class W, class Op>
class Encoder {
 public:
  // The first pixel goes on to the left.
  HWY_INLINE Encoder(const Factors& factors, const uint8_t* a, const uint8_t* b) : mOp(factors) {
    uint32_t pixelA, pixelB;
    std::memcpy(&pixelA, a, 4);
    std::memcpy(&pixelB, b, 4);
    mBefore = Sum(Words::Of(Dwords(pixelA)), Words::Of(Dwords(pixelB)));
  }

  // (A loop over the four vectors would not be unrolled, and go through memory.)
  HWY_INLINE void Block(const uint8_t* a, const uint8_t* b, uint8_t* lumaA, uint8_t* lumaB, uint8_t* u, uint8_t* v) {
    const ScalableTag<uint8_t> d;
    const hn::Half<decltype(d)> dHalf;
    const Step s0 = Next(a, b, 0), s1 = Next(a, b, 1), s2 = Next(a, b, 2), s3 = Next(a, b, 3);
    StoreVector(PackTo8(s0.lumaA, s1.lumaA, s2.lumaA, s3.lumaA), lumaA);
    StoreVector(PackTo8(s0.lumaB, s1.lumaB, s2.lumaB, s3.lumaB), lumaB);
    const Words low = Filter(s0.pairs, s1.pairs), high = Filter(s2.pairs, s3.pairs);
    const U8 chroma = PackChroma(mOp.template U<W::kBits>(low), mOp.template U<W::kBits>(high),
                                 mOp.template V<W::kBits>(low), mOp.template V<W::kBits>(high));
    hn::StoreU(hn::LowerHalf(dHalf, chroma), dHalf, u);
    hn::StoreU(hn::UpperHalf(dHalf, chroma), dHalf, v);
  }

 private:
  // Of one vector of pixels of either line: luma, and their sums with those one to the left.
  struct Step {
    I32 lumaA, lumaB;
    Words pairs;
  };
  HWY_INLINE Step Next(const uint8_t* a, const uint8_t* b, size_t index) {
    const Words wordsA = Words::Of(LoadVector<uint8_t>(a, index)), wordsB = Words::Of(LoadVector<uint8_t>(b, index));
    const Words sum = Sum(wordsA, wordsB), before = mBefore;
    mBefore = sum;
    return {mOp.Luma(wordsA),
            mOp.Luma(wordsB),
            {hn::Add(sum.outer, PixelBefore(before.outer, sum.outer)),
             hn::Add(sum.inner, PixelBefore(before.inner, sum.inner))}};
  }
  static HWY_INLINE Words Sum(const Words& a, const Words& b) {
    return {WeightedSum<W>(a.outer, b.outer), WeightedSum<W>(a.inner, b.inner)};
  }
  static HWY_INLINE Words Filter(const Words& low, const Words& high) {
    return {AddNeighbours(low.outer, high.outer), AddNeighbours(low.inner, high.inner)};
  }

  const Op mOp;
  Words mBefore;
};

// Asks for memory. Addresses that are not there do no harm.
template <size_t kBytes>
HWY_INLINE void Fetch(uintptr_t address) {
  for (size_t offset = 0; offset < kBytes; offset += 64)
    __builtin_prefetch(reinterpret_cast<const void*>(address + offset));
}

template <class W, class Op>
HWY_INLINE void EncodeRows(const LinePair& lines, const Factors& factors) {
  Encoder<W, Op> encoder(factors, lines.a, lines.b);
  size_t x = 0;
  for (; x + kBlock <= lines.width; x += kBlock) {
    Fetch<4 * kBlock>(lines.nextA + 4 * x);
    Fetch<4 * kBlock>(lines.nextB + 4 * x);
    encoder.Block(lines.a + 4 * x, lines.b + 4 * x, lines.lumaA + x, lines.lumaB + x, lines.u + x / 2, lines.v + x / 2);
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
  encoder.Block(a, b, lumaA, lumaB, u, v);
  std::memcpy(lines.lumaA + x, lumaA, rest);
  std::memcpy(lines.lumaB + x, lumaB, rest);
  std::memcpy(lines.u + x / 2, u, lines.chromaWidth - x / 2);
  std::memcpy(lines.v + x / 2, v, lines.chromaWidth - x / 2);
}

template <class W>
void EncodeBgrx(const LinePair& lines, const Factors& factors) {
  EncodeRows<W, FromBgr>(lines, factors);
}
template <class W>
void EncodeVuyx(const LinePair& lines, const Factors& factors) {
  EncodeRows<W, FromVuy>(lines, factors);
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

struct FromBgr {
  const Factors& factors;
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
    const int32_t pixel[3] = {pixels[4 * x], pixels[4 * x + 1], pixels[4 * x + 2]};
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
        return line[4 * left + k] + 2 * line[4 * x + k] + line[4 * right + k];
      };
      sums[k] = W::kA * across(lines.a) + W::kB * across(lines.b);
    }
    lines.u[i] = op.template U<W::kBits>(sums);
    lines.v[i] = op.template V<W::kBits>(sums);
  }
}

template <class W>
void EncodeBgrx(const LinePair& lines, const Factors& factors) {
  EncodeRows<W, FromBgr>(lines, factors);
}
template <class W>
void EncodeVuyx(const LinePair& lines, const Factors& factors) {
  EncodeRows<W, FromVuy>(lines, factors);
}

}  // namespace
}  // namespace plain

#define VX_PAIR_KERNELS(Encode) \
  { VX_KERNEL_VARIANTS(Encode<Even>), VX_KERNEL_VARIANTS(Encode<NearFirst>), VX_KERNEL_VARIANTS(Encode<NearSecond>) }
const PairKernels kFromBgrx = VX_PAIR_KERNELS(EncodeBgrx);
const PairKernels kFromVuyx = VX_PAIR_KERNELS(EncodeVuyx);
#undef VX_PAIR_KERNELS

}  // namespace vexel::encode420
#endif
