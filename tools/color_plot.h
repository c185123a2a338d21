// Plots of the colour spaces for the documentation, computed by the library itself.
#pragma once

#include <string>

namespace tool {

// Writes transfer.svg, primaries.svg and tone.svg into `directory`, which is made
// where it is missing. Throws ToolError when they cannot be written.
void PlotColorSpaces(const std::string& directory);

}  // namespace tool
