#include "MemoryCache.h"

#include <bit>
#include <new>

#include "Sanitizers.h"
#include "System.h"

#if defined(VX_HOST_ASAN)
#include <sanitizer/asan_interface.h>
#endif

namespace vexel_host {
namespace {

constexpr size_t kSmallest = 1024;
constexpr size_t kLargest = size_t{1} << 46;
constexpr size_t kAlignment = 64;
// From here on blocks are pages of their own: the C library's heap would not give them back.
constexpr size_t kMappedFrom = 256 * 1024;

// With AddressSanitizer a kept block is as good as freed memory.
void Hide([[maybe_unused]] void* begin, [[maybe_unused]] size_t bytes) {
#if defined(VX_HOST_ASAN)
  __asan_poison_memory_region(begin, bytes);
#endif
}

void Show([[maybe_unused]] void* begin, [[maybe_unused]] size_t bytes) {
#if defined(VX_HOST_ASAN)
  __asan_unpoison_memory_region(begin, bytes);
#endif
}

void* FromSystem(size_t blockSize) noexcept {
  return blockSize >= kMappedFrom ? system::MapMemory(blockSize) : system::AlignedMalloc(blockSize, kAlignment);
}

void ToSystem(void* block, size_t blockSize) noexcept {
  Show(block, blockSize);
  if (blockSize >= kMappedFrom)
    system::UnmapMemory(block, blockSize);
  else
    system::AlignedFree(block);
}

}  // namespace

size_t MemoryCache::BlockSize(size_t bytes) noexcept {
  if (bytes <= kSmallest) return kSmallest;
  if (bytes > kLargest) return 0;
  const int shift = std::bit_width(bytes - 1) - 4;
  return (((bytes - 1) >> shift) + 1) << shift;
}

int MemoryCache::ClassOf(size_t blockSize) noexcept {
  const int shift = std::bit_width(blockSize) - 4;  // 7 for the smallest
  return (shift - 7) * 8 + static_cast<int>(blockSize >> shift) - 8;
}

void MemoryCache::Unlink(FreeBlock* block) noexcept {
  (block->warmer ? block->warmer->colder : mWarmest[ClassOf(block->size)]) = block->colder;
  if (block->colder) block->colder->warmer = block->warmer;
  (block->newer ? block->newer->older : mNewest) = block->older;
  (block->older ? block->older->newer : mOldest) = block->newer;
  mCached -= block->size;
}

MemoryCache::FreeBlock* MemoryCache::Take(int sizeClass) noexcept {
  FreeBlock* const block = mWarmest[sizeClass];
  if (block) Unlink(block);
  return block;
}

void* MemoryCache::Allocate(size_t bytes, size_t* rawSize) noexcept {
  const size_t blockSize = BlockSize(bytes);
  if (blockSize == 0) return nullptr;
  const int sizeClass = ClassOf(blockSize);
  FreeBlock* block;
  {
    const std::lock_guard lock(mMutex);
    block = Take(sizeClass);
    // A frame's placement varies by some kilobytes, so equal frames may fall on both sides of a class's end.
    if (!block && blockSize >= kMappedFrom && sizeClass + 1 < kClassCount) block = Take(sizeClass + 1);
  }
  if (block) {
    *rawSize = block->size;
    Show(block, *rawSize);
    Hide(reinterpret_cast<char*>(block) + bytes, *rawSize - bytes);
    return block;
  }
  void* fresh = FromSystem(blockSize);
  if (!fresh) {
    Trim();  // what is kept may be what is missing
    fresh = FromSystem(blockSize);
    if (!fresh) return nullptr;
  }
  *rawSize = blockSize;
  Hide(static_cast<char*>(fresh) + bytes, blockSize - bytes);
  return fresh;
}

void MemoryCache::Recycle(void* memory, size_t rawSize) noexcept {
  Show(memory, rawSize);
  const int64_t now = system::CoarseMilliseconds();
  FreeBlock* evicted;
  {
    const std::lock_guard lock(mMutex);
    FreeBlock*& warmest = mWarmest[ClassOf(rawSize)];
    auto* const block = new (memory) FreeBlock{nullptr, warmest, nullptr, mNewest, now, rawSize};
    if (warmest) warmest->warmer = block;
    warmest = block;
    (mNewest ? mNewest->newer : mOldest) = block;
    mNewest = block;
    mCached += rawSize;
    Hide(block + 1, rawSize - sizeof(FreeBlock));
    evicted = EvictOldest(mLimit, now - kIdleMilliseconds);
  }
  Release(evicted);
}

// Unlinks the oldest blocks until at most `limit` bytes are kept and none was freed before that time; gives them as a
// chain through `colder`, to be released without the lock.
MemoryCache::FreeBlock* MemoryCache::EvictOldest(size_t limit, int64_t freedBefore) noexcept {
  FreeBlock* chain = nullptr;
  while (mOldest && (mCached > limit || mOldest->freed < freedBefore)) {
    FreeBlock* const block = mOldest;
    Unlink(block);
    block->colder = chain;
    chain = block;
  }
  return chain;
}

void MemoryCache::Release(FreeBlock* chain) noexcept {
  while (chain) {
    FreeBlock* const next = chain->colder;
    ToSystem(chain, chain->size);
    chain = next;
  }
}

void MemoryCache::SetLimit(size_t bytes) noexcept {
  FreeBlock* evicted;
  {
    const std::lock_guard lock(mMutex);
    mLimit = bytes;
    evicted = EvictOldest(mLimit, INT64_MIN);
  }
  Release(evicted);
}

void MemoryCache::Trim() noexcept {
  FreeBlock* evicted;
  {
    const std::lock_guard lock(mMutex);
    evicted = EvictOldest(0, INT64_MIN);
  }
  Release(evicted);
}

size_t MemoryCache::CachedBytes() const noexcept {
  const std::lock_guard lock(mMutex);
  return mCached;
}

}  // namespace vexel_host
