// A processor with hardly any cache: small pictures, too, take the ways past it.
#pragma once

#include <cstdint>

#include "frame/Lifecycle.h"

namespace vexel::testing {

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
