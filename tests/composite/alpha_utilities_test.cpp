// The alpha utilities against formulas of their own, in the armed arena and refused.
#include "support/Arena.h"
#include "support/Formats.h"
#include "support/Image.h"
#include "support/Operations.h"
#include "support/Test.h"

namespace vexel::testing {
namespace {

// The formats that gains work in: those with an alpha that counts, in 8u and 32f.
bool HasGainKernel(F f) { return IsPixels(f) && AlphaKind(f) != kAlphaIgnored && Depth(f) != kDepth15u; }

std::vector<F> FormatsThat(const std::function<bool(F)>& fit) {
  std::vector<F> formats;
  for (const F f : RasterFormats())
    if (fit(f)) formats.push_back(f);
  return formats;
}

// What an operation makes of one pixel, in double precision; `out` holds what the destination held before.
using Formula = std::function<void(F format, const double* in, double* out)>;
struct Operation {
  const char* name;
  std::function<bool(F)> takes;
  bool readsDestination;
  std::function<VX_Result(const ArenaFrame& src, const ArenaFrame& dst)> run;
  Formula formula;
};

double Rounded(double value) { return double{static_cast<float>(value)}; }

Operation GainOperation(float gain) {
  return {"VX_AlphaGain", HasGainKernel, false,
          [=](const ArenaFrame& s, const ArenaFrame& d) { return AlphaGain(s, d, gain); },
          [=](F f, const double* in, double* out) {
            const bool isFloat = Depth(f) == kDepth32f, all = AlphaKind(f) == kAlphaPremultiplied;
            const double vuyBlack[] = {128, 128, 16, 0};
            for (size_t k = 0; k < 4; ++k) {
              const double black = IsYuv(f) && all && !isFloat ? vuyBlack[k] : 0;
              const double scaled = Rounded((in[k] - black) * double{gain});
              const double code = std::clamp(std::nearbyint(scaled) + black, 0.0, 255.0);
              out[k] = !all && k != AlphaAt(f) ? in[k] : isFloat ? scaled : code;
            }
          }};
}

Operation SetOperation(float alpha, double code8, double code15) {
  return {"VX_CopyAndSetAlpha", IsPixels, false,
          [=](const ArenaFrame& s, const ArenaFrame& d) { return SetAlpha(s, d, alpha); },
          [=](F f, const double* in, double* out) {
            std::copy_n(in, 4, out);
            out[AlphaAt(f)] = Depth(f) == kDepth8u ? code8 : Depth(f) == kDepth15u ? code15 : double{alpha};
          }};
}

// In place; the source is not looked at.
Operation SetInPlaceOperation(bool opaque) {
  return {"VX_SetAlphaChannel", IsSettable, true,
          [=](const ArenaFrame&, const ArenaFrame& d) {
            return VX_SetAlphaChannel(static_cast<uint32_t>(d.width), static_cast<uint32_t>(d.height), d.base,
                                      d.rowBytes, d.format, opaque);
          },
          [=](F f, const double*, double* out) { out[AlphaAt(f)] = opaque ? FullScale(f) : 0; }};
}

// The matte is a pixel of the buffer's own format; in 15u it may hold more than full scale, which counts as that.
Operation MatteOperation(double m0, double m1, double m2, double m3) {
  const std::vector<double> matte = {m0, m1, m2, m3};
  const auto of = [](F f, double m) {
    return Depth(f) == kDepth32f ? Rounded(m) : std::floor(std::min(m, Depth(f) == kDepth8u ? 1 : m) * FullScale(f));
  };
  return {"VX_UnPremultiplyAgainstMatteColor", IsMatted, false,
          [=](const ArenaFrame& s, const ArenaFrame& d) {
            uint8_t pixel[16];
            for (size_t k = 0; k < 4; ++k) PutSample(pixel, k, d.format, of(d.format, matte[k]));
            return RemoveMatte(s, d, pixel, d.format);
          },
          [=](F f, const double* in, double* out) {
            const bool isFloat = Depth(f) == kDepth32f;
            const double most = FullScale(f), a = in[AlphaAt(f)],
                         rest = isFloat ? Rounded(1 - a) : most - std::min(a, most);
            for (size_t k = 0; k < 4; ++k) {
              const double product = (isFloat ? of(f, matte[k]) : std::min(of(f, matte[k]), most)) * rest;
              const double m = isFloat ? Rounded(product) : std::floor((2 * product + most) / (2 * most));
              out[k] = k == AlphaAt(f) ? in[k] : m > in[k] ? 0 : isFloat ? Rounded(in[k] - m) : in[k] - m;
            }
          }};
}

// Composited over black where nothing is converted: a colorimetry other than 601 only at full opacity.
Operation ToBlackOperation(float opacity) {
  return {"VX_CompositeToBlack",
          [=](F f) {
            return AlphaKind(f) == kAlphaStraight && IsPixels(f) && Depth(f) != kDepth15u && !IsLinear(f) &&
                   (Colorimetry(f) == 0 || !IsYuv(f) || opacity > 0.9999f);
          },
          false, [=](const ArenaFrame& s, const ArenaFrame& d) { return ToBlack(s, d, opacity); },
          [=](F f, const double* in, double* out) {
            const bool isFloat = Depth(f) == kDepth32f, full = opacity > 0.999992f;
            const double level = full ? 255 : std::floor(double{opacity} * 255 + 0.5);
            const double scaled = Rounded(in[AlphaAt(f)] * (full ? 1 : double{opacity}));
            const double alpha = isFloat ? scaled : std::round(in[AlphaAt(f)] * level / 255);
            for (size_t k = 0; k < 4; ++k) {
              const double black = !IsYuv(f) || isFloat ? 0 : k == 2 ? 16 : 128;
              out[k] = k == AlphaAt(f)             ? FullScale(f)
                       : !isFloat                  ? black + std::round((in[k] - black) * alpha / 255)
                       : alpha > double{0.999992f} ? in[k]
                                                   : Rounded(in[k] * alpha);
            }
          }};
}

std::vector<Operation> Operations() {
  std::vector<Operation> operations = {
      {"VX_InvertAlpha", IsPixels, true, [](const ArenaFrame& s, const ArenaFrame& d) { return InvertAlpha(s, d); },
       [](F f, const double* in, double* out) {
         const double inverse = FullScale(f) - in[AlphaAt(f)];
         out[AlphaAt(f)] = Depth(f) == kDepth32f ? Rounded(inverse) : inverse < 0 ? inverse + 65536 : inverse;
       }},
  };
  for (const float gain : {0.25f, 0.5f, 1.0f / 3, 1.0f, 1.7f, 1e30f}) operations.push_back(GainOperation(gain));
  operations.push_back(SetOperation(0.3f, 77, 9830));  // 76.5000003 and 9830.4
  operations.push_back(SetOperation(0.5f, 128, 16384));
  for (const bool opaque : {false, true}) operations.push_back(SetInPlaceOperation(opaque));
  operations.push_back(MatteOperation(0.16, 0.5, 1, 0.7));
  operations.push_back(MatteOperation(0.01, 1.5, 0.999, 0.3));
  for (const float opacity : {1.0f, 0.999995f, 0.999f, 0.6f, 0.5f, 0.01f, 0.001f, 3.0f})
    operations.push_back(ToBlackOperation(opacity));
  return operations;
}

// Every 8u channel under every alpha; every 16-bit alpha; floats around 0..1 and what is special about them.
double DomainSample(F f, size_t pixel, size_t channel) {
  const bool isAlpha = channel == AlphaAt(f);
  if (Depth(f) == kDepth8u) return static_cast<double>((isAlpha ? pixel >> 8 : pixel + 85 * channel) & 255);
  if (Depth(f) == kDepth15u) return static_cast<double>(isAlpha ? pixel : (pixel * 40503 >> channel) & 65535);
  static constexpr double kSpecial[] = {NAN, INFINITY, -INFINITY, 1e38, -0.0};
  if (!isAlpha && pixel % 101 < std::size(kSpecial)) return kSpecial[pixel % 101];
  return Rounded((static_cast<double>((pixel * 40503 >> channel) & 65535) - 16384) / 32767);
}

bool AreAlike(double a, double b) { return a == b || (std::isnan(a) && std::isnan(b)); }

TEST(AlphaUtilities, WholeDomains) {
  for (const Operation& operation : Operations())
    for (const F f : FormatsThat(operation.takes)) {
      Image src(f, 256, 256), dst(f, 256, 256);
      for (size_t i = 0; i < 65536; ++i)
        for (size_t k = 0; k < 4; ++k) {
          PutSample(src.bytes.data(), 4 * i + k, f, DomainSample(f, i, k));
          PutSample(dst.bytes.data(), 4 * i + k, f, DomainSample(f, i + 7, k));
        }
      const auto before = dst.bytes;
      ASSERT_EQ(operation.run(src, dst), VX_Success) << operation.name;
      for (size_t i = 0; i < 65536; ++i) {
        double in[4], out[4];
        for (size_t k = 0; k < 4; ++k) {
          in[k] = SampleAt(src.bytes.data(), 4 * i + k, f);
          out[k] = SampleAt(before.data(), 4 * i + k, f);
        }
        operation.formula(f, in, out);
        for (size_t k = 0; k < 4; ++k)
          ASSERT_PRED2(AreAlike, SampleAt(dst.bytes.data(), 4 * i + k, f), out[k])
              << operation.name << " of " << FormatName(f) << ", channel " << k << " of " << in[0] << " " << in[1]
              << " " << in[2] << " " << in[3];
      }
      ASSERT_EQ(operation.run(src, src), VX_Success);
      if (operation.readsDestination) continue;
      ASSERT_EQ(src.bytes, dst.bytes) << operation.name << " in place";
    }
}

// ---- Gain through working formats ----

F ExpectedWorking(F dst, int hint) {
  if (HasGainKernel(dst)) return dst;
  if (IsYuv(dst)) return hint > 2 ? F::VUYP_4444_32f : F::VUYP_4444_8u;
  return Depth(dst) == kDepth32f ? F::BGRA_4444_32f : F::BGRA_4444_8u;
}

TEST(AlphaUtilities, GainConvertsInAndOut) {
  for (const F from : RasterFormats())
    for (const F to : RasterFormats())
      for (const int hint : {2, 3}) {
        const F working = ExpectedWorking(to, hint);
        const Image src(from, 390, 3, Bits(from) * 31 + Bits(to));
        Image between = src.Converted(working, hint), got(to, 390, 3);
        ASSERT_EQ(AlphaGain(between, between, 0.4f), VX_Success);
        ASSERT_EQ(AlphaGain(src, got, 0.4f, hint), VX_Success);
        ASSERT_EQ(got.bytes, between.Converted(to, hint).bytes)
            << FormatName(from) << " to " << FormatName(to) << ", hint " << hint;
      }
}

TEST(AlphaUtilities, GainOfNothingFills) {
  for (const F f : RasterFormats())
    for (const float gain : {0.0f, 7.9e-6f, -1.0f, NAN}) {
      Image src(F::BGRA_4444_8u, 7, 3), want(f, 7, 3), got(f, 7, 3);
      EXPECT_EQ(AlphaGain(src, got, gain), FillWith(VX_FillWithTransparentBlack, want));
      EXPECT_EQ(got.bytes, want.bytes) << FormatName(f) << " by " << gain;
    }
}

// ---- Mask ----

// The mask's last needed byte is the last one of its row. VX_ErrReserved1 if any pixel is not what its bit says.
VX_Result ChooseAndCheck(const ArenaFrame& a, const ArenaFrame& b, const ArenaFrame& mask, const ArenaFrame& d,
                         int offset) {
  const F to = d.format;
  const int maskBytes = (offset + d.width + 7) / 8, pixel = static_cast<int>(UnpaddedRowBytes(to, 1));
  Image fromA(to, d.width, d.height), fromB(to, d.width, d.height);
  Convert(a, fromA, 2), Convert(b, fromB, 2);
  const uint8_t* bits = mask.Row(0) + 4 * mask.width - maskBytes;
  const VX_Result result = ChooseByMask(a, {b.base, b.rowBytes, to}, {bits, mask.rowBytes, to}, offset, d);
  for (int y = 0; y < d.height; ++y)
    for (int x = 0; x < d.width; ++x) {
      const bool takesA = (bits[y * ptrdiff_t{mask.rowBytes} + (offset + x) / 8] & 0x80 >> (offset + x) % 8) != 0;
      if (std::memcmp(d.Row(y) + pixel * x, (takesA ? fromA : fromB).Row(y) + pixel * x, pixel)) return VX_ErrReserved1;
    }
  return result;
}

TEST(AlphaUtilities, MaskChooses) {
  for (const F to : {F::BGRA_4444_8u, F::VUYP_4444_8u_709, kRgb10Format, F::PRGB_4444_15u, F::BGRX_4444_32f})
    for (const F from : {to, F::UYVY_422_8u, F::V210_422_10u, F::PRGB_4444_32f})
      for (int offset = from == to ? 0 : 6; offset < 8; ++offset) {
        ArenaCase arenaCase;
        arenaCase.name = "VX_OneBitMaskComposite at bit " + std::to_string(offset);
        arenaCase.sources = {from, F::BGRA_4444_8u, to};
        arenaCase.destination = to;
        arenaCase.widths = {1, 2, 7, 8, 9, 23, 31, 32, 33, 64, 129, 384, 385, 773};
        arenaCase.heights = {1, 2, 3, 5, 8, 65};
        arenaCase.sourceSize = [=](int source, ArenaSize size) {
          return source == 1 ? ArenaSize{((offset + size.width + 7) / 8 + 3) / 4, size.height} : size;
        };
        arenaCase.run = [=](const ArenaFrame* s, const ArenaFrame& d) {
          return ChooseAndCheck(s[0], s[2], s[1], d, offset);
        };
        EXPECT_TRUE(RunArena(arenaCase));
      }
}

// ---- Edges ----

TEST(AlphaUtilities, OpacityThatDoesNothing) {
  struct {
    int mode;
    float opacity;
    bool expected;
  } const cases[] = {{18, 1, true},           {6, 1, true},           {17, 1, false},        {-1, 1, false},
                     {27, 1, false},          {18, 0.9999921f, true}, {6, 1.0000079f, true}, {18, 0.9999919f, false},
                     {18, 1.0000081f, false}, {18, 0, false},         {18, NAN, false}};
  for (const auto& test : cases)
    EXPECT_EQ(VX_IsOpacityNOP(test.mode, test.opacity), test.expected) << test.mode << " " << test.opacity;
}

TEST(AlphaUtilities, ConstantAlphas) {
  struct {
    float alpha;
    int code8, code15;
  } const cases[] = {
      {0, 0, 0},        {1, 255, 32768},         {0.5f, 128, 16384}, {-0.1f, 0, 0},        {1.1f, 255, 32768},
      {NAN, 0, 0},      {kInfinity, 255, 32768}, {-kInfinity, 0, 0}, {1.5f / 32768, 0, 2}, {2.5f / 32768, 0, 2},
      {0.1f, 26, 3277}, {0.1f - 1e-8f, 25, 3277}};
  for (const auto& test : cases) {
    const uint16_t in[4] = {1, 2, 3, 4};
    uint16_t wide[4];
    uint8_t narrow[8];
    EXPECT_EQ(VX_CopyAndSetAlpha(in, 8, wide, 8, F::ARGB_4444_15u, 1, 1, test.alpha), VX_Success);
    EXPECT_EQ(VX_CopyAndSetAlpha(in, 8, narrow, 8, F::BGRA_4444_8u, 2, 1, test.alpha), VX_Success);
    EXPECT_EQ(wide[0], test.code15) << test.alpha;
    EXPECT_EQ(narrow[3], test.code8) << test.alpha;
  }
  // Rows are stepped in whole words, toward zero.
  std::vector<uint8_t> in(64), odd(64), even(64);
  Random(1).Fill(in.data(), in.size());
  for (const int sign : {1, -1}) {
    EXPECT_EQ(VX_CopyAndSetAlpha(&in[32], 11 * sign, &odd[32], 15 * sign, F::BGRA_4444_8u, 2, 2, 1), VX_Success);
    EXPECT_EQ(VX_CopyAndSetAlpha(&in[32], 8 * sign, &even[32], 12 * sign, F::BGRA_4444_8u, 2, 2, 1), VX_Success);
    EXPECT_EQ(odd, even);
  }
}

// What operations_test.cpp does not know.
TEST(AlphaUtilities, Refusals) {
  constexpr F kDv = F::NTSCDV25, kBgra = F::BGRA_4444_8u, kRgba10 = FromBits(0x44);
  const auto mask = [](void* p, F b, int bit) {
    return ChooseByMask({p, 64, kBgra}, {p, 64, b}, {p, 8, kBgra}, bit, {p, 64, kBgra, 5, 5});
  };
  const auto matted = [](void* p, F f, const void* color, F colorFormat) {
    return RemoveMatte({p, 64, f}, {p, 64, f, 5, 5}, color, colorFormat);
  };
  const auto setAll = [](void* p, uint32_t w, uint32_t h, int rowBytes) {
    return VX_SetAlphaChannel(w, h, p, rowBytes, kBgra, true);
  };
  const std::pair<VX_Result, std::function<VX_Result(void*)>> cases[] = {
      {VX_ErrArgumentOutOfRange, [&](void* p) { return mask(p, kBgra, -1); }},
      {VX_ErrArgumentOutOfRange, [&](void* p) { return mask(p, kBgra, 8); }},
      {VX_ErrFailed, [&](void* p) { return mask(p, kRgba10, 0); }},
      {VX_ErrFormatNotHandled, [&](void* p) { return matted(p, kRgba10, p, kRgba10); }},
      {VX_ErrNullSource, [&](void* p) { return matted(p, kBgra, nullptr, F::VUYA_4444_8u); }},
      {VX_ErrUnsupportedFormat, [&](void* p) { return matted(p, kBgra, p, kDv); }},
      {VX_ErrFormatNotHandled, [&](void* p) { return VX_SetAlphaChannel(5, 5, p, 64, F::ARGB_4444_15u, true); }},
      {VX_ErrFormatNotHandled, [&](void* p) { return VX_SetAlphaChannel(0, 5, p, 64, F::VUYA_4444_8u_709, true); }},
      {VX_Success, [&](void* p) { return setAll(p, 0, 5, 64); }},
      {VX_Success, [&](void* p) { return setAll(p, 5, 0, 64); }},
      {VX_ErrFailed, [&](void* p) { return setAll(p, 0x20000000, 1, 64); }},
      {VX_ErrFailed, [&](void* p) { return setAll(p, UINT_MAX, 1, 64); }},
      {VX_ErrFailed, [&](void* p) { return setAll(p, 1, 0x80000000, 4); }},
      {VX_ErrFailed, [&](void* p) { return setAll(p, 5, 2, 19); }},
      {VX_ErrFailed, [&](void*) { return setAll(nullptr, 5, 2, 20); }},
  };
  for (const auto& c : cases) ExpectRefusal("case " + std::to_string(&c - cases), c.first, c.second);
}

}  // namespace
}  // namespace vexel::testing
