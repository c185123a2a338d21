// The last half of Y'CbCr to RGB for 32 pixels at once, in the arithmetic of VectorYuvToRgb8.
#pragma once

#include <cstddef>
#include <cstdint>

#include "convert/PixelWords512.h"
#include "convert/YuvFixed8.h"

namespace vexel::rgb512 {

inline constexpr size_t kPixels = 32;

VX_VBMI_INLINE __m512i WordPair(int low, int high) {
  return _mm512_set1_epi32(static_cast<int>((static_cast<uint32_t>(low) & 0xFFFF) | static_cast<uint32_t>(high) << 16));
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
    const __m512i b = channel(_mm512_mulhrs_epi16(words512::JoinLow(s.even, s.odd), blue)),
                  r = channel(_mm512_mulhrs_epi16(words512::JoinHigh(s.even, s.odd), red)),
                  g = channel(words512::JoinHigh(_mm512_madd_epi16(s.even, green), _mm512_madd_epi16(s.odd, green)));
    words512::StoreChannels<kStream>(b, g, r, dst);
  }

  __m512i luma, lumaBias, blue, green, red;
};

}  // namespace vexel::rgb512
