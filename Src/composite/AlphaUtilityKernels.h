// Kernels of the alpha utilities, over rows of four-channel pixels. The destination may be any of the sources.
#pragma once

#include <cstddef>
#include <cstdint>

#include "formats/FormatBits.h"
#include "frame/KernelVariant.h"

namespace vexel {

// Alpha, or all four channels, times a gain of at least 0. 8u results are rounded as the processor is set to and
// saturated, for gains up to 255; VUYP scales about video black. 32f is not clamped.
using GainKernel = void (*)(const uint8_t* src, uint8_t* dst, size_t count, float gain);
using GainKernels = KernelVariants<GainKernel>;
extern const GainKernels kGainAlphaLast8u, kGainAlphaFirst8u, kGainPixel8u, kGainVuyp8;
extern const GainKernels kGainAlphaLast32f, kGainAlphaFirst32f, kGainPixel32f;

// The kernels below are indexed by depth class and by whether alpha comes first.
inline constexpr int kDepthClasses = 3;
constexpr int DepthClass(VX_PixelFormat format) noexcept {  // -1: a depth without kernels
  const uint32_t depth = Depth(format);
  return depth == kDepth8u ? 0 : depth == kDepth15u ? 1 : depth == kDepth32f ? 2 : -1;
}

// The colours of `colors` under the inverse of the alpha of `src`; in 15u, alpha above 32768 wraps around.
using MergeKernel = void (*)(const uint8_t* src, const uint8_t* colors, uint8_t* dst, size_t count);
using MergeKernels = KernelVariants<MergeKernel>;
extern const MergeKernels kInvertAlpha[kDepthClasses][2];

// One pixel, repeated over 16 bytes.
struct alignas(16) PixelPattern {
  uint8_t bytes[16];
};

// Copies pixels but for the bits of `mask`, which come from `value`.
using ReplaceKernel = void (*)(const uint8_t* src, uint8_t* dst, size_t bytes, const PixelPattern& value,
                               const PixelPattern& mask);
extern const KernelVariants<ReplaceKernel> kReplaceBits;

// Each colour channel minus the matte's under the inverse of the pixel's alpha, premultiplied as rows are (see
// convert/AlphaKernels.cpp); 0 where that is the larger one. In the matte, alpha is 0 and no 15u channel above 32768.
using MatteKernel = void (*)(const uint8_t* src, uint8_t* dst, size_t count, const PixelPattern& matte);
using MatteKernels = KernelVariants<MatteKernel>;
extern const MatteKernels kSubtractMatte[kDepthClasses][2];

// For each pixel that of `a` where the mask's bit is set, that of `b` where it is clear. A word of the mask is 32
// pixels, the first in its uppermost bit.
using SelectKernel = void (*)(const uint8_t* a, const uint8_t* b, const uint32_t* mask, uint8_t* dst, size_t count);
using SelectKernels = KernelVariants<SelectKernel>;
extern const SelectKernels kSelectPixels4, kSelectPixels8, kSelectPixels16;

}  // namespace vexel
