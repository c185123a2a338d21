// Tone compression: luminance through a logarithmic curve with a soft shoulder at both ends, chromaticity kept.
#include <cmath>
#include <cstddef>

#include "color/PixelKernels.h"
#include "color/PlainPixels.h"

#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "color/ToneKernels.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

#include "color/ColorVectors-inl.h"
#include "frame/KernelTable.h"

#ifndef VEXEL_COLOR_TONEKERNELS_CONSTANTS
#define VEXEL_COLOR_TONEKERNELS_CONSTANTS
namespace vexel {
namespace {
constexpr float kDarkest = 1e-6f;         // Below it a pixel has no chromaticity of its own.
constexpr float kLogScale = 99.99f;       // Linear 1 reaches log10(100.99 a).
constexpr float kLogRange = 0.01010101f;  // 1 / 99
}  // namespace
}  // namespace vexel
#endif

#if HWY_TARGET != HWY_SCALAR
HWY_BEFORE_NAMESPACE();
namespace vexel {
namespace HWY_NAMESPACE {
namespace {

HWY_INLINE void DecodeTones(PixelBlock& block, const ToneCurve& curve) {
  const ColorTag d;
  Powers<PowerCore::Float>(
      block, curve.exponent,
      [&](ColorVector v)
          VX_COLOR_STAGE { return hn::Mul(hn::Add(hn::Abs(v), hn::Set(d, curve.offset)), hn::Set(d, curve.scale)); },
      [&](ColorVector power, ColorVector v) VX_COLOR_STAGE {
        const auto magnitude = hn::Abs(v);
        const auto straight = hn::Mul(magnitude, hn::Set(d, curve.slope));
        return WithSignOf(hn::IfThenElse(hn::Gt(magnitude, hn::Set(d, curve.threshold)), power, straight), v);
      });
}

HWY_INLINE void EncodeTones(PixelBlock& block, const ToneCurve& curve) {
  const ColorTag d;
  Powers<PowerCore::Float>(
      block, curve.exponent, [](ColorVector v) VX_COLOR_STAGE { return hn::Abs(v); },
      [&](ColorVector power, ColorVector v) VX_COLOR_STAGE {
        const auto magnitude = hn::Abs(v);
        const auto curved = hn::Add(hn::Mul(power, hn::Set(d, curve.scale)), hn::Set(d, curve.offset));
        const auto straight = hn::Mul(magnitude, hn::Set(d, curve.slope));
        return WithSignOf(hn::IfThenElse(hn::Gt(magnitude, hn::Set(d, curve.threshold)), curved, straight), v);
      });
}

// The luminance curve: luminance to its place t, 0 at mid-tones, +-1 at the ends; a bend; and back.
HWY_INLINE void CompressLuminances(float* values, size_t count, float* scratch, const ToneJob& job) {
  const ColorTag d;
  const size_t lanes = hn::Lanes(d);
  const auto one = hn::Set(d, 1.0f);
  Logs(
      values, count, scratch, power::kDecimalLog,
      [&](ColorVector y) VX_COLOR_STAGE {
        const auto light = hn::Mul(hn::Max(y, hn::Zero(d)), hn::Set(d, job.a));
        return hn::Add(hn::Mul(light, hn::Set(d, kLogScale)), one);
      },
      [&](ColorVector log, ColorVector) VX_COLOR_STAGE { return hn::Sub(hn::Mul(log, hn::Set(d, 0.5f)), one); });
  const auto distance = [&](ColorVector t) VX_COLOR_STAGE { return hn::Min(hn::Abs(t), one); };
  HWY_ALIGN float bent[PixelBlock::kPixels];
  for (size_t i = 0; i < count; i += lanes) {
    const auto u = distance(hn::Load(d, values + i));
    const auto s = hn::Div(hn::Sub(u, hn::Set(d, job.k)), hn::Set(d, 1.0f - job.k));
    hn::Store(hn::Sub(one, s), d, bent + i);
  }
  PowersAny(bent, count, scratch, job.shape);
  for (size_t i = 0; i < count; i += lanes) {
    const auto t = hn::Load(d, values + i), u = distance(t);
    const auto rest = hn::Sub(one, hn::Load(d, bent + i));
    const auto curved = hn::Add(hn::Mul(rest, hn::Set(d, 1.0f - job.c)), hn::Set(d, job.c));
    const auto straight = hn::Mul(u, hn::Set(d, job.b));
    hn::Store(WithSignOf(hn::IfThenElse(hn::Gt(u, hn::Set(d, job.k)), curved, straight), t), d, values + i);
  }
  // 10^(w + 1), not 10^(2 (w + 1)) which would invert the logarithm: the compressed range is part of the look.
  Exps(
      values, count, power::kLog2Of10Short, [&](ColorVector w) VX_COLOR_STAGE { return hn::Add(w, one); },
      [&](ColorVector power, ColorVector)
          VX_COLOR_STAGE { return hn::Mul(hn::Sub(power, one), hn::Set(d, kLogRange)); });
}

void CompressTones(const float* src, float* dst, size_t count, const ToneJob& job) {
  const ToneJob local = job;
  const MatrixVectors toXyz(local.toXyz), fromXyz(local.fromXyz);
  ForEachBlock(src, dst, count, [&](PixelBlock& block) VX_COLOR_STAGE {
    DecodeTones(block, local.decode);
    ForEachColor(block, [&](RgbVectors& c) VX_COLOR_STAGE {  // From here x, Y, y stand for red, green, blue.
      const ColorTag d;
      toXyz(c);
      const auto sum = hn::Add(hn::Add(c.r, c.g), c.b);
      const auto bright = hn::Gt(sum, hn::Set(d, kDarkest));
      c = {hn::IfThenElse(bright, hn::Div(c.r, sum), hn::Set(d, local.whiteX)), c.g,
           hn::IfThenElse(bright, hn::Div(c.g, sum), hn::Set(d, local.whiteY))};
    });
    CompressLuminances(block.colors + block.pixels, block.pixels, block.scratch, local);
    ForEachColor(block, [&](RgbVectors& c) VX_COLOR_STAGE {
      const ColorTag d;
      const auto x = c.r, luminance = c.g, y = c.b;
      const auto z = hn::Sub(hn::Sub(hn::Set(d, 1.0f), x), y);
      c = {hn::Div(hn::Mul(x, luminance), y), luminance, hn::Div(hn::Mul(z, luminance), y)};
      fromXyz(c);
    });
    EncodeTones(block, local.encode);
  });
}

}  // namespace
}  // namespace HWY_NAMESPACE
}  // namespace vexel
HWY_AFTER_NAMESPACE();
#endif  // HWY_TARGET

#if HWY_ONCE
namespace vexel {
namespace plain {
namespace {

float CompressLuminance(float y, const ToneJob& job) {
  const float t = 0.5f * Log10(Most(y, 0.0f) * job.a * kLogScale + 1.0f) - 1.0f;
  const float u = Least(std::fabs(t), 1.0f);
  float w = u * job.b;
  if (u > job.k) {
    const float s = (u - job.k) / (1.0f - job.k);
    w = (1.0f - Power(1.0f - s, job.shape)) * (1.0f - job.c) + job.c;
  }
  return (Exp10(WithSignOf(w, t) + 1.0f) - 1.0f) * kLogRange;
}

void CompressTones(const float* src, float* dst, size_t count, const ToneJob& job) {
  ForEachPlainPixel(src, dst, count, [&](LinearRgb& c) {
    ForEachChannel(c, [&curve = job.decode](float v) {
      const float magnitude = std::fabs(v);
      return WithSignOf(magnitude > curve.threshold ? Power((magnitude + curve.offset) * curve.scale, curve.exponent)
                                                    : magnitude * curve.slope,
                        v);
    });
    const LinearRgb xyz = Apply(job.toXyz, c);
    const float sum = xyz.r + xyz.g + xyz.b;
    const float x = sum > kDarkest ? xyz.r / sum : job.whiteX;
    const float y = sum > kDarkest ? xyz.g / sum : job.whiteY;
    const float luminance = CompressLuminance(xyz.g, job);
    c = Apply(job.fromXyz, {x * luminance / y, luminance, (1.0f - x - y) * luminance / y});
    ForEachChannel(c, [&curve = job.encode](float v) {
      const float magnitude = std::fabs(v);
      return WithSignOf(magnitude > curve.threshold ? Power(magnitude, curve.exponent) * curve.scale + curve.offset
                                                    : magnitude * curve.slope,
                        v);
    });
  });
}

}  // namespace
}  // namespace plain

const KernelVariants<ToneKernel> kCompressTones = VX_KERNEL_VARIANTS(CompressTones);

}  // namespace vexel
#endif  // HWY_ONCE
