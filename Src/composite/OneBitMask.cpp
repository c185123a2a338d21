// Choosing between two pictures, pixel by pixel, by a mask of bits.
#include <algorithm>
#include <cstring>

#include "composite/AlphaUtilityKernels.h"
#include "composite/RowJob.h"
#include "formats/FormatBits.h"
#include "frame/FpModeGuard.h"
#include "vexel/compositing.h"

namespace vexel {
namespace {

constexpr size_t kWordPixels = 32;
constexpr size_t kPixelsAtOnce = kChainBlock;
static_assert(kPixelsAtOnce % kWordPixels == 0);

// The kernel for pixels that have an address each; null for other formats.
const SelectKernels* KernelFor(VX_PixelFormat format) noexcept {
  const bool addressed = !IsSpecial(format) && Layout(format) == kLayout4444 &&
                         (AlphaKind(format) != kAlphaNone || Depth(format) == kDepth10u);
  switch (addressed ? UnpaddedRowBytes(format, 1) : 0) {
    case 4:
      return &kSelectPixels4;
    case 8:
      return &kSelectPixels8;
    case 16:
      return &kSelectPixels16;
    default:
      return nullptr;
  }
}

// `count` bits from bit `first` of a row on, uppermost bits first, as words; reads no byte beyond the one of the last
// bit.
void GatherBits(const uint8_t* row, size_t first, size_t count, uint32_t* words) noexcept {
  const uint8_t *from = row + first / 8, *const end = row + (first + count + 7) / 8;
  for (size_t done = 0; done < count; done += kWordPixels, from += kWordPixels / 8) {
    uint64_t bits = 0;
    const auto bytes = static_cast<size_t>(end - from);
    if (bytes >= sizeof bits)
      std::memcpy(&bits, from, sizeof bits);
    else
      for (size_t i = 0; i < bytes; ++i) bits |= uint64_t{from[i]} << 8 * i;
    *words++ = static_cast<uint32_t>(__builtin_bswap64(bits) << first % 8 >> 32);
  }
}

}  // namespace
}  // namespace vexel

using namespace vexel;

VX_Result VX_OneBitMaskComposite(const void* a, int32_t aRowBytes, VX_PixelFormat aFormat, const void* b,
                                 int32_t bRowBytes, VX_PixelFormat bFormat, const void* mask, int32_t maskRowBytes,
                                 int32_t maskBitOffset, void* dst, int32_t dstRowBytes, VX_PixelFormat dstFormat,
                                 int32_t width, int32_t height, int32_t conversionOption) noexcept {
  const FpModeGuard fpMode;
  const SelectKernels* kernels = KernelFor(dstFormat);
  if (!kernels) return VX_ErrUnsupportedDestinationFormat;
  RowJob job(width, height, conversionOption);
  if (const VX_Result result = job.AddSource({a, aRowBytes, aFormat}, dstFormat)) return result;
  if (const VX_Result result = job.AddSource({b, bRowBytes, bFormat}, dstFormat)) return result;
  if (const VX_Result result = job.SetTarget({dst, dstRowBytes, dstFormat}, dstFormat)) return result;
  if (maskBitOffset < 0 || maskBitOffset > 7) return VX_ErrArgumentOutOfRange;
  bool done;
  const VX_Result check = job.CheckBuffers(&done);
  if (check != VX_Success || done) return check;
  if (!mask) return VX_ErrNullSource;

  const auto pixelBytes = static_cast<size_t>(UnpaddedRowBytes(dstFormat, 1));
  const SelectKernel select = (*kernels)[job.Variant()];
  return job.Run([=](const RowSpan& span) {
    const uint8_t* const bits = static_cast<const uint8_t*>(mask) + span.row * ptrdiff_t{maskRowBytes};
    const size_t firstBit = static_cast<size_t>(maskBitOffset) + static_cast<size_t>(span.column);
    for (size_t i = 0; i < span.count; i += kPixelsAtOnce) {
      const size_t count = std::min(kPixelsAtOnce, span.count - i), at = i * pixelBytes;
      uint32_t words[kPixelsAtOnce / kWordPixels];
      GatherBits(bits, firstBit + i, count, words);
      select(span.src[0] + at, span.src[1] + at, words, span.dst + at, count);
    }
  });
}
