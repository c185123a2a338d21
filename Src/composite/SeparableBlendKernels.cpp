// Blend modes that work on each channel by itself.
#include <cmath>
#include <cstddef>

#include "composite/BlendKernels.h"
#include "composite/PlainBlend.h"

#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "composite/SeparableBlendKernels.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

#include "composite/BlendVectors-inl.h"
#include "frame/KernelTable.h"

#ifndef VEXEL_COMPOSITE_SEPARABLEBLENDKERNELS_CONSTANTS
#define VEXEL_COMPOSITE_SEPARABLEBLENDKERNELS_CONSTANTS
namespace vexel {
namespace {
constexpr float kLeastDivisor = 1e-7f;
}  // namespace
}  // namespace vexel
#endif

#if HWY_TARGET != HWY_SCALAR
HWY_BEFORE_NAMESPACE();
namespace vexel {
namespace HWY_NAMESPACE {
namespace {

template <VX_BlendMode kMode>
F32 Channel(F32 s, F32 d);

template <VX_BlendMode kMode>
struct Mode {
  F32 opacity, most;
  explicit HWY_INLINE Mode(const BlendArguments& arguments)
      : opacity(SetFloat(arguments.opacity)), most(SetFloat(arguments.most)) {}
  HWY_INLINE Planes operator()(const Planes& s, const Planes& d) const {
    const Colour blended = PerChannel(Channel<kMode>, s.colour, d.colour);
    Planes out = Composite(s, d, hn::Mul(s.alpha, opacity), blended);
    if constexpr (kMode == VX_BlendMode::Divide)
      out.colour = PerChannel([&](F32 c) HWY_ATTR { return hn::Min(most, c); }, out.colour);  // NaN stays
    return out;
  }
};

#define VX_CHANNEL(mode) \
  template <>            \
  HWY_INLINE F32 Channel<VX_BlendMode::mode>(F32 s, F32 d)

// 2 s d where `chooser` is dark, else the same of the complements.
HWY_INLINE F32 MultiplyOrScreen(F32 s, F32 d, F32 chooser) {
  const auto one = SetFloat(1.0f), light = hn::Sub(one, d);
  const auto screen = hn::Sub(one, hn::Mul(hn::Sub(one, s), hn::Add(light, light)));
  return Limit(hn::IfThenElse(hn::Le(chooser, SetFloat(0.5f)), hn::Mul(hn::Add(s, s), d), screen));
}

VX_CHANNEL(ColorBurn) {
  const auto one = SetFloat(1.0f);
  return Limit(hn::Sub(one, hn::Div(hn::Sub(one, Limit(d)), Limit(s, kLeastDivisor))));
}
VX_CHANNEL(ColorDodge) { return Limit(hn::Div(Limit(d), hn::Sub(SetFloat(1.0f), Limit(s, 0.0f, 0.99999f)))); }
VX_CHANNEL(Darken) { return hn::IfThenElse(hn::Ge(d, s), s, d); }
VX_CHANNEL(Difference) { return hn::Abs(hn::Sub(s, d)); }
VX_CHANNEL(Divide) {
  const auto isNothing = hn::Lt(hn::Abs(s), SetFloat(kLeastDivisor));
  return hn::Div(d, hn::IfThenElse(isNothing, SetFloat(kLeastDivisor), s));
}
VX_CHANNEL(Exclusion) {
  s = Limit(s);
  d = Limit(d);
  return Limit(hn::Sub(hn::Add(s, d), hn::Mul(hn::Add(s, s), d)));
}
VX_CHANNEL(HardLight) { return MultiplyOrScreen(Limit(s), Limit(d), Limit(s)); }
VX_CHANNEL(HardMix) { return hn::IfThenZeroElse(hn::Gt(hn::Sub(SetFloat(1.0f), d), s), SetFloat(1.0f)); }
VX_CHANNEL(Lighten) { return hn::IfThenElse(hn::Ge(s, d), s, d); }
VX_CHANNEL(LinearBurn) { return Limit(hn::Sub(hn::Add(Limit(s), Limit(d)), SetFloat(1.0f))); }
VX_CHANNEL(LinearDodge) { return hn::Add(s, d); }
VX_CHANNEL(LinearLight) {
  s = Limit(s);
  return hn::Sub(hn::Add(Limit(d), hn::Add(s, s)), SetFloat(1.0f));
}
VX_CHANNEL(Multiply) { return hn::Mul(s, d); }
VX_CHANNEL(Overlay) { return MultiplyOrScreen(Limit(s), Limit(d), Limit(d)); }
VX_CHANNEL(PinLight) {
  s = Limit(s);
  d = Limit(d);
  const auto twice = hn::Add(s, s), upper = hn::Sub(twice, SetFloat(1.0f));
  return hn::IfThenElse(hn::Gt(upper, d), upper, hn::Min(twice, d));
}
VX_CHANNEL(Screen) {
  const auto one = SetFloat(1.0f);
  return Limit(hn::Sub(one, hn::Mul(hn::Sub(one, Limit(s, kLeastDivisor)), hn::Sub(one, Limit(d, kLeastDivisor)))));
}
VX_CHANNEL(SoftLight) {
  s = Limit(s);
  d = Limit(d);
  const auto isDark = hn::Le(s, SetFloat(0.5f));
  const auto change = hn::IfThenElse(isDark, hn::Sub(d, hn::Mul(d, d)), hn::Sub(hn::Sqrt(d), d));
  return Limit(hn::Add(hn::Mul(hn::Sub(hn::Add(s, s), SetFloat(1.0f)), change), d));
}
VX_CHANNEL(Subtract) { return hn::Sub(d, s); }
VX_CHANNEL(VividLight) {
  const auto one = SetFloat(1.0f);
  s = Limit(s, 1e-6f, 0.999999f);
  d = Limit(d);
  const auto isDark = hn::Le(s, SetFloat(0.5f));
  const auto part = hn::IfThenElse(isDark, s, hn::Sub(one, s));
  const auto quotient = hn::Div(hn::IfThenElse(isDark, hn::Sub(one, d), d), hn::Add(part, part));
  return Limit(hn::IfThenElse(isDark, hn::Sub(one, quotient), quotient));
}

#undef VX_CHANNEL

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

template <VX_BlendMode kMode>
float Channel(float s, float d);

template <VX_BlendMode kMode>
BlendPixel Blend(const BlendPixel& s, const BlendPixel& d, const BlendArguments& arguments) {
  float blended[3];
  ForChannels<3>([&](size_t k) { blended[k] = Channel<kMode>(s.colour[k], d.colour[k]); });
  BlendPixel out = Composite(s, d, s.alpha * arguments.opacity, blended);
  if (kMode == VX_BlendMode::Divide)
    for (float& c : out.colour) c = Min(arguments.most, c);  // NaN stays
  return out;
}

#define VX_CHANNEL(mode) \
  template <>            \
  inline float Channel<VX_BlendMode::mode>(float s, float d)

float MultiplyOrScreen(float s, float d, float chooser) {
  return Limit(chooser <= 0.5f ? 2 * s * d : 1 - (1 - s) * (2 * (1 - d)));
}

VX_CHANNEL(ColorBurn) { return Limit(1 - (1 - Limit(d)) / Limit(s, kLeastDivisor)); }
VX_CHANNEL(ColorDodge) { return Limit(Limit(d) / (1 - Limit(s, 0.0f, 0.99999f))); }
VX_CHANNEL(Darken) { return d >= s ? s : d; }
VX_CHANNEL(Difference) { return std::fabs(s - d); }
VX_CHANNEL(Divide) { return d / (std::fabs(s) < kLeastDivisor ? kLeastDivisor : s); }
VX_CHANNEL(Exclusion) {
  s = Limit(s);
  d = Limit(d);
  return Limit(s + d - 2 * s * d);
}
VX_CHANNEL(HardLight) { return MultiplyOrScreen(Limit(s), Limit(d), Limit(s)); }
VX_CHANNEL(HardMix) { return 1.0f - d > s ? 0.0f : 1.0f; }
VX_CHANNEL(Lighten) { return s >= d ? s : d; }
VX_CHANNEL(LinearBurn) { return Limit(Limit(s) + Limit(d) - 1); }
VX_CHANNEL(LinearDodge) { return s + d; }
VX_CHANNEL(LinearLight) { return Limit(d) + 2 * Limit(s) - 1; }
VX_CHANNEL(Multiply) { return s * d; }
VX_CHANNEL(Overlay) { return MultiplyOrScreen(Limit(s), Limit(d), Limit(d)); }
VX_CHANNEL(PinLight) {
  s = Limit(s);
  d = Limit(d);
  const float upper = 2 * s - 1;
  return upper > d ? upper : Min(2 * s, d);
}
VX_CHANNEL(Screen) { return Limit(1 - (1 - Limit(s, kLeastDivisor)) * (1 - Limit(d, kLeastDivisor))); }
VX_CHANNEL(SoftLight) {
  s = Limit(s);
  d = Limit(d);
  const float change = s <= 0.5f ? d - d * d : std::sqrt(d) - d;
  return Limit((2 * s - 1) * change + d);
}
VX_CHANNEL(Subtract) { return d - s; }
VX_CHANNEL(VividLight) {
  s = Limit(s, 1e-6f, 0.999999f);
  d = Limit(d);
  return Limit(s <= 0.5f ? 1 - (1 - d) / (2 * s) : d / (2 * (1 - s)));
}

#undef VX_CHANNEL

VX_DEFINE_PLAIN_BLEND_ROWS

}  // namespace
}  // namespace plain

VX_DEFINE_BLEND(ColorBurn)
VX_DEFINE_BLEND(ColorDodge)
VX_DEFINE_BLEND(Darken)
VX_DEFINE_BLEND(Difference)
VX_DEFINE_BLEND(Divide)
VX_DEFINE_BLEND(Exclusion)
VX_DEFINE_BLEND(HardLight)
VX_DEFINE_BLEND(HardMix)
VX_DEFINE_BLEND(Lighten)
VX_DEFINE_BLEND(LinearBurn)
VX_DEFINE_BLEND(LinearDodge)
VX_DEFINE_BLEND(LinearLight)
VX_DEFINE_BLEND(Multiply)
VX_DEFINE_BLEND(Overlay)
VX_DEFINE_BLEND(PinLight)
VX_DEFINE_BLEND(Screen)
VX_DEFINE_BLEND(SoftLight)
VX_DEFINE_BLEND(Subtract)
VX_DEFINE_BLEND(VividLight)

}  // namespace vexel
#endif  // HWY_ONCE
