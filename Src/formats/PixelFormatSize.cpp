// Sizes of rows and pictures.
#include "formats/FormatBits.h"
#include "frame/SeededBug.h"

namespace vexel {
namespace {

// Towards plus infinity, for negative values too.
template <int64_t kMultiple>
constexpr int64_t RoundUp(int64_t value) noexcept {
  static_assert((kMultiple & (kMultiple - 1)) == 0);
  return (value + kMultiple - 1) & ~(kMultiple - 1);
}

// Bytes of one pixel of a format that is not packed 4:2:2 and not V210.
constexpr int64_t BytesPerPixel(VX_PixelFormat format) noexcept {
  const bool fourChannels = Layout(format) == kLayout4444 && AlphaKind(format) != kAlphaNone;
  switch (Depth(format)) {
    case kDepth8u:
      return fourChannels ? 4 : 2;
    case kDepth10u:
      return IsYuv(format) ? 0 : 4;
    case kDepth15u:
      return 8;
    case kDepth32f:
      return fourChannels ? 16 : 8;
    default:
      return 0;
  }
}

constexpr int64_t BytesPerPixel422(VX_PixelFormat format) noexcept {
  switch (Depth(format)) {
    case kDepth8u:
      return 2;
    case kDepth10u:
      return IsYuv(format) ? 0 : 4;
    case kDepth15u:
    case kDepth32f:
      return 8;
    default:
      return 0;
  }
}

// Saturating: the extreme sizes of 10-bit biplanar pictures do not fit.
constexpr int64_t Product(int64_t a, int64_t b) noexcept {
  int64_t product = 0;
  if (!__builtin_mul_overflow(a, b, &product)) return product;
  return (a < 0) == (b < 0) ? INT64_MAX : INT64_MIN;
}

constexpr int64_t SpecialFrameSize(VX_PixelFormat format, int64_t width, int64_t height) noexcept {
  switch (FrameKind(format)) {
    case 1:
      return 120000;
    case 2:
      return 144000;
    case 3:
    case 7:
      return 240000;
    case 4:
    case 8:
      return 288000;
    case 5:
      return 480000;
    case 6:
      return 576000;
    case 9:
    case 10:
    case 11:
    case 12:
      return (RoundUp<128>(width) + RoundUp<128>(width / 2)) * RoundUp<32>(height);
    case 13:
    case 14:
      return Product(RoundUp<128>(width) * (Depth(format) == kDepth10u ? 2 : 1), height + (height + 1) / 2);
    default:
      return 0;
  }
}

}  // namespace

int64_t UnpaddedRowBytes(VX_PixelFormat format, int64_t width) noexcept {
  if (Layout(format) == kLayout4444) return width * BytesPerPixel(format);
  switch (Depth(format)) {
    case kDepth8u:
      return (width + 1) / 2 * 4;
    case kDepth10u:
      return (width + 5) / 6 * 16;
    default:
      return (width + 1) / 2 * 16;
  }
}

int64_t PaddedRowBytes(VX_PixelFormat format, int64_t width) noexcept {
  if (IsSpecial(format)) return 0;
  if (IsV210(format)) return RoundUp<128>((width + (Has(SeededBug::GroupsRoundDown) ? 0 : 5)) / 6 * 16);
  if (Layout(format) == kLayout422) return RoundUp<16>(width * BytesPerPixel422(format));
  return RoundUp<64>(width * BytesPerPixel(format));
}

}  // namespace vexel

extern "C" int64_t VX_PixelFormatSize(VX_PixelFormat format, int32_t width, int32_t height) noexcept {
  if (vexel::IsSpecial(format)) return vexel::SpecialFrameSize(format, width, height);
  const auto rowBytes = static_cast<uint32_t>(vexel::PaddedRowBytes(format, width));
  return static_cast<int32_t>(rowBytes * static_cast<uint32_t>(height));
}
