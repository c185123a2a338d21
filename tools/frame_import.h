// From decoded frames to library pictures: which format a frame maps to, and moving its samples there.
//
//   in the file                                      library format
//   4:2:0, 8 bits, planar                            YUV_420_MPEG4_* (YUV_420_MPEG2_* for MPEG-2 video), same planes;
//                                                    FIELD for interlaced frames, FullRange and _709 as coded
//   4:2:0, 8 bits, biplanar (NV12, NV21)             the biplanar formats, same planes
//   4:2:0, 10 bits, video range, 709 or 2020         the biplanar 10-bit formats (planar ones interleaved)
//   4:2:2, 8 bits, video range                       UYVY_422_8u or YUYV_422_8u
//   4:2:2, 10 bits, video range                      V210_422_10u
//   4:4:4, 8 bits, video range                       VUYX_4444_8u, VUYA_4444_8u with alpha
//   other 4:2:2 and 4:4:4 codings, full range too    UYVY_422_32f, VUYX_4444_32f, VUYA_4444_32f (exact in float)
//   4:1:1, 4:1:0, 4:4:0 and 4:2:0 left over          as 4:2:2 or 4:4:4, chroma samples repeated
//   RGB and grey, 8 bits or fewer, palettes          BGRX_4444_8u, BGRA_4444_8u (ARGB and XRGB kept where stored so)
//   RGB, 10 bits                                     RGB_444_10u
//   RGB and grey, other depths                       BGRX_4444_32f, BGRA_4444_32f (exact in float)
//   linear-light float RGB (EXR)                     BGRX_4444_32f_Linear, BGRP_4444_32f_Linear (its alpha is
//                                                    premultiplied)
//
// The library's 4:2:0 chroma is co-sited with every second column; that of JPEG pictures, which lies between the
// columns, is taken as if it were.
//
// YUV formats end in _709 where the coding is BT.709. A frame that does not say is taken as BT.709 from 720 lines on
// and as BT.601 below, as players do.
#pragma once

extern "C" {
#include <libavcodec/avcodec.h>
#include <libavutil/frame.h>
}

#include <string>

#include "picture.h"

namespace tool {

enum class Matrix { FromFile, Bt601, Bt709, Bt2020 };

// Reads "601", "709" or "2020".
Matrix ParseMatrix(const std::string& text);

// What a picture of this height is taken for that does not name its matrix.
inline Matrix UnnamedMatrix(int height) { return height >= 720 ? Matrix::Bt709 : Matrix::Bt601; }

// The library format that `frame`, decoded by `codec`, maps to. Throws ToolError, naming the property in the way, when
// the library has none.
VX_PixelFormat LibraryFormatOf(const AVFrame& frame, AVCodecID codec, Matrix matrix);

// The frame's samples in a library picture of that format.
Picture ImportFrame(const AVFrame& frame, VX_PixelFormat format);

}  // namespace tool
