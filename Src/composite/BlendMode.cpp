// VX_CompositeWithBlendMode: the choice of a kernel, and Dissolve.
#include <cmath>
#include <cstring>
#include <limits>

#include "composite/BlendKernels.h"
#include "composite/PlainBlend.h"
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

// ---- Dissolve

// Copies the source pixel with a probability of its alpha times `opacity`, else the background's. kPixel is
// the size of a pixel. kPlaced draws for every pixel, needed or not, so that a pixel's place decides what it gets.
// Without branches, which nothing could predict.
template <size_t kPixel, bool kPlaced>
void DissolveRow(const RowSpan& span, size_t alphaAt, float opacity, RandomSequence& randomSequence) noexcept {
  const uint8_t *const src = span.src[0], *const background = span.src[1];
  uint8_t* const dst = span.dst;
  const size_t end = span.count * kPixel;
  RandomSequence sequence = randomSequence;
  for (size_t at = 0; at < end; at += kPixel) {
    float alpha = src[at + alphaAt] * k8uTo32f;
    if constexpr (kPixel == 16) std::memcpy(&alpha, src + at + alphaAt, sizeof alpha);
    const float p = alpha * opacity;
    // More than certain is certain; NaN counts as negative.
    const int n = static_cast<int>(plain::Min(plain::Max(p, -1), 1) * 32767.0f);
    const bool isNothing = std::fabs(p) < kAlphaGuard;
    RandomSequence next = sequence;
    const int r = next.Next();
    if (kPlaced || (!isNothing & (n >= 0))) sequence = next;
    const uint32_t fromBackground = 0u - static_cast<uint32_t>(isNothing | ((n >= 0) & (r > n)));
    uint32_t s[kPixel / 4], d[kPixel / 4];
    std::memcpy(s, src + at, kPixel);
    std::memcpy(d, background + at, kPixel);
    for (size_t i = 0; i < kPixel / 4; ++i) d[i] = (d[i] & fromBackground) | (s[i] & ~fromBackground);
    std::memcpy(dst + at, d, kPixel);
  }
  randomSequence = sequence;
}

template <size_t kPixel>
VX_Result DissolveIn(const BlendJob& blend, size_t alphaAt) noexcept {
  if (blend.height > RowJob::kInlineRows)
    return RunJob(blend, kPixel == 4, [&](const RowSpan& span, KernelVariant) {
      RandomSequence sequence(1);
      sequence.Skip(static_cast<uint64_t>(span.row) * static_cast<uint64_t>(blend.width) +
                    static_cast<uint64_t>(span.column));
      DissolveRow<kPixel, true>(span, alphaAt, blend.opacity, sequence);
    });
  // Not the thread's own sequence: scratch memory may draw from that one.
  RandomSequence sequence = RuntimeRandomSequence();
  const VX_Result result = RunJob(blend, kPixel == 4, [&](const RowSpan& span, KernelVariant) {
    DissolveRow<kPixel, false>(span, alphaAt, blend.opacity, sequence);
  });
  RuntimeRandomSequence() = sequence;
  return result;
}

// Pixels of four bytes can be copied where all three pictures have them alike.
VX_Result Dissolve(const BlendJob& blend) noexcept {
  const VX_PixelFormat format = blend.dst.format;
  if (IsByteRgb(format) && AlphaKind(format) == kAlphaStraight && blend.src.format == format &&
      blend.background.format == format)
    return DissolveIn<4>(blend, IsReversed(format) ? 0 : 3);
  return DissolveIn<16>(blend, 12);
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
