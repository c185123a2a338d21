// The row kernels of the blend modes.
#pragma once

#include <cstddef>
#include <cstdint>

#include "frame/KernelVariant.h"
#include "frame/RuntimeRandom.h"
#include "vexel/compositing.h"

namespace vexel {

// Where a pixel of four bytes has its alpha, and what it means. BGRA straight as it stands.
struct BytePixels {
  bool reversed = false;       // ARGB
  bool opaque = false;         // read and written as 255
  bool premultiplied = false;  // destinations only
};

struct BlendArguments {
  float opacity;
  float luma[3];  // weights of blue, green and red by which DarkerColor and LighterColor compare
  BytePixels src, background, dst;
  // What Divide gives at most. Its quotients, up to 10^7, must not leave the range in which conversions saturate.
  float most;
};

// Blends `count` pixels. The destination may be one of the sources. Reads and writes no other byte.
using BlendKernel = void (*)(const uint8_t* src, const uint8_t* background, uint8_t* dst, size_t count,
                             const BlendArguments& arguments);

// The same arithmetic on BGRA_4444_32f and on pixels of four bytes, which gives the bytes of widening, blending in
// floats and narrowing.
struct BlendKernels {
  KernelVariants<BlendKernel> floats, bytes;
};

// Every mode but Normal, and Dissolve, whose kernels are of another kind.
// clang-format off
#define VX_KERNEL_BLEND_MODES(X) \
  X(Color) X(ColorBurn) X(ColorDodge) X(Darken) X(DarkerColor) X(Difference) \
  X(Exclusion) X(HardLight) X(HardMix) X(Hue) X(Lighten) X(LighterColor) \
  X(LinearBurn) X(LinearDodge) X(LinearLight) X(Luminosity) X(Multiply) X(Overlay) \
  X(PinLight) X(Saturation) X(Screen) X(SoftLight) X(VividLight) X(Subtract) \
  X(Divide)
// clang-format on

#define VX_DECLARE_BLEND(mode) extern const BlendKernels kBlend##mode;
VX_KERNEL_BLEND_MODES(VX_DECLARE_BLEND)
#undef VX_DECLARE_BLEND

// Dissolve copies the source pixel with a probability of its alpha times the opacity, else the background's: pixels of
// four bytes with straight alpha, first if `reversed`, or BGRA_4444_32f. By place, every pixel draws from the sequence,
// needed or not; in turn, only pixels that need it, so that one vector would have to wait for the other.
using DissolveBlendKernel = void (*)(const uint8_t* src, const uint8_t* background, uint8_t* dst, size_t count,
                                     bool reversed, float opacity, RandomSequence& sequence);
extern const KernelVariants<DissolveBlendKernel> kBlendDissolveBytesByPlace, kBlendDissolveFloatsByPlace;
extern const DissolveBlendKernel kBlendDissolveBytesInTurn, kBlendDissolveFloatsInTurn;

}  // namespace vexel

// Defines a mode's kernels in the HWY_ONCE block of the file that holds them.
#define VX_DEFINE_BLEND(mode)                              \
  const BlendKernels kBlend##mode = {                      \
      VX_KERNEL_VARIANTS(BlendFloats<VX_BlendMode::mode>), \
      VX_KERNEL_VARIANTS(BlendBytes<VX_BlendMode::mode>),  \
  };
