#include "geometry/Transpose.h"

#include <algorithm>
#include <array>
#include <bit>
#include <cstring>
#include <utility>

#include "formats/FormatBits.h"
#include "frame/StreamCopy.h"
#include "geometry/TransposeTiles.h"
#include "vexel/vexel.h"

namespace vexel {
namespace {

// Columns per panel: their destination rows, each in a page of its own, stay within reach of the TLB.
constexpr int32_t kPanelColumns = 2048;
constexpr int32_t kPlainTile = 16;
constexpr int64_t kStreamFrom = 1 << 20;

struct Job {
  const uint8_t* src;
  ptrdiff_t srcRowBytes;
  uint8_t* dst;
  ptrdiff_t dstRowBytes;
  int32_t width, height;
};

// The rectangle of source elements [x0, x1) x [y0, y1), one element at a time.
template <int kSize>
void TransposeSmall(const Job& job, int32_t x0, int32_t x1, int32_t y0, int32_t y1) {
  for (int32_t x = x0; x < x1; ++x) {
    uint8_t* to = job.dst + x * job.dstRowBytes;
    const uint8_t* from = job.src + static_cast<ptrdiff_t>(x) * kSize;
    for (int32_t y = y0; y < y1; ++y)
      std::memcpy(to + static_cast<ptrdiff_t>(y) * kSize, from + y * job.srcRowBytes, kSize);
  }
}

using SmallFunction = void (*)(const Job&, int32_t, int32_t, int32_t, int32_t);

// Powers of two go by vector tiles.
template <int kSize>
constexpr SmallFunction Small() {
  if constexpr (std::has_single_bit(static_cast<unsigned>(kSize)))
    return nullptr;
  else
    return &TransposeSmall<kSize>;
}

template <int... kSizes>
constexpr auto SmallTable(std::integer_sequence<int, kSizes...>) {
  return std::array<SmallFunction, sizeof...(kSizes)>{Small<kSizes + 1>()...};
}
constexpr auto kSmall = SmallTable(std::make_integer_sequence<int, 16>{});

void TransposeBySmallTiles(const Job& job, int elementSize) {
  const SmallFunction small = kSmall[elementSize - 1];
  for (int32_t y = 0; y < job.height; y += kPlainTile)
    for (int32_t x = 0; x < job.width; x += kPlainTile)
      small(job, x, std::min(x + kPlainTile, job.width), y, std::min(y + kPlainTile, job.height));
}

// Scattered lines that miss the second-level cache would be read before they are written, so from about that size on
// they are streamed; that takes rows that can all be cut at whole lines.
bool CanStream(const Job& job, int elementSize) {
  const int64_t bytes = static_cast<int64_t>(job.width) * job.height * elementSize;
  return bytes >= kStreamFrom && job.dstRowBytes % kTileBytes == 0 &&
         reinterpret_cast<uintptr_t>(job.dst) % static_cast<unsigned>(elementSize) == 0;
}

// Whether a frame passed through once would push itself out of the cache.
bool IsLarge(const Job& job, int elementSize) {
  const size_t bytes = static_cast<size_t>(job.width) * elementSize * job.height;
  return VX_GetCacheSize() != 0 && bytes >= VX_GetCacheSize() / 2;
}

// Up to a tile of elements from (x, y) on, moved in a copy.
void TransposeEdge(const Job& job, int elementSize, TransposeTile transpose, int32_t x, int32_t y, int32_t columns,
                   int32_t rows) {
  alignas(kTileBytes) uint8_t in[kTileBytes * kTileBytes], out[kTileBytes * kTileBytes];
  const uint8_t* from = job.src + y * job.srcRowBytes + static_cast<ptrdiff_t>(x) * elementSize;
  uint8_t* to = job.dst + x * job.dstRowBytes + static_cast<ptrdiff_t>(y) * elementSize;
  for (int32_t i = 0; i < rows; ++i)
    std::memcpy(in + i * kTileBytes, from + i * job.srcRowBytes, static_cast<size_t>(columns) * elementSize);
  transpose(in, kTileBytes, out, kTileBytes, 1, 1, 4);
  for (int32_t i = 0; i < columns; ++i)
    std::memcpy(to + i * job.dstRowBytes, out + i * kTileBytes, static_cast<size_t>(rows) * elementSize);
}

void TransposeByTiles(const Job& job, int elementSize, KernelVariant variant) {
  const int sizeLog = std::countr_zero(static_cast<unsigned>(elementSize));
  const int32_t tile = kTileBytes >> sizeLog;
  const bool stream = CanStream(job, elementSize);
  // Memory gives longer runs of a row sooner; small elements have the most rows side by side.
  const size_t ahead = elementSize < 4 && IsLarge(job, elementSize) ? 8 : 4;
  const TransposeTile stored = kTransposeTiles[sizeLog][variant];
  const TransposeTile transpose = stream ? kStreamTiles[sizeLog][variant] : stored;
  // When streaming, the first source rows bring the destination columns to a line's start.
  const auto misalignment = static_cast<int32_t>(reinterpret_cast<uintptr_t>(job.dst) % kTileBytes);
  const int32_t top = stream && misalignment ? std::min((kTileBytes - misalignment) >> sizeLog, job.height) : 0;
  const int32_t bottom = top + (job.height - top) / tile * tile;
  const int32_t block = tile * static_cast<int32_t>(kStripTiles);
  const auto edge = [&](int32_t x, int32_t columns, int32_t y, int32_t rows) {
    if (columns > 0 && rows > 0) TransposeEdge(job, elementSize, stored, x, y, columns, rows);
  };

  for (int32_t panel = 0; panel < job.width; panel += kPanelColumns) {
    const int32_t panelEnd = std::min(panel + kPanelColumns, job.width);
    const int32_t right = panel + (panelEnd - panel) / tile * tile;
    for (int32_t x = panel; x < panelEnd; x += tile) edge(x, std::min(tile, panelEnd - x), 0, top);
    for (int32_t y0 = top; y0 < bottom; y0 += block) {
      const int32_t y1 = std::min(y0 + block, bottom);
      transpose(job.src + y0 * job.srcRowBytes + (static_cast<ptrdiff_t>(panel) << sizeLog), job.srcRowBytes,
                job.dst + panel * job.dstRowBytes + (static_cast<ptrdiff_t>(y0) << sizeLog), job.dstRowBytes,
                static_cast<size_t>((y1 - y0) / tile), static_cast<size_t>((right - panel) / tile), ahead);
      for (int32_t y = y0; y < y1; y += tile) edge(right, panelEnd - right, y, tile);
    }
    for (int32_t x = panel; x < panelEnd; x += tile) edge(x, std::min(tile, panelEnd - x), bottom, job.height - bottom);
  }
  if (stream) StreamFence();
}

// What rotation needs to know of a pixel: its size, 0 for formats that do not have four whole channels.
int RotationPixelBytes(VX_PixelFormat format) noexcept {
  if (Layout(format) != kLayout4444 || AlphaKind(format) == kAlphaNone) return 0;
  switch (Depth(format)) {
    case kDepth8u:
      return 4;
    case kDepth10u:
      return IsYuv(format) ? 0 : 4;
    case kDepth15u:
      return 8;
    case kDepth32f:
      return 16;
    default:
      return 0;
  }
}

void CopyRows(const Job& job, int pixelBytes, KernelVariant variant) {
  const size_t rowBytes = static_cast<size_t>(job.width) * pixelBytes;
  const bool stream = IsLarge(job, pixelBytes);
  for (int32_t y = 0; y < job.height; ++y) {
    if (stream)
      StreamCopy(job.dst + y * job.dstRowBytes, job.src + y * job.srcRowBytes, rowBytes, variant);
    else
      std::memcpy(job.dst + y * job.dstRowBytes, job.src + y * job.srcRowBytes, rowBytes);
  }
  if (stream) StreamFence();
}

// Rows in reverse order, each reversed.
void HalfTurn(const Job& job, int pixelBytes, KernelVariant variant) {
  const bool isAligned =
      (reinterpret_cast<uintptr_t>(job.dst) | static_cast<uintptr_t>(job.dstRowBytes)) % pixelBytes == 0;
  const bool stream = isAligned && IsLarge(job, pixelBytes);
  const auto& kernels = stream ? kStreamReversePixels : kReversePixels;
  const ReversePixels reverse = kernels[std::countr_zero(static_cast<unsigned>(pixelBytes)) - 2][variant];
  for (int32_t y = 0; y < job.height; ++y)
    reverse(job.src + y * job.srcRowBytes, job.dst + (job.height - 1 - y) * job.dstRowBytes,
            static_cast<size_t>(job.width));
  if (stream) StreamFence();
}

}  // namespace

void TransposeElements(const uint8_t* src, ptrdiff_t srcRowBytes, uint8_t* dst, ptrdiff_t dstRowBytes, int32_t width,
                       int32_t height, int elementSize, KernelVariant variant) noexcept {
  if (width < 1 || height < 1) return;
  const Job job{src, srcRowBytes, dst, dstRowBytes, width, height};
  if (std::has_single_bit(static_cast<unsigned>(elementSize)))
    TransposeByTiles(job, elementSize, variant);
  else
    TransposeBySmallTiles(job, elementSize);
}

}  // namespace vexel

using namespace vexel;

VX_Result VX_Transpose(const void* src, int32_t srcRowBytes, void* dst, int32_t dstRowBytes, int32_t width,
                       int32_t height, uint8_t elementSize) noexcept {
  if (elementSize < 1 || elementSize > 16) return VX_ErrUnsupportedFormat;
  // Strides count whole elements.
  const ptrdiff_t srcStride = srcRowBytes / elementSize * elementSize;
  const ptrdiff_t dstStride = dstRowBytes / elementSize * elementSize;
  TransposeElements(static_cast<const uint8_t*>(src), srcStride, static_cast<uint8_t*>(dst), dstStride, width, height,
                    elementSize, ActiveKernelVariant());
  return VX_Success;
}

VX_Result VX_RotateImageAndFlip(const void* src, int32_t srcRowBytes, void* dst, int32_t dstRowBytes, int32_t width,
                                int32_t height, VX_PixelFormat format, int32_t angle, bool flip) noexcept {
  const int pixelBytes = RotationPixelBytes(format);
  if (pixelBytes == 0) return VX_ErrUnsupportedFormat;
  if (angle % 90 != 0 || angle < -270 || angle > 270) return VX_ErrFormatNotHandled;
  if (width < 1 || height < 1) return VX_Success;

  const KernelVariant variant = ActiveKernelVariant();
  Job job{static_cast<const uint8_t*>(src), srcRowBytes, static_cast<uint8_t*>(dst), dstRowBytes, width, height};
  const auto flipSource = [&] {
    job.src += (height - 1) * job.srcRowBytes;
    job.srcRowBytes = -job.srcRowBytes;
  };
  if (flip) flipSource();
  switch ((angle + 360) % 360) {
    case 0:
      CopyRows(job, pixelBytes, variant);
      break;
    case 180:
      HalfTurn(job, pixelBytes, variant);
      break;
    case 90:  // the transpose, its rows in reverse order
      TransposeElements(job.src, job.srcRowBytes, job.dst + (width - 1) * job.dstRowBytes, -job.dstRowBytes, width,
                        height, pixelBytes, variant);
      break;
    default:  // 270: the transpose of the source upside down
      flipSource();
      TransposeElements(job.src, job.srcRowBytes, job.dst, job.dstRowBytes, width, height, pixelBytes, variant);
  }
  return VX_Success;
}
