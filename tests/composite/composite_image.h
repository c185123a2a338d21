// Pictures in memory of their own, for tests of operations on several of them.
#pragma once

#include <gtest/gtest.h>
#include <xmmintrin.h>

#include <cstdint>
#include <string>
#include <vector>

#include "formats/FormatBits.h"
#include "support/Arena.h"
#include "support/Random.h"
#include "vexel/vexel.h"

namespace vexel::testing {

// Pixels wherever they are.
struct View {
  View(const void* pixels, int32_t bytes, VX_PixelFormat f) : base(pixels), rowBytes(bytes), format(f) {}
  View(const ArenaFrame& frame) : View(frame.base, frame.rowBytes, frame.format) {}
  void* Target() const { return const_cast<void*>(base); }

  const void* base;
  int32_t rowBytes;
  VX_PixelFormat format;
};

struct Image {
  Image(VX_PixelFormat f, int w, int h, Contents contents = Contents::Random, uint64_t seed = 1)
      : format(f), width(w), height(h), rowBytes(static_cast<int32_t>(UnpaddedRowBytes(f, w))) {
    bytes.resize(static_cast<size_t>(rowBytes) * static_cast<size_t>(h));
    Random random(seed);
    for (int row = 0; row < h; ++row) FillSamples(Row(row), static_cast<size_t>(rowBytes), f, contents, random);
  }
  Image(VX_PixelFormat f, int w, int h, uint64_t seed) : Image(f, w, h, Contents::Random, seed) {}
  operator View() const { return {bytes.data(), rowBytes, format}; }
  operator ArenaFrame() { return Frame(); }
  ArenaFrame Frame() { return {bytes.data(), rowBytes, format, width, height}; }
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

inline VX_Result Convert(const View& from, Image& to, int32_t quality = 3) {
  return VX_Convert(from.base, from.rowBytes, from.format, to.bytes.data(), to.rowBytes, to.format, to.width, to.height,
                    quality);
}

// Calls under a control word of the caller's, which must be what it was afterwards.
template <class Call>
VX_Result UnderControlWord(unsigned word, const Call& call) {
  const unsigned callers = _mm_getcsr();
  _mm_setcsr(word);
  const VX_Result result = call();
  const unsigned after = _mm_getcsr();
  _mm_setcsr(callers);
  EXPECT_EQ(after, word);
  return result;
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
