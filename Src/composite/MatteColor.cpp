// Taking out a matte colour that was mixed into the colour: C = a F + (1 - a) M becomes a F.
#include <algorithm>
#include <cstring>

#include "composite/AlphaUtilityKernels.h"
#include "composite/RowJob.h"
#include "convert/PlainPixels.h"
#include "formats/FormatBits.h"
#include "frame/FpModeGuard.h"
#include "vexel/compositing.h"

namespace vexel {
namespace {

bool HasMattedColor(VX_PixelFormat format) noexcept {
  return !IsSpecial(format) && !IsYuv(format) && Layout(format) == kLayout4444 && HasAlpha(format);
}

// The matte as kernels take it: without alpha, 15u channels limited to full scale.
PixelPattern MattePattern(const uint8_t* pixel, int depthClass, bool alphaFirst) noexcept {
  const size_t channelBytes = size_t{1} << depthClass, pixelBytes = 4 * channelBytes;
  PixelPattern matte;
  for (size_t at = 0; at < sizeof matte; at += pixelBytes) {
    std::memcpy(matte.bytes + at, pixel, pixelBytes);
    std::memset(matte.bytes + at + (alphaFirst ? 0 : 3 * channelBytes), 0, channelBytes);
  }
  if (depthClass != 1) return matte;
  uint16_t channels[8];
  std::memcpy(channels, matte.bytes, sizeof channels);
  for (uint16_t& c : channels) c = std::min(c, kFullScale<uint16_t>);
  std::memcpy(matte.bytes, channels, sizeof channels);
  return matte;
}

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
  RowJob job(width, height, conversionOption);
  job.AddSource({src, srcRowBytes, format}, format);
  job.SetTarget({dst, dstRowBytes, format}, format);
  bool done;
  const VX_Result check = job.CheckBuffers(&done);
  if (check != VX_Success || done) return check;

  const PixelPattern matte = MattePattern(pixel, depthClass, IsReversed(format));
  const MatteKernel subtract = kSubtractMatte[depthClass][IsReversed(format)][job.Variant()];
  return job.Run([&](const RowSpan& span) { subtract(span.src[0], span.dst, span.count, matte); });
}
