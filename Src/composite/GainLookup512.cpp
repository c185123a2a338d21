#include "composite/GainLookup512.h"

#include <cstring>

#include "convert/Vbmi.h"

namespace vexel {
namespace {

constexpr size_t kVectors = 4, kBlockBytes = kVectors * 64, kFetchAhead = 8192;

template <bool kVuy>
VX_VBMI_INLINE __m512i Scale(__m512i v, const GainCodes& gain) {
  const __m512i first = LookUpBytes(gain.codes[0], v);
  if constexpr (!kVuy) return first;
  const __m512i chromaLuma = _mm512_mask_mov_epi8(first, 0x4444444444444444, LookUpBytes(gain.codes[2], v));
  return _mm512_mask_mov_epi8(chromaLuma, 0x8888888888888888, LookUpBytes(gain.codes[3], v));
}

template <bool kVuy>
VX_VBMI_INLINE void ScaleBlock(const uint8_t* src, uint8_t* dst, const GainCodes& gain) {
  for (size_t line = 0; line < kBlockBytes; line += 64)
    __builtin_prefetch(reinterpret_cast<const void*>(reinterpret_cast<uintptr_t>(src) + kFetchAhead + line));
  const __m512i v0 = _mm512_loadu_si512(src), v1 = _mm512_loadu_si512(src + 64), v2 = _mm512_loadu_si512(src + 128),
                v3 = _mm512_loadu_si512(src + 192);
  _mm512_storeu_si512(dst, Scale<kVuy>(v0, gain));
  _mm512_storeu_si512(dst + 64, Scale<kVuy>(v1, gain));
  _mm512_storeu_si512(dst + 128, Scale<kVuy>(v2, gain));
  _mm512_storeu_si512(dst + 192, Scale<kVuy>(v3, gain));
}

template <bool kVuy>
VX_VBMI void ScaleRow(const uint8_t* src, uint8_t* dst, size_t count, const GainCodes& gain) {
  size_t bytes = 4 * count;
  // A copy of their own, which stores to dst cannot change.
  const GainCodes codes = gain;
  for (; bytes >= kBlockBytes; bytes -= kBlockBytes, src += kBlockBytes, dst += kBlockBytes)
    ScaleBlock<kVuy>(src, dst, codes);
  if (bytes == 0) return;
  uint8_t in[kBlockBytes] = {}, out[kBlockBytes];
  std::memcpy(in, src, bytes);
  ScaleBlock<kVuy>(in, out, codes);
  std::memcpy(dst, out, bytes);
}

}  // namespace

GainCodes::GainCodes(GainKernel kernel, float gain) noexcept {
  uint8_t pixels[256][4], scaled[256][4];
  for (int c = 0; c < 256; ++c) std::memset(pixels[c], c, 4);
  kernel(pixels[0], scaled[0], 256, gain);
  for (int c = 0; c < 256; ++c)
    for (int k = 0; k < 4; ++k) codes[k][c] = scaled[c][k];
}

void GainPixel512(const uint8_t* src, uint8_t* dst, size_t count, const GainCodes& gain) noexcept {
  ScaleRow<false>(src, dst, count, gain);
}
void GainVuyp512(const uint8_t* src, uint8_t* dst, size_t count, const GainCodes& gain) noexcept {
  ScaleRow<true>(src, dst, count, gain);
}

}  // namespace vexel
