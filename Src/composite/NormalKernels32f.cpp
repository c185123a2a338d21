// Normal compositing in floats, nothing clamped: the colours of the two parts weighted with t = as / ao. Black is 0 in
// every channel, for Y'CbCr too.
#include <cmath>
#include <cstddef>
#include <cstdint>

#include "composite/NormalKernels.h"
#include "composite/Opacity.h"
#include "convert/PlainPixels.h"

#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "composite/NormalKernels32f.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

#include "composite/TwoRows-inl.h"
#include "convert/FloatPixels-inl.h"
#include "frame/KernelTable.h"

#if HWY_TARGET != HWY_SCALAR
HWY_BEFORE_NAMESPACE();
namespace vexel {
namespace HWY_NAMESPACE {
namespace {

template <OverChoice kChoice>
HWY_INLINE F32 Over(F32 s, F32 d, F32 opacity) {
  const FloatTag df;
  constexpr size_t kAlpha = AlphaAt(kChoice);
  constexpr int kAlphaBit = 1 << kAlpha;
  const auto one = hn::Set(df, 1.0f);
  auto as = opacity;
  if constexpr (kChoice.sourceAlpha) as = hn::Mul(hn::Broadcast<kAlpha>(s), opacity);
  const auto mix = [&](F32 t) HWY_ATTR { return hn::Add(hn::Mul(hn::Sub(one, t), d), hn::Mul(t, s)); };
  if constexpr (!kChoice.backgroundAlpha) return TakeChannels<kAlphaBit>(mix(as), one);
  const auto ab = hn::Broadcast<kAlpha>(d);
  const auto both = hn::Mul(as, ab);
  const auto ao = hn::Sub(hn::Add(ab, as), both);
  if constexpr (!kChoice.straight)
    return TakeChannels<kAlphaBit>(hn::Add(hn::Mul(s, as), hn::Mul(d, hn::Sub(ab, both))), ao);
  const auto clear = hn::Lt(hn::Abs(ao), hn::Set(df, kAlphaGuard));
  const auto t = hn::Mul(as, hn::Div(one, hn::IfThenElse(clear, one, ao)));
  return TakeChannels<kAlphaBit>(hn::IfThenZeroElse(clear, mix(t)), ao);
}

template <OverChoice kChoice>
HWY_ATTR void Over32(const uint8_t* source, const uint8_t* background, uint8_t* dst, size_t count, float opacity,
                     bool stream) {
  const auto part = hn::Set(FloatTag(), opacity);
  TwoRowLoop<4 * HWY_MAX_BYTES>(
      stream, source, background, dst, 16 * count,
      [&](const uint8_t* from, const uint8_t* onto, const auto& put) HWY_ATTR {
        const auto r0 = Over<kChoice>(LoadVector<float>(from, 0), LoadVector<float>(onto, 0), part);
        const auto r1 = Over<kChoice>(LoadVector<float>(from, 1), LoadVector<float>(onto, 1), part);
        const auto r2 = Over<kChoice>(LoadVector<float>(from, 2), LoadVector<float>(onto, 2), part);
        const auto r3 = Over<kChoice>(LoadVector<float>(from, 3), LoadVector<float>(onto, 3), part);
        put(r0, 0);
        put(r1, 1);
        put(r2, 2);
        put(r3, 3);
      });
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

template <OverChoice kChoice>
void Over32(const uint8_t* source, const uint8_t* background, uint8_t* dst, size_t count, float opacity, bool) {
  for (size_t i = 0; i < count; ++i) {
    float s[4], d[4];
    std::memcpy(s, source + 16 * i, sizeof s);
    std::memcpy(d, background + 16 * i, sizeof d);
    const float as = kChoice.sourceAlpha ? s[AlphaAt(kChoice)] * opacity : opacity;
    const float ab = kChoice.backgroundAlpha ? d[AlphaAt(kChoice)] : 1.0f;
    const float ao = kChoice.backgroundAlpha ? ab + as - as * ab : 1.0f;
    const bool clear = kChoice.straight && std::fabs(ao) < kAlphaGuard;
    const float t = kChoice.backgroundAlpha && !clear ? as * (1 / ao) : as;
    float out[4];
    ForChannels([&](size_t k) {
      if (k == AlphaAt(kChoice))
        out[k] = ao;
      else if (clear)
        out[k] = 0;
      else if (kChoice.straight)
        out[k] = (1 - t) * d[k] + t * s[k];
      else
        out[k] = s[k] * as + d[k] * (ab - as * ab);
    });
    std::memcpy(dst + 16 * i, out, sizeof out);
  }
}

}  // namespace
}  // namespace plain

namespace {

template <OverChoice kChoice>
const OverKernelSet kOver32 = VX_KERNEL_VARIANTS(Over32<kChoice>);

}  // namespace

const OverKernelSet& Over32f(OverChoice choice) noexcept {
  choice.yuv = false;
  return *[&]<size_t... i>(std::index_sequence<i...>) {
    static constexpr const OverKernelSet* kTable[] = {&kOver32<OverChoiceAt(i & ~size_t{1})>...};
    return kTable[IndexOf(choice)];
  }
  (std::make_index_sequence<kOverChoices>());
}

}  // namespace vexel
#endif  // HWY_ONCE
