// Packed 4:2:2 in single precision: U Y0 V Y1 (UYVY) or Y0 U Y1 V (YUYV), chroma co-sited with the even pixel.
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <type_traits>

#include "convert/PlainYuv.h"
#include "convert/StudioScale.h"
#include "convert/YuvKernels.h"

#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "convert/Packed422Kernels32f.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

#include "convert/FloatPairs-inl.h"
#include "convert/FloatPixels-inl.h"
#include "frame/KernelTable.h"

#ifndef VEXEL_CONVERT_PACKED422KERNELS32F_ONCE
#define VEXEL_CONVERT_PACKED422KERNELS32F_ONCE
namespace vexel {
namespace {

constexpr size_t PairsOf(size_t pixels) { return (pixels + 1) / 2; }

// The interpolated chroma between c0 and c1.
inline float Between(float before, float c0, float c1, float after) {
  return (9.0f * (c0 + c1) - (before + after)) * 0.0625f;
}

}  // namespace
}  // namespace vexel
#endif

#if HWY_TARGET != HWY_SCALAR
HWY_BEFORE_NAMESPACE();
namespace vexel {
namespace HWY_NAMESPACE {
namespace {

constexpr size_t kVectorPairs = kVectorPixels;

constexpr size_t kBlockPairs = 4 * kVectorPairs;

struct SwapBlock {
  HWY_INLINE void operator()(const uint8_t* HWY_RESTRICT in, uint8_t* HWY_RESTRICT out) const {
    for (size_t i = 0; i < 4; ++i) StoreVector(hn::Shuffle2301(LoadVector<int32_t>(in, i)), out, i);
  }
};

template <const StudioScale& kScale>
struct WidenBlock {
  HWY_INLINE void operator()(const uint8_t* HWY_RESTRICT in, uint8_t* HWY_RESTRICT out) const {
    for (size_t i = 0; i < 4; ++i) StoreVector(WidenCodes<kScale>(in + i * kLanes<float>), out, i);
  }
};

template <const StudioScale& kScale>
struct NarrowBlock {
  static HWY_INLINE I32 Codes(const uint8_t* HWY_RESTRICT in, size_t index) {
    return ScaleToCodes<kScale>(LoadVector<float>(in, index));
  }
  HWY_INLINE void operator()(const uint8_t* HWY_RESTRICT in, uint8_t* HWY_RESTRICT out) const {
    StoreVector(PackTo8(Codes(in, 0), Codes(in, 1), Codes(in, 2), Codes(in, 3)), out);
  }
};

void Swap422_32f(const uint8_t* src, uint8_t* dst, size_t count) {
  RowLoop<kBlockPairs, 16, 16>(src, dst, PairsOf(count), SwapBlock());
}
void Uyvy8To32f(const uint8_t* src, uint8_t* dst, size_t count) {
  RowLoop<kBlockPairs, 4, 16>(src, dst, PairsOf(count), WidenBlock<kUyvy8Scale>());
}
void Yuyv8To32f(const uint8_t* src, uint8_t* dst, size_t count) {
  RowLoop<kBlockPairs, 4, 16>(src, dst, PairsOf(count), WidenBlock<kYuyv8Scale>());
}
void Uyvy32fTo8(const uint8_t* src, uint8_t* dst, size_t count) {
  RowLoop<kBlockPairs, 16, 4>(src, dst, PairsOf(count), NarrowBlock<kUyvy8Scale>());
}
void Yuyv32fTo8(const uint8_t* src, uint8_t* dst, size_t count) {
  RowLoop<kBlockPairs, 16, 4>(src, dst, PairsOf(count), NarrowBlock<kYuyv8Scale>());
}

// Between of the pairs of `own` and the ones after them.
HWY_INLINE F32 PairsBetween(F32 before, F32 own, F32 next) {
  const FloatTag d;
  const F32 inner = hn::Add(own, ShiftPairsIn<1>(own, next));
  const F32 outer = hn::Add(ShiftPairsOut(before, own), ShiftPairsIn<2>(own, next));
  return hn::Mul(hn::Sub(hn::Mul(hn::Set(d, 9.0f), inner), outer), hn::Set(d, 0.0625f));
}

constexpr size_t kPlanePixels = 2 * kPlanePairs;

// A row in blocks of kPlanePixels pixels, and what follows it: `repeated`, of 16 bytes, over and over.
template <size_t kBlockBytes>
class BlockRow {
 public:
  BlockRow(const uint8_t* HWY_RESTRICT src, size_t blocks, size_t restBytes, const uint8_t* HWY_RESTRICT repeated)
      : mSrc(src), mBlocks(blocks) {
    for (size_t i = 0; i < sizeof mTail; i += 16) std::memcpy(mTail + i, repeated, 16);
    std::memcpy(mTail, src + blocks * kBlockBytes, restBytes);
  }
  HWY_INLINE const uint8_t* Block(size_t i) const {
    return i < mBlocks ? mSrc + i * kBlockBytes : i == mBlocks ? mTail : mTail + kBlockBytes;
  }

 private:
  const uint8_t* mSrc;
  size_t mBlocks;
  alignas(64) uint8_t mTail[2 * kBlockBytes];
};

// The same chroma for all pairs.
HWY_INLINE F32 RepeatChroma(const uint8_t* v, const uint8_t* u) {
  const FloatTag d;
  float chroma[2];
  std::memcpy(&chroma[0], v, sizeof(float));
  std::memcpy(&chroma[1], u, sizeof(float));
  return hn::OddEven(hn::Set(d, chroma[1]), hn::Set(d, chroma[0]));
}

template <bool kInterpolate>
HWY_INLINE void UpsampleRow(const uint8_t* HWY_RESTRICT src, uint8_t* HWY_RESTRICT dst, size_t count) {
  constexpr size_t kSrcBlock = 16 * kPlanePairs, kDstBlock = 16 * kPlanePixels;
  if (count == 0) return;
  const size_t blocks = count / kPlanePixels, rest = count % kPlanePixels;
  const BlockRow<kSrcBlock> row(src, blocks, 16 * PairsOf(rest), src + 16 * (PairsOf(count) - 1));
  F32 before = RepeatChroma(src + 8, src), own = LoadPairChroma(row.Block(0));
  const auto step = [&](const uint8_t* HWY_RESTRICT block, size_t i, uint8_t* HWY_RESTRICT out) HWY_ATTR {
    const F32 next = LoadPairChroma(row.Block(i + 1));
    StorePixelPlanes(own, kInterpolate ? PairsBetween(before, own, next) : own, block, out);
    before = own;
    own = next;
  };
  for (size_t i = 0; i < blocks; ++i) {
    FetchAhead<kSrcBlock>(src + i * kSrcBlock);
    step(src + i * kSrcBlock, i, dst + i * kDstBlock);
  }
  if (rest > 0) {
    alignas(64) uint8_t out[kDstBlock];
    step(row.Block(blocks), blocks, out);
    std::memcpy(dst + blocks * kDstBlock, out, 16 * rest);
  }
}

void Uyvy32fToVuyx32f(const uint8_t* src, uint8_t* dst, size_t count) { UpsampleRow<true>(src, dst, count); }
void Uyvy32fToVuyx32fNearest(const uint8_t* src, uint8_t* dst, size_t count) { UpsampleRow<false>(src, dst, count); }

void Vuyx32fToUyvy32f(const uint8_t* HWY_RESTRICT src, uint8_t* HWY_RESTRICT dst, size_t count) {
  constexpr size_t kSrcBlock = 16 * kPlanePixels, kDstBlock = 16 * kPlanePairs;
  if (count == 0) return;
  const FloatTag d;
  const size_t blocks = count / kPlanePixels, rest = count % kPlanePixels;
  const BlockRow<kSrcBlock> row(src, blocks, 16 * rest, src + 32 * (PairsOf(count) - 1));
  F32 before = RepeatChroma(src, src + 4), detailsBefore = hn::Zero(d);
  PixelPlanes own = LoadPixelPlanes(row.Block(0));
  // Details are those of pairs that have an odd pixel.
  const auto step = [&](size_t i, auto lacksOdd, uint8_t* HWY_RESTRICT out) HWY_ATTR {
    const PixelPlanes next = LoadPixelPlanes(row.Block(i + 1));
    F32 details = hn::Sub(PairsBetween(before, own.even, next.even), own.odd);
    if constexpr (lacksOdd) details = hn::IfThenElseZero(hn::FirstN(d, rest / 2 * 2), details);
    const F32 sum = hn::Add(ShiftPairsOut(detailsBefore, details), details);
    StorePairs(hn::Sub(own.even, hn::Mul(sum, hn::Set(d, 0.25f))), own.luma, out);
    before = own.even;
    detailsBefore = details;
    own = next;
  };
  for (size_t i = 0; i < blocks; ++i) {
    FetchAhead<kSrcBlock>(src + i * kSrcBlock);
    step(i, std::false_type(), dst + i * kDstBlock);
  }
  if (rest > 0) {
    alignas(64) uint8_t out[kDstBlock];
    step(blocks, std::true_type(), out);
    std::memcpy(dst + blocks * kDstBlock, out, 16 * PairsOf(rest));
  }
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

void Swap422_32f(const uint8_t* src, uint8_t* dst, size_t count) {
  for (size_t word = 0; word < 4 * PairsOf(count); ++word) std::memcpy(dst + 4 * word, src + 4 * (word ^ 1), 4);
}

void Uyvy8To32f(const uint8_t* src, uint8_t* dst, size_t count) {
  for (size_t i = 0; i < PairsOf(count); ++i, src += 4, dst += 16)
    StoreQuad({{ChromaToFloat(src[0]), LumaToFloat(src[1]), ChromaToFloat(src[2]), LumaToFloat(src[3])}}, dst);
}

void Yuyv8To32f(const uint8_t* src, uint8_t* dst, size_t count) {
  for (size_t i = 0; i < PairsOf(count); ++i, src += 4, dst += 16)
    StoreQuad({{LumaToFloat(src[0]), ChromaToFloat(src[1]), LumaToFloat(src[2]), ChromaToFloat(src[3])}}, dst);
}

// kLuma is the index of the first luma sample.
template <int kLuma>
void NarrowPairs(const uint8_t* src, uint8_t* dst, size_t count) {
  for (size_t i = 0; i < PairsOf(count); ++i, src += 16, dst += 4) {
    const Quad pair = LoadQuad(src);
    for (int c = 0; c < 4; ++c) dst[c] = c % 2 == kLuma ? LumaTo8(pair.c[c]) : ChromaTo8(pair.c[c]);
  }
}

void Uyvy32fTo8(const uint8_t* src, uint8_t* dst, size_t count) { NarrowPairs<1>(src, dst, count); }
void Yuyv32fTo8(const uint8_t* src, uint8_t* dst, size_t count) { NarrowPairs<0>(src, dst, count); }

struct Chroma {
  float v, u;
};

// Chroma of a pair of a UYVY row that continues beyond its ends.
Chroma PairChroma(const uint8_t* row, size_t pixels, ptrdiff_t pair) {
  const auto last = static_cast<ptrdiff_t>(PairsOf(pixels)) - 1;
  const Quad quad = LoadQuad(row + 16 * (pair < 0 ? 0 : pair > last ? last : pair));
  return {quad.c[2], quad.c[0]};
}

void Uyvy32fToVuyx32f(const uint8_t* src, uint8_t* dst, size_t count) {
  for (size_t x = 0; x < count; ++x) {
    const auto pair = static_cast<ptrdiff_t>(x / 2);
    Chroma c = PairChroma(src, count, pair);
    if (x % 2 != 0) {
      const Chroma before = PairChroma(src, count, pair - 1), next = PairChroma(src, count, pair + 1),
                   after = PairChroma(src, count, pair + 2);
      c = {Between(before.v, c.v, next.v, after.v), Between(before.u, c.u, next.u, after.u)};
    }
    StoreQuad({{c.v, c.u, LoadQuad(src + 16 * pair).c[1 + 2 * (x % 2)], 1.0f}}, dst + 16 * x);
  }
}

void Uyvy32fToVuyx32fNearest(const uint8_t* src, uint8_t* dst, size_t count) {
  for (size_t x = 0; x < count; ++x) {
    const Quad pair = LoadQuad(src + 16 * (x / 2));
    StoreQuad({{pair.c[2], pair.c[0], pair.c[1 + 2 * (x % 2)], 1.0f}}, dst + 16 * x);
  }
}

// Channel `c` (V or U) of the even pixel of a pair, or the end's.
float EvenChroma(const uint8_t* row, size_t pixels, ptrdiff_t pair, size_t c) {
  const auto last = static_cast<ptrdiff_t>(PairsOf(pixels)) - 1;
  return LoadQuad(row + 32 * (pair < 0 ? 0 : pair > last ? last : pair)).c[c];
}

// What interpolation gets wrong at the odd pixel of a pair; nothing where there is none.
float Detail(const uint8_t* row, size_t pixels, ptrdiff_t pair, size_t c) {
  if (pair < 0 || 2 * static_cast<size_t>(pair) + 1 >= pixels) return 0.0f;
  const auto even = [=](ptrdiff_t offset) { return EvenChroma(row, pixels, pair + offset, c); };
  return Between(even(-1), even(0), even(1), even(2)) - LoadQuad(row + 32 * pair + 16).c[c];
}

void Vuyx32fToUyvy32f(const uint8_t* src, uint8_t* dst, size_t count) {
  for (size_t i = 0; i < PairsOf(count); ++i) {
    const auto chroma = [=](size_t c) {
      const auto pair = static_cast<ptrdiff_t>(i);
      return EvenChroma(src, count, pair, c) - (Detail(src, count, pair - 1, c) + Detail(src, count, pair, c)) * 0.25f;
    };
    const float luma = LoadQuad(src + 32 * i).c[2];
    StoreQuad({{chroma(1), luma, chroma(0), 2 * i + 1 < count ? LoadQuad(src + 32 * i + 16).c[2] : luma}},
              dst + 16 * i);
  }
}

}  // namespace
}  // namespace plain

const RowKernelSet kSwap422_32f = VX_KERNEL_VARIANTS(Swap422_32f);
const RowKernelSet kUyvy8To32f = VX_KERNEL_VARIANTS(Uyvy8To32f);
const RowKernelSet kYuyv8To32f = VX_KERNEL_VARIANTS(Yuyv8To32f);
const RowKernelSet kUyvy32fTo8 = VX_KERNEL_VARIANTS(Uyvy32fTo8);
const RowKernelSet kYuyv32fTo8 = VX_KERNEL_VARIANTS(Yuyv32fTo8);
const RowKernelSet kUyvy32fToVuyx32f = VX_KERNEL_VARIANTS(Uyvy32fToVuyx32f);
const RowKernelSet kUyvy32fToVuyx32fNearest = VX_KERNEL_VARIANTS(Uyvy32fToVuyx32fNearest);
const RowKernelSet kVuyx32fToUyvy32f = VX_KERNEL_VARIANTS(Vuyx32fToUyvy32f);

}  // namespace vexel
#endif
