// Frames of pictures and video files, read by libavformat and libavcodec.
#include <cmath>
#include <filesystem>
#include <iostream>
#include <string_view>
#include <system_error>

extern "C" {
#include <libavutil/display.h>
#include <libavutil/pixdesc.h>
}

#include "av_handles.h"
#include "format_catalogue.h"
#include "frame_source.h"
#include "numbered_path.h"
#include "tool_error.h"

namespace tool {
namespace {

InputContext OpenInput(const std::string& path) {
  CollectAvMessages();
  std::error_code error;
  if (path != "-" && std::filesystem::is_regular_file(path, error) && std::filesystem::file_size(path, error) == 0)
    throw ToolError("cannot read " + SourceName(path) + ": the file is empty");
  AVFormatContext* context = nullptr;
  const std::string url = path == "-" ? "pipe:0" : path;
  AVDictionary* options = nullptr;
  // A sequence may begin anywhere; libav alone looks for the numbers 0 to 4.
  if (const auto numbered = ParseNumberedPath(path))
    if (const auto first = numbered->FirstThere()) av_dict_set_int(&options, "start_number", *first, 0);
  const int opened = avformat_open_input(&context, url.c_str(), nullptr, &options);
  av_dict_free(&options);
  CheckAv(opened, "cannot read " + SourceName(path));
  InputContext input(context);
  CheckAv(avformat_find_stream_info(context, nullptr), "cannot read " + SourceName(path));
  return input;
}

// Decodes one video stream of an open file.
class StreamDecoder {
 public:
  StreamDecoder(AVFormatContext* input, int streamIndex, int threads, const std::string& path)
      : mInput(input), mStream(streamIndex), mName(SourceName(path)), mPacket(NewPacket()) {
    const AVStream* stream = input->streams[streamIndex];
    const AVCodec* codec = avcodec_find_decoder(stream->codecpar->codec_id);
    if (!codec)
      throw ToolError("cannot read " + mName + ": there is no decoder for " +
                      avcodec_get_name(stream->codecpar->codec_id));
    mCodec.reset(avcodec_alloc_context3(codec));
    if (!mCodec) throw std::bad_alloc();
    CheckAv(avcodec_parameters_to_context(mCodec.get(), stream->codecpar), "cannot read " + mName);
    mCodec->thread_count = threads;
    CheckAv(avcodec_open2(mCodec.get(), codec, nullptr), "cannot read " + mName);
  }

  // The next frame into `frame`; false after the last.
  bool Next(AVFrame* frame) {
    for (;;) {
      const int received = avcodec_receive_frame(mCodec.get(), frame);
      if (received >= 0) return mFoundFrame = true;
      if (received == AVERROR_EOF) {
        if (!mFoundFrame) throw ToolError("cannot decode " + mName + ": it holds no whole frame" + TakeAvMessage());
        return false;
      }
      if (received != AVERROR(EAGAIN)) CheckAv(received, "cannot decode " + mName);
      FeedPacket();
    }
  }

  AVCodecID Codec() const { return mCodec->codec_id; }
  int StreamIndex() const { return mStream; }

 private:
  void FeedPacket() {
    for (;;) {
      const int read = av_read_frame(mInput, mPacket.get());
      if (read == AVERROR_EOF) {
        avcodec_send_packet(mCodec.get(), nullptr);
        return;
      }
      CheckAv(read, "cannot read " + mName);
      const bool mine = mPacket->stream_index == mStream;
      const int sent = mine ? avcodec_send_packet(mCodec.get(), mPacket.get()) : 0;
      av_packet_unref(mPacket.get());
      CheckAv(sent, "cannot decode " + mName);
      if (mine) return;
    }
  }

  AVFormatContext* mInput;
  int mStream;
  std::string mName;
  Packet mPacket;
  CodecContext mCodec;
  bool mFoundFrame = false;
};

int64_t FrameCountOf(const AVFormatContext* input, const AVStream* stream) {
  if (stream->nb_frames > 0) return stream->nb_frames;
  const AVRational rate = stream->avg_frame_rate;
  if (rate.num <= 0 || rate.den <= 0 || input->duration <= 0) return 0;
  return av_rescale_q(input->duration, AV_TIME_BASE_Q, av_inv_q(rate));
}

// How far clockwise a file asks a frame to be turned for display, in its header or in the frame itself (Exif).
int DisplayAngle(const AVStream* stream, const AVFrame& frame) {
  const uint8_t* matrix = av_stream_get_side_data(stream, AV_PKT_DATA_DISPLAYMATRIX, nullptr);
  if (const AVFrameSideData* data = av_frame_get_side_data(&frame, AV_FRAME_DATA_DISPLAYMATRIX)) matrix = data->data;
  if (!matrix) return 0;
  const double counterclockwise = av_display_rotation_get(reinterpret_cast<const int32_t*>(matrix));
  return std::isnan(counterclockwise) ? 0 : static_cast<int>(std::lrint(360 - counterclockwise)) % 360;
}

class MediaSource : public FrameSource {
 public:
  MediaSource(const std::string& path, const SourceOptions& options)
      : mName(SourceName(path)), mOptions(options), mInput(OpenInput(path)), mFrame(NewFrame()) {
    const int index = av_find_best_stream(mInput.get(), AVMEDIA_TYPE_VIDEO, -1, -1, nullptr, 0);
    if (index == AVERROR_STREAM_NOT_FOUND) throw ToolError("cannot read " + mName + ": it holds no picture or video");
    CheckAv(index, "cannot read " + SourceName(path));
    mDecoder = std::make_unique<StreamDecoder>(mInput.get(), index, options.threads, path);
    TakeAvMessage();  // what could be opened all the same
  }

  Picture Next() override {
    if (!mDecoder->Next(mFrame.get())) return {};
    NoteOddities();
    const VX_PixelFormat format = LibraryFormatOf(*mFrame, mDecoder->Codec(), mOptions.matrix);
    return ImportFrame(*mFrame, format);
  }
  bool Skip() override { return mDecoder->Next(mFrame.get()); }
  int64_t FrameCount() const override { return FrameCountOf(mInput.get(), Stream()); }
  std::pair<int, int> FrameRate() const override {
    const AVRational rate = Stream()->avg_frame_rate;
    return rate.num > 0 && rate.den > 0 ? std::pair{rate.num, rate.den} : std::pair{25, 1};
  }

 private:
  const AVStream* Stream() const { return mInput->streams[mDecoder->StreamIndex()]; }

  // What a picture that looks wrong would come from. Said once, of the first frame that has it.
  void NoteOddities() {
    if (const int angle = DisplayAngle(Stream(), *mFrame); angle != 0 && !mNotedAngle) {
      std::cerr << "vexel: note: " << mName << " asks to be shown turned by " << angle
                << " degrees; its frames are taken as stored (\"vexel rotate --angle " << angle << "\" turns one)\n";
      mNotedAngle = true;
    }
    const std::string message = TakeAvMessage();
    if (message.empty() || mNotedDamage) return;
    std::cerr << "vexel: note: " << mName << " is damaged; what could be decoded is used" << message << '\n';
    mNotedDamage = true;
  }

  std::string mName;
  SourceOptions mOptions;
  InputContext mInput;
  Frame mFrame;
  std::unique_ptr<StreamDecoder> mDecoder;
  bool mNotedAngle = false, mNotedDamage = false;
};

const char* NameOr(const char* name, const char* otherwise) { return name ? name : otherwise; }

std::string ColourOf(const AVFrame& frame) {
  const auto known = [](int value, int unspecified, const char* name) {
    return value == unspecified ? std::string("unspecified") : std::string(NameOr(name, "unknown"));
  };
  return "matrix " + known(frame.colorspace, AVCOL_SPC_UNSPECIFIED, av_color_space_name(frame.colorspace)) +
         ", range " + known(frame.color_range, AVCOL_RANGE_UNSPECIFIED, av_color_range_name(frame.color_range)) +
         ", transfer " + known(frame.color_trc, AVCOL_TRC_UNSPECIFIED, av_color_transfer_name(frame.color_trc)) +
         (frame.interlaced_frame ? ", interlaced" : "");
}

// Single pictures and numbered ones; libav gives them a frame rate all the same.
bool IsPictureFormat(const AVInputFormat* format) {
  const std::string_view name = format->name;
  return name == "image2" || name.ends_with("_pipe");
}

// The first frame tells what the decoder really gives. A stream that cannot be decoded is described all the same.
void DescribeFirstFrame(const std::string& path, const SourceOptions& options, StreamDescription& description) {
  try {
    const InputContext input = OpenInput(path);
    StreamDecoder decoder(input.get(), description.index, options.threads, path);
    const Frame frame = NewFrame();
    decoder.Next(frame.get());
    description.width = frame->width;
    description.height = frame->height;
    description.fileFormat = NameOr(av_get_pix_fmt_name(static_cast<AVPixelFormat>(frame->format)), "unknown");
    description.colour = ColourOf(*frame);
    description.displayAngle = DisplayAngle(input->streams[description.index], *frame);
    description.libraryFormat = LibraryFormatOf(*frame, decoder.Codec(), options.matrix);
  } catch (const ToolError& error) {
    description.refusal = error.what();
  }
}

}  // namespace

std::unique_ptr<FrameSource> OpenMediaSource(const std::string& path, const SourceOptions& options) {
  return std::make_unique<MediaSource>(path, options);
}

FileDescription DescribeFile(const std::string& path, const SourceOptions& options) {
  if (path == "-") throw ToolError("info needs a file: it reads it more than once");
  const InputContext input = OpenInput(path);
  FileDescription file;
  const bool picture = IsPictureFormat(input->iformat);
  file.container = picture ? "picture" : NameOr(input->iformat->long_name, input->iformat->name);
  file.seconds = input->duration > 0 && !picture ? static_cast<double>(input->duration) / AV_TIME_BASE : 0;
  for (unsigned i = 0; i < input->nb_streams; ++i) {
    const AVStream* stream = input->streams[i];
    StreamDescription description;
    description.index = static_cast<int>(i);
    description.kind = NameOr(av_get_media_type_string(stream->codecpar->codec_type), "data");
    description.codec = avcodec_get_name(stream->codecpar->codec_id);
    if (stream->codecpar->codec_type == AVMEDIA_TYPE_VIDEO) {
      description.frameRate = stream->avg_frame_rate.den && !picture ? av_q2d(stream->avg_frame_rate) : 0;
      description.frameCount = FrameCountOf(input.get(), stream);
      DescribeFirstFrame(path, options, description);
    }
    file.streams.push_back(std::move(description));
  }
  return file;
}

}  // namespace tool
