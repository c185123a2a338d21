// V210 to 8-bit pixels for processors with byte permutations beside the other AVX-512 sets.
#pragma once

#include <cstddef>
#include <cstdint>

#include "convert/V210Fixed.h"
#include "convert/Vbmi.h"

namespace vexel {

// The same bytes as kV210ToBgrx8, kV210ToVuyx8 and kV210_709ToVuyx8_601. Only where HasVbmi.
void V210ToBgrx512(const uint8_t* src, uint8_t* dst, size_t count, const BgrFixed& matrix) noexcept;
void V210ToVuyx512(const uint8_t* src, uint8_t* dst, size_t count) noexcept;
void RecodeV210ToVuyx512(const uint8_t* src, uint8_t* dst, size_t count, const RecodingFixed& matrix) noexcept;

}  // namespace vexel
