// The raster formats, for tests that go over all of them.
#pragma once

#include <vector>

#include "formats/FormatBits.h"
#include "vexel/vexel.h"

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

inline const char* FormatName(VX_PixelFormat format) {
  return format == kRgb10Format ? "RGB_444_10u" : VX_PixelFormatName(format);
}

}  // namespace vexel::testing
