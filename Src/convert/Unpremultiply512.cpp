#include "convert/Unpremultiply512.h"

#include <cstring>

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

constexpr size_t kPixels = 64, kBlockBytes = 4 * kPixels, kFetchAhead = 8192;

// Byte kAlpha of each pixel in all its bytes.
template <int kAlpha>
VX_VBMI_INLINE __m512i SpreadAlpha(__m512i pixels) {
  constexpr int a = kAlpha * 0x01010101;
  return _mm512_shuffle_epi8(pixels, _mm512_set4_epi32(a + 0x0C0C0C0C, a + 0x08080808, a + 0x04040404, a));
}

// Both products of 16-bit lanes, with the result in the high byte.
VX_VBMI_INLINE __m512i Quotients(__m512i channels, __m512i p, __m512i m) {
  return _mm512_add_epi16(_mm512_mulhi_epu16(_mm512_mullo_epi16(channels, p), m), _mm512_set1_epi16(128));
}

// Sixteen pixels, with their factors in both words of each.
template <int kAlpha>
VX_VBMI_INLINE void Divide(__m512i pixels, __m512i p, __m512i m, uint8_t* dst) {
  constexpr __mmask64 kOdd = kAlpha == 0 ? 0xAAAAAAAAAAAAAAAA : 0x2222222222222222,
                      kEven = kAlpha == 0 ? 0x4444444444444444 : 0x5555555555555555;
  const __m512i limited = _mm512_min_epu8(pixels, SpreadAlpha<kAlpha>(pixels));
  const __m512i even = Quotients(_mm512_and_si512(limited, _mm512_set1_epi16(0xFF)), p, m),
                odd = Quotients(_mm512_srli_epi16(limited, 8), p, m);
  const __m512i result = _mm512_mask_mov_epi8(pixels, kOdd, odd);
  _mm512_storeu_si512(dst, _mm512_mask_mov_epi8(result, kEven, _mm512_srli_epi16(even, 8)));
}

// The factors of 64 pixels as words: those of vectors 0 and 1, and of 2 and 3. Each 16 bytes hold four pixels of both.
struct BlockFactors {
  __m512i p01, p23, m01, m23;
  bool opaque;
};

template <int kAlpha>
VX_VBMI_INLINE BlockFactors FactorsOf(const uint8_t* src) {
  // In each 16 bytes the alphas of four pixels of every vector, which the unpacking puts where their pixels are.
  const __m512i first = _mm512_set1_epi32(0x0C080400 + kAlpha * 0x01010101);
  __m512i alphas = _mm512_shuffle_epi8(_mm512_loadu_si512(src), first);
  alphas = _mm512_mask_shuffle_epi8(alphas, 0x00F000F000F000F0, _mm512_loadu_si512(src + 64), first);
  alphas = _mm512_mask_shuffle_epi8(alphas, 0x0F000F000F000F00, _mm512_loadu_si512(src + 128), first);
  alphas = _mm512_mask_shuffle_epi8(alphas, 0xF000F000F000F000, _mm512_loadu_si512(src + 192), first);
  const __m512i pLow = LookUpBytes(kFactors.pLow, alphas), pHigh = LookUpBytes(kFactors.pHigh, alphas),
                mLow = LookUpBytes(kFactors.mLow, alphas), mHigh = _mm512_set1_epi8(-1);
  return {_mm512_unpacklo_epi8(pLow, pHigh), _mm512_unpackhi_epi8(pLow, pHigh), _mm512_unpacklo_epi8(mLow, mHigh),
          _mm512_unpackhi_epi8(mLow, mHigh), _mm512_cmpneq_epi8_mask(alphas, mHigh) == 0};
}

template <int kAlpha>
VX_VBMI_INLINE void Divide64(const uint8_t* src, const BlockFactors& f, uint8_t* dst) {
  const __m512i v0 = _mm512_loadu_si512(src), v1 = _mm512_loadu_si512(src + 64), v2 = _mm512_loadu_si512(src + 128),
                v3 = _mm512_loadu_si512(src + 192);
  if (f.opaque) {
    _mm512_storeu_si512(dst, v0);
    _mm512_storeu_si512(dst + 64, v1);
    _mm512_storeu_si512(dst + 128, v2);
    _mm512_storeu_si512(dst + 192, v3);
    return;
  }
  Divide<kAlpha>(v0, _mm512_unpacklo_epi16(f.p01, f.p01), _mm512_unpacklo_epi16(f.m01, f.m01), dst);
  Divide<kAlpha>(v1, _mm512_unpackhi_epi16(f.p01, f.p01), _mm512_unpackhi_epi16(f.m01, f.m01), dst + 64);
  Divide<kAlpha>(v2, _mm512_unpacklo_epi16(f.p23, f.p23), _mm512_unpacklo_epi16(f.m23, f.m23), dst + 128);
  Divide<kAlpha>(v3, _mm512_unpackhi_epi16(f.p23, f.p23), _mm512_unpackhi_epi16(f.m23, f.m23), dst + 192);
}

// The factors are looked up one block ahead: both parts in a row are a longer chain than processors overlap.
template <int kAlpha>
VX_VBMI void Unpremultiply(const uint8_t* src, uint8_t* dst, size_t count) {
  const size_t blocks = count / kPixels, rest = count % kPixels;
  if (blocks > 0) {
    BlockFactors now = FactorsOf<kAlpha>(src);
    for (size_t i = 0; i < blocks; ++i, src += kBlockBytes, dst += kBlockBytes) {
      for (size_t line = 0; line < kBlockBytes; line += 64)
        __builtin_prefetch(reinterpret_cast<const void*>(reinterpret_cast<uintptr_t>(src) + kFetchAhead + line));
      const BlockFactors next = FactorsOf<kAlpha>(i + 1 < blocks ? src + kBlockBytes : src);
      Divide64<kAlpha>(src, now, dst);
      now = next;
    }
  }
  if (rest == 0) return;
  uint8_t in[kBlockBytes] = {}, out[kBlockBytes];
  std::memcpy(in, src, 4 * rest);
  Divide64<kAlpha>(in, FactorsOf<kAlpha>(in), out);
  std::memcpy(dst, out, 4 * rest);
}

}  // namespace

void UnpremultiplyLast512(const uint8_t* src, uint8_t* dst, size_t count) noexcept {
  Unpremultiply<3>(src, dst, count);
}
void UnpremultiplyFirst512(const uint8_t* src, uint8_t* dst, size_t count) noexcept {
  Unpremultiply<0>(src, dst, count);
}

}  // namespace vexel
