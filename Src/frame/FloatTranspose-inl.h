// Four channels of floats, between pixels and one vector per channel.
#if defined(VEXEL_FRAME_FLOATTRANSPOSE_INL_H_) == defined(HWY_TARGET_TOGGLE)
#ifdef VEXEL_FRAME_FLOATTRANSPOSE_INL_H_
#undef VEXEL_FRAME_FLOATTRANSPOSE_INL_H_
#else
#define VEXEL_FRAME_FLOATTRANSPOSE_INL_H_
#endif

#include <hwy/highway.h>

#if HWY_TARGET != HWY_SCALAR
HWY_BEFORE_NAMESPACE();
namespace vexel {
namespace HWY_NAMESPACE {
namespace hn = hwy::HWY_NAMESPACE;

using FloatVector = hn::Vec<hn::ScalableTag<float>>;

// 4 x 4 transposition within each 128 bits of four vectors; its own inverse.
HWY_INLINE void Transpose4(FloatVector& v0, FloatVector& v1, FloatVector& v2, FloatVector& v3) {
  const hn::ScalableTag<float> d;
  const hn::ScalableTag<double> d64;
  const auto low01 = hn::BitCast(d64, hn::InterleaveLower(d, v0, v1));
  const auto high01 = hn::BitCast(d64, hn::InterleaveUpper(d, v0, v1));
  const auto low23 = hn::BitCast(d64, hn::InterleaveLower(d, v2, v3));
  const auto high23 = hn::BitCast(d64, hn::InterleaveUpper(d, v2, v3));
  v0 = hn::BitCast(d, hn::InterleaveLower(d64, low01, low23));
  v1 = hn::BitCast(d, hn::InterleaveUpper(d64, low01, low23));
  v2 = hn::BitCast(d, hn::InterleaveLower(d64, high01, high23));
  v3 = hn::BitCast(d, hn::InterleaveUpper(d64, high01, high23));
}

}  // namespace HWY_NAMESPACE
}  // namespace vexel
HWY_AFTER_NAMESPACE();
#endif  // HWY_TARGET

#endif
