#include "blend.h"

#include <algorithm>
#include <vector>

#include "convert_picture.h"
#include "format_catalogue.h"
#include "nearest_name.h"
#include "tool_error.h"

namespace tool {
namespace {

// The stretch of one direction in which both pictures have pixels.
struct Overlap {
  int front, back, length;
};

Overlap OverlapOf(int frontLength, int backLength, int offset) {
  const int64_t first = std::max(0, offset), end = std::min<int64_t>(int64_t{offset} + frontLength, backLength);
  return {static_cast<int>(first - offset), static_cast<int>(first),
          static_cast<int>(std::max<int64_t>(end - first, 0))};
}

// The first stored pixel of a rectangle.
std::byte* FirstPixel(const Picture& picture, int x, int y, int height) {
  return picture.Row(picture.IsBottomUp() ? y + height - 1 : y) + TightRowBytes(picture.Format(), x);
}

}  // namespace

std::span<const BlendModeEntry> BlendModes() {
#define VX_BLEND_MODE_ENTRY(name, value) {VX_BlendMode::name, #name},
  static constexpr BlendModeEntry kModes[] = {VX_BLEND_MODES(VX_BLEND_MODE_ENTRY)};
#undef VX_BLEND_MODE_ENTRY
  return kModes;
}

VX_BlendMode ParseBlendMode(const std::string& name) {
  std::vector<std::string> names;
  for (const BlendModeEntry& entry : BlendModes()) {
    if (SameName(name, entry.name) || name == std::to_string(static_cast<int>(entry.mode))) return entry.mode;
    names.push_back(entry.name);
  }
  throw ToolError("unknown blend mode \"" + name + "\"" + DidYouMean(name, names) +
                  " (\"vexel composite --help\" lists all)");
}

Picture BlendPictures(const Picture& back, const Picture& front, const BlendOptions& options) {
  const bool isDeep = !Is8Bit(back.Format()) || !Is8Bit(front.Format());
  const VX_PixelFormat format = isDeep ? VX_PixelFormat::BGRA_4444_32f : VX_PixelFormat::BGRA_4444_8u;
  Picture result = ConvertPicture(back, format, {});
  const Picture source = ConvertPicture(front, format, {});
  const Overlap x = OverlapOf(source.Width(), result.Width(), options.x),
                y = OverlapOf(source.Height(), result.Height(), options.y);
  if (x.length == 0 || y.length == 0) return result;
  std::byte* const target = FirstPixel(result, x.back, y.back, y.length);
  CheckResult(VX_CompositeWithBlendMode(FirstPixel(source, x.front, y.front, y.length), source.RowBytes(), format,
                                        target, result.RowBytes(), format, target, result.RowBytes(), format, x.length,
                                        y.length, options.opacity, static_cast<int32_t>(options.mode), 3, false),
              "cannot blend the pictures");
  return result;
}

}  // namespace tool
