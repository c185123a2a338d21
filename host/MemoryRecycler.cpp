#include "MemoryCache.h"

#include <algorithm>
#include <atomic>

#include "System.h"
#include "vexel_host/host.h"
#include "zovcore/Utility.h"

namespace {

using vexel_host::Allocator;
using vexel_host::MemoryCache;

std::atomic<Allocator*> gAllocator{nullptr};
std::atomic<size_t> gLiveBytes{0};
std::atomic<uint64_t> gRequests{0};
std::atomic<uint64_t> gFailAt{0};  // the number of the request that fails; 0: none
std::atomic<bool> gFailSticky{false};

size_t DefaultCacheLimit() {
  constexpr uint64_t kMost = uint64_t{4} << 30;
  return static_cast<size_t>(std::min(vexel_host::system::PhysicalMemory() / 4, kMost));
}

// Never destroyed: blocks may come back while the process ends.
MemoryCache& Cache() {
  static auto& cache = *new MemoryCache(DefaultCacheLimit());
  return cache;
}

bool MustFail() {
  const uint64_t number = gRequests.fetch_add(1, std::memory_order_relaxed) + 1;
  const uint64_t failAt = gFailAt.load(std::memory_order_relaxed);
  if (failAt == 0 || number < failAt) return false;
  return number == failAt || gFailSticky.load(std::memory_order_relaxed);
}

}  // namespace

namespace zovcore::utility {

void* MemoryRecycler::Allocate(size_t bytes, size_t* rawSize) noexcept {
  *rawSize = 0;
  if (bytes == 0 || MustFail()) return nullptr;
  Allocator* const own = gAllocator.load(std::memory_order_acquire);
  void* const block = own ? own->Allocate(bytes, rawSize) : Cache().Allocate(bytes, rawSize);
  if (block)
    gLiveBytes.fetch_add(*rawSize, std::memory_order_relaxed);
  else
    *rawSize = 0;
  return block;
}

void MemoryRecycler::Recycle(void* block, size_t rawSize) noexcept {
  if (!block) return;
  gLiveBytes.fetch_sub(rawSize, std::memory_order_relaxed);
  if (Allocator* const own = gAllocator.load(std::memory_order_acquire))
    own->Recycle(block, rawSize);
  else
    Cache().Recycle(block, rawSize);
}

}  // namespace zovcore::utility

namespace vexel_host {

Allocator::~Allocator() = default;

bool SetAllocator(Allocator* allocator) {
  if (gLiveBytes.load() != 0) return false;
  gAllocator.store(allocator, std::memory_order_release);
  return true;
}

size_t LiveBytes() { return gLiveBytes.load(); }
size_t CachedBytes() { return Cache().CachedBytes(); }
void SetCacheLimit(size_t bytes) { Cache().SetLimit(bytes); }
void TrimMemory() { Cache().Trim(); }
uint64_t AllocationCount() { return gRequests.load(); }

void FailAllocation(uint64_t nth, bool sticky) {
  gFailSticky.store(sticky);
  gFailAt.store(nth == 0 ? 0 : gRequests.load() + nth);
}

}  // namespace vexel_host
