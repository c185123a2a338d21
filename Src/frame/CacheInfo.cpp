#include "frame/CacheInfo.h"

#include "frame/Platform.h"

namespace vexel {
namespace {

constexpr uint32_t kIntelCacheLeaf = 4, kAmdCacheLeaf = 0x8000001D;

// The leaf that lists the caches; 0 if the processor has none.
uint32_t CacheLeaf(const Processor& processor) {
  const CpuidRegisters vendor = processor.cpuid(0, 0);
  const bool amd = vendor.ebx == 0x68747541;    // "Auth"enticAMD
  const bool hygon = vendor.ebx == 0x6F677948;  // "Hygo"nGenuine, a licensed AMD design
  if (!amd && !hygon) return vendor.eax >= kIntelCacheLeaf ? kIntelCacheLeaf : 0;
  if (processor.cpuid(0x80000000, 0).eax < kAmdCacheLeaf) return 0;
  constexpr uint32_t kTopologyExtensions = 1u << 22;
  return processor.cpuid(0x80000001, 0).ecx & kTopologyExtensions ? kAmdCacheLeaf : 0;
}

}  // namespace

bool UnifiedCacheFromCpuid(const Processor& processor, CacheInfo& cache) {
  const uint32_t leaf = CacheLeaf(processor);
  if (leaf == 0) return false;
  LargestUnifiedCache largest;
  constexpr uint32_t kMostCaches = 16;
  for (uint32_t i = 0; i < kMostCaches; ++i) {
    const CpuidRegisters r = processor.cpuid(leaf, i);
    const uint32_t type = r.eax & 31;  // 0 none left, 1 data, 2 instructions, 3 unified
    if (type == 0) break;
    const uint64_t ways = (r.ebx >> 22) + 1, partitions = (r.ebx >> 12 & 0x3FF) + 1, lineBytes = (r.ebx & 0xFFF) + 1;
    largest.Offer(type == 3, r.eax >> 5 & 7, ways * partitions * lineBytes * (uint64_t{r.ecx} + 1));
  }
  if (!largest.Found()) return false;
  cache = largest.Best();
  return true;
}

}  // namespace vexel
