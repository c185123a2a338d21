// The vector forms of frame/Power.h: the same operations in the same order, so the same bits.
#if defined(VEXEL_FRAME_POWER_INL_H_) == defined(HWY_TARGET_TOGGLE)
#ifdef VEXEL_FRAME_POWER_INL_H_
#undef VEXEL_FRAME_POWER_INL_H_
#else
#define VEXEL_FRAME_POWER_INL_H_
#endif

#include <bit>
#include <cstddef>
#include <cstdint>
#include <type_traits>

#include <hwy/highway.h>

#include "frame/Power.h"
#include "frame/RowLoop-inl.h"

#if HWY_TARGET != HWY_SCALAR
HWY_BEFORE_NAMESPACE();
namespace vexel {
namespace HWY_NAMESPACE {
namespace hn = hwy::HWY_NAMESPACE;

#ifndef VX_POWER_STEP
#define VX_POWER_STEP HWY_ATTR __attribute__((always_inline))
#endif

// An argument 1 - u, as for PowerOfOneLess.
struct OneLess {
  hn::Vec<hn::ScalableTag<float>> u;
};

// A power as the sum of two, before that is rounded.
struct PowerTerms {
  hn::Vec<hn::ScalableTag<float>> root, rest;
};

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
using V = hn::Vec<D>;
using VI = hn::Vec<DI>;

// kRoot less the low bits of its index at their place in the exponent's shift.
struct ShiftedRoot {
  constexpr ShiftedRoot() : entries{} {
    for (uint32_t j = 0; j < 8; ++j)
      entries[j] = std::bit_cast<float>(std::bit_cast<uint32_t>(power::kRoot[j]) - (j << 20));
  }
  alignas(32) float entries[8];
};
inline constexpr ShiftedRoot kShiftedRoot;

// mantissa * 2^(the whole octaves of a count), the bits of which are given; any count.
HWY_INLINE V ScaleByEighths(V mantissa, VI countBits) {
  const D d;
  const DI di;
  const VI n =
      hn::ShiftRight<3>(hn::Sub(countBits, hn::Set(di, static_cast<int32_t>(vexel::power::kEighthsMagicBits))));
  const VI inRange = hn::Min(hn::Max(n, hn::Set(di, -151)), hn::Set(di, 128));
  const VI infinity = hn::Set(di, 0x7f800000);
  const VI normal = hn::Min(hn::Add(hn::BitCast(di, mantissa), hn::ShiftLeft<23>(inRange)), infinity);
  const VI unitExponent = hn::Add(hn::Min(inRange, hn::Set(di, -120)), hn::Set(di, 149 + 127));
  const VI denormal = ConvertNearest(hn::Mul(mantissa, hn::BitCast(d, hn::ShiftLeft<23>(unitExponent))));
  VI result = hn::IfThenElse(hn::Lt(n, hn::Set(di, -125)), denormal, normal);
  result = hn::IfThenElse(hn::Gt(n, hn::Set(di, 128)), infinity, result);
  return hn::BitCast(d, result);
}

// The bits of x from the first segment on. kAll: denormals too.
template <bool kAll>
HWY_INLINE VI SegmentBits(V x) {
  const D d;
  const DI di;
  VI i = hn::BitCast(di, x);
  if constexpr (kAll) {
    const VI renormalised = hn::Sub(hn::BitCast(di, hn::ConvertTo(d, i)), hn::Set(di, 149 << 23));
    i = hn::IfThenElse(hn::Lt(i, hn::Set(di, 0x00800000)), renormalised, i);
  }
  return hn::Sub(i, hn::Set(di, static_cast<int32_t>(vexel::power::kFirstBits)));
}

// The mantissa less the centre of its segment.
HWY_INLINE V FractionOf(VI bits, const EighthIndex& index) {
  const D d;
  const DI di;
  const VI mask = hn::Set(di, static_cast<int32_t>(vexel::power::kMantissaMask));
  const VI first = hn::Set(di, static_cast<int32_t>(vexel::power::kFirstBits));
  const V mantissa = hn::BitCast(d, hn::Add(hn::And(bits, mask), first));
  return hn::Sub(mantissa, LookupEighth(vexel::power::kCentre, index));
}

// c[0] + v * c[1] + v^2 * c[2] + v^3 * c[3].
HWY_INLINE V Cubic(V v, V square, const float* c) {
  const D d;
  const V low = hn::Add(hn::Set(d, c[0]), hn::Mul(v, hn::Set(d, c[1])));
  const V high = hn::Add(hn::Set(d, c[2]), hn::Mul(v, hn::Set(d, c[3])));
  return hn::Add(low, hn::Mul(square, high));
}

// A power goes in three steps, which loops over many vectors take one after the other: more vectors are in flight then
// than a scheduler finds in one long chain. The first: x to eighths of an octave and its place in the segment, in the
// float form already multiplied by the slope.
struct Place {
  VI eighths;
  V place;
};

HWY_INLINE V ValueOf(V x) { return x; }
HWY_INLINE V ValueOf(OneLess x) { return hn::Sub(hn::Set(D(), 1.0f), x.u); }
// The fraction with what the rounding of the argument took away.
HWY_INLINE V WithRest(V fraction, V) { return fraction; }
HWY_INLINE V WithRest(V fraction, OneLess x) {
  const V one = hn::Set(D(), 1.0f);
  return hn::Add(fraction, hn::Sub(hn::Sub(one, hn::Sub(one, x.u)), x.u));
}

template <bool kAll, PowerCore kCore, class Argument, class Log>
HWY_INLINE Place PlaceOf(Argument x, const Log& log) {
  const VI bits = SegmentBits<kAll>(ValueOf(x));
  const VI eighths = hn::ShiftRight<20>(bits);
  const EighthIndex index = MakeEighthIndex(eighths);
  const V fraction = FractionOf(bits, index);
  if constexpr (kCore == PowerCore::Float) return {eighths, hn::Mul(fraction, LookupEighth(log.slopes, index))};
  return {eighths, WithRest(fraction, x)};
}

// The second: scale * log2(x) - shift = large + middle + small, as whole eighths and the rest. The float form has no
// middle.
struct LogSum {
  V large, middle, small;
};

// start + w^2 * series(w).
HWY_INLINE V Curve(V start, V w, const vexel::power::ScaledLog2& log) {
  const V square = hn::Mul(w, w);
  return hn::Add(start, hn::Mul(square, Cubic(w, square, log.series)));
}

template <PowerCore kCore>
HWY_INLINE LogSum LogOf(const Place& x, const vexel::power::ScaledLog2& log) {
  const D d;
  const EighthIndex index = MakeEighthIndex(x.eighths);
  const V k = hn::ConvertTo(d, x.eighths);
  const V large = hn::Mul(hn::Set(d, log.eighthHigh), k);
  const V offset = hn::Add(hn::Mul(hn::Set(d, log.eighthLow), k), LookupEighth(log.offsets, index));
  if constexpr (kCore == PowerCore::Float) {
    return {large, large, hn::Add(offset, Curve(x.place, x.place, log))};
  } else {
    const V top = hn::And(x.place, hn::BitCast(d, hn::Set(DI(), static_cast<int32_t>(0xfffff000))));
    const V slope = LookupEighth(log.slopes, index);
    const V middle = hn::Mul(top, slope);
    const V rest =
        hn::Add(hn::Mul(hn::Sub(x.place, top), slope), hn::Mul(x.place, LookupEighth(log.slopeRests, index)));
    return {hn::Add(large, LookupEighth(log.offsetsHigh, index)), middle,
            hn::Add(offset, Curve(rest, hn::Add(middle, rest), log))};
  }
}

// n / 8 + f, |f| at most 1/16; `count` is n / 8 + kEighthsMagic.
struct Eighths {
  V count, f;
};
template <PowerCore kCore>
HWY_INLINE Eighths EighthsOf(const LogSum& sum) {
  const V magic = hn::Set(D(), vexel::power::kEighthsMagic);
  constexpr bool kLong = kCore == PowerCore::Long;
  const V upper = kLong ? hn::Add(sum.large, sum.middle) : sum.large;
  const V count = hn::Add(hn::Add(upper, sum.small), magic);
  const V left = hn::Sub(sum.large, hn::Sub(count, magic));
  return {count, hn::Add(kLong ? hn::Add(left, sum.middle) : left, sum.small)};
}

HWY_INLINE V SumOf(const PowerTerms& terms) { return hn::Add(terms.root, terms.rest); }

// The last step: 2^(n / 8 + f + kRootShift), normal and finite, as a sum.
HWY_INLINE V Exp2Part(V f) { return hn::Mul(f, Cubic(f, hn::Mul(f, f), vexel::power::kExp2)); }
HWY_INLINE PowerTerms Exp2Terms(const Eighths& t) {
  const D d;
  const DI di;
  const VI bits = hn::BitCast(di, t.count);
  // The count shifted to the exponent's place; the eighths that come along are taken out of the table's entries.
  const VI shifted = hn::BitCast(di, LookupEighth(kShiftedRoot.entries, MakeEighthIndex(bits)));
  const V root = hn::BitCast(d, hn::Add(shifted, hn::ShiftLeft<20>(bits)));
  return {root, hn::Mul(root, Exp2Part(t.f))};
}

// kAll: results that overflow or are denormal too.
template <bool kAll>
HWY_INLINE V Exp2Of(const Eighths& t) {
  if constexpr (!kAll) {
    return SumOf(Exp2Terms(t));
  } else {
    const VI bits = hn::BitCast(DI(), t.count);
    const V root = LookupEighth(vexel::power::kRoot, MakeEighthIndex(bits));
    return ScaleByEighths(hn::Add(root, hn::Mul(root, Exp2Part(t.f))), bits);
  }
}

// Any argument at all.
template <PowerCore kCore>
HWY_NOINLINE V PowerAll(V x, const PowerExponent& y) {
  const D d;
  const DI di;
  const VI given = hn::BitCast(di, x);
  const auto isZero = hn::Eq(hn::Add(given, given), hn::Zero(di));
  const VI bits = hn::IfThenZeroElse(isZero, given);
  const VI infinity = hn::Set(di, 0x7f800000);
  const LogSum log = LogOf<kCore>(PlaceOf<true, kCore>(hn::BitCast(d, bits), y.log), y.log);
  VI result = hn::BitCast(di, Exp2Of<true>(EighthsOf<kCore>(log)));
  result = hn::IfThenElse(hn::Eq(bits, infinity), infinity, hn::IfThenZeroElse(isZero, result));
  result = hn::IfThenElse(hn::Or(hn::Gt(bits, infinity), hn::Lt(bits, hn::Zero(di))), hn::Set(di, 0x7fc00000), result);
  return hn::BitCast(d, result);
}

HWY_NOINLINE inline V PowerLaneByLane(V x, const PowerExponent& y) {
  const D d;
  HWY_ALIGN float lanes[hn::MaxLanes(D())];
  hn::Store(x, d, lanes);
  for (float& lane : lanes) lane = vexel::Power(lane, y);
  return hn::Load(d, lanes);
}

// How far the bits of a magnitude lie above the first of the fast range: beyond FastSpan for those that the fast form
// does not cover. Both are flipped in the top bit, so that signed comparison orders them.
constexpr uint32_t kFlip = 0x80000000;
HWY_INLINE VI AboveFirst(V magnitude, const PowerExponent& y) {
  const DI di;
  return hn::Sub(hn::BitCast(di, magnitude), hn::Set(di, static_cast<int32_t>(y.firstBits + kFlip)));
}
HWY_INLINE VI FastSpan(const PowerExponent& y) {
  return hn::Set(DI(), static_cast<int32_t>(y.lastBits - y.firstBits + kFlip));
}

// The fast power of a vector that may have arguments outside the fast range, put right. Zeros, the usual ones, cost
// little.
template <PowerCore kCore>
HWY_INLINE V MendRare(V fast, V magnitude, const PowerExponent& y) {
  const D d;
  const DI di;
  const auto isZero = hn::Eq(hn::BitCast(di, magnitude), hn::Zero(di));
  const auto outside = hn::AndNot(isZero, hn::Gt(AboveFirst(magnitude, y), FastSpan(y)));
  const V power = hn::IfThenZeroElse(hn::RebindMask(d, isZero), fast);
  if (HWY_LIKELY(hn::AllFalse(di, outside))) return power;
  return hn::IfThenElse(hn::RebindMask(d, outside), PowerAll<kCore>(magnitude, y), power);
}

template <PowerCore kCore>
HWY_INLINE PowerTerms MendRare(const PowerTerms& fast, V magnitude, const PowerExponent& y) {
  const V mended = MendRare<kCore>(SumOf(fast), magnitude, y);
  const auto rare = hn::RebindMask(D(), hn::Gt(AboveFirst(magnitude, y), FastSpan(y)));
  return {hn::IfThenElse(rare, mended, fast.root), hn::IfThenZeroElse(rare, fast.rest)};
}

// The power of NaN has no sign.
template <bool kSigned>
HWY_INLINE V WithoutSignedNaN(V power, V x) {
  return kSigned ? hn::IfThenElse(hn::IsNaN(x), hn::BitCast(D(), hn::Set(DI(), 0x7fc00000)), power) : power;
}

// 8 log2(x), of a place by the float form.
HWY_INLINE V Log2InEighths(const Place& x) {
  const D d;
  const vexel::power::EighthsLog2& log = vexel::power::kEighthsLog2;
  const V w = x.place, square = hn::Mul(w, w);
  const V low = hn::Add(hn::Set(d, log.series[0]), hn::Mul(w, hn::Set(d, log.series[1])));
  const V curve = hn::Add(w, hn::Mul(square, hn::Add(low, hn::Mul(square, hn::Set(d, log.series[2])))));
  return hn::Add(hn::ConvertTo(d, x.eighths), hn::Add(LookupEighth(log.offsets, MakeEighthIndex(x.eighths)), curve));
}

// What loops do with negative values; false is returned, with nothing done, where they refuse them. Absent: the caller
// knows that all arguments are positive and give normal results.
enum class Signs : uint8_t { ByFinish, Kept, Refused, Absent };

HWY_INLINE bool AnyNegative(const float* values, size_t count) {
  const D d;
  const DI di;
  VI all = hn::Zero(di);
  for (size_t i = 0; i < count; i += hn::Lanes(d)) all = hn::Or(all, hn::BitCast(di, hn::Load(d, values + i)));
  return !hn::AllFalse(di, hn::Lt(all, hn::Zero(di)));
}

// What the steps leave of many vectors: two arrays.
class StepArrays {
 public:
  HWY_INLINE StepArrays(float* scratch, size_t count) : mFirst(scratch), mSecond(scratch + count) {}
  HWY_INLINE void Store(const Place& place, size_t i) const { Store(hn::BitCast(D(), place.eighths), place.place, i); }
  HWY_INLINE void Store(const Eighths& eighths, size_t i) const { Store(eighths.count, eighths.f, i); }
  HWY_INLINE Place PlaceAt(size_t i) const {
    return {hn::BitCast(DI(), hn::Load(D(), mFirst + i)), hn::Load(D(), mSecond + i)};
  }
  HWY_INLINE Eighths EighthsAt(size_t i) const { return {hn::Load(D(), mFirst + i), hn::Load(D(), mSecond + i)}; }

 private:
  HWY_INLINE void Store(V first, V second, size_t i) const {
    hn::Store(first, D(), mFirst + i);
    hn::Store(second, D(), mSecond + i);
  }
  float* HWY_RESTRICT mFirst;
  float* HWY_RESTRICT mSecond;
};

// The last step as a finish takes it: a power or its terms.
template <class Finish>
HWY_INLINE auto UsualExp2For(const Eighths& t) {
  if constexpr (std::is_invocable_v<Finish, PowerTerms, V>) {
    return Exp2Terms(t);
  } else {
    return Exp2Of<false>(t);
  }
}

template <PowerCore kCore, Signs kSigns, class Prepare, class Finish>
HWY_INLINE bool PowerLoops(float* HWY_RESTRICT values, size_t count, float* HWY_RESTRICT scratch,
                           const PowerExponent& y, const Prepare& prepare, const Finish& finish) {
  const D d;
  const DI di;
  const size_t lanes = hn::Lanes(d);
  constexpr bool kSigned = kSigns == Signs::Kept;
  if constexpr (kCore == PowerCore::Scalar) {
    if (kSigns == Signs::Refused && AnyNegative(values, count)) return false;
    for (size_t i = 0; i < count; i += lanes) {
      const V v = hn::Load(d, values + i);
      hn::Store(WithoutSignedNaN<kSigned>(finish(PowerLaneByLane(ValueOf(prepare(v)), y), v), v), d, values + i);
    }
  } else {
    const StepArrays steps(scratch, count);
    VI above = hn::Set(di, INT32_MIN);
    for (size_t i = 0; i < count; i += lanes) {
      const auto x = prepare(hn::Load(d, values + i));
      if constexpr (kSigns != Signs::Absent) above = hn::Max(above, AboveFirst(ValueOf(x), y));
      steps.Store(PlaceOf<false, kCore>(x, y.log), i);
    }
    const bool rare = kSigns != Signs::Absent && !hn::AllFalse(di, hn::Gt(above, FastSpan(y)));
    if (kSigns == Signs::Refused && HWY_UNLIKELY(rare) && AnyNegative(values, count)) return false;
    for (size_t i = 0; i < count; i += lanes) steps.Store(EighthsOf<kCore>(LogOf<kCore>(steps.PlaceAt(i), y.log)), i);
    if (HWY_LIKELY(!rare)) {
      for (size_t i = 0; i < count; i += lanes)
        hn::Store(finish(UsualExp2For<Finish>(steps.EighthsAt(i)), hn::Load(d, values + i)), d, values + i);
    } else {
      for (size_t i = 0; i < count; i += lanes) {
        const V v = hn::Load(d, values + i);
        const auto power = MendRare<kCore>(UsualExp2For<Finish>(steps.EighthsAt(i)), ValueOf(prepare(v)), y);
        hn::Store(WithoutSignedNaN<kSigned>(finish(power, v), v), d, values + i);
      }
    }
  }
  return true;
}

HWY_INLINE V SumOfLog(const LogSum& log) {
  const V sum = hn::Add(log.large, log.middle);
  return hn::Add(sum, hn::Add(hn::Sub(log.middle, hn::Sub(sum, log.large)), log.small));
}

HWY_INLINE V LogOfBase(V x, const vexel::power::ScaledLog2& log) {
  const D d;
  const DI di;
  const VI bits = hn::BitCast(di, x);
  const VI infinity = hn::Set(di, 0x7f800000);
  const VI zero = hn::Zero(di);
  const auto noNumber = hn::Or(hn::Gt(bits, infinity), hn::Lt(bits, zero));
  VI result = hn::BitCast(di, SumOfLog(LogOf<PowerCore::Long>(PlaceOf<true, PowerCore::Long>(x, log), log)));
  result = hn::IfThenElse(hn::Eq(bits, infinity), infinity, result);
  result = hn::IfThenElse(noNumber, hn::Set(di, 0x7fc00000), result);
  result = hn::IfThenElse(hn::Eq(hn::Add(bits, bits), zero), hn::Set(di, static_cast<int32_t>(0xff800000)), result);
  return hn::BitCast(d, result);
}

// Logarithms in loops like PowerLoops: finish(log of prepare(value), value).
template <class Prepare, class Finish>
HWY_INLINE void LogLoops(float* HWY_RESTRICT values, size_t count, float* HWY_RESTRICT scratch,
                         const vexel::power::ScaledLog2& log, const Prepare& prepare, const Finish& finish) {
  const D d;
  const DI di;
  const size_t lanes = hn::Lanes(d);
  const StepArrays steps(scratch, count);
  const VI first = hn::Set(di, static_cast<int32_t>(0x00800000 + kFlip));
  const VI span = hn::Set(di, static_cast<int32_t>(0x7f7fffff - 0x00800000 + kFlip));
  VI above = hn::Set(di, INT32_MIN);
  for (size_t i = 0; i < count; i += lanes) {
    const V x = prepare(hn::Load(d, values + i));
    above = hn::Max(above, hn::Sub(hn::BitCast(di, x), first));
    steps.Store(PlaceOf<false, PowerCore::Long>(x, log), i);
  }
  if (HWY_LIKELY(hn::AllFalse(di, hn::Gt(above, span)))) {
    for (size_t i = 0; i < count; i += lanes)
      hn::Store(finish(SumOfLog(LogOf<PowerCore::Long>(steps.PlaceAt(i), log)), hn::Load(d, values + i)), d,
                values + i);
  } else {
    for (size_t i = 0; i < count; i += lanes) {
      const V v = hn::Load(d, values + i);
      hn::Store(finish(LogOfBase(prepare(v), log), v), d, values + i);
    }
  }
}

// log2(base^x) - kRootShift.
HWY_INLINE Eighths ExponentOf(V x, const vexel::power::SplitFloat& log2Base) {
  const D d;
  const V bounded = hn::Max(hn::Min(x, hn::Set(d, 256.0f)), hn::Set(d, -256.0f));
  const V top = hn::And(bounded, hn::BitCast(d, hn::Set(DI(), static_cast<int32_t>(0xfffff000))));
  const V low = hn::Add(hn::Mul(top, hn::Set(d, log2Base.low)),
                        hn::Mul(hn::Sub(bounded, top), hn::Set(d, log2Base.high + log2Base.low)));
  const V large = hn::Mul(top, hn::Set(d, log2Base.high));
  const V small = hn::Sub(low, hn::Set(d, static_cast<float>(vexel::power::kRootShift)));
  return EighthsOf<PowerCore::Float>({large, large, small});
}

// Exponentials in loops like PowerLoops: finish(base^prepare(value), value).
template <class Prepare, class Finish>
HWY_INLINE void ExpLoops(float* HWY_RESTRICT values, size_t count, const vexel::power::SplitFloat& log2Base,
                         const Prepare& prepare, const Finish& finish) {
  const D d;
  const size_t lanes = hn::Lanes(d);
  constexpr float kMostUsual = 30.0f;  // Both bases raise it to a normal number.
  V largest = hn::Zero(d);
  auto noNumber = hn::IsNaN(largest);
  for (size_t i = 0; i < count; i += lanes) {
    const V x = prepare(hn::Load(d, values + i));
    noNumber = hn::Or(noNumber, hn::IsNaN(x));
    largest = hn::Max(largest, hn::Abs(x));
  }
  const bool rare = !hn::AllFalse(d, hn::Or(noNumber, hn::Gt(largest, hn::Set(d, kMostUsual))));
  for (size_t i = 0; i < count; i += lanes) {
    const V v = hn::Load(d, values + i), x = prepare(v);
    const Eighths exponent = ExponentOf(x, log2Base);
    V power;
    if (HWY_UNLIKELY(rare)) {
      power = hn::IfThenElse(hn::IsNaN(x), hn::BitCast(d, hn::Set(DI(), 0x7fc00000)), Exp2Of<true>(exponent));
    } else {
      power = Exp2Of<false>(exponent);
    }
    hn::Store(finish(power, v), d, values + i);
  }
}

}  // namespace power_detail

// In all of these, `count` floats, whole vectors at an aligned address, become finish(function of prepare(value),
// value). `scratch`, aligned too, has room for kPowerScratch times as many.
inline constexpr size_t kPowerScratch = 2;

// kCore must be y.core. prepare may give OneLess if that is the long one.
template <PowerCore kCore, class Prepare, class Finish>
HWY_INLINE void Powers(float* values, size_t count, float* scratch, const PowerExponent& y, const Prepare& prepare,
                       const Finish& finish) {
  power_detail::PowerLoops<kCore, power_detail::Signs::ByFinish>(values, count, scratch, y, prepare, finish);
}

// finish(terms, value) takes the power as PowerTerms. kRefused: false is returned, with nothing done, where a value has
// a minus sign; otherwise prepare takes signs off.
template <PowerCore kCore, bool kRefused, class Prepare, class Finish>
HWY_INLINE bool UnroundedPowers(float* values, size_t count, float* scratch, const PowerExponent& y,
                                const Prepare& prepare, const Finish& finish) {
  constexpr auto kSigns = kRefused ? power_detail::Signs::Refused : power_detail::Signs::ByFinish;
  return power_detail::PowerLoops<kCore, kSigns>(values, count, scratch, y, prepare, finish);
}

// For arguments that are known to be positive, with normal results.
template <PowerCore kCore, class Finish>
HWY_INLINE void UsualPowers(float* values, size_t count, float* scratch, const PowerExponent& y, const Finish& finish) {
  power_detail::PowerLoops<kCore, power_detail::Signs::Absent>(
      values, count, scratch, y, [](power_detail::V v) VX_POWER_STEP { return v; }, finish);
}

template <class Prepare, class Finish>
HWY_INLINE void Logs(float* values, size_t count, float* scratch, const power::ScaledLog2& log, const Prepare& prepare,
                     const Finish& finish) {
  power_detail::LogLoops(values, count, scratch, log, prepare, finish);
}

template <class Prepare, class Finish>
HWY_INLINE void Exps(float* values, size_t count, const power::SplitFloat& log2Base, const Prepare& prepare,
                     const Finish& finish) {
  power_detail::ExpLoops(values, count, log2Base, prepare, finish);
}

// Powers with the sign of their arguments. `negative` is set by the first call that meets a minus sign; until then
// signs are neither taken off nor put back.
template <PowerCore kCore>
HWY_INLINE void SignedPowers(float* values, size_t count, float* scratch, const PowerExponent& y, bool& negative) {
  using power_detail::PowerLoops;
  using power_detail::Signs;
  using power_detail::V;
  if (!negative) {
    const bool done = PowerLoops<kCore, Signs::Refused>(
        values, count, scratch, y, [](V v) VX_POWER_STEP { return v; }, [](V power, V) VX_POWER_STEP { return power; });
    if (HWY_LIKELY(done)) return;
    negative = true;
  }
  PowerLoops<kCore, Signs::Kept>(
      values, count, scratch, y, [](V v) VX_POWER_STEP { return hn::Abs(v); },
      [](V power, V v) VX_POWER_STEP { return hn::Or(power, hn::And(v, hn::SignBit(power_detail::D()))); });
}

// For exponents whose core is known only at run time.
HWY_NOINLINE inline void PowersAny(float* values, size_t count, float* scratch, const PowerExponent& y) {
  using power_detail::V;
  const auto same = [](V v) VX_POWER_STEP { return v; };
  const auto result = [](V power, V) VX_POWER_STEP { return power; };
  if (y.core == PowerCore::Float) {
    Powers<PowerCore::Float>(values, count, scratch, y, same, result);
  } else if (y.core == PowerCore::Long) {
    Powers<PowerCore::Long>(values, count, scratch, y, same, result);
  } else {
    Powers<PowerCore::Scalar>(values, count, scratch, y, same, result);
  }
}
HWY_NOINLINE inline void SignedPowersAny(float* values, size_t count, float* scratch, const PowerExponent& y,
                                         bool& negative) {
  if (y.core == PowerCore::Float) {
    SignedPowers<PowerCore::Float>(values, count, scratch, y, negative);
  } else if (y.core == PowerCore::Long) {
    SignedPowers<PowerCore::Long>(values, count, scratch, y, negative);
  } else {
    SignedPowers<PowerCore::Scalar>(values, count, scratch, y, negative);
  }
}

}  // namespace HWY_NAMESPACE
}  // namespace vexel
HWY_AFTER_NAMESPACE();
#endif  // HWY_TARGET

#endif
