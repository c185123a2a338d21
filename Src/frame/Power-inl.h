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

#include <hwy/highway.h>

#include "frame/Power.h"
#include "frame/RowLoop-inl.h"

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

#if HWY_TARGET == HWY_SCALAR  // Compiled by foreach_target as the baseline, never chosen.

namespace power_detail {
using V = hn::Vec<hn::ScalableTag<float>>;
}
namespace power_detail {
template <PowerCore kCore, bool kSigned>
HWY_INLINE V Power1(V x, const PowerExponent& y) {
  return V(kSigned ? vexel::SignedPower(x.raw, y) : vexel::Power(x.raw, y));
}
template <PowerCore kCore>
HWY_INLINE void SignedPower3(V& a, V& b, V& c, const PowerExponent& y) {
  a = Power1<kCore, true>(a, y);
  b = Power1<kCore, true>(b, y);
  c = Power1<kCore, true>(c, y);
}
template <PowerCore kCore>
HWY_INLINE V PowerOf(V x, const PowerExponent& y) {
  return Power1<kCore, false>(x, y);
}
template <PowerCore kCore>
HWY_INLINE V PowerOf(OneLess x, const PowerExponent& y) {
  return V(vexel::PowerOfOneLess(x.u.raw, y));
}
enum class Signs : uint8_t { ByFinish, Kept, Refused };
template <PowerCore kCore, Signs kSigns, class Prepare, class Finish>
HWY_INLINE bool PowerLoops(float* values, size_t count, float*, const PowerExponent& y, const Prepare& prepare,
                           const Finish& finish) {
  for (size_t i = 0; i < count; ++i) values[i] = finish(PowerOf<kCore>(prepare(V(values[i])), y), V(values[i])).raw;
  return kSigns != Signs::Refused;
}
template <class Prepare, class Finish>
HWY_INLINE void LogLoops(float* values, size_t count, float*, const vexel::power::ScaledLog2&, const Prepare& prepare,
                         const Finish& finish) {
  for (size_t i = 0; i < count; ++i) values[i] = finish(V(vexel::Log(prepare(V(values[i])).raw)), V(values[i])).raw;
}
template <bool kSigned>
HWY_INLINE V Magnitude(V x) {
  return kSigned ? hn::Abs(x) : x;
}
template <bool kSigned>
HWY_INLINE V WithSign(V power, V x) {
  return kSigned ? hn::Or(power, hn::And(x, hn::SignBit(hn::ScalableTag<float>()))) : power;
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

// Several vectors that advance together. The chain of a power is longer than the scheduler of a processor looks ahead,
// so three powers overlap only if the program lists their instructions step by step. Map keeps that order: the empty
// statements pin each step's results before the next step.
template <size_t N>
struct Bundle {
  V a;
};
template <>
struct Bundle<3> {  // Not an array, which compilers keep in memory.
  V a, b, c;
};

HWY_INLINE void EndStep(V& v) {
#if defined(__GNUC__)
  asm volatile("" : "+v"(v.raw));
#endif
}

template <size_t N, class F, class... Bundles>
HWY_INLINE Bundle<N> Map(const F& f, const Bundles&... args) {
  if constexpr (N == 1) {
    return {f(args.a...)};
  } else {
    static_assert(N == 3);
    return {f(args.a...), f(args.b...), f(args.c...)};
  }
}

template <size_t N, class... Bundles>
HWY_INLINE void EndStep(Bundles&... bundles) {
  if constexpr (N == 3) {
    (EndStep(bundles.a), ...);
    (EndStep(bundles.b), ...);
    (EndStep(bundles.c), ...);
  }
}

// The bits of x from the first segment on. kAll: denormals too.
template <bool kAll, size_t N>
HWY_INLINE Bundle<N> SegmentBits(const Bundle<N>& x) {
  const D d;
  const DI di;
  return Map<N>(
      [&](V v) VX_POWER_STEP {
        VI i = hn::BitCast(di, v);
        if constexpr (kAll) {
          const VI renormalised = hn::Sub(hn::BitCast(di, hn::ConvertTo(d, i)), hn::Set(di, 149 << 23));
          i = hn::IfThenElse(hn::Lt(i, hn::Set(di, 0x00800000)), renormalised, i);
        }
        return hn::BitCast(d, hn::Sub(i, hn::Set(di, static_cast<int32_t>(vexel::power::kFirstBits))));
      },
      x);
}

// Eighths of an octave, as integers.
template <size_t N>
HWY_INLINE Bundle<N> EighthsOf(const Bundle<N>& bits) {
  return Map<N>([](V v) VX_POWER_STEP { return hn::BitCast(D(), hn::ShiftRight<20>(hn::BitCast(DI(), v))); }, bits);
}

// The mantissa less the centre of its segment.
template <size_t N>
HWY_INLINE Bundle<N> FractionOf(const Bundle<N>& bits, const Bundle<N>& eighths) {
  const D d;
  const DI di;
  return Map<N>(
      [&](V v, V k) VX_POWER_STEP {
        const VI mask = hn::Set(di, static_cast<int32_t>(vexel::power::kMantissaMask));
        const VI first = hn::Set(di, static_cast<int32_t>(vexel::power::kFirstBits));
        const V mantissa = hn::BitCast(d, hn::Add(hn::And(hn::BitCast(di, v), mask), first));
        return hn::Sub(mantissa, LookupEighth(vexel::power::kCentre, MakeEighthIndex(hn::BitCast(di, k))));
      },
      bits, eighths);
}

// factor * eighths + offsets[segment].
template <size_t N>
HWY_INLINE Bundle<N> Linear(float factor, const float* offsets, const Bundle<N>& eighths) {
  const D d;
  const DI di;
  return Map<N>(
      [&](V k) VX_POWER_STEP {
        const V product = hn::Mul(hn::Set(d, factor), hn::ConvertTo(d, hn::BitCast(di, k)));
        return offsets ? hn::Add(product, LookupEighth(offsets, MakeEighthIndex(hn::BitCast(di, k)))) : product;
      },
      eighths);
}

// c[0] + v * c[1] + v^2 * c[2] + v^3 * c[3].
HWY_INLINE V Cubic(V v, V square, const float* c) {
  const D d;
  const V low = hn::Add(hn::Set(d, c[0]), hn::Mul(v, hn::Set(d, c[1])));
  const V high = hn::Add(hn::Set(d, c[2]), hn::Mul(v, hn::Set(d, c[3])));
  return hn::Add(low, hn::Mul(square, high));
}

// start + w^2 * series(w).
template <size_t N>
HWY_INLINE Bundle<N> Curve(const Bundle<N>& start, const Bundle<N>& w, const vexel::power::ScaledLog2& log) {
  return Map<N>(
      [&](V a, V v) VX_POWER_STEP {
        const V square = hn::Mul(v, v);
        return hn::Add(a, hn::Mul(square, Cubic(v, square, log.series)));
      },
      start, w);
}

// A power goes in three thirds, which loops over many vectors take one after the other. The first: x to eighths of an
// octave and its place in the segment, in the float form already multiplied by the slope.
template <bool kAll, PowerCore kCore, size_t N>
HWY_INLINE void PlaceOf(const Bundle<N>& x, const vexel::power::ScaledLog2& log, Bundle<N>& eighths, Bundle<N>& place) {
  const auto bits = SegmentBits<kAll>(x);
  eighths = EighthsOf(bits);
  place = FractionOf(bits, eighths);
  if constexpr (kCore == PowerCore::Float) {
    place = Map<N>(
        [&](V r, V k)
            VX_POWER_STEP { return hn::Mul(r, LookupEighth(log.slopes, MakeEighthIndex(hn::BitCast(DI(), k)))); },
        place, eighths);
  }
}

// scale * log2(x) - shift as a sum, large + small.
template <size_t N>
HWY_INLINE void FloatLog(const Bundle<N>& eighths, const Bundle<N>& w, const vexel::power::ScaledLog2& log,
                         Bundle<N>& large, Bundle<N>& small) {
  large = Linear(log.eighthHigh, nullptr, eighths);
  auto offset = Linear(log.eighthLow, log.offsets, eighths);
  EndStep<N>(large, offset);
  const auto curve = Curve(w, w, log);
  small = Map<N>([](V a, V b) VX_POWER_STEP { return hn::Add(a, b); }, offset, curve);
}

template <size_t N>
HWY_INLINE void LongLog(const Bundle<N>& eighths, const Bundle<N>& fraction, const vexel::power::ScaledLog2& log,
                        Bundle<N>& large, Bundle<N>& middle, Bundle<N>& small) {
  const DI di;
  const V mask = hn::BitCast(D(), hn::Set(di, static_cast<int32_t>(0xfffff000)));
  middle = Map<N>(
      [&](V r, V k) VX_POWER_STEP {
        return hn::Mul(hn::And(r, mask), LookupEighth(log.slopes, MakeEighthIndex(hn::BitCast(di, k))));
      },
      fraction, eighths);
  auto rest = Map<N>(
      [&](V r, V k) VX_POWER_STEP {
        const EighthIndex index = MakeEighthIndex(hn::BitCast(di, k));
        return hn::Add(hn::Mul(hn::Sub(r, hn::And(r, mask)), LookupEighth(log.slopes, index)),
                       hn::Mul(r, LookupEighth(log.slopeRests, index)));
      },
      fraction, eighths);
  large = Linear(log.eighthHigh, log.offsetsHigh, eighths);
  auto offset = Linear(log.eighthLow, log.offsets, eighths);
  EndStep<N>(rest, large, middle, offset);
  const auto w = Map<N>([](V a, V b) VX_POWER_STEP { return hn::Add(a, b); }, middle, rest);
  const auto curve = Curve(rest, w, log);
  small = Map<N>([](V a, V b) VX_POWER_STEP { return hn::Add(a, b); }, offset, curve);
}

// A sum as n / 8 + f, |f| at most 1/16; `count` is n / 8 + kEighthsMagic.
template <size_t N>
HWY_INLINE void CountEighths(const Bundle<N>& large, const Bundle<N>& small, Bundle<N>& count, Bundle<N>& f) {
  const V magic = hn::Set(D(), vexel::power::kEighthsMagic);
  count = Map<N>([&](V a, V c) VX_POWER_STEP { return hn::Add(hn::Add(a, c), magic); }, large, small);
  f = Map<N>([&](V a, V n, V c) VX_POWER_STEP { return hn::Add(hn::Sub(a, hn::Sub(n, magic)), c); }, large, count,
             small);
}

// The second third of a power: its logarithm, counted in eighths.
template <PowerCore kCore, size_t N>
HWY_INLINE void ExponentOf(const Bundle<N>& eighths, const Bundle<N>& place, const vexel::power::ScaledLog2& log,
                           Bundle<N>& count, Bundle<N>& f) {
  Bundle<N> large, small;
  if constexpr (kCore == PowerCore::Float) {
    FloatLog(eighths, place, log, large, small);
    CountEighths(large, small, count, f);
  } else {
    Bundle<N> middle;
    LongLog(eighths, place, log, large, middle, small);
    const V magic = hn::Set(D(), vexel::power::kEighthsMagic);
    count = Map<N>([&](V a, V b, V c) VX_POWER_STEP { return hn::Add(hn::Add(hn::Add(a, b), c), magic); }, large,
                   middle, small);
    f = Map<N>([&](V a, V n, V b, V c) VX_POWER_STEP { return hn::Add(hn::Add(hn::Sub(a, hn::Sub(n, magic)), b), c); },
               large, count, middle, small);
  }
}

// The last third: 2^(n / 8 + f + kRootShift). kAll: results that overflow or are denormal too.
template <bool kAll, size_t N>
HWY_INLINE Bundle<N> Exp2Of(const Bundle<N>& count, const Bundle<N>& f) {
  const D d;
  const DI di;
  const auto g = Map<N>([&](V v) VX_POWER_STEP { return hn::Mul(v, Cubic(v, hn::Mul(v, v), vexel::power::kExp2)); }, f);
  return Map<N>(
      [&](V n, V part) VX_POWER_STEP {
        const VI bits = hn::BitCast(di, n);
        const EighthIndex index = MakeEighthIndex(bits);
        if constexpr (!kAll) {
          // The count shifted to the exponent's place; the eighths that come along are taken out of the table's
          // entries.
          const VI shifted = hn::BitCast(di, LookupEighth(kShiftedRoot.entries, index));
          const V root = hn::BitCast(d, hn::Add(shifted, hn::ShiftLeft<20>(bits)));
          return hn::Add(root, hn::Mul(root, part));
        } else {
          const V root = LookupEighth(vexel::power::kRoot, index);
          return ScaleByEighths(hn::Add(root, hn::Mul(root, part)), bits);
        }
      },
      count, g);
}

template <bool kAll, PowerCore kCore, size_t N>
HWY_INLINE Bundle<N> PowersOf(const Bundle<N>& x, const PowerExponent& y) {
  Bundle<N> eighths, place, count, f;
  PlaceOf<kAll, kCore>(x, y.log, eighths, place);
  EndStep<N>(eighths, place);
  ExponentOf<kCore>(eighths, place, y.log, count, f);
  EndStep<N>(count, f);
  return Exp2Of<kAll>(count, f);
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
  VI result = hn::BitCast(di, PowersOf<true, kCore>(Bundle<1>{hn::BitCast(d, bits)}, y).a);
  result = hn::IfThenElse(hn::Eq(bits, infinity), infinity, hn::IfThenZeroElse(isZero, result));
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

template <bool kSigned>
HWY_INLINE V Magnitude(V x) {
  return kSigned ? hn::Abs(x) : x;
}

template <bool kSigned>
HWY_INLINE V WithSign(V power, V x) {
  return kSigned ? hn::Or(power, hn::And(x, hn::SignBit(D()))) : power;
}

template <PowerCore kCore, bool kSigned>
HWY_INLINE V FastPower(V x, const PowerExponent& y) {
  return WithSign<kSigned>(PowersOf<false, kCore>(Bundle<1>{Magnitude<kSigned>(x)}, y).a, x);
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

// The power of NaN has no sign.
template <bool kSigned>
HWY_INLINE V WithoutSignedNaN(V power, V x) {
  return kSigned ? hn::IfThenElse(hn::IsNaN(x), hn::BitCast(D(), hn::Set(DI(), 0x7fc00000)), power) : power;
}

template <PowerCore kCore, bool kSigned>
HWY_NOINLINE V RarePower(V x, const PowerExponent& y) {
  const V magnitude = Magnitude<kSigned>(x);
  const V power = MendRare<kCore>(PowersOf<false, kCore>(Bundle<1>{magnitude}, y).a, magnitude, y);
  return WithoutSignedNaN<kSigned>(WithSign<kSigned>(power, x), x);
}

template <PowerCore kCore, bool kSigned>
HWY_INLINE V Power1(V x, const PowerExponent& y) {
  if constexpr (kCore == PowerCore::Scalar) {
    return PowerLaneByLane<kSigned>(x, y);
  } else {
    const VI above = AboveFirst(Magnitude<kSigned>(x), y);
    if (HWY_UNLIKELY(!hn::AllFalse(DI(), hn::Gt(above, FastSpan(y))))) return RarePower<kCore, kSigned>(x, y);
    return FastPower<kCore, kSigned>(x, y);
  }
}

template <PowerCore kCore>
HWY_INLINE void SignedPower3(V& a, V& b, V& c, const PowerExponent& y) {
  if constexpr (kCore == PowerCore::Scalar) {
    a = PowerLaneByLane<true>(a, y);
    b = PowerLaneByLane<true>(b, y);
    c = PowerLaneByLane<true>(c, y);
  } else {
    const VI above = hn::Max(hn::Max(AboveFirst(Magnitude<true>(a), y), AboveFirst(Magnitude<true>(b), y)),
                             AboveFirst(Magnitude<true>(c), y));
    if (HWY_UNLIKELY(!hn::AllFalse(DI(), hn::Gt(above, FastSpan(y))))) {
      a = RarePower<kCore, true>(a, y);
      b = RarePower<kCore, true>(b, y);
      c = RarePower<kCore, true>(c, y);
    } else {
      const Bundle<3> powers =
          PowersOf<false, kCore>(Bundle<3>{Magnitude<true>(a), Magnitude<true>(b), Magnitude<true>(c)}, y);
      a = WithSign<true>(powers.a, a);
      b = WithSign<true>(powers.b, b);
      c = WithSign<true>(powers.c, c);
    }
  }
}

// The loops keep more vectors in flight than a scheduler finds in one long chain. kSigns: what they do with negative
// values; false is returned, with nothing done, where they refuse them.
enum class Signs : uint8_t { ByFinish, Kept, Refused };

HWY_INLINE V ValueOf(V x) { return x; }
HWY_INLINE V ValueOf(OneLess x) { return hn::Sub(hn::Set(D(), 1.0f), x.u); }
// The place in a segment with what the rounding of the argument took away.
HWY_INLINE V WithRest(V place, V, V) { return place; }
HWY_INLINE V WithRest(V place, V rounded, OneLess x) {
  return hn::Add(place, hn::Sub(hn::Sub(hn::Set(D(), 1.0f), rounded), x.u));
}

HWY_INLINE bool AnyNegative(const float* values, size_t count) {
  const D d;
  const DI di;
  VI all = hn::Zero(di);
  for (size_t i = 0; i < count; i += hn::Lanes(d)) all = hn::Or(all, hn::BitCast(di, hn::Load(d, values + i)));
  return !hn::AllFalse(di, hn::Lt(all, hn::Zero(di)));
}

template <PowerCore kCore, Signs kSigns, class Prepare, class Finish>
HWY_INLINE bool PowerLoops(float* HWY_RESTRICT values, size_t count, float* HWY_RESTRICT scratch,
                           const PowerExponent& y, const Prepare& prepare, const Finish& finish) {
  const D d;
  const DI di;
  const size_t lanes = hn::Lanes(d);
  constexpr bool kSigned = kSigns == Signs::Kept;
  float* HWY_RESTRICT scratch2 = scratch + count;
  if constexpr (kCore == PowerCore::Scalar) {
    if (kSigns == Signs::Refused && AnyNegative(values, count)) return false;
    for (size_t i = 0; i < count; i += lanes) {
      const V v = hn::Load(d, values + i);
      hn::Store(WithoutSignedNaN<kSigned>(finish(PowerLaneByLane<false>(ValueOf(prepare(v)), y), v), v), d, values + i);
    }
  } else {
    VI above = hn::Set(di, INT32_MIN);
    for (size_t i = 0; i < count; i += lanes) {
      const auto argument = prepare(hn::Load(d, values + i));
      const Bundle<1> x{ValueOf(argument)};
      above = hn::Max(above, AboveFirst(x.a, y));
      Bundle<1> eighths, place;
      PlaceOf<false, kCore>(x, y.log, eighths, place);
      hn::Store(eighths.a, d, scratch + i);
      hn::Store(WithRest(place.a, x.a, argument), d, scratch2 + i);
    }
    const bool rare = !hn::AllFalse(di, hn::Gt(above, FastSpan(y)));
    if (kSigns == Signs::Refused && HWY_UNLIKELY(rare) && AnyNegative(values, count)) return false;
    for (size_t i = 0; i < count; i += lanes) {
      Bundle<1> whole, f;
      ExponentOf<kCore>(Bundle<1>{hn::Load(d, scratch + i)}, Bundle<1>{hn::Load(d, scratch2 + i)}, y.log, whole, f);
      hn::Store(whole.a, d, scratch + i);
      hn::Store(f.a, d, scratch2 + i);
    }
    const auto last = [&](size_t i) VX_POWER_STEP {
      return Exp2Of<false>(Bundle<1>{hn::Load(d, scratch + i)}, Bundle<1>{hn::Load(d, scratch2 + i)}).a;
    };
    if (HWY_LIKELY(!rare)) {
      for (size_t i = 0; i < count; i += lanes) hn::Store(finish(last(i), hn::Load(d, values + i)), d, values + i);
    } else {
      for (size_t i = 0; i < count; i += lanes) {
        const V v = hn::Load(d, values + i);
        const V power = MendRare<kCore>(last(i), ValueOf(prepare(v)), y);
        hn::Store(WithoutSignedNaN<kSigned>(finish(power, v), v), d, values + i);
      }
    }
  }
  return true;
}

HWY_INLINE V SumOfLog(V large, V middle, V small) {
  const V sum = hn::Add(large, middle);
  return hn::Add(sum, hn::Add(hn::Sub(middle, hn::Sub(sum, large)), small));
}

template <size_t N>
HWY_INLINE Bundle<N> LogOfBase(const Bundle<N>& x, const vexel::power::ScaledLog2& log) {
  const D d;
  const DI di;
  Bundle<N> eighths, fraction, large, middle, small;
  PlaceOf<true, PowerCore::Long>(x, log, eighths, fraction);
  LongLog(eighths, fraction, log, large, middle, small);
  return Map<N>(
      [&](V in, V a, V b, V c) VX_POWER_STEP {
        const V value = SumOfLog(a, b, c);
        const VI bits = hn::BitCast(di, in);
        const VI infinity = hn::Set(di, 0x7f800000);
        const VI zero = hn::Zero(di);
        const auto noNumber = hn::Or(hn::Gt(bits, infinity), hn::Lt(bits, zero));
        VI result = hn::IfThenElse(hn::Eq(bits, infinity), infinity, hn::BitCast(di, value));
        result = hn::IfThenElse(noNumber, hn::Set(di, 0x7fc00000), result);
        result =
            hn::IfThenElse(hn::Eq(hn::Add(bits, bits), zero), hn::Set(di, static_cast<int32_t>(0xff800000)), result);
        return hn::BitCast(d, result);
      },
      x, large, middle, small);
}

// Logarithms in loops like PowerLoops: finish(log of prepare(value), value).
template <class Prepare, class Finish>
HWY_INLINE void LogLoops(float* HWY_RESTRICT values, size_t count, float* HWY_RESTRICT scratch,
                         const vexel::power::ScaledLog2& log, const Prepare& prepare, const Finish& finish) {
  const D d;
  const DI di;
  const size_t lanes = hn::Lanes(d);
  float* HWY_RESTRICT scratch2 = scratch + count;
  const VI first = hn::Set(di, static_cast<int32_t>(0x00800000 + kFlip));
  const VI span = hn::Set(di, static_cast<int32_t>(0x7f7fffff - 0x00800000 + kFlip));
  VI above = hn::Set(di, INT32_MIN);
  for (size_t i = 0; i < count; i += lanes) {
    const Bundle<1> x{prepare(hn::Load(d, values + i))};
    above = hn::Max(above, hn::Sub(hn::BitCast(di, x.a), first));
    Bundle<1> eighths, fraction;
    PlaceOf<false, PowerCore::Long>(x, log, eighths, fraction);
    hn::Store(eighths.a, d, scratch + i);
    hn::Store(fraction.a, d, scratch2 + i);
  }
  const bool rare = !hn::AllFalse(di, hn::Gt(above, span));
  for (size_t i = 0; i < count; i += lanes) {
    const V v = hn::Load(d, values + i);
    V logarithm;
    if (HWY_UNLIKELY(rare)) {
      logarithm = LogOfBase(Bundle<1>{prepare(v)}, log).a;
    } else {
      Bundle<1> large, middle, small;
      LongLog(Bundle<1>{hn::Load(d, scratch + i)}, Bundle<1>{hn::Load(d, scratch2 + i)}, log, large, middle, small);
      logarithm = SumOfLog(large.a, middle.a, small.a);
    }
    hn::Store(finish(logarithm, v), d, values + i);
  }
}

HWY_INLINE V ExpOfBase(V x, const vexel::power::SplitFloat& log2Base) {
  const D d;
  const DI di;
  const V bounded = hn::Max(hn::Min(x, hn::Set(d, 256.0f)), hn::Set(d, -256.0f));
  const V top = hn::And(bounded, hn::BitCast(d, hn::Set(di, static_cast<int32_t>(0xfffff000))));
  const V low = hn::Add(hn::Mul(top, hn::Set(d, log2Base.low)),
                        hn::Mul(hn::Sub(bounded, top), hn::Set(d, log2Base.high + log2Base.low)));
  const V shifted = hn::Sub(low, hn::Set(d, static_cast<float>(vexel::power::kRootShift)));
  Bundle<1> count, f;
  CountEighths(Bundle<1>{hn::Mul(top, hn::Set(d, log2Base.high))}, Bundle<1>{shifted}, count, f);
  const V power = Exp2Of<true>(count, f).a;
  return hn::IfThenElse(hn::IsNaN(x), hn::BitCast(d, hn::Set(di, 0x7fc00000)), power);
}

}  // namespace power_detail

HWY_INLINE power_detail::V Log(power_detail::V x) {
  return power_detail::LogOfBase(power_detail::Bundle<1>{x}, vexel::power::kNaturalLog).a;
}
HWY_INLINE power_detail::V Log10(power_detail::V x) {
  return power_detail::LogOfBase(power_detail::Bundle<1>{x}, vexel::power::kDecimalLog).a;
}
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
HWY_INLINE void SignedPower3(power_detail::V& a, power_detail::V& b, power_detail::V& c, const PowerExponent& y) {
  power_detail::SignedPower3<kCore>(a, b, c, y);
}

// `count` floats, whole vectors at an aligned address, become finish(power of prepare(value), value). `scratch`,
// aligned too, has room for twice as many. prepare may give OneLess if the core is the long one.
template <PowerCore kCore, class Prepare, class Finish>
HWY_INLINE void Powers(float* values, size_t count, float* scratch, const PowerExponent& y, const Prepare& prepare,
                       const Finish& finish) {
  power_detail::PowerLoops<kCore, power_detail::Signs::ByFinish>(values, count, scratch, y, prepare, finish);
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
      values, count, scratch, y, [](V v) VX_POWER_STEP { return power_detail::Magnitude<true>(v); },
      [](V power, V v) VX_POWER_STEP { return power_detail::WithSign<true>(power, v); });
}

template <class Prepare, class Finish>
HWY_INLINE void Logs(float* values, size_t count, float* scratch, const Prepare& prepare, const Finish& finish) {
  power_detail::LogLoops(values, count, scratch, vexel::power::kNaturalLog, prepare, finish);
}

// For exponents whose core is known only at run time.
HWY_NOINLINE inline power_detail::V PowerAny(power_detail::V x, const PowerExponent& y) {
  if (y.core == PowerCore::Float) return Power<PowerCore::Float>(x, y);
  if (y.core == PowerCore::Long) return Power<PowerCore::Long>(x, y);
  return Power<PowerCore::Scalar>(x, y);
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

#endif
