// Power law to power law and sRGB, with a matrix and gamut compression between.
#include <cmath>
#include <cstddef>
#include <cstring>

#include "color/PixelKernels.h"
#include "color/PlainPixels.h"

#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "color/TransferKernels.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

#include "color/ColorVectors-inl.h"

namespace vexel {
#ifndef VEXEL_COLOR_SRGB_CONSTANTS_
#define VEXEL_COLOR_SRGB_CONSTANTS_
// The converters multiply by reciprocals where the scalar slot functions divide.
constexpr float kSrgbDecodeThreshold = 0.04045f, kSrgbDecodeScale = 0.94786733f, kSrgbDecodeSlope = 0.07739938f;
constexpr float kSrgbEncodeThreshold = 0.0031308f, kSrgbEncodeScale = 1.055f, kSrgbEncodeSlope = 12.92f;
constexpr float kSrgbOffset = 0.055f;
#endif
}  // namespace vexel

HWY_BEFORE_NAMESPACE();
namespace vexel {
namespace HWY_NAMESPACE {

// kFloat: both exponents have the float core, as all usual ones; otherwise each vector asks.
template <bool kFloat>
HWY_INLINE void SignedPowerRgb(RgbVectors& c, const PowerExponent& y) {
  if constexpr (kFloat) {
    SignedPower3<PowerCore::Float>(c.r, c.g, c.b, y);
  } else {
    SignedPower3Any(c.r, c.g, c.b, y);
  }
}

template <bool kFloat, GamutStep kStep>
void PowerToPowerLoop(const float* src, float* dst, size_t count, const TransferJob& job) {
  const TransferJob local = job;  // Nobody else's pointer reaches it, so constants stay in registers.
  const MatrixVectors matrix(local.matrix);
  ForEachPixel(
      src, dst, count, [&](RgbVectors& c) VX_COLOR_STAGE { SignedPowerRgb<kFloat>(c, local.decode); },
      [&](RgbVectors& c) VX_COLOR_STAGE {
        if constexpr (kStep != GamutStep::None) matrix(c);
        if constexpr (kStep == GamutStep::MatrixAndCompression) CompressGamut(c, local.luma);
        SignedPowerRgb<kFloat>(c, local.encode);
      });
}

#define VX_POWER_TO_POWER(name, usual, step)                                      \
  void name(const float* src, float* dst, size_t count, const TransferJob& job) { \
    PowerToPowerLoop<usual, step>(src, dst, count, job);                          \
  }
VX_POWER_TO_POWER(PowerToPower, true, GamutStep::None)
VX_POWER_TO_POWER(PowerToPowerMatrix, true, GamutStep::Matrix)
VX_POWER_TO_POWER(PowerToPowerCompressed, true, GamutStep::MatrixAndCompression)
VX_POWER_TO_POWER(AnyPower, false, GamutStep::None)
VX_POWER_TO_POWER(AnyPowerMatrix, false, GamutStep::Matrix)
VX_POWER_TO_POWER(AnyPowerCompressed, false, GamutStep::MatrixAndCompression)
#undef VX_POWER_TO_POWER

HWY_INLINE void EncodeSrgb(RgbVectors& c, const PowerExponent& exponent) {
  const ColorTag d;
  const RgbVectors linear = c;
  c = {hn::Abs(c.r), hn::Abs(c.g), hn::Abs(c.b)};
  Power3<PowerCore::Float>(c.r, c.g, c.b, exponent);
  const auto join = [&](ColorVector power, ColorVector in) HWY_ATTR {
    const auto magnitude = hn::Abs(in);
    const auto curve = hn::Sub(hn::Mul(power, hn::Set(d, kSrgbEncodeScale)), hn::Set(d, kSrgbOffset));
    const auto straight = hn::Mul(magnitude, hn::Set(d, kSrgbEncodeSlope));
    return WithSignOf(hn::IfThenElse(hn::Gt(magnitude, hn::Set(d, kSrgbEncodeThreshold)), curve, straight), in);
  };
  c = {join(c.r, linear.r), join(c.g, linear.g), join(c.b, linear.b)};
}

HWY_INLINE void DecodeSrgb(RgbVectors& c, const PowerExponent& exponent) {
  const ColorTag d;
  const RgbVectors in = c;
  const auto base = [&](ColorVector v) HWY_ATTR {
    return hn::Mul(hn::Add(hn::Abs(v), hn::Set(d, kSrgbOffset)), hn::Set(d, kSrgbDecodeScale));
  };
  c = {base(c.r), base(c.g), base(c.b)};
  Power3<PowerCore::Float>(c.r, c.g, c.b, exponent);
  const auto join = [&](ColorVector power, ColorVector v) HWY_ATTR {
    const auto magnitude = hn::Abs(v);
    const auto straight = hn::Mul(magnitude, hn::Set(d, kSrgbDecodeSlope));
    return WithSignOf(hn::IfThenElse(hn::Gt(magnitude, hn::Set(d, kSrgbDecodeThreshold)), power, straight), v);
  };
  c = {join(c.r, in.r), join(c.g, in.g), join(c.b, in.b)};
}

void PowerToSrgb(const float* src, float* dst, size_t count, const TransferJob& job) {
  const TransferJob local = job;
  ForEachPixel(
      src, dst, count, [&](RgbVectors& c) VX_COLOR_STAGE { SignedPowerRgb<true>(c, local.decode); },
      [&](RgbVectors& c) VX_COLOR_STAGE { EncodeSrgb(c, local.encode); });
}

void SrgbToPower(const float* src, float* dst, size_t count, const TransferJob& job) {
  const TransferJob local = job;
  ForEachPixel(
      src, dst, count, [&](RgbVectors& c) VX_COLOR_STAGE { DecodeSrgb(c, local.decode); },
      [&](RgbVectors& c) VX_COLOR_STAGE { SignedPowerRgb<true>(c, local.encode); });
}

}  // namespace HWY_NAMESPACE
}  // namespace vexel
HWY_AFTER_NAMESPACE();

#if HWY_ONCE

#include "frame/KernelTable.h"

namespace vexel {
namespace plain {

template <GamutStep kStep>
void AnyPowerLoop(const float* src, float* dst, size_t count, const TransferJob& job) {
  ForEachPlainPixel(src, dst, count, [&](LinearRgb& c) {
    ForEachChannel(c, [&](float v) { return SignedPower(v, job.decode); });
    if (kStep != GamutStep::None) c = Apply(job.matrix, c);
    if (kStep == GamutStep::MatrixAndCompression) CompressGamut(c, job.luma);
    ForEachChannel(c, [&](float v) { return SignedPower(v, job.encode); });
  });
}

constexpr auto& PowerToPower = AnyPowerLoop<GamutStep::None>;
constexpr auto& PowerToPowerMatrix = AnyPowerLoop<GamutStep::Matrix>;
constexpr auto& PowerToPowerCompressed = AnyPowerLoop<GamutStep::MatrixAndCompression>;
constexpr auto& AnyPower = PowerToPower;
constexpr auto& AnyPowerMatrix = PowerToPowerMatrix;
constexpr auto& AnyPowerCompressed = PowerToPowerCompressed;

void PowerToSrgb(const float* src, float* dst, size_t count, const TransferJob& job) {
  ForEachPlainPixel(src, dst, count, [&](LinearRgb& c) {
    ForEachChannel(c, [&](float v) {
      const float linear = SignedPower(v, job.decode);
      const float magnitude = std::fabs(linear);
      return WithSignOf(magnitude > kSrgbEncodeThreshold ? Power(magnitude, job.encode) * kSrgbEncodeScale - kSrgbOffset
                                                         : magnitude * kSrgbEncodeSlope,
                        linear);
    });
  });
}

void SrgbToPower(const float* src, float* dst, size_t count, const TransferJob& job) {
  ForEachPlainPixel(src, dst, count, [&](LinearRgb& c) {
    ForEachChannel(c, [&](float v) {
      const float magnitude = std::fabs(v);
      const float linear = magnitude > kSrgbDecodeThreshold
                               ? Power((magnitude + kSrgbOffset) * kSrgbDecodeScale, job.decode)
                               : magnitude * kSrgbDecodeSlope;
      return SignedPower(WithSignOf(linear, v), job.encode);
    });
  });
}

}  // namespace plain

namespace {
const KernelVariants<TransferKernel> kPowerToPower[2][3] = {
    {VX_KERNEL_VARIANTS(AnyPower), VX_KERNEL_VARIANTS(AnyPowerMatrix), VX_KERNEL_VARIANTS(AnyPowerCompressed)},
    {VX_KERNEL_VARIANTS(PowerToPower), VX_KERNEL_VARIANTS(PowerToPowerMatrix),
     VX_KERNEL_VARIANTS(PowerToPowerCompressed)}};
}  // namespace

TransferKernel PowerToPowerKernel(KernelVariant variant, const TransferJob& job, GamutStep step) noexcept {
  const bool usual = job.decode.core == PowerCore::Float && job.encode.core == PowerCore::Float;
  return kPowerToPower[usual][static_cast<int>(step)][variant];
}

const KernelVariants<TransferKernel> kPowerToSrgb = VX_KERNEL_VARIANTS(PowerToSrgb);
const KernelVariants<TransferKernel> kSrgbToPower = VX_KERNEL_VARIANTS(SrgbToPower);

}  // namespace vexel

#endif  // HWY_ONCE
