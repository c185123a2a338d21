// The host's names for pixel layouts.
#pragma once

#include <cstdint>
#include <string_view>

#include "vexel/pixel_formats.h"

namespace zovmediatypes {

// A layout as a pair of words; two formats are the same if both words are. A first word whose low byte is 64 or 95
// marks a compressed frame that only its own codec can read.
struct PixelFormat {
  uint32_t mFirst;
  uint32_t mSecond;

  friend constexpr bool operator==(const PixelFormat& a, const PixelFormat& b) {
    return a.mFirst == b.mFirst && a.mSecond == b.mSecond;
  }
  friend constexpr bool operator!=(const PixelFormat& a, const PixelFormat& b) { return !(a == b); }
};

namespace detail {

// Words hashed (FNV-1a) from the name, so that a new format moves no other; the low byte 16 marks an ordinary layout.
constexpr PixelFormat WordsFromName(std::string_view name) {
  if (name == "Invalid") return {};
  uint64_t hash = 0xCBF29CE484222325u;
  for (const char c : name) hash = (hash ^ static_cast<unsigned char>(c)) * 0x100000001B3u;
  return {static_cast<uint32_t>(hash) << 8 | 16, static_cast<uint32_t>(hash >> 32)};
}

}  // namespace detail

#define ZOV_PIXEL_FORMAT(hostName) \
  inline constexpr PixelFormat kPixelFormat_##hostName = detail::WordsFromName(#hostName);
#define ZOV_NAMED_FORMAT(name, value, hostName, mapping) ZOV_PIXEL_FORMAT(hostName)
#define ZOV_UNNAMED_FORMAT(value, hostName, mapping) ZOV_PIXEL_FORMAT(hostName)
VX_PIXEL_FORMATS(ZOV_NAMED_FORMAT)
VX_UNNAMED_PIXEL_FORMATS(ZOV_UNNAMED_FORMAT)
#undef ZOV_PIXEL_FORMAT
#undef ZOV_NAMED_FORMAT
#undef ZOV_UNNAMED_FORMAT

}  // namespace zovmediatypes
