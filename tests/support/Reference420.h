// 4:2:0 pictures by definition: positions of samples, ranges and matrices in double precision, one pixel at a time.
// Nothing here is shared with the library but the layout of blocks.
#pragma once

#include <array>

#include "convert/YuvReference.h"
#include "support/Formats.h"
#include "support/Test.h"

namespace vexel::testing {

// A picture in a block of exactly its size.
struct Block420 {
  VX_PixelFormat format;
  int width, height;
  std::vector<uint8_t> bytes;
  void* planes[3];
  int32_t rowBytes[3];

  Block420(VX_PixelFormat f, int w, int h)
      : format(f), width(w), height(h), bytes(static_cast<size_t>(VX_PixelFormatSize(f, w, h))) {
    VX_GetPlanarBuffers(bytes.data(), f, w, h, planes, rowBytes);
  }
  Block420(const Block420&) = delete;

  bool isWide() const { return Depth(format) != kDepth8u; }
  void Randomize(uint64_t seed) {
    Random(seed).Fill(bytes.data(), bytes.size());
    if (isWide())
      for (size_t i = 0; i < bytes.size(); i += 2) bytes[i] &= 0xC0;
  }
  // A sample as an 8-bit code with its fraction; plane 0 is Y, 1 U (Cb), 2 V (Cr).
  double Code(int plane, int x, int row) const {
    if (plane != 0) {
      const int pitch = rowBytes[1] / (isWide() ? 2 : 1) / (IsBiplanar(format) ? 2 : 1);
      if (pitch == 0) return 128;
      x = std::min(x, pitch - 1);
    }
    const bool swap = IsReversed(format);
    int index = x, memoryPlane = plane;
    if (plane != 0 && IsBiplanar(format)) {
      memoryPlane = 1;
      index = 2 * x + ((plane == 2) != swap ? 1 : 0);
    } else if (plane != 0 && swap) {
      memoryPlane = 3 - plane;
    }
    const auto* p = static_cast<const uint8_t*>(planes[memoryPlane]) + ptrdiff_t{row} * rowBytes[memoryPlane];
    return isWide() ? ((p[2 * index] | p[2 * index + 1] << 8) >> 6) / 4.0 : p[index];
  }
};

using Ycc = std::array<double, 3>;  // Y, Cb, Cr

// The value at `position` among samples of which number k lies at first + spacing k, the ends going on.
template <class Sample>
double Between(double position, double first, double spacing, int count, const Sample& sample) {
  const double at = std::clamp((position - first) / spacing, 0.0, count - 1.0);
  const int k = std::min(static_cast<int>(at), std::max(count - 2, 0));
  const double t = at - k;
  return t == 0 ? sample(k) : (1 - t) * sample(k) + t * sample(k + 1);
}

// A pixel of the full-size picture, in codes of the source's range.
inline Ycc FullSizeYcc(const Block420& src, int x, int line, bool interpolates) {
  const int rows = (src.height + 1) / 2, columns = (src.width + 1) / 2;
  const bool fields = FrameKind(src.format) % 2 == 1;
  const int parity = fields && rows > 1 ? line % 2 : 0, step = fields ? 2 : 1;
  const int rowsOfField = (rows - parity + step - 1) / step;
  const bool lacksRows = fields && rows == 1 && line % 2 == 1;
  Ycc pixel{src.Code(0, x, line), 0, 0};
  for (int plane = 1; plane < 3; ++plane) {
    const auto column = [&](int row) {
      const auto sample = [&](int k) { return src.Code(plane, k, row); };
      return interpolates ? Between(x, 0, 2, columns, sample) : sample(x / 2);
    };
    if (lacksRows) {
      pixel[plane] = column(0);
    } else if (!interpolates) {
      pixel[plane] = column(std::min(line / step / 2, rowsOfField - 1) * step + parity);
    } else {
      // ISO/IEC 13818-2, figures 6-1 to 6-3: in lines of the picture, chroma row j lies at 2 j + 0.5, fields alternate.
      pixel[plane] =
          Between(line, 2 * parity + 0.5, 2 * step, rowsOfField, [&](int k) { return column(k * step + parity); });
    }
  }
  return pixel;
}

inline Luma LumaOf(VX_PixelFormat f) {
  return Colorimetry(f) == 0 ? k601 : Colorimetry(f) == kColorimetry709 ? k709 : Luma{0.2627, 0.0593};
}

// Codes of a 4:2:0 format to the codes of an 8-bit BGRX or VUYX format, in memory order, unrounded.
inline Ycc ToCodes(const Ycc& codes, VX_PixelFormat src, VX_PixelFormat dst) {
  const double chroma = IsVideoRange(src) ? 1 : 224 / 255.0;
  Triple pixel{{128 + (codes[2] - 128) * chroma, 128 + (codes[1] - 128) * chroma,
                IsVideoRange(src) ? codes[0] : 16 + codes[0] * 219 / 255}};
  pixel = VuyToBgr(LumaOf(src), pixel);
  if (IsYuv(dst)) pixel = BgrToVuy(LumaOf(dst), pixel);
  return {pixel.c[0], pixel.c[1], pixel.c[2]};
}

// The same from full-range R'G'B' codes to codes of a 4:2:0 format.
inline Ycc FromBgr(const std::array<double, 3>& bgr, VX_PixelFormat dst) {
  const Luma to = LumaOf(dst);
  const double luma = to.r * bgr[2] + to.b * bgr[0] + to.g() * bgr[1];
  return {luma, 128 + (bgr[0] - luma) / (2 * (1 - to.b)), 128 + (bgr[2] - luma) / (2 * (1 - to.r))};
}

}  // namespace vexel::testing
