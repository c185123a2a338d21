// Rows of any bytes, of either direction, inside a larger block at a cache line, whose rest must stay as it was.
#pragma once

#include <new>

#include "support/Test.h"

namespace vexel::testing {

// Memory in which rows may begin at cache lines.
template <class T>
struct LineAllocator {
  using value_type = T;
  static constexpr std::align_val_t kLine{64};
  T* allocate(size_t n) { return static_cast<T*>(operator new(n * sizeof(T), kLine)); }
  void deallocate(T* p, size_t) { operator delete(p, kLine); }
  bool operator==(const LineAllocator&) const = default;
};
using LineBytes = std::vector<uint8_t, LineAllocator<uint8_t>>;

struct PaddedRows {
  PaddedRows(size_t bytes, int height, int padding, bool upsideDown, uint64_t seed, size_t offset = 3)
      : memory((bytes + static_cast<size_t>(padding)) * static_cast<size_t>(height) + offset + 64),
        first(offset),
        rowBytes(static_cast<int>(bytes) + padding) {
    Random(seed).Fill(memory.data(), memory.size());
    if (!upsideDown) return;
    first += static_cast<size_t>(rowBytes) * static_cast<size_t>(height - 1);
    rowBytes = -rowBytes;
  }
  uint8_t* base() { return memory.data() + first; }
  size_t At(int row) const { return static_cast<size_t>(static_cast<ptrdiff_t>(first) + ptrdiff_t{row} * rowBytes); }
  template <class T>
  T Get(int row, size_t index) const {
    T v;
    std::memcpy(&v, memory.data() + At(row) + index * sizeof(T), sizeof(T));
    return v;
  }
  template <class T>
  void Put(int row, size_t index, T v) {
    std::memcpy(memory.data() + At(row) + index * sizeof(T), &v, sizeof(T));
  }

  LineBytes memory;
  size_t first;
  int rowBytes;
};

}  // namespace vexel::testing
