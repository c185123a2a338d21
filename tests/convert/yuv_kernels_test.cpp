// Y'CbCr kernels against the equations: matrices, depths, and 4:2:2 in every packing.
#include "convert/RowKernelCheck.h"
#include "convert/YuvKernels.h"
#include "convert/YuvReference.h"
#include "support/Test.h"

namespace vexel::testing {
namespace {

using Bytes = std::vector<uint8_t>;
using Words = std::vector<uint32_t>;
using Floats = std::vector<float>;
using Map = Triple (*)(const Triple&);

// ---- Matrices

struct Matrix {
  const char* name;
  const RowKernelSet *bytes, *floats;
  bool fromYuv, toYuv;
  Map exact;
};
const Matrix kMatrices[] = {
    {"BGR to VUY 601", &kBgra8ToVuya8_601, &kBgra32fToVuya32f_601, false, true,
     [](const Triple& p) { return BgrToVuy(k601, p); }},
    {"BGR to VUY 709", &kBgra8ToVuya8_709, &kBgra32fToVuya32f_709, false, true,
     [](const Triple& p) { return BgrToVuy(k709, p); }},
    {"VUY to BGR 601", &kVuya8ToBgra8_601, &kVuya32fToBgra32f_601, true, false,
     [](const Triple& p) { return VuyToBgr(k601, p); }},
    {"VUY to BGR 709", &kVuya8ToBgra8_709, &kVuya32fToBgra32f_709, true, false,
     [](const Triple& p) { return VuyToBgr(k709, p); }},
    {"VUY 601 to 709", &kVuya8_601To709, &kVuya32f_601To709, true, true,
     [](const Triple& p) { return BgrToVuy(k709, VuyToBgr(k601, p)); }},
    {"VUY 709 to 601", &kVuya8_709To601, &kVuya32f_709To601, true, true,
     [](const Triple& p) { return BgrToVuy(k601, VuyToBgr(k709, p)); }},
};

// All 2^24 colours against the equations. Every matrix is affine, so it is known by where it takes four colours.
// Nearest codes alone could tint a grey.
TEST(YuvKernels, EveryColourIsRoundedRightAndGreysStayGrey) {
  constexpr size_t kRow = 65536;
  Bytes in(4 * kRow), out(4 * kRow);
  for (const Matrix& matrix : kMatrices) {
    const Triple origin = matrix.exact({{0, 0, 0}});
    Triple steps[3];
    for (int k = 0; k < 3; ++k) {
      Triple unit{};
      unit.c[k] = 1;
      steps[k] = matrix.exact(unit);
      for (int j = 0; j < 3; ++j) steps[k].c[j] -= origin.c[j];
    }
    double worst = 0;
    size_t notNearest = 0;
    for (int c2 = 0; c2 < 256; ++c2) {
      for (size_t i = 0; i < kRow; ++i) {
        in[4 * i] = static_cast<uint8_t>(i);
        in[4 * i + 1] = static_cast<uint8_t>(i >> 8);
        in[4 * i + 2] = static_cast<uint8_t>(c2);
      }
      (*matrix.bytes)[ActiveKernelVariant()](in.data(), out.data(), kRow);
      for (size_t j = 0; j < 3; ++j)
        for (size_t i = 0; i < kRow; ++i) {
          const double exact = origin.c[j] + steps[0].c[j] * static_cast<double>(i & 255) +
                               steps[1].c[j] * static_cast<double>(i >> 8) + steps[2].c[j] * c2;
          const double error = std::abs(out[4 * i + j] - Code8(exact));
          worst = std::max(worst, error);
          notNearest += error > 0.5 + 1e-9;
        }
      const uint8_t* const grey = &out[size_t{4} * 128 * 257];
      ASSERT_TRUE(matrix.toYuv || (grey[0] == grey[1] && grey[1] == grey[2])) << matrix.name << " " << c2;
    }
    EXPECT_LT(worst, 0.52) << matrix.name;
    EXPECT_LT(static_cast<double>(notNearest) / (3.0 * 256 * kRow), 0.004) << matrix.name;
  }
}

// The equations hold for codes; floats go there and back.
TEST(YuvKernels, FloatMatricesFollowTheEquations) {
  constexpr size_t kCount = 1000;
  const double scales[2][3] = {{255, 255, 255}, {224, 224, 219}}, blacks[2][3] = {{}, {128, 128, 16}};
  Random random(7);
  Floats source(4 * kCount);
  for (float& value : source) value = random.Float(-0.5f, 1.5f);
  for (const Matrix& m : kMatrices) {
    const auto got = RunKernel<float>(*m.floats, source, kCount, 4 * kCount);
    for (size_t i = 0; i < kCount; ++i) {
      Triple codes;
      for (size_t c = 0; c < 3; ++c) codes.c[c] = source[4 * i + c] * scales[m.fromYuv][c] + blacks[m.fromYuv][c];
      codes = m.exact(codes);
      for (size_t c = 0; c < 3; ++c)
        ASSERT_NEAR(got[4 * i + c], (codes.c[c] - blacks[m.toYuv][c]) / scales[m.toYuv][c], 2.5e-6)
            << m.name << " channel " << c;
      ASSERT_EQ(got[4 * i + 3], source[4 * i + 3]) << m.name;
    }
  }
  const Floats greys = {0, 0, 0.3f, 0.25f, 0, 0, 1.0f, 0, 0, 0, -0.7f, 1, 0, 0, 1e20f, 2};
  for (const RowKernelSet* kernels : {&kVuya32f_601To709, &kVuya32f_709To601})
    EXPECT_EQ(RunKernel<float>(*kernels, greys, 4, 16), greys);
}

// An infinite or undefined channel reaches only those channels whose formula names it.
TEST(YuvKernels, SpecialValuesReachOnlyTheirChannels) {
  const auto finite = [](const RowKernelSet* kernels, const Floats& pixel) {
    std::vector<bool> result;
    for (const float value : RunKernel<float>(*kernels, pixel, 1, 4)) result.push_back(std::isfinite(value));
    return result;
  };
  for (const float bad : {kInfinity, kNaN}) {
    for (const RowKernelSet* kernels : {&kVuya32fToBgra32f_601, &kVuya32fToBgra32f_709}) {
      EXPECT_EQ(finite(kernels, {bad, 0.25f, 0.5f, 1}), (std::vector{true, false, false, true}));
      EXPECT_EQ(finite(kernels, {0.25f, bad, 0.5f, 1}), (std::vector{false, false, true, true}));
    }
    for (const RowKernelSet* kernels : {&kBgra32fToVuya32f_601, &kVuya32fToBgra32f_709, &kVuya32f_601To709})
      EXPECT_EQ(finite(kernels, {0.25f, 0.25f, 0.5f, bad}), (std::vector{true, true, true, false}));
  }
}

// ---- Depths

const struct {
  const RowKernelSet *widen, *narrow;
  size_t pixels;      // in four samples
  const char* order;  // chroma, luma, alpha
} kDepths[] = {{&kVuya8To32f, &kVuya32fTo8, 1, "ccya"}, {&kUyvy8To32f, &kUyvy32fTo8, 2, "cycy"}};

TEST(YuvKernels, EveryCodeWidensAndComesBack) {
  Bytes codes(4 * 256);
  for (size_t i = 0; i < codes.size(); ++i) codes[i] = static_cast<uint8_t>(i / 4);
  for (const auto& [widen, narrow, pixels, order] : kDepths) {
    const auto wide = RunKernel<float>(*widen, codes, 256 * pixels, 1024);
    for (size_t i = 0; i < wide.size(); ++i) {
      const char kind = order[i % 4];
      const double expected = kind == 'c'   ? (codes[i] - 128) / 224.0
                              : kind == 'y' ? (codes[i] - 16) / 219.0
                                            : codes[i] / 255.0;
      ASSERT_NEAR(wide[i], expected, kind == 'a' && codes[i] == 255 ? 0 : 1.2e-7 * std::abs(expected))
          << order << " " << i;
    }
    EXPECT_EQ(RunKernel<uint8_t>(*narrow, wide, 256 * pixels, 1024), codes);
  }
}

TEST(YuvKernels, NarrowingSaturates) {
  struct {
    float value;
    uint8_t chroma, luma, alpha;
  } const kValues[] = {{-1, 0, 0, 0},         {1, 255, 235, 255},    {2, 255, 255, 255},   {-100, 0, 0, 0},
                       {0.5f, 240, 126, 128}, {kNaN, 0, 0, 0},       {kInfinity, 0, 0, 0}, {-kInfinity, 0, 0, 0},
                       {1e10f, 0, 0, 0},      {8e6f, 255, 255, 255}, {-1e10f, 0, 0, 0},    {1e-40f, 128, 16, 0}};
  for (const auto& [value, chroma, luma, alpha] : kValues)
    for (const auto& depth : kDepths) {
      Bytes expected;
      for (const char* kind = depth.order; *kind; ++kind)
        expected.push_back(*kind == 'c' ? chroma : *kind == 'y' ? luma : alpha);
      EXPECT_EQ(RunKernel<uint8_t>(*depth.narrow, Floats(4, value), depth.pixels, 4), expected) << value;
    }
}

// ---- 4:2:2 to 8-bit pixels

Words PackCodes(const std::vector<int>& codes) {
  Words words((codes.size() + 11) / 12 * 4);
  for (size_t i = 0; i < codes.size(); ++i) words[i / 3] |= static_cast<uint32_t>(codes[i]) << (i % 3 * 10);
  return words;
}

// Chroma of odd pixels is the mean of two samples before anything is rounded; the row's end repeats the last. Results
// are the nearest codes, but for what fixed point can tip over.
TEST(YuvKernels, PixelsOf422FollowTheEquations) {
  const Map to601 = [](const Triple&vuy) { return VuyToBgr(k601, vuy); },
            to709 = [](const Triple&vuy) { return VuyToBgr(k709, vuy); }, same = [](const Triple&vuy) { return vuy; },
            recode = [](const Triple&vuy) { return BgrToVuy(k601, VuyToBgr(k709, vuy)); };
  struct {
    const RowKernelSet* kernels;
    int bits;
    Map exact;
    double tolerance;
  } const kOutputs[] = {{&kV210ToBgrx8_601, 10, to601, 0.5625}, {&kV210ToBgrx8_709, 10, to709, 0.5625},
                        {&kV210ToVuyx8, 10, same, 0.5},         {&kV210_709ToVuyx8_601, 10, recode, 0.5625},
                        {&kUyvy8ToBgrx8_601, 8, to601, 0.52},   {&kUyvy8ToBgrx8_709, 8, to709, 0.52},
                        {&kUyvy8ToVuyx8, 8, same, 0.5}};
  Random random(11);
  for (const auto& output : kOutputs)
    for (size_t count = 1; count < 90000; count += count < 40 ? 1 : count < 700 ? 23 : 40001) {
      const int most = (1 << output.bits) - 1;
      std::vector<int> codes((count + 1) / 2 * 4);
      for (int& code : codes) code = static_cast<int>(random.OneIn(8) ? random.Int(0, 1) * most : random.Int(0, most));
      const auto got = output.bits == 8
                           ? RunKernel<uint8_t>(*output.kernels, Bytes(codes.begin(), codes.end()), count, 4 * count)
                           : RunKernel<uint8_t>(*output.kernels, PackCodes(codes), count, 4 * count);
      const double step = 1 << (output.bits - 8);
      for (size_t x = 0; x < count; ++x) {
        const size_t own = x / 2 * 4, next = x % 2 && own + 4 < codes.size() ? own + 4 : own;
        const Triple expected =
            output.exact({{(codes[own + 2] + codes[next + 2]) / 2.0 / step, (codes[own] + codes[next]) / 2.0 / step,
                           codes[own + 1 + 2 * (x % 2)] / step}});
        for (size_t c = 0; c < 3; ++c)
          ASSERT_NEAR(got[4 * x + c], Code8(expected.c[c]), output.tolerance)
              << x << " of " << count << " channel " << c << ", kernel " << &output - kOutputs;
        ASSERT_EQ(got[4 * x + 3], 255);
      }
    }
  for (int code = 64; code <= 940; ++code)
    for (const RowKernelSet* kernels : {&kV210ToBgrx8_601, &kV210ToBgrx8_709}) {
      const auto grey = RunKernel<uint8_t>(*kernels, PackCodes({512, code, 512, code}), 1, 4);
      ASSERT_EQ(grey, (Bytes{grey[1], grey[1], grey[1], 255})) << code;
    }
}

// ---- 4:2:2 in bytes

// Noise, with codes 0 and 255 more often than by chance.
Bytes RandomBytes(size_t bytes, uint64_t seed) {
  Random random(seed);
  Bytes row(bytes);
  for (uint8_t& value : row)
    value = static_cast<uint8_t>(random.OneIn(6) ? random.Int(0, 1) * 255 : random.Int(0, 255));
  return row;
}
size_t PairSamples(size_t count) { return (count + 1) / 2 * 4; }

// Rounding inside the lifting adds at most a quarter to the half code of the last rounding. What was interpolated comes
// back as it was.
TEST(YuvKernels, ChromaOfBytesIsLowPassed) {
  constexpr double kTaps[] = {-0.125, 0.25, 0.75, 0.25, -0.125};
  for (size_t count = 1; count <= 131; ++count) {
    const Bytes source = RandomBytes(4 * count, 1000 + count);
    const auto got = RunKernel<uint8_t>(kVuyx8ToUyvy8, source, count, PairSamples(count));
    const auto pixel = [&](size_t i, int offset) {
      const auto at = static_cast<ptrdiff_t>(i) + offset;
      return &source[4 * static_cast<size_t>(std::clamp<ptrdiff_t>(at, 0, static_cast<ptrdiff_t>(count) - 1))];
    };
    for (size_t i = 0; i < count; i += 2) {
      for (size_t c = 0; c < 2; ++c) {
        double exact = 0;
        for (int k = -2; k <= 2; ++k) exact += kTaps[k + 2] * pixel(i, k)[c];
        ASSERT_NEAR(got[2 * i + 2 - 2 * c], Code8(exact), 0.7501)
            << count << " pixels, pixel " << i << " channel " << c;
      }
      ASSERT_EQ(got[2 * i + 1], pixel(i, 0)[2]) << count;
      ASSERT_EQ(got[2 * i + 3], pixel(i, 1)[2]) << count << ": a missing luma repeats the last";
    }
    Bytes pairs = RandomBytes(PairSamples(count), count);
    if (count % 2 != 0) pairs.back() = pairs[pairs.size() - 3];
    const auto pixels = RunKernel<uint8_t>(kUyvy8ToVuyx8, pairs, count, 4 * count);
    ASSERT_EQ(RunKernel<uint8_t>(kVuyx8ToUyvy8, pixels, count, pairs.size()), pairs) << count;
  }
}

// Both pixels of a pair by their own chroma, of which the even one's is kept; whatever the source has in the place of
// the luma that an odd width lacks.
TEST(YuvKernels, RecodedPairsFollowTheEquations) {
  const struct {
    const RowKernelSet* kernels;
    Luma from, to;
  } recodings[] = {{&kUyvy8_601To709, k601, k709}, {&kUyvy8_709To601, k709, k601}};
  for (const auto& [kernels, from, to] : recodings)
    for (const size_t count : {1u, 2u, 33u, 100001u}) {
      const Bytes source = RandomBytes(PairSamples(count), count);
      const auto got = RunKernel<uint8_t>(*kernels, source, count, source.size());
      for (size_t i = 0; i < source.size(); i += 4) {
        const size_t next = i + 4 < source.size() ? i + 4 : i;
        const Triple even = BgrToVuy(to, VuyToBgr(from, {{1.0 * source[i + 2], 1.0 * source[i], 1.0 * source[i + 1]}}));
        const Triple odd = BgrToVuy(to, VuyToBgr(from, {{(source[i + 2] + source[next + 2]) / 2.0,
                                                         (source[i] + source[next]) / 2.0, 1.0 * source[i + 3]}}));
        const double expected[] = {even.c[1], even.c[2], even.c[0], odd.c[2]};
        for (size_t k = 0; k < (2 * count >= i + 4 ? 4 : 3); ++k)
          ASSERT_NEAR(got[i + k], Code8(expected[k]), 0.52) << i << " of " << count;
      }
      ASSERT_TRUE(count % 2 == 0 || got.back() == got[got.size() - 3]) << count;
    }
}

// ---- 4:2:2 in floats

Floats RandomFloats(size_t count, uint64_t seed) {
  Random random(seed);
  Floats values(count);
  for (float& value : values) value = random.Float(-0.75f, 0.75f);
  return values;
}

TEST(YuvKernels, OddFloatPixelsTakeTheFourTapMiddle) {
  constexpr size_t kChroma[] = {2, 0};  // V and U of a UYVY pair
  for (size_t count = 1; count <= 40; ++count) {
    const Floats uyvy = RandomFloats(PairSamples(count), count);
    const auto smooth = RunKernel<float>(kUyvy32fToVuyx32f, uyvy, count, 4 * count);
    const auto nearest = RunKernel<float>(kUyvy32fToVuyx32fNearest, uyvy, count, 4 * count);
    const auto last = static_cast<ptrdiff_t>(uyvy.size() / 4) - 1;
    for (size_t x = 0; x < count; ++x) {
      for (size_t c = 0; c < 2; ++c) {
        const auto tap = [&](ptrdiff_t offset) {
          const auto pair = std::clamp<ptrdiff_t>(static_cast<ptrdiff_t>(x / 2) + offset, 0, last);
          return double{uyvy[4 * static_cast<size_t>(pair) + kChroma[c]]};
        };
        const double middle = 9 / 16. * (tap(0) + tap(1)) - 1 / 16. * (tap(-1) + tap(2));
        ASSERT_NEAR(smooth[4 * x + c], x % 2 ? middle : tap(0), x % 2 ? 3e-7 : 0) << x << " of " << count;
        ASSERT_EQ(nearest[4 * x + c], tap(0)) << x << " of " << count;
      }
      for (const auto* row : {&smooth, &nearest}) {
        ASSERT_EQ((*row)[4 * x + 2], uyvy[4 * (x / 2) + 1 + 2 * (x % 2)]);
        ASSERT_EQ((*row)[4 * x + 3], 1.0f);
      }
    }
  }
}

// The nine taps that the two lifting steps amount to, where the row reaches far enough to both sides.
TEST(YuvKernels, ChromaOfFloatsIsLowPassed) {
  constexpr double kTaps[9] = {1 / 64., 0, -1 / 8., 1 / 4., 23 / 32., 1 / 4., -1 / 8., 0, 1 / 64.};
  constexpr size_t kCount = 301;
  const Floats vuyx = RandomFloats(4 * kCount, 5);
  const auto uyvy = RunKernel<float>(kVuyx32fToUyvy32f, vuyx, kCount, PairSamples(kCount));
  for (size_t pair = 2; 2 * pair + 4 < kCount; ++pair) {
    double v = 0, u = 0;
    for (size_t tap = 0; tap < 9; ++tap) {
      v += kTaps[tap] * vuyx[4 * (2 * pair + tap - 4)];
      u += kTaps[tap] * vuyx[4 * (2 * pair + tap - 4) + 1];
    }
    ASSERT_NEAR(uyvy[4 * pair], u, 5e-7) << pair;
    ASSERT_NEAR(uyvy[4 * pair + 2], v, 5e-7) << pair;
  }
  for (size_t x = 0; x < kCount; ++x) ASSERT_EQ(uyvy[4 * (x / 2) + 1 + 2 * (x % 2)], vuyx[4 * x + 2]) << x;
  EXPECT_EQ(uyvy.back(), vuyx[4 * (kCount - 1) + 2]) << "the missing luma repeats the last";
}

// Flat chroma stays flat to the ends, too.
TEST(YuvKernels, InterpolatedFloatsComeBackBitForBit) {
  for (size_t count = 1; count <= 300; ++count) {
    Floats uyvy = RandomFloats(PairSamples(count), count);
    uyvy[count % uyvy.size() / 2 * 2] = -0.0f;
    if (count % 3 == 0) uyvy[0] = 1e30f;
    if (count % 2 != 0) uyvy.back() = uyvy[uyvy.size() - 3];
    const auto back = RunKernel<float>(kVuyx32fToUyvy32f, RunKernel<float>(kUyvy32fToVuyx32f, uyvy, count, 4 * count),
                                       count, uyvy.size());
    ASSERT_EQ(std::memcmp(back.data(), uyvy.data(), 4 * uyvy.size()), 0) << count << " pixels";
    for (const float value : RunKernel<float>(kVuyx32fToUyvy32f, Floats(4 * count, 0.3f), count, uyvy.size()))
      ASSERT_NEAR(value, 0.3f, 1e-7) << count;
  }
}

// ---- V210

// The samples of a group have the places that the layout names, and the last group continues in black.
TEST(YuvKernels, V210Layout) {
  const Bytes uyvy = {1, 2, 3, 4, 5, 6, 7, 8, 9, 10, 11, 12, 201, 202, 203, 204};
  EXPECT_EQ(RunKernel<uint32_t>(kUyvy8ToV210, uyvy, 7, 8),
            PackCodes({4,   8,   12,  16,  20,  24, 28,  32, 36,  40, 44,  48,
                       804, 808, 812, 816, 512, 64, 512, 64, 512, 64, 512, 64}));
  EXPECT_EQ(RunKernel<uint32_t>(kUyvy32fToV210, Floats(8, 0.0f), 3, 4),
            PackCodes({512, 64, 512, 64, 512, 64, 512, 64, 512, 64, 512, 64}));
  EXPECT_EQ(RunKernel<uint32_t>(kUyvy32fToV210,
                                Floats{kNaN, kNaN, 1, 2, -1, -1, kInfinity, 1, 0.5f, -kInfinity, -0.5f, 1e20f}, 6, 4),
            PackCodes({0, 0, 1023, 1023, 0, 0, 0, 940, 960, 0, 64, 0}));
}

TEST(YuvKernels, EveryV210Code) {
  std::vector<int> codes(12 * 1024);
  for (size_t i = 0; i < codes.size(); ++i) codes[i] = static_cast<int>(i / 12);
  const Words v210 = PackCodes(codes);
  const size_t count = codes.size() / 2;
  const auto bytes = RunKernel<uint8_t>(kV210ToUyvy8, v210, count, codes.size());
  const auto floats = RunKernel<float>(kV210ToUyvy32f, v210, count, codes.size());
  for (size_t i = 0; i < codes.size(); ++i) {
    ASSERT_EQ(bytes[i], std::min(255.0, std::floor(codes[i] / 4.0 + 0.5))) << codes[i];
    const double expected = i % 2 ? (codes[i] - 64) / 876.0 : (codes[i] - 512) / 896.0;
    ASSERT_NEAR(floats[i], expected, 1.2e-7 * std::abs(expected)) << codes[i];
  }
  EXPECT_EQ(RunKernel<uint32_t>(kUyvy32fToV210, floats, count, v210.size()), v210) << "floats keep every code";
}

TEST(YuvKernels, BytesSurviveV210) {
  for (size_t count = 1; count < 64; ++count) {
    const Bytes uyvy = RandomBytes(PairSamples(count), count);
    const auto v210 = RunKernel<uint32_t>(kUyvy8ToV210, uyvy, count, (count + 5) / 6 * 4);
    EXPECT_EQ(RunKernel<uint8_t>(kV210ToUyvy8, v210, count, uyvy.size()), uyvy);
    const auto floats = RunKernel<float>(kUyvy8To32f, uyvy, count, uyvy.size());
    EXPECT_EQ(RunKernel<uint32_t>(kUyvy32fToV210, floats, count, v210.size()), v210) << "either way to ten bits";
  }
}

}  // namespace
}  // namespace vexel::testing
