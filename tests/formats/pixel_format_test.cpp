// The catalogue of formats, its mapping to the host; buffers, flips and pixel addresses.
#include <set>
#include <sstream>
#include <vexel_host/host.h>

#include "support/Arena.h"
#include "support/FailingAllocations.h"
#include "support/Test.h"
#include "vexel/host_types.h"

namespace vexel::testing {
namespace {

using HostFormat = zovmediatypes::PixelFormat;

// A second copy, kept by hand: saved projects and other programs hold these numbers and names.
constexpr char kCatalogue[] =
    "0 Invalid 805 VUYA_4444_8u 809 VUYP_4444_8u 80D VUYX_4444_8u A05 VUYA_4444_8u_709 A09 VUYP_4444_8u_709 "
    "A0D VUYX_4444_8u_709 905 VUYA_4444_32f 909 VUYP_4444_32f 90D VUYX_4444_32f B05 VUYA_4444_32f_709 "
    "B09 VUYP_4444_32f_709 B0D VUYX_4444_32f_709 4 BGRA_4444_8u 8 BGRP_4444_8u C BGRX_4444_8u 104 BGRA_4444_32f "
    "108 BGRP_4444_32f 10C BGRX_4444_32f 1004 ARGB_4444_8u 1008 PRGB_4444_8u 100C XRGB_4444_8u 1104 ARGB_4444_32f "
    "1108 PRGB_4444_32f 110C XRGB_4444_32f 811 UYVY_422_8u A11 UYVY_422_8u_709 1811 YUYV_422_8u 1A11 YUYV_422_8u_709 "
    "911 UYVY_422_32f B11 UYVY_422_32f_709 1911 YUYV_422_32f 1B11 YUYV_422_32f_709 851 V210_422_10u "
    "A51 V210_422_10u_709 84 BGRA_4444_15u 88 BGRP_4444_15u 8C BGRX_4444_15u 1084 ARGB_4444_15u 1088 PRGB_4444_15u "
    "108C XRGB_4444_15u 106 BGRA_4444_32f_Linear 10A BGRP_4444_32f_Linear 10E BGRX_4444_32f_Linear "
    "1106 ARGB_4444_32f_Linear 110A PRGB_4444_32f_Linear 110E XRGB_4444_32f_Linear 1000821 NTSCDV25 2000821 PALDV25 "
    "7000821 NTSCDV50 8000821 PALDV50 3000A21 NTSC_DV100_720p 4000A21 PAL_DV100_720p 5000A21 NTSC_DV100_1080i "
    "6000A21 PAL_DV100_1080i 9000831 YUV_420_MPEG2_FIELD A000831 YUV_420_MPEG2_FRAME "
    "9000031 YUV_420_MPEG2_FIELD_FullRange A000031 YUV_420_MPEG2_FRAME_FullRange 9000A31 YUV_420_MPEG2_FIELD_709 "
    "A000A31 YUV_420_MPEG2_FRAME_709 9000231 YUV_420_MPEG2_FIELD_FullRange_709 "
    "A000231 YUV_420_MPEG2_FRAME_FullRange_709 B000831 YUV_420_MPEG4_FIELD C000831 YUV_420_MPEG4_FRAME "
    "B000031 YUV_420_MPEG4_FIELD_FullRange C000031 YUV_420_MPEG4_FRAME_FullRange B000A31 YUV_420_MPEG4_FIELD_709 "
    "C000A31 YUV_420_MPEG4_FRAME_709 B000231 YUV_420_MPEG4_FIELD_FullRange_709 "
    "C000231 YUV_420_MPEG4_FRAME_FullRange_709 ";

struct Listed {
  std::string name;
  uint32_t value;
  std::string hostName;
  HostFormat host;
};

const Listed kListed[] = {
#define LISTED(name, value, hostName, mapping) {#name, value, #hostName, zovmediatypes::kPixelFormat_##hostName},
    VX_PIXEL_FORMATS(LISTED)
#undef LISTED
};
const Listed kUnnamed[] = {
#define LISTED(value, hostName, mapping) {"", value, #hostName, zovmediatypes::kPixelFormat_##hostName},
    VX_UNNAMED_PIXEL_FORMATS(LISTED)
#undef LISTED
};

bool Has(const std::string& text, const char* part) { return text.find(part) != std::string::npos; }

TEST(PixelFormats, ValuesAndNamesInOrder) {
  std::istringstream catalogue(kCatalogue);
  uint32_t value = 0;
  std::string name;
  for (const auto& format : kListed) {
    ASSERT_TRUE(catalogue >> std::hex >> value >> name);
    EXPECT_EQ(format.name, name);
    EXPECT_EQ(format.value, value) << name;
    EXPECT_EQ(VX_PixelFormatName(FromBits(value)), name);
    EXPECT_EQ(Bits(VX_PixelFormatFromName(name.c_str())), value);
  }
  EXPECT_FALSE(catalogue >> name) << "nothing is missing";
  for (const uint32_t other : {0x40u, 0x105u, 0x801u, 0x0D000031u, 0x7F000020u, 0xFFFFFFFFu})
    EXPECT_STREQ(VX_PixelFormatName(FromBits(other)), "Unknown pixel format");
  for (const char* wrong : {static_cast<const char*>(nullptr), "", "bgra_4444_8u", "BGRA_4444_8u ", "BGRA_4444_8"})
    EXPECT_EQ(VX_PixelFormatFromName(wrong), VX_PixelFormat::Invalid);
}

// How a raster's row is stored: groups of so many pixels in so many bytes, the row padded to a multiple.
struct RowRule {
  int pixels, bytes, padding;
};

RowRule RuleOfName(const std::string& name) {
  if (Has(name, "V210")) return {6, 16, 128};
  if (Has(name, "_422_8u")) return {1, 2, 16};
  if (Has(name, "_422_32f")) return {1, 8, 16};
  if (Has(name, "_4444_8u")) return {1, 4, 64};
  if (Has(name, "_4444_15u")) return {1, 8, 64};
  if (Has(name, "_4444_32f")) return {1, 16, 64};
  EXPECT_EQ(name, "Invalid");
  return {1, 2, 64};
}

__int128 RoundUp(__int128 value, int multiple) {
  const __int128 rest = (value % multiple + multiple) % multiple;
  return rest == 0 ? value : value + multiple - rest;
}

const std::vector<int32_t> kExtents = [] {
  std::vector<int32_t> extents = {INT32_MIN,  INT32_MIN + 1, -65536,     -721,     719,       1920,
                                  4095,       4096,          8191,       65536,    0x7FFFFFF, 0x8000000,
                                  0x1FFFFFFF, 0x20000000,    0x7FFFFFF0, INT32_MAX};
  for (int32_t i = -140; i <= 140; ++i) extents.push_back(i);
  return extents;
}();

TEST(PixelFormatSize, RastersFollowTheirRowRule) {
  std::vector<std::pair<uint32_t, RowRule>> rules = {
      // No names: 10-bit RGB, rows without alpha, 10-bit and 15-bit 4:2:2, depths that do not exist.
      {0x40, {1, 4, 64}},  {0x41, {1, 0, 64}},  {0x801, {1, 2, 64}}, {0x105, {1, 16, 64}}, {0x100, {1, 8, 64}},
      {0x901, {1, 8, 64}}, {0x10, {1, 2, 16}},  {0x50, {1, 4, 16}},  {0x90, {1, 8, 16}},   {0x91, {1, 8, 16}},
      {0xC4, {1, 0, 64}},  {0x1D0, {1, 0, 16}}, {0x20, {1, 2, 64}},  {0x130, {1, 8, 64}},  {0xC51, {1, 0, 16}}};
  for (const auto& format : kListed)
    if (format.value < 0x1000000) rules.emplace_back(format.value, RuleOfName(format.name));
  for (const auto& [value, rule] : rules) {
    const bool isUsed = value == 0x40 || VX_PixelFormatFromName(VX_PixelFormatName(FromBits(value))) == FromBits(value);
    for (const int32_t width : kExtents) {
      const __int128 groups = rule.pixels == 1 ? width : (__int128{width} + rule.pixels - 1) / rule.pixels;
      const __int128 rowBytes = RoundUp(groups * rule.bytes, rule.padding);
      ASSERT_EQ(PaddedRowBytes(FromBits(value), width), static_cast<int64_t>(rowBytes)) << value << " " << width;
      // Unpadded rows of 4:2:2 hold whole pairs.
      const int64_t held = width > 0 && rule.padding == 16 ? int64_t{width} + width % 2 : static_cast<int64_t>(groups);
      ASSERT_TRUE(width < 0 || !isUsed || UnpaddedRowBytes(FromBits(value), width) == held * rule.bytes)
          << value << " " << width;
      for (const int32_t height : kExtents)
        ASSERT_EQ(VX_PixelFormatSize(FromBits(value), width, height), static_cast<int32_t>(rowBytes * height))
            << std::hex << value << std::dec << " " << width << " x " << height;
    }
  }
}

TEST(PixelFormatSize, WholeFrames) {
  const struct {
    uint32_t kind;
    int64_t bytes;
  } frames[] = {{1, 120000}, {2, 144000}, {3, 240000}, {4, 288000}, {5, 480000}, {6, 576000},
                {7, 240000}, {8, 288000}, {15, 0},     {0x20, 0},   {0x7F, 0},   {0xFF, 0}};
  for (const auto& frame : frames)
    for (const int32_t extent : {INT32_MIN, -1, 0, 1, 720, INT32_MAX})
      EXPECT_EQ(VX_PixelFormatSize(FromBits(frame.kind << 24 | 0x821), extent, extent / 2), frame.bytes);
  const __int128 most = INT64_MAX, least = INT64_MIN;
  for (const int32_t w : kExtents)
    for (const int32_t h : kExtents) {
      const __int128 planar = (RoundUp(w, 128) + RoundUp(w / 2, 128)) * RoundUp(h, 32);
      const __int128 biplanar = RoundUp(w, 128) * (h + (__int128{h} + 1) / 2);
      for (uint32_t kind = 9; kind <= 12; ++kind)
        ASSERT_EQ(VX_PixelFormatSize(FromBits(kind << 24 | 0x831), w, h), static_cast<int64_t>(planar));
      for (uint32_t kind = 13; kind <= 14; ++kind) {
        ASSERT_EQ(VX_PixelFormatSize(FromBits(kind << 24 | 0x1031), w, h), static_cast<int64_t>(biplanar));
        ASSERT_EQ(VX_PixelFormatSize(FromBits(kind << 24 | 0xE71), w, h),
                  static_cast<int64_t>(std::clamp(2 * biplanar, least, most)));
      }
    }
  EXPECT_EQ(VX_PixelFormatSize(VX_PixelFormat::YUV_420_MPEG2_FRAME, 720, 480), 552960);
}

// The host spells 4:2:0 names out; everything else is called the same.
std::string HostNameOf(const std::string& name) {
  if (!Has(name, "YUV_420")) return name;
  return name.substr(0, std::string("YUV_420_MPEG2_FIELD").size()) + "_PICTURE_PLANAR_8u_" +
         (Has(name, "_709") ? "709" : "601") + (Has(name, "_FullRange") ? "_FullRange" : "");
}

uint32_t BiplanarValueOf(const std::string& hostName) {
  return (Has(hostName, "_FIELD_") ? 0x0D000031 : 0x0E000031) | (Has(hostName, "YVU") ? 0x1000 : 0) |
         (Has(hostName, "10u_as16u") ? 0x40 : 0) | (Has(hostName, "FullRange") ? 0 : 0x800) |
         (Has(hostName, "_709") ? 0x200 : 0) | (Has(hostName, "_2020") ? 0x400 : 0) |
         (Has(hostName, "HDR") ? 0x200 : 0);
}

TEST(HostFormats, RoundTripsWithTheirExceptions) {
  const std::set<std::string> notIn = {"YUYV_422_32f", "YUYV_422_32f_709", "BGRX_4444_32f_Linear",
                                       "XRGB_4444_32f_Linear"};
  const std::set<std::string> notOut = {"YUYV_422_32f", "YUYV_422_32f_709"};
  for (const auto& format : kListed) {
    EXPECT_EQ(format.hostName, HostNameOf(format.name));
    EXPECT_EQ(Bits(VX_ZOVPixelFormatToVXPixelFormat(format.host)), notIn.count(format.name) ? 0 : format.value);
    EXPECT_EQ(VX_VXPixelFormatToZOVPixelFormat(FromBits(format.value)) == format.host, !notOut.count(format.name))
        << format.name;
  }
  std::set<uint32_t> values;
  for (const auto& format : kUnnamed) {
    const bool isRgb10 = format.hostName == "RGB_444_10u";
    const uint32_t value = isRgb10 ? 0x40 : BiplanarValueOf(format.hostName);
    EXPECT_EQ(Bits(VX_ZOVPixelFormatToVXPixelFormat(format.host)), value) << format.hostName;
    EXPECT_EQ(VX_VXPixelFormatToZOVPixelFormat(FromBits(value)) == format.host, isRgb10) << format.hostName;
    values.insert(value);
  }
  EXPECT_EQ(values.size(), 23u);
}

TEST(HostFormats, UnknownOnes) {
  for (uint32_t lowByte = 0; lowByte < 256; ++lowByte) {
    const uint32_t expected = lowByte == 64 || lowByte == 95 ? 0x7F000020 : 0;
    EXPECT_EQ(Bits(VX_ZOVPixelFormatToVXPixelFormat({0x12345600 | lowByte, 7})), expected);
  }
  // One equal word is not enough.
  HostFormat other = zovmediatypes::kPixelFormat_BGRA_4444_8u;
  ++other.mSecond;
  EXPECT_EQ(VX_ZOVPixelFormatToVXPixelFormat(other), VX_PixelFormat::Invalid);
  for (const uint32_t value : {0x105u, 0x801u, 0x7F000020u, 0x0D000A71u, 0x7F000000u, 0x2104u})
    EXPECT_EQ(VX_VXPixelFormatToZOVPixelFormat(FromBits(value)), HostFormat{}) << value;
}

TEST(HostColorSpaces, ComeFromTheFormatsBits) {
  const struct {
    uint32_t value;
    zovmediatypes::color::ColorSpace space;  // primaries, transfer, matrix, depth, full range, RGB
  } cases[] = {{0x805, {1, 1, 1, 8, false, false}},
               {0x106, {1, 8, 0, 32, true, true}},
               {0x4, {1, 1, 0, 8, true, true}},
               {0x84, {1, 1, 0, 16, true, true}},
               {0x40, {1, 1, 0, 10, true, true}},
               {0xA51, {1, 1, 1, 10, false, false}},
               {0xB11, {1, 1, 1, 32, false, false}},
               {0x09000031, {1, 1, 1, 8, true, false}},
               {0x0E000E71, {1, 1, 1, 10, false, false}},
               {0x0A000C31, {1, 1, 1, 8, false, false}},
               {0, {1, 1, 0, 8, true, true}},
               {0xC5, {1, 1, 1, 8, true, false}}};
  for (const auto& c : cases) EXPECT_EQ(VX_PixelFormatToColorSpace(FromBits(c.value)), c.space) << std::hex << c.value;
}

// ---- Buffers, flips and pixel addresses

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
      EXPECT_EQ(ExpectSurvivesFailingAllocations("buffer", getAndFree), 1);
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
    EXPECT_TRUE(RunArena({.name = "VX_FlipInPlace",
                          .destination = format,
                          .run = [](const ArenaFrame*, const ArenaFrame& frame) { return FlipAndCheck(frame); },
                          .destinationIsInput = true}));
  }
}

TEST(FlipInPlace, GiantStridesAndNothingToDo) {
  const auto format = VX_PixelFormat::BGRA_4444_32f;
  for (const int32_t rowBytes : {INT32_MAX - 63, INT32_MIN + 64}) {
    const ArenaFrame frame = GiantStrideFrame(format, 500, 7, rowBytes);
    Random random(7);
    for (int row = 0; row < frame.height; ++row) random.Fill(frame.Row(row), 500 * 16);
    EXPECT_EQ(FlipAndCheck(frame), VX_Success);
  }
  for (const int32_t height : {1, 0, -1, -2, INT32_MIN})
    ExpectRefusal("one row", VX_Success, [&](void* memory) { return VX_FlipInPlace(memory, 64, 4, height, format); });
  for (const int32_t width : {0, -1, INT32_MIN})
    ExpectRefusal("no pixels", VX_Success, [&](void* memory) { return VX_FlipInPlace(memory, 64, width, 2, format); });
}

TEST(FlipInPlace, WideRowsTakeOneScratchRow) {
  const ArenaFrame frame = GiantStrideFrame(VX_PixelFormat::BGRA_4444_8u, 65537, 3, 1 << 20);
  Random random(8);
  for (int row = 0; row < frame.height; ++row) random.Fill(frame.Row(row), 65537 * 4);
  EXPECT_EQ(FlipAndCheck(frame), VX_Success);
  const auto flip = [&] { return VX_FlipInPlace(frame.base, frame.rowBytes, frame.width, frame.height, frame.format); };
  EXPECT_EQ(ExpectSurvivesFailingAllocations("VX_FlipInPlace", flip), 1);
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
    auto* const base = static_cast<uint8_t*>(UnreadableMemory());
    for (const int32_t rowBytes : {4096, -4096, INT32_MAX, INT32_MIN}) {
      void* pixel = &pixel;
      const VX_Result result = VX_ClipBufferToRect(base, rowBytes, format, 2, -3, &pixel);
      ASSERT_EQ(result, addressable ? VX_Success : VX_ErrUnsupportedFormat) << value;
      ASSERT_EQ(pixel, addressable ? base + int64_t{-3} * rowBytes + 2 * pixelBytes : static_cast<void*>(&pixel));
    }
  }
}

}  // namespace
}  // namespace vexel::testing
