// Colour spaces: their conversions against double precision and each other, matrices, white points, contracts.
#include <typeinfo>

#include <gmock/gmock.h>

#include "color/color_reference.h"
#include "support/Arena.h"
#include "support/Processor.h"
#include "support/Test.h"
#include "support/Ulp.h"
#include "vexel/color_space.h"

namespace vexel::testing {
namespace {

using VX::ColorSpace;
using VX::CSMatrix;

// ---- All conversions, each with its reference ----

struct Operation {
  std::string name;
  std::function<void(const float*, float*, int)> run;
  std::function<Rgb(Rgb, Noise&)> reference;
  float least = -0.4f, most = 1.6f;  // of test values
  int tableSize = 0;                 // values stand in the middle between two entries
};

const Matrix kTo2020{0.627402, 0.329292, 0.043306, 0.069095, 0.919544, 0.011360, 0.016394, 0.088028, 0.895578};
const Matrix kFrom2020{1.6605, -0.587657, -0.07284, -0.124547, 1.1329, -0.008348, -0.018154, -0.100597, 1.11875};
const Matrix kUnity{1, 0, 0, 0, 1, 0, 0, 0, 1};
const Rgb kLuma709{0.2126, 0.7152, 0.0722}, kLuma2020{0.2627, 0.6780, 0.0593};

// The library's own matrices, which are single precision; ColorSpaceMatrices holds them against double precision.
Matrix Elements(const CSMatrix& m) {
  Matrix out;
  std::copy(m[0], m[0] + 9, out.begin());
  return out;
}
Matrix Conversion(const ColorSpace& from, const ColorSpace& to) {
  return Elements(ColorSpace::CalculateConversionMatrix(from, to));
}
Rgb LumaOf(const ColorSpace& space) {
  const float* coeffs = space.LuminanceCoeffs();
  return {coeffs[0], coeffs[1], coeffs[2]};
}

std::function<Rgb(Rgb, Noise&)> Powers(double decode, double encode, Matrix m, bool compress = false, Rgb luma = {}) {
  return [=](Rgb c, Noise& noise) {
    c = Each(c, noise, [=](double v) { return SignedPow(v, decode); });
    if (m != kUnity) c = Times(m, c, noise);
    if (m != kUnity && compress) c = CompressGamut(c, luma, noise);
    return Each(c, noise, [=](double v) { return SignedPow(v, encode); });
  };
}

using Run = std::function<void(const float*, float*, int)>;
Run FromRec709(const ColorSpace& space, bool compress) {
  return [&space, compress](const float* s, float* d, int n) { space.ConvertPixelsFromRec709(s, d, n, compress); };
}
Run ToRec709(const ColorSpace& space, bool compress) {
  return [&space, compress](const float* s, float* d, int n) { space.ConvertPixelsToRec709(s, d, n, compress); };
}

std::vector<Operation> TransferOperations() {
  static const VX::SRGBColorSpace srgb;
  static const VX::Rec2020ColorSpace rec2020;
  static const VX::DCIP3ColorSpace p3d60(VX_IlluminantD60), p3d65(VX_IlluminantD65);
  const ColorSpace& rec709 = ColorSpace::WorkingSpace(VX_WorkingSpaceRec709);
  std::vector<Operation> list;
  const auto both = [&](const std::string& name, const ColorSpace& space, const auto& from, const auto& to) {
    for (const bool compress : {false, true}) {
      const std::string suffix = compress ? " compressed" : "";
      list.push_back({"from Rec.709 to " + name + suffix, FromRec709(space, compress), from(compress)});
      list.push_back({"to Rec.709 from " + name + suffix, ToRec709(space, compress), to(compress)});
    }
  };
  both(
      "Rec.2020", rec2020, [&](bool c) { return Powers(2.4f, 1 / 2.4f, kTo2020, c, kLuma2020); },
      [&](bool c) { return Powers(2.4f, 1 / 2.4f, kFrom2020, c, kLuma709); });
  for (const auto* space : {&p3d60, &p3d65})
    both(
        space == &p3d60 ? "P3 D60" : "P3 D65", *space,
        [&](bool c) { return Powers(2.4f, 1 / 2.6f, Conversion(rec709, *space), c, LumaOf(*space)); },
        [&](bool c) { return Powers(2.6f, 1 / 2.4f, Conversion(*space, rec709), c, kLuma709); });
  static const VX::GammaColorSpace gammas[] = {VX::GammaColorSpace(0.5f),  VX::GammaColorSpace(1 / 2.2f),
                                               VX::GammaColorSpace(1),     VX::GammaColorSpace(0.1f),
                                               VX::GammaColorSpace(0.01f), VX::GammaColorSpace(100)};
  const float exponents[] = {0.5f, 1 / 2.2f, 1, 0.1f, 0.01f, 100};
  for (size_t i = 0; i < std::size(gammas); ++i)
    both(
        "gamma " + std::to_string(exponents[i]), gammas[i], [&](bool) { return Powers(2.4f, exponents[i], kUnity); },
        [&](bool) { return Powers(1 / exponents[i], 1 / 2.4f, kUnity); });
  // The reference's own curve and a pure one, one after the other.
  const auto curves = [](double (*first)(double), double (*second)(double)) {
    return [=](bool) { return [=](Rgb c, Noise& noise) { return Each(Each(c, noise, first), noise, second); }; };
  };
  both("sRGB", srgb, curves([](double v) { return SignedPow(v, 2.4f); }, SrgbEncode),
       curves(SrgbDecode, [](double v) { return SignedPow(v, 1 / 2.4f); }));
  return list;
}

std::vector<Operation> HdrOperations() {
  static const VX::PQColorSpace pq(false, false), pqWhite(false, true), pqP3(true, false);
  static const VX::HLGColorSpace hlg;
  constexpr double kWhite = 0.50807786f;
  const ColorSpace& rec709 = ColorSpace::WorkingSpace(VX_WorkingSpaceRec709);
  const auto encode = [](double v) { return SignedPow(v, 1 / 2.4f); };
  std::vector<Operation> list;
  for (const auto* space : {&pq, &pqWhite, &pqP3}) {
    const double white = space == &pqWhite ? kWhite : 1;
    const std::string name = space == &pqP3 ? "PQ P3" : space == &pqWhite ? "PQ with white" : "PQ";
    const Matrix m = Conversion(rec709, *space), back = Conversion(*space, rec709);
    const auto toSignal = [=](Rgb c, Noise& noise) {
      c = Each(c, noise, [](double v) { return SignedPow(v, 2.4f); });
      c = Times(m, c, noise);
      return Each(c, noise, [&](double v) { return std::copysign(PqCurve::Encode(v, noise) / white, v); });
    };
    list.push_back({"from Rec.709 to " + name, FromRec709(*space, true), toSignal, -0.4f, 3.0f});
    for (const bool compress : {false, true}) {
      const bool table = white == 1 && !compress;
      const auto fromSignal = [=](Rgb c, Noise& noise) {
        c = Each(c, noise, [&](double v) {
          if (table) v = std::floor(std::clamp(v, 0.0, 1.0) * 4095) / 4095;
          return std::copysign(PqCurve::Decode(v * white, noise), v);
        });
        c = Each(Times(back, c, noise), noise, encode);
        return compress ? CompressGamut(c, kLuma709, noise) : c;
      };
      list.push_back({"to Rec.709 from " + name + (compress ? " compressed" : ""), ToRec709(*space, compress),
                      fromSignal, -0.4f, 1.2f, table ? 4096 : 0});
    }
  }
  list.push_back({"from Rec.709 to HLG", FromRec709(hlg, true),
                  [](Rgb c, Noise& noise) {
                    c = Each(c, noise, [](double v) { return SignedPow(v, 2.4f); });
                    c = Times(kTo2020, c, noise);
                    const double luma =
                        noise(HlgCurve::Luma(Each(c, noise, [](double v) { return std::abs(v) * 0.1; })));
                    const double gain = noise(1 / std::max(0.0001, std::pow(luma, 1.0f / 6)));
                    return Each(c, noise, [&](double v) {
                      return std::copysign(HlgCurve::Encode(noise(std::abs(v) * 0.1 * gain), noise), v);
                    });
                  },
                  -0.4f, 2.5f});
  list.push_back({"to Rec.709 from HLG", ToRec709(hlg, true),
                  [=](Rgb c, Noise& noise) {
                    c = Each(c, noise, [](double v) {
                      return HlgCurve::Decode(std::floor(std::clamp(v, 0.0, 1.0) * 2047) / 2047);
                    });
                    const double gain = noise(10 * std::pow(noise(HlgCurve::Luma(c)), 0.2f));
                    c = Each(c, noise, [=](double v) { return v * gain; });
                    return Each(Times(kFrom2020, c, noise), noise, encode);
                  },
                  -0.4f, 1.2f, 2048});
  return list;
}

std::vector<Operation> LinearOperations() {
  static const VX::SRGBColorSpace srgb;
  static const VX::Rec709ColorSpace rec709;
  static const VX::Rec2020ColorSpace rec2020;
  static const VX::DCIP3ColorSpace p3(VX_IlluminantDCI);
  std::vector<Operation> list;
  struct Tone {
    const char* name;
    const ColorSpace& space;
    double gamma;  // 0: sRGB's own curve
  };
  const Tone tones[] = {{"sRGB", srgb, 0}, {"Rec.709", rec709, 2.4f}, {"Rec.2020", rec2020, 2.4f}, {"P3", p3, 2.6f}};
  for (const auto& tone : tones)
    for (const auto& p : {std::array{1.0f, 1.2f, 0.6f}, {4.0f, 1.05f, 0.9f}, {0.3f, 2.0f, 0.25f}}) {
      const auto power = [](double exponent) { return [=](double v) { return SignedPow(v, exponent); }; };
      const float* const white = tone.space.WhitePoint();
      ToneReference curve{SrgbDecode, SrgbEncode, Elements(tone.space.RGBtoXYZ()), Elements(tone.space.XYZtoRGB()),
                          white[0],   white[1]};
      if (tone.gamma != 0) curve.decode = power(tone.gamma), curve.encode = power(1 / tone.gamma);
      const auto run = [&space = tone.space, p](const float* s, float* d, int n) {
        space.CompressPixelsToSDR(s, d, n, p[0], p[1], p[2]);
      };
      const auto reference = [curve, p](Rgb v, Noise& noise) { return curve(v, p[0], p[1], p[2], noise); };
      list.push_back({std::string("tones of ") + tone.name, run, reference, 0, 2.5f});
    }
  list.push_back({"Y'CbCr to RGB", [](const float* s, float* d, int n) { rec2020.ConvertPixelsFromYUVtoRGB(s, d, n); },
                  [](Rgb c, Noise& noise) {  // Y', Cb, Cr where R, G, B stands
                    return Times({1, 0, 1.4746, 1, -0.1645, -0.5713, 1, 1.8814, 0}, c, noise);
                  }});
  list.push_back({"RGB to Y'CbCr", [](const float* s, float* d, int n) { rec2020.ConvertPixelsFromRGBtoYUV(s, d, n); },
                  [](Rgb c, Noise& noise) {
                    return Times({0.2627, 0.6780, 0.0593, -0.1396, -0.3604, 0.5, 0.5, -0.4598, -0.0402}, c, noise);
                  }});
  return list;
}

std::vector<Operation> AllOperations() {
  std::vector<Operation> all = TransferOperations();
  for (const auto& list : {HdrOperations(), LinearOperations()}) all.insert(all.end(), list.begin(), list.end());
  return all;
}

float Draw(const Operation& operation, Random& random) {
  if (operation.tableSize)
    return (static_cast<float>(random.Int(-40, operation.tableSize + 40)) + 0.5f) /
           static_cast<float>(operation.tableSize - 1);
  return random.OneIn(8) ? 0 : random.Float(operation.least, operation.most);
}

TEST(ColorConversions, MatchDoublePrecision) {
  Random random(3);
  constexpr int kCount = 1501;
  for (const Operation& operation : AllOperations()) {
    std::vector<float> in(4 * kCount), out(4 * kCount, 9.0f);
    for (float& v : in) v = Draw(operation, random);
    operation.run(in.data(), out.data(), kCount);
    int failures = 0;
    for (size_t i = 0; i < kCount && failures < 2; ++i) {
      const Rgb pixel{in[4 * i + 2], in[4 * i + 1], in[4 * i]};
      Noise exact(0, 0), noise(i + 1, 0x1p-22);
      const Rgb expected = operation.reference(pixel, exact);
      Rgb spread{};
      for (int run = 0; run < 8; ++run) {
        const Rgb noisy = operation.reference(pixel, noise);
        for (size_t k = 0; k < 3; ++k) spread[k] = std::max(spread[k], std::abs(noisy[k] - expected[k]));
      }
      for (size_t k = 0; k < 3; ++k) {
        const double got = out[4 * i + 2 - k];
        if (std::abs(got - expected[k]) <= 3 * spread[k] + 1e-12) continue;
        if (got == static_cast<float>(expected[k])) continue;  // Beyond the range of float.
        ++failures;
        ADD_FAILURE() << operation.name << ", channel " << k << " of (" << pixel[0] << ", " << pixel[1] << ", "
                      << pixel[2] << "): " << got << " instead of " << expected[k] << " +- " << 3 * spread[k];
      }
      EXPECT_TRUE(SameBits(out[4 * i + 3], in[4 * i + 3])) << operation.name;
    }
  }
}

TEST(ColorConversions, StayInTheirRowsAndGiveTheSameBitsInEveryVariant) {
  for (const Operation& operation : AllOperations())
    for (const bool inPlace : {false, true}) {
      ArenaCase c;
      c.name = operation.name;
      c.destination = VX_PixelFormat::BGRA_4444_32f;
      c.widths = Range(1, 67);
      c.widths.insert(c.widths.end(), {183, 299, 415, 531});  // beyond two blocks of the widest variant
      c.heights = {1, 2};
      c.destinationIsInput = inPlace;
      if (!inPlace) c.sources = {c.destination};
      c.run = [&](const ArenaFrame* sources, const ArenaFrame& to) {
        for (int y = 0; y < to.height; ++y)
          operation.run(reinterpret_cast<const float*>((inPlace ? to : *sources).Row(y)),
                        reinterpret_cast<float*>(to.Row(y)), to.width);
        for (const int none : {0, -5, std::numeric_limits<int>::min()}) operation.run(nullptr, nullptr, none);
        return VX_Success;
      };
      EXPECT_TRUE(RunArena(c));
    }
}

// ---- Numbers of the standards and the edges ----

TEST(ColorCurves, ScalarFunctionsFollowTheStandards) {
  const VX::PQColorSpace pq(false, false), pqWhite(false, true);
  const struct {
    float light, signal;  // SMPTE ST 2084, light in units of 100 cd/m2
  } kPq[] = {{0.001f, 0.0623369f}, {0.01f, 0.1499457f}, {1, 0.5080784f},
             {2.03f, 0.5806888f},  {10, 0.7518271f},    {100, 1}};
  for (const auto& [light, signal] : kPq) {
    EXPECT_NEAR(pq.LinearToEOTF(light), signal, 2e-7) << light;
    EXPECT_NEAR(pq.EOTFToLinear(signal), light, light * 2e-4) << light;
    // Reference white is a factor of the signal, to the last digit.
    EXPECT_EQ(pqWhite.LinearToEOTF(light), pq.LinearToEOTF(light) / 0.50807786f);
    EXPECT_EQ(pqWhite.EOTFToLinear(signal), pq.EOTFToLinear(signal * 0.50807786f));
    const float pixel[4] = {light, 0.5f * light, -light, 1};
    float without[4], with[4];
    pq.ConvertPixelsFromRec709(pixel, without, 1, false);
    pqWhite.ConvertPixelsFromRec709(pixel, with, 1, false);
    for (int k = 0; k < 3; ++k) EXPECT_EQ(with[k], without[k] * 1.9682022f);
  }
  // The curve's exponent would magnify a rounding of its argument almost eightyfold.
  Noise none(0, 0);
  for (float light = 1e-4f; light < 100; light *= 1.0003f)
    ASSERT_NEAR(pq.LinearToEOTF(light), PqCurve::Encode(100.0 * (light * 0.01f), none), 6.5e-8) << light;
  EXPECT_NEAR(pqWhite.LinearToEOTF(1), 1, 1e-5);
  EXPECT_NEAR(pqWhite.EOTFToLinear(1), 1, 2e-4);
  EXPECT_TRUE(std::isnan(pq.LinearToEOTF(-1)));  // No clamping.
  EXPECT_TRUE(std::isnan(pq.EOTFToLinear(1e-6f)) || pq.EOTFToLinear(1e-6f) >= 0);
  EXPECT_TRUE(std::isnan(pq.EOTFToLinear(0)));

  const VX::SRGBColorSpace srgb;
  EXPECT_FLOAT_EQ(srgb.LinearToEOTF(-0.5f), -6.46f);  // Negative values stay on the linear segment.
  EXPECT_FLOAT_EQ(srgb.EOTFToLinear(-0.5f), -0.5f / 12.92f);
  EXPECT_NEAR(srgb.LinearToEOTF(0.5f), 0.735357, 1e-6);
  EXPECT_NEAR(srgb.EOTFToLinear(0.735357f), 0.5, 1e-6);
  EXPECT_FLOAT_EQ(srgb.LinearToEOTF(0.0031308f), 12.92f * 0.0031308f);
  EXPECT_FLOAT_EQ(srgb.EOTFToLinear(0.04045f), 0.04045f / 12.92f);

  const VX::Rec709ColorSpace rec709;
  const VX::DCIP3ColorSpace p3(VX_IlluminantDCI);
  for (const float v : {0.0f, 0.02f, 0.5f, 1.0f, 4.0f}) {
    for (const float sign : {1.0f, -1.0f}) {
      EXPECT_LE(UlpError(rec709.LinearToEOTF(sign * v), SignedPow(sign * v, 1 / 2.4f)), 1.5);
      EXPECT_LE(UlpError(p3.LinearToEOTF(sign * v), SignedPow(sign * v, 1 / 2.6f)), 1.5);
    }
    EXPECT_NEAR(rec709.EOTFToLinear(rec709.LinearToEOTF(v)), v, v * 1e-6);
  }
  const VX::HLGColorSpace hlg;
  EXPECT_EQ(hlg.LinearToEOTF(-2), -2);
  EXPECT_EQ(hlg.EOTFToLinear(3), 3);
}

// BT.2100: 75 % is 203 cd/m2, the peak 1,000 cd/m2, of PQ 10,000; NaN is dark.
TEST(ColorCurves, PixelsFollowTheStandards) {
  const auto light = [](const ColorSpace& space, float value) {
    float pixel[4] = {value, value, value, 1};
    space.ConvertPixelsToRec709(pixel, pixel, 1, false);
    return std::pow(pixel[1], 2.4);
  };
  EXPECT_NEAR(light(VX::PQColorSpace(false, false), 1), 100, 0.03);
  const VX::HLGColorSpace hlg;
  EXPECT_NEAR(light(hlg, 0.75f), 2.03, 0.01);
  EXPECT_NEAR(light(hlg, 1), 10, 1e-3);
  EXPECT_EQ(light(hlg, kNaN), light(hlg, 0));
}

TEST(ColorGamut, CompressionEndsInsideAndKeepsGreys) {
  const VX::Rec2020ColorSpace rec2020;
  Random random(23);
  std::vector<float> pixels = {0, 0, 1, 1, 0, 1, 0, 1, 1, 0, 0, 1, 1, 1, 0, 1, 5, 5, 5, 1};
  for (int i = 0; i < 4000; ++i) pixels.push_back(random.Float(0, 1.5f));
  std::vector<float> out(pixels.size());
  const int count = static_cast<int>(pixels.size() / 4);
  rec2020.ConvertPixelsToRec709(pixels.data(), out.data(), count, true);
  for (size_t i = 0; i < out.size(); ++i)
    if (i % 4 != 3) {
      ASSERT_GE(out[i], 0) << i / 4;
      ASSERT_LE(out[i], 1) << i / 4;
    }
  EXPECT_EQ(out[2], 1);  // The largest channel of a saturated red.
  EXPECT_THAT(std::vector<float>(out.begin() + 16, out.begin() + 20),
              ::testing::Each(::testing::FloatNear(1, 1e-5f)));  // A grey above 1.

  // With the identity nothing is compressed, nor without luma to move toward.
  float pixel[4] = {-0.5f, 3, 0.5f, 1};
  VX::PureGammaToPureGamma(pixel, pixel, 1, 1, 1, CSMatrix(), true, nullptr);
  EXPECT_THAT(pixel, ::testing::ElementsAre(-0.5f, 3, 0.5f, 1));
  CSMatrix nearly;
  nearly[0][0] = std::nextafter(1.0f, 2.0f);
  float stuck[4] = {-1, -1, -1, 1};
  const float third[3] = {0.25f, 0.5f, 0.25f};
  VX::PureGammaToPureGamma(stuck, stuck, 1, 1, 1, CSMatrix(1, 0, 0, 0, 1, 0, 0, 1, 0), true, third);
  EXPECT_THAT(stuck, ::testing::ElementsAre(-1, -1, -1, 1));
  float toBlack[4] = {-1, -2, 0.5f, 1};
  VX::PureGammaToPureGamma(toBlack, toBlack, 1, 1, 1, nearly, true, nullptr);
  EXPECT_THAT(toBlack, ::testing::ElementsAre(0, 0, 0, 1));
}

TEST(ColorSpaces, WithoutAToneCurveLeaveTheDestination) {
  const VX::GammaColorSpace gamma(0.5f);
  const VX::PQColorSpace pq(true, true);
  const VX::HLGColorSpace hlg;
  const float in[4] = {1, 2, 3, 4};
  float out[4] = {9, 9, 9, 9};
  for (const ColorSpace* space : {static_cast<const ColorSpace*>(&gamma), static_cast<const ColorSpace*>(&pq),
                                  static_cast<const ColorSpace*>(&hlg)})
    space->CompressPixelsToSDR(in, out, 1, 1, 1.2f, 0.6f);
  EXPECT_THAT(out, ::testing::Each(9));
  const VX::Rec709ColorSpace rec709;
  rec709.ConvertPixelsFromRec709(in, out, 1, true);
  EXPECT_THAT(out, ::testing::ElementsAre(1, 2, 3, 4));
  rec709.ConvertPixelsToRec709(out, out, 1, true);
  EXPECT_THAT(out, ::testing::ElementsAre(1, 2, 3, 4));
  const float* luma = pq.LuminanceCoeffs();
  const Matrix xyz = RgbToXyz(pq.Primaries(), pq.WhitePoint());
  for (size_t i = 0; i < 3; ++i) EXPECT_NEAR(luma[i], xyz[3 + i], 1e-6);
}

// ---- P010 and clamping ----

TEST(ColorP010, DecodesAllWidthsAndCodes) {
  const VX::Rec2020ColorSpace rec2020;
  Random random(7);
  const uint16_t edges[] = {0, 4095, 4096, 4097, 32768, 60160, 60161, 61440, 65472, 65535};
  for (int width = 0; width <= 67; ++width) {
    const size_t w = static_cast<size_t>(width);
    std::vector<uint16_t> codes(3 * w + 1);
    for (uint16_t& code : codes)
      code = random.OneIn(3) ? edges[random.Next() % std::size(edges)] : static_cast<uint16_t>(random.Bits32());
    const uint16_t *luma[2] = {codes.data(), codes.data() + w}, *chroma = codes.data() + 2 * w;
    std::vector<float> plain;
    ForEachVariant([&](int v) {
      std::vector<float> out(8 * w + 8, 77.0f);
      rec2020.Convert2RowsFromP010toRGB(luma[0], luma[1], chroma, out.data(), out.data() + 4 * w + 4, width);
      if (v == 0) plain = out;
      ASSERT_EQ(std::memcmp(out.data(), plain.data(), out.size() * sizeof(float)), 0)
          << "variant " << v << " width " << width;
    });
    for (size_t row = 0; row < 2; ++row) {
      const float* out = plain.data() + row * (4 * w + 4);
      EXPECT_EQ(out[4 * w], 77);
      for (size_t x = 0; x < w; ++x) {
        const bool last = width % 2 && x + 1 == w;  // full range, not clamped
        const double code = luma[row][x], u = chroma[x & ~size_t{1}], v = chroma[(x & ~size_t{1}) + 1];
        const double y = last ? code / 65472 : std::clamp((code - 4096) / 56065, 0.0, 1.0);
        const double cb = last ? u / 65472 - 0.5 : std::clamp((u - 32768) / 57345, -0.5, 0.5);
        const double cr = last ? v / 65472 - 0.5 : std::clamp((v - 32768) / 57345, -0.5, 0.5);
        ASSERT_NEAR(out[4 * x], y + 1.8814 * cb, 5e-7) << x << " of " << width;
        ASSERT_NEAR(out[4 * x + 1], y - 0.1645 * cb - 0.5713 * cr, 5e-7) << x << " of " << width;
        ASSERT_NEAR(out[4 * x + 2], y + 1.4746 * cr, 5e-7) << x << " of " << width;
        ASSERT_EQ(out[4 * x + 3], 1);
      }
    }
  }
  rec2020.Convert2RowsFromP010toRGB(nullptr, nullptr, nullptr, nullptr, nullptr, -1);
}

TEST(ColorClamp, StaysOneRowBehind) {
  Random random(9);
  for (const int rowBytes : {-8, 0, 3, 4, 30, 100, 128, 132, 260})
    for (int rows = -1; rows <= 5; ++rows)
      ForEachVariant([&](int v) {
        for (const auto& [lo, hi] : {std::pair{0.0f, 1.0f}, {0.6f, 0.2f}, {-kInfinity, 0.5f}}) {
          std::vector<uint8_t> in(2048), out(2048, 0x55);
          for (size_t i = 0; i + 4 <= in.size(); i += 4) {
            const float value = random.OneIn(6) ? (random.OneIn(2) ? kNaN : -0.0f) : random.Float(-1, 2);
            std::memcpy(in.data() + i, &value, 4);
          }
          std::vector<uint8_t> expected = out;
          for (int pass = 0; pass < rows; ++pass)
            for (int i = 0; i + 4 <= rowBytes; i += 4) {
              const int at = std::max(pass - 1, 0) * rowBytes + i;
              float value;
              std::memcpy(&value, in.data() + at, 4);
              value = value > lo ? std::min(value, hi) : lo;
              std::memcpy(expected.data() + at, &value, 4);
            }
          VX::ClampFloatPixels(reinterpret_cast<const float*>(in.data()), reinterpret_cast<float*>(out.data()), rows,
                               rowBytes, lo, hi);
          ASSERT_EQ(out, expected) << "variant " << v << ", " << rows << " rows of " << rowBytes << " bytes";
        }
      });
}

// ---- Matrices, white points, adaptation and the classes' contract of layout and slots

CSMatrix FromArray(const Matrix& m) {
  CSMatrix out;
  for (int i = 0; i < 9; ++i) out[i / 3][i % 3] = static_cast<float>(m[static_cast<size_t>(i)]);
  return out;
}

void ExpectNear(const CSMatrix& got, const Matrix& expected, double tolerance) {
  for (size_t i = 0; i < 9; ++i)
    EXPECT_NEAR(got[static_cast<int>(i / 3)][i % 3], expected[i], tolerance) << "element " << i;
}

TEST(ColorMatrix, ComparesExactly) {
  EXPECT_TRUE(CSMatrix().IsUnity());
  for (int i = 0; i < 9; ++i) {
    CSMatrix m;
    m[i / 3][i % 3] = std::nextafter(m[i / 3][i % 3], 2.0f);
    EXPECT_FALSE(m.IsUnity()) << i;
    EXPECT_FALSE(m == CSMatrix()) << i;
    m[i / 3][i % 3] = kNaN;
    EXPECT_FALSE(m == m) << i;
  }
}

TEST(ColorMatrix, MultipliesTransposesAndTransforms) {
  const CSMatrix a(1, 2, 3, 4, 5, 6, 7, 8, 10), b(2, -1, 0, 0.5f, 3, 1, -2, 4, 6);
  ExpectNear(a * b, {-3, 17, 20, -1.5, 35, 41, -2, 57, 68}, 0);
  EXPECT_TRUE(a.Transposed() == CSMatrix(1, 4, 7, 2, 5, 8, 3, 6, 10));
  float v[3] = {1, -1, 2};
  a.Transform(v);
  EXPECT_THAT(v, ::testing::ElementsAre(5, 11, 19));
}

TEST(ColorMatrix, InvertsUnlessTheDeterminantIsBelowTheLimit) {
  bool ok = false;
  const Matrix m{3, 0.5, -1, 2, 4, 0.25, -0.5, 1, 2};
  ExpectNear(FromArray(m).Inverted(&ok), Inverse(m), 1e-6);
  EXPECT_TRUE(ok);
  for (const auto& [determinant, regular] :
       {std::pair{5e-7f, false}, {-5e-7f, false}, {1e-6f, true}, {-1.0f, true}, {0.0f, false}}) {
    ok = !regular;
    const CSMatrix diagonal(1, 0, 0, 0, 1, 0, 0, 0, determinant);
    EXPECT_EQ(diagonal.Inverted(&ok).IsUnity(), !regular) << determinant;
    EXPECT_EQ(ok, regular) << determinant;
    EXPECT_EQ(diagonal.Inverted().IsUnity(), !regular);
  }
  EXPECT_FALSE(CSMatrix(kNaN, 0, 0, 0, 1, 0, 0, 0, 1).Inverted(&ok).IsUnity());  // NaN is not below the limit.
}

TEST(ColorSpaceMatrices, FollowThePrimaries) {
  const float odd[6] = {0.7347f, 0.2653f, 0.1596f, 0.8404f, 0.0366f, 0.0001f};
  const VX::CustomColorSpace wide(odd, 6, ColorSpace::Illuminant(VX_IlluminantD50), 2);
  std::vector<const ColorSpace*> spaces{&wide};
  for (int i = 0; i < 7; ++i) spaces.push_back(&ColorSpace::WorkingSpace(static_cast<VX_WorkingSpace>(i)));
  for (const ColorSpace* space : spaces) {
    const Matrix expected = RgbToXyz(space->Primaries(), space->WhitePoint());
    // A few roundings of products of numbers up to 12 (the blue column of wide primaries before scaling).
    ExpectNear(space->RGBtoXYZ(), expected, 5e-6);
    ExpectNear(space->XYZtoRGB(), Inverse(expected), 2e-5);
    EXPECT_FALSE((space->RGBtoXYZ() * space->XYZtoRGB()).IsUnity() && space == &wide);
    for (const ColorSpace* other : spaces) {
      const Matrix adapt = Bradford(space->WhitePoint(), other->WhitePoint());
      const Matrix conversion =
          Product(Inverse(RgbToXyz(other->Primaries(), other->WhitePoint())), Product(adapt, expected));
      ExpectNear(ColorSpace::CalculateConversionMatrix(*space, *other), conversion, 3e-5);
    }
  }
  const VX::SRGBColorSpace srgb;
  const ColorSpace& rec2020 = ColorSpace::WorkingSpace(VX_WorkingSpaceRec2020);
  for (const auto& [space, luma] :
       {std::pair<const ColorSpace*, Rgb>{&srgb, {0.2126, 0.7152, 0.0722}}, {&rec2020, {0.2627, 0.6780, 0.0593}}})
    for (size_t i = 0; i < 3; ++i) EXPECT_NEAR(space->RGBtoXYZ()[1][i], luma[i], 5e-5);
}

TEST(ColorSpaceMatrices, Illuminants) {
  constexpr float kWhites[6][2] = {{0.34567f, 0.3585f}, {0.33242f, 0.34743f}, {0.32168f, 0.33767f},
                                   {0.314f, 0.351f},    {0.31271f, 0.32902f}, {0.29902f, 0.31485f}};
  for (int i = 0; i < 6; ++i)
    for (int k = 0; k < 2; ++k) EXPECT_EQ(ColorSpace::Illuminant(static_cast<VX_Illuminant>(i))[k], kWhites[i][k]);
}

TEST(ColorSpaceMatrices, AdaptByBradford) {
  const float* d65 = ColorSpace::Illuminant(VX_IlluminantD65);
  const float* d50 = ColorSpace::Illuminant(VX_IlluminantD50);
  EXPECT_TRUE(ColorSpace::CalculateAdaptationMatrix(d65, d65).IsUnity());
  // The published matrix, for whites given to four digits.
  ExpectNear(ColorSpace::CalculateAdaptationMatrix(d65, d50),
             {1.0478112, 0.0228866, -0.0501270, 0.0295424, 0.9904844, -0.0170491, -0.0092345, 0.0150436, 0.7521316},
             3e-4);
  ExpectNear(ColorSpace::CalculateAdaptationMatrix(d65, d50), Bradford(d65, d50), 1e-6);
  // Three floats are compared.
  const float same[3] = {0.31271f, 0.32902f, 1}, third[3] = {0.31271f, 0.32902f, 2};
  EXPECT_FALSE(ColorSpace::CalculateAdaptationMatrix(same, third).IsUnity());
  const float near[3] = {0.31271f + 5e-7f, 0.32902f - 5e-7f, 1};
  EXPECT_TRUE(ColorSpace::CalculateAdaptationMatrix(same, near).IsUnity());
}

TEST(ColorSpaceMatrices, SingularPrimariesGiveIdentityInverses) {
  const float flat[6] = {0.3f, 0.3f, 0.3f, 0.3f, 0.3f, 0.3f};
  const VX::CustomColorSpace space(flat, 6, ColorSpace::Illuminant(VX_IlluminantD65), 2);
  EXPECT_TRUE(space.XYZtoRGB().IsUnity());
  const VX::PQColorSpace zeros(nullptr, true);  // No primaries: everything is NaN, nothing crashes.
  float pixel[4] = {0.5f, 0.5f, 0.5f, 1};
  zeros.ConvertPixelsFromRec709(pixel, pixel, 1, true);
  zeros.ConvertPixelsToRec709(pixel, pixel, 1, true);
  EXPECT_EQ(pixel[3], 1);
}

TEST(ColorSpaces, WorkingSpacesAreSharedAndTyped) {
  const auto is = [](int value, const std::type_info& type) {
    const ColorSpace& space = ColorSpace::WorkingSpace(static_cast<VX_WorkingSpace>(value));
    EXPECT_EQ(&space, &ColorSpace::WorkingSpace(static_cast<VX_WorkingSpace>(value)));
    return typeid(space) == type;
  };
  const std::type_info* const types[] = {&typeid(VX::Rec709ColorSpace), &typeid(VX::Rec2020ColorSpace),
                                         &typeid(VX::DCIP3ColorSpace),  &typeid(VX::DCIP3ColorSpace),
                                         &typeid(VX::PQColorSpace),     &typeid(VX::PQColorSpace)};
  for (int i = 0; i < 6; ++i) EXPECT_TRUE(is(i, *types[i])) << i;
  for (const int other : {6, 17, -1, 1 << 30}) EXPECT_TRUE(is(other, typeid(VX::SRGBColorSpace)));
  EXPECT_EQ(ColorSpace::WorkingSpace(VX_WorkingSpaceDCIP3D60).WhitePoint()[0], 0.32168f);
  EXPECT_NEAR(ColorSpace::WorkingSpace(VX_WorkingSpacePQRec2020).LinearToEOTF(1), 1, 1e-5);
  EXPECT_EQ(ColorSpace::WorkingSpace(VX_WorkingSpacePQDCIP3).Primaries()[0], 0.68f);
}

TEST(ColorSpaces, CustomSpacesCarryMatricesOnly) {
  const float primaries[6] = {0.6f, 0.3f, 0.3f, 0.6f, 0.1f, 0.1f}, white[2] = {0.33f, 0.33f};
  const VX::CustomColorSpace space(primaries, 6, white, 2);
  EXPECT_EQ(std::memcmp(space.Primaries(), primaries, sizeof primaries), 0);
  EXPECT_EQ(std::memcmp(space.WhitePoint(), white, sizeof white), 0);
  EXPECT_EQ(space.LuminanceCoeffs(), nullptr);
  EXPECT_EQ(space.LinearToEOTF(-3), -3);
  EXPECT_EQ(space.EOTFToLinear(7), 7);
  const float in[4] = {1, 2, 3, 4};
  float out[4] = {9, 9, 9, 9};
  space.ConvertPixelsFromRec709(in, out, 1, true);
  space.ConvertPixelsToRec709(in, out, 1, true);
  space.CompressPixelsToSDR(in, out, 1, 1, 1, 0.5f);
  EXPECT_THAT(out, ::testing::Each(9));
  // Refused arguments leave an object that may be copied and destroyed.
  for (const auto& [p, n, w, m] : {std::tuple<const float*, int, const float*, int>{nullptr, 6, white, 2},
                                   {primaries, 6, nullptr, 2},
                                   {primaries, 5, white, 2},
                                   {primaries, 6, white, 3}}) {
    const VX::CustomColorSpace refused(p, static_cast<uint8_t>(n), w, static_cast<uint8_t>(m));
    EXPECT_EQ(refused.LuminanceCoeffs(), nullptr);
  }
}

// The order of slots and members is a contract with hosts that were built against it.
bool Ascend(std::initializer_list<const void*> members) { return std::is_sorted(members.begin(), members.end()); }

struct PqLayout : VX::PQColorSpace {
  using PQColorSpace::PQColorSpace;
  bool MembersInOrder() const {
    return Ascend({&mRGBtoXYZ, &mXYZtoRGB, &mMatricesValid, mPrimaries, mLumaCoeffs, &mRefWhite, &mRefWhiteSet, &mDCIP3,
                   &mFromRec709, &mFromRec709Valid, &mToRec709, &mToRec709Valid, this + 1});
  }
};
struct P3Layout : VX::DCIP3ColorSpace {
  using DCIP3ColorSpace::DCIP3ColorSpace;
  using DCIP3ColorSpace::mIlluminant;
  bool MembersInOrder() const {
    return Ascend({&mMatricesValid, &mGamma, &mIlluminant, mLumaCoeffs, &mFromRec709, &mToRec709, &mFromRec709Valid,
                   &mToRec709Valid, this + 1});
  }
};

// The place in the table of virtual functions, of which the Itanium C++ ABI stores the offset and 1.
template <class Function, class Space>
size_t SlotOf(Function Space::*function) {
  size_t word;
  std::memcpy(&word, &function, sizeof word);
  return word / sizeof(void*);
}

TEST(ColorSpaces, KeepTheirLayout) {
  EXPECT_TRUE(PqLayout(false, false).MembersInOrder());
  EXPECT_TRUE(P3Layout(VX_IlluminantD65).MembersInOrder());
  EXPECT_EQ(sizeof(CSMatrix), 36u);
  EXPECT_EQ(sizeof(VX::SRGBColorSpace), 88u);
  EXPECT_EQ(sizeof(VX::HLGColorSpace), sizeof(VX::GammaColorSpace));
  static_assert(std::is_abstract_v<ColorSpace> && !std::has_virtual_destructor_v<ColorSpace>);
#if defined(__GNUC__)  // Itanium C++ ABI
  using C = VX::Rec2020ColorSpace;
  EXPECT_THAT((std::vector{SlotOf(&C::Primaries), SlotOf(&C::WhitePoint), SlotOf(&C::LuminanceCoeffs),
                           SlotOf(&C::LinearToEOTF), SlotOf(&C::EOTFToLinear), SlotOf(&C::ConvertPixelsFromRec709),
                           SlotOf(&C::ConvertPixelsToRec709), SlotOf(&C::CompressPixelsToSDR),
                           SlotOf(&C::ConvertPixelsFromYUVtoRGB), SlotOf(&C::ConvertPixelsFromRGBtoYUV)}),
              ::testing::ElementsAre(0, 1, 2, 3, 4, 5, 6, 7, 8, 9));
#endif
}

TEST(ColorSpaces, CopiesCarryTheirCaches) {
  VX::DCIP3ColorSpace p3(VX_IlluminantD60);
  const VX::PQColorSpace pq(true, true);
  const float in[4] = {0.2f, 0.5f, 0.9f, 1};
  float expected[4], got[4];
  p3.ConvertPixelsFromRec709(in, expected, 1, false);
  VX::DCIP3ColorSpace copy(p3), moved(std::move(p3)), assigned(VX_IlluminantD65);
  assigned = copy;
  for (const auto* space : {&copy, &moved, &assigned}) {
    space->ConvertPixelsFromRec709(in, got, 1, false);
    EXPECT_EQ(std::memcmp(got, expected, sizeof got), 0);
  }
  const P3Layout d60(VX_IlluminantD60);
  P3Layout other(VX_IlluminantD65);
  other = d60;
  EXPECT_EQ(other.mIlluminant, VX_IlluminantD60);
  pq.ConvertPixelsToRec709(in, expected, 1, false);
  const VX::PQColorSpace pqCopy(pq);
  pqCopy.ConvertPixelsToRec709(in, got, 1, false);
  EXPECT_EQ(std::memcmp(got, expected, sizeof got), 0);
  EXPECT_EQ(std::memcmp(pqCopy.LuminanceCoeffs(), pq.LuminanceCoeffs(), 12), 0);
}

}  // namespace
}  // namespace vexel::testing
