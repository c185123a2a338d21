// The vector forms of the powers, logarithms and exponentials, one array at a time.
#pragma once

#include <cstddef>

#include "frame/KernelVariant.h"
#include "frame/Power.h"

namespace vexel::testing {

using PowerArray = void (*)(const float* src, float* dst, size_t count, const PowerExponent& y);
using FunctionArray = void (*)(const float* src, float* dst, size_t count);

// `count` is a multiple of kPowerBlock.
inline constexpr size_t kPowerBlock = 48;
extern const KernelVariants<PowerArray> kPowers;
extern const KernelVariants<PowerArray> kSignedPowers;
extern const KernelVariants<FunctionArray> kLogs;
extern const KernelVariants<FunctionArray> kLog10s;
extern const KernelVariants<FunctionArray> kExps;
extern const KernelVariants<FunctionArray> kExp10s;

}  // namespace vexel::testing
