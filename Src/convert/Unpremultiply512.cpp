#include "convert/Unpremultiply512.h"

#include "convert/Vbmi.h"

namespace vexel {
namespace {

// 255 c / a rounded to nearest, ties up, for c <= a is (((c p) m >> 16) + 128) >> 8 for two 16-bit factors of each
// alpha: p as large as c p allows, and m = 255 2^24 / (a p) rounded up, the high byte of which is always 255. Alpha 0
// gives 0. The other bytes are tables.
struct Factors {
  constexpr Factors() : pLow{}, pHigh{}, mLow{} {
    for (uint32_t a = 1; a < 256; ++a) {
      const uint32_t p = 65535 / a, m = ((255u << 24) + a * p - 1) / (a * p);
      pLow[a] = static_cast<uint8_t>(p);
      pHigh[a] = static_cast<uint8_t>(p >> 8);
      mLow[a] = static_cast<uint8_t>(m);
    }
  }
  alignas(64) uint8_t pLow[256], pHigh[256], mLow[256];
};
constexpr Factors kFactors;

constexpr size_t kPixels = 64;

// Both products of 16-bit lanes, with the result in the high byte.
VX_VBMI_INLINE __m512i Quotients(__m512i channels, __m512i p, __m512i m) {
  return _mm512_add_epi16(_mm512_mulhi_epu16(_mm512_mullo_epi16(channels, p), m), Constant(0x00800080));
}

// The even or the odd words of two vectors, so that unpacking words undoes it.
template <int kOdd>
VX_VBMI_INLINE __m512i SplitWords(__m512i v0, __m512i v1) {
  alignas(64) static constexpr struct Indices {
    constexpr Indices() : words{} {
      for (int i = 0; i < 32; ++i) words[i] = static_cast<uint16_t>(i / 8 * 8 + i % 4 * 2 + (i & 4) * 8 + kOdd);
    }
    uint16_t words[32];
  } kIndices;
  return _mm512_permutex2var_epi16(v0, _mm512_load_si512(kIndices.words), v1);
}

// The low bytes and the high bytes of words; above the low ones is 0.
VX_VBMI_INLINE __m512i Join(__m512i low, __m512i high) {
  constexpr int kLowOrHighByte = 0xF8;
  return _mm512_ternarylogic_epi32(low, high, Constant(static_cast<int>(0xFF00FF00)), kLowOrHighByte);
}

// The alpha of 64 pixels: with the third colour in words, and its factors in bytes, for unpacking.
template <int kAlpha>
struct Alphas {
  VX_VBMI_INLINE explicit Alphas(const uint8_t* src) {
    for (int half = 0; half < 2; ++half)
      words[half] =
          SplitWords<kAlpha != 0>(_mm512_loadu_si512(src + 128 * half), _mm512_loadu_si512(src + 128 * half + 64));
    const __m512i bytes = _mm512_packus_epi16(Alone(0), Alone(1));
    isOpaque = _mm512_cmpneq_epi8_mask(bytes, _mm512_set1_epi8(-1)) == 0;
    // Above 127, p has a high byte of 1.
    pLow = LookUpBytes(kFactors.pLow, bytes), mLow = LookUpBytes(kFactors.mLow, bytes);
    pHigh = _mm512_mask_mov_epi8(
        _mm512_permutex2var_epi8(_mm512_load_si512(kFactors.pHigh), bytes, _mm512_load_si512(kFactors.pHigh + 64)),
        _mm512_movepi8_mask(bytes), _mm512_set1_epi8(1));
  }
  VX_VBMI_INLINE __m512i Alone(int half) const {
    return kAlpha == 0 ? _mm512_and_si512(words[half], _mm512_set1_epi16(0xFF)) : _mm512_srli_epi16(words[half], 8);
  }
  __m512i words[2], pLow, pHigh, mLow;
  bool isOpaque;
};

template <int kAlpha>
VX_VBMI_INLINE void Divide32(const uint8_t* src, __m512i last, __m512i alpha, __m512i p, __m512i m, uint8_t* dst) {
  const __m512i colors = SplitWords<kAlpha == 0>(_mm512_loadu_si512(src), _mm512_loadu_si512(src + 64));
  const __m512i odd = kAlpha == 0 ? _mm512_srli_epi16(last, 8) : last;
  // Above alpha is 0, so the minimum takes the upper bytes away too.
  const auto quotients = [&](__m512i c) VX_VBMI { return Quotients(_mm512_min_epu8(c, alpha), p, m); };
  const __m512i first = quotients(colors), second = quotients(_mm512_srli_epi16(colors, 8)), third = quotients(odd);
  const __m512i both = Join(_mm512_srli_epi16(first, 8), second);
  const __m512i rest = kAlpha == 0 ? Join(alpha, third) : Join(_mm512_srli_epi16(third, 8), last);
  const __m512i even = kAlpha == 0 ? rest : both, uneven = kAlpha == 0 ? both : rest;
  _mm512_storeu_si512(dst, _mm512_unpacklo_epi16(even, uneven));
  _mm512_storeu_si512(dst + 64, _mm512_unpackhi_epi16(even, uneven));
}

template <int kAlpha>
VX_VBMI_INLINE void Divide64(const uint8_t* src, const Alphas<kAlpha>& a, uint8_t* dst) {
  if (a.isOpaque) {
    const __m512i v0 = _mm512_loadu_si512(src), v1 = _mm512_loadu_si512(src + 64), v2 = _mm512_loadu_si512(src + 128),
                  v3 = _mm512_loadu_si512(src + 192);
    _mm512_storeu_si512(dst, v0);
    _mm512_storeu_si512(dst + 64, v1);
    _mm512_storeu_si512(dst + 128, v2);
    _mm512_storeu_si512(dst + 192, v3);
    return;
  }
  const __m512i ones = _mm512_set1_epi8(-1);
  Divide32<kAlpha>(src, a.words[0], a.Alone(0), _mm512_unpacklo_epi8(a.pLow, a.pHigh),
                   _mm512_unpacklo_epi8(a.mLow, ones), dst);
  Divide32<kAlpha>(src + 128, a.words[1], a.Alone(1), _mm512_unpackhi_epi8(a.pLow, a.pHigh),
                   _mm512_unpackhi_epi8(a.mLow, ones), dst + 128);
}

template <int kAlpha>
struct Ahead : Alphas<kAlpha> {
  VX_VBMI_INLINE explicit Ahead(const uint8_t* src) : Alphas<kAlpha>(src) {}
  VX_VBMI_INLINE void Map(const uint8_t* src, uint8_t* dst) const { Divide64<kAlpha>(src, *this, dst); }
};

}  // namespace

VX_VBMI void UnpremultiplyLast512(const uint8_t* src, uint8_t* dst, size_t count) noexcept {
  MapRowAhead512<Ahead<3>, kPixels, 4>(src, dst, count);
}
VX_VBMI void UnpremultiplyFirst512(const uint8_t* src, uint8_t* dst, size_t count) noexcept {
  MapRowAhead512<Ahead<0>, kPixels, 4>(src, dst, count);
}

}  // namespace vexel
