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

// A block of n x n lanes, n vectors of 16 bytes. Interleaving vector i with vector i + n/2 rotates the bits of an
// element's index (row, column) by one place; log2(n) rounds exchange row and column.
template <class T>
HWY_INLINE void TransposeBlock(const uint8_t* HWY_RESTRICT src, ptrdiff_t srcRowBytes, uint8_t* HWY_RESTRICT dst,
                               ptrdiff_t dstRowBytes) {
  const hn::Full128<T> d;
  constexpr int n = 16 / sizeof(T);
  hn::VFromD<decltype(d)> a[n], b[n];
  HWY_UNROLL(16)
  for (int i = 0; i < n; ++i) a[i] = hn::LoadU(d, reinterpret_cast<const T*>(src + i * srcRowBytes));
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
  HWY_UNROLL(16)
  for (int i = 0; i < n; ++i) hn::StoreU(a[i], d, reinterpret_cast<T*>(dst + i * dstRowBytes));
}

// Goes down the columns of blocks, so that each destination row piece is finished before the next.
template <class T>
HWY_INLINE void Tile(const uint8_t* src, ptrdiff_t srcRowBytes, uint8_t* dst, ptrdiff_t dstRowBytes) {
  constexpr int n = 16 / sizeof(T);
  constexpr int blocks = kTileBytes / 16;
  for (int x = 0; x < blocks; ++x)
    for (int y = 0; y < blocks; ++y)
      TransposeBlock<T>(src + y * n * srcRowBytes + x * 16, srcRowBytes, dst + x * n * dstRowBytes + y * 16,
                        dstRowBytes);
}

void Tile1(const uint8_t* src, ptrdiff_t srcRowBytes, uint8_t* dst, ptrdiff_t dstRowBytes) {
  Tile<uint8_t>(src, srcRowBytes, dst, dstRowBytes);
}
void Tile2(const uint8_t* src, ptrdiff_t srcRowBytes, uint8_t* dst, ptrdiff_t dstRowBytes) {
  Tile<uint16_t>(src, srcRowBytes, dst, dstRowBytes);
}
void Tile4(const uint8_t* src, ptrdiff_t srcRowBytes, uint8_t* dst, ptrdiff_t dstRowBytes) {
  Tile<uint32_t>(src, srcRowBytes, dst, dstRowBytes);
}
void Tile8(const uint8_t* src, ptrdiff_t srcRowBytes, uint8_t* dst, ptrdiff_t dstRowBytes) {
  Tile<uint64_t>(src, srcRowBytes, dst, dstRowBytes);
}
void Tile16(const uint8_t* src, ptrdiff_t srcRowBytes, uint8_t* dst, ptrdiff_t dstRowBytes) {
  const hn::Full128<uint8_t> d;
  for (int x = 0; x < kTileBytes / 16; ++x)
    for (int y = 0; y < kTileBytes / 16; ++y)
      hn::StoreU(hn::LoadU(d, src + y * srcRowBytes + x * 16), d, dst + x * dstRowBytes + y * 16);
}

template <class T>
HWY_INLINE void ReverseLanes(const uint8_t* HWY_RESTRICT src, uint8_t* HWY_RESTRICT dst, size_t count) {
  const hn::ScalableTag<T> d;
  const size_t lanes = hn::Lanes(d);
  const T* from = reinterpret_cast<const T*>(src);
  T* to = reinterpret_cast<T*>(dst);
  size_t i = 0;
  for (; i + lanes <= count; i += lanes) hn::StoreU(hn::Reverse(d, hn::LoadU(d, from + count - i - lanes)), d, to + i);
  for (; i < count; ++i) std::memcpy(to + i, from + count - 1 - i, sizeof(T));
}

void Reverse4(const uint8_t* src, uint8_t* dst, size_t count) { ReverseLanes<uint32_t>(src, dst, count); }
void Reverse8(const uint8_t* src, uint8_t* dst, size_t count) { ReverseLanes<uint64_t>(src, dst, count); }
void Reverse16(const uint8_t* src, uint8_t* dst, size_t count) {
  const hn::Full128<uint8_t> d;
  for (size_t i = 0; i < count; ++i) hn::StoreU(hn::LoadU(d, src + 16 * (count - 1 - i)), d, dst + 16 * i);
}

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
void Tile(const uint8_t* src, ptrdiff_t srcRowBytes, uint8_t* dst, ptrdiff_t dstRowBytes) {
  for (int x = 0; x < kTileBytes / kSize; ++x)
    for (int y = 0; y < kTileBytes / kSize; ++y)
      std::memcpy(dst + x * dstRowBytes + y * kSize, src + y * srcRowBytes + x * kSize, kSize);
}
constexpr auto Tile1 = Tile<1>, Tile2 = Tile<2>, Tile4 = Tile<4>, Tile8 = Tile<8>, Tile16 = Tile<16>;

template <int kSize>
void Reverse(const uint8_t* src, uint8_t* dst, size_t count) {
  for (size_t i = 0; i < count; ++i) std::memcpy(dst + i * kSize, src + (count - 1 - i) * kSize, kSize);
}
constexpr auto Reverse4 = Reverse<4>, Reverse8 = Reverse<8>, Reverse16 = Reverse<16>;

}  // namespace
}  // namespace plain

#define VX_TILE_VARIANTS(name) \
  { plain::name, HWY_CHOOSE_SSSE3(name), HWY_CHOOSE_SSE4(name), HWY_CHOOSE_AVX2(name), HWY_CHOOSE_AVX3(name) }

const KernelVariants<TransposeTile> kTransposeTiles[5] = {VX_TILE_VARIANTS(Tile1), VX_TILE_VARIANTS(Tile2),
                                                          VX_TILE_VARIANTS(Tile4), VX_TILE_VARIANTS(Tile8),
                                                          VX_TILE_VARIANTS(Tile16)};
const KernelVariants<ReversePixels> kReversePixels[3] = {VX_TILE_VARIANTS(Reverse4), VX_TILE_VARIANTS(Reverse8),
                                                         VX_TILE_VARIANTS(Reverse16)};

}  // namespace vexel
#endif
