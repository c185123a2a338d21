#include "composite/AlphaUtilityKernels.h"

#include <algorithm>
#include <cstring>

#include "convert/PlainPixels.h"

#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "composite/AlphaUtilityKernels.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

#include "composite/TwoRows-inl.h"
#include "convert/PixelVectors-inl.h"
#include "frame/KernelTable.h"

#ifndef VEXEL_COMPOSITE_ALPHAUTILITYKERNELS_LAYOUTS
#define VEXEL_COMPOSITE_ALPHAUTILITYKERNELS_LAYOUTS
namespace vexel {
namespace {

template <class T, size_t kIndex>
struct Channels {
  using Type = T;
  static constexpr size_t kAlpha = kIndex;
};
using Last8u = Channels<uint8_t, 3>;
using First8u = Channels<uint8_t, 0>;
using Last15u = Channels<uint16_t, 3>;
using First15u = Channels<uint16_t, 0>;
using Last32f = Channels<float, 3>;
using First32f = Channels<float, 0>;

// The codes of black, about which 8u pixels are scaled.
struct Rgb8 {
  static constexpr bool kIsZero = true;
  alignas(16) static constexpr int32_t kBlack[4] = {0, 0, 0, 0};
};
struct Vuy8 {
  static constexpr bool kIsZero = false;
  alignas(16) static constexpr int32_t kBlack[4] = {128, 128, 16, 0};
};

constexpr size_t kMaskPixels = 32;

}  // namespace
}  // namespace vexel
#endif

#if HWY_TARGET != HWY_SCALAR
HWY_BEFORE_NAMESPACE();
namespace vexel {
namespace HWY_NAMESPACE {
namespace {

// Maps vectors of lane type T by op(a, b).
template <class T, class Op>
HWY_INLINE void MergeRow(const uint8_t* a, const uint8_t* b, uint8_t* dst, size_t bytes, const Op& op) {
  const auto body = [&](const uint8_t* inA, const uint8_t* inB, uint8_t* out) HWY_ATTR {
    const auto r0 = op(LoadVector<T>(inA, 0), LoadVector<T>(inB, 0));
    const auto r1 = op(LoadVector<T>(inA, 1), LoadVector<T>(inB, 1));
    const auto r2 = op(LoadVector<T>(inA, 2), LoadVector<T>(inB, 2));
    const auto r3 = op(LoadVector<T>(inA, 3), LoadVector<T>(inB, 3));
    StoreVector(r0, out, 0);
    StoreVector(r1, out, 1);
    StoreVector(r2, out, 2);
    StoreVector(r3, out, 3);
  };
  TwoRowLoop<4 * HWY_MAX_BYTES>(a, b, dst, bytes, body);
}

template <class T, class Op>
HWY_INLINE void MapBytes(const uint8_t* src, uint8_t* dst, size_t bytes, const Op& op) {
  constexpr size_t kBlock = 4 * HWY_MAX_BYTES;
  const auto body = [&](const uint8_t* in, const uint8_t*, uint8_t* out) HWY_ATTR {
    FetchAhead<kBlock>(in);
    const auto r0 = op(LoadVector<T>(in, 0)), r1 = op(LoadVector<T>(in, 1));
    const auto r2 = op(LoadVector<T>(in, 2)), r3 = op(LoadVector<T>(in, 3));
    StoreVector(r0, out, 0);
    StoreVector(r1, out, 1);
    StoreVector(r2, out, 2);
    StoreVector(r3, out, 3);
  };
  TwoRowLoop<kBlock>(src, src, dst, bytes, body);
}

template <class L>
constexpr size_t kPixelBytes = 4 * sizeof(typename L::Type);

template <class L>
HWY_INLINE Full<typename L::Type> WithAlphaOf(Full<typename L::Type> alpha, Full<typename L::Type> colors) {
  return hn::IfVecThenElse(ChannelMask<L::kAlpha, typename L::Type>(), alpha, colors);
}

template <class T>
HWY_INLINE Full<T> LoadPattern(const PixelPattern& pattern) {
  return hn::BitCast(hn::ScalableTag<T>(), hn::LoadDup128(hn::ScalableTag<uint8_t>(), pattern.bytes));
}

// ---- Gain ----

template <class L>
void GainAlpha8u(const uint8_t* src, uint8_t* dst, size_t count, float gain) {
  const hn::ScalableTag<float> df;
  const hn::ScalableTag<uint32_t> du;
  constexpr int kShift = 8 * L::kAlpha;
  const auto factor = hn::Set(df, gain), most = hn::Set(df, 255);
  const auto others = hn::Set(du, ~(uint32_t{255} << kShift));
  MapBytes<uint32_t>(src, dst, count * 4, [&](U32 v) HWY_ATTR {
    const auto alpha =
        hn::ConvertTo(df, hn::BitCast(hn::ScalableTag<int32_t>(), hn::ShiftRight<kShift>(hn::AndNot(others, v))));
    const auto scaled = ConvertNearest(hn::Min(hn::Mul(alpha, factor), most));
    return hn::Or(hn::And(v, others), hn::ShiftLeft<kShift>(hn::BitCast(du, scaled)));
  });
}

template <class Black>
void GainAll8u(const uint8_t* src, uint8_t* dst, size_t count, float gain) {
  const hn::ScalableTag<float> df;
  const auto factor = hn::Set(df, gain);
  const auto black = hn::LoadDup128(hn::ScalableTag<int32_t>(), Black::kBlack);
  const auto blackFloat = hn::ConvertTo(df, black);
  // Packing saturates.
  const auto scaled = [&](const uint8_t* in) HWY_ATTR {
    const auto c = hn::ConvertTo(df, LoadPromoted<int32_t, uint8_t>(in));
    if constexpr (Black::kIsZero)
      return ConvertNearest(hn::Mul(c, factor));
    else
      return hn::Add(ConvertNearest(hn::Mul(hn::Sub(c, blackFloat), factor)), black);
  };
  constexpr size_t kQuarter = HWY_MAX_BYTES / 4;
  TwoRowLoop<HWY_MAX_BYTES>(src, src, dst, count * 4, [&](const uint8_t* in, const uint8_t*, uint8_t* out) HWY_ATTR {
    StoreVector(PackTo8(scaled(in), scaled(in + kQuarter), scaled(in + 2 * kQuarter), scaled(in + 3 * kQuarter)), out);
  });
}

template <class L>
void GainAlpha32f(const uint8_t* src, uint8_t* dst, size_t count, float gain) {
  const auto factor = hn::Set(hn::ScalableTag<float>(), gain);
  MapBytes<float>(src, dst, count * 16, [&](F32 v) HWY_ATTR { return WithAlphaOf<L>(hn::Mul(v, factor), v); });
}

void GainAll32f(const uint8_t* src, uint8_t* dst, size_t count, float gain) {
  const auto factor = hn::Set(hn::ScalableTag<float>(), gain);
  MapBytes<float>(src, dst, count * 16, [&](F32 v) HWY_ATTR { return hn::Mul(v, factor); });
}

// ---- Setting and inverting ----

template <class T>
HWY_INLINE Full<T> Inverse(Full<T> v) {
  const hn::ScalableTag<T> d;
  if constexpr (sizeof(T) == 1) return hn::Not(v);
  return hn::Sub(hn::Set(d, kFullScale<T>), v);
}

template <class L>
void InvertAlpha(const uint8_t* src, const uint8_t* colors, uint8_t* dst, size_t count) {
  using T = typename L::Type;
  MergeRow<T>(src, colors, dst, count * kPixelBytes<L>,
              [](Full<T> v, Full<T> color) HWY_ATTR { return WithAlphaOf<L>(Inverse<T>(v), color); });
}

void ReplaceBits(const uint8_t* src, uint8_t* dst, size_t bytes, const PixelPattern& value, const PixelPattern& mask) {
  const auto keep = hn::Not(LoadPattern<uint8_t>(mask));
  const auto bits = hn::AndNot(keep, LoadPattern<uint8_t>(value));
  MapBytes<uint8_t>(src, dst, bytes, [&](U8 v) HWY_ATTR { return hn::Or(hn::And(v, keep), bits); });
}

// ---- Matte ----

// M (1 - a) as premultiplying rounds it, for a matte whose alpha channel is 0; so is the result's.
template <size_t kAlpha>
HWY_INLINE U8 MatteUnder(U8 v, U8 matte) {
  const hn::ScalableTag<uint8_t> d8;
  const hn::ScalableTag<uint16_t> d;
  constexpr uint8_t a = kAlpha, no = 0x80;
  alignas(16) static constexpr uint8_t kSpread[16] = {a,     no, a,     no, a + 4,  no, a + 4,  no,
                                                      a + 8, no, a + 8, no, a + 12, no, a + 12, no};
  const auto rest = hn::BitCast(d, hn::TableLookupBytesOr0(hn::Not(v), hn::LoadDup128(d8, kSpread)));
  const auto pairs = hn::BitCast(d, matte);
  const auto half = hn::Set(d, 128);
  // t = 255 q + r + 128; t * 257 >> 16 is the rounded quotient.
  const auto even = hn::Add(hn::Mul(hn::And(pairs, hn::Set(d, 0x00FF)), rest), half);
  const auto odd = hn::Add(hn::Mul(hn::ShiftRight<8>(pairs), rest), half);
  const auto oddResult = hn::And(hn::Add(odd, hn::ShiftRight<8>(odd)), hn::Set(d, 0xFF00));
  return hn::BitCast(d8, hn::Or(hn::MulHigh(even, hn::Set(d, 257)), oddResult));
}

// The rounding signed multiply holds 0..32768 as negative numbers, whose product is positive.
template <size_t kAlpha>
HWY_INLINE U16 MatteUnder(U16 v, U16 matte) {
  const hn::ScalableTag<uint8_t> d8;
  const hn::ScalableTag<uint16_t> d;
  const hn::ScalableTag<int16_t> di;
  constexpr uint8_t a = 2 * kAlpha, b = a + 1;
  alignas(16) static constexpr uint8_t kSpread[16] = {a,     b,     a,     b,     a,     b,     a,     b,
                                                      a + 8, b + 8, a + 8, b + 8, a + 8, b + 8, a + 8, b + 8};
  const auto alpha = hn::BitCast(d, hn::TableLookupBytes(hn::BitCast(d8, v), hn::LoadDup128(d8, kSpread)));
  const auto opaque = hn::Set(d, kFullScale<uint16_t>);
  const auto minusRest = hn::Sub(hn::Min(alpha, opaque), opaque), minusMatte = hn::Sub(hn::Zero(d), matte);
  return hn::BitCast(d, hn::MulFixedPoint15(hn::BitCast(di, minusMatte), hn::BitCast(di, minusRest)));
}

template <size_t kAlpha>
HWY_INLINE F32 MatteUnder(F32 v, F32 matte) {
  return hn::Mul(matte, hn::Sub(hn::Set(hn::ScalableTag<float>(), 1.0f), hn::Broadcast<kAlpha>(v)));
}

template <class L>
void SubtractMatte(const uint8_t* src, uint8_t* dst, size_t count, const PixelPattern& matte) {
  using T = typename L::Type;
  const auto color = LoadPattern<T>(matte);
  MapBytes<T>(src, dst, count * kPixelBytes<L>, [&](Full<T> v) HWY_ATTR {
    const auto m = MatteUnder<L::kAlpha>(v, color);
    if constexpr (sizeof(T) == 4)
      return WithAlphaOf<L>(v, hn::IfThenZeroElse(hn::Gt(m, v), hn::Sub(v, m)));
    else
      return hn::SaturatedSub(v, m);
  });
}

// ---- Mask ----

// In every 32-bit lane of a vector the bit of its pixel, the first pixel's uppermost.
template <size_t kBytes>
struct LaneBits {
  constexpr LaneBits() {
    for (size_t i = 0; i < kLanes<uint32_t>; ++i) lanes[i] = 0x80000000u >> (i * 4 / kBytes);
  }
  alignas(64) uint32_t lanes[kLanes<uint32_t>];
};

template <size_t kBytes>
void SelectPixels(const uint8_t* a, const uint8_t* b, const uint32_t* mask, uint8_t* dst, size_t count) {
  static constexpr LaneBits<kBytes> kLaneBits;
  constexpr size_t kBlock = kMaskPixels * kBytes, kVectorPixels = HWY_MAX_BYTES / kBytes;
  const hn::ScalableTag<uint32_t> d;
  const auto laneBits = hn::Load(d, kLaneBits.lanes);
  // Where masks have registers of their own, loads under a mask wait for it; so it is made a vector.
  const auto body = [&](const uint8_t* inA, const uint8_t* inB, uint8_t* out) HWY_ATTR {
    uint32_t bits = *mask++;
    for (size_t i = 0; i < kBlock / HWY_MAX_BYTES; ++i, bits <<= kVectorPixels) {
      const auto takeA = hn::VecFromMask(d, hn::TestBit(hn::Set(d, bits), laneBits));
      const auto fromA = LoadVector<uint32_t>(inA, i), fromB = LoadVector<uint32_t>(inB, i);
      StoreVector(hn::Or(hn::And(takeA, fromA), hn::AndNot(takeA, fromB)), out, i);
    }
  };
  TwoRowLoop<kBlock>(a, b, dst, count * kBytes, body);
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

// Calls pixel(a, b, out) for each pixel of two rows.
template <class T, class Pixel>
void MergePixels(const uint8_t* a, const uint8_t* b, uint8_t* dst, size_t count, const Pixel& pixel) {
  for (size_t i = 0; i < count; ++i) {
    T inA[4], inB[4], out[4];
    std::memcpy(inA, a + i * sizeof inA, sizeof inA);
    std::memcpy(inB, b + i * sizeof inB, sizeof inB);
    pixel(inA, inB, out);
    std::memcpy(dst + i * sizeof out, out, sizeof out);
  }
}

template <class Black>
uint8_t Scaled(uint8_t c, size_t channel, float gain) {
  const int black = Black::kBlack[channel];
  const float scaled = static_cast<float>(c - black) * gain;
  const auto least = static_cast<float>(-black), most = static_cast<float>(255 - black);
  return static_cast<uint8_t>(ConvertNearest(std::min(std::max(scaled, least), most)) + black);
}

template <class L>
void GainAlpha8u(const uint8_t* src, uint8_t* dst, size_t count, float gain) {
  MapPixels<uint8_t, uint8_t>(src, dst, count, [&](const uint8_t* in, uint8_t* out) {
    ForChannels([&](size_t k) { out[k] = k == L::kAlpha ? Scaled<Rgb8>(in[k], k, gain) : in[k]; });
  });
}

template <class Black>
void GainAll8u(const uint8_t* src, uint8_t* dst, size_t count, float gain) {
  MapPixels<uint8_t, uint8_t>(src, dst, count, [&](const uint8_t* in, uint8_t* out) {
    ForChannels([&](size_t k) { out[k] = Scaled<Black>(in[k], k, gain); });
  });
}

template <class L>
void GainAlpha32f(const uint8_t* src, uint8_t* dst, size_t count, float gain) {
  MapPixels<float, float>(src, dst, count, [&](const float* in, float* out) {
    ForChannels([&](size_t k) { out[k] = k == L::kAlpha ? in[k] * gain : in[k]; });
  });
}

void GainAll32f(const uint8_t* src, uint8_t* dst, size_t count, float gain) {
  MapPixels<float, float>(src, dst, count,
                          [&](const float* in, float* out) { ForChannels([&](size_t k) { out[k] = in[k] * gain; }); });
}

template <class L>
void InvertAlpha(const uint8_t* src, const uint8_t* colors, uint8_t* dst, size_t count) {
  using T = typename L::Type;
  MergePixels<T>(src, colors, dst, count, [](const T* in, const T* color, T* out) {
    ForChannels([&](size_t k) { out[k] = color[k]; });
    out[L::kAlpha] = static_cast<T>(kFullScale<T> - in[L::kAlpha]);
  });
}

void ReplaceBits(const uint8_t* src, uint8_t* dst, size_t bytes, const PixelPattern& value, const PixelPattern& mask) {
  for (size_t i = 0; i < bytes; ++i) {
    const uint8_t m = mask.bytes[i % 16];
    dst[i] = static_cast<uint8_t>((src[i] & ~m) | (value.bytes[i % 16] & m));
  }
}

// m (1 - a) as premultiplying rounds it: to nearest, ties up.
template <class T>
T MatteUnder(T alpha, T matte) {
  if constexpr (sizeof(T) == 4) {
    return matte * (1.0f - alpha);
  } else {
    constexpr uint64_t kMost = kFullScale<T>;
    const uint64_t rest = alpha > kMost ? 0 : kMost - alpha;
    return static_cast<T>((2 * matte * rest + kMost) / (2 * kMost));
  }
}

template <class L>
void SubtractMatte(const uint8_t* src, uint8_t* dst, size_t count, const PixelPattern& matte) {
  using T = typename L::Type;
  T color[4];
  std::memcpy(color, matte.bytes, sizeof color);
  MapPixels<T, T>(src, dst, count, [&](const T* in, T* out) {
    ForChannels([&](size_t k) {
      const T m = MatteUnder(in[L::kAlpha], color[k]);
      out[k] = k == L::kAlpha ? in[k] : m > in[k] ? T{0} : static_cast<T>(in[k] - m);
    });
  });
}

template <size_t kBytes>
void SelectPixels(const uint8_t* a, const uint8_t* b, const uint32_t* mask, uint8_t* dst, size_t count) {
  for (size_t i = 0; i < count; ++i) {
    const bool takeA = (mask[i / kMaskPixels] >> (kMaskPixels - 1 - i % kMaskPixels) & 1) != 0;
    std::memmove(dst + i * kBytes, (takeA ? a : b) + i * kBytes, kBytes);
  }
}

}  // namespace
}  // namespace plain

const GainKernels kGainAlphaLast8u = VX_KERNEL_VARIANTS(GainAlpha8u<Last8u>);
const GainKernels kGainAlphaFirst8u = VX_KERNEL_VARIANTS(GainAlpha8u<First8u>);
const GainKernels kGainPixel8u = VX_KERNEL_VARIANTS(GainAll8u<Rgb8>);
const GainKernels kGainVuyp8 = VX_KERNEL_VARIANTS(GainAll8u<Vuy8>);
const GainKernels kGainAlphaLast32f = VX_KERNEL_VARIANTS(GainAlpha32f<Last32f>);
const GainKernels kGainAlphaFirst32f = VX_KERNEL_VARIANTS(GainAlpha32f<First32f>);
const GainKernels kGainPixel32f = VX_KERNEL_VARIANTS(GainAll32f);

// clang-format off
#define VX_BY_LAYOUT(name)                                                     \
  {{VX_KERNEL_VARIANTS(name<Last8u>), VX_KERNEL_VARIANTS(name<First8u>)},      \
   {VX_KERNEL_VARIANTS(name<Last15u>), VX_KERNEL_VARIANTS(name<First15u>)},    \
   {VX_KERNEL_VARIANTS(name<Last32f>), VX_KERNEL_VARIANTS(name<First32f>)}}
// clang-format on

const MergeKernels kInvertAlpha[kDepthClasses][2] = VX_BY_LAYOUT(InvertAlpha);
const MatteKernels kSubtractMatte[kDepthClasses][2] = VX_BY_LAYOUT(SubtractMatte);
const KernelVariants<ReplaceKernel> kReplaceBits = VX_KERNEL_VARIANTS(ReplaceBits);

const SelectKernels kSelectPixels4 = VX_KERNEL_VARIANTS(SelectPixels<4>);
const SelectKernels kSelectPixels8 = VX_KERNEL_VARIANTS(SelectPixels<8>);
const SelectKernels kSelectPixels16 = VX_KERNEL_VARIANTS(SelectPixels<16>);

}  // namespace vexel
#endif  // HWY_ONCE
