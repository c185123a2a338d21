// Colour-space conversions beside zimg and OpenColorIO, and the power function beside the C library and SLEEF. The
// largest error of a contender against double precision stands in its name, in units of signal (powers: ulp).
#include <algorithm>
#include <array>
#include <cmath>
#include <cstdio>
#include <functional>
#include <memory>
#include <string>
#include <vector>

#include "color/PixelKernels.h"
#include "support/Bench.h"
#include "vexel/color_space.h"

#ifdef VEXEL_PEER_ZIMG
#include <zimg.h>
#endif
#ifdef VEXEL_PEER_OPENCOLORIO
#include <OpenColorIO/OpenColorIO.h>
namespace OCIO = OCIO_NAMESPACE;
#endif
#if defined(VEXEL_PEER_SLEEF) && defined(__x86_64__)
#include <immintrin.h>
// Its header declares these only where the whole file is compiled for AVX.
extern "C" __attribute__((target("avx2"))) __m256 Sleef_cinz_powf8_u10avx(__m256, __m256);
extern "C" __attribute__((target("avx2"))) __m256 Sleef_finz_powf8_u10avx2(__m256, __m256);
#endif

namespace {

using vexel::bench::BenchCase;
using vexel::bench::Memory;

constexpr size_t kPixels = 1 << 20;
constexpr size_t kChecked = 1 << 14;

using Rgb = std::array<double, 3>;
using Reference = std::function<Rgb(Rgb)>;

std::string WithError(const std::string& name, double error) {
  char text[64];
  std::snprintf(text, sizeof text, "%s (error %.1e)", name.c_str(), error);
  return text;
}

// ---- References in double precision ----

double Power(double v, double y) { return std::copysign(std::pow(std::abs(v), y), v); }

Rgb Each(const Rgb& c, const std::function<double(double)>& f) { return {f(c[0]), f(c[1]), f(c[2])}; }

Rgb Times(const std::array<double, 9>& m, const Rgb& c) {
  return {m[0] * c[0] + m[1] * c[1] + m[2] * c[2], m[3] * c[0] + m[4] * c[1] + m[5] * c[2],
          m[6] * c[0] + m[7] * c[1] + m[8] * c[2]};
}

double ToPq(double light) {
  const double y = std::pow(std::abs(light) * 0.01, 0.1593017578125);
  return std::pow((0.8359375 + 18.8515625 * y) / (1 + 18.6875 * y), 78.84375);
}

double FromPq(double signal) {
  const double e = std::pow(std::abs(signal), 1 / 78.84375);
  return 100 * std::pow(std::max(0.0, (e - 0.8359375) / (18.8515625 - 18.6875 * e)), 1 / 0.1593017578125);
}

double ToSrgb(double v) { return v > 0.0031308 ? 1.055 * std::pow(v, 1 / 2.4) - 0.055 : 12.92 * v; }

std::array<double, 9> Elements(const VX::CSMatrix& m) {
  std::array<double, 9> result;
  std::copy(m[0], m[0] + 9, result.begin());
  return result;
}

// ---- One conversion with all who can do it ----

#ifdef VEXEL_PEER_ZIMG
constexpr int kPrimaries2020 = ZIMG_PRIMARIES_BT2020;
#else
constexpr int kPrimaries2020 = 9;
#endif

struct Conversion {
  const char* name;
  std::function<void(const float*, float*)> ours;
  std::function<Rgb(Rgb, const std::array<double, 9>&)> reference;  // of the matrix between linear lights
  std::array<double, 9> ourMatrix;
  int fromTransfer, fromPrimaries, toTransfer, toPrimaries;  // zimg
};

// In units of signal, of large signals relative. Only pixels inside the destination's gamut count: contenders disagree
// about negative light.
double LargestError(const Conversion& conversion, const std::array<double, 9>& matrix, const float* src,
                    const std::function<double(size_t, int)>& result) {
  double largest = 0;
  for (size_t i = 0; i < kChecked; ++i) {
    const Rgb expected = conversion.reference({src[4 * i + 2], src[4 * i + 1], src[4 * i]}, matrix);
    if (*std::min_element(expected.begin(), expected.end()) < 0.01) continue;
    for (int k = 0; k < 3; ++k)
      largest = std::max(largest, std::abs(expected[k] - result(i, k)) / std::max(1.0, expected[k]));
  }
  return largest;
}

// From primaries under the peers' white, which has one digit less than ours.
std::array<double, 9> IdealMatrix(int from, int to) {
  const float white[2] = {0.3127f, 0.3290f};
  const auto space = [&](int primaries) {
    const bool wide = primaries == kPrimaries2020;
    const auto& like = VX::ColorSpace::WorkingSpace(wide ? VX_WorkingSpaceRec2020 : VX_WorkingSpaceRec709);
    return VX::CustomColorSpace(like.Primaries(), 6, white, 2);
  };
  const VX::CustomColorSpace source = space(from), destination = space(to);
  return Elements(destination.XYZtoRGB() * source.RGBtoXYZ());
}

#ifdef VEXEL_PEER_ZIMG
struct ZimgGraph {
  zimg_filter_graph* graph = nullptr;
  std::vector<float> planes[2];
  std::unique_ptr<Memory> scratch;
  static constexpr unsigned kWidth = 1024, kHeight = kPixels / 1024;

  ZimgGraph(const Conversion& c, const float* src, bool approximate) {
    zimg_image_format formats[2];
    zimg_graph_builder_params params;
    zimg_graph_builder_params_default(&params, ZIMG_API_VERSION);
    params.nominal_peak_luminance = 100;
    params.allow_approximate_gamma = approximate;
    params.cpu_type = ZIMG_CPU_AUTO_64B;
    for (int i = 0; i < 2; ++i) {
      zimg_image_format_default(&formats[i], ZIMG_API_VERSION);
      formats[i].width = kWidth;
      formats[i].height = kHeight;
      formats[i].pixel_type = ZIMG_PIXEL_FLOAT;
      formats[i].color_family = ZIMG_COLOR_RGB;
      formats[i].matrix_coefficients = ZIMG_MATRIX_RGB;
      formats[i].pixel_range = ZIMG_RANGE_FULL;
      formats[i].depth = 32;
      formats[i].transfer_characteristics =
          static_cast<zimg_transfer_characteristics_e>(i ? c.toTransfer : c.fromTransfer);
      formats[i].color_primaries = static_cast<zimg_color_primaries_e>(i ? c.toPrimaries : c.fromPrimaries);
      planes[i].resize(kPixels * 3 + 16);
    }
    graph = zimg_filter_graph_build(&formats[0], &formats[1], &params);
    if (!graph) return;
    size_t bytes = 0;
    zimg_filter_graph_get_tmp_size(graph, &bytes);
    scratch = std::make_unique<Memory>(bytes);
    for (size_t i = 0; i < kPixels; ++i)
      for (int k = 0; k < 3; ++k) Plane(0, k)[i] = src[4 * i + 2 - k];
  }
  ~ZimgGraph() { zimg_filter_graph_free(graph); }
  float* Plane(int i, int k) {
    auto* base = reinterpret_cast<float*>((reinterpret_cast<uintptr_t>(planes[i].data()) + 63) & ~uintptr_t{63});
    return base + static_cast<size_t>(k) * kPixels;
  }
  void Run() {
    zimg_image_buffer_const from{};
    zimg_image_buffer to{};
    from.version = to.version = ZIMG_API_VERSION;
    for (int k = 0; k < 3; ++k) {
      from.plane[k] = {Plane(0, k), kWidth * sizeof(float), ZIMG_BUFFER_MAX};
      to.plane[k] = {Plane(1, k), kWidth * sizeof(float), ZIMG_BUFFER_MAX};
    }
    zimg_filter_graph_process(graph, &from, &to, scratch->data(), nullptr, nullptr, nullptr, nullptr);
  }
};
#endif

#ifdef VEXEL_PEER_OPENCOLORIO
OCIO::ConstCPUProcessorRcPtr OcioProcessor(const Conversion& c) {
  auto group = OCIO::GroupTransform::Create();
  const auto exponent = [&](double y) {
    auto transform = OCIO::ExponentTransform::Create();
    const double values[4] = {y, y, y, 1};
    transform->setValue(values);
    group->appendTransform(transform);
  };
  const auto matrix = [&] {
    auto transform = OCIO::MatrixTransform::Create();
    const auto& m = c.ourMatrix;
    const double values[16] = {m[0], m[1], m[2], 0, m[3], m[4], m[5], 0, m[6], m[7], m[8], 0, 0, 0, 0, 1};
    transform->setMatrix(values);
    group->appendTransform(transform);
  };
  const auto curve = [&](const char* style) {
    auto transform = OCIO::BuiltinTransform::Create();
    transform->setStyle(style);
    group->appendTransform(transform);
  };
  const std::string name = c.name;
  if (name == "Rec.709 to Rec.2020") {
    exponent(2.4), matrix(), exponent(1 / 2.4);
  } else if (name == "Rec.709 to sRGB") {
    exponent(2.4);
    auto transform = OCIO::ExponentWithLinearTransform::Create();
    const double gamma[4] = {2.4, 2.4, 2.4, 1}, offset[4] = {0.055, 0.055, 0.055, 0};
    transform->setGamma(gamma);
    transform->setOffset(offset);
    transform->setDirection(OCIO::TRANSFORM_DIR_INVERSE);
    group->appendTransform(transform);
  } else if (name == "Rec.709 to PQ") {
    exponent(2.4), matrix(), curve("CURVE - LINEAR_to_ST-2084");
  } else if (name == "PQ to Rec.709" || name == "PQ to Rec.709, computed") {
    curve("CURVE - ST-2084_to_LINEAR"), matrix(), exponent(1 / 2.4);
  } else {
    return {};
  }
  try {
    return OCIO::Config::CreateRaw()->getProcessor(group)->getOptimizedCPUProcessor(OCIO::OPTIMIZATION_LOSSLESS);
  } catch (const OCIO::Exception&) {
    return {};
  }
}
#endif

void ConversionCase(const Conversion& c) {
  auto src = std::make_shared<Memory>(kPixels * 16), dst = std::make_shared<Memory>(kPixels * 16);
  src->FillFloats();
  const auto* from = reinterpret_cast<const float*>(src->data());
  auto* to = reinterpret_cast<float*>(dst->data());
  BenchCase report(c.name, kPixels);
  const auto interleaved = [to](size_t i, int k) { return static_cast<double>(to[4 * i + 2 - k]); };
  c.ours(from, to);
  std::printf("- %s: %.1e\n", c.name, LargestError(c, c.ourMatrix, from, interleaved));
  report.Add("vexel", [=, ours = c.ours] { (void)src, (void)dst, ours(from, to); });
  report.AddFloor(kPixels * 16, kPixels * 16);
#ifdef VEXEL_PEER_ZIMG
  if (c.fromTransfer != 0)
    for (const bool approximate : {false, true}) {
      auto graph = std::make_shared<ZimgGraph>(c, from, approximate);
      if (!graph->graph) continue;
      graph->Run();
      const double error = LargestError(c, IdealMatrix(c.fromPrimaries, c.toPrimaries), from,
                                        [&](size_t i, int k) { return static_cast<double>(graph->Plane(1, k)[i]); });
      report.Add(WithError(approximate ? "zimg approximate" : "zimg", error), [graph] { graph->Run(); });
    }
#endif
#ifdef VEXEL_PEER_OPENCOLORIO
  if (auto processor = OcioProcessor(c)) {
    const auto run = [=] {
      OCIO::PackedImageDesc in(const_cast<float*>(from), 1024, kPixels / 1024, OCIO::CHANNEL_ORDERING_BGRA);
      OCIO::PackedImageDesc out(to, 1024, kPixels / 1024, OCIO::CHANNEL_ORDERING_BGRA);
      processor->apply(in, out);
    };
    run();
    report.Add(WithError("OpenColorIO", LargestError(c, c.ourMatrix, from, interleaved)), run);
  }
#endif
}

void ConversionCases() {
#ifdef VEXEL_PEER_ZIMG
  constexpr int k709 = ZIMG_TRANSFER_BT709, kPq = ZIMG_TRANSFER_ST2084, kHlg = ZIMG_TRANSFER_ARIB_B67,
                kSrgb = ZIMG_TRANSFER_IEC_61966_2_1, kP709 = ZIMG_PRIMARIES_BT709, kP2020 = ZIMG_PRIMARIES_BT2020;
#else
  constexpr int k709 = 0, kPq = 0, kHlg = 0, kSrgb = 0, kP709 = 0, kP2020 = 0;
#endif
  static const VX::SRGBColorSpace srgb;
  static const VX::PQColorSpace pq(false, false), pqWithWhite(false, true);
  static const VX::HLGColorSpace hlg;
  const auto& rec709 = VX::ColorSpace::WorkingSpace(VX_WorkingSpaceRec709);
  const auto& rec2020 = VX::ColorSpace::WorkingSpace(VX_WorkingSpaceRec2020);
  const auto from = [](const VX::ColorSpace& space, bool compress = false) {
    return [&space, compress](const float* s, float* d) { space.ConvertPixelsFromRec709(s, d, kPixels, compress); };
  };
  const auto to = [](const VX::ColorSpace& space, bool compress = false) {
    return [&space, compress](const float* s, float* d) { space.ConvertPixelsToRec709(s, d, kPixels, compress); };
  };
  using Matrix = std::array<double, 9>;
  const Matrix wide{0.627402f, 0.329292f, 0.043306f, 0.069095f, 0.919544f, 0.011360f, 0.016394f, 0.088028f, 0.895578f};
  const Matrix narrow{1.6605f,    -0.587657f, -0.07284f,  -0.124547f, 1.1329f,
                      -0.008348f, -0.018154f, -0.100597f, 1.11875f};
  const auto decode = [](double v) { return Power(v, 2.4); };
  const auto encode = [](double v) { return Power(v, 1 / 2.4); };
  const auto gamma = [=](Rgb c, const Matrix& m) { return Each(Times(m, Each(c, decode)), encode); };
  const auto pqOut = [=](Rgb c, const Matrix& m) { return Each(Times(m, Each(c, decode)), ToPq); };
  const auto pqIn = [=](Rgb c, const Matrix& m) { return Each(Times(m, Each(c, FromPq)), encode); };
  const auto srgbOut = [=](Rgb c, const Matrix&) { return Each(Each(c, decode), ToSrgb); };
  const auto luma = [](const Rgb& c) { return 0.2627 * c[0] + 0.678 * c[1] + 0.0593 * c[2]; };
  const auto hlgOut = [=](Rgb c, const Matrix& m) {
    Rgb e = Each(Times(m, Each(c, decode)), [](double v) { return v * 0.1; });
    const double gain = std::pow(luma(e), -1 / 6.0);
    return Each(e, [=](double v) {
      const double s = v * gain;
      return s < 1 / 12.0 ? std::sqrt(3 * s) : 0.17883277 * std::log(s - 0.02372241) + 1.0042934;
    });
  };
  const auto hlgIn = [=](Rgb c, const Matrix& m) {
    const Rgb e =
        Each(c, [](double x) { return x < 0.5 ? x * x / 3 : std::exp((x - 1.0042934) * 5.5918164) + 0.02372241; });
    const double gain = 10 * std::pow(luma(e), 0.2);
    return Each(Times(m, Each(e, [=](double v) { return v * gain; })), encode);
  };
  const Matrix toPq = Elements(VX::ColorSpace::CalculateConversionMatrix(rec709, pq));
  const Matrix fromPq = Elements(VX::ColorSpace::CalculateConversionMatrix(pq, rec709));
  const auto pqScaledIn = [=](Rgb c, const Matrix& m) {
    return pqIn(Each(c, [](double v) { return v * static_cast<double>(0.50807786f); }), m);
  };
  std::printf(
      "Largest error of Vexel's signal against double precision (peers: beside their names; large for table "
      "paths):\n\n");
  ConversionCase({"Rec.709 to Rec.2020", from(rec2020), gamma, wide, k709, kP709, k709, kP2020});
  ConversionCase({"Rec.2020 to Rec.709", to(rec2020), gamma, narrow, k709, kP2020, k709, kP709});
  ConversionCase({"Rec.709 to sRGB", from(srgb), srgbOut, {}, k709, kP709, kSrgb, kP709});
  ConversionCase({"Rec.709 to PQ", from(pq), pqOut, toPq, k709, kP709, kPq, kP2020});
  ConversionCase({"PQ to Rec.709", to(pq), pqIn, fromPq, kPq, kP2020, k709, kP709});
  ConversionCase({"PQ to Rec.709, computed", to(pqWithWhite), pqScaledIn, fromPq, kPq, kP2020, k709, kP709});
  ConversionCase({"Rec.709 to HLG", from(hlg), hlgOut, wide, k709, kP709, kHlg, kP2020});
  ConversionCase({"HLG to Rec.709", to(hlg), hlgIn, narrow, kHlg, kP2020, k709, kP709});
  std::printf("\n");
}

void PlainCases() {
  auto src = std::make_shared<Memory>(kPixels * 16), dst = std::make_shared<Memory>(kPixels * 16);
  src->FillFloats();
  const auto* from = reinterpret_cast<const float*>(src->data());
  auto* to = reinterpret_cast<float*>(dst->data());
  static const VX::Rec2020ColorSpace rec2020;
  const auto add = [=](const char* name, const std::function<void()>& work) {
    BenchCase(name, kPixels).Add("vexel", [=] { (void)src, (void)dst, work(); }).AddFloor(kPixels * 16, kPixels * 16);
  };
  add("compress tones", [=] { rec2020.CompressPixelsToSDR(from, to, kPixels, 1, 1.2f, 0.6f); });
  add("Rec.2020 to Rec.709 with gamut compression", [=] { rec2020.ConvertPixelsToRec709(from, to, kPixels, true); });
  add("Y'CbCr to RGB", [=] { rec2020.ConvertPixelsFromYUVtoRGB(from, to, kPixels); });
  add("RGB to Y'CbCr", [=] { rec2020.ConvertPixelsFromRGBtoYUV(from, to, kPixels); });
  add("clamp", [=] { VX::ClampFloatPixels(from, to, 1025, kPixels / 1024 * 16, 0, 1); });
  const auto* codes = reinterpret_cast<const uint16_t*>(src->data());
  BenchCase("P010 to RGB", kPixels)
      .Add("vexel",
           [=] {
             constexpr int kWidth = 2048, kPairs = kPixels / kWidth / 2;
             for (int i = 0; i < kPairs; ++i)
               rec2020.Convert2RowsFromP010toRGB(codes + i * 3 * kWidth, codes + i * 3 * kWidth + kWidth,
                                                 codes + i * 3 * kWidth + 2 * kWidth, to + i * 8 * kWidth,
                                                 to + i * 8 * kWidth + 4 * kWidth, kWidth);
           })
      .AddFloor(kPixels * 3, kPixels * 16);
}

// ---- Powers ----

#if defined(VEXEL_PEER_SLEEF) && defined(__x86_64__)
__attribute__((target("avx2"))) void SleefPowers(const float* src, float* dst, size_t count, float y) {
  for (size_t i = 0; i < count; i += 8)
    _mm256_storeu_ps(dst + i, Sleef_cinz_powf8_u10avx(_mm256_loadu_ps(src + i), _mm256_set1_ps(y)));
}
__attribute__((target("avx2"))) void SleefPowersAvx2(const float* src, float* dst, size_t count, float y) {
  for (size_t i = 0; i < count; i += 8)
    _mm256_storeu_ps(dst + i, Sleef_finz_powf8_u10avx2(_mm256_loadu_ps(src + i), _mm256_set1_ps(y)));
}
#endif

double LargestUlp(const float* src, const float* dst, size_t count, double y) {
  double largest = 0;
  for (size_t i = 0; i < count; ++i) {
    const double expected = std::pow(static_cast<double>(src[i]), y);
    const double ulp = std::ldexp(1.0, std::max(std::ilogb(expected), -126) - 23);
    largest = std::max(largest, std::abs(expected - dst[i]) / ulp);
  }
  return largest;
}

// The transfer kernels' decoding alone is not exported: an identity encoding (exponent 1) would hide half of the work,
// so four values of a pixel count as six powers: three decoded, three encoded.
void PowerCase(float decode, float encode) {
  constexpr size_t kValues = 1 << 14;
  auto src = std::make_shared<Memory>(kValues * 4), dst = std::make_shared<Memory>(kValues * 4);
  src->FillFloats();
  const auto* from = reinterpret_cast<const float*>(src->data());
  auto* to = reinterpret_cast<float*>(dst->data());
  char name[64];
  std::snprintf(name, sizeof name, "power %g and %g, per value", decode, encode);
  BenchCase report(name, kValues / 4 * 6);
  report.Add("vexel", [=] {
    (void)src, (void)dst;
    VX::PureGammaToPureGamma(from, to, kValues / 4, decode, encode, VX::CSMatrix(), false, nullptr);
  });
  const auto add = [&](const char* contender, const auto& powers) {
    double error = 0;
    for (const float y : {decode, encode}) {
      powers(from, to, kValues, y);
      error = std::max(error, LargestUlp(from, to, kValues, y));
    }
    report.Add(WithError(contender, error), [=] {
      (void)src, (void)dst;
      powers(from, to, kValues / 4 * 3, decode);
      powers(to, to, kValues / 4 * 3, encode);
    });
  };
  add("powf", [](const float* s, float* d, size_t n, float y) {
    for (size_t i = 0; i < n; ++i) d[i] = std::pow(s[i], y);
  });
#if defined(VEXEL_PEER_SLEEF) && defined(__x86_64__)
  add("SLEEF deterministic", SleefPowers);
  add("SLEEF AVX2 with FMA", SleefPowersAvx2);
#endif
}

}  // namespace

void RegisterBenchmarks() {
  PowerCase(2.4f, 1 / 2.4f);
  PowerCase(0.1593017578125f, 78.84375f);
  ConversionCases();
  PlainCases();
}
