// Buffers, flips and pixel addresses.
#include <gtest/gtest.h>
#include <vexel_host/host.h>

#include <cstring>
#include <set>
#include <string>
#include <vector>

#include "formats/FormatBits.h"
#include "support/Arena.h"
#include "support/FailingAllocations.h"
#include "support/Random.h"

namespace vexel {
namespace {

using testing::ArenaCase;
using testing::ArenaFrame;

struct Buffer {
  VX_Result result;
  void* raw = reinterpret_cast<void*>(1);
  void* pixels = reinterpret_cast<void*>(1);
  int32_t rowBytes = -77;
  size_t rawSize = 77;
};

using Allocate = decltype(&VX_AllocatePixelBuffer);
using Free = decltype(&VX_FreePixelBuffer);

struct Pair {
  Allocate allocate;
  Free free;
};
const Pair kPairs[] = {{VX_AllocatePixelBuffer, VX_FreePixelBuffer},
                       {VX_AllocateTransientPixelBuffer, VX_FreeTransientPixelBuffer}};

Buffer Get(const Pair& pair, VX_PixelFormat format, int32_t width, int32_t height) {
  Buffer b;
  b.result = pair.allocate(format, width, height, &b.raw, &b.pixels, &b.rowBytes, &b.rawSize);
  return b;
}

TEST(PixelBuffers, AreAlignedColouredAndLargeEnough) {
  const size_t live = vexel_host::LiveBytes();
  std::set<ptrdiff_t> offsets;
  const uint32_t values[] = {0x4, 0x108, 0x84, 0x811, 0xA51, 0x40, 0, 0x01000821, 0x0A000831, 0x0E000E71};
  for (const auto& pair : kPairs)
    for (int round = 0; round < 40; ++round)
      for (const uint32_t value : values) {
        const VX_PixelFormat format = FromBits(value);
        const int32_t width = 1 + 7 * round, height = 1 + 3 * round;
        const Buffer b = Get(pair, format, width, height);
        ASSERT_EQ(b.result, VX_Success);
        EXPECT_EQ(b.rowBytes, PaddedRowBytes(format, width));
        const ptrdiff_t shift = static_cast<uint8_t*>(b.pixels) - static_cast<uint8_t*>(b.raw);
        EXPECT_EQ(reinterpret_cast<uintptr_t>(b.pixels) % 16, 0u);
        EXPECT_GE(shift, 0);
        EXPECT_LE(shift, 8064 + 15);
        EXPECT_LE(shift % 128, 15);
        offsets.insert(shift / 128);
        const auto size = static_cast<size_t>(VX_PixelFormatSize(format, width, height));
        EXPECT_GE(b.rawSize, static_cast<size_t>(shift) + size);
        std::memset(b.pixels, 0x77, size);
        EXPECT_GE(vexel_host::LiveBytes(), live + b.rawSize);
        EXPECT_EQ(pair.free(format, b.raw, b.rawSize), VX_Success);
      }
  EXPECT_EQ(vexel_host::LiveBytes(), live);
  EXPECT_GT(offsets.size(), 48u);  // of 64
  for (const auto& pair : kPairs) EXPECT_EQ(pair.free(VX_PixelFormat::BGRA_4444_8u, nullptr, 5), VX_Success);
}

TEST(PixelBuffers, EmptyAndImpossibleSizes) {
  const auto bgra = VX_PixelFormat::BGRA_4444_8u;
  const auto planar = VX_PixelFormat::YUV_420_MPEG2_FRAME;
  const struct {
    VX_PixelFormat format;
    int32_t width, height;
    VX_Result result;
    int32_t rowBytes;
  } cases[] = {
      {bgra, 0, 10, VX_Success, 0},
      {bgra, 10, 0, VX_Success, 64},
      {FromBits(0xC4), 10, 10, VX_Success, 0},        // no such depth
      {FromBits(0x7F000020), 10, 10, VX_Success, 0},  // a frame of unknown size
      {planar, 0, 10, VX_Success, 0},
      {bgra, -20, 10, VX_ErrOutOfMemory, 0},
      {bgra, 10, -1, VX_ErrOutOfMemory, 0},
      {bgra, -20, -20, VX_ErrOutOfMemory, 0},
      {bgra, INT32_MIN, INT32_MIN, VX_ErrOutOfMemory, 0},
      {planar, -200, 10, VX_ErrOutOfMemory, 0},
      {planar, -200, -200, VX_ErrOutOfMemory, 0},
      // 32 bits wrap to 0, to something small, to something negative.
      {bgra, 0x40000000, 1, VX_ErrOutOfMemory, 0},
      {bgra, 0x8000, 0x8000, VX_ErrOutOfMemory, 0},
      {bgra, 0x8010, 0x8000, VX_ErrOutOfMemory, 0},
      {bgra, 0x4000, 0x8000, VX_ErrOutOfMemory, 0},
      {VX_PixelFormat::BGRA_4444_32f, INT32_MAX, INT32_MAX, VX_ErrOutOfMemory, 0},
      {FromBits(0x0E000E71), INT32_MAX, INT32_MAX, VX_ErrOutOfMemory, 0},
  };
  const size_t live = vexel_host::LiveBytes();
  for (const auto& pair : kPairs)
    for (const auto& c : cases) {
      const Buffer b = Get(pair, c.format, c.width, c.height);
      const auto where = ::testing::Message()
                         << std::hex << Bits(c.format) << std::dec << " " << c.width << "x" << c.height;
      EXPECT_EQ(b.result, c.result) << where;
      EXPECT_EQ(b.rowBytes, c.rowBytes) << where;
      EXPECT_TRUE(!b.raw && !b.pixels && !b.rawSize) << where;
    }
  EXPECT_EQ(vexel_host::LiveBytes(), live);
}

TEST(PixelBuffers, FailingAllocatorZeroesAllOutputs) {
  for (const auto& pair : kPairs)
    for (const uint32_t value : {0x4u, 0x01000821u, 0x0A000831u}) {
      const auto getAndFree = [&] {
        const Buffer b = Get(pair, FromBits(value), 64, 48);
        EXPECT_TRUE(b.result == VX_Success || (!b.raw && !b.pixels && !b.rowBytes && !b.rawSize));
        pair.free(FromBits(value), b.raw, b.rawSize);
        return b.result;
      };
      EXPECT_EQ(testing::ExpectSurvivesFailingAllocations("buffer", getAndFree), 1);
    }
}

// Turns the picture with the library and checks it against the one it was.
VX_Result FlipAndCheck(const ArenaFrame& frame) {
  const auto bytes = static_cast<size_t>(UnpaddedRowBytes(frame.format, frame.width));
  std::vector<std::string> rows;
  for (int row = 0; row < frame.height; ++row) rows.emplace_back(reinterpret_cast<char*>(frame.Row(row)), bytes);
  const VX_Result result = VX_FlipInPlace(frame.base, frame.rowBytes, frame.width, frame.height, frame.format);
  for (int row = 0; row < frame.height; ++row)
    if (std::memcmp(frame.Row(row), rows[static_cast<size_t>(frame.height - 1 - row)].data(), bytes) != 0)
      return VX_ErrFailed;
  return result;
}

TEST(FlipInPlace, TurnsEveryRasterAndKeepsThePadding) {
#define LISTED(name, value, hostName, mapping) VX_PixelFormat::name,
  for (const auto format : {VX_PIXEL_FORMATS(LISTED) FromBits(0x40)}) {
#undef LISTED
    if (IsSpecial(format)) continue;
    ArenaCase arenaCase;
    arenaCase.name = "VX_FlipInPlace";
    arenaCase.destination = format;
    arenaCase.destinationIsInput = true;
    arenaCase.run = [](const ArenaFrame*, const ArenaFrame& frame) { return FlipAndCheck(frame); };
    EXPECT_TRUE(RunArena(arenaCase));
  }
}

TEST(FlipInPlace, GiantStridesAndNothingToDo) {
  const auto format = VX_PixelFormat::BGRA_4444_32f;
  for (const int32_t rowBytes : {INT32_MAX - 63, INT32_MIN + 64}) {
    const ArenaFrame frame = testing::GiantStrideFrame(format, 500, 7, rowBytes);
    testing::Random random(7);
    for (int row = 0; row < frame.height; ++row) random.Fill(frame.Row(row), 500 * 16);
    EXPECT_EQ(FlipAndCheck(frame), VX_Success);
  }
  for (const int32_t height : {1, 0, -1, -2, INT32_MIN})
    testing::ExpectRefusal("one row", VX_Success,
                           [&](void* memory) { return VX_FlipInPlace(memory, 64, 4, height, format); });
  for (const int32_t width : {0, -1, INT32_MIN})
    testing::ExpectRefusal("no pixels", VX_Success,
                           [&](void* memory) { return VX_FlipInPlace(memory, 64, width, 2, format); });
}

TEST(FlipInPlace, WideRowsTakeOneScratchRow) {
  const ArenaFrame frame = testing::GiantStrideFrame(VX_PixelFormat::BGRA_4444_8u, 65537, 3, 1 << 20);
  testing::Random random(8);
  for (int row = 0; row < frame.height; ++row) random.Fill(frame.Row(row), 65537 * 4);
  EXPECT_EQ(FlipAndCheck(frame), VX_Success);
  const auto flip = [&] { return VX_FlipInPlace(frame.base, frame.rowBytes, frame.width, frame.height, frame.format); };
  EXPECT_EQ(testing::ExpectSurvivesFailingAllocations("VX_FlipInPlace", flip), 1);
}

TEST(ClipBufferToRect, AddressesWholePixelsOnly) {
  for (int32_t value = 0; value < 0x2000; ++value) {  // every combination of fields
    const auto format = FromBits(static_cast<uint32_t>(value));
    const uint32_t depth = Depth(format);
    const int pixelBytes = depth == kDepth8u    ? 4
                           : depth == kDepth15u ? 8
                           : depth == kDepth32f ? 16
                           : depth == kDepth10u ? (value & 1 ? 0 : 4)
                                                : 0;
    const bool addressable = (value & 0x30) == 0 && (value & 0xC) != 0 && pixelBytes != 0;
    auto* const base = static_cast<uint8_t*>(testing::UnreadableMemory());
    for (const int32_t rowBytes : {4096, -4096, INT32_MAX, INT32_MIN}) {
      void* pixel = &pixel;
      const VX_Result result = VX_ClipBufferToRect(base, rowBytes, format, 2, -3, &pixel);
      ASSERT_EQ(result, addressable ? VX_Success : VX_ErrUnsupportedFormat) << value;
      ASSERT_EQ(pixel, addressable ? base + int64_t{-3} * rowBytes + 2 * pixelBytes : static_cast<void*>(&pixel));
    }
  }
}

}  // namespace
}  // namespace vexel
