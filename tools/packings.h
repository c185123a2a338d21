// What codecs and cameras take or give instead of the library's own layouts, by name.
#pragma once

#include <cstdint>
#include <span>
#include <string>
#include <vector>

#include "picture.h"

namespace tool {

// The bytes of one frame: rows from the top, without padding but for V210 rows, which are padded to 128 bytes.
using FrameBytes = std::vector<uint8_t>;

struct Packing {
  const char* name;
  const char* unpacked;  // name of the layout it is made from
  const char* help;
  VX_PixelFormat unpackedAs, packedAs;  // library formats whose raw frames have as many bytes
  VX_PixelFormat picture;               // what pictures are converted to and from
  FrameBytes (*pack)(const FrameBytes& unpacked, int width, int height);
  FrameBytes (*unpack)(const FrameBytes& packed, int width, int height);

  // A picture of the format `picture` in the unpacked layout, and back.
  FrameBytes FromPicture(const Picture& source) const;
  Picture ToPicture(const FrameBytes& unpacked, int width, int height) const;
};

std::span<const Packing> Packings();
// Throws ToolError, with the names, when there is none of that name.
const Packing& ParsePacking(const std::string& name);
std::string PackingNames();

}  // namespace tool
