// SMPTE ST 2084 from and to the Rec.709 working space.
#include <cmath>
#include <cstddef>
#include <cstring>

#include "color/HdrConstants.h"
#include "color/PixelKernels.h"
#include "color/PlainPixels.h"

#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "color/PqKernels.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

#include "color/ColorVectors-inl.h"
#include "frame/KernelTable.h"

#if HWY_TARGET != HWY_SCALAR
HWY_BEFORE_NAMESPACE();
namespace vexel {
namespace HWY_NAMESPACE {
namespace {

// PqRatioBelowOne of the halves of a vector.
using HalfColorTag = hn::Half<ColorTag>;
HWY_INLINE hn::Vec<HalfColorTag> PqRatioBelowOne(hn::Vec<HalfColorTag> root, hn::Vec<HalfColorTag> rest) {
  const hn::RepartitionToWide<ColorTag> dd;
  const auto one = hn::Set(dd, 1.0);
  const auto y = hn::Add(hn::PromoteTo(dd, root), hn::PromoteTo(dd, rest));
  const auto above = hn::Mul(hn::Set(dd, double{kPqBelowOne}), hn::Sub(one, y));
  return hn::DemoteTo(HalfColorTag(), hn::Div(above, hn::Add(hn::Mul(hn::Set(dd, double{kPqC3}), y), one)));
}

// Light, in units of 10,000 cd/m2, becomes PqRatioBelowOne of it. Without kAny it is refused where there are minus
// signs; with it signs are dropped.
template <bool kAny>
HWY_INLINE bool PqRatiosBelowOne(PixelBlock& block) {
  const ColorTag d;
  const HalfColorTag dh;
  return UnroundedPowers<PowerCore::Float, !kAny>(
      block.colors, 3 * block.pixels, block.scratch, kPqM1,
      [](ColorVector v) VX_COLOR_STAGE { return kAny ? hn::Abs(v) : v; },
      [&](const PowerTerms& y, ColorVector) VX_COLOR_STAGE {
        return hn::Combine(d, PqRatioBelowOne(hn::UpperHalf(dh, y.root), hn::UpperHalf(dh, y.rest)),
                           PqRatioBelowOne(hn::LowerHalf(dh, y.root), hn::LowerHalf(dh, y.rest)));
      });
}

HWY_INLINE void LightToPq(PixelBlock& block, float scale) {
  const ColorTag d;
  const auto ratio = [](ColorVector u) VX_COLOR_STAGE { return OneLess{u}; };
  const auto scaled = [&](ColorVector power, ColorVector) VX_COLOR_STAGE { return hn::Mul(power, hn::Set(d, scale)); };
  if (HWY_LIKELY(!block.negative) && PqRatiosBelowOne<false>(block))
    return Powers<PowerCore::Long>(block, kPqM2, ratio, scaled);
  block.negative = true;
  const size_t count = 3 * block.pixels;
  HWY_ALIGN float light[3 * PixelBlock::kPixels];
  std::memcpy(light, block.colors, count * sizeof(float));
  PqRatiosBelowOne<true>(block);
  Powers<PowerCore::Long>(block, kPqM2, ratio, scaled);
  for (size_t i = 0; i < count; i += hn::Lanes(d))
    hn::Store(WithSignOf(hn::Load(d, block.colors + i), hn::Load(d, light + i)), d, block.colors + i);
}

HWY_INLINE ColorVector PqRatioOf(ColorVector t) {
  const ColorTag d;
  const auto constant = [&](float c) VX_COLOR_STAGE { return hn::Set(d, c); };
  const float *n = kPqRatioAbove, *m = kPqRatioBelow;
  const auto above = hn::Add(hn::Mul(hn::Add(hn::Mul(constant(n[2]), t), constant(n[1])), t), constant(n[0]));
  const auto below = hn::Add(hn::Mul(hn::Add(t, constant(m[1])), t), constant(m[0]));
  return hn::Max(hn::Div(above, below), constant(kPqLeastRatio));
}

// Signals times `scale` become the ratios of which light is a power, at least kPqLeastRatio. Without kAny it is refused
// unless all are positive and light is in the range of floats; with it ratios carry the sign of the signal.
template <bool kAny>
HWY_INLINE bool PqRatios(PixelBlock& block, float scale) {
  const ColorTag d;
  const hn::RebindToUnsigned<ColorTag> du;
  const size_t count = 3 * block.pixels, lanes = hn::Lanes(d);
  const power_detail::StepArrays steps(block.scratch, count);
  auto largest = hn::Zero(du);
  for (size_t i = 0; i < count; i += lanes) {
    auto v = hn::Mul(hn::Load(d, block.colors + i), hn::Set(d, scale));
    if constexpr (kAny) {
      v = hn::Min(hn::Max(hn::Abs(v), hn::Set(d, kPqLeastSignal)), hn::Set(d, kPqMostSignal));
    } else {
      largest = hn::Max(largest, hn::BitCast(du, v));
      v = hn::Max(v, hn::Set(d, kPqLeastSignal));
    }
    steps.Store(power_detail::PlaceOf<false, PowerCore::Float>(v, power::kEighthsLog2), i);
  }
  if constexpr (!kAny) {
    const auto most = hn::BitCast(du, hn::Set(d, kPqMostUsualSignal));
    if (HWY_UNLIKELY(!hn::AllFalse(du, hn::Gt(largest, most)))) return false;
  }
  for (size_t i = 0; i < count; i += lanes) {
    auto ratio = PqRatioOf(power_detail::Log2InEighths(steps.PlaceAt(i)));
    if constexpr (kAny) ratio = WithSignOf(ratio, hn::Load(d, block.colors + i));
    hn::Store(ratio, d, block.colors + i);
  }
  return true;
}

HWY_INLINE void PqToLight(PixelBlock& block, float scale) {
  const size_t count = 3 * block.pixels;
  const ColorTag d;
  const auto light = [&](ColorVector power, ColorVector ratio)
                         VX_COLOR_STAGE { return hn::IfThenElseZero(hn::Gt(ratio, hn::Set(d, kPqLeastRatio)), power); };
  if (HWY_LIKELY(PqRatios<false>(block, scale)))
    return UsualPowers<PowerCore::Float>(block.colors, count, block.scratch, kPqInverseM1, light);
  PqRatios<true>(block, scale);
  Powers<PowerCore::Float>(
      block, kPqInverseM1, [](ColorVector ratio) VX_COLOR_STAGE { return hn::Abs(ratio); },
      [&](ColorVector power, ColorVector ratio)
          VX_COLOR_STAGE { return WithSignOf(light(power, hn::Abs(ratio)), ratio); });
}

void Rec709ToPq(const float* src, float* dst, size_t count, const PqJob& job) {
  const PqJob local = job;
  const MatrixVectors matrix(local.matrix);
  const ColorTag d;
  ForEachBlock(src, dst, count, [&](PixelBlock& block) VX_COLOR_STAGE {
    SignedPowers<PowerCore::Float>(block, kPower2_4);
    ForEachColor(block, [&](RgbVectors& c) VX_COLOR_STAGE {
      matrix(c);
      const auto scale = hn::Set(d, 0.01f);
      c = {hn::Mul(c.r, scale), hn::Mul(c.g, scale), hn::Mul(c.b, scale)};
    });
    LightToPq(block, local.scale);
  });
}

void PqTableToRec709(const float* src, float* dst, size_t count, const PqJob& job) {
  const PqJob local = job;
  const MatrixVectors matrix(local.matrix);
  ForEachBlock(src, dst, count, [&](PixelBlock& block) VX_COLOR_STAGE {
    ForEachColor(block, [&](RgbVectors& c) VX_COLOR_STAGE {
      c = {LookupUnit(c.r, local.table, kPqTableSize), LookupUnit(c.g, local.table, kPqTableSize),
           LookupUnit(c.b, local.table, kPqTableSize)};
      matrix(c);
    });
    SignedPowers<PowerCore::Float>(block, kPower1Over2_4);
  });
}

template <bool kCompressed>
HWY_INLINE void PqToRec709Loop(const float* src, float* dst, size_t count, const PqJob& job) {
  const PqJob local = job;
  const MatrixVectors matrix(local.matrix);
  ForEachBlock(src, dst, count, [&](PixelBlock& block) VX_COLOR_STAGE {
    PqToLight(block, local.scale);
    if (local.applyMatrix) ForEachColor(block, matrix);
    SignedPowers<PowerCore::Float>(block, kPower1Over2_4);
    if constexpr (kCompressed) ForEachColorIntoGamut(block, local.luma, [](RgbVectors&) VX_COLOR_STAGE {});
  });
}

void PqToRec709(const float* src, float* dst, size_t count, const PqJob& job) {
  PqToRec709Loop<false>(src, dst, count, job);
}
void PqToRec709Compressed(const float* src, float* dst, size_t count, const PqJob& job) {
  PqToRec709Loop<true>(src, dst, count, job);
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

void Rec709ToPq(const float* src, float* dst, size_t count, const PqJob& job) {
  ForEachPlainPixel(src, dst, count, [&](LinearRgb& c) {
    ForEachChannel(c, [](float v) { return SignedPower(v, kPower2_4); });
    c = Apply(job.matrix, c);
    ForEachChannel(c, [&](float v) {
      const float light = v * 0.01f;
      return WithSignOf(PowerOfOneLess(PqRatioBelowOne(std::fabs(light)), kPqM2) * job.scale, light);
    });
  });
}

void PqTableToRec709(const float* src, float* dst, size_t count, const PqJob& job) {
  ForEachPlainPixel(src, dst, count, [&](LinearRgb& c) {
    ForEachChannel(c, [&](float v) { return LookupUnit(v, job.table, kPqTableSize); });
    c = Apply(job.matrix, c);
    ForEachChannel(c, [](float v) { return SignedPower(v, kPower1Over2_4); });
  });
}

LinearRgb PqPixelToRec709(LinearRgb c, const PqJob& job) {
  ForEachChannel(c, [&](float v) { return WithSignOf(PqLight(std::fabs(v * job.scale)), v); });
  if (job.applyMatrix) c = Apply(job.matrix, c);
  ForEachChannel(c, [](float v) { return SignedPower(v, kPower1Over2_4); });
  return c;
}

void PqToRec709(const float* src, float* dst, size_t count, const PqJob& job) {
  ForEachPlainPixel(src, dst, count, [&](LinearRgb& c) { c = PqPixelToRec709(c, job); });
}
void PqToRec709Compressed(const float* src, float* dst, size_t count, const PqJob& job) {
  ForEachPlainPixel(src, dst, count, [&](LinearRgb& c) {
    c = PqPixelToRec709(c, job);
    CompressGamut(c, job.luma);
  });
}

}  // namespace
}  // namespace plain

const KernelVariants<PqKernel> kRec709ToPq = VX_KERNEL_VARIANTS(Rec709ToPq);
const KernelVariants<PqKernel> kPqTableToRec709 = VX_KERNEL_VARIANTS(PqTableToRec709);
const KernelVariants<PqKernel> kPqToRec709 = VX_KERNEL_VARIANTS(PqToRec709);
const KernelVariants<PqKernel> kPqToRec709Compressed = VX_KERNEL_VARIANTS(PqToRec709Compressed);

}  // namespace vexel
#endif  // HWY_ONCE
