// Straight <-> premultiplied alpha. Alpha itself is copied; 15u values above 32768 count as 32768.
//
// Integer results are the exact quotients rounded to nearest, ties up, saturated to full scale. (Ties occur in 8u
// unpremultiplying and 15u premultiplying only.) In 32f, premultiplying is one multiplication and unpremultiplying one
// true division, not clamped; a NaN channel stays as it is. Unpremultiplying alpha 0 gives black.
#include <cstddef>
#include <cstdint>

#include "convert/PlainPixels.h"
#include "convert/RgbKernels.h"
#include "convert/Unpremultiply512.h"
#include "convert/Vbmi.h"

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

// A constant for the two 16-bit lanes that hold channels `low` and `low` + 2 of a pixel.
constexpr uint32_t PairOf(const Layout& layout, size_t low, int factor, int offset) {
  const auto lane = [&](size_t channel) { return static_cast<uint16_t>(BlackOf(layout, channel) * factor + offset); };
  return lane(low) | static_cast<uint32_t>(lane(low + 2)) << 16;
}

constexpr AlphaWrite OpaqueAt(const Layout& layout) {
  return layout.alpha == 0 ? AlphaWrite::OpaqueFirst : AlphaWrite::OpaqueLast;
}

}  // namespace
}  // namespace vexel
#endif

#if HWY_TARGET != HWY_SCALAR
HWY_BEFORE_NAMESPACE();
namespace vexel {
namespace HWY_NAMESPACE {
namespace {

// Maps blocks of four vectors by op.Map(a, b), two at a time; a block of opaque pixels only is copied, which gives the
// same bytes.
template <class T, const Layout& kLayout, class Op>
struct UnlessOpaque {
  HWY_INLINE void operator()(const uint8_t* in, uint8_t* out) const {
    const hn::ScalableTag<T> d;
    auto v0 = Op::Load(in, 0), v1 = Op::Load(in, 1), v2 = Op::Load(in, 2), v3 = Op::Load(in, 3);
    const auto opaque = OpaqueVector<kLayout.alpha, T>();
    // One after the other, so that compilers load in this order: prefetchers follow ascending addresses.
    const auto all = hn::And(hn::And(hn::And(v0, v1), v2), v3);
    if (!hn::AllTrue(d, hn::Eq(hn::And(all, opaque), opaque))) {
      Op::Map(v0, v1);
      Op::Map(v2, v3);
    }
    StoreVector(v0, out, 0);
    StoreVector(v1, out, 1);
    StoreVector(v2, out, 2);
    StoreVector(v3, out, 3);
  }
};

// An op with Map(a, b) of one with MapOne(a).
template <class Op>
struct Singly : Op {
  template <class V>
  static HWY_INLINE void Map(V& a, V& b) {
    a = Op::MapOne(a);
    b = Op::MapOne(b);
  }
};

// ---- 8u ----

struct Load8 {
  static HWY_INLINE U8 Load(const uint8_t* in, size_t index) { return LoadVector<uint8_t>(in, index); }
};

// black + (c - black) a / 255 in 16-bit lanes, the even bytes apart from the odd ones: all of t = 255 black +
// (c - black) a + 128 lies in 128..65153, where t * 257 >> 16 is the rounded quotient. Alpha is multiplied by 255.
template <const Layout& kLayout>
struct Premultiply8 : Load8 {
  template <size_t kLow>
  static HWY_INLINE U16 Scaled(U16 c, U16 alpha) {
    constexpr uint32_t kAlphaLane = kLayout.alpha == kLow ? 0x000000FF : kLayout.alpha == kLow + 2 ? 0x00FF0000 : 0;
    const hn::ScalableTag<uint16_t> d;
    if constexpr (IsVuy(kLayout)) c = hn::Sub(c, SetPair(PairOf(kLayout, kLow, 1, 0)));
    const auto factor = kAlphaLane == 0 ? alpha : hn::Or(alpha, SetPair(kAlphaLane));
    return hn::Add(hn::Mul(c, factor), SetPair(PairOf(kLayout, kLow, 255, 128)));
  }
  static HWY_INLINE U8 MapOne(U8 v) {
    const hn::ScalableTag<uint8_t> d8;
    const hn::ScalableTag<uint16_t> d;
    constexpr uint8_t a = kLayout.alpha, no = 0x80;
    alignas(16) static constexpr uint8_t kSpread[16] = {a,     no, a,     no, a + 4,  no, a + 4,  no,
                                                        a + 8, no, a + 8, no, a + 12, no, a + 12, no};
    const auto pairs = hn::BitCast(d, v);
    const auto alpha = hn::BitCast(d, hn::TableLookupBytesOr0(v, hn::LoadDup128(d8, kSpread)));
    const auto even = Scaled<0>(hn::And(pairs, hn::Set(d, 0x00FF)), alpha);
    const auto odd = Scaled<1>(hn::ShiftRight<8>(pairs), alpha);
    const auto oddResult = hn::And(hn::Add(odd, hn::ShiftRight<8>(odd)), hn::Set(d, 0xFF00));
    return hn::BitCast(d8, hn::Or(hn::MulHigh(even, hn::Set(d, 257)), oddResult));
  }

 private:
  static HWY_INLINE U16 SetPair(uint32_t pair) {
    return hn::BitCast(hn::ScalableTag<uint16_t>(), hn::Set(hn::ScalableTag<uint32_t>(), pair));
  }
};

// black + (c - black) * (255 / a) in float. The product is off by less than 2^-14 where it matters, and a quotient that
// is no tie is at least 1/510 away from one; so adding 1/2 + 1/1024 before truncating rounds exactly, ties up.
template <const Layout& kLayout>
struct Unpremultiply8 : Load8 {
  // Byte kByte of each pixel in all its four bytes, or in the lowest one above which zeros stand.
  template <size_t kByte, bool kInAll>
  static HWY_INLINE U8 Spread(U8 v) {
    constexpr uint8_t b = kByte, no = kInAll ? kByte : 0x80, up = kInAll ? 4 : 0;
    alignas(16) static constexpr uint8_t kSpread[16] = {
        b,     no,          no,          no,          b + 4,  no + up,     no + up,     no + up,
        b + 8, no + 2 * up, no + 2 * up, no + 2 * up, b + 12, no + 3 * up, no + 3 * up, no + 3 * up};
    return hn::TableLookupBytesOr0(v, hn::LoadDup128(hn::ScalableTag<uint8_t>(), kSpread));
  }
  template <size_t kByte>
  static HWY_INLINE F32 Floats(U8 v) {
    return hn::ConvertTo(hn::ScalableTag<float>(), hn::BitCast(hn::ScalableTag<int32_t>(), Spread<kByte, false>(v)));
  }
  template <size_t kChannel>
  static HWY_INLINE U32 Channel(U8 v, F32 inverse) {
    const hn::ScalableTag<float> df;
    const hn::ScalableTag<uint32_t> du;
    if constexpr (kChannel == kLayout.alpha) {
      return hn::And(hn::BitCast(du, v), hn::Set(du, uint32_t{255} << (8 * kChannel)));
    } else {
      constexpr float kBlack = BlackOf(kLayout, kChannel);
      auto c = Floats<kChannel>(v);
      if constexpr (IsVuy(kLayout)) c = hn::Sub(c, hn::Set(df, kBlack));
      auto q = hn::Add(hn::Mul(c, inverse), hn::Set(df, kBlack + 0.5f + 1.0f / 1024));
      if constexpr (IsVuy(kLayout)) q = hn::Max(hn::Min(q, hn::Set(df, 255.0f)), hn::Zero(df));
      return hn::ShiftLeft<8 * kChannel>(hn::BitCast(du, Truncate(q)));
    }
  }
  static HWY_INLINE U8 MapOne(U8 v) {
    const hn::ScalableTag<float> df;
    const auto alpha = Floats<kLayout.alpha>(v);
    // Alpha 0 must give black, without a division by zero that the host may trap. Without video black, c <= a does it
    // and saturates too; with it, a huge alpha does.
    auto divisor = alpha;
    if constexpr (IsVuy(kLayout)) {
      divisor = hn::IfThenElse(hn::Eq(alpha, hn::Zero(df)), hn::Set(df, 0x1p40f), alpha);
    } else {
      divisor = hn::Max(alpha, hn::Set(df, 1.0f));
      v = hn::Min(v, Spread<kLayout.alpha, true>(v));
    }
    const auto inverse = hn::Div(hn::Set(df, 255.0f), divisor);
    const auto low = hn::Or(Channel<0>(v, inverse), Channel<1>(v, inverse));
    const auto high = hn::Or(Channel<2>(v, inverse), Channel<3>(v, inverse));
    return hn::BitCast(hn::ScalableTag<uint8_t>(), hn::Or(low, high));
  }
};

// ---- 15u ----

template <const Layout& kLayout>
struct Alpha15 {
  static HWY_INLINE U16 Load(const uint8_t* in, size_t index) {
    return hn::Min(LoadVector<uint16_t>(in, index), hn::Set(hn::ScalableTag<uint16_t>(), 32768));
  }
  // Each pixel's alpha in all four channels.
  static HWY_INLINE U16 Spread(U16 v) {
    const hn::ScalableTag<uint8_t> d8;
    constexpr uint8_t a = 2 * kLayout.alpha, b = a + 1;
    alignas(16) static constexpr uint8_t kSpread[16] = {a,     b,     a,     b,     a,     b,     a,     b,
                                                        a + 8, b + 8, a + 8, b + 8, a + 8, b + 8, a + 8, b + 8};
    const auto alpha = hn::TableLookupBytes(hn::BitCast(d8, v), hn::LoadDup128(d8, kSpread));
    return hn::BitCast(hn::ScalableTag<uint16_t>(), alpha);
  }
};

// The rounding signed multiply holds 0..32768 as negative numbers, whose product is positive.
template <const Layout& kLayout>
struct Premultiply15 : Alpha15<kLayout> {
  static HWY_INLINE U16 MapOne(U16 v) {
    const hn::ScalableTag<uint16_t> d;
    const hn::ScalableTag<int16_t> di;
    const auto negative = hn::Sub(hn::Zero(d), v);
    const auto factors = WriteAlpha<OpaqueAt(kLayout), uint16_t>(Alpha15<kLayout>::Spread(negative));
    return hn::BitCast(d, hn::MulFixedPoint15(hn::BitCast(di, negative), hn::BitCast(di, factors)));
  }
};

// For each lane of the block-wise lower or upper halves of the first or second of two vectors of 16-bit pixels: the
// pixel's index in the two.
template <bool kSecond, bool kUpper>
struct PixelIndices {
  constexpr PixelIndices() {
    for (size_t i = 0; i < kLanes<float>; ++i)
      lanes[i] = static_cast<int32_t>((kSecond ? kLanes<float> / 2 : 0) + i / 4 * 2 + kUpper);
  }
  alignas(64) int32_t lanes[kLanes<float>] = {};
};

// 32768 c / a, c <= a (more saturates), from one division per pixel. The float result is off by less than 1/128, so the
// rounded quotient comes out right or one too low; the remainder, of which 16 bits are enough, tells. No ties exist.
template <const Layout& kLayout>
struct Unpremultiply15 : Alpha15<kLayout> {
  template <bool kSecond, bool kUpper>
  static HWY_INLINE I32 Estimate(U16 c16, F32 inverses) {
    const hn::ScalableTag<float> df;
    const hn::ScalableTag<int32_t> di;
    static constexpr PixelIndices<kSecond, kUpper> kIndices;
    const auto inverse = hn::TableLookupLanes(inverses, hn::SetTableIndices(df, kIndices.lanes));
    const auto quotient = hn::Mul(hn::ConvertTo(df, hn::BitCast(di, c16)), inverse);
    return Truncate(hn::Add(quotient, hn::Set(df, 0.5f - 1.0f / 128)));
  }
  template <bool kSecond>
  static HWY_INLINE U16 MapOne(U16 v, F32 inverses) {
    const hn::ScalableTag<uint16_t> d;
    const hn::ScalableTag<int16_t> di;
    const auto a = Alpha15<kLayout>::Spread(v);
    const auto c = hn::Min(v, a);
    const auto zero = hn::Zero(d);
    const auto q = PackBlocks(Estimate<kSecond, false>(hn::InterleaveLower(d, c, zero), inverses),
                              Estimate<kSecond, true>(hn::InterleaveUpper(d, c, zero), inverses));
    const auto remainder = hn::BitCast(di, hn::Sub(hn::ShiftLeft<15>(c), hn::Mul(q, a)));
    const auto tooLow = hn::VecFromMask(di, hn::Gt(remainder, hn::BitCast(di, hn::ShiftRight<1>(a))));
    const auto isAlpha = hn::MaskFromVec(ChannelMask<kLayout.alpha, uint16_t>());
    return hn::IfThenElse(isAlpha, v, hn::Sub(q, hn::BitCast(d, tooLow)));
  }
  static HWY_INLINE U32 AlphaIn64(U16 v) {
    const hn::ScalableTag<uint64_t> d;
    const auto pixels = hn::BitCast(d, v);
    return hn::BitCast(hn::ScalableTag<uint32_t>(),
                       kLayout.alpha == 3 ? hn::ShiftRight<48>(pixels) : hn::And(pixels, hn::Set(d, 0xFFFF)));
  }
  static HWY_INLINE void Map(U16& v0, U16& v1) {
    const hn::ScalableTag<float> df;
    const auto alphaBits = hn::ConcatEven(hn::ScalableTag<uint32_t>(), AlphaIn64(v1), AlphaIn64(v0));
    const auto alpha = hn::ConvertTo(df, hn::BitCast(hn::ScalableTag<int32_t>(), alphaBits));
    const auto inverses = hn::Div(hn::Set(df, 32768.0f), hn::Max(alpha, hn::Set(df, 1.0f)));
    v0 = MapOne<false>(v0, inverses);
    v1 = MapOne<true>(v1, inverses);
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
  MapRow<uint8_t>(src, dst, count, UnlessOpaque<uint8_t, kLayout, Singly<Premultiply8<kLayout>>>());
}
template <const Layout& kLayout>
HWY_ATTR void Unpremultiply8u(const uint8_t* src, uint8_t* dst, size_t count) {
  if (HWY_TARGET == HWY_AVX3 && !IsVuy(kLayout) && HasVbmi())
    return kLayout.alpha == 3 ? UnpremultiplyLast512(src, dst, count) : UnpremultiplyFirst512(src, dst, count);
  MapRow<uint8_t>(src, dst, count, UnlessOpaque<uint8_t, kLayout, Singly<Unpremultiply8<kLayout>>>());
}
template <const Layout& kLayout>
HWY_ATTR void Premultiply15u(const uint8_t* src, uint8_t* dst, size_t count) {
  MapRow<uint16_t>(src, dst, count, UnlessOpaque<uint16_t, kLayout, Singly<Premultiply15<kLayout>>>());
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
inline int64_t RoundedQuotient(int64_t n, int64_t d) {
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
    ForChannels([&](size_t k) {
      out[k] = k == kLayout.alpha ? alpha : static_cast<T>(color(limited(in[k]), alpha, BlackOf(kLayout, k)));
    });
  });
}

template <class T>
struct PremultiplyInteger {
  T operator()(int c, int a, int black) const {
    return static_cast<T>(black + RoundedQuotient(int64_t{c - black} * a, kFullScale<T>));
  }
};

template <class T>
struct UnpremultiplyInteger {
  T operator()(int c, int a, int black) const {
    if (a == 0) return static_cast<T>(black);
    const int64_t value = black + RoundedQuotient(int64_t{c - black} * kFullScale<T>, a);
    return static_cast<T>(value < 0 ? 0 : value > kFullScale<T> ? kFullScale<T> : value);
  }
};

template <const Layout& kLayout>
void Premultiply8u(const uint8_t* src, uint8_t* dst, size_t count) {
  MapColor<uint8_t, kLayout>(src, dst, count, PremultiplyInteger<uint8_t>());
}
template <const Layout& kLayout>
void Unpremultiply8u(const uint8_t* src, uint8_t* dst, size_t count) {
  MapColor<uint8_t, kLayout>(src, dst, count, UnpremultiplyInteger<uint8_t>());
}
template <const Layout& kLayout>
void Premultiply15u(const uint8_t* src, uint8_t* dst, size_t count) {
  MapColor<uint16_t, kLayout>(src, dst, count, PremultiplyInteger<uint16_t>());
}
template <const Layout& kLayout>
void Unpremultiply15u(const uint8_t* src, uint8_t* dst, size_t count) {
  MapColor<uint16_t, kLayout>(src, dst, count, UnpremultiplyInteger<uint16_t>());
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
