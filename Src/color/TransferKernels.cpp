// Power law to power law and sRGB, with a matrix and gamut compression between.
#include <cmath>
#include <cstddef>

#include "color/PixelKernels.h"
#include "color/PlainPixels.h"

#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "color/TransferKernels.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

#include "color/ColorVectors-inl.h"
#include "frame/KernelTable.h"

#ifndef VEXEL_COLOR_TRANSFERKERNELS_CONSTANTS
#define VEXEL_COLOR_TRANSFERKERNELS_CONSTANTS
namespace vexel {
namespace {
// The converters multiply by reciprocals where the scalar slot functions divide.
constexpr float kSrgbDecodeThreshold = 0.04045f, kSrgbDecodeScale = 0.94786733f, kSrgbDecodeSlope = 0.07739938f;
constexpr float kSrgbEncodeThreshold = 0.0031308f, kSrgbEncodeScale = 1.055f, kSrgbEncodeSlope = 12.92f;
constexpr float kSrgbOffset = 0.055f;
}  // namespace
}  // namespace vexel
#endif

#if HWY_TARGET != HWY_SCALAR
HWY_BEFORE_NAMESPACE();
namespace vexel {
namespace HWY_NAMESPACE {
namespace {

// kFloat: both exponents have the float core, as all usual ones; otherwise each block asks.
template <bool kFloat>
HWY_INLINE void SignedPowersOf(PixelBlock& block, const PowerExponent& y) {
  if constexpr (kFloat) {
    SignedPowers<PowerCore::Float>(block, y);
  } else {
    SignedPowersAny(block.colors, 3 * block.pixels, block.scratch, y, block.negative);
  }
}

template <bool kFloat, GamutStep kStep>
void PowerToPowerLoop(const float* src, float* dst, size_t count, const TransferJob& job) {
  const TransferJob local = job;  // Nobody else's pointer reaches it, so constants stay in registers.
  const MatrixVectors matrix(local.matrix);
  ForEachBlock(src, dst, count, [&](PixelBlock& block) VX_COLOR_STAGE {
    SignedPowersOf<kFloat>(block, local.decode);
    if constexpr (kStep == GamutStep::Matrix) ForEachColor(block, matrix);
    if constexpr (kStep == GamutStep::MatrixAndCompression) ForEachColorIntoGamut(block, local.luma, matrix);
    SignedPowersOf<kFloat>(block, local.encode);
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

HWY_INLINE void EncodeSrgb(PixelBlock& block, const PowerExponent& exponent) {
  const ColorTag d;
  Powers<PowerCore::Float>(
      block, exponent, [](ColorVector v) VX_COLOR_STAGE { return hn::Abs(v); },
      [&](ColorVector power, ColorVector v) VX_COLOR_STAGE {
        const auto magnitude = hn::Abs(v);
        const auto curve = hn::Sub(hn::Mul(power, hn::Set(d, kSrgbEncodeScale)), hn::Set(d, kSrgbOffset));
        const auto straight = hn::Mul(magnitude, hn::Set(d, kSrgbEncodeSlope));
        return WithSignOf(hn::IfThenElse(hn::Gt(magnitude, hn::Set(d, kSrgbEncodeThreshold)), curve, straight), v);
      });
}

HWY_INLINE void DecodeSrgb(PixelBlock& block, const PowerExponent& exponent) {
  const ColorTag d;
  Powers<PowerCore::Float>(
      block, exponent,
      [&](ColorVector v) VX_COLOR_STAGE {
        return hn::Mul(hn::Add(hn::Abs(v), hn::Set(d, kSrgbOffset)), hn::Set(d, kSrgbDecodeScale));
      },
      [&](ColorVector power, ColorVector v) VX_COLOR_STAGE {
        const auto magnitude = hn::Abs(v);
        const auto straight = hn::Mul(magnitude, hn::Set(d, kSrgbDecodeSlope));
        return WithSignOf(hn::IfThenElse(hn::Gt(magnitude, hn::Set(d, kSrgbDecodeThreshold)), power, straight), v);
      });
}

void PowerToSrgb(const float* src, float* dst, size_t count, const TransferJob& job) {
  const TransferJob local = job;
  ForEachBlock(src, dst, count, [&](PixelBlock& block) VX_COLOR_STAGE {
    SignedPowers<PowerCore::Float>(block, local.decode);
    EncodeSrgb(block, local.encode);
  });
}

void SrgbToPower(const float* src, float* dst, size_t count, const TransferJob& job) {
  const TransferJob local = job;
  ForEachBlock(src, dst, count, [&](PixelBlock& block) VX_COLOR_STAGE {
    DecodeSrgb(block, local.decode);
    SignedPowers<PowerCore::Float>(block, local.encode);
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

}  // namespace
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
