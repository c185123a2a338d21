// The stages of 4:2:0 decoding. Between them samples are 16-bit, 8-bit codes times 256 (65,280 = 255), so that 10-bit
// words in the top bits fit in as they are, and fractions survive until the one rounding at the end.
//
// Rows between stages are scratch memory of kRowSlack samples more than they hold on either side: kernels read and
// write whole vectors there. Rows of pictures are read and written exactly.
#pragma once

#include <cstddef>
#include <cstdint>

#include "frame/KernelVariant.h"

namespace vexel::decode420 {

inline constexpr size_t kRowSlack = 128;

// Weighted sums of two picture rows: out = weightA a + weightB b, or added to what `out` holds. All weights that meet
// in one output row total kMixTotal8 or kMixTotal10 (10-bit words; their low six bits are not read).
inline constexpr uint32_t kMixTotal8 = 256, kMixTotal10 = 64;
struct MixRows {
  const uint8_t *a, *b;
  uint32_t weightA, weightB;
  bool add;
};
using MixSamples = void (*)(const MixRows& rows, uint16_t* out, uint16_t* outSecond, size_t count);
extern const KernelVariants<MixSamples> kMixPlane8, kMixPlane10;  // samples one after another, all into `out`
extern const KernelVariants<MixSamples> kMixPairs8, kMixPairs10;  // `count` pairs of samples, taken apart

// Sums of any number of rows: weights of 16 fraction bits that total 65,536. `first` starts a new sum.
using AddWeighted = void (*)(const uint16_t* row, uint32_t weight, bool first, uint32_t* sums, size_t count);
using FinishSums = void (*)(const uint32_t* sums, uint16_t* out, size_t count);
extern const KernelVariants<AddWeighted> kAddWeighted;
extern const KernelVariants<FinishSums> kFinishSums;

// Row to row, out == in allowed for the first two. `count` is the number of samples written.
using ResampleRow = void (*)(const uint16_t* in, uint16_t* out, size_t count);
extern const KernelVariants<ResampleRow> kHalveRow;       // means of pairs
extern const KernelVariants<ResampleRow> kMeanOfPairs;    // (3 c[i] + c[i + 1]) / 4: co-sited samples at pair centres
extern const KernelVariants<ResampleRow> kDoubleNearest;  // c[i] twice
extern const KernelVariants<ResampleRow> kDoubleLinear;   // c[i], then the mean of c[i] and c[i + 1]
extern const KernelVariants<ResampleRow>
    kFourThirds;  // bicubic, pixel centres aligned; reads 2 samples beyond the ends
extern const KernelVariants<ResampleRow> kThreeHalves;  // the same

// Luma code, chroma code - 128 -> three channels of a pixel in memory order (B, G, R or V, U, Y), each rounded and
// clamped to 0..255. Factors are scaled for the kernels' fixed point (Decode420Rows.cpp).
struct Matrix {
  int16_t luma;          // the same for all channels that have luma: B, G and R, or Y
  int16_t lumaBias;      // with half a unit for rounding
  int16_t chroma[3][2];  // of each channel, for (U, V)
  constexpr bool operator==(const Matrix&) const = default;
};

// Pixels of a row. Luma is bytes, or 16-bit samples ("wide", "full"). Chroma is 16-bit samples at half the resolution,
// the nearest ones or interpolated (which reads one sample more than there are pairs of pixels), or at the pixels' own
// ("full"). Or it is that of a picture's own rows: bytes, or pairs of them or of 10-bit words, then all in `u`; the
// nearest samples, or interpolated between those of two rows. The fourth channel is written opaque.
struct PixelRow {
  const uint8_t *y, *u, *v;
  uint8_t* dst;
  size_t count;
  bool stream;  // past the cache; for dst on a line of it
  // Of two rows: the second one, the weights of both, 8 in all, and the samples that either has.
  const uint8_t *uB = nullptr, *vB = nullptr;
  uint32_t weightA = 8, weightB = 0;
  size_t chroma = 0;
};
using MakePixels = void (*)(const PixelRow& row, const Matrix& matrix);
struct OwnChromaKernels {
  KernelVariants<MakePixels> bytes, pairs, swappedPairs, widePairs, swappedWidePairs;
};
struct PixelKernels {
  KernelVariants<MakePixels> wideNearest, wideLinear, full;
  OwnChromaKernels nearest, mixed;
};
extern const PixelKernels kToBgrx, kToVuyx;

// Of a picture's own bytes, chroma interpolated, codes kept but for rounding: the matrix must be kSameCodes.
enum class ByteChroma : uint8_t { Planes, Pairs, SwappedPairs };  // (U, V), (V, U)
struct ByteKernels {
  KernelVariants<MakePixels> kernels[3];
  const KernelVariants<MakePixels>& operator[](ByteChroma chroma) const { return kernels[static_cast<int>(chroma)]; }
};
inline constexpr Matrix kSameCodes = {16384, 32, {{0, 8192}, {8192, 0}, {0, 0}}};
extern const ByteKernels kToCodes;  // pixels of V, U and Y
// Pairs of pixels (U, Y, V, Y), chroma being that of the first one. It is what interpolated codes give when they are
// subsampled: an odd pixel has the mean of its neighbours, rounded up, or one less, and a low-pass that adds a quarter
// of two such differences rounds them away.
extern const ByteKernels kToUyvy;

}  // namespace vexel::decode420
