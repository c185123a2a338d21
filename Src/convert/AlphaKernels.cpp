// Straight <-> premultiplied alpha. Alpha itself is copied; 15u values above 32768 count as 32768.
//
// Integer results are the exact quotients rounded to nearest, ties up, saturated to full scale. (Ties occur in 8u
// unpremultiplying and 15u premultiplying only.) In 32f, premultiplying is one multiplication and unpremultiplying one
// true division, not clamped; a NaN channel stays as it is. Unpremultiplying alpha 0 gives black.
#include <cstddef>
#include <cstdint>

#include "convert/PlainPixels.h"
#include "convert/RgbKernels.h"

#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "convert/AlphaKernels.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

#include "convert/PixelVectors-inl.h"
#include "frame/KernelTable.h"

#ifndef VEXEL_CONVERT_ALPHAKERNELS_LAYOUTS
#define VEXEL_CONVERT_ALPHAKERNELS_LAYOUTS
namespace vexel {
namespace {

// Where alpha is in a pixel, and the code of black in the first three channels.
struct Layout {
  size_t alpha;
  int black[3];
};
constexpr Layout kAlphaLast = {3, {0, 0, 0}};
constexpr Layout kAlphaFirst = {0, {0, 0, 0}};
constexpr Layout kVuya = {3, {128, 128, 16}};

constexpr int BlackOf(const Layout& layout, size_t channel) { return channel < 3 ? layout.black[channel] : 0; }
constexpr bool IsVuy(const Layout& layout) { return layout.black[0] != 0; }
constexpr AlphaWrite OpaqueAt(const Layout& layout) {
  return layout.alpha == 0 ? AlphaWrite::OpaqueFirst : AlphaWrite::OpaqueLast;
}

}  // namespace
}  // namespace vexel
#endif

#if HWY_TARGET != HWY_BASELINE_SCALAR
HWY_BEFORE_NAMESPACE();
namespace vexel {
namespace HWY_NAMESPACE {
namespace {

// Four vectors per block, each mapped by op; a block of opaque pixels only is copied, which gives the same bytes.
template <class T, const Layout& kLayout, class Op>
struct UnlessOpaque {
  Op op;
  HWY_INLINE void operator()(const uint8_t* in, uint8_t* out) const {
    const hn::ScalableTag<T> d;
    const auto v0 = Op::Load(in, 0), v1 = Op::Load(in, 1), v2 = Op::Load(in, 2), v3 = Op::Load(in, 3);
    const auto opaque = ChannelVector<kLayout.alpha, T>(kFullScale<T>, 0);
    const auto all = hn::And(hn::And(v0, v1), hn::And(v2, v3));
    const bool copy = hn::AllTrue(d, hn::Eq(hn::And(all, opaque), opaque));
    StoreVector(copy ? v0 : op(v0), out, 0);
    StoreVector(copy ? v1 : op(v1), out, 1);
    StoreVector(copy ? v2 : op(v2), out, 2);
    StoreVector(copy ? v3 : op(v3), out, 3);
  }
};

// ---- 8u ----

struct Load8 {
  static HWY_INLINE U8 Load(const uint8_t* in, size_t index) { return LoadVector<uint8_t>(in, index); }
};

// black + (c - black) a / 255 in 16-bit lanes: all of t = 255 black + (c - black) a lies in 0..65025, where
// (t + 128) * 257 >> 16 is the rounded quotient. The alpha channel is multiplied by 255.
template <const Layout& kLayout>
struct Premultiply8 : Load8 {
  // The block-wise lower or upper half of the pixels: `channels` widened to 16 bits, `alpha` of each one four times.
  HWY_INLINE I16 Half(U8 channels, U8 alpha) const {
    const hn::ScalableTag<uint16_t> d;
    alignas(16) uint16_t black[8], bias[8];
    for (size_t i = 0; i < 8; ++i) {
      black[i] = static_cast<uint16_t>(BlackOf(kLayout, i % 4));
      bias[i] = static_cast<uint16_t>(black[i] * 255 + 128);
    }
    const auto factor = hn::Or(hn::BitCast(d, alpha), ChannelVector<kLayout.alpha, uint16_t>(255, 0));
    auto c = hn::BitCast(d, channels);
    if constexpr (IsVuy(kLayout)) c = hn::Sub(c, hn::LoadDup128(d, black));
    const auto t = hn::Add(hn::Mul(c, factor), hn::LoadDup128(d, bias));
    return hn::BitCast(hn::ScalableTag<int16_t>(), hn::MulHigh(t, hn::Set(d, 257)));
  }
  HWY_INLINE U8 operator()(U8 v) const {
    const hn::ScalableTag<uint8_t> d;
    constexpr uint8_t a = kLayout.alpha, no = 0x80;
    alignas(16) static constexpr uint8_t kLower[16] = {a,     no, a,     no, a,     no, a,     no,
                                                       a + 4, no, a + 4, no, a + 4, no, a + 4, no};
    alignas(16) static constexpr uint8_t kUpper[16] = {a + 8,  no, a + 8,  no, a + 8,  no, a + 8,  no,
                                                       a + 12, no, a + 12, no, a + 12, no, a + 12, no};
    const auto zero = hn::Zero(d);
    return PackBlocks(Half(hn::InterleaveLower(d, v, zero), hn::TableLookupBytesOr0(v, hn::LoadDup128(d, kLower))),
                      Half(hn::InterleaveUpper(d, v, zero), hn::TableLookupBytesOr0(v, hn::LoadDup128(d, kUpper))));
  }
};

// black + (c - black) * (255 / a) in float. The product is off by less than 2^-14 where it matters, and a quotient that
// is no tie is at least 1/510 away from one; so adding 1/2 + 1/1024 before truncating rounds exactly, ties up.
template <const Layout& kLayout>
struct Unpremultiply8 : Load8 {
  template <size_t kChannel>
  HWY_INLINE U32 Channel(U32 pixels, F32 inverse) const {
    const hn::ScalableTag<float> df;
    const hn::ScalableTag<uint32_t> du;
    if constexpr (kChannel == kLayout.alpha) {
      return hn::And(pixels, hn::Set(du, uint32_t{255} << (8 * kChannel)));
    } else {
      constexpr float kBlack = BlackOf(kLayout, kChannel);
      auto c = hn::ConvertTo(
          df, hn::BitCast(hn::ScalableTag<int32_t>(), hn::And(hn::ShiftRight<8 * kChannel>(pixels), hn::Set(du, 255))));
      if constexpr (kBlack != 0) c = hn::Sub(c, hn::Set(df, kBlack));
      auto q = hn::Add(hn::Mul(c, inverse), hn::Set(df, kBlack + 0.5f + 1.0f / 1024));
      if constexpr (kBlack != 0) q = hn::Max(q, hn::Zero(df));
      return hn::ShiftLeft<8 * kChannel>(hn::BitCast(du, Truncate(hn::Min(q, hn::Set(df, 255.0f)))));
    }
  }
  HWY_INLINE U8 operator()(U8 v) const {
    const hn::ScalableTag<float> df;
    const hn::ScalableTag<uint32_t> du;
    const auto pixels = hn::BitCast(du, v);
    const auto alphaBits = kLayout.alpha == 3 ? hn::ShiftRight<24>(pixels) : hn::And(pixels, hn::Set(du, 255));
    const auto alpha = hn::ConvertTo(df, hn::BitCast(hn::ScalableTag<int32_t>(), alphaBits));
    // Alpha 0 is a huge alpha: black, and no division by zero that a host may trap.
    const auto divisor = hn::IfThenElse(hn::Eq(alpha, hn::Zero(df)), hn::Set(df, 0x1p40f), alpha);
    const auto inverse = hn::Div(hn::Set(df, 255.0f), divisor);
    const auto low = hn::Or(Channel<0>(pixels, inverse), Channel<1>(pixels, inverse));
    const auto high = hn::Or(Channel<2>(pixels, inverse), Channel<3>(pixels, inverse));
    return hn::BitCast(hn::ScalableTag<uint8_t>(), hn::Or(low, high));
  }
};

// ---- 15u ----

template <const Layout& kLayout>
struct Alpha15 {
  static HWY_INLINE U16 Load(const uint8_t* in, size_t index) {
    return hn::Min(LoadVector<uint16_t>(in, index), hn::Set(hn::ScalableTag<uint16_t>(), 32768));
  }
  // Each pixel's alpha in all four channels, then 32768 in the alpha channel.
  static HWY_INLINE U16 Factors(U16 v) {
    const hn::ScalableTag<uint8_t> d8;
    constexpr uint8_t a = 2 * kLayout.alpha, b = a + 1;
    alignas(16) static constexpr uint8_t kSpread[16] = {a,     b,     a,     b,     a,     b,     a,     b,
                                                        a + 8, b + 8, a + 8, b + 8, a + 8, b + 8, a + 8, b + 8};
    const auto alpha = hn::TableLookupBytes(hn::BitCast(d8, v), hn::LoadDup128(d8, kSpread));
    return WriteAlpha<OpaqueAt(kLayout), uint16_t>(hn::BitCast(hn::ScalableTag<uint16_t>(), alpha));
  }
};

// The rounding signed multiply holds 0..32768 as negative numbers, whose product is positive.
template <const Layout& kLayout>
struct Premultiply15 : Alpha15<kLayout> {
  HWY_INLINE U16 operator()(U16 v) const {
    const hn::ScalableTag<uint16_t> d;
    const hn::ScalableTag<int16_t> di;
    const auto negative = hn::Sub(hn::Zero(d), v);
    const auto factors = Alpha15<kLayout>::Factors(negative);
    return hn::BitCast(d, hn::MulFixedPoint15(hn::BitCast(di, negative), hn::BitCast(di, factors)));
  }
};

// 32768 c / a, c <= a (more saturates). The float quotient can round onto a tie, so that it ends up one too high or too
// low; the remainder, of which 16 bits are enough, tells.
template <const Layout& kLayout>
struct Unpremultiply15 : Alpha15<kLayout> {
  // The quotient less 32768, which packs signed.
  HWY_INLINE I32 Quotient(U16 c16, U16 a16) const {
    const hn::ScalableTag<float> df;
    const hn::ScalableTag<int32_t> di;
    const auto c = hn::ConvertTo(df, hn::BitCast(di, c16)), a = hn::ConvertTo(df, hn::BitCast(di, a16));
    const auto quotient = hn::Div(hn::Mul(c, hn::Set(df, 32768.0f)), a);
    return hn::Sub(Truncate(hn::Add(quotient, hn::Set(df, 0.5f))), hn::Set(di, 32768));
  }
  HWY_INLINE U16 operator()(U16 v) const {
    const hn::ScalableTag<uint16_t> d;
    const hn::ScalableTag<int16_t> di;
    const auto factors = Alpha15<kLayout>::Factors(v);
    const auto c = hn::Min(v, factors);
    const auto a = hn::Max(factors, hn::Set(d, 1));
    const auto zero = hn::Zero(d);
    const auto biased =
        hn::ReorderDemote2To(di, Quotient(hn::InterleaveLower(d, c, zero), hn::InterleaveLower(d, a, zero)),
                             Quotient(hn::InterleaveUpper(d, c, zero), hn::InterleaveUpper(d, a, zero)));
    const auto q = hn::Xor(biased, hn::Set(di, INT16_MIN));
    const auto product = hn::Mul(hn::BitCast(d, q), a);
    const auto remainder = hn::BitCast(di, hn::Sub(hn::ShiftLeft<15>(c), product));
    const auto half = hn::BitCast(di, hn::ShiftRight<1>(a));
    const auto tooLow = hn::VecFromMask(di, hn::Gt(remainder, half));
    const auto tooHigh = hn::VecFromMask(di, hn::Gt(hn::Neg(remainder), half));
    return hn::BitCast(d, hn::Add(hn::Sub(q, tooLow), tooHigh));
  }
};

// ---- 32f ----

template <const Layout& kLayout>
struct Premultiply32 {
  HWY_INLINE F32 operator()(F32 v) const {
    const auto isAlpha = hn::MaskFromVec(ChannelMask<kLayout.alpha, float>());
    const auto product = hn::Mul(v, hn::Broadcast<kLayout.alpha>(v));
    return hn::IfThenElse(hn::Or(isAlpha, hn::IsNaN(v)), v, product);
  }
};

template <const Layout& kLayout>
struct Unpremultiply32 {
  HWY_INLINE F32 operator()(F32 v) const {
    const hn::ScalableTag<float> d;
    const auto isAlpha = hn::MaskFromVec(ChannelMask<kLayout.alpha, float>());
    const auto alpha = hn::Broadcast<kLayout.alpha>(v);
    const auto isClear = hn::Eq(alpha, hn::Zero(d));
    const auto quotient = hn::Div(v, hn::IfThenElse(isClear, hn::Set(d, 1.0f), alpha));
    return hn::IfThenElse(isAlpha, v, hn::IfThenZeroElse(isClear, quotient));
  }
};

template <const Layout& kLayout>
HWY_ATTR void Premultiply8u(const uint8_t* src, uint8_t* dst, size_t count) {
  MapRow<uint8_t>(src, dst, count, UnlessOpaque<uint8_t, kLayout, Premultiply8<kLayout>>());
}
template <const Layout& kLayout>
HWY_ATTR void Unpremultiply8u(const uint8_t* src, uint8_t* dst, size_t count) {
  MapRow<uint8_t>(src, dst, count, UnlessOpaque<uint8_t, kLayout, Unpremultiply8<kLayout>>());
}
template <const Layout& kLayout>
HWY_ATTR void Premultiply15u(const uint8_t* src, uint8_t* dst, size_t count) {
  MapRow<uint16_t>(src, dst, count, UnlessOpaque<uint16_t, kLayout, Premultiply15<kLayout>>());
}
template <const Layout& kLayout>
HWY_ATTR void Unpremultiply15u(const uint8_t* src, uint8_t* dst, size_t count) {
  MapRow<uint16_t>(src, dst, count, UnlessOpaque<uint16_t, kLayout, Unpremultiply15<kLayout>>());
}
template <const Layout& kLayout>
HWY_ATTR void Premultiply32f(const uint8_t* src, uint8_t* dst, size_t count) {
  MapRow<float>(src, dst, count, EachVector<float, Premultiply32<kLayout>>());
}
template <const Layout& kLayout>
HWY_ATTR void Unpremultiply32f(const uint8_t* src, uint8_t* dst, size_t count) {
  MapRow<float>(src, dst, count, EachVector<float, Unpremultiply32<kLayout>>());
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

// n / d rounded to nearest, ties up; d > 0.
int64_t RoundedQuotient(int64_t n, int64_t d) {
  const int64_t twice = 2 * n + d;
  return twice / (2 * d) - (twice % (2 * d) < 0);
}

// Maps the three colour channels by color(channel, alpha, black).
template <class T, const Layout& kLayout, class Color>
void MapColor(const uint8_t* src, uint8_t* dst, size_t count, const Color& color) {
  constexpr auto kMost = kFullScale<T>;
  MapPixels<T, T>(src, dst, count, [&](const T* in, T* out) {
    const auto limited = [](T c) { return sizeof(T) == 2 && c > kMost ? kMost : c; };
    const T alpha = limited(in[kLayout.alpha]);
    for (size_t k = 0; k < 4; ++k) {
      if (k == kLayout.alpha)
        out[k] = alpha;
      else
        out[k] = color(limited(in[k]), alpha, BlackOf(kLayout, k));
    }
  });
}

template <class T>
T PremultiplyInteger(int c, int a, int black) {
  return static_cast<T>(black + RoundedQuotient(int64_t{c - black} * a, kFullScale<T>));
}

template <class T>
T UnpremultiplyInteger(int c, int a, int black) {
  if (a == 0) return static_cast<T>(black);
  const int64_t value = black + RoundedQuotient(int64_t{c - black} * kFullScale<T>, a);
  return static_cast<T>(value < 0 ? 0 : value > kFullScale<T> ? kFullScale<T> : value);
}

template <const Layout& kLayout>
void Premultiply8u(const uint8_t* src, uint8_t* dst, size_t count) {
  MapColor<uint8_t, kLayout>(src, dst, count, PremultiplyInteger<uint8_t>);
}
template <const Layout& kLayout>
void Unpremultiply8u(const uint8_t* src, uint8_t* dst, size_t count) {
  MapColor<uint8_t, kLayout>(src, dst, count, UnpremultiplyInteger<uint8_t>);
}
template <const Layout& kLayout>
void Premultiply15u(const uint8_t* src, uint8_t* dst, size_t count) {
  MapColor<uint16_t, kLayout>(src, dst, count, PremultiplyInteger<uint16_t>);
}
template <const Layout& kLayout>
void Unpremultiply15u(const uint8_t* src, uint8_t* dst, size_t count) {
  MapColor<uint16_t, kLayout>(src, dst, count, UnpremultiplyInteger<uint16_t>);
}
template <const Layout& kLayout>
void Premultiply32f(const uint8_t* src, uint8_t* dst, size_t count) {
  MapColor<float, kLayout>(src, dst, count, [](float c, float a, int) { return c != c ? c : c * a; });
}
template <const Layout& kLayout>
void Unpremultiply32f(const uint8_t* src, uint8_t* dst, size_t count) {
  MapColor<float, kLayout>(src, dst, count, [](float c, float a, int) { return a == 0 ? 0.0f : c / a; });
}

}  // namespace
}  // namespace plain

#define VX_ALPHA_KERNELS(name, depth)                                                    \
  const RowKernelSet k##name##Last##depth = VX_KERNEL_VARIANTS(name##depth<kAlphaLast>); \
  const RowKernelSet k##name##First##depth = VX_KERNEL_VARIANTS(name##depth<kAlphaFirst>)

VX_ALPHA_KERNELS(Premultiply, 8u);
VX_ALPHA_KERNELS(Premultiply, 15u);
VX_ALPHA_KERNELS(Premultiply, 32f);
VX_ALPHA_KERNELS(Unpremultiply, 8u);
VX_ALPHA_KERNELS(Unpremultiply, 15u);
VX_ALPHA_KERNELS(Unpremultiply, 32f);

#undef VX_ALPHA_KERNELS

const RowKernelSet kPremultiplyVuya8 = VX_KERNEL_VARIANTS(Premultiply8u<kVuya>);
const RowKernelSet kUnpremultiplyVuyp8 = VX_KERNEL_VARIANTS(Unpremultiply8u<kVuya>);

}  // namespace vexel
#endif  // HWY_ONCE
