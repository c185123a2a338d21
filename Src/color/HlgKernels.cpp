// ITU-R BT.2100 hybrid log-gamma from and to the Rec.709 working space.
#include <cmath>
#include <cstddef>

#include "color/HdrConstants.h"
#include "color/PixelKernels.h"
#include "color/PlainPixels.h"

#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "color/HlgKernels.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

#include "color/ColorVectors-inl.h"
#include "frame/KernelTable.h"

#if HWY_TARGET != HWY_SCALAR
HWY_BEFORE_NAMESPACE();
namespace vexel {
namespace HWY_NAMESPACE {
namespace {

HWY_INLINE ColorVector HlgLuma(const RgbVectors& c) {
  LumaWeights weights;
  weights.r = kHlgLumaR;
  weights.g = kHlgLumaG;
  weights.b = kHlgLumaB;
  return Luma(c, weights);
}

// A power of the luma of all pixels of a block, into `gain`.
template <class Finish>
HWY_INLINE void GainOfLuma(PixelBlock& block, const PowerExponent& y, float* gain, const Finish& finish) {
  const ColorTag d;
  for (size_t i = 0; i < block.pixels; i += hn::Lanes(d)) {
    const RgbVectors c = LoadColors(block, i);
    hn::Store(HlgLuma({hn::Abs(c.r), hn::Abs(c.g), hn::Abs(c.b)}), d, gain + i);
  }
  Powers<PowerCore::Float>(
      gain, block.pixels, block.scratch, y, [](ColorVector v) VX_COLOR_STAGE { return v; }, finish);
}

// Multiplies the colours of a block by its gains.
HWY_INLINE void ApplyGain(PixelBlock& block, const float* gain) {
  const ColorTag d;
  for (size_t i = 0; i < block.pixels; i += hn::Lanes(d)) {
    const RgbVectors c = LoadColors(block, i);
    const auto factor = hn::Load(d, gain + i);
    StoreColors({hn::Mul(c.r, factor), hn::Mul(c.g, factor), hn::Mul(c.b, factor)}, block, i);
  }
}

void Rec709ToHlg(const float* src, float* dst, size_t count, const HlgJob& job) {
  const MatrixVectors matrix(job.matrix);
  const ColorTag d;
  HWY_ALIGN float gain[PixelBlock::kPixels];
  ForEachBlock(src, dst, count, [&](PixelBlock& block) VX_COLOR_STAGE {
    SignedPowers<PowerCore::Float>(block, kPower2_4);
    ForEachColor(block, [&](RgbVectors& c) VX_COLOR_STAGE {
      matrix(c);
      const auto scale = hn::Set(d, 0.1f);
      c = {hn::Mul(c.r, scale), hn::Mul(c.g, scale), hn::Mul(c.b, scale)};
    });
    GainOfLuma(block, kHlgInverseGamma, gain, [&](ColorVector power, ColorVector) VX_COLOR_STAGE {
      return hn::Div(hn::Set(d, 1.0f), hn::Max(power, hn::Set(d, kHlgLeastGain)));
    });
    ApplyGain(block, gain);
    Logs(
        block.colors, 3 * block.pixels, block.scratch, power::kNaturalLog,
        // Below the threshold the logarithm does not count; held at a positive number it costs no detour. NaN stays.
        [&](ColorVector v) VX_COLOR_STAGE {
          return hn::Max(hn::Set(d, 0.5f * kHlgThreshold), hn::Sub(hn::Abs(v), hn::Set(d, kHlgB)));
        },
        [&](ColorVector log, ColorVector v) VX_COLOR_STAGE {
          const auto e = hn::Abs(v);
          const auto root = hn::Sqrt(hn::Mul(e, hn::Set(d, 3.0f)));
          const auto curve = hn::Add(hn::Mul(log, hn::Set(d, kHlgA)), hn::Set(d, kHlgC));
          return WithSignOf(hn::IfThenElse(hn::Lt(e, hn::Set(d, kHlgThreshold)), root, curve), v);
        });
  });
}

void HlgToRec709(const float* src, float* dst, size_t count, const HlgJob& job) {
  const HlgJob local = job;
  const MatrixVectors matrix(local.matrix);
  const ColorTag d;
  HWY_ALIGN float gain[PixelBlock::kPixels];
  ForEachBlock(src, dst, count, [&](PixelBlock& block) VX_COLOR_STAGE {
    ForEachColor(block, [&](RgbVectors& c) VX_COLOR_STAGE {
      c = {LookupUnit(c.r, local.table, kHlgTableSize), LookupUnit(c.g, local.table, kHlgTableSize),
           LookupUnit(c.b, local.table, kHlgTableSize)};
    });
    GainOfLuma(block, kHlgSystemGamma, gain,
               [&](ColorVector power, ColorVector) VX_COLOR_STAGE { return hn::Mul(power, hn::Set(d, 10.0f)); });
    ApplyGain(block, gain);
    ForEachColor(block, matrix);
    SignedPowers<PowerCore::Float>(block, kPower1Over2_4);
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

}  // namespace
}  // namespace plain

const KernelVariants<HlgKernel> kRec709ToHlg = VX_KERNEL_VARIANTS(Rec709ToHlg);
const KernelVariants<HlgKernel> kHlgToRec709 = VX_KERNEL_VARIANTS(HlgToRec709);

}  // namespace vexel
#endif  // HWY_ONCE
