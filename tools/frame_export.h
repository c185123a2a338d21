// From library pictures to the frames that encoders take; the reverse of frame_import.h.
#pragma once

extern "C" {
#include <libavutil/frame.h>
}

#include "av_handles.h"
#include "picture.h"

namespace tool {

// The picture's samples as a frame of `frameFormat`, coded in full range if `fullRange` (YUV only). Component counts
// and chroma columns of the two must agree; float formats are rounded to the depth of integer frames.
Frame ExportFrame(const Picture& picture, AVPixelFormat frameFormat, bool fullRange);

}  // namespace tool
