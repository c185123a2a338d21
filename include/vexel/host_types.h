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

// Decodes a 4:2:0 picture from its planes (luma, then U and V, or one interleaved chroma plane and no third entry) into
// a raster. Always writes the top picture line first, at `dst`, whatever the format's origin: for a bottom-left format
// pass the last row and negated row bytes. All 8-bit formats of four channels are written opaque.
//
// Sizes: the source's own; half its height at the same width; half of both; with quality below 3 also a width divided
// by 1, 2, 4 or 8 and a height divided by an even integer; and, where the has-SSE2 switch is on, 4/3 (widths in
// multiples of 96) or 3/2 (multiples of 16) of the width at full or half height, resampled bicubically. Reduced pixels
// are means of all pixels that they cover; field pictures are reduced from their upper field. At half height of full or
// greater width `field` picks the lines: Upper, Lower, or Whole, which is the mean of both lines of a frame picture and
// the upper field of a field picture. Elsewhere `field` is not used.
//
// Chroma: quality 2 and above interpolates linearly, below 2 every pixel takes the sample that covers it. Frame
// pictures are progressive, field pictures hold two interleaved fields with chroma of their own (ISO/IEC
// 13818-2, 6.1.1.8). Both families have chroma co-sited with even columns and between the lines. Rows hold (width + 1)
// / 2 samples of chroma, or as many as their row bytes have room for; the last one is then repeated, and a plane
// without any counts as neutral. 10-bit samples are the upper bits of 16-bit words; the lower six should be 0. BT.2020
// (non-constant luminance) becomes BT.709 Y'CbCr by way of R'G'B', primaries and transfer function staying what they
// are.
//
// 0, also for an empty picture; -3 the source is not 4:2:0 with 8 or 10 bits; -4 the destination is no raster; -13 a
// size that the decoder does not reach; -11, -12 a missing plane or destination; -16 out of memory; -999 no conversion
// into the destination format. Nothing is written on failure. Runs on the calling thread; safe from any.
VX_API VX_Result DecompressYUV_420_8u(const void* const* srcPlanes, const int32_t* srcRowBytes, int32_t srcWidth,
                                      int32_t srcHeight, VX_PixelFormat srcFormat, void* dst, int32_t dstRowBytes,
                                      int32_t dstWidth, int32_t dstHeight, VX_PixelFormat dstFormat,
                                      zovmediatypes::FieldType field, zovmediatypes::RenderQuality quality) noexcept;

}  // namespace VX

#endif
