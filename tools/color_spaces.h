// The colour spaces by the names that the command line uses.
#pragma once

#include <string>
#include <vector>

#include "vexel/color_space.h"

namespace tool {

struct NamedColorSpace {
  const char* name;
  const char* description;
  const VX::ColorSpace& space;
  bool isHdr;  // has no tone compression of its own
};

const std::vector<NamedColorSpace>& ColorSpaces();

// Throws ToolError, suggesting the nearest, for other names.
const NamedColorSpace& ParseColorSpace(const std::string& name);

// "srgb, rec709, ..."
std::string ColorSpaceNames();

}  // namespace tool
