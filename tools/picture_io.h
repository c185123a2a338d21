// One picture from a file, and into one: what most commands need.
#pragma once

#include <string>

#include "convert_picture.h"
#include "frame_sink.h"
#include "frame_source.h"
#include "picture.h"

namespace tool {

// The first picture of a file (or standard input, "-"), in the library format that its file format maps to.
Picture LoadPicture(const std::string& path, const SourceOptions& options = {});

// Writes one picture, converted to what the file holds, as its extension says, and says so on standard error.
void SavePicture(const Picture& picture, const std::string& path, const ConvertOptions& convert = {},
                 const SinkOptions& options = {});

}  // namespace tool
