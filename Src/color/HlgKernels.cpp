// ITU-R BT.2100 hybrid log-gamma from and to the Rec.709 working space.
#include <cmath>
#include <cstddef>
#include <cstring>

#include "color/HdrConstants.h"
#include "color/PixelKernels.h"
#include "color/PlainPixels.h"

#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "color/HlgKernels.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

#include "color/ColorVectors-inl.h"

HWY_BEFORE_NAMESPACE();
namespace vexel {
namespace HWY_NAMESPACE {

HWY_INLINE ColorVector HlgLuma(const RgbVectors& c) {
  LumaWeights weights;
  weights.r = kHlgLumaR;
  weights.g = kHlgLumaG;
  weights.b = kHlgLumaB;
  return Luma(c, weights);
}

void Rec709ToHlg(const float* src, float* dst, size_t count, const HlgJob& job) {
  const MatrixVectors matrix(job.matrix);
  ForEachPixel(
      src, dst, count, [](RgbVectors& c) VX_COLOR_STAGE { SignedPower3<PowerCore::Float>(c.r, c.g, c.b, kPower2_4); },
      [&](RgbVectors& c) VX_COLOR_STAGE {
        const ColorTag d;
        matrix(c);
        const RgbVectors linear = c;
        const auto scene = [&](ColorVector v) HWY_ATTR { return hn::Mul(hn::Abs(v), hn::Set(d, 0.1f)); };
        c = {scene(c.r), scene(c.g), scene(c.b)};
        const auto gain = hn::Max(Power<PowerCore::Float>(HlgLuma(c), kHlgInverseGamma), hn::Set(d, kHlgLeastGain));
        const auto inverse = hn::Div(hn::Set(d, 1.0f), gain);
        c = {WithSignOf(hn::Mul(c.r, inverse), linear.r), WithSignOf(hn::Mul(c.g, inverse), linear.g),
             WithSignOf(hn::Mul(c.b, inverse), linear.b)};
      },
      [](RgbVectors& c) VX_COLOR_STAGE {
        const ColorTag d;
        const RgbVectors in = c;
        const auto shifted = [&](ColorVector v) HWY_ATTR { return hn::Sub(hn::Abs(v), hn::Set(d, kHlgB)); };
        c = {shifted(c.r), shifted(c.g), shifted(c.b)};
        Log3(c.r, c.g, c.b);
        const auto join = [&](ColorVector log, ColorVector v) HWY_ATTR {
          const auto e = hn::Abs(v);
          const auto root = hn::Sqrt(hn::Mul(e, hn::Set(d, 3.0f)));
          const auto curve = hn::Add(hn::Mul(log, hn::Set(d, kHlgA)), hn::Set(d, kHlgC));
          return WithSignOf(hn::IfThenElse(hn::Lt(e, hn::Set(d, kHlgThreshold)), root, curve), v);
        };
        c = {join(c.r, in.r), join(c.g, in.g), join(c.b, in.b)};
      });
}

void HlgToRec709(const float* src, float* dst, size_t count, const HlgJob& job) {
  const HlgJob local = job;
  const MatrixVectors matrix(local.matrix);
  ForEachPixel(
      src, dst, count,
      [&](RgbVectors& c) VX_COLOR_STAGE {
        const ColorTag d;
        c = {LookupUnit(c.r, local.table, kHlgTableSize), LookupUnit(c.g, local.table, kHlgTableSize),
             LookupUnit(c.b, local.table, kHlgTableSize)};
        const auto gain = hn::Mul(Power<PowerCore::Float>(HlgLuma(c), kHlgSystemGamma), hn::Set(d, 10.0f));
        c = {hn::Mul(c.r, gain), hn::Mul(c.g, gain), hn::Mul(c.b, gain)};
      },
      [&](RgbVectors& c) VX_COLOR_STAGE {
        matrix(c);
        SignedPower3<PowerCore::Float>(c.r, c.g, c.b, kPower1Over2_4);
      });
}

}  // namespace HWY_NAMESPACE
}  // namespace vexel
HWY_AFTER_NAMESPACE();

#if HWY_ONCE

#include "frame/KernelTable.h"

namespace vexel {
namespace plain {

void Rec709ToHlg(const float* src, float* dst, size_t count, const HlgJob& job) {
  ForEachPlainPixel(src, dst, count, [&](LinearRgb& c) {
    ForEachChannel(c, [](float v) { return SignedPower(v, kPower2_4); });
    c = Apply(job.matrix, c);
    const LinearRgb scene{std::fabs(c.r) * 0.1f, std::fabs(c.g) * 0.1f, std::fabs(c.b) * 0.1f};
    const float luma = kHlgLumaR * scene.r + kHlgLumaG * scene.g + kHlgLumaB * scene.b;
    const float inverse = 1.0f / Most(Power(luma, kHlgInverseGamma), kHlgLeastGain);
    c = {WithSignOf(scene.r * inverse, c.r), WithSignOf(scene.g * inverse, c.g), WithSignOf(scene.b * inverse, c.b)};
    ForEachChannel(c, [](float in) {
      const float e = std::fabs(in);
      return WithSignOf(e < kHlgThreshold ? std::sqrt(3.0f * e) : kHlgA * Log(e - kHlgB) + kHlgC, in);
    });
  });
}

void HlgToRec709(const float* src, float* dst, size_t count, const HlgJob& job) {
  ForEachPlainPixel(src, dst, count, [&](LinearRgb& c) {
    ForEachChannel(c, [&](float v) { return LookupUnit(v, job.table, kHlgTableSize); });
    const float luma = kHlgLumaR * c.r + kHlgLumaG * c.g + kHlgLumaB * c.b;
    const float gain = Power(luma, kHlgSystemGamma) * 10.0f;
    ForEachChannel(c, [gain](float v) { return v * gain; });
    c = Apply(job.matrix, c);
    ForEachChannel(c, [](float v) { return SignedPower(v, kPower1Over2_4); });
  });
}

}  // namespace plain

const KernelVariants<HlgKernel> kRec709ToHlg = VX_KERNEL_VARIANTS(Rec709ToHlg);
const KernelVariants<HlgKernel> kHlgToRec709 = VX_KERNEL_VARIANTS(HlgToRec709);

}  // namespace vexel

#endif  // HWY_ONCE
