// Scalar definitions of 8-bit compositing over opaque pixels.
#pragma once

#include <cstdint>

namespace vexel::plain {

// n / 255 to nearest; there are no ties.
inline int Divide255(int n) { return (2 * n + 255) / 510; }

// s a + d (1 - a) for a of 0..255, rounded to nearest.
inline uint8_t OverOpaque(int s, int d, int alpha) {
  return static_cast<uint8_t>(Divide255(s * alpha + d * (255 - alpha)));
}

// Opacity in 1/65536, so that 1 becomes 65535.
inline uint16_t FixedOpacity(float opacity) {
  const float scaled = opacity * 65536.0f + 0.5f;
  return static_cast<uint16_t>(scaled < 65535.0f ? scaled : 65535.0f);
}

// Source alpha times opacity in 1/32768, at most 32767.
inline int Weight15(int alpha, uint16_t fixedOpacity) {
  return (static_cast<int>(alpha * 257u * fixedOpacity >> 16) + 1) >> 1;
}

// d + (s - d) weight, the product kept to 1/128. The shift of a negative number rounds down, as the processor's does.
inline uint8_t OverOpaqueWeighted(int s, int d, int weight) {
  const int difference = ((s - d) * 128 * weight + (1 << 14)) >> 15;
  return static_cast<uint8_t>((d * 128 + difference + 64) >> 7);
}

}  // namespace vexel::plain
