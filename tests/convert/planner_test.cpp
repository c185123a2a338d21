#include "convert/Planner.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <string>

#include "convert/YuvKernels.h"
#include "support/Formats.h"

namespace vexel {
namespace {

using F = VX_PixelFormat;
using testing::FormatName;
using testing::kRgb10Format;
using testing::RasterFormats;

std::string Chain(F src, F dst) {
  F formats[9];
  int32_t count = 0;
  if (VX_ExplainConversion(src, dst, 2, formats, &count) != VX_Success) return "none";
  std::string text;
  for (int i = 0; i < count; ++i) text += (i ? " > " : "") + FormatName(formats[i]);
  return text;
}

int DepthRank(F format) {
  const uint32_t depth = Depth(format);
  return depth == kDepth8u ? 8 : depth == kDepth10u ? 10 : depth == kDepth15u ? 15 : 32;
}

TEST(Planner, EveryPairWalksAlongStepsOfTheGraph) {
  for (F src : RasterFormats())
    for (F dst : RasterFormats()) {
      Plan plan;
      ASSERT_EQ(MakePlan(src, dst, 2, &plan), VX_Success) << FormatName(src) << " to " << FormatName(dst);
      ASSERT_GE(plan.stepCount, 1);
      ASSERT_LE(plan.stepCount, kMaxSteps);
      F current = src;
      for (int i = 0; i < plan.stepCount; ++i) {
        const auto isStep = [&](const Step& step) { return step.from == current && step.to == plan.steps[i].to; };
        ASSERT_TRUE(src == dst || std::ranges::any_of(AllSteps(), isStep)) << Chain(src, dst);
        current = plan.steps[i].to;
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

// What both ends keep is kept in between: depth, alpha, and straight colour where alpha is 0.
TEST(Planner, NothingIsLostOnTheWay) {
  const auto carriesAlpha = [](F f) { return AlphaKind(f) == kAlphaStraight || AlphaKind(f) == kAlphaPremultiplied; };
  for (F src : RasterFormats())
    for (F dst : RasterFormats()) {
      Plan plan;
      ASSERT_EQ(MakePlan(src, dst, 2, &plan), VX_Success);
      for (int i = 0; i + 1 < plan.stepCount; ++i) {
        const F through = plan.steps[i].to;
        EXPECT_GE(DepthRank(through), std::min(DepthRank(src), DepthRank(dst))) << Chain(src, dst);
        if (carriesAlpha(src) && carriesAlpha(dst)) {
          EXPECT_TRUE(carriesAlpha(through)) << Chain(src, dst);
        }
        if (Layout(src) == kLayout4444 && Layout(dst) == kLayout4444) {
          EXPECT_EQ(Layout(through), kLayout4444) << Chain(src, dst);
        }
        if (AlphaKind(src) == kAlphaStraight && AlphaKind(dst) == kAlphaStraight) {
          EXPECT_EQ(AlphaKind(through), kAlphaStraight) << Chain(src, dst);
        }
      }
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

}  // namespace
}  // namespace vexel
