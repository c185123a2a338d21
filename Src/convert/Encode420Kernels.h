// The stages of 4:2:0 encoding from four-channel 8-bit pixels. Rows of sums are scratch memory of kSumSlack samples
// more than they hold on either side, which kernels read and write by whole vectors; rows of pictures are read and
// written exactly.
#pragma once

#include <cstddef>
#include <cstdint>

#include "frame/KernelVariant.h"

namespace vexel::encode420 {

inline constexpr size_t kSumSlack = 64;

// Factors of B, G and R in 1/32768.
struct BgrFactors {
  int16_t b, g, r;
};

using TakeLuma = void (*)(const uint8_t* pixels, uint8_t* luma, size_t count);
extern const KernelVariants<TakeLuma> kTakeLuma;  // from VUYX
using MakeLuma = void (*)(const uint8_t* pixels, const BgrFactors& factors, uint8_t* luma, size_t count);
extern const KernelVariants<MakeLuma> kMakeLuma;  // from BGRX, full range

// Two lines into sums of their channels: weightA a + weightB b, the weights 4 in all.
using SumLines = void (*)(const uint8_t* a, const uint8_t* b, int weightA, int weightB, uint16_t* const sums[3],
                          size_t count);
extern const KernelVariants<SumLines> kSumLines;

// Chroma samples at the even columns of sums, filtered with (1, 2, 1) / 4: of one channel as it is, or of BGR through
// factors that add up to 0, about 128.
using FilterChroma = void (*)(const uint16_t* sums, uint8_t* chroma, size_t count);
extern const KernelVariants<FilterChroma> kFilterChroma;
using MakeChroma = void (*)(const uint16_t* const sums[3], const BgrFactors& factors, uint8_t* chroma, size_t count);
extern const KernelVariants<MakeChroma> kMakeChroma;

}  // namespace vexel::encode420
