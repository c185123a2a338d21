// Row kernels of normal compositing: a source over a background.
#pragma once

#include <cstddef>
#include <cstdint>

#include "frame/KernelVariant.h"

namespace vexel {

// Composites `count` pixels at an opacity of 0..1. Reads and writes no byte outside of the rows; dst may be one of the
// others. `stream`: dst is aligned to kStreamAlignment and better written past the cache.
using OverKernel = void (*)(const uint8_t* source, const uint8_t* background, uint8_t* dst, size_t count, float opacity,
                            bool stream);
using OverKernelSet = KernelVariants<OverKernel>;

// What a kernel is chosen by. Where alpha is not usable its channel is not looked at and counts as opaque.
struct OverChoice {
  bool yuv;         // 8u: black is 128, 128, 16 instead of 0
  bool straight;    // the result; premultiplied otherwise
  bool alphaFirst;  // in memory, in all three rows; last otherwise
  bool sourceAlpha, backgroundAlpha;
};

constexpr size_t AlphaAt(OverChoice choice) noexcept { return choice.alphaFirst ? 0 : 3; }

// Both rows with straight alpha.
const OverKernelSet& Over8u(OverChoice choice) noexcept;
const OverKernelSet& Over32f(OverChoice choice) noexcept;

// All rows premultiplied; `straight` does not count.
const OverKernelSet& OverPremultiplied8u(OverChoice choice) noexcept;
const OverKernelSet& OverPremultiplied32f(OverChoice choice) noexcept;

// For the tables: the choice of an index of five bits, or the one that gives the same results with straight rows. Over
// a background without alpha every result is opaque, and straight and premultiplied are the same.
inline constexpr size_t kOverChoices = 32;
constexpr size_t IndexOf(OverChoice c) noexcept {
  return size_t{c.yuv} | size_t{c.straight} << 1 | size_t{c.alphaFirst} << 2 | size_t{c.sourceAlpha} << 3 |
         size_t{c.backgroundAlpha} << 4;
}
constexpr OverChoice OverChoiceAt(size_t index) noexcept {
  const auto bit = [index](int i) { return (index >> i & 1) != 0; };
  const bool mixes = bit(4);
  return {bit(0) && mixes && !bit(2), bit(1) || !mixes, bit(2), bit(3), mixes};
}

}  // namespace vexel
