/* Vexel: compositing, blend modes, alpha, fills and dissolves. Part of the flat C interface; vexel.h includes it.
 *
 * Buffers, formats, results and threads are as vexel.h says. In every function here:
 *
 * - Pictures meet upright: a source whose origin differs from the destination's (VX_IsOriginTopLeft) is read from its
 *   last stored row.
 * - The destination may be exactly one of the sources (same base, row bytes and format); any other overlap is
 * undefined.
 * - An empty width or height does nothing and succeeds once the formats are accepted; a negative one is
 *   VX_ErrArgumentOutOfRange, as is a row beyond 2^31 - 1 bytes. A null source is VX_ErrNullSource, a null destination
 *   VX_ErrNullDestination. On these and on refused formats nothing is written.
 * - More than 64 rows are spread over the host's processors; the result does not depend on how.
 * - Scratch memory that cannot be had is VX_ErrOutOfMemory; the destination may then be partly written. */
#ifndef VEXEL_COMPOSITING_H
#define VEXEL_COMPOSITING_H

#include "vexel/vexel.h"

#ifdef __cplusplus
extern "C" {
#endif

/* ---- Compositing and blend modes --------------------------------------------------------------------------------- */

/* The order is the contract; it is alphabetical but for the last two. */
#define VX_BLEND_MODES(X)                                                                                              \
  X(Color, 0)                                                                                                          \
  X(ColorBurn, 1) X(ColorDodge, 2) X(Darken, 3) X(DarkerColor, 4) X(Difference, 5) X(Dissolve, 6) X(Exclusion, 7)      \
      X(HardLight, 8) X(HardMix, 9) X(Hue, 10) X(Lighten, 11) X(LighterColor, 12) X(LinearBurn, 13) X(LinearDodge, 14) \
          X(LinearLight, 15) X(Luminosity, 16) X(Multiply, 17) X(Normal, 18) X(Overlay, 19) X(PinLight, 20)            \
              X(Saturation, 21) X(Screen, 22) X(SoftLight, 23) X(VividLight, 24) X(Subtract, 25) X(Divide, 26)
#ifdef __cplusplus
enum class VX_BlendMode : int32_t {
#define VX_BLEND_MODE_ENUMERATOR(name, value) name = value,
  VX_BLEND_MODES(VX_BLEND_MODE_ENUMERATOR)
#undef VX_BLEND_MODE_ENUMERATOR
};
#else
typedef int32_t VX_BlendMode;
enum {
#define VX_BLEND_MODE_ENUMERATOR(name, value) VX_BlendMode_##name = value,
  VX_BLEND_MODES(VX_BLEND_MODE_ENUMERATOR)
#undef VX_BLEND_MODE_ENUMERATOR
};
#endif

/* Lays the source over the background with an opacity of 0..1 (source-over, straight alpha: ao = as + ab (1 - as),
 * colour (s as + d ab (1 - as)) / ao). A source without alpha, or with an ignored one, is opaque. NaN opacity counts as
 * 0. `conversionOption` is the render quality of the row conversions (see VX_Convert); `flag` is reserved.
 * VX_ErrUnsupportedFormat: source or background is no raster format. VX_ErrUnsupportedDestinationFormat: likewise the
 * destination. */
VX_API VX_Result VX_Composite(const void* src, int32_t srcRowBytes, VX_PixelFormat srcFormat, const void* background,
                              int32_t backgroundRowBytes, VX_PixelFormat backgroundFormat, void* dst,
                              int32_t dstRowBytes, VX_PixelFormat dstFormat, int32_t width, int32_t height,
                              float opacity, int32_t conversionOption, bool flag) VX_NOEXCEPT;
/* The same through one of the VX_BLEND_MODES. A mode outside the list is VX_ErrFormatNotHandled. */
VX_API VX_Result VX_CompositeWithBlendMode(const void* src, int32_t srcRowBytes, VX_PixelFormat srcFormat,
                                           const void* background, int32_t backgroundRowBytes,
                                           VX_PixelFormat backgroundFormat, void* dst, int32_t dstRowBytes,
                                           VX_PixelFormat dstFormat, int32_t width, int32_t height, float opacity,
                                           int32_t blendMode, int32_t conversionOption, bool flag) VX_NOEXCEPT;
VX_API VX_Result VX_CompositeToBlack(const void* src, int32_t srcRowBytes, VX_PixelFormat srcFormat, void* dst,
                                     int32_t dstRowBytes, VX_PixelFormat dstFormat, int32_t width, int32_t height,
                                     float opacity, int32_t precisionHint) VX_NOEXCEPT;
VX_API VX_Result VX_CompositeToBlackAndTestSourceAlpha(const void* src, int32_t srcRowBytes, VX_PixelFormat srcFormat,
                                                       void* dst, int32_t dstRowBytes, VX_PixelFormat dstFormat,
                                                       int32_t width, int32_t height, int32_t* alphaState,
                                                       int32_t precisionHint) VX_NOEXCEPT;

/* ---- Alpha ------------------------------------------------------------------------------------------------------- */

VX_API bool VX_IsOpacityNOP(int32_t blendMode, float opacity) VX_NOEXCEPT;
VX_API VX_Result VX_AlphaGain(const void* src, int32_t srcRowBytes, VX_PixelFormat srcFormat, void* dst,
                              int32_t dstRowBytes, VX_PixelFormat dstFormat, int32_t width, int32_t height, float gain,
                              int32_t precisionHint) VX_NOEXCEPT;
VX_API VX_Result VX_SetAlphaChannel(uint32_t width, uint32_t height, void* base, int32_t rowBytes,
                                    VX_PixelFormat format, bool opaque) VX_NOEXCEPT;
VX_API VX_Result VX_InvertAlpha(const void* src, int32_t srcRowBytes, void* dst, int32_t dstRowBytes,
                                VX_PixelFormat format, int32_t width, int32_t height) VX_NOEXCEPT;
VX_API VX_Result VX_CopyAndSetAlpha(const void* src, int32_t srcRowBytes, void* dst, int32_t dstRowBytes,
                                    VX_PixelFormat format, int32_t width, int32_t height, float alpha) VX_NOEXCEPT;
VX_API VX_Result VX_UnPremultiplyAgainstMatteColor(const void* src, int32_t srcRowBytes, void* dst, int32_t dstRowBytes,
                                                   VX_PixelFormat format, int32_t width, int32_t height,
                                                   const void* matteColor, VX_PixelFormat matteFormat,
                                                   int32_t conversionOption) VX_NOEXCEPT;
VX_API VX_Result VX_OneBitMaskComposite(const void* a, int32_t aRowBytes, VX_PixelFormat aFormat, const void* b,
                                        int32_t bRowBytes, VX_PixelFormat bFormat, const void* mask,
                                        int32_t maskRowBytes, int32_t maskBitOffset, void* dst, int32_t dstRowBytes,
                                        VX_PixelFormat dstFormat, int32_t width, int32_t height,
                                        int32_t conversionOption) VX_NOEXCEPT;

/* ---- Fills, dissolves, sums -------------------------------------------------------------------------------------- */

VX_API VX_Result VX_FillWithOpaqueBlack(void* base, int32_t rowBytes, int32_t width, int32_t height,
                                        VX_PixelFormat format) VX_NOEXCEPT;
VX_API VX_Result VX_FillWithTransparentBlack(void* base, int32_t rowBytes, int32_t width, int32_t height,
                                             VX_PixelFormat format) VX_NOEXCEPT;
VX_API VX_Result VX_FillWithOpaqueWhite(void* base, int32_t rowBytes, int32_t width, int32_t height,
                                        VX_PixelFormat format) VX_NOEXCEPT;
VX_API VX_Result VX_FillWithTransparentWhite(void* base, int32_t rowBytes, int32_t width, int32_t height,
                                             VX_PixelFormat format) VX_NOEXCEPT;
VX_API VX_Result VX_FillWithColor(void* base, int32_t rowBytes, int32_t width, int32_t height, VX_PixelFormat format,
                                  const void* color, VX_PixelFormat colorFormat) VX_NOEXCEPT;
VX_API VX_Result VX_CrossDissolve(const void* a, int32_t aRowBytes, VX_PixelFormat aFormat, const void* b,
                                  int32_t bRowBytes, VX_PixelFormat bFormat, void* dst, int32_t dstRowBytes,
                                  VX_PixelFormat dstFormat, int32_t width, int32_t height, float mix,
                                  int32_t precisionHint) VX_NOEXCEPT;
VX_API VX_Result VX_MultiplyByConstant(int32_t width, int32_t height, const void* src, int32_t srcRowBytes, void* dst,
                                       int32_t dstRowBytes, const uint8_t constant[4], int32_t scale) VX_NOEXCEPT;
VX_API VX_Result VX_Accumulate(const void* const* srcs, const int32_t* srcRowBytes, const VX_PixelFormat* srcFormats,
                               int32_t count, void* dst, int32_t dstRowBytes, VX_PixelFormat dstFormat, int32_t width,
                               int32_t height, const float* weights, int32_t precisionHint) VX_NOEXCEPT;

#ifdef __cplusplus
} /* extern "C" */
#endif

#endif
