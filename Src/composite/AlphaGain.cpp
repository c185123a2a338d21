// Scaling alpha, and whether an opacity does anything.
#include <algorithm>
#include <cmath>

#include "composite/AlphaUtilityKernels.h"
#include "composite/GainLookup512.h"
#include "composite/Opacity.h"
#include "composite/RowJob.h"
#include "convert/Vbmi.h"
#include "formats/FormatBits.h"
#include "frame/FpModeGuard.h"
#include "vexel/compositing.h"

namespace vexel {
namespace {

constexpr float kMostGain8u = 255;  // greater ones give the same codes

// The kernel that works in a format itself; null if there is none.
const GainKernels* KernelFor(VX_PixelFormat format) noexcept {
  const uint32_t depth = Depth(format), alpha = AlphaKind(format);
  if (Layout(format) != kLayout4444 || (depth != kDepth8u && depth != kDepth32f)) return nullptr;
  const bool is8u = depth == kDepth8u;
  if (alpha == kAlphaStraight) {
    if (IsReversed(format)) return is8u ? &kGainAlphaFirst8u : &kGainAlphaFirst32f;
    return is8u ? &kGainAlphaLast8u : &kGainAlphaLast32f;
  }
  if (alpha != kAlphaPremultiplied) return nullptr;
  return !is8u ? &kGainPixel32f : IsYuv(format) ? &kGainVuyp8 : &kGainPixel8u;
}

// Whether the kernel treats every byte by itself.
bool ScalesAllBytes(VX_PixelFormat format) noexcept {
  return Depth(format) == kDepth8u && AlphaKind(format) == kAlphaPremultiplied;
}

VX_PixelFormat WorkingFormat(VX_PixelFormat dst, int32_t precisionHint) noexcept {
  using F = VX_PixelFormat;
  if (KernelFor(dst)) return dst;
  if (IsYuv(dst)) return precisionHint > 2 ? F::VUYP_4444_32f : F::VUYP_4444_8u;
  return Depth(dst) == kDepth32f ? F::BGRA_4444_32f : F::BGRA_4444_8u;
}

}  // namespace
}  // namespace vexel

using namespace vexel;

bool VX_IsOpacityNOP(int32_t blendMode, float opacity) noexcept {
  const FpModeGuard fpMode;
  const auto mode = static_cast<VX_BlendMode>(blendMode);
  return (mode == VX_BlendMode::Dissolve || mode == VX_BlendMode::Normal) && std::fabs(opacity - 1) < kAlphaGuard;
}

VX_Result VX_AlphaGain(const void* src, int32_t srcRowBytes, VX_PixelFormat srcFormat, void* dst, int32_t dstRowBytes,
                       VX_PixelFormat dstFormat, int32_t width, int32_t height, float gain,
                       int32_t precisionHint) noexcept {
  const FpModeGuard fpMode;
  if (IsSpecial(srcFormat)) return VX_ErrUnsupportedFormat;
  if (IsSpecial(dstFormat)) return VX_ErrUnsupportedDestinationFormat;
  if (!(gain >= kAlphaGuard)) return VX_FillWithTransparentBlack(dst, dstRowBytes, width, height, dstFormat);

  const VX_PixelFormat working = WorkingFormat(dstFormat, precisionHint);
  RowJob job(width, height, precisionHint);
  if (const VX_Result result = job.AddSource({src, srcRowBytes, srcFormat}, working)) return result;
  if (const VX_Result result = job.SetTarget({dst, dstRowBytes, dstFormat}, working)) return result;
  bool done;
  const VX_Result check = job.CheckBuffers(&done);
  if (check != VX_Success || done) return check;

  const GainKernel scale = (*KernelFor(working))[job.Variant()];
  const float factor = Depth(working) == kDepth8u ? std::min(gain, kMostGain8u) : gain;
  if (job.Variant() == KernelVariant::Avx512 && HasVbmi() && ScalesAllBytes(working)) {
    const GainCodes codes(scale, factor);
    const auto lookUp = IsYuv(working) ? GainVuyp512 : GainPixel512;
    return job.Run([&](const RowSpan& span) { lookUp(span.src[0], span.dst, span.count, codes); });
  }
  return job.Run([=](const RowSpan& span) { scale(span.src[0], span.dst, span.count, factor); });
}
