// Scalar Y'CbCr steps from which the plain kernels are written: the definition of the arithmetic.
#pragma once

#include <cstdint>
#include <cstring>

#include "convert/PlainPixels.h"

namespace vexel::plain {

// A float pixel of four channels in memory order, or a 4:2:2 pair.
struct Quad {
  float c[4];
};

inline Quad LoadQuad(const uint8_t* p) {
  Quad quad;
  std::memcpy(&quad, p, sizeof quad);
  return quad;
}
inline void StoreQuad(const Quad& quad, uint8_t* p) { std::memcpy(p, &quad, sizeof quad); }

inline float LumaToFloat(uint8_t code) { return static_cast<float>(code - 16) * (1.0f / 219.0f); }
inline float ChromaToFloat(uint8_t code) { return static_cast<float>(code - 128) * (1.0f / 224.0f); }
inline float AlphaToFloat(uint8_t code) { return static_cast<float>(code) * (1.0f / 255.0f); }

// Saturates to 0..most; NaN and what int32 cannot hold gives 0.
inline int ToCode(float v, int most) { return Clamp(ConvertNearest(v), 0, most); }
inline uint8_t LumaTo8(float y) { return static_cast<uint8_t>(ToCode(y * 219.0f + 16.0f, 255)); }
inline uint8_t ChromaTo8(float c) { return static_cast<uint8_t>(ToCode(c * 224.0f + 128.0f, 255)); }
inline uint8_t AlphaTo8(float a) { return static_cast<uint8_t>(ToCode(a * 255.0f, 255)); }

inline Quad Vuya8ToFloat(const uint8_t* p) {
  return {{ChromaToFloat(p[0]), ChromaToFloat(p[1]), LumaToFloat(p[2]), AlphaToFloat(p[3])}};
}
inline void FloatToVuya8(const Quad& vuya, uint8_t* p) {
  p[0] = ChromaTo8(vuya.c[0]);
  p[1] = ChromaTo8(vuya.c[1]);
  p[2] = LumaTo8(vuya.c[2]);
  p[3] = AlphaTo8(vuya.c[3]);
}

}  // namespace vexel::plain
