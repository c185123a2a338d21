#include "frame_sink.h"

#include <algorithm>
#include <cctype>
#include <cstring>

#include "format_catalogue.h"
#include "tool_error.h"

namespace tool {
namespace {

struct ContainerName {
  const char* name;
  Container container;
};
constexpr ContainerName kContainerNames[] = {
    {"png", Container::Png},   {"jpg", Container::Jpeg}, {"jpeg", Container::Jpeg}, {"tif", Container::Tiff},
    {"tiff", Container::Tiff}, {"exr", Container::Exr},  {"dpx", Container::Dpx},   {"y4m", Container::Y4m},
    {"raw", Container::Raw},   {"yuv", Container::Raw},  {"rgb", Container::Raw},   {"v210", Container::Raw}};

const ContainerName* FindContainer(std::string name) {
  std::transform(name.begin(), name.end(), name.begin(), [](unsigned char c) { return std::tolower(c); });
  for (const ContainerName& entry : kContainerNames)
    if (name == entry.name) return &entry;
  return nullptr;
}

}  // namespace

const char* ContainerNames() { return "png, jpeg, tiff, exr, dpx, y4m or raw"; }

Container ParseContainer(const std::string& name) {
  if (const ContainerName* entry = FindContainer(name)) return entry->container;
  throw ToolError("unknown container \"" + name + "\"; it is " + ContainerNames());
}

std::optional<Container> ContainerByExtension(const std::string& path) {
  if (path == "-") return Container::Raw;
  const size_t dot = path.find_last_of("./");
  if (dot != std::string::npos && path[dot] == '.')
    if (const ContainerName* entry = FindContainer(path.substr(dot + 1))) return entry->container;
  return std::nullopt;
}

Container ContainerOf(const std::string& path) {
  if (const auto container = ContainerByExtension(path)) return *container;
  throw ToolError("cannot tell from its name what to write to \"" + path + "\"; its extension may be " +
                  ContainerNames());
}

std::unique_ptr<FrameSink> OpenSink(const std::string& path, const SinkOptions& options, int64_t firstNumber) {
  const Container container = options.container ? *options.container : ContainerOf(path);
  if (container == Container::Y4m || container == Container::Raw)
    return OpenStreamSink(path, container, options.frameRate, firstNumber);
  return OpenImageSink(path, container, firstNumber);
}

std::string SinkName(const std::string& path) { return path == "-" ? "standard output" : path; }

std::vector<uint8_t> RawBytes(const Picture& picture) {
  std::vector<uint8_t> bytes;
  const auto append = [&](const std::byte* from, size_t count, size_t padded) {
    const size_t at = bytes.size();
    bytes.resize(at + padded);
    std::memcpy(bytes.data() + at, from, count);
  };
  const VX_PixelFormat format = picture.Format();
  if (Is420(format)) {
    for (int p = 0; p < picture.PlaneCount(); ++p) {
      const Plane plane = picture.PlaneAt(p);
      for (int y = 0; y < plane.height; ++y) append(plane.Row(y), plane.width, plane.width);
    }
  } else if (!IsRaster(format)) {
    append(picture.Pixels(), picture.Size(), picture.Size());
  } else {
    bytes.reserve(FileRowBytes(format, picture.Width()) * static_cast<size_t>(picture.Height()));
    for (int y = 0; y < picture.Height(); ++y)
      append(picture.Row(y), TightRowBytes(format, picture.Width()), FileRowBytes(format, picture.Width()));
  }
  return bytes;
}

}  // namespace tool
