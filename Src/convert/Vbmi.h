// Look-ups in tables of 256 bytes, which AVX512-VBMI makes permutations of registers. No kernel variant implies it.
#pragma once

#if defined(__GNUC__) && !defined(__clang__)
#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wuninitialized"  // GCC 12 warns of its own intrinsics
#pragma GCC diagnostic ignored "-Wmaybe-uninitialized"
#endif
#include <immintrin.h>
#if defined(__GNUC__) && !defined(__clang__)
#pragma GCC diagnostic pop
#endif

#include <cstddef>
#include <cstdint>
#include <cstring>

// Of functions that use it. No Highway target has these instructions without more that processors lack.
#define VX_VBMI __attribute__((target("avx512f,avx512bw,avx512cd,avx512dq,avx512vl,avx512vbmi")))
#define VX_VBMI_INLINE VX_VBMI __attribute__((always_inline)) inline

namespace vexel {

inline bool HasVbmi() noexcept {
  static const bool has = __builtin_cpu_supports("avx512vbmi");
  return has;
}

// A constant that compilers keep in a register; in loops they would rather make it anew, by way of a general register.
VX_VBMI_INLINE __m512i Constant(int value) {
  __m512i vector = _mm512_set1_epi32(value);
  asm("" : "+v"(vector));
  return vector;
}

// Maps pixels by Ahead(src).Map(src, dst), a block at a time, with the next block's Ahead under way meanwhile: where it
// divides or looks up, both in a row are a longer chain than processors overlap.
template <class Ahead, size_t kPixels, size_t kPixelBytes>
VX_VBMI_INLINE void MapRowAhead512(const uint8_t* src, uint8_t* dst, size_t count) {
  constexpr size_t kBlockBytes = kPixels * kPixelBytes, kFetchAhead = 8192;
  const size_t blocks = count / kPixels, rest = count % kPixels;
  if (blocks > 0) {
    Ahead now(src);
    for (size_t i = 0; i < blocks; ++i, src += kBlockBytes, dst += kBlockBytes) {
      for (size_t line = 0; line < kBlockBytes; line += 64)
        __builtin_prefetch(reinterpret_cast<const void*>(reinterpret_cast<uintptr_t>(src) + kFetchAhead + line));
      const Ahead next(i + 1 < blocks ? src + kBlockBytes : src);
      now.Map(src, dst);
      now = next;
    }
  }
  if (rest == 0) return;
  uint8_t in[kBlockBytes] = {}, out[kBlockBytes];
  std::memcpy(in, src, kPixelBytes * rest);
  Ahead(in).Map(in, out);
  std::memcpy(dst, out, kPixelBytes * rest);
}

// The table is two pairs of registers.
VX_VBMI_INLINE __m512i LookUpBytes(const uint8_t* table, __m512i codes) {
  const __m512i low = _mm512_permutex2var_epi8(_mm512_load_si512(table), codes, _mm512_load_si512(table + 64));
  const __m512i high = _mm512_permutex2var_epi8(_mm512_load_si512(table + 128), codes, _mm512_load_si512(table + 192));
  return _mm512_mask_mov_epi8(low, _mm512_movepi8_mask(codes), high);
}

}  // namespace vexel
