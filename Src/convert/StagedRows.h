// The walk over the rows of a repacking: what cannot stay in the cache is staged piece by piece and streamed.
#pragma once

#include <algorithm>
#include <cstddef>
#include <cstdint>

#include "frame/KernelVariant.h"
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

// Calls convert(from, to, count) for `units` units of each row, in pieces.
template <class Convert>
void ConvertStaged(const SourceRows& src, const DestinationRows& dst, size_t units, int32_t height,
                   KernelVariant variant, const Convert& convert) {
  if (units == 0 || height < 1) return;
  const size_t bytes = units * (src.unitBytes + dst.unitBytes);
  const bool stream = VX_GetCacheSize() != 0 && bytes * static_cast<size_t>(height) >= VX_GetCacheSize() / 2;
  alignas(64) uint8_t staging[2048];
  const size_t piece = stream ? sizeof staging / dst.unitBytes : units;
  for (int32_t row = 0; row < height; ++row) {
    const uint8_t* from = src.base + row * src.rowBytes;
    uint8_t* to = dst.base + row * dst.rowBytes;
    for (size_t i = 0; i < units; i += piece) {
      const size_t count = std::min(piece, units - i);
      convert(from + i * src.unitBytes, stream ? staging : to, count);
      if (stream) StreamCopy(to + i * dst.unitBytes, staging, count * dst.unitBytes, variant);
    }
  }
  if (stream) StreamFence();
}

}  // namespace vexel
