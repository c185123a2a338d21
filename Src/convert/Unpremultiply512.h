// Unpremultiplying for processors that have byte permutations (convert/Vbmi.h) beside the other AVX-512 sets: 8u by
// factors from such permutations, 15u by planes of channels.
#pragma once

#include <cstddef>
#include <cstdint>

namespace vexel {

// The same bytes as kUnpremultiplyLast8u and kUnpremultiplyFirst8u.
void UnpremultiplyLast512(const uint8_t* src, uint8_t* dst, size_t count) noexcept;
void UnpremultiplyFirst512(const uint8_t* src, uint8_t* dst, size_t count) noexcept;

// The same bytes as kUnpremultiplyLast15u and kUnpremultiplyFirst15u.
void UnpremultiplyLast15u512(const uint8_t* src, uint8_t* dst, size_t count) noexcept;
void UnpremultiplyFirst15u512(const uint8_t* src, uint8_t* dst, size_t count) noexcept;

}  // namespace vexel
