#include "convert/LightLookup512.h"

#include <cstring>

#include "convert/LightCodes.h"
#include "convert/Vbmi.h"

namespace vexel {
namespace {

constexpr size_t kPixels = 16, kFetchAhead = 8192;

// Byte k of the light of every code: 256 bytes are two pairs of registers.
struct BytePlanes {
  static const BytePlanes& Get() noexcept {
    static const BytePlanes planes;
    return planes;
  }
  alignas(64) uint8_t bytes[4][256];

 private:
  BytePlanes() noexcept {
    for (size_t code = 0; code < 256; ++code) {
      const float value = LinearCodes::Get().Light(code);
      uint8_t light[4];
      std::memcpy(light, &value, 4);
      for (int k = 0; k < 4; ++k) bytes[k][code] = light[k];
    }
  }
};

// Four pixels: their light, with alpha in place of the fourth. `which` repeats the index of each pixel four times.
VX_VBMI_INLINE void Finish(__m512i light, __m512i codes, __m512i which, uint8_t* dst) {
  const __m512i alpha = _mm512_srli_epi32(_mm512_permutexvar_epi32(which, codes), 24);
  // To nearest like the tables, whatever the caller's rounding mode.
  const __m512 scaled = _mm512_mul_round_ps(_mm512_cvtepi32_ps(alpha), _mm512_set1_ps(k8uTo32f),
                                            _MM_FROUND_TO_NEAREST_INT | _MM_FROUND_NO_EXC);
  _mm512_storeu_ps(dst, _mm512_mask_mov_ps(_mm512_castsi512_ps(light), 0x8888, scaled));
}

VX_VBMI void Convert16(const uint8_t* src, uint8_t* dst, const BytePlanes& planes) {
  const __m512i codes = _mm512_loadu_si512(src);
  const __m512i byte0 = LookUpBytes(planes.bytes[0], codes), byte1 = LookUpBytes(planes.bytes[1], codes),
                byte2 = LookUpBytes(planes.bytes[2], codes), byte3 = LookUpBytes(planes.bytes[3], codes);
  const __m512i lowHalf0 = _mm512_unpacklo_epi8(byte0, byte1), lowHalf1 = _mm512_unpackhi_epi8(byte0, byte1),
                highHalf0 = _mm512_unpacklo_epi8(byte2, byte3), highHalf1 = _mm512_unpackhi_epi8(byte2, byte3);
  // Pixel k of each of the four lanes.
  const __m512i pixel0 = _mm512_unpacklo_epi16(lowHalf0, highHalf0),
                pixel1 = _mm512_unpackhi_epi16(lowHalf0, highHalf0),
                pixel2 = _mm512_unpacklo_epi16(lowHalf1, highHalf1),
                pixel3 = _mm512_unpackhi_epi16(lowHalf1, highHalf1);
  const __m512i front01 = _mm512_shuffle_i64x2(pixel0, pixel1, 0x44),
                front23 = _mm512_shuffle_i64x2(pixel2, pixel3, 0x44),
                back01 = _mm512_shuffle_i64x2(pixel0, pixel1, 0xEE),
                back23 = _mm512_shuffle_i64x2(pixel2, pixel3, 0xEE);
  const __m512i first = _mm512_set_epi32(3, 3, 3, 3, 2, 2, 2, 2, 1, 1, 1, 1, 0, 0, 0, 0);
  const auto which = [&](int i) VX_VBMI { return _mm512_add_epi32(first, _mm512_set1_epi32(4 * i)); };
  Finish(_mm512_shuffle_i64x2(front01, front23, 0x88), codes, which(0), dst);
  Finish(_mm512_shuffle_i64x2(front01, front23, 0xDD), codes, which(1), dst + 64);
  Finish(_mm512_shuffle_i64x2(back01, back23, 0x88), codes, which(2), dst + 128);
  Finish(_mm512_shuffle_i64x2(back01, back23, 0xDD), codes, which(3), dst + 192);
}

}  // namespace

void LightLookup512(const uint8_t* src, uint8_t* dst, size_t count) noexcept {
  const BytePlanes& planes = BytePlanes::Get();
  for (; count >= kPixels; count -= kPixels, src += 4 * kPixels, dst += 16 * kPixels) {
    __builtin_prefetch(reinterpret_cast<const void*>(reinterpret_cast<uintptr_t>(src) + kFetchAhead));
    Convert16(src, dst, planes);
  }
  if (count == 0) return;
  uint8_t in[4 * kPixels] = {}, out[16 * kPixels];
  std::memcpy(in, src, 4 * count);
  Convert16(in, out, planes);
  std::memcpy(dst, out, 16 * count);
}

}  // namespace vexel
