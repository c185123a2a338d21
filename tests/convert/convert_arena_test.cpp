// Every direct kernel and every pair of raster formats in the armed arena.
#include <gtest/gtest.h>

#include <cstring>
#include <string>
#include <vector>

#include "convert/StepGraph.h"
#include "formats/FormatBits.h"
#include "support/Arena.h"
#include "support/FailingAllocations.h"
#include "support/Formats.h"

namespace vexel::testing {
namespace {

using F = VX_PixelFormat;

constexpr F kOpaqueFrame = FromBits(0x7F000020);

std::string PairName(F src, F dst) { return std::string("VX_Convert ") + FormatName(src) + " to " + FormatName(dst); }

ArenaCase ConvertCase(F src, F dst, int32_t quality) {
  ArenaCase arenaCase;
  arenaCase.name = PairName(src, dst) + " at quality " + std::to_string(quality);
  arenaCase.sources = {src};
  arenaCase.destination = dst;
  arenaCase.run = [quality](const ArenaFrame* sources, const ArenaFrame& to) {
    const ArenaFrame& from = sources[0];
    return VX_Convert(from.base, from.rowBytes, from.format, to.base, to.rowBytes, to.format, to.width, to.height,
                      quality);
  };
  return arenaCase;
}

// Between steps, unnamed Y'CbCr rasters without alpha are packed 4:2:2 pairs.
F StoredAs(F format) {
  if (!IsYuv(format) || Layout(format) != kLayout4444 || AlphaKind(format) != kAlphaNone) return format;
  return FromBits(Bits(format) | kLayout422);
}

TEST(ConvertArena, EveryDirectKernel) {
  for (const Step& step : AllSteps()) {
    ArenaCase arenaCase;
    arenaCase.name = std::string("direct ") + FormatName(step.from) + " to " + FormatName(step.to);
    arenaCase.sources = {StoredAs(step.from)};
    arenaCase.destination = StoredAs(step.to);
    arenaCase.everyContents = true;
    arenaCase.run = RunRows(*step.kernel);
    EXPECT_TRUE(RunArena(arenaCase));
  }
}

// Longer rows than the blocks in which chains run, and what lies around the widths of vectors.
TEST(ConvertArena, EveryPair) {
  int32_t quality = 0;
  for (const F src : RasterFormats())
    for (const F dst : RasterFormats()) {
      ArenaCase arenaCase = ConvertCase(src, dst, quality++ % 6);
      arenaCase.widths = {1,  2,  3,  4,  5,  6,  7,  8,  9,  10, 11, 12, 13,  14,  15,  16,  17,  18,
                          19, 23, 24, 25, 31, 32, 33, 47, 48, 63, 64, 65, 127, 128, 129, 383, 385, 773};
      arenaCase.seed = static_cast<uint64_t>(quality);
      EXPECT_TRUE(RunArena(arenaCase));
    }
}

TEST(ConvertArena, Planar420) {
  std::vector<F> pictures;
  const auto add = [&](F format) {
    if (Is420(format)) pictures.push_back(format);
  };
#define ADD_NAMED(name, value, hostName, mapping) add(F::name);
#define ADD_UNNAMED(value, hostName, mapping) add(FromBits(value));
  VX_PIXEL_FORMATS(ADD_NAMED)
  VX_UNNAMED_PIXEL_FORMATS(ADD_UNNAMED)
#undef ADD_NAMED
#undef ADD_UNNAMED
  ASSERT_EQ(pictures.size(), 38u);
  for (const F picture : pictures)
    for (const F raster : {F::BGRA_4444_8u, F::BGRX_4444_8u, F::VUYX_4444_8u_709, F::UYVY_422_8u, F::PRGB_4444_32f}) {
      ArenaCase decode = ConvertCase(picture, raster, 3), encode = ConvertCase(raster, picture, 3);
      decode.widths = encode.widths = {1, 2, 3, 4, 7, 15, 16, 17, 30, 33, 62, 64, 65, 66, 127, 128, 129, 130, 131};
      decode.heights = encode.heights = {1, 2, 3, 4, 7, 8, 33, 34};
      if (IsBiplanar(picture) || (IsVideoRange(picture) && Colorimetry(picture) != kColorimetry709))
        encode.expected = VX_ErrFormatNotHandled;
      EXPECT_TRUE(RunArena(decode));
      EXPECT_TRUE(RunArena(encode));
    }
}

TEST(ConvertArena, InvalidIsEightBitWithoutAlpha) {
  int reached = 0;
  for (const F format : RasterFormats()) {
    ArenaCase from = ConvertCase(F::Invalid, format, 3), to = ConvertCase(format, F::Invalid, 3);
    from.widths = to.widths = {1, 2, 7, 33, 130, 500};
    const bool reaches = Depth(format) == kDepth8u && (IsYuv(format) || !IsReversed(format));
    if (!reaches) from.expected = VX_ErrFailed;
    reached += reaches;
    EXPECT_TRUE(RunArena(from));
    EXPECT_TRUE(RunArena(to));
  }
  EXPECT_EQ(reached, 13);
  ArenaCase neither = ConvertCase(F::Invalid, F::Invalid, 3);
  neither.expected = VX_ErrFailed;
  EXPECT_TRUE(RunArena(neither));
}

TEST(ConvertArena, RefusesBeforeItTouchesAPixel) {
  const struct {
    F src, dst;
    int32_t width, height;
    VX_Result expected;
  } cases[] = {
      {F::BGRA_4444_8u, F::BGRA_4444_8u, 64, 0, VX_Success},
      {F::BGRA_4444_8u, F::VUYA_4444_32f, 64, -1, VX_Success},
      {F::BGRA_4444_8u, F::VUYA_4444_32f, 64, INT32_MIN, VX_Success},
      {F::BGRA_4444_8u, F::BGRA_4444_8u, INT32_MAX, 0, VX_Success},
      {F::Invalid, F::Invalid, 64, 64, VX_ErrFailed},
      {F::Invalid, F::Invalid, 64, 0, VX_ErrFailed},
      {F::Invalid, F::BGRA_4444_32f, 64, 64, VX_ErrFailed},
      {FromBits(0x105), F::BGRA_4444_32f, 64, 64, VX_ErrFailed},
      {F::BGRA_4444_8u, FromBits(0xFFFFFF), 64, 64, VX_ErrFailed},
      {kOpaqueFrame, F::BGRA_4444_8u, 64, 64, VX_ErrUnsupportedFormat},
      {F::BGRA_4444_8u, kOpaqueFrame, 64, 64, VX_ErrFormatNotHandled},
      {F::BGRA_4444_8u, F::YUV_420_MPEG2_FRAME, 64, 64, VX_ErrFormatNotHandled},
      {F::BGRA_4444_8u, F::PALDV25, 720, 576, VX_ErrFormatNotHandled},
      {F::PAL_DV100_1080i, F::BGRA_4444_8u, 1920, 1080, VX_ErrUnsupportedConversion},
  };
  for (const auto& c : cases)
    ExpectRefusal(
        PairName(c.src, c.dst) + " " + std::to_string(c.width) + "x" + std::to_string(c.height), c.expected,
        [&](void* memory) { return VX_Convert(memory, 64, c.src, memory, -64, c.dst, c.width, c.height, 3); });
}

TEST(ConvertArena, GiantStrides) {
  for (const int32_t rowBytes : {INT32_MAX - 63, INT32_MIN + 64}) {
    const ArenaFrame giant = GiantStrideFrame(F::BGRA_4444_8u, 37, 7, rowBytes);
    std::vector<uint8_t> in(7 * 37 * 4), out(7 * 37 * 16), back(7 * 37 * 4);
    Random(5).Fill(in.data(), in.size());
    for (int row = 0; row < 7; ++row) std::memcpy(giant.Row(row), &in[static_cast<size_t>(row) * 37 * 4], 37 * 4);
    const auto wide = F::BGRA_4444_32f;
    ASSERT_EQ(VX_Convert(giant.base, rowBytes, giant.format, out.data(), 37 * 16, wide, 37, 7, 3), VX_Success);
    for (int row = 0; row < 7; ++row) std::memset(giant.Row(row), 0, 37 * 4);
    ASSERT_EQ(VX_Convert(out.data(), 37 * 16, wide, giant.base, rowBytes, giant.format, 37, 7, 3), VX_Success);
    for (int row = 0; row < 7; ++row) std::memcpy(&back[static_cast<size_t>(row) * 37 * 4], giant.Row(row), 37 * 4);
    EXPECT_EQ(in, back);
  }
}

// Rows whose chain does not fit on the stack.
TEST(ConvertArena, FailingAllocations) {
  constexpr int32_t kWidth = 40000;
  std::vector<uint8_t> in(2 * kWidth * 16), out(2 * kWidth * 16);
  const struct {
    F src, dst;
  } cases[] = {{F::BGRA_4444_8u, F::VUYA_4444_8u},
               {F::UYVY_422_32f, F::BGRA_4444_32f},
               {F::XRGB_4444_8u, F::PRGB_4444_32f_Linear},
               {F::V210_422_10u, F::PRGB_4444_15u}};
  for (const auto& c : cases)
    ExpectSurvivesFailingAllocations(PairName(c.src, c.dst), [&] {
      return VX_Convert(in.data(), kWidth * 16, c.src, out.data(), kWidth * 16, c.dst, kWidth, 2, 3);
    });
}

}  // namespace
}  // namespace vexel::testing
