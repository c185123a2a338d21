// Normal compositing of premultiplied rows: s o + d (1 - as), alpha like any other channel, about the code of black.
// 8u: both products in 1/64, within 0.54 of the exact result, saturated. 32f: nothing clamped.
#include <cstddef>
#include <cstdint>

#include "composite/NormalKernels.h"
#include "composite/PlainOver8.h"
#include "convert/PlainPixels.h"

#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "composite/PremultipliedKernels.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

#include "composite/Bytes-inl.h"
#include "composite/TwoRows-inl.h"
#include "convert/FloatPixels-inl.h"
#include "frame/KernelTable.h"

#if HWY_TARGET != HWY_SCALAR
HWY_BEFORE_NAMESPACE();
namespace vexel {
namespace HWY_NAMESPACE {
namespace {

using I16Tag = hn::ScalableTag<int16_t>;

template <OverChoice kChoice>
struct Adder {
  explicit HWY_INLINE Adder(float opacity)
      : forSource(hn::Set(I16Tag(), static_cast<int16_t>(plain::Factor15(opacity)))),
        fixedOpacity(hn::Set(hn::ScalableTag<uint16_t>(), plain::FixedOpacity(opacity))) {}

  HWY_INLINE U8 operator()(U8 s, U8 d) const {
    constexpr size_t kAlpha = AlphaAt(kChoice);
    if constexpr (!kChoice.sourceAlpha) s = hn::Or(s, OpaqueVector<kAlpha, uint8_t>());
    if constexpr (!kChoice.backgroundAlpha) d = hn::Or(d, OpaqueVector<kAlpha, uint8_t>());
    const hn::ScalableTag<uint16_t> dw;
    const auto alpha = hn::BitCast(dw, SpreadByte<kAlpha, true>(s));
    const auto forBackground =
        hn::Sub(hn::Set(I16Tag(), 32767), hn::BitCast(I16Tag(), hn::MulHigh(alpha, fixedOpacity)));
    const auto sum = JoinSaturated(Sum<0>(s, d, forBackground), Sum<1>(s, d, forBackground));
    return kChoice.backgroundAlpha ? sum : hn::Or(sum, OpaqueVector<kAlpha, uint8_t>());
  }

 private:
  // Of the even or odd bytes.
  template <int kOdd>
  HWY_INLINE I16 Sum(U8 s, U8 d, I16 forBackground) const {
    const hn::ScalableTag<uint8_t> d8;
    const auto times64 = hn::BitCast(d8, hn::Set(hn::ScalableTag<uint16_t>(), kOdd ? 0x4000 : 0x0040));
    auto s64 = WeighBytes(s, times64), d64 = WeighBytes(d, times64);
    const auto black = hn::BitCast(
        I16Tag(), WeighBytes(hn::BitCast(d8, hn::Set(hn::ScalableTag<uint32_t>(), kBlackVuyWord)), times64));
    if constexpr (kChoice.yuv) {
      s64 = hn::Sub(s64, black);
      d64 = hn::Sub(d64, black);
    }
    auto sum = hn::Add(hn::MulFixedPoint15(s64, forSource), hn::MulFixedPoint15(d64, forBackground));
    if constexpr (kChoice.yuv) sum = hn::Add(sum, black);
    return hn::MulFixedPoint15(sum, hn::Set(I16Tag(), 512));
  }

  I16 forSource;
  U16 fixedOpacity;
};

template <OverChoice kChoice>
HWY_ATTR void Premultiplied8(const uint8_t* source, const uint8_t* background, uint8_t* dst, size_t count,
                             float opacity, bool stream) {
  const Adder<kChoice> add(opacity);
  TwoRowLoop<2 * HWY_MAX_BYTES>(stream, source, background, dst, 4 * count,
                                [&](const uint8_t* from, const uint8_t* onto, const auto& put) HWY_ATTR {
                                  const auto r0 = add(LoadVector<uint8_t>(from, 0), LoadVector<uint8_t>(onto, 0));
                                  const auto r1 = add(LoadVector<uint8_t>(from, 1), LoadVector<uint8_t>(onto, 1));
                                  put(r0, 0);
                                  put(r1, 1);
                                });
}

template <OverChoice kChoice>
HWY_ATTR void Premultiplied32(const uint8_t* source, const uint8_t* background, uint8_t* dst, size_t count,
                              float opacity, bool stream) {
  constexpr size_t kAlpha = AlphaAt(kChoice);
  const FloatTag df;
  const auto one = hn::Set(df, 1.0f), part = hn::Set(df, opacity);
  const auto over = [&](F32 s, F32 d) HWY_ATTR {
    if constexpr (!kChoice.sourceAlpha) s = TakeChannels<1 << kAlpha>(s, one);
    if constexpr (!kChoice.backgroundAlpha) d = TakeChannels<1 << kAlpha>(d, one);
    const auto scaled = hn::Mul(s, part);
    const auto sum = hn::Add(scaled, hn::Mul(d, hn::Sub(one, hn::Broadcast<kAlpha>(scaled))));
    return kChoice.backgroundAlpha ? sum : TakeChannels<1 << kAlpha>(sum, one);
  };
  TwoRowLoop<2 * HWY_MAX_BYTES>(stream, source, background, dst, 16 * count,
                                [&](const uint8_t* from, const uint8_t* onto, const auto& put) HWY_ATTR {
                                  const auto r0 = over(LoadVector<float>(from, 0), LoadVector<float>(onto, 0));
                                  const auto r1 = over(LoadVector<float>(from, 1), LoadVector<float>(onto, 1));
                                  put(r0, 0);
                                  put(r1, 1);
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

// Calls channel(k, s, d, sourceAlpha) for each channel of each pixel, alphas that are not usable taken as full.
template <class T, OverChoice kChoice, class Channel>
void OverPixels(const uint8_t* source, const uint8_t* background, uint8_t* dst, size_t count, const Channel& channel) {
  constexpr size_t kAlpha = AlphaAt(kChoice);
  for (size_t i = 0; i < count; ++i) {
    T s[4], d[4], out[4];
    std::memcpy(s, source + i * sizeof s, sizeof s);
    std::memcpy(d, background + i * sizeof d, sizeof d);
    if (!kChoice.sourceAlpha) s[kAlpha] = kFullScale<T>;
    if (!kChoice.backgroundAlpha) d[kAlpha] = kFullScale<T>;
    ForChannels([&](size_t k) { out[k] = channel(k, s[k], d[k], s[kAlpha]); });
    if (!kChoice.backgroundAlpha) out[kAlpha] = kFullScale<T>;
    std::memcpy(dst + i * sizeof out, out, sizeof out);
  }
}

template <OverChoice kChoice>
void Premultiplied8(const uint8_t* source, const uint8_t* background, uint8_t* dst, size_t count, float opacity, bool) {
  const int forSource = Factor15(opacity);
  const uint16_t fixedOpacity = FixedOpacity(opacity);
  OverPixels<uint8_t, kChoice>(source, background, dst, count, [&](size_t k, int s, int d, int alpha) {
    const int black = kChoice.yuv ? kBlackVuy[k] : 0;
    const auto product = [&](int c, int factor) { return ((c - black) * 64 * factor + 16384) >> 15; };
    const int sum = product(s, forSource) + product(d, 32767 - Weight15(alpha, fixedOpacity));
    return static_cast<uint8_t>(Clamp((sum + 64 * black + 32) >> 6, 0, 255));
  });
}

template <OverChoice kChoice>
void Premultiplied32(const uint8_t* source, const uint8_t* background, uint8_t* dst, size_t count, float opacity,
                     bool) {
  OverPixels<float, kChoice>(source, background, dst, count, [&](size_t, float s, float d, float alpha) {
    return s * opacity + d * (1 - alpha * opacity);
  });
}

}  // namespace
}  // namespace plain

namespace {

template <OverChoice kChoice>
const OverKernelSet kPremultiplied8 = VX_KERNEL_VARIANTS(Premultiplied8<kChoice>);
template <OverChoice kChoice>
const OverKernelSet kPremultiplied32 = VX_KERNEL_VARIANTS(Premultiplied32<kChoice>);

// The choice of an index without what does not count.
constexpr OverChoice PremultipliedAt(size_t index, bool narrow) {
  OverChoice choice = OverChoiceAt(index);
  choice.yuv = narrow && (index & 1) != 0 && !choice.alphaFirst;
  choice.straight = false;
  return choice;
}

}  // namespace

const OverKernelSet& OverPremultiplied8u(OverChoice choice) noexcept {
  return *[&]<size_t... i>(std::index_sequence<i...>) {
    static constexpr const OverKernelSet* kTable[] = {&kPremultiplied8<PremultipliedAt(i, true)>...};
    return kTable[IndexOf(choice)];
  }
  (std::make_index_sequence<kOverChoices>());
}

const OverKernelSet& OverPremultiplied32f(OverChoice choice) noexcept {
  return *[&]<size_t... i>(std::index_sequence<i...>) {
    static constexpr const OverKernelSet* kTable[] = {&kPremultiplied32<PremultipliedAt(i, false)>...};
    return kTable[IndexOf(choice)];
  }
  (std::make_index_sequence<kOverChoices>());
}

}  // namespace vexel
#endif  // HWY_ONCE
