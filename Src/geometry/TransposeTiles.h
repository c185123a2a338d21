// Transposes square tiles of 64 bytes by 64 bytes' worth of elements, which stay in registers and whole cache lines.
#pragma once

#include <cstddef>
#include <cstdint>

#include "frame/KernelVariant.h"

namespace vexel {

inline constexpr int kTileBytes = 64;

// Tiles that stand one below the other in the source: their rows are read side by side, and of a destination row they
// fill 256 bytes. Lines that are written far apart are slow even past the cache, most of all a multiple of
// 4,096 bytes apart; four in a row are not.
inline constexpr size_t kStripTiles = 4;

// Full tiles of kTileBytes / size elements each way, up to kStripTiles `down` and any number `across`; `ahead` lines of
// a row, 4 or 8, are fetched together.
using TransposeTile = void (*)(const uint8_t* src, ptrdiff_t srcRowBytes, uint8_t* dst, ptrdiff_t dstRowBytes,
                               size_t down, size_t across, size_t ahead);

// For element sizes 1, 2, 4, 8 and 16; index is the logarithm of the size.
extern const KernelVariants<TransposeTile> kTransposeTiles[5];
// The same past the cache; dst and dstRowBytes are multiples of kTileBytes. To be followed by StreamFence.
extern const KernelVariants<TransposeTile> kStreamTiles[5];

// Reverses the order of `count` pixels of 4, 8 or 16 bytes; index is the logarithm of the size less 2.
using ReversePixels = void (*)(const uint8_t* src, uint8_t* dst, size_t count);
extern const KernelVariants<ReversePixels> kReversePixels[3];
// The same past the cache; dst is a multiple of the pixel size. To be followed by StreamFence.
extern const KernelVariants<ReversePixels> kStreamReversePixels[3];

}  // namespace vexel
