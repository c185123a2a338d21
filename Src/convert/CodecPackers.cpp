// Repacks rows between the library's layouts and the ones that codecs read or write.
#include <algorithm>
#include <cmath>
#include <cstdlib>
#include <cstring>

#include "convert/PackerKernels.h"
#include "convert/StreamedRows.h"
#include "frame/FpModeGuard.h"
#include "vexel/vexel.h"

namespace vexel {
namespace {

template <class Function, class... Arguments>
void ConvertInPlace(Function convert, void* base, ptrdiff_t rowBytes, size_t count, int32_t height,
                    Arguments... arguments) {
  for (int32_t row = 0; row < height; ++row) convert(static_cast<uint8_t*>(base) + row * rowBytes, count, arguments...);
}

constexpr size_t AtLeast0(int32_t n) { return static_cast<size_t>(std::max(n, 0)); }

VX_Result ConvertPixels(const PackerKernels& kernels, const SourceRows& src, const DestinationRows& dst, int32_t width,
                        int32_t height) {
  const KernelVariant variant = ActiveKernelVariant();
  ConvertRows(src, dst, AtLeast0(width), height, kernels.stored[variant], kernels.streamed[variant]);
  return VX_Success;
}

VX_Result ScaleInPlace(const InPlaceKernelSet& kernels, void* base, int32_t rowBytes, int32_t width, int32_t height) {
  const FpModeGuard guard;  // the plain kernel scales in floats
  ConvertInPlace(kernels[ActiveKernelVariant()], base, rowBytes, 4 * AtLeast0(width), height);
  return VX_Success;
}

// Beyond these powers of two, nothing but zeros and saturated values is left.
constexpr int32_t kMaxScaleFactor = 252;

VX_Result NarrowSamples(const KernelVariants<NarrowKernel>& kernels, const float* src, void* dst, int32_t count,
                        int32_t scaleFactor) {
  const FpModeGuard guard;
  const int exponent = -std::clamp(scaleFactor, -kMaxScaleFactor, kMaxScaleFactor);
  const auto power = [](int n) { return static_cast<float>(std::ldexp(1.0, n)); };
  kernels[ActiveKernelVariant()](src, static_cast<uint8_t*>(dst), AtLeast0(count), power(exponent / 2),
                                 power(exponent - exponent / 2));
  return VX_Success;
}

}  // namespace
}  // namespace vexel

using namespace vexel;

VX_Result VX_Convert_15u_To_16u_InPlace(void* base, int32_t rowBytes, int32_t width, int32_t height) noexcept {
  return ScaleInPlace(kScale15To16, base, rowBytes, width, height);
}

VX_Result VX_Convert_15u_To_16u_BigEndian_InPlace(void* base, int32_t rowBytes, int32_t width,
                                                  int32_t height) noexcept {
  return ScaleInPlace(kScale15To16BigEndian, base, rowBytes, width, height);
}

VX_Result VX_Convert_Uint32_BigEndian_InPlace(void* base, int32_t rowBytes, int32_t, int32_t height) noexcept {
  const auto words = static_cast<size_t>(std::abs(int64_t{rowBytes}) / 4);
  ConvertInPlace(kSwapBytes32[ActiveKernelVariant()], base, rowBytes, words, height);
  return VX_Success;
}

VX_Result VX_ConvertUYVY_422_10uToV210_422_10u(const void* src, int32_t srcRowBytes, void* dst, int32_t dstRowBytes,
                                               int32_t width, int32_t height) noexcept {
  const KernelVariant variant = ActiveKernelVariant();
  const SourceRows from(src, srcRowBytes, kUyvy16GroupBytes);
  const DestinationRows to(dst, dstRowBytes, kV210GroupBytes);
  const size_t groups = AtLeast0(width) / kV210GroupPixels, rest = AtLeast0(width) % kV210GroupPixels;
  ConvertRows(from, to, groups, height, kUyvy10ToV210.stored[variant], kUyvy10ToV210.streamed[variant]);

  const auto neededBytes = static_cast<int64_t>((groups + 1) * kV210GroupBytes);
  if (rest == 0 || neededBytes > std::abs(int64_t{dstRowBytes})) return VX_Success;
  for (int32_t row = 0; row < height; ++row) {
    uint16_t group[] = {512, 64, 512, 64, 512, 64, 512, 64, 512, 64, 512, 64};
    std::memcpy(group, from.base + row * from.rowBytes + groups * kUyvy16GroupBytes, rest * 4);
    kUyvy10ToV210.stored[variant](reinterpret_cast<const uint8_t*>(group),
                                  to.base + row * to.rowBytes + groups * kV210GroupBytes, 1);
  }
  return VX_Success;
}

VX_Result VX_Convert_j2k_V210_To_10_Bits_Within_UYVY16u(const void* src, int32_t srcRowBytes, void* dst,
                                                        int32_t dstRowBytes, int32_t width, int32_t height) noexcept {
  const KernelVariant variant = ActiveKernelVariant();
  const SourceRows from(src, srcRowBytes, kV210GroupBytes);
  const DestinationRows to(dst, dstRowBytes, kUyvy16GroupBytes);
  const size_t groups = AtLeast0(width) / kV210GroupPixels, rest = AtLeast0(width) % kV210GroupPixels;
  ConvertRows(from, to, groups, height, kV210ToUyvy10.stored[variant], kV210ToUyvy10.streamed[variant]);

  if (rest == 0) return VX_Success;
  for (int32_t row = 0; row < height; ++row) {
    uint8_t group[kUyvy16GroupBytes];
    kV210ToUyvy10.stored[variant](from.base + row * from.rowBytes + groups * kV210GroupBytes, group, 1);
    std::memcpy(to.base + row * to.rowBytes + groups * kUyvy16GroupBytes, group, rest * 4);
  }
  return VX_Success;
}

VX_Result VX_Convert_RGB_444_10u_To_DNxHD16u(const void* src, int32_t srcRowBytes, void* dst, int32_t width,
                                             int32_t height) noexcept {
  // Not ConvertRows, which would stream whole pixels: each fourth sample stays as it is.
  const RowKernel convert = kRgb10ToDnxhd16[ActiveKernelVariant()];
  const size_t pixels = AtLeast0(width);
  for (int32_t row = 0; row < height; ++row)
    convert(static_cast<const uint8_t*>(src) + row * ptrdiff_t{srcRowBytes},
            static_cast<uint8_t*>(dst) + static_cast<size_t>(row) * pixels * 8, pixels);
  return VX_Success;
}

VX_Result VX_Convert_DNxHD16u_To_RGB_444_10u(const void* src, void* dst, int32_t dstRowBytes, int32_t width,
                                             int32_t height) noexcept {
  return ConvertPixels(kDnxhd16ToRgb10, {src, static_cast<ptrdiff_t>(AtLeast0(width)) * 8, 8}, {dst, dstRowBytes, 4},
                       width, height);
}

VX_Result VX_Convert_j2k_BGR16u_To_RGB_444_10u(const void* src, int32_t srcRowBytes, void* dst, int32_t dstRowBytes,
                                               int32_t width, int32_t height) noexcept {
  return ConvertPixels(kBgr16ToRgb10, {src, srcRowBytes, 6}, {dst, dstRowBytes, 4}, width, height);
}

VX_Result VX_Convert_j2k_RGB_444_10u_To_10_Bits_Within_BGR16u(const void* src, int32_t srcRowBytes, void* dst,
                                                              int32_t dstRowBytes, int32_t width,
                                                              int32_t height) noexcept {
  return ConvertPixels(kRgb10ToBgr10In16, {src, srcRowBytes, 4}, {dst, dstRowBytes, 6}, width, height);
}

VX_Result VX_ConvertRGB_444_8uToBGRA_4444_8u(const void* src, int32_t srcRowBytes, void* dst, int32_t dstRowBytes,
                                             int32_t width, int32_t height) noexcept {
  return ConvertPixels(kRgb8ToBgra8, {src, srcRowBytes, 3}, {dst, dstRowBytes, 4}, width, height);
}

VX_Result VX_ConvertRGB_444_16u_To_XRGB_4444_15u(const void* src, int32_t srcRowBytes, void* dst, int32_t dstRowBytes,
                                                 int32_t width, int32_t height) noexcept {
  return ConvertPixels(kRgb16ToXrgb15, {src, srcRowBytes, 6}, {dst, dstRowBytes, 8}, width, height);
}

VX_Result VX_Scale16uBufferTo15uSIMD(const uint16_t* src, uint16_t* dst, size_t count) noexcept {
  kScale16To15[ActiveKernelVariant()](reinterpret_cast<const uint8_t*>(src), reinterpret_cast<uint8_t*>(dst), count);
  return VX_Success;
}

VX_Result VX_Convert_32f16sSfs(const float* src, int16_t* dst, int32_t count, int32_t scaleFactor) noexcept {
  return NarrowSamples(kNarrowToInt16, src, dst, count, scaleFactor);
}

VX_Result VX_Convert_32f32sSfs(const float* src, int32_t* dst, int32_t count, int32_t scaleFactor) noexcept {
  return NarrowSamples(kNarrowToInt32, src, dst, count, scaleFactor);
}

VX_Result VX_Convert_j2k_UYVY_422_32f_Offset_In_Place(void* base, int32_t rowBytes, int32_t width, int32_t height,
                                                      float offset) noexcept {
  const FpModeGuard guard;
  ConvertInPlace(kOffsetChroma32f[ActiveKernelVariant()], base, rowBytes, (AtLeast0(width) + 1) / 2, height, offset);
  return VX_Success;
}

VX_Result VX_Convert_j2k_ZYXx_32f_To_BGRX_32f_In_Place(void* base, int32_t rowBytes, int32_t width,
                                                       int32_t height) noexcept {
  const FpModeGuard guard;
  ConvertInPlace(kZyxToBgr32f[ActiveKernelVariant()], base, rowBytes, AtLeast0(width), height);
  return VX_Success;
}

VX_Result VX_Convert_SGamut3_16u_To_SGamut3Cine_16u(void* base, int32_t rowBytes, int32_t width,
                                                    int32_t height) noexcept {
  const FpModeGuard guard;
  ConvertInPlace(kSGamut3ToSGamut3Cine[ActiveKernelVariant()], base, rowBytes, AtLeast0(width), height);
  return VX_Success;
}
