// Black and white in the raster formats: the smallest run of bytes that repeats along a row.
#pragma once

#include <algorithm>
#include <cstdint>
#include <cstring>

#include "formats/FormatBits.h"

namespace vexel {

enum class FillLevel : uint8_t { Black, White };

// A pixel, a 4:2:2 pair or a V210 group.
struct FillUnit {
  uint8_t bytes[16];
  int size;    // 4, 8 or 16
  int pixels;  // 1, 2 or 6
};

// Black and white of 8-bit studio codes; 10-bit ones are four times as large.
inline constexpr uint8_t kStudioChroma8 = 128;
constexpr uint8_t StudioLuma8(FillLevel level) noexcept { return level == FillLevel::White ? 235 : 16; }

namespace fill_detail {

template <class T>
FillUnit UnitOf(T c0, T c1, T c2, T c3, bool reversed, int pixels) noexcept {
  T channels[4] = {c0, c1, c2, c3};
  if (reversed) std::reverse(channels, channels + 4);
  FillUnit unit{{}, sizeof channels, pixels};
  std::memcpy(unit.bytes, channels, sizeof channels);
  return unit;
}

template <class T>
FillUnit FourChannels(VX_PixelFormat format, T chroma, T luma, T alpha) noexcept {
  const T first = IsYuv(format) ? chroma : luma;
  return UnitOf(first, first, luma, alpha, IsReversed(format), 1);
}

template <class T>
FillUnit Pair422(VX_PixelFormat format, T chroma, T luma) noexcept {
  return UnitOf(chroma, luma, chroma, luma, IsReversed(format), 2);
}

// U Y V | Y U Y | V Y U | Y V Y, ten bits each.
inline FillUnit GroupV210(uint32_t chroma, uint32_t luma) noexcept {
  const uint32_t even = chroma | luma << 10 | chroma << 20, odd = luma | chroma << 10 | luma << 20;
  return UnitOf(even, odd, even, odd, false, 6);
}

}  // namespace fill_detail

// The unit of a raster format, with alpha opaque or 0 where there is one; false for every other value.
inline bool MakeFillUnit(VX_PixelFormat format, FillLevel level, bool opaque, FillUnit* unit) noexcept {
  using namespace fill_detail;
  if (IsSpecial(format)) return false;
  const bool white = level == FillLevel::White, yuv = IsYuv(format), wide = Depth(format) == kDepth32f;
  const uint8_t studio = StudioLuma8(level), code = yuv ? studio : white ? 255 : 0;
  const float unity = white ? 1.0f : 0.0f;
  if (IsLinear(format) && (yuv || !wide)) return false;
  if (Bits(format) == kDepth10u)
    *unit = UnitOf<uint8_t>(white ? 0xFC : 0, code, code, code, false, 1);
  else if (IsV210(format))
    *unit = GroupV210(kStudioChroma8 * 4, studio * 4u);
  else if (Layout(format) == kLayout422 && yuv && AlphaKind(format) == kAlphaNone && wide)
    *unit = Pair422(format, 0.0f, unity);
  else if (Layout(format) == kLayout422 && yuv && AlphaKind(format) == kAlphaNone && Depth(format) == kDepth8u)
    *unit = Pair422(format, kStudioChroma8, studio);
  else if (Layout(format) != kLayout4444 || AlphaKind(format) == kAlphaNone)
    return false;
  else if (wide)
    *unit = FourChannels(format, 0.0f, unity, opaque ? 1.0f : 0.0f);
  else if (Depth(format) == kDepth8u)
    *unit = FourChannels<uint8_t>(format, kStudioChroma8, code, opaque ? 255 : 0);
  else if (Depth(format) == kDepth15u && !yuv)
    *unit = FourChannels<uint16_t>(format, 0, white ? 32768 : 0, opaque ? 32768 : 0);
  else
    return false;
  return true;
}

}  // namespace vexel
