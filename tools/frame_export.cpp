#include "frame_export.h"

#include <cstring>

extern "C" {
#include <libavutil/pixdesc.h>
}

#include "format_catalogue.h"
#include "sample_rows.h"
#include "tool_error.h"

namespace tool {
namespace {

void Export420(const Picture& picture, const AVFrame& frame) {
  for (int p = 0; p < picture.PlaneCount(); ++p) {
    const Plane plane = picture.PlaneAt(p);
    for (int y = 0; y < plane.height; ++y)
      std::memcpy(frame.data[p] + static_cast<ptrdiff_t>(y) * frame.linesize[p], plane.Row(y), plane.width);
  }
}

void ExportRows(const Picture& picture, const AVPixFmtDescriptor& d, bool fullRange, AVFrame& frame) {
  const SampleCoding coding{d.comp[0].depth, (d.flags & AV_PIX_FMT_FLAG_FLOAT) != 0, fullRange};
  const UnpackRow unpack = RowUnpackerFor(picture.Format());
  SampleRow samples(picture.Width());
  for (int y = 0; y < picture.Height(); ++y) {
    unpack(picture.Row(y), picture.Format(), coding, samples, picture.Width());
    for (int c = 0; c < d.nb_components; ++c) {
      const bool chroma = c == 1 || c == 2;
      const int columns = chroma ? AV_CEIL_RSHIFT(picture.Width(), d.log2_chroma_w) : picture.Width();
      av_write_image_line2(samples.components[c].data(), frame.data, frame.linesize, &d, 0, y, c, columns, 4);
    }
  }
}

}  // namespace

Frame ExportFrame(const Picture& picture, AVPixelFormat frameFormat, bool fullRange) {
  Frame frame = NewFrame();
  frame->format = frameFormat;
  frame->width = picture.Width();
  frame->height = picture.Height();
  frame->color_range = fullRange ? AVCOL_RANGE_JPEG : AVCOL_RANGE_MPEG;
  if (IsYuv(picture.Format())) frame->colorspace = Is709(picture.Format()) ? AVCOL_SPC_BT709 : AVCOL_SPC_SMPTE170M;
  CheckAv(av_frame_get_buffer(frame.get(), 0), "cannot write the picture");
  if (Is420(picture.Format()))
    Export420(picture, *frame);
  else
    ExportRows(picture, *av_pix_fmt_desc_get(frameFormat), fullRange, *frame);
  return frame;
}

}  // namespace tool
