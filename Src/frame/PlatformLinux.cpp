#if !defined(_WIN32)
#include "frame/Platform.h"

#include <cpuid.h>

#include <cstdio>
#include <cstdlib>
#include <cstring>

namespace vexel::platform {
namespace {

CpuidRegisters Cpuid(uint32_t leaf, uint32_t subleaf) {
  CpuidRegisters r;
  __cpuid_count(leaf, subleaf, r.eax, r.ebx, r.ecx, r.edx);
  return r;
}

uint64_t Xcr0() {
  uint32_t low, high;
  __asm__ volatile("xgetbv" : "=a"(low), "=d"(high) : "c"(0));
  return uint64_t{high} << 32 | low;
}

// The first line of a cache's description; false if there is none.
bool ReadAttribute(int index, const char* name, char (&text)[32]) {
  char path[96];
  std::snprintf(path, sizeof path, "/sys/devices/system/cpu/cpu0/cache/index%d/%s", index, name);
  std::FILE* const file = std::fopen(path, "re");
  if (!file) return false;
  const bool read = std::fgets(text, sizeof text, file) != nullptr;
  std::fclose(file);
  return read;
}

// "1024K", "32M" or plain bytes.
uint64_t ParseSize(const char* text) {
  char* end;
  const uint64_t number = std::strtoull(text, &end, 10);
  return *end == 'K' ? number << 10 : *end == 'M' ? number << 20 : *end == 'G' ? number << 30 : number;
}

bool UnifiedCacheFromSysfs(CacheInfo& cache) {
  LargestUnifiedCache largest;
  for (int index = 0;; ++index) {
    char type[32], level[32], size[32];
    if (!ReadAttribute(index, "type", type)) break;
    if (!ReadAttribute(index, "level", level) || !ReadAttribute(index, "size", size)) continue;
    largest.Offer(std::strncmp(type, "Unified", 7) == 0, std::strtoull(level, nullptr, 10), ParseSize(size));
  }
  if (!largest.Found()) return false;
  cache = largest.Best();
  return true;
}

}  // namespace

const Processor kProcessor{&Cpuid, &Xcr0};

bool FindUnifiedCache(CacheInfo& cache) {
  return UnifiedCacheFromSysfs(cache) || UnifiedCacheFromCpuid(kProcessor, cache);
}

}  // namespace vexel::platform
#endif
