// Raw frames: no header, rows from the top of the picture without padding (V210 rows padded to 128 bytes), the planes
// of 4:2:0 pictures one after another, DV frames whole.
#include <cerrno>
#include <cstdio>
#include <cstring>

#include "format_catalogue.h"
#include "frame_source.h"
#include "tool_error.h"

namespace tool {
namespace {

struct FileCloser {
  void operator()(std::FILE* file) const {
    if (file != stdin) std::fclose(file);
  }
};

class RawSource : public FrameSource {
 public:
  RawSource(const std::string& path, const SourceOptions& options) : mName(SourceName(path)), mOptions(options) {
    mFile.reset(path == "-" ? stdin : std::fopen(path.c_str(), "rb"));
    if (!mFile) throw ToolError("cannot read " + mName + ": " + std::strerror(errno));
    if (options.width < 1 || options.height < 1) throw ToolError("raw frames need their size: --size WIDTHxHEIGHT");
  }

  Picture Next() override {
    Picture picture(*mOptions.rawFormat, mOptions.width, mOptions.height);
    return ReadInto(picture) ? std::move(picture) : Picture();
  }
  bool Skip() override {
    Picture picture(*mOptions.rawFormat, mOptions.width, mOptions.height);
    return ReadInto(picture);
  }

  int64_t FrameCount() const override { return 0; }

 private:
  // False at the end of the file, before the first byte of a frame.
  bool ReadInto(const Picture& picture) {
    bool first = true;
    const auto read = [&](std::byte* to, size_t bytes) {
      const size_t got = std::fread(to, 1, bytes, mFile.get());
      if (got == bytes) {
        first = false;
        return true;
      }
      if (std::ferror(mFile.get())) throw ToolError("cannot read " + mName + ": " + std::strerror(errno));
      if (got == 0 && first) return false;
      throw ToolError(mName + " ends in the middle of a frame (check --size and --raw-format)");
    };
    if (Is420(picture.Format())) {
      for (int p = 0; p < picture.PlaneCount(); ++p) {
        const Plane plane = picture.PlaneAt(p);
        for (int y = 0; y < plane.height; ++y)
          if (!read(plane.Row(y), plane.width)) return false;
      }
      return true;
    }
    if (!IsRaster(picture.Format())) return read(picture.Pixels(), picture.Size());
    const size_t rowBytes = FileRowBytes(picture.Format(), picture.Width());
    for (int y = 0; y < picture.Height(); ++y)
      if (!read(picture.Row(y), rowBytes)) return false;
    return true;
  }

  std::string mName;
  SourceOptions mOptions;
  std::unique_ptr<std::FILE, FileCloser> mFile;
};

}  // namespace

std::unique_ptr<FrameSource> OpenRawSource(const std::string& path, const SourceOptions& options) {
  return std::make_unique<RawSource>(path, options);
}

}  // namespace tool
