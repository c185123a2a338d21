// RGB kernels over their whole domains in double precision: depths, 10-bit words, premultiplied alpha, linear light.
#include <numeric>

#include "convert/RgbKernels.h"
#include "convert/RowKernelCheck.h"
#include "support/Test.h"
#include "support/Ulp.h"

namespace vexel::testing {
namespace {

// ---- Depths

template <class T>
std::vector<T> Codes(size_t count) {
  std::vector<T> codes(count);
  std::iota(codes.begin(), codes.end(), T{0});
  return codes;
}

// Values around every tie of a narrowing to `most`, and all that is special about floats.
std::vector<float> NarrowingValues(int most) {
  std::vector<float> values = {0.0f,       -0.0f, 1e-45f,         -1e-45f,         kInfinity,
                               -kInfinity, kNaN,  -kNaN,          3e38f,           -3e38f,
                               1e9f,       -1e9f, 0x1p31f / most, -0x1p31f / most, 8e6f,
                               -0.5f,      1.0f,  2.0f,           0x1p30f / most,  std::nextafter(0x1p31f / most, 0.0f),
                               12345.678f, 0.5f};
  for (int code = -1; code <= most; ++code) {
    const float tie = (code + 0.5f) / most;
    values.insert(values.end(), {std::nextafter(tie, -kInfinity), tie, std::nextafter(tie, kInfinity)});
  }
  values.resize((values.size() + 3) / 4 * 4);
  return values;
}

// The scaling is a float product, rounded as the processor does at the moment; what it cannot convert counts as the
// least int32.
int NarrowedFloat(float value, int most) {
  const double product = value * static_cast<float>(most);
  const double rounded = std::nearbyint(product);
  if (!(rounded >= -2147483648.0 && rounded <= 2147483647.0)) return 0;
  return static_cast<int>(std::clamp(rounded, 0.0, static_cast<double>(most)));
}

// Not inlined, so that all is computed in the mode of the call.
[[gnu::noinline]] std::vector<int> NarrowedFloats(const std::vector<float>& values, int most) {
  const FpModeGuard guard;
  std::vector<int> codes;
  for (const float value : values) codes.push_back(NarrowedFloat(value, most));
  return codes;
}

TEST(DepthKernels, WideningToFloat) {
  const auto bytes = RunKernel<float>(kWiden8uTo32f, Codes<uint8_t>(256), 64, 256);
  for (int c = 0; c < 256; ++c) {
    ASSERT_EQ(bytes[c], static_cast<float>(c * static_cast<double>(0.003921569f))) << c;
    ASSERT_NEAR(bytes[c], c / 255.0, 1.2e-7);  // two roundings
  }
  EXPECT_EQ(bytes[255], 1.0f);
  const auto words = RunKernel<float>(kWiden15uTo32f, Codes<uint16_t>(65536), 16384, 65536);
  for (int c = 0; c < 65536; ++c) ASSERT_EQ(words[c], c / 32768.0) << c;
}

TEST(DepthKernels, IntegerDepths) {
  const auto widened = RunKernel<uint16_t>(kWiden8uTo15u, Codes<uint8_t>(256), 64, 256);
  for (int c = 0; c < 256; ++c) ASSERT_EQ(widened[c], std::floor(c * 32768.0 / 255 + 0.5)) << c;
  const auto narrowed = RunKernel<uint8_t>(kNarrow15uTo8u, Codes<uint16_t>(65536), 16384, 65536);
  for (int c = 0; c < 65536; ++c) ASSERT_EQ(narrowed[c], std::floor(std::min(c, 32768) * 255.0 / 32768 + 0.5)) << c;
}

TEST(DepthKernels, NarrowingFromFloat) {
  const auto to8 = NarrowingValues(255), to15 = NarrowingValues(32768);
  const unsigned callers = _mm_getcsr();
  for (const unsigned mode : {0x0000u, 0x2000u, 0x4000u, 0x6000u}) {
    _mm_setcsr((callers & ~0x6000u) | mode);
    const auto bytes = RunKernel<uint8_t>(kNarrow32fTo8u, to8, to8.size() / 4, to8.size());
    const auto words = RunKernel<uint16_t>(kNarrow32fTo15u, to15, to15.size() / 4, to15.size());
    const auto expectedBytes = NarrowedFloats(to8, 255), expectedWords = NarrowedFloats(to15, 32768);
    _mm_setcsr(callers);
    for (size_t i = 0; i < to8.size(); ++i) ASSERT_EQ(bytes[i], expectedBytes[i]) << to8[i] << ", mode " << mode;
    for (size_t i = 0; i < to15.size(); ++i) ASSERT_EQ(words[i], expectedWords[i]) << to15[i] << ", mode " << mode;
  }
}

uint32_t Word(uint32_t red, uint32_t green, uint32_t blue) { return red << 2 | green << 12 | blue << 22; }

// The channels of BGRX pixels, each code of 0..size-1 in each channel, with neighbours that must not leak into it.
template <class T>
std::vector<T> Pixels(const std::vector<T>& codes) {
  std::vector<T> pixels;
  const size_t n = codes.size();
  for (size_t i = 0; i < n; ++i)
    pixels.insert(pixels.end(), {codes[i], codes[(i * 7 + 3) % n], codes[n - 1 - i], codes[(i * 5 + 1) % n]});
  return pixels;
}

TEST(Rgb10Kernels, FromWords) {
  std::vector<uint32_t> words;
  std::vector<uint32_t> codes;  // in the order of BGRX
  for (uint32_t i = 0; i < 1024; ++i) {
    const uint32_t green = i * 7 % 1024, red = 1023 - i;
    words.push_back(Word(red, green, i) | i % 4);  // the low two bits carry nothing
    codes.insert(codes.end(), {i, green, red, 1023});
  }
  const auto bytes = RunKernel<uint8_t>(kRgb10ToBgrx8, words, 1024, 4096);
  const auto halves = RunKernel<uint16_t>(kRgb10ToBgrx15, words, 1024, 4096);
  const auto floats = RunKernel<float>(kRgb10ToBgrx32f, words, 1024, 4096);
  for (size_t i = 0; i < codes.size(); ++i) {
    ASSERT_EQ(bytes[i], std::floor(codes[i] * 255.0 / 1023 + 0.5)) << codes[i];
    ASSERT_EQ(halves[i], std::floor(codes[i] * 32768.0 / 1023 + 0.5)) << codes[i];
    ASSERT_EQ(floats[i], static_cast<float>(codes[i] / 1023.0)) << codes[i];
  }
}

template <class T, class Code>
void ExpectWords(const RowKernelSet& kernels, const std::vector<T>& codes, const Code& code) {
  const std::vector<T> pixels = Pixels(codes);
  const auto words = RunKernel<uint32_t>(kernels, pixels, codes.size(), codes.size());
  for (size_t i = 0; i < words.size(); ++i)
    ASSERT_EQ(words[i], Word(code(pixels[4 * i + 2]), code(pixels[4 * i + 1]), code(pixels[4 * i]))) << i;
}

TEST(Rgb10Kernels, ToWords) {
  const auto rounded = [](double code) { return static_cast<uint32_t>(std::floor(code + 0.5)); };
  ExpectWords(kBgrx8ToRgb10, Codes<uint8_t>(256), [&](uint8_t c) { return rounded(c * 1023.0 / 255); });
  ExpectWords(kBgrx15ToRgb10, Codes<uint16_t>(65536),
              [&](uint16_t c) { return rounded(std::min<int>(c, 32768) * 1023.0 / 32768); });
  ExpectWords(kBgrx32fToRgb10, NarrowingValues(1023), [](float c) { return NarrowedFloat(c, 1023); });
}

// ---- Premultiplied alpha

struct AlphaCase {
  const RowKernelSet* kernels;
  bool premultiplies;
  size_t alphaAt;
  int black[4] = {};
};

template <class T>
void ExpectQuotients(const AlphaCase& test, const std::vector<T>& source, int most) {
  const auto result = RunKernel<T>(*test.kernels, source, source.size() / 4, source.size());
  for (size_t i = 0; i < source.size(); ++i) {
    const double alpha = std::min<int>(source[i / 4 * 4 + test.alphaAt], most), black = test.black[i % 4],
                 channel = std::min<int>(source[i], most) - black;
    // Exact where it is a tie: small integers times or over small integers.
    const double exact = alpha == 0 ? 0 : test.premultiplies ? channel * alpha / most : channel * most / alpha;
    const double expected = std::clamp(black + std::floor(exact + 0.5), 0.0, double(most));
    ASSERT_EQ(result[i], i % 4 == test.alphaAt ? alpha : expected)
        << (test.premultiplies ? "premultiply " : "unpremultiply ") << source[i] << " under " << alpha;
  }
}

// All 65,536 pairs of a channel and an alpha, the pair in each channel in turn, with other pixels beside them.
TEST(AlphaKernels, EightBitDomain) {
  for (const AlphaCase& test : {AlphaCase{&kPremultiplyLast8u, true, 3},
                                {&kPremultiplyFirst8u, true, 0},
                                {&kPremultiplyVuya8, true, 3, {128, 128, 16}},
                                {&kUnpremultiplyLast8u, false, 3},
                                {&kUnpremultiplyFirst8u, false, 0},
                                {&kUnpremultiplyVuyp8, false, 3, {128, 128, 16}}}) {
    std::vector<uint8_t> source(65536 * 4);
    for (size_t i = 0; i < 65536; ++i)
      for (size_t k = 0; k < 4; ++k) source[4 * i + k] = static_cast<uint8_t>(k == test.alphaAt ? i >> 8 : i + 85 * k);
    ExpectQuotients(test, source, 255);
  }
}

// Every alpha with the channels where quotients are closest to ties, and random ones.
TEST(AlphaKernels, FifteenBitQuotients) {
  for (const AlphaCase& test : {AlphaCase{&kPremultiplyLast15u, true, 3},
                                {&kPremultiplyFirst15u, true, 0},
                                {&kUnpremultiplyLast15u, false, 3},
                                {&kUnpremultiplyFirst15u, false, 0}}) {
    Random random(15);
    std::vector<uint16_t> source;
    for (int a = 0; a < 65536; a += a <= 32768 ? 1 : 77) {
      // 32768 c = a q + (a - 1) / 2 has its quotient just below a tie; c as near to `most` as possible.
      const int most = std::min(a, 32768);
      int near = most;
      for (int c = most; c > 0 && c > most - 64; --c)
        if (std::abs(32768LL * c % most - most / 2) < std::abs(32768LL * near % most - most / 2)) near = c;
      const auto below = [&](int last) { return static_cast<int>(random.Int(0, last)); };
      const int channels[] = {0,        1,     most / 2,    most - 1,    most,         near,
                              most + 1, 32768, below(most), below(most), below(65535), 16384};
      for (size_t k = 0; k < std::size(channels); k += 3) {
        uint16_t pixel[4];
        for (size_t n = 0, m = k; n < 4; ++n) pixel[n] = static_cast<uint16_t>(n == test.alphaAt ? a : channels[m++]);
        source.insert(source.end(), pixel, pixel + 4);
      }
    }
    ExpectQuotients(test, source, 32768);
  }
}

TEST(AlphaKernels, Float) {
  struct {
    float channel, alpha, premultiplied, unpremultiplied;
  } const cases[] = {
      {0.5f, 0.25f, 0.125f, 2.0f},       {0.3f, 1.0f, 0.3f, 0.3f},         {-2.0f, 0.5f, -1.0f, -4.0f},
      {0.5f, 0.0f, 0.0f, 0.0f},          {0.5f, -0.0f, -0.0f, 0.0f},       {kNaN, 0.5f, kNaN, kNaN},
      {kNaN, 0.0f, kNaN, 0.0f},          {kInfinity, 0.0f, NAN, 0.0f},     {1.0f, kInfinity, kInfinity, 0.0f},
      {3e38f, 2.0f, kInfinity, 1.5e38f}, {0.1f, 3.0f, 0.1f * 3, 0.1f / 3}, {kNaN, kNaN, kNaN, kNaN},
  };
  const auto same = [](float a, float b) {
    return std::isnan(b) ? std::isnan(a) : std::bit_cast<uint32_t>(a) == std::bit_cast<uint32_t>(b);
  };
  for (const size_t alphaAt : {0, 3})
    for (const bool premultiplies : {true, false}) {
      std::vector<float> source, expected;
      for (const auto& test : cases)
        for (size_t k = 0; k < 4; ++k) {
          source.push_back(k == alphaAt ? test.alpha : test.channel);
          expected.push_back(k == alphaAt ? test.alpha : premultiplies ? test.premultiplied : test.unpremultiplied);
        }
      const RowKernelSet& kernels = premultiplies  ? alphaAt == 3 ? kPremultiplyLast32f : kPremultiplyFirst32f
                                    : alphaAt == 3 ? kUnpremultiplyLast32f
                                                   : kUnpremultiplyFirst32f;
      const auto result = RunKernel<float>(kernels, source, std::size(cases), source.size());
      for (size_t i = 0; i < source.size(); ++i)
        EXPECT_PRED2(same, result[i], expected[i])
            << "channel " << i % 4 << " of case " << i / 4 << ", " << premultiplies;
    }
}

// ---- Linear light: the working curve against pow, its 8u kernels against the walk through 32f

double SignedPow(float x, float exponent) { return std::copysign(std::pow(std::abs(double{x}), double{exponent}), x); }

TEST(LinearKernels, CurveBothWays) {
  // Blocks of ordinary values, blocks with rare ones, and from there on with signs.
  std::vector<float> source;
  Random random(24);
  while (source.size() < 4096) source.push_back(random.Float(0.01f, 1.5f));
  for (const float rare : {0.0f, 1e-45f, 1e-30f, 3e38f, kInfinity, std::bit_cast<float>(0x7F800001)}) {
    source.push_back(rare);
    while (source.size() % 1023 != 0) source.push_back(random.Float(0.0f, 1.5f));
  }
  source.insert(source.end(), {-0.0f, 1.0f, -1.0f, -1e-30f, -3e38f, -kInfinity, 0.5f, 2.0f});
  while (source.size() < 40000) source.push_back(random.Float(-0.5f, 1.5f));
  while (source.size() < 48000)
    source.push_back(std::ldexp(random.Float(-2.0f, 2.0f), static_cast<int>(random.Int(-60, 40))));
  for (const auto& [kernels, exponent] : {std::pair{&kBgra32fToLinear, 2.4f}, {&kLinearToBgra32f, 1 / 2.4f}}) {
    const auto got = RunKernel<float>(*kernels, source, source.size() / 4, source.size());
    for (size_t i = 0; i < source.size(); ++i) {
      const double expected = i % 4 == 3 ? double{source[i]} : SignedPow(source[i], exponent);
      ASSERT_LE(UlpError(got[i], expected), i % 4 == 3 ? 0 : 1.5) << source[i] << " to " << exponent;
      ASSERT_TRUE(std::isnan(source[i]) || std::signbit(got[i]) == std::signbit(source[i]));
    }
  }
}

// Light to 8u is the curve and the narrowing of 32f, exactly so beside every threshold between two codes, where the
// range of int32 ends, and anywhere else.
TEST(LinearKernels, LightToCodesEqualsTheWalkThroughFloat) {
  std::vector<float> source;
  const auto addAround = [&](double value, int steps, int stride) {
    const int32_t bits = std::bit_cast<int32_t>(static_cast<float>(value));
    for (int i = -steps; i <= steps; ++i) source.push_back(std::bit_cast<float>(bits + i * stride));
  };
  for (int code = 1; code < 256; ++code) {
    const double threshold = std::pow((code - 0.5) / 255, 2.4);
    addAround(threshold, 300, 1);
    addAround(threshold, 300, 1997);  // past the neighbouring thresholds
    addAround(-threshold, 2, 1);
  }
  addAround(std::pow(2147483648.0 / 255, 2.4), 300, 1);
  addAround(std::pow(2147483648.0 / 255, 2.4), 300, 1 << 16);
  addAround(0x1p-23, 20, 1);
  addAround(1.0, 20, 1);
  addAround(20.0, 300, 1 << 17);  // all below 512, from where another form takes over
  addAround(512.0, 300, 1);
  Random random(8);
  for (int i = 0; i < 200000; ++i) source.push_back(i % 2 ? random.Unit() : std::bit_cast<float>(random.Bits32()));
  source.resize(source.size() / 4 * 4);
  const size_t count = source.size() / 4;
  const auto codes = RunKernel<uint8_t>(kLinearToBgra8, source, count, source.size());
  const auto floats = RunKernel<float>(kLinearToBgra32f, source, count, source.size());
  const auto expected = RunKernel<uint8_t>(kNarrow32fTo8u, floats, count, source.size());
  for (size_t i = 0; i < source.size(); ++i)
    ASSERT_EQ(codes[i], expected[i]) << source[i] << ", bits " << std::hex << std::bit_cast<uint32_t>(source[i]);
}

}  // namespace
}  // namespace vexel::testing
