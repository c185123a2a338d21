// The linear mix of two images.
#include <cstdint>

#include "composite/DissolveKernels.h"
#include "composite/Opacity.h"
#include "composite/RowJob.h"
#include "formats/FormatBits.h"
#include "frame/FpModeGuard.h"
#include "vexel/compositing.h"

namespace vexel {
namespace {

VX_Result CrossDissolve(const SourceImage& a, const SourceImage& b, const TargetImage& target, int32_t width,
                        int32_t height, float mix, int32_t precisionHint) noexcept {
  if (IsSpecial(a.format) || IsSpecial(b.format)) return VX_ErrUnsupportedFormat;
  if (IsSpecial(target.format)) return VX_ErrUnsupportedDestinationFormat;
  Plan plan;
  if (const VX_Result result = MakePlan(target.format, target.format, precisionHint, &plan)) return result;
  const bool sameDepth = Depth(a.format) == Depth(b.format) && Depth(b.format) == Depth(target.format);
  const VX_PixelFormat working = sameDepth || precisionHint == 2 ? target.format : InFloat(target.format);

  RowJob job(width, height, precisionHint);
  if (const VX_Result result = job.AddSource(a, working)) return result;
  if (const VX_Result result = job.AddSource(b, working)) return result;
  if (const VX_Result result = job.SetTarget(target, working)) return result;
  bool done;
  const VX_Result check = job.CheckBuffers(&done);
  if (check != VX_Success || done) return check;
  const MixKernel kernel = (*MixKernelFor(working))[job.Variant()];
  const bool ofIntegers = Depth(working) != kDepth32f;
  return job.Run([=](const RowSpan& span) {
    const NearestRounding rounding(ofIntegers);
    const auto bytes = static_cast<size_t>(UnpaddedRowBytes(working, static_cast<int64_t>(span.count)));
    kernel(span.src[0], span.src[1], span.dst, bytes, mix);
  });
}

}  // namespace
}  // namespace vexel

using namespace vexel;

VX_Result VX_CrossDissolve(const void* a, int32_t aRowBytes, VX_PixelFormat aFormat, const void* b, int32_t bRowBytes,
                           VX_PixelFormat bFormat, void* dst, int32_t dstRowBytes, VX_PixelFormat dstFormat,
                           int32_t width, int32_t height, float mix, int32_t precisionHint) noexcept {
  const FpModeGuard fpMode;
  const SourceImage imageA{a, aRowBytes, aFormat}, imageB{b, bRowBytes, bFormat};
  const TargetImage target{dst, dstRowBytes, dstFormat};
  // NaN counts as 0.
  if (!(mix >= kAlphaGuard)) return CopyPicture(imageA, target, width, height, precisionHint);
  if (mix + kAlphaGuard > 1.0f) return CopyPicture(imageB, target, width, height, precisionHint);
  return CrossDissolve(imageA, imageB, target, width, height, mix, precisionHint);
}
