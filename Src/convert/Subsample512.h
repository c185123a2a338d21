// 8-bit RGB to packed 4:2:2 for processors with the byte permutations and word products beside the other AVX-512 sets.
#pragma once

#include <cstddef>
#include <cstdint>

#include "convert/Vbmi.h"
#include "convert/Vnni.h"
#include "convert/YuvFixed8.h"

namespace vexel {

inline bool HasSubsample512() noexcept { return HasVbmi() && HasVnni(); }

// The same bytes as kBgra8ToUyvy8 and kBgrx8ToUyvy8 of the matrix. Only where HasSubsample512.
void Bgra8ToUyvy512(const uint8_t* src, uint8_t* dst, size_t count, const FixedMatrix8& matrix) noexcept;
void Bgrx8ToUyvy512(const uint8_t* src, uint8_t* dst, size_t count, const FixedMatrix8& matrix) noexcept;

}  // namespace vexel
