// Scalar definitions of 8-bit compositing over opaque pixels.
#pragma once

#include <cstdint>

namespace vexel::plain {

// n / 255 to nearest; there are no ties.
inline int Divide255(int n) { return (2 * n + 255) / 510; }

// An opacity of 0..1 times 32768 * 256 / 255, held so that full weights stay below 32768.
inline uint16_t FixedOpacity(float opacity) {
  const float scaled = opacity * (32768.0f * 256 / 255) + 0.5f;
  return static_cast<uint16_t>(scaled < 32896.0f ? scaled : 32896.0f);
}

// Alpha times opacity in 1/32768: 0..32767.
inline int Weight15(int alpha, uint16_t fixedOpacity) { return alpha * fixedOpacity >> 8; }

// s weight + d (1 - weight), rounded to nearest, ties up. (A shift of negative numbers rounds down.)
inline uint8_t Mix15(int s, int d, int weight) { return static_cast<uint8_t>(d + (((s - d) * weight + 16384) >> 15)); }

}  // namespace vexel::plain
