// 4:2:0 decoding against its definition, over formats, sizes, fields and qualities.
#include "convert/Decode420.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <climits>
#include <cstring>
#include <string>
#include <vector>

#include "support/Arena.h"
#include "support/Formats.h"
#include "support/PaddedRows.h"
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
  std::vector<F> formats = Formats420();
  formats.push_back(FromBits(0x0A001831));  // V before U
  int turn = 0;
  for (const F format : formats)
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

// Every combination of three codes through every matrix and range; grey stays grey.
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
              if (u != 128 || v != 128) continue;
              ASSERT_EQ(pixels[4 * y + k], all ? pixels[4 * y] : k < 2 ? 128 : pixels[4 * y + 2]) << y;
              ASSERT_TRUE(IsVideoRange(src) == all || pixels[4 * y + 2] == y) << "of one range the code itself, " << y;
            }
        }
      EXPECT_LT(worst, kTolerance) << std::hex << Bits(src) << " to " << Bits(dst);
    }
}

// Planes with any stride, upside down too, and chroma rows that lack the last sample of an odd width.
TEST(Decode420, PlanesAnywhere) {
  const int width = 35, height = 9;
  Block420 block(F::YUV_420_MPEG4_FIELD_709, width, height);
  block.Randomize(3);
  std::vector<uint8_t> expected(width * height * 4), dst(expected.size());
  ASSERT_EQ(VX_Success, DecodePlanes(block, expected.data(), 4 * width, width, height, F::BGRA_4444_8u, 0, 2));
  for (const bool up : {false, true}) {
    PaddedRows rows[] = {{width, height, 0, up, 1}, {18, 5, 0, up, 1}, {18, 5, 0, up, 1}};
    for (int i = 0; i < 3; ++i)
      for (int row = 0; row < (i == 0 ? height : 5); ++row)
        std::memcpy(rows[i].memory.data() + rows[i].At(row),
                    static_cast<uint8_t*>(block.planes[i]) + row * block.rowBytes[i], i == 0 ? width : 18);
    const void* const planes[] = {rows[0].base(), rows[1].base(), rows[2].base()};
    const int32_t rowBytes[] = {rows[0].rowBytes, rows[1].rowBytes, rows[2].rowBytes};
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
  for (int row = 0; row < 4; ++row)
    std::memset(static_cast<uint8_t*>(src.planes[0]) + row * src.rowBytes[0], 40 * row + 40, 8);
  const auto lumas = [&](F format, int rowBytes, int first) {
    std::vector<uint8_t> dst(4 * static_cast<size_t>(rowBytes));
    EXPECT_EQ(VX_Success, Decode420(src.bytes.data(), src.format, 8, 4, dst.data(), rowBytes, format, 2));
    return std::vector<int>{dst[first], dst[first + rowBytes], dst[first + 2 * rowBytes], dst[first + 3 * rowBytes]};
  };
  EXPECT_EQ(lumas(F::VUYX_4444_8u_709, 32, 2), (std::vector{160, 120, 80, 40}));
  EXPECT_EQ(lumas(F::UYVY_422_8u_709, 16, 1), (std::vector{40, 80, 120, 160}));
  VX_SetDebugFlag(10, 1);
  EXPECT_EQ(lumas(F::VUYX_4444_8u_709, 32, 2), (std::vector{40, 80, 120, 160}));
  VX_SetDebugFlag(10, 0);
}

// Whether a picture's rows made in parts are those it holds.
bool IsSameInParts(const ArenaFrame& src, const ArenaFrame& dst, int quality) {
  constexpr int kPart = 46;
  Rows420 rows;
  if (!Rows420::CanMake(dst.format)) return true;
  if (rows.Prepare(PictureFromBlock(src.base, src.format, src.width, src.height), dst.format, dst.width, dst.height, 0,
                   quality) != VX_Success)
    return false;
  std::vector<uint8_t> scratch(rows.ScratchBytes());
  uint8_t part[4 * kPart];
  rows.UseScratch(scratch.data());
  for (int y = 0; y < dst.height; ++y) {
    rows.BeginRow(y);
    for (int x = 0; x < dst.width; x += kPart) {
      const int count = std::min(kPart, dst.width - x);
      rows.Pixels(x, count, part);
      if (std::memcmp(part, dst.Row(dst.height - 1 - y) + 4 * x, static_cast<size_t>(count) * 4) != 0) return false;
    }
  }
  return true;
}

TEST(Decode420, StaysInsideItsMemory) {
  const struct {
    std::vector<int> widths;
    int wide, by, tall;  // the source: so many times as wide and as tall
  } ratios[] = {{Range(1, 130), 1, 1, 1},
                {{1, 2, 3, 8, 17, 31, 33, 64, 199}, 2, 1, 2},
                {{1, 2, 3, 8, 17, 31, 33, 64}, 4, 1, 4},
                {{1, 8, 9, 31, 64}, 8, 1, 10},
                {{128, 256, 384}, 3, 4, 1},
                {{24, 48, 72, 96, 168}, 2, 3, 2}};
  for (const F format : Formats420())
    for (const F destination : {F::BGRA_4444_8u, F::VUYX_4444_8u_709, F::UYVY_422_8u})
      for (const auto& ratio : ratios) {
        ArenaCase c;
        c.name = "decode 4:2:0 by " + std::to_string(ratio.by) + "/" + std::to_string(ratio.wide);
        c.sources = {format};
        c.destination = destination;
        c.widths = ratio.widths;
        c.heights = Range(1, ratio.tall > 2 ? 4 : 8);
        c.sourceSize = [&](int, ArenaSize size) {
          return ArenaSize{size.width * ratio.wide / ratio.by, size.height * ratio.tall};
        };
        c.seed = Bits(format);
        c.run = [=](const ArenaFrame* src, const ArenaFrame& dst) {
          const int quality = (dst.width + dst.height) % 3;
          const VX_Result result = Decode420(src->base, format, src->width, src->height, dst.base, dst.rowBytes,
                                             dst.width, dst.height, destination, 0, quality);
          return result != VX_Success || IsSameInParts(*src, dst, quality) ? result : VX_ErrReserved1;
        };
        EXPECT_TRUE(RunArena(c));
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
  for (const int size : {1, 0, -1})
    EXPECT_EQ(VX_ErrNullSource, Decode420(nullptr, mpeg, size, 1, memory, 4, bgra, 2)) << size;
  EXPECT_EQ(VX_ErrNullDestination, Decode420(memory, mpeg, 1, 1, nullptr, 4, bgra, 2));
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
