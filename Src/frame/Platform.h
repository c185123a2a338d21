// What the library asks of the processor and the operating system. PlatformLinux.cpp and PlatformWindows.cpp answer.
#pragma once

#include <cstdint>

#include "frame/CacheInfo.h"

namespace vexel {

struct CpuidRegisters {
  uint32_t eax, ebx, ecx, edx;
};

// A processor to ask; tests put another one in its place.
struct Processor {
  CpuidRegisters (*cpuid)(uint32_t leaf, uint32_t subleaf);
  uint64_t (*xcr0)();  // only with CPUID's OSXSAVE bit
};

namespace platform {

extern const Processor kProcessor;

// The unified cache of the highest level, asked of the operating system and else of the processor. False if neither
// knows.
bool FindUnifiedCache(CacheInfo& cache);

}  // namespace platform
}  // namespace vexel
