#include "frame/ImagePrimitives.h"

#include <algorithm>
#include <cstring>

#include "frame/Bands.h"
#include "frame/Lifecycle.h"
#include "frame/Platform.h"
#include "frame/StreamCopy.h"

#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "frame/ImagePrimitives.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

#include "frame/KernelTable.h"

#ifndef VEXEL_FRAME_IMAGEPRIMITIVES_TYPES
#define VEXEL_FRAME_IMAGEPRIMITIVES_TYPES
namespace vexel::primitives {

// Every constant is bytes that repeat: 16 bytes hold a whole number of pixels of each kind. Repeated here often enough
// to load a vector from any place of the first 16 bytes.
struct Pattern {
  static constexpr size_t kPeriod = 16, kLongest = 64;
  alignas(64) uint8_t bytes[kLongest + kPeriod];
};

// The rounded shift of a product, split so that no 16-bit lane is shifted by 16.
struct Scale {
  int right, rightAgain;  // together 0 to 16
  int left;               // 0 to 8
};

}  // namespace vexel::primitives
#endif

#if HWY_TARGET != HWY_SCALAR
HWY_BEFORE_NAMESPACE();
namespace vexel::primitives {
namespace HWY_NAMESPACE {
namespace hn = hwy::HWY_NAMESPACE;
namespace {

using D = hn::ScalableTag<uint8_t>;
constexpr size_t kLanes = hn::MaxLanes(D());

template <bool kStream>
HWY_INLINE void FillMiddle(uint8_t* dst, const uint8_t* end, hn::VFromD<D> v) {
  const D d;
  for (; dst + kLanes <= end; dst += kLanes) {
    if constexpr (kStream)
      hn::Stream(v, d, dst);
    else
      hn::Store(v, d, dst);
  }
}

// The ends are whole vectors that overlap the aligned middle.
void FillRow(uint8_t* dst, size_t bytes, const Pattern& pattern, bool stream) {
  const D d;
  if (bytes < kLanes) {
    std::memcpy(dst, pattern.bytes, bytes);
    return;
  }
  const size_t skip = -reinterpret_cast<uintptr_t>(dst) & (kLanes - 1);
  const auto middle = hn::LoadU(d, pattern.bytes + skip % Pattern::kPeriod);
  hn::StoreU(hn::Load(d, pattern.bytes), d, dst);
  if (stream)
    FillMiddle<true>(dst + skip, dst + bytes, middle);
  else
    FillMiddle<false>(dst + skip, dst + bytes, middle);
  hn::StoreU(hn::LoadU(d, pattern.bytes + (bytes - kLanes) % Pattern::kPeriod), d, dst + bytes - kLanes);
}

// RowLoop for a row that may be changed in place: full blocks, then the rest through the same body on a copy.
template <size_t kBlock, class Body>
HWY_INLINE void InPlaceLoop(const uint8_t* src, uint8_t* dst, size_t bytes, const Body& body) {
  size_t i = 0;
  for (; i + kBlock <= bytes; i += kBlock) body(src + i, dst + i);
  if (const size_t rest = bytes - i) {
    alignas(64) uint8_t block[kBlock] = {};
    std::memcpy(block, src + i, rest);
    body(block, block);
    std::memcpy(dst + i, block, rest);
  }
}

// Whole pixels of 4, 8 or 16 bytes; the bytes of `mask` that are 0xFF take the pattern's.
void SetMaskedRow(uint8_t* dst, size_t bytes, const Pattern& pattern, const Pattern& mask) {
  const D d;
  const auto keep = hn::Not(hn::Load(d, mask.bytes));
  const auto value = hn::AndNot(keep, hn::Load(d, pattern.bytes));
  InPlaceLoop<kLanes>(dst, dst, bytes, [&](const uint8_t* src, uint8_t* out) HWY_ATTR {
    hn::StoreU(hn::Or(hn::And(hn::LoadU(d, src), keep), value), d, out);
  });
}

template <class V16>
HWY_INLINE V16 ScaleProduct(V16 product, const Scale& scale, V16 half) {
  const hn::DFromV<V16> d16;
  const auto quotient = hn::ShiftRightSame(hn::ShiftRightSame(product, scale.right), scale.rightAgain);
  const auto rest = hn::Sub(product, hn::ShiftLeftSame(hn::ShiftLeftSame(quotient, scale.right), scale.rightAgain));
  // Up above one half, and at one half if the quotient is odd.
  const auto up = hn::Gt(hn::Add(rest, hn::And(quotient, hn::Set(d16, 1))), half);
  const auto most = hn::Set(d16, 255);
  const auto rounded = hn::Min(hn::Sub(quotient, hn::VecFromMask(d16, up)), most);
  return hn::Min(hn::ShiftLeftSame(rounded, scale.left), most);
}

void MultiplyRow(const uint8_t* src, uint8_t* dst, size_t bytes, const Pattern& constants, const Scale& scale) {
  using D8 = hn::Rebind<uint8_t, hn::ScalableTag<uint16_t>>;
  const D8 d8;
  const hn::ScalableTag<uint16_t> d16;
  constexpr size_t kBlock = hn::MaxLanes(D8());
  const auto factor = hn::PromoteTo(d16, hn::LoadU(d8, constants.bytes));
  const int shift = scale.right + scale.rightAgain;
  const auto half = hn::Set(d16, static_cast<uint16_t>(shift == 0 ? 0xFFFF : 1 << (shift - 1)));
  InPlaceLoop<kBlock>(src, dst, bytes, [&](const uint8_t* from, uint8_t* to) HWY_ATTR {
    const auto product = hn::Mul(hn::PromoteTo(d16, hn::LoadU(d8, from)), factor);
    // At most 255, so the signed narrowing keeps every value.
    const auto scaled = hn::BitCast(hn::RebindToSigned<decltype(d16)>(), ScaleProduct(product, scale, half));
    hn::StoreU(hn::DemoteTo(d8, scaled), d8, to);
  });
}

}  // namespace
}  // namespace HWY_NAMESPACE
}  // namespace vexel::primitives
HWY_AFTER_NAMESPACE();
#endif  // HWY_TARGET

#if HWY_ONCE
namespace vexel::primitives {
namespace {

namespace plain {

void FillRow(uint8_t* dst, size_t bytes, const Pattern& pattern, bool) {
  for (size_t i = 0; i < bytes; ++i) dst[i] = pattern.bytes[i % Pattern::kPeriod];
}

void SetMaskedRow(uint8_t* dst, size_t bytes, const Pattern& pattern, const Pattern& mask) {
  for (size_t i = 0; i < bytes; ++i)
    if (mask.bytes[i % Pattern::kPeriod]) dst[i] = pattern.bytes[i % Pattern::kPeriod];
}

void MultiplyRow(const uint8_t* src, uint8_t* dst, size_t bytes, const Pattern& constants, const Scale& scale) {
  const int shift = scale.right + scale.rightAgain;
  for (size_t i = 0; i < bytes; ++i) {
    const int product = src[i] * constants.bytes[i % Pattern::kPeriod];
    int result = product >> shift;
    const int twiceRest = 2 * (product - (result << shift)), whole = 1 << shift;
    if (twiceRest > whole || (twiceRest == whole && result % 2 != 0)) ++result;
    dst[i] = static_cast<uint8_t>(std::min(std::min(result, 255) << scale.left, 255));
  }
}

}  // namespace plain

template <class... Arguments>
using Kernels = KernelVariants<void (*)(Arguments...)>;
constinit const Kernels<uint8_t*, size_t, const Pattern&, bool> kFillRow = VX_KERNEL_VARIANTS(FillRow);
constinit const Kernels<uint8_t*, size_t, const Pattern&, const Pattern&> kSetMaskedRow =
    VX_KERNEL_VARIANTS(SetMaskedRow);
constinit const Kernels<const uint8_t*, uint8_t*, size_t, const Pattern&, const Scale&> kMultiplyRow =
    VX_KERNEL_VARIANTS(MultiplyRow);

// The processor's string store, which needs no vectors, fills whole cache lines without reading them first and goes
// past the cache by itself. Short runs are over before it is at full speed.
constexpr size_t kStringStoreFrom = 16 * 1024;

bool HasFastStringStore() {
  static const bool has = [] {
    const auto& cpuid = platform::kProcessor.cpuid;
    return cpuid(0, 0).eax >= 7 && (cpuid(7, 0).ebx >> 9 & 1) != 0;
  }();
  return has;
}

bool RepeatsEvery8(const Pattern& pattern) { return std::memcmp(pattern.bytes, pattern.bytes + 8, 8) == 0; }

// For at least a cache line; the ends overlap the aligned middle.
void FillRowByString(uint8_t* dst, size_t bytes, const Pattern& pattern, bool) {
  const size_t skip = -reinterpret_cast<uintptr_t>(dst) & 63;
  std::memcpy(dst, pattern.bytes, 64);
  std::memcpy(dst + bytes - 8, pattern.bytes + bytes % 8, 8);
  uint64_t word;
  std::memcpy(&word, pattern.bytes + skip % 8, 8);
  uint8_t* middle = dst + skip;
  size_t count = (bytes - skip) / 8;
  asm volatile("rep stosq" : "+D"(middle), "+c"(count) : "a"(word) : "memory");
}

// For pixels of 16 bytes: neither does the string copy, here of the row's start, which stays in the cache.
void FillRowByStringCopy(uint8_t* dst, size_t bytes, const Pattern& pattern, bool) {
  constexpr size_t kChunk = 32 * 1024;
  const size_t first = std::min(bytes, kChunk);
  kFillRow[ActiveKernelVariant()](dst, first, pattern, false);
  for (size_t done = first; done < bytes; done += kChunk) {
    uint8_t* to = dst + done;
    const uint8_t* from = dst;
    size_t count = std::min(bytes - done, kChunk);
    asm volatile("rep movsb" : "+D"(to), "+S"(from), "+c"(count) : : "memory");
  }
}

// Below it a fan-out costs more than it saves.
constexpr size_t kBandsFrom = 256 * 1024;

template <class T, size_t N>
Pattern MakePattern(const T (&pixel)[N]) {
  Pattern pattern;
  for (size_t i = 0; i < sizeof pattern.bytes; i += sizeof pixel) std::memcpy(pattern.bytes + i, pixel, sizeof pixel);
  return pattern;
}

Status Check(const void* base, ptrdiff_t rowBytes, int width, int height, size_t pixelBytes) {
  if (!base) return Status::NullPointer;
  if (width <= 0 || height <= 0) return Status::Size;
  const auto needed = static_cast<ptrdiff_t>(static_cast<size_t>(width) * pixelBytes);
  if (height > 1 && rowBytes < needed && rowBytes > -needed) return Status::Step;
  return Status::Ok;
}

// Calls rows(first, end) for all rows.
template <class Rows>
void ForEachRun(int height, size_t bytesOfAll, const Rows& rows) {
  if (bytesOfAll < kBandsFrom)
    rows(0, height);
  else
    ForEachBand(height, rows);
}

// Calls row(r) for every row.
template <class Row>
void ForEachRow(int height, size_t bytesOfAll, const Row& row) {
  ForEachRun(height, bytesOfAll, [&](int first, int end) {
    for (int r = first; r < end; ++r) row(r);
  });
}

uint8_t* RowAt(void* base, ptrdiff_t rowBytes, int row) {
  return static_cast<uint8_t*>(base) + static_cast<ptrdiff_t>(row) * rowBytes;
}

template <class T, size_t N>
Status FillWithPixel(const T (&pixel)[N], T* dst, ptrdiff_t rowBytes, int width, int height) {
  if (const Status status = Check(dst, rowBytes, width, height, sizeof pixel); status != Status::Ok) return status;
  const size_t bytes = static_cast<size_t>(width) * sizeof pixel, bytesOfAll = bytes * static_cast<size_t>(height);
  const Pattern pattern = MakePattern(pixel);
  const KernelVariant variant = ActiveKernelVariant();
  const bool withoutGaps = rowBytes == static_cast<ptrdiff_t>(bytes);
  const bool hasString = variant != KernelVariant::Plain && HasFastStringStore();
  const bool byString = hasString && (withoutGaps ? bytesOfAll : bytes) >= kStringStoreFrom && RepeatsEvery8(pattern);
  const bool isBig = !byString && bytesOfAll >= std::max<size_t>(kBandsFrom, UnifiedCache().bytes / 2);
  // What the whole cache holds need not go past it.
  const bool byCopy = isBig && hasString && withoutGaps && bytesOfAll < UnifiedCache().bytes;
  const bool stream = isBig && !byCopy;
  const auto fillRow = byString ? &FillRowByString : byCopy ? &FillRowByStringCopy : kFillRow[variant];
  ForEachRun(height, bytesOfAll, [&](int first, int end) {
    if (withoutGaps)
      fillRow(RowAt(dst, rowBytes, first), bytes * static_cast<size_t>(end - first), pattern, stream);
    else
      for (int r = first; r < end; ++r) fillRow(RowAt(dst, rowBytes, r), bytes, pattern, stream);
    if (stream) StreamFence();
  });
  return Status::Ok;
}

template <class T>
Status SetOneChannel(int channel, T value, T* dst, ptrdiff_t rowBytes, int width, int height) {
  if (const Status status = Check(dst, rowBytes, width, height, 4 * sizeof(T)); status != Status::Ok) return status;
  if (channel < 0 || channel > 3) return Status::Channel;
  const T values[4] = {value, value, value, value};
  uint8_t maskPixel[4 * sizeof(T)] = {};
  std::memset(maskPixel + static_cast<size_t>(channel) * sizeof(T), 0xFF, sizeof(T));
  const Pattern pattern = MakePattern(values), mask = MakePattern(maskPixel);
  const size_t bytes = static_cast<size_t>(width) * 4 * sizeof(T);
  const auto setRow = kSetMaskedRow[ActiveKernelVariant()];
  ForEachRow(height, bytes * static_cast<size_t>(height),
             [&](int r) { setRow(RowAt(dst, rowBytes, r), bytes, pattern, mask); });
  return Status::Ok;
}

}  // namespace

const char* StatusText(Status status) noexcept {
  switch (status) {
    case Status::Ok:
      return "done";
    case Status::NullPointer:
      return "null pointer";
    case Status::Size:
      return "width or height is not positive";
    case Status::Step:
      return "row bytes are fewer than a row's";
    case Status::Channel:
      return "no such channel";
    case Status::PlainCode:
      return "plain code is used, without vector instructions";
  }
  return "unknown status";
}

Status Initialise(Domain) noexcept {
  // All families have kernels for the same processors.
  return ActiveKernelVariant() == KernelVariant::Plain ? Status::PlainCode : Status::Ok;
}

Status Fill(uint8_t value, uint8_t* dst, ptrdiff_t rowBytes, int width, int height) noexcept {
  return FillWithPixel<uint8_t, 1>({value}, dst, rowBytes, width, height);
}
Status Fill(uint16_t value, uint16_t* dst, ptrdiff_t rowBytes, int width, int height) noexcept {
  return FillWithPixel<uint16_t, 1>({value}, dst, rowBytes, width, height);
}
Status Fill(float value, float* dst, ptrdiff_t rowBytes, int width, int height) noexcept {
  return FillWithPixel<float, 1>({value}, dst, rowBytes, width, height);
}
Status Fill4(const uint8_t (&pixel)[4], uint8_t* dst, ptrdiff_t rowBytes, int width, int height) noexcept {
  return FillWithPixel(pixel, dst, rowBytes, width, height);
}
Status Fill4(const uint16_t (&pixel)[4], uint16_t* dst, ptrdiff_t rowBytes, int width, int height) noexcept {
  return FillWithPixel(pixel, dst, rowBytes, width, height);
}
Status Fill4(const float (&pixel)[4], float* dst, ptrdiff_t rowBytes, int width, int height) noexcept {
  return FillWithPixel(pixel, dst, rowBytes, width, height);
}

Status SetChannel(int channel, uint8_t value, uint8_t* dst, ptrdiff_t rowBytes, int width, int height) noexcept {
  return SetOneChannel(channel, value, dst, rowBytes, width, height);
}
Status SetChannel(int channel, uint16_t value, uint16_t* dst, ptrdiff_t rowBytes, int width, int height) noexcept {
  return SetOneChannel(channel, value, dst, rowBytes, width, height);
}
Status SetChannel(int channel, float value, float* dst, ptrdiff_t rowBytes, int width, int height) noexcept {
  return SetOneChannel(channel, value, dst, rowBytes, width, height);
}

Status MultiplyByConstants4(const uint8_t* src, ptrdiff_t srcRowBytes, const uint8_t (&constants)[4], uint8_t* dst,
                            ptrdiff_t dstRowBytes, int width, int height, int scaleFactor) noexcept {
  if (const Status status = Check(src, srcRowBytes, width, height, 4); status != Status::Ok) return status;
  if (const Status status = Check(dst, dstRowBytes, width, height, 4); status != Status::Ok) return status;
  // A product is below 2^16: shifted down by 17 or more it is below one half. Shifted up by 8 it saturates unless 0.
  if (scaleFactor > 16) return Fill4({0, 0, 0, 0}, dst, dstRowBytes, width, height);
  const int right = std::max(scaleFactor, 0);
  const Scale scale{std::min(right, 15), right - std::min(right, 15),
                    scaleFactor < 0 ? std::min(-(scaleFactor + 1), 7) + 1 : 0};
  const Pattern factors = MakePattern(constants);
  const size_t bytes = static_cast<size_t>(width) * 4;
  const auto multiplyRow = kMultiplyRow[ActiveKernelVariant()];
  ForEachRow(height, bytes * static_cast<size_t>(height), [&](int r) {
    const uint8_t* const srcRow = src + static_cast<ptrdiff_t>(r) * srcRowBytes;
    multiplyRow(srcRow, RowAt(dst, dstRowBytes, r), bytes, factors, scale);
  });
  return Status::Ok;
}

}  // namespace vexel::primitives
#endif
