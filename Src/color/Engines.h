// What the SDR and HDR spaces share: the guarded calls into the pixel kernels.
#pragma once

#include "color/PixelKernels.h"

namespace vexel {

inline size_t PixelCount(int count) { return count > 0 ? static_cast<size_t>(count) : 0; }

void ConvertPowerToPower(const float* src, float* dst, int count, const PowerExponent& decode,
                         const PowerExponent& encode, const VX::CSMatrix& matrix, bool compressGamut,
                         const float* lumaCoeffs) noexcept;

// BT.709 to BT.2020 primaries in linear light and back, to the digits of BT.2087.
const VX::CSMatrix& Rec709ToRec2020() noexcept;
const VX::CSMatrix& Rec2020ToRec709() noexcept;

const float* Rec709Luma();

}  // namespace vexel
