#include <cstdint>

#include "frame/RuntimeRandom.h"
#include "vexel/vexel.h"
#include "zovcore/Utility.h"

namespace {

constexpr size_t kAlignment = 16;
// Buffers that start at the same place in a page compete for the same cache sets; a random start spreads them.
constexpr size_t kColourStep = 128;
constexpr int kColourMask = 63;

}  // namespace

void* VX_AllocateTransientMemoryBlock(size_t bytes, void** rawBlock, size_t* rawSize) noexcept {
  *rawBlock = nullptr;
  *rawSize = 0;
  if (bytes == 0) return nullptr;
  const size_t extra = static_cast<size_t>(vexel::RuntimeRandom() & kColourMask) * kColourStep + kAlignment - 1;
  if (bytes > SIZE_MAX - extra) return nullptr;
  void* const raw = zovcore::utility::MemoryRecycler::Allocate(bytes + extra, rawSize);
  if (!raw) return nullptr;
  *rawBlock = raw;
  return reinterpret_cast<void*>((reinterpret_cast<uintptr_t>(raw) + extra) & ~uintptr_t{kAlignment - 1});
}

void VX_FreeTransientMemoryBlock(void* rawBlock, size_t rawSize) noexcept {
  if (rawBlock) zovcore::utility::MemoryRecycler::Recycle(rawBlock, rawSize);
}
