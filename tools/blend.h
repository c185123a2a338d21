// One picture laid over another through a blend mode.
#pragma once

#include <span>
#include <string>

#include "picture.h"
#include "vexel/compositing.h"

namespace tool {

struct BlendModeEntry {
  VX_BlendMode mode;
  const char* name;
};

// In the order of the modes' numbers.
std::span<const BlendModeEntry> BlendModes();

// The mode of a name, case ignored, or of a number. Throws ToolError, with the nearest names, when there is none.
VX_BlendMode ParseBlendMode(const std::string& name);

struct BlendOptions {
  VX_BlendMode mode = VX_BlendMode::Normal;
  float opacity = 1;
  int x = 0, y = 0;  // of the front picture's top left corner, from that of the back
};

// A copy of `back` with `front` blended where the two meet; what stands out is cut off. BGRA in 8 bits, or in floats if
// either picture holds more.
Picture BlendPictures(const Picture& back, const Picture& front, const BlendOptions& options);

}  // namespace tool
