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

template <const Layout& kLayout, class T>
HWY_INLINE bool AllOpaque(Full<T> v0, Full<T> v1, Full<T> v2, Full<T> v3) {
  const auto opaque = OpaqueVector<kLayout.alpha, T>();
  // One after the other, so that compilers load in this order: prefetchers follow ascending addresses.
  const auto all = hn::And(hn::And(hn::And(v0, v1), v2), v3);
  return hn::AllTrue(hn::ScalableTag<T>(), hn::Eq(hn::And(all, opaque), opaque));
}

// Maps blocks of four vectors by op.MapOne; a block of opaque pixels only is copied, which gives the same bytes.
template <class T, const Layout& kLayout, class Op>
struct UnlessOpaque {
  HWY_INLINE void operator()(const uint8_t* in, uint8_t* out) const {
    auto v0 = Op::Load(in, 0), v1 = Op::Load(in, 1), v2 = Op::Load(in, 2), v3 = Op::Load(in, 3);
    if (!AllOpaque<kLayout, T>(v0, v1, v2, v3)) {
      v0 = Op::MapOne(v0);
      v1 = Op::MapOne(v1);
      v2 = Op::MapOne(v2);
      v3 = Op::MapOne(v3);
    }
    StoreVector(v0, out, 0);
    StoreVector(v1, out, 1);
    StoreVector(v2, out, 2);
    StoreVector(v3, out, 3);
  }
};

// Maps blocks of four vectors by op.MapOne, with the next block's factors under way meanwhile: a division and what
// follows it are a longer chain than processors overlap. Opaque blocks are copied.
template <class T, class Op>
HWY_INLINE void MapRowAhead(const uint8_t* HWY_RESTRICT src, uint8_t* HWY_RESTRICT dst, size_t count) {
  constexpr size_t kPixel = 4 * sizeof(T), kBytes = 4 * HWY_MAX_BYTES, kBlock = kBytes / kPixel;
  const size_t blocks = count / kBlock;
  if (blocks > 0) {
    typename Op::Factors now(src);
    for (size_t i = 0; i < blocks; ++i, src += kBytes, dst += kBytes) {
      FetchAhead<kBytes>(src);
      const typename Op::Factors next(i + 1 < blocks ? src + kBytes : src);
      Op::Map(src, now, dst);
      now = next;
    }
  }
  RowLoop<kBlock, kPixel, kPixel>(src, dst, count % kBlock, [](const uint8_t* in, uint8_t* out) HWY_ATTR {
    Op::Map(in, typename Op::Factors(in), out);
  });
}

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
template <const Layout& kLayout, size_t kChannel>
HWY_INLINE I32 RoundedQuotients(F32 c, F32 inverse) {
  const hn::ScalableTag<float> d;
  constexpr float kBlack = BlackOf(kLayout, kChannel);
  if constexpr (IsVuy(kLayout)) c = hn::Sub(c, hn::Set(d, kBlack));
  return Truncate(hn::Add(hn::Mul(c, inverse), hn::Set(d, kBlack + 0.5f + 1.0f / 1024)));
}

// Byte kByte of each pixel in all its four bytes, or in the lowest one above which zeros stand.
template <size_t kByte, bool kInAll>
HWY_INLINE U8 SpreadByte(U8 v) {
  constexpr uint8_t b = kByte, no = kInAll ? kByte : 0x80, up = kInAll ? 4 : 0;
  alignas(16) static constexpr uint8_t kSpread[16] = {
      b,     no,          no,          no,          b + 4,  no + up,     no + up,     no + up,
      b + 8, no + 2 * up, no + 2 * up, no + 2 * up, b + 12, no + 3 * up, no + 3 * up, no + 3 * up};
  return hn::TableLookupBytesOr0(v, hn::LoadDup128(hn::ScalableTag<uint8_t>(), kSpread));
}
template <size_t kByte>
HWY_INLINE F32 FloatsOfByte(U8 v) {
  return hn::ConvertTo(hn::ScalableTag<float>(), hn::BitCast(hn::ScalableTag<int32_t>(), SpreadByte<kByte, false>(v)));
}

// c <= a saturates, and gives black where alpha is 0; which must not be divided by, since hosts may trap that.
template <const Layout& kLayout>
struct Unpremultiply8 : Load8 {
  template <size_t kChannel>
  static HWY_INLINE U32 Channel(U8 v, F32 inverse) {
    const hn::ScalableTag<uint32_t> d;
    if constexpr (kChannel == kLayout.alpha) {
      return hn::And(hn::BitCast(d, v), hn::Set(d, uint32_t{255} << (8 * kChannel)));
    } else {
      const auto q = RoundedQuotients<kLayout, kChannel>(FloatsOfByte<kChannel>(v), inverse);
      return hn::ShiftLeft<8 * kChannel>(hn::BitCast(d, q));
    }
  }
  static HWY_INLINE U8 MapOne(U8 v) {
    const hn::ScalableTag<float> d;
    const auto alpha = FloatsOfByte<kLayout.alpha>(v);
    const auto inverse = hn::Div(hn::Set(d, 255.0f), hn::Max(alpha, hn::Set(d, 1.0f)));
    v = hn::Min(v, SpreadByte<kLayout.alpha, true>(v));
    const auto low = hn::Or(Channel<0>(v, inverse), Channel<1>(v, inverse));
    const auto high = hn::Or(Channel<2>(v, inverse), Channel<3>(v, inverse));
    return hn::BitCast(hn::ScalableTag<uint8_t>(), hn::Or(low, high));
  }
};

// Around video black: packing four vectors' quotients saturates them on both sides. A huge alpha in place of 0 gives
// black.
struct UnpremultiplyVuya8 {
  struct Factors {
    HWY_INLINE explicit Factors(const uint8_t* in) {
      const auto v0 = Load8::Load(in, 0), v1 = Load8::Load(in, 1), v2 = Load8::Load(in, 2), v3 = Load8::Load(in, 3);
      areOpaque = AllOpaque<kVuya, uint8_t>(v0, v1, v2, v3);
      inverse0 = Inverse(v0), inverse1 = Inverse(v1), inverse2 = Inverse(v2), inverse3 = Inverse(v3);
    }
    static HWY_INLINE F32 Inverse(U8 v) {
      const hn::ScalableTag<float> d;
      const auto alpha = FloatsOfByte<kVuya.alpha>(v);
      return hn::Div(hn::Set(d, 255.0f), hn::IfThenElse(hn::Eq(alpha, hn::Zero(d)), hn::Set(d, 0x1p40f), alpha));
    }
    F32 inverse0, inverse1, inverse2, inverse3;
    bool areOpaque;
  };
  // In each block of 16 bytes the channel of four pixels of each vector.
  template <size_t kChannel>
  static HWY_INLINE U8 Channel(const uint8_t* in, const Factors& factors) {
    const hn::ScalableTag<int16_t> d;
    const auto quotients = [&](size_t index, F32 inverse) HWY_ATTR {
      return RoundedQuotients<kVuya, kChannel>(FloatsOfByte<kChannel>(Load8::Load(in, index)), inverse);
    };
    return PackBlocks(hn::ReorderDemote2To(d, quotients(0, factors.inverse0), quotients(1, factors.inverse1)),
                      hn::ReorderDemote2To(d, quotients(2, factors.inverse2), quotients(3, factors.inverse3)));
  }
  static HWY_INLINE void StoreUnder(const uint8_t* in, U16 colors, uint8_t* out, size_t index) {
    const auto pixels = hn::BitCast(hn::ScalableTag<uint8_t>(), colors);
    const auto alpha = hn::And(Load8::Load(in, index), ChannelMask<kVuya.alpha, uint8_t>());
    StoreVector(hn::Or(pixels, alpha), out, index);
  }
  static HWY_INLINE void Map(const uint8_t* in, const Factors& factors, uint8_t* out) {
    const hn::ScalableTag<uint8_t> d;
    const hn::ScalableTag<uint16_t> d16;
    if (factors.areOpaque) return EachVector<uint8_t, Same>{}(in, out);
    const auto v = Channel<0>(in, factors), u = Channel<1>(in, factors), y = Channel<2>(in, factors);
    const auto vuLow = hn::BitCast(d16, hn::InterleaveLower(d, v, u));
    const auto vuHigh = hn::BitCast(d16, hn::InterleaveUpper(d, v, u));
    const auto yLow = hn::BitCast(d16, hn::InterleaveLower(d, y, hn::Zero(d)));
    const auto yHigh = hn::BitCast(d16, hn::InterleaveUpper(d, y, hn::Zero(d)));
    StoreUnder(in, hn::InterleaveLower(d16, vuLow, yLow), out, 0);
    StoreUnder(in, hn::InterleaveUpper(d16, vuLow, yLow), out, 1);
    StoreUnder(in, hn::InterleaveLower(d16, vuHigh, yHigh), out, 2);
    StoreUnder(in, hn::InterleaveUpper(d16, vuHigh, yHigh), out, 3);
  }

 private:
  struct Same {
    HWY_INLINE U8 operator()(U8 v) const { return v; }
  };
};

// ---- 15u ----

// A constant that compilers keep in a register; in loops they would rather make it anew, by way of a general register.
template <class T>
HWY_INLINE Full<T> Constant(T value) {
  auto v = hn::Set(hn::ScalableTag<T>(), value);
  asm("" : "+v"(v.raw));
  return v;
}

template <const Layout& kLayout>
struct Alpha15 {
  static HWY_INLINE U16 Load(const uint8_t* in, size_t index) {
    return hn::Min(LoadVector<uint16_t>(in, index), Constant<uint16_t>(32768));
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

// q = 32768 c / a, c <= a (more saturates), from one division for each pixel. A power of two p brings a to a p in
// 32768..65535, and m = 2^31 / (a p) is 16 bits, rounded, 65536 as 65535. Then e = c p m >> 16 is q rounded or one
// less. It is one less where (2 e + 1) a < 65536 c, that is where the high word of the product is c - 1 and not c: no
// ties exist. Where c = a, e + 1 may be 32769. In the lane of alpha m is 0, which gives a.
template <const Layout& kLayout>
struct Unpremultiply15 : Alpha15<kLayout> {
  // In each block of 16 bytes: m of the block's two pixels of v0 and two of v1, then p of them.
  static HWY_INLINE U16 PairFactors(U16 v0, U16 v1) {
    const hn::ScalableTag<float> df;
    const hn::ScalableTag<int32_t> di;
    const hn::ScalableTag<uint32_t> du;
    constexpr uint32_t kExponent = 0x7F800000, kOf2To15 = (127 + 15) << 23, kOf1 = 127 << 23;
    const auto a = hn::Max(hn::Min(hn::BitCast(di, AlphaOf(v0, v1)), Constant(32768)), Constant(1));
    const auto alpha = hn::ConvertTo(df, a);
    const auto exponent = hn::And(hn::BitCast(du, alpha), Constant(kExponent));
    const auto p = hn::BitCast(df, hn::Sub(Constant(kOf2To15 + kOf1), exponent));
    const auto m = hn::Div(Constant(0x1p31f), hn::Mul(alpha, p));
    return PackBlocks(Truncate(hn::Add(m, Constant(0.5f))), Truncate(p));
  }
  static HWY_INLINE U32 AlphaOf(U16 v0, U16 v1) {
    const hn::ScalableTag<uint32_t> d;
    const auto a = hn::BitCast(d, v0), b = hn::BitCast(d, v1);
    if constexpr (kLayout.alpha == 3) return hn::ShiftRight<16>(EachSecond<1>(a, b));
    return hn::And(EachSecond<0>(a, b), hn::Set(d, 0xFFFF));
  }
  template <size_t kOfVector>
  static HWY_INLINE U16 MapOne(U16 v, U16 factors) {
    const hn::ScalableTag<uint16_t> d;
    const auto spread = [&](const BlockBytes& bytes) HWY_ATTR {
      const hn::ScalableTag<uint8_t> d8;
      return hn::BitCast(d, hn::TableLookupBytesOr0(hn::BitCast(d8, factors), hn::LoadDup128(d8, bytes.indices)));
    };
    static constexpr BlockBytes kM(2 * kOfVector, kLayout.alpha), kP(2 * kOfVector + 4, 4);
    const auto a = Alpha15<kLayout>::Spread(v);
    const auto c = hn::Min(v, a);
    const auto e = hn::MulHigh(hn::Mul(c, spread(kP)), spread(kM));
    const auto high = hn::MulHigh(hn::Sub(e, hn::Not(e)), a);
    return hn::Min(hn::Add(e, hn::Sub(c, high)), Constant<uint16_t>(32768));
  }
  struct Factors {
    HWY_INLINE explicit Factors(const uint8_t* in) {
      const auto v0 = LoadVector<uint16_t>(in, 0), v1 = LoadVector<uint16_t>(in, 1);
      const auto v2 = LoadVector<uint16_t>(in, 2), v3 = LoadVector<uint16_t>(in, 3);
      areOpaque = AllOpaque<kLayout, uint16_t>(v0, v1, v2, v3);
      first = PairFactors(v0, v1);
      second = PairFactors(v2, v3);
    }
    U16 first, second;
    bool areOpaque;
  };
  static HWY_INLINE void Map(const uint8_t* in, const Factors& factors, uint8_t* out) {
    using Base = Alpha15<kLayout>;
    auto v0 = Base::Load(in, 0), v1 = Base::Load(in, 1), v2 = Base::Load(in, 2), v3 = Base::Load(in, 3);
    if (!factors.areOpaque) {
      v0 = MapOne<0>(v0, factors.first);
      v1 = MapOne<1>(v1, factors.first);
      v2 = MapOne<0>(v2, factors.second);
      v3 = MapOne<1>(v3, factors.second);
    }
    StoreVector(v0, out, 0);
    StoreVector(v1, out, 1);
    StoreVector(v2, out, 2);
    StoreVector(v3, out, 3);
  }

 private:
  // Bytes of a block: the words `first` and `first` + 1, each four times; 0 in the channel `clear` of either four.
  struct BlockBytes {
    constexpr BlockBytes(size_t first, size_t clear) {
      for (size_t i = 0; i < 16; ++i)
        indices[i] = static_cast<uint8_t>(i / 2 % 4 == clear ? 0x80 : 2 * (first + i / 8) + i % 2);
    }
    alignas(16) uint8_t indices[16] = {};
  };
  // Of each pair of lanes the first or the second: in each block those of `a`, then those of `b`.
  template <int kSecond>
  static HWY_INLINE U32 EachSecond(U32 a, U32 b) {
    constexpr int kSelect = kSecond ? 0xDD : 0x88;
#if HWY_TARGET == HWY_AVX3
    return U32{_mm512_castps_si512(_mm512_shuffle_ps(_mm512_castsi512_ps(a.raw), _mm512_castsi512_ps(b.raw), kSelect))};
#elif HWY_TARGET == HWY_AVX2
    return U32{_mm256_castps_si256(_mm256_shuffle_ps(_mm256_castsi256_ps(a.raw), _mm256_castsi256_ps(b.raw), kSelect))};
#else
    return U32{_mm_castps_si128(_mm_shuffle_ps(_mm_castsi128_ps(a.raw), _mm_castsi128_ps(b.raw), kSelect))};
#endif
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
  if constexpr (IsVuy(kLayout)) {
    MapRowAhead<uint8_t, UnpremultiplyVuya8>(src, dst, count);
  } else if (HWY_TARGET == HWY_AVX3 && HasVbmi()) {
    kLayout.alpha == 3 ? UnpremultiplyLast512(src, dst, count) : UnpremultiplyFirst512(src, dst, count);
  } else {
    MapRow<uint8_t>(src, dst, count, UnlessOpaque<uint8_t, kLayout, Unpremultiply8<kLayout>>());
  }
}
template <const Layout& kLayout>
HWY_ATTR void Premultiply15u(const uint8_t* src, uint8_t* dst, size_t count) {
  MapRow<uint16_t>(src, dst, count, UnlessOpaque<uint16_t, kLayout, Premultiply15<kLayout>>());
}
template <const Layout& kLayout>
HWY_ATTR void Unpremultiply15u(const uint8_t* src, uint8_t* dst, size_t count) {
  if (HWY_TARGET == HWY_AVX3 && HasVbmi())
    return kLayout.alpha == 3 ? UnpremultiplyLast15u512(src, dst, count) : UnpremultiplyFirst15u512(src, dst, count);
  MapRowAhead<uint16_t, Unpremultiply15<kLayout>>(src, dst, count);
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
