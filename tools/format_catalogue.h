// The formats the tool speaks of: the named ones and those that only a host has a name for.
#pragma once

#include <span>
#include <string>

#include "vexel/vexel.h"

namespace tool {

struct CatalogueEntry {
  VX_PixelFormat format;
  const char* name;      // the library's name, or the host's where the library has none
  const char* hostName;  // without the kPixelFormat_ prefix
  const char* mapping;   // "both", "library to host", "host to library" or "none"
};

// Every format that the library handles, in catalogue order. `Invalid` is not one of them.
std::span<const CatalogueEntry> Catalogue();

// The name to show for a value; values outside the catalogue in hexadecimal.
std::string FormatName(VX_PixelFormat format);

// The format of a name of the catalogue. Throws ToolError, with the nearest names, when there is none.
VX_PixelFormat ParseFormat(const std::string& name);

// The fields of a format value (vexel/pixel_formats.h).
inline uint32_t Bits(VX_PixelFormat format) { return static_cast<uint32_t>(format); }
inline bool IsYuv(VX_PixelFormat format) { return Bits(format) & 1; }
inline bool IsLinear(VX_PixelFormat format) { return Bits(format) & 2; }
inline bool HasAlpha(VX_PixelFormat format) {
  const uint32_t kind = (Bits(format) >> 2) & 3;
  return kind == 1 || kind == 2;
}
inline bool IsPacked422(VX_PixelFormat format) { return (Bits(format) & 0x30) == 0x10; }
inline bool Is8Bit(VX_PixelFormat format) { return (Bits(format) & 0x1C0) == 0; }
inline bool Is10Bit(VX_PixelFormat format) { return (Bits(format) & 0x1C0) == 0x40; }
inline bool Is15Bit(VX_PixelFormat format) { return (Bits(format) & 0x1C0) == 0x80; }
inline bool IsFloat(VX_PixelFormat format) { return (Bits(format) & 0x1C0) == 0x100; }
inline bool Is709(VX_PixelFormat format) { return (Bits(format) & 0x600) == 0x200; }
inline bool IsFullRangeYuv(VX_PixelFormat format) { return IsYuv(format) && !(Bits(format) & 0x800); }
inline bool IsReversed(VX_PixelFormat format) { return Bits(format) & 0x1000; }
inline uint32_t FrameKind(VX_PixelFormat format) { return Bits(format) >> 24; }
inline bool IsRaster(VX_PixelFormat format) { return FrameKind(format) == 0; }
inline bool IsBiplanar420(VX_PixelFormat format) { return FrameKind(format) == 13 || FrameKind(format) == 14; }
inline bool Is420(VX_PixelFormat format) { return FrameKind(format) >= 9 && FrameKind(format) <= 14; }
inline bool IsV210(VX_PixelFormat format) { return IsPacked422(format) && Is10Bit(format); }

inline constexpr VX_PixelFormat kRgb444_10u = static_cast<VX_PixelFormat>(0x40);

// Bytes of `width` pixels of a raster format without padding, and those that a raw file holds per row: the same, except
// that V210 rows are padded to 128 bytes there too, as every reader of V210 expects.
size_t TightRowBytes(VX_PixelFormat format, int width);
size_t FileRowBytes(VX_PixelFormat format, int width);

}  // namespace tool
