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

// Writes `count` samples of a component: whole bytes, 16-bit words of either order, or 32-bit floats.
void WriteComponent(const uint32_t* in, const AVPixFmtDescriptor& d, int component, int y, int count, AVFrame& frame) {
  const AVComponentDescriptor& c = d.comp[component];
  uint8_t* out = frame.data[c.plane] + static_cast<ptrdiff_t>(y) * frame.linesize[c.plane] + c.offset;
  const bool bigEndian = d.flags & AV_PIX_FMT_FLAG_BE;
  for (int x = 0; x < count; ++x, out += c.step) {
    if (c.depth <= 8) {
      *out = static_cast<uint8_t>(in[x]);
    } else if (c.depth <= 16) {
      const uint8_t low = static_cast<uint8_t>(in[x]), high = static_cast<uint8_t>(in[x] >> 8);
      out[0] = bigEndian ? high : low;
      out[1] = bigEndian ? low : high;
    } else {
      std::memcpy(out, &in[x], 4);
    }
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
      WriteComponent(samples.components[c].data(), d, c, y, columns, frame);
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
