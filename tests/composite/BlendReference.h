// The blend modes in double precision, pixel by pixel, from their published formulas.
#pragma once

#include <array>

#include "support/Test.h"
#include "vexel/compositing.h"

namespace vexel::testing {

struct ReferencePixel {
  std::array<double, 3> colour;  // blue, green, red
  double alpha;
};

namespace reference {

using Colour = std::array<double, 3>;
using M = VX_BlendMode;

inline double Unit(double x) { return std::clamp(x, 0.0, 1.0); }
inline double Hard(double chooser, double s, double d) {
  return chooser <= 0.5 ? 2 * s * d : s + s - 1 + d * (2 - 2 * s);
}

inline double Channel(M mode, double s, double d) {
  const double cs = Unit(s), cd = Unit(d), vivid = std::clamp(s, 1e-6, double{0.999999f});
  switch (mode) {
    case M::ColorBurn:
      return Unit(1 - (1 - cd) / std::clamp(s, 1e-7, 1.0));
    case M::ColorDodge:
      return Unit(cd / (1 - std::clamp(s, 0.0, double{0.99999f})));
    case M::Darken:
      return std::min(s, d);
    case M::Difference:
      return std::max(s, d) - std::min(s, d);
    case M::Exclusion:
      return cs * (1 - cd) + cd * (1 - cs);
    case M::HardLight:
      return Hard(cs, cs, cd);
    case M::HardMix:
      return s + d >= 1 ? 1 : 0;
    case M::Lighten:
      return std::max(s, d);
    case M::LinearBurn:
      return Unit(cs + cd - 1);
    case M::LinearDodge:
      return s + d;
    case M::LinearLight:
      return cd + 2 * cs - 1;
    case M::Multiply:
      return s * d;
    case M::Overlay:
      return Hard(cd, cs, cd);
    case M::PinLight:
      return std::max(2 * cs - 1, std::min(2 * cs, cd));
    case M::Screen:
      return cs + cd - cs * cd;
    case M::SoftLight:
      return cs <= 0.5 ? cd - (1 - 2 * cs) * cd * (1 - cd) : cd + (2 * cs - 1) * (std::sqrt(cd) - cd);
    case M::VividLight:
      return Unit(vivid <= 0.5 ? 1 - (1 - cd) / (2 * vivid) : cd / (2 - 2 * vivid));
    case M::Subtract:
      return d - s;
    case M::Divide:
      return d / (std::abs(s) < 1e-7 ? 1e-7 : s);
    default:
      return s;
  }
}

inline double Luma(const Colour& c, double red, double green) {
  return red * c[2] + green * c[1] + (1 - red - green) * c[0];
}
inline double Lum(const Colour& c) { return Luma(c, 0.3, 0.59); }
inline double Sat(const Colour& c) {
  const auto [least, most] = std::minmax_element(c.begin(), c.end());
  return *most - *least;
}

inline Colour SetLum(Colour c, double lum) {
  const double delta = Unit(lum) - Unit(Lum(c));
  for (double& x : c) x += delta;
  const double grey = Unit(Lum(c)), least = *std::min_element(c.begin(), c.end()),
               most = *std::max_element(c.begin(), c.end());
  for (double& x : c) {
    if (least < 0) x = grey + (x - grey) * grey / (grey - least);
    if (most > 1) x = grey + (x - grey) * (1 - grey) / (most - grey);
  }
  return c;
}

// By sorting, as the published pseudo-code has it.
inline Colour SetSat(const Colour& c, double sat) {
  std::array<size_t, 3> order = {0, 1, 2};
  std::sort(order.begin(), order.end(), [&](size_t a, size_t b) { return c[a] < c[b]; });
  const auto [least, middle, most] = order;
  Colour out{};
  if (c[most] > c[least]) {
    out[middle] = (c[middle] - c[least]) * sat / (c[most] - c[least]);
    out[most] = sat;
  }
  return out;
}

inline Colour Blended(M mode, const Colour& s, const Colour& d) {
  if (mode == M::Color) return SetLum(s, Lum(d));
  if (mode == M::Luminosity) return SetLum(d, Lum(s));
  if (mode == M::Hue) return SetLum(SetSat(s, Sat(d)), Lum(d));
  if (mode == M::Saturation) return SetLum(SetSat(d, Sat(s)), Lum(d));
  return {Channel(mode, s[0], d[0]), Channel(mode, s[1], d[1]), Channel(mode, s[2], d[2])};
}

}  // namespace reference

// Every mode but Dissolve.
inline ReferencePixel BlendReference(VX_BlendMode mode, const ReferencePixel& s, const ReferencePixel& d,
                                     double opacity, int width) {
  const double as = s.alpha * opacity, ab = d.alpha, guard = 8e-6;
  if (mode == VX_BlendMode::DarkerColor || mode == VX_BlendMode::LighterColor) {
    if (as < guard) return d;
    if (ab < guard) return {s.colour, as};
    const double red = width > 720 ? 0.2126 : 0.299, green = width > 720 ? 0.7152 : 0.587;
    const double more =
        reference::Unit(reference::Luma(s.colour, red, green)) - reference::Unit(reference::Luma(d.colour, red, green));
    if (mode == VX_BlendMode::DarkerColor ? more >= 0 : more <= 0) return d;
  }
  const double ao = 1 - (1 - as) * (1 - ab);
  ReferencePixel out{{}, ao};
  if (std::abs(ao) < guard) return out;
  const auto blended = reference::Blended(mode, s.colour, d.colour);
  // What is seen of the background alone, of the source alone, and of both.
  for (size_t k = 0; k < 3; ++k)
    out.colour[k] = ((1 - as) * ab * d.colour[k] + as * (1 - ab) * s.colour[k] + as * ab * blended[k]) / ao;
  return out;
}

}  // namespace vexel::testing
