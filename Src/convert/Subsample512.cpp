// The arithmetic is that of Subsample422Kernels8.cpp. A block of 32 pixels passes through five stages, each an
// iteration after the one before: in a row they are a longer chain than processors overlap, however few the
// instructions.
#include "convert/Subsample512.h"

#include <cstring>
#include <utility>

#define VX_SUBSAMPLE __attribute__((target("avx512f,avx512bw,avx512dq,avx512vl,avx512vbmi,avx512vnni")))
#define VX_SUBSAMPLE_INLINE VX_SUBSAMPLE __attribute__((always_inline)) inline

namespace vexel {
namespace {

constexpr size_t kBlockPixels = 32, kBlockBytes = 4 * kBlockPixels, kPairBytes = 2 * kBlockPixels;
constexpr size_t kFetchAhead = 8192;
constexpr size_t kAhead = 4;    // blocks between what is loaded and what is stored
constexpr size_t kChunk = 14;   // blocks whose alpha is looked at together; even
constexpr int kClamp = 0x7F00;  // Chroma words are that much larger, so that they saturate above 255.

// For each pair of two vectors of pixels: four bytes of its even pixel, and of its odd one.
struct PairBytes {
  constexpr explicit PairBytes(uint32_t order) : even{}, odd{} {
    for (uint32_t i = 0; i < 64; ++i) {
      even[i] = static_cast<uint8_t>(i / 4 * 8 + (order >> (4 * (i % 4)) & 3));
      odd[i] = static_cast<uint8_t>(even[i] + 4);
    }
  }
  alignas(64) uint8_t even[64], odd[64];
};
// The digits name the bytes of a pixel, from the highest result byte to the lowest.
constexpr PairBytes kBgrg(0x1210), kAlpha(0x3333);

// luma: byte 2 of each dword of two vectors, to the places of luma in a pair. green: as words, of the even and the odd
// pixel of each pair. evenGreen and oddGreen: the bytes at even places, and such a green word, as bytes (b, g, r, g).
struct JoinBytes {
  constexpr JoinBytes() : luma{}, green{}, evenGreen{}, oddGreen{} {
    for (uint32_t i = 0; i < 64; ++i) {
      const uint32_t dword = i / 4 * 4;
      luma[i] = static_cast<uint8_t>(dword + 2 + (i % 4 == 3 ? 64 : 0));
      green[i] = static_cast<uint8_t>(i / 4 * 8 + (i % 4 < 2 ? 1 : 5));
      evenGreen[i] = static_cast<uint8_t>(i % 2 == 0 ? i : 64 + dword);
      oddGreen[i] = static_cast<uint8_t>(i % 2 == 0 ? i : 64 + dword + 2);
    }
  }
  alignas(64) uint8_t luma[64], green[64], evenGreen[64], oddGreen[64];
};
constexpr JoinBytes kJoin;

// Bytes (b, g, r, g) of the even and the odd pixels.
struct Pixels {
  __m512i even, odd;
};
// Words (b - g, r - g) and (b, r) of them.
struct Factors {
  __m512i evenDifferences, oddDifferences, even, odd;
};
// Chroma words (u, v) of the even and of the odd pixels, the latter plus 1, and luma where it is stored.
struct Words {
  __m512i even, oddPlus1, luma;
};

VX_SUBSAMPLE_INLINE __m512i WordPair(int low, int high) {
  return _mm512_set1_epi32(static_cast<int>((static_cast<uint32_t>(low) & 0xFFFF) | static_cast<uint32_t>(high) << 16));
}

VX_SUBSAMPLE_INLINE __m512i PermuteBytes(__m512i a, const uint8_t* order, __m512i b) {
  return _mm512_permutex2var_epi8(a, _mm512_load_si512(order), b);
}

// The same with words of the bytes at even places.
VX_SUBSAMPLE_INLINE __m512i PermuteToWords(__m512i a, const uint8_t* order, __m512i b) {
  return _mm512_maskz_permutex2var_epi8(0x5555555555555555, a, _mm512_load_si512(order), b);
}

// Luma is a sum over (b - g, r - g) and (b, r): of the ways to divide its coefficients one in which all fit 16 bits.
struct Matrix {
  VX_SUBSAMPLE_INLINE explicit Matrix(const FixedMatrix8& m)
      : v(WordPair(m.c0[0], m.c2[0])),
        u(WordPair(m.c0[1], m.c2[1])),
        lumaOfDifferences(WordPair(-2 * m.c1[2] - m.c2[2] + kRed, m.c2[2] - kRed)),
        lumaOfPixels(WordPair(m.c0[2] + 2 * m.c1[2] + m.c2[2] - kRed, kRed)),
        evenBias(_mm512_set1_epi32(m.biasUnit * m.bias[0] + (kClamp << 16))),
        oddBias(_mm512_set1_epi32(m.biasUnit * m.bias[0] + ((kClamp + 1) << 16))),
        lumaBias(_mm512_set1_epi32(m.biasUnit * m.bias[2])) {}

  VX_SUBSAMPLE_INLINE __m512i Chroma(__m512i differences, __m512i bias) const {
    constexpr __mmask64 kLow = 0x3333333333333333;
    const __m512i high = _mm512_set4_epi32(0x0F0E0F0E, 0x0B0A0B0A, 0x07060706, 0x03020302);
    return _mm512_mask_shuffle_epi8(_mm512_dpwssd_epi32(bias, differences, v), kLow,
                                    _mm512_dpwssd_epi32(bias, differences, u), high);
  }
  VX_SUBSAMPLE_INLINE __m512i Luma(__m512i differences, __m512i pixels) const {
    return _mm512_dpwssd_epi32(_mm512_dpwssd_epi32(lumaBias, differences, lumaOfDifferences), pixels, lumaOfPixels);
  }

  static constexpr int kRed = 30000;
  __m512i v, u, lumaOfDifferences, lumaOfPixels, evenBias, oddBias, lumaBias;
};

// c a / 255 to nearest: (t + 128) 257 >> 16 of t = c a.
VX_SUBSAMPLE_INLINE __m512i Scale(__m512i channels, __m512i alphas) {
  const __m512i product = _mm512_add_epi16(_mm512_mullo_epi16(channels, alphas), _mm512_set1_epi16(128));
  return _mm512_mulhi_epu16(product, _mm512_set1_epi16(257));
}

// Which of a block's alphas are taken for 255: all of them, all as long as they are (the caller finds out), or none.
enum class Alpha { Ignored, Opaque, Premultiplied };

// The least of all pixels so far. Two minima are faster than one logical operation of three registers: of those
// processors do two in a cycle, and the products and permutations are many enough.
struct AlphaCheck {
  VX_SUBSAMPLE_INLINE bool AllOpaque() const {
    return _mm512_cmplt_epu32_mask(pixels, _mm512_set1_epi32(static_cast<int>(0xFF000000))) == 0;
  }
  __m512i pixels;
};

template <Alpha kAlphas>
VX_SUBSAMPLE_INLINE Pixels Load(const uint8_t* src, AlphaCheck& check) {
  for (size_t line = 0; line < kBlockBytes; line += 64)
    __builtin_prefetch(reinterpret_cast<const void*>(reinterpret_cast<uintptr_t>(src) + kFetchAhead + line));
  const __m512i a = _mm512_loadu_si512(src), b = _mm512_loadu_si512(src + 64);
  if constexpr (kAlphas != Alpha::Premultiplied) {
    if (kAlphas == Alpha::Opaque) check.pixels = _mm512_min_epu32(check.pixels, _mm512_min_epu32(a, b));
    return {PermuteBytes(a, kBgrg.even, b), PermuteBytes(a, kBgrg.odd, b)};
  }
  const __m512i evenAlpha = PermuteToWords(a, kAlpha.even, b), oddAlpha = PermuteToWords(a, kAlpha.odd, b);
  const __m512i green =
      Scale(PermuteToWords(a, kJoin.green, b), _mm512_mask_mov_epi16(evenAlpha, 0xAAAAAAAA, oddAlpha));
  return {PermuteBytes(Scale(PermuteToWords(a, kBgrg.even, b), evenAlpha), kJoin.evenGreen, green),
          PermuteBytes(Scale(PermuteToWords(a, kBgrg.odd, b), oddAlpha), kJoin.oddGreen, green)};
}

VX_SUBSAMPLE_INLINE Factors Split(const Pixels& pixels) {
  const __m512i bytes = _mm512_set1_epi16(0xFF), lessGreen = _mm512_set1_epi16(static_cast<int16_t>(0xFF01));
  return {_mm512_maddubs_epi16(pixels.even, lessGreen), _mm512_maddubs_epi16(pixels.odd, lessGreen),
          _mm512_and_si512(pixels.even, bytes), _mm512_and_si512(pixels.odd, bytes)};
}

VX_SUBSAMPLE_INLINE Words Multiply(const Matrix& m, const Factors& f) {
  constexpr __mmask64 kLuma = 0xAAAAAAAAAAAAAAAA;
  return {m.Chroma(f.evenDifferences, m.evenBias), m.Chroma(f.oddDifferences, m.oddBias),
          _mm512_maskz_permutex2var_epi8(kLuma, m.Luma(f.evenDifferences, f.even), _mm512_load_si512(kJoin.luma),
                                         m.Luma(f.oddDifferences, f.odd))};
}

// The details of the lifting plus 1.
VX_SUBSAMPLE_INLINE __m512i Details(const Words& words, __m512i following) {
  const __m512i after = _mm512_alignr_epi32(following, words.even, 1);
  return _mm512_sub_epi16(words.oddPlus1, _mm512_avg_epu16(words.even, after));
}

VX_SUBSAMPLE_INLINE void Store(const Words& words, __m512i details, __m512i before, uint8_t* dst) {
  const __m512i sum = _mm512_add_epi16(_mm512_alignr_epi32(details, before, 15), details);
  const __m512i chroma = _mm512_subs_epu16(_mm512_adds_epi16(words.even, _mm512_srai_epi16(sum, 2)),
                                           _mm512_set1_epi16(static_cast<int16_t>(kClamp)));
  _mm512_storeu_si512(dst, _mm512_or_si512(chroma, words.luma));
}

// Block i of a row and what follows it: its last pixel over and over.
struct Row {
  VX_SUBSAMPLE_INLINE Row(const uint8_t* source, size_t count) : src(source), blocks(count / kBlockPixels) {
    const uint8_t* end = src + 4 * count;
    const size_t rest = count % kBlockPixels;
    int32_t last;
    std::memcpy(&last, end - 4, 4);
    for (size_t i = 0; i < sizeof tail; i += 64) _mm512_store_si512(tail + i, _mm512_set1_epi32(last));
    std::memcpy(tail, end - 4 * rest, 4 * rest);
  }
  VX_SUBSAMPLE_INLINE const uint8_t* Block(size_t i) const {
    return i < blocks ? src + i * kBlockBytes : i == blocks ? tail : tail + kBlockBytes;
  }
  const uint8_t* src;
  size_t blocks;
  alignas(64) uint8_t tail[2 * kBlockBytes];
};

// What is between the stages: two blocks of words and their details in turn, one of factors and one of pixels.
template <Alpha kAlphas>
struct Pipeline {
  VX_SUBSAMPLE_INLINE Pipeline(const Matrix& m, const Row& row) : check{_mm512_set1_epi32(-1)} {
    words[0] = Multiply(m, Split(Load<kAlphas>(row.Block(0), check)));
    words[1] = Multiply(m, Split(Load<kAlphas>(row.Block(1), check)));
    details[0] = Details(words[0], words[1].even);
    details[1] = _mm512_set1_epi16(1);
    factors = Split(Load<kAlphas>(row.Block(2), check));
    pixels = Load<kAlphas>(row.Block(3), check);
  }
  // Stores a block and moves the others on.
  template <int kTurn>
  VX_SUBSAMPLE_INLINE void Step(const Matrix& m, uint8_t* dst) {
    constexpr int kNext = 1 - kTurn;
    Store(words[kTurn], details[kTurn], details[kNext], dst);
    words[kTurn] = Multiply(m, factors);
    details[kNext] = Details(words[kNext], words[kTurn].even);
    factors = Split(pixels);
  }
  VX_SUBSAMPLE_INLINE void StepChunk(const Matrix& m, const uint8_t* src, uint8_t* dst) {
    Pixels staged[kChunk];
    if constexpr (kAlphas == Alpha::Premultiplied)
      for (size_t i = 0; i < kChunk; ++i) staged[i] = Load<kAlphas>(src + i * kBlockBytes, check);
    const auto load = [&](size_t i) VX_SUBSAMPLE {
      return kAlphas == Alpha::Premultiplied ? staged[i] : Load<kAlphas>(src + i * kBlockBytes, check);
    };
    for (size_t i = 0; i < kChunk; i += 2, dst += 2 * kPairBytes) {
      Step<0>(m, dst);
      pixels = load(i);
      Step<1>(m, dst + kPairBytes);
      pixels = load(i + 1);
    }
  }

  Words words[2];
  __m512i details[2];
  Factors factors;
  Pixels pixels;
  AlphaCheck check;
};

// Returns false, with part of the row written, where alphas are not what they are taken for.
template <Alpha kAlphas>
VX_SUBSAMPLE bool Subsample(const uint8_t* src, uint8_t* dst, size_t count, const FixedMatrix8& matrix) {
  const Matrix m(matrix);
  const Row row(src, count);
  Pipeline<kAlphas> pipeline(m, row);
  size_t i = 0;
  for (; i + kAhead + kChunk <= row.blocks; i += kChunk, dst += kChunk * kPairBytes) {
    if (!pipeline.check.AllOpaque()) return false;
    pipeline.StepChunk(m, src + (i + kAhead) * kBlockBytes, dst);
  }
  for (; i < row.blocks; ++i, dst += kPairBytes) {
    pipeline.template Step<0>(m, dst);
    std::swap(pipeline.words[0], pipeline.words[1]);
    std::swap(pipeline.details[0], pipeline.details[1]);
    if (i + kAhead <= row.blocks + 1) pipeline.pixels = Load<kAlphas>(row.Block(i + kAhead), pipeline.check);
  }
  if (const size_t rest = count % kBlockPixels) {
    alignas(64) uint8_t out[kPairBytes];
    pipeline.template Step<0>(m, out);
    std::memcpy(dst, out, (rest + 1) / 2 * 4);
  }
  return pipeline.check.AllOpaque();
}

}  // namespace

void Bgra8ToUyvy512(const uint8_t* src, uint8_t* dst, size_t count, const FixedMatrix8& matrix) noexcept {
  if (count == 0 || Subsample<Alpha::Opaque>(src, dst, count, matrix)) return;
  Subsample<Alpha::Premultiplied>(src, dst, count, matrix);
}
void Bgrx8ToUyvy512(const uint8_t* src, uint8_t* dst, size_t count, const FixedMatrix8& matrix) noexcept {
  if (count > 0) Subsample<Alpha::Ignored>(src, dst, count, matrix);
}

}  // namespace vexel
