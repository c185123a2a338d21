#include <cstddef>
#include <cstdint>
#include <cstring>

#include "color/PixelKernels.h"

#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "color/ClampKernels.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

#include "frame/KernelTable.h"

#if HWY_TARGET != HWY_SCALAR
HWY_BEFORE_NAMESPACE();
namespace vexel {
namespace HWY_NAMESPACE {
namespace hn = hwy::HWY_NAMESPACE;
namespace {

void ClampFloats(const void* src, void* dst, size_t count, float lo, float hi) {
  const hn::ScalableTag<float> d;
  const auto least = hn::Set(d, lo), most = hn::Set(d, hi);
  const size_t lanes = hn::Lanes(d);
  const auto clamp = [&](const float* from, float* to) HWY_ATTR {
    const auto v = hn::LoadU(d, from);
    hn::StoreU(hn::IfThenElse(hn::Gt(v, least), hn::Min(v, most), least), d, to);
  };
  const float* from = static_cast<const float*>(src);
  float* to = static_cast<float*>(dst);
  size_t i = 0;
  for (; i + lanes <= count; i += lanes) clamp(from + i, to + i);
  if (i < count) {
    HWY_ALIGN float block[hn::MaxLanes(hn::ScalableTag<float>())] = {};
    std::memcpy(block, from + i, (count - i) * sizeof(float));
    clamp(block, block);
    std::memcpy(to + i, block, (count - i) * sizeof(float));
  }
}

}  // namespace
}  // namespace HWY_NAMESPACE
}  // namespace vexel
HWY_AFTER_NAMESPACE();
#endif  // HWY_TARGET

#if HWY_ONCE
namespace vexel {
namespace plain {
namespace {

void ClampFloats(const void* src, void* dst, size_t count, float lo, float hi) {
  for (size_t i = 0; i < count * sizeof(float); i += sizeof(float)) {
    float v;
    std::memcpy(&v, static_cast<const uint8_t*>(src) + i, sizeof v);
    v = v > lo ? (v < hi ? v : hi) : lo;
    std::memcpy(static_cast<uint8_t*>(dst) + i, &v, sizeof v);
  }
}

}  // namespace
}  // namespace plain

const KernelVariants<ClampKernel> kClampFloats = VX_KERNEL_VARIANTS(ClampFloats);

}  // namespace vexel
#endif  // HWY_ONCE
