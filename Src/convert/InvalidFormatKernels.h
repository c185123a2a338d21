// Row kernels to and from `Invalid` as a raster of 2 bytes per pixel: BT.601 UYVY pairs whose chroma serves both
// pixels. Unlike a 4:2:2 row, a row of odd width ends with half a pair (U and Y); it takes V from the pair before.
#pragma once

#include "convert/RowKernel.h"

namespace vexel {

extern const RowKernelSet kInvalidToPairs8u, kInvalidToBgrx8;
extern const RowKernelSet kBgrx8ToInvalid, kBgrx32fToInvalid;

}  // namespace vexel
