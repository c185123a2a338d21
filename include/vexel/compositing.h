/* Vexel: compositing, blend modes, alpha, fills and dissolves. Part of the flat C interface; vexel.h includes it.
 *
 * Buffers, formats, results and threads are as vexel.h says. In every function here:
 *
 * - Pictures meet upright: a source whose origin differs from the destination's (VX_IsOriginTopLeft) is read from its
 *   last stored row.
 * - The destination may be exactly one of the sources (same base, row bytes and format); other overlap is undefined.
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
/* clang-format off */
#define VX_BLEND_MODES(X) \
  X(Color, 0) X(ColorBurn, 1) X(ColorDodge, 2) X(Darken, 3) X(DarkerColor, 4) X(Difference, 5) \
  X(Dissolve, 6) X(Exclusion, 7) X(HardLight, 8) X(HardMix, 9) X(Hue, 10) X(Lighten, 11) \
  X(LighterColor, 12) X(LinearBurn, 13) X(LinearDodge, 14) X(LinearLight, 15) X(Luminosity, 16) X(Multiply, 17) \
  X(Normal, 18) X(Overlay, 19) X(PinLight, 20) X(Saturation, 21) X(Screen, 22) X(SoftLight, 23) \
  X(VividLight, 24) X(Subtract, 25) X(Divide, 26)
/* clang-format on */
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

/* Lays the source over the background: with as = source alpha times opacity and background alpha ab, the result has
 * alpha ao = as + ab (1 - as) and colour (s as + d ab (1 - as)) / ao. A source or background whose alpha is absent or
 * ignored is opaque.
 *
 * Opacity is clamped to 0..1; below 8e-6 and as NaN it is 0, above 1 - 8e-6 it is 1. At 0 the call converts the
 * background with VX_Convert and gives its result, at 1 the source if that has no alpha; nothing is done where that
 * picture is the destination itself, and the other one only has to be of a raster format.
 *
 * The arithmetic is the destination's: 8u in 8 bits, anything else (10u and 15u too) in 32f, linear formats in light,
 * 4:2:2 in VUYP_4444_8u or VUYP_4444_32f, 709 formats among them. Inputs are brought to straight alpha, but stay
 * premultiplied where neither is straight and the result is premultiplied or opaque. Destinations without alpha get the
 * result over black.
 * Each pixel's result depends on its own pixels only. In 8u every channel is within 0.54 of the exact result; alpha 0
 * and 255 over an opaque background give background and source exactly. Straight results have black for a colour (16,
 * 128, 128 in 8-bit Y'CbCr) where ao is 7.63e-6 or less in 8u, less than 8e-6 in 32f. 32f results are not clamped; the
 * sign and payload of NaNs are unspecified.
 *
 * `conversionOption` is the render quality of the row conversions (see VX_Convert); `flag` is reserved.
 * VX_ErrUnsupportedFormat: source or background is no raster format. VX_ErrUnsupportedDestinationFormat: likewise the
 * destination. VX_ErrFormatNotHandled: raster formats between which no conversion leads. */
VX_API VX_Result VX_Composite(const void* src, int32_t srcRowBytes, VX_PixelFormat srcFormat, const void* background,
                              int32_t backgroundRowBytes, VX_PixelFormat backgroundFormat, void* dst,
                              int32_t dstRowBytes, VX_PixelFormat dstFormat, int32_t width, int32_t height,
                              float opacity, int32_t conversionOption, bool flag) VX_NOEXCEPT;
/* The same through one of the VX_BLEND_MODES; Normal is VX_Composite itself. docs/blending.md has the formula of each.
 *
 * Pixels are blended as BGRA_4444_32f with straight alpha; as = source alpha x opacity, ab = background alpha:
 *
 *   ao = ab + as - ab as,  t = as / ao,  colour = (1 - t) d + t ((1 - ab) s + ab B(s, d))
 *
 * where B is the mode's function, and colour 0 where |ao| < 8e-6. Only some modes clamp, so float results may leave
 * 0..1 and integer ones saturate. DarkerColor and LighterColor take a pixel as a whole by its luma, with the weights of
 * BT.709 in rows of more than 720 pixels and those of BT.601 otherwise; ties keep the background.
 *
 * Dissolve mixes nothing: a pixel with as >= 8e-6 is the source's, its own alpha included, with a probability of as,
 * else the background's. Up to 64 rows draw from the generator of the C run-time library, one value for each pixel that
 * needs one; more than one row seed it with 1 first, one row goes on with the calling thread's. In taller pictures the
 * pixel in stored row r, column x of the destination takes value r x width + x of the sequence seeded with 1.
 *
 * Opacities outside 0..1 are used as they are, NaN counts as 0. A NaN colour stays in its channel in the modes that
 * work channel by channel, a NaN alpha spreads over its pixel; clamping takes a NaN for its lower limit.
 *
 * In this order: VX_ErrUnsupportedFormat and VX_ErrUnsupportedDestinationFormat as above, VX_ErrFormatNotHandled for a
 * mode outside the list and for formats that BGRA_4444_32f cannot be had from or made into. */
VX_API VX_Result VX_CompositeWithBlendMode(const void* src, int32_t srcRowBytes, VX_PixelFormat srcFormat,
                                           const void* background, int32_t backgroundRowBytes,
                                           VX_PixelFormat backgroundFormat, void* dst, int32_t dstRowBytes,
                                           VX_PixelFormat dstFormat, int32_t width, int32_t height, float opacity,
                                           int32_t blendMode, int32_t conversionOption, bool flag) VX_NOEXCEPT;
/* Lays the source over opaque black; the result is opaque. Opacity as in VX_Composite; 0 is VX_FillWithOpaqueBlack and
 * its result, whatever raster the source is.
 *
 * Done in the destination's own format if that is BGRA, ARGB or VUYA in 8u or 32f, else in BGRA_4444 or VUYA_4444 (709
 * for 709 destinations), in 32f if the precision hint is above 2, in 8u otherwise. Below opacity 1 the 709 formats,
 * VUYA_4444_*_709 included, go through their 601 ones. The precision hint is also the render quality of the row
 * conversions.
 *
 * 8u: opacity counts in 1/255, rounded half up; alpha times opacity and colour times alpha are divided by 255 and
 * rounded to nearest; Y'CbCr is scaled about 16, 128, 128. 32f: colours are multiplied by alpha times opacity, or kept
 * where that exceeds 1 - 8e-6.
 *
 * VX_ErrUnsupportedFormat: the source is no raster format or cannot be converted. VX_ErrUnsupportedDestinationFormat:
 * likewise the destination. */
VX_API VX_Result VX_CompositeToBlack(const void* src, int32_t srcRowBytes, VX_PixelFormat srcFormat, void* dst,
                                     int32_t dstRowBytes, VX_PixelFormat dstFormat, int32_t width, int32_t height,
                                     float opacity, int32_t precisionHint) VX_NOEXCEPT;
/* The same at full opacity, row by row: rows whose alpha as worked on is opaque throughout (255, 1.0) are converted
 * straight from the source format to the destination's, those with alpha 0 throughout are filled with opaque black.
 * *alphaState receives 0 if every row was opaque (also if there are none), 1 if every row was clear, 2 otherwise; it
 * may be null, and stays as it is on failure. In place, opaque rows are not touched. */
VX_API VX_Result VX_CompositeToBlackAndTestSourceAlpha(const void* src, int32_t srcRowBytes, VX_PixelFormat srcFormat,
                                                       void* dst, int32_t dstRowBytes, VX_PixelFormat dstFormat,
                                                       int32_t width, int32_t height, int32_t* alphaState,
                                                       int32_t precisionHint) VX_NOEXCEPT;

/* ---- Alpha ------------------------------------------------------------------------------------------------------- */

/* Opaque alpha is 255 in 8u, 32768 in 15u, 1.0 in 32f. */

/* Whether an opacity changes nothing: within 8e-6 of 1, in the modes Dissolve and Normal only. */
VX_API bool VX_IsOpacityNOP(int32_t blendMode, float opacity) VX_NOEXCEPT;

/* Scales alpha, and with premultiplied alpha the colour too (8-bit Y'CbCr about video black). 8u results are rounded as
 * the processor is set to (to nearest, ties to even) and saturated, so a gain above 1 is clamped; 32f results are not
 * clamped. A gain below 8e-6, a negative one and NaN give VX_FillWithTransparentBlack and its result. Done in the
 * destination's own format if that has straight or premultiplied alpha in 8u or 32f, else in VUYP_4444_32f (Y'CbCr,
 * precision hint above 2), VUYP_4444_8u (Y'CbCr), BGRA_4444_32f (32f RGB) or BGRA_4444_8u (any other, 15u too). The
 * precision hint is also the render quality of the row conversions.
 * VX_ErrUnsupportedFormat: the source is no raster format. VX_ErrUnsupportedDestinationFormat: likewise the
 * destination. VX_ErrFailed: no conversion. */
VX_API VX_Result VX_AlphaGain(const void* src, int32_t srcRowBytes, VX_PixelFormat srcFormat, void* dst,
                              int32_t dstRowBytes, VX_PixelFormat dstFormat, int32_t width, int32_t height, float gain,
                              int32_t precisionHint) VX_NOEXCEPT;

/* Sets alpha to opaque or to 0, in place; for BGRA_4444_8u, _15u, _32f and _32f_Linear, ARGB_4444_32f and _32f_Linear,
 * VUYA_4444_8u and _32f. VX_ErrFormatNotHandled: any other format. VX_ErrFailed: a null base, rows that overlap, a size
 * that cannot be expressed. */
VX_API VX_Result VX_SetAlphaChannel(uint32_t width, uint32_t height, void* base, int32_t rowBytes,
                                    VX_PixelFormat format, bool opaque) VX_NOEXCEPT;
/* Writes opaque minus the source's alpha into the destination, whose colours stay as they are. A 15u alpha above 32768
 * wraps around. VX_ErrUnsupportedFormat: not 4:4:4:4 with an alpha channel (an ignored one is one) in 8u, 15u or 32f.
 */
VX_API VX_Result VX_InvertAlpha(const void* src, int32_t srcRowBytes, void* dst, int32_t dstRowBytes,
                                VX_PixelFormat format, int32_t width, int32_t height) VX_NOEXCEPT;
/* Copies the colours and sets alpha to a constant of 0..1: in 8u and 15u rounded to nearest and clamped, NaN as 0; in
 * 32f the value itself, whatever it is. Row bytes are rounded toward zero to a multiple of 4. VX_ErrFormatNotHandled:
 * formats that VX_InvertAlpha refuses. */
VX_API VX_Result VX_CopyAndSetAlpha(const void* src, int32_t srcRowBytes, void* dst, int32_t dstRowBytes,
                                    VX_PixelFormat format, int32_t width, int32_t height, float alpha) VX_NOEXCEPT;
/* Takes out a matte colour M that was mixed into the colour: each colour channel C becomes C - M (1 - a), rounded as
 * premultiplying is, or 0 where that is negative; alpha is copied. `matteColor` is one pixel of its own format, whose
 * alpha counts only where its conversion to `format` makes it count. A 15u alpha above 32768 is opaque.
 * VX_ErrUnsupportedFormat: not RGB 4:4:4:4 with straight or premultiplied alpha. VX_ErrFormatNotHandled: such a format
 * in a depth other than 8u, 15u and 32f. Otherwise what VX_Convert says about the matte. */
VX_API VX_Result VX_UnPremultiplyAgainstMatteColor(const void* src, int32_t srcRowBytes, void* dst, int32_t dstRowBytes,
                                                   VX_PixelFormat format, int32_t width, int32_t height,
                                                   const void* matteColor, VX_PixelFormat matteFormat,
                                                   int32_t conversionOption) VX_NOEXCEPT;
/* Takes each pixel from `a` where its bit in the mask is set, from `b` where it is clear. A mask row holds one bit for
 * each pixel, uppermost first; pixel 0 is bit 7 - maskBitOffset of its first byte. The mask's rows belong to the
 * destination's stored rows and may have any signed row bytes; no byte beyond a row's last bit is read.
 * `conversionOption` is the render quality with which a and b are converted to the destination's format.
 * VX_ErrUnsupportedDestinationFormat: not pixels of 4, 8 or 16 bytes (4:4:4:4, or 10-bit RGB).
 * VX_ErrUnsupportedFormat: a or b is no raster format. VX_ErrFailed: no conversion.
 * VX_ErrArgumentOutOfRange: a bit offset outside 0..7 too. VX_ErrNullSource: no mask, too. */
VX_API VX_Result VX_OneBitMaskComposite(const void* a, int32_t aRowBytes, VX_PixelFormat aFormat, const void* b,
                                        int32_t bRowBytes, VX_PixelFormat bFormat, const void* mask,
                                        int32_t maskRowBytes, int32_t maskBitOffset, void* dst, int32_t dstRowBytes,
                                        VX_PixelFormat dstFormat, int32_t width, int32_t height,
                                        int32_t conversionOption) VX_NOEXCEPT;

/* ---- Fills, dissolves, sums -------------------------------------------------------------------------------------- */

/* Fill a whole buffer with a constant. Rows are whole pixels, 4:2:2 pairs (an odd width fills its last pair) or V210
 * groups; their padding is not touched. Black and white are
 *
 *   RGB            0 and full scale (255, 32768, 1.0; 1023 in 10 bits), linear light too
 *   YUV 8u         luma 16 and 235, chroma 128; in V210 four times that, in 32f 0 and 1 with chroma 0
 *   4:2:0 planar   luma 16 and 235, chroma 128, full range too; width / 2 x height / 2 samples of chroma, rounded down.
 *                  The block is laid out as VX_GetPlanarBuffers says, its row bytes are not used
 *   4:2:0 biplanar the same, in 10 bits times 256, but for whole chroma planes, halves rounded up
 *   NTSCDV25       black only: a compressed frame of 120,000 bytes, 720 x 480 4:1:1 with two silent channels of sound;
 *   PALDV25        one of 144,000 bytes, 720 x 576 4:2:0. Whatever width, height (unless 0) and row bytes say
 *
 * An opaque fill writes alpha, the ignored one of X formats too, as full scale. Every other format (DV50, DV100, white
 * DV25, planar 4:2:0 above 8 bits, Invalid) is VX_ErrFormatNotHandled. A transparent fill writes the same colours under
 * alpha 0, in premultiplied formats too; formats without straight or premultiplied alpha are
 * VX_ErrUnsupportedDestinationFormat.
 *
 * More than one row with |rowBytes| below a row's bytes is VX_ErrArgumentOutOfRange. */
VX_API VX_Result VX_FillWithOpaqueBlack(void* base, int32_t rowBytes, int32_t width, int32_t height,
                                        VX_PixelFormat format) VX_NOEXCEPT;
VX_API VX_Result VX_FillWithTransparentBlack(void* base, int32_t rowBytes, int32_t width, int32_t height,
                                             VX_PixelFormat format) VX_NOEXCEPT;
VX_API VX_Result VX_FillWithOpaqueWhite(void* base, int32_t rowBytes, int32_t width, int32_t height,
                                        VX_PixelFormat format) VX_NOEXCEPT;
VX_API VX_Result VX_FillWithTransparentWhite(void* base, int32_t rowBytes, int32_t width, int32_t height,
                                             VX_PixelFormat format) VX_NOEXCEPT;
/* Fills a 4:4:4:4 buffer with an A, P or X channel with one pixel, converted into the buffer's format as VX_Convert
 * does it; of a 4:2:2 pair or V210 group the first pixel counts. VX_ErrUnsupportedFormat: another buffer format, or a
 * DV or 4:2:0 colour. VX_ErrNullSource: no colour. Other codes as VX_Convert. */
VX_API VX_Result VX_FillWithColor(void* base, int32_t rowBytes, int32_t width, int32_t height, VX_PixelFormat format,
                                  const void* color, VX_PixelFormat colorFormat) VX_NOEXCEPT;

/* dst = a (1 - mix) + b mix. A mix below 8e-6, NaN included, is VX_Convert of a, one within 8e-6 of 1 or above is
 * VX_Convert of b, with all that it accepts (4:2:0, for instance) and returns; the other image is not looked at.
 *
 * In between, both images are converted into the destination's format and mixed there: channel by channel where alpha
 * is premultiplied or missing, and under opaque alpha where it is ignored. Straight alpha weights the colours (c =
 * (ca aa (1 - mix) + cb ab mix) / alpha, alpha = aa (1 - mix) + ab mix; black where alpha is below 8e-6), so pixels of
 * equal alpha mix channel by channel as well. 10-bit formats mix as codes, linear ones in light. If any of the three
 * depths differs from the others, all are mixed in 32-bit float and rounded once, unless `precisionHint` is 2. The hint
 * is also the render quality of the conversions. Products and sums are single precision; integers round to nearest,
 * ties to even, and 15u counts at most 32768. An odd width of 4:2:2 mixes its last pair whole.
 *
 * VX_ErrUnsupportedFormat: a DV or 4:2:0 source; VX_ErrUnsupportedDestinationFormat: such a destination. VX_ErrFailed:
 * no conversion. */
VX_API VX_Result VX_CrossDissolve(const void* a, int32_t aRowBytes, VX_PixelFormat aFormat, const void* b,
                                  int32_t bRowBytes, VX_PixelFormat bFormat, void* dst, int32_t dstRowBytes,
                                  VX_PixelFormat dstFormat, int32_t width, int32_t height, float mix,
                                  int32_t precisionHint) VX_NOEXCEPT;

/* dst = min(255, src * constant * 2^-scale) for four channels of bytes, rounded to nearest, ties to even; any scale.
 * Everything that it refuses is VX_ErrFailed: null pointers, sizes below 1, |rowBytes| below a row's. */
VX_API VX_Result VX_MultiplyByConstant(int32_t width, int32_t height, const void* src, int32_t srcRowBytes, void* dst,
                                       int32_t dstRowBytes, const uint8_t constant[4], int32_t scale) VX_NOEXCEPT;

/* dst = the sum of weights[i] * srcs[i] over `count` images of any raster formats, all of one size. Null weights are
 * all 1; an image of weight 0 is not read. Sums are taken in 32-bit float in the order of the images, in the
 * destination's channels, and brought to its depth once, saturated as VX_Convert does; YUV sums up about black. Alpha
 * is a channel like the others, opaque where it is ignored; where straight alphas differ, sum up into a premultiplied
 * format. `precisionHint` is the render quality of the conversions.
 *
 * No images give black, with alpha 0 where there is one. VX_ErrArgumentOutOfRange: a negative count too.
 * VX_ErrNullSource: one of the arrays, or one of the images. Formats as in VX_CrossDissolve. */
VX_API VX_Result VX_Accumulate(const void* const* srcs, const int32_t* srcRowBytes, const VX_PixelFormat* srcFormats,
                               int32_t count, void* dst, int32_t dstRowBytes, VX_PixelFormat dstFormat, int32_t width,
                               int32_t height, const float* weights, int32_t precisionHint) VX_NOEXCEPT;

#ifdef __cplusplus
} /* extern "C" */
#endif

#endif
