#include "picture_io.h"

#include <iostream>

#include "format_catalogue.h"
#include "tool_error.h"

namespace tool {

Picture LoadPicture(const std::string& path, const SourceOptions& options) {
  Picture picture = OpenSource(path, options)->Next();
  if (!picture) throw ToolError("cannot read " + SourceName(path) + ": it holds no frame");
  return picture;
}

void SavePicture(const Picture& picture, const std::string& path, const ConvertOptions& convert,
                 const SinkOptions& options) {
  const std::unique_ptr<FrameSink> sink = OpenSink(path, options);
  const VX_PixelFormat format = sink->StorageFormat(picture.Format(), picture.Height());
  const auto save = [&](const Picture& stored) { sink->Append(stored, sink->Encode(stored)); };
  if (format == picture.Format())
    save(picture);
  else
    save(ConvertPicture(picture, format, convert));
  sink->Close();
  std::cerr << SinkName(path) << ": " << picture.Width() << "x" << picture.Height() << ", "
            << FormatName(picture.Format()) << '\n';
}

}  // namespace tool
