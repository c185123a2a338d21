// Pictures in memory of their own, for tests of operations on several of them.
#pragma once

#include "support/Arena.h"
#include "support/Formats.h"
#include "support/Operations.h"
#include "support/PaddedRows.h"
#include "support/Test.h"

namespace vexel::testing {

struct Image {
  Image(VX_PixelFormat f, int w, int h, Contents contents = Contents::Random, uint64_t seed = 1)
      : format(f), width(w), height(h), rowBytes(static_cast<int32_t>(UnpaddedRowBytes(f, w))) {
    bytes.resize(static_cast<size_t>(rowBytes) * static_cast<size_t>(h));
    Random random(seed);
    for (int row = 0; row < h; ++row) FillSamples(Row(row), static_cast<size_t>(rowBytes), f, contents, random);
  }
  Image(VX_PixelFormat f, int w, int h, uint64_t seed) : Image(f, w, h, Contents::Random, seed) {}
  operator View() const { return {bytes.data(), rowBytes, format}; }
  operator ArenaFrame() { return {bytes.data(), rowBytes, format, width, height}; }
  uint8_t* Row(int row) { return bytes.data() + ptrdiff_t{row} * rowBytes; }
  // A row counted from the picture's top.
  uint8_t* UprightRow(int row) { return Row(VX_IsOriginTopLeft(format) ? row : height - 1 - row); }
  template <class T>
  T* As() {
    return reinterpret_cast<T*>(bytes.data());
  }
  Image Converted(VX_PixelFormat to, int32_t quality = 3) const {
    Image out(to, width, height, 0);
    EXPECT_EQ(Convert(*this, out, quality), VX_Success);
    return out;
  }

  VX_PixelFormat format;
  int width, height;
  int32_t rowBytes;
  LineBytes bytes;
};

// Where the alpha of a pixel of four channels is.
inline size_t AlphaAt(VX_PixelFormat format) { return IsReversed(format) ? 0 : 3; }

inline double FullScale(VX_PixelFormat f) {
  return Depth(f) == kDepth8u ? 255 : Depth(f) == kDepth10u ? 1023 : Depth(f) == kDepth15u ? 32768 : 1;
}

// Samples as numbers, of ten bits the three of each word.
inline size_t SampleCount(const Image& image) {
  return image.bytes.size() / SampleBytes(image.format) * (Depth(image.format) == kDepth10u ? 3 : 1);
}
inline double SampleAt(const uint8_t* samples, size_t i, VX_PixelFormat f) {
  const auto get = [&](auto sample, size_t index) {
    std::memcpy(&sample, samples + index * sizeof sample, sizeof sample);
    return sample;
  };
  if (Depth(f) == kDepth8u) return samples[i];
  if (Depth(f) == kDepth15u) return get(uint16_t{}, i);
  if (Depth(f) == kDepth32f) return double{get(0.0f, i)};
  return get(0u, i / 3) >> (i % 3 * 10 + (IsV210(f) ? 0 : 2)) & 1023;
}
inline void PutSample(uint8_t* samples, size_t i, VX_PixelFormat f, double value) {
  const auto put = [&](auto sample) { std::memcpy(samples + i * sizeof sample, &sample, sizeof sample); };
  if (Depth(f) == kDepth32f) return put(static_cast<float>(value));
  if (Depth(f) == kDepth15u) return put(static_cast<uint16_t>(static_cast<int>(value)));
  put(static_cast<uint8_t>(value));
}

// Whether pixels have a fourth channel, and whether a matte colour may be taken from them.
inline bool IsPixels(VX_PixelFormat f) { return Layout(f) == kLayout4444 && AlphaKind(f) != kAlphaNone; }
inline bool IsMatted(VX_PixelFormat f) { return IsPixels(f) && !IsYuv(f) && AlphaKind(f) != kAlphaIgnored; }
// Whether alpha may be set in place.
inline bool IsSettable(VX_PixelFormat f) {
  constexpr F kSettable[] = {F::BGRA_4444_8u,         F::VUYA_4444_8u,  F::BGRA_4444_15u, F::BGRA_4444_32f,
                             F::BGRA_4444_32f_Linear, F::VUYA_4444_32f, F::ARGB_4444_32f, F::ARGB_4444_32f_Linear};
  return std::find(std::begin(kSettable), std::end(kSettable), f) != std::end(kSettable);
}

// The format of a given name.
inline VX_PixelFormat FormatByName(const std::string& wanted) {
  const VX_PixelFormat format = VX_PixelFormatFromName(wanted.c_str());
  EXPECT_EQ(VX_PixelFormatName(format), wanted);
  return format;
}

}  // namespace vexel::testing
