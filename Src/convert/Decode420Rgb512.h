// 4:2:0 to RGB by way of codes, for processors with byte permutations beside the other AVX-512 sets.
#pragma once

#include "convert/Decode420Kernels.h"

namespace vexel::decode420 {

// The bytes of kToCodes, then of kVuyx8ToBgrx8 of a colorimetry. Only where HasVbmi.
MakePixels CodesToBgrx512(ByteChroma chroma, bool is709) noexcept;

}  // namespace vexel::decode420
