// Copies that go past the cache.
#pragma once

#include <cstddef>
#include <cstdint>

#include "frame/KernelVariant.h"

namespace vexel {

// Copies bytes between areas that do not overlap and do not depend on alignment: whole 64-byte lines of dst with
// non-temporal stores, the ends of the area with ordinary ones. Meant for a source that is in the cache, block by block
// (2 to 64 KiB). Other threads may see the bytes only after StreamFence, called once by the thread that streamed.
void StreamCopy(void* dst, const void* src, size_t bytes, KernelVariant variant) noexcept;
void StreamFence() noexcept;

// Asks for the block that is read next, before a block is streamed: meanwhile the processor does not read ahead by
// itself. Addresses past the end of the memory do no harm.
inline void PrefetchBlock(const uint8_t* src, size_t bytes) noexcept {
  constexpr size_t kLine = 64;
  const auto first = reinterpret_cast<uintptr_t>(src);
  for (size_t i = 0; i < bytes; i += kLine) __builtin_prefetch(reinterpret_cast<const void*>(first + i));
}

}  // namespace vexel
