// A frame in a library buffer.
#pragma once

#include <cstddef>

#include "vexel/vexel.h"

namespace tool {

// One plane of a 4:2:0 picture: `width` bytes in each of `height` rows.
struct Plane {
  std::byte* base = nullptr;
  ptrdiff_t rowBytes = 0;
  size_t width = 0;
  int height = 0;

  std::byte* Row(int y) const { return base + y * rowBytes; }
};

// Movable owner of one buffer from VX_AllocatePixelBuffer.
class Picture {
 public:
  Picture() = default;
  // Throws ToolError for sizes below 1, sizes the library refuses and when out of memory.
  Picture(VX_PixelFormat format, int width, int height);
  ~Picture();
  Picture(Picture&& other) noexcept;
  Picture& operator=(Picture&& other) noexcept;

  explicit operator bool() const { return mPixels != nullptr; }
  VX_PixelFormat Format() const { return mFormat; }
  int Width() const { return mWidth; }
  int Height() const { return mHeight; }
  int RowBytes() const { return mRowBytes; }
  std::byte* Pixels() const { return mPixels; }
  // Bytes of the whole buffer, padding included.
  size_t Size() const { return mSize; }

  // Row y counted from the top of the picture, whichever row of a raster is stored first.
  std::byte* Row(int y) const { return mPixels + static_cast<ptrdiff_t>(StoredRow(y)) * mRowBytes; }
  int StoredRow(int y) const { return mBottomUp ? mHeight - 1 - y : y; }
  bool IsBottomUp() const { return mBottomUp; }

  // The planes of a 4:2:0 picture: Y, U, V or Y, interleaved chroma (PlaneCount() of them).
  int PlaneCount() const;
  Plane PlaneAt(int index) const;

 private:
  void Swap(Picture& other) noexcept;

  VX_PixelFormat mFormat{};
  int mWidth = 0;
  int mHeight = 0;
  int mRowBytes = 0;
  bool mBottomUp = false;
  std::byte* mPixels = nullptr;
  size_t mSize = 0;
  void* mRawBlock = nullptr;
  size_t mRawSize = 0;
};

}  // namespace tool
