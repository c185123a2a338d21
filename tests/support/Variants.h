// Runs of the same under every kernel variant that the processor has.
#pragma once

#include "frame/KernelVariant.h"

namespace vexel::testing {

// Calls run(0), run(1), ... with the kernels limited to plain code, then to the next better ones.
template <class Run>
void ForEachVariant(const Run& run) {
  const KernelVariant active = ActiveKernelVariant();
  for (int v = 0; v <= static_cast<int>(ProcessorVariant()); ++v) {
    LimitKernelVariant(static_cast<KernelVariant>(v));
    run(v);
  }
  LimitKernelVariant(active);
}

}  // namespace vexel::testing
