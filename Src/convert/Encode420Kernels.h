// The kernels of 4:2:0 encoding from four-channel 8-bit pixels.
#pragma once

#include <cstddef>
#include <cstdint>

#include "convert/Decode420Kernels.h"
#include "frame/KernelVariant.h"

namespace vexel::encode420 {

// Factors of B, G and R in 1/32768: for luma 32768 in all, for chroma 0. Pixels of V, U and Y need none.
struct BgrFactors {
  int16_t b, g, r;
};
struct Factors {
  BgrFactors luma, u, v;
};

// Two lines of pixels, the rows of luma made of them, and the row of either chroma plane that they share. The ends of
// lines go on for the chroma filter, (1, 2, 1) / 4 about the even columns. All rows are read and written exactly.
struct LinePair {
  const uint8_t *a, *b;  // one line twice, luma rows and all, where the picture ends between them
  uint8_t *lumaA, *lumaB;
  uint8_t *u, *v;
  uintptr_t nextA, nextB;     // asked for, not read: lines that lie downward in memory are not fetched ahead
  size_t width, chromaWidth;  // chroma may lack the last sample of an odd width
  bool stream;                // past the cache; for planes' rows on lines of it
  bool continues;             // of four-channel pixels: those before stand in memory before the lines
};
using EncodeLines = void (*)(const LinePair& lines, const Factors& factors);

// By the weights of the two lines in chroma.
template <class Kernel>
struct ByWeights {
  KernelVariants<Kernel> even, nearFirst, nearSecond;  // (2, 2), (3, 1), (1, 3)
};
using PairKernels = ByWeights<EncodeLines>;
extern const PairKernels kFromBgrx, kFromVuyx;
extern const PairKernels kFromBgra;  // premultiplied first
// Packed 4:2:2: pairs of pixels, the last one whole, with the chroma that kUyvy8ToVuyx8 and kYuyv8ToVuyx8 give them.
extern const PairKernels kFromUyvy, kFromYuyv;

// The first `count` samples of a chroma row of either plane, from two lines of chroma as decode420::kToCodes would make
// pixels of it. Those lines have `count` samples, or one more where the row lacks that of an odd width.
using RecodeChroma = void (*)(const decode420::PixelRow& a, const decode420::PixelRow& b, uint8_t* u, uint8_t* v,
                              size_t count);
extern const ByWeights<RecodeChroma> kRecodePlanes, kRecodePairs;

}  // namespace vexel::encode420
