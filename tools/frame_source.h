// Where frames come from: a file that libav reads, or raw frames.
#pragma once

#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "frame_import.h"
#include "picture.h"

namespace tool {

struct SourceOptions {
  std::optional<VX_PixelFormat> rawFormat;  // frames without any header, in this format
  int width = 0;                            // of raw frames
  int height = 0;
  Matrix matrix = Matrix::FromFile;
  int threads = 0;  // for decoding; 0 = as many as the codec likes
};

// From the texts of a command's options, empty where they are not given. A size is that of raw frames.
SourceOptions ParseSourceOptions(const std::string& rawFormat, const std::string& size, const std::string& matrix,
                                 int threads);

class FrameSource {
 public:
  virtual ~FrameSource() = default;
  // The next frame; an empty picture after the last one. Throws ToolError when the file is damaged.
  virtual Picture Next() = 0;
  // Passes over a frame.
  virtual bool Skip() = 0;
  // How many frames there are, as far as the file says; 0 if it does not.
  virtual int64_t FrameCount() const = 0;
  // Frames per second as a fraction; 25/1 where the file does not say.
  virtual std::pair<int, int> FrameRate() const { return {25, 1}; }
};

// `path` may be "-" for standard input. Throws ToolError, saying why, when it cannot be read.
std::unique_ptr<FrameSource> OpenSource(const std::string& path, const SourceOptions& options);

// What messages call it: standard input, or the path in quotes.
std::string SourceName(const std::string& path);

// What a file holds, one entry per stream.
struct StreamDescription {
  int index = 0;
  std::string kind;  // "video", "audio", ...
  std::string codec;
  int width = 0;
  int height = 0;
  double frameRate = 0;            // 0 if there is none
  int64_t frameCount = 0;          // 0 if unknown
  std::string fileFormat;          // libav's name of the pixel format
  std::string colour;              // matrix, range and transfer as coded
  int displayAngle = 0;            // degrees clockwise to be turned for display
  VX_PixelFormat libraryFormat{};  // Invalid where there is none
  std::string refusal;             // why there is none
};

struct FileDescription {
  std::string container;
  double seconds = 0;  // 0 if unknown
  std::vector<StreamDescription> streams;
};

FileDescription DescribeFile(const std::string& path, const SourceOptions& options);

// Defined by media_source.cpp and raw_source.cpp.
std::unique_ptr<FrameSource> OpenMediaSource(const std::string& path, const SourceOptions& options);
std::unique_ptr<FrameSource> OpenRawSource(const std::string& path, const SourceOptions& options);

}  // namespace tool
