// The last half of Y'CbCr to RGB for 32 pixels at once, in the arithmetic of VectorYuvToRgb8.
#pragma once

#include <cstddef>
#include <cstdint>

#include "convert/Vbmi.h"
#include "convert/YuvFixed8.h"

namespace vexel::rgb512 {

inline constexpr size_t kPixels = 32;

// Of the words of a block packed to bytes, B with R and G with alpha in each 16 bytes, the first 16 pixels and the
// other 16.
struct PixelOrder {
  constexpr PixelOrder() : bytes{} {
    for (uint32_t i = 0; i < 128; ++i) {
      const uint32_t pixel = i / 4, channel = i % 4, at = pixel / 8 * 16 + pixel % 8;
      bytes[i] = static_cast<uint8_t>(at + channel / 2 * 8 + channel % 2 * 64);
    }
  }
  alignas(64) uint8_t bytes[128];
};
inline constexpr PixelOrder kOrder;

VX_VBMI_INLINE __m512i WordPair(int low, int high) {
  return _mm512_set1_epi32(static_cast<int>((static_cast<uint32_t>(low) & 0xFFFF) | static_cast<uint32_t>(high) << 16));
}

// Pairs of words: the low words of `even` and `odd`, and their high words.
VX_VBMI_INLINE __m512i JoinLow(__m512i even, __m512i odd) {
  const __m512i low = _mm512_set4_epi32(0x0D0C0D0C, 0x09080908, 0x05040504, 0x01000100);
  return _mm512_mask_shuffle_epi8(even, 0xCCCCCCCCCCCCCCCC, odd, low);
}
VX_VBMI_INLINE __m512i JoinHigh(__m512i even, __m512i odd) {
  const __m512i high = _mm512_set4_epi32(0x0F0E0F0E, 0x0B0A0B0A, 0x07060706, 0x03020302);
  return _mm512_mask_shuffle_epi8(odd, 0x3333333333333333, even, high);
}

// 64 times luma of pixels, and 256 times the chroma (u, v) of the even and of the odd ones about 0.
struct Samples {
  __m512i luma, even, odd;
};

struct Matrix {
  VX_VBMI_INLINE explicit Matrix(const FixedYuvToRgb8& f)
      : luma(WordPair(f.luma, f.luma)),
        lumaBias(WordPair(f.lumaBias, f.lumaBias)),
        blue(WordPair(f.blueU, f.blueU)),
        green(WordPair(f.greenU, f.greenV)),
        red(WordPair(f.redV, f.redV)) {}

  // Of words 256 Y.
  VX_VBMI_INLINE __m512i Luma(__m512i y) const { return _mm512_add_epi16(_mm512_mulhi_epu16(y, luma), lumaBias); }

  // Into the cache, or past it where dst is on a line of it.
  template <bool kStream = false>
  VX_VBMI_INLINE void Store(const Samples& s, uint8_t* dst) const {
    const auto channel = [&](__m512i chroma)
                             VX_VBMI { return _mm512_srai_epi16(_mm512_adds_epi16(s.luma, chroma), 6); };
    const __m512i b = channel(_mm512_mulhrs_epi16(JoinLow(s.even, s.odd), blue)),
                  r = channel(_mm512_mulhrs_epi16(JoinHigh(s.even, s.odd), red)),
                  g = channel(JoinHigh(_mm512_madd_epi16(s.even, green), _mm512_madd_epi16(s.odd, green)));
    const __m512i blueRed = _mm512_packus_epi16(b, r), greenOpaque = _mm512_packus_epi16(g, _mm512_set1_epi16(255));
    for (size_t i = 0; i < 4 * kPixels; i += 64) {
      const __m512i out = _mm512_permutex2var_epi8(blueRed, _mm512_load_si512(kOrder.bytes + i), greenOpaque);
      if constexpr (kStream)
        _mm512_stream_si512(reinterpret_cast<__m512i*>(dst + i), out);
      else
        _mm512_storeu_si512(dst + i, out);
    }
  }

  __m512i luma, lumaBias, blue, green, red;
};

}  // namespace vexel::rgb512
