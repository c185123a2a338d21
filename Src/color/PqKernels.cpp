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

HWY_BEFORE_NAMESPACE();
namespace vexel {
namespace HWY_NAMESPACE {

HWY_INLINE OneLess PqEncodingRatio(ColorVector v) {
  const ColorTag d;
  const auto one = hn::Set(d, 1.0f);
  const auto y = hn::Abs(v);
  return {hn::Div(hn::Mul(hn::Set(d, kPqBelowOne), hn::Sub(one, y)), hn::Add(hn::Mul(hn::Set(d, kPqC3), y), one))};
}

HWY_INLINE ColorVector PqDecodingRatio(ColorVector v) {
  const ColorTag d;
  const auto e = hn::Abs(v);
  const auto below = hn::Sub(hn::Set(d, kPqC2), hn::Mul(e, hn::Set(d, kPqC3)));
  return hn::Max(hn::Div(hn::Sub(e, hn::Set(d, kPqC1)), below), hn::Zero(d));
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
    SignedPowers<PowerCore::Float>(block, kPqM1);
    Powers<PowerCore::Long>(
        block, kPqM2, [](ColorVector v) VX_COLOR_STAGE { return PqEncodingRatio(v); },
        [&](ColorVector power, ColorVector v)
            VX_COLOR_STAGE { return WithSignOf(hn::Mul(power, hn::Set(d, local.scale)), v); });
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
  const ColorTag d;
  ForEachBlock(src, dst, count, [&](PixelBlock& block) VX_COLOR_STAGE {
    ForEachColor(block, [&](RgbVectors& c) VX_COLOR_STAGE {
      const auto scale = hn::Set(d, local.scale);
      c = {hn::Mul(c.r, scale), hn::Mul(c.g, scale), hn::Mul(c.b, scale)};
    });
    SignedPowers<PowerCore::Float>(block, kPqInverseM2);
    Powers<PowerCore::Long>(
        block, kPqInverseM1, [](ColorVector v) VX_COLOR_STAGE { return PqDecodingRatio(v); },
        [&](ColorVector power, ColorVector v)
            VX_COLOR_STAGE { return WithSignOf(hn::Mul(power, hn::Set(d, 100.0f)), v); });
    if (local.applyMatrix) ForEachColor(block, matrix);
    SignedPowers<PowerCore::Float>(block, kPower1Over2_4);
    if constexpr (kCompressed) ForEachColor(block, [&](RgbVectors& c) VX_COLOR_STAGE { CompressGamut(c, local.luma); });
  });
}

void PqToRec709(const float* src, float* dst, size_t count, const PqJob& job) {
  PqToRec709Loop<false>(src, dst, count, job);
}
void PqToRec709Compressed(const float* src, float* dst, size_t count, const PqJob& job) {
  PqToRec709Loop<true>(src, dst, count, job);
}

}  // namespace HWY_NAMESPACE
}  // namespace vexel
HWY_AFTER_NAMESPACE();

#if HWY_ONCE

#include "frame/KernelTable.h"

namespace vexel {
namespace plain {

void Rec709ToPq(const float* src, float* dst, size_t count, const PqJob& job) {
  ForEachPlainPixel(src, dst, count, [&](LinearRgb& c) {
    ForEachChannel(c, [](float v) { return SignedPower(v, kPower2_4); });
    c = Apply(job.matrix, c);
    ForEachChannel(c, [&](float v) {
      const float light = v * 0.01f, y = Power(std::fabs(light), kPqM1);
      return WithSignOf(PowerOfOneLess(PqRatioBelowOne(y), kPqM2) * job.scale, light);
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
  ForEachChannel(c, [&](float v) {
    const float e = Power(std::fabs(v) * job.scale, kPqInverseM2);
    const float ratio = Most((e - kPqC1) / (kPqC2 - kPqC3 * e), 0.0f);
    return WithSignOf(Power(ratio, kPqInverseM1) * 100.0f, v);
  });
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

}  // namespace plain

const KernelVariants<PqKernel> kRec709ToPq = VX_KERNEL_VARIANTS(Rec709ToPq);
const KernelVariants<PqKernel> kPqTableToRec709 = VX_KERNEL_VARIANTS(PqTableToRec709);
const KernelVariants<PqKernel> kPqToRec709 = VX_KERNEL_VARIANTS(PqToRec709);
const KernelVariants<PqKernel> kPqToRec709Compressed = VX_KERNEL_VARIANTS(PqToRec709Compressed);

}  // namespace vexel

#endif  // HWY_ONCE
