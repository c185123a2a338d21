// Gain of all channels of 8u pixels for AVX512-VBMI. Only where HasVbmi() says so.
#pragma once

#include "composite/AlphaUtilityKernels.h"

namespace vexel {

// What every code becomes in each channel.
struct GainCodes {
  // As `kernel` makes it, which need not be one of this file.
  GainCodes(GainKernel kernel, float gain) noexcept;
  alignas(64) uint8_t codes[4][256];
};

void GainPixel512(const uint8_t* src, uint8_t* dst, size_t count, const GainCodes& gain) noexcept;  // channels alike
void GainVuyp512(const uint8_t* src, uint8_t* dst, size_t count, const GainCodes& gain) noexcept;

}  // namespace vexel
