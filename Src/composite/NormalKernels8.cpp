// 8-bit normal compositing. Every pixel's result depends on that pixel only.
//
// Over an opaque pixel: at opacity 1 the exact quotient rounded to nearest; below, integer arithmetic that is within
// 0.52 of the exact result. Over any other: floats with one division for each pixel, which give the same bytes for
// opaque pixels at opacity 1 (quotients by 255 keep 1/510 away from ties, the floats are off by less than 1/5000).
#include <cstddef>
#include <cstdint>

#include "composite/NormalKernels.h"
#include "composite/PlainOver8.h"
#include "convert/PlainPixels.h"

#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "composite/NormalKernels8.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

#include "composite/Over8-inl.h"
#include "composite/TwoRows-inl.h"
#include "frame/KernelTable.h"

#ifndef VEXEL_COMPOSITE_NORMALKERNELS8_SHARED
#define VEXEL_COMPOSITE_NORMALKERNELS8_SHARED
namespace vexel {
namespace {

// Result alpha up to this counts as none; the colour is black then.
constexpr float kClearAlpha = 7.6293945e-6f;
constexpr int kBlackVuy[3] = {128, 128, 16};
constexpr uint32_t kBlackVuyWord = 0x00108080;

}  // namespace
}  // namespace vexel
#endif

#if HWY_TARGET != HWY_BASELINE_SCALAR
HWY_BEFORE_NAMESPACE();
namespace vexel {
namespace HWY_NAMESPACE {
namespace {

template <size_t kChannel>
HWY_INLINE F32 ChannelFloats(U8 v) {
  const hn::ScalableTag<uint32_t> du;
  auto words = hn::BitCast(du, v);
  if constexpr (kChannel > 0) words = hn::ShiftRight<8 * kChannel>(words);
  if constexpr (kChannel < 3) words = hn::And(words, hn::Set(du, 255));
  return hn::ConvertTo(hn::ScalableTag<float>(), hn::BitCast(hn::ScalableTag<int32_t>(), words));
}

template <size_t kChannel>
HWY_INLINE U32 ChannelBytes(F32 v) {
  const auto bytes = hn::BitCast(hn::ScalableTag<uint32_t>(), ConvertNearest(v));
  if constexpr (kChannel == 0) return bytes;
  return hn::ShiftLeft<8 * kChannel>(bytes);
}

// The source's part in a result: its alpha times opacity, as floats and for opaque backgrounds. kFull means opacity 1
// and a source with alpha.
template <bool kFull, bool kSourceAlpha>
struct Part {
  explicit HWY_INLINE Part(float opacity)
      : scale(hn::Set(hn::ScalableTag<float>(), kSourceAlpha ? opacity * k8uTo32f : opacity)),
        fixedOpacity(hn::Set(hn::ScalableTag<uint16_t>(), plain::FixedOpacity(opacity))),
        constant(Weight15(hn::Set(hn::ScalableTag<uint16_t>(), 65535), fixedOpacity)) {}

  HWY_INLINE F32 Alpha(U8 s) const {
    if constexpr (kSourceAlpha) return hn::Mul(ChannelFloats<3>(s), scale);
    return scale;
  }
  HWY_INLINE U8 OnOpaque(U8 s, U8 d) const {
    U8 result;
    if constexpr (kFull)
      result = OverOpaque(s, d, SpreadChannel<3>(s));
    else if constexpr (kSourceAlpha)
      result = OverOpaqueWeighted(s, d, WeightsOf(SpreadChannel<3>(s), fixedOpacity));
    else
      result = OverOpaqueWeighted(s, d, {constant, constant});
    return hn::Or(result, OpaqueVector<3, uint8_t>());
  }

  F32 scale;
  U16 fixedOpacity, constant;
};

// Over pixels of any alpha.
template <bool kYuv, bool kStraight, bool kFull, bool kSourceAlpha>
HWY_INLINE U8 OnAny(U8 s, U8 d, const Part<kFull, kSourceAlpha>& part) {
  const hn::ScalableTag<uint8_t> d8;
  const hn::ScalableTag<uint32_t> du;
  const hn::ScalableTag<float> df;
  const auto one = hn::Set(df, 1.0f);
  const auto as = part.Alpha(s);
  const auto ab = hn::Mul(ChannelFloats<3>(d), hn::Set(df, k8uTo32f));
  const auto rest = hn::Sub(ab, hn::Mul(ab, as));
  const auto ao = hn::Add(as, rest);
  auto forSource = as, forBackground = rest;
  if constexpr (kStraight) {
    const auto inverse = hn::Div(one, hn::Max(ao, hn::Set(df, kClearAlpha)));
    forSource = hn::Mul(as, inverse);
    forBackground = hn::Mul(rest, inverse);
  }
  const auto mix = [&](F32 cs, F32 cd, int black) HWY_ATTR {
    auto sum = hn::Add(hn::Mul(cs, forSource), hn::Mul(cd, forBackground));
    if (kYuv && !kStraight) sum = hn::Add(sum, hn::Mul(hn::Sub(one, ao), hn::Set(df, static_cast<float>(black))));
    return sum;
  };
  const auto c0 = ChannelBytes<0>(mix(ChannelFloats<0>(s), ChannelFloats<0>(d), kBlackVuy[0]));
  const auto c1 = ChannelBytes<1>(mix(ChannelFloats<1>(s), ChannelFloats<1>(d), kBlackVuy[1]));
  const auto c2 = ChannelBytes<2>(mix(ChannelFloats<2>(s), ChannelFloats<2>(d), kBlackVuy[2]));
  const auto alpha = ChannelBytes<3>(hn::Mul(ao, hn::Set(df, 255.0f)));
  auto result = hn::Or(hn::Or(c0, c1), hn::Or(c2, alpha));
  if constexpr (kStraight) {
    const auto clear = hn::RebindMask(du, hn::Le(ao, hn::Set(df, kClearAlpha)));
    result = hn::IfThenElse(clear, hn::Set(du, kYuv ? kBlackVuyWord : 0), result);
  }
  if constexpr (!kFull) {
    const auto opaque = hn::Eq(hn::ShiftRight<24>(hn::BitCast(du, d)), hn::Set(du, 255));
    result = hn::IfThenElse(opaque, hn::BitCast(du, part.OnOpaque(s, d)), result);
  }
  return hn::BitCast(d8, result);
}

template <OverChoice kChoice, bool kFull>
HWY_INLINE void OverRow(const uint8_t* source, const uint8_t* background, uint8_t* dst, size_t count, float opacity) {
  const Part<kFull, kChoice.sourceAlpha> part(opacity);
  TwoRowLoop<2 * HWY_MAX_BYTES / 4, 4>(
      source, background, dst, count, [&](const uint8_t* from, const uint8_t* onto, uint8_t* out) HWY_ATTR {
        const auto s0 = LoadVector<uint8_t>(from, 0), s1 = LoadVector<uint8_t>(from, 1);
        const auto d0 = LoadVector<uint8_t>(onto, 0), d1 = LoadVector<uint8_t>(onto, 1);
        const auto opaque = OpaqueVector<3, uint8_t>();
        if (!kChoice.backgroundAlpha ||
            hn::AllTrue(hn::ScalableTag<uint8_t>(), hn::Eq(hn::And(hn::And(d0, d1), opaque), opaque))) {
          StoreVector(part.OnOpaque(s0, d0), out, 0);
          StoreVector(part.OnOpaque(s1, d1), out, 1);
        } else {
          StoreVector(OnAny<kChoice.yuv, kChoice.straight>(s0, d0, part), out, 0);
          StoreVector(OnAny<kChoice.yuv, kChoice.straight>(s1, d1, part), out, 1);
        }
      });
}

template <OverChoice kChoice>
HWY_ATTR void Over8(const uint8_t* source, const uint8_t* background, uint8_t* dst, size_t count, float opacity) {
  if (kChoice.sourceAlpha && opacity == 1.0f)
    OverRow<kChoice, kChoice.sourceAlpha>(source, background, dst, count, opacity);
  else
    OverRow<kChoice, false>(source, background, dst, count, opacity);
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

// One pixel over an opaque one.
template <bool kSourceAlpha>
void OnOpaque(const uint8_t* s, const uint8_t* d, float opacity, uint8_t* out) {
  const int alpha = kSourceAlpha ? s[3] : 255;
  const int weight = Weight15(alpha, FixedOpacity(opacity));
  ForChannels<3>([&](size_t k) {
    const bool exact = kSourceAlpha && opacity == 1.0f;
    out[k] = exact ? OverOpaque(s[k], d[k], alpha) : OverOpaqueWeighted(s[k], d[k], weight);
  });
  out[3] = 255;
}

template <bool kYuv, bool kStraight, bool kSourceAlpha>
void OnAny(const uint8_t* s, const uint8_t* d, float opacity, uint8_t* out) {
  const float as = kSourceAlpha ? s[3] * (opacity * k8uTo32f) : opacity;
  const float ab = d[3] * k8uTo32f;
  const float rest = ab - ab * as;
  const float ao = as + rest;
  const bool clear = kStraight && ao <= kClearAlpha;
  const float inverse = !kStraight ? 1.0f : clear ? 0.0f : 1 / ao;
  ForChannels<3>([&](size_t k) {
    const int black = kYuv ? kBlackVuy[k] : 0;
    float sum = s[k] * (as * inverse) + d[k] * (rest * inverse);
    if (!kStraight) sum += (1 - ao) * black;
    out[k] = static_cast<uint8_t>(clear ? black : ConvertNearest(sum));
  });
  out[3] = static_cast<uint8_t>(clear ? 0 : ConvertNearest(ao * 255));
}

template <OverChoice kChoice>
void Over8(const uint8_t* source, const uint8_t* background, uint8_t* dst, size_t count, float opacity) {
  for (size_t i = 0; i < 4 * count; i += 4) {
    uint8_t out[4];
    if (!kChoice.backgroundAlpha || background[i + 3] == 255)
      OnOpaque<kChoice.sourceAlpha>(source + i, background + i, opacity, out);
    else
      OnAny<kChoice.yuv, kChoice.straight, kChoice.sourceAlpha>(source + i, background + i, opacity, out);
    std::memcpy(dst + i, out, 4);
  }
}

}  // namespace
}  // namespace plain

namespace {

template <OverChoice kChoice>
const OverKernelSet kOver8 = VX_KERNEL_VARIANTS(Over8<kChoice>);

}  // namespace

const OverKernelSet& Over8u(OverChoice choice) noexcept {
  return PickOver(choice, []<OverChoice kChoice>() -> const OverKernelSet& { return kOver8<kChoice>; });
}

}  // namespace vexel
#endif  // HWY_ONCE
