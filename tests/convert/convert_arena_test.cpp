// Every direct kernel and every pair of raster formats in the armed arena.
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "convert/RgbKernels.h"
#include "convert/StepGraph.h"
#include "convert/YuvKernels.h"
#include "formats/FormatBits.h"
#include "support/Arena.h"
#include "support/FailingAllocations.h"
#include "support/Formats.h"
#include "support/Operations.h"

namespace vexel::testing {
namespace {

using F = VX_PixelFormat;

ArenaCase ConvertCase(F src, F dst, int32_t quality) {
  ArenaCase arenaCase;
  arenaCase.name = "VX_Convert at quality " + std::to_string(quality);
  arenaCase.sources = {src};
  arenaCase.destination = dst;
  arenaCase.run = [=](const ArenaFrame* from, const ArenaFrame& to) { return Convert(*from, to, quality); };
  return arenaCase;
}

// Between steps, unnamed Y'CbCr rasters without alpha are packed 4:2:2 pairs.
F StoredAs(F format) {
  if (!IsYuv(format) || Layout(format) != kLayout4444 || AlphaKind(format) != kAlphaNone) return format;
  return FromBits(Bits(format) | kLayout422);
}

// Rows around the runs that stay in the cache too, and none at all.
void ExpectStaysInItsRows(const std::string& name, const RowKernelSet& kernel, F src, F dst) {
  auto* const unreadable = static_cast<uint8_t*>(UnreadableMemory());
  kernel[ActiveKernelVariant()](unreadable, unreadable, 0);
  ArenaCase arenaCase;
  arenaCase.name = name;
  arenaCase.sources = {src};
  arenaCase.destination = dst;
  arenaCase.everyContents = true;
  for (const int width : {131, 132, 133, 191, 192, 193, 197, 198, 255, 256, 257, 258, 383, 384, 389, 640, 720})
    arenaCase.widths.push_back(width);
  arenaCase.run = RunRows(kernel);
  EXPECT_TRUE(RunArena(arenaCase));
}

TEST(ConvertArena, EveryDirectKernel) {
  for (const Step& step : AllSteps())
    ExpectStaysInItsRows(std::string("direct ") + FormatName(step.from) + " to " + FormatName(step.to), *step.kernel,
                         StoredAs(step.from), StoredAs(step.to));
  ExpectStaysInItsRows("nearest chroma", kUyvy32fToVuyx32fNearest, F::UYVY_422_32f, F::VUYX_4444_32f);
  const struct {
    const RowKernelSet& kernel;
    F format;
  } copies[] = {{kCopy4, F::BGRA_4444_8u},     {kCopy8, F::BGRA_4444_15u},      {kCopy16, F::BGRA_4444_32f},
                {kCopy422_8u, F::UYVY_422_8u}, {kCopy422_32f, F::UYVY_422_32f}, {kCopyV210, F::V210_422_10u}};
  for (const auto& copy : copies) ExpectStaysInItsRows("copy", copy.kernel, copy.format, copy.format);
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
  const std::vector<F> pictures = Formats420();
  ASSERT_EQ(pictures.size(), 38u);
  for (const F picture : pictures)
    for (const F raster : {F::BGRA_4444_8u, F::BGRX_4444_8u, F::VUYX_4444_8u_709, F::UYVY_422_8u, F::PRGB_4444_32f}) {
      ArenaCase decode = ConvertCase(picture, raster, 3), encode = ConvertCase(raster, picture, 3);
      decode.widths = {1, 2, 3, 4, 7, 15, 16, 17, 30, 33, 62, 64, 65, 66, 127, 128, 129, 130, 131};
      decode.heights = encode.heights = {1, 2, 3, 4, 5, 6, 7, 8, 33, 34};
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

// Rows whose chain does not fit on the stack.
TEST(ConvertArena, FailingAllocations) {
  constexpr int32_t kWidth = 48000;
  std::vector<uint8_t> in(4 * kWidth * 16), out(4 * kWidth * 16);  // room for pictures of 32 rows
  const struct {
    F src, dst;
  } cases[] = {{F::YUV_420_MPEG4_FRAME_709, F::BGRA_4444_32f},
               {F::BGRA_4444_8u, F::YUV_420_MPEG4_FIELD_FullRange},
               {F::YUV_420_MPEG4_FIELD_FullRange, F::YUV_420_MPEG4_FRAME_709},
               {F::BGRA_4444_8u, F::VUYA_4444_8u},
               {F::UYVY_422_32f, F::BGRA_4444_32f},
               {F::XRGB_4444_8u, F::PRGB_4444_32f_Linear},
               {F::V210_422_10u, F::PRGB_4444_15u}};
  for (const auto& c : cases)
    EXPECT_GT(
        ExpectSurvivesFailingAllocations(
            FormatName(c.src) + " to " + FormatName(c.dst),
            [&] { return VX_Convert(in.data(), kWidth * 16, c.src, out.data(), kWidth * 16, c.dst, kWidth, 2, 3); }),
        Is420(c.src) || Is420(c.dst) ? 0 : -1);
}

}  // namespace
}  // namespace vexel::testing
