// 8-bit compositing: black, and scalar definitions of the arithmetic.
#pragma once

#include <cstdint>

namespace vexel {

// Of V, U, Y and alpha.
inline constexpr int kBlackVuy[4] = {128, 128, 16, 0};
inline constexpr uint32_t kBlackVuyWord = 0x00108080;

namespace plain {

// n / 255 to nearest; there are no ties.
inline int Divide255(int n) { return (2 * n + 255) / 510; }

// An opacity of 0..1 times 32768 * 256 / 255, held so that full weights stay below 32768. Rounded up, because weights
// are rounded down: an opaque source at one half then weighs exactly one half, and 127.5 becomes 128.
inline uint16_t FixedOpacity(float opacity) {
  const float scaled = opacity * (32768.0f * 256 / 255) + 1.0f;
  return static_cast<uint16_t>(scaled < 32896.0f ? scaled : 32896.0f);
}

// Alpha times opacity in 1/32768: 0..32767.
inline int Weight15(int alpha, uint16_t fixedOpacity) { return alpha * fixedOpacity >> 8; }

// s weight + d (1 - weight), rounded to nearest, ties up. (A shift of negative numbers rounds down.)
inline uint8_t Mix15(int s, int d, int weight) { return static_cast<uint8_t>(d + (((s - d) * weight + 16384) >> 15)); }

// An opacity of 0..1 in 1/32768, at most 32767: a product with a code, rounded to 1/64, is then the code itself.
inline int Factor15(float opacity) {
  const float scaled = opacity * 32768.0f + 0.5f;
  return static_cast<int>(scaled < 32767.0f ? scaled : 32767.0f);
}

}  // namespace plain
}  // namespace vexel
