// Packed 8-bit 4:2:2 to RGB for processors with byte permutations beside the other AVX-512 sets.
#pragma once

#include <cstddef>
#include <cstdint>

#include "convert/PairOrder.h"
#include "convert/Vbmi.h"
#include "convert/YuvFixed8.h"

namespace vexel {

// The same bytes as kUyvy8ToBgrx8 and kYuyv8ToBgrx8 of the coefficients. Only where HasVbmi.
void PairsToBgrx512(PairOrder order, const uint8_t* src, uint8_t* dst, size_t count,
                    const FixedYuvToRgb8& coefficients) noexcept;

}  // namespace vexel
