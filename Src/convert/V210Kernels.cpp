// V210: 6 pixels in four little-endian words of three 10-bit samples, in the order U Y V Y; studio codes.
#include <cstddef>
#include <cstdint>
#include <cstring>

#include "convert/PlainYuv.h"
#include "convert/StudioScale.h"
#include "convert/YuvKernels.h"
#include "convert/YuvMatrices.h"

#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "convert/V210Kernels.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

#include "convert/FloatPixels-inl.h"
#include "frame/KernelTable.h"

#ifndef VEXEL_CONVERT_V210KERNELS_ONCE
#define VEXEL_CONVERT_V210KERNELS_ONCE
namespace vexel {
namespace {

constexpr size_t kGroupSamples = 12, kGroupBytes = 16;
constexpr size_t PairsOf(size_t pixels) { return (pixels + 1) / 2; }
constexpr size_t GroupsOf(size_t pixels) { return (pixels + 5) / 6; }

// Black pairs for what a last group holds beyond the row. In float and as zero samples of a read row they need no fill.
constexpr uint32_t kBlackUyvy8 = 0x10801080;

// Fixed point: products of a 16-bit value and a coefficient in units of 2^-15, rounded. Results are codes of 8 bits in
// units of 2^-6. Luma comes in as 10-bit codes times 32, chroma as sums of two 10-bit codes times 32.
constexpr int16_t ToFixed(double resultPerInput) {
  const double v = resultPerInput * 32768.0;
  return static_cast<int16_t>(v < 0 ? v - 0.5 : v + 0.5);
}
constexpr double kLumaUnit = 64.0 / (4 * 32), kChromaUnit = 64.0 / (2 * 4 * 32);

struct BgrFixed {
  int16_t y, bU, gU, gV, rV;
};
constexpr BgrFixed MakeBgrFixed(const YuvMatrix& m) {
  constexpr double kLuma = 255.0 / kLumaRange8 * kLumaUnit, kChroma = 255.0 / kChromaRange8 * kChromaUnit;
  return {ToFixed(kLuma), ToFixed(m.bU * kChroma), ToFixed(m.gU * kChroma), ToFixed(m.gV * kChroma),
          ToFixed(m.rV * kChroma)};
}
inline constexpr BgrFixed kBgrFixed601 = MakeBgrFixed(kBt601), kBgrFixed709 = MakeBgrFixed(kBt709);

struct RecodingFixed {
  int16_t vU, vV, uU, uV, yU, yV;
};
constexpr RecodingFixed MakeRecodingFixed(const YuvRecoding& r) {
  constexpr double kLuma = double{kLumaRange8} / kChromaRange8 * kChromaUnit;
  return {ToFixed(r.vU * kChromaUnit), ToFixed(r.vV * kChromaUnit), ToFixed(r.uU * kChromaUnit),
          ToFixed(r.uV * kChromaUnit), ToFixed(r.yU * kLuma),       ToFixed(r.yV * kLuma)};
}
inline constexpr RecodingFixed kRecodingFixed709To601 = MakeRecodingFixed(k709To601);

}  // namespace
}  // namespace vexel
#endif

#if HWY_TARGET != HWY_BASELINE_SCALAR
HWY_BEFORE_NAMESPACE();
namespace vexel {
namespace HWY_NAMESPACE {
namespace {

constexpr size_t kVectorGroups = HWY_MAX_BYTES / kGroupBytes;

// Calls body(src, dst) for blocks of kBlock groups. The body may read kSrcOver bytes and write kDstOver bytes beyond
// its block: blocks run in order, and those that would leave the row run on a copy. kFill continues a source row.
template <size_t kBlock, size_t kSrcGroup, size_t kDstGroup, size_t kSrcOver, size_t kDstOver, uint32_t kFill,
          class Body>
HWY_INLINE void GroupLoop(const uint8_t* HWY_RESTRICT src, size_t srcBytes, uint8_t* HWY_RESTRICT dst, size_t dstBytes,
                          const Body& body) {
  constexpr size_t kSrcBlock = kBlock * kSrcGroup, kDstBlock = kBlock * kDstGroup;
  size_t s = 0, d = 0;
  for (; s + kSrcBlock + kSrcOver <= srcBytes && d + kDstBlock + kDstOver <= dstBytes; s += kSrcBlock, d += kDstBlock)
    body(src + s, dst + d);
  for (; d < dstBytes; s += kSrcBlock, d += kDstBlock) {
    alignas(64) uint8_t in[kSrcBlock + kSrcOver];
    alignas(64) uint8_t out[kDstBlock + kDstOver];
    const uint32_t fill = kFill;
    for (size_t i = 0; i < sizeof in; i += sizeof fill) std::memcpy(in + i, &fill, sizeof fill);
    std::memcpy(in, src + s, srcBytes - s < kSrcBlock ? srcBytes - s : kSrcBlock);
    body(in, out);
    std::memcpy(dst + d, out, dstBytes - d < kDstBlock ? dstBytes - d : kDstBlock);
  }
}

// The 12 bytes of each group at the front of a block of 16, and back.
HWY_INLINE U8 SpreadGroups(U8 v) {
#if HWY_TARGET == HWY_AVX3
  return U8{_mm512_permutexvar_epi32(_mm512_setr_epi32(0, 1, 2, 3, 3, 4, 5, 6, 6, 7, 8, 9, 9, 10, 11, 12), v.raw)};
#elif HWY_TARGET == HWY_AVX2
  return U8{_mm256_permutevar8x32_epi32(v.raw, _mm256_setr_epi32(0, 1, 2, 3, 3, 4, 5, 6))};
#else
  return v;
#endif
}
HWY_INLINE U8 GatherGroups(U8 v) {
#if HWY_TARGET == HWY_AVX3
  return U8{_mm512_permutexvar_epi32(_mm512_setr_epi32(0, 1, 2, 4, 5, 6, 8, 9, 10, 12, 13, 14, 3, 7, 11, 15), v.raw)};
#elif HWY_TARGET == HWY_AVX2
  return U8{_mm256_permutevar8x32_epi32(v.raw, _mm256_setr_epi32(0, 1, 2, 4, 5, 6, 3, 7))};
#else
  return v;
#endif
}

template <class T>
HWY_INLINE Full<T> Repeat(const T* lanes) {
  return hn::LoadDup128(hn::ScalableTag<T>(), lanes);
}

void Uyvy8ToV210(const uint8_t* src, uint8_t* dst, size_t count) {
  GroupLoop<kVectorGroups, 12, 16, 4 * kVectorGroups, 0, kBlackUyvy8>(
      src, 4 * PairsOf(count), dst, 16 * GroupsOf(count),
      [](const uint8_t* HWY_RESTRICT in, uint8_t* HWY_RESTRICT out) HWY_ATTR {
        static constexpr uint8_t Z = 0x80;
        alignas(16) static constexpr uint8_t kOuter[16] = {0, Z, 2, Z, 3, Z, 5, Z, 6, Z, 8, Z, 9, Z, 11, Z};
        alignas(16) static constexpr uint8_t kMiddle[16] = {Z, 1, Z, Z, Z, 4, Z, Z, Z, 7, Z, Z, Z, 10, Z, Z};
        alignas(16) static constexpr uint16_t kShift[8] = {4, 64, 4, 64, 4, 64, 4, 64};
        const hn::ScalableTag<uint16_t> d16;
        const hn::ScalableTag<uint32_t> d32;
        const auto groups = SpreadGroups(LoadVector<uint8_t>(in));
        const auto outer = hn::BitCast(d16, hn::TableLookupBytesOr0(groups, Repeat(kOuter)));
        const auto middle = hn::BitCast(d32, hn::TableLookupBytesOr0(groups, Repeat(kMiddle)));
        StoreVector(hn::Or(hn::BitCast(d32, hn::Mul(outer, Repeat(kShift))), hn::ShiftLeft<4>(middle)), out);
      });
}

void V210ToUyvy8(const uint8_t* src, uint8_t* dst, size_t count) {
  GroupLoop<kVectorGroups, 16, 12, 0, 4 * kVectorGroups, 0>(
      src, 16 * GroupsOf(count), dst, 4 * PairsOf(count),
      [](const uint8_t* HWY_RESTRICT in, uint8_t* HWY_RESTRICT out) HWY_ATTR {
        alignas(16) static constexpr uint8_t kOrder[16] = {0, 8, 1, 2, 10, 3, 4, 12, 5, 6, 14, 7, 9, 11, 13, 15};
        // A rounded product with 2^13 is a rounded shift by 2; the third sample stands 4 bits higher.
        alignas(16) static constexpr int16_t kShift[8] = {1 << 13, 1 << 9, 1 << 13, 1 << 9,
                                                          1 << 13, 1 << 9, 1 << 13, 1 << 9};
        const hn::ScalableTag<int16_t> d16;
        const hn::ScalableTag<uint32_t> d32;
        const auto words = LoadVector<uint32_t>(in);
        const auto outer = hn::BitCast(d16, hn::And(words, hn::Set(d32, 0x3FF003FF)));
        const auto middle = hn::BitCast(d16, hn::And(hn::ShiftRight<10>(words), hn::Set(d32, 0x3FF)));
        const auto shift = Repeat(kShift);
        const auto bytes = PackBlocks(hn::MulFixedPoint15(outer, shift), hn::MulFixedPoint15(middle, shift));
        StoreVector(GatherGroups(hn::TableLookupBytes(bytes, Repeat(kOrder))), out);
      });
}

// 16-bit samples. A block of 8 groups is a whole number of vectors of floats on every target.
constexpr size_t kBlockGroups = 8, kBlockSamples = kBlockGroups * kGroupSamples;

// The samples of a group; kSpareSamples more are overwritten.
constexpr size_t kSpareSamples = 4;
HWY_INLINE void UnpackGroup(const uint8_t* HWY_RESTRICT src, uint16_t* HWY_RESTRICT samples) {
  // The two bytes that hold a sample, moved so that it ends at bit 15 and the bits above it fall out.
  alignas(32) static constexpr uint8_t kBytes[32] = {0,  1,  1,    2,    2,    3,    4,    5,    5,    6,   6,
                                                     7,  8,  9,    9,    10,   10,   11,   12,   13,   13,  14,
                                                     14, 15, 0x80, 0x80, 0x80, 0x80, 0x80, 0x80, 0x80, 0x80};
  alignas(32) static constexpr uint16_t kShift[16] = {64, 16, 4, 64, 16, 4, 64, 16, 4, 64, 16, 4, 0, 0, 0, 0};
  const hn::CappedTag<uint16_t, 16> d16;
  const hn::Repartition<uint8_t, decltype(d16)> d8;
  constexpr size_t kN = hn::MaxLanes(d16);
  const auto group = hn::LoadDup128(d8, src);
  for (size_t i = 0; i < 16; i += kN) {
    const auto moved = hn::BitCast(d16, hn::TableLookupBytesOr0(group, hn::Load(d8, kBytes + 2 * i)));
    hn::StoreU(hn::ShiftRight<6>(hn::Mul(moved, hn::Load(d16, kShift + i))), d16, samples + i);
  }
}

HWY_INLINE void PackGroup(const uint16_t* HWY_RESTRICT samples, uint8_t* HWY_RESTRICT dst) {
  static constexpr uint8_t Z = 0x80;
  // Of the first 8 samples and of the last 8: the lower two of each word, and the third in an upper half.
  alignas(16) static constexpr uint8_t kTwo[2][16] = {{0, 1, 2, 3, 6, 7, 8, 9, Z, Z, Z, Z, Z, Z, Z, Z},
                                                      {Z, Z, Z, Z, Z, Z, Z, Z, 4, 5, 6, 7, 10, 11, 12, 13}};
  alignas(16) static constexpr uint8_t kThird[2][16] = {{Z, Z, 4, 5, Z, Z, 10, 11, Z, Z, Z, Z, Z, Z, Z, Z},
                                                        {Z, Z, Z, Z, Z, Z, Z, Z, Z, Z, 8, 9, Z, Z, 14, 15}};
  const hn::CappedTag<uint8_t, 16> d8;
  const hn::Repartition<uint16_t, decltype(d8)> d16;
  const hn::Repartition<uint32_t, decltype(d8)> d32;
  const auto first = hn::BitCast(d8, hn::LoadU(d16, samples)), last = hn::BitCast(d8, hn::LoadU(d16, samples + 4));
  const auto pick = [&](const uint8_t(&bytes)[2][16]) HWY_ATTR {
    return hn::BitCast(d32, hn::Or(hn::TableLookupBytesOr0(first, hn::Load(d8, bytes[0])),
                                   hn::TableLookupBytesOr0(last, hn::Load(d8, bytes[1]))));
  };
  const decltype(pick(kTwo)) lower{_mm_madd_epi16(pick(kTwo).raw, _mm_set1_epi32(1 | 1024 << 16))};
  hn::StoreU(hn::BitCast(d8, hn::Or(lower, hn::ShiftLeft<4>(pick(kThird)))), d8, dst);
}

void Uyvy32fToV210(const uint8_t* src, uint8_t* dst, size_t count) {
  GroupLoop<kBlockGroups, 48, 16, 0, 0, 0>(
      src, 16 * PairsOf(count), dst, 16 * GroupsOf(count),
      [](const uint8_t* HWY_RESTRICT in, uint8_t* HWY_RESTRICT out) HWY_ATTR {
        const hn::ScalableTag<int16_t> d16;
        alignas(64) uint16_t samples[kBlockSamples];
        auto* bytes = reinterpret_cast<uint8_t*>(samples);
        for (size_t i = 0; i < kBlockSamples / kLanes<int16_t>; ++i) {
          const auto codes = PackTo16(ScaleToCodes<kUyvy10Scale>(LoadVector<float>(in, 2 * i)),
                                      ScaleToCodes<kUyvy10Scale>(LoadVector<float>(in, 2 * i + 1)));
          StoreVector(hn::Min(hn::Max(codes, hn::Zero(d16)), hn::Set(d16, 1023)), bytes, i);
        }
        for (size_t i = 0; i < kBlockGroups; ++i) PackGroup(samples + i * kGroupSamples, out + i * kGroupBytes);
      });
}

void V210ToUyvy32f(const uint8_t* src, uint8_t* dst, size_t count) {
  GroupLoop<kBlockGroups, 16, 48, 0, 0, 0>(
      src, 16 * GroupsOf(count), dst, 16 * PairsOf(count),
      [](const uint8_t* HWY_RESTRICT in, uint8_t* HWY_RESTRICT out) HWY_ATTR {
        alignas(64) uint16_t samples[kBlockSamples + kSpareSamples];
        for (size_t i = 0; i < kBlockGroups; ++i) UnpackGroup(in + i * kGroupBytes, samples + i * kGroupSamples);
        const auto* bytes = reinterpret_cast<const uint8_t*>(samples);
        for (size_t i = 0; i < kBlockSamples / kLanes<float>; ++i)
          StoreVector(WidenCodes<kUyvy10Scale, uint16_t>(bytes + 2 * i * kLanes<float>), out, i);
      });
}

// Three channels of 16 bits, not yet saturated to bytes.
struct Channels16 {
  I16 c[3];
};

HWY_INLINE I16 RoundCode(I16 v) {
  return hn::ShiftRight<6>(hn::SaturatedAdd(v, hn::Set(hn::ScalableTag<int16_t>(), 32)));
}
HWY_INLINE I16 Times(I16 v, int16_t coefficient) {
  return hn::MulFixedPoint15(v, hn::Set(hn::ScalableTag<int16_t>(), coefficient));
}

// The steps take luma codes and sums of two chroma codes. Sums that leave 16 bits saturate; they are beyond white or
// black anyway.
template <const BgrFixed& kM>
struct ToBgr8 {
  static HWY_INLINE Channels16 Apply(I16 luma, I16 u2, I16 v2) {
    const hn::ScalableTag<int16_t> d;
    const auto y = Times(hn::ShiftLeft<5>(hn::Sub(luma, hn::Set(d, 64))), kM.y);
    const auto u = hn::ShiftLeft<5>(hn::Sub(u2, hn::Set(d, 1024))), v = hn::ShiftLeft<5>(hn::Sub(v2, hn::Set(d, 1024)));
    return {{RoundCode(hn::SaturatedAdd(y, Times(u, kM.bU))),
             RoundCode(hn::SaturatedAdd(y, hn::Add(Times(u, kM.gU), Times(v, kM.gV)))),
             RoundCode(hn::SaturatedAdd(y, Times(v, kM.rV)))}};
  }
};

struct ToVuy8 {
  static HWY_INLINE Channels16 Apply(I16 luma, I16 u2, I16 v2) {
    const hn::ScalableTag<int16_t> d;
    const auto four = hn::Set(d, 4);
    return {{hn::ShiftRight<3>(hn::Add(v2, four)), hn::ShiftRight<3>(hn::Add(u2, four)),
             hn::ShiftRight<2>(hn::Add(luma, hn::Set(d, 2)))}};
  }
};

template <const RecodingFixed& kR>
struct RecodeToVuy8 {
  static HWY_INLINE Channels16 Apply(I16 luma, I16 u2, I16 v2) {
    const hn::ScalableTag<int16_t> d;
    const auto zero = hn::Set(d, kChromaZero8 * 64);
    const auto u = hn::ShiftLeft<5>(hn::Sub(u2, hn::Set(d, 1024))), v = hn::ShiftLeft<5>(hn::Sub(v2, hn::Set(d, 1024)));
    return {{RoundCode(hn::Add(hn::Add(Times(u, kR.vU), Times(v, kR.vV)), zero)),
             RoundCode(hn::Add(hn::Add(Times(u, kR.uU), Times(v, kR.uV)), zero)),
             RoundCode(hn::Add(hn::Add(Times(u, kR.yU), Times(v, kR.yV)), hn::ShiftLeft<4>(luma)))}};
  }
};

constexpr size_t kStepPixels = kLanes<int16_t>;  // two vectors of sample pairs

// Luma in the order of the pairs in `a` and `b`, block by block, and for every pixel the sum of its two chroma codes:
// its own twice, or its own and the next pair's for an odd pixel.
template <class Step>
HWY_INLINE Channels16 StepPixels(const uint8_t* HWY_RESTRICT pairs) {
  const hn::ScalableTag<int16_t> d16;
  const hn::ScalableTag<int32_t> d32;
  const hn::ScalableTag<float> df;
  const auto a = LoadVector<int32_t>(pairs, 0), b = LoadVector<int32_t>(pairs, 1);
  const auto luma = hn::ReorderDemote2To(d16, hn::ShiftRight<16>(a), hn::ShiftRight<16>(b));
  // [2U, U + next U, 2V, V + next V] per pair.
  const auto sums = [=](I32 own, I32 next) HWY_ATTR {
    const auto even = hn::And(hn::Add(own, own), hn::Set(d32, 0xFFFF));
    return hn::BitCast(df, hn::Or(even, hn::ShiftLeft<16>(hn::Add(own, next))));
  };
  const auto sumsA = sums(a, LoadVector<int32_t>(pairs + 8, 0)), sumsB = sums(b, LoadVector<int32_t>(pairs + 8, 1));
#if HWY_TARGET == HWY_AVX3
  const F32 u{_mm512_shuffle_ps(sumsA.raw, sumsB.raw, 0x88)}, v{_mm512_shuffle_ps(sumsA.raw, sumsB.raw, 0xDD)};
#elif HWY_TARGET == HWY_AVX2
  const F32 u{_mm256_shuffle_ps(sumsA.raw, sumsB.raw, 0x88)}, v{_mm256_shuffle_ps(sumsA.raw, sumsB.raw, 0xDD)};
#else
  const F32 u{_mm_shuffle_ps(sumsA.raw, sumsB.raw, 0x88)}, v{_mm_shuffle_ps(sumsA.raw, sumsB.raw, 0xDD)};
#endif
  return Step::Apply(luma, hn::BitCast(d16, u), hn::BitCast(d16, v));
}

// Bytes of four channels, the fourth opaque: the first half of each block, then the second.
HWY_INLINE void StorePixels(const Channels16& pixels, uint8_t* HWY_RESTRICT dst) {
  alignas(16) static constexpr uint8_t kZip[16] = {0, 8, 1, 9, 2, 10, 3, 11, 4, 12, 5, 13, 6, 14, 7, 15};
  const hn::ScalableTag<int16_t> d16;
  const auto zip = [](I16 a, I16 b) HWY_ATTR {
    return hn::BitCast(hn::ScalableTag<uint16_t>(), hn::TableLookupBytes(PackBlocks(a, b), Repeat(kZip)));
  };
  const auto lower = zip(pixels.c[0], pixels.c[1]), upper = zip(pixels.c[2], hn::Set(d16, 255));
  const hn::ScalableTag<uint16_t> du;
  StoreVector(hn::InterleaveLower(du, lower, upper), dst, 0);
  StoreVector(hn::InterleaveUpper(du, lower, upper), dst, 1);
}

constexpr size_t kChunkGroups = 32, kChunkPixels = 6 * kChunkGroups;

// Runs of a row small enough to stay in the cache as 16-bit samples.
template <class Step>
HWY_INLINE void UpsampleRow(const uint8_t* HWY_RESTRICT src, uint8_t* HWY_RESTRICT dst, size_t count) {
  // A chunk, the pair after it, and what the last step reads beyond.
  alignas(64) uint16_t samples[(kChunkGroups + 1) * kGroupSamples + 2 * kStepPixels] = {};
  const auto* bytes = reinterpret_cast<const uint8_t*>(samples);
  for (; count > 0; src += kChunkGroups * kGroupBytes) {
    const size_t pixels = count < kChunkPixels ? count : kChunkPixels;
    const size_t groups = GroupsOf(count) <= kChunkGroups ? GroupsOf(count) : kChunkGroups + 1;
    for (size_t i = 0; i < groups; ++i) UnpackGroup(src + i * kGroupBytes, samples + i * kGroupSamples);
    if (count <= kChunkPixels) {  // the row ends: its last chroma repeats
      const size_t last = 4 * (PairsOf(count) - 1);
      samples[last + 4] = samples[last];
      samples[last + 6] = samples[last + 2];
    }
    size_t x = 0;
    for (; x + kStepPixels <= pixels; x += kStepPixels, dst += 4 * kStepPixels)
      StorePixels(StepPixels<Step>(bytes + 4 * x), dst);
    if (x < pixels) {
      alignas(64) uint8_t out[4 * kStepPixels];
      StorePixels(StepPixels<Step>(bytes + 4 * x), out);
      std::memcpy(dst, out, 4 * (pixels - x));
    }
    count -= pixels;
  }
}

void V210ToBgrx8_601(const uint8_t* src, uint8_t* dst, size_t count) {
  UpsampleRow<ToBgr8<kBgrFixed601>>(src, dst, count);
}
void V210ToBgrx8_709(const uint8_t* src, uint8_t* dst, size_t count) {
  UpsampleRow<ToBgr8<kBgrFixed709>>(src, dst, count);
}
void V210ToVuyx8(const uint8_t* src, uint8_t* dst, size_t count) { UpsampleRow<ToVuy8>(src, dst, count); }
void V210_709ToVuyx8_601(const uint8_t* src, uint8_t* dst, size_t count) {
  UpsampleRow<RecodeToVuy8<kRecodingFixed709To601>>(src, dst, count);
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

// Sample `index` of a row: 0 is U of the first pair, 1 its first luma, 2 its V, 3 its second luma, 4 the next U.
int LoadSample(const uint8_t* row, size_t index) {
  uint32_t word;
  std::memcpy(&word, row + 4 * (index / 3), 4);
  return static_cast<int>(word >> (10 * (index % 3)) & 0x3FF);
}

// Writes `count` samples given by code(index), and black up to the end of the last group.
template <class Code>
void PackSamples(uint8_t* dst, size_t count, const Code& code) {
  for (size_t index = 0; index < count || index % kGroupSamples != 0; index += 3, dst += 4) {
    uint32_t word = 0;
    for (size_t i = index; i < index + 3; ++i) {
      const int sample = i < count ? code(i) : i % 2 == 0 ? 512 : 64;
      word |= static_cast<uint32_t>(sample) << (10 * (i - index));
    }
    std::memcpy(dst, &word, 4);
  }
}

void Uyvy8ToV210(const uint8_t* src, uint8_t* dst, size_t count) {
  PackSamples(dst, 4 * PairsOf(count), [src](size_t i) { return src[i] * 4; });
}

void V210ToUyvy8(const uint8_t* src, uint8_t* dst, size_t count) {
  for (size_t i = 0; i < 4 * PairsOf(count); ++i)
    dst[i] = static_cast<uint8_t>(Clamp((LoadSample(src, i) + 2) >> 2, 0, 255));
}

void Uyvy32fToV210(const uint8_t* src, uint8_t* dst, size_t count) {
  PackSamples(dst, 4 * PairsOf(count), [src](size_t i) {
    float v;
    std::memcpy(&v, src + 4 * i, 4);
    return i % 2 == 0 ? ToCode(v * 896.0f + 512.0f, 1023) : ToCode(v * 876.0f + 64.0f, 1023);
  });
}

void V210ToUyvy32f(const uint8_t* src, uint8_t* dst, size_t count) {
  for (size_t i = 0; i < 4 * PairsOf(count); ++i) {
    const int code = LoadSample(src, i);
    const float v =
        i % 2 == 0 ? static_cast<float>(code - 512) * (1.0f / 896.0f) : static_cast<float>(code - 64) * (1.0f / 876.0f);
    std::memcpy(dst + 4 * i, &v, 4);
  }
}

// The product with a coefficient in units of 2^-15, rounded.
int Times(int v, int16_t coefficient) { return (v * coefficient + 0x4000) >> 15; }
uint8_t RoundCode(int v) { return static_cast<uint8_t>(Clamp((v + 32) >> 6, 0, 255)); }

// Calls pixel(luma, u2, v2, out) for each pixel of a row; u2 and v2 are sums of two codes.
template <class Pixel>
void UpsampleRow(const uint8_t* src, uint8_t* dst, size_t count, const Pixel& pixel) {
  for (size_t x = 0; x < count; ++x, dst += 4) {
    const size_t pair = x / 2, next = x % 2 != 0 && pair + 1 < PairsOf(count) ? pair + 1 : pair;
    pixel(LoadSample(src, 4 * pair + 1 + 2 * (x % 2)), LoadSample(src, 4 * pair) + LoadSample(src, 4 * next),
          LoadSample(src, 4 * pair + 2) + LoadSample(src, 4 * next + 2), dst);
    dst[3] = 255;
  }
}

void ToBgrx8(const BgrFixed& m, const uint8_t* src, uint8_t* dst, size_t count) {
  UpsampleRow(src, dst, count, [&m](int luma, int u2, int v2, uint8_t* out) {
    const int y = Times((luma - 64) * 32, m.y), u = (u2 - 1024) * 32, v = (v2 - 1024) * 32;
    out[0] = RoundCode(y + Times(u, m.bU));
    out[1] = RoundCode(y + Times(u, m.gU) + Times(v, m.gV));
    out[2] = RoundCode(y + Times(v, m.rV));
  });
}
void V210ToBgrx8_601(const uint8_t* src, uint8_t* dst, size_t count) { ToBgrx8(kBgrFixed601, src, dst, count); }
void V210ToBgrx8_709(const uint8_t* src, uint8_t* dst, size_t count) { ToBgrx8(kBgrFixed709, src, dst, count); }

void V210ToVuyx8(const uint8_t* src, uint8_t* dst, size_t count) {
  UpsampleRow(src, dst, count, [](int luma, int u2, int v2, uint8_t* out) {
    out[0] = static_cast<uint8_t>(Clamp((v2 + 4) >> 3, 0, 255));
    out[1] = static_cast<uint8_t>(Clamp((u2 + 4) >> 3, 0, 255));
    out[2] = static_cast<uint8_t>(Clamp((luma + 2) >> 2, 0, 255));
  });
}

void V210_709ToVuyx8_601(const uint8_t* src, uint8_t* dst, size_t count) {
  constexpr RecodingFixed r = kRecodingFixed709To601;
  UpsampleRow(src, dst, count, [r](int luma, int u2, int v2, uint8_t* out) {
    const int u = (u2 - 1024) * 32, v = (v2 - 1024) * 32;
    out[0] = RoundCode(Times(u, r.vU) + Times(v, r.vV) + 128 * 64);
    out[1] = RoundCode(Times(u, r.uU) + Times(v, r.uV) + 128 * 64);
    out[2] = RoundCode(Times(u, r.yU) + Times(v, r.yV) + luma * 16);
  });
}

}  // namespace
}  // namespace plain

const RowKernelSet kUyvy8ToV210 = VX_KERNEL_VARIANTS(Uyvy8ToV210);
const RowKernelSet kV210ToUyvy8 = VX_KERNEL_VARIANTS(V210ToUyvy8);
const RowKernelSet kUyvy32fToV210 = VX_KERNEL_VARIANTS(Uyvy32fToV210);
const RowKernelSet kV210ToUyvy32f = VX_KERNEL_VARIANTS(V210ToUyvy32f);
const RowKernelSet kV210ToBgrx8_601 = VX_KERNEL_VARIANTS(V210ToBgrx8_601);
const RowKernelSet kV210ToBgrx8_709 = VX_KERNEL_VARIANTS(V210ToBgrx8_709);
const RowKernelSet kV210ToVuyx8 = VX_KERNEL_VARIANTS(V210ToVuyx8);
const RowKernelSet kV210_709ToVuyx8_601 = VX_KERNEL_VARIANTS(V210_709ToVuyx8_601);

}  // namespace vexel
#endif
