// Float pixels of four channels, one in each 128-bit block of a vector: constants and blends by channel.
#if defined(VEXEL_CONVERT_FLOATPIXELS_INL_H_) == defined(HWY_TARGET_TOGGLE)
#ifdef VEXEL_CONVERT_FLOATPIXELS_INL_H_
#undef VEXEL_CONVERT_FLOATPIXELS_INL_H_
#else
#define VEXEL_CONVERT_FLOATPIXELS_INL_H_
#endif

#include <cstddef>
#include <cstdint>

#include <hwy/highway.h>

#include "convert/PixelVectors-inl.h"
#include "convert/StudioScale.h"

#if HWY_TARGET != HWY_SCALAR
HWY_BEFORE_NAMESPACE();
namespace vexel {
namespace HWY_NAMESPACE {
namespace hn = hwy::HWY_NAMESPACE;

using FloatTag = hn::ScalableTag<float>;
constexpr size_t kVectorPixels = kLanes<float> / 4;

// The channels whose bits are set in kMask from `second`, the others from `first`.
template <int kMask>
HWY_INLINE F32 TakeChannels(F32 first, F32 second) {
#if HWY_TARGET == HWY_AVX3
  return F32{_mm512_mask_blend_ps(static_cast<__mmask16>(kMask * 0x1111), first.raw, second.raw)};
#elif HWY_TARGET == HWY_AVX2
  return F32{_mm256_blend_ps(first.raw, second.raw, kMask * 0x11)};
#elif HWY_TARGET == HWY_SSE4
  return F32{_mm_blend_ps(first.raw, second.raw, kMask)};
#else
  alignas(16) static constexpr int32_t kBits[4] = {-(kMask & 1), -(kMask >> 1 & 1), -(kMask >> 2 & 1),
                                                   -(kMask >> 3 & 1)};
  const hn::RebindToSigned<FloatTag> di;
  return hn::IfVecThenElse(hn::BitCast(FloatTag(), hn::LoadDup128(di, kBits)), second, first);
#endif
}

// The channels of each pixel in a new order.
template <int k0, int k1, int k2, int k3>
HWY_INLINE F32 PermuteChannels(F32 v) {
  constexpr int kOrder = k0 | k1 << 2 | k2 << 4 | k3 << 6;
#if HWY_TARGET == HWY_AVX3
  return F32{_mm512_permute_ps(v.raw, kOrder)};
#elif HWY_TARGET == HWY_AVX2
  return F32{_mm256_permute_ps(v.raw, kOrder)};
#else
  return F32{_mm_shuffle_ps(v.raw, v.raw, kOrder)};
#endif
}

// `colour` with the fourth channel of `source`, or with an opaque one.
template <bool kOpaque>
HWY_INLINE F32 FinishAlpha(F32 colour, F32 source) {
  return TakeChannels<8>(colour, kOpaque ? hn::Set(FloatTag(), 1.0f) : source);
}

// One vector of floats from its studio codes.
template <const StudioScale& kScale>
HWY_INLINE F32 CodesToFloat(I32 codes) {
  const hn::RebindToSigned<FloatTag> di;
  return hn::Mul(hn::ConvertTo(FloatTag(), hn::Sub(codes, hn::LoadDup128(di, kScale.zero))),
                 hn::LoadDup128(FloatTag(), kScale.toFloat));
}
template <const StudioScale& kScale>
HWY_INLINE F32 WidenCodes(const uint8_t* HWY_RESTRICT src) {
  return CodesToFloat<kScale>(LoadPromoted<int32_t, uint8_t>(src));
}

// One vector of codes from its floats, not yet saturated. NaN and what int32 cannot hold gives INT32_MIN.
template <const StudioScale& kScale, class V>
HWY_INLINE auto ScaleToCodes(V v) {
  const hn::DFromV<V> d;
  return ConvertNearest(hn::Add(hn::Mul(v, hn::LoadDup128(d, kScale.fromFloat)), hn::LoadDup128(d, kScale.offset)));
}

}  // namespace HWY_NAMESPACE
}  // namespace vexel
HWY_AFTER_NAMESPACE();
#endif  // HWY_TARGET

#endif
