// Pictures in memory of their own, for tests of operations on several of them.
#pragma once

#include <cstdint>
#include <vector>

#include "formats/FormatBits.h"
#include "support/Arena.h"
#include "support/Random.h"
#include "vexel/vexel.h"

namespace vexel::testing {

struct Image {
  Image(VX_PixelFormat f, int w, int h, Contents contents = Contents::Random, uint64_t seed = 1)
      : format(f), width(w), height(h), rowBytes(static_cast<int32_t>(UnpaddedRowBytes(f, w))) {
    bytes.resize(static_cast<size_t>(rowBytes) * static_cast<size_t>(h));
    Random random(seed);
    for (int row = 0; row < h; ++row) FillSamples(Row(row), static_cast<size_t>(rowBytes), f, contents, random);
  }
  uint8_t* Row(int row) { return bytes.data() + ptrdiff_t{row} * rowBytes; }
  // A row counted from the picture's top.
  uint8_t* UprightRow(int row) { return Row(VX_IsOriginTopLeft(format) ? row : height - 1 - row); }
  template <class T>
  T* As() {
    return reinterpret_cast<T*>(bytes.data());
  }

  VX_PixelFormat format;
  int width, height;
  int32_t rowBytes;
  std::vector<uint8_t> bytes;
};

inline VX_Result Convert(Image& from, Image& to, int32_t quality = 3) {
  return VX_Convert(from.bytes.data(), from.rowBytes, from.format, to.bytes.data(), to.rowBytes, to.format, to.width,
                    to.height, quality);
}

// Whether a format has alpha to honour.
inline bool CarriesAlpha(VX_PixelFormat format) {
  return AlphaKind(format) == kAlphaStraight || AlphaKind(format) == kAlphaPremultiplied;
}

// The format of a given name.
inline VX_PixelFormat FormatByName(const std::string& wanted) {
#define VX_FIND(name, value, hostName, mapping) \
  if (wanted == #name) return VX_PixelFormat::name;
  VX_PIXEL_FORMATS(VX_FIND)
#undef VX_FIND
  ADD_FAILURE() << wanted;
  return VX_PixelFormat::Invalid;
}

}  // namespace vexel::testing
