// Conversions of pictures: their plans, every pair of formats, every direct kernel in the armed arena.
#include <map>

#include "convert/Planar420.h"
#include "convert/Planner.h"
#include "convert/RgbKernels.h"
#include "convert/RowConverter.h"
#include "convert/StepGraph.h"
#include "convert/YuvKernels.h"
#include "frame/KernelVariant.h"
#include "support/Arena.h"
#include "support/FailingAllocations.h"
#include "support/Formats.h"
#include "support/Image.h"
#include "support/Operations.h"
#include "support/Processor.h"
#include "support/Test.h"

namespace vexel::testing {
namespace {

// The formats on the way from one to another; none without a way.
std::vector<F> WayOf(F src, F dst, int32_t quality = 2) {
  std::vector<F> formats(9);
  int32_t count = 0;
  if (VX_ExplainConversion(src, dst, quality, formats.data(), &count) != VX_Success) count = 0;
  formats.resize(static_cast<size_t>(count));
  return formats;
}

std::string Chain(F src, F dst) {
  std::string text;
  for (const F format : WayOf(src, dst)) text += (text.empty() ? "" : " > ") + FormatName(format);
  return text.empty() ? "none" : text;
}

// What both ends keep is kept in between: depth, alpha, and straight colour where alpha is 0.
TEST(Planner, EveryPairWalksAlongStepsOfTheGraphAndLosesNothing) {
  for (F src : RasterFormats())
    for (F dst : RasterFormats()) {
      SCOPED_TRACE(Chain(src, dst));
      Plan plan;
      ASSERT_EQ(MakePlan(src, dst, 2, &plan), VX_Success);
      ASSERT_GE(plan.stepCount, 1);
      ASSERT_LE(plan.stepCount, kMaxSteps);
      F current = src;
      for (int i = 0; i < plan.stepCount; ++i) {
        const F through = plan.steps[i].to;
        const auto isStep = [&](const Step& step) { return step.from == current && step.to == through; };
        ASSERT_TRUE(src == dst || std::ranges::any_of(AllSteps(), isStep));
        current = through;
        EXPECT_GE(DepthBits(through), std::min(DepthBits(src), DepthBits(dst)));
        EXPECT_TRUE(HasAlpha(through) || !HasAlpha(src) || !HasAlpha(dst));
        EXPECT_TRUE(Layout(through) == kLayout4444 || Layout(src) != kLayout4444 || Layout(dst) != kLayout4444);
        EXPECT_TRUE(AlphaKind(through) == kAlphaStraight || AlphaKind(src) != kAlphaStraight ||
                    AlphaKind(dst) != kAlphaStraight);
      }
      ASSERT_EQ(current, dst);
    }
}

TEST(Planner, DirectStepsAreTaken) {
  for (const Step& step : AllSteps()) {
    if (AlphaKind(step.from) == kAlphaNone && Layout(step.from) == kLayout4444 && step.from != kRgb10Format) continue;
    Plan plan;
    ASSERT_EQ(MakePlan(step.from, step.to, 2, &plan), VX_Success);
    const bool needsSimd =
        step.to == F::BGRA_4444_8u && (step.from == F::VUYX_4444_8u || step.from == F::VUYX_4444_8u_709);
    const bool hasSimd = ActiveKernelVariant() != KernelVariant::Plain;
    EXPECT_EQ(plan.stepCount, needsSimd && !hasSimd ? 2 : 1) << Chain(step.from, step.to);
  }
}

TEST(Planner, FixedAndTellingChains) {
  EXPECT_EQ(Chain(F::BGRA_4444_8u, F::BGRA_4444_32f), "BGRA_4444_8u > BGRA_4444_32f");
  EXPECT_EQ(Chain(F::BGRA_4444_8u, F::VUYA_4444_8u), "BGRA_4444_8u > VUYA_4444_8u");
  EXPECT_EQ(Chain(F::XRGB_4444_8u, F::PRGB_4444_32f_Linear),
            "XRGB_4444_8u > PRGB_4444_8u > BGRP_4444_8u > BGRP_4444_32f > BGRA_4444_32f > BGRA_4444_32f_Linear > "
            "ARGB_4444_32f_Linear > PRGB_4444_32f_Linear");
  EXPECT_EQ(Chain(F::VUYA_4444_8u, F::VUYX_4444_32f), "VUYA_4444_8u > VUYA_4444_32f > VUYP_4444_32f > VUYX_4444_32f");
  EXPECT_EQ(Chain(F::BGRA_4444_8u, F::Invalid), "BGRA_4444_8u > BGRP_4444_8u > Invalid");
  EXPECT_EQ(Chain(F::BGRA_4444_8u, F::UYVY_422_8u), "BGRA_4444_8u > BGRP_4444_8u > VUYP_4444_8u > UYVY_422_8u");
  EXPECT_EQ(Chain(F::V210_422_10u, F::BGRA_4444_15u),
            "V210_422_10u > UYVY_422_32f > VUYA_4444_32f > BGRA_4444_32f > BGRA_4444_15u");
}

TEST(Planner, ExplainsSpecialEnds) {
  EXPECT_EQ(Chain(F::YUV_420_MPEG4_FRAME_709, F::VUYX_4444_8u_709), "YUV_420_MPEG4_FRAME_709 > VUYX_4444_8u_709");
  EXPECT_EQ(Chain(F::YUV_420_MPEG2_FIELD_FullRange, F::BGRX_4444_15u),
            "YUV_420_MPEG2_FIELD_FullRange > BGRX_4444_8u > BGRX_4444_15u");
  EXPECT_EQ(Chain(F::VUYA_4444_8u, F::YUV_420_MPEG4_FRAME_FullRange),
            "VUYA_4444_8u > BGRA_4444_8u > BGRP_4444_8u > BGRX_4444_8u > YUV_420_MPEG4_FRAME_FullRange");
  EXPECT_EQ(Chain(F::V210_422_10u_709, F::YUV_420_MPEG2_FRAME_709), "V210_422_10u_709 > YUV_420_MPEG2_FRAME_709");
  EXPECT_EQ(Chain(F::YUV_420_MPEG4_FRAME_FullRange, F::YUV_420_MPEG4_FRAME_FullRange),
            "YUV_420_MPEG4_FRAME_FullRange > BGRX_4444_8u > YUV_420_MPEG4_FRAME_FullRange");
  // Every chain fits: the 4:2:0 end and at most nine rasters would not.
  for (F src : {F::YUV_420_MPEG4_FRAME, F::YUV_420_MPEG4_FRAME_709, F::YUV_420_MPEG2_FIELD_FullRange})
    for (F dst : RasterFormats()) EXPECT_NE(Chain(src, dst), "none") << FormatName(src) << " to " << FormatName(dst);
  F formats[9];
  int32_t count = 0;
  EXPECT_EQ(VX_ExplainConversion(F::PALDV25, F::BGRA_4444_8u, 2, formats, &count), VX_ErrUnsupportedFormat);
  EXPECT_EQ(VX_ExplainConversion(F::BGRA_4444_8u, F::PALDV25, 2, formats, &count), VX_ErrFormatNotHandled);
  EXPECT_EQ(VX_ExplainConversion(F::BGRA_4444_8u, F::YUV_420_MPEG4_FRAME, 2, formats, &count), VX_ErrFormatNotHandled);
}

// Every special value, named or not, at either end of a way.
TEST(Planner, ExplainsWhatConvertDoes) {
  F formats[9];
  int32_t count = 0;
  for (uint32_t kind = 1; kind < 17; ++kind)
    for (uint32_t bits = 0; bits < 0x2000; ++bits) {
      const F special = FromBits(kind << 24 | bits);
      for (const F other : {F::BGRX_4444_8u, F::Invalid, F::YUV_420_MPEG2_FRAME_709, FromBits(0x12345), special})
        for (const auto& [src, dst] : {std::pair{special, other}, {other, special}})
          ASSERT_EQ(VX_ExplainConversion(src, dst, 2, formats, &count),
                    VX_Convert(nullptr, 0, src, nullptr, 0, dst, 0, 1, 2))
              << std::hex << Bits(src) << " to " << Bits(dst);
    }
}

// In plain code, too, all others are the same.
TEST(Planner, TwoChainsDependOnTheSse2Switch) {
  std::map<std::string, std::string> differ;
  for (F src : RasterFormats())
    for (F dst : RasterFormats()) {
      std::string chains[2];
      for (const int on : {1, 0}) {
        VX_SetDebugFlag(3, on);
        chains[on] = Chain(src, dst);
      }
      if (chains[0] != chains[1]) differ[chains[1]] = chains[0];
    }
  VX_SetDebugFlag(3, 1);
  const bool isPlain = ActiveKernelVariant() == KernelVariant::Plain;
  EXPECT_EQ(differ.size(), isPlain ? 0u : 2u) << ::testing::PrintToString(differ);
  for (const std::string end : {"_4444_8u", "_4444_8u_709"}) {
    const std::string x = "VUYX" + end, direct = x + " > BGRA_4444_8u";
    const std::string without = isPlain ? Chain(VX_PixelFormatFromName(x.c_str()), F::BGRA_4444_8u) : differ[direct];
    EXPECT_EQ(without, x + " > VUYA" + end + " > BGRA_4444_8u");
  }
}

TEST(Planner, RefusesSpecialAndUnknownFormats) {
  Plan plan;
  EXPECT_EQ(MakePlan(F::PALDV25, F::BGRA_4444_8u, 2, &plan), VX_ErrUnsupportedFormat);
  EXPECT_EQ(MakePlan(F::BGRA_4444_8u, F::YUV_420_MPEG2_FRAME, 2, &plan), VX_ErrUnsupportedDestinationFormat);
  EXPECT_EQ(MakePlan(FromBits(0x105), F::BGRA_4444_8u, 2, &plan), VX_ErrFailed);
  EXPECT_EQ(MakePlan(F::BGRA_4444_8u, FromBits(0x00FFFFFF), 2, &plan), VX_ErrFailed);
}

TEST(Planner, RenderQualityPicksTheChromaKernelOnly) {
  Plan low, high;
  ASSERT_EQ(MakePlan(F::UYVY_422_32f, F::VUYA_4444_32f, 1, &low), VX_Success);
  ASSERT_EQ(MakePlan(F::UYVY_422_32f, F::VUYA_4444_32f, 2, &high), VX_Success);
  EXPECT_EQ(low.steps[0].kernel, &kUyvy32fToVuyx32fNearest);
  EXPECT_EQ(high.steps[0].kernel, &kUyvy32fToVuyx32f);
}

TEST(Convert, RefusalsComeInOrderAndTouchNothing) {
  const struct {
    F src, dst;
    int32_t width, height;
    VX_Result expected;
  } cases[] = {
      {F::Invalid, F::Invalid, 4, 4, VX_ErrFailed},
      {F::Invalid, F::Invalid, 4, 0, VX_ErrFailed},
      {F::Invalid, F::ARGB_4444_8u, 4, 4, VX_ErrFailed},
      {FromBits(0x105), F::BGRA_4444_8u, 4, 4, VX_ErrFailed},
      {F::BGRA_4444_8u, FromBits(0x1FFF), 4, 4, VX_ErrFailed},
      {F::BGRA_4444_8u, F::UYVY_422_8u, 4, 0, VX_Success},
      {F::BGRA_4444_8u, F::BGRA_4444_8u, INT_MAX, 0, VX_Success},
      {F::BGRA_4444_8u, F::VUYA_4444_32f, 64, -1, VX_Success},
      {F::BGRA_4444_8u, F::UYVY_422_8u, 4, INT_MIN, VX_Success},
      {F::BGRA_4444_8u, F::UYVY_422_8u, 0, 4, VX_Success},
      {F::BGRA_4444_8u, F::UYVY_422_8u, -1, 4, VX_ErrArgumentOutOfRange},
      {F::BGRA_4444_8u, F::BGRA_4444_8u, INT_MIN, 4, VX_ErrArgumentOutOfRange},
      {F::BGRA_4444_8u, F::BGRA_4444_8u, INT_MAX, 1, VX_ErrArgumentOutOfRange},
      {F::UYVY_422_8u, F::BGRA_4444_32f, INT_MAX / 8, INT_MAX, VX_ErrArgumentOutOfRange},
      // DV: a larger request than the native size cannot be decoded; otherwise there is no decoder.
      {F::PAL_DV100_1080i, F::BGRA_4444_8u, 1920, 1080, VX_ErrUnsupportedConversion},
      {F::PAL_DV100_1080i, F::BGRA_4444_8u, 1440, 1080, VX_ErrUnsupportedFormat},
      {F::PAL_DV100_1080i, F::BGRA_4444_8u, 720, 1080, VX_ErrUnsupportedFormat},
      {F::PALDV25, F::BGRA_4444_8u, 720, 576, VX_ErrUnsupportedFormat},
      {F::NTSCDV25, F::BGRA_4444_8u, 720, 576, VX_ErrUnsupportedConversion},
      {FromBits(0x7F000020), F::BGRA_4444_8u, 4, 4, VX_ErrUnsupportedFormat},
      // 4:2:0 ends: the way first, then nothing to do, then sizes.
      {F::BGRA_4444_8u, F::YUV_420_MPEG2_FRAME_FullRange, 16, -1, VX_Success},
      {F::YUV_420_MPEG2_FRAME_FullRange, F::YUV_420_MPEG2_FRAME_FullRange, 16, 0, VX_Success},
      {F::YUV_420_MPEG2_FRAME_FullRange, F::BGRX_4444_8u, 16, -1, VX_Success},
      {F::YUV_420_MPEG2_FRAME_709, FromBits(0x0E000A31), 16, 0, VX_ErrFormatNotHandled},
      {F::YUV_420_MPEG2_FRAME_709, F::UYVY_422_8u, -1, 4, VX_ErrArgumentOutOfRange},
      {F::BGRA_4444_8u, F::YUV_420_MPEG2_FRAME_709, -1, 4, VX_ErrArgumentOutOfRange},
      {F::BGRX_4444_8u, F::YUV_420_MPEG2_FRAME_FullRange, INT_MAX, 1, VX_ErrArgumentOutOfRange},
      {FromBits(0x12345), F::YUV_420_MPEG2_FRAME_709, 16, 16, VX_ErrFailed},
      {FromBits(0x0A000871), F::BGRA_4444_8u, 200, 64, VX_ErrUnsupportedFormat},
      // No decoder and no encoder for such depths and colorimetries, whatever the size.
      {FromBits(0x0D000CF9), F::BGRA_4444_8u, 16, 0, VX_ErrUnsupportedFormat},
      {F::BGRX_4444_8u, FromBits(0x0A000071), 16, 0, VX_ErrFormatNotHandled},
      {F::BGRX_4444_8u, FromBits(0x0A000431), -1, 1, VX_ErrFormatNotHandled},
      {F::YUV_420_MPEG2_FRAME_709, FromBits(0x0A000631), 16, 0, VX_ErrFormatNotHandled},
      {FromBits(0x801), F::VUYA_4444_8u, 3, 1, VX_ErrFailed},
      {F::Invalid, FromBits(0xA01), 3, 1, VX_ErrFailed},
      // Destinations without an encoder.
      {F::BGRA_4444_8u, F::PALDV25, 720, 576, VX_ErrFormatNotHandled},
      {F::YUYV_422_8u, F::PALDV50, 720, 576, VX_ErrFormatNotHandled},
      {F::BGRA_4444_8u, F::YUV_420_MPEG2_FRAME, 64, 64, VX_ErrFormatNotHandled},
      {F::BGRA_4444_8u, FromBits(0x0E000A31), 64, 64, VX_ErrFormatNotHandled},
      {F::BGRA_4444_8u, FromBits(0x7F000020), 64, 64, VX_ErrFormatNotHandled},
      {F::YUV_420_MPEG2_FRAME_709, F::YUV_420_MPEG2_FRAME_709, 64, 64, VX_ErrFormatNotHandled},
  };
  for (const auto& c : cases)
    ExpectRefusal("case " + std::to_string(&c - cases), c.expected, [&](void* memory) {
      return VX_Convert(memory, 64, c.src, memory, -64, c.dst, c.width, c.height, 2);
    });
  for (const auto& [quality, expected] : {std::pair{2, VX_ErrUnsupportedFormat}, {3, VX_ErrUnsupportedConversion}})
    ExpectRefusal("a smaller DV picture", expected, [&, q = quality](void* memory) {
      return VX_Convert(memory, 0, F::PAL_DV100_1080i, memory, 64, F::BGRA_4444_8u, 1000, 1000, q);
    });
  uint8_t pixel[64] = {};
  EXPECT_EQ(VX_Convert(nullptr, 64, F::BGRA_4444_8u, pixel, 64, F::BGRA_4444_8u, 1, 1, 2), VX_ErrNullSource);
  EXPECT_EQ(VX_Convert(pixel, 64, F::BGRA_4444_8u, nullptr, 64, F::BGRA_4444_8u, 1, 1, 2), VX_ErrNullDestination);
}

// Chains run in blocks, in whole rows or fused into one kernel: always the bytes of their steps one after the other.
// Past the cache rows are made in blocks: no kernel looks farther than they overlap, and none sees where they end. A
// format converted to itself keeps every byte.
TEST(Convert, AChainGivesTheBytesOfItsStepsAndStreamsThem) {
  for (F src : RasterFormats())
    for (F dst : RasterFormats()) {
      SCOPED_TRACE(FormatName(src) + " to " + FormatName(dst));
      const Image source(src, 2 * static_cast<int>(kStreamBlock) + 7, 2, Contents::Extremes, Bits(src) + 1);
      const auto chained = source.Converted(dst, 2).bytes;
      Image stepped = source;
      for (const F through : WayOf(src, dst)) stepped = stepped.Converted(through, 2);
      ASSERT_EQ(stepped.bytes, chained);
      ASSERT_TRUE(src != dst || chained == source.bytes);
      const SmallCache small;
      ASSERT_EQ(source.Converted(dst, 2).bytes, chained);
    }
}

// A picture of any kind.
struct Picture {
  F format;
  int32_t width, height;
  std::vector<uint8_t> bytes;
  Picture(F f, int32_t w, int32_t h)
      : format(f), width(w), height(h), bytes(static_cast<size_t>(VX_PixelFormatSize(f, w, h))) {}
  int32_t RowBytes() const { return IsSpecial(format) ? 0 : static_cast<int32_t>(bytes.size()) / height; }
  Picture Flipped() const {
    Picture flipped = *this;
    if (!IsSpecial(format)) VX_FlipInPlace(flipped.bytes.data(), RowBytes(), width, height, format);
    return flipped;
  }
};

// Downward, the first row of a raster is the last one in memory.
VX_Result Convert(const Picture& src, Picture& dst, int32_t quality, bool down = false) {
  const int32_t from = src.RowBytes(), to = dst.RowBytes(), last = down ? src.height - 1 : 0;
  return VX_Convert(src.bytes.data() + last * from, down ? -from : from, src.format, dst.bytes.data() + last * to,
                    down ? -to : to, dst.format, src.width, src.height, quality);
}

// 4:2:0 pictures come and go line by line: with the bytes of whole frames, whichever way up.
TEST(Convert, PicturesGiveTheBytesOfTheirSteps) {
  struct Size {
    int32_t width, height;
  };
  const Size sizes[] = {{2061, 5}, {1, 1}, {34, 6}};  // lines in parts too
  std::vector<F> all = Formats420();
  const std::vector<F> rasters = RasterFormats();
  all.insert(all.end(), rasters.begin(), rasters.end());
  int turn = 0, reached = 0;
  for (const F from : all)
    for (const F to : all) {
      const int32_t quality = turn / 3 % 3 + 1;
      if (!Is420(from) && !Is420(to)) continue;
      const std::vector<F> way = WayOf(from, to, quality);
      if (way.empty()) continue;
      if (Is420(from) && HasWideSamples(from) && !IsBiplanar(from)) continue;
      const Size size = sizes[turn++ % 3];
      Picture src(from, size.width, size.height);
      Random random(static_cast<uint64_t>(turn));
      FillSamples(src.bytes.data(), src.bytes.size(), from, Contents::Random, random);
      Picture dst(to, size.width, size.height), dstDown = dst;
      ASSERT_EQ(Convert(src, dst, quality), VX_Success) << FormatName(from) << " to " << FormatName(to);
      ASSERT_EQ(Convert(src.Flipped(), dstDown, quality, true), VX_Success);
      Picture stepped = src;
      for (size_t i = 1; i < way.size(); ++i) {
        Picture next(way[i], size.width, size.height);
        ASSERT_EQ(Convert(stepped, next, quality), VX_Success);
        stepped = next;
      }
      ASSERT_EQ(stepped.bytes, dst.bytes) << FormatName(from) << " to " << FormatName(to) << " " << size.width;
      ASSERT_EQ(dstDown.Flipped().bytes, dst.bytes) << FormatName(from) << " to " << FormatName(to);
      // Past the cache straight or staged, by how rows lie in its lines.
      const SmallCache small;
      LineBytes memory(dst.bytes.size() + 16);
      uint8_t* const past = memory.data() + turn % 2 * 16;
      ASSERT_EQ(VX_Convert(src.bytes.data(), src.RowBytes(), from, past, dst.RowBytes(), to, size.width, size.height,
                           quality),
                VX_Success);
      ASSERT_TRUE(std::equal(dst.bytes.begin(), dst.bytes.end(), past)) << FormatName(from) << " to " << FormatName(to);
      ++reached;
    }
  EXPECT_GT(reached, 2000);
}

// ---- Every direct kernel and every pair of raster formats in the armed arena

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
  constexpr int32_t kWidth = 72000;
  std::vector<uint8_t> in(4 * kWidth * 16), out(4 * kWidth * 16);  // room for pictures of 32 rows
  const struct {
    F src, dst;
  } cases[] = {{F::YUV_420_MPEG4_FRAME_709, F::BGRA_4444_32f},
               {F::ARGB_4444_8u, F::YUV_420_MPEG4_FIELD_FullRange},
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
        Is420(c.src) != Is420(c.dst) ? 0 : -1);  // between 4:2:0 pictures, lines pass in parts
}

}  // namespace
}  // namespace vexel::testing
