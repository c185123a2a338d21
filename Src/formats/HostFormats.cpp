// The mapping between the library's pixel formats and the host's.
#include "vexel/host_types.h"

#include <algorithm>
#include <array>

#include <kolfane/SEIColorCodes.h>

#include "formats/FormatBits.h"

namespace vexel {
namespace {

using HostFormat = zovmediatypes::PixelFormat;

// Pointers, so that a host may define its constants in its own library.
struct HostMapping {
  uint32_t value = 0;
  const HostFormat* host = nullptr;
  int group = 0;
};

// Host formats are compared group by group; the order decides only where a host has two names for one pair of words.
constexpr int Group(uint32_t value) {
  const VX_PixelFormat format = FromBits(value);
  if (IsBiplanar(format)) return 10;
  if (Is420(format)) return 9;
  if (IsSpecial(format)) return 6;
  if (IsV210(format)) return 8;
  if (Layout(format) == kLayout422) return Depth(format) == kDepth32f ? 5 : 7;
  if (IsLinear(format)) return 4;
  switch (Depth(format)) {
    case kDepth15u:
      return 1;
    case kDepth10u:
      return 2;
    case kDepth32f:
      return 3;
    default:
      return 0;
  }
}

#define VX_MAPPED_BOTH(value, hostName) {value, &zovmediatypes::kPixelFormat_##hostName, Group(value)},
#define VX_MAPPED_IN(value, hostName) VX_MAPPED_BOTH(value, hostName)
#define VX_MAPPED_OUT(value, hostName)
#define VX_MAPPED_NONE(value, hostName)
#define VX_NAMED(name, value, hostName, mapping) VX_MAPPED_##mapping(value, hostName)
#define VX_UNNAMED(value, hostName, mapping) VX_MAPPED_##mapping(value, hostName)
constexpr HostMapping kUnordered[] = {VX_PIXEL_FORMATS(VX_NAMED) VX_UNNAMED_PIXEL_FORMATS(VX_UNNAMED)};
#undef VX_MAPPED_BOTH
#undef VX_MAPPED_IN
#undef VX_MAPPED_OUT
#undef VX_MAPPED_NONE

constexpr auto kFromHost = [] {
  std::array<HostMapping, std::size(kUnordered)> ordered{};
  auto next = ordered.begin();
  for (int group = 0; group <= 10; ++group)
    next = std::copy_if(std::begin(kUnordered), std::end(kUnordered), next,
                        [&](const HostMapping& mapping) { return mapping.group == group; });
  return ordered;
}();
// 67 of the 71 named formats and all 23 unnamed ones.
static_assert(kFromHost.size() == 90 && kFromHost.back().group == 10);

constexpr uint32_t kOpaqueFrame = 0x7F000020;

constexpr kqSEIColorCodesRec ColorCodes(VX_PixelFormat format) {
  const bool isRgb = !IsYuv(format);
  const uint32_t depth = Depth(format);
  return {1,
          IsLinear(format) ? 8 : 1,
          isRgb ? 0 : 1,
          depth == kDepth10u   ? 10
          : depth == kDepth15u ? 16
          : depth == kDepth32f ? 32
                               : 8,
          IsVideoRange(format) ? 0 : 1,
          isRgb ? 1 : 0};
}

}  // namespace
}  // namespace vexel

extern "C" {

VX_PixelFormat VX_ZOVPixelFormatToVXPixelFormat(const zovmediatypes::PixelFormat& format) noexcept {
  for (const auto& mapping : vexel::kFromHost)
    if (*mapping.host == format) return vexel::FromBits(mapping.value);
  const uint32_t lowByte = format.mFirst & 0xFF;
  return lowByte == 64 || lowByte == 95 ? vexel::FromBits(vexel::kOpaqueFrame) : VX_PixelFormat::Invalid;
}

zovmediatypes::PixelFormat VX_VXPixelFormatToZOVPixelFormat(VX_PixelFormat format) noexcept {
  switch (vexel::Bits(format)) {
#define VX_MAPPED_BOTH(value, hostName) \
  case value:                           \
    return zovmediatypes::kPixelFormat_##hostName;
#define VX_MAPPED_OUT(value, hostName) VX_MAPPED_BOTH(value, hostName)
#define VX_MAPPED_IN(value, hostName)
#define VX_MAPPED_NONE(value, hostName)
    VX_PIXEL_FORMATS(VX_NAMED)
    VX_UNNAMED_PIXEL_FORMATS(VX_UNNAMED)
    default:
      return zovmediatypes::kPixelFormat_Invalid;
  }
}

zovmediatypes::color::ColorSpace VX_PixelFormatToColorSpace(VX_PixelFormat format) noexcept {
  try {
    return KF::ZOVColorSpaceFromSEIColorCodes(vexel::ColorCodes(format));
  } catch (...) {
    return {};
  }
}

}  // extern "C"
