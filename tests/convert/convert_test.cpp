#include <gtest/gtest.h>
#include <xmmintrin.h>

#include <climits>
#include <cstring>
#include <string>
#include <vector>

#include "convert/Planar420.h"
#include "convert/RowConverter.h"
#include "formats/FormatBits.h"
#include "frame/KernelVariant.h"
#include "support/Arena.h"
#include "support/Formats.h"
#include "support/Image.h"
#include "support/SmallCache.h"

namespace vexel {
namespace {

using F = VX_PixelFormat;
using testing::FormatName;
using testing::RasterFormats;

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
    testing::ExpectRefusal("case " + std::to_string(&c - cases), c.expected, [&](void* memory) {
      return VX_Convert(memory, 64, c.src, memory, -64, c.dst, c.width, c.height, 2);
    });
  uint8_t pixel[64] = {};
  EXPECT_EQ(VX_Convert(nullptr, 64, F::BGRA_4444_8u, pixel, 64, F::BGRA_4444_8u, 1, 1, 2), VX_ErrNullSource);
  EXPECT_EQ(VX_Convert(pixel, 64, F::BGRA_4444_8u, nullptr, 64, F::BGRA_4444_8u, 1, 1, 2), VX_ErrNullDestination);
}

// Past the cache rows are made in blocks: no kernel looks farther than the blocks overlap, and none sees where they
// end. A format converted to itself keeps every byte.
TEST(Convert, EveryPairStreamsTheSameBytes) {
  for (const F src : RasterFormats())
    for (const F dst : RasterFormats()) {
      const testing::Image image(src, 2 * static_cast<int>(kStreamBlock) + 7, 2);
      const auto inCache = image.Converted(dst, 2).bytes;
      if (src == dst) {
        ASSERT_EQ(inCache, image.bytes) << FormatName(src);
      }
      const testing::SmallCache small;
      ASSERT_EQ(image.Converted(dst, 2).bytes, inCache) << FormatName(src) << " to " << FormatName(dst);
    }
}

// A caller's rounding mode reaches every kernel alike and comes back.
TEST(Convert, RoundingModesGiveTheSameBytesInEveryVariant) {
  constexpr int kWidth = 259;
  std::vector<float> light(4 * kWidth);
  testing::Random random(5);
  for (float& v : light) v = random.Unit();
  const KernelVariant most = ActiveKernelVariant();
  for (const uint32_t mode : {0x0000u, 0x2000u, 0x4000u, 0x6000u}) {
    const auto run = [&](KernelVariant variant) {
      std::vector<uint8_t> codes(4 * kWidth);
      LimitKernelVariant(variant);
      const uint32_t saved = _mm_getcsr();
      _mm_setcsr((saved & ~0x6000u) | mode);
      VX_Convert(light.data(), 0, F::BGRA_4444_32f_Linear, codes.data(), 0, F::BGRA_4444_8u, kWidth, 1, 2);
      EXPECT_EQ(_mm_getcsr() & 0x6000u, mode);
      _mm_setcsr(saved);
      return codes;
    };
    const auto plain = run(KernelVariant::Plain);
    EXPECT_EQ(plain, run(most)) << "mode " << mode;
  }
  LimitKernelVariant(most);
}

// Chains run in blocks, in whole rows or fused into one kernel: always the bytes of their steps one after the other.
TEST(Convert, AChainGivesTheBytesOfItsSteps) {
  for (F src : RasterFormats())
    for (F dst : RasterFormats()) {
      F formats[9];
      int32_t count = 0;
      ASSERT_EQ(VX_ExplainConversion(src, dst, 2, formats, &count), VX_Success);
      testing::Image stepped(src, 781, 1, testing::Contents::Extremes, Bits(src) + 1);
      const testing::Image chained = stepped.Converted(dst, 2);
      for (int i = 1; i < count; ++i) stepped = stepped.Converted(formats[i], 2);
      ASSERT_EQ(stepped.bytes, chained.bytes) << FormatName(src) << " to " << FormatName(dst);
    }
}

// A picture of any kind, its rows upward or downward in memory.
struct Picture {
  F format;
  int32_t width, height;
  bool down;
  std::vector<uint8_t> bytes;
  Picture(F f, int32_t w, int32_t h, bool upsideDown = false)
      : format(f),
        width(w),
        height(h),
        down(upsideDown && !IsSpecial(f)),
        bytes(static_cast<size_t>(VX_PixelFormatSize(f, w, h))) {}
  int32_t RowBytes() const {
    if (IsSpecial(format)) return 0;
    const auto rowBytes = static_cast<int32_t>(bytes.size() / static_cast<size_t>(height));
    return down ? -rowBytes : rowBytes;
  }
  uint8_t* Base() { return down ? &bytes[bytes.size() - bytes.size() / static_cast<size_t>(height)] : bytes.data(); }
  // The other way up, without what lies between the rows.
  Picture Turned() const {
    Picture turned(format, width, height, !down);
    if (IsSpecial(format)) turned.bytes = bytes;
    const size_t rowBytes = bytes.size() / static_cast<size_t>(height);
    for (size_t y = 0; !IsSpecial(format) && y < static_cast<size_t>(height); ++y)
      std::copy_n(&bytes[y * rowBytes], UnpaddedRowBytes(format, width),
                  &turned.bytes[(static_cast<size_t>(height) - 1 - y) * rowBytes]);
    return turned;
  }
};

VX_Result Convert(Picture& src, Picture& dst, int32_t quality) {
  return VX_Convert(src.Base(), src.RowBytes(), src.format, dst.Base(), dst.RowBytes(), dst.format, src.width,
                    src.height, quality);
}

// 4:2:0 pictures come and go line by line: with the bytes of whole frames, whichever way up.
TEST(Convert, PicturesGiveTheBytesOfTheirSteps) {
  struct Size {
    int32_t width, height;
  };
  const Size sizes[] = {{1061, 5}, {1, 1}, {34, 6}};
  std::vector<F> all = testing::Formats420();
  const std::vector<F> rasters = RasterFormats();
  all.insert(all.end(), rasters.begin(), rasters.end());
  int turn = 0, reached = 0;
  for (const F from : all)
    for (const F to : all) {
      F formats[9];
      int32_t count = 0;
      const int32_t quality = turn % 3 + 1;
      if (!Is420(from) && !Is420(to)) continue;
      if (VX_ExplainConversion(from, to, quality, formats, &count) != VX_Success) continue;
      if (Is420(from) && HasWideSamples(from) && !IsBiplanar(from)) continue;
      const Size size = sizes[turn++ % 3];
      Picture src(from, size.width, size.height);
      testing::Random random(static_cast<uint64_t>(turn));
      testing::FillSamples(src.bytes.data(), src.bytes.size(), from, testing::Contents::Random, random);
      Picture turned = src.Turned(), dst(to, size.width, size.height), dstTurned = dst.Turned();
      ASSERT_EQ(Convert(src, dst, quality), VX_Success) << FormatName(from) << " to " << FormatName(to);
      ASSERT_EQ(Convert(turned, dstTurned, quality), VX_Success);
      Picture stepped = src;
      for (int i = 1; i < count; ++i) {
        Picture next(formats[i], size.width, size.height);
        ASSERT_EQ(Convert(stepped, next, quality), VX_Success);
        stepped = next;
      }
      ASSERT_EQ(stepped.bytes, dst.bytes) << FormatName(from) << " to " << FormatName(to) << " " << size.width;
      ASSERT_EQ(dstTurned.Turned().bytes, dst.bytes) << FormatName(from) << " to " << FormatName(to);
      // Past the cache straight or staged, by how rows lie in its lines.
      const testing::SmallCache small;
      testing::LineBytes memory(dst.bytes.size() + 16);
      uint8_t* const past = memory.data() + turn % 2 * 16;
      ASSERT_EQ(
          VX_Convert(src.Base(), src.RowBytes(), from, past, dst.RowBytes(), to, size.width, size.height, quality),
          VX_Success);
      ASSERT_TRUE(std::equal(dst.bytes.begin(), dst.bytes.end(), past)) << FormatName(from) << " to " << FormatName(to);
      ++reached;
    }
  EXPECT_GT(reached, 2000);
}

}  // namespace
}  // namespace vexel
