// Layouts, plane copies and decode planning of 4:2:0 pictures.
#include "convert/Planar420.h"

#include <gtest/gtest.h>

#include <climits>
#include <cstring>
#include <vector>

#include "frame/Features.h"
#include "support/Random.h"
#include "support/Reference420.h"

namespace vexel::testing {
namespace {

using F = VX_PixelFormat;

struct LayoutCase {
  F format;
  int width, height;
  ptrdiff_t chroma, second;  // offsets of the chroma planes, -1 for none
  int32_t rowBytes[3];
};

TEST(Planar420, Layouts) {
  const F biplanar = FromBits(0x0E000A31), biplanar10 = FromBits(0x0D000A71);
  const LayoutCase cases[] = {
      {F::YUV_420_MPEG2_FRAME, 720, 480, 368640, 368640 + 92160, {768, 384, 384}},
      {F::YUV_420_MPEG4_FIELD_FullRange_709, 1920, 1080, 1920 * 1088, 1920 * 1088 + 544 * 1024, {1920, 1024, 1024}},
      {F::YUV_420_MPEG2_FRAME, 257, 1, 384 * 32, 384 * 32 + 128 * 16, {384, 128, 128}},
      {F::YUV_420_MPEG2_FRAME, 1, 33, 128 * 64, 128 * 64, {128, 0, 0}},
      {biplanar, 1920, 1080, 1920 * 1080, -1, {1920, 1920, 1024}},
      {biplanar, 129, 3, 256 * 3, -1, {256, 256, 128}},
      {biplanar10, 1920, 1080, 3840 * 1080, -1, {3840, 3840, 3840}},
      {biplanar10, 65, 3, 256 * 3, -1, {256, 256, 256}},
  };
  std::vector<uint8_t> memory(16);
  for (const LayoutCase& c : cases) {
    void* planes[3];
    int32_t rowBytes[3];
    ASSERT_EQ(VX_Success, VX_GetPlanarBuffers(memory.data(), c.format, c.width, c.height, planes, rowBytes));
    const auto* base = memory.data();
    EXPECT_EQ(planes[0], base);
    EXPECT_EQ(planes[1], base + c.chroma);
    EXPECT_EQ(planes[2], c.second < 0 ? nullptr : base + c.second) << c.width;
    for (int i = 0; i < 3; ++i) EXPECT_EQ(rowBytes[i], c.rowBytes[i]) << c.width << " plane " << i;
    if (IsBiplanar(c.format) && Depth(c.format) == kDepth8u) {
      ASSERT_EQ(VX_Success, VX_GetBiPlanarBuffers(memory.data(), F::Invalid, c.width, c.height, planes, rowBytes));
      EXPECT_EQ(planes[0], base);
      EXPECT_EQ(planes[1], base + c.chroma);
      EXPECT_EQ(rowBytes[0], c.rowBytes[0]);
      EXPECT_EQ(rowBytes[1], c.rowBytes[1]);
    }
  }
}

// Everything that a layout addresses lies inside the block of VX_PixelFormatSize, whatever the size.
TEST(Planar420, PlanesLieInTheBlock) {
  for (const F format : Formats420())
    for (const int width : {1, 2, 3, 63, 64, 65, 127, 128, 129, 255, 256, 257, 1919})
      for (const int height : {1, 2, 3, 31, 32, 33, 1079}) {
        const int64_t size = VX_PixelFormatSize(format, width, height);
        const Picture420 picture = PictureFromBlock(nullptr, format, width, height);
        const int64_t bytes = HasWideSamples(format) ? 2 : 1, channels = IsBiplanar(format) ? 2 : 1;
        for (int i = 0; i < (IsBiplanar(format) ? 2 : 3); ++i) {
          const int64_t rows = i == 0 ? height : ChromaHeight(picture);
          const int64_t used = i == 0 ? width * bytes : ChromaWidth(picture) * bytes * channels;
          const auto offset = reinterpret_cast<intptr_t>(picture.planes[i]);
          EXPECT_LE(offset + (rows - 1) * picture.rowBytes[i] + used, size) << std::hex << Bits(format) << width;
        }
      }
}

TEST(Planar420, CopiesPlanes) {
  for (const bool tight : {false, true})
    for (const int width : {1, 2, 7, 16, 33})
      for (const int height : {1, 2, 5, 8}) {
        const int chroma = width / 2, gap = tight ? 0 : 5;
        // Three planes each way, with the gaps and the ends filled differently.
        std::vector<uint8_t> src(3 * 64 * 16), dst(src.size(), 0xEE), expected(dst);
        Random(static_cast<uint64_t>(width)).Fill(src.data(), src.size());
        const int32_t srcRowBytes[3] = {width + gap, chroma + gap, chroma + gap};
        const int32_t dstRowBytes[3] = {width + 2 * gap, chroma + 2 * gap, chroma + 2 * gap};
        const int32_t srcPairs[2] = {width + gap, width + gap}, dstPairs[2] = {width + 2 * gap, width + 2 * gap};
        const void* from[3];
        void* to[3];
        for (int i = 0; i < 3; ++i) from[i] = &src[i * 1024], to[i] = &dst[i * 1024];
        const auto copy = [&](int plane, int rows, int bytes, int fromStep, int toStep) {
          for (int row = 0; row < rows; ++row)
            std::memcpy(&expected[plane * 1024 + row * toStep], &src[plane * 1024 + row * fromStep], bytes);
        };
        const int odd = width * height / 4 - height / 2 * chroma;  // copied on, where rows have no gaps
        copy(0, height, width, srcRowBytes[0], dstRowBytes[0]);
        for (int i = 1; i < 3; ++i) {
          copy(i, height / 2, chroma, srcRowBytes[i], dstRowBytes[i]);
          if (tight) copy(i, 1, height / 2 * chroma + odd, 0, 0);
        }
        EXPECT_EQ(VX_Success, VX_CopyPlanar_8u(from, srcRowBytes, to, dstRowBytes, width, height));
        EXPECT_EQ(dst, expected) << width << " x " << height << " tight " << tight;

        std::fill(dst.begin(), dst.end(), 0xEE);
        std::fill(expected.begin(), expected.end(), 0xEE);
        copy(0, height, width, srcPairs[0], dstPairs[0]);
        copy(1, height / 2, width, srcPairs[1], dstPairs[1]);
        if (tight) copy(1, 1, width * height / 2, 0, 0);
        EXPECT_EQ(VX_Success, VX_CopyBiPlanar_8u(from, srcPairs, to, dstPairs, width, height));
        EXPECT_EQ(dst, expected) << width << " x " << height << " tight " << tight;
      }
  for (const int bad : {0, -1, INT_MIN}) {
    const int32_t rowBytes[3] = {bad, bad, bad};
    const void* const none[3] = {};
    void* const nowhere[3] = {};
    EXPECT_EQ(VX_Success, VX_CopyPlanar_8u(none, rowBytes, nowhere, rowBytes, bad, 1));
    EXPECT_EQ(VX_Success, VX_CopyBiPlanar_8u(none, rowBytes, nowhere, rowBytes, bad, 1));
  }
}

TEST(Planar420, CopiesFields) {
  for (const F format : Formats420())
    for (const int field : {0, 1, 2}) {
      Block420 src(format, 39, 11), dst(format, 39, 5);
      src.Randomize(1);
      CopyField420(src.bytes.data(), format, 39, 11, field, dst.bytes.data());
      for (int row = 0; row < 5; ++row)
        for (int x = 0; x < 39; ++x)
          ASSERT_EQ(dst.Code(0, x, row), src.Code(0, x, 2 * row + (field == 2))) << std::hex << Bits(format);
      for (int plane = 1; plane < 3; ++plane)
        for (int row = 0; row < 2; ++row)
          for (int x = 0; x < 19; ++x) ASSERT_EQ(dst.Code(plane, x, row), src.Code(plane, x, 2 * row));
    }
}

struct PlanCase {
  int width, height, dstWidth, dstHeight, quality;
  int plannedWidth, plannedHeight;
  bool needsSse2 = false;
};

TEST(Plan420, Sizes) {
  const PlanCase cases[] = {
      {1440, 1080, 1920, 1080, 0, 1920, 1080, true},  // 4/3
      {1440, 1080, 1920, 540, 5, 1920, 540, true},
      {1440, 1080, 1920, 541, 0, 1440, 1080},
      {1056, 576, 1408, 576, 0, 1408, 576, true},
      {1280, 1080, 1920, 1080, 0, 1920, 1080, true},  // 3/2
      {1280, 720, 1920, 360, 4, 1920, 360, true},
      {1288, 720, 1932, 720, 0, 1288, 720},   // not a multiple of 16
      {1488, 720, 1984, 720, 0, 1488, 720},   // 4/3, but no multiple of 96
      {1920, 1080, 1920, 540, 5, 1920, 540},  // a field
      {1920, 1081, 1920, 540, 0, 1920, 540},
      {1920, 1080, 1280, 720, 0, 1920, 1080},
      {1920, 1080, 480, 541, 0, 1920, 1080},
      {1920, 1080, 480, 270, 0, 480, 270},  // reductions
      {1920, 1080, 480, 270, 2, 480, 270},
      {1920, 1080, 480, 270, 3, 1920, 1080},
      {1920, 1080, 640, 360, 0, 960, 540},  // the height ratio is odd
      {1920, 1080, 640, 180, 0, 960, 540},  // the width ratio is 3
      {1920, 1080, 240, 108, 0, 240, 108},
      {1920, 1080, 120, 90, 0, 960, 540},
      {1920, 1080, 1920, 270, 0, 1920, 270},
      {1920, 1080, 1000, 270, 0, 1920, 540},
      {1919, 1080, 480, 270, 0, 1919, 1080},
      {960, 540, 480, 270, 0, 480, 270},
      {960, 541, 480, 270, 0, 480, 270},  // half of both by the general rule
      {INT_MAX, INT_MAX, INT_MAX, INT_MAX, 0, INT_MAX, INT_MAX},
      {INT_MAX - 15, 16, INT_MAX, 16, 0, INT_MAX - 15, 16},
      {1920, 1080, 0, 0, 0, 960, 540},  // nothing divides by zero
      {1920, 1080, 1920, 0, 0, 1920, 540},
      {1920, 0, 1920, 0, 0, 1920, 0},
      {0, 0, 0, 0, 0, 0, 0},
      {1, 1, 1, 1, 0, 1, 1},
      {1, 1, 1, 0, 0, 1, 0},
  };
  for (const bool hasSse2 : {true, false}) {
    VX_SetDebugFlag(3, hasSse2);
    for (const PlanCase& c : cases) {
      const DecodePlan plan =
          PlanDecode420(F::YUV_420_MPEG2_FRAME, c.width, c.height, F::BGRA_4444_8u, c.dstWidth, c.dstHeight, c.quality);
      const bool full = c.needsSse2 && !hasSse2;
      const int height = full && 2 * c.dstHeight <= c.height && c.quality < 3 ? c.height / 2 : c.height;
      EXPECT_EQ(plan.width, full ? c.width : c.plannedWidth) << c.width << " to " << c.dstWidth;
      EXPECT_EQ(plan.height, full ? height : c.plannedHeight) << c.height << " to " << c.dstHeight;
    }
  }
  VX_SetDebugFlag(3, 1);
}

TEST(Plan420, Formats) {
  const F rgb = F::BGRX_4444_8u, yuv = F::VUYX_4444_8u, yuv709 = F::VUYX_4444_8u_709;
  const struct {
    F src, dst, planned;
  } cases[] = {
      {F::YUV_420_MPEG2_FRAME_FullRange, F::UYVY_422_8u, rgb},
      {F::YUV_420_MPEG4_FIELD_FullRange_709, F::BGRA_4444_32f, rgb},
      {FromBits(0x0E001231), F::VUYA_4444_8u_709, rgb},  // full range, biplanar
      {F::YUV_420_MPEG2_FRAME, F::BGRA_4444_8u, yuv},
      {F::YUV_420_MPEG2_FRAME_709, F::BGRA_4444_8u, yuv709},
      {F::YUV_420_MPEG2_FRAME_709, F::UYVY_422_8u, yuv},  // the destination decides
      {F::YUV_420_MPEG2_FRAME, F::UYVY_422_8u_709, yuv709},
      {F::YUV_420_MPEG2_FRAME, F::V210_422_10u_709, yuv},  // not 8 bits: the source decides
      {F::YUV_420_MPEG2_FRAME_709, F::VUYA_4444_32f, yuv709},
      {FromBits(0x0E000C71), F::BGRA_4444_15u, yuv709},
      {FromBits(0x0E000E71), F::UYVY_422_8u, yuv},
  };
  for (const auto& c : cases)
    EXPECT_EQ(PlanDecode420(c.src, 16, 16, c.dst, 16, 16, 0).format, c.planned)
        << VX_PixelFormatName(c.src) << " to " << VX_PixelFormatName(c.dst);
}

}  // namespace
}  // namespace vexel::testing
