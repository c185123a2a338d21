// Decoding of whole 4:2:0 pictures into rasters.
#include "convert/Decode420.h"

#include <algorithm>
#include <sstream>

#include "convert/RowConverter.h"
#include "frame/FpModeGuard.h"
#include "frame/Scratch.h"
#include "frame/StreamCopy.h"
#include "frame/Trace.h"
#include "vexel/host_types.h"

namespace vexel {
namespace {

// A raster by its top line.
struct TopDown {
  uint8_t* top;
  ptrdiff_t rowBytes;
  int32_t width, height;
  VX_PixelFormat format;
};

// Pixels decoded at a time on the way past the cache: with the samples they are made of they stay in the first level.
constexpr int32_t kStreamPixels = 1024;
static_assert(kStreamPixels % 2 == 0);

// Whether reading the source would push the destination, if it is not small, out of the cache before anyone looks at
// it.
bool GoesPastCache(const Picture420& src, const TopDown& dst) noexcept {
  const uint32_t cache = VX_GetCacheSize();
  const int64_t srcBytes = int64_t{src.width} * src.height / 2 * (HasWideSamples(src.format) ? 6 : 3);
  const int64_t dstBytes = UnpaddedRowBytes(dst.format, dst.width) * dst.height;
  return cache != 0 && dstBytes >= int64_t{cache / 8} && srcBytes + dstBytes >= int64_t{cache / 2};
}

// What the decoder makes for a destination: its own format if it can, else one on the way that loses least. 8-bit RGB
// is best made in one step; anything else takes the format that the plan names, which keeps whiter than white.
VX_PixelFormat WorkingFormat(VX_PixelFormat src, VX_PixelFormat dst) noexcept {
  if (Rows420::CanMake(dst)) return dst;
  if (!IsYuv(dst) && Layout(dst) == kLayout4444 && Depth(dst) == kDepth8u) return VX_PixelFormat::BGRX_4444_8u;
  return PlanDecode420(src, 0, 0, dst, 0, 0, 0).format;
}

// Whether a plan goes on from its first step as a conversion from there would.
bool BeginsWithStep(const Plan& plan, VX_PixelFormat to, int32_t quality) noexcept {
  if (plan.steps[0].to == to) return true;
  Plan rest;
  if (MakePlan(plan.steps[0].to, to, quality, &rest) != VX_Success || rest.stepCount != plan.stepCount - 1)
    return false;
  const auto isSame = [](const PlannedStep& a, const PlannedStep& b) { return a.kernel == b.kernel; };
  return std::equal(rest.steps.begin(), rest.steps.begin() + rest.stepCount, plan.steps.begin() + 1, isSame);
}

VX_Result CheckPlanes(const Picture420& src, const void* dst) noexcept {
  for (int i = 0; i < (IsBiplanar(src.format) ? 2 : 3); ++i)
    if (!src.planes[i]) return VX_ErrNullSource;
  return dst ? VX_Success : VX_ErrNullDestination;
}

// Rows straight into the destination's memory, or past the cache: by way of staging where their places in memory do not
// suit the kernels.
void WriteRows(Rows420& rows, const TopDown& dst, uint8_t* staging) noexcept {
  const bool aligned = ((reinterpret_cast<uintptr_t>(dst.top) | static_cast<uintptr_t>(dst.rowBytes)) & 63) == 0;
  const KernelVariant variant = ActiveKernelVariant();
  const int64_t pairBytes = UnpaddedRowBytes(dst.format, 2);
  for (int32_t y = 0; y < dst.height; ++y) {
    uint8_t* const row = dst.top + y * dst.rowBytes;
    rows.BeginRow(y);
    if (!staging || aligned) {
      rows.Pixels(0, dst.width, row, staging != nullptr);
      continue;
    }
    for (int32_t x = 0; x < dst.width; x += kStreamPixels) {
      const int32_t count = std::min(kStreamPixels, dst.width - x);
      rows.Pixels(x, count, staging);
      StreamCopy(row + x / 2 * pairBytes, staging, static_cast<size_t>(UnpaddedRowBytes(dst.format, count)), variant);
    }
  }
}

void ConvertRows(Rows420& rows, const TopDown& dst, const RowConverter& converter, uint8_t* decoded) noexcept {
  for (int32_t y = 0; y < dst.height; ++y) {
    rows.BeginRow(y);
    rows.Pixels(0, dst.width, decoded);
    converter.Convert(decoded, dst.top + y * dst.rowBytes);
  }
}

// By way of `working`, of which the decoder makes four channels.
VX_Result Decode(const Picture420& src, const TopDown& dst, VX_PixelFormat working, int32_t field,
                 int32_t quality) noexcept {
  if (!CanDecode420(src.format)) return VX_ErrUnsupportedFormat;
  if (IsSpecial(dst.format)) return VX_ErrUnsupportedDestinationFormat;
  Rows420 rows;
  if (const VX_Result result = rows.Prepare(src, working, dst.width, dst.height, field, quality)) return result;
  Plan plan;
  if (working != dst.format && MakePlan(working, dst.format, quality, &plan) == VX_Success &&
      BeginsWithStep(plan, dst.format, quality) && rows.TakeStep(plan.steps[0]))
    working = plan.steps[0].to;
  RowConverter converter;
  const bool converts = working != dst.format;
  if (converts)
    if (const VX_Result result = converter.Prepare(working, dst.format, quality, dst.width)) return result;
  if (dst.width < 1 || dst.height < 1) return VX_Success;
  if (const VX_Result result = CheckPlanes(src, dst.top)) return result;

  const bool streams = GoesPastCache(src, dst);
  if (streams && converts) converter.StreamOutput();
  const size_t rowsBytes = ScratchRounded(rows.ScratchBytes());
  const size_t converterBytes = converts ? ScratchRounded(converter.ScratchBytes()) : 0;
  const size_t pixels = converts ? static_cast<size_t>(dst.width) : streams ? kStreamPixels : 0;
  VX_SCRATCH(scratch, rowsBytes + converterBytes + pixels * 4);
  if (!scratch) return VX_ErrOutOfMemory;
  rows.UseScratch(scratch.get());
  uint8_t* const decoded = scratch.get() + rowsBytes + converterBytes;

  if (dst.width == src.width && dst.height == src.height) TraceFullSize420(src);
  if (converts) {
    converter.UseScratch(scratch.get() + rowsBytes);
    ConvertRows(rows, dst, converter, decoded);
  } else {
    WriteRows(rows, dst, streams ? decoded : nullptr);
  }
  if (streams) StreamFence();
  return VX_Success;
}

TopDown Raster(void* base, int32_t rowBytes, int32_t width, int32_t height, VX_PixelFormat format) noexcept {
  TopDown raster{static_cast<uint8_t*>(base), rowBytes, width, height, format};
  if (base && VX_IsOriginBottomLeft(format)) {
    raster.top += (ptrdiff_t{height} - 1) * rowBytes;
    raster.rowBytes = -raster.rowBytes;
  }
  return raster;
}

}  // namespace

bool CanDecode420(VX_PixelFormat format) noexcept {
  return Is420(format) && (Depth(format) == kDepth8u || Depth(format) == kDepth10u);
}

void TraceFullSize420(const Picture420& src) noexcept try {
  static TraceSite site("Vexel", 5);
  if (!site.Enabled()) return;
  constexpr const char* kFunction = "<unnamed>::ConvertFromYUV_420_8u_full";
  std::ostringstream text;
  text << kFunction << ": inSrcWidth =" << src.width << ", inSrcHeight =" << src.height
       << ", inSrcRowBytes[3]:" << src.rowBytes[0] << " " << src.rowBytes[1] << " " << src.rowBytes[2];
  site.Line(text.str());
  // The rows are made with 8 bits: what a deeper destination could hold of the rest is dropped.
  if (HasWideSamples(src.format)) site.Line(std::string(kFunction) + ": TODO for BiPlanar 10u");
} catch (...) {
  // no memory for the text
}

VX_Result Decode420(const void* src, VX_PixelFormat srcFormat, int32_t srcWidth, int32_t srcHeight, void* dst,
                    int32_t dstRowBytes, int32_t dstWidth, int32_t dstHeight, VX_PixelFormat dstFormat, int32_t field,
                    int32_t quality) noexcept {
  if (!src && Is420(srcFormat) && !IsSpecial(dstFormat)) return VX_ErrNullSource;
  return Decode(PictureFromBlock(src, srcFormat, srcWidth, srcHeight),
                Raster(dst, dstRowBytes, dstWidth, dstHeight, dstFormat), WorkingFormat(srcFormat, dstFormat), field,
                quality);
}

VX_Result Decode420(const void* src, VX_PixelFormat srcFormat, int32_t width, int32_t height, void* dst,
                    int32_t dstRowBytes, VX_PixelFormat dstFormat, int32_t quality) noexcept {
  return Decode420(src, srcFormat, width, height, dst, dstRowBytes, width, height, dstFormat, 0, quality);
}

VX_Result Decode420Through(VX_PixelFormat decoded, const void* src, VX_PixelFormat srcFormat, int32_t width,
                           int32_t height, void* dst, int32_t dstRowBytes, VX_PixelFormat dstFormat,
                           int32_t quality) noexcept {
  if (!src) return VX_ErrNullSource;
  return Decode(PictureFromBlock(src, srcFormat, width, height), Raster(dst, dstRowBytes, width, height, dstFormat),
                decoded, 0, quality);
}

}  // namespace vexel

VX_Result VX::DecompressYUV_420_8u(const void* const* srcPlanes, const int32_t* srcRowBytes, int32_t srcWidth,
                                   int32_t srcHeight, VX_PixelFormat srcFormat, void* dst, int32_t dstRowBytes,
                                   int32_t dstWidth, int32_t dstHeight, VX_PixelFormat dstFormat,
                                   zovmediatypes::FieldType field, zovmediatypes::RenderQuality quality) noexcept {
  using namespace vexel;
  const FpModeGuard fpMode;
  Picture420 picture{{}, {}, srcWidth, srcHeight, srcFormat};
  const int planes = !Is420(srcFormat) ? 0 : IsBiplanar(srcFormat) ? 2 : 3;
  if (srcPlanes && srcRowBytes)
    for (int i = 0; i < planes; ++i) {
      picture.planes[i] = static_cast<const uint8_t*>(srcPlanes[i]);
      picture.rowBytes[i] = srcRowBytes[i];
    }
  return Decode(picture, {static_cast<uint8_t*>(dst), dstRowBytes, dstWidth, dstHeight, dstFormat},
                WorkingFormat(srcFormat, dstFormat), static_cast<int32_t>(field), static_cast<int32_t>(quality));
}
