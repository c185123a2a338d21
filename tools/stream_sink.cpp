// Raw frames and Y4M: one stream of bytes.
#include <cstdio>
#include <iostream>

extern "C" {
#include <libavutil/pixdesc.h>
}

#include "format_catalogue.h"
#include "frame_export.h"
#include "frame_import.h"
#include "frame_sink.h"
#include "numbered_path.h"
#include "output_file.h"
#include "tool_error.h"

namespace tool {
namespace {

// One file for all frames, which must be of one size: nothing in it says where another begins.
class StreamSink : public FrameSink {
 public:
  StreamSink(const std::string& path, int64_t firstNumber) : mFile(path), mNumber(firstNumber) {
    if (ParseNumberedPath(path))
      throw ToolError("\"" + path +
                      "\" would be one file of all frames; only pictures are numbered, as in out_%04d.png");
  }
  bool TakesManyFrames() const override { return true; }
  void Close() override { mFile.Close(); }

 protected:
  void CheckSize(const Picture& picture) {
    const auto text = [](int width, int height) { return std::to_string(width) + "x" + std::to_string(height); };
    if (mWidth == 0) {
      mWidth = picture.Width();
      mHeight = picture.Height();
    } else if (picture.Width() != mWidth || picture.Height() != mHeight) {
      throw ToolError("frame " + std::to_string(mNumber) + " is " + text(picture.Width(), picture.Height()) +
                      ", those before are " + text(mWidth, mHeight) +
                      "; one file of frames has one size, numbered pictures (out_%04d.png) take any");
    }
    ++mNumber;
  }

  OutputFile mFile;

 private:
  int64_t mNumber;
  int mWidth = 0, mHeight = 0;
};

class RawSink : public StreamSink {
 public:
  using StreamSink::StreamSink;
  VX_PixelFormat StorageFormat(VX_PixelFormat format, int) const override { return format; }
  std::vector<uint8_t> Encode(const Picture& picture) const override { return RawBytes(picture); }
  void Append(const Picture& picture, const std::vector<uint8_t>& encoded) override {
    CheckSize(picture);
    mFile.Write(encoded.data(), encoded.size());
  }
};

// How Y4M names a coding, and the frame layout of its planes.
struct Y4mCoding {
  const char* name;
  AVPixelFormat frameFormat;
};

Y4mCoding Y4mCodingOf(VX_PixelFormat format) {
  if (Is420(format)) return {"420mpeg2", AV_PIX_FMT_YUV420P};  // chroma is co-sited with every second column
  if (IsV210(format)) return {"422p10", AV_PIX_FMT_YUV422P10LE};
  if (IsPacked422(format)) return {"422", AV_PIX_FMT_YUV422P};
  if (IsFloat(format)) return {"444p16", AV_PIX_FMT_YUV444P16LE};
  if (HasAlpha(format)) return {"444alpha", AV_PIX_FMT_YUVA444P};
  return {"444", AV_PIX_FMT_YUV444P};
}

class Y4mSink : public StreamSink {
 public:
  Y4mSink(const std::string& path, std::pair<int, int> frameRate, int64_t firstNumber)
      : StreamSink(path, firstNumber), mFrameRate(frameRate) {}

  // Y4M has no straight or premultiplied alpha beyond 8 bits, and does not name its matrix: RGB takes the one that
  // readers assume.
  VX_PixelFormat StorageFormat(VX_PixelFormat format, int height) const override {
    if (Is420(format) && !IsBiplanar420(format)) return format;
    const bool is709 = IsYuv(format) ? (Bits(format) & 0x600) != 0 : UnnamedMatrix(height) == Matrix::Bt709;
    const uint32_t matrix = is709 ? 0x200 : 0;
    const auto with = [&](VX_PixelFormat base) { return static_cast<VX_PixelFormat>(Bits(base) | matrix); };
    if (Is420(format)) return with(Is8Bit(format) ? VX_PixelFormat::VUYX_4444_8u : VX_PixelFormat::V210_422_10u);
    if (!IsRaster(format)) return with(VX_PixelFormat::UYVY_422_8u);
    if (IsPacked422(format)) return with(Is8Bit(format) ? VX_PixelFormat::UYVY_422_8u : VX_PixelFormat::V210_422_10u);
    if (!Is8Bit(format)) return with(VX_PixelFormat::VUYX_4444_32f);
    return with(HasAlpha(format) ? VX_PixelFormat::VUYA_4444_8u : VX_PixelFormat::VUYX_4444_8u);
  }

  std::vector<uint8_t> Encode(const Picture& picture) const override {
    if (Is420(picture.Format())) return RawBytes(picture);
    const AVPixelFormat frameFormat = Y4mCodingOf(picture.Format()).frameFormat;
    const Frame frame = ExportFrame(picture, frameFormat, false);
    const AVPixFmtDescriptor* d = av_pix_fmt_desc_get(frameFormat);
    std::vector<uint8_t> bytes;
    for (int p = 0; p < av_pix_fmt_count_planes(frameFormat); ++p) {
      const bool chroma = p == 1 || p == 2;
      const int columns = chroma ? AV_CEIL_RSHIFT(picture.Width(), d->log2_chroma_w) : picture.Width();
      const size_t rowBytes = static_cast<size_t>(columns) * (d->comp[0].depth > 8 ? 2 : 1);
      for (int y = 0; y < picture.Height(); ++y) {
        const uint8_t* row = frame->data[p] + static_cast<ptrdiff_t>(y) * frame->linesize[p];
        bytes.insert(bytes.end(), row, row + rowBytes);
      }
    }
    return bytes;
  }

  void Append(const Picture& picture, const std::vector<uint8_t>& encoded) override {
    CheckSize(picture);
    if (!mHeaderWritten) WriteHeader(picture);
    mFile.Write("FRAME\n", 6);
    mFile.Write(encoded.data(), encoded.size());
  }

 private:
  void WriteHeader(const Picture& picture) {
    const bool field = FrameKind(picture.Format()) == 9 || FrameKind(picture.Format()) == 11;
    const char* range = IsFullRangeYuv(picture.Format()) ? "FULL" : "LIMITED";
    char header[160];
    const int length = std::snprintf(header, sizeof header, "YUV4MPEG2 W%d H%d F%d:%d I%c A1:1 C%s XCOLORRANGE=%s\n",
                                     picture.Width(), picture.Height(), mFrameRate.first, mFrameRate.second,
                                     field ? 't' : 'p', Y4mCodingOf(picture.Format()).name, range);
    mFile.Write(header, static_cast<size_t>(length));
    const bool is709 = (Bits(picture.Format()) & 0x600) != 0;
    if (is709 != (UnnamedMatrix(picture.Height()) == Matrix::Bt709))
      std::cerr << "vexel: note: Y4M does not name its matrix; read this one with --matrix " << (is709 ? "709" : "601")
                << '\n';
    mHeaderWritten = true;
  }

  std::pair<int, int> mFrameRate;
  bool mHeaderWritten = false;
};

}  // namespace

std::unique_ptr<FrameSink> OpenStreamSink(const std::string& path, Container container, std::pair<int, int> frameRate,
                                          int64_t firstNumber) {
  if (container == Container::Raw) return std::make_unique<RawSink>(path, firstNumber);
  return std::make_unique<Y4mSink>(path, frameRate, firstNumber);
}

}  // namespace tool
