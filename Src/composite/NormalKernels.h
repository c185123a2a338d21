// Row kernels of normal compositing: a source over a background, both with straight alpha in the fourth channel.
#pragma once

#include <cstddef>
#include <cstdint>

#include "frame/KernelVariant.h"

namespace vexel {

// Composites `count` pixels at an opacity of 0..1. Reads and writes no byte outside of the rows; dst may be one of the
// others.
using OverKernel = void (*)(const uint8_t* source, const uint8_t* background, uint8_t* dst, size_t count,
                            float opacity);
using OverKernelSet = KernelVariants<OverKernel>;

// What a kernel is chosen by. Where alpha is not usable the fourth channel is not looked at and counts as opaque. With
// a background without alpha, the result is opaque and straight and premultiplied are the same.
struct OverChoice {
  bool yuv;  // 8u only: black is 128, 128, 16 instead of 0
  bool straight;
  bool sourceAlpha, backgroundAlpha;
};

// Calls pick with the choice as a template argument; those with the same results become one.
template <class Pick>
const OverKernelSet& PickOver(OverChoice choice, const Pick& pick) noexcept {
  constexpr bool no = false, yes = true;
  if (!choice.backgroundAlpha)
    return choice.sourceAlpha ? pick.template operator()<OverChoice{no, yes, yes, no}>()
                              : pick.template operator()<OverChoice{no, yes, no, no}>();
  if (choice.sourceAlpha) {
    if (choice.straight)
      return choice.yuv ? pick.template operator()<OverChoice{yes, yes, yes, yes}>()
                        : pick.template operator()<OverChoice{no, yes, yes, yes}>();
    return choice.yuv ? pick.template operator()<OverChoice{yes, no, yes, yes}>()
                      : pick.template operator()<OverChoice{no, no, yes, yes}>();
  }
  if (choice.straight)
    return choice.yuv ? pick.template operator()<OverChoice{yes, yes, no, yes}>()
                      : pick.template operator()<OverChoice{no, yes, no, yes}>();
  return choice.yuv ? pick.template operator()<OverChoice{yes, no, no, yes}>()
                    : pick.template operator()<OverChoice{no, no, no, yes}>();
}

const OverKernelSet& Over8u(OverChoice choice) noexcept;
const OverKernelSet& Over32f(OverChoice choice) noexcept;

}  // namespace vexel
