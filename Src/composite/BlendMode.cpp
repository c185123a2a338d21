// VX_CompositeWithBlendMode: the choice of a kernel and of its working formats.
#include <cmath>
#include <limits>

#include "composite/BlendKernels.h"
#include "composite/RowJob.h"
#include "formats/FormatBits.h"
#include "frame/FpModeGuard.h"
#include "frame/RuntimeRandom.h"

namespace vexel {
namespace {

using M = VX_BlendMode;
constexpr VX_PixelFormat kWorking = VX_PixelFormat::BGRA_4444_32f;
constexpr float kUnlimited = std::numeric_limits<float>::infinity();
// Every integer format holds less; times the scale of the widest one, it still fits in 32 bits.
constexpr float kSaturated = 32768;
// Rows up to this are taken for standard definition.
constexpr int32_t kWidestSd = 720;

const BlendKernels* KernelsOf(int32_t mode) noexcept {
#define VX_BLEND_CASE(name) \
  case M::name:             \
    return &kBlend##name;
  switch (static_cast<M>(mode)) {
    VX_KERNEL_BLEND_MODES(VX_BLEND_CASE)
    default:
      return nullptr;
  }
#undef VX_BLEND_CASE
}

struct BlendJob {
  SourceImage src, background;
  TargetImage dst;
  int32_t width, height, renderQuality;
  float opacity;
};

// BGRA, ARGB and their X and P kinds in 8 bits.
bool IsByteRgb(VX_PixelFormat format) noexcept {
  return (Bits(format) & ~(kAlphaMask | kReversedBit)) == kDepth8u && AlphaKind(format) != kAlphaNone;
}

BytePixels BytePixelsOf(VX_PixelFormat format) noexcept {
  return {IsReversed(format), AlphaKind(format) == kAlphaIgnored, AlphaKind(format) != kAlphaStraight};
}

// Rows in working formats, then `kernel` over all spans.
template <class Kernel>
VX_Result RunJob(const BlendJob& blend, bool inBytes, const Kernel& kernel) noexcept {
  RowJob job(blend.width, blend.height, blend.renderQuality);
  const auto working = [&](VX_PixelFormat format) { return inBytes ? format : kWorking; };
  if (job.AddSource(blend.src, working(blend.src.format)) != VX_Success ||
      job.AddSource(blend.background, working(blend.background.format)) != VX_Success ||
      job.SetTarget(blend.dst, working(blend.dst.format)) != VX_Success)
    return VX_ErrFormatNotHandled;
  bool done = false;
  if (const VX_Result result = job.CheckBuffers(&done); result != VX_Success || done) return result;
  return job.Run([&](const RowSpan& span) { kernel(span, job.Variant()); });
}

VX_Result Blend(const BlendJob& blend, const BlendKernels& kernels) noexcept {
  const VX_PixelFormat src = blend.src.format, background = blend.background.format, dst = blend.dst.format;
  const bool inBytes = IsByteRgb(src) && AlphaKind(src) != kAlphaPremultiplied && IsByteRgb(background) &&
                       AlphaKind(background) != kAlphaPremultiplied && IsByteRgb(dst);
  const bool isSd = blend.width <= kWidestSd;
  const BlendArguments arguments = {
      blend.opacity,     {isSd ? 0.114f : 0.0722f, isSd ? 0.587f : 0.7152f, isSd ? 0.299f : 0.2126f},
      BytePixelsOf(src), BytePixelsOf(background),
      BytePixelsOf(dst), Depth(dst) == kDepth32f ? kUnlimited : kSaturated};
  const auto& variants = inBytes ? kernels.bytes : kernels.floats;
  return RunJob(blend, inBytes, [&](const RowSpan& span, KernelVariant variant) {
    variants[variant](span.src[0], span.src[1], span.dst, span.count, arguments);
  });
}

// In taller pictures than one thread works on, a pixel's place decides what it draws.
VX_Result Dissolve(const BlendJob& blend) noexcept {
  // Pixels of four bytes can be copied where all three pictures have them alike.
  const VX_PixelFormat format = blend.dst.format;
  const bool inBytes = IsByteRgb(format) && AlphaKind(format) == kAlphaStraight && blend.src.format == format &&
                       blend.background.format == format;
  const bool reversed = IsReversed(format);
  if (blend.height > kInlineRows) {
    const auto& variants = inBytes ? kBlendDissolveBytesByPlace : kBlendDissolveFloatsByPlace;
    return RunJob(blend, inBytes, [&](const RowSpan& span, KernelVariant variant) {
      RandomSequence sequence(1);
      sequence.Skip(static_cast<uint64_t>(span.row) * static_cast<uint64_t>(blend.width) +
                    static_cast<uint64_t>(span.column));
      variants[variant](span.src[0], span.src[1], span.dst, span.count, reversed, blend.opacity, sequence);
    });
  }
  // Not the thread's own sequence: scratch memory may draw from that one.
  RandomSequence sequence = RuntimeRandomSequence();
  const DissolveBlendKernel kernel = inBytes ? kBlendDissolveBytesInTurn : kBlendDissolveFloatsInTurn;
  const VX_Result result = RunJob(blend, inBytes, [&](const RowSpan& span, KernelVariant) {
    kernel(span.src[0], span.src[1], span.dst, span.count, reversed, blend.opacity, sequence);
  });
  RuntimeRandomSequence() = sequence;
  return result;
}

}  // namespace
}  // namespace vexel

using namespace vexel;

VX_Result VX_CompositeWithBlendMode(const void* src, int32_t srcRowBytes, VX_PixelFormat srcFormat,
                                    const void* background, int32_t backgroundRowBytes, VX_PixelFormat backgroundFormat,
                                    void* dst, int32_t dstRowBytes, VX_PixelFormat dstFormat, int32_t width,
                                    int32_t height, float opacity, int32_t blendMode, int32_t conversionOption,
                                    bool flag) noexcept {
  if (blendMode == static_cast<int32_t>(M::Normal))
    return VX_Composite(src, srcRowBytes, srcFormat, background, backgroundRowBytes, backgroundFormat, dst, dstRowBytes,
                        dstFormat, width, height, opacity, conversionOption, flag);
  const bool isDissolve = blendMode == static_cast<int32_t>(M::Dissolve);
  if (isDissolve && height > 1) SeedRuntimeRandom(1);
  const FpModeGuard guard;
  if (IsSpecial(srcFormat) || IsSpecial(backgroundFormat)) return VX_ErrUnsupportedFormat;
  if (IsSpecial(dstFormat)) return VX_ErrUnsupportedDestinationFormat;
  const BlendJob blend = {{src, srcRowBytes, srcFormat},
                          {background, backgroundRowBytes, backgroundFormat},
                          {dst, dstRowBytes, dstFormat},
                          width,
                          height,
                          conversionOption,
                          std::isnan(opacity) ? 0.0f : opacity};
  if (isDissolve) return Dissolve(blend);
  const BlendKernels* const kernels = KernelsOf(blendMode);
  return kernels ? Blend(blend, *kernels) : VX_ErrFormatNotHandled;
}
