// Blend modes that take hue, saturation or luminosity of a pixel from one picture and the rest from the other.
#include <cstddef>

#include "composite/BlendKernels.h"
#include "composite/PlainBlend.h"

#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "composite/NonSeparableBlendKernels.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

#include "composite/BlendVectors-inl.h"
#include "frame/KernelTable.h"

#ifndef VEXEL_COMPOSITE_NONSEPARABLEBLENDKERNELS_CONSTANTS
#define VEXEL_COMPOSITE_NONSEPARABLEBLENDKERNELS_CONSTANTS
namespace vexel {
namespace {
constexpr float kLumRed = 0.3f, kLumGreen = 0.59f, kLumBlue = 0.11f;
}  // namespace
}  // namespace vexel
#endif

#if HWY_TARGET != HWY_SCALAR
HWY_BEFORE_NAMESPACE();
namespace vexel {
namespace HWY_NAMESPACE {
namespace {

using M = VX_BlendMode;

HWY_INLINE F32 Lum(const Colour& c) {
  return hn::Add(hn::Add(hn::Mul(SetFloat(kLumRed), c.red), hn::Mul(SetFloat(kLumGreen), c.green)),
                 hn::Mul(SetFloat(kLumBlue), c.blue));
}
HWY_INLINE F32 Least(const Colour& c) { return hn::Min(hn::Min(c.blue, c.green), c.red); }
HWY_INLINE F32 Most(const Colour& c) { return hn::Max(hn::Max(c.blue, c.green), c.red); }
HWY_INLINE F32 Sat(const Colour& c) { return hn::Sub(Most(c), Least(c)); }

// Where `applies`, draws c toward the grey `lum` by the quotient, which is computed once for all channels.
template <class Mask>
HWY_INLINE Colour PullToGrey(const Colour& c, F32 lum, Mask applies, F32 numerator, F32 denominator) {
  const auto factor = hn::Div(numerator, hn::IfThenElse(applies, denominator, SetFloat(1.0f)));
  const auto pull = [&](F32 x)
                        HWY_ATTR { return hn::IfThenElse(applies, hn::Add(lum, hn::Mul(hn::Sub(x, lum), factor)), x); };
  return PerChannel(pull, c);
}

HWY_INLINE Colour SetLum(const Colour& c, F32 lum) {
  const auto zero = SetFloat(0.0f), one = SetFloat(1.0f);
  const auto delta = hn::Sub(Limit(lum), Limit(Lum(c)));
  const Colour shifted = PerChannel([&](F32 x) HWY_ATTR { return hn::Add(x, delta); }, c);
  const auto grey = Limit(Lum(shifted)), least = Least(shifted), most = Most(shifted);
  const Colour raised = PullToGrey(shifted, grey, hn::Lt(least, zero), grey, hn::Sub(grey, least));
  return PullToGrey(raised, grey, hn::Gt(most, one), hn::Sub(one, grey), hn::Sub(most, grey));
}

HWY_INLINE Colour SetSat(const Colour& c, F32 sat) {
  const auto least = Least(c), range = hn::Sub(Most(c), least);
  const auto isColour = hn::Gt(range, SetFloat(0.0f));
  const auto inverse = hn::Div(SetFloat(1.0f), hn::IfThenElse(isColour, range, SetFloat(1.0f)));
  const auto stretch = [&](F32 x) HWY_ATTR {
    return hn::IfThenElseZero(isColour, hn::Mul(hn::Mul(hn::Sub(x, least), inverse), sat));
  };
  return PerChannel(stretch, c);
}

template <VX_BlendMode kMode>
HWY_INLINE Colour Recoloured(const Colour& s, const Colour& d) {
  if constexpr (kMode == M::Color) return SetLum(s, Lum(d));
  if constexpr (kMode == M::Luminosity) return SetLum(d, Lum(s));
  if constexpr (kMode == M::Hue) return SetLum(SetSat(s, Sat(d)), Lum(d));
  if constexpr (kMode == M::Saturation) return SetLum(SetSat(d, Sat(s)), Lum(d));
}

template <VX_BlendMode kMode>
struct Mode {
  F32 opacity;
  explicit HWY_INLINE Mode(const BlendArguments& arguments) : opacity(SetFloat(arguments.opacity)) {}
  HWY_INLINE Planes operator()(const Planes& s, const Planes& d) const {
    return Composite(s, d, hn::Mul(s.alpha, opacity), Recoloured<kMode>(s.colour, d.colour));
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

using M = VX_BlendMode;

float Lum(const float c[3]) { return kLumRed * c[2] + kLumGreen * c[1] + kLumBlue * c[0]; }
float Least(const float c[3]) { return Min(Min(c[0], c[1]), c[2]); }
float Most(const float c[3]) { return Max(Max(c[0], c[1]), c[2]); }
float Sat(const float c[3]) { return Most(c) - Least(c); }

void PullToGrey(float c[3], float lum, float factor) {
  ForChannels<3>([&](size_t k) { c[k] = lum + (c[k] - lum) * factor; });
}

void SetLum(float c[3], float lum) {
  const float delta = Limit(lum) - Limit(Lum(c));
  ForChannels<3>([&](size_t k) { c[k] += delta; });
  const float grey = Limit(Lum(c)), least = Least(c), most = Most(c);
  if (least < 0) PullToGrey(c, grey, grey / (grey - least));
  if (most > 1) PullToGrey(c, grey, (1 - grey) / (most - grey));
}

// The channels keep their order and their ratios of distance, from 0 to `sat`; grey becomes black.
void SetSat(float c[3], float sat) {
  const float least = Least(c), range = Most(c) - least;
  ForChannels<3>([&](size_t k) { c[k] = range > 0 ? (c[k] - least) * (1 / range) * sat : 0; });
}

template <VX_BlendMode kMode>
BlendPixel Blend(const BlendPixel& s, const BlendPixel& d, const BlendArguments& arguments) {
  constexpr bool kKeepsBackground = kMode == M::Luminosity || kMode == M::Saturation;
  BlendPixel c = kKeepsBackground ? d : s;
  if (kMode == M::Hue) SetSat(c.colour, Sat(d.colour));
  if (kMode == M::Saturation) SetSat(c.colour, Sat(s.colour));
  SetLum(c.colour, Lum(kMode == M::Luminosity ? s.colour : d.colour));
  return Composite(s, d, s.alpha * arguments.opacity, c.colour);
}

VX_DEFINE_PLAIN_BLEND_ROWS

}  // namespace
}  // namespace plain

VX_DEFINE_BLEND(Color)
VX_DEFINE_BLEND(Hue)
VX_DEFINE_BLEND(Luminosity)
VX_DEFINE_BLEND(Saturation)

}  // namespace vexel
#endif  // HWY_ONCE
