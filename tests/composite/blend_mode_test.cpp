#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <cstring>
#include <limits>
#include <string>
#include <vector>

#include "composite/BlendReference.h"
#include "composite/composite_image.h"
#include "frame/RuntimeRandom.h"
#include "support/Arena.h"
#include "support/FailingAllocations.h"
#include "support/Formats.h"
#include "vexel/compositing.h"
#include "vexel_host/host.h"

namespace vexel::testing {
namespace {

using F = VX_PixelFormat;
using M = VX_BlendMode;
using Floats = std::vector<float>;
using Bytes = std::vector<uint8_t>;

constexpr float kNan = std::numeric_limits<float>::quiet_NaN();
constexpr F kFloats = F::BGRA_4444_32f, kBytes = F::BGRA_4444_8u;
constexpr F kOpaqueFrame = FromBits(0x7F000020);

const char* ModeName(M mode) {
#define VX_MODE_NAME(name, value) \
  if (mode == M::name) return #name;
  VX_BLEND_MODES(VX_MODE_NAME)
#undef VX_MODE_NAME
  return "?";
}

// All but Normal, which is the composite's own; Dissolve on demand.
std::vector<M> Modes(bool withDissolve = false) {
  std::vector<M> modes;
  for (int mode = 0; mode <= 26; ++mode)
    if (mode != static_cast<int>(M::Normal) && (withDissolve || mode != static_cast<int>(M::Dissolve)))
      modes.push_back(static_cast<M>(mode));
  return modes;
}

VX_Result Blend(M mode, const View& src, const View& background, const View& dst, int32_t width, int32_t height,
                float opacity = 1, int32_t quality = 3) {
  return VX_CompositeWithBlendMode(src.base, src.rowBytes, src.format, background.base, background.rowBytes,
                                   background.format, dst.Target(), dst.rowBytes, dst.format, width, height, opacity,
                                   static_cast<int32_t>(mode), quality, false);
}

template <class T>
std::vector<T> BlendPixels(F format, M mode, const std::vector<T>& src, const std::vector<T>& background, int32_t width,
                           int32_t height, float opacity) {
  std::vector<T> out(src.size());
  const auto view = [&](const std::vector<T>& p) { return View(p.data(), width * 4 * int{sizeof(T)}, format); };
  EXPECT_EQ(Blend(mode, view(src), view(background), view(out), width, height, opacity), VX_Success);
  return out;
}
Floats BlendFloats(M mode, const Floats& src, const Floats& background, int32_t width, int32_t height,
                   float opacity = 1) {
  return BlendPixels(kFloats, mode, src, background, width, height, opacity);
}

// The same by way of a float picture.
Bytes BlendBytesInFloats(M mode, const Bytes& src, const Bytes& background, int32_t width, int32_t height,
                         float opacity) {
  Floats wide(src.size());
  Bytes out(src.size());
  const View floats{wide.data(), width * 16, kFloats};
  EXPECT_EQ(Blend(mode, {src.data(), width * 4, kBytes}, {background.data(), width * 4, kBytes}, floats, width, height,
                  opacity),
            VX_Success);
  for (float& value : wide) value = std::min(value, 32768.0f);  // conversions take no more for a number
  EXPECT_EQ(VX_Convert(wide.data(), width * 16, kFloats, out.data(), width * 4, kBytes, width, height, 3), VX_Success);
  return out;
}

// ---- Values

// Every pair of channel values under every pair of alphas, the channels of a pixel at different places of the list.
TEST(BlendMode, FloatsFollowTheFormulas) {
  static constexpr float kValues[] = {-0.5f,   -0.0625f, 0.0f,    0.001f, 0.125f, 0.25f, 0.5f,
                                      0.5625f, 0.75f,    0.9375f, 0.998f, 1.0f,   1.25f, 3.0f};
  static constexpr float kAlphas[] = {0.0f, 4e-6f, 0.125f, 0.5f, 1.0f};
  constexpr size_t kCount = std::size(kValues);
  for (const float opacity : {1.0f, 0.375f, 0.0f, -0.25f, 1.75f}) {
    Floats src, background;
    for (const float as : kAlphas)
      for (const float ab : kAlphas)
        for (size_t i = 0; i < kCount; ++i)
          for (size_t j = 0; j < kCount; ++j)
            for (size_t k = 0; k < 4; ++k) {
              src.push_back(k == 3 ? as : kValues[(i + 3 * k) % kCount]);
              background.push_back(k == 3 ? ab : kValues[(j + 5 * k) % kCount]);
            }
    const auto width = static_cast<int32_t>(src.size() / 4);
    for (const M mode : Modes()) {
      const Floats out = BlendFloats(mode, src, background, width, 1, opacity);
      for (size_t i = 0; i < out.size(); i += 4) {
        const ReferencePixel s{{src[i], src[i + 1], src[i + 2]}, src[i + 3]},
            d{{background[i], background[i + 1], background[i + 2]}, background[i + 3]};
        const ReferencePixel expected = BlendReference(mode, s, d, opacity, width);
        const double wanted[4] = {expected.colour[0], expected.colour[1], expected.colour[2], expected.alpha};
        // A small result alpha magnifies the rounding of what it divides.
        const double slack = 1e-6 / std::clamp(std::abs(expected.alpha), 1e-3, 1.0);
        for (size_t k = 0; k < 4; ++k)
          ASSERT_NEAR(out[i + k], wanted[k], slack * std::max(8.0, 4 * std::abs(wanted[k])))
              << ModeName(mode) << " opacity " << opacity << " channel " << k << ", source " << src[i] << " "
              << src[i + 1] << " " << src[i + 2] << " " << src[i + 3] << ", background " << background[i] << " "
              << background[i + 1] << " " << background[i + 2] << " " << background[i + 3];
      }
    }
  }
}

struct OnePixel {
  M mode;
  float opacity;
  Floats src, background, expected;
};

TEST(BlendMode, Edges) {
  const OnePixel cases[] = {
      {M::Divide, 1, {0, 1e-8f, -2, 1}, {0.5f, 1, 1, 1}, {0.5f / 1e-7f, 1 / 1e-7f, -0.5f, 1}},
      {M::ColorBurn, 1, {0, 0, 0.5f, 1}, {1, 0.5f, 0.75f, 1}, {1, 0, 0.5f, 1}},
      {M::ColorDodge, 1, {1, 1, 0.5f, 1}, {0, 0.5f, 0.25f, 1}, {0, 1, 0.5f, 1}},
      {M::HardMix, 1, {0.25f, 0.25f, 0.25f, 1}, {0.75f, 0.7499f, 2, 1}, {1, 0, 1, 1}},
      {M::LinearLight, 1, {1, 0, 2, 1}, {1, 0, 0.5f, 1}, {2, -1, 1.5f, 1}},
      // Equal luminance keeps the background, alpha included; a clear background gives way; a clear source stays out.
      {M::DarkerColor, 1, {1, 1, 1, 1}, {2, 2, 2, 0.5f}, {2, 2, 2, 0.5f}},
      {M::LighterColor, 0.5f, {0.25f, 0.5f, 1, 0.5f}, {9, 9, 9, 7e-6f}, {0.25f, 0.5f, 1, 0.25f}},
      {M::LighterColor, 1, {1, 1, 1, 7e-6f}, {0.5f, -3, 0.25f, 0.5f}, {0.5f, -3, 0.25f, 0.5f}},
      // NaN stays in its channel, and in the pixel where it is an alpha.
      {M::Screen, 1, {kNan, 1, 0.5f, 1}, {0.5f, kNan, 0.5f, 1}, {kNan, kNan, 0.75f, 1}},
      {M::Luminosity, 1, {kNan, 0, 0, 1}, {0.5f, 0.5f, 0.5f, 1}, {kNan, 0, 0, 1}},
      {M::Multiply, 1, {1, 1, 1, kNan}, {1, 1, 1, 1}, {kNan, kNan, kNan, kNan}},
      // A NaN opacity shows nothing of the source.
      {M::Difference, kNan, {1, 1, 1, 1}, {0.25f, 0.5f, 0.75f, 0.5f}, {0.25f, 0.5f, 0.75f, 0.5f}},
  };
  for (const OnePixel& c : cases) {
    const Floats out = BlendFloats(c.mode, c.src, c.background, 1, 1, c.opacity);
    for (size_t k = 0; k < 4; ++k)
      EXPECT_TRUE(std::isnan(c.expected[k])
                      ? std::isnan(out[k])
                      : std::abs(out[k] - c.expected[k]) <= 1e-6f * std::max(1.0f, std::abs(c.expected[k])))
          << ModeName(c.mode) << " channel " << k << ": " << out[k];
  }
  for (const M mode : Modes(true)) {
    const Floats clear = BlendFloats(mode, {0.25f, 4, -1, 0}, {0.5f, 3, 7, 0}, 1, 1);
    const bool keeps = mode == M::Dissolve || mode == M::DarkerColor || mode == M::LighterColor;
    EXPECT_EQ(clear, keeps ? (Floats{0.5f, 3, 7, 0}) : Floats(4)) << ModeName(mode);
  }
}

// Red is brighter than a quarter by the weights of narrow pictures only.
TEST(BlendMode, LumaWeightsFollowTheWidth) {
  for (const int32_t width : {720, 721}) {
    Floats src, background;
    for (int32_t x = 0; x < width; ++x) {
      src.insert(src.end(), {0, 0, 1, 1});
      background.insert(background.end(), {0.25f, 0.25f, 0.25f, 1});
    }
    const Floats darker = BlendFloats(M::DarkerColor, src, background, width, 1),
                 lighter = BlendFloats(M::LighterColor, src, background, width, 1);
    EXPECT_EQ(darker, width == 720 ? background : src);
    EXPECT_EQ(lighter, width == 720 ? src : background);
  }
}

// ---- Bytes

// Every pair of codes in some channel, under alphas from the ends and between, and every pair of alphas over random
// colours: the bytes of the way through floats, and within one code of the formula.
class ByteBlend : public ::testing::Test {
 protected:
  void Expect(M mode, const Bytes& src, const Bytes& background, int32_t width, float opacity) {
    const auto height = static_cast<int32_t>(src.size() / 4) / width;
    const Bytes out = BlendPixels(kBytes, mode, src, background, width, height, opacity);
    ASSERT_EQ(out, BlendBytesInFloats(mode, src, background, width, height, opacity)) << ModeName(mode);
    for (size_t i = 0; i < out.size(); i += 4) {
      const auto pixel = [i](const Bytes& p) {
        return ReferencePixel{{p[i] / 255.0, p[i + 1] / 255.0, p[i + 2] / 255.0}, p[i + 3] / 255.0};
      };
      const ReferencePixel expected = BlendReference(mode, pixel(src), pixel(background), opacity, width);
      for (size_t k = 0; k < 4; ++k) {
        // Which side of its step 1 - d is on at s + d = 1 is a matter of rounding.
        if (mode == M::HardMix && src[i + k] + background[i + k] == 255) continue;
        const double wanted = 255 * reference::Unit(k == 3 ? expected.alpha : expected.colour[k]);
        ASSERT_LE(std::abs(out[i + k] - wanted), 0.501)
            << ModeName(mode) << " opacity " << opacity << " channel " << k << ", source " << int{src[i + k]}
            << " alpha " << int{src[i + 3]} << ", background " << int{background[i + k]} << " alpha "
            << int{background[i + 3]};
      }
    }
  }
};

TEST_F(ByteBlend, EveryPairOfCodes) {
  constexpr int32_t kWidth = 256;
  constexpr size_t kPixels = kWidth * 86;  // three pairs a pixel
  static constexpr uint8_t kAlphas[] = {0, 1, 127, 254, 255};
  Bytes src(kPixels * 4), background(kPixels * 4);
  for (size_t i = 0; i < kPixels; ++i)
    for (size_t k = 0; k < 3; ++k) {
      const size_t pair = (3 * i + k) % 65536;
      src[4 * i + k] = static_cast<uint8_t>(pair >> 8);
      background[4 * i + k] = static_cast<uint8_t>(pair);
    }
  int round = 0;
  for (const uint8_t as : kAlphas)
    for (const uint8_t ab : kAlphas) {
      for (size_t i = 0; i < kPixels; ++i) src[4 * i + 3] = as, background[4 * i + 3] = ab;
      for (const M mode : Modes()) Expect(mode, src, background, kWidth, round++ % 3 ? 1.0f : 0.4f);
      if (HasFatalFailure()) return;
    }
}

TEST_F(ByteBlend, EveryPairOfAlphas) {
  Bytes src(256 * 256 * 4), background(src.size());
  Random random(7);
  random.Fill(src.data(), src.size());
  random.Fill(background.data(), background.size());
  for (size_t i = 0; i < 65536; ++i) {
    src[4 * i + 3] = static_cast<uint8_t>(i >> 8);
    background[4 * i + 3] = static_cast<uint8_t>(i);
  }
  for (const M mode : Modes()) Expect(mode, src, background, 256, 1);
}

// The orders and kinds of alpha that are read and written as bytes, against pictures converted by themselves.
TEST(BlendMode, ByteFormatsAgreeWithConversions) {
  const F kinds[] = {F::BGRA_4444_8u, F::ARGB_4444_8u, F::BGRX_4444_8u,
                     F::XRGB_4444_8u, F::BGRP_4444_8u, F::PRGB_4444_8u};
  constexpr int32_t kWidth = 500, kHeight = 3;
  Bytes src(kWidth * kHeight * 4), background(src.size()), out(src.size()), expected(src.size());
  Floats wideSrc(src.size()), wideBackground(src.size()), wideOut(src.size());
  Random random(3);
  int turn = 0;
  for (const F s : kinds)
    for (const F d : kinds)
      for (const F to : kinds) {
        const M mode = Modes()[static_cast<size_t>(turn++) % Modes().size()];
        FillSamples(src.data(), src.size(), s, Contents::Random, random);
        FillSamples(background.data(), background.size(), d, Contents::Random, random);
        const auto convert = [&](const void* from, F fromFormat, void* into, F intoFormat) {
          const auto rowBytes = [](F f) { return kWidth * (Depth(f) == kDepth8u ? 4 : 16); };
          ASSERT_EQ(VX_Convert(from, rowBytes(fromFormat), fromFormat, into, rowBytes(intoFormat), intoFormat, kWidth,
                               kHeight, 3),
                    VX_Success);
        };
        convert(src.data(), s, wideSrc.data(), kFloats);
        convert(background.data(), d, wideBackground.data(), kFloats);
        wideOut = BlendFloats(mode, wideSrc, wideBackground, kWidth, kHeight, 0.7f);
        for (float& value : wideOut) value = std::min(value, 32768.0f);
        convert(wideOut.data(), kFloats, expected.data(), to);
        ASSERT_EQ(Blend(mode, {src.data(), kWidth * 4, s}, {background.data(), kWidth * 4, d},
                        {out.data(), kWidth * 4, to}, kWidth, kHeight, 0.7f),
                  VX_Success);
        ASSERT_EQ(out, expected) << ModeName(mode) << " " << FormatName(s) << " over " << FormatName(d) << " to "
                                 << FormatName(to);
      }
}

// ---- Dissolve

TEST(Dissolve, DrawsOnlyWhereNeededRowByRow) {
  constexpr int32_t kWidth = 401;
  for (const int32_t height : {1, 2, 64, 65, 200})
    for (const bool inBytes : {false, true}) {
      const auto count = static_cast<size_t>(kWidth * height);
      Floats src(count * 4), background(count * 4, -1.0f);
      Random random(static_cast<uint64_t>(height));
      static constexpr float kAlphas[] = {0, 7e-6f, 9e-6f, 0.2f, 0.6f, 1, 3, -0.5f, -1e-5f, kNan};
      for (size_t i = 0; i < count; ++i) {
        for (size_t k = 0; k < 3; ++k) src[4 * i + k] = static_cast<float>(random.Int(0, 255)) / 255;
        src[4 * i + 3] = inBytes ? static_cast<float>(random.Int(0, 255)) / 255 : kAlphas[random.Int(0, 9)];
        if (inBytes) std::fill_n(&background[4 * i], 4, 0.0f);
      }
      constexpr float kOpacity = 0.8f;
      SeedRuntimeRandom(height == 1 ? 99 : 12345);
      RandomSequence sequence(height == 1 ? 99 : 1);
      Floats out(count * 4), expected(count * 4);
      Bytes narrow[3];
      if (inBytes) {
        for (Bytes& picture : narrow) picture.resize(count * 4);
        VX_Convert(src.data(), kWidth * 16, kFloats, narrow[0].data(), kWidth * 4, F::ARGB_4444_8u, kWidth, height, 3);
        ASSERT_EQ(Blend(M::Dissolve, {narrow[0].data(), kWidth * 4, F::ARGB_4444_8u},
                        {narrow[1].data(), kWidth * 4, F::ARGB_4444_8u},
                        {narrow[2].data(), kWidth * 4, F::ARGB_4444_8u}, kWidth, height, kOpacity),
                  VX_Success);
        VX_Convert(narrow[2].data(), kWidth * 4, F::ARGB_4444_8u, out.data(), kWidth * 16, kFloats, kWidth, height, 3);
      } else {
        out = BlendFloats(M::Dissolve, src, background, kWidth, height, kOpacity);
      }
      for (size_t i = 0; i < count; ++i) {
        const float p = src[4 * i + 3] * kOpacity;
        bool fromSource = true;
        if (std::abs(p) < 8e-6f) {
          fromSource = false;
          if (height > 64) sequence.Next();
        } else if (std::isnan(p) || p * 32767 <= -1) {
          if (height > 64) sequence.Next();
        } else {
          fromSource = sequence.Next() <= static_cast<int>(p * 32767);
        }
        std::copy_n(&(fromSource ? src : background)[4 * i], 4, &expected[4 * i]);
      }
      for (size_t i = 0; i < expected.size(); ++i)
        ASSERT_TRUE(std::abs(out[i] - expected[i]) < 1e-6f || (std::isnan(out[i]) && std::isnan(expected[i])))
            << height << " rows, pixel " << i / 4;
      if (height > 64) sequence = RandomSequence(1);
      EXPECT_EQ(RuntimeRandom(), sequence.Next()) << "the thread's generator goes on behind the last draw";
    }
}

// ---- Formats, bands, refusals

ArenaCase BlendCase(M mode, F src, F background, F dst, float opacity) {
  ArenaCase arenaCase;
  arenaCase.name = std::string("blend ") + ModeName(mode);
  arenaCase.sources = {src, background};
  arenaCase.destination = dst;
  arenaCase.run = [=](const ArenaFrame* in, const ArenaFrame& to) {
    SeedRuntimeRandom(5);  // one row goes on with the thread's generator
    return Blend(mode, in[0], in[1], to, to.width, to.height, opacity);
  };
  return arenaCase;
}

TEST(BlendArena, EveryModeInFloatsAndBytes) {
  for (const M mode : Modes(true))
    for (const F format : {kFloats, kBytes, F::XRGB_4444_8u}) {
      ArenaCase arenaCase = BlendCase(mode, format, format, format, 0.9f);
      arenaCase.everyContents = true;
      arenaCase.widths = Range(1, 70);
      EXPECT_TRUE(RunArena(arenaCase));
    }
}

TEST(BlendArena, EveryFormat) {
  size_t turn = 0;
  const std::vector<F> formats = RasterFormats();
  for (const F format : formats) {
    const F other = formats[(turn * 7 + 3) % formats.size()];
    for (const auto& [src, background, dst] :
         {std::tuple{format, kFloats, other}, {other, format, kBytes}, {kBytes, other, format}}) {
      ArenaCase arenaCase = BlendCase(Modes(true)[turn++ % 26], src, background, dst, 1);
      arenaCase.widths = {1, 2, 3, 5, 6, 7, 16, 17, 31, 65, 130, 383, 385, 773};
      EXPECT_TRUE(RunArena(arenaCase));
    }
  }
}

// The destination is the source, or the background.
TEST(BlendArena, InPlace) {
  for (const M mode : Modes(true))
    for (const F format : {kFloats, F::ARGB_4444_8u, F::UYVY_422_8u_709})
      for (const bool overSource : {false, true}) {
        ArenaCase arenaCase = BlendCase(mode, format, format, format, 0.6f);
        arenaCase.sources = {format};
        arenaCase.destinationIsInput = true;
        arenaCase.widths = {1, 4, 17, 63, 130, 385, 801};
        arenaCase.heights = {1, 3, 66};
        arenaCase.run = [=](const ArenaFrame* in, const ArenaFrame& to) {
          const View other(*in), place(to);
          const auto row = static_cast<size_t>(UnpaddedRowBytes(format, to.width));
          Bytes apart(row * static_cast<size_t>(to.height)), copy(apart.size());
          for (int y = 0; y < to.height; ++y) std::memcpy(&copy[row * y], to.Row(y), row);
          const View held{copy.data(), static_cast<int32_t>(row), format},
              out{apart.data(), static_cast<int32_t>(row), format};
          SeedRuntimeRandom(5);
          VX_Result result =
              Blend(mode, overSource ? held : other, overSource ? other : held, out, to.width, to.height, 0.6f);
          EXPECT_EQ(result, VX_Success);
          SeedRuntimeRandom(5);
          result =
              Blend(mode, overSource ? place : other, overSource ? other : place, place, to.width, to.height, 0.6f);
          for (int y = 0; y < to.height; ++y)
            EXPECT_EQ(std::memcmp(&apart[row * y], to.Row(y), row), 0) << ModeName(mode) << " row " << y;
          return result;
        };
        ASSERT_TRUE(RunArena(arenaCase));
        ASSERT_FALSE(HasFailure());
      }
}

// A picture stored bottom row first over one stored top row first.
TEST(BlendMode, PicturesMeetUpright) {
  constexpr int32_t kHeight = 5;
  Bytes up(kHeight * 8), down(kHeight * 8), out(kHeight * 8), background(kHeight * 8);
  for (int y = 0; y < kHeight; ++y) {
    const uint8_t grey = static_cast<uint8_t>(40 * y + 20);
    const uint8_t pixel[8] = {grey, grey, grey, 255, grey, grey, grey, 255};
    std::memcpy(&down[y * 8], pixel, 8);
    std::memcpy(&up[(kHeight - 1 - y) * 8], pixel, 8);
  }
  const F pairs = F::UYVY_422_8u_709;
  std::fill(background.begin(), background.end(), uint8_t{128});
  for (int i = 1; i < kHeight * 4; i += 2) background[static_cast<size_t>(i)] = 16;
  ASSERT_EQ(
      Blend(M::LinearDodge, {up.data(), 8, kBytes}, {background.data(), 4, pairs}, {out.data(), 8, kBytes}, 2, kHeight),
      VX_Success);
  EXPECT_EQ(out, up);
  ASSERT_EQ(
      Blend(M::LinearDodge, {up.data(), 8, kBytes}, {background.data(), 4, pairs}, {out.data(), 4, pairs}, 2, kHeight),
      VX_Success);
  for (int y = 1; y < kHeight; ++y) EXPECT_GT(out[4 * y + 1], out[4 * y - 3]) << "brighter toward the bottom";
}

TEST(BlendMode, EqualForAnyNumberOfWorkers) {
  constexpr int32_t kWidth = 389, kHeight = 203;
  for (const M mode : {M::Dissolve, M::Hue, M::Overlay})
    for (const F dst : {kBytes, kFloats, F::UYVY_422_8u_709}) {
      Bytes src(kWidth * kHeight * 4), background(src.size()), first;
      Random(1).Fill(src.data(), src.size());
      Random(2).Fill(background.data(), background.size());
      const auto rowBytes = static_cast<int32_t>(UnpaddedRowBytes(dst, kWidth));
      for (const int workers : {1, 2, 3, 7, 16}) {
        vexel_host::SetThreadLimit(workers);
        SeedRuntimeRandom(static_cast<uint32_t>(workers));
        Bytes out(static_cast<size_t>(rowBytes) * kHeight);
        EXPECT_EQ(Blend(mode, {src.data(), kWidth * 4, kBytes}, {background.data(), kWidth * 4, kBytes},
                        {out.data(), rowBytes, dst}, kWidth, kHeight, 0.5f),
                  VX_Success);
        if (first.empty()) first = out;
        EXPECT_EQ(out, first) << ModeName(mode) << " with " << workers;
      }
      vexel_host::SetThreadLimit(0);
    }
}

TEST(BlendMode, RefusesInOrderBeforeItTouchesAPixel) {
  const struct {
    F src, background, dst;
    int32_t mode, width, height;
    VX_Result expected;
  } cases[] = {
      {kOpaqueFrame, kBytes, kOpaqueFrame, 27, -1, -1, VX_ErrUnsupportedFormat},
      {kBytes, kOpaqueFrame, kBytes, 0, 8, 8, VX_ErrUnsupportedFormat},
      {kBytes, kBytes, F::YUV_420_MPEG2_FRAME, 27, 8, 8, VX_ErrUnsupportedDestinationFormat},
      {kBytes, kBytes, kBytes, 27, -1, 8, VX_ErrFormatNotHandled},
      {kBytes, kBytes, kBytes, -1, 8, 8, VX_ErrFormatNotHandled},
      {kBytes, kBytes, kBytes, INT32_MIN, 8, 8, VX_ErrFormatNotHandled},
      {kBytes, kBytes, FromBits(0xFFFFFF), 6, 8, 8, VX_ErrFormatNotHandled},
      {F::Invalid, kBytes, kBytes, 0, 8, 8, VX_ErrFormatNotHandled},
      {kBytes, kBytes, kBytes, 0, -1, 8, VX_ErrArgumentOutOfRange},
      {kBytes, kBytes, kFloats, 6, 8, INT32_MIN, VX_ErrArgumentOutOfRange},
      {kBytes, kBytes, kBytes, 6, INT32_MAX, 8, VX_ErrArgumentOutOfRange},
      {kBytes, kBytes, kBytes, 6, 0, 8, VX_Success},
      {kFloats, kBytes, kBytes, 0, 8, 0, VX_Success},
  };
  for (const auto& c : cases)
    ExpectRefusal(std::string("blend mode ") + std::to_string(c.mode), c.expected, [&](void* memory) {
      return Blend(static_cast<M>(c.mode), {memory, 64, c.src}, {memory, -64, c.background}, {memory, 64, c.dst},
                   c.width, c.height);
    });
  uint8_t pixel[4] = {};
  const View some{pixel, 4, kBytes}, none{nullptr, 4, kBytes};
  EXPECT_EQ(Blend(M::Hue, none, some, some, 1, 1), VX_ErrNullSource);
  EXPECT_EQ(Blend(M::Hue, some, none, some, 1, 1), VX_ErrNullSource);
  EXPECT_EQ(Blend(M::Dissolve, some, some, none, 1, 1), VX_ErrNullDestination);
}

// Rows that do not fit on the stack: 4:2:2 in floats needs whole ones.
TEST(BlendMode, FailingAllocations) {
  constexpr int32_t kWidth = 20000;
  Bytes src(kWidth * 4), background(kWidth * 8), out(kWidth * 8);
  const View front(src.data(), kWidth * 4, kBytes), back(background.data(), kWidth * 8, F::UYVY_422_32f),
      to(out.data(), kWidth * 8, F::UYVY_422_32f);
  for (const M mode : {M::Hue, M::Dissolve}) {
    const auto blend = [&] { return Blend(mode, front, back, to, kWidth, 1); };
    EXPECT_GT(ExpectSurvivesFailingAllocations(ModeName(mode), blend), 0);
  }
}

}  // namespace
}  // namespace vexel::testing
