// What the SDR and HDR spaces share: counts, the conversion by powers, and what BT.709 and BT.2020 mean to each other.
#pragma once

#include "color/PixelKernels.h"

namespace vexel {

inline size_t PixelCount(int count) { return count > 0 ? static_cast<size_t>(count) : 0; }

// PureGammaToPureGamma with exponents that are prepared.
void ConvertPowerToPower(const float* src, float* dst, int count, const PowerExponent& decode,
                         const PowerExponent& encode, const VX::CSMatrix& matrix, bool compressGamut,
                         const float* lumaCoeffs) noexcept;

// BT.709 to BT.2020 primaries in linear light and back, to the digits of BT.2087.
const VX::CSMatrix& Rec709ToRec2020() noexcept;
const VX::CSMatrix& Rec2020ToRec709() noexcept;

// Weights of R, G and B in the luma of the working space.
const float* Rec709Luma();

}  // namespace vexel
