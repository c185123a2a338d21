// VX_Convert: special sources and destinations by way of their planners, orientation, and the chain over all rows.
#include <algorithm>
#include <cstddef>

#include "convert/Planar420.h"
#include "convert/RowConverter.h"
#include "formats/FormatBits.h"
#include "frame/FpModeGuard.h"
#include "frame/Scratch.h"
#include "frame/StreamCopy.h"
#include "vexel/vexel.h"

namespace vexel {
namespace {

struct ConstBuffer {
  const uint8_t* base;
  ptrdiff_t rowBytes;
  VX_PixelFormat format;
};
struct Buffer {
  uint8_t* base;
  ptrdiff_t rowBytes;
  VX_PixelFormat format;
};

// Bottom picture row first, walking up.
template <class B>
B BottomUp(B buffer, int32_t height) noexcept {
  if (!VX_IsOriginTopLeft(buffer.format)) return buffer;
  buffer.base += static_cast<ptrdiff_t>(height - 1) * buffer.rowBytes;
  buffer.rowBytes = -buffer.rowBytes;
  return buffer;
}

// Whether reading the source would push the destination out of the cache before anyone looks at it.
bool GoesPastCache(VX_PixelFormat src, VX_PixelFormat dst, int32_t width, int32_t height) noexcept {
  const uint32_t cache = VX_GetCacheSize();
  const int64_t rowBytes = UnpaddedRowBytes(src, width) + UnpaddedRowBytes(dst, width);
  return cache != 0 && rowBytes * height >= static_cast<int64_t>(cache / 2);
}

// Whether the row bytes of a buffer can express a row.
bool RowFits(VX_PixelFormat format, int32_t width) noexcept {
  return width >= 0 && UnpaddedRowBytes(format, width) <= INT32_MAX;
}

// What is asked once the way is known: that there are rows, that their bytes can be expressed, that both buffers are
// there. Success with *done set means that nothing is to be done.
VX_Result CheckBuffers(const ConstBuffer& src, VX_PixelFormat srcRaster, const Buffer& dst, VX_PixelFormat dstRaster,
                       int32_t width, int32_t height, bool* done) noexcept {
  *done = height < 1 || width == 0;
  if (*done) return VX_Success;
  if (!RowFits(srcRaster, width) || !RowFits(dstRaster, width)) return VX_ErrArgumentOutOfRange;
  if (!src.base) return VX_ErrNullSource;
  return dst.base ? VX_Success : VX_ErrNullDestination;
}

VX_Result RunChain(const ConstBuffer& src, const Buffer& dst, int32_t width, int32_t height,
                   int32_t renderQuality) noexcept {
  RowConverter converter;
  if (const VX_Result result = converter.Prepare(src.format, dst.format, renderQuality, width)) return result;
  bool done;
  const VX_Result check = CheckBuffers(src, src.format, dst, dst.format, width, height, &done);
  if (check != VX_Success || done) return check;
  const bool stream = GoesPastCache(src.format, dst.format, width, height);
  if (stream) converter.StreamOutput();
  VX_SCRATCH(scratch, converter.ScratchBytes());
  if (!scratch && converter.ScratchBytes() != 0) return VX_ErrOutOfMemory;
  converter.UseScratch(scratch.get());

  const ConstBuffer from = BottomUp(src, height);
  const Buffer to = BottomUp(dst, height);
  // The source in order of its addresses: processors fetch ahead upward, and a large source read downward takes three
  // times as long.
  const int32_t first = from.rowBytes < 0 ? height - 1 : 0, step = from.rowBytes < 0 ? -1 : 1;
  for (int32_t i = 0, row = first; i < height; ++i, row += step)
    converter.Convert(from.base + row * from.rowBytes, to.base + row * to.rowBytes);
  if (stream) StreamFence();
  return VX_Success;
}

// What a decoder would deliver for a DV source asked for width x height.
struct DecodeTarget {
  int32_t width, height;
  bool known;
};

DecodeTarget PlanDvDecode(VX_PixelFormat src, int32_t width, int32_t height, int32_t renderQuality) noexcept {
  struct NativeSize {
    int32_t width, height;
  };
  static constexpr NativeSize kNative[] = {{0, 0},       {720, 480},   {720, 576}, {960, 720}, {960, 720},
                                           {1280, 1080}, {1440, 1080}, {720, 480}, {720, 576}};
  const uint32_t kind = FrameKind(src);
  if (kind == 0 || kind >= sizeof kNative / sizeof kNative[0]) return {0, 0, false};
  const NativeSize native = kNative[kind];
  const bool reduced = (width <= native.width / 2 && height <= native.height) ||
                       (renderQuality < 3 && width < native.width && height < native.height);
  return reduced ? DecodeTarget{width, height, true} : DecodeTarget{native.width, native.height, true};
}

// The raster format that the encoder of a special destination takes; false if there is no encoder for it.
bool PlanEncode(VX_PixelFormat src, VX_PixelFormat dst, VX_PixelFormat* input) noexcept {
  using F = VX_PixelFormat;
  const uint32_t kind = FrameKind(dst);
  if (kind == 1 || kind == 2) {
    const bool hasAlphaKind = Layout(src) == kLayout4444 && AlphaKind(src) != kAlphaNone;
    *input = !IsYuv(src)       ? F::BGRA_4444_8u
             : hasAlphaKind    ? F::VUYA_4444_8u
             : IsReversed(src) ? F::YUYV_422_8u
                               : F::UYVY_422_8u;
    return true;
  }
  if (kind == 7 || kind == 8) return *input = F::YUYV_422_8u, true;
  if (kind >= 3 && kind <= 6) return *input = F::YUYV_422_8u_709, true;
  if (kind < 9 || kind > 12) return false;
  if (!IsVideoRange(dst)) return *input = F::BGRX_4444_8u, true;
  if (Colorimetry(dst) != kColorimetry709 || IsSpecial(src)) return false;
  return *input = src, true;
}

// Only planar 4:2:0 has an encoder; DV goes through a module that is not there.
bool HasEncoder(VX_PixelFormat src, VX_PixelFormat dst, VX_PixelFormat* input) noexcept {
  return CanEncode420(dst) && PlanEncode(src, dst, input);
}

// What the encoder takes is reached at the render quality; what it makes of that itself, at its own.
int32_t EncodeQuality(VX_PixelFormat src, VX_PixelFormat input, int32_t renderQuality) noexcept {
  return src == input ? kEncodeQuality : renderQuality;
}

// The block of a planar picture above 8 bits has no defined size, so only its planes can be decoded.
bool CanDecodeBlock(VX_PixelFormat format) noexcept {
  return CanDecode420(format) && (!HasWideSamples(format) || IsBiplanar(format));
}

// From one 4:2:0 format to another, or to itself.
VX_Result RecodePicture(const ConstBuffer& src, VX_PixelFormat decoded, VX_PixelFormat input, const Buffer& dst,
                        int32_t width, int32_t height, int32_t renderQuality) noexcept {
  return Recode420(src.base, src.format, decoded, renderQuality, dst.base, dst.format, width, height,
                   EncodeQuality(decoded, input, renderQuality));
}

VX_Result ConvertToSpecial(const ConstBuffer& src, const Buffer& dst, int32_t width, int32_t height,
                           int32_t renderQuality) noexcept {
  VX_PixelFormat input;
  if (!HasEncoder(src.format, dst.format, &input)) return VX_ErrFormatNotHandled;
  Plan chain;
  const VX_PixelFormat raster = IsSpecial(src.format) ? input : src.format;
  if (const VX_Result result = MakePlan(raster, input, renderQuality, &chain)) return result;
  bool done;
  const VX_Result check = CheckBuffers(src, raster, dst, VX_PixelFormat::BGRX_4444_8u, width, height, &done);
  if (check != VX_Success || done) return check;

  if (IsSpecial(src.format)) return RecodePicture(src, input, input, dst, width, height, renderQuality);
  return Encode420(src.base, static_cast<int32_t>(src.rowBytes), src.format, dst.base, dst.format, width, height,
                   EncodeQuality(src.format, input, renderQuality));
}

VX_Result ConvertRasters(const ConstBuffer& src, const Buffer& dst, int32_t width, int32_t height,
                         int32_t renderQuality) noexcept {
  if (IsSpecial(dst.format)) return ConvertToSpecial(src, dst, width, height, renderQuality);
  return RunChain(src, dst, width, height, renderQuality);
}

// From a 4:2:0 source by way of the planned intermediate.
VX_Result ConvertFrom420(const ConstBuffer& src, const Buffer& dst, int32_t width, int32_t height,
                         int32_t renderQuality) noexcept {
  const DecodePlan plan = PlanDecode420(src.format, width, height, dst.format, width, height, renderQuality);
  if (width >= 1 && height >= 1 && (plan.width != width || plan.height != height)) return VX_ErrUnsupportedConversion;
  // Refuse what cannot be reached before anything is decoded.
  Plan chain;
  VX_PixelFormat raster = dst.format;
  if (IsSpecial(dst.format) && !HasEncoder(plan.format, dst.format, &raster)) return VX_ErrFormatNotHandled;
  if (const VX_Result result = MakePlan(plan.format, raster, renderQuality, &chain)) return result;
  bool done;
  const VX_Result check = CheckBuffers(src, plan.format, dst, raster, width, height, &done);
  if (check != VX_Success || done) return check;

  if (IsSpecial(dst.format)) return RecodePicture(src, plan.format, raster, dst, width, height, renderQuality);
  return Decode420Through(plan.format, src.base, src.format, width, height, dst.base,
                          static_cast<int32_t>(dst.rowBytes), dst.format, renderQuality);
}

VX_Result ConvertFromSpecial(const ConstBuffer& src, const Buffer& dst, int32_t width, int32_t height,
                             int32_t renderQuality) noexcept {
  if (CanDecodeBlock(src.format)) return ConvertFrom420(src, dst, width, height, renderQuality);
  const DecodeTarget target = PlanDvDecode(src.format, width, height, renderQuality);
  if (!target.known) return VX_ErrUnsupportedFormat;
  if (target.width != width || target.height != height) return VX_ErrUnsupportedConversion;
  return VX_ErrUnsupportedFormat;  // no DV decoder is there
}

// The rasters that a way begins and ends with: the ends themselves, or what a picture is decoded to and encoded from.
VX_Result FindRasters(VX_PixelFormat src, VX_PixelFormat dst, int32_t renderQuality, VX_PixelFormat* from,
                      VX_PixelFormat* to) noexcept {
  *from = src;
  *to = dst;
  if (src != dst && IsSpecial(src)) {
    if (!CanDecodeBlock(src)) return VX_ErrUnsupportedFormat;
    *from = PlanDecode420(src, 2, 2, dst, 2, 2, renderQuality).format;  // the same for every size
  }
  if (!IsSpecial(dst)) return VX_Success;
  if (!HasEncoder(*from, dst, to)) return VX_ErrFormatNotHandled;
  if (IsSpecial(*from)) *from = *to;
  return VX_Success;
}

}  // namespace
}  // namespace vexel

using namespace vexel;

VX_Result VX_Convert(const void* src, int32_t srcRowBytes, VX_PixelFormat srcFormat, void* dst, int32_t dstRowBytes,
                     VX_PixelFormat dstFormat, int32_t width, int32_t height, int32_t renderQuality) noexcept {
  const FpModeGuard fpMode;
  const ConstBuffer from{static_cast<const uint8_t*>(src), srcRowBytes, srcFormat};
  const Buffer to{static_cast<uint8_t*>(dst), dstRowBytes, dstFormat};
  if (srcFormat != dstFormat && IsSpecial(srcFormat)) return ConvertFromSpecial(from, to, width, height, renderQuality);
  return ConvertRasters(from, to, width, height, renderQuality);
}

VX_Result VX_ExplainConversion(VX_PixelFormat srcFormat, VX_PixelFormat dstFormat, int32_t renderQuality,
                               VX_PixelFormat formats[9], int32_t* count) noexcept {
  VX_PixelFormat from, to;
  if (const VX_Result result = FindRasters(srcFormat, dstFormat, renderQuality, &from, &to)) return result;
  Plan plan;
  if (const VX_Result result = MakePlan(from, to, renderQuality, &plan)) return result;

  VX_PixelFormat chain[kMaxSteps + 3];
  int32_t length = 0;
  chain[length++] = srcFormat;
  if (from != srcFormat) chain[length++] = from;
  if (from != to || (from == srcFormat && to == dstFormat))
    for (int i = 0; i < plan.stepCount; ++i) chain[length++] = plan.steps[i].to;
  if (to != dstFormat) chain[length++] = dstFormat;
  if (length > 9) return VX_ErrFailed;
  std::copy_n(chain, length, formats);
  *count = length;
  return VX_Success;
}
