// VX_Convert for pictures.
#pragma once

#include <string>

#include "picture.h"

namespace tool {

struct ConvertOptions {
  int quality = 3;  // as VX_Convert's renderQuality
  int threads = 1;  // bands of rows of one picture
};

// `source` in another format. Throws ToolError, naming both formats and the code, when the library refuses.
Picture ConvertPicture(const Picture& source, VX_PixelFormat format, const ConvertOptions& options);

// The same into a picture of the same size that is already there.
void ConvertInto(const Picture& source, const Picture& destination, const ConvertOptions& options);

// The chain of formats that the library goes through, "A > B > C".
std::string ExplainConversion(VX_PixelFormat from, VX_PixelFormat to, int quality);

}  // namespace tool
