#include "convert_picture.h"

#include <algorithm>
#include <cstring>

#include "format_catalogue.h"
#include "parallel.h"
#include "tool_error.h"

namespace tool {
namespace {

// What the codes of VX_Convert mean for these two.
std::string MeaningOf(VX_Result result, const std::string& from, const std::string& to) {
  switch (result) {
    case VX_ErrUnsupportedFormat:
      return "; there is no decoder for " + from;
    case VX_ErrFormatNotHandled:
      return "; there is no encoder for " + to;
    case VX_ErrFailed:
      return "; no chain of formats leads from one to the other";
    default:
      return "";
  }
}

void Check(VX_Result result, const Picture& source, const Picture& destination) {
  if (result == VX_Success) return;  // before any text is made: a band is small
  const std::string from = FormatName(source.Format()), to = FormatName(destination.Format());
  CheckResult(result,
              "cannot convert " + from + " to " + to + " at " + std::to_string(source.Width()) + "x" +
                  std::to_string(source.Height()),
              MeaningOf(result, from, to));
}

// The first stored row of the picture rows [top, bottom).
std::byte* BandBase(const Picture& picture, int top, int bottom) {
  return picture.IsBottomUp() ? picture.Row(bottom - 1) : picture.Row(top);
}

}  // namespace

void ConvertInto(const Picture& source, const Picture& destination, const ConvertOptions& options) {
  const int height = source.Height();
  // Rows are independent in rasters; a special frame is one block.
  const bool raster = IsRaster(source.Format()) && IsRaster(destination.Format());
  const int bands = raster ? std::clamp(height / 16, 1, options.threads) : 1;
  ForEach(bands, bands, [&](int band) {
    const int top = static_cast<int>(int64_t{height} * band / bands);
    const int bottom = static_cast<int>(int64_t{height} * (band + 1) / bands);
    Check(VX_Convert(BandBase(source, top, bottom), source.RowBytes(), source.Format(),
                     BandBase(destination, top, bottom), destination.RowBytes(), destination.Format(), source.Width(),
                     bottom - top, options.quality),
          source, destination);
  });
}

Picture ConvertPicture(const Picture& source, VX_PixelFormat format, const ConvertOptions& options) {
  Picture destination(format, source.Width(), source.Height());
  if (format == source.Format() && !IsRaster(format))
    std::memcpy(destination.Pixels(), source.Pixels(), source.Size());  // nothing to decode or encode
  else
    ConvertInto(source, destination, options);
  return destination;
}

std::string ExplainConversion(VX_PixelFormat from, VX_PixelFormat to, int quality) {
  if (from == to) return FormatName(from) + " (a copy)";
  VX_PixelFormat chain[9];
  int32_t count = 0;
  const VX_Result result = VX_ExplainConversion(from, to, quality, chain, &count);
  if (result != VX_Success) return FormatName(from) + " > " + FormatName(to) + ": no plan, " + ResultText(result);
  std::string text;
  for (int i = 0; i < count; ++i) text += (i ? " > " : "") + FormatName(chain[i]);
  return text;
}

}  // namespace tool
