// Over opaque black. In 8u the opacity counts in 1/255, and every division by 255 is exact and rounded to nearest. In
// 32f, pixels whose alpha times opacity reaches 1 keep their colour, and a NaN channel stays as it is.
#include <cstddef>
#include <cstdint>

#include "composite/Opacity.h"
#include "composite/PlainOver8.h"
#include "composite/ToBlackKernels.h"
#include "convert/PlainPixels.h"

#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "composite/ToBlackKernels.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

#include "composite/Bytes-inl.h"
#include "convert/PixelVectors-inl.h"
#include "frame/KernelTable.h"

#ifndef VEXEL_COMPOSITE_TOBLACKKERNELS_SHARED
#define VEXEL_COMPOSITE_TOBLACKKERNELS_SHARED
namespace vexel {
namespace {

// Which channel is alpha, and whether black is that of studio-range VUY.
struct BlackLayout {
  size_t alpha;
  bool vuy;
};
constexpr BlackLayout kLast = {3, false}, kFirst = {0, false}, kVuya = {3, true};

// 0..255; opacity is 0..1.
inline int Opacity255(float opacity) { return static_cast<int>(opacity * 255 + 0.5f); }

}  // namespace
}  // namespace vexel
#endif

#if HWY_TARGET != HWY_SCALAR
HWY_BEFORE_NAMESPACE();
namespace vexel {
namespace HWY_NAMESPACE {
namespace {

// Maps rows of pixels of kBytes bytes by op(vector), four vectors at a time; dst may be src.
template <class T, class Op>
HWY_INLINE void MapInPlace(const uint8_t* src, uint8_t* dst, size_t count, const Op& op) {
  constexpr size_t kPixel = 4 * sizeof(T), kBlock = 4 * HWY_MAX_BYTES / kPixel;
  size_t i = 0;
  const EachVector<T, Op> each{op};
  for (; i + kBlock <= count; i += kBlock) each(src + i * kPixel, dst + i * kPixel);
  if (const size_t rest = count - i) {
    alignas(64) uint8_t block[2][kBlock * kPixel] = {};
    std::memcpy(block[0], src + i * kPixel, rest * kPixel);
    each(block[0], block[1]);
    std::memcpy(dst + i * kPixel, block[1], rest * kPixel);
  }
}

// black + (c - black) alpha / 255 in 16-bit lanes: n + 128, all of 128..65153, for which (n + 128) * 257 >> 16 is the
// rounded quotient. The differences wrap around where they are negative.
template <BlackLayout kLayout, bool kFull>
struct Darken8 {
  U16 level;                // 0..255
  U16 blackEven, blackOdd;  // of the channels

  HWY_INLINE U8 operator()(U8 v) const {
    auto alpha = hn::BitCast(d, SpreadByte<kLayout.alpha, false>(v));
    if constexpr (!kFull) alpha = Divide255(hn::Mul(alpha, level));
    const EvenOdd channels = SplitBytes(v);
    const auto result = JoinBytes(Scaled(channels.even, alpha, blackEven), Scaled(channels.odd, alpha, blackOdd));
    return hn::Or(result, OpaqueVector<kLayout.alpha, uint8_t>());
  }

 private:
  static HWY_INLINE I16 Scaled(I16 channels, U16 alpha, U16 black) {
    const hn::ScalableTag<int16_t> di;
    const auto c = hn::BitCast(d, channels);
    if constexpr (!kLayout.vuy) return hn::BitCast(di, Divide255(hn::Mul(c, alpha)));
    const auto ofBlack = hn::Mul(black, hn::Set(d, 255));
    return hn::BitCast(di, Divide255(hn::Add(hn::Mul(hn::Sub(c, black), alpha), ofBlack)));
  }
  static HWY_INLINE U16 Divide255(U16 n) { return hn::MulHigh(hn::Add(n, hn::Set(d, 128)), hn::Set(d, 257)); }

  static constexpr hn::ScalableTag<uint16_t> d{};
};

template <BlackLayout kLayout>
HWY_ATTR void ToBlack8(const uint8_t* src, uint8_t* dst, size_t count, float opacity) {
  const hn::ScalableTag<uint16_t> d;
  const int opacity255 = Opacity255(opacity);
  const EvenOdd black =
      SplitBytes(hn::BitCast(hn::ScalableTag<uint8_t>(), hn::Set(hn::ScalableTag<uint32_t>(), kBlackVuyWord)));
  const auto even = hn::BitCast(d, black.even), odd = hn::BitCast(d, black.odd);
  const auto level = hn::Set(d, static_cast<uint16_t>(opacity255));
  if (opacity255 == 255)
    MapInPlace<uint8_t>(src, dst, count, Darken8<kLayout, true>{level, even, odd});
  else
    MapInPlace<uint8_t>(src, dst, count, Darken8<kLayout, false>{level, even, odd});
}

template <BlackLayout kLayout>
struct Darken32 {
  F32 opacity;

  HWY_INLINE F32 operator()(F32 v) const {
    const hn::ScalableTag<float> d;
    const auto one = hn::Set(d, 1.0f);
    const auto alpha = hn::Mul(hn::Broadcast<kLayout.alpha>(v), opacity);
    const auto keeps = hn::Or(hn::Gt(hn::Add(alpha, hn::Set(d, kAlphaGuard)), one), hn::IsNaN(v));
    const auto isAlpha = hn::MaskFromVec(ChannelMask<kLayout.alpha, float>());
    return hn::IfThenElse(isAlpha, one, hn::IfThenElse(keeps, v, hn::Mul(v, alpha)));
  }
};

template <BlackLayout kLayout>
HWY_ATTR void ToBlack32(const uint8_t* src, uint8_t* dst, size_t count, float opacity) {
  MapInPlace<float>(src, dst, count, Darken32<kLayout>{hn::Set(hn::ScalableTag<float>(), opacity)});
}

// Folds the comparisons of all channels; only the alpha lanes count in the end.
template <class T, size_t kAlpha>
HWY_INLINE AlphaState TestAlpha(const uint8_t* row, size_t count) {
  const hn::ScalableTag<T> d;
  constexpr size_t kPixels = HWY_MAX_BYTES / (4 * sizeof(T));
  const auto full = hn::Set(d, kFullScale<T>), none = hn::Zero(d);
  auto opaque = hn::VecFromMask(d, hn::Eq(none, none)), clear = opaque;
  const auto fold = [&](const uint8_t* pixels) HWY_ATTR {
    const auto v = LoadVector<T>(pixels);
    opaque = hn::And(opaque, hn::VecFromMask(d, hn::Eq(v, full)));
    clear = hn::And(clear, hn::VecFromMask(d, hn::Eq(v, none)));
  };
  const auto all = [&](Full<T> lanes) HWY_ATTR {
    const hn::ScalableTag<uint8_t> d8;
    const auto wanted = hn::BitCast(d8, ChannelMask<kAlpha, T>());
    return hn::AllTrue(d8, hn::Eq(hn::And(hn::BitCast(d8, lanes), wanted), wanted));
  };
  size_t i = 0;
  for (; i + kPixels <= count; i += kPixels) fold(row + i * 4 * sizeof(T));
  if (const size_t rest = count - i) {
    // The padding repeats a pixel of the row.
    alignas(64) uint8_t block[HWY_MAX_BYTES];
    for (size_t k = 0; k < kPixels; ++k)
      std::memcpy(block + k * 4 * sizeof(T), row + (i + (k < rest ? k : 0)) * 4 * sizeof(T), 4 * sizeof(T));
    fold(block);
  }
  return all(opaque) ? AlphaState::Opaque : all(clear) ? AlphaState::Clear : AlphaState::Mixed;
}
template <BlackLayout kLayout>
HWY_ATTR AlphaState TestAlpha8(const uint8_t* row, size_t count) {
  return TestAlpha<uint8_t, kLayout.alpha>(row, count);
}
template <BlackLayout kLayout>
HWY_ATTR AlphaState TestAlpha32(const uint8_t* row, size_t count) {
  return TestAlpha<float, kLayout.alpha>(row, count);
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

template <BlackLayout kLayout>
void ToBlack8(const uint8_t* src, uint8_t* dst, size_t count, float opacity) {
  const int level = Opacity255(opacity);
  MapPixels<uint8_t, uint8_t>(src, dst, count, [&](const uint8_t* in, uint8_t* out) {
    const int alpha = Divide255(in[kLayout.alpha] * level);
    ForChannels([&](size_t k) {
      const int black = kLayout.vuy ? kBlackVuy[k] : 0;
      out[k] = static_cast<uint8_t>(k == kLayout.alpha ? 255 : Divide255(in[k] * alpha + black * (255 - alpha)));
    });
  });
}

template <BlackLayout kLayout>
void ToBlack32(const uint8_t* src, uint8_t* dst, size_t count, float opacity) {
  MapPixels<float, float>(src, dst, count, [&](const float* in, float* out) {
    const float alpha = in[kLayout.alpha] * opacity;
    const bool keeps = alpha + kAlphaGuard > 1.0f;
    ForChannels([&](size_t k) {
      out[k] = k == kLayout.alpha ? 1.0f : keeps || in[k] != in[k] ? in[k] : in[k] * alpha;
    });
  });
}

template <class T, size_t kAlpha>
AlphaState TestAlpha(const uint8_t* row, size_t count) {
  bool opaque = true, clear = true;
  for (size_t i = 0; i < count; ++i) {
    T alpha;
    std::memcpy(&alpha, row + (4 * i + kAlpha) * sizeof(T), sizeof(T));
    opaque &= alpha == kFullScale<T>;
    clear &= alpha == T{0};
  }
  return opaque ? AlphaState::Opaque : clear ? AlphaState::Clear : AlphaState::Mixed;
}

template <BlackLayout kLayout>
AlphaState TestAlpha8(const uint8_t* row, size_t count) {
  return TestAlpha<uint8_t, kLayout.alpha>(row, count);
}
template <BlackLayout kLayout>
AlphaState TestAlpha32(const uint8_t* row, size_t count) {
  return TestAlpha<float, kLayout.alpha>(row, count);
}

}  // namespace
}  // namespace plain

const ToBlackKernelSet kToBlackLast8u = VX_KERNEL_VARIANTS(ToBlack8<kLast>);
const ToBlackKernelSet kToBlackFirst8u = VX_KERNEL_VARIANTS(ToBlack8<kFirst>);
const ToBlackKernelSet kToBlackVuya8u = VX_KERNEL_VARIANTS(ToBlack8<kVuya>);
const ToBlackKernelSet kToBlackLast32f = VX_KERNEL_VARIANTS(ToBlack32<kLast>);
const ToBlackKernelSet kToBlackFirst32f = VX_KERNEL_VARIANTS(ToBlack32<kFirst>);
const AlphaTestSet kTestAlphaLast8u = VX_KERNEL_VARIANTS(TestAlpha8<kLast>);
const AlphaTestSet kTestAlphaFirst8u = VX_KERNEL_VARIANTS(TestAlpha8<kFirst>);
const AlphaTestSet kTestAlphaLast32f = VX_KERNEL_VARIANTS(TestAlpha32<kLast>);
const AlphaTestSet kTestAlphaFirst32f = VX_KERNEL_VARIANTS(TestAlpha32<kFirst>);

}  // namespace vexel
#endif  // HWY_ONCE
