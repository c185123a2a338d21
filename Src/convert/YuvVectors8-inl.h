// Vector forms of the 8-bit Y'CbCr arithmetic, shared by the 4:4:4 and the 4:2:2 kernels.
#if defined(VEXEL_CONVERT_YUVVECTORS8_INL_H_) == defined(HWY_TARGET_TOGGLE)
#ifdef VEXEL_CONVERT_YUVVECTORS8_INL_H_
#undef VEXEL_CONVERT_YUVVECTORS8_INL_H_
#else
#define VEXEL_CONVERT_YUVVECTORS8_INL_H_
#endif

#include <cstddef>
#include <cstdint>

#include <hwy/highway.h>

#include "convert/PixelVectors-inl.h"
#include "convert/YuvFixed8.h"

#if HWY_TARGET != HWY_SCALAR
HWY_BEFORE_NAMESPACE();
namespace vexel {
namespace HWY_NAMESPACE {

template <class V>
HWY_INLINE I16 AsI16(V v) {
  return hn::BitCast(hn::ScalableTag<int16_t>(), v);
}
template <class V>
HWY_INLINE U16 AsU16(V v) {
  return hn::BitCast(hn::ScalableTag<uint16_t>(), v);
}
template <class V>
HWY_INLINE I32 AsI32(V v) {
  return hn::BitCast(hn::ScalableTag<int32_t>(), v);
}
template <class V>
HWY_INLINE U8 AsU8(V v) {
  return hn::BitCast(hn::ScalableTag<uint8_t>(), v);
}

// The same pair of words, or dword, in all lanes.
HWY_INLINE I16 WordPair(int low, int high) {
  return AsI16(hn::Set(hn::ScalableTag<uint32_t>(),
                       (static_cast<uint32_t>(low) & 0xFFFF) | (static_cast<uint32_t>(high) << 16)));
}
HWY_INLINE U8 Dwords(uint32_t value) { return AsU8(hn::Set(hn::ScalableTag<uint32_t>(), value)); }

// a[2i] b[2i] + a[2i + 1] b[2i + 1]
HWY_INLINE I32 MultiplyPairs(I16 a, I16 b) {
#if HWY_TARGET == HWY_AVX3
  return I32{_mm512_madd_epi16(a.raw, b.raw)};
#elif HWY_TARGET == HWY_AVX2
  return I32{_mm256_madd_epi16(a.raw, b.raw)};
#else
  return I32{_mm_madd_epi16(a.raw, b.raw)};
#endif
}

// Byte 0 of each word less byte 1.
HWY_INLINE I16 SubtractOddBytes(U8 v) { return WeighBytes(v, Dwords(0xFF01FF01)); }

// sum + the products of pairs. No Highway target has the single instruction without more that processors lack, so the
// caller says whether the processor has it.
template <bool kVnni>
HWY_INLINE I32 AddProducts(I32 sum, I16 a, I16 b) {
#if HWY_TARGET == HWY_AVX3
  if constexpr (kVnni) {
    asm("vpdpwssd %2, %1, %0" : "+v"(sum.raw) : "v"(a.raw), "v"(b.raw));
    return sum;
  }
#endif
  return hn::Add(sum, MultiplyPairs(a, b));
}

// Bytes of `yes` where the mask vector is all ones, else of `no`.
HWY_INLINE U8 SelectBytes(U8 mask, U8 yes, U8 no) {
#if HWY_TARGET == HWY_AVX2
  return U8{_mm256_blendv_epi8(no.raw, yes.raw, mask.raw)};
#else
  return hn::IfVecThenElse(mask, yes, no);
#endif
}

// Shuffle tables, repeated for every 128-bit block: compilers redo the broadcast of a shorter one in every pass of a
// loop.
struct ShuffleTable {
  constexpr explicit ShuffleTable(const uint8_t (&block)[16]) : bytes() {
    for (size_t i = 0; i < HWY_MAX_BYTES; ++i) bytes[i] = block[i % 16];
  }
  // Moves bytes within each group of four. The hexadecimal digits name the source bytes, from the highest result byte
  // to the lowest, 8 for zero: 0x8280 makes words of bytes 2 and 0.
  constexpr explicit ShuffleTable(uint32_t order) : bytes() {
    for (uint32_t i = 0; i < HWY_MAX_BYTES; ++i) {
      const uint32_t digit = order >> (4 * (i % 4)) & 15;
      bytes[i] = static_cast<uint8_t>(digit >= 8 ? 0x80 : digit + i % 16 / 4 * 4);
    }
  }
  HWY_INLINE U8 Load() const { return hn::Load(hn::ScalableTag<uint8_t>(), bytes); }

  alignas(HWY_MAX_BYTES) uint8_t bytes[HWY_MAX_BYTES];
};
template <uint32_t kOrder>
HWY_INLINE U8 ByteOrder() {
  static constexpr ShuffleTable kTable(kOrder);
  return kTable.Load();
}

#if HWY_TARGET == HWY_AVX3
// Where the bytes of `pattern` are 0xFF. As a constant, compilers would load it anew in every pass of a loop.
HWY_INLINE __mmask64 ByteMask(uint32_t pattern) { return hn::MaskFromVec(Dwords(pattern)).raw; }
#endif

// Pairs of words: the low words of `even` and `odd`, and their high words.
HWY_INLINE I16 JoinLowWords(I16 even, I16 odd) {
#if HWY_TARGET == HWY_AVX3
  return I16{_mm512_mask_shuffle_epi8(even.raw, ByteMask(0xFFFF0000), odd.raw, ByteOrder<0x1010>().raw)};
#else
  return hn::OddEven(AsI16(hn::ShiftLeft<16>(AsI32(odd))), even);
#endif
}
HWY_INLINE I16 JoinHighWords(I16 even, I16 odd) {
#if HWY_TARGET == HWY_AVX3
  return I16{_mm512_mask_shuffle_epi8(odd.raw, ByteMask(0x0000FFFF), even.raw, ByteOrder<0x3232>().raw)};
#else
  return hn::OddEven(odd, AsI16(hn::ShiftRight<16>(AsI32(even))));
#endif
}

// Four bytes of a pixel from the low and high words of two vectors, that is x0 y0 and alpha x1, to x0 x1 y0 alpha: the
// words are clamped to 0..255, alpha is that of the pixels or opaque.
template <AlphaWrite kAlpha>
HWY_INLINE U8 PackPixels(I16 outer, I16 innerHigh, U8 pixels) {
  static constexpr ShuffleTable kOrder({0, 9, 1, 8, 2, 11, 3, 10, 4, 13, 5, 12, 6, 15, 7, 14});
#if HWY_TARGET == HWY_AVX3
  const __mmask64 low = ByteMask(0x0000FFFF);
  const I16 inner{kAlpha == AlphaWrite::Keep
                      ? _mm512_mask_shuffle_epi8(innerHigh.raw, low, pixels.raw, ByteOrder<0x8383>().raw)
                      : _mm512_mask_mov_epi8(innerHigh.raw, low, Dwords(0x000000FF).raw)};
#else
  const hn::ScalableTag<uint32_t> d;
  const auto alpha = kAlpha == AlphaWrite::Keep ? hn::ShiftRight<24>(hn::BitCast(d, pixels)) : hn::Set(d, 255u);
  const I16 inner = hn::OddEven(innerHigh, AsI16(alpha));
#endif
  return hn::TableLookupBytes(PackBlocks(outer, inner), kOrder.Load());
}

// FixedMatrix8 with its numbers in vectors.
struct VectorMatrix8 {
  HWY_INLINE explicit VectorMatrix8(const FixedMatrix8& m)
      : outer{WordPair(m.c0[0], m.c2[0]), WordPair(m.c0[1], m.c2[1]), WordPair(m.c0[2], m.c2[2])},
        inner{WordPair(m.c1[0], m.bias[0]), WordPair(m.c1[1], m.bias[1]), WordPair(m.c1[2], m.bias[2])},
        unit(Dwords(static_cast<uint32_t>(m.biasUnit) << 16)) {}

  // The sums of result j before the shift.
  HWY_INLINE I32 Sum(int j, I16 outerChannels, I16 innerChannel) const {
    return hn::Add(MultiplyPairs(outerChannels, outer[j]), MultiplyPairs(innerChannel, inner[j]));
  }
  static HWY_INLINE I16 OuterChannels(U8 pixels) { return AsI16(hn::And(pixels, Dwords(0x00FF00FF))); }
  HWY_INLINE I16 InnerChannel(U8 pixels) const { return InnerOfDoubled(AsU8(hn::ShiftRight<7>(AsU16(pixels)))); }
  HWY_INLINE I16 InnerOfDoubled(U8 doubled) const { return AsI16(hn::OrAnd(unit, doubled, Dwords(0x000001FE))); }

  I16 outer[3], inner[3];
  U8 unit;
};

// The FixedMatrix8 from BGR, by the differences of blue and red from green: the coefficients of a chroma row sum to 0,
// and what luma lacks is green times the sum of its row, in two halves because that has 16 bits. The sums are the same.
template <bool kVnni>
struct VectorRgbToYuv8 {
  // Words (b - g, r - g) and (g, g).
  struct Pixels {
    I16 differences, green;
  };
  HWY_INLINE explicit VectorRgbToYuv8(const FixedMatrix8& m)
      : v(WordPair(m.c0[0], m.c2[0])),
        u(WordPair(m.c0[1], m.c2[1])),
        y(WordPair(m.c0[2], m.c2[2])),
        green(Halves(m.c0[2] + 2 * m.c1[2] + m.c2[2])),
        chromaBias(AsI32(Dwords(static_cast<uint32_t>(m.biasUnit * m.bias[0])))),
        lumaBias(AsI32(Dwords(static_cast<uint32_t>(m.biasUnit * m.bias[2])))) {}
  static HWY_INLINE I16 Halves(int sum) { return WordPair(sum / 2, sum - sum / 2); }

  static HWY_INLINE Pixels Split(U8 bgra) {
    const U8 bgrg = hn::TableLookupBytes(bgra, ByteOrder<0x1210>());
    return {SubtractOddBytes(bgrg), AsI16(hn::ShiftRight<8>(AsU16(bgrg)))};
  }
  // The high words are the results.
  HWY_INLINE I32 V(const Pixels& p, I32 bias) const { return AddProducts<kVnni>(bias, p.differences, v); }
  HWY_INLINE I32 U(const Pixels& p, I32 bias) const { return AddProducts<kVnni>(bias, p.differences, u); }
  HWY_INLINE I32 Y(const Pixels& p) const {
    return AddProducts<kVnni>(AddProducts<kVnni>(lumaBias, p.differences, y), p.green, green);
  }

  I16 v, u, y, green;
  I32 chromaBias, lumaBias;
};

// FixedYuvToRgb8 with its numbers in vectors. Words have 6 fractional bits.
struct VectorYuvToRgb8 {
  HWY_INLINE explicit VectorYuvToRgb8(const FixedYuvToRgb8& f)
      : luma(AsU16(WordPair(f.luma, f.luma))),
        lumaBias(WordPair(f.lumaBias, f.lumaBias)),
        blueRed(WordPair(f.blueU, f.redV)),
        blue(WordPair(f.blueU, f.blueU)),
        red(WordPair(f.redV, f.redV)),
        green(WordPair(f.greenU, f.greenV)) {}

  // Of words 256 Y.
  HWY_INLINE I16 Luma(U16 y) const { return hn::Add(AsI16(hn::MulHigh(y, luma)), lumaBias); }
  // Luma plus the chroma part of one or two channels, less the fraction; `factor` is one of the vectors below.
  static HWY_INLINE I16 AddChroma(I16 y, I16 chroma, I16 factor) {
    return Integers(y, hn::MulFixedPoint15(chroma, factor));
  }
  // What chroma adds to G, in the high word of each pair (u, v).
  HWY_INLINE I16 GreenChroma(I16 uv) const { return AsI16(MultiplyPairs(uv, green)); }
  static HWY_INLINE I16 Integers(I16 y, I16 chroma) { return hn::ShiftRight<6>(hn::SaturatedAdd(y, chroma)); }

  U16 luma;
  I16 lumaBias, blueRed, blue, red, green;
};

}  // namespace HWY_NAMESPACE
}  // namespace vexel
HWY_AFTER_NAMESPACE();
#endif  // HWY_TARGET

#endif
