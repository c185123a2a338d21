// Pixel buffers in library-padded rows, and what addresses whole rows of them.
#include "formats/FormatBits.h"
#include "frame/Scratch.h"
#include "frame/SeededBug.h"

namespace vexel {
namespace {

// A size that a buffer cannot have: negative, or a raster of more bytes than its 32-bit description can express.
bool IsInexpressible(VX_PixelFormat format, int32_t width, int32_t height, int64_t size) noexcept {
  if (IsSpecial(format)) return size < 0 || ((width < 0 || height < 0) && size != 0 && FrameKind(format) > 8);
  const int64_t rowBytes = PaddedRowBytes(format, width);
  if (rowBytes == 0 || height == 0) return false;
  return rowBytes < 0 || height < 0 || rowBytes > INT32_MAX / height;
}

VX_Result AllocatePixels(VX_PixelFormat format, int32_t width, int32_t height, void** rawBlock, void** pixels,
                         int32_t* rowBytes, size_t* rawSize) noexcept {
  const int64_t size = VX_PixelFormatSize(format, width, height);
  *rowBytes = IsSpecial(format) ? 0 : static_cast<int32_t>(VX_PixelFormatSize(format, width, 1));
  *rawBlock = nullptr;
  *pixels = nullptr;
  *rawSize = 0;
  if (!IsInexpressible(format, width, height, size)) {
    if (size == 0) return VX_Success;
    *pixels = VX_AllocateTransientMemoryBlock(static_cast<size_t>(size), rawBlock, rawSize);
    if (*pixels) return VX_Success;
  }
  *rawBlock = nullptr;
  if (!Has(SeededBug::FailureKeepsValue)) *rowBytes = 0;
  *rawSize = 0;
  return VX_ErrOutOfMemory;
}

// Bytes between neighbouring pixels that have an address of their own; 0 if they have none.
int64_t AddressablePixelBytes(VX_PixelFormat format) noexcept {
  if (Layout(format) != kLayout4444 || AlphaKind(format) == kAlphaNone) return 0;
  return UnpaddedRowBytes(format, 1);
}

}  // namespace
}  // namespace vexel

extern "C" {

VX_Result VX_AllocatePixelBuffer(VX_PixelFormat format, int32_t width, int32_t height, void** rawBlock, void** pixels,
                                 int32_t* rowBytes, size_t* rawSize) noexcept {
  return vexel::AllocatePixels(format, width, height, rawBlock, pixels, rowBytes, rawSize);
}

VX_Result VX_FreePixelBuffer(VX_PixelFormat, void* rawBlock, size_t rawSize) noexcept {
  VX_FreeTransientMemoryBlock(rawBlock, rawSize);
  return VX_Success;
}

VX_Result VX_AllocateTransientPixelBuffer(VX_PixelFormat format, int32_t width, int32_t height, void** rawBlock,
                                          void** pixels, int32_t* rowBytes, size_t* rawSize) noexcept {
  return vexel::AllocatePixels(format, width, height, rawBlock, pixels, rowBytes, rawSize);
}

VX_Result VX_FreeTransientPixelBuffer(VX_PixelFormat format, void* rawBlock, size_t rawSize) noexcept {
  return VX_FreePixelBuffer(format, rawBlock, rawSize);
}

VX_Result VX_FlipInPlace(void* base, int32_t rowBytes, int32_t width, int32_t height, VX_PixelFormat format) noexcept {
  const int64_t pixelBytes = vexel::UnpaddedRowBytes(format, width);
  if (height < 2 || pixelBytes <= 0) return VX_Success;
  const auto n = Has(vexel::SeededBug::FlipMovesPadding) ? static_cast<size_t>(vexel::PaddedRowBytes(format, width))
                                                         : static_cast<size_t>(pixelBytes);
  VX_SCRATCH(scratch, n);
  if (!scratch) return VX_ErrOutOfMemory;
  auto* const first = static_cast<uint8_t*>(base);
  for (int32_t row = 0; row < height / 2; ++row) {
    uint8_t* const upper = first + ptrdiff_t{row} * rowBytes;
    uint8_t* const lower = first + ptrdiff_t{height - 1 - row} * rowBytes;
    VX_CopyMemory(scratch.get(), upper, n);
    VX_CopyMemory(upper, lower, n);
    VX_CopyMemory(lower, scratch.get(), n);
  }
  return VX_Success;
}

VX_Result VX_ClipBufferToRect(void* base, int32_t rowBytes, VX_PixelFormat format, int32_t x, int32_t y,
                              void** pixel) noexcept {
  const int64_t pixelBytes = vexel::AddressablePixelBytes(format);
  if (pixelBytes == 0) return VX_ErrUnsupportedFormat;
  *pixel = static_cast<uint8_t*>(base) + ptrdiff_t{y} * rowBytes + x * pixelBytes;
  return VX_Success;
}

}  // extern "C"
