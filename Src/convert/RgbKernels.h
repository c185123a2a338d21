// Row kernels that move, scale and linearise channels: copies, reorders, alpha kinds, depths, light. None knows the
// difference between BGR and VUY unless its name says so.
//
// "Last" kernels have alpha in the fourth channel in memory (BGRA, VUYA), "First" in the first (ARGB). "Opaque" kernels
// write the fourth channel opaque whatever the source holds.
#pragma once

#include "convert/RowKernel.h"

namespace vexel {

// Exact moves (ReorderKernels.cpp).
extern const RowKernelSet kCopy4, kCopy8, kCopy16;               // whole pixels of 4, 8, 16 bytes
extern const RowKernelSet kCopy422_8u, kCopy422_32f, kCopyV210;  // pixel pairs of 4 and 16 bytes; groups of 6
extern const RowKernelSet kReverse8u, kReverse15u, kReverse32f;  // BGRA <-> ARGB
extern const RowKernelSet kBgrx8ToXrgb8, kXrgb8ToBgrx8;          // the same, alpha written opaque
extern const RowKernelSet kBgrx15ToXrgb15, kXrgb15ToBgrx15, kBgrx32fToXrgb32f, kXrgb32fToBgrx32f;
extern const RowKernelSet kOpaqueLast8u, kOpaqueLast15u, kOpaqueLast32f;
extern const RowKernelSet kOpaqueFirst8u, kOpaqueFirst15u, kOpaqueFirst32f;

// Straight <-> premultiplied (AlphaKernels.cpp). The VUY 8u pair scales about black (16, 128, 128); 32f VUY uses the
// Last32f pair, whose black is 0.
extern const RowKernelSet kPremultiplyLast8u, kPremultiplyLast15u, kPremultiplyLast32f;
extern const RowKernelSet kPremultiplyFirst8u, kPremultiplyFirst15u, kPremultiplyFirst32f;
extern const RowKernelSet kUnpremultiplyLast8u, kUnpremultiplyLast15u, kUnpremultiplyLast32f;
extern const RowKernelSet kUnpremultiplyFirst8u, kUnpremultiplyFirst15u, kUnpremultiplyFirst32f;
extern const RowKernelSet kPremultiplyVuya8, kUnpremultiplyVuyp8;

// Depths of RGB pixels, all four channels alike or the alpha channel written opaque (DepthKernels.cpp).
extern const RowKernelSet kWiden8uTo32f, kWiden8uTo32fOpaqueLast, kWiden8uTo32fOpaqueFirst;
extern const RowKernelSet kWiden15uTo32f, kWiden15uTo32fOpaqueLast, kWiden15uTo32fOpaqueFirst;
extern const RowKernelSet kWiden8uTo15u, kWiden8uTo15uOpaqueLast, kWiden8uTo15uOpaqueFirst;
extern const RowKernelSet kNarrow32fTo8u, kNarrow32fTo8uOpaqueLast, kNarrow32fTo8uOpaqueFirst;
extern const RowKernelSet kNarrow32fTo15u, kNarrow32fTo15uOpaqueLast, kNarrow32fTo15uOpaqueFirst;
extern const RowKernelSet kNarrow15uTo8u, kNarrow15uTo8uOpaqueLast, kNarrow15uTo8uOpaqueFirst;
extern const RowKernelSet kBgra8ToBgrp32f;  // widens, then premultiplies

// 10-bit RGB: R in bits 2-11, G 12-21, B 22-31 of a little-endian word; full range (Rgb10Kernels.cpp).
extern const RowKernelSet kRgb10ToBgrx8, kRgb10ToBgrx15, kRgb10ToBgrx32f;
extern const RowKernelSet kBgrx8ToRgb10, kBgrx15ToRgb10, kBgrx32fToRgb10;

// Working curve: linear = sign(c) |c|^2.4, alpha untouched (LinearKernels.cpp).
extern const RowKernelSet kBgra32fToLinear, kLinearToBgra32f;  // alpha copied
extern const RowKernelSet kBgrx32fToLinear, kLinearToBgrx32f;  // alpha written opaque
extern const RowKernelSet kBgra8ToLinear, kLinearToBgra8;

}  // namespace vexel
