// The scalar definitions that the plain kernels share. Vector forms: ColorVectors-inl.h.
#pragma once

#include <cstddef>
#include <cstring>

#include "color/PixelKernels.h"

namespace vexel {
namespace plain {

struct LinearRgb {
  float r, g, b;
};

// pixel(LinearRgb&) changes the colour; alpha is copied bit by bit.
template <class Change>
void ForEachPlainPixel(const float* src, float* dst, size_t count, const Change& change) {
  for (size_t i = 0; i < count; ++i, src += 4, dst += 4) {
    LinearRgb c{src[2], src[1], src[0]};
    change(c);
    std::memmove(dst + 3, src + 3, sizeof(float));
    dst[0] = c.b;
    dst[1] = c.g;
    dst[2] = c.r;
  }
}

template <class Curve>
void ForEachChannel(LinearRgb& c, const Curve& curve) {
  c = {curve(c.r), curve(c.g), curve(c.b)};
}

inline LinearRgb Apply(const Matrix3& matrix, const LinearRgb& c) {
  const float* m = matrix.m;
  return {m[0] * c.r + m[1] * c.g + m[2] * c.b, m[3] * c.r + m[4] * c.g + m[5] * c.b,
          m[6] * c.r + m[7] * c.g + m[8] * c.b};
}

// What the processor's minimum and maximum do: the second where either is NaN.
inline float Least(float a, float b) { return a < b ? a : b; }
inline float Most(float a, float b) { return a > b ? a : b; }

inline float WithSignOf(float magnitude, float c) { return c < 0.0f ? -magnitude : magnitude; }

// Looks up a value of [0, 1] in a table without interpolation; values outside are held at the ends, NaN at the first.
inline float LookupUnit(float v, const float* table, int size) {
  return table[static_cast<int>(Least(Most(v, 0.0f), 1.0f) * static_cast<float>(size - 1))];
}

// Brings a colour outside [0, 1] inside. Rounding could leave a channel just outside; it is held at the bound, because
// the encoding that follows makes 1e-9 visible.
inline void CompressGamut(LinearRgb& c, const LumaWeights& luma) {
  if (c.r < 0.0f || c.g < 0.0f || c.b < 0.0f) {
    const float y = luma.r * c.r + luma.g * c.g + luma.b * c.b;
    const auto reach = [y](float v) { return v < 0.0f ? y / (y - v) : 1.0f; };
    const auto stuck = [y](float v) { return v < 0.0f && y - v == 0.0f; };
    if (!stuck(c.r) && !stuck(c.g) && !stuck(c.b)) {
      const float t = Least(Least(reach(c.r), reach(c.g)), reach(c.b));
      ForEachChannel(c, [y, t](float v) {
        const float pulled = y + (v - y) * t;
        return y >= 0.0f ? Most(pulled, 0.0f) : pulled;
      });
    }
  }
  if (c.r > 1.0f || c.g > 1.0f || c.b > 1.0f) {
    const float least = Least(Least(c.r, c.g), c.b);
    const float most = Most(Most(c.r, c.g), c.b);
    const float s = 1.0f / (most - least);
    const float weighted = luma.r * (c.r - least) * s + luma.g * (c.g - least) * s + luma.b * (c.b - least) * s;
    const float pivot = Least(Most(weighted, 0.15f), 0.9f);
    const float k = (1.0f - pivot) / (most - pivot);
    ForEachChannel(c, [&](float v) { return v == most ? 1.0f : Least(1.0f, (v - pivot) * k + pivot); });
  }
}

}  // namespace plain
}  // namespace vexel
