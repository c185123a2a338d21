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
  ForEachPixelBlock(src, dst, count, [&](RgbVectors& c) HWY_ATTR {
    const ColorTag d;
    SignedPower3<PowerCore::Float>(c.r, c.g, c.b, kPower2_4);
    matrix(c);
    const RgbVectors linear = c;
    const auto scene = [&](ColorVector v) HWY_ATTR { return hn::Mul(hn::Abs(v), hn::Set(d, 0.1f)); };
    c = {scene(c.r), scene(c.g), scene(c.b)};
    const auto luma = HlgLuma(c);
    const auto gain = hn::Max(Power<PowerCore::Float>(luma, kHlgInverseGamma), hn::Set(d, kHlgLeastGain));
    const auto inverse = hn::Div(hn::Set(d, 1.0f), gain);
    const auto encode = [&](ColorVector v, ColorVector in) HWY_ATTR {
      const auto e = hn::Mul(v, inverse);
      const auto root = hn::Sqrt(hn::Mul(e, hn::Set(d, 3.0f)));
      const auto log = hn::Add(hn::Mul(Log(hn::Sub(e, hn::Set(d, kHlgB))), hn::Set(d, kHlgA)), hn::Set(d, kHlgC));
      return WithSignOf(hn::IfThenElse(hn::Lt(e, hn::Set(d, kHlgThreshold)), root, log), in);
    };
    c = {encode(c.r, linear.r), encode(c.g, linear.g), encode(c.b, linear.b)};
  });
}

void HlgToRec709(const float* src, float* dst, size_t count, const HlgJob& job) {
  const HlgJob local = job;
  const MatrixVectors matrix(local.matrix);
  ForEachPixelBlock(src, dst, count, [&](RgbVectors& c) HWY_ATTR {
    const ColorTag d;
    c = {LookupUnit(c.r, local.table, kHlgTableSize), LookupUnit(c.g, local.table, kHlgTableSize),
         LookupUnit(c.b, local.table, kHlgTableSize)};
    const auto gain = hn::Mul(Power<PowerCore::Float>(HlgLuma(c), kHlgSystemGamma), hn::Set(d, 10.0f));
    c = {hn::Mul(c.r, gain), hn::Mul(c.g, gain), hn::Mul(c.b, gain)};
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
    const auto encode = [inverse](float v, float in) {
      const float e = v * inverse;
      return WithSignOf(e < kHlgThreshold ? std::sqrt(3.0f * e) : kHlgA * Log(e - kHlgB) + kHlgC, in);
    };
    c = {encode(scene.r, c.r), encode(scene.g, c.g), encode(scene.b, c.b)};
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
