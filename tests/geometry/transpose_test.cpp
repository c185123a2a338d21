// Transposes and rotations, element by element.
#include "support/Arena.h"
#include "support/Operations.h"
#include "support/PaddedRows.h"
#include "support/Processor.h"
#include "support/Test.h"

namespace vexel::testing {
namespace {

// A transpose is the turn by 270 degrees of a flipped picture.
struct Turn {
  int angle;
  bool flip;

  bool IsSideways() const { return angle % 180 != 0; }
  // What of the source lands at an element of the result, by the definition.
  const uint8_t* Origin(const ArenaFrame& from, size_t size, int row, int column) const {
    const int w = from.width, h = from.height, quarters = (angle + 360) / 90 % 4;
    const int x[] = {column, w - 1 - row, w - 1 - column, row}, y[] = {row, column, h - 1 - row, h - 1 - column};
    return from.Row(flip ? h - 1 - y[quarters] : y[quarters]) + static_cast<size_t>(x[quarters]) * size;
  }
  bool Made(const ArenaFrame& to, const ArenaFrame& from, size_t size) const {
    for (int row = 0; row < to.height; ++row)
      for (int column = 0; column < to.width; ++column)
        if (std::memcmp(to.Row(row) + static_cast<size_t>(column) * size, Origin(from, size, row, column), size) != 0)
          return false;
    return true;
  }
};
constexpr Turn kTranspose{270, true};

// Strides count whole elements: the rest of a division is nothing.
VX_Result TransposeElements(const ArenaFrame& from, const ArenaFrame& to, size_t size) {
  const auto bytes = static_cast<uint8_t>(size);
  const auto more = [&](int32_t rowBytes) { return rowBytes + (rowBytes < 0 ? -1 : 1) * (from.width % bytes); };
  return VX_Transpose(from.base, more(from.rowBytes), to.base, more(to.rowBytes), from.width, from.height, bytes);
}

ArenaCase CaseOf(const Turn& turn, F format, size_t size,
                 std::function<VX_Result(const ArenaFrame& from, const ArenaFrame& to)> call) {
  ArenaCase c;
  c.name = std::to_string(size) + " bytes by " + std::to_string(turn.angle) + (turn.flip ? ", flipped" : "");
  c.sources = {format};
  c.destination = format;
  c.heights = c.widths = Range(1, 79);
  if (turn.IsSideways()) c.sourceSize = [](int, ArenaSize to) { return ArenaSize{to.height, to.width}; };
  c.run = [=](const ArenaFrame* from, const ArenaFrame& to) {
    const VX_Result result = call(*from, to);
    return turn.Made(to, *from, size) ? result : VX_ErrReserved1;
  };
  return c;
}

TEST(Transpose, EveryElementSize) {
  for (size_t size = 1; size <= 16; ++size) {
    ArenaCase c = CaseOf(kTranspose, F::UYVY_422_8u, size, [size](const ArenaFrame& from, const ArenaFrame& to) {
      return TransposeElements(from, to, size);
    });
    c.elementBytes = size;
    EXPECT_TRUE(RunArena(c));
  }
}

TEST(Rotate, EveryAngleFlipAndDepthInTheCacheAndPastIt) {
  for (const F format : {F::BGRA_4444_8u, FromBits(0x44), F::ARGB_4444_15u, F::VUYX_4444_32f_709})
    for (const int angle : {0, 90, 180, 270, -90, -180, -270})
      for (const bool flip : {false, true}) {
        const auto size = static_cast<size_t>(UnpaddedRowBytes(format, 1));
        const ArenaCase c = CaseOf({angle, flip}, format, size, [=](const ArenaFrame& from, const ArenaFrame& to) {
          return Rotate(from, to, angle, flip);
        });
        EXPECT_TRUE(RunArena(c));
        const SmallCache small;
        EXPECT_TRUE(RunArena(c)) << "past the cache";
      }
}

// Several panels of columns, rows that share places in the cache, and what is large enough to be streamed: into whole
// lines, from any place in one.
TEST(Transpose, LargePictures) {
  for (size_t size = 1; size <= 16; ++size)
    for (const auto& [width, lines, offset] :
         {std::tuple{2055, 0, 3}, {1021, 0, 0}, {700, 1, 0}, {700, 1, 48}, {1021, 1, 16}, {2127, 1, 16}}) {
      if (lines && (size & (size - 1))) continue;                       // the others are not streamed
      const SmallCache cache(offset == 16 ? 1024 : VX_GetCacheSize());  // where more is fetched ahead
      const int step = static_cast<int>(size), height = lines ? (1 << 20) / (width * step) + 37 : 261;
      const int padding = lines ? 64 - height * step % 64 : 2 * step;
      PaddedRows src(static_cast<size_t>(width * step), height, 3 * step, lines == 0, 1, 5);
      PaddedRows dst(static_cast<size_t>(height * step), width, padding, lines != 0, 2, static_cast<size_t>(offset));
      PaddedRows result = dst;
      const ArenaFrame from{src.base(), src.rowBytes, {}, width, height},
          to{result.base(), result.rowBytes, {}, height, width};
      ASSERT_EQ(VX_Transpose(from.base, from.rowBytes, to.base, to.rowBytes, width, height, static_cast<uint8_t>(size)),
                VX_Success);
      ASSERT_TRUE(kTranspose.Made(to, from, size)) << size << " bytes, width " << width << " at " << offset;
      for (int row = 0; row < width; ++row)
        std::memcpy(dst.base() + ptrdiff_t{row} * dst.rowBytes, to.Row(row), static_cast<size_t>(height) * size);
      ASSERT_EQ(dst.memory, result.memory) << "padding";
    }
}

TEST(Transpose, RefusalsAndEmptySizes) {
  void* const nowhere = UnreadableMemory();
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
}  // namespace vexel::testing
