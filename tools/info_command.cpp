// vexel info: what a file holds, and the library format of each stream.
#include <iostream>
#include <memory>

#include "commands.h"
#include "format_catalogue.h"
#include "frame_source.h"
#include "tool_error.h"

namespace tool {
namespace {

struct InfoOptions {
  std::string path;
  std::string matrix;
};

void PrintStream(const StreamDescription& stream) {
  std::cout << "  stream " << stream.index << ": " << stream.kind << ", " << stream.codec;
  if (stream.kind != "video") {
    std::cout << '\n';
    return;
  }
  if (stream.width) std::cout << ", " << stream.width << "x" << stream.height;
  if (stream.frameRate > 0 && stream.frameCount != 1) std::cout << ", " << stream.frameRate << " frames/s";
  if (stream.frameCount > 0) std::cout << ", " << stream.frameCount << (stream.frameCount == 1 ? " frame" : " frames");
  std::cout << '\n';
  if (!stream.fileFormat.empty()) std::cout << "    coded as " << stream.fileFormat << ", " << stream.colour << '\n';
  if (stream.displayAngle) std::cout << "    to be shown turned by " << stream.displayAngle << " degrees clockwise\n";
  if (stream.refusal.empty())
    std::cout << "    library format " << FormatName(stream.libraryFormat) << '\n';
  else
    std::cout << "    no library format: " << stream.refusal << '\n';
}

void RunInfo(const InfoOptions& options) {
  SourceOptions source;
  if (!options.matrix.empty()) source.matrix = ParseMatrix(options.matrix);
  const FileDescription file = DescribeFile(options.path, source);
  std::cout << options.path << ": " << file.container;
  if (file.seconds > 0) std::cout << ", " << file.seconds << " s";
  std::cout << '\n';
  for (const StreamDescription& stream : file.streams) PrintStream(stream);
}

}  // namespace

void AddInfoCommand(CLI::App& app) {
  CLI::App* command = app.add_subcommand("info", "Show what a file holds and which pixel format each stream maps to");
  const auto options = std::make_shared<InfoOptions>();
  command->add_option("file", options->path, "A picture or video")->required();
  command->add_option("--matrix", options->matrix, "Treat YUV as BT.601, 709 or 2020, whatever the file says");
  command->callback([options] { RunInfo(*options); });
}

}  // namespace tool
