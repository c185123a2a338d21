// The arithmetic is that of Packed422Kernels8.cpp and VectorYuvToRgb8, the first half of it a block ahead: all in a row
// is a longer chain than processors overlap.
#include "convert/Upsample512.h"

#include <algorithm>
#include <cstring>

#include "convert/YuvToRgb512.h"

namespace vexel {

using namespace rgb512;

namespace {

constexpr size_t kBlockPairs = kPixels / 2, kPairBytes = 4 * kBlockPairs, kPixelBytes = 4 * kPixels, kFetchAhead = 8192;

template <PairOrder kPairs>
VX_VBMI_INLINE Samples Split(const Matrix& m, __m512i pairs, __m512i following) {
  const __m512i highBytes = _mm512_set1_epi16(static_cast<int16_t>(0xFF00)),
                zero = _mm512_set1_epi16(static_cast<int16_t>(0x8000));
  const auto low256 = [&](__m512i v) VX_VBMI { return _mm512_slli_epi16(v, 8); };
  const auto high256 = [&](__m512i v) VX_VBMI { return _mm512_and_si512(v, highBytes); };
  constexpr bool kUyvy = kPairs == PairOrder::Uyvy;
  const __m512i even = kUyvy ? low256(pairs) : high256(pairs);
  const __m512i next = kUyvy ? low256(following) : high256(following);
  const __m512i y = kUyvy ? high256(pairs) : low256(pairs);
  return {m.Luma(y), _mm512_xor_si512(even, zero), _mm512_xor_si512(_mm512_avg_epu16(even, next), zero)};
}

// A row like PairLoop (convert/Pairs422-inl.h).
template <PairOrder kPairs>
VX_VBMI void PairsToBgrx(const uint8_t* src, uint8_t* dst, size_t count, const FixedYuvToRgb8& coefficients) {
  const Matrix m(coefficients);
  const auto split = [&](const uint8_t* p) VX_VBMI {
    __builtin_prefetch(reinterpret_cast<const void*>(reinterpret_cast<uintptr_t>(p) + kFetchAhead));
    return Split<kPairs>(m, _mm512_loadu_si512(p), _mm512_loadu_si512(p + 4));
  };
  const size_t pairs = (count + 1) / 2, blocks = (pairs - 1) / kBlockPairs;
  if (blocks > 0) {
    Samples now = split(src);
    for (size_t i = 0; i < blocks; ++i) {
      const Samples next = split(src + std::min(i + 1, blocks - 1) * kPairBytes);
      m.Store(now, dst + i * kPixelBytes);
      now = next;
    }
  }

  int32_t last;
  std::memcpy(&last, src + 4 * (pairs - 1), 4);
  const __m512i repeated = _mm512_set1_epi32(last);
  const auto convert = [&](const uint8_t* in, uint8_t* out) VX_VBMI {
    const __m512i vector = _mm512_loadu_si512(in);
    m.Store(Split<kPairs>(m, vector, _mm512_alignr_epi32(repeated, vector, 1)), out);
  };
  if (pairs >= kBlockPairs && count % 2 == 0)
    return convert(src + 4 * (pairs - kBlockPairs), dst + 8 * (pairs - kBlockPairs));
  alignas(64) uint8_t in[kPairBytes], out[kPixelBytes];
  _mm512_store_si512(in, repeated);
  std::memcpy(in, src + blocks * kPairBytes, 4 * (pairs - blocks * kBlockPairs));
  convert(in, out);
  std::memcpy(dst + blocks * kPixelBytes, out, 4 * count - blocks * kPixelBytes);
}

}  // namespace

void PairsToBgrx512(PairOrder order, const uint8_t* src, uint8_t* dst, size_t count,
                    const FixedYuvToRgb8& coefficients) noexcept {
  if (count == 0) return;
  if (order == PairOrder::Uyvy) return PairsToBgrx<PairOrder::Uyvy>(src, dst, count, coefficients);
  PairsToBgrx<PairOrder::Yuyv>(src, dst, count, coefficients);
}

}  // namespace vexel
