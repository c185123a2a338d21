#include "kolfane/SEIColorCodes.h"

#include "zovmediatypes/PixelFormat.h"

namespace KF {

zovmediatypes::color::ColorSpace ZOVColorSpaceFromSEIColorCodes(const kqSEIColorCodesRec& codes) {
  return {codes.colourPrimaries, codes.transferCharacteristics, codes.matrixCoefficients,
          codes.bitDepth,        codes.fullRange != 0,          codes.isRGB != 0};
}

}  // namespace KF

namespace zovmediatypes {
namespace {

constexpr PixelFormat kAll[] = {
#define ZOV_NAMED(name, value, hostName, mapping) kPixelFormat_##hostName,
#define ZOV_UNNAMED(value, hostName, mapping) kPixelFormat_##hostName,
    VX_PIXEL_FORMATS(ZOV_NAMED) VX_UNNAMED_PIXEL_FORMATS(ZOV_UNNAMED)
#undef ZOV_NAMED
#undef ZOV_UNNAMED
};

constexpr bool AllDiffer() {
  for (const auto& a : kAll)
    for (const auto& b : kAll)
      if (&a != &b && a == b) return false;
  return true;
}
static_assert(AllDiffer());

}  // namespace
}  // namespace zovmediatypes
