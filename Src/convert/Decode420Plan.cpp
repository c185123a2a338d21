// What a 4:2:0 source decodes to most cheaply for a destination.
#include "convert/Decode420.h"
#include "frame/Features.h"

namespace vexel {
namespace {

struct Size {
  int64_t width, height;
};

// All sizes in 64 bits: 4 w / 3 of a legal width need not fit in 32.
Size PlanSize(const Size& src, const Size& dst, int32_t quality) noexcept {
  if (AnamorphicRatio(src.width, src.height, dst.width, dst.height) != HorizontalRatio::None) return dst;
  if (dst.height == src.height / 2 && dst.width == src.width) return dst;
  if (dst.height > src.height / 2 || src.width % 2 != 0 || quality >= 3) return src;
  if (IsReduction(src.width, src.height, dst.width, dst.height)) return dst;
  return {dst.width <= src.width / 2 ? src.width / 2 : src.width, src.height / 2};
}

VX_PixelFormat PlanFormat(VX_PixelFormat src, VX_PixelFormat dst) noexcept {
  if (!IsVideoRange(src)) return VX_PixelFormat::BGRX_4444_8u;
  const bool isYuv8 = IsYuv(dst) && Depth(dst) == kDepth8u;
  return Colorimetry(isYuv8 ? dst : src) != 0 ? VX_PixelFormat::VUYX_4444_8u_709 : VX_PixelFormat::VUYX_4444_8u;
}

}  // namespace

HorizontalRatio AnamorphicRatio(int64_t srcWidth, int64_t srcHeight, int64_t dstWidth, int64_t dstHeight) noexcept {
  if (!gSwitches.sse2) return HorizontalRatio::None;
  if (dstHeight != srcHeight && dstHeight != srcHeight / 2) return HorizontalRatio::None;
  if (srcWidth % 96 == 0 && dstWidth == 4 * srcWidth / 3) return HorizontalRatio::FourThirds;
  if (srcWidth % 16 == 0 && dstWidth == 3 * srcWidth / 2) return HorizontalRatio::ThreeHalves;
  return HorizontalRatio::None;
}

bool IsReduction(int64_t srcWidth, int64_t srcHeight, int64_t dstWidth, int64_t dstHeight) noexcept {
  if (dstWidth < 1 || dstHeight < 1) return false;
  if (srcHeight < 1 || srcHeight % dstHeight != 0 || srcHeight / dstHeight % 2 != 0) return false;
  for (const int ratio : {1, 2, 4, 8})
    if (srcWidth == ratio * dstWidth) return true;
  return false;
}

DecodePlan PlanDecode420(VX_PixelFormat srcFormat, int32_t srcWidth, int32_t srcHeight, VX_PixelFormat dstFormat,
                         int32_t dstWidth, int32_t dstHeight, int32_t quality) noexcept {
  const Size size = PlanSize({srcWidth, srcHeight}, {dstWidth, dstHeight}, quality);
  return {PlanFormat(srcFormat, dstFormat), static_cast<int32_t>(size.width), static_cast<int32_t>(size.height)};
}

}  // namespace vexel
