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
#include "support/Random.h"

namespace vexel {
namespace {

using F = VX_PixelFormat;
using testing::FormatName;
using testing::RasterFormats;

std::vector<uint8_t> RandomBytes(size_t bytes, uint64_t seed) {
  std::vector<uint8_t> memory(bytes);
  testing::Random(seed).Fill(memory.data(), bytes);
  return memory;
}

TEST(Convert, SameFormatCopiesEveryByteAndKeepsRowOrder) {
  for (F format : RasterFormats())
    for (int width : {1, 2, 5, 6, 7, 400}) {
      const auto rowBytes = static_cast<int32_t>(UnpaddedRowBytes(format, width));
      const auto src = RandomBytes(static_cast<size_t>(rowBytes) * 3, Bits(format));
      std::vector<uint8_t> dst(src.size());
      ASSERT_EQ(VX_Convert(src.data(), rowBytes, format, dst.data(), rowBytes, format, width, 3, 2), VX_Success);
      EXPECT_EQ(src, dst) << FormatName(format) << " width " << width;
    }
}

// A bottom-up format and a top-down one store rows in opposite orders; negative row bytes turn a buffer around.
TEST(Convert, OrientationFollowsTheFormats) {
  constexpr int kWidth = 4, kHeight = 3;
  uint8_t bgra[kHeight][kWidth * 4], uyvy[kHeight][kWidth * 2];
  for (int y = 0; y < kHeight; ++y) std::memset(bgra[y], 60 * y + 30, sizeof bgra[y]);
  for (auto& row : bgra)
    for (int x = 0; x < kWidth; ++x) row[4 * x + 3] = 255;
  const auto lumaOfRow = [&](int y) { return uyvy[y][1]; };

  ASSERT_EQ(VX_Convert(bgra, sizeof bgra[0], F::BGRA_4444_8u, uyvy, sizeof uyvy[0], F::UYVY_422_8u, kWidth, kHeight, 2),
            VX_Success);
  EXPECT_GT(lumaOfRow(0), lumaOfRow(1));
  EXPECT_GT(lumaOfRow(1), lumaOfRow(2));

  ASSERT_EQ(VX_Convert(bgra[kHeight - 1], -static_cast<int32_t>(sizeof bgra[0]), F::BGRA_4444_8u, uyvy, sizeof uyvy[0],
                       F::UYVY_422_8u, kWidth, kHeight, 2),
            VX_Success);
  EXPECT_LT(lumaOfRow(0), lumaOfRow(1));
  EXPECT_LT(lumaOfRow(1), lumaOfRow(2));

  VX_SetDebugFlag(10, 1);
  const VX_Result result =
      VX_Convert(bgra, sizeof bgra[0], F::BGRA_4444_8u, uyvy, sizeof uyvy[0], F::UYVY_422_8u, kWidth, kHeight, 2);
  VX_SetDebugFlag(10, 0);
  ASSERT_EQ(result, VX_Success);
  EXPECT_LT(lumaOfRow(0), lumaOfRow(1));
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

// Blocks, whole rows and streamed rows give the same bytes: a wide picture equals the same picture converted in the
// other ways.
TEST(Convert, StreamedLargeFramesEqualSmallOnes) {
  const struct {
    F src, dst;
  } pairs[] = {{F::BGRA_4444_8u, F::BGRA_4444_8u},     {F::BGRA_4444_8u, F::ARGB_4444_32f},
               {F::UYVY_422_8u, F::BGRA_4444_32f},     {F::BGRA_4444_8u, F::V210_422_10u},
               {F::ARGB_4444_32f, F::UYVY_422_8u_709}, {F::V210_422_10u, F::XRGB_4444_15u}};
  constexpr int kWidth = 1001;
  for (const auto& [src, dst] : pairs) {
    const auto srcRow = static_cast<int32_t>(UnpaddedRowBytes(src, kWidth));
    const auto dstRow = static_cast<int32_t>(UnpaddedRowBytes(dst, kWidth));
    const int height = static_cast<int>(VX_GetCacheSize() / 2 / static_cast<uint32_t>(dstRow)) + 2;
    const auto source = RandomBytes(static_cast<size_t>(srcRow), 7);
    std::vector<uint8_t> large(static_cast<size_t>(dstRow) * height), small(static_cast<size_t>(dstRow));
    // Row bytes 0: every row is the one source row.
    ASSERT_EQ(VX_Convert(source.data(), 0, src, large.data(), dstRow, dst, kWidth, height, 2), VX_Success);
    ASSERT_EQ(VX_Convert(source.data(), 0, src, small.data(), dstRow, dst, kWidth, 1, 2), VX_Success);
    for (int y = 0; y < height; ++y)
      ASSERT_EQ(std::memcmp(&large[static_cast<size_t>(dstRow) * y], small.data(), small.size()), 0)
          << FormatName(src) << " to " << FormatName(dst) << " row " << y;
  }
}

// Past the cache rows are made in blocks: no kernel looks farther than the blocks overlap, and none sees where they
// end.
TEST(Convert, EveryPairStreamsTheSameBytes) {
  constexpr int32_t kWidth = 2 * static_cast<int32_t>(kStreamBlock) + 7;
  for (const F src : testing::RasterFormats())
    for (const F dst : testing::RasterFormats()) {
      std::vector<uint8_t> source(static_cast<size_t>(UnpaddedRowBytes(src, kWidth)));
      testing::Random random(11);
      testing::FillSamples(source.data(), source.size(), src, testing::Contents::Random, random);
      const auto convert = [&](bool streams) {
        RowConverter converter;
        EXPECT_EQ(converter.Prepare(src, dst, 2, kWidth), VX_Success);
        if (streams) converter.StreamOutput();
        std::vector<uint8_t> scratch(converter.ScratchBytes() + 64),
            row(static_cast<size_t>(UnpaddedRowBytes(dst, kWidth)));
        converter.UseScratch(scratch.data() + (64 - reinterpret_cast<uintptr_t>(scratch.data()) % 64));
        converter.Convert(source.data(), row.data());
        return row;
      };
      ASSERT_EQ(convert(true), convert(false)) << FormatName(src) << " to " << FormatName(dst);
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
  constexpr int kWidth = 781;
  for (F src : RasterFormats())
    for (F dst : RasterFormats()) {
      F formats[9];
      int32_t count = 0;
      ASSERT_EQ(VX_ExplainConversion(src, dst, 2, formats, &count), VX_Success);
      auto stepped = RandomBytes(static_cast<size_t>(UnpaddedRowBytes(src, kWidth)), Bits(src) + 1);
      std::vector<uint8_t> chained(static_cast<size_t>(UnpaddedRowBytes(dst, kWidth)));
      ASSERT_EQ(VX_Convert(stepped.data(), 0, src, chained.data(), 0, dst, kWidth, 1, 2), VX_Success);
      for (int i = 1; i < count; ++i) {
        std::vector<uint8_t> next(static_cast<size_t>(UnpaddedRowBytes(formats[i], kWidth)));
        ASSERT_EQ(VX_Convert(stepped.data(), 0, formats[i - 1], next.data(), 0, formats[i], kWidth, 1, 2), VX_Success);
        stepped.swap(next);
      }
      ASSERT_EQ(stepped, chained) << FormatName(src) << " to " << FormatName(dst);
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
  const Size sizes[] = {{781, 5}, {1, 1}, {34, 6}};
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
      ++reached;
    }
  EXPECT_GT(reached, 2000);
}

}  // namespace
}  // namespace vexel
