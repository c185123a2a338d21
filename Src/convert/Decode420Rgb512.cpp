#include "convert/Decode420Rgb512.h"

#include <cstring>

#include "convert/YuvToRgb512.h"

namespace vexel::decode420 {

using rgb512::kPixels;

namespace {

// A block is 64 pixels.
constexpr size_t kPairs = 32, kBlock = 2 * kPairs;

// Of two vectors, the samples of rows A and B side by side. Planes: u and v, each of row A and then of row B; pairs:
// row A and row B.
struct ChromaOrder {
  constexpr explicit ChromaOrder(ByteChroma chroma) : bytes{} {
    for (uint32_t i = 0; i < 128; ++i) {
      const uint32_t sample = i / 2, row = i % 2;
      bytes[i] = static_cast<uint8_t>(chroma == ByteChroma::Planes  ? sample / 2 + 32 * row + 64 * (sample % 2)
                                      : chroma == ByteChroma::Pairs ? sample + 64 * row
                                                                    : (sample ^ 1) + 64 * row);
    }
  }
  alignas(64) uint8_t bytes[128];
};

// Bytes of luma at the top of words.
struct LumaOrder {
  constexpr LumaOrder() : bytes{} {
    for (uint32_t i = 0; i < 128; ++i) bytes[i] = static_cast<uint8_t>(i / 2);
  }
  alignas(64) uint8_t bytes[128];
};
constexpr LumaOrder kLuma;

// Eight times the mixed chroma (u, v) of a block, plus 4.
struct Mixed {
  __m512i first, second;
};

// The chroma of a row, its last sample repeated behind the end.
template <ByteChroma kChroma>
class ChromaRows {
 public:
  VX_VBMI_INLINE explicit ChromaRows(const PixelRow& row)
      : mRow(row), mWeights(_mm512_set1_epi16(static_cast<int16_t>(row.weightA | row.weightB << 8))) {
    const size_t rest = row.chroma % kPairs;
    const uint8_t* const rows[] = {row.u, row.uB, row.v, row.vB};
    for (size_t k = 0; k < (kChroma == ByteChroma::Planes ? 4 : 2); ++k) {
      const uint8_t* const end = rows[k] + row.chroma * kBytes;
      int16_t last = end[-1];
      if (kBytes == 2) std::memcpy(&last, end - 2, 2);
      const __m512i repeated = kBytes == 1 ? _mm512_set1_epi8(static_cast<int8_t>(last)) : _mm512_set1_epi16(last);
      for (size_t i = 0; i < sizeof mTail[k]; i += 64) _mm512_store_si512(mTail[k] + i, repeated);
      std::memcpy(mTail[k], end - rest * kBytes, rest * kBytes);
    }
  }
  VX_VBMI_INLINE Mixed Block(size_t block) const {
    const size_t ends = mRow.chroma / kPairs, at = block * kPairs * kBytes;
    if (block < ends) return Mix(mRow.u + at, mRow.uB + at, mRow.v + at, mRow.vB + at);
    const size_t behind = (block == ends ? 0 : kPairs) * kBytes;
    return Mix(mTail[0] + behind, mTail[1] + behind, mTail[2] + behind, mTail[3] + behind);
  }

 private:
  static constexpr size_t kBytes = kChroma == ByteChroma::Planes ? 1 : 2;

  VX_VBMI_INLINE Mixed Mix(const uint8_t* u, const uint8_t* uB, const uint8_t* v, const uint8_t* vB) const {
    static constexpr ChromaOrder kOrder(kChroma);
    __m512i a, b;
    if constexpr (kChroma == ByteChroma::Planes)
      a = Join(u, uB), b = Join(v, vB);
    else
      a = _mm512_loadu_si512(u), b = _mm512_loadu_si512(uB);
    const auto half = [&](size_t at) VX_VBMI {
      const __m512i samples = _mm512_permutex2var_epi8(a, _mm512_load_si512(kOrder.bytes + at), b);
      return _mm512_add_epi16(_mm512_maddubs_epi16(samples, mWeights), _mm512_set1_epi16(4));
    };
    return {half(0), half(64)};
  }
  static VX_VBMI_INLINE __m512i Join(const uint8_t* low, const uint8_t* high) {
    const auto *a = reinterpret_cast<const __m256i*>(low), *b = reinterpret_cast<const __m256i*>(high);
    return _mm512_inserti64x4(_mm512_castsi256_si512(_mm256_loadu_si256(a)), _mm256_loadu_si256(b), 1);
  }

  const PixelRow& mRow;
  __m512i mWeights;
  alignas(64) uint8_t mTail[4][2 * kPairs * kBytes];
};

template <bool kStream>
VX_VBMI_INLINE void StoreHalf(const rgb512::Matrix& m, __m512i luma, __m512i mixed, __m512i following, uint8_t* dst) {
  const __m512i top = _mm512_set1_epi16(static_cast<int16_t>(0xFF00)),
                zero = _mm512_set1_epi16(static_cast<int16_t>(0x8000));
  constexpr int kXorAnd = 0x78;  // a ^ (b & c)
  const __m512i even = _mm512_slli_epi16(mixed, 5),
                odd = _mm512_slli_epi16(_mm512_add_epi16(mixed, _mm512_alignr_epi32(following, mixed, 1)), 4);
  m.Store<kStream>({m.Luma(luma), _mm512_ternarylogic_epi32(zero, even, top, kXorAnd),
                    _mm512_ternarylogic_epi32(zero, odd, top, kXorAnd)},
                   dst);
}

template <bool kStream>
VX_VBMI_INLINE void StoreBlock(const rgb512::Matrix& m, const uint8_t* y, const Mixed& mixed, const Mixed& next,
                               uint8_t* dst) {
  const __m512i bytes = _mm512_loadu_si512(y);
  const auto luma = [&](size_t at) VX_VBMI {
    return _mm512_maskz_permutexvar_epi8(0xAAAAAAAAAAAAAAAA, _mm512_load_si512(kLuma.bytes + at), bytes);
  };
  StoreHalf<kStream>(m, luma(0), mixed.first, mixed.second, dst);
  StoreHalf<kStream>(m, luma(64), mixed.second, next.first, dst + 4 * kPixels);
}

// Chroma is mixed a block ahead.
template <ByteChroma kChroma, bool kStream>
VX_VBMI_INLINE void Run(const PixelRow& row, const rgb512::Matrix& m) {
  const ChromaRows<kChroma> chroma(row);
  Mixed mixed = chroma.Block(0);
  const size_t blocks = row.count / kBlock, rest = row.count % kBlock;
  for (size_t i = 0; i < blocks; ++i) {
    const Mixed next = chroma.Block(i + 1);
    StoreBlock<kStream>(m, row.y + i * kBlock, mixed, next, row.dst + i * 4 * kBlock);
    mixed = next;
  }
  if (rest == 0) return;
  alignas(64) uint8_t y[kBlock] = {}, out[4 * kBlock];
  std::memcpy(y, row.y + blocks * kBlock, rest);
  StoreBlock<false>(m, y, mixed, chroma.Block(blocks + 1), out);
  std::memcpy(row.dst + blocks * 4 * kBlock, out, 4 * rest);
}

template <ByteChroma kChroma, bool kIs709>
VX_VBMI void CodesToBgrx(const PixelRow& row, const decode420::Matrix&) {
  const rgb512::Matrix m(kIs709 ? kYuvToRgb8_709 : kYuvToRgb8_601);
  if (row.stream)
    Run<kChroma, true>(row, m);
  else
    Run<kChroma, false>(row, m);
}

template <bool kIs709>
constexpr MakePixels kKernels[] = {CodesToBgrx<ByteChroma::Planes, kIs709>, CodesToBgrx<ByteChroma::Pairs, kIs709>,
                                   CodesToBgrx<ByteChroma::SwappedPairs, kIs709>};

}  // namespace

MakePixels CodesToBgrx512(ByteChroma chroma, bool is709) noexcept {
  return (is709 ? kKernels<true> : kKernels<false>)[static_cast<int>(chroma)];
}

}  // namespace vexel::decode420
