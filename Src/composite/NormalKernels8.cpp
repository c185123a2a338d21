// 8-bit normal compositing, within 0.52 of the exact result in every channel. Every pixel's result depends on that
// pixel only.
//
// Over an opaque pixel the colours are mixed with a weight of 15 bits, alpha times opacity. Over any other the weight
// comes from floats, with one division for each pixel. There opaque pixels take their alpha times opacity from the
// same 15 bits, so that both ways give them the same bytes.
#include <cstddef>
#include <cstdint>

#include "composite/NormalKernels.h"
#include "composite/PlainOver8.h"
#include "convert/PlainPixels.h"

#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "composite/NormalKernels8.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

#include "composite/Bytes-inl.h"
#include "composite/TwoRows-inl.h"
#include "frame/KernelTable.h"

#ifndef VEXEL_COMPOSITE_NORMALKERNELS8_SHARED
#define VEXEL_COMPOSITE_NORMALKERNELS8_SHARED
namespace vexel {
namespace {

// A straight result's alpha up to this counts as none; the colour is black then.
constexpr float kClearAlpha = 7.6293945e-6f;

}  // namespace
}  // namespace vexel
#endif

#if HWY_TARGET != HWY_SCALAR
HWY_BEFORE_NAMESPACE();
namespace vexel {
namespace HWY_NAMESPACE {
namespace {

template <size_t kByte>
HWY_INLINE I32 ByteOf(U8 v) {
  const hn::ScalableTag<uint32_t> du;
  auto words = hn::BitCast(du, v);
  if constexpr (kByte > 0) words = hn::ShiftRight<8 * kByte>(words);
  if constexpr (kByte < 3) words = hn::And(words, hn::Set(du, 255));
  return hn::BitCast(hn::ScalableTag<int32_t>(), words);
}
template <size_t kByte>
HWY_INLINE F32 FloatOf(U8 v) {
  return hn::ConvertTo(hn::ScalableTag<float>(), ByteOf<kByte>(v));
}
template <size_t kByte>
HWY_INLINE U32 PlaceByte(I32 v) {
  const auto words = hn::BitCast(hn::ScalableTag<uint32_t>(), v);
  if constexpr (kByte == 0) return words;
  return hn::ShiftLeft<8 * kByte>(words);
}

template <OverChoice kChoice>
struct Compositor {
  static constexpr size_t kAlpha = AlphaAt(kChoice), kColour = kChoice.alphaFirst ? 1 : 0;

  explicit HWY_INLINE Compositor(float opacity)
      : scale(hn::Set(df, kChoice.sourceAlpha ? opacity * k8uTo32f : opacity)),
        fixedOpacity(hn::Set(hn::ScalableTag<uint16_t>(), plain::FixedOpacity(opacity))),
        weight(static_cast<int16_t>(plain::Weight15(255, plain::FixedOpacity(opacity)))) {}

  HWY_INLINE U8 OverOpaque(U8 s, U8 d) const {
    return hn::Or(Mix15(s, d, Weights(s)), OpaqueVector<kAlpha, uint8_t>());
  }

  HWY_INLINE U8 OverAny(U8 s, U8 d) const {
    // Not hn::Eq of floats: 255 / 255 is 1, but nobody has to know.
    const auto isOpaque = hn::RebindMask(df, hn::Eq(ByteOf<kAlpha>(d), hn::Set(di, 255)));
    auto as = scale;
    if constexpr (kChoice.sourceAlpha) as = hn::Mul(FloatOf<kAlpha>(s), scale);
    as = hn::IfThenElse(isOpaque, hn::Mul(hn::ConvertTo(df, WeightOfPixel(s)), hn::Set(df, 1.0f / 32768)), as);
    const auto ab = hn::Mul(FloatOf<kAlpha>(d), hn::Set(df, k8uTo32f));
    const auto ao = hn::Add(as, hn::Sub(ab, hn::Mul(ab, as)));
    const auto alpha = PlaceByte<kAlpha>(ConvertNearest(hn::Mul(ao, hn::Set(df, 255.0f))));
    const auto colour = kChoice.straight ? StraightColour(s, d, as, ao) : PremultipliedColour(s, d, as, ao);
    auto result = hn::Or(colour, alpha);
    if constexpr (kChoice.straight) {
      const auto isClear = hn::RebindMask(du, hn::Le(ao, hn::Set(df, kClearAlpha)));
      result = hn::IfThenElse(isClear, hn::Set(du, kChoice.yuv ? kBlackVuyWord : 0), result);
    }
    return hn::BitCast(d8, result);
  }

 private:
  // Alpha times opacity in 1/32768, for all channels and in one lane for each pixel.
  HWY_INLINE I16 Weights(U8 s) const {
    const hn::ScalableTag<int16_t> d16;
    if constexpr (!kChoice.sourceAlpha) return hn::Set(d16, weight);
    return hn::BitCast(d16, hn::MulHigh(hn::BitCast(dw, SpreadByte<kAlpha, true>(s)), fixedOpacity));
  }
  HWY_INLINE I32 WeightOfPixel(U8 s) const {
    if constexpr (!kChoice.sourceAlpha) return hn::Set(di, weight);
    const auto alpha = hn::ShiftLeft<8>(ByteOf<kAlpha>(s));
    return hn::BitCast(di, hn::MulHigh(hn::BitCast(dw, alpha), fixedOpacity));
  }

  static HWY_INLINE U32 StraightColour(U8 s, U8 d, F32 as, F32 ao) {
    const auto inverse = hn::Div(hn::Set(df, 32768.0f), hn::Max(ao, hn::Set(df, kClearAlpha)));
    const auto part = hn::Min(ConvertNearest(hn::Mul(as, inverse)), hn::Set(di, 32767));
    return hn::BitCast(du, hn::AndNot(OpaqueVector<kAlpha, uint8_t>(), Mix15(s, d, SpreadWord(part))));
  }
  static HWY_INLINE U32 PremultipliedColour(U8 s, U8 d, F32 as, F32 ao) {
    const auto channel = [&](F32 cs, F32 cd, int black) HWY_ATTR {
      auto sum = hn::Add(hn::Mul(cd, ao), hn::Mul(hn::Sub(cs, cd), as));
      if constexpr (kChoice.yuv)
        sum = hn::Add(sum, hn::Mul(hn::Sub(hn::Set(df, 1.0f), ao), hn::Set(df, static_cast<float>(black))));
      return Truncate(hn::Add(sum, hn::Set(df, 0.5f)));
    };
    constexpr size_t k0 = kColour, k1 = kColour + 1, k2 = kColour + 2;
    const auto c0 = PlaceByte<k0>(channel(FloatOf<k0>(s), FloatOf<k0>(d), kBlackVuy[k0]));
    const auto c1 = PlaceByte<k1>(channel(FloatOf<k1>(s), FloatOf<k1>(d), kBlackVuy[k1]));
    const auto c2 = PlaceByte<k2>(channel(FloatOf<k2>(s), FloatOf<k2>(d), kBlackVuy[k2]));
    return hn::Or(c0, hn::Or(c1, c2));
  }

  static constexpr hn::ScalableTag<uint8_t> d8{};
  static constexpr hn::ScalableTag<uint16_t> dw{};
  static constexpr hn::ScalableTag<uint32_t> du{};
  static constexpr hn::ScalableTag<int32_t> di{};
  static constexpr hn::ScalableTag<float> df{};

  F32 scale;  // times a source's alpha code; the opacity itself where there is none
  U16 fixedOpacity;
  int16_t weight;  // of a source without alpha
};

template <OverChoice kChoice>
HWY_ATTR void Over8(const uint8_t* source, const uint8_t* background, uint8_t* dst, size_t count, float opacity,
                    bool stream) {
  const Compositor<kChoice> compositor(opacity);
  const auto opaque = OpaqueVector<AlphaAt(kChoice), uint8_t>();
  TwoRowLoop<2 * HWY_MAX_BYTES>(
      stream, source, background, dst, 4 * count,
      [&](const uint8_t* from, const uint8_t* onto, const auto& put) HWY_ATTR {
        const auto s0 = LoadVector<uint8_t>(from, 0), s1 = LoadVector<uint8_t>(from, 1);
        const auto d0 = LoadVector<uint8_t>(onto, 0), d1 = LoadVector<uint8_t>(onto, 1);
        const auto both = hn::And(hn::And(d0, d1), opaque);
        if (!kChoice.backgroundAlpha || hn::AllTrue(hn::ScalableTag<uint8_t>(), hn::Eq(both, opaque))) {
          put(compositor.OverOpaque(s0, d0), 0);
          put(compositor.OverOpaque(s1, d1), 1);
        } else {
          const auto r0 = compositor.OverAny(s0, d0), r1 = compositor.OverAny(s1, d1);
          put(r0, 0);
          put(r1, 1);
        }
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
void PixelOverOpaque(const uint8_t* s, const uint8_t* d, float opacity, uint8_t* out) {
  const int alpha = kChoice.sourceAlpha ? s[AlphaAt(kChoice)] : 255;
  const int weight = Weight15(alpha, FixedOpacity(opacity));
  ForChannels([&](size_t k) { out[k] = k == AlphaAt(kChoice) ? 255 : Mix15(s[k], d[k], weight); });
}

template <OverChoice kChoice>
void PixelOverAny(const uint8_t* s, const uint8_t* d, float opacity, uint8_t* out) {
  const float as = kChoice.sourceAlpha ? s[AlphaAt(kChoice)] * (opacity * k8uTo32f) : opacity;
  const float ab = d[AlphaAt(kChoice)] * k8uTo32f;
  const float ao = as + (ab - ab * as);
  const bool clear = kChoice.straight && ao <= kClearAlpha;
  const int weight = kChoice.straight && !clear ? Clamp(ConvertNearest(as * (32768 / ao)), 0, 32767) : 0;
  ForChannels([&](size_t k) {
    const int black = kChoice.yuv ? kBlackVuy[k] : 0;
    if (k == AlphaAt(kChoice)) {
      out[k] = static_cast<uint8_t>(clear ? 0 : ConvertNearest(ao * 255));
    } else if (kChoice.straight) {
      out[k] = clear ? static_cast<uint8_t>(black) : Mix15(s[k], d[k], weight);
    } else {
      float sum = d[k] * ao + (s[k] - d[k]) * as;
      if (kChoice.yuv) sum += (1 - ao) * black;
      out[k] = static_cast<uint8_t>(sum + 0.5f);
    }
  });
}

template <OverChoice kChoice>
void Over8(const uint8_t* source, const uint8_t* background, uint8_t* dst, size_t count, float opacity, bool) {
  for (size_t i = 0; i < 4 * count; i += 4) {
    uint8_t out[4];
    if (!kChoice.backgroundAlpha || background[i + AlphaAt(kChoice)] == 255)
      PixelOverOpaque<kChoice>(source + i, background + i, opacity, out);
    else
      PixelOverAny<kChoice>(source + i, background + i, opacity, out);
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
  return *[&]<size_t... i>(std::index_sequence<i...>) {
    static constexpr const OverKernelSet* kTable[] = {&kOver8<OverChoiceAt(i)>...};
    return kTable[IndexOf(choice)];
  }
  (std::make_index_sequence<kOverChoices>());
}

}  // namespace vexel
#endif  // HWY_ONCE
