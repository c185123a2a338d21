#include <cstdint>
#include <cstring>

#include "frame/Lifecycle.h"
#include "frame/StreamCopy.h"
#include "vexel/vexel.h"

#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "frame/MemoryCopy.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

#include "frame/KernelTable.h"

HWY_BEFORE_NAMESPACE();
namespace vexel {
namespace HWY_NAMESPACE {
namespace hn = hwy::HWY_NAMESPACE;

using D = hn::ScalableTag<uint8_t>;
constexpr size_t kLine = 64;

// The caller has aligned dst to 64 bytes and counts whole lines.
void StreamLines(uint8_t* HWY_RESTRICT dst, const uint8_t* HWY_RESTRICT src, size_t lines) {
  const D d;
  constexpr size_t n = hn::MaxLanes(D());
  for (; lines != 0; --lines, dst += kLine, src += kLine) {
    // All loads first: stores of one line that leave together fill one write-combining buffer.
    if constexpr (n == 64) {
      hn::Stream(hn::LoadU(d, src), d, dst);
    } else if constexpr (n == 32) {
      const auto a = hn::LoadU(d, src), b = hn::LoadU(d, src + 32);
      hn::Stream(a, d, dst);
      hn::Stream(b, d, dst + 32);
    } else if constexpr (n == 16) {
      const auto a = hn::LoadU(d, src), b = hn::LoadU(d, src + 16), c = hn::LoadU(d, src + 32),
                 e = hn::LoadU(d, src + 48);
      hn::Stream(a, d, dst);
      hn::Stream(b, d, dst + 16);
      hn::Stream(c, d, dst + 32);
      hn::Stream(e, d, dst + 48);
    } else {
      std::memcpy(dst, src, kLine);
    }
  }
}

}  // namespace HWY_NAMESPACE
}  // namespace vexel
HWY_AFTER_NAMESPACE();

#if HWY_ONCE
namespace vexel {
namespace {

namespace plain {

void StreamLines(uint8_t* dst, const uint8_t* src, size_t lines) { std::memcpy(dst, src, lines * 64); }

}  // namespace plain

constexpr size_t kLine = 64;
const KernelVariants<void (*)(uint8_t*, const uint8_t*, size_t)> kStreamLines = VX_KERNEL_VARIANTS(StreamLines);

}  // namespace

void StreamCopy(void* dst, const void* src, size_t bytes, KernelVariant variant) noexcept {
  auto* to = static_cast<uint8_t*>(dst);
  auto* from = static_cast<const uint8_t*>(src);
  const size_t head = -reinterpret_cast<uintptr_t>(to) % kLine;
  if (bytes < head + kLine) {
    if (bytes != 0) std::memcpy(to, from, bytes);
    return;
  }
  std::memcpy(to, from, head);
  const size_t lines = (bytes - head) / kLine, tail = (bytes - head) % kLine;
  kStreamLines[variant](to + head, from + head, lines);
  std::memcpy(to + bytes - tail, from + bytes - tail, tail);
}

void StreamFence() noexcept { _mm_sfence(); }

}  // namespace vexel

VX_Result VX_CopyMemory(void* dst, const void* src, size_t bytes) noexcept {
  if (bytes != 0) std::memcpy(dst, src, bytes);
  return VX_Success;
}
#endif
