// The working curve of linear light: linear = sign(c) |c|^2.4 and back, channel by channel; alpha stays what it is.
//
// Negative and over-range values keep their sign and size, NaN stays NaN (one, the quiet one of the channel's sign).
// The 8u kernels equal the walk through 32f: 8u is scaled by 1/255 before the curve, and after the curve 32f narrows as
// always (round to nearest, saturate; NaN and what int32 cannot hold give 0).
#include <xmmintrin.h>

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

#if HWY_TARGET != HWY_SCALAR
HWY_BEFORE_NAMESPACE();
namespace vexel {
namespace HWY_NAMESPACE {
namespace {

class LinearToBgra8Body {
 public:
  explicit HWY_INLINE LinearToBgra8Body(const LightCodes& codes) : mCodes(codes), mOverflow(codes.OverflowBits()) {}

#if HWY_TARGET == HWY_AVX3
  // Several vectors of pixels go from step to step together; one pixel's way is longer than processors overlap.
  static constexpr size_t kVectors = 4;

  HWY_INLINE void operator()(const uint8_t* in, uint8_t* out) const {
    Unrounded values[kVectors];
    auto largest = hn::Zero(DI());
    for (size_t i = 0; i < kVectors; ++i) {
      const Light light = LoadLight(in, i);
      values[i] = {Estimate(light.blue, largest), Estimate(light.green, largest), Estimate(light.red, largest),
                   ScaledAlpha(light)};
    }
    const bool inRange = hn::AllTrue(DI(), hn::Lt(largest, hn::Set(DI(), LightCodes::kScalesEnd)));
    for (size_t i = 0; i < kVectors; ++i) {
      const Unrounded& v = values[i];
      Codes codes = {ConvertNearest(v.blue), ConvertNearest(v.green), ConvertNearest(v.red)};
      if (HWY_UNLIKELY(!inRange || !IsClear(v))) codes = LookUp(LoadLight(in, i));
      StorePixelCodes(codes, ConvertNearest(v.alpha), out + i * HWY_MAX_BYTES);
    }
  }
#else
  static constexpr size_t kVectors = 1;

  HWY_INLINE void operator()(const uint8_t* in, uint8_t* out) const {
    const Light light = LoadLight(in, 0);
    StorePixelCodes(LookUp(light), ConvertNearest(ScaledAlpha(light)), out);
  }
#endif

 private:
  using DF = hn::ScalableTag<float>;
  using DI = hn::ScalableTag<int32_t>;
  struct Light {
    F32 blue, green, red, alpha;
  };
  struct Codes {
    I32 blue, green, red;
  };

  static HWY_INLINE Light LoadLight(const uint8_t* in, size_t index) {
    Light light;
    LoadPixels(reinterpret_cast<const float*>(in) + index * 4 * kLanes<float>, light.blue, light.green, light.red,
               light.alpha);
    return light;
  }
  static HWY_INLINE F32 ScaledAlpha(const Light& light) { return hn::Mul(light.alpha, hn::Set(DF(), 255.0f)); }

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
  HWY_INLINE Codes LookUp(const Light& light) const {
    return {LookUp(light.blue), LookUp(light.green), LookUp(light.red)};
  }

#if HWY_TARGET == HWY_AVX3
  struct Unrounded {
    F32 blue, green, red, alpha;
  };

  // By the low five bits.
  static HWY_INLINE F32 LookUp32(const float* table, I32 index) {
    return F32{_mm512_permutex2var_ps(_mm512_load_ps(table), index.raw, _mm512_load_ps(table + 16))};
  }

  // Tables of 32 floats are permutations here, which are faster than gathers. Only near a threshold and far
  // above white does the result leave the code open. Codes above 255 stand for 255.
  HWY_INLINE F32 Estimate(F32 v, I32& largest) const {
    const auto bits = hn::Max(hn::BitCast(DI(), v), hn::Set(DI(), LightCodes::kFirst));
    largest = hn::Max(largest, bits);
    const auto segment = hn::ShiftRight<18>(bits);
    const auto coefficient = [&](int power) HWY_ATTR { return LookUp32(mCodes.Coefficients(power), segment); };
    const auto rest = hn::Or(hn::And(bits, hn::Set(DI(), 0x3FFFF)), hn::Set(DI(), 0x3F800000));
    const auto x = hn::BitCast(DF(), rest);
    const auto parabola = hn::Add(coefficient(0), hn::Mul(x, hn::Add(coefficient(1), hn::Mul(x, coefficient(2)))));
    return hn::Mul(parabola, LookUp32(mCodes.Scales(), hn::ShiftRight<23>(bits)));
  }
  // Whether no value is so near a threshold that its code may be wrong.
  static HWY_INLINE bool IsClear(const Unrounded& v) {
    constexpr int kToNearest = 0, kLargerMagnitude = 0b1011;
    const auto distance = [](F32 value) HWY_ATTR { return _mm512_reduce_ps(value.raw, kToNearest); };
    const auto farthest = _mm512_range_ps(_mm512_range_ps(distance(v.blue), distance(v.green), kLargerMagnitude),
                                          distance(v.red), kLargerMagnitude);
    return hn::AllTrue(DF(), hn::Lt(F32{farthest}, hn::Set(DF(), 0.5f - LightCodes::kMostError)));
  }
#endif

  const LightCodes& mCodes;
  const int32_t mOverflow;
};

#if HWY_TARGET <= HWY_SSE4
HWY_INLINE void LookUpLight(const uint8_t* HWY_RESTRICT src, uint8_t* HWY_RESTRICT dst, size_t count) {
  const LinearCodes& codes = LinearCodes::Get();
  const float *const lights = codes.Lights(), *const alphas = codes.Alphas();
  // The third and fourth floats from the entry before, where they are those of this one.
  const float *const thirdLights = lights - 2, *const fourthAlphas = alphas - 2;
  for (size_t i = 0; i < count; ++i) {
    uint32_t pixel;
    std::memcpy(&pixel, src + 4 * i, 4);
    const auto entry = [](const float* table, size_t code) HWY_ATTR { return _mm_loadu_ps(table + 2 * code); };
    const uint32_t upper = pixel >> 16;
    const __m128 blueGreen = _mm_blend_ps(entry(lights, pixel & 255), entry(lights, pixel >> 8 & 255), 2);
    const __m128 redAlpha = _mm_blend_ps(entry(thirdLights, upper & 255), entry(fourthAlphas, upper >> 8), 8);
    _mm_storeu_ps(reinterpret_cast<float*>(dst + 16 * i), _mm_blend_ps(blueGreen, redAlpha, 12));
  }
}
#else
HWY_INLINE void LookUpLight(const uint8_t* src, uint8_t* dst, size_t count) { plain::Bgra8ToLinear(src, dst, count); }
#endif
HWY_ATTR void Bgra8ToLinear(const uint8_t* src, uint8_t* dst, size_t count) {
  if (HWY_TARGET == HWY_AVX3 && HasVbmi()) return LightLookup512(src, dst, count);
  constexpr size_t kPixels = 64;
  RowLoop<kPixels, 4, 16>(src, dst, count,
                          [](const uint8_t* in, uint8_t* out) HWY_ATTR { LookUpLight(in, out, kPixels); });
}

// Powers of the colours of pixels, block by block, in three passes of which the first and the last load and store the
// pixels. The steps and special cases are those of frame/Power-inl.h.
template <const PowerExponent& kExponent, AlphaWrite kAlpha>
class PixelPowers {
 public:
  static constexpr size_t kPixels = PixelBlock::kPixels;

  HWY_INLINE void operator()(const float* from, float* to, size_t pixels) {
    if (!mNegative) {
      if (HWY_LIKELY(!FindExponents<false>(from, pixels))) return Raise<false, false>(from, to, pixels);
      mNegative = AnyNegative(from, pixels);
      if (!mNegative) return Raise<true, false>(from, to, pixels);
    }
    FindExponents<true>(from, pixels);
    Raise<true, true>(from, to, pixels);
  }

 private:
  using DF = hn::ScalableTag<float>;
  using DI = hn::ScalableTag<int32_t>;
  static constexpr PowerCore kCore = PowerCore::Float;
  static_assert(kExponent.core == kCore);

  HWY_INLINE power_detail::StepArrays Steps() { return {mSteps, 3 * kPixels}; }

  template <bool kSigned>
  static HWY_INLINE F32 Magnitude(F32 v) {
    return kSigned ? hn::Abs(v) : v;
  }

  // Whether there are colours outside the range of the fast form.
  template <bool kSigned>
  HWY_INLINE bool FindExponents(const float* from, size_t pixels) {
    auto above = hn::Set(DI(), INT32_MIN);
    for (size_t i = 0; i < pixels; i += kLanes<float>) {
      FetchNextBlock(from + 4 * i);
      F32 blue, green, red, alpha;
      LoadPixels(from + 4 * i, blue, green, red, alpha);
      const auto store = [&](F32 v, size_t at) VX_COLOR_STAGE {
        const F32 x = Magnitude<kSigned>(v);
        above = hn::Max(above, power_detail::AboveFirst(x, kExponent));
        Steps().Store(power_detail::PlaceOf<false, kCore>(x, kExponent.log), at);
      };
      store(blue, 3 * i);
      store(green, 3 * i + kLanes<float>);
      store(red, 3 * i + 2 * kLanes<float>);
      if constexpr (kAlpha == AlphaWrite::Keep) hn::Store(alpha, DF(), mAlpha + i);
    }
    for (size_t i = 0; i < 3 * pixels; i += kLanes<float>) {
      const auto log = power_detail::LogOf<kCore>(Steps().PlaceAt(i), kExponent.log);
      Steps().Store(power_detail::EighthsOf<kCore>(log), i);
    }
    return !hn::AllFalse(DI(), hn::Gt(above, power_detail::FastSpan(kExponent)));
  }

  template <bool kRare, bool kSigned>
  HWY_INLINE void Raise(const float* from, float* to, size_t pixels) {
    for (size_t i = 0; i < pixels; i += kLanes<float>) {
      FetchNextBlock(to + 4 * i);
      F32 blue, green, red, alpha;
      if constexpr (kRare) LoadPixels(from + 4 * i, blue, green, red, alpha);
      const auto raise = [&](F32& v, size_t at) VX_COLOR_STAGE {
        auto power = power_detail::Exp2Of<false>(Steps().EighthsAt(at));
        if constexpr (kRare) {
          power = power_detail::MendRare<kCore>(power, Magnitude<kSigned>(v), kExponent);
          if constexpr (kSigned) power = hn::Or(power, hn::And(v, hn::SignBit(DF())));
          power = power_detail::WithoutSignedNaN<kSigned>(power, v);
        }
        v = power;
      };
      raise(blue, 3 * i);
      raise(green, 3 * i + kLanes<float>);
      raise(red, 3 * i + 2 * kLanes<float>);
      alpha = kAlpha == AlphaWrite::Keep ? hn::Load(DF(), mAlpha + i) : hn::Set(DF(), 1.0f);
      StorePixels(blue, green, red, alpha, to + 4 * i);
    }
  }

  static HWY_INLINE bool AnyNegative(const float* from, size_t pixels) {
    auto all = hn::Zero(DI());
    for (size_t i = 0; i < 4 * pixels; i += kLanes<float>)
      all = hn::Or(all, hn::BitCast(DI(), hn::LoadU(DF(), from + i)));
    return !hn::AllFalse(DI(), hn::Lt(all, hn::Zero(DI())));
  }

  bool mNegative = false;  // A minus sign has been met; until then none is taken off or put back.
  HWY_ALIGN float mSteps[6 * kPixels];
  HWY_ALIGN float mAlpha[kPixels];
};

template <const PowerExponent& kExponent, AlphaWrite kAlpha>
HWY_ATTR void Curve(const uint8_t* src, uint8_t* dst, size_t count) {
  PixelPowers<kExponent, kAlpha> powers;
  ForEachRun(reinterpret_cast<const float*>(src), reinterpret_cast<float*>(dst), count, powers.kPixels,
             [&](const float* from, float* to, size_t pixels) VX_COLOR_STAGE { powers(from, to, pixels); });
}
HWY_ATTR void LinearToBgra8(const uint8_t* src, uint8_t* dst, size_t count) {
  // The thresholds are those of rounding to nearest; a caller's other rounding mode takes the definition.
  constexpr uint32_t kRoundingMode = 0x6000;
  if (_mm_getcsr() & kRoundingMode) return plain::LinearToBgra8(src, dst, count);
  RowLoop<LinearToBgra8Body::kVectors * kLanes<float>, 16, 4>(src, dst, count, LinearToBgra8Body(LightCodes::Get()));
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
    ForChannels<3>([&](size_t k) { out[k] = codes.Light(in[k]); });
    out[3] = codes.Alpha(in[3]);
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
