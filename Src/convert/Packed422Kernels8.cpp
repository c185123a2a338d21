// Packed 8-bit 4:2:2 to 4:4:4 pixels, to the other byte order, and to the other colorimetry.
#include <cstddef>
#include <cstdint>
#include <cstring>

#include "convert/PairOrder.h"
#include "convert/PlainPixels.h"
#include "convert/Upsample512.h"
#include "convert/YuvFixed8.h"
#include "convert/YuvKernels.h"

#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "convert/Packed422Kernels8.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

#include "convert/Pairs422-inl.h"
#include "frame/KernelTable.h"

// X(kernel, operation, byte order, coefficients): all kernels of this file.
#ifndef VEXEL_CONVERT_PACKED422_KERNELS8
#define VEXEL_CONVERT_PACKED422_KERNELS8(X)                         \
  X(Uyvy8ToBgrx8_601, PairsToBgrx, PairOrder::Uyvy, kYuvToRgb8_601) \
  X(Uyvy8ToBgrx8_709, PairsToBgrx, PairOrder::Uyvy, kYuvToRgb8_709) \
  X(Yuyv8ToBgrx8_601, PairsToBgrx, PairOrder::Yuyv, kYuvToRgb8_601) \
  X(Yuyv8ToBgrx8_709, PairsToBgrx, PairOrder::Yuyv, kYuvToRgb8_709) \
  X(Uyvy8_601To709, RecodePairs, PairOrder::Uyvy, kYuv8_601To709)   \
  X(Uyvy8_709To601, RecodePairs, PairOrder::Uyvy, kYuv8_709To601)   \
  X(Yuyv8_601To709, RecodePairs, PairOrder::Yuyv, kYuv8_601To709)   \
  X(Yuyv8_709To601, RecodePairs, PairOrder::Yuyv, kYuv8_709To601)   \
  X(Uyvy8ToVuyx8, PairsToVuyx, PairOrder::Uyvy, 0)                  \
  X(Yuyv8ToVuyx8, PairsToVuyx, PairOrder::Yuyv, 0)                  \
  X(Swap422_8u, SwapPairs, PairOrder::Uyvy, 0)
#endif

#if HWY_TARGET != HWY_SCALAR
HWY_BEFORE_NAMESPACE();
namespace vexel {
namespace HWY_NAMESPACE {
namespace {

template <PairOrder kOrder>
struct PairsToBgrxBody {
  HWY_INLINE void operator()(U8 pairs, U8 next, uint8_t* out) const {
    constexpr int kChroma = ChromaByte(kOrder);
    // The average of two multiples of 256 is exact.
    const U16 chroma = WordBytes256<kChroma>(pairs);
    const U16 between = hn::AverageRound(chroma, WordBytes256<kChroma>(next));
    const auto zero = AsU16(Dwords(0x80008000));
    const I16 even = AsI16(hn::Xor(chroma, zero)), odd = AsI16(hn::Xor(between, zero));

    const I16 y = matrix.Luma(WordBytes256<LumaByte(kOrder)>(pairs));
    const I16 blue = matrix.AddChroma(y, JoinLowWords(even, odd), matrix.blue);
    const I16 red = matrix.AddChroma(y, JoinHighWords(even, odd), matrix.red);
    const I16 green = matrix.Integers(y, JoinHighWords(matrix.GreenChroma(even), matrix.GreenChroma(odd)));

    const hn::ScalableTag<uint8_t> d;
    const U8 blueRed = PackBlocks(blue, red), greenOpaque = PackBlocks(green, WordPair(255, 255));
    StoreWordPairs(hn::InterleaveLower(d, blueRed, greenOpaque), hn::InterleaveUpper(d, blueRed, greenOpaque), out);
  }
  VectorYuvToRgb8 matrix;
};
template <PairOrder kOrder>
HWY_INLINE void PairsToBgrx(const uint8_t* src, uint8_t* dst, size_t count, const FixedYuvToRgb8& f) {
  if (HWY_TARGET == HWY_AVX3 && HasVbmi()) return PairsToBgrx512(kOrder, src, dst, count, f);
  PairLoop<4, false>(src, dst, count, PairsToBgrxBody<kOrder>{VectorYuvToRgb8(f)});
}

template <PairOrder kOrder>
struct PairsToVuyxBody {
  HWY_INLINE void operator()(U8 pairs, U8 next, uint8_t* out) const {
    const U8 between = hn::AverageRound(pairs, next);
    const auto order = kOrder == PairOrder::Uyvy ? ByteOrder<0x0202>() : ByteOrder<0x1313>();
    const auto vu =
        JoinLowWords(AsI16(hn::TableLookupBytes(pairs, order)), AsI16(hn::TableLookupBytes(between, order)));
    const auto opaque = AsU16(Dwords(0xFF00FF00));
    StoreWordPairs(AsU8(vu), AsU8(hn::Or(WordBytes<LumaByte(kOrder)>(pairs), opaque)), out);
  }
};
template <PairOrder kOrder>
HWY_INLINE void PairsToVuyx(const uint8_t* src, uint8_t* dst, size_t count, int) {
  PairLoop<4, false>(src, dst, count, PairsToVuyxBody<kOrder>());
}

// Like the 4:4:4 kernel of the same matrix, with chroma counted double in the luma sums.
template <PairOrder kOrder>
struct RecodePairsBody {
  HWY_INLINE explicit RecodePairsBody(const FixedMatrix8& m)
      : v(WordPair(2 * m.c1[0], m.c0[0])),
        u(WordPair(2 * m.c1[1], m.c0[1])),
        y(WordPair(2 * m.c1[2], m.c0[2])),
        vBias(AsI32(Dwords(static_cast<uint32_t>(m.biasUnit * m.bias[0])))),
        uBias(AsI32(Dwords(static_cast<uint32_t>(m.biasUnit * m.bias[1])))),
        yBias(AsI32(Dwords(static_cast<uint32_t>(2 * m.biasUnit * m.bias[2])))) {}

  HWY_INLINE void operator()(U8 pairs, U8 next, uint8_t* out) const {
    const I16 chroma = AsI16(WordBytes<ChromaByte(kOrder)>(pairs));
    const I16 following = AsI16(WordBytes<ChromaByte(kOrder)>(next));
    const I32 newU = hn::ShiftRight<14>(hn::Add(MultiplyPairs(chroma, u), uBias));
    const I32 newV = hn::ShiftRight<14>(hn::Add(MultiplyPairs(chroma, v), vBias));
    const I32 even = hn::ShiftRight<15>(hn::Add(MultiplyPairs(hn::Add(chroma, chroma), y), yBias));
    const I32 odd = hn::ShiftRight<15>(hn::Add(MultiplyPairs(hn::Add(chroma, following), y), yBias));
    const I16 luma = AsI16(WordBytes<LumaByte(kOrder)>(pairs));
    StorePairs<kOrder>(JoinLowWords(AsI16(newU), AsI16(newV)), hn::Add(luma, JoinLowWords(AsI16(even), AsI16(odd))),
                       out);
  }
  I16 v, u, y;
  I32 vBias, uBias, yBias;
};
template <PairOrder kOrder>
HWY_INLINE void RecodePairs(const uint8_t* src, uint8_t* dst, size_t count, const FixedMatrix8& m) {
  PairLoop<2, true>(src, dst, count, RecodePairsBody<kOrder>(m));
  RepeatMissingLuma(kOrder, dst, count);
}

struct SwapBytes {
  HWY_INLINE U8 operator()(U8 v) const { return hn::TableLookupBytes(v, ByteOrder<0x2301>()); }
};
template <PairOrder>
HWY_INLINE void SwapPairs(const uint8_t* src, uint8_t* dst, size_t count, int) {
  MapRow<uint8_t>(src, dst, (count + 1) / 2, EachVector<uint8_t, SwapBytes>());
}

#define VX_KERNEL(Name, Operation, kOrder, kCoefficients)              \
  HWY_ATTR void Name(const uint8_t* src, uint8_t* dst, size_t count) { \
    Operation<kOrder>(src, dst, count, kCoefficients);                 \
  }
VEXEL_CONVERT_PACKED422_KERNELS8(VX_KERNEL)
#undef VX_KERNEL

}  // namespace
}  // namespace HWY_NAMESPACE
}  // namespace vexel
HWY_AFTER_NAMESPACE();
#endif  // HWY_TARGET

#if HWY_ONCE
namespace vexel {
namespace plain {
namespace {

template <PairOrder kOrder>
void PairsToBgrx(const uint8_t* src, uint8_t* dst, size_t count, const FixedYuvToRgb8& f) {
  ForEachPair(kOrder, src, count, [&](size_t i, const Pair8& pair, const Pair8& next) {
    // 256 times the chroma about 0, at the pair and half-way to the next.
    const int u[2] = {256 * (pair.u - 128), 128 * (pair.u + next.u - 256)};
    const int v[2] = {256 * (pair.v - 128), 128 * (pair.v + next.v - 256)};
    for (size_t k = 0; k < 2 && 2 * i + k < count; ++k) {
      uint8_t* bgrx = dst + 4 * (2 * i + k);
      Yuv8ToBgr8(f, pair.y[k], u[k], v[k], bgrx);
      bgrx[3] = 255;
    }
  });
}

template <PairOrder kOrder>
void PairsToVuyx(const uint8_t* src, uint8_t* dst, size_t count, int) {
  ForEachPair(kOrder, src, count, [&](size_t i, const Pair8& pair, const Pair8& next) {
    const int u[2] = {pair.u, (pair.u + next.u + 1) >> 1}, v[2] = {pair.v, (pair.v + next.v + 1) >> 1};
    for (size_t k = 0; k < 2 && 2 * i + k < count; ++k) {
      const uint8_t vuyx[4] = {Clamp8(v[k]), Clamp8(u[k]), Clamp8(pair.y[k]), 255};
      std::memcpy(dst + 4 * (2 * i + k), vuyx, 4);
    }
  });
}

template <PairOrder kOrder>
void RecodePairs(const uint8_t* src, uint8_t* dst, size_t count, const FixedMatrix8& m) {
  ForEachPair(kOrder, src, count, [&](size_t i, const Pair8& pair, const Pair8& next) {
    const auto chroma = [&](int j) {
      return Clamp8((m.c0[j] * pair.v + m.c1[j] * 2 * pair.u + m.biasUnit * m.bias[j]) >> m.shift);
    };
    // u and v are sums of two samples.
    const auto luma = [&](int y, int u, int v) {
      return Clamp8(y + ((m.c0[2] * v + m.c1[2] * 2 * u + 2 * m.biasUnit * m.bias[2]) >> (m.shift + 1)));
    };
    const Pair8 result = {chroma(1),
                          chroma(0),
                          {luma(pair.y[0], 2 * pair.u, 2 * pair.v), luma(pair.y[1], pair.u + next.u, pair.v + next.v)}};
    StorePair(kOrder, result, dst + 4 * i);
  });
  RepeatMissingLuma(kOrder, dst, count);
}

template <PairOrder>
void SwapPairs(const uint8_t* src, uint8_t* dst, size_t count, int) {
  ForEachPair(PairOrder::Uyvy, src, count,
              [&](size_t i, const Pair8& pair, const Pair8&) { StorePair(PairOrder::Yuyv, pair, dst + 4 * i); });
}

#define VX_KERNEL(Name, Operation, kOrder, kCoefficients) \
  void Name(const uint8_t* src, uint8_t* dst, size_t count) { Operation<kOrder>(src, dst, count, kCoefficients); }
VEXEL_CONVERT_PACKED422_KERNELS8(VX_KERNEL)
#undef VX_KERNEL

}  // namespace
}  // namespace plain

#define VX_KERNEL(Name, Operation, kOrder, kCoefficients) const RowKernelSet k##Name = VX_KERNEL_VARIANTS(Name);
VEXEL_CONVERT_PACKED422_KERNELS8(VX_KERNEL)
#undef VX_KERNEL

}  // namespace vexel
#endif  // HWY_ONCE
