// R'G'B' <-> Y'CbCr in double precision, from the luma coefficients alone: what the 8-bit kernels are measured against.
#pragma once

#include <algorithm>

namespace vexel::testing {

struct Triple {
  double c[3];
};

struct Luma {
  double r, b;
  double g() const { return 1 - r - b; }
};
inline constexpr Luma k601{0.299, 0.114}, k709{0.2126, 0.0722};

// 8-bit codes in memory order: B, G, R of 0..255 and V, U, Y of studio video. Nothing is rounded or clamped.
inline Triple BgrToVuy(const Luma& k, const Triple& bgr) {
  const double y = k.r * bgr.c[2] + k.g() * bgr.c[1] + k.b * bgr.c[0];
  return {{128 + 224 * (bgr.c[2] - y) / (2 - 2 * k.r) / 255, 128 + 224 * (bgr.c[0] - y) / (2 - 2 * k.b) / 255,
           16 + 219 * y / 255}};
}
inline Triple VuyToBgr(const Luma& k, const Triple& vuy) {
  const double y = 255 * (vuy.c[2] - 16) / 219;
  const double r = y + (2 - 2 * k.r) * 255 * (vuy.c[0] - 128) / 224,
               b = y + (2 - 2 * k.b) * 255 * (vuy.c[1] - 128) / 224;
  return {{b, (y - k.r * r - k.b * b) / k.g(), r}};
}

inline double Code8(double value) { return std::clamp(value, 0.0, 255.0); }

}  // namespace vexel::testing
