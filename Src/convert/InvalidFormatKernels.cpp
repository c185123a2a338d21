#include "convert/InvalidFormatKernels.h"

#include <algorithm>
#include <cstring>

#include "convert/RgbKernels.h"
#include "convert/YuvKernels.h"

namespace vexel {
namespace {

constexpr size_t kBlock = 64;

// Nothing but accidents of the format rules leads here, so there is one variant and it is put together from others.

// The missing V of half a pair at `i`, the last pixel of the row.
uint8_t LastV(const uint8_t* pairs, size_t i) { return i >= 2 ? pairs[2 * i - 2] : 128; }

void InvalidToPairs8u(const uint8_t* src, uint8_t* dst, size_t count) {
  std::memcpy(dst, src, 2 * count);
  if (count % 2 == 0) return;
  dst[2 * count] = LastV(src, count - 1);
  dst[2 * count + 1] = src[2 * count - 1];
}

void InvalidToBgrx8(const uint8_t* src, uint8_t* dst, size_t count) {
  uint8_t vuyx[kBlock * 4];
  for (size_t first = 0; first < count; first += kBlock) {
    const size_t n = std::min(kBlock, count - first);
    for (size_t k = 0; k < n; ++k) {
      const size_t i = first + k, pair = i & ~size_t{1};
      vuyx[4 * k] = pair + 1 < count ? src[2 * pair + 2] : LastV(src, i);
      vuyx[4 * k + 1] = src[2 * pair];
      vuyx[4 * k + 2] = src[2 * i + 1];
      vuyx[4 * k + 3] = 255;
    }
    kVuyx8ToBgrx8_601[KernelVariant::Plain](vuyx, dst + 4 * first, n);
  }
}

void Bgrx8ToInvalid(const uint8_t* src, uint8_t* dst, size_t count) {
  uint8_t vuyx[kBlock * 4];
  for (size_t i = 0; i < count; i += kBlock) {
    const size_t n = std::min(kBlock, count - i);
    kBgrx8ToVuyx8_601[KernelVariant::Plain](src + 4 * i, vuyx, n);
    for (size_t k = 0; k < n; ++k) {
      dst[2 * (i + k)] = vuyx[4 * (k & ~size_t{1}) + (k % 2 == 0 ? 1 : 0)];
      dst[2 * (i + k) + 1] = vuyx[4 * k + 2];
    }
  }
}

void Bgrx32fToInvalid(const uint8_t* src, uint8_t* dst, size_t count) {
  uint8_t bgrx[kBlock * 4];
  for (size_t i = 0; i < count; i += kBlock) {
    const size_t n = std::min(kBlock, count - i);
    kNarrow32fTo8u[KernelVariant::Plain](src + 16 * i, bgrx, n);
    Bgrx8ToInvalid(bgrx, dst + 2 * i, n);
  }
}

}  // namespace

const RowKernelSet kInvalidToPairs8u = {&InvalidToPairs8u, nullptr, nullptr, nullptr, nullptr};
const RowKernelSet kInvalidToBgrx8 = {&InvalidToBgrx8, nullptr, nullptr, nullptr, nullptr};
const RowKernelSet kBgrx8ToInvalid = {&Bgrx8ToInvalid, nullptr, nullptr, nullptr, nullptr};
const RowKernelSet kBgrx32fToInvalid = {&Bgrx32fToInvalid, nullptr, nullptr, nullptr, nullptr};

}  // namespace vexel
