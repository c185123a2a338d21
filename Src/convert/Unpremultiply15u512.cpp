#include "convert/Unpremultiply512.h"
#include "convert/Vbmi.h"

namespace vexel {
namespace {

constexpr size_t kPixels = 32, kBlockBytes = 8 * kPixels;
constexpr int kFirsts = 0x88, kSeconds = 0xDD;  // of the pairs of 32-bit lanes of two vectors, block by block
constexpr __mmask32 kOddWords = 0xAAAAAAAA;

VX_VBMI_INLINE __m512 FloatConstant(float value) {
  __m512 vector = _mm512_set1_ps(value);
  asm("" : "+v"(vector));
  return vector;
}

template <int kSelect>
VX_VBMI_INLINE __m512i Pick(const uint8_t* src) {
  const __m512 a = _mm512_castsi512_ps(_mm512_loadu_si512(src)), b = _mm512_castsi512_ps(_mm512_loadu_si512(src + 64));
  return _mm512_castps_si512(_mm512_shuffle_ps(a, b, kSelect));
}

// Even words of two vectors as the even and odd words of one, or the odd ones.
VX_VBMI_INLINE __m512i EvenWords(__m512i a, __m512i b) {
  return _mm512_mask_blend_epi16(kOddWords, a, _mm512_slli_epi32(b, 16));
}
VX_VBMI_INLINE __m512i OddWords(__m512i a, __m512i b) {
  return _mm512_mask_blend_epi16(kOddWords, _mm512_srli_epi32(a, 16), b);
}

// 16 alphas a, and the left shifts that bring them to 32768..65535; clear alpha may have any. The factors are
// 2^32 / (a << shift) less 2^16, at most 65535. Rounding them down less strictly, or more, would make wrong quotients.
struct Sixteen {
  VX_VBMI_INLINE Sixteen(__m512i alpha, __m512i alphaOnTop) : shifts(_mm512_lzcnt_epi32(alphaOnTop)) {
    const __m512i clamped = _mm512_min_epi32(_mm512_max_epi32(alpha, Constant(1)), Constant(32768));
    const __m512 mantissa = _mm512_getmant_ps(_mm512_cvtepi32_ps(clamped), _MM_MANT_NORM_1_2, _MM_MANT_SIGN_src);
    const __m512 quotient = _mm512_div_ps(FloatConstant(0x1p17f), mantissa);
    factors = _mm512_cvttps_epi32(_mm512_sub_ps(quotient, FloatConstant(0x1p16f + 1.0f / 128)));
  }
  __m512i shifts, factors;
};

// The alpha of 32 pixels and what it makes of their colours, in words.
template <int kAlpha>
struct Alphas {
  VX_VBMI_INLINE explicit Alphas(const uint8_t* src) {
    constexpr int kSelect = kAlpha == 0 ? kFirsts : kSeconds;
    const __m512i a = Pick<kSelect>(src), b = Pick<kSelect>(src + 128);
    const Sixteen first(Below(a), OnTop(a)), second(Below(b), OnTop(b));
    alpha = _mm512_min_epu16(kAlpha == 0 ? EvenWords(a, b) : OddWords(a, b), Constant(static_cast<int>(0x80008000)));
    shifts = EvenWords(first.shifts, second.shifts);
    factors = EvenWords(first.factors, second.factors);
    areOpaque = _mm512_cmpneq_epi16_mask(alpha, Constant(static_cast<int>(0x80008000))) == 0;
  }
  // The word of alpha at the bottom of 32 bits, and at their top.
  static VX_VBMI_INLINE __m512i Below(__m512i v) {
    return kAlpha == 0 ? _mm512_and_si512(v, Constant(0xFFFF)) : _mm512_srli_epi32(v, 16);
  }
  static VX_VBMI_INLINE __m512i OnTop(__m512i v) { return kAlpha == 0 ? _mm512_slli_epi32(v, 16) : v; }
  // For c <= alpha, 65536 c / alpha rounded down is e or e + 1, and e + 1 where (e + 1) alpha < 65536 c, that is where
  // the product's high word is c - 1 and not c; where they are equal, both give the same. Half of it, rounded up, is
  // the quotient: no ties exist.
  VX_VBMI_INLINE __m512i Divide(__m512i c) const {
    c = _mm512_min_epu16(c, alpha);
    const __m512i shifted = _mm512_sllv_epi16(c, shifts);
    const __m512i e = _mm512_add_epi16(shifted, _mm512_mulhi_epu16(shifted, factors));
    const __m512i high = _mm512_mulhi_epu16(_mm512_adds_epu16(e, Constant(0x00010001)), alpha);
    return _mm512_avg_epu16(e, _mm512_sub_epi16(c, high));
  }
  __m512i alpha, shifts, factors;
  bool areOpaque;
};

VX_VBMI_INLINE void Interleave(__m512i firsts, __m512i seconds, uint8_t* dst) {
  _mm512_storeu_si512(dst, _mm512_unpacklo_epi32(firsts, seconds));
  _mm512_storeu_si512(dst + 64, _mm512_unpackhi_epi32(firsts, seconds));
}

template <int kAlpha>
VX_VBMI_INLINE void Divide32(const uint8_t* src, const Alphas<kAlpha>& a, uint8_t* dst) {
  if (a.areOpaque) {
    const __m512i most = Constant(static_cast<int>(0x80008000));
    for (size_t i = 0; i < kBlockBytes; i += 64)
      _mm512_storeu_si512(dst + i, _mm512_min_epu16(_mm512_loadu_si512(src + i), most));
    return;
  }
  const __m512i first0 = Pick<kFirsts>(src), first1 = Pick<kFirsts>(src + 128);
  const __m512i second0 = Pick<kSeconds>(src), second1 = Pick<kSeconds>(src + 128);
  const __m512i c0 = kAlpha == 0 ? a.alpha : a.Divide(EvenWords(first0, first1));
  const __m512i c1 = a.Divide(OddWords(first0, first1)), c2 = a.Divide(EvenWords(second0, second1));
  const __m512i c3 = kAlpha == 3 ? a.alpha : a.Divide(OddWords(second0, second1));
  Interleave(EvenWords(c0, c1), EvenWords(c2, c3), dst);
  Interleave(OddWords(c0, c1), OddWords(c2, c3), dst + 128);
}

template <int kAlpha>
struct Ahead : Alphas<kAlpha> {
  VX_VBMI_INLINE explicit Ahead(const uint8_t* src) : Alphas<kAlpha>(src) {}
  VX_VBMI_INLINE void Map(const uint8_t* src, uint8_t* dst) const { Divide32<kAlpha>(src, *this, dst); }
};

}  // namespace

VX_VBMI void UnpremultiplyLast15u512(const uint8_t* src, uint8_t* dst, size_t count) noexcept {
  MapRowAhead512<Ahead<3>, kPixels, 8>(src, dst, count);
}
VX_VBMI void UnpremultiplyFirst15u512(const uint8_t* src, uint8_t* dst, size_t count) noexcept {
  MapRowAhead512<Ahead<0>, kPixels, 8>(src, dst, count);
}

}  // namespace vexel
