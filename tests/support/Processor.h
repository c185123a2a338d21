// Processors that are not this one: with lesser kernels, with hardly any cache.
#pragma once

#include <cstdint>

#include "frame/KernelVariant.h"
#include "frame/Lifecycle.h"

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

// Small pictures, too, take the ways past the cache.
class SmallCache {
 public:
  explicit SmallCache(uint32_t bytes = 1024) { detail::gUnifiedCache.bytes = bytes; }
  ~SmallCache() { detail::gUnifiedCache = mFound; }
  SmallCache(const SmallCache&) = delete;
  SmallCache& operator=(const SmallCache&) = delete;

 private:
  const CacheInfo mFound = UnifiedCache();
};

}  // namespace vexel::testing
