// Row kernels that mix or add up rows of one format.
#pragma once

#include <cstddef>
#include <cstdint>

#include "frame/KernelVariant.h"
#include "vexel/vexel.h"

namespace vexel {

// dst = a (1 - mix) + b mix over `bytes` bytes, whole pixels, pairs or groups; 0 < mix < 1. The destination may be one
// of the sources. Products and sum are single precision, integers round to nearest even; 15u values above 32768 count
// as 32768.
using MixKernel = void (*)(const uint8_t* a, const uint8_t* b, uint8_t* dst, size_t bytes, float mix);
using MixKernelSet = KernelVariants<MixKernel>;

// How a raster format mixes: channel by channel where alpha is premultiplied or missing; the same with opaque alpha
// written where it is ignored; weighted by alpha where it is straight (black at alpha 0). 10-bit codes mix as codes.
// For raster formats.
const MixKernelSet* MixKernelFor(VX_PixelFormat format) noexcept;

// dst = b + a weight over rows of floats; the destination may be b.
extern const MixKernelSet kAddScaled;

// The format in which images of `format` mix as floats, every channel in its place and the chroma resolution kept.
VX_PixelFormat InFloat(VX_PixelFormat format) noexcept;

}  // namespace vexel
