// 8u codes to linear light through byte permutations, for processors that have them beside the other AVX-512 sets.
#pragma once

#include <cstddef>
#include <cstdint>

namespace vexel {

// The same bytes as kBgra8ToLinear. Only where HasVbmi (convert/Vbmi.h).
void LightLookup512(const uint8_t* src, uint8_t* dst, size_t count) noexcept;

}  // namespace vexel
