// Moves elements of any size from rows to columns.
#pragma once

#include <cstddef>
#include <cstdint>

#include "frame/KernelVariant.h"

namespace vexel {

// dst element (row x, column y) = src element (row y, column x) for a source of width x height elements of 1 to 16
// bytes. Row bytes may be negative; a size below 1 does nothing.
void TransposeElements(const uint8_t* src, ptrdiff_t srcRowBytes, uint8_t* dst, ptrdiff_t dstRowBytes, int32_t width,
                       int32_t height, int elementSize, KernelVariant variant) noexcept;

}  // namespace vexel
