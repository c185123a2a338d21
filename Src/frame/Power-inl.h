// The vector forms of frame/Power.h: the same operations in the same order, so the same bits.
#if defined(VEXEL_FRAME_POWER_INL_H_) == defined(HWY_TARGET_TOGGLE)
#ifdef VEXEL_FRAME_POWER_INL_H_
#undef VEXEL_FRAME_POWER_INL_H_
#else
#define VEXEL_FRAME_POWER_INL_H_
#endif

#include <cstddef>
#include <cstdint>

#include <hwy/highway.h>

#include "frame/Power.h"
#include "frame/RowLoop-inl.h"

HWY_BEFORE_NAMESPACE();
namespace vexel {
namespace HWY_NAMESPACE {
namespace hn = hwy::HWY_NAMESPACE;

#if HWY_TARGET == HWY_SCALAR  // Compiled by foreach_target as the baseline, never chosen.

namespace power_detail {
using V = hn::Vec<hn::ScalableTag<float>>;
}
namespace power_detail {
template <PowerCore kCore, bool kSigned>
HWY_INLINE V Power1(V x, const PowerExponent& y) {
  return V(kSigned ? vexel::SignedPower(x.raw, y) : vexel::Power(x.raw, y));
}
template <PowerCore kCore, bool kSigned>
HWY_INLINE void Power3(V& a, V& b, V& c, const PowerExponent& y) {
  a = Power1<kCore, kSigned>(a, y);
  b = Power1<kCore, kSigned>(b, y);
  c = Power1<kCore, kSigned>(c, y);
}
}  // namespace power_detail
HWY_INLINE power_detail::V Log(power_detail::V x) { return power_detail::V(vexel::Log(x.raw)); }
HWY_INLINE power_detail::V Log10(power_detail::V x) { return power_detail::V(vexel::Log10(x.raw)); }
HWY_INLINE power_detail::V Exp(power_detail::V x) { return power_detail::V(vexel::Exp(x.raw)); }
HWY_INLINE power_detail::V Exp10(power_detail::V x) { return power_detail::V(vexel::Exp10(x.raw)); }

#else

// Tables of eight floats, looked up without memory access. The index is the low three bits of each lane; what stands
// above them does not matter.
#if HWY_TARGET == HWY_AVX3
using EighthIndex = hn::Vec<hn::ScalableTag<int32_t>>;
HWY_INLINE EighthIndex MakeEighthIndex(EighthIndex eighths) { return eighths; }
HWY_INLINE hn::Vec<hn::ScalableTag<float>> LookupEighth(const float* table, EighthIndex index) {
  return hn::Vec<hn::ScalableTag<float>>{
      _mm512_permutexvar_ps(index.raw, _mm512_broadcast_f32x8(_mm256_load_ps(table)))};
}
#elif HWY_TARGET == HWY_AVX2
using EighthIndex = hn::Vec<hn::ScalableTag<int32_t>>;
HWY_INLINE EighthIndex MakeEighthIndex(EighthIndex eighths) { return eighths; }
HWY_INLINE hn::Vec<hn::ScalableTag<float>> LookupEighth(const float* table, EighthIndex index) {
  return hn::Vec<hn::ScalableTag<float>>{_mm256_permutevar8x32_ps(_mm256_load_ps(table), index.raw)};
}
#else
// The bytes of the lane for two 16-byte look-ups that give 0 out of range (bit 7 set).
struct EighthIndex {
  hn::Vec<hn::ScalableTag<uint8_t>> low, high;
};
HWY_INLINE EighthIndex MakeEighthIndex(hn::Vec<hn::ScalableTag<int32_t>> eighths) {
  const hn::ScalableTag<int32_t> di;
  const hn::ScalableTag<uint8_t> d8;
  alignas(16) static constexpr uint8_t kSpread[16] = {0, 0, 0, 0, 4, 4, 4, 4, 8, 8, 8, 8, 12, 12, 12, 12};
  alignas(16) static constexpr uint8_t kBytes[16] = {0, 1, 2, 3, 0, 1, 2, 3, 0, 1, 2, 3, 0, 1, 2, 3};
  const auto offset = hn::BitCast(d8, hn::ShiftLeft<2>(hn::And(eighths, hn::Set(di, 7))));
  const auto bytes = hn::Add(hn::TableLookupBytes(offset, hn::Load(d8, kSpread)), hn::Load(d8, kBytes));
  return {hn::Add(bytes, hn::Set(d8, 0x70)), hn::Sub(bytes, hn::Set(d8, 16))};
}
HWY_INLINE hn::Vec<hn::ScalableTag<float>> LookupEighth(const float* table, const EighthIndex& index) {
  const hn::ScalableTag<float> d;
  const hn::ScalableTag<uint8_t> d8;
  const auto low = hn::TableLookupBytesOr0(hn::BitCast(d8, hn::Load(d, table)), index.low);
  const auto high = hn::TableLookupBytesOr0(hn::BitCast(d8, hn::Load(d, table + 4)), index.high);
  return hn::BitCast(d, hn::Or(low, high));
}
#endif

namespace power_detail {

using D = hn::ScalableTag<float>;
using DI = hn::ScalableTag<int32_t>;
using DD = hn::ScalableTag<double>;
using DHalf = hn::Half<D>;
using DIHalf = hn::Half<DI>;
using V = hn::Vec<D>;
using VI = hn::Vec<DI>;

struct SplitArgument {
  VI eighths;
  V mantissa;
};

// kAll: denormals too.
template <bool kAll>
HWY_INLINE SplitArgument Split(V x) {
  const D d;
  const DI di;
  VI i = hn::BitCast(di, x);
  if constexpr (kAll) {
    const VI renormalised = hn::Sub(hn::BitCast(di, hn::ConvertTo(d, i)), hn::Set(di, 149 << 23));
    i = hn::IfThenElse(hn::Lt(i, hn::Set(di, 0x00800000)), renormalised, i);
  }
  const VI first = hn::Set(di, static_cast<int32_t>(power::kFirstBits));
  i = hn::Sub(i, first);
  const VI mantissa = hn::Add(hn::And(i, hn::Set(di, static_cast<int32_t>(power::kMantissaMask))), first);
  return {hn::ShiftRight<20>(i), hn::BitCast(d, mantissa)};
}

// `count` is eighths + kEighthsMagic. kAll: results that overflow or are denormal too.
template <bool kAll>
HWY_INLINE V Exp2Tail(V count, V f) {
  const D d;
  const DI di;
  const VI bits = hn::BitCast(di, count);
  const EighthIndex index = MakeEighthIndex(bits);
  const V f2 = hn::Mul(f, f);
  const V series = hn::Add(hn::Add(hn::Set(d, power::kExp2[0]), hn::Mul(f, hn::Set(d, power::kExp2[1]))),
                           hn::Mul(f2, hn::Add(hn::Set(d, power::kExp2[2]), hn::Mul(f, hn::Set(d, power::kExp2[3])))));
  const V g = hn::Mul(f, series);
  const V root = LookupEighth(power::kRoot, index);
  const V mantissa = hn::Add(root, hn::Add(LookupEighth(power::kRootRest, index), hn::Mul(root, g)));
  if constexpr (!kAll) {
    // The low bits, shifted to the exponent's place and freed of the eighths.
    const VI exponent = hn::And(hn::ShiftLeft<20>(bits), hn::Set(di, static_cast<int32_t>(0xff800000)));
    return hn::BitCast(d, hn::Add(hn::BitCast(di, mantissa), exponent));
  } else {
    const VI n = hn::ShiftRight<3>(hn::Sub(bits, hn::Set(di, static_cast<int32_t>(power::kEighthsMagicBits))));
    const VI inRange = hn::Min(hn::Max(n, hn::Set(di, -151)), hn::Set(di, 128));
    const VI infinity = hn::Set(di, 0x7f800000);
    const VI normal = hn::Min(hn::Add(hn::BitCast(di, mantissa), hn::ShiftLeft<23>(inRange)), infinity);
    const VI unitExponent = hn::Add(hn::Min(inRange, hn::Set(di, -120)), hn::Set(di, 149 + 127));
    const VI denormal = ConvertNearest(hn::Mul(mantissa, hn::BitCast(d, hn::ShiftLeft<23>(unitExponent))));
    VI result = hn::IfThenElse(hn::Lt(n, hn::Set(di, -125)), denormal, normal);
    result = hn::IfThenElse(hn::Gt(n, hn::Set(di, 128)), infinity, result);
    return hn::BitCast(d, result);
  }
}

template <bool kAll>
HWY_INLINE V Exp2Pair(V high, V low) {
  const V magic = hn::Set(D(), power::kEighthsMagic);
  const V count = hn::Add(hn::Add(high, low), magic);
  return Exp2Tail<kAll>(count, hn::Add(hn::Sub(high, hn::Sub(count, magic)), low));
}

template <bool kAll>
HWY_INLINE V PowerFloat(V x, const PowerExponent& y) {
  const D d;
  const SplitArgument s = Split<kAll>(x);
  const EighthIndex index = MakeEighthIndex(s.eighths);
  const V k = hn::ConvertTo(d, s.eighths);
  const V w = hn::Mul(hn::Sub(s.mantissa, LookupEighth(power::kCentre, index)), LookupEighth(y.slope, index));
  const V w2 = hn::Mul(w, w);
  const V series = hn::Add(hn::Add(hn::Set(d, y.series[0]), hn::Mul(w, hn::Set(d, y.series[1]))),
                           hn::Mul(w2, hn::Add(hn::Set(d, y.series[2]), hn::Mul(w, hn::Set(d, y.series[3])))));
  const V rest = hn::Add(w, hn::Mul(w2, series));
  return Exp2Pair<kAll>(hn::Mul(hn::Set(d, y.eighthHigh), k),
                        hn::Add(hn::Mul(hn::Set(d, y.eighthLow), k), hn::Add(LookupEighth(y.offset, index), rest)));
}

// log2 of half a vector.
HWY_INLINE hn::Vec<DD> Log2Double(hn::Vec<DIHalf> eighths, hn::Vec<DHalf> mantissa, hn::Vec<DHalf> reciprocal,
                                  hn::Vec<DHalf> offset) {
  const DD dd;
  const auto r = hn::Sub(hn::Mul(hn::PromoteTo(dd, mantissa), hn::PromoteTo(dd, reciprocal)), hn::Set(dd, 1.0));
  const auto r2 = hn::Mul(r, r);
  const double* c = power::kLog2;
  const auto c01 = hn::Add(hn::Set(dd, c[0]), hn::Mul(r, hn::Set(dd, c[1])));
  const auto c23 = hn::Add(hn::Set(dd, c[2]), hn::Mul(r, hn::Set(dd, c[3])));
  const auto c45 = hn::Add(hn::Set(dd, c[4]), hn::Mul(r, hn::Set(dd, c[5])));
  const auto series = hn::Add(hn::Add(c01, hn::Mul(r2, c23)), hn::Mul(hn::Mul(r2, r2), c45));
  return hn::Add(hn::Mul(hn::PromoteTo(dd, eighths), hn::Set(dd, 0.125)),
                 hn::Add(hn::PromoteTo(dd, offset), hn::Mul(r, series)));
}

struct DoublePair {
  hn::Vec<DD> lower, upper;
};

template <bool kAll>
HWY_INLINE DoublePair Log2Double(V x) {
  const DHalf dh;
  const DIHalf dih;
  const SplitArgument s = Split<kAll>(x);
  const EighthIndex index = MakeEighthIndex(s.eighths);
  const V reciprocal = LookupEighth(power::kReciprocal, index);
  const V offset = LookupEighth(power::kReciprocalOffset, index);
  return {Log2Double(hn::LowerHalf(dih, s.eighths), hn::LowerHalf(dh, s.mantissa), hn::LowerHalf(dh, reciprocal),
                     hn::LowerHalf(dh, offset)),
          Log2Double(hn::UpperHalf(dih, s.eighths), hn::UpperHalf(dh, s.mantissa), hn::UpperHalf(dh, reciprocal),
                     hn::UpperHalf(dh, offset))};
}

HWY_INLINE V DemoteBoth(hn::Vec<DD> lower, hn::Vec<DD> upper) {
  const DHalf dh;
  return hn::Combine(D(), hn::DemoteTo(dh, upper), hn::DemoteTo(dh, lower));
}

template <bool kAll>
HWY_INLINE V PowerDouble(V x, const PowerExponent& y) {
  const DD dd;
  const DoublePair log2 = Log2Double<kAll>(x);
  const auto exponent = hn::Set(dd, static_cast<double>(y.exponent));
  auto lower = hn::Mul(exponent, log2.lower);
  auto upper = hn::Mul(exponent, log2.upper);
  if constexpr (kAll) {
    const auto most = hn::Set(dd, 1024.0);
    const auto least = hn::Set(dd, -1024.0);
    lower = hn::Max(hn::Min(lower, most), least);
    upper = hn::Max(hn::Min(upper, most), least);
  }
  const auto magic = hn::Set(dd, power::kEighthsMagicDouble);
  const auto lowerEighths = hn::Sub(hn::Add(lower, magic), magic);
  const auto upperEighths = hn::Sub(hn::Add(upper, magic), magic);
  const V count = hn::Add(DemoteBoth(lowerEighths, upperEighths), hn::Set(D(), power::kEighthsMagic));
  return Exp2Tail<kAll>(count, DemoteBoth(hn::Sub(lower, lowerEighths), hn::Sub(upper, upperEighths)));
}

template <bool kAll, PowerCore kCore>
HWY_INLINE V PowerCoreOf(V x, const PowerExponent& y) {
  if constexpr (kCore == PowerCore::Float) return PowerFloat<kAll>(x, y);
  return PowerDouble<kAll>(x, y);
}

// Any argument at all. kSigned: sign(x) * |x|^y, NaN without a sign.
template <PowerCore kCore, bool kSigned>
HWY_NOINLINE V PowerAll(V x, const PowerExponent& y) {
  const D d;
  const DI di;
  const VI given = hn::BitCast(di, kSigned ? hn::Abs(x) : x);
  const auto isZero = hn::Eq(hn::Add(given, given), hn::Zero(di));
  const VI bits = hn::IfThenZeroElse(isZero, given);
  const VI infinity = hn::Set(di, 0x7f800000);
  VI result = hn::BitCast(di, PowerCoreOf<true, kCore>(hn::BitCast(d, bits), y));
  result = hn::IfThenElse(hn::Eq(bits, infinity), infinity, hn::IfThenZeroElse(isZero, result));
  if constexpr (kSigned) result = hn::Or(result, hn::BitCast(di, hn::And(x, hn::SignBit(d))));
  result = hn::IfThenElse(hn::Or(hn::Gt(bits, infinity), hn::Lt(bits, hn::Zero(di))), hn::Set(di, 0x7fc00000), result);
  return hn::BitCast(d, result);
}

template <bool kSigned>
HWY_NOINLINE V PowerLaneByLane(V x, const PowerExponent& y) {
  const D d;
  HWY_ALIGN float lanes[hn::MaxLanes(D())];
  hn::Store(x, d, lanes);
  for (float& lane : lanes) lane = kSigned ? vexel::SignedPower(lane, y) : vexel::Power(lane, y);
  return hn::Load(d, lanes);
}

// Lanes that the fast form does not cover; zero, which is common, it does. `bits` of a magnitude or of any float.
HWY_INLINE hn::Mask<DI> OutsideFastRange(VI bits, hn::Mask<DI> isZero, const PowerExponent& y) {
  const DI di;
  const uint32_t flip = 0x80000000;  // Unsigned comparison by a signed one.
  const VI above = hn::Sub(bits, hn::Set(di, static_cast<int32_t>(y.firstBits + flip)));
  const VI span = hn::Set(di, static_cast<int32_t>(y.lastBits - y.firstBits + flip));
  return hn::AndNot(isZero, hn::Gt(above, span));
}

template <PowerCore kCore, bool kSigned>
struct FastPower {
  HWY_INLINE FastPower(V x, const PowerExponent& y)
      : argument(kSigned ? hn::Abs(x) : x),
        isZero(hn::Eq(hn::BitCast(DI(), argument), hn::Zero(DI()))),
        outside(OutsideFastRange(hn::BitCast(DI(), argument), isZero, y)) {}
  // x again, so that it need not be kept.
  HWY_INLINE V Result(V x, const PowerExponent& y) const {
    const V power = hn::IfThenZeroElse(hn::RebindMask(D(), isZero), PowerCoreOf<false, kCore>(argument, y));
    return kSigned ? hn::Or(power, hn::And(x, hn::SignBit(D()))) : power;
  }
  V argument;
  hn::Mask<DI> isZero, outside;
};

template <PowerCore kCore, bool kSigned>
HWY_INLINE V Power1(V x, const PowerExponent& y) {
  if constexpr (kCore == PowerCore::Scalar) {
    return PowerLaneByLane<kSigned>(x, y);
  } else {
    const FastPower<kCore, kSigned> fast(x, y);
    if (HWY_UNLIKELY(!hn::AllFalse(DI(), fast.outside))) return PowerAll<kCore, kSigned>(x, y);
    return fast.Result(x, y);
  }
}

template <PowerCore kCore, bool kSigned>
HWY_INLINE void Power3(V& a, V& b, V& c, const PowerExponent& y) {
  if constexpr (kCore == PowerCore::Scalar) {
    a = PowerLaneByLane<kSigned>(a, y);
    b = PowerLaneByLane<kSigned>(b, y);
    c = PowerLaneByLane<kSigned>(c, y);
  } else {
    const FastPower<kCore, kSigned> fastA(a, y), fastB(b, y), fastC(c, y);
    if (HWY_UNLIKELY(!hn::AllFalse(DI(), hn::Or(hn::Or(fastA.outside, fastB.outside), fastC.outside)))) {
      a = PowerAll<kCore, kSigned>(a, y);
      b = PowerAll<kCore, kSigned>(b, y);
      c = PowerAll<kCore, kSigned>(c, y);
    } else {
      a = fastA.Result(a, y);
      b = fastB.Result(b, y);
      c = fastC.Result(c, y);
    }
  }
}

}  // namespace power_detail

namespace power_detail {

HWY_INLINE V LogOfBase(V x, double scale) {
  const D d;
  const DI di;
  const DD dd;
  const DoublePair log2 = Log2Double<true>(x);
  const VI bits = hn::BitCast(di, x);
  const VI infinity = hn::Set(di, 0x7f800000);
  VI result =
      hn::BitCast(di, DemoteBoth(hn::Mul(log2.lower, hn::Set(dd, scale)), hn::Mul(log2.upper, hn::Set(dd, scale))));
  result = hn::IfThenElse(hn::Eq(bits, infinity), infinity, result);
  result = hn::IfThenElse(hn::Or(hn::Gt(bits, infinity), hn::Lt(bits, hn::Zero(di))), hn::Set(di, 0x7fc00000), result);
  result =
      hn::IfThenElse(hn::Eq(hn::Add(bits, bits), hn::Zero(di)), hn::Set(di, static_cast<int32_t>(0xff800000)), result);
  return hn::BitCast(d, result);
}

HWY_INLINE V ExpOfBase(V x, const vexel::power::SplitFloat& log2Base) {
  const D d;
  const DI di;
  const auto isNaN = hn::IsNaN(x);
  const V bounded = hn::Max(hn::Min(x, hn::Set(d, 256.0f)), hn::Set(d, -256.0f));
  const V top = hn::And(bounded, hn::BitCast(d, hn::Set(di, static_cast<int32_t>(0xfffff000))));
  const V bottom = hn::Sub(bounded, top);
  const V low =
      hn::Add(hn::Mul(top, hn::Set(d, log2Base.low)), hn::Mul(bottom, hn::Set(d, log2Base.high + log2Base.low)));
  const V result = Exp2Pair<true>(hn::Mul(top, hn::Set(d, log2Base.high)), low);
  return hn::IfThenElse(isNaN, hn::BitCast(d, hn::Set(di, 0x7fc00000)), result);
}

}  // namespace power_detail

HWY_INLINE power_detail::V Log(power_detail::V x) { return power_detail::LogOfBase(x, power::kLn2); }
HWY_INLINE power_detail::V Log10(power_detail::V x) { return power_detail::LogOfBase(x, power::kLog10Of2); }
HWY_INLINE power_detail::V Exp(power_detail::V x) { return power_detail::ExpOfBase(x, power::kLog2EShort); }
HWY_INLINE power_detail::V Exp10(power_detail::V x) { return power_detail::ExpOfBase(x, power::kLog2Of10Short); }

#endif  // HWY_TARGET

// Arguments and results as for the scalar functions; kCore must be y.core.
template <PowerCore kCore>
HWY_INLINE power_detail::V Power(power_detail::V x, const PowerExponent& y) {
  return power_detail::Power1<kCore, false>(x, y);
}
template <PowerCore kCore>
HWY_INLINE power_detail::V SignedPower(power_detail::V x, const PowerExponent& y) {
  return power_detail::Power1<kCore, true>(x, y);
}

// Three vectors at once, the colour channels of pixels: a, b, c <- their powers.
template <PowerCore kCore>
HWY_INLINE void Power3(power_detail::V& a, power_detail::V& b, power_detail::V& c, const PowerExponent& y) {
  power_detail::Power3<kCore, false>(a, b, c, y);
}
template <PowerCore kCore>
HWY_INLINE void SignedPower3(power_detail::V& a, power_detail::V& b, power_detail::V& c, const PowerExponent& y) {
  power_detail::Power3<kCore, true>(a, b, c, y);
}

// For exponents whose core is known only at run time.
HWY_NOINLINE inline power_detail::V PowerAny(power_detail::V x, const PowerExponent& y) {
  if (y.core == PowerCore::Float) return Power<PowerCore::Float>(x, y);
  if (y.core == PowerCore::Double) return Power<PowerCore::Double>(x, y);
  return Power<PowerCore::Scalar>(x, y);
}
HWY_NOINLINE inline void SignedPower3Any(power_detail::V& a, power_detail::V& b, power_detail::V& c,
                                         const PowerExponent& y) {
  if (y.core == PowerCore::Float) {
    SignedPower3<PowerCore::Float>(a, b, c, y);
  } else if (y.core == PowerCore::Double) {
    SignedPower3<PowerCore::Double>(a, b, c, y);
  } else {
    SignedPower3<PowerCore::Scalar>(a, b, c, y);
  }
}

}  // namespace HWY_NAMESPACE
}  // namespace vexel
HWY_AFTER_NAMESPACE();

#endif
