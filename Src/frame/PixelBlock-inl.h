// Blocks of pixels of four floats as one vector per channel, and loops over rows of them.
#if defined(VEXEL_FRAME_PIXELBLOCK_INL_H_) == defined(HWY_TARGET_TOGGLE)
#ifdef VEXEL_FRAME_PIXELBLOCK_INL_H_
#undef VEXEL_FRAME_PIXELBLOCK_INL_H_
#else
#define VEXEL_FRAME_PIXELBLOCK_INL_H_
#endif

#include <cstddef>
#include <cstdint>
#include <cstring>

#include <hwy/highway.h>

#include "frame/FloatTranspose-inl.h"
#include "frame/Power-inl.h"

#if HWY_TARGET != HWY_SCALAR
HWY_BEFORE_NAMESPACE();
namespace vexel {
namespace HWY_NAMESPACE {
namespace hn = hwy::HWY_NAMESPACE;

#ifndef VX_COLOR_STAGE
// Stages are inlined into their loops, where constants stay in registers.
#define VX_COLOR_STAGE HWY_ATTR __attribute__((always_inline))
#endif

using ColorTag = hn::ScalableTag<float>;
using ColorVector = hn::Vec<ColorTag>;

struct RgbVectors {
  ColorVector r, g, b;
};

// A block of pixels in whole vectors, all reds, then all greens, then all blues, so that what happens to each channel
// alike is one loop. Blocks hold their pixels in the order that costs least to produce; only the way back to memory has
// to know it.
struct PixelBlock {
  static constexpr size_t kVectors = 16;
  static constexpr size_t kPixels = kVectors * hn::MaxLanes(ColorTag());
  size_t pixels;
  bool negative;  // A minus sign has been met, in this block or an earlier one.
  HWY_ALIGN float colors[3 * kPixels];
  HWY_ALIGN float alpha[kPixels];
  HWY_ALIGN float scratch[3 * kPowerScratch * kPixels];
};

HWY_INLINE void LoadPixels(const float* from, ColorVector& v0, ColorVector& v1, ColorVector& v2, ColorVector& v3) {
  const ColorTag d;
  const size_t lanes = hn::Lanes(d);
  v0 = hn::LoadU(d, from);
  v1 = hn::LoadU(d, from + lanes);
  v2 = hn::LoadU(d, from + 2 * lanes);
  v3 = hn::LoadU(d, from + 3 * lanes);
  Transpose4(v0, v1, v2, v3);
}
HWY_INLINE void StorePixels(ColorVector v0, ColorVector v1, ColorVector v2, ColorVector v3, float* to) {
  const ColorTag d;
  const size_t lanes = hn::Lanes(d);
  Transpose4(v0, v1, v2, v3);
  hn::StoreU(v0, d, to);
  hn::StoreU(v1, d, to + lanes);
  hn::StoreU(v2, d, to + 2 * lanes);
  hn::StoreU(v3, d, to + 3 * lanes);
}

HWY_INLINE RgbVectors LoadColors(const PixelBlock& block, size_t i) {
  const ColorTag d;
  const float* from = block.colors + i;
  return {hn::Load(d, from), hn::Load(d, from + block.pixels), hn::Load(d, from + 2 * block.pixels)};
}
HWY_INLINE void StoreColors(const RgbVectors& c, PixelBlock& block, size_t i) {
  const ColorTag d;
  float* to = block.colors + i;
  hn::Store(c.r, d, to);
  hn::Store(c.g, d, to + block.pixels);
  hn::Store(c.b, d, to + 2 * block.pixels);
}

// stage(RgbVectors&) changes the colours of a block.
template <class Stage>
HWY_INLINE void ForEachColor(PixelBlock& block, const Stage& stage) {
  const size_t lanes = hn::Lanes(ColorTag());
  for (size_t i = 0; i < block.pixels; i += lanes) {
    RgbVectors c = LoadColors(block, i);
    stage(c);
    StoreColors(c, block, i);
  }
}

// Asks for the pixels that stand one block further on: processors do not fetch them by themselves while a block is
// worked on. Addresses past the pixels do no harm.
HWY_INLINE void FetchNextBlock(const float* pixels) {
  const auto address = reinterpret_cast<uintptr_t>(pixels) + PixelBlock::kPixels * 4 * sizeof(float);
  for (size_t offset = 0; offset < 4 * sizeof(ColorVector); offset += 64)
    __builtin_prefetch(reinterpret_cast<const void*>(address + offset));
}

HWY_INLINE void LoadBlock(const float* src, PixelBlock& block) {
  const ColorTag d;
  const size_t lanes = hn::Lanes(d);
  for (size_t i = 0; i < block.pixels; i += lanes) {
    FetchNextBlock(src + 4 * i);
    RgbVectors c;
    ColorVector a;
    LoadPixels(src + 4 * i, c.b, c.g, c.r, a);
    StoreColors(c, block, i);
    hn::Store(a, d, block.alpha + i);
  }
}
HWY_INLINE void StoreBlock(const PixelBlock& block, float* dst) {
  const ColorTag d;
  const size_t lanes = hn::Lanes(d);
  for (size_t i = 0; i < block.pixels; i += lanes) {
    FetchNextBlock(dst + 4 * i);
    const RgbVectors c = LoadColors(block, i);
    StorePixels(c.b, c.g, c.r, hn::Load(d, block.alpha + i), dst + 4 * i);
  }
}

// Calls change(source, destination, pixels) for runs of whole vectors of pixels, at most `most`; the last pixels go
// through the same code on a copy padded with zeros.
template <class Change>
HWY_INLINE void ForEachRun(const float* src, float* dst, size_t count, size_t most, const Change& change) {
  const size_t lanes = hn::Lanes(ColorTag());
  while (count >= lanes) {
    const size_t pixels = HWY_MIN(count / lanes * lanes, most);
    change(src, dst, pixels);
    src += 4 * pixels;
    dst += 4 * pixels;
    count -= pixels;
  }
  if (count != 0) {
    HWY_ALIGN float padded[4 * hn::MaxLanes(ColorTag())] = {};
    std::memcpy(padded, src, count * 4 * sizeof(float));
    change(padded, padded, lanes);
    std::memcpy(dst, padded, count * 4 * sizeof(float));
  }
}

// change(PixelBlock&) for pixels in blocks that stay in the cache.
template <class Change>
HWY_INLINE void ForEachBlock(const float* src, float* dst, size_t count, const Change& change) {
  PixelBlock block;
  block.negative = false;
  ForEachRun(src, dst, count, PixelBlock::kPixels, [&](const float* from, float* to, size_t pixels) VX_COLOR_STAGE {
    block.pixels = pixels;
    LoadBlock(from, block);
    change(block);
    StoreBlock(block, to);
  });
}

// change(RgbVectors&) for pixels, in one pass.
template <class Change>
HWY_INLINE void ForEachPixel(const float* src, float* dst, size_t count, const Change& change) {
  const size_t lanes = hn::Lanes(ColorTag());
  ForEachRun(src, dst, count, SIZE_MAX, [&](const float* from, float* to, size_t pixels) VX_COLOR_STAGE {
    for (size_t i = 0; i < pixels; i += lanes) {
      RgbVectors c;
      ColorVector a;
      LoadPixels(from + 4 * i, c.b, c.g, c.r, a);
      change(c);
      StorePixels(c.b, c.g, c.r, a, to + 4 * i);
    }
  });
}

// Powers of all channels of a block, and the same between two changes of single values.
template <PowerCore kCore>
HWY_INLINE void SignedPowers(PixelBlock& block, const PowerExponent& y) {
  SignedPowers<kCore>(block.colors, 3 * block.pixels, block.scratch, y, block.negative);
}
template <PowerCore kCore, class Prepare, class Finish>
HWY_INLINE void Powers(PixelBlock& block, const PowerExponent& y, const Prepare& prepare, const Finish& finish) {
  Powers<kCore>(block.colors, 3 * block.pixels, block.scratch, y, prepare, finish);
}

}  // namespace HWY_NAMESPACE
}  // namespace vexel
HWY_AFTER_NAMESPACE();
#endif  // HWY_TARGET

#endif
