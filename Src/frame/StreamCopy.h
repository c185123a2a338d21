// Copies that go past the cache.
#pragma once

#include <cstddef>

#include "frame/KernelVariant.h"

namespace vexel {

// Copies bytes between areas that do not overlap and do not depend on alignment: whole 64-byte lines of dst with
// non-temporal stores, the ends of the area with ordinary ones. Meant for a source that is in the cache, block by block
// (6 to 64 KiB). Other threads may see the bytes only after StreamFence, called once by the thread that streamed.
void StreamCopy(void* dst, const void* src, size_t bytes, KernelVariant variant) noexcept;
void StreamFence() noexcept;

}  // namespace vexel
