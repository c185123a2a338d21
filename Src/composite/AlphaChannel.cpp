// Setting and inverting the alpha of a whole picture.
#include <algorithm>
#include <cmath>
#include <cstring>

#include "composite/AlphaUtilityKernels.h"
#include "composite/RowJob.h"
#include "convert/PlainPixels.h"
#include "formats/FormatBits.h"
#include "frame/FpModeGuard.h"
#include "frame/ImagePrimitives.h"
#include "vexel/compositing.h"

namespace vexel {
namespace {

bool HasAlphaChannel(VX_PixelFormat format) noexcept {
  return !IsSpecial(format) && Layout(format) == kLayout4444 && AlphaKind(format) != kAlphaNone;
}

template <class T>
VX_Result SetChannel(int channel, bool opaque, void* base, int32_t rowBytes, uint32_t width, uint32_t height) noexcept {
  if (width == 0 || height == 0) return VX_Success;
  if (width > INT32_MAX / (4 * sizeof(T)) || height > INT32_MAX) return VX_ErrFailed;
  const auto status = primitives::SetChannel(channel, opaque ? kFullScale<T> : T{0}, static_cast<T*>(base), rowBytes,
                                             static_cast<int>(width), static_cast<int>(height));
  return status == primitives::Status::Ok ? VX_Success : VX_ErrFailed;
}

// A whole number of 0..most; NaN gives 0. In double precision the product is exact.
template <class T>
T AlphaCode(float alpha) noexcept {
  const double scaled = double{alpha} * kFullScale<T>;
  return static_cast<T>(scaled > 0 ? std::nearbyint(std::min(scaled, double{kFullScale<T>})) : 0);
}

// One pixel whose channel `index` is `value`, over 16 bytes.
template <class T>
PixelPattern ChannelPattern(size_t index, T value) noexcept {
  PixelPattern pattern = {};
  for (size_t at = index * sizeof(T); at < sizeof pattern; at += 4 * sizeof(T))
    std::memcpy(pattern.bytes + at, &value, sizeof(T));
  return pattern;
}

PixelPattern AlphaPattern(int depthClass, size_t index, float alpha) noexcept {
  return depthClass == 0   ? ChannelPattern(index, AlphaCode<uint8_t>(alpha))
         : depthClass == 1 ? ChannelPattern(index, AlphaCode<uint16_t>(alpha))
                           : ChannelPattern(index, alpha);
}
PixelPattern AlphaMask(int depthClass, size_t index) noexcept {
  return depthClass == 0   ? ChannelPattern(index, uint8_t{0xFF})
         : depthClass == 1 ? ChannelPattern(index, uint16_t{0xFFFF})
                           : ChannelPattern(index, ~uint32_t{0});
}

}  // namespace
}  // namespace vexel

using namespace vexel;

VX_Result VX_SetAlphaChannel(uint32_t width, uint32_t height, void* base, int32_t rowBytes, VX_PixelFormat format,
                             bool opaque) noexcept {
  using F = VX_PixelFormat;
  switch (format) {
    case F::BGRA_4444_8u:
    case F::VUYA_4444_8u:
      return SetChannel<uint8_t>(3, opaque, base, rowBytes, width, height);
    case F::BGRA_4444_15u:
      return SetChannel<uint16_t>(3, opaque, base, rowBytes, width, height);
    case F::BGRA_4444_32f:
    case F::BGRA_4444_32f_Linear:
    case F::VUYA_4444_32f:
      return SetChannel<float>(3, opaque, base, rowBytes, width, height);
    case F::ARGB_4444_32f:
    case F::ARGB_4444_32f_Linear:
      return SetChannel<float>(0, opaque, base, rowBytes, width, height);
    default:
      return VX_ErrFormatNotHandled;
  }
}

VX_Result VX_InvertAlpha(const void* src, int32_t srcRowBytes, void* dst, int32_t dstRowBytes, VX_PixelFormat format,
                         int32_t width, int32_t height) noexcept {
  const FpModeGuard fpMode;
  const int depthClass = DepthClass(format);
  if (!HasAlphaChannel(format) || depthClass < 0) return VX_ErrUnsupportedFormat;
  RowJob job(width, height, 0);
  job.AddSource({src, srcRowBytes, format}, format);
  job.AddSource({dst, dstRowBytes, format}, format);  // its colours stay
  job.SetTarget({dst, dstRowBytes, format}, format);
  bool done;
  const VX_Result check = job.CheckBuffers(&done);
  if (check == VX_ErrNullSource && src) return VX_ErrNullDestination;
  if (check != VX_Success || done) return check;
  const MergeKernel invert = kInvertAlpha[depthClass][IsReversed(format)][job.Variant()];
  return job.Run([=](const RowSpan& span) { invert(span.src[0], span.src[1], span.dst, span.count); });
}

VX_Result VX_CopyAndSetAlpha(const void* src, int32_t srcRowBytes, void* dst, int32_t dstRowBytes,
                             VX_PixelFormat format, int32_t width, int32_t height, float alpha) noexcept {
  const int depthClass = DepthClass(format);
  if (!HasAlphaChannel(format) || depthClass < 0) return VX_ErrFormatNotHandled;
  const auto wholeWords = [](int32_t rowBytes) { return rowBytes / 4 * 4; };
  RowJob job(width, height, 0);
  job.AddSource({src, wholeWords(srcRowBytes), format}, format);
  job.SetTarget({dst, wholeWords(dstRowBytes), format}, format);
  bool done;
  const VX_Result check = job.CheckBuffers(&done);
  if (check != VX_Success || done) return check;

  const FpModeGuard fpMode;
  const size_t index = IsReversed(format) ? 0 : 3, pixelBytes = size_t{4} << depthClass;
  const PixelPattern value = AlphaPattern(depthClass, index, alpha), mask = AlphaMask(depthClass, index);
  const ReplaceKernel replace = kReplaceBits[job.Variant()];
  return job.Run([&](const RowSpan& span) { replace(span.src[0], span.dst, span.count * pixelBytes, value, mask); });
}
