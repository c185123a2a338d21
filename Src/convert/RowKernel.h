// A row kernel converts `count` pixels from a source row to a destination row. It reads no byte past the last pixel (or
// 4:2:2 pair, or V210 group) of the row and writes none either, whatever the row padding.
#pragma once

#include <cstddef>
#include <cstdint>

#include "frame/KernelVariant.h"

namespace vexel {

using RowKernel = void (*)(const uint8_t* src, uint8_t* dst, size_t count);
using RowKernelSet = KernelVariants<RowKernel>;

}  // namespace vexel
