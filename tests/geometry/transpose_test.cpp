#include <gtest/gtest.h>

#include <climits>
#include <cstring>
#include <string>
#include <vector>

#include "formats/FormatBits.h"
#include "geometry/Transpose.h"
#include "support/Arena.h"
#include "support/PaddedRows.h"

namespace vexel {
namespace {

using F = VX_PixelFormat;

// Pictures of elements.
struct Picture : testing::PaddedRows {
  Picture(int width, int height, int size, int padding, size_t offset, bool upsideDown, uint64_t seed)
      : PaddedRows(static_cast<size_t>(width * size), height, padding, upsideDown, seed, offset), elementSize(size) {}
  uint8_t* Element(int row, int column) { return memory.data() + At(row) + column * elementSize; }
  int elementSize;
};

// Moves each element by the definition into a copy of the destination and compares the whole memory, padding included.
template <class Source>
void ExpectMoved(Picture dst, Picture& result, int rows, int columns, Source&& source) {
  for (int i = 0; i < rows; ++i)
    for (int j = 0; j < columns; ++j)
      std::memcpy(dst.Element(i, j), source(i, j), static_cast<size_t>(dst.elementSize));
  ASSERT_EQ(dst.memory, result.memory);
}

TEST(Transpose, EverySizeShapeAndStride) {
  for (int size = 1; size <= 16; ++size)
    for (const auto& [width, height] :
         {std::pair{1, 1}, {3, 2}, {1, 70}, {70, 1}, {64, 64}, {67, 130}, {530, 33}, {129, 65}, {2055, 261}})
      for (const bool upsideDown : {false, true}) {
        SCOPED_TRACE(::testing::Message() << "size " << size << " " << width << " x " << height);
        Picture src(width, height, size, 3 * size, 5, upsideDown, 1),
            dst(height, width, size, 2 * size, 3, !upsideDown, 2);
        Picture result(height, width, size, 2 * size, 3, !upsideDown, 2);
        ASSERT_EQ(VX_Transpose(src.base(), src.rowBytes, result.base(), result.rowBytes, width, height,
                               static_cast<uint8_t>(size)),
                  VX_Success);
        ExpectMoved(dst, result, width, height, [&](int i, int j) { return src.Element(j, i); });
      }
}

TEST(Transpose, StridesCountWholeElements) {
  Picture src(5, 4, 3, 3, 0, false, 1), dst(4, 5, 3, 0, 0, false, 2), result(4, 5, 3, 0, 0, false, 2);
  ASSERT_EQ(VX_Transpose(src.base(), src.rowBytes + 2, result.base(), result.rowBytes + 1, 5, 4, 3), VX_Success);
  ExpectMoved(dst, result, 5, 4, [&](int i, int j) { return src.Element(j, i); });
}

// Large enough for the path past the cache, at destination offsets that begin inside a cache line.
TEST(Transpose, PastTheCacheNothingChanges) {
  for (const int size : {1, 2, 4, 8, 16})
    for (const auto& [width, offset] : {std::pair{700, 0}, {700, 48}, {2127, 16}}) {
      const int height = (1 << 20) / (width * size) + 37;
      const int rowBytes = (height * size + 63) / 64 * 64;
      std::vector<uint8_t> src(static_cast<size_t>(width) * size * height),
          memory(static_cast<size_t>(rowBytes) * width + 128, 9);
      testing::Random(3).Fill(src.data(), src.size());
      uint8_t* dst = memory.data() + (64 - reinterpret_cast<uintptr_t>(memory.data()) % 64) + offset;
      ASSERT_EQ(VX_Transpose(src.data(), width * size, dst, rowBytes, width, height, static_cast<uint8_t>(size)),
                VX_Success);
      for (int x = 0; x < width; ++x) {
        for (int y = 0; y < height; ++y)
          ASSERT_EQ(std::memcmp(dst + static_cast<ptrdiff_t>(x) * rowBytes + y * size,
                                &src[(static_cast<size_t>(y) * width + x) * size], size),
                    0);
        for (int k = height * size; k < rowBytes && x + 1 < width; ++k)
          ASSERT_EQ(dst[static_cast<ptrdiff_t>(x) * rowBytes + k], 9);
      }
    }
}

// Memory beyond the rows, on either side, at any alignment and stride.
TEST(Transpose, TouchesNothingButTheElements) {
  for (size_t size = 1; size <= 16; ++size) {
    testing::ArenaCase arenaCase;
    arenaCase.name = "VX_Transpose of " + std::to_string(size) + "-byte elements";
    arenaCase.sources = {F::UYVY_422_8u};
    arenaCase.destination = F::UYVY_422_8u;
    arenaCase.elementBytes = size;
    arenaCase.heights = testing::Range(1, 79);
    arenaCase.widths = testing::Range(1, 79);
    arenaCase.sourceSize = [](int, testing::ArenaSize size) { return testing::ArenaSize{size.height, size.width}; };
    arenaCase.run = [size](const testing::ArenaFrame* sources, const testing::ArenaFrame& to) {
      return VX_Transpose(sources[0].base, sources[0].rowBytes, to.base, to.rowBytes, to.height, to.width,
                          static_cast<uint8_t>(size));
    };
    EXPECT_TRUE(RunArena(arenaCase));
  }
}

TEST(Rotate, TouchesNothingButThePixels) {
  for (const F format : {F::BGRA_4444_8u, F::ARGB_4444_15u, F::VUYP_4444_32f})
    for (const int angle : {0, 90, -90, 180})
      for (const bool flip : {false, true}) {
        testing::ArenaCase arenaCase;
        arenaCase.name = "VX_RotateImageAndFlip by " + std::to_string(angle) + (flip ? ", flipped" : "");
        arenaCase.sources = {format};
        arenaCase.destination = format;
        arenaCase.heights = testing::Range(1, 79);
        arenaCase.widths = testing::Range(1, 79);
        arenaCase.sourceSize = [angle](int, testing::ArenaSize size) {
          return angle % 180 == 0 ? size : testing::ArenaSize{size.height, size.width};
        };
        arenaCase.run = [angle, flip](const testing::ArenaFrame* sources, const testing::ArenaFrame& to) {
          return VX_RotateImageAndFlip(sources[0].base, sources[0].rowBytes, to.base, to.rowBytes, sources[0].width,
                                       sources[0].height, to.format, angle, flip);
        };
        EXPECT_TRUE(RunArena(arenaCase));
      }
}

TEST(Rotate, EveryAngleFlipAndDepth) {
  for (const F format : {F::BGRA_4444_8u, F::PRGB_4444_15u, F::VUYX_4444_32f_709})
    for (const auto& [w, h] : {std::pair{3, 2}, {1, 1}, {37, 66}, {130, 17}})
      for (const int angle : {0, 90, 180, 270, -90, -180, -270})
        for (const bool flip : {false, true}) {
          SCOPED_TRACE(::testing::Message() << w << " x " << h << " angle " << angle << " flip " << flip);
          const int size = Depth(format) == kDepth8u ? 4 : Depth(format) == kDepth15u ? 8 : 16;
          const bool sideways = angle % 180 != 0;
          const int rows = sideways ? w : h, columns = sideways ? h : w;
          Picture src(w, h, size, 8, 4, flip, 1), dst(columns, rows, size, 4, 7, !flip, 2),
              result(columns, rows, size, 4, 7, !flip, 2);
          ASSERT_EQ(VX_RotateImageAndFlip(src.base(), src.rowBytes, result.base(), result.rowBytes, w, h, format, angle,
                                          flip),
                    VX_Success);
          const auto at = [&, h = h](int r, int c) { return src.Element(flip ? h - 1 - r : r, c); };
          ExpectMoved(dst, result, rows, columns, [&, w = w, h = h](int i, int j) {
            switch (angle) {
              case 0:
                return at(i, j);
              case 90:
              case -270:
                return at(j, w - 1 - i);
              case 270:
              case -90:
                return at(h - 1 - j, i);
              default:
                return at(h - 1 - i, w - 1 - j);
            }
          });
        }
}

// Large enough for the path past the cache; rows begin anywhere in a cache line, once even inside a pixel's bytes.
TEST(Rotate, PastTheCacheAHalfTurnIsTheSame) {
  for (const F format : {F::BGRA_4444_8u, F::ARGB_4444_15u, F::VUYP_4444_32f})
    for (const size_t offset : {16, 3}) {
      const int size = Depth(format) == kDepth8u ? 4 : Depth(format) == kDepth15u ? 8 : 16, width = 1003;
      const int height = static_cast<int>(VX_GetCacheSize() / 2 / static_cast<uint32_t>(width * size)) + 2;
      Picture src(width, height, size, size, 4, false, 1), dst(width, height, size, 3 * size, offset, true, 2),
          result(width, height, size, 3 * size, offset, true, 2);
      ASSERT_EQ(VX_RotateImageAndFlip(src.base(), src.rowBytes, result.base(), result.rowBytes, width, height, format,
                                      180, false),
                VX_Success);
      ExpectMoved(dst, result, height, width, [&](int i, int j) { return src.Element(height - 1 - i, width - 1 - j); });
    }
}

TEST(Transpose, RefusalsAndEmptySizes) {
  void* const nowhere = reinterpret_cast<void*>(16);
  for (const uint8_t size : {0, 17, 255})
    EXPECT_EQ(VX_Transpose(nowhere, 64, nowhere, 64, 4, 4, size), VX_ErrUnsupportedFormat);
  for (const int32_t none : {0, -1, INT_MIN}) {
    EXPECT_EQ(VX_Transpose(nowhere, 64, nowhere, 64, none, 4, 4), VX_Success);
    EXPECT_EQ(VX_RotateImageAndFlip(nowhere, 64, nowhere, 64, 4, none, F::BGRA_4444_8u, 90, true), VX_Success);
  }
  for (const F format : {F::UYVY_422_8u, F::V210_422_10u, F::Invalid, F::PALDV25, FromBits(0x40),
                         F::YUV_420_MPEG2_FRAME, FromBits(0x4 | 0xC0)})
    EXPECT_EQ(VX_RotateImageAndFlip(nowhere, 64, nowhere, 64, 4, 4, format, 45, false), VX_ErrUnsupportedFormat);
  for (const int32_t angle : {45, 360, -360, 1, INT_MIN})
    EXPECT_EQ(VX_RotateImageAndFlip(nowhere, 64, nowhere, 64, 4, 4, F::BGRA_4444_8u, angle, false),
              VX_ErrFormatNotHandled);
}

}  // namespace
}  // namespace vexel
