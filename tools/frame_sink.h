// Where frames go: pictures, sequences of pictures, Y4M and raw files.
#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "picture.h"

namespace tool {

enum class Container { Png, Jpeg, Tiff, Exr, Dpx, Y4m, Raw };

// By name ("png"), or by the extension of a path. "-" is raw. Throws ToolError for others.
Container ParseContainer(const std::string& name);
Container ContainerOf(const std::string& path);
// The same, nothing where the extension does not tell.
std::optional<Container> ContainerByExtension(const std::string& path);
const char* ContainerNames();

struct SinkOptions {
  std::optional<Container> container;  // instead of the path's extension
  std::pair<int, int> frameRate = {25, 1};
};

// Files hold few of the library's formats: a frame is converted to StorageFormat() of its format, encoded, and
// appended.
class FrameSink {
 public:
  virtual ~FrameSink() = default;
  // The library format, nearest to `format`, that the file can hold: with alpha, and deep enough, where the file can.
  // `height` is the pictures'; it tells readers the matrix where the file does not.
  virtual VX_PixelFormat StorageFormat(VX_PixelFormat format, int height) const = 0;
  // The bytes of one frame of a storage format. May be called from several threads at once.
  virtual std::vector<uint8_t> Encode(const Picture& picture) const = 0;
  // Writes encoded frames, in order. Throws ToolError when the file cannot be written.
  virtual void Append(const Picture& picture, const std::vector<uint8_t>& encoded) = 0;
  // True if the path takes any number of frames.
  virtual bool TakesManyFrames() const = 0;
  // Must be called after the last frame; reports late write errors.
  virtual void Close() {}
};

// `path` may be "-" for standard output, or a printf pattern ("out_%04d.png") for a sequence of pictures. `firstNumber`
// is the first frame's, in such names and in messages.
std::unique_ptr<FrameSink> OpenSink(const std::string& path, const SinkOptions& options, int64_t firstNumber = 0);

// What reports call it: standard output, or the path.
std::string SinkName(const std::string& path);

// The frame's bytes as a raw file holds them: rows from the top, no padding (V210 rows padded to 128 bytes).
std::vector<uint8_t> RawBytes(const Picture& picture);

// Defined by image_sink.cpp and stream_sink.cpp.
std::unique_ptr<FrameSink> OpenImageSink(const std::string& path, Container container, int64_t firstNumber);
std::unique_ptr<FrameSink> OpenStreamSink(const std::string& path, Container container, std::pair<int, int> frameRate,
                                          int64_t firstNumber = 0);

}  // namespace tool
