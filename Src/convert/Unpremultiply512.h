// 8u unpremultiplying by factors from byte permutations, for processors that have them beside the other AVX-512 sets.
#pragma once

#include <cstddef>
#include <cstdint>

namespace vexel {

// The same bytes as kUnpremultiplyLast8u and kUnpremultiplyFirst8u. Only where HasVbmi (convert/Vbmi.h).
void UnpremultiplyLast512(const uint8_t* src, uint8_t* dst, size_t count) noexcept;
void UnpremultiplyFirst512(const uint8_t* src, uint8_t* dst, size_t count) noexcept;

}  // namespace vexel
