// 32 pixels as words of 512-bit registers, a register a channel, and as the bytes that they become.
#pragma once

#include <cstddef>
#include <cstdint>

#include "convert/Vbmi.h"

namespace vexel::words512 {

VX_VBMI_INLINE __m512i Words(int value) { return _mm512_set1_epi16(static_cast<int16_t>(value)); }

// Pairs of words: the low words of `even` and `odd`, and their high words.
VX_VBMI_INLINE __m512i JoinLow(__m512i even, __m512i odd) {
  const __m512i low = _mm512_set4_epi32(0x0D0C0D0C, 0x09080908, 0x05040504, 0x01000100);
  return _mm512_mask_shuffle_epi8(even, 0xCCCCCCCCCCCCCCCC, odd, low);
}
VX_VBMI_INLINE __m512i JoinHigh(__m512i even, __m512i odd) {
  const __m512i high = _mm512_set4_epi32(0x0F0E0F0E, 0x0B0A0B0A, 0x07060706, 0x03020302);
  return _mm512_mask_shuffle_epi8(odd, 0x3333333333333333, even, high);
}

// Bytes of `a` and `b`, picked by two vectors of indices. Into the cache, or past it where dst is on a line of it.
template <bool kStream = false>
VX_VBMI_INLINE void StoreOrdered(__m512i a, const uint8_t* order, __m512i b, uint8_t* dst) {
  for (size_t i = 0; i < 128; i += 64) {
    const __m512i out = _mm512_permutex2var_epi8(a, _mm512_load_si512(order + i), b);
    if constexpr (kStream)
      _mm512_stream_si512(reinterpret_cast<__m512i*>(dst + i), out);
    else
      _mm512_storeu_si512(dst + i, out);
  }
}

// Bytes of pixels, from those of their first and third channel in each 16 bytes and of their second and fourth.
struct PixelOrder {
  constexpr PixelOrder() : bytes{} {
    for (uint32_t i = 0; i < 128; ++i) {
      const uint32_t pixel = i / 4, channel = i % 4, at = pixel / 8 * 16 + pixel % 8;
      bytes[i] = static_cast<uint8_t>(at + channel / 2 * 8 + channel % 2 * 64);
    }
  }
  alignas(64) uint8_t bytes[128];
};

// Channels are saturated to bytes; the fourth is opaque.
template <bool kStream = false>
VX_VBMI_INLINE void StoreChannels(__m512i c0, __m512i c1, __m512i c2, uint8_t* dst) {
  static constexpr PixelOrder kOrder;
  StoreOrdered<kStream>(_mm512_packus_epi16(c0, c2), kOrder.bytes, _mm512_packus_epi16(c1, Words(255)), dst);
}

}  // namespace vexel::words512
