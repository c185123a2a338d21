#include "format_catalogue.h"

#include <algorithm>
#include <array>
#include <cctype>
#include <cstdio>
#include <numeric>
#include <vector>

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

// The number of insertions, deletions and replacements that turn one text into the other, ignoring case.
int EditDistance(const std::string& a, const std::string& b) {
  std::vector<int> row(b.size() + 1);
  std::iota(row.begin(), row.end(), 0);
  for (size_t i = 0; i < a.size(); ++i) {
    int diagonal = row[0];
    row[0] = static_cast<int>(i) + 1;
    for (size_t j = 0; j < b.size(); ++j) {
      const bool same =
          std::tolower(static_cast<unsigned char>(a[i])) == std::tolower(static_cast<unsigned char>(b[j]));
      const int replaced = diagonal + (same ? 0 : 1);
      diagonal = row[j + 1];
      row[j + 1] = std::min({replaced, row[j] + 1, diagonal + 1});
    }
  }
  return row.back();
}

// The few names that are nearest, best first.
std::string NearestNames(const std::string& name) {
  std::vector<std::pair<int, const char*>> ranked;
  for (const CatalogueEntry& entry : Catalogue()) ranked.emplace_back(EditDistance(name, entry.name), entry.name);
  std::stable_sort(ranked.begin(), ranked.end(), [](auto& a, auto& b) { return a.first < b.first; });
  std::string text = ranked[0].second;
  for (size_t i = 1; i < 3 && ranked[i].first <= ranked[0].first + 1; ++i) text += std::string(", ") + ranked[i].second;
  return text;
}

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
  throw ToolError("unknown format \"" + name + "\"; did you mean " + NearestNames(name) +
                  "? (\"vexel formats\" lists all)");
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
