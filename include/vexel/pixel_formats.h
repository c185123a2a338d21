/* The catalogue of named pixel formats: the one list from which the enumeration, the name table, the lookups and the
 * mapping to the host's formats are generated.
 *
 * VX_PIXEL_FORMATS(X) expands X(name, value, hostName, mapping) for every format in table order. `hostName` is the
 * host's kPixelFormat_ constant without its prefix; `mapping` says which directions exist: BOTH, OUT (library to host
 * only) or NONE.
 *
 * Value bits: 0 colour model (0 RGB, 1 YUV), 1 linear light, 2-3 alpha kind (0 none, 1 straight, 2 premultiplied,
 * 3 ignored), 4-5 layout (0 4:4:4:4, 1 packed 4:2:2, 2 DV, 3 4:2:0), 6-8 depth (0 8u, 0x40 10u, 0x80 15u, 0x100 32f),
 * 9-10 colorimetry (0 BT.601, 0x200 BT.709, 0x400 BT.2020, 0x600 BT.2020 HDR), 11 video range, 12 reversed channel
 * order, 24-31 frame kind (0 raster, 1-8 DV, 9-12 planar 4:2:0, 13-14 biplanar 4:2:0, 0x7F opaque). */
#ifndef VEXEL_PIXEL_FORMATS_H
#define VEXEL_PIXEL_FORMATS_H

#define VX_PIXEL_FORMATS(X)                                                                                    \
  X(Invalid, 0x00000000u, Invalid, BOTH)                                                                       \
  X(VUYA_4444_8u, 0x00000805u, VUYA_4444_8u, BOTH)                                                             \
  X(VUYP_4444_8u, 0x00000809u, VUYP_4444_8u, BOTH)                                                             \
  X(VUYX_4444_8u, 0x0000080Du, VUYX_4444_8u, BOTH)                                                             \
  X(VUYA_4444_8u_709, 0x00000A05u, VUYA_4444_8u_709, BOTH)                                                     \
  X(VUYP_4444_8u_709, 0x00000A09u, VUYP_4444_8u_709, BOTH)                                                     \
  X(VUYX_4444_8u_709, 0x00000A0Du, VUYX_4444_8u_709, BOTH)                                                     \
  X(VUYA_4444_32f, 0x00000905u, VUYA_4444_32f, BOTH)                                                           \
  X(VUYP_4444_32f, 0x00000909u, VUYP_4444_32f, BOTH)                                                           \
  X(VUYX_4444_32f, 0x0000090Du, VUYX_4444_32f, BOTH)                                                           \
  X(VUYA_4444_32f_709, 0x00000B05u, VUYA_4444_32f_709, BOTH)                                                   \
  X(VUYP_4444_32f_709, 0x00000B09u, VUYP_4444_32f_709, BOTH)                                                   \
  X(VUYX_4444_32f_709, 0x00000B0Du, VUYX_4444_32f_709, BOTH)                                                   \
  X(BGRA_4444_8u, 0x00000004u, BGRA_4444_8u, BOTH)                                                             \
  X(BGRP_4444_8u, 0x00000008u, BGRP_4444_8u, BOTH)                                                             \
  X(BGRX_4444_8u, 0x0000000Cu, BGRX_4444_8u, BOTH)                                                             \
  X(BGRA_4444_32f, 0x00000104u, BGRA_4444_32f, BOTH)                                                           \
  X(BGRP_4444_32f, 0x00000108u, BGRP_4444_32f, BOTH)                                                           \
  X(BGRX_4444_32f, 0x0000010Cu, BGRX_4444_32f, BOTH)                                                           \
  X(ARGB_4444_8u, 0x00001004u, ARGB_4444_8u, BOTH)                                                             \
  X(PRGB_4444_8u, 0x00001008u, PRGB_4444_8u, BOTH)                                                             \
  X(XRGB_4444_8u, 0x0000100Cu, XRGB_4444_8u, BOTH)                                                             \
  X(ARGB_4444_32f, 0x00001104u, ARGB_4444_32f, BOTH)                                                           \
  X(PRGB_4444_32f, 0x00001108u, PRGB_4444_32f, BOTH)                                                           \
  X(XRGB_4444_32f, 0x0000110Cu, XRGB_4444_32f, BOTH)                                                           \
  X(UYVY_422_8u, 0x00000811u, UYVY_422_8u, BOTH)                                                               \
  X(UYVY_422_8u_709, 0x00000A11u, UYVY_422_8u_709, BOTH)                                                       \
  X(YUYV_422_8u, 0x00001811u, YUYV_422_8u, BOTH)                                                               \
  X(YUYV_422_8u_709, 0x00001A11u, YUYV_422_8u_709, BOTH)                                                       \
  X(UYVY_422_32f, 0x00000911u, UYVY_422_32f, BOTH)                                                             \
  X(UYVY_422_32f_709, 0x00000B11u, UYVY_422_32f_709, BOTH)                                                     \
  X(YUYV_422_32f, 0x00001911u, YUYV_422_32f, NONE)                                                             \
  X(YUYV_422_32f_709, 0x00001B11u, YUYV_422_32f_709, NONE)                                                     \
  X(V210_422_10u, 0x00000851u, V210_422_10u, BOTH)                                                             \
  X(V210_422_10u_709, 0x00000A51u, V210_422_10u_709, BOTH)                                                     \
  X(BGRA_4444_15u, 0x00000084u, BGRA_4444_15u, BOTH)                                                           \
  X(BGRP_4444_15u, 0x00000088u, BGRP_4444_15u, BOTH)                                                           \
  X(BGRX_4444_15u, 0x0000008Cu, BGRX_4444_15u, BOTH)                                                           \
  X(ARGB_4444_15u, 0x00001084u, ARGB_4444_15u, BOTH)                                                           \
  X(PRGB_4444_15u, 0x00001088u, PRGB_4444_15u, BOTH)                                                           \
  X(XRGB_4444_15u, 0x0000108Cu, XRGB_4444_15u, BOTH)                                                           \
  X(BGRA_4444_32f_Linear, 0x00000106u, BGRA_4444_32f_Linear, BOTH)                                             \
  X(BGRP_4444_32f_Linear, 0x0000010Au, BGRP_4444_32f_Linear, BOTH)                                             \
  X(BGRX_4444_32f_Linear, 0x0000010Eu, BGRX_4444_32f_Linear, OUT)                                              \
  X(ARGB_4444_32f_Linear, 0x00001106u, ARGB_4444_32f_Linear, BOTH)                                             \
  X(PRGB_4444_32f_Linear, 0x0000110Au, PRGB_4444_32f_Linear, BOTH)                                             \
  X(XRGB_4444_32f_Linear, 0x0000110Eu, XRGB_4444_32f_Linear, OUT)                                              \
  X(NTSCDV25, 0x01000821u, NTSCDV25, BOTH)                                                                     \
  X(PALDV25, 0x02000821u, PALDV25, BOTH)                                                                       \
  X(NTSCDV50, 0x07000821u, NTSCDV50, BOTH)                                                                     \
  X(PALDV50, 0x08000821u, PALDV50, BOTH)                                                                       \
  X(NTSC_DV100_720p, 0x03000A21u, NTSC_DV100_720p, BOTH)                                                       \
  X(PAL_DV100_720p, 0x04000A21u, PAL_DV100_720p, BOTH)                                                         \
  X(NTSC_DV100_1080i, 0x05000A21u, NTSC_DV100_1080i, BOTH)                                                     \
  X(PAL_DV100_1080i, 0x06000A21u, PAL_DV100_1080i, BOTH)                                                       \
  X(YUV_420_MPEG2_FIELD, 0x09000831u, YUV_420_MPEG2_FIELD_PICTURE_PLANAR_8u_601, BOTH)                         \
  X(YUV_420_MPEG2_FRAME, 0x0A000831u, YUV_420_MPEG2_FRAME_PICTURE_PLANAR_8u_601, BOTH)                         \
  X(YUV_420_MPEG2_FIELD_FullRange, 0x09000031u, YUV_420_MPEG2_FIELD_PICTURE_PLANAR_8u_601_FullRange, BOTH)     \
  X(YUV_420_MPEG2_FRAME_FullRange, 0x0A000031u, YUV_420_MPEG2_FRAME_PICTURE_PLANAR_8u_601_FullRange, BOTH)     \
  X(YUV_420_MPEG2_FIELD_709, 0x09000A31u, YUV_420_MPEG2_FIELD_PICTURE_PLANAR_8u_709, BOTH)                     \
  X(YUV_420_MPEG2_FRAME_709, 0x0A000A31u, YUV_420_MPEG2_FRAME_PICTURE_PLANAR_8u_709, BOTH)                     \
  X(YUV_420_MPEG2_FIELD_FullRange_709, 0x09000231u, YUV_420_MPEG2_FIELD_PICTURE_PLANAR_8u_709_FullRange, BOTH) \
  X(YUV_420_MPEG2_FRAME_FullRange_709, 0x0A000231u, YUV_420_MPEG2_FRAME_PICTURE_PLANAR_8u_709_FullRange, BOTH) \
  X(YUV_420_MPEG4_FIELD, 0x0B000831u, YUV_420_MPEG4_FIELD_PICTURE_PLANAR_8u_601, BOTH)                         \
  X(YUV_420_MPEG4_FRAME, 0x0C000831u, YUV_420_MPEG4_FRAME_PICTURE_PLANAR_8u_601, BOTH)                         \
  X(YUV_420_MPEG4_FIELD_FullRange, 0x0B000031u, YUV_420_MPEG4_FIELD_PICTURE_PLANAR_8u_601_FullRange, BOTH)     \
  X(YUV_420_MPEG4_FRAME_FullRange, 0x0C000031u, YUV_420_MPEG4_FRAME_PICTURE_PLANAR_8u_601_FullRange, BOTH)     \
  X(YUV_420_MPEG4_FIELD_709, 0x0B000A31u, YUV_420_MPEG4_FIELD_PICTURE_PLANAR_8u_709, BOTH)                     \
  X(YUV_420_MPEG4_FRAME_709, 0x0C000A31u, YUV_420_MPEG4_FRAME_PICTURE_PLANAR_8u_709, BOTH)                     \
  X(YUV_420_MPEG4_FIELD_FullRange_709, 0x0B000231u, YUV_420_MPEG4_FIELD_PICTURE_PLANAR_8u_709_FullRange, BOTH) \
  X(YUV_420_MPEG4_FRAME_FullRange_709, 0x0C000231u, YUV_420_MPEG4_FRAME_PICTURE_PLANAR_8u_709_FullRange, BOTH)

/* Formats that the library handles and that have no name: 10-bit RGB and the biplanar 4:2:0 pictures.
 * VX_UNNAMED_PIXEL_FORMATS(X) expands X(value, hostName, mapping); IN is host to library only. */
#define VX_UNNAMED_PIXEL_FORMATS(X)                                           \
  X(0x00000040u, RGB_444_10u, BOTH)                                           \
  X(0x0D000031u, YUV_420_MPEG4_FIELD_PICTURE_BIPLANAR_8u_601_FullRange, IN)   \
  X(0x0D000231u, YUV_420_MPEG4_FIELD_PICTURE_BIPLANAR_8u_709_FullRange, IN)   \
  X(0x0D000831u, YUV_420_MPEG4_FIELD_PICTURE_BIPLANAR_8u_601, IN)             \
  X(0x0D000A31u, YUV_420_MPEG4_FIELD_PICTURE_BIPLANAR_8u_709, IN)             \
  X(0x0E000031u, YUV_420_MPEG4_FRAME_PICTURE_BIPLANAR_8u_601_FullRange, IN)   \
  X(0x0E000231u, YUV_420_MPEG4_FRAME_PICTURE_BIPLANAR_8u_709_FullRange, IN)   \
  X(0x0E000831u, YUV_420_MPEG4_FRAME_PICTURE_BIPLANAR_8u_601, IN)             \
  X(0x0E000A31u, YUV_420_MPEG4_FRAME_PICTURE_BIPLANAR_8u_709, IN)             \
  X(0x0D001031u, YVU_420_MPEG4_FIELD_PICTURE_BIPLANAR_8u_601_FullRange, IN)   \
  X(0x0D001231u, YVU_420_MPEG4_FIELD_PICTURE_BIPLANAR_8u_709_FullRange, IN)   \
  X(0x0D001831u, YVU_420_MPEG4_FIELD_PICTURE_BIPLANAR_8u_601, IN)             \
  X(0x0D001A31u, YVU_420_MPEG4_FIELD_PICTURE_BIPLANAR_8u_709, IN)             \
  X(0x0E001031u, YVU_420_MPEG4_FRAME_PICTURE_BIPLANAR_8u_601_FullRange, IN)   \
  X(0x0E001231u, YVU_420_MPEG4_FRAME_PICTURE_BIPLANAR_8u_709_FullRange, IN)   \
  X(0x0E001831u, YVU_420_MPEG4_FRAME_PICTURE_BIPLANAR_8u_601, IN)             \
  X(0x0E001A31u, YVU_420_MPEG4_FRAME_PICTURE_BIPLANAR_8u_709, IN)             \
  X(0x0D000A71u, YUV_420_MPEG4_FIELD_PICTURE_BIPLANAR_10u_as16u_709, IN)      \
  X(0x0D000C71u, YUV_420_MPEG4_FIELD_PICTURE_BIPLANAR_10u_as16u_2020, IN)     \
  X(0x0D000E71u, YUV_420_MPEG4_FIELD_PICTURE_BIPLANAR_10u_as16u_2020_HDR, IN) \
  X(0x0E000A71u, YUV_420_MPEG4_FRAME_PICTURE_BIPLANAR_10u_as16u_709, IN)      \
  X(0x0E000C71u, YUV_420_MPEG4_FRAME_PICTURE_BIPLANAR_10u_as16u_2020, IN)     \
  X(0x0E000E71u, YUV_420_MPEG4_FRAME_PICTURE_BIPLANAR_10u_as16u_2020_HDR, IN)

#endif
