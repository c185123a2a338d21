// Taking out a matte colour that was mixed into the colour: C = a F + (1 - a) M becomes a F.
#include <cstring>

#include "composite/AlphaUtilityKernels.h"
#include "composite/RowJob.h"
#include "formats/FormatBits.h"
#include "frame/FpModeGuard.h"
#include "vexel/compositing.h"

namespace vexel {
namespace {

constexpr VX_PixelFormat WithAlphaKind(VX_PixelFormat format, uint32_t kind) noexcept {
  return FromBits((Bits(format) & ~kAlphaMask) | kind);
}

bool HasMattedColor(VX_PixelFormat format) noexcept {
  const uint32_t alpha = AlphaKind(format);
  return !IsSpecial(format) && !IsYuv(format) && Layout(format) == kLayout4444 &&
         (alpha == kAlphaStraight || alpha == kAlphaPremultiplied);
}

// Pixels done at a time: the mattes under a block of them stay in the first-level cache.
constexpr size_t kMatteBlock = kChainBlock;

}  // namespace
}  // namespace vexel

using namespace vexel;

VX_Result VX_UnPremultiplyAgainstMatteColor(const void* src, int32_t srcRowBytes, void* dst, int32_t dstRowBytes,
                                            VX_PixelFormat format, int32_t width, int32_t height,
                                            const void* matteColor, VX_PixelFormat matteFormat,
                                            int32_t conversionOption) noexcept {
  const FpModeGuard fpMode;
  if (!HasMattedColor(format)) return VX_ErrUnsupportedFormat;
  const int depthClass = DepthClass(format);
  if (depthClass < 0) return VX_ErrFormatNotHandled;
  uint8_t pixel[16];
  if (const VX_Result result = VX_Convert(matteColor, 0, matteFormat, pixel, 0, format, 1, 1, conversionOption))
    return result;
  RowConverter premultiply;
  if (const VX_Result result =
          premultiply.Prepare(WithAlphaKind(format, kAlphaStraight), WithAlphaKind(format, kAlphaPremultiplied),
                              conversionOption, static_cast<int32_t>(kMatteBlock)))
    return result;

  RowJob job(width, height, conversionOption);
  job.AddSource({src, srcRowBytes, format}, format);
  job.SetTarget({dst, dstRowBytes, format}, format);
  bool done;
  const VX_Result check = job.CheckBuffers(&done);
  if (check != VX_Success || done) return check;

  PixelPattern matte;
  const size_t pixelBytes = size_t{4} << depthClass;
  for (size_t at = 0; at < sizeof matte; at += pixelBytes) std::memcpy(matte.bytes + at, pixel, pixelBytes);
  const MatteKernel putMatte = kMatteUnderInverse[depthClass][IsReversed(format)][job.Variant()];
  const MergeKernel subtract = kSubtractMatte[depthClass][IsReversed(format)][job.Variant()];
  return job.Run([&](const RowSpan& span) {
    alignas(64) uint8_t straight[kMatteBlock * 16], premultiplied[kMatteBlock * 16];
    putMatte(span.src[0], straight, span.count, matte);
    premultiply.ConvertBlock(straight, premultiplied, span.count);
    subtract(span.src[0], premultiplied, span.dst, span.count);
  });
}
