// Row kernels that composite over opaque black, and those that look at a row's alpha.
#pragma once

#include <cstddef>
#include <cstdint>

#include "frame/KernelVariant.h"

namespace vexel {

// `count` pixels at an opacity of 0..1; the result is opaque. dst may be src.
using ToBlackKernel = void (*)(const uint8_t* src, uint8_t* dst, size_t count, float opacity);
using ToBlackKernelSet = KernelVariants<ToBlackKernel>;

extern const ToBlackKernelSet kToBlackLast8u, kToBlackFirst8u, kToBlackVuya8u;  // Vuya: black is 128, 128, 16
extern const ToBlackKernelSet kToBlackLast32f, kToBlackFirst32f;

enum class AlphaState : uint8_t { Opaque, Clear, Mixed };

// Opaque where all alphas are full (255, 1.0), also for no pixels at all; Clear where all are 0.
using AlphaTest = AlphaState (*)(const uint8_t* row, size_t count);
using AlphaTestSet = KernelVariants<AlphaTest>;

extern const AlphaTestSet kTestAlphaLast8u, kTestAlphaFirst8u, kTestAlphaLast32f, kTestAlphaFirst32f;

}  // namespace vexel
