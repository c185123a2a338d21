/* Vexel: image processing for video. The flat C interface.
 *
 * Buffers are described by a base pointer to the first stored row, a signed row stride in bytes (`rowBytes`; row r
 * starts at base + r * rowBytes), a width and a height in pixels, and a VX_PixelFormat. The caller owns every buffer it
 * passes. Whether the first stored row is the top of the picture follows from the format (VX_IsOriginTopLeft). Pointers
 * must not be null where a function does not say what null does.
 *
 * No function throws. Except for VX_Initialize and VX_Terminate, every function may be called from many threads at
 * once. Functions that compute with floats run with flush-to-zero set and put the caller's floating-point mode back. */
#ifndef VEXEL_VEXEL_H
#define VEXEL_VEXEL_H

#include <stdbool.h>
#include <stddef.h>
#include <stdint.h>

#include "vexel/pixel_formats.h"

#if defined(_WIN32)
#if defined(VEXEL_BUILDING)
#define VX_API __declspec(dllexport)
#else
#define VX_API __declspec(dllimport)
#endif
#else
#define VX_API __attribute__((visibility("default")))
#endif

#ifdef __cplusplus
#define VX_NOEXCEPT noexcept
extern "C" {
#else
#define VX_NOEXCEPT
#endif

/* ---- Types ---------------------------------------------------------------------------------------------------- */

/* A pixel layout as a 32-bit code of bit fields (see pixel_formats.h). Values without a name are legal values. */
#ifdef __cplusplus
enum class VX_PixelFormat : uint32_t {
#define VX_FORMAT_ENUMERATOR(name, value, hostName, mapping) name = value,
  VX_PIXEL_FORMATS(VX_FORMAT_ENUMERATOR)
#undef VX_FORMAT_ENUMERATOR
};
#else
typedef uint32_t VX_PixelFormat;
enum {
#define VX_FORMAT_ENUMERATOR(name, value, hostName, mapping) VX_PixelFormat_##name = (int32_t)value,
  VX_PIXEL_FORMATS(VX_FORMAT_ENUMERATOR)
#undef VX_FORMAT_ENUMERATOR
};
#endif

/* Result of an operation: 0 is success, every failure is negative. */
/* clang-format off */
typedef enum VX_Result
#ifdef __cplusplus
    : int32_t
#endif
{
  VX_Success = 0,
  VX_ErrReserved1 = -1,
  VX_ErrInvalidRectangle = -2,
  VX_ErrUnsupportedFormat = -3,
  VX_ErrUnsupportedDestinationFormat = -4,
  VX_ErrDestinationTooNarrow = -7,
  VX_ErrDestinationTooShort = -8,
  VX_ErrNullSource = -11,
  VX_ErrNullDestination = -12,
  VX_ErrUnsupportedConversion = -13,
  VX_ErrOutOfMemory = -16,
  VX_ErrArgumentOutOfRange = -17,
  VX_ErrReserved18 = -18,
  VX_ErrFailed = -999,
  VX_ErrFormatNotHandled = -1000
} VX_Result;
/* clang-format on */

/* ---- Lifecycle, switches, diagnostics ---------------------------------------------------------------------------- */

/* Starts the library: detects processor features and the cache, reads the configuration keys "VX.disableAVX" and
 * "VX.disableAVX2" (true only if the text is exactly "true"; our own key "VX.disableAVX512" keeps AVX2 kernels but no
 * wider ones), creates the CPU-bound executor, loads the host's DV module if there is one. Reference counted; call it
 * and VX_Terminate from one thread. Always VX_Success. Before it, all switches are off and plain kernels run. */
VX_API VX_Result VX_Initialize(void) VX_NOEXCEPT;
/* Undoes one VX_Initialize, if there is one; the last releases executor and module, flags stay. Always VX_Success. */
VX_API VX_Result VX_Terminate(void) VX_NOEXCEPT;

/* The current value of the has-SSE4.1, has-AVX and has-AVX2 switches, after keys and debug flags. */
VX_API bool VX_hasSSE4(void) VX_NOEXCEPT;
VX_API bool VX_hasAVX(void) VX_NOEXCEPT;
VX_API bool VX_hasAVX2(void) VX_NOEXCEPT;

/* Sets one switch to value != 0: 0 motion path, 1 nothing, 2 SSE, 3 SSE2, 4 SSE3, 5 SSSE3, 6 SSE4.1, 7 SSE4.2, 8 AVX,
 * 9 AVX2, 10 force top-left origin. Higher indices are ignored. A switch never makes a kernel run that the processor
 * cannot execute. Always VX_Success. */
VX_API VX_Result VX_SetDebugFlag(uint32_t index, int32_t value) VX_NOEXCEPT;

/* True if the first stored row is the top of the picture: every format but the 4:4:4:4 ones with an A, P or X channel,
 * and those too while debug flag 10 is set. */
VX_API bool VX_IsOriginTopLeft(VX_PixelFormat format) VX_NOEXCEPT;
VX_API bool VX_IsOriginBottomLeft(VX_PixelFormat format) VX_NOEXCEPT;

/* "Low" for render quality 2, "High" for every other value. The text is constant, as all texts here are. */
VX_API const char* VX_RenderQualityName(int32_t renderQuality) VX_NOEXCEPT;
/* Bytes of the largest-level unified cache found at start-up; 0 if unknown. */
VX_API uint32_t VX_GetCacheSize(void) VX_NOEXCEPT;
/* The name of a code, for instance "VX_ErrOutOfMemory"; "Unknown result". */
VX_API const char* VX_ResultName(VX_Result result) VX_NOEXCEPT;
/* The version of the library that is running, for instance "1.0.0". */
VX_API const char* VX_GetVersion(void) VX_NOEXCEPT;

/* ---- Pixel formats and buffers ----------------------------------------------------------------------------------- */

/* Bytes of `height` rows of `width` pixels with the library's own row padding (4:4:4:4 rows to 64 bytes, 4:2:2 to 16,
 * V210 to 128); whole-frame sizes for DV and 4:2:0. Rasters are computed in 32 bits and sign-extended. 0 for unknown
 * values. `Invalid` is sized as 2 bytes per pixel. */
VX_API int64_t VX_PixelFormatSize(VX_PixelFormat format, int32_t width, int32_t height) VX_NOEXCEPT;
/* The format's name, for instance "UYVY_422_8u_709"; "Unknown pixel format". */
VX_API const char* VX_PixelFormatName(VX_PixelFormat format) VX_NOEXCEPT;
/* The format of that name (case-sensitive); Invalid if there is none or name is null. */
VX_API VX_PixelFormat VX_PixelFormatFromName(const char* name) VX_NOEXCEPT;

/* A 16-byte-aligned block from the host's recycling allocator, placed at a pseudo-random multiple of 128 bytes (0 to
 * 8,064) past the raw block to spread buffers over cache sets. Null when out of memory or when bytes is 0. Give
 * *rawBlock and *rawSize back to VX_FreeTransientMemoryBlock, which ignores null. */
VX_API void* VX_AllocateTransientMemoryBlock(size_t bytes, void** rawBlock, size_t* rawSize) VX_NOEXCEPT;
VX_API void VX_FreeTransientMemoryBlock(void* rawBlock, size_t rawSize) VX_NOEXCEPT;

/* A pixel buffer with padded rows, its bytes unspecified; *rowBytes is 0 for DV and 4:2:0 formats. A size of 0 bytes is
 * VX_Success with null pointers. VX_ErrOutOfMemory zeroes all outputs; sizes that 32 bits cannot express and negative
 * ones are refused that way. Freeing null does nothing. The transient pair is the same thing for buffers that live for
 * one operation. */
VX_API VX_Result VX_AllocatePixelBuffer(VX_PixelFormat format, int32_t width, int32_t height, void** rawBlock,
                                        void** pixels, int32_t* rowBytes, size_t* rawSize) VX_NOEXCEPT;
VX_API VX_Result VX_FreePixelBuffer(VX_PixelFormat format, void* rawBlock, size_t rawSize) VX_NOEXCEPT;
VX_API VX_Result VX_AllocateTransientPixelBuffer(VX_PixelFormat format, int32_t width, int32_t height, void** rawBlock,
                                                 void** pixels, int32_t* rowBytes, size_t* rawSize) VX_NOEXCEPT;
VX_API VX_Result VX_FreeTransientPixelBuffer(VX_PixelFormat format, void* rawBlock, size_t rawSize) VX_NOEXCEPT;

/* Copies bytes between areas that do not overlap; from half the cache size on past the cache. Always VX_Success. */
VX_API VX_Result VX_CopyMemory(void* dst, const void* src, size_t bytes) VX_NOEXCEPT;
/* Turns a raster upside down. Row padding stays; a height below 2 or a width below 1 does nothing. Rows of DV and 4:2:0
 * formats count as packed 4:2:2 ones. VX_ErrOutOfMemory only if the scratch row of a very wide raster cannot be had. */
VX_API VX_Result VX_FlipInPlace(void* base, int32_t rowBytes, int32_t width, int32_t height,
                                VX_PixelFormat format) VX_NOEXCEPT;
/* The address of pixel (x, y), y counting stored rows, of a 4:4:4:4 raster; nothing is clipped or checked.
 * VX_ErrUnsupportedFormat for formats whose pixels have no address of their own; *pixel is then untouched. */
VX_API VX_Result VX_ClipBufferToRect(void* base, int32_t rowBytes, VX_PixelFormat format, int32_t x, int32_t y,
                                     void** pixel) VX_NOEXCEPT;

/* ---- Conversion -------------------------------------------------------------------------------------------------- */

/* Converts width x height pixels from one format to another; never scales. Each buffer is walked from its bottom
 * picture row, so pictures keep their orientation. Source and destination must not overlap.
 *
 * A 4:2:0 picture is one block laid out as VX_GetPlanarBuffers says, its row bytes argument is not used. renderQuality
 * above 1 interpolates chroma where 4:2:2 in 32f or 4:2:0 becomes 4:4:4:4. The sign and payload of a NaN that
 * arithmetic produces are unspecified.
 *
 * 0 done, and for height < 1; -3 a special source without a decoder; -4 a special destination inside a chain; -13 a
 * special source that cannot be decoded to exactly width x height; -16 out of memory; -999 no chain of at most eight
 * steps; -1000 a special destination without an encoder. Ours, tested after the chain is found and for height >= 1: -17
 * a negative width or one whose row exceeds 2^31 - 1 bytes, -11 and -12 a null source or destination. Nothing is
 * written on failure. Width 0 does nothing. */
VX_API VX_Result VX_Convert(const void* src, int32_t srcRowBytes, VX_PixelFormat srcFormat, void* dst,
                            int32_t dstRowBytes, VX_PixelFormat dstFormat, int32_t width, int32_t height,
                            int32_t renderQuality) VX_NOEXCEPT;

/* The formats that VX_Convert goes through, both ends and the rasters that 4:2:0 ends are decoded to and encoded from
 * included: up to 9 values into formats[], their number into *count. Codes as VX_Convert: -999 if there is no chain, -3
 * a special source without a decoder, -1000 a special destination without an encoder; the outputs are then untouched.
 */
VX_API VX_Result VX_ExplainConversion(VX_PixelFormat srcFormat, VX_PixelFormat dstFormat, int32_t renderQuality,
                                      VX_PixelFormat formats[9], int32_t* count) VX_NOEXCEPT;

/* Plane pointers and row bytes of a 4:2:0 picture held in one block: luma pitch = width (2 * width above 8 bits) to
 * 128, chroma pitch = width / 2 to 128 (the luma pitch above 8 bits), planes of height rounded up to 32 rows; biplanar
 * pictures have no height padding, chroma pitch = luma pitch and no third plane (null). Computes only, never fails. */
VX_API VX_Result VX_GetPlanarBuffers(void* base, VX_PixelFormat format, int32_t width, int32_t height, void* planes[3],
                                     int32_t rowBytes[3]) VX_NOEXCEPT;
/* The same for 8-bit biplanar pictures: both pitches are width to 128. The format is not used. Never fails. */
VX_API VX_Result VX_GetBiPlanarBuffers(void* base, VX_PixelFormat format, int32_t width, int32_t height,
                                       void* planes[2], int32_t rowBytes[2]) VX_NOEXCEPT;
/* Copies the planes of 8-bit 4:2:0 pictures: height rows of width bytes of luma, height / 2 rows of width / 2 bytes of
 * each chroma plane (width bytes of the interleaved one); unpadded rows as one piece, width * height / 4 (2) bytes. */
VX_API VX_Result VX_CopyPlanar_8u(const void* const srcPlanes[3], const int32_t srcRowBytes[3],
                                  void* const dstPlanes[3], const int32_t dstRowBytes[3], int32_t width,
                                  int32_t height) VX_NOEXCEPT;
VX_API VX_Result VX_CopyBiPlanar_8u(const void* const srcPlanes[2], const int32_t srcRowBytes[2],
                                    void* const dstPlanes[2], const int32_t dstRowBytes[2], int32_t width,
                                    int32_t height) VX_NOEXCEPT;

/* ---- Codec and camera formats ------------------------------------------------------------------------------------ */

/* Each repacks rows of samples; a width or height below 1 does nothing. Row bytes may be negative, pixels have any
 * alignment, source and destination must not overlap. All give VX_Success. A 15u sample is 0..32768 (32768 is 1.0), a
 * 16u sample 0..65535 (65535 is 1.0). The 10-bit RGB word holds R in bits 2-11, G in 12-21, B in 22-31. */

/* Rescales every sample of four-channel 16-bit pixels from 15u to 16u: (s + 0.5) * 65535 / 32768 in floats, at most
 * 65535, truncated. The second stores the result big-endian. */
VX_API VX_Result VX_Convert_15u_To_16u_InPlace(void* base, int32_t rowBytes, int32_t width, int32_t height) VX_NOEXCEPT;
VX_API VX_Result VX_Convert_15u_To_16u_BigEndian_InPlace(void* base, int32_t rowBytes, int32_t width,
                                                         int32_t height) VX_NOEXCEPT;
/* Reverses the bytes of |rowBytes| / 4 words in each row, row padding included; width is not used. */
VX_API VX_Result VX_Convert_Uint32_BigEndian_InPlace(void* base, int32_t rowBytes, int32_t width,
                                                     int32_t height) VX_NOEXCEPT;

/* 16-bit samples U Y V Y holding 10 bits at the right, 4 bytes per pixel, to V210 groups of 6 pixels in 16 bytes.
 * Samples are not masked: one above 1023 runs into its neighbour. Where width is not a multiple of 6, the last group is
 * filled up with black if |dstRowBytes| has room for it; otherwise its pixels are left out. */
VX_API VX_Result VX_ConvertUYVY_422_10uToV210_422_10u(const void* src, int32_t srcRowBytes, void* dst,
                                                      int32_t dstRowBytes, int32_t width, int32_t height) VX_NOEXCEPT;

/* 10-bit RGB words to and from four 16-bit samples, of which the first three hold R, G and B in their upper ten bits;
 * the lower six are written as zero and dropped when read. The fourth is neither read nor written. The 16-bit side
 * has 8 bytes per pixel and no row padding. */
VX_API VX_Result VX_Convert_RGB_444_10u_To_DNxHD16u(const void* src, int32_t srcRowBytes, void* dst, int32_t width,
                                                    int32_t height) VX_NOEXCEPT;
VX_API VX_Result VX_Convert_DNxHD16u_To_RGB_444_10u(const void* src, void* dst, int32_t dstRowBytes, int32_t width,
                                                    int32_t height) VX_NOEXCEPT;

/* Pixels of four 16-bit samples A R G B in Canon Log 3, big-endian if the flag is not 0, to floats B G R X, X = 1.
 * Light is linearized in double precision, kept as a float and raised to the power 0.41666666 with its sign; no linear
 * toe. A is ignored. The first call of a process computes a table of 256 KiB in a few milliseconds. */
VX_API VX_Result VX_Convert_16uARGB_To_32fBGRX_Remove_CanonLog3_Apply_709(const void* src, int32_t srcRowBytes,
                                                                          void* dst, int32_t dstRowBytes, int32_t width,
                                                                          int32_t height,
                                                                          uint8_t bigEndian) VX_NOEXCEPT;
/* Sony S-Gamut3 to S-Gamut3.Cine in place on the first three of four 16-bit samples: the matrix in double precision,
 * truncated; results outside 0..65535 wrap around modulo 65536. The fourth sample stays as it is. */
VX_API VX_Result VX_Convert_SGamut3_16u_To_SGamut3Cine_16u(void* base, int32_t rowBytes, int32_t width,
                                                           int32_t height) VX_NOEXCEPT;

/* Bytes R G B, 3 per pixel, to B G R A with A = 255. */
VX_API VX_Result VX_ConvertRGB_444_8uToBGRA_4444_8u(const void* src, int32_t srcRowBytes, void* dst,
                                                    int32_t dstRowBytes, int32_t width, int32_t height) VX_NOEXCEPT;
/* 16u samples R G B, 6 bytes per pixel, to 15u samples X R G B with X = 32768, rounded to the nearest code. */
VX_API VX_Result VX_ConvertRGB_444_16u_To_XRGB_4444_15u(const void* src, int32_t srcRowBytes, void* dst,
                                                        int32_t dstRowBytes, int32_t width, int32_t height) VX_NOEXCEPT;
/* `count` samples from 16u to 15u, rounded to the nearest code; dst may be src. */
VX_API VX_Result VX_Scale16uBufferTo15uSIMD(const uint16_t* src, uint16_t* dst, size_t count) VX_NOEXCEPT;

/* `count` floats times 2^-scaleFactor, rounded to the nearest integer (ties to even) and saturated; NaN gives 0. */
VX_API VX_Result VX_Convert_32f16sSfs(const float* src, int16_t* dst, int32_t count, int32_t scaleFactor) VX_NOEXCEPT;
VX_API VX_Result VX_Convert_32f32sSfs(const float* src, int32_t* dst, int32_t count, int32_t scaleFactor) VX_NOEXCEPT;

/* For JPEG 2000. 16u samples B G R, 6 bytes per pixel, to 10-bit RGB words: the upper ten bits of each sample. */
VX_API VX_Result VX_Convert_j2k_BGR16u_To_RGB_444_10u(const void* src, int32_t srcRowBytes, void* dst,
                                                      int32_t dstRowBytes, int32_t width, int32_t height) VX_NOEXCEPT;
/* 10-bit RGB words to 16-bit samples B G R, 6 bytes per pixel, with the ten bits at the right. */
VX_API VX_Result VX_Convert_j2k_RGB_444_10u_To_10_Bits_Within_BGR16u(const void* src, int32_t srcRowBytes, void* dst,
                                                                     int32_t dstRowBytes, int32_t width,
                                                                     int32_t height) VX_NOEXCEPT;
/* V210 to 16-bit samples U Y V Y with ten bits at the right, 4 bytes per pixel. The last group of each source row is
 * whole, whatever the width. */
VX_API VX_Result VX_Convert_j2k_V210_To_10_Bits_Within_UYVY16u(const void* src, int32_t srcRowBytes, void* dst,
                                                               int32_t dstRowBytes, int32_t width,
                                                               int32_t height) VX_NOEXCEPT;
/* Adds `offset` to U and V of 4:2:2 float pairs U Y V Y: -0.5 takes a codec's unsigned chroma to our centre of 0, 0.5
 * back. Of an odd width, the last pair counts as whole. */
VX_API VX_Result VX_Convert_j2k_UYVY_422_32f_Offset_In_Place(void* base, int32_t rowBytes, int32_t width,
                                                             int32_t height, float offset) VX_NOEXCEPT;
/* Digital cinema codes Z' Y' X' (SMPTE ST 428-1: gamma 2.6, 1.0 is 52.37 cd/m2 where white is 48) to B G R on BT.709
 * primaries with D65 white and a display gamma of 2.4; negative values keep their sign, nothing is clamped. The fourth
 * float stays as it is. */
VX_API VX_Result VX_Convert_j2k_ZYXx_32f_To_BGRX_32f_In_Place(void* base, int32_t rowBytes, int32_t width,
                                                              int32_t height) VX_NOEXCEPT;

/* ---- Transpose and rotation -------------------------------------------------------------------------------------- */

/* Mirrors about the main diagonal: destination element (row x, column y) = source element (row y, column x). `width`
 * and `height` describe the source; the destination has `height` elements per row and `width` rows. Elements have 1 to
 * 16 bytes, any other size is VX_ErrUnsupportedFormat; strides are rounded toward zero to whole elements. The areas
 * must not overlap. A size below 1 does nothing. */
VX_API VX_Result VX_Transpose(const void* src, int32_t srcRowBytes, void* dst, int32_t dstRowBytes, int32_t width,
                              int32_t height, uint8_t elementSize) VX_NOEXCEPT;
/* Rotates stored rows by a multiple of 90 degrees: for 90 the destination's first stored row is the source's last
 * column read from its first row on. Angles 0, +-90, +-180, +-270, others are VX_ErrFormatNotHandled. `flip` reads the
 * source from its last row first. 4:4:4:4 formats with a fourth channel only, others are VX_ErrUnsupportedFormat.
 * `width` and `height` describe the source. Every pixel is copied bit for bit; the areas must not overlap. */
VX_API VX_Result VX_RotateImageAndFlip(const void* src, int32_t srcRowBytes, void* dst, int32_t dstRowBytes,
                                       int32_t width, int32_t height, VX_PixelFormat format, int32_t angle,
                                       bool flip) VX_NOEXCEPT;

#ifdef __cplusplus
} /* extern "C" */
#endif

/* Compositing, blend modes, alpha, fills and dissolves. */
#include "vexel/compositing.h"

#endif
