// V210: 6 pixels in four little-endian words of three 10-bit samples, in the order U Y V Y; studio codes.
#include <cstddef>
#include <cstdint>
#include <cstring>

#include "convert/PlainYuv.h"
#include "convert/StudioScale.h"
#include "convert/V210Fixed.h"
#include "convert/V210Upsample512.h"
#include "convert/YuvKernels.h"

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

// How kVectors vectors of kBlocks 128-bit blocks take their samples, kLanes of kBytes bytes to a block, from the groups
// in order. A sample ends at the top of its lane.
template <size_t kVectors, size_t kBlocks, size_t kBytes>
struct UnpackTable {
  static constexpr size_t kLanes = 16 / kBytes;
  alignas(64) uint8_t bytes[kVectors][16 * kBlocks];
  alignas(64) uint16_t factors[kVectors][8 * kBlocks];
};
template <size_t kVectors, size_t kBlocks, size_t kBytes>
constexpr UnpackTable<kVectors, kBlocks, kBytes> MakeUnpackTable() {
  UnpackTable<kVectors, kBlocks, kBytes> table{};
  for (size_t i = 0; i < kVectors * kBlocks * table.kLanes; ++i) {
    const size_t vector = i / (kBlocks * table.kLanes), end = (i % (kBlocks * table.kLanes) + 1) * kBytes;
    for (size_t byte = end - kBytes; byte < end - 2; ++byte) table.bytes[vector][byte] = 0x80;
    table.bytes[vector][end - 2] = FirstByte(i % kGroupSamples);
    table.bytes[vector][end - 1] = static_cast<uint8_t>(FirstByte(i % kGroupSamples) + 1);
    table.factors[vector][end / 2 - 1] = ToTop(i % kGroupSamples);
  }
  return table;
}

}  // namespace
}  // namespace vexel
#endif

#if HWY_TARGET != HWY_SCALAR
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
  const size_t srcBlocks = srcBytes < kSrcOver ? 0 : (srcBytes - kSrcOver) / kSrcBlock;
  const size_t dstBlocks = dstBytes < kDstOver ? 0 : (dstBytes - kDstOver) / kDstBlock;
  const size_t blocks = srcBlocks < dstBlocks ? srcBlocks : dstBlocks;
  for (size_t i = 0; i < blocks; ++i) body(src + i * kSrcBlock, dst + i * kDstBlock);
  size_t s = blocks * kSrcBlock, d = blocks * kDstBlock;
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

// Between groups of 12 bytes and vectors with each group at the front of a block of 16. The widest target takes four
// vectors at once, so that no load or store straddles a cache line of its own making; the others reach over the groups.
#if HWY_TARGET == HWY_AVX3
constexpr size_t kByteVectors = 4, kByteOver = 0;
#else
constexpr size_t kByteVectors = 1, kByteOver = 4 * kVectorGroups;
#endif
constexpr size_t kByteGroups = kByteVectors * kVectorGroups;

HWY_INLINE void LoadGroups(const uint8_t* HWY_RESTRICT src, U8* HWY_RESTRICT v) {
#if HWY_TARGET == HWY_AVX3
  const __m512i a = LoadVector<uint8_t>(src, 0).raw, b = LoadVector<uint8_t>(src, 1).raw;
  const __m512i c = LoadVector<uint8_t>(src, 2).raw;
  const __m512i first = _mm512_setr_epi32(0, 1, 2, 3, 3, 4, 5, 6, 6, 7, 8, 9, 9, 10, 11, 12);
  const __m512i second = _mm512_add_epi32(first, _mm512_set1_epi32(12));
  const __m512i third = _mm512_add_epi32(first, _mm512_set1_epi32(8));
  const __m512i last = _mm512_add_epi32(first, _mm512_set1_epi32(4));
  v[0] = U8{_mm512_permutexvar_epi32(first, a)};
  v[1] = U8{_mm512_permutex2var_epi32(a, second, b)};
  v[2] = U8{_mm512_permutex2var_epi32(b, third, c)};
  v[3] = U8{_mm512_permutexvar_epi32(last, c)};
#elif HWY_TARGET == HWY_AVX2
  const __m256i order = _mm256_setr_epi32(0, 1, 2, 3, 3, 4, 5, 6);
  v[0] = U8{_mm256_permutevar8x32_epi32(LoadVector<uint8_t>(src).raw, order)};
#else
  v[0] = LoadVector<uint8_t>(src);
#endif
}

HWY_INLINE void StoreGroups(const U8* HWY_RESTRICT v, uint8_t* HWY_RESTRICT dst) {
#if HWY_TARGET == HWY_AVX3
  const __m512i first = _mm512_setr_epi32(0, 1, 2, 4, 5, 6, 8, 9, 10, 12, 13, 14, 16, 17, 18, 20);
  const __m512i second = _mm512_setr_epi32(5, 6, 8, 9, 10, 12, 13, 14, 16, 17, 18, 20, 21, 22, 24, 25);
  const __m512i third = _mm512_setr_epi32(10, 12, 13, 14, 16, 17, 18, 20, 21, 22, 24, 25, 26, 28, 29, 30);
  StoreVector(U8{_mm512_permutex2var_epi32(v[0].raw, first, v[1].raw)}, dst, 0);
  StoreVector(U8{_mm512_permutex2var_epi32(v[1].raw, second, v[2].raw)}, dst, 1);
  StoreVector(U8{_mm512_permutex2var_epi32(v[2].raw, third, v[3].raw)}, dst, 2);
#elif HWY_TARGET == HWY_AVX2
  const __m256i order = _mm256_setr_epi32(0, 1, 2, 4, 5, 6, 3, 7);
  StoreVector(U8{_mm256_permutevar8x32_epi32(v[0].raw, order)}, dst);
#else
  StoreVector(v[0], dst);
#endif
}

template <class T>
HWY_INLINE Full<T> Repeat(const T* lanes) {
  return hn::LoadDup128(hn::ScalableTag<T>(), lanes);
}

struct PackBytes {
  static HWY_INLINE U32 Pack(U8 groups) {
    static constexpr uint8_t Z = 0x80;
    alignas(16) static constexpr uint8_t kOuter[16] = {0, Z, 2, Z, 3, Z, 5, Z, 6, Z, 8, Z, 9, Z, 11, Z};
    alignas(16) static constexpr uint8_t kMiddle[16] = {Z, 1, Z, Z, Z, 4, Z, Z, Z, 7, Z, Z, Z, 10, Z, Z};
    alignas(16) static constexpr uint16_t kShift[8] = {4, 64, 4, 64, 4, 64, 4, 64};
    const hn::ScalableTag<uint16_t> d16;
    const hn::ScalableTag<uint32_t> d32;
    const auto outer = hn::BitCast(d16, hn::TableLookupBytesOr0(groups, Repeat(kOuter)));
    const auto middle = hn::BitCast(d32, hn::TableLookupBytesOr0(groups, Repeat(kMiddle)));
    return hn::Or(hn::BitCast(d32, hn::Mul(outer, Repeat(kShift))), hn::ShiftLeft<4>(middle));
  }
  HWY_INLINE void operator()(const uint8_t* HWY_RESTRICT in, uint8_t* HWY_RESTRICT out) const {
    U8 groups[kByteVectors];
    LoadGroups(in, groups);
    StoreVector(Pack(groups[0]), out, 0);
    if constexpr (kByteVectors == 4) {  // by hand: as a loop the vectors would go through memory
      StoreVector(Pack(groups[1]), out, 1);
      StoreVector(Pack(groups[2]), out, 2);
      StoreVector(Pack(groups[3]), out, 3);
    }
  }
};

void Uyvy8ToV210(const uint8_t* src, uint8_t* dst, size_t count) {
  GroupLoop<kByteGroups, 12, 16, kByteOver, 0, kBlackUyvy8>(src, 4 * PairsOf(count), dst, 16 * GroupsOf(count),
                                                            PackBytes());
}

struct UnpackBytes {
  static HWY_INLINE U8 Unpack(U32 words) {
    alignas(16) static constexpr uint8_t kOrder[16] = {0, 8, 1, 2, 10, 3, 4, 12, 5, 6, 14, 7, 9, 11, 13, 15};
    // A rounded product with 2^13 is a rounded shift by 2; the third sample stands 4 bits higher.
    alignas(16) static constexpr int16_t kShift[8] = {1 << 13, 1 << 9, 1 << 13, 1 << 9,
                                                      1 << 13, 1 << 9, 1 << 13, 1 << 9};
    const hn::ScalableTag<int16_t> d16;
    const hn::ScalableTag<uint32_t> d32;
    const auto outer = hn::BitCast(d16, hn::And(words, hn::Set(d32, 0x3FF003FF)));
    const auto middle = hn::BitCast(d16, hn::And(hn::ShiftRight<10>(words), hn::Set(d32, 0x3FF)));
    const auto shift = Repeat(kShift);
    const auto bytes = PackBlocks(hn::MulFixedPoint15(outer, shift), hn::MulFixedPoint15(middle, shift));
    return hn::TableLookupBytes(bytes, Repeat(kOrder));
  }
  HWY_INLINE void operator()(const uint8_t* HWY_RESTRICT in, uint8_t* HWY_RESTRICT out) const {
    U8 groups[kByteVectors];
    groups[0] = Unpack(LoadVector<uint32_t>(in, 0));
    if constexpr (kByteVectors == 4) {
      groups[1] = Unpack(LoadVector<uint32_t>(in, 1));
      groups[2] = Unpack(LoadVector<uint32_t>(in, 2));
      groups[3] = Unpack(LoadVector<uint32_t>(in, 3));
    }
    StoreGroups(groups, out);
  }
};

void V210ToUyvy8(const uint8_t* src, uint8_t* dst, size_t count) {
  GroupLoop<kByteGroups, 16, 12, 0, kByteOver, 0>(src, 16 * GroupsOf(count), dst, 4 * PairsOf(count), UnpackBytes());
}

#if HWY_TARGET == HWY_AVX3
// Four groups at once.
constexpr size_t kPackGroups = 4;

struct PackFloats {
  // Of the words of three vectors of samples, packed to two block by block: the lower two of each word of V210, and the
  // third in an upper half.
  struct Order {
    constexpr Order() : two{}, third{} {
      for (size_t i = 0; i < 48; ++i) {
        const size_t at = i / 16 * 4 + i / 32 * 24 + i % 16 / 4 * 8 + i % 4, word = i / 3 * 2;
        if (i % 3 == 2)
          third[word + 1] = static_cast<uint16_t>(at);
        else
          two[word + i % 3] = static_cast<uint16_t>(at);
      }
    }
    alignas(64) uint16_t two[32], third[32];
  };
  static HWY_INLINE I32 Codes(const uint8_t* HWY_RESTRICT in, size_t index) {
    return ScaleToCodes<kUyvy10Scale>(LoadVector<float>(in, index));
  }
  static HWY_INLINE __m512i Saturate(I32 a, I32 b) {
    return hn::Min(PackBlocks(a, b), hn::Set(hn::ScalableTag<uint16_t>(), 1023)).raw;
  }
  HWY_INLINE void operator()(const uint8_t* HWY_RESTRICT in, uint8_t* HWY_RESTRICT out) const {
    static constexpr Order kOrder;
    const I32 c = Codes(in, 2);
    const __m512i first = Saturate(Codes(in, 0), Codes(in, 1)), last = Saturate(c, c);
    const __m512i two = _mm512_permutex2var_epi16(first, _mm512_load_si512(kOrder.two), last);
    const __m512i third = _mm512_maskz_permutex2var_epi16(0xAAAAAAAA, first, _mm512_load_si512(kOrder.third), last);
    // A sum of products puts the second sample above the first.
    const __m512i lower = _mm512_madd_epi16(two, _mm512_set1_epi32(1 | 1024 << 16));
    StoreVector(U32{_mm512_or_si512(lower, _mm512_slli_epi32(third, 4))}, out);
  }
};
#else
// Two groups at a time, one per block.
using PackTag = hn::CappedTag<float, 8>;
constexpr size_t kPackGroups = hn::MaxLanes(PackTag()) / 4;

// The pair kPair of each group as 10-bit codes, not yet saturated.
template <size_t kPair>
HWY_INLINE auto LoadPairs(const uint8_t* HWY_RESTRICT groups) {
  const auto* floats = reinterpret_cast<const float*>(groups) + 4 * kPair;
#if HWY_TARGET == HWY_AVX2
  const hn::Full128<float> d;
  return ScaleToCodes<kUyvy10Scale>(hn::Combine(PackTag(), hn::LoadU(d, floats + kGroupSamples), hn::LoadU(d, floats)));
#else
  return ScaleToCodes<kUyvy10Scale>(hn::LoadU(PackTag(), floats));
#endif
}

struct PackFloats {
  static constexpr uint8_t Z = 0x80;
  using Table = uint8_t[2][16];
  // Of a group's first 8 samples and of its last 8: the lower two of each word, and the third in an upper half.
  alignas(16) static constexpr Table kTwo = {{0, 1, 2, 3, 6, 7, 8, 9, Z, Z, Z, Z, Z, Z, Z, Z},
                                             {Z, Z, Z, Z, Z, Z, Z, Z, 4, 5, 6, 7, 10, 11, 12, 13}};
  alignas(16) static constexpr Table kThird = {{Z, Z, 4, 5, Z, Z, 10, 11, Z, Z, Z, Z, Z, Z, Z, Z},
                                               {Z, Z, Z, Z, Z, Z, Z, Z, Z, Z, 8, 9, Z, Z, 14, 15}};

  template <class V>
  static HWY_INLINE V Saturate(V v) {
    const hn::DFromV<V> d;
    return hn::Min(hn::Max(v, hn::Zero(d)), hn::Set(d, 1023));
  }
  template <class V>
  static HWY_INLINE V Pick(V first, V last, const Table& table) {
    const hn::Repartition<uint8_t, hn::DFromV<V>> d8;
    const auto a = hn::TableLookupBytesOr0(hn::BitCast(d8, first), hn::LoadDup128(d8, table[0]));
    const auto b = hn::TableLookupBytesOr0(hn::BitCast(d8, last), hn::LoadDup128(d8, table[1]));
    return hn::BitCast(hn::DFromV<V>(), hn::Or(a, b));
  }

  HWY_INLINE void operator()(const uint8_t* HWY_RESTRICT in, uint8_t* HWY_RESTRICT out) const {
    const hn::Repartition<int16_t, PackTag> d16;
    const hn::Repartition<int32_t, PackTag> d32;
    const hn::Repartition<uint8_t, PackTag> d8;
    const auto middle = LoadPairs<1>(in);
    const auto first = Saturate(hn::ReorderDemote2To(d16, LoadPairs<0>(in), middle));
    const auto last = Saturate(hn::ReorderDemote2To(d16, middle, LoadPairs<2>(in)));
    const auto two = Pick(first, last, kTwo), third = Pick(first, last, kThird);
    // A sum of products puts the second sample above the first.
#if HWY_TARGET == HWY_AVX2
    const hn::VFromD<decltype(d32)> lower{_mm256_madd_epi16(two.raw, _mm256_set1_epi32(1 | 1024 << 16))};
#else
    const hn::VFromD<decltype(d32)> lower{_mm_madd_epi16(two.raw, _mm_set1_epi32(1 | 1024 << 16))};
#endif
    hn::StoreU(hn::BitCast(d8, hn::Or(lower, hn::ShiftLeft<4>(hn::BitCast(d32, third)))), d8, out);
  }
};
#endif

void Uyvy32fToV210(const uint8_t* src, uint8_t* dst, size_t count) {
  GroupLoop<kPackGroups, 48, 16, 0, 0, 0>(src, 16 * PairsOf(count), dst, 16 * GroupsOf(count), PackFloats());
}

// The groups that the blocks of vector kIndex of three come from.
template <size_t kIndex>
HWY_INLINE U8 RepeatGroups(U8 groups) {
#if HWY_TARGET == HWY_AVX3
  constexpr int kOrders[3] = {0x40, 0xA5, 0xFE}, kOrder = kOrders[kIndex];
  return U8{_mm512_shuffle_i64x2(groups.raw, groups.raw, kOrder)};
#elif HWY_TARGET == HWY_AVX2
  constexpr int kOrders[3] = {0x44, 0xE4, 0xEE}, kOrder = kOrders[kIndex];
  return U8{_mm256_permute4x64_epi64(groups.raw, kOrder)};
#else
  return groups;
#endif
}

struct UnpackFloats {
  static constexpr auto kTable = MakeUnpackTable<3, kVectorGroups, 4>();

  template <size_t kIndex>
  static HWY_INLINE void Unpack(U8 groups, uint8_t* HWY_RESTRICT out) {
    const hn::ScalableTag<uint8_t> d8;
    const hn::ScalableTag<uint16_t> d16;
    const hn::ScalableTag<uint32_t> d32;
    const auto bytes = hn::TableLookupBytesOr0(RepeatGroups<kIndex>(groups), hn::Load(d8, kTable.bytes[kIndex]));
    const auto atTop = hn::Mul(hn::BitCast(d16, bytes), hn::Load(d16, kTable.factors[kIndex]));
    const auto codes = hn::BitCast(hn::ScalableTag<int32_t>(), hn::ShiftRight<22>(hn::BitCast(d32, atTop)));
    StoreVector(CodesToFloat<kUyvy10Scale>(codes), out, kIndex);
  }
  HWY_INLINE void operator()(const uint8_t* HWY_RESTRICT in, uint8_t* HWY_RESTRICT out) const {
    const auto groups = LoadVector<uint8_t>(in);
    Unpack<0>(groups, out);
    Unpack<1>(groups, out);
    Unpack<2>(groups, out);
  }
};

void V210ToUyvy32f(const uint8_t* src, uint8_t* dst, size_t count) {
  GroupLoop<kVectorGroups, 16, 48, 0, 0, 0>(src, 16 * GroupsOf(count), dst, 16 * PairsOf(count), UnpackFloats());
}

// The samples of a group, times 64, and zeros for the rest of 16.
HWY_INLINE void UnpackGroup(const uint8_t* HWY_RESTRICT src, uint16_t* HWY_RESTRICT samples) {
  static constexpr auto kTable = MakeUnpackTable<1, 2, 2>();
  const hn::CappedTag<uint16_t, 16> d16;
  const hn::Repartition<uint8_t, decltype(d16)> d8;
  const auto group = hn::LoadDup128(d8, src);
  for (size_t i = 0; i < 16; i += hn::MaxLanes(d16)) {
    const auto bytes = hn::BitCast(d16, hn::TableLookupBytesOr0(group, hn::Load(d8, kTable.bytes[0] + 2 * i)));
    const auto atTop = hn::Mul(bytes, hn::Load(d16, kTable.factors[0] + i));
    hn::StoreU(hn::And(atTop, hn::Set(d16, 0xFFC0)), d16, samples + i);
  }
}

// Three channels of 16 bits, not yet saturated to bytes.
struct Channels16 {
  I16 c[3];
};

HWY_INLINE I16 Set16(int v) { return hn::Set(hn::ScalableTag<int16_t>(), static_cast<int16_t>(v)); }
HWY_INLINE I16 Times(I16 v, int16_t coefficient) { return hn::MulFixedPoint15(v, Set16(coefficient)); }

// The steps take codes times 64, with the top bit flipped: less 2^15, as signed. Sums that leave 16 bits saturate; they
// are beyond white or black anyway.
template <const BgrFixed& kM>
struct ToBgr8 {
  static HWY_INLINE Channels16 Apply(I16 luma, I16 u, I16 v) {
    const auto y = hn::Add(Times(luma, kM.y), Set16(kM.offset + 32));
    return {{hn::ShiftRight<6>(hn::SaturatedAdd(y, Times(u, kM.bU))),
             hn::ShiftRight<6>(hn::SaturatedAdd(y, hn::Add(Times(u, kM.gU), Times(v, kM.gV)))),
             hn::ShiftRight<6>(hn::SaturatedAdd(y, Times(v, kM.rV)))}};
  }
};

template <const RecodingFixed& kR>
struct RecodeToVuy8 {
  static HWY_INLINE Channels16 Apply(I16 luma, I16 u, I16 v) {
    const auto half = Set16(128 * 64 + 32);
    return {{hn::ShiftRight<6>(hn::Add(hn::Add(Times(u, kR.vU), Times(v, kR.vV)), half)),
             hn::ShiftRight<6>(hn::Add(hn::Add(Times(u, kR.uU), Times(v, kR.uV)), half)),
             hn::ShiftRight<6>(
                 hn::Add(hn::Add(Times(u, kR.yU), Times(v, kR.yV)), hn::Add(hn::ShiftRight<2>(luma), half)))}};
  }
};

constexpr size_t kStepPixels = kLanes<int16_t>;  // two vectors of sample pairs

// Even lanes of a and b, or odd ones, block by block.
template <int kOdd>
HWY_INLINE I16 TakeLanes(U16 a, U16 b) {
  const hn::ScalableTag<float> df;
  constexpr int kOrder = kOdd ? 0xDD : 0x88;
#if HWY_TARGET == HWY_AVX3
  const F32 taken{_mm512_shuffle_ps(hn::BitCast(df, a).raw, hn::BitCast(df, b).raw, kOrder)};
#elif HWY_TARGET == HWY_AVX2
  const F32 taken{_mm256_shuffle_ps(hn::BitCast(df, a).raw, hn::BitCast(df, b).raw, kOrder)};
#else
  const F32 taken{_mm_shuffle_ps(hn::BitCast(df, a).raw, hn::BitCast(df, b).raw, kOrder)};
#endif
  return hn::BitCast(hn::ScalableTag<int16_t>(), taken);
}

// [U, mean of U and the next U, V, mean of V and the next V] of each pair. Samples times 64 have an exact mean.
HWY_INLINE U16 PixelChroma(U16 own, U16 next) {
  const hn::ScalableTag<uint16_t> d16;
  const hn::ScalableTag<uint32_t> d32;
  return hn::OddEven(hn::BitCast(d16, hn::ShiftLeft<16>(hn::BitCast(d32, hn::AverageRound(own, next)))), own);
}

// The pixels of two vectors of pairs: in each block those of its block of the first, then of the second.
template <class Step>
HWY_INLINE Channels16 StepPixels(const uint8_t* HWY_RESTRICT pairs) {
  const hn::ScalableTag<int16_t> d16;
  const hn::ScalableTag<int32_t> d32;
  const auto a = LoadVector<uint16_t>(pairs, 0), b = LoadVector<uint16_t>(pairs, 1);
  const auto luma =
      hn::ReorderDemote2To(d16, hn::ShiftRight<16>(hn::BitCast(d32, a)), hn::ShiftRight<16>(hn::BitCast(d32, b)));
  const auto chromaA = PixelChroma(a, LoadVector<uint16_t>(pairs + 8, 0));
  const auto chromaB = PixelChroma(b, LoadVector<uint16_t>(pairs + 8, 1));
  const auto top = Set16(-32768);
  return Step::Apply(hn::Xor(luma, top), hn::Xor(TakeLanes<0>(chromaA, chromaB), top),
                     hn::Xor(TakeLanes<1>(chromaA, chromaB), top));
}

// The low bytes of two channels side by side.
HWY_INLINE U16 ZipBytes(I16 a, I16 b) {
  alignas(16) static constexpr uint8_t kZip[16] = {0, 8, 1, 9, 2, 10, 3, 11, 4, 12, 5, 13, 6, 14, 7, 15};
  return hn::BitCast(hn::ScalableTag<uint16_t>(), hn::TableLookupBytes(PackBlocks(a, b), Repeat(kZip)));
}

// Bytes of four channels, the fourth opaque: the first half of each block, then the second.
HWY_INLINE void StorePixels(const Channels16& pixels, uint8_t* HWY_RESTRICT dst) {
  const hn::ScalableTag<uint16_t> d16;
  const auto lower = ZipBytes(pixels.c[0], pixels.c[1]), upper = ZipBytes(pixels.c[2], Set16(255));
  StoreVector(hn::InterleaveLower(d16, lower, upper), dst, 0);
  StoreVector(hn::InterleaveUpper(d16, lower, upper), dst, 1);
}

// Steps make kStepPixels pixels of their samples, which continue with those of the next pair.
template <class Matrix>
struct MatrixStep {
  static HWY_INLINE void Store(const uint8_t* HWY_RESTRICT pairs, uint8_t* HWY_RESTRICT dst) {
    StorePixels(StepPixels<Matrix>(pairs), dst);
  }
};

// Rounded codes are the upper bytes of words: those of the samples and those of the chroma between pairs.
struct RoundStep {
  static HWY_INLINE U8 Pixels(U16 own, U16 next) {
    static constexpr uint8_t Z = 0x80;
    alignas(16) static constexpr uint8_t kOwn[16] = {5, 1, 3, Z, Z, Z, 7, Z, 13, 9, 11, Z, Z, Z, 15, Z};
    alignas(16) static constexpr uint8_t kBetween[16] = {Z, Z, Z, Z, 5, 1, Z, Z, Z, Z, Z, Z, 13, 9, Z, Z};
    const hn::ScalableTag<uint8_t> d8;
    const hn::ScalableTag<uint16_t> d16;
    const auto round = [&](U16 v) HWY_ATTR { return hn::BitCast(d8, hn::SaturatedAdd(v, hn::Set(d16, 128))); };
    const auto colors = hn::Or(hn::TableLookupBytesOr0(round(own), Repeat(kOwn)),
                               hn::TableLookupBytesOr0(round(hn::AverageRound(own, next)), Repeat(kBetween)));
    return WriteAlpha<AlphaWrite::OpaqueLast, uint8_t>(colors);
  }
  static HWY_INLINE void Store(const uint8_t* HWY_RESTRICT pairs, uint8_t* HWY_RESTRICT dst) {
    StoreVector(Pixels(LoadVector<uint16_t>(pairs, 0), LoadVector<uint16_t>(pairs + 8, 0)), dst, 0);
    StoreVector(Pixels(LoadVector<uint16_t>(pairs, 1), LoadVector<uint16_t>(pairs + 8, 1)), dst, 1);
  }
};

constexpr size_t kChunkGroups = 32, kChunkPixels = 6 * kChunkGroups;

// Runs of a row small enough to stay in the cache as 16-bit samples.
template <class Step>
HWY_INLINE void UpsampleRow(const uint8_t* HWY_RESTRICT src, uint8_t* HWY_RESTRICT dst, size_t count) {
  // A chunk, the pair after it, and what the last step reads beyond.
  alignas(64) uint16_t samples[(kChunkGroups + 1) * kGroupSamples + 2 * kStepPixels];
  const auto* bytes = reinterpret_cast<const uint8_t*>(samples);
  for (; count > 0; src += kChunkGroups * kGroupBytes) {
    const size_t pixels = count < kChunkPixels ? count : kChunkPixels;
    const size_t groups = GroupsOf(count) <= kChunkGroups ? GroupsOf(count) : kChunkGroups + 1;
    uint16_t* end = samples;
    for (const uint8_t* group = src; group != src + groups * kGroupBytes; group += kGroupBytes, end += kGroupSamples)
      UnpackGroup(group, end);
    if (count <= kChunkPixels) {  // the row ends: its last chroma repeats
      const size_t last = 4 * (PairsOf(count) - 1);
      samples[last + 4] = samples[last];
      samples[last + 6] = samples[last + 2];
      std::memset(end + 4, 0, 4 * kStepPixels);
    }
    size_t x = 0;
    for (; x + kStepPixels <= pixels; x += kStepPixels, dst += 4 * kStepPixels) Step::Store(bytes + 4 * x, dst);
    if (x < pixels) {
      alignas(64) uint8_t out[4 * kStepPixels];
      Step::Store(bytes + 4 * x, out);
      std::memcpy(dst, out, 4 * (pixels - x));
    }
    count -= pixels;
  }
}

template <const BgrFixed& kM>
HWY_INLINE void ToBgrx8(const uint8_t* src, uint8_t* dst, size_t count) {
  if (HWY_TARGET == HWY_AVX3 && HasVbmi()) return V210ToBgrx512(src, dst, count, kM);
  UpsampleRow<MatrixStep<ToBgr8<kM>>>(src, dst, count);
}
void V210ToBgrx8_601(const uint8_t* src, uint8_t* dst, size_t count) { ToBgrx8<kBgrFixed601>(src, dst, count); }
void V210ToBgrx8_709(const uint8_t* src, uint8_t* dst, size_t count) { ToBgrx8<kBgrFixed709>(src, dst, count); }
void V210ToVuyx8(const uint8_t* src, uint8_t* dst, size_t count) {
  if (HWY_TARGET == HWY_AVX3 && HasVbmi()) return V210ToVuyx512(src, dst, count);
  UpsampleRow<RoundStep>(src, dst, count);
}
void V210_709ToVuyx8_601(const uint8_t* src, uint8_t* dst, size_t count) {
  if (HWY_TARGET == HWY_AVX3 && HasVbmi()) return RecodeV210ToVuyx512(src, dst, count, kRecodingFixed709To601);
  UpsampleRow<MatrixStep<RecodeToVuy8<kRecodingFixed709To601>>>(src, dst, count);
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

// Divides by a power of two, rounds to nearest and saturates to a byte.
uint8_t RoundCode(int v, int shift) { return static_cast<uint8_t>(Clamp((v + (1 << (shift - 1))) >> shift, 0, 255)); }

// Calls pixel(luma, u, v, out) for each pixel of a row. All are 10-bit codes times 64: the mean chroma of an odd pixel
// is exact.
template <class Pixel>
void UpsampleRow(const uint8_t* src, uint8_t* dst, size_t count, const Pixel& pixel) {
  for (size_t x = 0; x < count; ++x, dst += 4) {
    const size_t pair = x / 2, next = x % 2 != 0 && pair + 1 < PairsOf(count) ? pair + 1 : pair;
    const auto mean = [&](size_t c) { return (LoadSample(src, 4 * pair + c) + LoadSample(src, 4 * next + c)) * 32; };
    pixel(LoadSample(src, 4 * pair + 1 + 2 * (x % 2)) * 64, mean(0), mean(2), dst);
    dst[3] = 255;
  }
}

void ToBgrx8(const BgrFixed& m, const uint8_t* src, uint8_t* dst, size_t count) {
  UpsampleRow(src, dst, count, [&m](int luma, int u, int v, uint8_t* out) {
    const int y = Times(luma - 512 * 64, m.y) + m.offset;
    u -= 512 * 64, v -= 512 * 64;
    out[0] = RoundCode(y + Times(u, m.bU), 6);
    out[1] = RoundCode(y + Times(u, m.gU) + Times(v, m.gV), 6);
    out[2] = RoundCode(y + Times(v, m.rV), 6);
  });
}
void V210ToBgrx8_601(const uint8_t* src, uint8_t* dst, size_t count) { ToBgrx8(kBgrFixed601, src, dst, count); }
void V210ToBgrx8_709(const uint8_t* src, uint8_t* dst, size_t count) { ToBgrx8(kBgrFixed709, src, dst, count); }

void V210ToVuyx8(const uint8_t* src, uint8_t* dst, size_t count) {
  UpsampleRow(src, dst, count, [](int luma, int u, int v, uint8_t* out) {
    out[0] = RoundCode(v, 8);
    out[1] = RoundCode(u, 8);
    out[2] = RoundCode(luma, 8);
  });
}

void V210_709ToVuyx8_601(const uint8_t* src, uint8_t* dst, size_t count) {
  static constexpr RecodingFixed r = kRecodingFixed709To601;
  UpsampleRow(src, dst, count, [](int luma, int u, int v, uint8_t* out) {
    u -= 512 * 64, v -= 512 * 64;
    out[0] = RoundCode(Times(u, r.vU) + Times(v, r.vV) + 128 * 64, 6);
    out[1] = RoundCode(Times(u, r.uU) + Times(v, r.uV) + 128 * 64, 6);
    out[2] = RoundCode(Times(u, r.yU) + Times(v, r.yV) + luma / 4, 6);
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
