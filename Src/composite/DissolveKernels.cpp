#include "composite/DissolveKernels.h"

#include <cstring>

#include "composite/Opacity.h"
#include "composite/PlainOver8.h"
#include "convert/PlainPixels.h"
#include "formats/FormatBits.h"

#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "composite/DissolveKernels.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

#include "composite/TwoRows-inl.h"
#include "convert/PixelVectors-inl.h"
#include "frame/KernelTable.h"

#ifndef VEXEL_COMPOSITE_DISSOLVEKERNELS_LAYOUTS
#define VEXEL_COMPOSITE_DISSOLVEKERNELS_LAYOUTS
namespace vexel {
namespace {

// Where straight alpha is in an 8u pixel, and the pixel of transparent black.
struct Layout8 {
  size_t alpha;
  uint32_t black;
};
constexpr Layout8 kBgra8 = {3, 0}, kArgb8 = {0, 0}, kVuya8 = {3, kBlackVuyWord};

// What becomes of the fourth channel: it mixes like the others, is written opaque, or weights them.
template <class T, AlphaWrite kWrite>
struct AlphaMode {
  using Sample = T;
  static constexpr AlphaWrite kAlphaWrite = kWrite;
};
template <class T>
using Keep = AlphaMode<T, AlphaWrite::Keep>;
template <class T>
using OpaqueLast = AlphaMode<T, AlphaWrite::OpaqueLast>;
template <class T>
using OpaqueFirst = AlphaMode<T, AlphaWrite::OpaqueFirst>;

template <class T, size_t kIndex>
struct StraightMode {
  using Sample = T;
  static constexpr size_t kAlpha = kIndex;
};
template <class T>
using StraightLast = StraightMode<T, 3>;
template <class T>
using StraightFirst = StraightMode<T, 0>;

template <class T>
constexpr float kCodeGuard = kAlphaGuard* kFullScale<T>;

// Ten bits each, three of them in a word from this bit on.
constexpr int kV210Bit = 0, kRgb10Bit = 2;

}  // namespace
}  // namespace vexel
#endif

#if HWY_TARGET != HWY_SCALAR
HWY_BEFORE_NAMESPACE();
namespace vexel {
namespace HWY_NAMESPACE {
namespace {

constexpr size_t kBlock = HWY_MAX_BYTES;

// A vector of samples as floats; `index` counts such vectors.
template <class T>
HWY_INLINE F32 LoadSamples(const uint8_t* p, size_t index) {
  const hn::ScalableTag<float> d;
  if constexpr (sizeof(T) == 4) return LoadVector<float>(p, index);
  p += index * kLanes<float> * sizeof(T);
  if constexpr (sizeof(T) == 1) return hn::ConvertTo(d, LoadPromoted<int32_t, uint8_t>(p));
  if constexpr (sizeof(T) == 2)
    return hn::Min(hn::ConvertTo(d, LoadPromoted<int32_t, uint16_t>(p)), hn::Set(d, kFullScale<uint16_t>));
}

struct Weights {
  HWY_INLINE explicit Weights(float mix)
      : a(hn::Set(hn::ScalableTag<float>(), 1.0f - mix)), b(hn::Set(hn::ScalableTag<float>(), mix)) {}
  HWY_INLINE Weights(F32 weightA, F32 weightB) : a(weightA), b(weightB) {}
  HWY_INLINE F32 Mix(F32 x, F32 y) const { return hn::Add(hn::Mul(x, a), hn::Mul(y, b)); }
  F32 a, b;
};

// The weights of two pixels' colours; where alphas are equal they are those of the images.
template <class T>
struct AlphaWeights {
  HWY_INLINE AlphaWeights(const Weights& mix, F32 alphaA, F32 alphaB)
      : a(hn::Mul(alphaA, mix.a)), b(hn::Mul(alphaB, mix.b)), alpha(hn::Add(a, b)) {
    const hn::ScalableTag<float> d;
    isClear = hn::Lt(alpha, hn::Set(d, kCodeGuard<T>));
    const auto isSame = hn::Eq(alphaA, alphaB);
    const auto divisor = hn::IfThenElse(isClear, hn::Set(d, 1.0f), alpha);
    a = hn::IfThenElse(isSame, mix.a, hn::Div(a, divisor));
    b = hn::IfThenElse(isSame, mix.b, hn::Div(b, divisor));
  }
  F32 a, b, alpha;
  hn::Mask<hn::ScalableTag<float>> isClear;
};

struct MixChannels {
  HWY_INLINE F32 operator()(F32 a, F32 b) const { return weights.Mix(a, b); }
  Weights weights;
};

template <class T, size_t kAlpha>
struct MixStraight {
  HWY_INLINE F32 operator()(F32 a, F32 b) const {
    const AlphaWeights<T> pixel(weights, hn::Broadcast<kAlpha>(a), hn::Broadcast<kAlpha>(b));
    const auto color = hn::IfThenZeroElse(pixel.isClear, Weights(pixel.a, pixel.b).Mix(a, b));
    return hn::IfThenElse(hn::MaskFromVec(ChannelMask<kAlpha, float>()), pixel.alpha, color);
  }
  Weights weights;
};

template <class T, AlphaWrite kAlpha, class Op>
HWY_INLINE void MixSamples(const uint8_t* rowA, const uint8_t* rowB, uint8_t* rowDst, size_t bytes, const Op& op) {
  TwoRowLoop<kBlock>(rowA, rowB, rowDst, bytes, [&](const uint8_t* a, const uint8_t* b, uint8_t* dst) HWY_ATTR {
    const auto mixed = [&](size_t i) HWY_ATTR { return op(LoadSamples<T>(a, i), LoadSamples<T>(b, i)); };
    const auto code = [&](size_t i) HWY_ATTR { return ConvertNearest(mixed(i)); };
    if constexpr (sizeof(T) == 4) StoreVector(WriteAlpha<kAlpha, T>(mixed(0)), dst);
    if constexpr (sizeof(T) == 2) StoreVector(WriteAlpha<kAlpha, T>(PackToU16(code(0), code(1))), dst);
    if constexpr (sizeof(T) == 1) StoreVector(WriteAlpha<kAlpha, T>(PackTo8(code(0), code(1), code(2), code(3))), dst);
  });
}

template <class Mode>
HWY_ATTR void Mix(const uint8_t* a, const uint8_t* b, uint8_t* dst, size_t bytes, float mix) {
  MixSamples<typename Mode::Sample, Mode::kAlphaWrite>(a, b, dst, bytes, MixChannels{Weights(mix)});
}
template <class Mode>
HWY_ATTR void MixAlpha(const uint8_t* a, const uint8_t* b, uint8_t* dst, size_t bytes, float mix) {
  using T = typename Mode::Sample;
  MixSamples<T, AlphaWrite::Keep>(a, b, dst, bytes, MixStraight<T, Mode::kAlpha>{Weights(mix)});
}

// Bits kShift to kShift + kBits - 1 of each word as a float.
template <int kShift, int kBits>
HWY_INLINE F32 Field(U32 words) {
  const auto shifted = hn::ShiftRight<kShift>(words);
  const auto field =
      kShift + kBits == 32 ? shifted : hn::And(shifted, hn::Set(hn::ScalableTag<uint32_t>(), (1u << kBits) - 1));
  return hn::ConvertTo(hn::ScalableTag<float>(), hn::BitCast(hn::ScalableTag<int32_t>(), field));
}
template <int kShift>
HWY_INLINE U32 IntoField(F32 value) {
  return hn::ShiftLeft<kShift>(hn::BitCast(hn::ScalableTag<uint32_t>(), ConvertNearest(value)));
}

// Pixels with one channel per vector: one division serves a pixel's three colours.
template <const Layout8& kLayout>
HWY_ATTR void MixAlpha8(const uint8_t* rowA, const uint8_t* rowB, uint8_t* rowDst, size_t bytes, float mix) {
  const Weights weights(mix);
  TwoRowLoop<kBlock>(rowA, rowB, rowDst, bytes, [&](const uint8_t* a, const uint8_t* b, uint8_t* dst) HWY_ATTR {
    const hn::ScalableTag<uint32_t> d;
    constexpr int kAlpha = 8 * kLayout.alpha, kFirst = kAlpha == 0 ? 8 : 0;
    const U32 pixelA = LoadVector<uint32_t>(a), pixelB = LoadVector<uint32_t>(b);
    const AlphaWeights<uint8_t> pixel(weights, Field<kAlpha, 8>(pixelA), Field<kAlpha, 8>(pixelB));
    const Weights color(pixel.a, pixel.b);
    const auto channel = [&](auto shift) HWY_ATTR {
      constexpr int kShift = decltype(shift)::value;
      return IntoField<kShift>(color.Mix(Field<kShift, 8>(pixelA), Field<kShift, 8>(pixelB)));
    };
    const U32 first = channel(std::integral_constant<int, kFirst>());
    const U32 second = channel(std::integral_constant<int, kFirst + 8>());
    const U32 third = channel(std::integral_constant<int, kFirst + 16>());
    const U32 colors = hn::IfThenElse(hn::RebindMask(d, pixel.isClear), hn::Set(d, kLayout.black),
                                      hn::Or(hn::Or(first, second), third));
    StoreVector(hn::Or(colors, IntoField<kAlpha>(pixel.alpha)), dst);
  });
}

template <int kBit>
HWY_ATTR void MixTenBits(const uint8_t* rowA, const uint8_t* rowB, uint8_t* rowDst, size_t bytes, float mix) {
  const Weights weights(mix);
  TwoRowLoop<kBlock>(rowA, rowB, rowDst, bytes, [&](const uint8_t* a, const uint8_t* b, uint8_t* dst) HWY_ATTR {
    const U32 wordA = LoadVector<uint32_t>(a), wordB = LoadVector<uint32_t>(b);
    const U32 low = IntoField<kBit>(weights.Mix(Field<kBit, 10>(wordA), Field<kBit, 10>(wordB)));
    const U32 middle = IntoField<kBit + 10>(weights.Mix(Field<kBit + 10, 10>(wordA), Field<kBit + 10, 10>(wordB)));
    const U32 high = IntoField<kBit + 20>(weights.Mix(Field<kBit + 20, 10>(wordA), Field<kBit + 20, 10>(wordB)));
    StoreVector(hn::Or(hn::Or(low, middle), high), dst);
  });
}

HWY_ATTR void AddScaled(const uint8_t* rowA, const uint8_t* rowB, uint8_t* rowDst, size_t bytes, float weight) {
  const auto factor = hn::Set(hn::ScalableTag<float>(), weight);
  TwoRowLoop<kBlock>(rowA, rowB, rowDst, bytes, [&](const uint8_t* a, const uint8_t* b, uint8_t* dst) HWY_ATTR {
    StoreVector(hn::Add(LoadVector<float>(b), hn::Mul(LoadVector<float>(a), factor)), dst);
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

struct Weights {
  float a, b;
  float Mix(float x, float y) const { return x * a + y * b; }
};

template <class T>
float Sample(T value) {
  return sizeof(T) == 2 && value > kFullScale<T> ? float{kFullScale<T>} : static_cast<float>(value);
}
template <class T>
T Code(float value) {
  if constexpr (sizeof(T) == 4) return value;
  return static_cast<T>(Clamp(ConvertNearest(value), 0, kFullScale<T>));
}

// Calls pixel(a, b, out) with four samples each.
template <class T, class Pixel>
void MapTwo(const uint8_t* a, const uint8_t* b, uint8_t* dst, size_t bytes, const Pixel& pixel) {
  for (size_t i = 0; i < bytes; i += 4 * sizeof(T)) {
    T inA[4], inB[4], out[4];
    std::memcpy(inA, a + i, sizeof inA);
    std::memcpy(inB, b + i, sizeof inB);
    pixel(inA, inB, out);
    std::memcpy(dst + i, out, sizeof out);
  }
}

template <class Mode>
void Mix(const uint8_t* a, const uint8_t* b, uint8_t* dst, size_t bytes, float mix) {
  using T = typename Mode::Sample;
  constexpr AlphaWrite kAlpha = Mode::kAlphaWrite;
  const Weights weights{1.0f - mix, mix};
  MapTwo<T>(a, b, dst, bytes, [&](const T* inA, const T* inB, T* out) {
    ForChannels([&](size_t k) { out[k] = Code<T>(weights.Mix(Sample(inA[k]), Sample(inB[k]))); });
    if constexpr (kAlpha != AlphaWrite::Keep) out[AlphaIndex(kAlpha)] = kFullScale<T>;
  });
}

template <class T>
void MixStraight(const uint8_t* a, const uint8_t* b, uint8_t* dst, size_t bytes, float mix, size_t alpha,
                 const T (&black)[4]) {
  const Weights weights{1.0f - mix, mix};
  MapTwo<T>(a, b, dst, bytes, [&](const T* inA, const T* inB, T* out) {
    const float alphaA = Sample(inA[alpha]), alphaB = Sample(inB[alpha]);
    const Weights parts{alphaA * weights.a, alphaB * weights.b};
    const float sum = parts.a + parts.b;
    const bool isClear = sum < kCodeGuard<T>;
    const float divisor = isClear ? 1.0f : sum;
    const Weights color = alphaA == alphaB ? weights : Weights{parts.a / divisor, parts.b / divisor};
    ForChannels([&](size_t k) {
      out[k] = k == alpha ? Code<T>(sum) : isClear ? black[k] : Code<T>(color.Mix(Sample(inA[k]), Sample(inB[k])));
    });
  });
}
template <class Mode>
void MixAlpha(const uint8_t* a, const uint8_t* b, uint8_t* dst, size_t bytes, float mix) {
  MixStraight<typename Mode::Sample>(a, b, dst, bytes, mix, Mode::kAlpha, {0, 0, 0, 0});
}
template <const Layout8& kLayout>
void MixAlpha8(const uint8_t* a, const uint8_t* b, uint8_t* dst, size_t bytes, float mix) {
  uint8_t black[4];
  std::memcpy(black, &kLayout.black, sizeof black);
  MixStraight(a, b, dst, bytes, mix, kLayout.alpha, black);
}

template <int kBit>
void MixTenBits(const uint8_t* a, const uint8_t* b, uint8_t* dst, size_t bytes, float mix) {
  const Weights weights{1.0f - mix, mix};
  for (size_t i = 0; i < bytes; i += 4) {
    uint32_t wordA, wordB, word = 0;
    std::memcpy(&wordA, a + i, 4);
    std::memcpy(&wordB, b + i, 4);
    for (int bit = kBit; bit < kBit + 30; bit += 10) {
      const auto field = [&](uint32_t w) { return static_cast<float>(w >> bit & 1023); };
      word |= static_cast<uint32_t>(ConvertNearest(weights.Mix(field(wordA), field(wordB)))) << bit;
    }
    std::memcpy(dst + i, &word, 4);
  }
}

void AddScaled(const uint8_t* a, const uint8_t* b, uint8_t* dst, size_t bytes, float weight) {
  MapTwo<float>(a, b, dst, bytes, [&](const float* inA, const float* inB, float* out) {
    ForChannels([&](size_t k) { out[k] = inB[k] + inA[k] * weight; });
  });
}

}  // namespace
}  // namespace plain

const MixKernelSet kAddScaled = VX_KERNEL_VARIANTS(AddScaled);

namespace {

const MixKernelSet kMixBgra8 = VX_KERNEL_VARIANTS(MixAlpha8<kBgra8>);
const MixKernelSet kMixArgb8 = VX_KERNEL_VARIANTS(MixAlpha8<kArgb8>);
const MixKernelSet kMixVuya8 = VX_KERNEL_VARIANTS(MixAlpha8<kVuya8>);
const MixKernelSet kMixV210 = VX_KERNEL_VARIANTS(MixTenBits<kV210Bit>);
const MixKernelSet kMixRgb10 = VX_KERNEL_VARIANTS(MixTenBits<kRgb10Bit>);
const MixKernelSet kMixAlpha15[2] = {VX_KERNEL_VARIANTS(MixAlpha<StraightLast<uint16_t>>),
                                     VX_KERNEL_VARIANTS(MixAlpha<StraightFirst<uint16_t>>)};
const MixKernelSet kMixAlpha32[2] = {VX_KERNEL_VARIANTS(MixAlpha<StraightLast<float>>),
                                     VX_KERNEL_VARIANTS(MixAlpha<StraightFirst<float>>)};

// In the order of AlphaWrite.
const MixKernelSet kMix8[3] = {VX_KERNEL_VARIANTS(Mix<Keep<uint8_t>>), VX_KERNEL_VARIANTS(Mix<OpaqueLast<uint8_t>>),
                               VX_KERNEL_VARIANTS(Mix<OpaqueFirst<uint8_t>>)};
const MixKernelSet kMix15[3] = {VX_KERNEL_VARIANTS(Mix<Keep<uint16_t>>), VX_KERNEL_VARIANTS(Mix<OpaqueLast<uint16_t>>),
                                VX_KERNEL_VARIANTS(Mix<OpaqueFirst<uint16_t>>)};
const MixKernelSet kMix32[3] = {VX_KERNEL_VARIANTS(Mix<Keep<float>>), VX_KERNEL_VARIANTS(Mix<OpaqueLast<float>>),
                                VX_KERNEL_VARIANTS(Mix<OpaqueFirst<float>>)};

const MixKernelSet* StraightKernelFor(VX_PixelFormat format) noexcept {
  const bool first = IsReversed(format);
  if (Depth(format) == kDepth15u) return &kMixAlpha15[first];
  if (Depth(format) == kDepth32f) return &kMixAlpha32[first];
  return IsYuv(format) ? &kMixVuya8 : first ? &kMixArgb8 : &kMixBgra8;
}

}  // namespace

VX_PixelFormat InFloat(VX_PixelFormat format) noexcept {
  if (Bits(format) == kDepth10u) return VX_PixelFormat::BGRX_4444_32f;
  return FromBits((Bits(format) & ~kDepthMask) | kDepth32f);
}

const MixKernelSet* MixKernelFor(VX_PixelFormat format) noexcept {
  if (IsV210(format)) return &kMixV210;
  if (Bits(format) == kDepth10u) return &kMixRgb10;
  if (AlphaKind(format) == kAlphaStraight) return StraightKernelFor(format);
  const AlphaWrite alpha = AlphaKind(format) != kAlphaIgnored ? AlphaWrite::Keep
                           : IsReversed(format)               ? AlphaWrite::OpaqueFirst
                                                              : AlphaWrite::OpaqueLast;
  const MixKernelSet* const kernels = Depth(format) == kDepth8u ? kMix8 : Depth(format) == kDepth15u ? kMix15 : kMix32;
  return &kernels[static_cast<size_t>(alpha)];
}

}  // namespace vexel
#endif  // HWY_ONCE
