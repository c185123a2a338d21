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

#if HWY_TARGET != HWY_BASELINE_SCALAR
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

// Bytes of `yes` where the mask vector is all ones, else of `no`.
HWY_INLINE U8 SelectBytes(U8 mask, U8 yes, U8 no) {
#if HWY_TARGET == HWY_AVX2
  return U8{_mm256_blendv_epi8(no.raw, yes.raw, mask.raw)};
#else
  return hn::IfVecThenElse(mask, yes, no);
#endif
}

// Shuffle table that moves bytes within each group of four. The hexadecimal digits of kOrder name the source bytes,
// from the highest result byte to the lowest, 8 for zero: 0x8280 makes words of bytes 2 and 0.
// The table fills a vector: compilers repeat the broadcast of a shorter one in every pass of a loop.
struct ByteOrderTable {
  constexpr explicit ByteOrderTable(uint32_t order) : bytes() {
    for (uint32_t i = 0; i < HWY_MAX_BYTES; ++i) {
      const uint32_t digit = order >> (4 * (i % 4)) & 15;
      bytes[i] = static_cast<uint8_t>(digit >= 8 ? 0x80 : digit + i % 16 / 4 * 4);
    }
  }
  alignas(HWY_MAX_BYTES) uint8_t bytes[HWY_MAX_BYTES];
};
template <uint32_t kOrder>
HWY_INLINE U8 ByteOrder() {
  static constexpr ByteOrderTable kTable(kOrder);
  return hn::Load(hn::ScalableTag<uint8_t>(), kTable.bytes);
}

// A vector whose fourth bytes are those of the pixels, or opaque; its other bytes are anything.
template <AlphaWrite kAlpha>
HWY_INLINE U8 AlphaBytes(U8 pixels) {
  return kAlpha == AlphaWrite::Keep ? pixels : Dwords(0xFF000000);
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
  HWY_INLINE I16 InnerChannel(U8 pixels) const {
    const auto doubled = AsU8(hn::ShiftRight<7>(AsU16(pixels)));
    return AsI16(hn::OrAnd(unit, doubled, Dwords(0x000001FE)));
  }

  I16 outer[3], inner[3];
  U8 unit;
};

// FixedYuvToRgb8 with its numbers in vectors.
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
  // B and R in the low and high word of each pixel, from its luma in both and the pair (u, v).
  HWY_INLINE I16 BlueRed(I16 y, I16 uv) const { return AddChroma(y, uv, blueRed); }
  // The same for words of one kind.
  HWY_INLINE I16 Blue(I16 y, I16 u) const { return AddChroma(y, u, blue); }
  HWY_INLINE I16 Red(I16 y, I16 v) const { return AddChroma(y, v, red); }
  // What chroma adds to G, in the high word of each pixel.
  HWY_INLINE I16 GreenChroma(I16 uv) const { return AsI16(MultiplyPairs(uv, green)); }

  static HWY_INLINE I16 AddChroma(I16 y, I16 c, I16 factor) {
    return hn::SaturatedAdd(hn::Add(y, hn::MulFixedPoint15(c, factor)), c);
  }

  U16 luma;
  I16 lumaBias, blueRed, blue, red, green;
};

// Doubles with saturation: the upper byte of each word is then the 8-bit result less 128.
HWY_INLINE I16 Double(I16 v) { return hn::SaturatedAdd(v, v); }

}  // namespace HWY_NAMESPACE
}  // namespace vexel
HWY_AFTER_NAMESPACE();
#endif  // HWY_TARGET

#endif
