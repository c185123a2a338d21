// The stages of 4:2:0 encoding from four-channel 8-bit pixels.
#pragma once

#include <cstddef>
#include <cstdint>

#include "frame/KernelVariant.h"

namespace vexel::encode420 {

// Factors of B, G and R in 1/32768.
struct BgrFactors {
  int16_t b, g, r;
};

using MakeLuma = void (*)(const uint8_t* pixels, const BgrFactors& factors, uint8_t* luma, size_t count);
extern const KernelVariants<MakeLuma> kLumaFromBgrx;  // factors that total 32768
extern const KernelVariants<MakeLuma> kLumaFromVuyx;  // takes Y, no factors

// A row of sums has a pair of words for each pixel. They are scratch memory of kSumSlack words more than they hold on
// either side, which kernels read and write by whole vectors; rows of pictures are read and written exactly.
inline constexpr size_t kSumSlack = 64;
struct SumRows {
  uint16_t* outer;  // channels 0 and 2
  uint16_t* inner;  // channels 1 and 3
};

// weightA a + weightB b, the weights 4 in all.
using SumLines = void (*)(const uint8_t* a, const uint8_t* b, int weightA, int weightB, const SumRows& sums,
                          size_t count);
extern const KernelVariants<SumLines> kSumLines;

// Chroma about 128 at the even columns of sums, filtered with (1, 2, 1) / 4. `count` samples, for which the sums reach
// one pixel beyond both ends.
struct ChromaFactors {
  BgrFactors u, v;  // each totals 0
};
using MakeChroma = void (*)(const SumRows& sums, const ChromaFactors& factors, uint8_t* u, uint8_t* v, size_t count);
extern const KernelVariants<MakeChroma> kChromaFromBgrx;
extern const KernelVariants<MakeChroma> kChromaFromVuyx;  // takes U and V, no factors

}  // namespace vexel::encode420
