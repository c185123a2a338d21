// Blend modes that take hue, saturation or luminosity of a pixel from one picture and the rest from the other.
#include <cstddef>
#include <cstdint>

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

#if HWY_TARGET != HWY_BASELINE_SCALAR
HWY_BEFORE_NAMESPACE();
namespace vexel {
namespace HWY_NAMESPACE {
namespace {

using M = VX_BlendMode;

HWY_INLINE F32 Lum(const F32 c[3]) {
  return hn::Add(hn::Add(hn::Mul(SetFloat(kLumRed), c[2]), hn::Mul(SetFloat(kLumGreen), c[1])),
                 hn::Mul(SetFloat(kLumBlue), c[0]));
}
HWY_INLINE F32 Least(const F32 c[3]) { return hn::Min(hn::Min(c[0], c[1]), c[2]); }
HWY_INLINE F32 Most(const F32 c[3]) { return hn::Max(hn::Max(c[0], c[1]), c[2]); }
HWY_INLINE F32 Sat(const F32 c[3]) { return hn::Sub(Most(c), Least(c)); }

// Where `applies`, draws c toward the grey `lum` by the quotient, which is computed once for all channels.
template <class Mask>
HWY_INLINE void PullToGrey(F32 c[3], F32 lum, Mask applies, F32 numerator, F32 denominator) {
  const auto factor = hn::Div(numerator, hn::IfThenElse(applies, denominator, SetFloat(1.0f)));
  for (int k = 0; k < 3; ++k) c[k] = hn::IfThenElse(applies, hn::Add(lum, hn::Mul(hn::Sub(c[k], lum), factor)), c[k]);
}

HWY_INLINE void SetLum(F32 c[3], F32 lum) {
  const auto zero = SetFloat(0.0f), one = SetFloat(1.0f);
  const auto delta = hn::Sub(Limit(lum), Limit(Lum(c)));
  for (int k = 0; k < 3; ++k) c[k] = hn::Add(c[k], delta);
  const auto grey = Limit(Lum(c)), least = Least(c), most = Most(c);
  PullToGrey(c, grey, hn::Lt(least, zero), grey, hn::Sub(grey, least));
  PullToGrey(c, grey, hn::Gt(most, one), hn::Sub(one, grey), hn::Sub(most, grey));
}

HWY_INLINE void SetSat(F32 c[3], F32 sat) {
  const auto least = Least(c), range = hn::Sub(Most(c), least);
  const auto isColour = hn::Gt(range, SetFloat(0.0f));
  const auto inverse = hn::Div(SetFloat(1.0f), hn::IfThenElse(isColour, range, SetFloat(1.0f)));
  for (int k = 0; k < 3; ++k) c[k] = hn::IfThenElseZero(isColour, hn::Mul(hn::Mul(hn::Sub(c[k], least), inverse), sat));
}

template <VX_BlendMode kMode>
struct Mode {
  F32 opacity;
  explicit HWY_INLINE Mode(const BlendArguments& arguments) : opacity(SetFloat(arguments.opacity)) {}
  HWY_INLINE Planes operator()(const Planes& s, const Planes& d) const {
    constexpr bool kKeepsBackground = kMode == M::Luminosity || kMode == M::Saturation;
    Planes c = kKeepsBackground ? d : s;
    if constexpr (kMode == M::Hue) SetSat(c.colour, Sat(d.colour));
    if constexpr (kMode == M::Saturation) SetSat(c.colour, Sat(s.colour));
    SetLum(c.colour, Lum(kMode == M::Luminosity ? s.colour : d.colour));
    return Composite(s, d, hn::Mul(s.alpha, opacity), c.colour);
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
