
#include <tuple>

#include "support/Arena.h"
#include "support/Formats.h"
#include "support/Image.h"
#include "support/Operations.h"
#include "support/Test.h"

namespace vexel::testing {
namespace {

using Bytes = std::vector<uint8_t>;

const struct {
  Fill fill;
  const char* name;
  bool white, opaque;
} kFills[] = {{VX_FillWithOpaqueBlack, "opaque black", false, true},
              {VX_FillWithTransparentBlack, "transparent black", false, false},
              {VX_FillWithOpaqueWhite, "opaque white", true, true},
              {VX_FillWithTransparentWhite, "transparent white", true, false}};

template <class T>
void Append(Bytes& bytes, double value) {
  const T sample = static_cast<T>(value);
  bytes.insert(bytes.end(), reinterpret_cast<const uint8_t*>(&sample), reinterpret_cast<const uint8_t*>(&sample + 1));
}

// The repeating bytes of a constant row, read off the format's name: "PRGB_4444_15u" is an alpha and three colours of
// 15 bits.
Bytes UnitByName(const std::string& name, bool white, bool opaque) {
  Bytes unit;
  if (name.find("V210") == 0) {
    const uint32_t c = 512, y = white ? 940 : 64;
    for (const uint32_t word :
         {c | y << 10 | c << 20, y | c << 10 | y << 20, c | y << 10 | c << 20, y | c << 10 | y << 20})
      for (int i = 0; i < 4; ++i) unit.push_back(static_cast<uint8_t>(word >> 8 * i));
    return unit;
  }
  if (name == "RGB_444_10u") return white ? Bytes{0xFC, 0xFF, 0xFF, 0xFF} : Bytes(4, 0);
  const bool wide = name.find("32f") != std::string::npos, words = name.find("15u") != std::string::npos;
  const double full = wide ? 1 : words ? 32768 : 255;
  for (const char channel : name.substr(0, 4)) {
    double value = white ? full : 0;
    if (std::strchr("APX", channel)) value = opaque ? full : 0;
    if (channel == 'Y') value = wide ? white : white ? 235 : 16;
    if (channel == 'U' || channel == 'V') value = wide ? 0 : 128;
    wide ? Append<float>(unit, value) : words ? Append<uint16_t>(unit, value) : Append<uint8_t>(unit, value);
  }
  return unit;
}

bool HasAlpha(const std::string& name) { return name.substr(0, 4).find_first_of("AP") != std::string::npos; }

// Gaps between the rows and what lies around them stay.
void ExpectFilled(Fill fill, F format, const Bytes& unit, int width, int height, size_t offset, size_t gap, bool up) {
  const size_t rowBytes = static_cast<size_t>(UnpaddedRowBytes(format, width)), pitch = rowBytes + gap;
  Bytes picture(pitch * height + 128, 0x77), expected = picture;
  for (int row = 0; row < height; ++row)
    for (size_t i = 0; i < rowBytes; ++i) expected[offset + row * pitch + i] = unit[i % unit.size()];
  const auto step = static_cast<int32_t>(pitch);
  uint8_t* const base = &picture[offset + (up ? (height - 1) * pitch : 0)];
  ASSERT_EQ(fill(base, up ? -step : step, width, height, format), VX_Success);
  ASSERT_TRUE(picture == expected) << FormatName(format) << " " << width << " at " << offset << " gap " << gap;
}

TEST(Fills, EveryRasterByItsName) {
  for (const F format : RasterFormats())
    for (const auto& f : kFills) {
      const std::string name = FormatName(format);
      SCOPED_TRACE(name + " " + f.name);
      if (!f.opaque && !HasAlpha(name)) {
        ExpectRefusal(name, VX_ErrUnsupportedDestinationFormat,
                      [&](void* memory) { return f.fill(memory, 64, 4, 4, format); });
        continue;
      }
      ExpectFilled(f.fill, format, UnitByName(name, f.white, f.opaque), 41, 3, 0, 9, true);
    }
  // Long runs of bytes, with gaps between the rows and without, from every alignment.
  for (const F format : {F::BGRA_4444_8u, F::YUYV_422_8u, F::ARGB_4444_15u, F::V210_422_10u, F::BGRA_4444_32f})
    for (const size_t gap : {0, 36})
      for (size_t offset = 0; offset < 64; offset += format == F::BGRA_4444_8u ? 1 : 9)
        ExpectFilled(VX_FillWithOpaqueBlack, format, UnitByName(FormatName(format), false, true),
                     4300 + static_cast<int>(offset), 5, offset, gap, false);
}

// Planar chroma is half the size, rounded down; interleaved chroma is filled whole.
TEST(Fills, PlanesOf420) {
  for (const F format : Formats420())
    for (const auto& [width, height] : {std::pair{64, 34}, {131, 33}, {1, 1}, {700, 701}})
      for (const auto& f : {kFills[0], kFills[2]}) {
        SCOPED_TRACE(::testing::Message() << std::hex << Bits(format) << std::dec << " " << width << "x" << height);
        const size_t size = static_cast<size_t>(VX_PixelFormatSize(format, width, height));
        Bytes block(size + 256, 0x77), expected = block;
        void* planes[3];
        int32_t pitch[3];
        VX_GetPlanarBuffers(nullptr, format, width, height, planes, pitch);
        const bool biplanar = planes[2] == nullptr;
        const size_t sampleBytes = Depth(format) == kDepth10u ? 2 : 1;
        for (int plane = 0; plane < (biplanar ? 2 : 3); ++plane) {
          const int rows = plane == 0 ? height : (height + biplanar) / 2;
          const int samples = plane == 0 ? width : (width + biplanar) / 2 * (biplanar ? 2 : 1);
          const uint8_t code = plane != 0 ? 128 : f.white ? 235 : 16;
          for (int row = 0; row < rows; ++row)
            for (size_t i = 0; i < static_cast<size_t>(samples) * sampleBytes; ++i)
              expected[reinterpret_cast<size_t>(planes[plane]) + static_cast<size_t>(row * pitch[plane]) + i] =
                  (i + 1) % sampleBytes == 0 ? code : 0;
        }
        ASSERT_EQ(f.fill(block.data(), 0, width, height, format), VX_Success);
        ASSERT_EQ(block, expected);
      }
}

TEST(Fills, ColorIsConvertedOnceForEveryPair) {
  const uint8_t bytes[16] = {0x80, 0x40, 0xC0, 0x3E, 0x11, 0x22, 0x33, 0x3F, 0x10, 0xA0, 0xB0, 0x3D, 0x77, 0, 0, 0x3F};
  for (const F color : RasterFormats())
    for (const F format : RasterFormats()) {
      SCOPED_TRACE(FormatName(color) + " in " + FormatName(format));
      const std::string name = FormatName(format);
      if (!HasAlpha(name) && name.substr(0, 4).find('X') == std::string::npos) {
        ExpectRefusal(name, VX_ErrUnsupportedFormat,
                      [&](void* memory) { return VX_FillWithColor(memory, 64, 4, 4, format, memory, color); });
        continue;
      }
      Image pixel(format, 1, 1), picture(format, 7, 3);
      ASSERT_EQ(Convert({bytes, 16, color}, pixel), VX_Success);
      ASSERT_EQ(VX_FillWithColor(picture.bytes.data(), picture.rowBytes, 7, 3, format, bytes, color), VX_Success);
      for (size_t i = 0; i < picture.bytes.size(); ++i)
        ASSERT_EQ(picture.bytes[i], pixel.bytes[i % pixel.bytes.size()]) << i;
    }
}

// What operations_test.cpp does not know.
TEST(Fills, Refusals) {
  constexpr F kFrame = FromBits(0x7F000004), kPlanar10 = FromBits(0x0C000A71), kBiplanar10 = FromBits(0x0E000A71),
              kBgra = F::BGRA_4444_8u, kPlanar = F::YUV_420_MPEG2_FRAME;
  static const uint32_t pixel = 0;
  const auto color = [](void* p, F format, const void* value, F colorFormat, int32_t width = 4) {
    return VX_FillWithColor(p, 64, width, 4, format, value, colorFormat);
  };
  for (const F format : {F::NTSCDV50, F::PALDV50, F::NTSC_DV100_720p, F::PAL_DV100_1080i, F::Invalid, kPlanar10}) {
    for (const auto& f : kFills)
      for (const int32_t size : {4, 0, -1})
        ExpectRefusal(f.name, f.opaque ? VX_ErrFormatNotHandled : VX_ErrUnsupportedDestinationFormat,
                      [&](void* p) { return f.fill(p, 64, size, 4, format); });
    ExpectRefusal("colour into", VX_ErrUnsupportedFormat, [&](void* p) { return color(p, format, p, kBgra); });
  }
  const std::pair<VX_Result, std::function<VX_Result(void*)>> cases[] = {
      {VX_ErrFormatNotHandled, [](void* p) { return VX_FillWithOpaqueWhite(p, 0, 720, 480, F::NTSCDV25); }},
      {VX_ErrFormatNotHandled, [](void* p) { return VX_FillWithOpaqueWhite(p, 0, 720, 480, F::PALDV25); }},
      {VX_ErrUnsupportedFormat, [&](void* p) { return color(p, kBgra, p, F::NTSCDV25); }},
      {VX_ErrUnsupportedFormat, [&](void* p) { return color(p, kBgra, p, kPlanar); }},
      {VX_ErrUnsupportedFormat, [&](void* p) { return color(p, kBgra, p, kFrame); }},
      {VX_ErrFailed, [&](void* p) { return color(p, F::BGRA_4444_32f, p, F::Invalid); }},
      {VX_ErrNullSource, [&](void* p) { return color(p, kBgra, nullptr, kBgra); }},
      {VX_Success, [&](void*) { return color(nullptr, kBgra, nullptr, kBgra, 0); }},
      {VX_ErrArgumentOutOfRange, [&](void* p) { return color(p, kBgra, &pixel, kBgra, -1); }},
      {VX_ErrArgumentOutOfRange, [&](void* p) { return color(p, kBgra, &pixel, kBgra, INT32_MAX); }},
      {VX_ErrNullDestination, [&](void*) { return color(nullptr, kBgra, &pixel, kBgra); }},
      {VX_ErrArgumentOutOfRange, [](void* p) { return VX_FillWithOpaqueBlack(p, 15, 4, 4, kBgra); }},
      {VX_ErrArgumentOutOfRange, [](void* p) { return VX_FillWithOpaqueBlack(p, -15, 4, 4, kBgra); }}};
  for (const auto& c : cases) ExpectRefusal("case " + std::to_string(&c - cases), c.first, c.second);
  for (const F format : {kPlanar, kBiplanar10, F::PALDV25})
    for (const auto& [width, height, null, expected] : {std::tuple{0, 4, true, VX_Success},
                                                        {4, 0, true, VX_Success},
                                                        {-1, 4, false, VX_ErrArgumentOutOfRange},
                                                        {4, INT32_MIN, false, VX_ErrArgumentOutOfRange},
                                                        {4, 4, true, VX_ErrNullDestination}})
      ExpectRefusal("4:2:0 and DV", expected, [&, w = width, h = height, none = null](void* p) {
        return VX_FillWithOpaqueBlack(none ? nullptr : p, 64, w, h, format);
      });
  ExpectRefusal("wide 4:2:0", VX_ErrArgumentOutOfRange,
                [](void* p) { return VX_FillWithOpaqueBlack(p, 64, INT32_MAX, 4, kPlanar); });
}

// Every block of a DV frame is where it says; what is in them is for a decoder to tell (tests/tool/fill.sh).
TEST(Fills, DvFramesAreWhole) {
  for (const F format : {F::NTSCDV25, F::PALDV25}) {
    const bool is625 = format == F::PALDV25;
    const size_t size = is625 ? 144000 : 120000;
    Bytes frame(size + 1, 0x77), again(size + 1, 0x88);
    ASSERT_EQ(VX_FillWithOpaqueBlack(frame.data(), 0, 720, 480, format), VX_Success);
    ASSERT_EQ(VX_FillWithOpaqueBlack(again.data(), 1, 1, 1, format), VX_Success);
    EXPECT_EQ(frame[size], 0x77);
    EXPECT_TRUE(std::equal(frame.begin(), frame.end() - 1, again.begin()));
    EXPECT_EQ(frame[3] >> 7, is625);
    for (size_t i = 0; i < size / 80; ++i) {
      const size_t place = i % 150, group = (place - 6) / 16, inGroup = (place - 6) % 16;
      const size_t section = place == 0 ? 0 : place < 3 ? 1 : place < 6 ? 2 : inGroup == 0 ? 3 : 4;
      const size_t number[] = {0, place - 1, place - 3, group, group * 15 + inGroup - 1};
      ASSERT_EQ(frame[80 * i] >> 5, section);
      ASSERT_EQ(frame[80 * i + 1] >> 4, i / 150);
      ASSERT_EQ(frame[80 * i + 2], number[section]);
    }
  }
}

}  // namespace
}  // namespace vexel::testing
