#include "picture.h"

#include <utility>

#include "format_catalogue.h"
#include "tool_error.h"

namespace tool {

Picture::Picture(VX_PixelFormat format, int width, int height) : mFormat(format), mWidth(width), mHeight(height) {
  const auto refuse = [&](const char* why) {
    throw ToolError("cannot hold a " + std::to_string(width) + "x" + std::to_string(height) + " " + FormatName(format) +
                    " picture: " + why);
  };
  if (width < 1 || height < 1) refuse("it is empty");
  void* pixels = nullptr;
  const VX_Result result = VX_AllocatePixelBuffer(format, width, height, &mRawBlock, &pixels, &mRowBytes, &mRawSize);
  if (result != VX_Success) refuse(VX_ResultName(result));
  if (!pixels) refuse("the format has no size");
  mPixels = static_cast<std::byte*>(pixels);
  mSize = static_cast<size_t>(VX_PixelFormatSize(format, width, height));
  mBottomUp = VX_IsOriginBottomLeft(format);
}

Picture::~Picture() { VX_FreePixelBuffer(mFormat, mRawBlock, mRawSize); }

Picture::Picture(Picture&& other) noexcept { Swap(other); }

Picture& Picture::operator=(Picture&& other) noexcept {
  Picture taken(std::move(other));
  Swap(taken);
  return *this;
}

void Picture::Swap(Picture& other) noexcept {
  std::swap(mFormat, other.mFormat);
  std::swap(mWidth, other.mWidth);
  std::swap(mHeight, other.mHeight);
  std::swap(mRowBytes, other.mRowBytes);
  std::swap(mBottomUp, other.mBottomUp);
  std::swap(mPixels, other.mPixels);
  std::swap(mSize, other.mSize);
  std::swap(mRawBlock, other.mRawBlock);
  std::swap(mRawSize, other.mRawSize);
}

int Picture::PlaneCount() const { return IsBiplanar420(mFormat) ? 2 : 3; }

Plane Picture::PlaneAt(int index) const {
  void* planes[3] = {};
  int32_t rowBytes[3] = {};
  const bool eightBitBiplanar = IsBiplanar420(mFormat) && Is8Bit(mFormat);
  if (eightBitBiplanar)
    VX_GetBiPlanarBuffers(mPixels, mFormat, mWidth, mHeight, planes, rowBytes);
  else
    VX_GetPlanarBuffers(mPixels, mFormat, mWidth, mHeight, planes, rowBytes);
  const size_t sampleBytes = Is8Bit(mFormat) ? 1 : 2;
  const size_t chromaColumns = (static_cast<size_t>(mWidth) + 1) / 2;
  Plane plane{static_cast<std::byte*>(planes[index]), rowBytes[index], 0, (mHeight + 1) / 2};
  if (index == 0) {
    plane.width = static_cast<size_t>(mWidth) * sampleBytes;
    plane.height = mHeight;
  } else {
    plane.width = chromaColumns * sampleBytes * (IsBiplanar420(mFormat) ? 2 : 1);
  }
  // An odd width one past a full row has no room for its last chroma column.
  if (plane.width > static_cast<size_t>(plane.rowBytes)) plane.width = static_cast<size_t>(plane.rowBytes);
  return plane;
}

}  // namespace tool
