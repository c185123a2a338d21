// Alphas and opacities that count as none or as full.
#pragma once

namespace vexel {

// Below this they count as nothing, and above 1 less this as 1.
inline constexpr float kAlphaGuard = 8e-6f;

// 0 for what counts as invisible, NaN included, and 1 for what counts as full; unchanged between.
constexpr float UsableOpacity(float opacity) noexcept {
  if (!(opacity >= kAlphaGuard)) return 0.0f;
  return opacity + kAlphaGuard > 1.0f ? 1.0f : opacity;
}

}  // namespace vexel
