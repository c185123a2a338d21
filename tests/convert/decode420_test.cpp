// 4:2:0 decoding against its definition, over formats, sizes, fields and qualities.
#include "convert/Decode420.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <climits>
#include <cstring>
#include <string>
#include <vector>

#include "support/Arena.h"
#include "support/FailingAllocations.h"
#include "support/Formats.h"
#include "support/Reference420.h"
#include "vexel/host_types.h"
#include "vexel_host/host.h"

namespace vexel::testing {
namespace {

using F = VX_PixelFormat;
using zovmediatypes::FieldType;
using zovmediatypes::RenderQuality;

// Half a code of rounding, and what the fixed-point sums may stray.
constexpr double kTolerance = 0.5 + 0.07;

struct Sizes {
  int width, height, dstWidth, dstHeight;
};

VX_Result DecodePlanes(const Block420& src, void* dst, int rowBytes, int width, int height, F format, int field,
                       int quality) {
  return VX::DecompressYUV_420_8u(src.planes, src.rowBytes, src.width, src.height, src.format, dst, rowBytes, width,
                                  height, format, static_cast<FieldType>(field), static_cast<RenderQuality>(quality));
}

// Sample `position` of a row of `count` by Catmull-Rom, the ends repeated.
template <class Sample>
double Cubic(double position, int count, const Sample& sample) {
  const int k = static_cast<int>(std::floor(position));
  const auto at = [&](int i) { return sample(std::clamp(i, 0, count - 1)); };
  const double t = position - k, a = at(k - 1), b = at(k), c = at(k + 1), d = at(k + 2);
  return b + t / 2 * (c - a + t * (2 * a - 5 * b + 4 * c - d + t * (3 * (b - c) + d - a)));
}

// The picture lines that a decoded row shows, by the rules for fields.
std::vector<int> LinesOf(const Block420& src, const Sizes& s, int row, int field) {
  const bool fields = FrameKind(src.format) % 2 == 1;
  if (s.dstHeight == s.height) return {row};
  const int ratio = s.height / s.dstHeight;
  const bool isFieldDecode = s.dstWidth >= s.width && s.dstHeight == s.height / 2;
  if (isFieldDecode && field != 0) return {2 * row + field - 1};
  std::vector<int> lines;
  for (int i = 0; i < ratio / 2 * 2; i += fields ? 2 : 1) lines.push_back(ratio / 2 * 2 * row + i);
  return lines;
}

class Decoded {
 public:
  Decoded(const Block420& src, const Sizes& s, int field, bool interpolates)
      : mSrc(src), mSizes(s), mField(field), mInterpolates(interpolates) {}

  Ycc Pixel(int x, int row) {
    if (row != mRow) MakeLine(row);
    if (mSizes.dstWidth <= mSizes.width) {
      const int columns = mSizes.width / mSizes.dstWidth;
      Ycc mean{};
      for (int i = 0; i < columns; ++i)
        for (int k = 0; k < 3; ++k) mean[k] += mLine[columns * x + i][k] / columns;
      return mean;
    }
    Ycc pixel;
    const double position = (x + 0.5) * mSizes.width / mSizes.dstWidth - 0.5;
    for (int k = 0; k < 3; ++k) {
      pixel[k] = Cubic(position, mSizes.width, [&](int i) { return mLine[i][k]; });
      pixel[k] = std::clamp(pixel[k], 0.0, 65535 / 256.0);  // what 16-bit samples between the stages hold
    }
    return pixel;
  }

 private:
  void MakeLine(int row) {
    mRow = row;
    mLine.assign(mSizes.width, {});
    const std::vector<int> lines = LinesOf(mSrc, mSizes, row, mField);
    for (const int line : lines)
      for (int x = 0; x < mSizes.width; ++x) {
        const Ycc pixel = FullSizeYcc(mSrc, x, line, mInterpolates);
        for (int k = 0; k < 3; ++k) mLine[x][k] += pixel[k] / lines.size();
      }
  }

  const Block420& mSrc;
  Sizes mSizes;
  int mField;
  bool mInterpolates;
  int mRow = -1;
  std::vector<Ycc> mLine;
};

void ExpectDecodes(const Block420& src, const Sizes& s, F format, int field, int quality) {
  SCOPED_TRACE(::testing::Message() << std::hex << Bits(src.format) << " to " << Bits(format) << std::dec << " "
                                    << s.width << "x" << s.height << " to " << s.dstWidth << "x" << s.dstHeight
                                    << " field " << field << " quality " << quality);
  std::vector<uint8_t> dst(static_cast<size_t>(s.dstWidth) * s.dstHeight * 4);
  ASSERT_EQ(VX_Success, DecodePlanes(src, dst.data(), s.dstWidth * 4, s.dstWidth, s.dstHeight, format, field, quality));
  Decoded reference(src, s, field, quality >= 2);
  for (int row = 0; row < s.dstHeight; ++row)
    for (int x = 0; x < s.dstWidth; ++x) {
      const auto codes = ToCodes(reference.Pixel(x, row), src.format, format);
      const uint8_t* pixel = &dst[4 * (static_cast<size_t>(row) * s.dstWidth + x)];
      ASSERT_EQ(pixel[3], 255);
      for (int k = 0; k < 3; ++k)
        ASSERT_NEAR(pixel[k], std::clamp(codes[k], 0.0, 255.0), kTolerance) << "x " << x << " row " << row << " " << k;
    }
}

TEST(Decode420, EveryFormatAndBranch) {
  const Sizes sizes[] = {
      {16, 8, 16, 8},   {1, 1, 1, 1},     {2, 2, 2, 2},    {5, 3, 5, 3},   {37, 6, 37, 6},  {130, 3, 130, 3},
      {257, 5, 257, 5}, {64, 10, 64, 5},  {7, 7, 7, 3},    {38, 7, 19, 3}, {16, 12, 8, 6},  {16, 16, 16, 4},
      {32, 16, 8, 4},   {64, 32, 8, 2},   {64, 24, 32, 4}, {32, 64, 8, 1}, {34, 40, 17, 2}, {96, 5, 128, 5},
      {96, 8, 128, 4},  {192, 3, 256, 3}, {16, 5, 24, 5},  {48, 9, 72, 4}, {80, 2, 120, 1},
  };
  const F destinations[] = {F::BGRA_4444_8u, F::VUYX_4444_8u, F::VUYP_4444_8u_709};
  int turn = 0;
  for (const F format : Formats420())
    for (const Sizes& s : sizes) {
      Block420 src(format, s.width, s.height);
      src.Randomize(static_cast<uint64_t>(turn));
      for (const int field : {0, 1, 2})
        for (const int quality : {0, 2})
          if (field == 0 || 2 * s.dstHeight <= s.height)
            ExpectDecodes(src, s, destinations[turn++ % 3], field, quality);
      if (HasFatalFailure()) return;
    }
}

// Every combination of three codes through every matrix and range.
TEST(Decode420, MatricesOverAllCodes) {
  std::vector<uint8_t> luma(256), pixels(4 * 256);
  for (int i = 0; i < 256; ++i) luma[i] = static_cast<uint8_t>(i);
  for (const F src : {F::YUV_420_MPEG2_FRAME, F::YUV_420_MPEG2_FRAME_709, F::YUV_420_MPEG2_FRAME_FullRange,
                      F::YUV_420_MPEG2_FRAME_FullRange_709, FromBits(0x0E000C71)})
    for (const F dst : {F::BGRX_4444_8u, F::VUYX_4444_8u, F::VUYX_4444_8u_709}) {
      const bool all = !IsYuv(dst);  // the others have the same factors in fewer places
      const auto matrix = MakeMatrix420(src, dst);
      const auto& kernels = IsYuv(dst) ? decode420::kToVuyx : decode420::kToBgrx;
      double worst = 0;
      for (int u = 0; u < 256; u += all ? 1 : 5)
        for (int v = 0; v < 256; v += all ? 1 : 5) {
          const std::vector<uint8_t> us(128, static_cast<uint8_t>(u)), vs(128, static_cast<uint8_t>(v));
          kernels.bytes[ActiveKernelVariant()]({luma.data(), us.data(), vs.data(), pixels.data(), 256, false}, matrix);
          const auto black = ToCodes({0, double(u), double(v)}, src, dst), step = ToCodes({1, 128, 128}, src, dst),
                     zero = ToCodes({0, 128, 128}, src, dst);
          for (int y = 0; y < 256; ++y)
            for (int k = 0; k < 3; ++k) {
              const double exact = black[k] + y * (step[k] - zero[k]);
              worst = std::max(worst, std::abs(pixels[4 * y + k] - std::clamp(exact, 0.0, 255.0)));
            }
        }
      EXPECT_LT(worst, kTolerance) << std::hex << Bits(src) << " to " << Bits(dst);
    }
}

// Grey keeps its code and stays grey; the same colorimetry and range in and out is the identity.
TEST(Decode420, Neutral) {
  Block420 src(F::YUV_420_MPEG2_FRAME_FullRange, 256, 2);
  std::memset(src.bytes.data(), 128, src.bytes.size());
  for (int x = 0; x < 256; ++x) static_cast<uint8_t*>(src.planes[0])[x] = static_cast<uint8_t>(x);
  std::vector<uint8_t> dst(256 * 2 * 4);
  ASSERT_EQ(VX_Success, DecodePlanes(src, dst.data(), 1024, 256, 2, F::BGRX_4444_8u, 0, 2));
  for (int x = 0; x < 256; ++x)
    for (int k = 0; k < 3; ++k) ASSERT_EQ(dst[4 * x + k], x);
  src.format = F::YUV_420_MPEG2_FRAME_709;
  for (int x = 0; x < 128; ++x) static_cast<uint8_t*>(src.planes[1])[x] = static_cast<uint8_t>(2 * x);
  ASSERT_EQ(VX_Success, DecodePlanes(src, dst.data(), 1024, 256, 2, F::VUYA_4444_8u_709, 0, 0));
  for (int x = 0; x < 256; ++x) {
    const uint8_t expected[4] = {128, static_cast<uint8_t>(x / 2 * 2), static_cast<uint8_t>(x), 255};
    ASSERT_EQ(0, std::memcmp(&dst[4 * x], expected, 4)) << x;
  }
}

// Row by row, every variant makes what plain code makes; parts of rows are the same as whole rows.
TEST(Decode420, VariantsAgree) {
  const Sizes sizes[] = {{1919, 6, 1919, 6}, {199, 7, 199, 3}, {134, 8, 67, 4}, {512, 48, 64, 4},
                         {208, 60, 52, 6},   {96, 4, 128, 4},  {112, 6, 168, 3}};
  Random random;
  for (const F format : Formats420())
    for (const Sizes& s : sizes) {
      Block420 src(format, s.width, s.height);
      src.Randomize(random.Next());
      const auto decode = [&](KernelVariant variant, F native, int quality, int part) {
        Rows420 rows;
        EXPECT_EQ(VX_Success, rows.Prepare(PictureFromBlock(src.bytes.data(), format, s.width, s.height), native,
                                           s.dstWidth, s.dstHeight, 0, quality, variant));
        std::vector<uint8_t> scratch(rows.ScratchBytes() + 64), pixels;
        rows.UseScratch(scratch.data() + (-reinterpret_cast<uintptr_t>(scratch.data()) & 63));
        pixels.resize(static_cast<size_t>(s.dstWidth) * s.dstHeight * 4);
        for (int y = 0; y < s.dstHeight; ++y) {
          rows.BeginRow(y);
          for (int x = 0; x < s.dstWidth; x += part)
            rows.Pixels(x, std::min(part, s.dstWidth - x), &pixels[4 * (static_cast<size_t>(y) * s.dstWidth + x)]);
        }
        return pixels;
      };
      for (const F native : {F::BGRX_4444_8u, F::VUYX_4444_8u_709})
        for (const int quality : {0, 2}) {
          const auto plain = decode(KernelVariant::Plain, native, quality, s.dstWidth);
          for (int v = 1; v <= static_cast<int>(ActiveKernelVariant()); ++v)
            ASSERT_EQ(plain, decode(static_cast<KernelVariant>(v), native, quality, 2 * (7 + 13 * v)))
                << std::hex << Bits(format) << std::dec << " " << s.width << " to " << s.dstWidth << " variant " << v;
        }
    }
}

// Planes with any stride, upside down too, and chroma rows that lack the last sample of an odd width.
TEST(Decode420, PlanesAnywhere) {
  const int width = 35, height = 9, chroma = 18, rows = 5;
  Block420 block(F::YUV_420_MPEG4_FIELD_709, width, height);
  block.Randomize(3);
  std::vector<uint8_t> expected(width * height * 4), dst(expected.size());
  ASSERT_EQ(VX_Success, DecodePlanes(block, expected.data(), 4 * width, width, height, F::BGRA_4444_8u, 0, 2));
  for (const int sign : {1, -1}) {
    std::vector<uint8_t> memory[3];
    const void* planes[3];
    int32_t rowBytes[3];
    for (int i = 0; i < 3; ++i) {
      const int bytes = i == 0 ? width : chroma, count = i == 0 ? height : rows;
      memory[i].resize(static_cast<size_t>(bytes) * count);
      for (int row = 0; row < count; ++row)
        std::memcpy(&memory[i][static_cast<size_t>(sign < 0 ? count - 1 - row : row) * bytes],
                    static_cast<uint8_t*>(block.planes[i]) + row * block.rowBytes[i], bytes);
      planes[i] = sign < 0 ? &memory[i][static_cast<size_t>(count - 1) * bytes] : memory[i].data();
      rowBytes[i] = sign * bytes;
    }
    // The destination upside down as well: the top line comes first, wherever the base says.
    ASSERT_EQ(VX_Success, VX::DecompressYUV_420_8u(planes, rowBytes, width, height, block.format,
                                                   dst.data() + (height - 1) * 4 * width, -4 * width, width, height,
                                                   F::BGRA_4444_8u, FieldType::Whole, RenderQuality::Low));
    for (int row = 0; row < height; ++row)
      ASSERT_EQ(0, std::memcmp(&dst[(height - 1 - row) * 4 * width], &expected[row * 4 * width], 4 * width)) << row;
  }
  uint8_t y[3] = {50, 50, 50}, u[1] = {90}, v[1] = {200}, pixels[12];
  const void* const planes[3] = {y, u, v};
  const int32_t tight[3] = {3, 1, 1};
  ASSERT_EQ(VX_Success, VX::DecompressYUV_420_8u(planes, tight, 3, 1, F::YUV_420_MPEG2_FRAME, pixels, 12, 3, 1,
                                                 F::VUYX_4444_8u, FieldType::Whole, RenderQuality::Low));
  for (int x = 0; x < 3; ++x) EXPECT_EQ(0, std::memcmp(pixels + 4 * x, "\xC8\x5A\x32\xFF", 4)) << x;
}

// Blocks are top line first, rasters as their format's origin says.
TEST(Decode420, Orientation) {
  Block420 src(F::YUV_420_MPEG2_FRAME_709, 8, 4);
  std::memset(src.bytes.data(), 128, src.bytes.size());
  for (int row = 0; row < 4; ++row)
    std::memset(static_cast<uint8_t*>(src.planes[0]) + row * src.rowBytes[0], 40 * row + 40, 8);
  std::vector<uint8_t> dst(8 * 4 * 4);
  const auto lumaOfRow = [&](F format, int row) {
    const int rowBytes = format == F::UYVY_422_8u_709 ? 16 : 32;
    EXPECT_EQ(VX_Success, Decode420(src.bytes.data(), src.format, 8, 4, dst.data(), rowBytes, format, 2));
    return int{dst[static_cast<size_t>(row * rowBytes) + (format == F::UYVY_422_8u_709 ? 1 : 2)]};
  };
  for (int row = 0; row < 4; ++row) {
    EXPECT_EQ(lumaOfRow(F::VUYX_4444_8u_709, row), 160 - 40 * row);
    EXPECT_EQ(lumaOfRow(F::UYVY_422_8u_709, row), 40 + 40 * row);
  }
  VX_SetDebugFlag(10, 1);
  for (int row = 0; row < 4; ++row) EXPECT_EQ(lumaOfRow(F::VUYX_4444_8u_709, row), 40 + 40 * row);
  VX_SetDebugFlag(10, 0);
}

// Formats that the decoder does not make itself come out as the conversion of one that it does.
TEST(Decode420, EveryRasterFormat) {
  const int width = 22, height = 5;
  for (const F srcFormat : {F::YUV_420_MPEG2_FIELD, F::YUV_420_MPEG4_FRAME_709, F::YUV_420_MPEG2_FRAME_FullRange,
                            FromBits(0x0E001831), FromBits(0x0D000C71)}) {
    Block420 src(srcFormat, width, height);
    src.Randomize(5);
    for (const F format : RasterFormats()) {
      const auto size = static_cast<size_t>(VX_PixelFormatSize(format, width, height));
      const auto rowBytes = static_cast<int32_t>(PaddedRowBytes(format, width));
      std::vector<uint8_t> dst(size), expected(size);
      ASSERT_EQ(VX_Success, Decode420(src.bytes.data(), srcFormat, width, height, dst.data(), rowBytes, format, 2))
          << FormatName(format);
      F way = format;
      if (!Rows420::CanMake(format))
        way = !IsYuv(format) && Depth(format) == kDepth8u
                  ? F::BGRX_4444_8u
                  : PlanDecode420(srcFormat, width, height, format, width, height, 2).format;
      std::vector<uint8_t> between(width * height * 4);
      ASSERT_EQ(VX_Success, Decode420(src.bytes.data(), srcFormat, width, height, between.data(), 4 * width, way, 2));
      ASSERT_EQ(VX_Success,
                VX_Convert(between.data(), 4 * width, way, expected.data(), rowBytes, format, width, height, 2));
      EXPECT_EQ(dst, expected) << FormatName(format);
    }
  }
}

// Destinations that would fill the cache take another way to memory, straight or staged by how their rows lie.
TEST(Decode420, LargeDestinations) {
  const struct {
    int width;
    size_t offset;
    F format;
  } cases[] = {{3001, 1, F::BGRA_4444_8u}, {3001, 1, F::XRGB_4444_8u}, {3024, 0, F::BGRA_4444_8u}};
  for (const auto& [width, offset, format] : cases) {
    const int height = static_cast<int>(VX_GetCacheSize() / 8 / width) + 3;
    Block420 src(F::YUV_420_MPEG4_FRAME_709, width, height);
    src.Randomize(6);
    std::vector<uint8_t> memory(static_cast<size_t>(width) * height * 4 + 65), row(width * 4);
    uint8_t* const dst = memory.data() + (-reinterpret_cast<uintptr_t>(memory.data()) & 63) + offset;
    ASSERT_EQ(VX_Success, DecodePlanes(src, dst, 4 * width, width, height, format, 0, 2));
    Rows420 rows;
    ASSERT_EQ(VX_Success, rows.Prepare(PictureFromBlock(src.bytes.data(), src.format, width, height), F::BGRX_4444_8u,
                                       width, height, 0, 2));
    std::vector<uint8_t> scratch(rows.ScratchBytes());
    rows.UseScratch(scratch.data());
    for (int y = 0; y < height; ++y) {
      rows.BeginRow(y);
      rows.Pixels(0, width, row.data());
      if (format == F::XRGB_4444_8u)
        for (int x = 0; x < width; ++x)
          std::swap(row[4 * x], row[4 * x + 3]), std::swap(row[4 * x + 1], row[4 * x + 2]);
      ASSERT_EQ(0, std::memcmp(row.data(), &dst[static_cast<size_t>(y) * width * 4], row.size())) << y;
    }
  }
}

TEST(Decode420, StaysInsideItsMemory) {
  for (const F format : Formats420())
    for (const F destination : {F::BGRA_4444_8u, F::VUYX_4444_8u_709, F::UYVY_422_8u}) {
      for (const int reduction : {1, 2, 4}) {
        ArenaCase arenaCase;
        arenaCase.name = "decode 4:2:0 / " + std::to_string(reduction);
        arenaCase.sources = {format};
        arenaCase.destination = destination;
        if (reduction != 1) arenaCase.widths = {1, 2, 3, 8, 17, 31, 33, 64};
        arenaCase.heights = reduction == 4 ? Range(1, 4) : Range(1, 8);
        arenaCase.sourceSize = [=](int, ArenaSize size) {
          return ArenaSize{size.width * reduction, size.height * reduction};
        };
        arenaCase.seed = Bits(format);
        arenaCase.run = [=](const ArenaFrame* sources, const ArenaFrame& dst) {
          return Decode420(sources->base, format, sources->width, sources->height, dst.base, dst.rowBytes, dst.width,
                           dst.height, destination, 0, (dst.width + dst.height) % 3);
        };
        EXPECT_TRUE(RunArena(arenaCase));
      }
    }
}

TEST(Decode420, Refuses) {
  const F mpeg = F::YUV_420_MPEG2_FRAME, bgra = F::BGRA_4444_8u;
  const struct {
    F src, dst;
    int width, height, dstWidth, dstHeight, quality;
    VX_Result expected;
  } cases[] = {
      {F::BGRA_4444_8u, bgra, 16, 16, 16, 16, 0, VX_ErrUnsupportedFormat},
      {F::PALDV25, mpeg, 16, 16, 16, 16, 0, VX_ErrUnsupportedFormat},
      {FromBits(0x0A000830), bgra, 16, 16, 16, 16, 0, VX_ErrUnsupportedFormat},
      {FromBits(0x0F000831), bgra, 16, 16, 16, 16, 0, VX_ErrUnsupportedFormat},
      {FromBits(0x0A000931), bgra, 16, 16, 16, 16, 0, VX_ErrUnsupportedFormat},
      {mpeg, mpeg, 16, 16, 16, 16, 0, VX_ErrUnsupportedDestinationFormat},
      {mpeg, F::NTSCDV25, 16, 16, 7, 7, 9, VX_ErrUnsupportedDestinationFormat},
      {mpeg, bgra, 16, 16, 15, 16, 0, VX_ErrUnsupportedConversion},
      {mpeg, bgra, 16, 16, 32, 16, 0, VX_ErrUnsupportedConversion},
      {mpeg, bgra, 48, 48, 16, 24, 0, VX_ErrUnsupportedConversion},  // 3
      {mpeg, bgra, 48, 48, 12, 16, 0, VX_ErrUnsupportedConversion},  // an odd ratio of heights
      {mpeg, bgra, 48, 48, 3, 24, 0, VX_ErrUnsupportedConversion},   // 16
      {mpeg, bgra, 48, 50, 12, 12, 0, VX_ErrUnsupportedConversion},
      {mpeg, bgra, 48, 48, 12, 12, 3, VX_ErrUnsupportedConversion},
      {mpeg, bgra, 49, 48, 24, 24, 0, VX_ErrUnsupportedConversion},
      {mpeg, bgra, 16, 16, -16, 16, 0, VX_ErrUnsupportedConversion},
      {mpeg, bgra, -16, -16, -16, -16, 0, VX_ErrUnsupportedConversion},
      {mpeg, bgra, INT_MIN, INT_MIN, INT_MIN, INT_MIN, 0, VX_ErrUnsupportedConversion},
      {mpeg, bgra, 16, 16, 8, 0, 0, VX_ErrUnsupportedConversion},
      {mpeg, bgra, 0, 0, 8, 8, 0, VX_ErrUnsupportedConversion},
      {mpeg, bgra, 0, 16, 0, 16, 0, VX_Success},
      {mpeg, bgra, 16, 1, 16, 0, 0, VX_Success},
      {mpeg, bgra, 0, 0, 0, 0, 0, VX_Success},
  };
  for (const auto& c : cases) {
    std::string what = ::testing::PrintToString(&c - cases);
    const auto call = [&](void* memory) {
      const void* const planes[3] = {memory, memory, memory};
      const int32_t rowBytes[3] = {16, 16, 16};
      return VX::DecompressYUV_420_8u(planes, rowBytes, c.width, c.height, c.src, memory, 64, c.dstWidth, c.dstHeight,
                                      c.dst, FieldType::Whole, static_cast<RenderQuality>(c.quality));
    };
    ExpectRefusal(what, c.expected, call);
    ExpectRefusal(what, c.expected, [&](void* memory) {
      return Decode420(memory, c.src, c.width, c.height, memory, 64, c.dstWidth, c.dstHeight, c.dst, 0, c.quality);
    });
  }
  // The anamorphic cases belong to the has-SSE2 switch.
  VX_SetDebugFlag(3, 0);
  ExpectRefusal("4/3 without SSE2", VX_ErrUnsupportedConversion,
                [&](void* memory) { return Decode420(memory, mpeg, 96, 16, memory, 512, 128, 16, bgra, 0, 0); });
  VX_SetDebugFlag(3, 1);

  uint8_t memory[64] = {};
  const int32_t rowBytes[3] = {1, 1, 1};
  for (int missing = 0; missing < 4; ++missing) {
    const void* planes[3] = {memory, memory, memory};
    if (missing < 3) planes[missing] = nullptr;
    EXPECT_EQ(missing < 3 ? VX_ErrNullSource : VX_ErrNullDestination,
              VX::DecompressYUV_420_8u(planes, rowBytes, 1, 1, mpeg, missing < 3 ? memory : nullptr, 4, 1, 1, bgra,
                                       FieldType::Whole, RenderQuality::Low));
  }
  EXPECT_EQ(VX_ErrNullSource, VX::DecompressYUV_420_8u(nullptr, nullptr, 1, 1, mpeg, memory, 4, 1, 1, bgra,
                                                       FieldType::Whole, RenderQuality::Low));
  EXPECT_EQ(VX_ErrNullSource, Decode420(nullptr, mpeg, 1, 1, memory, 4, bgra, 2));
  EXPECT_EQ(VX_ErrNullDestination, Decode420(memory, mpeg, 1, 1, nullptr, 4, bgra, 2));
}

TEST(Decode420, SurvivesFailingAllocations) {
  const int width = 140000;  // rows too long for the stack
  Block420 src(F::YUV_420_MPEG2_FRAME, width, 2);
  std::vector<uint8_t> dst(width * 16 * 2);
  for (const F format : {F::BGRA_4444_8u, F::BGRA_4444_32f})
    EXPECT_GT(ExpectSurvivesFailingAllocations(
                  "decode 4:2:0",
                  [&] { return Decode420(src.bytes.data(), src.format, width, 2, dst.data(), width * 16, format, 2); }),
              0);
}

TEST(Decode420, TracesFullSizeDecodes) {
  std::string lines;
  vexel_host::SetTraceSink([&](std::string_view line) { lines += line; });
  std::vector<uint8_t> dst(8 * 8 * 4);
  Block420 planar(F::YUV_420_MPEG2_FRAME, 8, 8), deep(FromBits(0x0E000A71), 8, 8);
  DecodePlanes(planar, dst.data(), 32, 8, 4, F::BGRA_4444_8u, 1, 2);
  EXPECT_EQ(lines, "");
  DecodePlanes(planar, dst.data(), 32, 8, 8, F::BGRA_4444_8u, 0, 2);
  EXPECT_THAT(lines, ::testing::ContainsRegex("<Vexel> <5> <unnamed>::ConvertFromYUV_420_8u_full: inSrcWidth =8, "
                                              "inSrcHeight =8, inSrcRowBytes\\[3\\]:128 128 128\n$"));
  EXPECT_THAT(lines, ::testing::Not(::testing::HasSubstr("TODO")));
  DecodePlanes(deep, dst.data(), 32, 8, 8, F::BGRA_4444_8u, 0, 2);
  EXPECT_THAT(lines, ::testing::HasSubstr(": TODO for BiPlanar 10u\n"));
  vexel_host::SetTraceSink({});
}

}  // namespace
}  // namespace vexel::testing
