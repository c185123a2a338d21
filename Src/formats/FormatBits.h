// The bit fields of a VX_PixelFormat.
#pragma once

#include <cstdint>

#include "vexel/vexel.h"

namespace vexel {

constexpr uint32_t Bits(VX_PixelFormat format) noexcept { return static_cast<uint32_t>(format); }
constexpr VX_PixelFormat FromBits(uint32_t bits) noexcept { return static_cast<VX_PixelFormat>(bits); }

inline constexpr uint32_t kYuvBit = 0x1, kLinearBit = 0x2, kVideoRangeBit = 0x800, kReversedBit = 0x1000;
inline constexpr uint32_t kAlphaMask = 0xC, kAlphaNone = 0x0, kAlphaStraight = 0x4, kAlphaPremultiplied = 0x8,
                          kAlphaIgnored = 0xC;
inline constexpr uint32_t kLayoutMask = 0x30, kLayout4444 = 0x00, kLayout422 = 0x10, kLayoutDv = 0x20,
                          kLayout420 = 0x30;
inline constexpr uint32_t kDepthMask = 0x1C0, kDepth8u = 0x0, kDepth10u = 0x40, kDepth15u = 0x80, kDepth32f = 0x100;
inline constexpr uint32_t kColorimetryMask = 0x600, kColorimetry709 = 0x200, kColorimetry2020 = 0x400,
                          kColorimetry2020Hdr = 0x600;

constexpr bool IsYuv(VX_PixelFormat f) noexcept { return (Bits(f) & kYuvBit) != 0; }
constexpr bool IsLinear(VX_PixelFormat f) noexcept { return (Bits(f) & kLinearBit) != 0; }
constexpr uint32_t AlphaKind(VX_PixelFormat f) noexcept { return Bits(f) & kAlphaMask; }
// That counts: straight or premultiplied.
constexpr bool HasAlpha(VX_PixelFormat f) noexcept {
  return AlphaKind(f) == kAlphaStraight || AlphaKind(f) == kAlphaPremultiplied;
}
constexpr uint32_t Layout(VX_PixelFormat f) noexcept { return Bits(f) & kLayoutMask; }
constexpr uint32_t Depth(VX_PixelFormat f) noexcept { return Bits(f) & kDepthMask; }
constexpr uint32_t Colorimetry(VX_PixelFormat f) noexcept { return Bits(f) & kColorimetryMask; }
constexpr uint32_t FrameKind(VX_PixelFormat f) noexcept { return Bits(f) >> 24; }
constexpr bool IsSpecial(VX_PixelFormat f) noexcept { return FrameKind(f) != 0; }
constexpr bool IsVideoRange(VX_PixelFormat f) noexcept { return (Bits(f) & kVideoRangeBit) != 0; }
constexpr bool IsReversed(VX_PixelFormat f) noexcept { return (Bits(f) & kReversedBit) != 0; }
constexpr bool IsV210(VX_PixelFormat f) noexcept { return (Bits(f) & ~kColorimetry709) == 0x851; }
constexpr bool Is420(VX_PixelFormat f) noexcept {
  return IsYuv(f) && Layout(f) == kLayout420 && FrameKind(f) >= 9 && FrameKind(f) <= 14;
}
constexpr bool IsBiplanar(VX_PixelFormat f) noexcept { return FrameKind(f) == 13 || FrameKind(f) == 14; }

// The bytes that `width` pixels occupy in a row, without padding; a packed 4:2:2 or V210 row holds whole groups. In 64
// bits: no width overflows. Negative widths follow the formulas.
int64_t UnpaddedRowBytes(VX_PixelFormat format, int64_t width) noexcept;

// The row bytes of a library-allocated raster (64-bit, unwrapped); 0 for special formats.
int64_t PaddedRowBytes(VX_PixelFormat format, int64_t width) noexcept;

}  // namespace vexel
