// Every RGB row kernel in the armed arena: variants against the plain definitions, nothing touched outside the rows.
#include <cstdint>
#include <cstring>
#include <vector>

#include <gtest/gtest.h>

#include "convert/RgbKernels.h"
#include "convert/RowKernelCheck.h"
#include "support/Arena.h"
#include "support/Formats.h"

namespace vexel::testing {
namespace {

struct RowCase {
  const char* name;
  const RowKernelSet* kernels;
  VX_PixelFormat source, destination;
};

using enum VX_PixelFormat;

#define VX_CASE(kernel, source, destination) \
  { #kernel, &k##kernel, source, destination }
#define VX_DEPTH_CASES(kernel, from, to)                                                                            \
  VX_CASE(kernel, BGRA_4444_##from, BGRA_4444_##to), VX_CASE(kernel##OpaqueLast, BGRX_4444_##from, BGRX_4444_##to), \
      VX_CASE(kernel##OpaqueFirst, XRGB_4444_##from, XRGB_4444_##to)
#define VX_ALPHA_CASES(depth)                                                   \
  VX_CASE(PremultiplyLast##depth, BGRA_4444_##depth, BGRP_4444_##depth),        \
      VX_CASE(PremultiplyFirst##depth, ARGB_4444_##depth, PRGB_4444_##depth),   \
      VX_CASE(UnpremultiplyLast##depth, BGRP_4444_##depth, BGRA_4444_##depth),  \
      VX_CASE(UnpremultiplyFirst##depth, PRGB_4444_##depth, ARGB_4444_##depth), \
      VX_CASE(Reverse##depth, BGRA_4444_##depth, ARGB_4444_##depth),            \
      VX_CASE(OpaqueLast##depth, BGRA_4444_##depth, BGRX_4444_##depth),         \
      VX_CASE(OpaqueFirst##depth, ARGB_4444_##depth, XRGB_4444_##depth)

const RowCase kCases[] = {
    VX_CASE(Copy4, BGRA_4444_8u, BGRA_4444_8u),
    VX_CASE(Copy8, BGRA_4444_15u, BGRA_4444_15u),
    VX_CASE(Copy16, BGRA_4444_32f, BGRA_4444_32f),
    VX_CASE(Copy422_8u, UYVY_422_8u, UYVY_422_8u),
    VX_CASE(Copy422_32f, UYVY_422_32f, UYVY_422_32f),
    VX_CASE(CopyV210, V210_422_10u, V210_422_10u),
    VX_ALPHA_CASES(8u),
    VX_ALPHA_CASES(15u),
    VX_ALPHA_CASES(32f),
    VX_CASE(PremultiplyVuya8, VUYA_4444_8u, VUYP_4444_8u),
    VX_CASE(UnpremultiplyVuyp8, VUYP_4444_8u, VUYA_4444_8u),
    VX_CASE(Bgrx8ToXrgb8, BGRX_4444_8u, XRGB_4444_8u),
    VX_CASE(Xrgb8ToBgrx8, XRGB_4444_8u, BGRX_4444_8u),
    VX_CASE(Bgrx15ToXrgb15, BGRX_4444_15u, XRGB_4444_15u),
    VX_CASE(Xrgb15ToBgrx15, XRGB_4444_15u, BGRX_4444_15u),
    VX_CASE(Bgrx32fToXrgb32f, BGRX_4444_32f, XRGB_4444_32f),
    VX_CASE(Xrgb32fToBgrx32f, XRGB_4444_32f, BGRX_4444_32f),
    VX_DEPTH_CASES(Widen8uTo32f, 8u, 32f),
    VX_DEPTH_CASES(Widen15uTo32f, 15u, 32f),
    VX_DEPTH_CASES(Widen8uTo15u, 8u, 15u),
    VX_DEPTH_CASES(Narrow32fTo8u, 32f, 8u),
    VX_DEPTH_CASES(Narrow32fTo15u, 32f, 15u),
    VX_DEPTH_CASES(Narrow15uTo8u, 15u, 8u),
    VX_CASE(Bgra8ToBgrp32f, BGRA_4444_8u, BGRP_4444_32f),
    VX_CASE(Rgb10ToBgrx8, kRgb10Format, BGRX_4444_8u),
    VX_CASE(Rgb10ToBgrx15, kRgb10Format, BGRX_4444_15u),
    VX_CASE(Rgb10ToBgrx32f, kRgb10Format, BGRX_4444_32f),
    VX_CASE(Bgrx8ToRgb10, BGRX_4444_8u, kRgb10Format),
    VX_CASE(Bgrx15ToRgb10, BGRX_4444_15u, kRgb10Format),
    VX_CASE(Bgrx32fToRgb10, BGRX_4444_32f, kRgb10Format),
    VX_CASE(Bgra32fToLinear, BGRA_4444_32f, BGRA_4444_32f_Linear),
    VX_CASE(LinearToBgra32f, BGRA_4444_32f_Linear, BGRA_4444_32f),
    VX_CASE(Bgrx32fToLinear, BGRX_4444_32f, BGRX_4444_32f_Linear),
    VX_CASE(LinearToBgrx32f, BGRX_4444_32f_Linear, BGRX_4444_32f),
    VX_CASE(Bgra8ToLinear, BGRA_4444_8u, BGRA_4444_32f_Linear),
    VX_CASE(LinearToBgra8, BGRA_4444_32f_Linear, BGRA_4444_8u),
};

TEST(RgbKernels, Arena) {
  for (const RowCase& test : kCases) {
    ArenaCase arenaCase;
    arenaCase.name = test.name;
    arenaCase.sources = {test.source};
    arenaCase.destination = test.destination;
    arenaCase.run = RunRows(*test.kernels);
    EXPECT_TRUE(RunArena(arenaCase)) << test.name;
  }
}

TEST(RgbKernels, MovesAreExact) {
  const std::vector<uint8_t> bytes = {1, 2, 3, 4};
  EXPECT_EQ(RunKernel<uint8_t>(kReverse8u, bytes, 1, 4), (std::vector<uint8_t>{4, 3, 2, 1}));
  EXPECT_EQ(RunKernel<uint8_t>(kBgrx8ToXrgb8, bytes, 1, 4), (std::vector<uint8_t>{255, 3, 2, 1}));
  EXPECT_EQ(RunKernel<uint8_t>(kXrgb8ToBgrx8, bytes, 1, 4), (std::vector<uint8_t>{4, 3, 2, 255}));
  EXPECT_EQ(RunKernel<uint8_t>(kOpaqueLast8u, bytes, 1, 4), (std::vector<uint8_t>{1, 2, 3, 255}));
  EXPECT_EQ(RunKernel<uint8_t>(kOpaqueFirst8u, bytes, 1, 4), (std::vector<uint8_t>{255, 2, 3, 4}));
  const std::vector<uint16_t> words = {1, 2, 3, 65535};
  EXPECT_EQ(RunKernel<uint16_t>(kReverse15u, words, 1, 4), (std::vector<uint16_t>{65535, 3, 2, 1}));
  EXPECT_EQ(RunKernel<uint16_t>(kBgrx15ToXrgb15, words, 1, 4), (std::vector<uint16_t>{32768, 3, 2, 1}));
  EXPECT_EQ(RunKernel<uint16_t>(kXrgb15ToBgrx15, words, 1, 4), (std::vector<uint16_t>{65535, 3, 2, 32768}));
  EXPECT_EQ(RunKernel<uint16_t>(kOpaqueLast15u, words, 1, 4), (std::vector<uint16_t>{1, 2, 3, 32768}));
  EXPECT_EQ(RunKernel<uint16_t>(kOpaqueFirst15u, words, 1, 4), (std::vector<uint16_t>{32768, 2, 3, 65535}));
  // Floats as bits: denormals and NaNs move unchanged.
  const std::vector<uint32_t> floats = {1, 0xFFA00001, 0x7F800000, 0x80000000};
  const uint32_t one = 0x3F800000;
  EXPECT_EQ(RunKernel<uint32_t>(kReverse32f, floats, 1, 4),
            (std::vector<uint32_t>{0x80000000, 0x7F800000, 0xFFA00001, 1}));
  EXPECT_EQ(RunKernel<uint32_t>(kBgrx32fToXrgb32f, floats, 1, 4),
            (std::vector<uint32_t>{one, 0x7F800000, 0xFFA00001, 1}));
  EXPECT_EQ(RunKernel<uint32_t>(kXrgb32fToBgrx32f, floats, 1, 4),
            (std::vector<uint32_t>{0x80000000, 0x7F800000, 0xFFA00001, one}));
  EXPECT_EQ(RunKernel<uint32_t>(kOpaqueLast32f, floats, 1, 4), (std::vector<uint32_t>{1, 0xFFA00001, 0x7F800000, one}));
  EXPECT_EQ(RunKernel<uint32_t>(kOpaqueFirst32f, floats, 1, 4),
            (std::vector<uint32_t>{one, 0xFFA00001, 0x7F800000, 0x80000000}));
}

}  // namespace
}  // namespace vexel::testing
