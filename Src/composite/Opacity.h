// Opacities that callers give.
#pragma once

namespace vexel {

inline constexpr float kOpacityMargin = 8e-6f;

// 0 for what counts as invisible, NaN included, and 1 for what counts as full; unchanged between.
constexpr float UsableOpacity(float opacity) noexcept {
  if (!(opacity >= kOpacityMargin)) return 0.0f;
  return opacity + kOpacityMargin > 1.0f ? 1.0f : opacity;
}

}  // namespace vexel
