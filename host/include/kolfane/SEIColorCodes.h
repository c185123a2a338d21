// Colour codes as video streams carry them.
#pragma once

#include <cstdint>

#include "zovcore/Export.h"
#include "zovmediatypes/ColorSpace.h"

struct kqSEIColorCodesRec {
  int32_t colourPrimaries;          // ITU-T H.273, 1 = BT.709
  int32_t transferCharacteristics;  // 1 = BT.709, 8 = linear
  int32_t matrixCoefficients;       // 0 = identity (RGB), 1 = BT.709
  int32_t bitDepth;
  int32_t fullRange;  // 1 or 0
  int32_t isRGB;      // 1 or 0
};
static_assert(sizeof(kqSEIColorCodesRec) == 24);

namespace KF {

// Never throws; codes are taken as they are.
ZOV_API zovmediatypes::color::ColorSpace ZOVColorSpaceFromSEIColorCodes(const kqSEIColorCodesRec& codes);

}  // namespace KF
