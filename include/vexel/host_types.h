// The functions that speak the host's types: pixel formats, colour spaces, fields and render qualities. C++ only.
#ifndef VEXEL_HOST_TYPES_H
#define VEXEL_HOST_TYPES_H

#include "vexel/vexel.h"

#include <zovmediatypes/ColorSpace.h>
#include <zovmediatypes/FieldType.h>
#include <zovmediatypes/PixelFormat.h>
#include <zovmediatypes/RenderQuality.h>

extern "C" {

// The library's format for a host format. 10-bit RGB and the biplanar 4:2:0 formats give values without a name, a
// compressed frame (low byte of the first word 64 or 95) gives 0x7F000020, everything else unknown gives Invalid. Host
// YUYV_422_32f (601 and 709), BGRX_4444_32f_Linear and XRGB_4444_32f_Linear count as unknown.
VX_API VX_PixelFormat VX_ZOVPixelFormatToVXPixelFormat(const zovmediatypes::PixelFormat& format) noexcept;

// The host's format for a library format; kPixelFormat_Invalid if the host has none, which holds for YUYV_422_32f (601
// and 709), the biplanar formats, compressed frames and values that are no format.
VX_API zovmediatypes::PixelFormat VX_VXPixelFormatToZOVPixelFormat(VX_PixelFormat format) noexcept;

// The colour space that the host makes of a format's codes (ITU-T H.273): primaries BT.709; transfer linear for linear
// formats, else BT.709; matrix identity for RGB, else BT.709; depth 8, 10, 16 (15u) or 32 bits; full range unless the
// format says video range, so always for RGB. The format's own colorimetry is not consulted: a BT.601 or BT.2020 format
// gives BT.709 too. A default-constructed colour space if the host throws.
VX_API zovmediatypes::color::ColorSpace VX_PixelFormatToColorSpace(VX_PixelFormat format) noexcept;

}  // extern "C"

namespace VX {

// Decodes an 8-bit 4:2:0 picture from its planes (luma, then U and V, or the interleaved chroma plane) into a raster of
// any format, at a size that the decoder reaches by itself: the source's own; its field (half the height, same width);
// half of both; with quality below 3 also a width divided by 1, 2, 4 or 8 and a height divided by an even integer; and
// 4/3 (widths in multiples of 96) or 3/2 (multiples of 16) of the width at full or half height, where the has-SSE2
// switch is on. `field` picks the field that half the height shows (Whole averages).
//
// 0; -3 the source is not 4:2:0; -4 the destination is no raster; -13 a size that the decoder does not reach; -16 out
// of memory; -999 no conversion into the destination format. Nothing is written on failure. Safe from any thread.
VX_API VX_Result DecompressYUV_420_8u(const void* const* srcPlanes, const int32_t* srcRowBytes, int32_t srcWidth,
                                      int32_t srcHeight, VX_PixelFormat srcFormat, void* dst, int32_t dstRowBytes,
                                      int32_t dstWidth, int32_t dstHeight, VX_PixelFormat dstFormat,
                                      zovmediatypes::FieldType field, zovmediatypes::RenderQuality quality) noexcept;

}  // namespace VX

#endif
