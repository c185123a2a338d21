// Plane layouts and plane copies of 4:2:0 pictures.
#include "convert/Planar420.h"

#include <algorithm>
#include <cstdlib>

namespace vexel {
namespace {

constexpr int64_t RoundUp(int64_t value, int64_t multiple) noexcept { return (value + multiple - 1) & -multiple; }

struct Layout420 {
  int64_t rowBytes[3];
  uint64_t offset[3];  // modulo 2^64: heights may be negative
  int planes;
};

Layout420 LayoutOf(VX_PixelFormat format, int64_t width, int64_t height) noexcept {
  const bool wide = HasWideSamples(format), biplanar = IsBiplanar(format);
  const int64_t luma = RoundUp(wide ? 2 * width : width, 128);
  const int64_t chroma = wide ? luma : RoundUp(width / 2, 128);
  const int64_t rows = biplanar ? height : RoundUp(height, 32);
  const uint64_t first = static_cast<uint64_t>(rows) * static_cast<uint64_t>(luma);
  const uint64_t second = first + static_cast<uint64_t>(rows / 2 * chroma);
  return {{luma, biplanar ? luma : chroma, chroma}, {0, first, second}, biplanar ? 2 : 3};
}

void CopyRows(const void* src, ptrdiff_t srcRowBytes, void* dst, ptrdiff_t dstRowBytes, int64_t rows,
              int64_t bytes) noexcept {
  const auto* from = static_cast<const uint8_t*>(src);
  auto* to = static_cast<uint8_t*>(dst);
  if (bytes < 1) return;
  for (int64_t row = 0; row < rows; ++row)
    VX_CopyMemory(to + row * dstRowBytes, from + row * srcRowBytes, static_cast<size_t>(bytes));
}

// A plane of rows x bytes; rows that lie without gaps on both sides go as one piece of `whole` bytes.
void CopyPlane(const void* src, int32_t srcRowBytes, void* dst, int32_t dstRowBytes, int32_t rows, int32_t bytes,
               int64_t whole) noexcept {
  if (bytes == srcRowBytes && bytes == dstRowBytes)
    CopyRows(src, 0, dst, 0, 1, whole);
  else
    CopyRows(src, srcRowBytes, dst, dstRowBytes, rows, bytes);
}

// As integers: callers ask for the offsets of a null block too.
uint8_t* Plane(const void* base, uint64_t offset) {
  return reinterpret_cast<uint8_t*>(reinterpret_cast<uintptr_t>(base) + static_cast<uintptr_t>(offset));
}

}  // namespace

Picture420 PictureFromBlock(const void* block, VX_PixelFormat format, int32_t width, int32_t height) noexcept {
  const Layout420 layout = LayoutOf(format, width, height);
  Picture420 picture{{}, {}, width, height, format};
  for (int i = 0; i < 3; ++i) {
    picture.planes[i] = i < layout.planes ? Plane(block, layout.offset[i]) : nullptr;
    picture.rowBytes[i] = layout.rowBytes[i];
  }
  return picture;
}

int32_t ChromaWidth(const Picture420& picture) noexcept {
  const int64_t sampleBytes = (HasWideSamples(picture.format) ? 2 : 1) * (IsBiplanar(picture.format) ? 2 : 1);
  int64_t room = std::abs(int64_t{picture.rowBytes[1]});
  if (!IsBiplanar(picture.format)) room = std::min(room, std::abs(int64_t{picture.rowBytes[2]}));
  return static_cast<int32_t>(std::min<int64_t>(picture.width / 2 + picture.width % 2, room / sampleBytes));
}

void CopyField420(const void* src, VX_PixelFormat format, int32_t width, int32_t height, int32_t field,
                  void* dst) noexcept {
  const Layout420 from = LayoutOf(format, width, height), to = LayoutOf(format, width, height / 2);
  const int sampleBytes = HasWideSamples(format) ? 2 : 1;
  const int64_t samples = IsBiplanar(format) ? width / 2 * 2 : width / 2;
  for (int i = 0; i < from.planes; ++i) {
    const auto* source = static_cast<const uint8_t*>(src) + from.offset[i];
    if (i == 0 && field == 2) source += from.rowBytes[0];
    CopyRows(source, 2 * from.rowBytes[i], static_cast<uint8_t*>(dst) + to.offset[i], to.rowBytes[i],
             i == 0 ? height / 2 : height / 2 / 2, (i == 0 ? width : samples) * sampleBytes);
  }
}

}  // namespace vexel

using namespace vexel;

VX_Result VX_GetPlanarBuffers(void* base, VX_PixelFormat format, int32_t width, int32_t height, void* planes[3],
                              int32_t rowBytes[3]) noexcept {
  const Layout420 layout = LayoutOf(format, width, height);
  for (int i = 0; i < 3; ++i) {
    planes[i] = i < layout.planes ? Plane(base, layout.offset[i]) : nullptr;
    rowBytes[i] = static_cast<int32_t>(layout.rowBytes[i]);
  }
  return VX_Success;
}

VX_Result VX_GetBiPlanarBuffers(void* base, VX_PixelFormat, int32_t width, int32_t height, void* planes[2],
                                int32_t rowBytes[2]) noexcept {
  const int64_t pitch = RoundUp(width, 128);
  planes[0] = base;
  planes[1] = Plane(base, static_cast<uint64_t>(height * pitch));
  rowBytes[0] = rowBytes[1] = static_cast<int32_t>(pitch);
  return VX_Success;
}

VX_Result VX_CopyPlanar_8u(const void* const srcPlanes[3], const int32_t srcRowBytes[3], void* const dstPlanes[3],
                           const int32_t dstRowBytes[3], int32_t width, int32_t height) noexcept {
  const int64_t area = int64_t{width} * height;
  CopyPlane(srcPlanes[0], srcRowBytes[0], dstPlanes[0], dstRowBytes[0], height, width, area);
  for (int i = 1; i < 3; ++i)
    CopyPlane(srcPlanes[i], srcRowBytes[i], dstPlanes[i], dstRowBytes[i], height / 2, width / 2, area / 4);
  return VX_Success;
}

VX_Result VX_CopyBiPlanar_8u(const void* const srcPlanes[2], const int32_t srcRowBytes[2], void* const dstPlanes[2],
                             const int32_t dstRowBytes[2], int32_t width, int32_t height) noexcept {
  const int64_t area = int64_t{width} * height;
  CopyPlane(srcPlanes[0], srcRowBytes[0], dstPlanes[0], dstRowBytes[0], height, width, area);
  CopyPlane(srcPlanes[1], srcRowBytes[1], dstPlanes[1], dstRowBytes[1], height / 2, width, area / 2);
  return VX_Success;
}
