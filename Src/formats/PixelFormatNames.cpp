// The name table of the pixel formats.
#include <cstring>
#include <iterator>

#include "formats/FormatBits.h"

namespace vexel {
namespace {

struct NamedFormat {
  uint32_t value;
  char name[36];
};
static_assert(sizeof(NamedFormat) == 40);

constexpr NamedFormat kNamedFormats[] = {
#define VX_NAMED_FORMAT(name, value, hostName, mapping) {value, #name},
    VX_PIXEL_FORMATS(VX_NAMED_FORMAT)
#undef VX_NAMED_FORMAT
};
static_assert(std::size(kNamedFormats) == 71);

}  // namespace
}  // namespace vexel

extern "C" {

const char* VX_PixelFormatName(VX_PixelFormat format) noexcept {
  for (const auto& entry : vexel::kNamedFormats)
    if (entry.value == vexel::Bits(format)) return entry.name;
  return "Unknown pixel format";
}

VX_PixelFormat VX_PixelFormatFromName(const char* name) noexcept {
  if (name)
    for (const auto& entry : vexel::kNamedFormats)
      if (std::strcmp(entry.name, name) == 0) return vexel::FromBits(entry.value);
  return VX_PixelFormat::Invalid;
}

}  // extern "C"
