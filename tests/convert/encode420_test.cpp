// 4:2:0 encoding against its definition.
#include <gtest/gtest.h>

#include <cmath>
#include <cstring>
#include <string>
#include <vector>

#include "convert/Planar420.h"
#include "support/Arena.h"
#include "support/Formats.h"
#include "support/Reference420.h"

namespace vexel::testing {
namespace {

using F = VX_PixelFormat;

constexpr double kTolerance = 0.5 + 0.03;

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
          ASSERT_NEAR(dst.Code(0, x, line), YccOf(src.Pixel(x, line), format)[0], kTolerance);
      const int columns = std::min((width + 1) / 2, dst.rowBytes[1]);
      for (int plane = 1; plane < 3; ++plane)
        for (int row = 0; row < (height + 1) / 2; ++row)
          for (int i = 0; i < columns; ++i)
            ASSERT_NEAR(dst.Code(plane, i, row), std::min(ChromaOf(src, i, row, plane, format), 255.0), kTolerance)
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
            ASSERT_NEAR(dst.Code(plane, 0, 0), std::min(exact[plane], 255.0), kTolerance) << b << " " << g << " " << r;
          const bool isGrey = b == g && g == r;
          ASSERT_TRUE(!isGrey || (dst.Code(0, 1, 1) == g && dst.Code(1, 0, 0) == 128 && dst.Code(2, 0, 0) == 128)) << g;
        }
  }
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
