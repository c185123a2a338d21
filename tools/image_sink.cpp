// Pictures through libavcodec's encoders: one file, or one per frame.
#include <optional>

extern "C" {
#include <libavutil/opt.h>
}

#include "format_catalogue.h"
#include "frame_export.h"
#include "frame_sink.h"
#include "numbered_path.h"
#include "output_file.h"
#include "tool_error.h"

namespace tool {
namespace {

// One way in which a kind of file holds pixels, and the library format that carries the samples there.
struct Storage {
  VX_PixelFormat format;
  AVPixelFormat frameFormat;
};

struct ImageKind {
  Container container;
  AVCodecID codec;
  Storage opaque8, alpha8, opaqueDeep, alphaDeep;
};

using F = VX_PixelFormat;
constexpr ImageKind kImageKinds[] = {
    {Container::Png,
     AV_CODEC_ID_PNG,
     {F::BGRX_4444_8u, AV_PIX_FMT_RGB24},
     {F::BGRA_4444_8u, AV_PIX_FMT_RGBA},
     {F::BGRX_4444_32f, AV_PIX_FMT_RGB48BE},
     {F::BGRA_4444_32f, AV_PIX_FMT_RGBA64BE}},
    {Container::Tiff,
     AV_CODEC_ID_TIFF,
     {F::BGRX_4444_8u, AV_PIX_FMT_RGB24},
     {F::BGRA_4444_8u, AV_PIX_FMT_RGBA},
     {F::BGRX_4444_32f, AV_PIX_FMT_RGB48LE},
     {F::BGRA_4444_32f, AV_PIX_FMT_RGBA64LE}},
    {Container::Dpx,
     AV_CODEC_ID_DPX,
     {F::BGRX_4444_8u, AV_PIX_FMT_RGB24},
     {F::BGRA_4444_8u, AV_PIX_FMT_RGBA},
     {F::BGRX_4444_32f, AV_PIX_FMT_RGB48BE},
     {F::BGRA_4444_32f, AV_PIX_FMT_RGBA64BE}},
    {Container::Exr,
     AV_CODEC_ID_EXR,
     {F::BGRX_4444_32f_Linear, AV_PIX_FMT_GBRPF32},
     {F::BGRP_4444_32f_Linear, AV_PIX_FMT_GBRAPF32},
     {F::BGRX_4444_32f_Linear, AV_PIX_FMT_GBRPF32},
     {F::BGRP_4444_32f_Linear, AV_PIX_FMT_GBRAPF32}},
    // Full-range BT.601, as JFIF asks; one coding for all, in float so that the range loses nothing.
    {Container::Jpeg,
     AV_CODEC_ID_MJPEG,
     {F::VUYX_4444_32f, AV_PIX_FMT_YUVJ444P},
     {F::VUYX_4444_32f, AV_PIX_FMT_YUVJ444P},
     {F::VUYX_4444_32f, AV_PIX_FMT_YUVJ444P},
     {F::VUYX_4444_32f, AV_PIX_FMT_YUVJ444P}},
};

const ImageKind& KindOf(Container container) {
  for (const ImageKind& kind : kImageKinds)
    if (kind.container == container) return kind;
  throw ToolError("not a picture container");
}

Storage StorageOf(const ImageKind& kind, VX_PixelFormat format) {
  if (kind.container == Container::Jpeg) {
    if (Is420(format) && !IsBiplanar420(format) && IsFullRangeYuv(format) && !Is709(format))
      return {format, AV_PIX_FMT_YUVJ420P};
    if (IsPacked422(format) && !Is709(format)) return {F::UYVY_422_32f, AV_PIX_FMT_YUVJ422P};
  }
  if (kind.container == Container::Dpx && Is10Bit(format)) return {kRgb444_10u, AV_PIX_FMT_GBRP10LE};
  const bool deep = !Is8Bit(format);
  const bool alpha = HasAlpha(format);
  return deep ? (alpha ? kind.alphaDeep : kind.opaqueDeep) : (alpha ? kind.alpha8 : kind.opaque8);
}

std::optional<NumberedPath> ParsePattern(const std::string& path) {
  const std::optional<NumberedPath> pattern = ParseNumberedPath(path);
  if (pattern ? pattern->after.find('%') != std::string::npos : path.find('%') != std::string::npos)
    throw ToolError("\"" + path + "\" is not a sequence pattern: it takes one number, as in out_%04d.png");
  return pattern;
}

class ImageSink : public FrameSink {
 public:
  ImageSink(const std::string& path, Container container, int64_t firstNumber)
      : mPath(path), mKind(KindOf(container)), mNumber(firstNumber), mPattern(ParsePattern(path)) {
    CollectAvMessages();
  }

  VX_PixelFormat StorageFormat(VX_PixelFormat format, int) const override { return StorageOf(mKind, format).format; }

  std::vector<uint8_t> Encode(const Picture& picture) const override {
    const std::string what = "cannot write \"" + mPath + "\"";
    const Storage storage = FrameStorageOf(picture.Format());
    const bool fullRange = true;  // of the YUV kinds only JPEG is here
    const Frame frame = ExportFrame(picture, storage.frameFormat, fullRange);
    const AVCodec* codec = avcodec_find_encoder(mKind.codec);
    if (!codec) throw ToolError(what + ": there is no encoder for " + avcodec_get_name(mKind.codec));
    const CodecContext context(avcodec_alloc_context3(codec));
    if (!context) throw std::bad_alloc();
    context->width = picture.Width();
    context->height = picture.Height();
    context->pix_fmt = storage.frameFormat;
    context->time_base = {1, 25};
    context->thread_count = 1;
    context->color_range = static_cast<AVColorRange>(frame->color_range);
    if (mKind.container == Container::Jpeg) {
      context->flags |= AV_CODEC_FLAG_QSCALE;
      context->global_quality = FF_QP2LAMBDA * 2;  // visually lossless
      context->colorspace = frame->colorspace;
      frame->quality = context->global_quality;
    }
    if (mKind.container == Container::Png) av_opt_set(context->priv_data, "pred", "mixed", 0);
    CheckAv(avcodec_open2(context.get(), codec, nullptr), what);
    CheckAv(avcodec_send_frame(context.get(), frame.get()), what);
    CheckAv(avcodec_send_frame(context.get(), nullptr), what);
    const Packet packet = NewPacket();
    CheckAv(avcodec_receive_packet(context.get(), packet.get()), what);
    return {packet->data, packet->data + packet->size};
  }

  void Append(const Picture&, const std::vector<uint8_t>& encoded) override {
    OutputFile file(mPattern ? mPattern->At(mNumber++) : mPath);
    file.Write(encoded.data(), encoded.size());
    file.Close();
  }

  bool TakesManyFrames() const override { return mPattern || mPath == "-"; }

 private:
  // The storage whose library format a picture already has.
  Storage FrameStorageOf(VX_PixelFormat format) const {
    for (const Storage& storage : {mKind.opaque8, mKind.alpha8, mKind.opaqueDeep, mKind.alphaDeep})
      if (storage.format == format) return storage;
    return StorageOf(mKind, format);
  }

  std::string mPath;
  const ImageKind& mKind;
  int64_t mNumber;
  std::optional<NumberedPath> mPattern;
};

}  // namespace

std::unique_ptr<FrameSink> OpenImageSink(const std::string& path, Container container, int64_t firstNumber) {
  return std::make_unique<ImageSink>(path, container, firstNumber);
}

}  // namespace tool
