// The store of free blocks behind the recycling allocator.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <mutex>

namespace vexel_host {

// Blocks come in size classes, eight to a power of two, so that a block fits its request within an eighth. A free block
// is kept, its list links inside itself, until a request of its class takes the one freed last (the warmest), or until
// the kept bytes pass the limit or it has lain idle for a while, oldest first.
class MemoryCache {
 public:
  explicit MemoryCache(size_t limit) : mLimit(limit) {}
  ~MemoryCache() { Trim(); }
  MemoryCache(const MemoryCache&) = delete;
  MemoryCache& operator=(const MemoryCache&) = delete;

  void* Allocate(size_t bytes, size_t* rawSize) noexcept;
  void Recycle(void* block, size_t rawSize) noexcept;
  void SetLimit(size_t bytes) noexcept;
  void Trim() noexcept;
  size_t CachedBytes() const noexcept;

  // The size that a request of that many bytes gets; 0 if it can never be had.
  static size_t BlockSize(size_t bytes) noexcept;

 private:
  static constexpr int kClassCount = 304;
  static constexpr int64_t kIdleMilliseconds = 10000;

  struct FreeBlock {
    FreeBlock *warmer, *colder;  // in its class
    FreeBlock *newer, *older;    // among all
    int64_t freed;               // milliseconds
    size_t size;
  };

  static int ClassOf(size_t blockSize) noexcept;
  FreeBlock* Take(int sizeClass) noexcept;
  void Unlink(FreeBlock* block) noexcept;
  FreeBlock* EvictOldest(size_t limit, int64_t freedBefore) noexcept;
  static void Release(FreeBlock* chain) noexcept;

  mutable std::mutex mMutex;
  std::array<FreeBlock*, kClassCount> mWarmest{};
  FreeBlock* mNewest = nullptr;
  FreeBlock* mOldest = nullptr;
  size_t mCached = 0;
  size_t mLimit;
};

}  // namespace vexel_host
