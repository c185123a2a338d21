#include "packings.h"

#include <cstring>

#include "format_catalogue.h"
#include "frame_sink.h"
#include "tool_error.h"

namespace tool {
namespace {

using F = VX_PixelFormat;
constexpr F kV210 = F::V210_422_10u_709;

size_t FrameSize(F format, int width, int height) { return FileRowBytes(format, width) * static_cast<size_t>(height); }
int RowBytesOf(F format, int width) { return static_cast<int>(FileRowBytes(format, width)); }

FrameBytes PackV210(const FrameBytes& samples, int width, int height) {
  FrameBytes packed(FrameSize(kV210, width, height));
  VX_ConvertUYVY_422_10uToV210_422_10u(samples.data(), 4 * width, packed.data(), RowBytesOf(kV210, width), width,
                                       height);
  return packed;
}
FrameBytes UnpackV210(const FrameBytes& packed, int width, int height) {
  FrameBytes samples(size_t{4} * static_cast<size_t>(width) * static_cast<size_t>(height));
  VX_Convert_j2k_V210_To_10_Bits_Within_UYVY16u(packed.data(), RowBytesOf(kV210, width), samples.data(), 4 * width,
                                                width, height);
  return samples;
}

FrameBytes PackDnxhd(const FrameBytes& words, int width, int height) {
  FrameBytes packed(2 * words.size());
  VX_Convert_RGB_444_10u_To_DNxHD16u(words.data(), 4 * width, packed.data(), width, height);
  return packed;
}
FrameBytes UnpackDnxhd(const FrameBytes& packed, int width, int height) {
  FrameBytes words(packed.size() / 2);
  VX_Convert_DNxHD16u_To_RGB_444_10u(packed.data(), words.data(), 4 * width, width, height);
  return words;
}

FrameBytes PackBigEndian16(const FrameBytes& samples, int width, int height) {
  FrameBytes packed = samples;
  VX_Convert_15u_To_16u_BigEndian_InPlace(packed.data(), 8 * width, width, height);
  return packed;
}
FrameBytes UnpackBigEndian16(const FrameBytes& packed, int, int) {
  std::vector<uint16_t> samples(packed.size() / 2);
  for (size_t i = 0; i < samples.size(); ++i)
    samples[i] = static_cast<uint16_t>(packed[2 * i] << 8 | packed[2 * i + 1]);
  VX_Scale16uBufferTo15uSIMD(samples.data(), samples.data(), samples.size());
  FrameBytes unpacked(packed.size());
  std::memcpy(unpacked.data(), samples.data(), unpacked.size());
  return unpacked;
}

FrameBytes SwapWords(const FrameBytes& words, int width, int height) {
  FrameBytes swapped = words;
  VX_Convert_Uint32_BigEndian_InPlace(swapped.data(), 4 * width, width, height);
  return swapped;
}

// BGRA_4444_8u stands for any 4 bytes per pixel, ARGB_4444_15u for any 8.
constexpr Packing kPackings[] = {
    {"v210", "16-bit samples U Y V Y, 10 bits at the right", "groups of 6 pixels in 16 bytes, rows padded to 128 bytes",
     F::BGRA_4444_8u, kV210, kV210, PackV210, UnpackV210},
    {"dnxhd16u", "RGB_444_10u", "four 16-bit samples, R G B in the upper 10 bits of the first three", kRgb444_10u,
     F::ARGB_4444_15u, kRgb444_10u, PackDnxhd, UnpackDnxhd},
    {"be16", "ARGB_4444_15u", "four big-endian 16-bit samples A R G B of 0 to 65535", F::ARGB_4444_15u,
     F::ARGB_4444_15u, F::ARGB_4444_15u, PackBigEndian16, UnpackBigEndian16},
    {"be32", "RGB_444_10u", "the 10-bit RGB words big-endian", kRgb444_10u, kRgb444_10u, kRgb444_10u, SwapWords,
     SwapWords},
};

}  // namespace

FrameBytes Packing::FromPicture(const Picture& source) const {
  const FrameBytes stored = RawBytes(source);
  return picture == kV210 ? unpack(stored, source.Width(), source.Height()) : stored;
}

Picture Packing::ToPicture(const FrameBytes& unpacked, int width, int height) const {
  const FrameBytes stored = picture == kV210 ? pack(unpacked, width, height) : unpacked;
  Picture result(picture, width, height);
  const size_t rowBytes = FileRowBytes(picture, width), tight = TightRowBytes(picture, width);
  for (int y = 0; y < height; ++y) std::memcpy(result.Row(y), stored.data() + static_cast<size_t>(y) * rowBytes, tight);
  return result;
}

std::span<const Packing> Packings() { return kPackings; }

std::string PackingNames() {
  std::string names;
  for (const Packing& packing : kPackings) names += std::string(names.empty() ? "" : ", ") + packing.name;
  return names;
}

const Packing& ParsePacking(const std::string& name) {
  for (const Packing& packing : kPackings)
    if (name == packing.name) return packing;
  throw ToolError("unknown packing \"" + name + "\"; it is one of " + PackingNames());
}

}  // namespace tool
