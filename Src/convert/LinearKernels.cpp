// The working curve of linear light: linear = sign(c) |c|^2.4 and back, channel by channel; alpha stays what it is.
//
// Negative and over-range values keep their sign and size, NaN stays NaN (one, the quiet one of the channel's sign).
// The 8u kernels equal the walk through 32f: 8u is scaled by 1/255 before the curve, and after the curve 32f narrows as
// always (round to nearest, saturate; NaN and what int32 cannot hold give 0).
#include <xmmintrin.h>

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <cstring>

#include "convert/LightCodes.h"
#include "convert/LightLookup512.h"
#include "convert/PlainPixels.h"
#include "convert/RgbKernels.h"
#include "convert/Vbmi.h"

#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "convert/LinearKernels.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

#include "convert/PixelVectors-inl.h"
#include "frame/KernelTable.h"
#include "frame/PixelBlock-inl.h"

namespace vexel::plain {
namespace {
void Bgra8ToLinear(const uint8_t* src, uint8_t* dst, size_t count);
void LinearToBgra8(const uint8_t* src, uint8_t* dst, size_t count);
}  // namespace
}  // namespace vexel::plain

#if HWY_TARGET != HWY_BASELINE_SCALAR
HWY_BEFORE_NAMESPACE();
namespace vexel {
namespace HWY_NAMESPACE {
namespace {

class LinearToBgra8Body {
 public:
  explicit HWY_INLINE LinearToBgra8Body(const LightCodes& codes) : mCodes(codes), mOverflow(codes.OverflowBits()) {}

  HWY_INLINE void operator()(const uint8_t* in, uint8_t* out) const {
    F32 blue, green, red, alpha;
    LoadPixels(reinterpret_cast<const float*>(in), blue, green, red, alpha);
    const Codes codes = LightToCodes(blue, green, red);
    StorePixelCodes(codes, ConvertNearest(hn::Mul(alpha, hn::Set(hn::ScalableTag<float>(), 255.0f))), out);
  }

 private:
  using DI = hn::ScalableTag<int32_t>;
  struct Codes {
    I32 blue, green, red;
  };

  // Limits codes to 8u and brings them into the order of memory.
  static HWY_INLINE void StorePixelCodes(const Codes& codes, I32 alpha, uint8_t* out) {
    const hn::ScalableTag<uint8_t> d8;
    const hn::ScalableTag<int16_t> d16;
    const auto blueRed = hn::ReorderDemote2To(d16, codes.blue, codes.red);
    const auto greenAlpha = hn::ReorderDemote2To(d16, codes.green, alpha);
    alignas(16) static constexpr uint8_t kBytes[16] = {0, 8, 4, 12, 1, 9, 5, 13, 2, 10, 6, 14, 3, 11, 7, 15};
    const auto pixels = hn::TableLookupBytes(PackBlocks(blueRed, greenAlpha), hn::LoadDup128(d8, kBytes));
    StoreVector(OrderPacked4(pixels), out);
  }
  // The bits of floats limited to the range of the tables.
  static HWY_INLINE I32 InRange(I32 bits) {
    return hn::Min(hn::Max(bits, hn::Set(DI(), LightCodes::kFirst)), hn::Set(DI(), LightCodes::kLast));
  }
  HWY_INLINE I32 ZeroOverflow(I32 bits, I32 code) const {
    return hn::IfThenElseZero(hn::Lt(bits, hn::Set(DI(), mOverflow)), code);
  }
  HWY_INLINE I32 LookUp(F32 v) const {
    const DI d;
    const auto bits = hn::BitCast(d, v), inRange = InRange(bits);
    const auto bucket = hn::ShiftRight<LightCodes::kLowBits>(hn::Sub(inRange, hn::Set(d, LightCodes::kFirst)));
    const auto entry = hn::GatherIndex(d, mCodes.Entries(), bucket);
    return ZeroOverflow(bits, hn::ShiftRight<LightCodes::kLowBits>(hn::Add(entry, inRange)));
  }
  HWY_INLINE Codes LookUpAll(F32 blue, F32 green, F32 red) const { return {LookUp(blue), LookUp(green), LookUp(red)}; }

#if HWY_TARGET == HWY_AVX3
  // Tables of 16 and 32 floats are permutations here, which are faster than gathers. Only near a threshold and far
  // above white does the result leave the code open. Codes above 255 stand for 255.
  HWY_INLINE I32 Estimate(F32 v, I32& largest, F32& farthest) const {
    const hn::ScalableTag<float> df;
    const auto bits = hn::Max(hn::BitCast(DI(), v), hn::Set(DI(), LightCodes::kFirst));
    const auto segment = hn::ShiftRight<19>(bits).raw;
    const auto coefficient = [&](int power) HWY_ATTR {
      return F32{_mm512_permutexvar_ps(segment, _mm512_load_ps(mCodes.Coefficients(power)))};
    };
    const auto rest = hn::Or(hn::And(bits, hn::Set(DI(), 0x7FFFF)), hn::Set(DI(), 0x3F800000));
    const auto x = hn::BitCast(df, rest);
    const auto parabola = hn::Add(coefficient(0), hn::Mul(x, hn::Add(coefficient(1), hn::Mul(x, coefficient(2)))));
    const auto scale = F32{_mm512_permutex2var_ps(_mm512_load_ps(mCodes.Scales()), hn::ShiftRight<23>(bits).raw,
                                                  _mm512_load_ps(mCodes.Scales() + 16))};
    const auto unrounded = hn::Mul(parabola, scale);
    constexpr int kToNearest = 0, kLargerMagnitude = 0b1011;
    farthest = F32{_mm512_range_ps(farthest.raw, _mm512_reduce_ps(unrounded.raw, kToNearest), kLargerMagnitude)};
    largest = hn::Max(largest, bits);
    return ConvertNearest(unrounded);
  }
  HWY_INLINE Codes LightToCodes(F32 blue, F32 green, F32 red) const {
    const hn::ScalableTag<float> df;
    auto farthest = hn::Zero(df);
    auto largest = hn::Zero(DI());
    const Codes codes = {Estimate(blue, largest, farthest), Estimate(green, largest, farthest),
                         Estimate(red, largest, farthest)};
    const auto isClear = hn::And(hn::Lt(farthest, hn::Set(df, 0.5f - LightCodes::kMostError)),
                                 hn::RebindMask(df, hn::Lt(largest, hn::Set(DI(), LightCodes::kScalesEnd))));
    if (HWY_LIKELY(hn::AllTrue(df, isClear))) return codes;
    return LookUpAll(blue, green, red);
  }
#else
  HWY_INLINE Codes LightToCodes(F32 blue, F32 green, F32 red) const { return LookUpAll(blue, green, red); }
#endif

  const LightCodes& mCodes;
  const int32_t mOverflow;
};

#if HWY_TARGET <= HWY_SSE4
// A pixel is put together from the entries of its four codes, 16 bytes each.
HWY_ATTR void Bgra8ToLinear(const uint8_t* HWY_RESTRICT src, uint8_t* HWY_RESTRICT dst, size_t count) {
  if (HWY_TARGET == HWY_AVX3 && HasVbmi()) return LightLookup512(src, dst, count);
  const float* const entries = LinearCodes::Get().entries[0];
  const auto entry = [entries](uint64_t offset)
                         HWY_ATTR { return _mm_load_ps(entries + (offset & 0xFF0) / sizeof(float)); };
  for (size_t i = 0; i < count; ++i) {
    uint32_t bits;
    std::memcpy(&bits, src + 4 * i, 4);
    const uint64_t pixel = bits;
    const __m128 blueGreen = _mm_blend_ps(entry(pixel << 4), entry(pixel >> 4), 2);
    const __m128 redAlpha = _mm_blend_ps(entry(pixel >> 12), entry(pixel >> 20), 8);
    _mm_storeu_ps(reinterpret_cast<float*>(dst + 16 * i), _mm_blend_ps(blueGreen, redAlpha, 12));
  }
}
#else
HWY_ATTR void Bgra8ToLinear(const uint8_t* src, uint8_t* dst, size_t count) { plain::Bgra8ToLinear(src, dst, count); }
#endif

template <const PowerExponent& kExponent, AlphaWrite kAlpha>
HWY_ATTR void Curve(const uint8_t* src, uint8_t* dst, size_t count) {
  const auto* from = reinterpret_cast<const float*>(src);
  ForEachBlock(from, reinterpret_cast<float*>(dst), count, [](PixelBlock& block) VX_COLOR_STAGE {
    SignedPowers<PowerCore::Float>(block, kExponent);
    if constexpr (kAlpha != AlphaWrite::Keep) std::fill_n(block.alpha, block.pixels, 1.0f);
  });
}
HWY_ATTR void LinearToBgra8(const uint8_t* src, uint8_t* dst, size_t count) {
  // The thresholds are those of rounding to nearest; a caller's other rounding mode takes the definition.
  constexpr uint32_t kRoundingMode = 0x6000;
  if (_mm_getcsr() & kRoundingMode) return plain::LinearToBgra8(src, dst, count);
  RowLoop<kLanes<float>, 16, 4>(src, dst, count, LinearToBgra8Body(LightCodes::Get()));
}
template <AlphaWrite kAlpha>
HWY_ATTR void Linearize(const uint8_t* src, uint8_t* dst, size_t count) {
  Curve<kToLinear, kAlpha>(src, dst, count);
}
template <AlphaWrite kAlpha>
HWY_ATTR void Delinearize(const uint8_t* src, uint8_t* dst, size_t count) {
  Curve<kFromLinear, kAlpha>(src, dst, count);
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

template <const PowerExponent& kExponent, AlphaWrite kAlpha>
void Curve(const uint8_t* src, uint8_t* dst, size_t count) {
  MapPixels<float, float>(src, dst, count, [](const float* in, float* out) {
    ForChannels<3>([&](size_t k) { out[k] = SignedPower(in[k], kExponent); });
    out[3] = kAlpha == AlphaWrite::Keep ? in[3] : 1.0f;
  });
}
template <AlphaWrite kAlpha>
void Linearize(const uint8_t* src, uint8_t* dst, size_t count) {
  Curve<kToLinear, kAlpha>(src, dst, count);
}
template <AlphaWrite kAlpha>
void Delinearize(const uint8_t* src, uint8_t* dst, size_t count) {
  Curve<kFromLinear, kAlpha>(src, dst, count);
}

void Bgra8ToLinear(const uint8_t* src, uint8_t* dst, size_t count) {
  const LinearCodes& codes = LinearCodes::Get();
  MapPixels<uint8_t, float>(src, dst, count, [&](const uint8_t* in, float* out) {
    ForChannels([&](size_t k) { out[k] = codes.entries[in[k]][k]; });
  });
}

void LinearToBgra8(const uint8_t* src, uint8_t* dst, size_t count) {
  MapPixels<float, uint8_t>(src, dst, count, [](const float* in, uint8_t* out) {
    ForChannels<3>([&](size_t k) { out[k] = static_cast<uint8_t>(NarrowLightTo8(in[k])); });
    out[3] = static_cast<uint8_t>(NarrowTo8(in[3]));
  });
}

}  // namespace
}  // namespace plain

const RowKernelSet kBgra32fToLinear = VX_KERNEL_VARIANTS(Linearize<AlphaWrite::Keep>);
const RowKernelSet kBgrx32fToLinear = VX_KERNEL_VARIANTS(Linearize<AlphaWrite::OpaqueLast>);
const RowKernelSet kLinearToBgra32f = VX_KERNEL_VARIANTS(Delinearize<AlphaWrite::Keep>);
const RowKernelSet kLinearToBgrx32f = VX_KERNEL_VARIANTS(Delinearize<AlphaWrite::OpaqueLast>);
const RowKernelSet kBgra8ToLinear = VX_KERNEL_VARIANTS(Bgra8ToLinear);
const RowKernelSet kLinearToBgra8 = VX_KERNEL_VARIANTS(LinearToBgra8);

}  // namespace vexel
#endif  // HWY_ONCE
