// Scoped scratch memory: up to 262,144 bytes on the caller's stack, larger from the transient allocator.
#pragma once

#if defined(_WIN32)
#include <malloc.h>
#else
#include <alloca.h>
#endif

#include <cstddef>
#include <cstdint>

#include "frame/SeededBug.h"
#include "vexel/vexel.h"

namespace vexel {

inline constexpr size_t kScratchStackLimit = 262144;
inline constexpr size_t kScratchAlignment = 64;

// The size of a piece of scratch memory after which the next one is as well aligned.
constexpr size_t ScratchRounded(size_t bytes) noexcept {
  return (bytes + kScratchAlignment - 1) & ~(kScratchAlignment - 1);
}

class Scratch {
 public:
  Scratch(void* stack, size_t bytes) noexcept {
    if (stack)
      mData = reinterpret_cast<uint8_t*>((reinterpret_cast<uintptr_t>(stack) + kScratchAlignment - 1) &
                                         ~uintptr_t{kScratchAlignment - 1});
    else if (bytes != 0)
      mData = static_cast<uint8_t*>(VX_AllocateTransientMemoryBlock(bytes, &mRaw, &mRawSize));
  }
  ~Scratch() {
    if (!Has(SeededBug::ScratchLeak)) VX_FreeTransientMemoryBlock(mRaw, mRawSize);
  }
  Scratch(const Scratch&) = delete;
  Scratch& operator=(const Scratch&) = delete;

  // 64-byte aligned on the stack, 16-byte aligned from the allocator; null when the allocation failed or bytes was 0.
  uint8_t* get() const noexcept { return mData; }
  explicit operator bool() const noexcept { return mData != nullptr; }

 private:
  uint8_t* mData = nullptr;
  void* mRaw = nullptr;
  size_t mRawSize = 0;
};

}  // namespace vexel

// Declares `name`, a Scratch of `bytes` bytes that lives until the end of the scope (its stack part until the function
// returns, so not inside a loop).
#define VX_SCRATCH(name, bytes)                                                          \
  const size_t name##Bytes_ = (bytes);                                                   \
  ::vexel::Scratch name(name##Bytes_ >= 1 && name##Bytes_ <= ::vexel::kScratchStackLimit \
                            ? alloca(name##Bytes_ + ::vexel::kScratchAlignment - 1)      \
                            : nullptr,                                                   \
                        name##Bytes_)
