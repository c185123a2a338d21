// Rows of any bytes, of either direction, inside a larger block whose rest must stay as it was.
#pragma once

#include <cstdint>
#include <cstring>
#include <vector>

#include "support/Random.h"

namespace vexel::testing {

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

  std::vector<uint8_t> memory;
  size_t first;
  int rowBytes;
};

}  // namespace vexel::testing
