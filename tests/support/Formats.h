// The raster formats, for tests that go over all of them.
#pragma once

#include <cstdio>

#include "support/Test.h"

namespace vexel::testing {

inline constexpr VX_PixelFormat kRgb10Format = FromBits(0x40);

// The named formats without a frame kind and 10-bit RGB; `Invalid` not among them.
inline std::vector<VX_PixelFormat> RasterFormats() {
  std::vector<VX_PixelFormat> formats;
#define VX_PUSH_RASTER(name, value, hostName, mapping) \
  if ((value) != 0 && ((value) >> 24) == 0) formats.push_back(VX_PixelFormat::name);
  VX_PIXEL_FORMATS(VX_PUSH_RASTER)
#undef VX_PUSH_RASTER
  formats.push_back(kRgb10Format);
  return formats;
}

inline int DepthBits(VX_PixelFormat f) {
  return Depth(f) == kDepth8u ? 8 : Depth(f) == kDepth10u ? 10 : Depth(f) == kDepth15u ? 15 : 32;
}
// Of a sample, or of the word of three that rasters of ten bits have.
inline size_t SampleBytes(VX_PixelFormat f) {
  if (Depth(f) == kDepth8u) return 1;
  return Depth(f) == kDepth15u || (Depth(f) == kDepth10u && Is420(f)) ? 2 : 4;
}

// All 4:2:0 formats: 16 planar ones and 22 biplanar ones.
inline std::vector<VX_PixelFormat> Formats420() {
  std::vector<VX_PixelFormat> formats;
#define VX_PUSH_420(name, value, hostName, mapping) FromBits(value),
#define VX_PUSH_UNNAMED_420(value, hostName, mapping) FromBits(value),
  for (const VX_PixelFormat format :
       {VX_PIXEL_FORMATS(VX_PUSH_420) VX_UNNAMED_PIXEL_FORMATS(VX_PUSH_UNNAMED_420) VX_PixelFormat::Invalid})
    if (Bits(format) >> 24 >= 9) formats.push_back(format);
#undef VX_PUSH_420
#undef VX_PUSH_UNNAMED_420
  return formats;
}

// For messages: formats without a name by their value.
inline std::string FormatName(VX_PixelFormat format) {
  char hex[16];
  std::snprintf(hex, sizeof hex, "0x%X", Bits(format));
  if (format == kRgb10Format) return "RGB_444_10u";
  return VX_PixelFormatFromName(VX_PixelFormatName(format)) == format ? VX_PixelFormatName(format) : hex;
}

}  // namespace vexel::testing
