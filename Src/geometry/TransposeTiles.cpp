#include "geometry/TransposeTiles.h"

#include <cstring>

#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "geometry/TransposeTiles.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

#include "frame/KernelTable.h"

#if HWY_TARGET != HWY_SCALAR  // compiled by foreach_target as the baseline, never chosen
HWY_BEFORE_NAMESPACE();
namespace vexel {
namespace HWY_NAMESPACE {
namespace hn = hwy::HWY_NAMESPACE;
namespace {

constexpr ptrdiff_t kPrefetchBytes = 2 * kTileBytes;

// 16 bytes of one row in each block of a vector.
template <class D>
HWY_INLINE hn::VFromD<D> LoadBlocks(D d, const uint8_t* src, [[maybe_unused]] ptrdiff_t rowBytes) {
  const hn::Full128<uint8_t> d128;
  [[maybe_unused]] const hn::Repartition<uint8_t, D> d8;
#if HWY_TARGET == HWY_AVX3
  // Broadcasts under a mask need no shuffle.
  const auto row = [&](int i) HWY_ATTR { return hn::LoadU(d128, src + i * rowBytes).raw; };
  auto v = _mm512_broadcast_i32x4(row(0));
  v = _mm512_mask_broadcast_i32x4(v, 0x00F0, row(1));
  v = _mm512_mask_broadcast_i32x4(v, 0x0F00, row(2));
  return hn::BitCast(d, hn::VFromD<decltype(d8)>{_mm512_mask_broadcast_i32x4(v, 0xF000, row(3))});
#elif HWY_MAX_BYTES == 32
  return hn::BitCast(d, hn::Combine(d8, hn::LoadU(d128, src + rowBytes), hn::LoadU(d128, src)));
#else
  return hn::BitCast(d, hn::LoadU(d128, src));
#endif
}

// Exchanges rows and columns of n x n lanes, n vectors, in each block of 16 bytes. Interleaving vector i with vector
// i + n/2 rotates the bits of an element's index (row, column) by one place; log2(n) rounds exchange row and column.
template <int n, class V>
HWY_INLINE void TransposeBlocks(V (&a)[n]) {
  const hn::DFromV<V> d;
  V b[n];
  HWY_UNROLL(4)
  for (int round = 1; round < n; round *= 2) {
    HWY_UNROLL(8)
    for (int i = 0; i < n / 2; ++i) {
      b[2 * i] = hn::InterleaveLower(d, a[i], a[i + n / 2]);
      b[2 * i + 1] = hn::InterleaveUpper(d, a[i], a[i + n / 2]);
    }
    HWY_UNROLL(16)
    for (int i = 0; i < n; ++i) a[i] = b[i];
  }
}

template <bool kStream, class V>
HWY_INLINE void StorePiece(V v, uint8_t* dst) {
  const hn::Repartition<uint8_t, hn::DFromV<V>> d8;
  if constexpr (kStream)
    hn::Stream(hn::BitCast(d8, v), d8, dst);
  else
    hn::StoreU(hn::BitCast(d8, v), d8, dst);
}

// Goes through the source by columns of 16 bytes, so that each destination line is written at once.
template <class T, int kSize, bool kStream>
HWY_INLINE void TileLines(const uint8_t* src, ptrdiff_t srcRowBytes, uint8_t* dst, ptrdiff_t dstRowBytes) {
  const hn::ScalableTag<T> d;
  constexpr int n = 16 / kSize, kVectors = kTileBytes / HWY_MAX_BYTES, kVectorRows = HWY_MAX_BYTES / kSize;
  for (int x = 0; x < kTileBytes / 16; ++x) {
    hn::VFromD<decltype(d)> lines[kVectors][n];
    HWY_UNROLL(4)
    for (int v = 0; v < kVectors; ++v) {
      HWY_UNROLL(16)
      for (int i = 0; i < n; ++i)
        lines[v][i] = LoadBlocks(d, src + (v * kVectorRows + i) * srcRowBytes + 16 * x, n * srcRowBytes);
      TransposeBlocks(lines[v]);
    }
    HWY_UNROLL(16)
    for (int i = 0; i < n; ++i) HWY_UNROLL(4)
    for (int v = 0; v < kVectors; ++v)
      StorePiece<kStream>(lines[v][i], dst + (x * n + i) * dstRowBytes + v * HWY_MAX_BYTES);
  }
}

template <class T, int kSize, bool kStream>
HWY_INLINE void Tile(const uint8_t* src, ptrdiff_t srcRowBytes, uint8_t* dst, ptrdiff_t dstRowBytes) {
  constexpr int kVectors = kTileBytes / HWY_MAX_BYTES, kRows = kTileBytes / kSize;
  if constexpr (!kStream || kVectors == 1 || kVectors * 16 / kSize <= 8) {
    TileLines<T, kSize, kStream>(src, srcRowBytes, dst, dstRowBytes);
  } else {
    // Too few registers to write whole lines.
    const hn::ScalableTag<uint8_t> d;
    alignas(64) uint8_t lines[kRows * kTileBytes];
    TileLines<T, kSize, false>(src, srcRowBytes, lines, kTileBytes);
    for (int i = 0; i < kRows; ++i)
      for (int v = 0; v < kTileBytes; v += HWY_MAX_BYTES)
        hn::Stream(hn::Load(d, lines + i * kTileBytes + v), d, dst + i * dstRowBytes + v);
  }
}

template <class T, int kSize, bool kStream>
HWY_INLINE void Tiles(const uint8_t* src, ptrdiff_t srcRowBytes, uint8_t* dst, ptrdiff_t dstRowBytes, size_t count) {
  constexpr ptrdiff_t kRows = kTileBytes / kSize;
  for (; count != 0; --count, src += kRows * srcRowBytes, dst += kTileBytes) {
    // So many rows at once are more than the hardware follows.
    HWY_UNROLL(16)
    for (ptrdiff_t i = 0; i < kRows; ++i) __builtin_prefetch(src + i * srcRowBytes + kPrefetchBytes, 0, 2);
    Tile<T, kSize, kStream>(src, srcRowBytes, dst, dstRowBytes);
  }
}

#define VX_TILE(name, T, kSize, kStream)                                                                    \
  void name(const uint8_t* src, ptrdiff_t srcRowBytes, uint8_t* dst, ptrdiff_t dstRowBytes, size_t count) { \
    Tiles<T, kSize, kStream>(src, srcRowBytes, dst, dstRowBytes, count);                                    \
  }
VX_TILE(Tile1, uint8_t, 1, false)
VX_TILE(Tile2, uint16_t, 2, false)
VX_TILE(Tile4, uint32_t, 4, false)
VX_TILE(Tile8, uint64_t, 8, false)
VX_TILE(Tile16, uint64_t, 16, false)
VX_TILE(StreamTile1, uint8_t, 1, true)
VX_TILE(StreamTile2, uint16_t, 2, true)
VX_TILE(StreamTile4, uint32_t, 4, true)
VX_TILE(StreamTile8, uint64_t, 8, true)
VX_TILE(StreamTile16, uint64_t, 16, true)
#undef VX_TILE

// Reverses the elements of kSize bytes in a vector.
template <int kSize, class V>
HWY_INLINE V ReverseElements(V v) {
  const hn::DFromV<V> d;
  if constexpr (kSize == 4) {
    const hn::Repartition<uint32_t, decltype(d)> d32;
    return hn::BitCast(d, hn::Reverse(d32, hn::BitCast(d32, v)));
  } else {
    const hn::Repartition<uint64_t, decltype(d)> d64;
    const auto reversed = hn::Reverse(d64, hn::BitCast(d64, v));
    return hn::BitCast(d, kSize == 8 ? reversed : hn::Shuffle01(reversed));
  }
}

// Fills dst upward in blocks of a few lines. Processors that see the source go down do not fetch ahead by themselves.
template <int kSize, bool kStream>
HWY_INLINE void ReverseRow(const uint8_t* HWY_RESTRICT src, uint8_t* HWY_RESTRICT dst, size_t count) {
  const hn::ScalableTag<uint8_t> d;
  constexpr size_t kBlock = 4 * kTileBytes, kAhead = 1024;
  const uint8_t* end = src + count * kSize;
  const auto reverseSingly = [&](size_t n) HWY_ATTR {
    for (; n != 0; --n, dst += kSize) std::memcpy(dst, end -= kSize, kSize);
  };
  if (kStream) {
    const size_t head = -reinterpret_cast<uintptr_t>(dst) % kTileBytes / kSize;
    reverseSingly(head < count ? head : count);
  }
  for (; static_cast<size_t>(end - src) >= kBlock; dst += kBlock) {
    end -= kBlock;
    for (size_t i = 0; i < kBlock; i += kTileBytes)
      __builtin_prefetch(reinterpret_cast<const void*>(reinterpret_cast<uintptr_t>(end) - kAhead + i));
    HWY_UNROLL(16)
    for (size_t i = 0; i < kBlock; i += HWY_MAX_BYTES)
      StorePiece<kStream>(ReverseElements<kSize>(hn::LoadU(d, end + kBlock - HWY_MAX_BYTES - i)), dst + i);
  }
  reverseSingly(static_cast<size_t>(end - src) / kSize);
}

#define VX_REVERSE(name, kSize, kStream) \
  void name(const uint8_t* src, uint8_t* dst, size_t count) { ReverseRow<kSize, kStream>(src, dst, count); }
VX_REVERSE(Reverse4, 4, false)
VX_REVERSE(Reverse8, 8, false)
VX_REVERSE(Reverse16, 16, false)
VX_REVERSE(StreamReverse4, 4, true)
VX_REVERSE(StreamReverse8, 8, true)
VX_REVERSE(StreamReverse16, 16, true)
#undef VX_REVERSE

}  // namespace
}  // namespace HWY_NAMESPACE
}  // namespace vexel
HWY_AFTER_NAMESPACE();
#endif

#if HWY_ONCE
namespace vexel {
namespace plain {
namespace {

template <int kSize>
void Tile(const uint8_t* src, ptrdiff_t srcRowBytes, uint8_t* dst, ptrdiff_t dstRowBytes, size_t count) {
  constexpr int kColumns = kTileBytes / kSize;
  const auto rows = static_cast<ptrdiff_t>(kColumns * count);
  for (int x = 0; x < kColumns; ++x)
    for (ptrdiff_t y = 0; y < rows; ++y)
      std::memcpy(dst + x * dstRowBytes + y * kSize, src + y * srcRowBytes + x * kSize, kSize);
}
constexpr auto Tile1 = Tile<1>, Tile2 = Tile<2>, Tile4 = Tile<4>, Tile8 = Tile<8>, Tile16 = Tile<16>;
constexpr auto StreamTile1 = Tile1, StreamTile2 = Tile2, StreamTile4 = Tile4, StreamTile8 = Tile8,
               StreamTile16 = Tile16;

template <int kSize>
void Reverse(const uint8_t* src, uint8_t* dst, size_t count) {
  for (size_t i = 0; i < count; ++i) std::memcpy(dst + i * kSize, src + (count - 1 - i) * kSize, kSize);
}
constexpr auto Reverse4 = Reverse<4>, Reverse8 = Reverse<8>, Reverse16 = Reverse<16>;
constexpr auto StreamReverse4 = Reverse4, StreamReverse8 = Reverse8, StreamReverse16 = Reverse16;

}  // namespace
}  // namespace plain

#define VX_TILE_VARIANTS(name) \
  { plain::name, HWY_CHOOSE_SSSE3(name), HWY_CHOOSE_SSE4(name), HWY_CHOOSE_AVX2(name), HWY_CHOOSE_AVX3(name) }

const KernelVariants<TransposeTile> kTransposeTiles[5] = {VX_TILE_VARIANTS(Tile1), VX_TILE_VARIANTS(Tile2),
                                                          VX_TILE_VARIANTS(Tile4), VX_TILE_VARIANTS(Tile8),
                                                          VX_TILE_VARIANTS(Tile16)};
const KernelVariants<TransposeTile> kStreamTiles[5] = {VX_TILE_VARIANTS(StreamTile1), VX_TILE_VARIANTS(StreamTile2),
                                                       VX_TILE_VARIANTS(StreamTile4), VX_TILE_VARIANTS(StreamTile8),
                                                       VX_TILE_VARIANTS(StreamTile16)};
const KernelVariants<ReversePixels> kReversePixels[3] = {VX_TILE_VARIANTS(Reverse4), VX_TILE_VARIANTS(Reverse8),
                                                         VX_TILE_VARIANTS(Reverse16)};
const KernelVariants<ReversePixels> kStreamReversePixels[3] = {
    VX_TILE_VARIANTS(StreamReverse4), VX_TILE_VARIANTS(StreamReverse8), VX_TILE_VARIANTS(StreamReverse16)};

}  // namespace vexel
#endif
