#include "frame_source.h"

#include <tuple>

#include "format_catalogue.h"
#include "parse_size.h"
#include "tool_error.h"

namespace tool {

SourceOptions ParseSourceOptions(const std::string& rawFormat, const std::string& size, const std::string& matrix,
                                 int threads) {
  SourceOptions options;
  options.threads = threads;
  if (!matrix.empty()) options.matrix = ParseMatrix(matrix);
  if (!size.empty()) std::tie(options.width, options.height) = ParseSize(size);
  if (!rawFormat.empty()) options.rawFormat = ParseFormat(rawFormat);
  if (options.width && !options.rawFormat)
    throw ToolError("--size belongs to raw frames (--raw-format); nothing is ever scaled");
  return options;
}

std::unique_ptr<FrameSource> OpenSource(const std::string& path, const SourceOptions& options) {
  return options.rawFormat ? OpenRawSource(path, options) : OpenMediaSource(path, options);
}

std::string SourceName(const std::string& path) { return path == "-" ? "standard input" : '"' + path + '"'; }

}  // namespace tool
