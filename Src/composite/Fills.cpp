// Constant fills of whole buffers.
#include <cstdint>
#include <cstring>

#include "composite/DvBlackFrames.h"
#include "composite/FillValues.h"
#include "convert/Planar420.h"
#include "formats/FormatBits.h"
#include "frame/ImagePrimitives.h"
#include "vexel/compositing.h"

namespace vexel {
namespace {

struct Raster {
  void* base;
  int32_t rowBytes, width, height;
};

// What every fill asks once the format is accepted. Success with *done set means that nothing is to be done.
VX_Result CheckBuffer(const void* base, int64_t bytesPerRow, int32_t width, int32_t height, bool* done) noexcept {
  *done = false;
  if (width < 0 || height < 0) return VX_ErrArgumentOutOfRange;
  *done = width == 0 || height == 0;
  if (*done) return VX_Success;
  if (bytesPerRow > INT32_MAX) return VX_ErrArgumentOutOfRange;
  return base ? VX_Success : VX_ErrNullDestination;
}

VX_Result ResultOf(primitives::Status status) noexcept {
  if (status == primitives::Status::Step) return VX_ErrArgumentOutOfRange;
  return status == primitives::Status::Ok ? VX_Success : VX_ErrFailed;
}

template <class T>
primitives::Status FillUnits(const Raster& raster, const FillUnit& unit, int32_t units) noexcept {
  T channels[4];
  std::memcpy(channels, unit.bytes, sizeof channels);
  return primitives::Fill4(channels, static_cast<T*>(raster.base), raster.rowBytes, units, raster.height);
}

VX_Result FillRaster(const Raster& raster, const FillUnit& unit) noexcept {
  const int64_t units = (int64_t{raster.width} + unit.pixels - 1) / unit.pixels;
  bool done;
  const VX_Result check = CheckBuffer(raster.base, units * unit.size, raster.width, raster.height, &done);
  if (check != VX_Success || done) return check;
  const auto fill = unit.size == 4 ? &FillUnits<uint8_t> : unit.size == 8 ? &FillUnits<uint16_t> : &FillUnits<float>;
  return ResultOf(fill(raster, unit, static_cast<int32_t>(units)));
}

// Samples deeper than 8 bits hold the 8-bit code in their upper byte.
void FillPlane(const Picture420& picture, int plane, int32_t samples, int32_t rows, uint8_t code) noexcept {
  if (samples < 1 || rows < 1) return;
  auto* const base = const_cast<uint8_t*>(picture.planes[plane]);  // the caller's destination
  if (HasWideSamples(picture.format))
    primitives::Fill(static_cast<uint16_t>(code << 8), reinterpret_cast<uint16_t*>(base), picture.rowBytes[plane],
                     samples, rows);
  else
    primitives::Fill(code, base, picture.rowBytes[plane], samples, rows);
}

VX_Result Fill420(const Raster& block, VX_PixelFormat format, FillLevel level) noexcept {
  // A planar block above 8 bits has no defined size.
  if (HasWideSamples(format) && !IsBiplanar(format)) return VX_ErrFormatNotHandled;
  const Picture420 picture = PictureFromBlock(block.base, format, block.width, block.height);
  bool done;
  const VX_Result check = CheckBuffer(block.base, picture.rowBytes[0], block.width, block.height, &done);
  if (check != VX_Success || done) return check;
  FillPlane(picture, 0, block.width, block.height, StudioLuma8(level));
  if (IsBiplanar(format)) {
    FillPlane(picture, 1, 2 * ChromaWidth(picture), ChromaHeight(picture), kStudioChroma8);
  } else {
    FillPlane(picture, 1, block.width / 2, block.height / 2, kStudioChroma8);
    FillPlane(picture, 2, block.width / 2, block.height / 2, kStudioChroma8);
  }
  return VX_Success;
}

// A DV frame has its standard's size, whatever the width and height.
VX_Result FillDv(const Raster& frame, VX_PixelFormat format) noexcept {
  bool done;
  const VX_Result check = CheckBuffer(frame.base, 0, frame.width, frame.height, &done);
  if (check != VX_Success || done) return check;
  WriteDvBlackFrame(format == VX_PixelFormat::PALDV25 ? DvSystem::Lines625 : DvSystem::Lines525,
                    static_cast<uint8_t*>(frame.base));
  return VX_Success;
}

VX_Result FillOpaque(const Raster& raster, VX_PixelFormat format, FillLevel level) noexcept {
  const bool isDv25 = format == VX_PixelFormat::NTSCDV25 || format == VX_PixelFormat::PALDV25;
  if (isDv25 && level == FillLevel::Black) return FillDv(raster, format);
  if (Is420(format)) return Fill420(raster, format, level);
  FillUnit unit;
  return MakeFillUnit(format, level, true, &unit) ? FillRaster(raster, unit) : VX_ErrFormatNotHandled;
}

VX_Result FillTransparent(const Raster& raster, VX_PixelFormat format, FillLevel level) noexcept {
  FillUnit unit;
  if (!HasAlpha(format) || !MakeFillUnit(format, level, false, &unit)) return VX_ErrUnsupportedDestinationFormat;
  return FillRaster(raster, unit);
}

}  // namespace
}  // namespace vexel

using namespace vexel;

VX_Result VX_FillWithOpaqueBlack(void* base, int32_t rowBytes, int32_t width, int32_t height,
                                 VX_PixelFormat format) noexcept {
  return FillOpaque({base, rowBytes, width, height}, format, FillLevel::Black);
}

VX_Result VX_FillWithTransparentBlack(void* base, int32_t rowBytes, int32_t width, int32_t height,
                                      VX_PixelFormat format) noexcept {
  return FillTransparent({base, rowBytes, width, height}, format, FillLevel::Black);
}

VX_Result VX_FillWithOpaqueWhite(void* base, int32_t rowBytes, int32_t width, int32_t height,
                                 VX_PixelFormat format) noexcept {
  return FillOpaque({base, rowBytes, width, height}, format, FillLevel::White);
}

VX_Result VX_FillWithTransparentWhite(void* base, int32_t rowBytes, int32_t width, int32_t height,
                                      VX_PixelFormat format) noexcept {
  return FillTransparent({base, rowBytes, width, height}, format, FillLevel::White);
}

VX_Result VX_FillWithColor(void* base, int32_t rowBytes, int32_t width, int32_t height, VX_PixelFormat format,
                           const void* color, VX_PixelFormat colorFormat) noexcept {
  FillUnit pixel;
  // Whether it is a format of single pixels; the colour follows.
  if (Layout(format) != kLayout4444 || AlphaKind(format) == kAlphaNone ||
      !MakeFillUnit(format, FillLevel::Black, true, &pixel) || IsSpecial(colorFormat))
    return VX_ErrUnsupportedFormat;
  if (const VX_Result result = VX_Convert(color, 0, colorFormat, pixel.bytes, 0, format, 1, color ? 1 : 0, 0))
    return result;
  if (width < 0 || height < 0) return VX_ErrArgumentOutOfRange;
  if (!color && width > 0 && height > 0) return VX_ErrNullSource;
  return FillRaster({base, rowBytes, width, height}, pixel);
}
