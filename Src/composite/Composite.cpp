// VX_Composite: the choice of a kernel and its working formats, and the short cuts through plain conversion.
#include "composite/NormalKernels.h"
#include "composite/Opacity.h"
#include "composite/RowJob.h"
#include "formats/FormatBits.h"
#include "frame/FpModeGuard.h"
#include "vexel/compositing.h"

namespace vexel {
namespace {

using F = VX_PixelFormat;

constexpr F WithAlphaKind(F format, uint32_t kind) { return FromBits((Bits(format) & ~kAlphaMask) | kind); }

// The 4:4:4:4 format, alpha last, in which a result for `destination` is computed.
constexpr F ResultFormat(F destination) {
  const bool narrow = Depth(destination) == kDepth8u;
  if (Layout(destination) == kLayout422) return narrow ? F::VUYP_4444_8u : F::VUYP_4444_32f;
  uint32_t bits = Bits(destination) & ~(kReversedBit | kLayoutMask);
  if (!narrow) bits = (bits & ~kDepthMask) | kDepth32f;
  return HasAlpha(destination) ? FromBits(bits) : WithAlphaKind(FromBits(bits), kAlphaPremultiplied);
}

VX_Result Composite(const SourceImage& src, const SourceImage& background, const TargetImage& dst, int32_t width,
                    int32_t height, float opacity, int32_t renderQuality) noexcept {
  if (IsSpecial(src.format) || IsSpecial(background.format)) return VX_ErrUnsupportedFormat;
  if (IsSpecial(dst.format)) return VX_ErrUnsupportedDestinationFormat;
  opacity = UsableOpacity(opacity);
  if (opacity == 0.0f) return CopyPicture(background, dst, width, height, renderQuality);
  if (opacity == 1.0f && !HasAlpha(src.format)) return CopyPicture(src, dst, width, height, renderQuality);
  F result = ResultFormat(dst.format);
  // Where everything is alpha-first RGB of one depth, three reversals are saved; the bytes are the same.
  const auto alphaFirst = [](F format) {
    return (Bits(format) & ~(kAlphaMask | kDepthMask)) == kReversedBit &&
           (Depth(format) == kDepth8u || Depth(format) == kDepth32f);
  };
  const bool keepsOrder = alphaFirst(src.format) && alphaFirst(background.format) && alphaFirst(dst.format) &&
                          Depth(src.format) == Depth(dst.format) && Depth(background.format) == Depth(dst.format);
  if (keepsOrder) result = FromBits(Bits(result) | kReversedBit);
  const OverChoice choice{IsYuv(result), AlphaKind(result) == kAlphaStraight, keepsOrder, HasAlpha(src.format),
                          HasAlpha(background.format)};
  // Pictures that are premultiplied anyway are composited as they are.
  const auto is = [](F format, uint32_t kind) { return AlphaKind(format) == kind; };
  const bool premultiplied = (is(src.format, kAlphaPremultiplied) || is(background.format, kAlphaPremultiplied)) &&
                             !is(src.format, kAlphaStraight) && !is(background.format, kAlphaStraight) &&
                             !(choice.straight && choice.backgroundAlpha);
  const uint32_t inputKind = premultiplied ? kAlphaPremultiplied : kAlphaStraight;
  const auto input = [&](bool alpha) { return WithAlphaKind(result, alpha ? inputKind : kAlphaIgnored); };
  const F srcFormat = input(choice.sourceAlpha), backgroundFormat = input(choice.backgroundAlpha);
  // An opaque result is the same in every alpha kind.
  if (!choice.backgroundAlpha && AlphaKind(dst.format) == kAlphaIgnored) result = WithAlphaKind(result, kAlphaIgnored);

  RowJob job(width, height, renderQuality);
  if (job.AddSource(src, srcFormat) || job.AddSource(background, backgroundFormat) || job.SetTarget(dst, result))
    return VX_ErrFormatNotHandled;
  bool done;
  const VX_Result check = job.CheckBuffers(&done);
  if (check != VX_Success || done) return check;

  const bool narrow = Depth(result) == kDepth8u;
  const OverKernelSet& kernels = premultiplied ? (narrow ? OverPremultiplied8u(choice) : OverPremultiplied32f(choice))
                                               : (narrow ? Over8u(choice) : Over32f(choice));
  const OverKernel over = kernels[job.Variant()];
  job.KernelStreams();
  return job.Run([=](const RowSpan& span) {
    const NearestRounding rounding(narrow);
    over(span.src[0], span.src[1], span.dst, span.count, opacity, span.stream);
  });
}

}  // namespace
}  // namespace vexel

VX_Result VX_Composite(const void* src, int32_t srcRowBytes, VX_PixelFormat srcFormat, const void* background,
                       int32_t backgroundRowBytes, VX_PixelFormat backgroundFormat, void* dst, int32_t dstRowBytes,
                       VX_PixelFormat dstFormat, int32_t width, int32_t height, float opacity, int32_t conversionOption,
                       bool) noexcept {
  const vexel::FpModeGuard fpMode;
  return vexel::Composite({src, srcRowBytes, srcFormat}, {background, backgroundRowBytes, backgroundFormat},
                          {dst, dstRowBytes, dstFormat}, width, height, opacity, conversionOption);
}
