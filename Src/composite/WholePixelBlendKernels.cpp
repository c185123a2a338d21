// Blend modes that take the darker or the lighter pixel as a whole.

#include "composite/BlendKernels.h"
#include "composite/PlainBlend.h"

#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "composite/WholePixelBlendKernels.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

#include "composite/BlendVectors-inl.h"
#include "frame/KernelTable.h"

#if HWY_TARGET != HWY_SCALAR
HWY_BEFORE_NAMESPACE();
namespace vexel {
namespace HWY_NAMESPACE {
namespace {

// The pixel of `a` where the mask says so, else that of `b`.
template <class Mask>
HWY_INLINE Planes Choose(Mask mask, const Planes& a, const Planes& b) {
  const auto choose = [&](F32 x, F32 y) HWY_ATTR { return hn::IfThenElse(mask, x, y); };
  return {PerChannel(choose, a.colour, b.colour), choose(a.alpha, b.alpha)};
}

template <VX_BlendMode kMode>
struct Mode {
  F32 opacity;
  Colour weights;
  explicit HWY_INLINE Mode(const BlendArguments& arguments)
      : opacity(SetFloat(arguments.opacity)),
        weights{SetFloat(arguments.luma[0]), SetFloat(arguments.luma[1]), SetFloat(arguments.luma[2])} {}

  HWY_INLINE F32 Luma(const Colour& c) const {
    return Limit(
        hn::Add(hn::Add(hn::Mul(weights.red, c.red), hn::Mul(weights.green, c.green)), hn::Mul(weights.blue, c.blue)));
  }
  HWY_INLINE Planes operator()(const Planes& s, const Planes& d) const {
    const auto as = hn::Mul(s.alpha, opacity), guard = SetFloat(kAlphaGuard);
    const auto ls = Luma(s.colour), lb = Luma(d.colour);
    const auto wins = kMode == VX_BlendMode::DarkerColor ? hn::Gt(lb, ls) : hn::Gt(ls, lb);
    Planes alone = s;
    alone.alpha = as;
    const Planes met = Choose(wins, Composite(s, d, as, s.colour), d);
    return Choose(hn::Lt(as, guard), d, Choose(hn::Lt(d.alpha, guard), alone, met));
  }
};

VX_DEFINE_BLEND_ROWS

}  // namespace
}  // namespace HWY_NAMESPACE
}  // namespace vexel
HWY_AFTER_NAMESPACE();
#endif  // HWY_TARGET

#if HWY_ONCE
namespace vexel {
namespace plain {
namespace {

float Luma(const float c[3], const BlendArguments& arguments) {
  return Limit(arguments.luma[2] * c[2] + arguments.luma[1] * c[1] + arguments.luma[0] * c[0]);
}

template <VX_BlendMode kMode>
BlendPixel Blend(const BlendPixel& s, const BlendPixel& d, const BlendArguments& arguments) {
  const float as = s.alpha * arguments.opacity;
  if (as < kAlphaGuard) return d;
  if (d.alpha < kAlphaGuard) return {{s.colour[0], s.colour[1], s.colour[2]}, as};
  const float ls = Luma(s.colour, arguments), lb = Luma(d.colour, arguments);
  const bool wins = kMode == VX_BlendMode::DarkerColor ? lb > ls : ls > lb;
  return wins ? Composite(s, d, as, s.colour) : d;
}

VX_DEFINE_PLAIN_BLEND_ROWS

}  // namespace
}  // namespace plain

VX_DEFINE_BLEND(DarkerColor)
VX_DEFINE_BLEND(LighterColor)

}  // namespace vexel
#endif  // HWY_ONCE
