// The fixed-point factors of 4:2:0 decoding for every pair of colorimetries and ranges.
#include "convert/Decode420.h"
#include "convert/YuvMatrices.h"

namespace vexel {
namespace {

// Codes of a range: luma black, and the widths of luma and of chroma about 128.
struct Range8 {
  double black, luma, chroma;
};
constexpr Range8 kVideo = {kLumaBlack8, kLumaRange8, kChromaRange8};
constexpr Range8 kFull = {0, 255, 255};

constexpr const YuvMatrix& MatrixOf(VX_PixelFormat format) {
  return Colorimetry(format) == 0 ? kBt601 : (Bits(format) & kColorimetry2020) == 0 ? kBt709 : kBt2020;
}

// The kernels multiply luma times 128 and chroma times 256 by factors in 1/32768; results are in 64ths.
constexpr double kLumaUnit = 64 * 32768 / 128, kChromaUnit = 64 * 32768 / 256, kOne = 64;

constexpr int16_t Round(double value) { return static_cast<int16_t>(value < 0 ? value - 0.5 : value + 0.5); }

}  // namespace

decode420::Matrix MakeMatrix420(VX_PixelFormat src, VX_PixelFormat dst) noexcept {
  const YuvMatrix& from = MatrixOf(src);
  const Range8 in = IsVideoRange(src) ? kVideo : kFull;
  decode420::Matrix m{};
  if (!IsYuv(dst)) {
    const double luma = 255 / in.luma, chroma = 255 / in.chroma * kChromaUnit;
    m.luma = Round(luma * kLumaUnit);
    m.lumaBias = Round((0.5 - in.black * luma) * kOne);
    m.chroma[0][0] = Round(from.bU * chroma);
    m.chroma[1][0] = Round(from.gU * chroma);
    m.chroma[1][1] = Round(from.gV * chroma);
    m.chroma[2][1] = Round(from.rV * chroma);
    return m;
  }
  const YuvMatrix& to = MatrixOf(dst);
  // The products of a matrix and its own inverse miss the identity by the rounding of the tables.
  const YuvRecoding r = &from == &to ? YuvRecoding{0, 1, 1, 0, 0, 0} : Recode(from, to);
  const double luma = kVideo.luma / in.luma;
  const double chroma = kVideo.chroma / in.chroma * kChromaUnit, chromaToLuma = kVideo.luma / in.chroma * kChromaUnit;
  m.luma = Round(luma * kLumaUnit);
  m.lumaBias = Round((0.5 + kVideo.black - in.black * luma) * kOne);
  m.chroma[0][0] = Round(r.vU * chroma);
  m.chroma[0][1] = Round(r.vV * chroma);
  m.chroma[1][0] = Round(r.uU * chroma);
  m.chroma[1][1] = Round(r.uV * chroma);
  m.chroma[2][0] = Round(r.yU * chromaToLuma);
  m.chroma[2][1] = Round(r.yV * chromaToLuma);
  return m;
}

}  // namespace vexel
