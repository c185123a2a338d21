// 4:2:0 pictures held in one block: where their planes lie, what they decode to, and the conversions both ways.
//
// A picture is a block of bytes with its top line first. Frame pictures are progressive: chroma row j lies midway
// between the lines 2j and 2j + 1. Field pictures hold two interleaved fields, each with chroma of its own: the chroma
// rows 0, 2, 4 ... belong to the upper field (lines 0, 2, 4 ...) and 1, 3, 5 ... to the lower one; as ISO/IEC 13818-2
// places them, a chroma row of the upper field lies a quarter of the way from the first to the second line that it
// covers in its field, one of the lower field three quarters. Horizontally chroma sample i is co-sited with luma sample
// 2i. The MPEG-4 family is sited alike: ISO/IEC 14496-2 adopts those positions, and in H.264 and H.265 they are the
// default (chroma_sample_loc_type 0).
#pragma once

#include <cstddef>
#include <cstdint>

#include "formats/FormatBits.h"
#include "vexel/vexel.h"

namespace vexel {

// A 4:2:0 picture by its planes: luma, then the first and second chroma plane as they lie in memory, or the interleaved
// one. Read-only.
struct Picture420 {
  const uint8_t* planes[3];
  ptrdiff_t rowBytes[3];
  int32_t width, height;
  VX_PixelFormat format;
};

// Samples deeper than 8 bits are 16-bit little-endian words with the 10 significant bits on top.
constexpr bool HasWideSamples(VX_PixelFormat format) noexcept { return Depth(format) != kDepth8u; }

// Field pictures (frame kinds 9, 11, 13) as opposed to progressive frames.
constexpr bool IsFieldPicture(VX_PixelFormat format) noexcept { return (FrameKind(format) & 1) != 0; }

// The planes of a block of any 4:2:0 format.
Picture420 PictureFromBlock(const void* block, VX_PixelFormat format, int32_t width, int32_t height) noexcept;

// Chroma samples of a row that can be read or written: half the width, rounded up, or fewer where the row bytes hold no
// more. A block whose width is odd and a multiple of 256 plus 1 lacks the last sample; readers repeat the one before.
int32_t ChromaWidth(const Picture420& picture) noexcept;
constexpr int32_t ChromaHeight(const Picture420& picture) noexcept { return picture.height / 2 + picture.height % 2; }

// One field (1 upper, 2 lower) of a block into a block of half the height, same format and width: every second luma row
// from the field's first, and every second chroma row from row 0 for either field.
void CopyField420(const void* src, VX_PixelFormat format, int32_t width, int32_t height, int32_t field,
                  void* dst) noexcept;

// What a 4:2:0 source is decoded to on its way to a destination of a given size.
struct DecodePlan {
  VX_PixelFormat format;
  int32_t width, height;
};
DecodePlan PlanDecode420(VX_PixelFormat srcFormat, int32_t srcWidth, int32_t srcHeight, VX_PixelFormat dstFormat,
                         int32_t dstWidth, int32_t dstHeight, int32_t quality) noexcept;

// Whether there is a decoder: 4:2:0 of 8 or 10 bits.
bool CanDecode420(VX_PixelFormat format) noexcept;

// Decodes a block into a raster of the same size, bottom line first where the format is stored so. The destination may
// have any raster format. Codes as VX::DecompressYUV_420_8u.
VX_Result Decode420(const void* src, VX_PixelFormat srcFormat, int32_t width, int32_t height, void* dst,
                    int32_t dstRowBytes, VX_PixelFormat dstFormat, int32_t quality) noexcept;

// The same by way of a format that the decoder makes (Rows420::CanMake), row for row: the bytes of a decode to that
// format and a conversion from it.
VX_Result Decode420Through(VX_PixelFormat decoded, const void* src, VX_PixelFormat srcFormat, int32_t width,
                           int32_t height, void* dst, int32_t dstRowBytes, VX_PixelFormat dstFormat,
                           int32_t quality) noexcept;

// Decodes at a size of its own and for one field (0 whole, 1 upper, 2 lower).
VX_Result Decode420(const void* src, VX_PixelFormat srcFormat, int32_t srcWidth, int32_t srcHeight, void* dst,
                    int32_t dstRowBytes, int32_t dstWidth, int32_t dstHeight, VX_PixelFormat dstFormat, int32_t field,
                    int32_t quality) noexcept;

// Whether there is an encoder: planar, 8 bits, full range or BT.709.
bool CanEncode420(VX_PixelFormat format) noexcept;

// Encodes a raster into a block. Planar full range takes BGRX_4444_8u (or another 8-bit BGR of four channels) and
// planar video range BT.709 any raster; VX_ErrFormatNotHandled for every other pair. Chroma is filtered at its siting:
// (1, 2, 1) / 4 across, the mean of both lines down in frame pictures, (3, 1) / 4 and (1, 3) / 4 of two lines of the
// field in field pictures. Only samples of the picture are written, padding of rows and planes keeps its bytes. Rows
// that need it are converted at `quality` first.
inline constexpr int32_t kEncodeQuality = 2;  // chroma of 4:2:2 sources is interpolated before it is filtered
VX_Result Encode420(const void* src, int32_t srcRowBytes, VX_PixelFormat srcFormat, void* dst, VX_PixelFormat dstFormat,
                    int32_t width, int32_t height, int32_t quality = kEncodeQuality) noexcept;

// Decodes a block to a format that the decoder makes and encodes that, line for line.
VX_Result Recode420(const void* src, VX_PixelFormat srcFormat, VX_PixelFormat decoded, int32_t decodeQuality, void* dst,
                    VX_PixelFormat dstFormat, int32_t width, int32_t height, int32_t quality) noexcept;

}  // namespace vexel
