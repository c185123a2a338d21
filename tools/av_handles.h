// Owners of libav objects, and its errors as ToolErrors.
#pragma once

extern "C" {
#include <libavcodec/avcodec.h>
#include <libavformat/avformat.h>
}

#include <memory>
#include <string>

namespace tool {

struct AvDeleter {
  void operator()(AVFormatContext* context) const { avformat_close_input(&context); }
  void operator()(AVCodecContext* context) const { avcodec_free_context(&context); }
  void operator()(AVFrame* frame) const { av_frame_free(&frame); }
  void operator()(AVPacket* packet) const { av_packet_free(&packet); }
};
using InputContext = std::unique_ptr<AVFormatContext, AvDeleter>;
using CodecContext = std::unique_ptr<AVCodecContext, AvDeleter>;
using Frame = std::unique_ptr<AVFrame, AvDeleter>;
using Packet = std::unique_ptr<AVPacket, AvDeleter>;

Frame NewFrame();
Packet NewPacket();

// Keeps libav from writing to the terminal; its last error line explains a failure instead.
void CollectAvMessages();

// Libav's last error line in parentheses, with a space before it, or nothing; it is told once.
std::string TakeAvMessage();

// Throws ToolError "WHAT: REASON" with libav's text for the code and its last error line. Does nothing for codes >= 0.
void CheckAv(int code, const std::string& what);

}  // namespace tool
