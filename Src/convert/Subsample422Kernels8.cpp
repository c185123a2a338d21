// 8-bit 4:4:4 pixels to packed 4:2:2: chroma through the 5/3 low-pass as lifting, and with the premultiplying and the
// matrix that come before it in the same pass.
#include <cstddef>
#include <cstdint>
#include <cstring>

#include "convert/PairOrder.h"
#include "convert/PlainPixels.h"
#include "convert/YuvFixed8.h"
#include "convert/YuvKernels.h"

#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "convert/Subsample422Kernels8.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

#include "convert/Pairs422-inl.h"
#include "frame/KernelTable.h"

#if HWY_TARGET != HWY_BASELINE_SCALAR
HWY_BEFORE_NAMESPACE();
namespace vexel {
namespace HWY_NAMESPACE {
namespace {

// What the lifting works on, for each pair of a vector: the chroma words (u, v) of the even and of the odd pixel, and
// the luma words (y0, y1), all 0..255.
struct PairWords {
  I16 even, odd, luma;
};

// From two vectors of pixels, each a dword: chroma words (u, v), and dwords whose high word is luma.
HWY_INLINE PairWords SplitPairs(I16 uv0, I16 uv1, I32 y0, I32 y1) {
  const hn::ScalableTag<int32_t> d;
  PairWords words;
  words.even = AsI16(hn::ConcatEven(d, AsI32(uv1), AsI32(uv0)));
  words.odd = AsI16(hn::ConcatOdd(d, AsI32(uv1), AsI32(uv0)));
#if HWY_TARGET == HWY_AVX3
  alignas(64) static constexpr uint16_t kHighWords[32] = {1,  3,  5,  7,  9,  11, 13, 15, 17, 19, 21,
                                                          23, 25, 27, 29, 31, 33, 35, 37, 39, 41, 43,
                                                          45, 47, 49, 51, 53, 55, 57, 59, 61, 63};
  words.luma = I16{_mm512_permutex2var_epi16(y0.raw, _mm512_load_si512(kHighWords), y1.raw)};
#else
  words.luma = PackTo16(hn::ShiftRight<16>(y0), hn::ShiftRight<16>(y1));
#endif
  return words;
}

struct FromVuyx {
  HWY_INLINE PairWords operator()(U8 a, U8 b) const {
    const auto chroma = ByteOrder<0x8081>();
    const auto luma = Dwords(0x00FF0000);
    return SplitPairs(AsI16(hn::TableLookupBytes(a, chroma)), AsI16(hn::TableLookupBytes(b, chroma)),
                      AsI32(hn::And(a, luma)), AsI32(hn::And(b, luma)));
  }
};

template <bool kPremultiply>
struct FromBgra {
  HWY_INLINE PairWords operator()(U8 a, U8 b) const {
    if constexpr (kPremultiply) {
      const hn::ScalableTag<uint32_t> d;
      const auto opaque = hn::BitCast(d, Dwords(0xFF000000)), alphas = hn::And(hn::BitCast(d, hn::And(a, b)), opaque);
      if (HWY_UNLIKELY(!hn::AllTrue(d, hn::Eq(alphas, opaque)))) {
        const auto alpha0 = Alpha(a), alpha1 = Alpha(b);
        return Multiply(Scale(WordBytes<0>(a), alpha0), Green(a, alpha0), Scale(WordBytes<0>(b), alpha1),
                        Green(b, alpha1));
      }
    }
    return Multiply(VectorMatrix8::OuterChannels(a), matrix.InnerChannel(a), VectorMatrix8::OuterChannels(b),
                    matrix.InnerChannel(b));
  }

  HWY_INLINE PairWords Multiply(I16 outer0, I16 inner0, I16 outer1, I16 inner1) const {
    return SplitPairs(Chroma(outer0, inner0), Chroma(outer1, inner1), matrix.Sum(2, outer0, inner0),
                      matrix.Sum(2, outer1, inner1));
  }
  // The high words of the sums are the results.
  HWY_INLINE I16 Chroma(I16 outer, I16 inner) const {
    return JoinHighWords(AsI16(matrix.Sum(1, outer, inner)), AsI16(matrix.Sum(0, outer, inner)));
  }

  static HWY_INLINE U16 Alpha(U8 bgra) { return AsU16(hn::TableLookupBytes(bgra, ByteOrder<0x8383>())); }
  // c a / 255 to nearest: (t + 128) 257 >> 16 of t = c a.
  static HWY_INLINE I16 Scale(U16 channels, U16 alpha) {
    const hn::ScalableTag<uint16_t> d;
    return AsI16(hn::MulHigh(hn::Add(hn::Mul(channels, alpha), hn::Set(d, uint16_t{128})), hn::Set(d, uint16_t{257})));
  }
  HWY_INLINE I16 Green(U8 bgra, U16 alpha) const {
    const auto green = Scale(WordBytes<1>(bgra), alpha);
    return matrix.InnerOfDoubled(AsU8(hn::Add(green, green)));
  }

  VectorMatrix8 matrix;
};

// Pairs from their own words, the even chroma of the pairs after them, and the details d of the pairs before them.
HWY_INLINE void LiftPairs(const PairWords& words, I16 following, I16& details, uint8_t* out) {
  const hn::ScalableTag<int16_t> d;
  const I16 after = ShiftLaneIn(words.even, following);
  const I16 between = AsI16(hn::AverageRound(AsU16(words.even), AsU16(after)));
  const I16 now = hn::Sub(words.odd, between);
  const I16 sum = hn::Add(hn::Add(ShiftLaneOut(details, now), now), hn::Set(d, int16_t{2}));
  details = now;
  StorePairs<PairOrder::Uyvy>(hn::Add(words.even, hn::ShiftRight<2>(sum)), words.luma, out);
}

// A row of `count` pixels, a vector of pairs at a time, each written when the next one is known. What follows the row
// is its last pixel over and over.
template <class Source>
HWY_INLINE void Subsample(const uint8_t* HWY_RESTRICT src, uint8_t* HWY_RESTRICT dst, size_t count,
                          const Source& source) {
  constexpr size_t kPixels = 2 * kVectorPairs, kSrcStep = 4 * kPixels, kDstStep = 2 * kPixels;
  if (count == 0) return;
  const size_t blocks = count / kPixels, rest = count % kPixels, steps = blocks + (rest > 0);
  alignas(64) uint8_t tail[kSrcStep], out[kDstStep];
  if (rest > 0) {
    uint32_t last;
    std::memcpy(&last, src + 4 * (count - 1), 4);
    StoreVector(Dwords(last), tail, 0);
    StoreVector(Dwords(last), tail, 1);
    std::memcpy(tail, src + blocks * kSrcStep, 4 * rest);
  }

  const I16 zero = hn::Zero(hn::ScalableTag<int16_t>());
  PairWords words = {zero, zero, zero};
  I16 details = zero;
  for (size_t i = 0; i < steps; ++i) {
    const uint8_t* p = i < blocks ? src + i * kSrcStep : tail;
    const PairWords following = source(LoadVector<uint8_t>(p, 0), LoadVector<uint8_t>(p, 1));
    if (i > 0) LiftPairs(words, following.even, details, dst + (i - 1) * kDstStep);
    words = following;
  }
  LiftPairs(words, ShiftLaneOut(words.odd, words.odd), details, rest > 0 ? out : dst + (blocks - 1) * kDstStep);
  if (rest > 0) std::memcpy(dst + blocks * kDstStep, out, (rest + 1) / 2 * 4);
}

HWY_ATTR void Vuyx8ToUyvy8(const uint8_t* src, uint8_t* dst, size_t count) { Subsample(src, dst, count, FromVuyx()); }
HWY_ATTR void Bgra8ToUyvy8_601(const uint8_t* src, uint8_t* dst, size_t count) {
  Subsample(src, dst, count, FromBgra<true>{VectorMatrix8(kRgbToYuv8_601)});
}
HWY_ATTR void Bgra8ToUyvy8_709(const uint8_t* src, uint8_t* dst, size_t count) {
  Subsample(src, dst, count, FromBgra<true>{VectorMatrix8(kRgbToYuv8_709)});
}
HWY_ATTR void Bgrx8ToUyvy8_601(const uint8_t* src, uint8_t* dst, size_t count) {
  Subsample(src, dst, count, FromBgra<false>{VectorMatrix8(kRgbToYuv8_601)});
}
HWY_ATTR void Bgrx8ToUyvy8_709(const uint8_t* src, uint8_t* dst, size_t count) {
  Subsample(src, dst, count, FromBgra<false>{VectorMatrix8(kRgbToYuv8_709)});
}

}  // namespace
}  // namespace HWY_NAMESPACE
}  // namespace vexel
HWY_AFTER_NAMESPACE();
#endif  // HWY_TARGET

#if HWY_ONCE
namespace vexel {
namespace plain {
namespace {

// pixel(src, vuy) makes the Y'CbCr of a pixel.
template <class Pixel>
void Subsample(const uint8_t* src, uint8_t* dst, size_t count, const Pixel& pixel) {
  const size_t pairs = (count + 1) / 2;
  int details[2] = {};
  for (size_t i = 0; i < pairs; ++i) {
    uint8_t vuy[3][3];  // even, odd, following even pixel
    for (size_t k = 0; k < 3; ++k) pixel(src + 4 * (2 * i + k < count ? 2 * i + k : count - 1), vuy[k]);
    int chroma[2];
    for (int j = 0; j < 2; ++j) {
      const int now = vuy[1][j] - ((vuy[0][j] + vuy[2][j] + 1) >> 1);
      chroma[j] = Clamp8(vuy[0][j] + ((details[j] + now + 2) >> 2));
      details[j] = now;
    }
    StorePair(PairOrder::Uyvy, {chroma[1], chroma[0], {vuy[0][2], vuy[1][2]}}, dst + 4 * i);
  }
}

void Vuyx8ToUyvy8(const uint8_t* src, uint8_t* dst, size_t count) {
  Subsample(src, dst, count, [](const uint8_t* in, uint8_t* vuy) { std::memcpy(vuy, in, 3); });
}

void Subsample(const uint8_t* src, uint8_t* dst, size_t count, const FixedMatrix8& m, bool premultiply) {
  Subsample(src, dst, count, [&](const uint8_t* in, uint8_t* vuy) {
    uint8_t bgr[3];
    for (int k = 0; k < 3; ++k) bgr[k] = premultiply ? static_cast<uint8_t>((2 * in[k] * in[3] + 255) / 510) : in[k];
    MultiplyMatrix8(m, bgr, vuy);
  });
}
void Bgra8ToUyvy8_601(const uint8_t* src, uint8_t* dst, size_t count) {
  Subsample(src, dst, count, kRgbToYuv8_601, true);
}
void Bgra8ToUyvy8_709(const uint8_t* src, uint8_t* dst, size_t count) {
  Subsample(src, dst, count, kRgbToYuv8_709, true);
}
void Bgrx8ToUyvy8_601(const uint8_t* src, uint8_t* dst, size_t count) {
  Subsample(src, dst, count, kRgbToYuv8_601, false);
}
void Bgrx8ToUyvy8_709(const uint8_t* src, uint8_t* dst, size_t count) {
  Subsample(src, dst, count, kRgbToYuv8_709, false);
}

}  // namespace
}  // namespace plain

const RowKernelSet kVuyx8ToUyvy8 = VX_KERNEL_VARIANTS(Vuyx8ToUyvy8);
const RowKernelSet kBgra8ToUyvy8_601 = VX_KERNEL_VARIANTS(Bgra8ToUyvy8_601);
const RowKernelSet kBgra8ToUyvy8_709 = VX_KERNEL_VARIANTS(Bgra8ToUyvy8_709);
const RowKernelSet kBgrx8ToUyvy8_601 = VX_KERNEL_VARIANTS(Bgrx8ToUyvy8_601);
const RowKernelSet kBgrx8ToUyvy8_709 = VX_KERNEL_VARIANTS(Bgrx8ToUyvy8_709);

}  // namespace vexel
#endif  // HWY_ONCE
