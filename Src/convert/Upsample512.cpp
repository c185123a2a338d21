// The arithmetic is that of Packed422Kernels8.cpp and VectorYuvToRgb8, the first half of it a block ahead: all in a row
// is a longer chain than processors overlap.
#include "convert/Upsample512.h"

#include <algorithm>
#include <cstring>

namespace vexel {
namespace {

constexpr size_t kBlockPairs = 16, kPairBytes = 4 * kBlockPairs, kPixelBytes = 2 * kPairBytes, kFetchAhead = 8192;

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
constexpr PixelOrder kOrder;

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

// 64 times luma, and 256 times the chroma of the even and the odd pixels about 0.
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

  template <PairOrder kPairs>
  VX_VBMI_INLINE Samples Split(__m512i pairs, __m512i following) const {
    const __m512i highBytes = _mm512_set1_epi16(static_cast<int16_t>(0xFF00)),
                  zero = _mm512_set1_epi16(static_cast<int16_t>(0x8000));
    const auto low256 = [&](__m512i v) VX_VBMI { return _mm512_slli_epi16(v, 8); };
    const auto high256 = [&](__m512i v) VX_VBMI { return _mm512_and_si512(v, highBytes); };
    constexpr bool kUyvy = kPairs == PairOrder::Uyvy;
    const __m512i even = kUyvy ? low256(pairs) : high256(pairs);
    const __m512i next = kUyvy ? low256(following) : high256(following);
    const __m512i y = kUyvy ? high256(pairs) : low256(pairs);
    return {_mm512_add_epi16(_mm512_mulhi_epu16(y, luma), lumaBias), _mm512_xor_si512(even, zero),
            _mm512_xor_si512(_mm512_avg_epu16(even, next), zero)};
  }

  VX_VBMI_INLINE void Store(const Samples& s, uint8_t* dst) const {
    const auto channel = [&](__m512i chroma)
                             VX_VBMI { return _mm512_srai_epi16(_mm512_adds_epi16(s.luma, chroma), 6); };
    const __m512i b = channel(_mm512_mulhrs_epi16(JoinLow(s.even, s.odd), blue)),
                  r = channel(_mm512_mulhrs_epi16(JoinHigh(s.even, s.odd), red)),
                  g = channel(JoinHigh(_mm512_madd_epi16(s.even, green), _mm512_madd_epi16(s.odd, green)));
    const __m512i blueRed = _mm512_packus_epi16(b, r), greenOpaque = _mm512_packus_epi16(g, _mm512_set1_epi16(255));
    for (size_t i = 0; i < kPixelBytes; i += 64)
      _mm512_storeu_si512(dst + i, _mm512_permutex2var_epi8(blueRed, _mm512_load_si512(kOrder.bytes + i), greenOpaque));
  }

  __m512i luma, lumaBias, blue, green, red;
};

// A row like PairLoop (convert/Pairs422-inl.h).
template <PairOrder kPairs>
VX_VBMI void PairsToBgrx(const uint8_t* src, uint8_t* dst, size_t count, const FixedYuvToRgb8& coefficients) {
  const Matrix m(coefficients);
  const auto split = [&](const uint8_t* p) VX_VBMI {
    __builtin_prefetch(reinterpret_cast<const void*>(reinterpret_cast<uintptr_t>(p) + kFetchAhead));
    return m.Split<kPairs>(_mm512_loadu_si512(p), _mm512_loadu_si512(p + 4));
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
    m.Store(m.Split<kPairs>(vector, _mm512_alignr_epi32(repeated, vector, 1)), out);
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
