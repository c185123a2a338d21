

#include "composite/BlendReference.h"
#include "frame/RuntimeRandom.h"
#include "support/Arena.h"
#include "support/Formats.h"
#include "support/Image.h"
#include "support/Operations.h"
#include "support/Processor.h"
#include "support/Test.h"

namespace vexel::testing {
namespace {

using M = VX_BlendMode;
using Floats = std::vector<float>;
using Bytes = std::vector<uint8_t>;

constexpr F kFloats = F::BGRA_4444_32f, kBytes = F::BGRA_4444_8u;

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

Floats BlendFloats(M mode, const Floats& src, const Floats& background, int32_t width, float opacity = 1) {
  Floats out(src.size());
  const auto view = [&](const Floats& p) { return View(p.data(), width * 16, kFloats); };
  const auto height = static_cast<int32_t>(src.size()) / 4 / width;
  EXPECT_EQ(Blend(mode, view(src), view(background), {out.data(), width * 16, kFloats, width, height}, opacity),
            VX_Success);
  return out;
}

// The same by way of a float picture: conversions take no more than 32,768 for a number.
Image BlendInFloats(M mode, const Image& src, const Image& background, F to, float opacity) {
  Image wide(kFloats, src.width, src.height);
  EXPECT_EQ(Blend(mode, src.Converted(kFloats), background.Converted(kFloats), wide, opacity), VX_Success);
  for (size_t i = 0; i < wide.bytes.size() / 4; ++i) wide.As<float>()[i] = std::min(wide.As<float>()[i], 32768.0f);
  return wide.Converted(to);
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
      const Floats out = BlendFloats(mode, src, background, width, opacity);
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
      // Divisors are held away from 0, each at its own distance.
      {M::ColorBurn, 1, {0, 0, 0, 1}, {1 - 0x1p-24f, 0.5f, 1, 1}, {1 - 0x1p-24f / 1e-7f, 0, 1, 1}},
      {M::ColorDodge, 1, {1, 1, 1, 1}, {5e-6f, 0.5f, 0, 1}, {5e-6f / (1 - 0.99999f), 1, 0, 1}},
      {M::VividLight,
       1,
       {1, 0, 0, 1},
       {1e-6f, 1 - 0x1p-20f, 0, 1},
       {0.5e-6f / (1 - 0.999999f), 1 - 0x1p-21f / 1e-6f, 0, 1}},
      {M::HardMix, 1, {0.25f, 0.25f, 0.25f, 1}, {0.75f, 0.7499f, 2, 1}, {1, 0, 1, 1}},
      {M::LinearLight, 1, {1, 0, 2, 1}, {1, 0, 0.5f, 1}, {2, -1, 1.5f, 1}},
      // Equal luminance keeps the background, alpha included; a clear background gives way; a clear source stays out.
      {M::DarkerColor, 1, {1, 1, 1, 1}, {2, 2, 2, 0.5f}, {2, 2, 2, 0.5f}},
      {M::LighterColor, 0.5f, {0.25f, 0.5f, 1, 0.5f}, {9, 9, 9, 7e-6f}, {0.25f, 0.5f, 1, 0.25f}},
      {M::LighterColor, 1, {1, 1, 1, 7e-6f}, {0.5f, -3, 0.25f, 0.5f}, {0.5f, -3, 0.25f, 0.5f}},
      {M::LighterColor, 0.5f, {0.25f, 0.5f, 1, 0.5f}, {9, 9, 9, 8.4e-6f}, {9, 9, 9, 8.4e-6f}},
      {M::LighterColor, 1, {1, 1, 1, 8.4e-6f}, {0.5f, -3, 0.25f, 0}, {1, 1, 1, 8.4e-6f}},
      // NaN stays in its channel, and in the pixel where it is an alpha.
      {M::Screen, 1, {kNaN, 1, 0.5f, 1}, {0.5f, kNaN, 0.5f, 1}, {kNaN, kNaN, 0.75f, 1}},
      {M::Luminosity, 1, {kNaN, 0, 0, 1}, {0.5f, 0.5f, 0.5f, 1}, {kNaN, 0, 0, 1}},
      {M::Multiply, 1, {1, 1, 1, kNaN}, {1, 1, 1, 1}, {kNaN, kNaN, kNaN, kNaN}},
      // A NaN opacity shows nothing of the source.
      {M::Difference, kNaN, {1, 1, 1, 1}, {0.25f, 0.5f, 0.75f, 0.5f}, {0.25f, 0.5f, 0.75f, 0.5f}},
  };
  for (const OnePixel& c : cases) {
    const Floats out = BlendFloats(c.mode, c.src, c.background, 1, c.opacity);
    for (size_t k = 0; k < 4; ++k)
      EXPECT_TRUE(std::isnan(c.expected[k])
                      ? std::isnan(out[k])
                      : std::abs(out[k] - c.expected[k]) <= 1e-6f * std::max(1.0f, std::abs(c.expected[k])))
          << ModeName(c.mode) << " channel " << k << ": " << out[k];
  }
  for (const M mode : Modes(true)) {
    const Floats clear = BlendFloats(mode, {0.25f, 4, -1, 0}, {0.5f, 3, 7, 0}, 1);
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
    EXPECT_EQ(BlendFloats(M::DarkerColor, src, background, width), width == 720 ? background : src);
    EXPECT_EQ(BlendFloats(M::LighterColor, src, background, width), width == 720 ? src : background);
  }
}

// ---- Bytes

// Every pair of codes in some channel, under alphas from the ends and between, and every pair of alphas over random
// colours: the bytes of the way through floats, and within one code of the formula.
void ExpectBytes(M mode, const Image& src, const Image& background, float opacity) {
  Image out(kBytes, src.width, src.height);
  ASSERT_EQ(Blend(mode, src, background, out, opacity), VX_Success);
  ASSERT_EQ(out.bytes, BlendInFloats(mode, src, background, kBytes, opacity).bytes) << ModeName(mode);
  for (size_t i = 0; i < out.bytes.size(); i += 4) {
    const uint8_t *s = &src.bytes[i], *d = &background.bytes[i];
    const auto pixel = [](const uint8_t* p) {
      return ReferencePixel{{p[0] / 255.0, p[1] / 255.0, p[2] / 255.0}, p[3] / 255.0};
    };
    const ReferencePixel expected = BlendReference(mode, pixel(s), pixel(d), opacity, src.width);
    for (size_t k = 0; k < 4; ++k) {
      // Which side of its step 1 - d is on at s + d = 1 is a matter of rounding.
      if (mode == M::HardMix && s[k] + d[k] == 255) continue;
      const double wanted = 255 * reference::Unit(k == 3 ? expected.alpha : expected.colour[k]);
      ASSERT_LE(std::abs(out.bytes[i + k] - wanted), 0.501)
          << ModeName(mode) << " opacity " << opacity << " channel " << k << ", source " << int{s[k]} << " alpha "
          << int{s[3]} << ", background " << int{d[k]} << " alpha " << int{d[3]};
    }
  }
}

TEST(ByteBlend, EveryPairOfCodes) {
  Image src(kBytes, 256, 86), background = src;  // three pairs a pixel
  const auto setPixels = [](Image& image, int shift, uint8_t alpha) {
    for (size_t i = 0; i < image.bytes.size(); ++i)
      image.bytes[i] = i % 4 == 3 ? alpha : static_cast<uint8_t>((i / 4 * 3 + i % 4) % 65536 >> shift);
  };
  int round = 0;
  for (const uint8_t as : {0, 1, 127, 254, 255})
    for (const uint8_t ab : {0, 1, 127, 254, 255}) {
      setPixels(src, 8, as), setPixels(background, 0, ab);
      for (const M mode : Modes()) ExpectBytes(mode, src, background, round++ % 3 ? 1.0f : 0.4f);
      if (::testing::Test::HasFatalFailure()) return;
    }
}

TEST(ByteBlend, EveryPairOfAlphas) {
  Image src(kBytes, 256, 256, 7), background(kBytes, 256, 256, 8);
  for (size_t i = 0; i < 65536; ++i) {
    src.bytes[4 * i + 3] = static_cast<uint8_t>(i >> 8);
    background.bytes[4 * i + 3] = static_cast<uint8_t>(i);
  }
  for (const M mode : Modes()) ExpectBytes(mode, src, background, 1);
}

// The orders and kinds of alpha that are read and written as bytes, against pictures converted by themselves.
TEST(BlendMode, ByteFormatsAgreeWithConversions) {
  const F kinds[] = {F::BGRA_4444_8u, F::ARGB_4444_8u, F::BGRX_4444_8u,
                     F::XRGB_4444_8u, F::BGRP_4444_8u, F::PRGB_4444_8u};
  uint64_t turn = 0;
  for (const F s : kinds)
    for (const F d : kinds)
      for (const F to : kinds) {
        const M mode = Modes()[turn++ % Modes().size()];
        const Image src(s, 500, 3, turn), background(d, 500, 3, ~turn);
        Image out(to, 500, 3);
        ASSERT_EQ(Blend(mode, src, background, out, 0.7f), VX_Success);
        ASSERT_EQ(out.bytes, BlendInFloats(mode, src, background, to, 0.7f).bytes)
            << ModeName(mode) << " " << FormatName(s) << " over " << FormatName(d) << " to " << FormatName(to);
      }
}

// ---- Dissolve

TEST(Dissolve, DrawsOnlyWhereNeededRowByRow) {
  constexpr int32_t kWidth = 401;
  for (const int32_t height : {1, 2, 64, 65, 300})
    for (const bool inBytes : {false, true})
      ForEachVariant([&](int) {
        const auto count = static_cast<size_t>(kWidth * height);
        Floats src(count * 4), background(count * 4, -1.0f);
        Random random(static_cast<uint64_t>(height));
        static constexpr float kAlphas[] = {0, 7e-6f, 9e-6f, 0.2f, 0.6f, 1, 3, -0.5f, -1e-5f, kNaN};
        for (size_t i = 0; i < count; ++i) {
          for (size_t k = 0; k < 3; ++k) src[4 * i + k] = static_cast<float>(random.Int(0, 255)) / 255;
          src[4 * i + 3] = inBytes ? static_cast<float>(random.Int(0, 255)) / 255 : kAlphas[random.Int(0, 9)];
          if (inBytes) std::fill_n(&background[4 * i], 4, 0.0f);
        }
        constexpr float kOpacity = 0.8f;
        SeedRuntimeRandom(height == 1 ? 99 : 12345);
        RandomSequence sequence(height == 1 ? 99 : 1);
        Floats out(count * 4), expected(count * 4);
        if (inBytes) {
          const F format = F::ARGB_4444_8u;
          Image wide(kFloats, kWidth, height), narrow(format, kWidth, height, Contents::Zeros);
          std::memcpy(wide.bytes.data(), src.data(), wide.bytes.size());
          ASSERT_EQ(Blend(M::Dissolve, wide.Converted(format), narrow, narrow, kOpacity), VX_Success);
          std::memcpy(out.data(), narrow.Converted(kFloats).bytes.data(), wide.bytes.size());
        } else {
          out = BlendFloats(M::Dissolve, src, background, kWidth, kOpacity);
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
      });
}

// ---- Formats and refusals; more in operations_test.cpp

TEST(BlendMode, KernelsInTheArena) {
  for (const M mode : Modes(true))
    for (const F format : {kFloats, kBytes, F::XRGB_4444_8u, F::PRGB_4444_8u}) {
      ArenaCase arenaCase;
      arenaCase.name = std::string("blend ") + ModeName(mode);
      arenaCase.sources = {format, format};
      arenaCase.destination = format;
      arenaCase.run = [=](const ArenaFrame* in, const ArenaFrame& to) {
        SeedRuntimeRandom(5);  // one row goes on with the thread's generator
        return Blend(mode, in[0], in[1], to, 0.9f);
      };
      arenaCase.everyContents = true;
      arenaCase.widths = Range(1, 70);
      EXPECT_TRUE(RunArena(arenaCase));
    }
}

TEST(BlendMode, UnknownModesComeAfterFrames) {
  for (const int32_t mode : {27, -1, INT32_MIN})
    for (const auto& [src, expected] :
         {std::pair{kBytes, VX_ErrFormatNotHandled}, {F::YUV_420_MPEG2_FRAME, VX_ErrUnsupportedFormat}})
      ExpectRefusal("blend mode " + std::to_string(mode), expected, [&, src = src](void* memory) {
        return Blend(static_cast<M>(mode), {memory, 64, src}, {memory, 64, kBytes}, {memory, 64, kBytes, -1, 8});
      });
}

}  // namespace
}  // namespace vexel::testing
