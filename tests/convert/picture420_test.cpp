// 4:2:0 pictures: layouts, copies and plans; decoding and encoding against their definitions.
#include <gmock/gmock.h>

#include "convert/Decode420.h"
#include "convert/Planar420.h"
#include "frame/Features.h"
#include "support/Arena.h"
#include "support/Formats.h"
#include "support/PaddedRows.h"
#include "support/Processor.h"
#include "support/Reference420.h"
#include "support/Test.h"
#include "vexel/host_types.h"
#include "vexel_host/host.h"

namespace vexel::testing {
namespace {

TEST(Planar420, Layouts) {
  const F biplanar = FromBits(0x0E000A31), biplanar10 = FromBits(0x0D000A71);
  const struct {
    F format;
    int width, height;
    ptrdiff_t chroma, second;  // offsets of the chroma planes, -1 for none
    int32_t rowBytes[3];
  } cases[] = {
      {F::YUV_420_MPEG2_FRAME, 720, 480, 368640, 368640 + 92160, {768, 384, 384}},
      {F::YUV_420_MPEG4_FIELD_FullRange_709, 1920, 1080, 1920 * 1088, 1920 * 1088 + 544 * 1024, {1920, 1024, 1024}},
      {F::YUV_420_MPEG2_FRAME, 257, 1, 384 * 32, 384 * 32 + 128 * 16, {384, 128, 128}},
      {F::YUV_420_MPEG2_FRAME, 1, 33, 128 * 64, 128 * 64, {128, 0, 0}},
      {biplanar, 1920, 1080, 1920 * 1080, -1, {1920, 1920, 1024}},
      {biplanar, 129, 3, 256 * 3, -1, {256, 256, 128}},
      {biplanar10, 1920, 1080, 3840 * 1080, -1, {3840, 3840, 3840}},
      {biplanar10, 65, 3, 256 * 3, -1, {256, 256, 256}},
      {F::YUV_420_MPEG2_FRAME, 16, -33, -128 * 32, -128 * 48, {128, 128, 128}},  // the formulas hold on
      {biplanar, 16, -3, -128 * 3, -1, {128, 128, 128}},
      {FromBits(0x0A000071), INT_MAX, 64, int64_t{1} << 38, (int64_t{1} << 38) + (int64_t{1} << 37), {0, 0, 0}},
  };
  std::vector<uint8_t> memory(16);
  for (const auto& c : cases) {
    void* planes[3];
    int32_t rowBytes[3];
    ASSERT_EQ(VX_Success, VX_GetPlanarBuffers(memory.data(), c.format, c.width, c.height, planes, rowBytes));
    const auto* base = memory.data();
    EXPECT_EQ(planes[0], base);
    EXPECT_EQ(planes[1], base + c.chroma);
    EXPECT_EQ(planes[2], c.second == -1 ? nullptr : base + c.second) << c.width;
    for (int i = 0; i < 3; ++i) EXPECT_EQ(rowBytes[i], c.rowBytes[i]) << c.width << " plane " << i;
    if (IsBiplanar(c.format) && Depth(c.format) == kDepth8u) {
      void* two[2];
      int32_t rowBytesOfTwo[2];
      ASSERT_EQ(VX_Success, VX_GetBiPlanarBuffers(memory.data(), F::Invalid, c.width, c.height, two, rowBytesOfTwo));
      for (int i = 0; i < 2; ++i) EXPECT_TRUE(two[i] == planes[i] && rowBytesOfTwo[i] == rowBytes[i]) << c.width;
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

// Where rows have no gaps, chroma is one run of a half or a quarter of the luma's bytes, rounded down once.
TEST(Planar420, CopiesPlanes) {
  for (const bool biplanar : {false, true})
    for (const int gap : {0, 5})
      for (const int width : {1, 2, 7, 16, 33})
        for (const int height : {1, 2, 5, 8}) {
          const int chroma = biplanar ? width : width / 2;
          // The planes each way, with the gaps and the ends filled differently.
          std::vector<uint8_t> src(3 * 1024), dst(src.size(), 0xEE), expected(dst);
          Random(static_cast<uint64_t>(width)).Fill(src.data(), src.size());
          const int32_t srcRowBytes[3] = {width + gap, chroma + gap, chroma + gap};
          const int32_t dstRowBytes[3] = {width + 2 * gap, chroma + 2 * gap, chroma + 2 * gap};
          const void* from[3];
          void* to[3];
          for (int i = 0; i < 3; ++i) {
            from[i] = &src[i * 1024], to[i] = &dst[i * 1024];
            if (biplanar && i == 2) continue;
            for (int row = 0; row < (i == 0 ? height : height / 2); ++row)
              std::memcpy(&expected[i * 1024 + row * dstRowBytes[i]], &src[i * 1024 + row * srcRowBytes[i]],
                          i == 0 ? width : chroma);
            if (i != 0 && gap == 0)
              std::memcpy(&expected[i * 1024], &src[i * 1024], width * height / (biplanar ? 2 : 4));
          }
          const auto copy = biplanar ? VX_CopyBiPlanar_8u : VX_CopyPlanar_8u;
          EXPECT_EQ(VX_Success, copy(from, srcRowBytes, to, dstRowBytes, width, height));
          EXPECT_EQ(dst, expected) << width << " x " << height << " gap " << gap << (biplanar ? " biplanar" : "");
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

TEST(Plan420, Sizes) {
  const struct {
    int width, height, dstWidth, dstHeight, quality;
    int plannedWidth, plannedHeight;
    bool needsSse2 = false;
  } cases[] = {
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
    for (const auto& c : cases) {
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

// ---- 4:2:0 decoding against its definition, over formats, sizes, fields and qualities

using zovmediatypes::FieldType;
using zovmediatypes::RenderQuality;

// Half a code of rounding, and what the fixed-point sums may stray.
constexpr double kDecodeTolerance = 0.5 + 0.07;

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
        ASSERT_NEAR(pixel[k], std::clamp(codes[k], 0.0, 255.0), kDecodeTolerance)
            << "x " << x << " row " << row << " " << k;
    }
}

TEST(Decode420, EveryFormatAndBranch) {
  const Sizes sizes[] = {
      {16, 8, 16, 8},   {1, 1, 1, 1},     {2, 2, 2, 2},    {5, 3, 5, 3},   {37, 6, 37, 6},  {130, 3, 130, 3},
      {257, 5, 257, 5}, {64, 10, 64, 5},  {7, 7, 7, 3},    {38, 7, 19, 3}, {16, 12, 8, 6},  {16, 16, 16, 4},
      {32, 16, 8, 4},   {64, 32, 8, 2},   {64, 24, 32, 4}, {32, 64, 8, 1}, {34, 40, 17, 2}, {96, 5, 128, 5},
      {96, 8, 128, 4},  {192, 3, 256, 3}, {16, 5, 24, 5},  {48, 9, 72, 4}, {80, 2, 120, 1}, {4131, 3, 4131, 3},
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
          kernels.nearest.bytes[ActiveKernelVariant()]({luma.data(), us.data(), vs.data(), pixels.data(), 256, false},
                                                       matrix);
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
      EXPECT_LT(worst, kDecodeTolerance) << std::hex << Bits(src) << " to " << Bits(dst);
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

// ---- 4:2:0 encoding against its definition

constexpr double kEncodeTolerance = 0.5 + 0.03;

std::vector<F> Destinations() {
  std::vector<F> formats;
  for (const F format : Formats420())
    if (!IsBiplanar(format) && (!IsVideoRange(format) || Colorimetry(format) == kColorimetry709))
      formats.push_back(format);
  return formats;
}

F InputOf(F dst) { return IsVideoRange(dst) ? F::VUYX_4444_8u_709 : F::BGRX_4444_8u; }

// A raster of four 8-bit channels without padding, bottom line first.
struct Raster {
  int width, height;
  std::vector<uint8_t> bytes;
  Raster(int w, int h) : width(w), height(h), bytes(static_cast<size_t>(w) * h * 4) {}
  uint8_t* Pixel(int x, int line) { return &bytes[(static_cast<size_t>(height - 1 - line) * width + x) * 4]; }
};

// Codes of the destination for a pixel.
Ycc YccOf(const uint8_t* pixel, F dst) {
  if (IsVideoRange(dst)) return {double(pixel[2]), double(pixel[1]), double(pixel[0])};
  return FromBgr({double(pixel[0]), double(pixel[1]), double(pixel[2])}, dst);
}

// The chroma at column 2 i of a line: the tent over the columns beside it.
double ChromaAcross(Raster& src, int i, int line, int plane, F dst) {
  const auto at = [&](int x) { return YccOf(src.Pixel(std::clamp(x, 0, src.width - 1), line), dst)[plane]; };
  return (at(2 * i - 1) + 2 * at(2 * i) + at(2 * i + 1)) / 4;
}

// A chroma row is where its position falls between the two lines that it covers, of the picture or of its field.
double ChromaOf(Raster& src, int i, int row, int plane, F dst) {
  const bool fields = FrameKind(dst) % 2 == 1;
  const double position = 2 * row + 0.5;  // in lines of the picture, in field pictures too
  const int first = fields ? row / 2 * 4 + row % 2 : 2 * row, spacing = fields ? 2 : 1;
  const int second = first + spacing < src.height ? first + spacing : first;
  const double t = (position - first) / spacing;
  return (1 - t) * ChromaAcross(src, i, first, plane, dst) + t * ChromaAcross(src, i, second, plane, dst);
}

TEST(Encode420, EveryFormatAndOddSizes) {
  const int sizes[][2] = {{1, 1}, {2, 2}, {3, 3}, {5, 6}, {8, 4}, {17, 5}, {33, 10}, {64, 2}, {131, 7}, {257, 3}};
  Random random;
  for (const F format : Destinations())
    for (const auto& [width, height] : sizes) {
      Raster src(width, height);
      random.Fill(src.bytes.data(), src.bytes.size());
      Block420 dst(format, width, height);
      ASSERT_EQ(VX_Success,
                Encode420(src.bytes.data(), 4 * width, InputOf(format), dst.bytes.data(), format, width, height));
      SCOPED_TRACE(::testing::Message() << VX_PixelFormatName(format) << " " << width << "x" << height);
      for (int line = 0; line < height; ++line)
        for (int x = 0; x < width; ++x)
          ASSERT_NEAR(dst.Code(0, x, line), YccOf(src.Pixel(x, line), format)[0], kEncodeTolerance);
      const int columns = std::min((width + 1) / 2, dst.rowBytes[1]);
      for (int plane = 1; plane < 3; ++plane)
        for (int row = 0; row < (height + 1) / 2; ++row)
          for (int i = 0; i < columns; ++i)
            ASSERT_NEAR(dst.Code(plane, i, row), std::min(ChromaOf(src, i, row, plane, format), 255.0),
                        kEncodeTolerance)
                << "plane " << plane << " row " << row << " column " << i;
    }
}

// The whole RGB cube in steps: luma and chroma of flat pictures, and grey without chroma.
TEST(Encode420, Colours) {
  for (const F format : {F::YUV_420_MPEG2_FRAME_FullRange, F::YUV_420_MPEG4_FIELD_FullRange_709}) {
    Block420 dst(format, 2, 2);
    Raster src(2, 2);
    for (int b = 0; b < 256; b += 5)
      for (int g = 0; g < 256; g += 5)
        for (int r = 0; r < 256; r += 5) {
          for (int i = 0; i < 4; ++i) {
            const uint8_t pixel[4] = {static_cast<uint8_t>(b), static_cast<uint8_t>(g), static_cast<uint8_t>(r), 9};
            std::memcpy(&src.bytes[4 * i], pixel, 4);
          }
          ASSERT_EQ(VX_Success, Encode420(src.bytes.data(), 8, F::BGRX_4444_8u, dst.bytes.data(), format, 2, 2));
          const Ycc exact = FromBgr({double(b), double(g), double(r)}, format);
          for (int plane = 0; plane < 3; ++plane)
            ASSERT_NEAR(dst.Code(plane, 0, 0), std::min(exact[plane], 255.0), kEncodeTolerance)
                << b << " " << g << " " << r;
          const bool isGrey = b == g && g == r;
          ASSERT_TRUE(!isGrey || (dst.Code(0, 1, 1) == g && dst.Code(1, 0, 0) == 128 && dst.Code(2, 0, 0) == 128)) << g;
        }
  }
}

// What the encoder reads without converting it first is encoded as what its last steps make of it. Alpha comes in runs,
// opaque and not.
TEST(Encode420, SavesStepsOfConversions) {
  const F full = F::YUV_420_MPEG2_FRAME_FullRange, fullFields = F::YUV_420_MPEG4_FIELD_FullRange_709;
  const F video = F::YUV_420_MPEG4_FRAME_709, videoFields = F::YUV_420_MPEG2_FIELD_709;
  const struct {
    F from, through;
    F to[2];
  } cases[] = {{F::BGRA_4444_8u, F::BGRP_4444_8u, {full, fullFields}},
               {F::BGRP_4444_8u, F::BGRX_4444_8u, {full, fullFields}},
               {F::ARGB_4444_8u, F::BGRX_4444_8u, {full, fullFields}},
               {F::UYVY_422_8u_709, F::VUYX_4444_8u_709, {video, videoFields}},
               {F::YUYV_422_8u_709, F::VUYX_4444_8u_709, {video, videoFields}},
               {F::UYVY_422_8u, F::VUYX_4444_8u_709, {video, videoFields}},
               {F::V210_422_10u_709, F::VUYX_4444_8u_709, {video, videoFields}}};
  Random random(5);
  for (const auto& c : cases)
    for (const F format : c.to)
      for (const int width : {1, 2, 3, 31, 64, 130, 389}) {
        const int height = 9;
        const auto bytes = [&](F f) { return static_cast<size_t>(VX_PixelFormatSize(f, width, height)); };
        std::vector<uint8_t> src(bytes(c.from)), through(bytes(c.through));
        random.Fill(src.data(), src.size());
        for (size_t i = 0; i < src.size(); i += 4)
          if (i / 4 / 97 % 3 != 0) src[i + (IsReversed(c.from) ? 0 : 3)] = 255;
        const auto rowBytes = static_cast<int32_t>(src.size()) / height, throughBytes = 4 * width;
        ASSERT_EQ(VX_Success,
                  VX_Convert(src.data(), rowBytes, c.from, through.data(), throughBytes, c.through, width, height, 2));
        Block420 expected(format, width, height), dst(format, width, height);
        ASSERT_EQ(VX_Success,
                  Encode420(through.data(), throughBytes, c.through, expected.bytes.data(), format, width, height));
        ASSERT_EQ(VX_Success, Encode420(src.data(), rowBytes, c.from, dst.bytes.data(), format, width, height));
        ASSERT_EQ(expected.bytes, dst.bytes) << VX_PixelFormatName(c.from) << " " << width;
      }
}

// The last lines of a picture of an odd number of line pairs in fields have chroma that goes nowhere, here to memory of
// the least alignment that a host may give.
TEST(Encode420, StreamsWithMemoryOfAnyAlignment) {
  struct LeastAligned : vexel_host::Allocator {
    void* Allocate(size_t bytes, size_t* rawSize) noexcept override {
      ++count;
      *rawSize = bytes;
      return static_cast<uint8_t*>(::operator new (bytes + 16, std::align_val_t{128})) + 16;
    }
    void Recycle(void* block, size_t) noexcept override {
      ::operator delete (static_cast<uint8_t*>(block) - 16, std::align_val_t{128});
    }
    int count = 0;
  } allocator;
  const int width = 40001, height = 6;
  const F from = F::UYVY_422_32f_709, format = F::YUV_420_MPEG2_FIELD_709;
  const auto rowBytes = static_cast<int32_t>(UnpaddedRowBytes(from, width));
  std::vector<uint8_t> src(static_cast<size_t>(rowBytes) * height);
  Random(1).Fill(src.data(), src.size());
  Block420 expected(format, width, height);
  ASSERT_EQ(VX_Success, Encode420(src.data(), rowBytes, from, expected.bytes.data(), format, width, height));
  const SmallCache cache;
  LineBytes dst(expected.bytes.size());  // streams need planes on lines of the cache
  ASSERT_TRUE(vexel_host::SetAllocator(&allocator));
  EXPECT_EQ(VX_Success, Encode420(src.data(), rowBytes, from, dst.data(), format, width, height));
  ASSERT_TRUE(vexel_host::SetAllocator(nullptr));
  EXPECT_GT(allocator.count, 0);
  EXPECT_TRUE(std::equal(dst.begin(), dst.end(), expected.bytes.begin(), expected.bytes.end()));
}

TEST(Encode420, Refuses) {
  const struct {
    F src, dst;
    int width, height;
    VX_Result expected;
  } cases[] = {
      {F::BGRA_4444_8u, F::YUV_420_MPEG2_FRAME, 16, 16, VX_ErrFormatNotHandled},  // video range, BT.601
      {F::BGRX_4444_8u, FromBits(0x0E000A31), 16, 16, VX_ErrFormatNotHandled},
      {F::BGRX_4444_8u, FromBits(0x0A000A71), 16, 16, VX_ErrFormatNotHandled},
      {F::BGRX_4444_8u, F::BGRX_4444_8u, 16, 16, VX_ErrFormatNotHandled},
      {F::YUV_420_MPEG2_FRAME_709, F::YUV_420_MPEG4_FRAME_709, 16, 16, VX_ErrFormatNotHandled},
      {F::BGRX_4444_8u, F::YUV_420_MPEG2_FRAME_709, 16, 0, VX_Success},
      {F::BGRX_4444_8u, F::YUV_420_MPEG2_FRAME_709, -1, 16, VX_Success},
  };
  for (const auto& c : cases)
    ExpectRefusal(VX_PixelFormatName(c.dst), c.expected,
                  [&](void* memory) { return Encode420(memory, 64, c.src, memory, c.dst, c.width, c.height); });
  uint8_t memory[16] = {};
  const F dst = F::YUV_420_MPEG2_FRAME_709;
  EXPECT_EQ(VX_ErrNullSource, Encode420(nullptr, 4, F::BGRX_4444_8u, memory, dst, 1, 1));
  EXPECT_EQ(VX_ErrNullDestination, Encode420(memory, 4, F::BGRX_4444_8u, nullptr, dst, 1, 1));
}

}  // namespace
}  // namespace vexel::testing
