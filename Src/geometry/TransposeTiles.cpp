#include "geometry/TransposeTiles.h"

#include <cstring>

#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "geometry/TransposeTiles.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

#include "frame/KernelTable.h"
#include "frame/StreamStore-inl.h"

#if HWY_TARGET != HWY_SCALAR
HWY_BEFORE_NAMESPACE();
namespace vexel {
namespace HWY_NAMESPACE {
namespace hn = hwy::HWY_NAMESPACE;
namespace {

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

// Transposes 16 bytes of each row of a tile into lines, one for each element.
template <class T, int kSize, bool kStream>
HWY_INLINE void ColumnLines(const uint8_t* src, ptrdiff_t srcRowBytes, uint8_t* dst, ptrdiff_t dstRowBytes) {
  const hn::ScalableTag<T> d;
  constexpr int n = 16 / kSize, kVectors = kTileBytes / HWY_MAX_BYTES, kVectorRows = HWY_MAX_BYTES / kSize;
  hn::VFromD<decltype(d)> lines[kVectors][n];
  HWY_UNROLL(4)
  for (int v = 0; v < kVectors; ++v) {
    HWY_UNROLL(16)
    for (int i = 0; i < n; ++i) lines[v][i] = LoadBlocks(d, src + (v * kVectorRows + i) * srcRowBytes, n * srcRowBytes);
    TransposeBlocks(lines[v]);
  }
  HWY_UNROLL(16)
  for (int i = 0; i < n; ++i) HWY_UNROLL(4)
  for (int v = 0; v < kVectors; ++v) StoreBytes<kStream>(lines[v][i], dst + i * dstRowBytes + v * HWY_MAX_BYTES);
}

// 16 bytes of each row of tiles that stand one below the other. Each destination row gets their lines in turn.
template <class T, int kSize, bool kStream>
HWY_INLINE void Column(const uint8_t* src, ptrdiff_t srcRowBytes, uint8_t* dst, ptrdiff_t dstRowBytes, size_t tiles) {
  for (size_t t = 0; t < tiles; ++t, src += kTileBytes / kSize * srcRowBytes)
    ColumnLines<T, kSize, kStream>(src, srcRowBytes, dst + t * kTileBytes, dstRowBytes);
}

// kColumns times 16 bytes of up to kTiles tiles.
template <class T, int kSize, bool kStream, int kColumns, size_t kTiles>
HWY_INLINE void Columns(const uint8_t* src, ptrdiff_t srcRowBytes, uint8_t* dst, ptrdiff_t dstRowBytes, size_t tiles) {
  constexpr int n = 16 / kSize;
  if constexpr (!kStream || kTileBytes == HWY_MAX_BYTES) {
    for (int x = 0; x < kColumns; ++x)
      Column<T, kSize, kStream>(src + 16 * x, srcRowBytes, dst + x * n * dstRowBytes, dstRowBytes, tiles);
  } else {
    // Too few registers to write whole lines.
    const hn::ScalableTag<uint8_t> d;
    constexpr ptrdiff_t kRun = kTiles * kTileBytes;
    alignas(64) uint8_t lines[kColumns * n * kRun];
    for (int x = 0; x < kColumns; ++x)
      Column<T, kSize, false>(src + 16 * x, srcRowBytes, lines + x * n * kRun, kRun, tiles);
    for (ptrdiff_t i = 0; i < kColumns * n; ++i)
      for (size_t v = 0; v < tiles * kTileBytes; v += HWY_MAX_BYTES)
        hn::Stream(hn::Load(d, lines + i * kRun + v), d, dst + i * dstRowBytes + v);
  }
}

#if HWY_TARGET == HWY_AVX3
// Exchanges rows and columns of 4 x 4 blocks of 16 bytes.
template <class V>
HWY_INLINE void ExchangeBlocks(V r0, V r1, V r2, V r3, V* HWY_RESTRICT columns, size_t step) {
  const auto even = [](V v, V w) HWY_ATTR { return V{_mm512_shuffle_i32x4(v.raw, w.raw, 0x88)}; };
  const auto odd = [](V v, V w) HWY_ATTR { return V{_mm512_shuffle_i32x4(v.raw, w.raw, 0xDD)}; };
  const V even01 = even(r0, r1), even23 = even(r2, r3), odd01 = odd(r0, r1), odd23 = odd(r2, r3);
  columns[0] = even(even01, even23);
  columns[step] = even(odd01, odd23);
  columns[2 * step] = odd(even01, even23);
  columns[3 * step] = odd(odd01, odd23);
}

// Reads and writes each line of a tile once, whatever places in the cache its rows share.
template <class T, int kSize, bool kStream>
HWY_INLINE void WholeLines(const uint8_t* src, ptrdiff_t srcRowBytes, uint8_t* dst, ptrdiff_t dstRowBytes) {
  const hn::ScalableTag<uint8_t> d8;
  const hn::ScalableTag<T> d;
  using V = hn::VFromD<decltype(d)>;
  constexpr int n = 16 / kSize;
  V rows[4][n], lines[4][n];
  HWY_UNROLL(4)
  for (int b = 0; b < 4; ++b) {
    HWY_UNROLL(4)
    for (int i = 0; i < n; ++i) rows[b][i] = hn::BitCast(d, hn::LoadU(d8, src + (b * n + i) * srcRowBytes));
    TransposeBlocks(rows[b]);
  }
  HWY_UNROLL(4)
  for (int i = 0; i < n; ++i) ExchangeBlocks(rows[0][i], rows[1][i], rows[2][i], rows[3][i], &lines[0][i], n);
  HWY_UNROLL(4)
  for (int b = 0; b < 4; ++b) HWY_UNROLL(4)
  for (int i = 0; i < n; ++i) StoreBytes<kStream>(lines[b][i], dst + (b * n + i) * dstRowBytes);
}

// The same for a tile that is more than the registers hold, by way of its blocks.
template <class T, int kSize, bool kStream, class Fetch>
HWY_INLINE void ThinTile(const uint8_t* src, ptrdiff_t srcRowBytes, uint8_t* dst, ptrdiff_t dstRowBytes,
                         const Fetch& fetch) {
  const hn::ScalableTag<uint8_t> d8;
  const hn::ScalableTag<T> d;
  using V = hn::VFromD<decltype(d)>;
  constexpr int n = 16 / kSize;
  alignas(64) uint8_t blocks[4][n][kTileBytes];
  for (auto& group : blocks) {
    fetch(n);
    V rows[n];
    HWY_UNROLL(16)
    for (int i = 0; i < n; ++i) rows[i] = hn::BitCast(d, hn::LoadU(d8, src + i * srcRowBytes));
    TransposeBlocks(rows);
    HWY_UNROLL(16)
    for (int i = 0; i < n; ++i) hn::Store(hn::BitCast(d8, rows[i]), d8, group[i]);
    src += n * srcRowBytes;
  }
  for (int i = 0; i < n; ++i, dst += dstRowBytes) {
    const auto load = [&](int group) HWY_ATTR { return hn::Load(d8, blocks[group][i]); };
    hn::VFromD<decltype(d8)> lines[4];
    ExchangeBlocks(load(0), load(1), load(2), load(3), lines, 1);
    HWY_UNROLL(4)
    for (int b = 0; b < 4; ++b) StoreBytes<kStream>(lines[b], dst + b * n * dstRowBytes);
  }
}
#endif

template <class T, int kSize, bool kStream>
HWY_INLINE void Tile(const uint8_t* src, ptrdiff_t srcRowBytes, uint8_t* dst, ptrdiff_t dstRowBytes) {
  constexpr int kColumns = kTileBytes / 16, n = 16 / kSize;
  if constexpr (kSize < 4) {
    Columns<T, kSize, kStream, kColumns, 1>(src, srcRowBytes, dst, dstRowBytes, 1);
  } else {
#if HWY_TARGET == HWY_AVX3
    WholeLines<T, kSize, kStream>(src, srcRowBytes, dst, dstRowBytes);
#else
    for (int c = 0; c < kColumns; ++c)
      ColumnLines<T, kSize, kStream>(src + 16 * c, srcRowBytes, dst + c * n * dstRowBytes, dstRowBytes);
#endif
  }
}

template <class T, int kSize, bool kStream, size_t kAhead>
HWY_INLINE void Strip(const uint8_t* src, ptrdiff_t srcRowBytes, uint8_t* dst, ptrdiff_t dstRowBytes, size_t down,
                      size_t across) {
  constexpr ptrdiff_t kRows = kTileBytes / kSize;
  const size_t rows = down * kRows;
  constexpr int kColumns = kTileBytes / 16, n = 16 / kSize;
  // Lines at such distances share few places in the cache: source lines are read once, and destination lines written
  // four in a row.
  constexpr int kGatherSize = HWY_TARGET == HWY_AVX3 ? 1 : 2;
  const bool gather = kSize <= kGatherSize && (srcRowBytes % (1024 * kSize) == 0 || dstRowBytes % (1024 * kSize) == 0);
  for (size_t x = 0; x < across; ++x, dst += kRows * dstRowBytes) {
    // So many rows at once are more than the hardware follows. With each tile, the lines of the next tiles are fetched
    // for some of the rows; after the last tile, those of the rows below.
    const size_t next = x / kAhead * kAhead + kAhead;
    const uint8_t* line = (next < across ? src + next * kTileBytes : src + static_cast<ptrdiff_t>(rows) * srcRowBytes) +
                          static_cast<ptrdiff_t>(x % kAhead * rows / kAhead) * srcRowBytes;
    const auto fetch = [&](size_t count) HWY_ATTR {
      for (size_t i = 0; i < count; i += kAhead, line += srcRowBytes)
        for (size_t k = 0; k < kAhead; ++k) __builtin_prefetch(line + k * kTileBytes);
    };
    const uint8_t* from = src + x * kTileBytes;
    if (gather) {
      const hn::ScalableTag<uint8_t> d;
      constexpr size_t kTiles = kStripTiles;
      alignas(64) uint8_t in[kTiles * kRows * kTileBytes];
      for (size_t i = 0; i < rows; ++i, from += srcRowBytes) {
        if (i % kAhead == 0) fetch(1);
        HWY_UNROLL(4)
        for (size_t v = 0; v < kTileBytes; v += HWY_MAX_BYTES)
          hn::Store(hn::LoadU(d, from + v), d, in + i * kTileBytes + v);
      }
      for (int c = 0; c < kColumns; ++c)
        Columns<T, kSize, kStream, 1, kTiles>(in + 16 * c, kTileBytes, dst + c * n * dstRowBytes, dstRowBytes, down);
      continue;
    }
    for (size_t t = 0; t < down; ++t, from += kRows * srcRowBytes) {
#if HWY_TARGET == HWY_AVX3
      if constexpr (kSize < 4) {
        ThinTile<T, kSize, kStream>(from, srcRowBytes, dst + t * kTileBytes, dstRowBytes, fetch);
        continue;
      }
#endif
      fetch(kRows);
      Tile<T, kSize, kStream>(from, srcRowBytes, dst + t * kTileBytes, dstRowBytes);
    }
  }
}

#define VX_TILE(name, T, kSize, kStream)                                                                 \
  void name(const uint8_t* src, ptrdiff_t srcRowBytes, uint8_t* dst, ptrdiff_t dstRowBytes, size_t down, \
            size_t across, size_t ahead) {                                                               \
    if (kSize < 4 && ahead == 8)                                                                         \
      Strip < T, kSize, kStream, kSize<4 ? 8 : 4>(src, srcRowBytes, dst, dstRowBytes, down, across);     \
    else                                                                                                 \
      Strip<T, kSize, kStream, 4>(src, srcRowBytes, dst, dstRowBytes, down, across);                     \
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
      StoreBytes<kStream>(ReverseElements<kSize>(hn::LoadU(d, end + kBlock - HWY_MAX_BYTES - i)), dst + i);
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
void Tile(const uint8_t* src, ptrdiff_t srcRowBytes, uint8_t* dst, ptrdiff_t dstRowBytes, size_t down, size_t across,
          size_t) {
  constexpr size_t kColumns = kTileBytes / kSize;
  const auto rows = static_cast<ptrdiff_t>(kColumns * down), columns = static_cast<ptrdiff_t>(kColumns * across);
  for (ptrdiff_t x = 0; x < columns; ++x)
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
