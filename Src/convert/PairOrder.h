// The two byte orders of packed 8-bit 4:2:2.
#pragma once

#include <cstddef>
#include <cstdint>

namespace vexel {

enum class PairOrder : uint8_t { Uyvy, Yuyv };

// Which byte of each 16-bit word holds chroma and which luma. Chroma words are U, then V.
constexpr int ChromaByte(PairOrder order) { return order == PairOrder::Uyvy ? 0 : 1; }
constexpr int LumaByte(PairOrder order) { return 1 - ChromaByte(order); }

// A row of an odd width lacks the luma of its last pair's second pixel: writes that of the first there.
inline void RepeatMissingLuma(PairOrder order, uint8_t* row, size_t count) {
  if (count % 2 == 0) return;
  uint8_t* luma = row + 2 * (count - 1) + LumaByte(order);
  luma[2] = luma[0];
}

namespace plain {

// One pair in memory.
struct Pair8 {
  int u, v, y[2];
};

inline Pair8 LoadPair(PairOrder order, const uint8_t* p) {
  const int c = ChromaByte(order), y = LumaByte(order);
  return {p[c], p[c + 2], {p[y], p[y + 2]}};
}
inline void StorePair(PairOrder order, const Pair8& pair, uint8_t* p) {
  const int c = ChromaByte(order), y = LumaByte(order);
  p[c] = static_cast<uint8_t>(pair.u);
  p[c + 2] = static_cast<uint8_t>(pair.v);
  p[y] = static_cast<uint8_t>(pair.y[0]);
  p[y + 2] = static_cast<uint8_t>(pair.y[1]);
}

// Calls step(i, pair, next) for each pair of a row of `count` pixels; the last pair follows itself.
template <class Step>
inline void ForEachPair(PairOrder order, const uint8_t* src, size_t count, const Step& step) {
  const size_t pairs = (count + 1) / 2;
  for (size_t i = 0; i < pairs; ++i)
    step(i, LoadPair(order, src + 4 * i), LoadPair(order, src + 4 * (i + 1 < pairs ? i + 1 : i)));
}

}  // namespace plain
}  // namespace vexel
