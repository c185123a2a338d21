// Kernels of the codec packers and camera converters. Pixels may have any alignment.
#pragma once

#include <cstddef>
#include <cstdint>

#include "convert/RowKernel.h"

namespace vexel {

inline constexpr size_t kV210GroupPixels = 6;
inline constexpr size_t kV210GroupBytes = 16;
inline constexpr size_t kUyvy16GroupBytes = 24;

// A kernel, and the same past the cache: for a destination at a line's start and a multiple of kStreamUnits units, to
// be followed by StreamFence.
struct PackerKernels {
  RowKernelSet stored, streamed;
};
inline constexpr size_t kStreamUnits = 32;

// In groups of 6 pixels. Samples beyond 10 bits run into their neighbours when packing.
extern const PackerKernels kUyvy10ToV210;
extern const PackerKernels kV210ToUyvy10;

// In pixels.
extern const PackerKernels kDnxhd16ToRgb10;
extern const PackerKernels kBgr16ToRgb10;
extern const PackerKernels kRgb10ToBgr10In16;
extern const PackerKernels kRgb8ToBgra8;
extern const PackerKernels kRgb16ToXrgb15;

// In pixels. The fourth DNxHD sample keeps its value.
extern const RowKernelSet kRgb10ToDnxhd16;

// `count` samples, words or pixels, read once and written back.
using InPlaceKernel = void (*)(uint8_t* row, size_t count);
using InPlaceKernelSet = KernelVariants<InPlaceKernel>;
extern const InPlaceKernelSet kScale15To16;
extern const InPlaceKernelSet kScale15To16BigEndian;
extern const InPlaceKernelSet kSwapBytes32;
extern const InPlaceKernelSet kSGamut3ToSGamut3Cine;
extern const InPlaceKernelSet kZyxToBgr32f;

// In samples; the source may be the destination.
using ScaleKernel = void (*)(const uint8_t* src, uint8_t* dst, size_t count);
extern const KernelVariants<ScaleKernel> kScale16To15;

// Rounds value * first * second to the nearest integer, ties to even, and saturates; NaN gives 0.
using NarrowKernel = void (*)(const float* src, uint8_t* dst, size_t count, float first, float second);
extern const KernelVariants<NarrowKernel> kNarrowToInt16;
extern const KernelVariants<NarrowKernel> kNarrowToInt32;

// Adds an offset to the U and V of `count` 4:2:2 pixel pairs U Y V Y.
using OffsetKernel = void (*)(uint8_t* row, size_t count, float offset);
extern const KernelVariants<OffsetKernel> kOffsetChroma32f;

}  // namespace vexel
