// Blend modes that brighten or darken by one picture the contrast of the other, channel by channel.
#include <cmath>
#include <cstddef>
#include <cstdint>

#include "composite/BlendKernels.h"
#include "composite/PlainBlend.h"

#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "composite/ContrastBlendKernels.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

#include "composite/BlendVectors-inl.h"
#include "frame/KernelTable.h"

#ifndef VEXEL_COMPOSITE_CONTRASTBLENDKERNELS_CONSTANTS
#define VEXEL_COMPOSITE_CONTRASTBLENDKERNELS_CONSTANTS
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
  F32 opacity;
  explicit HWY_INLINE Mode(const BlendArguments& arguments) : opacity(SetFloat(arguments.opacity)) {}
  HWY_INLINE Planes operator()(const Planes& s, const Planes& d) const {
    const Colour blended = PerChannel(Channel<kMode>, s.colour, d.colour);
    return Composite(s, d, hn::Mul(s.alpha, opacity), blended);
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
VX_CHANNEL(HardLight) { return MultiplyOrScreen(Limit(s), Limit(d), Limit(s)); }
VX_CHANNEL(Overlay) { return MultiplyOrScreen(Limit(s), Limit(d), Limit(d)); }
VX_CHANNEL(SoftLight) {
  s = Limit(s);
  d = Limit(d);
  const auto isDark = hn::Le(s, SetFloat(0.5f));
  const auto change = hn::IfThenElse(isDark, hn::Sub(d, hn::Mul(d, d)), hn::Sub(hn::Sqrt(d), d));
  return Limit(hn::Add(hn::Mul(hn::Sub(hn::Add(s, s), SetFloat(1.0f)), change), d));
}
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
  return Composite(s, d, s.alpha * arguments.opacity, blended);
}

#define VX_CHANNEL(mode) \
  template <>            \
  inline float Channel<VX_BlendMode::mode>(float s, float d)

float MultiplyOrScreen(float s, float d, float chooser) {
  return Limit(chooser <= 0.5f ? 2 * s * d : 1 - (1 - s) * (2 * (1 - d)));
}

VX_CHANNEL(ColorBurn) { return Limit(1 - (1 - Limit(d)) / Limit(s, kLeastDivisor)); }
VX_CHANNEL(ColorDodge) { return Limit(Limit(d) / (1 - Limit(s, 0.0f, 0.99999f))); }
VX_CHANNEL(HardLight) { return MultiplyOrScreen(Limit(s), Limit(d), Limit(s)); }
VX_CHANNEL(Overlay) { return MultiplyOrScreen(Limit(s), Limit(d), Limit(d)); }
VX_CHANNEL(SoftLight) {
  s = Limit(s);
  d = Limit(d);
  const float change = s <= 0.5f ? d - d * d : std::sqrt(d) - d;
  return Limit((2 * s - 1) * change + d);
}
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
VX_DEFINE_BLEND(HardLight)
VX_DEFINE_BLEND(Overlay)
VX_DEFINE_BLEND(SoftLight)
VX_DEFINE_BLEND(VividLight)

}  // namespace vexel
#endif  // HWY_ONCE
