#include "format_catalogue.h"

#include <cstdio>
#include <vector>

#include "nearest_name.h"
#include "tool_error.h"

namespace tool {
namespace {

constexpr const char* kMappingBOTH = "both";
constexpr const char* kMappingOUT = "library to host";
constexpr const char* kMappingIN = "host to library";
constexpr const char* kMappingNONE = "none";

#define TOOL_NAMED(name, value, hostName, mapping) {VX_PixelFormat::name, #name, #hostName, kMapping##mapping},
#define TOOL_UNNAMED(value, hostName, mapping) \
  {static_cast<VX_PixelFormat>(value), #hostName, #hostName, kMapping##mapping},
constexpr CatalogueEntry kEntries[] = {VX_PIXEL_FORMATS(TOOL_NAMED) VX_UNNAMED_PIXEL_FORMATS(TOOL_UNNAMED)};
#undef TOOL_NAMED
#undef TOOL_UNNAMED

}  // namespace

std::span<const CatalogueEntry> Catalogue() { return std::span(kEntries).subspan(1); }

std::string FormatName(VX_PixelFormat format) {
  for (const CatalogueEntry& entry : kEntries)
    if (entry.format == format) return entry.name;
  char text[16];
  std::snprintf(text, sizeof text, "0x%08X", static_cast<unsigned>(Bits(format)));
  return text;
}

VX_PixelFormat ParseFormat(const std::string& name) {
  for (const CatalogueEntry& entry : Catalogue())
    if (name == entry.name) return entry.format;
  std::vector<std::string> names;
  for (const CatalogueEntry& entry : Catalogue()) names.push_back(entry.name);
  throw ToolError("unknown format \"" + name + "\"" + DidYouMean(name, names) + " (\"vexel formats\" lists all)");
}

size_t TightRowBytes(VX_PixelFormat format, int width) {
  const size_t w = static_cast<size_t>(width);
  if (IsV210(format)) return (w + 5) / 6 * 16;
  if (IsPacked422(format)) return (w + 1) / 2 * (Is8Bit(format) ? 4 : 16);
  if (Is8Bit(format) || Is10Bit(format)) return w * 4;
  return w * (Is15Bit(format) ? 8 : 16);
}

size_t FileRowBytes(VX_PixelFormat format, int width) {
  const size_t bytes = TightRowBytes(format, width);
  return IsV210(format) ? (bytes + 127) / 128 * 128 : bytes;
}

}  // namespace tool
