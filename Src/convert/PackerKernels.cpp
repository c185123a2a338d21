#include "convert/PackerKernels.h"

#include <algorithm>
#include <cmath>
#include <cstring>
#include <limits>

#include "frame/Power.h"

#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "convert/PackerKernels.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

#include "frame/KernelTable.h"
#include "frame/PixelBlock-inl.h"
#include "frame/RowLoop-inl.h"
#include "frame/StreamStore-inl.h"

#ifndef VEXEL_CONVERT_PACKERKERNELS_ONCE
#define VEXEL_CONVERT_PACKERKERNELS_ONCE
namespace vexel {
namespace {

constexpr size_t kGroupSamples = 12;
constexpr uint16_t kTopTen = 0xFFC0;  // the bits of a 10-bit value at the top of a 16-bit sample

// S-Gamut3 to S-Gamut3.Cine, Sony's matrix between the two camera gamuts.
constexpr double kSGamut3ToCine[3][3] = {{1.1642234944, -0.1768455024, 0.012622008},
                                         {0.0260509511, 0.9341657009, 0.039783348},
                                         {0.0246996363, 0.0215592309, 0.9537411328}};

// SMPTE ST 428-1: X'Y'Z' codes are (48 / 52.37 * XYZ)^(1 / 2.6). XYZ to BT.709 primaries with D65 white.
constexpr float kDcdmGamma = 2.6f;
constexpr float kDisplayGamma = 1 / 2.4f;
constexpr double kDcdmPeak = 52.37 / 48;
constexpr float Weight(double v) { return static_cast<float>(v * kDcdmPeak); }
constexpr float kXyzToRgb[3][3] = {
    {Weight(3.2409699419045226), Weight(-1.5373831775700939), Weight(-0.4986107602930034)},
    {Weight(-0.9692436362808796), Weight(1.8759675015077202), Weight(0.0415550574071756)},
    {Weight(0.0556300796969936), Weight(-0.2039769588889765), Weight(1.0569715142428786)}};

// V210 samples of two groups in three pieces of 8, each out of 16 bytes of the groups; twice over, for four groups.
constexpr size_t kPieces = 6, kPieceSamples = 8;
constexpr size_t PieceStart(size_t piece) { return piece / 3 * 32 + piece % 3 * 8; }

// The two bytes that hold a sample, and the factor that moves it to the top of their 16 bits.
struct UnpackTable {
  alignas(32) uint8_t bytes[kPieces][16] = {};
  alignas(32) uint16_t factors[kPieces][kPieceSamples] = {};
  constexpr UnpackTable() {
    for (size_t i = 0; i < kPieces * kPieceSamples; ++i) {
      const size_t piece = i / kPieceSamples, lane = i % kPieceSamples;
      const auto first = static_cast<uint8_t>(i / 3 * 4 + i % 3 - PieceStart(piece));
      bytes[piece][lane * 2] = first;
      bytes[piece][lane * 2 + 1] = static_cast<uint8_t>(first + 1);
      factors[piece][lane] = static_cast<uint16_t>(64 >> 2 * (i % 3));
    }
  }
};
constexpr UnpackTable kUnpack;

}  // namespace
}  // namespace vexel
#endif

#if HWY_TARGET != HWY_SCALAR
HWY_BEFORE_NAMESPACE();
namespace vexel {
namespace HWY_NAMESPACE {
namespace hn = hwy::HWY_NAMESPACE;
namespace {

// Repacking is bound by memory from 16 bytes at a time on; arithmetic uses whole vectors.
using D8 = hn::Full128<uint8_t>;
using D16 = hn::Full128<uint16_t>;
using D32 = hn::Full128<uint32_t>;
using D64 = hn::Full128<uint64_t>;
using V8 = hn::VFromD<D8>;
using V64 = hn::VFromD<D64>;

constexpr uint8_t Z = 0x80;

HWY_INLINE V8 Shuffle(V8 v, const uint8_t* table) { return hn::TableLookupBytes(v, hn::Load(D8(), table)); }
HWY_INLINE V64 Mask(V64 v, uint64_t mask) { return hn::And(v, hn::Set(D64(), mask)); }

// As RowLoop, for rows that are their own destination.
template <size_t kBlock, size_t kBytes, class Body>
HWY_INLINE void InPlaceLoop(uint8_t* row, size_t units, const Body& body) {
  size_t i = 0;
  for (; i + kBlock <= units; i += kBlock) body(row + i * kBytes);
  if (const size_t rest = (units - i) * kBytes) {
    alignas(64) uint8_t block[kBlock * kBytes] = {};
    std::memcpy(block, row + i * kBytes, rest);
    body(block);
    std::memcpy(row + i * kBytes, block, rest);
  }
}

// V210 groups, one to a 128-bit block, two blocks where vectors have as many.
using DG8 = hn::CappedTag<uint8_t, 32>;
using DG16 = hn::Repartition<uint16_t, DG8>;
using VG8 = hn::VFromD<DG8>;
constexpr size_t kGroups = HWY_MAX_BYTES >= 32 ? 2 : 1;

HWY_INLINE VG8 LoadBlocks(const uint8_t* HWY_RESTRICT first, [[maybe_unused]] const uint8_t* HWY_RESTRICT second) {
#if HWY_MAX_BYTES >= 32
  return hn::Combine(DG8(), hn::LoadU(D8(), second), hn::LoadU(D8(), first));
#else
  return hn::LoadU(DG8(), first);
#endif
}

// In each block two words of `lower`, then two of `upper`.
template <int kControl, class V>
HWY_INLINE V PickWords(V lower, V upper) {
#if HWY_TARGET == HWY_AVX3
  if constexpr (sizeof(V) == 64)
    return V{_mm512_castps_si512(
        _mm512_shuffle_ps(_mm512_castsi512_ps(lower.raw), _mm512_castsi512_ps(upper.raw), kControl))};
#endif
#if HWY_TARGET == HWY_AVX3 || HWY_TARGET == HWY_AVX2
  if constexpr (sizeof(V) == 32)
    return V{_mm256_castps_si256(
        _mm256_shuffle_ps(_mm256_castsi256_ps(lower.raw), _mm256_castsi256_ps(upper.raw), kControl))};
#endif
  if constexpr (sizeof(V) == 16)
    return V{_mm_castps_si128(_mm_shuffle_ps(_mm_castsi128_ps(lower.raw), _mm_castsi128_ps(upper.raw), kControl))};
}

// Sums of the products of neighbours.
template <class V>
HWY_INLINE V MultiplyPairs(V a, V b) {
#if HWY_TARGET == HWY_AVX3
  if constexpr (sizeof(V) == 64) return V{_mm512_madd_epi16(a.raw, b.raw)};
#endif
#if HWY_TARGET == HWY_AVX3 || HWY_TARGET == HWY_AVX2
  if constexpr (sizeof(V) == 32) return V{_mm256_madd_epi16(a.raw, b.raw)};
#endif
  if constexpr (sizeof(V) == 16) return V{_mm_madd_epi16(a.raw, b.raw)};
}

// Of two words each, out of samples 0 to 7 and 4 to 11: the first and third samples side by side, then the second ones
// a byte up in 32 bits.
template <bool kStream>
HWY_INLINE void PackV210(const uint8_t* src, uint8_t* dst, size_t count) {
  alignas(16) static constexpr uint8_t kLower[16] = {0, 1, 4, 5, 6, 7, 10, 11, Z, 2, 3, Z, Z, 8, 9, Z};
  alignas(16) static constexpr uint8_t kUpper[16] = {4, 5, 8, 9, 10, 11, 14, 15, Z, 6, 7, Z, Z, 12, 13, Z};
  const DG8 d8;
  const DG16 d16;
  const hn::Repartition<uint32_t, DG8> d32;
  const hn::Repartition<uint64_t, DG8> d64;
  const auto fromLower = hn::LoadDup128(d8, kLower), fromUpper = hn::LoadDup128(d8, kUpper);
  const auto thirdUp = hn::BitCast(d16, hn::Set(d32, 0x100001));
  RowLoop<4, kUyvy16GroupBytes, kV210GroupBytes>(
      src, dst, count, [&](const uint8_t* HWY_RESTRICT in, uint8_t* HWY_RESTRICT out) HWY_ATTR {
        HWY_UNROLL(4)
        for (size_t i = 0; i < 4; i += kGroups, in += kGroups * kUyvy16GroupBytes, out += kGroups * kV210GroupBytes) {
          const auto lower = hn::TableLookupBytes(LoadBlocks(in, in + kUyvy16GroupBytes), fromLower);
          const auto upper = hn::TableLookupBytes(LoadBlocks(in + 8, in + kUyvy16GroupBytes + 8), fromUpper);
          const auto l = hn::BitCast(d64, lower), u = hn::BitCast(d64, upper);
          const auto outer = hn::BitCast(d16, hn::InterleaveLower(d64, l, u));
          const auto second = hn::BitCast(d32, hn::InterleaveUpper(d64, l, u));
          StoreBytes<kStream>(hn::Or(hn::ShiftLeft<2>(second), hn::BitCast(d32, hn::Mul(outer, thirdUp))), out);
        }
      });
}

#if HWY_TARGET == HWY_AVX3
// Four groups at once: the first two samples of each word side by side, the third in a vector of its own.
template <bool kStream>
HWY_INLINE void UnpackV210(const uint8_t* src, uint8_t* dst, size_t count) {
  struct Indices {
    alignas(64) uint16_t from[64] = {};
    constexpr Indices() {
      for (size_t i = 0; i < 4 * kGroupSamples; ++i)
        from[i] = static_cast<uint16_t>(i / 3 * 2 + (i % 3 == 2 ? 32 : i % 3));
    }
  };
  static constexpr Indices kIndices;
  const hn::Full512<uint32_t> d;
  const auto lowerFrom = _mm512_load_si512(kIndices.from), upperFrom = _mm512_load_si512(kIndices.from + 32);
  RowLoop<4, kV210GroupBytes, kUyvy16GroupBytes>(
      src, dst, count, [&](const uint8_t* HWY_RESTRICT in, uint8_t* HWY_RESTRICT out) HWY_ATTR {
        const auto words = hn::LoadU(d, reinterpret_cast<const uint32_t*>(in));
        const auto part = [&](auto moved, uint32_t mask) HWY_ATTR { return hn::And(moved, hn::Set(d, mask)); };
        const auto two = hn::Or(part(words, 0x3FF), part(hn::ShiftLeft<6>(words), 0x3FF0000)).raw;
        const auto third = part(hn::ShiftRight<20>(words), 0x3FF).raw;
        const hn::Vec512<uint16_t> lower{_mm512_permutex2var_epi16(two, lowerFrom, third)};
        const hn::Vec512<uint16_t> upper{_mm512_permutex2var_epi16(two, upperFrom, third)};
        const hn::Full256<uint16_t> dHalf;
        if constexpr (kStream) {  // every other block starts in the middle of a line
          StoreBytes<true>(hn::LowerHalf(dHalf, lower), out);
          StoreBytes<true>(hn::UpperHalf(dHalf, lower), out + 32);
        } else {
          StoreBytes<false>(lower, out);
        }
        StoreBytes<kStream>(hn::LowerHalf(dHalf, upper), out + 64);
      });
}
#else
template <bool kStream>
HWY_INLINE void UnpackV210(const uint8_t* src, uint8_t* dst, size_t count) {
  RowLoop<4, kV210GroupBytes, kUyvy16GroupBytes>(
      src, dst, count, [](const uint8_t* HWY_RESTRICT in, uint8_t* HWY_RESTRICT out) HWY_ATTR {
        const DG8 d8;
        const DG16 d;
        HWY_UNROLL(6)
        for (size_t p = 0; p < kPieces; p += kGroups) {
          const auto bytes = LoadBlocks(in + PieceStart(p), in + PieceStart(p + 1));
          const auto v = hn::BitCast(d, hn::TableLookupBytes(bytes, hn::Load(d8, kUnpack.bytes[p])));
          StoreBytes<kStream>(hn::ShiftRight<6>(hn::Mul(v, hn::Load(d, kUnpack.factors[p]))), out + 16 * p);
        }
      });
}
#endif

// The fourth sample is neither read nor written: it may be somebody else's.
#if HWY_TARGET == HWY_AVX3
void Rgb10ToDnxhd16(const uint8_t* src, uint8_t* dst, size_t count) {
  const hn::ScalableTag<uint64_t> d;
  const hn::ScalableTag<uint16_t> d16;
  const hn::Rebind<uint32_t, decltype(d)> dWords;
  const size_t lanes = hn::Lanes(d);
  const auto pixels = [&](const uint32_t* words) HWY_ATTR {
    const auto w = hn::PromoteTo(d, hn::LoadU(dWords, words));
    const auto first = hn::And(hn::ShiftLeft<4>(w), hn::Set(d, kTopTen));
    const auto second = hn::And(hn::ShiftLeft<10>(w), hn::Set(d, uint64_t{kTopTen} << 16));
    const auto third = hn::And(hn::ShiftLeft<16>(w), hn::Set(d, uint64_t{kTopTen} << 32));
    return hn::BitCast(d16, hn::Or(hn::Or(first, second), third));
  };
  const auto samples = [&](size_t n) HWY_ATTR {
    const auto colour = hn::MaskFromVec(hn::BitCast(d16, hn::Set(d, 0x0000FFFFFFFFFFFF)));
    return hn::And(colour, hn::FirstN(d16, 4 * n));
  };
  const auto full = samples(lanes);
  size_t i = 0;
  for (; i + lanes <= count; i += lanes) {
    FetchAhead<HWY_MAX_BYTES>(dst + 8 * i);
    hn::BlendedStore(pixels(reinterpret_cast<const uint32_t*>(src) + i), full, d16,
                     reinterpret_cast<uint16_t*>(dst) + 4 * i);
  }
  if (i == count) return;
  alignas(64) uint32_t words[HWY_MAX_BYTES / 8] = {};
  std::memcpy(words, src + 4 * i, 4 * (count - i));
  hn::BlendedStore(pixels(words), samples(count - i), d16, reinterpret_cast<uint16_t*>(dst) + 4 * i);
}
#else
// Without masked stores of 16-bit lanes, the fourth sample is stepped over with stores of 4 and 2 bytes.
void Rgb10ToDnxhd16(const uint8_t* src, uint8_t* dst, size_t count) {
  const D32 d;
  constexpr size_t kBlock = 8, kLanes = 4;
  const auto store = [&](const uint8_t* from, uint8_t* to) HWY_ATTR {
    const auto w = hn::LoadU(d, reinterpret_cast<const uint32_t*>(from));
    const auto two = hn::Or(hn::And(hn::ShiftLeft<4>(w), hn::Set(d, kTopTen)),
                            hn::And(hn::ShiftLeft<10>(w), hn::Set(d, uint32_t{kTopTen} << 16)));
    const auto third = hn::BitCast(D16(), hn::And(hn::ShiftRight<16>(w), hn::Set(d, kTopTen)));
    HWY_UNROLL(4)
    for (size_t i = 0; i < kLanes; ++i) {
      const uint32_t pair = hn::ExtractLane(two, i);
      const uint16_t last = hn::ExtractLane(third, 2 * i);
      std::memcpy(to + 8 * i, &pair, 4);
      std::memcpy(to + 8 * i + 4, &last, 2);
    }
  };
  size_t i = 0;
  for (; i + kBlock <= count; i += kBlock) {
    FetchAhead<kBlock * 8>(dst + 8 * i);
    store(src + 4 * i, dst + 8 * i);
    store(src + 4 * (i + kLanes), dst + 8 * (i + kLanes));
  }
  for (; i < count; ++i) {
    alignas(16) uint8_t word[16] = {}, pixels[32];
    std::memcpy(word, src + 4 * i, 4);
    store(word, pixels);
    std::memcpy(dst + 8 * i, pixels, 6);
  }
}
#endif

// Words of the top ten bits of the first three samples of each pixel.
template <bool kStream, class V>
HWY_INLINE void StoreWords(V lower, V upper, uint8_t* HWY_RESTRICT to) {
  const hn::Repartition<uint16_t, hn::DFromV<V>> d16;
  const hn::Repartition<uint32_t, hn::DFromV<V>> d;
  const auto l = hn::BitCast(d, lower), u = hn::BitCast(d, upper);
  const auto two = hn::BitCast(d, hn::ShiftRight<6>(hn::BitCast(d16, hn::ConcatEven(d, u, l))));
  const auto third = hn::And(hn::ShiftLeft<16>(hn::ConcatOdd(d, u, l)), hn::Set(d, uint32_t{kTopTen} << 16));
  StoreBytes<kStream>(hn::Or(MultiplyPairs(two, hn::Set(d, 4096 << 16 | 4)), third), to);
}

template <bool kStream>
HWY_INLINE void PackDnxhd16(const uint8_t* src, uint8_t* dst, size_t count) {
  const hn::ScalableTag<uint64_t> d;
  constexpr size_t kBlock = HWY_MAX_BYTES < 32 ? 8 : HWY_MAX_BYTES / 4;
  RowLoop<kBlock, 8, 4>(src, dst, count, [&](const uint8_t* HWY_RESTRICT in, uint8_t* HWY_RESTRICT out) HWY_ATTR {
    const auto pixels = [&](size_t at) HWY_ATTR { return hn::LoadU(d, reinterpret_cast<const uint64_t*>(in + at)); };
    HWY_UNROLL(2)
    for (size_t at = 0; at < 8 * kBlock; at += 2 * HWY_MAX_BYTES)
      StoreWords<kStream>(pixels(at), pixels(at + HWY_MAX_BYTES), out + at / 2);
  });
}

// Calls each(i, v) with the 48 bytes at `in` as four vectors of 12 bytes each, which `table` moves; nothing beyond the
// 48 bytes is read.
template <class Each>
HWY_INLINE void SpreadTwelves(const uint8_t* HWY_RESTRICT in, const uint8_t* table, const Each& each) {
  const auto v2 = hn::LoadU(D8(), in + 24), v3 = hn::ShiftRightBytes<4>(D8(), hn::LoadU(D8(), in + 32));
  each(0, Shuffle(hn::LoadU(D8(), in), table));
  each(1, Shuffle(hn::LoadU(D8(), in + 12), table));
  each(2, Shuffle(v2, table));
  each(3, Shuffle(v3, table));
}

template <bool kStream>
HWY_INLINE void PackBgr16(const uint8_t* src, uint8_t* dst, size_t count) {
  alignas(16) static constexpr uint8_t kToRgb[16] = {4, 5, 2, 3, 0, 1, Z, Z, 10, 11, 8, 9, 6, 7, Z, Z};
  RowLoop<8, 6, 4>(src, dst, count, [](const uint8_t* HWY_RESTRICT in, uint8_t* HWY_RESTRICT out) HWY_ATTR {
    V64 pixels[4];
    SpreadTwelves(in, kToRgb, [&](int i, V8 v) HWY_ATTR { pixels[i] = hn::BitCast(D64(), v); });
    StoreWords<kStream>(pixels[0], pixels[1], out);
    StoreWords<kStream>(pixels[2], pixels[3], out + 16);
  });
}

template <bool kStream>
HWY_INLINE void UnpackBgr16(const uint8_t* src, uint8_t* dst, size_t count) {
  alignas(16) static constexpr uint8_t kClose[16] = {0, 1, 2, 3, 4, 5, 8, 9, 10, 11, 12, 13, Z, Z, Z, Z};
  RowLoop<8, 4, 6>(src, dst, count, [](const uint8_t* HWY_RESTRICT in, uint8_t* HWY_RESTRICT out) HWY_ATTR {
    const D8 d8;
    const auto twelve = [&](size_t at) HWY_ATTR {
      const auto w = hn::PromoteTo(D64(), hn::LoadU(hn::Half<D32>(), reinterpret_cast<const uint32_t*>(in + at)));
      const auto v = hn::Or(hn::Or(hn::ShiftRight<22>(w), Mask(hn::ShiftLeft<4>(w), 0x03FF0000)),
                            Mask(hn::ShiftLeft<30>(w), uint64_t{0x3FF} << 32));
      return Shuffle(hn::BitCast(d8, v), kClose);
    };
    const auto a = twelve(0), b = twelve(8), c = twelve(16), e = twelve(24);
    const auto store = [&](V8 v, size_t at) HWY_ATTR { StoreBytes<kStream>(v, out + at); };
    store(hn::Or(a, hn::ShiftLeftBytes<12>(d8, b)), 0);
    store(hn::Or(hn::ShiftRightBytes<4>(d8, b), hn::ShiftLeftBytes<8>(d8, c)), 16);
    store(hn::Or(hn::ShiftRightBytes<8>(d8, c), hn::ShiftLeftBytes<4>(d8, e)), 32);
  });
}

template <bool kStream>
HWY_INLINE void AddAlpha8(const uint8_t* src, uint8_t* dst, size_t count) {
  alignas(16) static constexpr uint8_t kToBgr[16] = {2, 1, 0, Z, 5, 4, 3, Z, 8, 7, 6, Z, 11, 10, 9, Z};
  RowLoop<16, 3, 4>(src, dst, count, [](const uint8_t* HWY_RESTRICT in, uint8_t* HWY_RESTRICT out) HWY_ATTR {
    const auto alpha = hn::BitCast(D8(), hn::Set(D32(), 0xFF000000));
    SpreadTwelves(in, kToBgr, [&](int i, V8 v) HWY_ATTR { StoreBytes<kStream>(hn::Or(v, alpha), out + 16 * i); });
  });
}

template <bool kStream>
HWY_INLINE void AddX15(const uint8_t* src, uint8_t* dst, size_t count) {
  alignas(16) static constexpr uint8_t kAfterX[16] = {Z, Z, 0, 1, 2, 3, 4, 5, Z, Z, 6, 7, 8, 9, 10, 11};
  RowLoop<8, 6, 8>(src, dst, count, [](const uint8_t* HWY_RESTRICT in, uint8_t* HWY_RESTRICT out) HWY_ATTR {
    const D16 d;
    const auto x = hn::BitCast(d, hn::Set(D64(), 32768));
    SpreadTwelves(in, kAfterX, [&](int i, V8 v) HWY_ATTR {
      const auto half = hn::AverageRound(hn::BitCast(d, v), hn::Zero(d));
      StoreBytes<kStream>(hn::Or(half, x), out + 16 * i);
    });
  });
}

#define VX_PACKER(name, Body)                                                                 \
  void name(const uint8_t* src, uint8_t* dst, size_t count) { Body<false>(src, dst, count); } \
  void Stream##name(const uint8_t* src, uint8_t* dst, size_t count) { Body<true>(src, dst, count); }
VX_PACKER(Uyvy10ToV210, PackV210)
VX_PACKER(V210ToUyvy10, UnpackV210)
VX_PACKER(Dnxhd16ToRgb10, PackDnxhd16)
VX_PACKER(Bgr16ToRgb10, PackBgr16)
VX_PACKER(Rgb10ToBgr10In16, UnpackBgr16)
VX_PACKER(Rgb8ToBgra8, AddAlpha8)
VX_PACKER(Rgb16ToXrgb15, AddX15)
#undef VX_PACKER

// (s + 0.5) * 65535 / 32768 truncated is 2 s up to 32767, also in floats, whose error is far below what is cut off;
// from 32768 on it is above 65535.
template <bool kSwap>
HWY_INLINE void Scale15(uint8_t* row, size_t count) {
  alignas(16) static constexpr uint8_t kSwapped[16] = {1, 0, 3, 2, 5, 4, 7, 6, 9, 8, 11, 10, 13, 12, 15, 14};
  const hn::ScalableTag<uint16_t> d;
  const hn::ScalableTag<uint8_t> d8;
  InPlaceLoop<32, 2>(row, count, [&](uint8_t* p) HWY_ATTR {
    HWY_UNROLL(4)
    for (size_t at = 0; at < 64; at += HWY_MAX_BYTES) {
      auto* samples = reinterpret_cast<uint16_t*>(p + at);
      const auto s = hn::LoadU(d, samples);
      auto v = hn::SaturatedAdd(s, s);
      if constexpr (kSwap) v = hn::TableLookupBytes(v, hn::BitCast(d, hn::LoadDup128(d8, kSwapped)));
      hn::StoreU(v, d, samples);
    }
  });
}
void Scale15To16(uint8_t* row, size_t count) { Scale15<false>(row, count); }
void Scale15To16BigEndian(uint8_t* row, size_t count) { Scale15<true>(row, count); }

void SwapBytes32(uint8_t* row, size_t count) {
  alignas(16) static constexpr uint8_t kReversed[16] = {3, 2, 1, 0, 7, 6, 5, 4, 11, 10, 9, 8, 15, 14, 13, 12};
  const hn::ScalableTag<uint8_t> d;
  const auto table = hn::LoadDup128(d, kReversed);
  InPlaceLoop<16, 4>(row, count, [&](uint8_t* p) HWY_ATTR {
    HWY_UNROLL(4)
    for (size_t at = 0; at < 64; at += HWY_MAX_BYTES)
      hn::StoreU(hn::TableLookupBytes(hn::LoadU(d, p + at), table), d, p + at);
  });
}

// Towards zero, of what is in the range of int32.
template <class V>
HWY_INLINE auto Truncate(V v) {
  using Result = hn::VFromD<hn::Rebind<int32_t, hn::DFromV<V>>>;
#if HWY_TARGET == HWY_AVX3
  return Result{_mm512_cvttpd_epi32(v.raw)};
#elif HWY_TARGET == HWY_AVX2
  return Result{_mm256_cvttpd_epi32(v.raw)};
#else
  return Result{_mm_cvttpd_epi32(v.raw)};
#endif
}

void SGamut3ToSGamut3Cine(uint8_t* row, size_t count) {
  const hn::ScalableTag<double> d;
  const hn::ScalableTag<int32_t> d32;
  const hn::Rebind<int32_t, decltype(d)> dHalf;
  using V = hn::VFromD<decltype(d32)>;
  InPlaceLoop<HWY_MAX_BYTES / 4, 8>(row, count, [&](uint8_t* p) HWY_ATTR {
    auto* words = reinterpret_cast<int32_t*>(p);
    const auto q0 = hn::LoadU(d32, words), q1 = hn::LoadU(d32, words + HWY_MAX_BYTES / 4);
    // The words of samples 0 and 1, and those of samples 2 and 3.
    const auto first = PickWords<0x88>(q0, q1), second = PickWords<0xDD>(q0, q1);
    const auto low = hn::Set(d32, 0xFFFF);
    const V s0 = hn::And(first, low), s2 = hn::And(second, low);
    const V s1 = hn::BitCast(d32, hn::ShiftRight<16>(hn::BitCast(hn::ScalableTag<uint32_t>(), first)));
    const auto half = [&](const double* m, auto v0, auto v1, auto v2) HWY_ATTR {
      const auto term = [&](int k, auto v) HWY_ATTR { return hn::Mul(hn::Set(d, m[k]), hn::PromoteTo(d, v)); };
      return Truncate(hn::Add(hn::Add(term(0, v0), term(1, v1)), term(2, v2)));
    };
    const auto result = [&](const double* m) HWY_ATTR {
      const auto lower = half(m, hn::LowerHalf(dHalf, s0), hn::LowerHalf(dHalf, s1), hn::LowerHalf(dHalf, s2));
      const auto upper = half(m, hn::UpperHalf(dHalf, s0), hn::UpperHalf(dHalf, s1), hn::UpperHalf(dHalf, s2));
      return hn::Combine(d32, upper, lower);
    };
    const V r0 = result(kSGamut3ToCine[0]), r1 = result(kSGamut3ToCine[1]), r2 = result(kSGamut3ToCine[2]);
    const V to0 = hn::Or(hn::And(r0, low), hn::ShiftLeft<16>(r1));
    const V to1 = hn::Or(hn::And(r2, low), hn::AndNot(low, second));
    hn::StoreU(hn::InterleaveLower(d32, to0, to1), d32, words);
    hn::StoreU(hn::InterleaveUpper(d32, to0, to1), d32, words + HWY_MAX_BYTES / 4);
  });
}

void ZyxToBgr32f(uint8_t* row, size_t count) {
  static constexpr PowerExponent kDecode(kDcdmGamma), kEncode(kDisplayGamma);
  const hn::ScalableTag<float> d;
  auto* pixels = reinterpret_cast<float*>(row);
  ForEachBlock(pixels, pixels, count, [&](PixelBlock& block) VX_COLOR_STAGE {
    SignedPowers<PowerCore::Float>(block, kDecode);
    ForEachColor(block, [&](RgbVectors& c) VX_COLOR_STAGE {  // On entry X, Y, Z stand for red, green, blue.
      const RgbVectors xyz = c;
      const auto light = [&](const float* m) VX_COLOR_STAGE {
        return hn::Add(hn::Add(hn::Mul(hn::Set(d, m[0]), xyz.r), hn::Mul(hn::Set(d, m[1]), xyz.g)),
                       hn::Mul(hn::Set(d, m[2]), xyz.b));
      };
      c = {light(kXyzToRgb[0]), light(kXyzToRgb[1]), light(kXyzToRgb[2])};
    });
    SignedPowers<PowerCore::Float>(block, kEncode);
  });
}

void Scale16To15(const uint8_t* src, uint8_t* dst, size_t count) {
  const hn::ScalableTag<uint16_t> d;
  const size_t lanes = hn::Lanes(d);
  const auto scale = [&](const uint8_t* from, uint8_t* to) HWY_ATTR {
    hn::StoreU(hn::AverageRound(hn::LoadU(d, reinterpret_cast<const uint16_t*>(from)), hn::Zero(d)), d,
               reinterpret_cast<uint16_t*>(to));
  };
  size_t i = 0;
  for (; i + lanes <= count; i += lanes) scale(src + 2 * i, dst + 2 * i);
  if (i == count) return;
  alignas(64) uint8_t block[HWY_MAX_BYTES] = {};
  std::memcpy(block, src + 2 * i, 2 * (count - i));
  scale(block, block);
  std::memcpy(dst + 2 * i, block, 2 * (count - i));
}

// Calls store(values, destination) for scaled values without NaN.
template <size_t kBytes, class Store>
HWY_INLINE void Narrow(const float* src, uint8_t* dst, size_t count, float first, float second, const Store& store) {
  const hn::ScalableTag<float> d;
  const auto f = hn::Set(d, first), s = hn::Set(d, second);
  RowLoop<HWY_MAX_BYTES / 4, 4, kBytes>(reinterpret_cast<const uint8_t*>(src), dst, count,
                                        [&](const uint8_t* HWY_RESTRICT in, uint8_t* HWY_RESTRICT out) HWY_ATTR {
                                          const auto v =
                                              hn::Mul(hn::Mul(hn::LoadU(d, reinterpret_cast<const float*>(in)), f), s);
                                          store(hn::IfThenElseZero(hn::Eq(v, v), v), out);
                                        });
}

void NarrowToInt16(const float* src, uint8_t* dst, size_t count, float first, float second) {
  const hn::ScalableTag<float> d;
  const hn::Rebind<int16_t, decltype(d)> d16;
  Narrow<2>(src, dst, count, first, second, [&](auto v, uint8_t* HWY_RESTRICT out) HWY_ATTR {
    const auto clamped = hn::Min(hn::Max(v, hn::Set(d, -32768.0f)), hn::Set(d, 32767.0f));
    hn::StoreU(hn::DemoteTo(d16, ConvertNearest(clamped)), d16, reinterpret_cast<int16_t*>(out));
  });
}
void NarrowToInt32(const float* src, uint8_t* dst, size_t count, float first, float second) {
  const hn::ScalableTag<float> d;
  const hn::ScalableTag<int32_t> d32;
  Narrow<4>(src, dst, count, first, second, [&](auto v, uint8_t* HWY_RESTRICT out) HWY_ATTR {
    const auto above = hn::VecFromMask(d32, hn::RebindMask(d32, hn::Ge(v, hn::Set(d, 0x1p31f))));
    hn::StoreU(hn::Xor(ConvertNearest(v), above), d32, reinterpret_cast<int32_t*>(out));
  });
}

void OffsetChroma32f(uint8_t* row, size_t count, float offset) {
  const hn::ScalableTag<float> d;
  // Luma keeps its bits: even a sum with zero would not be the same for NaN and -0.
  const auto chroma = hn::MaskFromVec(hn::BitCast(d, hn::Set(hn::ScalableTag<uint64_t>(), 0xFFFFFFFF)));
  InPlaceLoop<HWY_MAX_BYTES / 16 * 2, 16>(row, count, [&](uint8_t* p) HWY_ATTR {
    for (size_t at = 0; at < HWY_MAX_BYTES / 16 * 32; at += HWY_MAX_BYTES) {
      auto* samples = reinterpret_cast<float*>(p + at);
      const auto v = hn::LoadU(d, samples);
      hn::StoreU(hn::IfThenElse(chroma, hn::Add(v, hn::Set(d, offset)), v), d, samples);
    }
  });
}

}  // namespace
}  // namespace HWY_NAMESPACE
}  // namespace vexel
HWY_AFTER_NAMESPACE();
#endif

#if HWY_ONCE
namespace vexel {
namespace plain {
namespace {

template <class T>
T Get(const uint8_t* row, size_t index) {
  T v;
  std::memcpy(&v, row + index * sizeof(T), sizeof(T));
  return v;
}
template <class T>
void Put(uint8_t* row, size_t index, T v) {
  std::memcpy(row + index * sizeof(T), &v, sizeof(T));
}

void Uyvy10ToV210(const uint8_t* src, uint8_t* dst, size_t count) {
  for (size_t i = 0; i < 4 * count; ++i) {
    const auto s = [&](size_t k) { return uint32_t{Get<uint16_t>(src, 3 * i + k)}; };
    Put(dst, i, s(0) | s(1) << 10 | s(2) << 20);
  }
}
void V210ToUyvy10(const uint8_t* src, uint8_t* dst, size_t count) {
  for (size_t i = 0; i < kGroupSamples * count; ++i)
    Put(dst, i, static_cast<uint16_t>(Get<uint32_t>(src, i / 3) >> (10 * (i % 3)) & 0x3FF));
}
void Rgb10ToDnxhd16(const uint8_t* src, uint8_t* dst, size_t count) {
  for (size_t i = 0; i < count; ++i) {
    const auto w = Get<uint32_t>(src, i);
    Put(dst, 4 * i, static_cast<uint16_t>(w >> 2 << 6));
    Put(dst, 4 * i + 1, static_cast<uint16_t>(w >> 12 << 6));
    Put(dst, 4 * i + 2, static_cast<uint16_t>(w >> 22 << 6));
  }
}

constexpr uint32_t Word(uint32_t r, uint32_t g, uint32_t b) { return r << 2 | g << 12 | b << 22; }

void Dnxhd16ToRgb10(const uint8_t* src, uint8_t* dst, size_t count) {
  for (size_t i = 0; i < count; ++i) {
    const auto s = [&](size_t k) { return uint32_t{Get<uint16_t>(src, 4 * i + k)} >> 6; };
    Put(dst, i, Word(s(0), s(1), s(2)));
  }
}
void Bgr16ToRgb10(const uint8_t* src, uint8_t* dst, size_t count) {
  for (size_t i = 0; i < count; ++i) {
    const auto s = [&](size_t k) { return uint32_t{Get<uint16_t>(src, 3 * i + k)} >> 6; };
    Put(dst, i, Word(s(2), s(1), s(0)));
  }
}
void Rgb10ToBgr10In16(const uint8_t* src, uint8_t* dst, size_t count) {
  for (size_t i = 0; i < count; ++i)
    for (size_t k = 0; k < 3; ++k)
      Put(dst, 3 * i + k, static_cast<uint16_t>(Get<uint32_t>(src, i) >> (22 - 10 * k) & 0x3FF));
}
void Rgb8ToBgra8(const uint8_t* src, uint8_t* dst, size_t count) {
  for (size_t i = 0; i < count; ++i, src += 3, dst += 4) {
    for (size_t k = 0; k < 3; ++k) dst[k] = src[2 - k];
    dst[3] = 255;
  }
}
constexpr uint16_t To15(uint16_t s) { return static_cast<uint16_t>((uint32_t{s} + 1) / 2); }
void Rgb16ToXrgb15(const uint8_t* src, uint8_t* dst, size_t count) {
  for (size_t i = 0; i < count; ++i) {
    Put(dst, 4 * i, uint16_t{32768});
    for (size_t k = 0; k < 3; ++k) Put(dst, 4 * i + 1 + k, To15(Get<uint16_t>(src, 3 * i + k)));
  }
}
void Scale16To15(const uint8_t* src, uint8_t* dst, size_t count) {
  for (size_t i = 0; i < count; ++i) Put(dst, i, To15(Get<uint16_t>(src, i)));
}

constexpr uint16_t To16(uint16_t s) {
  return static_cast<uint16_t>(std::min((s + 0.5f) * 65535.0f * 0x1p-15f, 65535.0f));
}
void Scale15To16(uint8_t* row, size_t count) {
  for (size_t i = 0; i < count; ++i) Put(row, i, To16(Get<uint16_t>(row, i)));
}
void Scale15To16BigEndian(uint8_t* row, size_t count) {
  for (size_t i = 0; i < count; ++i) Put(row, i, __builtin_bswap16(To16(Get<uint16_t>(row, i))));
}
void SwapBytes32(uint8_t* row, size_t count) {
  for (size_t i = 0; i < count; ++i) Put(row, i, __builtin_bswap32(Get<uint32_t>(row, i)));
}
void SGamut3ToSGamut3Cine(uint8_t* row, size_t count) {
  for (size_t i = 0; i < count; ++i) {
    double s[3];
    for (size_t k = 0; k < 3; ++k) s[k] = Get<uint16_t>(row, 4 * i + k);
    for (size_t k = 0; k < 3; ++k) {
      const double* m = kSGamut3ToCine[k];
      Put(row, 4 * i + k, static_cast<uint16_t>(static_cast<int32_t>(m[0] * s[0] + m[1] * s[1] + m[2] * s[2])));
    }
  }
}
void ZyxToBgr32f(uint8_t* row, size_t count) {
  static constexpr PowerExponent kDecode(kDcdmGamma), kEncode(kDisplayGamma);
  for (size_t i = 0; i < count; ++i) {
    float xyz[3];
    for (size_t k = 0; k < 3; ++k) xyz[k] = SignedPower(Get<float>(row, 4 * i + 2 - k), kDecode);
    for (size_t k = 0; k < 3; ++k) {
      const float* m = kXyzToRgb[k];
      Put(row, 4 * i + 2 - k, SignedPower(m[0] * xyz[0] + m[1] * xyz[1] + m[2] * xyz[2], kEncode));
    }
  }
}

template <class T>
void Narrow(const float* src, uint8_t* dst, size_t count, float first, float second) {
  constexpr auto kLeast = std::numeric_limits<T>::min(), kMost = std::numeric_limits<T>::max();
  for (size_t i = 0; i < count; ++i) {
    const double v = src[i] * first * second;
    const double inside = std::isnan(v) ? 0 : std::clamp<double>(v, kLeast, kMost);
    Put(dst, i, static_cast<T>(std::nearbyint(inside)));
  }
}
void NarrowToInt16(const float* src, uint8_t* dst, size_t count, float first, float second) {
  Narrow<int16_t>(src, dst, count, first, second);
}
void NarrowToInt32(const float* src, uint8_t* dst, size_t count, float first, float second) {
  Narrow<int32_t>(src, dst, count, first, second);
}
void OffsetChroma32f(uint8_t* row, size_t count, float offset) {
  for (size_t i = 0; i < 2 * count; ++i) Put(row, 2 * i, Get<float>(row, 2 * i) + offset);
}

}  // namespace
}  // namespace plain

#define VX_PACKER(name)                                                                                           \
  {                                                                                                               \
    VX_KERNEL_VARIANTS(name), {                                                                                   \
      &plain::name, HWY_CHOOSE_SSSE3(Stream##name), HWY_CHOOSE_SSE4(Stream##name), HWY_CHOOSE_AVX2(Stream##name), \
          HWY_CHOOSE_AVX3(Stream##name)                                                                           \
    }                                                                                                             \
  }
const PackerKernels kUyvy10ToV210 = VX_PACKER(Uyvy10ToV210);
const PackerKernels kV210ToUyvy10 = VX_PACKER(V210ToUyvy10);
const PackerKernels kDnxhd16ToRgb10 = VX_PACKER(Dnxhd16ToRgb10);
const PackerKernels kBgr16ToRgb10 = VX_PACKER(Bgr16ToRgb10);
const PackerKernels kRgb10ToBgr10In16 = VX_PACKER(Rgb10ToBgr10In16);
const PackerKernels kRgb8ToBgra8 = VX_PACKER(Rgb8ToBgra8);
const PackerKernels kRgb16ToXrgb15 = VX_PACKER(Rgb16ToXrgb15);
#undef VX_PACKER
const RowKernelSet kRgb10ToDnxhd16 = VX_KERNEL_VARIANTS(Rgb10ToDnxhd16);
const InPlaceKernelSet kScale15To16 = VX_KERNEL_VARIANTS(Scale15To16);
const InPlaceKernelSet kScale15To16BigEndian = VX_KERNEL_VARIANTS(Scale15To16BigEndian);
const InPlaceKernelSet kSwapBytes32 = VX_KERNEL_VARIANTS(SwapBytes32);
const InPlaceKernelSet kSGamut3ToSGamut3Cine = VX_KERNEL_VARIANTS(SGamut3ToSGamut3Cine);
const InPlaceKernelSet kZyxToBgr32f = VX_KERNEL_VARIANTS(ZyxToBgr32f);
const KernelVariants<ScaleKernel> kScale16To15 = VX_KERNEL_VARIANTS(Scale16To15);
const KernelVariants<NarrowKernel> kNarrowToInt16 = VX_KERNEL_VARIANTS(NarrowToInt16);
const KernelVariants<NarrowKernel> kNarrowToInt32 = VX_KERNEL_VARIANTS(NarrowToInt32);
const KernelVariants<OffsetKernel> kOffsetChroma32f = VX_KERNEL_VARIANTS(OffsetChroma32f);

}  // namespace vexel
#endif
