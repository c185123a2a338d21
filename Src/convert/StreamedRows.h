// The walk over the rows of a repacking: what cannot stay in the cache is streamed.
#pragma once

#include <algorithm>
#include <cstddef>
#include <cstdint>

#include "convert/PackerKernels.h"
#include "frame/StreamCopy.h"
#include "vexel/vexel.h"

namespace vexel {

// Rows of units: pixels or groups of them.
template <class Byte>
struct UnitRows {
  template <class Void>
  UnitRows(Void* b, ptrdiff_t bytes, size_t unit) : base(static_cast<Byte*>(b)), rowBytes(bytes), unitBytes(unit) {}
  Byte* base;
  ptrdiff_t rowBytes;
  size_t unitBytes;
};
using SourceRows = UnitRows<const uint8_t>;
using DestinationRows = UnitRows<uint8_t>;

// Of `units` units, those before the first that starts a line; all if none does.
inline size_t UnitsBeforeLine(const uint8_t* dst, size_t unitBytes, size_t units) {
  constexpr size_t kLine = 64;
  for (size_t i = 0; i < std::min(units, kLine); ++i)
    if (reinterpret_cast<uintptr_t>(dst + i * unitBytes) % kLine == 0) return i;
  return units;
}

// Calls store(from, to, count) for `units` units of each row, or stream(...) in its stead as PackerKernels says.
template <class Store, class Stream>
void ConvertRows(const SourceRows& src, const DestinationRows& dst, size_t units, int32_t height, const Store& store,
                 const Stream& stream) {
  if (units == 0 || height < 1) return;
  const size_t bytes = units * (src.unitBytes + dst.unitBytes);
  const bool isLarge = VX_GetCacheSize() != 0 && bytes * static_cast<size_t>(height) >= VX_GetCacheSize() / 2;
  for (int32_t row = 0; row < height; ++row) {
    const uint8_t* from = src.base + row * src.rowBytes;
    uint8_t* to = dst.base + row * dst.rowBytes;
    size_t done = isLarge ? UnitsBeforeLine(to, dst.unitBytes, units) : units;
    if (done != 0) store(from, to, done);
    const size_t lines = (units - done) / kStreamUnits * kStreamUnits;
    if (lines != 0) stream(from + done * src.unitBytes, to + done * dst.unitBytes, lines);
    done += lines;
    if (done != units) store(from + done * src.unitBytes, to + done * dst.unitBytes, units - done);
  }
  if (isLarge) StreamFence();
}

}  // namespace vexel
