// What the plain definitions of the blend kernels share: the definition of their arithmetic.
#pragma once

#include <cmath>
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <xmmintrin.h>

#include "composite/BlendKernels.h"
#include "composite/Opacity.h"
#include "convert/PlainPixels.h"

namespace vexel::plain {

// a < b ? a : b and a > b ? a : b, so NaN gives the second operand. Written with the instructions, since a compiler
// that sees the cases drops operations that would flush a denormal, such as a division by 1.
inline float Min(float a, float b) { return _mm_cvtss_f32(_mm_min_ss(_mm_set_ss(a), _mm_set_ss(b))); }
inline float Max(float a, float b) { return _mm_cvtss_f32(_mm_max_ss(_mm_set_ss(a), _mm_set_ss(b))); }
// NaN gives `least`.
inline float Limit(float x, float least = 0, float most = 1) { return Min(Max(x, least), most); }

struct BlendPixel {
  float colour[3];  // blue, green, red
  float alpha;
};

struct FloatPixel {
  static constexpr size_t kBytes = 16;
  static BlendPixel Load(const uint8_t* p, const BytePixels&) {
    BlendPixel pixel;
    std::memcpy(&pixel, p, kBytes);
    return pixel;
  }
  static void Store(const BlendPixel& pixel, uint8_t* p, const BytePixels&) { std::memcpy(p, &pixel, kBytes); }
};

struct BytePixel {
  static constexpr size_t kBytes = 4;
  static BlendPixel Load(const uint8_t* p, const BytePixels& kind) {
    const auto channel = [&](size_t k, int bits = 0) { return (p[kind.reversed ? 3 - k : k] | bits) * k8uTo32f; };
    return {{channel(0), channel(1), channel(2)}, channel(3, kind.opaque ? 255 : 0)};
  }
  static void Store(const BlendPixel& pixel, uint8_t* p, const BytePixels& kind) {
    const auto put = [&](size_t k, float value) {
      p[kind.reversed ? 3 - k : k] = static_cast<uint8_t>(Clamp(ConvertNearest(value * 255.0f), 0, 255));
    };
    const float factor = kind.premultiplied ? pixel.alpha : 1.0f;
    ForChannels<3>([&](size_t k) { put(k, pixel.colour[k] * factor); });
    put(3, kind.opaque ? 1.0f : pixel.alpha);
  }
};

// The common form: `blended` takes part as far as the background is there.
inline BlendPixel Composite(const BlendPixel& s, const BlendPixel& d, float as, const float blended[3]) {
  const float ab = d.alpha, ao = ab + as - ab * as;
  BlendPixel out{{0, 0, 0}, ao};
  if (std::fabs(ao) < kAlphaGuard) return out;
  const float t = as * (1.0f / ao);
  ForChannels<3>(
      [&](size_t k) { out.colour[k] = (1.0f - t) * d.colour[k] + t * ((1.0f - ab) * s.colour[k] + ab * blended[k]); });
  return out;
}

template <class Pixels, class Mode>
void BlendRow(const uint8_t* src, const uint8_t* background, uint8_t* dst, size_t count, const BlendArguments& a,
              const Mode& mode) {
  for (size_t at = 0; at < count * Pixels::kBytes; at += Pixels::kBytes)
    Pixels::Store(mode(Pixels::Load(src + at, a.src), Pixels::Load(background + at, a.background), a), dst + at, a.dst);
}

}  // namespace vexel::plain

// In the plain namespace of a file that defines `BlendPixel Blend<mode>(s, d, arguments)`.
#define VX_DEFINE_PLAIN_BLEND_ROWS                                                            \
  template <VX_BlendMode kMode>                                                               \
  void BlendFloats(const uint8_t* src, const uint8_t* background, uint8_t* dst, size_t count, \
                   const BlendArguments& arguments) {                                         \
    BlendRow<FloatPixel>(src, background, dst, count, arguments, Blend<kMode>);               \
  }                                                                                           \
  template <VX_BlendMode kMode>                                                               \
  void BlendBytes(const uint8_t* src, const uint8_t* background, uint8_t* dst, size_t count,  \
                  const BlendArguments& arguments) {                                          \
    BlendRow<BytePixel>(src, background, dst, count, arguments, Blend<kMode>);                \
  }
