#include "frame_import.h"

#include <algorithm>
#include <bit>
#include <cstring>
#include <optional>

extern "C" {
#include <libavutil/pixdesc.h>
}

#include "format_catalogue.h"
#include "sample_rows.h"
#include "tool_error.h"

namespace tool {
namespace {

constexpr uint32_t kYuv = 1, kLinear = 2, kStraight = 4, kPremultiplied = 8, kOpaque = 12, kPacked422 = 0x10,
                   k420 = 0x30, kTenBit = 0x40, kFloat = 0x100, kReversed = 0x1000, kVideoRange = 0x800;

VX_PixelFormat Format(uint32_t bits) { return static_cast<VX_PixelFormat>(bits); }

const AVPixFmtDescriptor& DescriptorOf(const AVFrame& frame) {
  const AVPixFmtDescriptor* descriptor = av_pix_fmt_desc_get(static_cast<AVPixelFormat>(frame.format));
  if (!descriptor) throw ToolError("the decoder gave no pixel format");
  return *descriptor;
}

[[noreturn]] void RefuseFrame(const AVFrame& frame, const std::string& why) {
  throw ToolError(std::string("no library format holds ") + DescriptorOf(frame).name + " frames " + why);
}

bool IsFloatFrame(const AVPixFmtDescriptor& d) { return d.flags & AV_PIX_FMT_FLAG_FLOAT; }
bool HasAlphaComponent(const AVPixFmtDescriptor& d) { return d.flags & AV_PIX_FMT_FLAG_ALPHA; }
bool IsPalette(const AVPixFmtDescriptor& d) { return d.flags & AV_PIX_FMT_FLAG_PAL; }
bool IsRgb(const AVPixFmtDescriptor& d) { return d.flags & AV_PIX_FMT_FLAG_RGB; }
bool IsGrey(const AVPixFmtDescriptor& d) { return !IsRgb(d) && !IsPalette(d) && d.nb_components <= 2; }
int DepthOf(const AVPixFmtDescriptor& d) { return d.comp[0].depth; }

// The old JPEG formats say their range by name.
bool IsFullRange(const AVFrame& frame) {
  switch (frame.format) {
    case AV_PIX_FMT_YUVJ420P:
    case AV_PIX_FMT_YUVJ422P:
    case AV_PIX_FMT_YUVJ444P:
    case AV_PIX_FMT_YUVJ440P:
    case AV_PIX_FMT_YUVJ411P:
      return true;
    default:
      return frame.color_range == AVCOL_RANGE_JPEG;
  }
}

Matrix MatrixOf(const AVFrame& frame, Matrix wanted) {
  if (wanted != Matrix::FromFile) return wanted;
  switch (frame.colorspace) {
    case AVCOL_SPC_BT709:
      return Matrix::Bt709;
    case AVCOL_SPC_BT470BG:
    case AVCOL_SPC_SMPTE170M:
      return Matrix::Bt601;
    case AVCOL_SPC_BT2020_NCL:
      return Matrix::Bt2020;
    case AVCOL_SPC_UNSPECIFIED:
    case AVCOL_SPC_RESERVED:
      return UnnamedMatrix(frame.height);
    default:
      RefuseFrame(frame, std::string("coded with the ") + av_color_space_name(frame.colorspace) +
                             " matrix (--matrix 601 or 709 treats them as such)");
  }
}

bool IsHdr(const AVFrame& frame) {
  return frame.color_trc == AVCOL_TRC_SMPTE2084 || frame.color_trc == AVCOL_TRC_ARIB_STD_B67;
}

VX_PixelFormat Planar420Of(const AVFrame& frame, AVCodecID codec, Matrix matrix) {
  const AVPixFmtDescriptor& d = DescriptorOf(frame);
  const bool biplanar = d.comp[1].plane == d.comp[2].plane;
  const bool mpeg2 = codec == AV_CODEC_ID_MPEG2VIDEO && !biplanar;
  const uint32_t kind = (biplanar ? 13u : mpeg2 ? 9u : 11u) + (frame.interlaced_frame ? 0 : 1);
  return Format(kind << 24 | k420 | kYuv | (matrix == Matrix::Bt709 ? 0x200 : 0) |
                (IsFullRange(frame) ? 0 : kVideoRange) |
                (biplanar && d.comp[1].offset > d.comp[2].offset ? kReversed : 0));
}

// 4:2:0 in 10 bits; none for BT.601 and full range.
std::optional<VX_PixelFormat> TenBit420Of(const AVFrame& frame, Matrix matrix) {
  if (matrix == Matrix::Bt601 || IsFullRange(frame)) return std::nullopt;
  const uint32_t kind = frame.interlaced_frame ? 13 : 14;
  const uint32_t colorimetry = matrix == Matrix::Bt709 ? 0x200 : IsHdr(frame) ? 0x600 : 0x400;
  return Format(kind << 24 | k420 | kYuv | kTenBit | kVideoRange | colorimetry);
}

VX_PixelFormat YuvFormatOf(const AVFrame& frame, AVCodecID codec, Matrix wanted) {
  const AVPixFmtDescriptor& d = DescriptorOf(frame);
  const Matrix matrix = MatrixOf(frame, wanted);
  const bool alpha = HasAlphaComponent(d), bigEndian = d.flags & AV_PIX_FMT_FLAG_BE;
  if (d.log2_chroma_w == 1 && d.log2_chroma_h == 1 && !alpha && !bigEndian) {
    if (DepthOf(d) == 8 && matrix != Matrix::Bt2020) return Planar420Of(frame, codec, matrix);
    if (DepthOf(d) == 10)
      if (const auto format = TenBit420Of(frame, matrix)) return *format;
  }
  if (matrix == Matrix::Bt2020)
    RefuseFrame(frame, "coded with the BT.2020 matrix (10-bit 4:2:0 excepted; --matrix 709 treats them as BT.709)");
  const uint32_t model = kYuv | kVideoRange | (matrix == Matrix::Bt709 ? 0x200 : 0);
  const bool packed422 = d.log2_chroma_w > 0 && !alpha;
  const bool exactDepth = !IsFullRange(frame) && !IsFloatFrame(d);
  if (packed422) {
    const bool yuyv = frame.format == AV_PIX_FMT_YUYV422;
    if (exactDepth && DepthOf(d) == 8) return Format(model | kPacked422 | (yuyv ? kReversed : 0));
    if (exactDepth && DepthOf(d) == 10) return Format(model | kPacked422 | kTenBit);
    return Format(model | kPacked422 | kFloat);
  }
  return Format(model | (alpha ? kStraight : kOpaque) | (exactDepth && DepthOf(d) == 8 ? 0 : kFloat));
}

VX_PixelFormat RgbFormatOf(const AVFrame& frame, AVCodecID codec) {
  const AVPixFmtDescriptor& d = DescriptorOf(frame);
  const bool alpha = HasAlphaComponent(d) || IsPalette(d);
  if (IsFloatFrame(d) && (codec == AV_CODEC_ID_EXR || frame.color_trc == AVCOL_TRC_LINEAR))
    return Format(kFloat | kLinear | (alpha ? kPremultiplied : kOpaque));
  if (DepthOf(d) == 10 && !alpha && !IsGrey(d)) return kRgb444_10u;
  const bool alphaFirst = frame.format == AV_PIX_FMT_ARGB || frame.format == AV_PIX_FMT_0RGB;
  return Format((alpha ? kStraight : kOpaque) | (DepthOf(d) <= 8 ? 0 : kFloat) | (alphaFirst ? kReversed : 0));
}

// ---- Samples ------------------------------------------------------------------------------------------------------

// Reads `count` samples of a component; the common layouts without the general reader's work per sample.
void ReadComponent(const AVFrame& frame, const AVPixFmtDescriptor& d, int component, int y, int count, uint32_t* out) {
  const AVComponentDescriptor& c = d.comp[component];
  const uint8_t* row = frame.data[c.plane] + static_cast<ptrdiff_t>(y) * frame.linesize[c.plane] + c.offset;
  const bool plain = !(d.flags & (AV_PIX_FMT_FLAG_BITSTREAM | AV_PIX_FMT_FLAG_PAL)) && c.shift == 0;
  if (plain && c.depth == 8) {
    for (int x = 0; x < count; ++x) out[x] = row[static_cast<ptrdiff_t>(x) * c.step];
  } else if (plain && c.depth > 8 && c.depth <= 16 && !(d.flags & AV_PIX_FMT_FLAG_BE)) {
    const uint32_t mask = (1u << c.depth) - 1;
    for (int x = 0; x < count; ++x) {
      uint16_t word;
      std::memcpy(&word, row + static_cast<ptrdiff_t>(x) * c.step, 2);
      out[x] = word & mask;
    }
  } else {
    const uint8_t* data[4] = {frame.data[0], frame.data[1], frame.data[2], frame.data[3]};
    av_read_image_line2(out, data, frame.linesize, &d, 0, y, component, count, 0, 4);
  }
}

// A reader of whole rows in the components and chroma columns that the library format wants.
class RowReader {
 public:
  RowReader(const AVFrame& frame, VX_PixelFormat format) : mFrame(frame), mDesc(DescriptorOf(frame)), mFormat(format) {
    mCoding.depth = IsPalette(mDesc) || DepthOf(mDesc) < 8 ? 8 : DepthOf(mDesc);
    mCoding.isFloat = IsFloatFrame(mDesc);
    mCoding.fullRange = IsFullRange(frame);
  }

  const SampleCoding& Coding() const { return mCoding; }

  void Read(int y, SampleRow& samples) const {
    if (IsPalette(mDesc)) return ReadPalette(y, samples);
    ReadComponent(mFrame, mDesc, 0, y, mFrame.width, samples.components[0].data());
    if (IsGrey(mDesc)) {
      FinishGrey(samples);
    } else {
      for (int c = 1; c < 3; ++c) ReadColour(c, y, samples.components[c]);
      WidenRgb(samples);
    }
    ReadAlpha(y, samples);
  }

 private:
  void ReadPalette(int y, SampleRow& samples) const {
    const uint8_t* indices = mFrame.data[0] + static_cast<ptrdiff_t>(y) * mFrame.linesize[0];
    for (int x = 0; x < mFrame.width; ++x) {
      uint32_t argb;
      std::memcpy(&argb, mFrame.data[1] + indices[x] * 4, 4);
      for (int c = 0; c < 3; ++c) samples.components[c][x] = argb >> (16 - 8 * c) & 255;
      samples.components[3][x] = argb >> 24;
    }
  }

  void FinishGrey(SampleRow& samples) const {
    std::vector<uint32_t>& grey = samples.components[0];
    const uint32_t invert = mFrame.format == AV_PIX_FMT_MONOWHITE ? 1 : 0;
    if (DepthOf(mDesc) < 8) {
      const uint32_t maximum = (1u << DepthOf(mDesc)) - 1;
      for (int x = 0; x < mFrame.width; ++x) grey[x] = (grey[x] ^ invert) * 255 / maximum;
    }
    const bool yuv = IsYuv(mFormat);  // neutral chroma there, equal channels in RGB
    for (int c = 1; c < 3; ++c) {
      if (yuv)
        std::fill(samples.components[c].begin(), samples.components[c].end(), 1u << (mCoding.depth - 1));
      else
        samples.components[c] = grey;
    }
  }

  // Chroma is repeated where the file has fewer columns or rows than the library format.
  void ReadColour(int c, int y, std::vector<uint32_t>& out) const {
    if (IsRgb(mDesc)) return ReadComponent(mFrame, mDesc, c, y, mFrame.width, out.data());
    const int columns = AV_CEIL_RSHIFT(mFrame.width, mDesc.log2_chroma_w);
    ReadComponent(mFrame, mDesc, c, y >> mDesc.log2_chroma_h, columns, out.data());
    const int repeat = mDesc.log2_chroma_w - (IsPacked422(mFormat) ? 1 : 0);
    if (repeat > 0)
      for (int x = AV_CEIL_RSHIFT(mFrame.width, IsPacked422(mFormat) ? 1 : 0) - 1; x >= 0; --x)
        out[x] = out[x >> repeat];
  }

  // RGB formats of fewer than 8 bits (5:6:5, 3:3:2) are scaled to 8.
  void WidenRgb(SampleRow& samples) const {
    for (int c = 0; c < 3; ++c) {
      const uint32_t maximum = mDesc.comp[c].depth < 8 ? (1u << mDesc.comp[c].depth) - 1 : 0;
      if (maximum)
        for (int x = 0; x < mFrame.width; ++x)
          samples.components[c][x] = (samples.components[c][x] * 255 + maximum / 2) / maximum;
    }
  }

  void ReadAlpha(int y, SampleRow& samples) const {
    std::vector<uint32_t>& alpha = samples.components[3];
    if (HasAlphaComponent(mDesc)) {
      ReadComponent(mFrame, mDesc, mDesc.nb_components - 1, y, mFrame.width, alpha.data());
    } else {
      const uint32_t opaque = mCoding.isFloat ? std::bit_cast<uint32_t>(1.0f) : (1u << mCoding.depth) - 1;
      std::fill(alpha.begin(), alpha.end(), opaque);
    }
  }

  const AVFrame& mFrame;
  const AVPixFmtDescriptor& mDesc;
  VX_PixelFormat mFormat;
  SampleCoding mCoding;
};

void CopyRows(const uint8_t* src, ptrdiff_t srcRowBytes, const Plane& dst) {
  for (int y = 0; y < dst.height; ++y) std::memcpy(dst.Row(y), src + y * srcRowBytes, dst.width);
}

// The library's 10-bit words hold the code in their upper bits, as P010 does.
void Import10BitBiplanar(const AVFrame& frame, const Picture& picture) {
  const AVPixFmtDescriptor& d = DescriptorOf(frame);
  for (int p = 0; p < 2; ++p) {
    const Plane plane = picture.PlaneAt(p);
    const int perRow = static_cast<int>(plane.width / 2);
    std::vector<uint32_t> first(static_cast<size_t>(perRow)), second(first);
    for (int y = 0; y < plane.height; ++y) {
      const int count = p == 0 ? perRow : perRow / 2;
      ReadComponent(frame, d, p == 0 ? 0 : 1, y, count, first.data());
      if (p == 1) ReadComponent(frame, d, 2, y, count, second.data());
      for (int i = 0; i < perRow; ++i) {
        const uint32_t code = p == 0 ? first[i] : (i & 1 ? second : first)[i / 2];
        const uint16_t word = static_cast<uint16_t>(code << 6);
        std::memcpy(plane.Row(y) + 2 * i, &word, 2);
      }
    }
  }
}

void Import420(const AVFrame& frame, const Picture& picture) {
  if (!Is8Bit(picture.Format())) return Import10BitBiplanar(frame, picture);
  for (int p = 0; p < picture.PlaneCount(); ++p) CopyRows(frame.data[p], frame.linesize[p], picture.PlaneAt(p));
}

// True where the bytes of a row are the same in the frame and in the library format.
bool SameRowBytes(AVPixelFormat frameFormat, VX_PixelFormat format) {
  switch (frameFormat) {
    case AV_PIX_FMT_BGRA:
    case AV_PIX_FMT_ARGB:
    case AV_PIX_FMT_YUYV422:
    case AV_PIX_FMT_UYVY422:
      return Is8Bit(format) && !(frameFormat == AV_PIX_FMT_UYVY422 && IsReversed(format));
    default:
      return false;
  }
}

}  // namespace

Matrix ParseMatrix(const std::string& text) {
  if (text == "601") return Matrix::Bt601;
  if (text == "709") return Matrix::Bt709;
  if (text == "2020") return Matrix::Bt2020;
  throw ToolError("unknown matrix \"" + text + "\"; it is 601, 709 or 2020");
}

VX_PixelFormat LibraryFormatOf(const AVFrame& frame, AVCodecID codec, Matrix matrix) {
  const AVPixFmtDescriptor& d = DescriptorOf(frame);
  if (d.flags & (AV_PIX_FMT_FLAG_HWACCEL | AV_PIX_FMT_FLAG_BAYER)) RefuseFrame(frame, "(not a raster of pixels)");
  if (frame.format == AV_PIX_FMT_XYZ12LE || frame.format == AV_PIX_FMT_XYZ12BE) RefuseFrame(frame, "(CIE XYZ)");
  const bool videoRangeGrey = IsGrey(d) && frame.color_range == AVCOL_RANGE_MPEG && !IsFloatFrame(d);
  if (IsRgb(d) || IsPalette(d) || (IsGrey(d) && !videoRangeGrey)) return RgbFormatOf(frame, codec);
  return YuvFormatOf(frame, codec, matrix);
}

Picture ImportFrame(const AVFrame& frame, VX_PixelFormat format) {
  Picture picture(format, frame.width, frame.height);
  if (Is420(format)) {
    Import420(frame, picture);
    return picture;
  }
  if (SameRowBytes(static_cast<AVPixelFormat>(frame.format), format)) {
    const size_t rowBytes = TightRowBytes(format, frame.width);
    for (int y = 0; y < frame.height; ++y)
      std::memcpy(picture.Row(y), frame.data[0] + static_cast<ptrdiff_t>(y) * frame.linesize[0], rowBytes);
    return picture;
  }
  const RowReader reader(frame, format);
  const PackRow pack = RowPackerFor(format);
  SampleRow samples(frame.width);
  for (int y = 0; y < frame.height; ++y) {
    reader.Read(y, samples);
    pack(samples, reader.Coding(), format, picture.Row(y), frame.width);
  }
  return picture;
}

}  // namespace tool
