// The linear-light steps on pixels as one vector per channel. Scalar forms: PlainPixels.h.
#if defined(VEXEL_COLOR_COLORVECTORS_INL_H_) == defined(HWY_TARGET_TOGGLE)
#ifdef VEXEL_COLOR_COLORVECTORS_INL_H_
#undef VEXEL_COLOR_COLORVECTORS_INL_H_
#else
#define VEXEL_COLOR_COLORVECTORS_INL_H_
#endif

#include <limits>

#include <hwy/highway.h>

#include "color/PixelKernels.h"
#include "frame/PixelBlock-inl.h"

#if HWY_TARGET != HWY_SCALAR
HWY_BEFORE_NAMESPACE();
namespace vexel {
namespace HWY_NAMESPACE {
namespace hn = hwy::HWY_NAMESPACE;

// A matrix spread over vectors once per call.
struct MatrixVectors {
  HWY_INLINE explicit MatrixVectors(const Matrix3& matrix) {
    for (int i = 0; i < 9; ++i) m[i] = matrix.m[i];
  }
  HWY_INLINE ColorVector Row(int row, const RgbVectors& c) const {
    const ColorTag d;
    const float* w = m + 3 * row;
    return hn::Add(hn::Add(hn::Mul(hn::Set(d, w[0]), c.r), hn::Mul(hn::Set(d, w[1]), c.g)),
                   hn::Mul(hn::Set(d, w[2]), c.b));
  }
  HWY_INLINE void operator()(RgbVectors& c) const {
    const RgbVectors in = c;
    c.r = Row(0, in);
    c.g = Row(1, in);
    c.b = Row(2, in);
  }
  float m[9];
};

HWY_INLINE ColorVector WithSignOf(ColorVector magnitude, ColorVector c) {
  const ColorTag d;
  const auto negative = hn::VecFromMask(d, hn::Lt(c, hn::Zero(d)));
  return hn::Xor(magnitude, hn::And(negative, hn::SignBit(d)));
}

HWY_INLINE ColorVector Luma(const RgbVectors& c, const LumaWeights& luma) {
  const ColorTag d;
  return hn::Add(hn::Add(hn::Mul(hn::Set(d, luma.r), c.r), hn::Mul(hn::Set(d, luma.g), c.g)),
                 hn::Mul(hn::Set(d, luma.b), c.b));
}

HWY_INLINE ColorVector LookupUnit(ColorVector v, const float* table, int size) {
  const ColorTag d;
  const hn::RebindToSigned<ColorTag> di;
  const auto unit = hn::Min(hn::Max(v, hn::Zero(d)), hn::Set(d, 1.0f));
  const auto index = hn::ConvertTo(di, hn::Mul(unit, hn::Set(d, static_cast<float>(size - 1))));
  return hn::GatherIndex(d, table, index);
}

HWY_INLINE ColorVector Least(const RgbVectors& c) { return hn::Min(hn::Min(c.r, c.g), c.b); }
HWY_INLINE ColorVector Most(const RgbVectors& c) { return hn::Max(hn::Max(c.r, c.g), c.b); }

// Pulls toward any luma, or none.
HWY_NOINLINE inline void PullToAnyLuma(RgbVectors& c, ColorVector y) {
  const ColorTag d;
  const auto zero = hn::Zero(d);
  const auto one = hn::Set(d, 1.0f);
  const auto negR = hn::Lt(c.r, zero), negG = hn::Lt(c.g, zero), negB = hn::Lt(c.b, zero);
  const ColorVector downR = hn::Sub(y, c.r), downG = hn::Sub(y, c.g), downB = hn::Sub(y, c.b);
  const auto stuck = hn::Or(hn::Or(hn::And(negR, hn::Eq(downR, zero)), hn::And(negG, hn::Eq(downG, zero))),
                            hn::And(negB, hn::Eq(downB, zero)));
  const auto pull = hn::AndNot(stuck, hn::Or(hn::Or(negR, negG), negB));
  const ColorVector t =
      hn::Min(hn::Min(hn::IfThenElse(negR, hn::Div(y, downR), one), hn::IfThenElse(negG, hn::Div(y, downG), one)),
              hn::IfThenElse(negB, hn::Div(y, downB), one));
  const auto holds = hn::Ge(y, zero);
  const auto move = [&](ColorVector v) HWY_ATTR {
    const ColorVector pulled = hn::Add(y, hn::Mul(hn::Sub(v, y), t));
    return hn::IfThenElse(pull, hn::IfThenElse(holds, hn::Max(pulled, zero), pulled), v);
  };
  c = {move(c.r), move(c.g), move(c.b)};
}

// Where luma is not negative, the least channel decides how far to pull.
HWY_INLINE void PullNegatives(RgbVectors& c, const LumaWeights& luma) {
  const ColorTag d;
  const auto zero = hn::Zero(d);
  const ColorVector y = Luma(c, luma), least = Least(c);
  const auto usual = hn::And(hn::Ge(y, zero), hn::Lt(y, hn::Set(d, std::numeric_limits<float>::infinity())));
  if (HWY_UNLIKELY(!hn::AllTrue(d, usual))) return PullToAnyLuma(c, y);
  const auto pull = hn::Lt(least, zero);
  const ColorVector t = hn::Div(y, hn::Sub(y, least));
  const auto move = [&](ColorVector v) HWY_ATTR {
    return hn::IfThenElse(pull, hn::Max(hn::Add(y, hn::Mul(hn::Sub(v, y), t)), zero), v);
  };
  c = {move(c.r), move(c.g), move(c.b)};
}

HWY_INLINE void ScaleOver(RgbVectors& c, const LumaWeights& luma) {
  const ColorTag d;
  const auto one = hn::Set(d, 1.0f);
  const auto over = hn::Or(hn::Or(hn::Gt(c.r, one), hn::Gt(c.g, one)), hn::Gt(c.b, one));
  const ColorVector least = Least(c), most = Most(c);
  const ColorVector s = hn::Div(one, hn::Sub(most, least));
  const auto part = [&](float weight, ColorVector v)
                        HWY_ATTR { return hn::Mul(hn::Mul(hn::Set(d, weight), hn::Sub(v, least)), s); };
  const ColorVector weighted = hn::Add(hn::Add(part(luma.r, c.r), part(luma.g, c.g)), part(luma.b, c.b));
  const ColorVector pivot = hn::Min(hn::Max(weighted, hn::Set(d, 0.15f)), hn::Set(d, 0.9f));
  const ColorVector k = hn::Div(hn::Sub(one, pivot), hn::Sub(most, pivot));
  const auto move = [&](ColorVector v) HWY_ATTR {
    const ColorVector scaled = hn::Min(one, hn::Add(hn::Mul(hn::Sub(v, pivot), k), pivot));
    return hn::IfThenElse(over, hn::IfThenElse(hn::Eq(v, most), one, scaled), v);
  };
  c = {move(c.r), move(c.g), move(c.b)};
}

// stage(RgbVectors&) changes the colours of a block, which are then brought inside the gamut. Many blocks are: the
// divisions wait for one that is not.
template <class Stage>
HWY_INLINE void ForEachColorIntoGamut(PixelBlock& block, const LumaWeights& luma, const Stage& stage) {
  const ColorTag d;
  auto least = hn::Zero(d), most = hn::Zero(d);  // NaN does not count.
  const auto findMost = [&](const RgbVectors& c) HWY_ATTR { most = hn::Max(c.r, hn::Max(c.g, hn::Max(c.b, most))); };
  ForEachColor(block, [&](RgbVectors& c) VX_COLOR_STAGE {
    stage(c);
    least = hn::Min(c.r, hn::Min(c.g, hn::Min(c.b, least)));
    findMost(c);
  });
  if (!hn::AllFalse(d, hn::Lt(least, hn::Zero(d)))) {
    most = hn::Zero(d);
    ForEachColor(block, [&](RgbVectors& c) VX_COLOR_STAGE {
      PullNegatives(c, luma);
      findMost(c);
    });
  }
  if (!hn::AllFalse(d, hn::Gt(most, hn::Set(d, 1.0f))))
    ForEachColor(block, [&](RgbVectors& c) VX_COLOR_STAGE { ScaleOver(c, luma); });
}

}  // namespace HWY_NAMESPACE
}  // namespace vexel
HWY_AFTER_NAMESPACE();
#endif  // HWY_TARGET

#endif
