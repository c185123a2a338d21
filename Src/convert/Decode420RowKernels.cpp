// Sums, means and resampling of rows of 4:2:0 samples.
#include <cstddef>
#include <cstdint>
#include <cstring>

#include "convert/Decode420Kernels.h"

#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "convert/Decode420RowKernels.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

#include "convert/PixelVectors-inl.h"
#include "frame/KernelTable.h"

#ifndef VEXEL_CONVERT_DECODE420ROWKERNELS_TAPS
#define VEXEL_CONVERT_DECODE420ROWKERNELS_TAPS
namespace vexel::decode420 {
namespace {

// Catmull-Rom weights of the four samples about a position `phase` past the second, in 1/32768; they total 32768.
struct CubicTaps {
  int16_t w[4];
};
constexpr int16_t RoundWeight(double weight) {
  return static_cast<int16_t>(weight * 32768 + (weight < 0 ? -0.5 : 0.5));
}
constexpr CubicTaps CatmullRom(double t) {
  const int16_t before = RoundWeight(t * (-0.5 + t * (1 - 0.5 * t)));
  const int16_t first = RoundWeight(1 + t * t * (-2.5 + 1.5 * t));
  const int16_t after = RoundWeight(t * t * (-0.5 + 0.5 * t));
  return {{before, first, static_cast<int16_t>(32768 - before - first - after), after}};
}

// Output sample o of a group lies at (o + 0.5) in / out - 0.5; `start` is the first of its four input samples.
struct CubicPhase {
  int start;
  CubicTaps taps;
};
inline constexpr CubicPhase kFourThirdsPhases[4] = {
    {-2, CatmullRom(7 / 8.0)}, {-1, CatmullRom(5 / 8.0)}, {0, CatmullRom(3 / 8.0)}, {1, CatmullRom(1 / 8.0)}};
inline constexpr CubicPhase kThreeHalvesPhases[3] = {
    {-2, CatmullRom(5 / 6.0)}, {-1, CatmullRom(1 / 2.0)}, {0, CatmullRom(1 / 6.0)}};

}  // namespace
}  // namespace vexel::decode420
#endif

#if HWY_TARGET != HWY_SCALAR
HWY_BEFORE_NAMESPACE();
namespace vexel::decode420 {
namespace HWY_NAMESPACE {
namespace {
using namespace vexel::HWY_NAMESPACE;

constexpr size_t kN = kLanes<uint16_t>;

HWY_INLINE U16 Load(const uint16_t* p) { return hn::LoadU(hn::ScalableTag<uint16_t>(), p); }
HWY_INLINE void Store(U16 v, uint16_t* p) { hn::StoreU(v, hn::ScalableTag<uint16_t>(), p); }
HWY_INLINE U16 Set(uint32_t value) { return hn::Set(hn::ScalableTag<uint16_t>(), static_cast<uint16_t>(value)); }

// Calls body(a, b, i) for each vector of outputs; the last one gets its input from padded copies of the rows' ends.
template <size_t kBytes, class Body>
HWY_INLINE void MixLoop(const MixRows& rows, size_t count, const Body& body) {
  size_t i = 0;
  for (; i + kN <= count; i += kN) body(rows.a + i * kBytes, rows.b + i * kBytes, i);
  if (const size_t rest = count - i) {
    alignas(64) uint8_t a[kN * kBytes] = {};
    alignas(64) uint8_t b[kN * kBytes] = {};
    std::memcpy(a, rows.a + i * kBytes, rest * kBytes);
    std::memcpy(b, rows.b + i * kBytes, rest * kBytes);
    body(a, b, i);
  }
}

struct Mixer {
  U16 weightA, weightB;
  bool add;
  explicit HWY_INLINE Mixer(const MixRows& rows)
      : weightA(Set(rows.weightA)), weightB(Set(rows.weightB)), add(rows.add) {}
  HWY_INLINE U16 Sum(U16 a, U16 b) const { return hn::Add(hn::Mul(a, weightA), hn::Mul(b, weightB)); }
  HWY_INLINE void Put(U16 sum, uint16_t* out) const { Store(add ? hn::Add(sum, Load(out)) : sum, out); }
  HWY_INLINE void operator()(U16 a, U16 b, uint16_t* out) const { Put(Sum(a, b), out); }
};

HWY_INLINE U16 LowBytes(U16 v) { return hn::And(v, Set(255)); }

void MixPlane8(const MixRows& rows, uint16_t* out, uint16_t*, size_t count) {
  const Mixer mix(rows);
  MixLoop<1>(rows, count, [&](const uint8_t* a, const uint8_t* b, size_t i) HWY_ATTR {
    mix(LoadPromoted<uint16_t, uint8_t>(a), LoadPromoted<uint16_t, uint8_t>(b), out + i);
  });
}

void MixPlane10(const MixRows& rows, uint16_t* out, uint16_t*, size_t count) {
  const Mixer mix(rows);
  MixLoop<2>(rows, count, [&](const uint8_t* a, const uint8_t* b, size_t i) HWY_ATTR {
    mix(hn::ShiftRight<6>(LoadVector<uint16_t>(a)), hn::ShiftRight<6>(LoadVector<uint16_t>(b)), out + i);
  });
}

void MixPairs8(const MixRows& rows, uint16_t* outFirst, uint16_t* outSecond, size_t count) {
  const Mixer mix(rows);
  MixLoop<2>(rows, count, [&](const uint8_t* a, const uint8_t* b, size_t i) HWY_ATTR {
    const U16 pairsA = LoadVector<uint16_t>(a), pairsB = LoadVector<uint16_t>(b);
    mix(LowBytes(pairsA), LowBytes(pairsB), outFirst + i);
    mix(hn::ShiftRight<8>(pairsA), hn::ShiftRight<8>(pairsB), outSecond + i);
  });
}

void MixPairs10(const MixRows& rows, uint16_t* outFirst, uint16_t* outSecond, size_t count) {
  const hn::ScalableTag<uint16_t> d;
  const Mixer mix(rows);
  MixLoop<4>(rows, count, [&](const uint8_t* a, const uint8_t* b, size_t i) HWY_ATTR {
    const auto sum = [&](size_t k) HWY_ATTR {
      return mix.Sum(hn::ShiftRight<6>(LoadVector<uint16_t>(a, k)), hn::ShiftRight<6>(LoadVector<uint16_t>(b, k)));
    };
    const U16 low = sum(0), high = sum(1);
    mix.Put(hn::ConcatEven(d, high, low), outFirst + i);
    mix.Put(hn::ConcatOdd(d, high, low), outSecond + i);
  });
}

void AddWeighted(const uint16_t* row, uint32_t weight, bool first, uint32_t* sums, size_t count) {
  const hn::ScalableTag<uint32_t> d;
  const hn::Rebind<uint16_t, decltype(d)> d16;
  const U32 w = hn::Set(d, weight);
  for (size_t i = 0; i < count; i += kLanes<uint32_t>) {
    const U32 sum = first ? hn::Set(d, 0x8000) : hn::LoadU(d, sums + i);
    hn::StoreU(hn::Add(sum, hn::Mul(hn::PromoteTo(d, hn::LoadU(d16, row + i)), w)), d, sums + i);
  }
}

void FinishSums(const uint32_t* sums, uint16_t* out, size_t count) {
  const hn::ScalableTag<uint16_t> d;
  const hn::ScalableTag<uint32_t> d32;
  for (size_t i = 0; i < count; i += kN) {
    const U16 low = hn::BitCast(d, hn::LoadU(d32, sums + i));
    const U16 high = hn::BitCast(d, hn::LoadU(d32, sums + i + kLanes<uint32_t>));
    Store(hn::ConcatOdd(d, high, low), out + i);
  }
}

void HalveRow(const uint16_t* in, uint16_t* out, size_t count) {
  const hn::ScalableTag<uint16_t> d;
  for (size_t i = 0; i < count; i += kN) {
    const U16 low = Load(in + 2 * i), high = Load(in + 2 * i + kN);
    Store(hn::AverageRound(hn::ConcatEven(d, high, low), hn::ConcatOdd(d, high, low)), out + i);
  }
}

void MeanOfPairs(const uint16_t* in, uint16_t* out, size_t count) {
  for (size_t i = 0; i < count; i += kN) {
    const U16 sample = Load(in + i);
    Store(hn::AverageRound(sample, hn::AverageRound(sample, Load(in + i + 1))), out + i);
  }
}

template <bool kLinear>
HWY_INLINE void Double(const uint16_t* in, uint16_t* out, size_t count) {
  for (size_t i = 0; 2 * i < count; i += kN) {
    const U16 even = Load(in + i);
    const U16 odd = kLinear ? hn::AverageRound(even, Load(in + i + 1)) : even;
    hn::StoreInterleaved2(even, odd, hn::ScalableTag<uint16_t>(), out + 2 * i);
  }
}
void DoubleNearest(const uint16_t* in, uint16_t* out, size_t count) { Double<false>(in, out, count); }
void DoubleLinear(const uint16_t* in, uint16_t* out, size_t count) { Double<true>(in, out, count); }

// In a block of words as many whole groups of outputs as fit; `sample` is the place of each one's first input, counted
// from two before the group's, and `weight` those of its four inputs. AVX-512 takes a whole vector for a block.
#if HWY_TARGET == HWY_AVX3
constexpr size_t kBlockWords = kN;
#else
constexpr size_t kBlockWords = 8;
#endif
template <size_t kIn, size_t kOut>
struct CubicBlock {
  static constexpr size_t kGroups = kBlockWords / kOut;
  static constexpr size_t kInputs = kGroups * kIn, kOutputs = kGroups * kOut;
  constexpr explicit CubicBlock(const CubicPhase (&phases)[kOut]) : weight(), sample() {
    for (size_t i = 0; i < kN; ++i) {
      const size_t word = i % kBlockWords < kOutputs ? i % kBlockWords : 0;
      const CubicPhase& phase = phases[word % kOut];
      for (size_t k = 0; k < 4; ++k) weight[k][i] = phase.taps.w[k];
      sample[i] = static_cast<uint16_t>(word / kOut * kIn + static_cast<size_t>(phase.start + 2));
    }
  }
  alignas(64) int16_t weight[4][kN];
  alignas(64) uint16_t sample[kN];
};

// The inputs of a vector of outputs, without their lowest bit: the products need a sign. (Loops over the four of them
// would not be unrolled, and go through memory.)
struct Taps {
  I16 t0, t1, t2, t3;
};
template <class Block>
struct CubicSamples {
#if HWY_TARGET == HWY_AVX3
  U16 s0, s1, s2, s3;
  explicit HWY_INLINE CubicSamples(const Block& block)
      : s0(Load(block.sample)), s1(hn::Add(s0, Set(1))), s2(hn::Add(s0, Set(2))), s3(hn::Add(s0, Set(3))) {}
  HWY_INLINE Taps operator()(const uint16_t* in) const {
    const __m512i row = hn::ShiftRight<1>(Load(in - 2)).raw;
    return {I16{_mm512_permutexvar_epi16(s0.raw, row)}, I16{_mm512_permutexvar_epi16(s1.raw, row)},
            I16{_mm512_permutexvar_epi16(s2.raw, row)}, I16{_mm512_permutexvar_epi16(s3.raw, row)}};
  }
#else
  // Bytes of the words within a block: of the first two inputs, and two words on of the others.
  U16 even, odd;
  explicit HWY_INLINE CubicSamples(const Block& block)
      : even(hn::Add(hn::Mul(Load(block.sample), Set(0x0202)), Set(0x0100))), odd(hn::Add(even, Set(0x0202))) {}
  HWY_INLINE Taps operator()(const uint16_t* in) const {
    const U16 first = hn::ShiftRight<1>(LoadBlocks(in - 2)), second = hn::ShiftRight<1>(LoadBlocks(in));
    return {Look(first, even), Look(first, odd), Look(second, even), Look(second, odd)};
  }
  static HWY_INLINE I16 Look(U16 row, U16 bytes) {
    return hn::BitCast(hn::ScalableTag<int16_t>(), hn::TableLookupBytes(row, bytes));
  }
  static HWY_INLINE U16 LoadBlocks(const uint16_t* in) {
#if HWY_TARGET == HWY_AVX2
    const auto* low = reinterpret_cast<const __m128i*>(in);
    const auto* high = reinterpret_cast<const __m128i*>(in + Block::kInputs);
    return U16{_mm256_inserti128_si256(_mm256_castsi128_si256(_mm_loadu_si128(low)), _mm_loadu_si128(high), 1)};
#else
    return Load(in);
#endif
  }
#endif
};

// The outer pairs are summed first, so that saturation only ever meets the result.
template <class Block>
HWY_INLINE void Cubic(const Block& block, const uint16_t* in, uint16_t* out, size_t count) {
  const hn::ScalableTag<int16_t> d;
  const CubicSamples<Block> samples(block);
  const I16 w0 = hn::Load(d, block.weight[0]), w1 = hn::Load(d, block.weight[1]);
  const I16 w2 = hn::Load(d, block.weight[2]), w3 = hn::Load(d, block.weight[3]);
  constexpr size_t kBlocks = kN / kBlockWords;
  for (size_t i = 0; i < count; i += kBlocks * Block::kOutputs, in += kBlocks * Block::kInputs) {
    const Taps taps = samples(in);
    const I16 sum = hn::SaturatedAdd(hn::Add(hn::MulFixedPoint15(taps.t0, w0), hn::MulFixedPoint15(taps.t1, w1)),
                                     hn::Add(hn::MulFixedPoint15(taps.t2, w2), hn::MulFixedPoint15(taps.t3, w3)));
    const U16 result = hn::ShiftLeft<1>(hn::BitCast(hn::ScalableTag<uint16_t>(), hn::Max(sum, hn::Zero(d))));
#if HWY_TARGET == HWY_AVX2
    const hn::Half<hn::ScalableTag<uint16_t>> dHalf;
    hn::StoreU(hn::LowerHalf(dHalf, result), dHalf, out + i);
    hn::StoreU(hn::UpperHalf(dHalf, result), dHalf, out + i + Block::kOutputs);
#else
    Store(result, out + i);
#endif
  }
}

void FourThirds(const uint16_t* in, uint16_t* out, size_t count) {
  static constexpr CubicBlock<3, 4> kBlock(kFourThirdsPhases);
  Cubic(kBlock, in, out, count);
}
void ThreeHalves(const uint16_t* in, uint16_t* out, size_t count) {
  static constexpr CubicBlock<2, 3> kBlock(kThreeHalvesPhases);
  Cubic(kBlock, in, out, count);
}

}  // namespace
}  // namespace HWY_NAMESPACE
}  // namespace vexel::decode420
HWY_AFTER_NAMESPACE();
#endif  // HWY_TARGET

#if HWY_ONCE
namespace vexel::decode420 {
namespace plain {
namespace {

uint32_t Byte(const uint8_t* row, size_t i) { return row[i]; }
uint32_t Code10(const uint8_t* row, size_t i) { return (row[2 * i] | uint32_t{row[2 * i + 1]} << 8) >> 6; }

// Every `step`-th sample from `first` on.
template <uint32_t (&kSample)(const uint8_t*, size_t)>
void Mix(const MixRows& rows, size_t first, size_t step, uint16_t* out, size_t count) {
  for (size_t i = 0; i < count; ++i) {
    const size_t at = first + step * i;
    const uint32_t sum = rows.weightA * kSample(rows.a, at) + rows.weightB * kSample(rows.b, at);
    out[i] = static_cast<uint16_t>(rows.add ? out[i] + sum : sum);
  }
}

void MixPlane8(const MixRows& rows, uint16_t* out, uint16_t*, size_t count) { Mix<Byte>(rows, 0, 1, out, count); }
void MixPlane10(const MixRows& rows, uint16_t* out, uint16_t*, size_t count) { Mix<Code10>(rows, 0, 1, out, count); }
void MixPairs8(const MixRows& rows, uint16_t* outFirst, uint16_t* outSecond, size_t count) {
  Mix<Byte>(rows, 0, 2, outFirst, count);
  Mix<Byte>(rows, 1, 2, outSecond, count);
}
void MixPairs10(const MixRows& rows, uint16_t* outFirst, uint16_t* outSecond, size_t count) {
  Mix<Code10>(rows, 0, 2, outFirst, count);
  Mix<Code10>(rows, 1, 2, outSecond, count);
}

void AddWeighted(const uint16_t* row, uint32_t weight, bool first, uint32_t* sums, size_t count) {
  for (size_t i = 0; i < count; ++i) sums[i] = (first ? 0x8000 : sums[i]) + row[i] * weight;
}
void FinishSums(const uint32_t* sums, uint16_t* out, size_t count) {
  for (size_t i = 0; i < count; ++i) out[i] = static_cast<uint16_t>(sums[i] >> 16);
}

uint16_t Mean(uint32_t a, uint32_t b) { return static_cast<uint16_t>((a + b + 1) >> 1); }

void HalveRow(const uint16_t* in, uint16_t* out, size_t count) {
  for (size_t i = 0; i < count; ++i) out[i] = Mean(in[2 * i], in[2 * i + 1]);
}
void MeanOfPairs(const uint16_t* in, uint16_t* out, size_t count) {
  for (size_t i = 0; i < count; ++i) out[i] = Mean(in[i], Mean(in[i], in[i + 1]));
}
void DoubleNearest(const uint16_t* in, uint16_t* out, size_t count) {
  for (size_t i = 0; i < count; ++i) out[i] = in[i / 2];
}
void DoubleLinear(const uint16_t* in, uint16_t* out, size_t count) {
  for (size_t i = 0; i < count; ++i) out[i] = i % 2 == 0 ? in[i / 2] : Mean(in[i / 2], in[i / 2 + 1]);
}

// Products rounded to samples of 15 bits, then a sum that saturates at both ends.
uint16_t Cubic(const uint16_t* in, const CubicTaps& taps) {
  int32_t sum = 0;
  for (int k = 0; k < 4; ++k) sum += ((in[k] >> 1) * taps.w[k] + 0x4000) >> 15;
  return static_cast<uint16_t>(2 * (sum < 0 ? 0 : sum > INT16_MAX ? INT16_MAX : sum));
}
void FourThirds(const uint16_t* in, uint16_t* out, size_t count) {
  for (size_t i = 0; i < count; ++i)
    out[i] = Cubic(in + i / 4 * 3 + kFourThirdsPhases[i % 4].start, kFourThirdsPhases[i % 4].taps);
}
void ThreeHalves(const uint16_t* in, uint16_t* out, size_t count) {
  for (size_t i = 0; i < count; ++i)
    out[i] = Cubic(in + i / 3 * 2 + kThreeHalvesPhases[i % 3].start, kThreeHalvesPhases[i % 3].taps);
}

}  // namespace
}  // namespace plain

const KernelVariants<MixSamples> kMixPlane8 = VX_KERNEL_VARIANTS(MixPlane8);
const KernelVariants<MixSamples> kMixPlane10 = VX_KERNEL_VARIANTS(MixPlane10);
const KernelVariants<MixSamples> kMixPairs8 = VX_KERNEL_VARIANTS(MixPairs8);
const KernelVariants<MixSamples> kMixPairs10 = VX_KERNEL_VARIANTS(MixPairs10);
const KernelVariants<AddWeighted> kAddWeighted = VX_KERNEL_VARIANTS(AddWeighted);
const KernelVariants<FinishSums> kFinishSums = VX_KERNEL_VARIANTS(FinishSums);
const KernelVariants<ResampleRow> kHalveRow = VX_KERNEL_VARIANTS(HalveRow);
const KernelVariants<ResampleRow> kMeanOfPairs = VX_KERNEL_VARIANTS(MeanOfPairs);
const KernelVariants<ResampleRow> kDoubleNearest = VX_KERNEL_VARIANTS(DoubleNearest);
const KernelVariants<ResampleRow> kDoubleLinear = VX_KERNEL_VARIANTS(DoubleLinear);
const KernelVariants<ResampleRow> kFourThirds = VX_KERNEL_VARIANTS(FourThirds);
const KernelVariants<ResampleRow> kThreeHalves = VX_KERNEL_VARIANTS(ThreeHalves);

}  // namespace vexel::decode420
#endif
