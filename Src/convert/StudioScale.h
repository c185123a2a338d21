// The scalings between studio codes and floats, for units of four channels in memory order: a 4:4:4:4 pixel or a 4:2:2
// pair. Floats have luma in 0..1, chroma in -0.5..0.5 and alpha in 0..1.
#pragma once

#include <cstdint>

#include "convert/YuvMatrices.h"

namespace vexel {

enum class Channel : uint8_t { Luma, Chroma, Alpha };

struct StudioScale {
  alignas(16) int32_t zero[4];  // float = (code - zero) * toFloat
  alignas(16) float toFloat[4];
  alignas(16) float fromFloat[4];  // code = float * fromFloat + offset, rounded to nearest even
  alignas(16) float offset[4];
};

// `step` is the number of codes per code of 8 bits.
constexpr StudioScale MakeStudioScale(const Channel (&order)[4], int step = 1) {
  StudioScale scale{};
  for (int i = 0; i < 4; ++i) {
    const int range = order[i] == Channel::Luma ? kLumaRange8 : order[i] == Channel::Chroma ? kChromaRange8 : 255;
    const int zero = order[i] == Channel::Luma ? kLumaBlack8 : order[i] == Channel::Chroma ? kChromaZero8 : 0;
    scale.zero[i] = zero * step;
    scale.toFloat[i] = static_cast<float>(1.0 / (range * step));
    scale.fromFloat[i] = static_cast<float>(range * step);
    scale.offset[i] = static_cast<float>(zero * step);
  }
  return scale;
}

inline constexpr StudioScale kVuya8Scale =
    MakeStudioScale({Channel::Chroma, Channel::Chroma, Channel::Luma, Channel::Alpha});
inline constexpr StudioScale kUyvy8Scale =
    MakeStudioScale({Channel::Chroma, Channel::Luma, Channel::Chroma, Channel::Luma});
inline constexpr StudioScale kYuyv8Scale =
    MakeStudioScale({Channel::Luma, Channel::Chroma, Channel::Luma, Channel::Chroma});
inline constexpr StudioScale kUyvy10Scale =
    MakeStudioScale({Channel::Chroma, Channel::Luma, Channel::Chroma, Channel::Luma}, 4);

}  // namespace vexel
