// The kernels of Dissolve, which takes each pixel from one picture or the other.
#include <cmath>
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <type_traits>

#include "composite/BlendKernels.h"
#include "composite/Opacity.h"
#include "composite/PlainBlend.h"

#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "composite/DissolveBlendKernels.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

#include "composite/BlendVectors-inl.h"
#include "composite/TwoRows-inl.h"
#include "frame/KernelTable.h"

#ifndef VEXEL_COMPOSITE_DISSOLVEBLENDKERNELS_STEPS
#define VEXEL_COMPOSITE_DISSOLVEBLENDKERNELS_STEPS
namespace vexel {
namespace {

// k draws at once: state * factor + addend.
constexpr uint32_t AddendOf(size_t k) {
  RandomSequence sequence(0);
  sequence.Skip(k);
  return sequence.State();
}
constexpr uint32_t FactorOf(size_t k) {
  RandomSequence sequence(1);
  sequence.Skip(k);
  return sequence.State() - AddendOf(k);
}

}  // namespace
}  // namespace vexel
#endif

#if HWY_TARGET != HWY_SCALAR
HWY_BEFORE_NAMESPACE();
namespace vexel {
namespace HWY_NAMESPACE {
namespace {

// From the state before a vector of pixels to the state of each of its pixels' draws. Floats are in transposed blocks.
template <bool kTransposed>
struct FirstDraws {
  constexpr FirstDraws() {
    for (size_t lane = 0; lane < kLanes<uint32_t>; ++lane) {
      const size_t pixel = kTransposed ? lane % 4 * (kLanes<uint32_t> / 4) + lane / 4 : lane;
      factors[lane] = FactorOf(pixel + 1);
      addends[lane] = AddendOf(pixel + 1);
    }
  }
  alignas(64) uint32_t factors[kLanes<uint32_t>] = {};
  alignas(64) uint32_t addends[kLanes<uint32_t>] = {};
};

template <bool kTransposed>
HWY_INLINE U32 Draw(uint32_t state) {
  static constexpr FirstDraws<kTransposed> kFirst;
  const hn::ScalableTag<uint32_t> d;
  return hn::Add(hn::Mul(hn::Set(d, state), hn::Load(d, kFirst.factors)), hn::Load(d, kFirst.addends));
}

HWY_INLINE auto TakesBackground(F32 p, U32 states) {
  const hn::ScalableTag<float> df;
  const hn::ScalableTag<int32_t> di;
  const auto n = Truncate(hn::Mul(Limit(p, -1.0f, 1.0f), SetFloat(32767.0f)));
  const auto r = hn::And(hn::BitCast(di, hn::ShiftRight<16>(states)), hn::Set(di, 0x7FFF));
  // r > n holds for every negative n.
  const auto loses = hn::AndNot(hn::Lt(n, hn::Zero(di)), hn::Gt(r, n));
  return hn::Or(hn::Lt(hn::Abs(p), SetFloat(kAlphaGuard)), hn::RebindMask(df, loses));
}

struct DissolveBytes {
  static constexpr size_t kBytes = 4;
  static constexpr bool kTransposed = false;
  F32 opacity;
  bool reversed;
  HWY_INLINE void operator()(const uint8_t* src, const uint8_t* background, uint8_t* dst, U32 states) const {
    const hn::ScalableTag<uint32_t> d;
    const auto s = LoadVector<uint32_t>(src), b = LoadVector<uint32_t>(background);
    const auto codes = reversed ? hn::And(s, hn::Set(d, 255)) : hn::ShiftRight<24>(s);
    const auto alpha = hn::Mul(hn::ConvertTo(hn::ScalableTag<float>(), hn::BitCast(hn::ScalableTag<int32_t>(), codes)),
                               SetFloat(k8uTo32f));
    const auto takesBackground = TakesBackground(hn::Mul(alpha, opacity), states);
    StoreVector(hn::IfThenElse(hn::RebindMask(d, takesBackground), b, s), dst);
  }
};

struct DissolveFloats {
  static constexpr size_t kBytes = 16;
  static constexpr bool kTransposed = true;
  F32 opacity;
  bool reversed;
  HWY_INLINE void operator()(const uint8_t* src, const uint8_t* background, uint8_t* dst, U32 states) const {
    const FloatPixels pixels{BytePixels{}};
    const Planes s = pixels.Load(src), b = pixels.Load(background);
    const auto takesBackground = TakesBackground(hn::Mul(s.alpha, opacity), states);
    const auto choose = [&](F32 x, F32 y) HWY_ATTR { return hn::IfThenElse(takesBackground, y, x); };
    pixels.Store({PerChannel(choose, s.colour, b.colour), choose(s.alpha, b.alpha)}, dst);
  }
};

template <class Body>
HWY_ATTR void DissolveRow(const uint8_t* src, const uint8_t* background, uint8_t* dst, size_t count, bool reversed,
                          float opacity, RandomSequence& sequence) {
  constexpr size_t kBlock = kLanes<uint32_t>, kBytes = Body::kBytes;
  constexpr uint32_t kFactor = FactorOf(kBlock), kAddend = AddendOf(kBlock);
  const hn::ScalableTag<uint32_t> d;
  const Body body{SetFloat(opacity), reversed};
  auto states = Draw<Body::kTransposed>(sequence.State());
  sequence.Skip(count);
  const auto block = [&](const uint8_t* s, const uint8_t* b, uint8_t* out) HWY_ATTR {
    body(s, b, out, states);
    states = hn::Add(hn::Mul(states, hn::Set(d, kFactor)), hn::Set(d, kAddend));
  };
  TwoRowLoop<kBlock * kBytes>(src, background, dst, count * kBytes, block);
}

template <size_t kPixel>
HWY_ATTR void DissolveByPlace(const uint8_t* src, const uint8_t* background, uint8_t* dst, size_t count, bool reversed,
                              float opacity, RandomSequence& sequence) {
  using Body = std::conditional_t<kPixel == 4, DissolveBytes, DissolveFloats>;
  DissolveRow<Body>(src, background, dst, count, reversed, opacity, sequence);
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

// Without branches, which nothing could predict.
template <size_t kPixel, bool kByPlace>
void DissolveRow(const uint8_t* src, const uint8_t* background, uint8_t* dst, size_t count, bool reversed,
                 float opacity, RandomSequence& randomSequence) {
  const size_t alphaAt = kPixel == 16 ? 12 : reversed ? 0 : 3;
  RandomSequence sequence = randomSequence;
  for (size_t at = 0; at < count * kPixel; at += kPixel) {
    float alpha = src[at + alphaAt] * k8uTo32f;
    if constexpr (kPixel == 16) std::memcpy(&alpha, src + at + alphaAt, sizeof alpha);
    const float p = alpha * opacity;
    // More than certain is certain; NaN counts as negative.
    const int n = static_cast<int>(Limit(p, -1, 1) * 32767.0f);
    const bool isNothing = std::fabs(p) < kAlphaGuard;
    RandomSequence next = sequence;
    const int r = next.Next();
    if (kByPlace || (!isNothing & (n >= 0))) sequence = next;
    const uint32_t fromBackground = 0u - static_cast<uint32_t>(isNothing | ((n >= 0) & (r > n)));
    uint32_t s[kPixel / 4], d[kPixel / 4];
    std::memcpy(s, src + at, kPixel);
    std::memcpy(d, background + at, kPixel);
    for (size_t i = 0; i < kPixel / 4; ++i) d[i] = (d[i] & fromBackground) | (s[i] & ~fromBackground);
    std::memcpy(dst + at, d, kPixel);
  }
  randomSequence = sequence;
}

template <size_t kPixel>
void DissolveByPlace(const uint8_t* src, const uint8_t* background, uint8_t* dst, size_t count, bool reversed,
                     float opacity, RandomSequence& sequence) {
  DissolveRow<kPixel, true>(src, background, dst, count, reversed, opacity, sequence);
}

}  // namespace
}  // namespace plain

const KernelVariants<DissolveBlendKernel> kBlendDissolveBytesByPlace = VX_KERNEL_VARIANTS(DissolveByPlace<4>);
const KernelVariants<DissolveBlendKernel> kBlendDissolveFloatsByPlace = VX_KERNEL_VARIANTS(DissolveByPlace<16>);
const DissolveBlendKernel kBlendDissolveBytesInTurn = &plain::DissolveRow<4, false>;
const DissolveBlendKernel kBlendDissolveFloatsInTurn = &plain::DissolveRow<16, false>;

}  // namespace vexel
#endif  // HWY_ONCE
