// A processor's caches, and which of them counts.
#pragma once

#include <cstdint>

namespace vexel {

struct CacheInfo {
  uint32_t bytes = 0;
  uint16_t level = 0;
};

// Keeps the unified cache of the highest level out of those that are offered; of one level the first.
class LargestUnifiedCache {
 public:
  void Offer(bool unified, uint64_t level, uint64_t bytes) noexcept {
    if (!unified || level <= mBest.level || level > UINT16_MAX) return;
    mBest = {bytes > UINT32_MAX ? UINT32_MAX : static_cast<uint32_t>(bytes), static_cast<uint16_t>(level)};
  }
  bool Found() const noexcept { return mBest.level != 0; }
  CacheInfo Best() const noexcept { return mBest; }

 private:
  CacheInfo mBest;
};

struct Processor;

// Asks CPUID: leaf 4, or leaf 0x8000001D on AMD's processors. False if it does not tell.
bool UnifiedCacheFromCpuid(const Processor& processor, CacheInfo& cache);

}  // namespace vexel
