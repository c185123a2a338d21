// The arithmetic is that of V210Kernels.cpp. 16 groups have as many samples of luma and of chroma as three vectors have
// words, so that no lane is idle.
#include "convert/V210Upsample512.h"

#include <cstring>

#include "convert/PixelWords512.h"

namespace vexel {

using namespace words512;

namespace {

constexpr size_t kBlockPixels = 96, kBlockBytes = 256, kStepBytes = 64, kStepPixelBytes = 128, kFetchAhead = 8192;
constexpr size_t PairsOf(size_t pixels) { return (pixels + 1) / 2; }
constexpr size_t GroupsOf(size_t pixels) { return (pixels + 5) / 6; }

// The bytes of the luma (kFirst 1) or chroma (0) samples of step kStep, counted from kStep vectors into the block, and
// the factors that move the samples to the top of their words.
template <size_t kStep, size_t kFirst>
struct Samples {
  constexpr Samples() : bytes{}, factors{} {
    for (size_t i = 0; i < 32; ++i) {
      const size_t sample = 64 * kStep + 2 * i + kFirst;
      for (size_t k = 0; k < 2; ++k) bytes[2 * i + k] = static_cast<uint8_t>(FirstByte(sample) - 64 * kStep + k);
      factors[i] = ToTop(sample);
    }
  }
  alignas(64) uint8_t bytes[64];
  alignas(64) uint16_t factors[32];
};

template <size_t kStep, size_t kFirst>
VX_VBMI_INLINE __m512i AtTop(const uint8_t* block) {
  static constexpr Samples<kStep, kFirst> kSamples;
  const __m512i words =
      _mm512_permutex2var_epi8(_mm512_loadu_si512(block + kStep * kStepBytes), _mm512_load_si512(kSamples.bytes),
                               _mm512_loadu_si512(block + (kStep + 1) * kStepBytes));
  return _mm512_mullo_epi16(words, _mm512_load_si512(kSamples.factors));
}

// Codes times 64; what is below a sample is left in the words of luma.
template <size_t kStep>
VX_VBMI_INLINE __m512i Luma(const uint8_t* block) {
  return AtTop<kStep, 1>(block);
}
template <size_t kStep>
VX_VBMI_INLINE __m512i Chroma(const uint8_t* block) {
  return _mm512_and_si512(AtTop<kStep, 0>(block), Words(0xFFC0));
}

// Chroma of the pixels about 0, from pairs of words (U, V) for the even and for the odd pixels.
struct PixelChroma {
  VX_VBMI_INLINE PixelChroma(__m512i even, __m512i odd) {
    even = _mm512_xor_si512(even, Words(0x8000)), odd = _mm512_xor_si512(odd, Words(0x8000));
    u = JoinLow(even, odd), v = JoinHigh(even, odd);
  }
  __m512i u, v;
};

// (luma & ~63) ^ 2^15
VX_VBMI_INLINE __m512i SignedLuma(__m512i luma) {
  return _mm512_ternarylogic_epi32(luma, Words(0xFFC0), Words(0x8000), 0x6A);
}

struct ToBgr {
  VX_VBMI_INLINE explicit ToBgr(const BgrFixed& m)
      : y(Words(m.y)),
        offset(Words(m.offset + 32)),
        bU(Words(m.bU)),
        gU(Words(m.gU)),
        gV(Words(m.gV)),
        rV(Words(m.rV)) {}
  VX_VBMI_INLINE void Store(__m512i luma, __m512i even, __m512i odd, uint8_t* dst) const {
    const PixelChroma c(even, odd);
    const __m512i grey = _mm512_add_epi16(_mm512_mulhrs_epi16(SignedLuma(luma), y), offset);
    const auto channel = [&](__m512i chroma) VX_VBMI { return _mm512_srai_epi16(_mm512_adds_epi16(grey, chroma), 6); };
    StoreChannels(channel(_mm512_mulhrs_epi16(c.u, bU)),
                  channel(_mm512_add_epi16(_mm512_mulhrs_epi16(c.u, gU), _mm512_mulhrs_epi16(c.v, gV))),
                  channel(_mm512_mulhrs_epi16(c.v, rV)), dst);
  }
  __m512i y, offset, bU, gU, gV, rV;
};

// Rounded codes are the upper bytes of words.
struct ToVuy {
  struct Order {
    constexpr Order() : chroma{}, pixels{} {
      for (uint32_t i = 0; i < 64; ++i)  // V and U of each pixel
        chroma[i] = static_cast<uint8_t>(i / 4 * 4 + 3 - i % 2 * 2 + i / 2 % 2 * 64);
      for (uint32_t i = 0; i < 128; ++i)
        pixels[i] = static_cast<uint8_t>(i / 4 * 2 + (i % 4 < 2 ? i % 2 : 64 + 1 - i % 2));
    }
    alignas(64) uint8_t chroma[64], pixels[128];
  };
  VX_VBMI_INLINE void Store(__m512i luma, __m512i even, __m512i odd, uint8_t* dst) const {
    static constexpr Order kOrder;
    const __m512i half = Words(128);
    const auto round = [&](__m512i v) VX_VBMI { return _mm512_adds_epu16(v, half); };
    StoreOrdered(_mm512_permutex2var_epi8(round(even), _mm512_load_si512(kOrder.chroma), round(odd)), kOrder.pixels,
                 _mm512_or_si512(round(luma), Words(255)), dst);
  }
};

struct RecodeToVuy {
  VX_VBMI_INLINE explicit RecodeToVuy(const RecodingFixed& m)
      : vU(Words(m.vU)), vV(Words(m.vV)), uU(Words(m.uU)), uV(Words(m.uV)), yU(Words(m.yU)), yV(Words(m.yV)) {}
  VX_VBMI_INLINE void Store(__m512i luma, __m512i even, __m512i odd, uint8_t* dst) const {
    const PixelChroma c(even, odd);
    const __m512i half = Words(128 * 64 + 32);
    const auto channel = [&](__m512i fromU, __m512i fromV, __m512i rest) VX_VBMI {
      const __m512i sum = _mm512_add_epi16(_mm512_mulhrs_epi16(c.u, fromU), _mm512_mulhrs_epi16(c.v, fromV));
      return _mm512_srai_epi16(_mm512_add_epi16(sum, rest), 6);
    };
    const __m512i grey = _mm512_add_epi16(_mm512_srai_epi16(SignedLuma(luma), 2), half);
    StoreChannels(channel(vU, vV, half), channel(uU, uV, half), channel(yU, yV, grey), dst);
  }
  __m512i vU, vV, uU, uV, yU, yV;
};

// The first `count` words of 32 bits, at most 16.
__mmask16 FirstWords(size_t count) { return static_cast<__mmask16>(count < 16 ? (1u << count) - 1 : 0xFFFF); }

// Sets a sample of a row.
void SetSample(uint8_t* row, size_t index, uint32_t code) {
  uint32_t word;
  std::memcpy(&word, row + index / 3 * 4, 4);
  word = (word & ~(uint32_t{0x3FF} << index % 3 * 10)) | code << index % 3 * 10;
  std::memcpy(row + index / 3 * 4, &word, 4);
}
uint32_t GetSample(const uint8_t* row, size_t index) {
  uint32_t word;
  std::memcpy(&word, row + index / 3 * 4, 4);
  return word >> index % 3 * 10 & 0x3FF;
}

// One step: pixels from their luma, the chroma of their pairs, and that of the next step.
template <class Pixels>
VX_VBMI_INLINE void StoreStep(const Pixels& pixels, __m512i luma, __m512i own, __m512i next, uint8_t* dst) {
  pixels.Store(luma, own, _mm512_avg_epu16(own, _mm512_alignr_epi32(next, own, 1)), dst);
}

// The pixels of a block, or its first `count`. Needs the chroma of its first step and returns that of the block that
// follows.
template <class Pixels>
VX_VBMI_INLINE __m512i UpsampleBlock(const Pixels& pixels, const uint8_t* block, const uint8_t* following,
                                     __m512i first, uint8_t* dst) {
  const __m512i second = Chroma<1>(block), third = Chroma<2>(block), after = Chroma<0>(following);
  StoreStep(pixels, Luma<0>(block), first, second, dst);
  StoreStep(pixels, Luma<1>(block), second, third, dst + kStepPixelBytes);
  StoreStep(pixels, Luma<2>(block), third, after, dst + 2 * kStepPixelBytes);
  return after;
}
template <class Pixels>
VX_VBMI_INLINE void UpsampleRest(const Pixels& pixels, const uint8_t* block, size_t count, __m512i first,
                                 uint8_t* dst) {
  alignas(64) uint8_t out[4 * kBlockPixels];
  const __m512i second = Chroma<1>(block), third = Chroma<2>(block);
  StoreStep(pixels, Luma<0>(block), first, second, out);
  if (count > 32) StoreStep(pixels, Luma<1>(block), second, third, out + kStepPixelBytes);
  if (count > 64) StoreStep(pixels, Luma<2>(block), third, Chroma<0>(block + kBlockBytes), out + 2 * kStepPixelBytes);
  for (size_t i = 0; i < count; i += 16)
    _mm512_mask_storeu_epi32(dst + 4 * i, FirstWords(count - i), _mm512_load_si512(out + 4 * i));
}

// The row continues with its last chroma.
template <class Pixels>
VX_VBMI void Upsample(const uint8_t* src, uint8_t* dst, size_t count, const Pixels& pixels) {
  if (count == 0) return;
  const size_t blocks = count / kBlockPixels, rest = count % kBlockPixels;
  alignas(64) uint8_t tail[kBlockBytes + 2 * kStepBytes] = {};
  const uint8_t* const restOfSrc = src + blocks * kBlockBytes;
  const size_t restWords = 4 * GroupsOf(rest);
  for (size_t i = 0; i < restWords; i += 16)
    _mm512_store_si512(tail + 4 * i, _mm512_maskz_loadu_epi32(FirstWords(restWords - i), restOfSrc + 4 * i));
  for (size_t channel = 0; channel <= 2; channel += 2)
    SetSample(tail, 4 * PairsOf(rest) + channel, GetSample(src, 4 * (PairsOf(count) - 1) + channel));

  __m512i first = Chroma<0>(blocks > 0 ? src : tail);
  for (size_t i = 0; i < blocks; ++i, src += kBlockBytes, dst += 4 * kBlockPixels) {
    for (size_t k = 0; k < kBlockBytes; k += 64)
      __builtin_prefetch(reinterpret_cast<const void*>(reinterpret_cast<uintptr_t>(src) + kFetchAhead + k));
    first = UpsampleBlock(pixels, src, i + 1 < blocks ? src + kBlockBytes : tail, first, dst);
  }
  if (rest > 0) UpsampleRest(pixels, tail, rest, first, dst);
}

}  // namespace

VX_VBMI void V210ToBgrx512(const uint8_t* src, uint8_t* dst, size_t count, const BgrFixed& matrix) noexcept {
  Upsample(src, dst, count, ToBgr(matrix));
}
VX_VBMI void V210ToVuyx512(const uint8_t* src, uint8_t* dst, size_t count) noexcept {
  Upsample(src, dst, count, ToVuy());
}
VX_VBMI void RecodeV210ToVuyx512(const uint8_t* src, uint8_t* dst, size_t count, const RecodingFixed& matrix) noexcept {
  Upsample(src, dst, count, RecodeToVuy(matrix));
}

}  // namespace vexel
