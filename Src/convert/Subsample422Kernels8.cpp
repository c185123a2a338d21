// 8-bit 4:4:4 pixels to packed 4:2:2: chroma through the 5/3 low-pass as lifting, and with the premultiplying and the
// matrix that come before it in the same pass.
#include <cstddef>
#include <cstdint>
#include <cstring>

#include "convert/PairOrder.h"
#include "convert/PlainPixels.h"
#include "convert/Subsample512.h"
#include "convert/YuvFixed8.h"
#include "convert/YuvKernels.h"

#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "convert/Subsample422Kernels8.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

#include "convert/Pairs422-inl.h"
#include "frame/KernelTable.h"

#if HWY_TARGET != HWY_SCALAR
HWY_BEFORE_NAMESPACE();
namespace vexel {
namespace HWY_NAMESPACE {
namespace {

// What the lifting works on, for each pair of a vector: the chroma words (u, v) of the even and of the odd pixel, the
// latter plus 1, and the luma words (y0, y1); all but that 1 in 0..255.
struct PairWords {
  I16 even, oddPlus1, luma;
};

// The even and the odd of the pixels of two vectors.
struct PairPixels {
  U8 even, odd;
};
HWY_INLINE PairPixels SplitPixels(U8 a, U8 b) {
  const hn::ScalableTag<int32_t> d;
  return {AsU8(hn::ConcatEven(d, AsI32(b), AsI32(a))), AsU8(hn::ConcatOdd(d, AsI32(b), AsI32(a)))};
}

// A source makes words of two vectors of pixels, in two stages.
struct FromVuyx {
  using Stage = PairPixels;
  static HWY_INLINE Stage Prepare(U8 a, U8 b) { return SplitPixels(a, b); }
  static HWY_INLINE PairWords Finish(const Stage& pixels) {
    const auto chroma = ByteOrder<0x8081>(), luma = ByteOrder<0x8282>();
    const I16 odd = AsI16(hn::TableLookupBytes(pixels.odd, chroma));
    return {AsI16(hn::TableLookupBytes(pixels.even, chroma)), hn::Add(odd, hn::Set(hn::ScalableTag<int16_t>(), 1)),
            hn::OddEven(AsI16(hn::TableLookupBytes(pixels.odd, luma)), AsI16(hn::TableLookupBytes(pixels.even, luma)))};
  }
};

template <bool kPremultiply>
struct FromBgra {
  using Matrix = VectorRgbToYuv8<false>;
  using Pixels = typename Matrix::Pixels;

  struct Stage {
    Pixels even, odd;
  };

  static HWY_INLINE Stage Prepare(U8 a, U8 b) {
    const PairPixels pixels = SplitPixels(a, b);
    if constexpr (kPremultiply) {
      const hn::ScalableTag<uint32_t> d;
      const auto opaque = hn::BitCast(d, Dwords(0xFF000000)), alphas = hn::And(hn::BitCast(d, hn::And(a, b)), opaque);
      if (HWY_UNLIKELY(!hn::AllTrue(d, hn::Eq(alphas, opaque))))
        return {Premultiplied(pixels.even), Premultiplied(pixels.odd)};
    }
    return {Matrix::Split(pixels.even), Matrix::Split(pixels.odd)};
  }

  HWY_INLINE PairWords Finish(const Stage& stage) const {
    const auto& [even, odd] = stage;
    const I32 one = AsI32(Dwords(1 << 16)), oddBias = hn::Add(matrix.chromaBias, one);
    return {JoinHighWords(AsI16(matrix.U(even, matrix.chromaBias)), AsI16(matrix.V(even, matrix.chromaBias))),
            JoinHighWords(AsI16(matrix.U(odd, oddBias)), AsI16(matrix.V(odd, oddBias))),
            JoinHighWords(AsI16(matrix.Y(even)), AsI16(matrix.Y(odd)))};
  }

  static HWY_INLINE Pixels Premultiplied(U8 bgra) {
    const auto alpha = AsU16(hn::TableLookupBytes(bgra, ByteOrder<0x8383>()));
    const I16 green = Scale(AsU16(hn::TableLookupBytes(bgra, ByteOrder<0x8181>())), alpha);
    return {hn::Sub(Scale(WordBytes<0>(bgra), alpha), green), green};
  }
  // c a / 255 to nearest: (t + 128) 257 >> 16 of t = c a.
  static HWY_INLINE I16 Scale(U16 channels, U16 alpha) {
    const hn::ScalableTag<uint16_t> d;
    return AsI16(hn::MulHigh(hn::Add(hn::Mul(channels, alpha), hn::Set(d, uint16_t{128})), hn::Set(d, uint16_t{257})));
  }

  Matrix matrix;
};

// Pairs from their own words, the even chroma of the pairs after them, and the details d + 1 of the pairs before them.
HWY_INLINE void LiftPairs(const PairWords& words, I16 following, I16& details, uint8_t* out) {
  const I16 after = ShiftLaneIn(words.even, following);
  const I16 between = AsI16(hn::AverageRound(AsU16(words.even), AsU16(after)));
  const I16 now = hn::Sub(words.oddPlus1, between);
  const I16 sum = hn::Add(ShiftLaneOut(details, now), now);
  details = now;
  StorePairs<PairOrder::Uyvy>(hn::Add(words.even, hn::ShiftRight<2>(sum)), words.luma, out);
}

// A row of `count` pixels, a vector of pairs at a time, each written when the next one is known. What follows the row
// is its last pixel over and over. Where there are registers for it, the first stage is one step ahead: all in a row is
// a longer chain than processors overlap.
template <class Source>
HWY_INLINE void Subsample(const uint8_t* HWY_RESTRICT src, uint8_t* HWY_RESTRICT dst, size_t count,
                          const Source& source) {
  constexpr bool kAhead = HWY_TARGET <= HWY_AVX2;
  constexpr size_t kPixels = 2 * kVectorPairs, kSrcStep = 4 * kPixels, kDstStep = 2 * kPixels;
  if (count == 0) return;
  const size_t blocks = count / kPixels, rest = count % kPixels, steps = blocks + (rest > 0);
  alignas(64) uint8_t tail[kSrcStep], out[kDstStep];
  uint32_t last;
  std::memcpy(&last, src + 4 * (count - 1), 4);
  StoreVector(Dwords(last), tail, 0);
  StoreVector(Dwords(last), tail, 1);
  if (rest > 0) std::memcpy(tail, src + blocks * kSrcStep, 4 * rest);

  const auto prepare = [&](size_t i) HWY_ATTR {
    const uint8_t* p = i < blocks ? src + i * kSrcStep : tail;
    FetchAhead<kSrcStep>(p);
    return source.Prepare(LoadVector<uint8_t>(p, 0), LoadVector<uint8_t>(p, 1));
  };
  const I16 one = hn::Set(hn::ScalableTag<int16_t>(), 1);
  PairWords words = {one, one, one};
  I16 details = one;
  auto stage = prepare(0);
  for (size_t i = 0; i < steps; ++i) {
    const auto now = kAhead ? stage : prepare(i);
    if (kAhead) stage = prepare(i + 1);
    const PairWords following = source.Finish(now);
    if (i > 0) LiftPairs(words, following.even, details, dst + (i - 1) * kDstStep);
    words = following;
  }
  LiftPairs(words, hn::Sub(ShiftLaneOut(words.oddPlus1, words.oddPlus1), one), details,
            rest > 0 ? out : dst + (blocks - 1) * kDstStep);
  if (rest > 0) std::memcpy(dst + blocks * kDstStep, out, (rest + 1) / 2 * 4);
}

HWY_ATTR void Vuyx8ToUyvy8(const uint8_t* src, uint8_t* dst, size_t count) { Subsample(src, dst, count, FromVuyx()); }

template <bool kPremultiply>
HWY_ATTR void BgraToUyvy(const uint8_t* src, uint8_t* dst, size_t count, const FixedMatrix8& m) {
  if (HWY_TARGET == HWY_AVX3 && HasSubsample512())
    return kPremultiply ? Bgra8ToUyvy512(src, dst, count, m) : Bgrx8ToUyvy512(src, dst, count, m);
  Subsample(src, dst, count, FromBgra<kPremultiply>{VectorRgbToYuv8<false>(m)});
}
HWY_ATTR void Bgra8ToUyvy8_601(const uint8_t* src, uint8_t* dst, size_t count) {
  BgraToUyvy<true>(src, dst, count, kRgbToYuv8_601);
}
HWY_ATTR void Bgra8ToUyvy8_709(const uint8_t* src, uint8_t* dst, size_t count) {
  BgraToUyvy<true>(src, dst, count, kRgbToYuv8_709);
}
HWY_ATTR void Bgrx8ToUyvy8_601(const uint8_t* src, uint8_t* dst, size_t count) {
  BgraToUyvy<false>(src, dst, count, kRgbToYuv8_601);
}
HWY_ATTR void Bgrx8ToUyvy8_709(const uint8_t* src, uint8_t* dst, size_t count) {
  BgraToUyvy<false>(src, dst, count, kRgbToYuv8_709);
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
