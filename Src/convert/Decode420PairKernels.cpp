// 4:2:0 samples to packed 4:2:2 of the same codes: chroma of two rows is mixed, luma stays as it is.
#include <cstddef>
#include <cstdint>
#include <cstring>

#include "convert/Decode420Kernels.h"

#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "convert/Decode420PairKernels.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

#include "convert/Pairs422-inl.h"
#include "frame/KernelTable.h"

#if HWY_TARGET != HWY_SCALAR
HWY_BEFORE_NAMESPACE();
namespace vexel::decode420 {
namespace HWY_NAMESPACE {
namespace {
using namespace vexel::HWY_NAMESPACE;
using hwy::HWY_NAMESPACE::ScalableTag;

// A block is two vectors of pairs.
constexpr size_t kBlockPairs = kLanes<uint16_t>, kBlock = 2 * kBlockPairs;

template <ByteChroma kChroma>
constexpr size_t kChromaBytes = kChroma == ByteChroma::Planes ? 1 : 2;

HWY_INLINE U16 SetWord(uint32_t value) { return hn::Set(ScalableTag<uint16_t>(), static_cast<uint16_t>(value)); }
HWY_INLINE U16 LoadBytes(const uint8_t* p) { return LoadPromoted<uint16_t, uint8_t>(p); }

// The chroma rows of a block.
struct Chroma {
  const uint8_t *u, *v, *uB, *vB;
};

template <ByteChroma kChroma>
struct PairMaker {
  U16 weightA, weightB;
  explicit HWY_INLINE PairMaker(const PixelRow& row) : weightA(SetWord(row.weightA)), weightB(SetWord(row.weightB)) {}

  // Words 0..255: weights are in eighths.
  HWY_INLINE U16 Mix(const uint8_t* a, const uint8_t* b) const {
    const U16 sum = hn::Add(hn::Mul(LoadBytes(a), weightA), hn::Mul(LoadBytes(b), weightB));
    return AsU16(hn::MulFixedPoint15(AsI16(sum), AsI16(SetWord(32768 / 8))));
  }
  template <bool kStream>
  HWY_INLINE void Block(const uint8_t* y, const Chroma& c, uint8_t* dst) const {
    if constexpr (kChroma == ByteChroma::Planes) {
      const U16 luma = LoadVector<uint16_t>(y);
      StoreWordPairs<kStream>(AsU8(hn::Or(Mix(c.u, c.uB), hn::ShiftLeft<8>(luma))),
                              AsU8(hn::OrAnd(Mix(c.v, c.vB), luma, SetWord(0xFF00))), dst);
    } else {
      const auto words = [&](size_t at) HWY_ATTR {
        U16 chroma = Mix(c.u + at, c.uB + at);
        if constexpr (kChroma == ByteChroma::SwappedPairs)
          chroma = AsU16(hn::TableLookupBytes(AsU8(chroma), ByteOrder<0x1032>()));
        return AsU8(hn::Or(chroma, hn::ShiftLeft<8>(LoadBytes(y + at))));
      };
      const U8 first = words(0), second = words(kBlockPairs);
      WriteVector<kStream>(first, dst, 0);
      WriteVector<kStream>(second, dst, 1);
    }
  }
};

// All rows are read and written exactly. The last pixel of an odd width makes both of its pair.
template <ByteChroma kChroma, bool kStream>
HWY_INLINE void Row(const PixelRow& row, const PairMaker<kChroma>& make) {
  constexpr size_t kStep = kBlockPairs * kChromaBytes<kChroma>;
  size_t x = 0, at = 0;
  for (; x + kBlock <= row.count; x += kBlock, at += kStep)
    make.template Block<kStream>(row.y + x, {row.u + at, row.v + at, row.uB + at, row.vB + at}, row.dst + 2 * x);
  const size_t rest = row.count - x, pairs = (rest + 1) / 2;
  if (rest == 0) return;
  alignas(64) uint8_t y[kBlock] = {}, chroma[4][kStep] = {}, out[2 * kBlock];
  std::memcpy(y, row.y + x, rest);
  if (rest < kBlock) y[rest] = y[rest - 1];
  std::memcpy(chroma[0], row.u + at, pairs * kChromaBytes<kChroma>);
  std::memcpy(chroma[1], row.v + at, pairs * kChromaBytes<kChroma>);
  std::memcpy(chroma[2], row.uB + at, pairs * kChromaBytes<kChroma>);
  std::memcpy(chroma[3], row.vB + at, pairs * kChromaBytes<kChroma>);
  make.template Block<false>(y, {chroma[0], chroma[1], chroma[2], chroma[3]}, out);
  std::memcpy(row.dst + 2 * x, out, 4 * pairs);
}

template <ByteChroma kChroma>
void ToUyvy(const PixelRow& row, const Matrix&) {
  const PairMaker<kChroma> make(row);
  if (row.stream)
    Row<kChroma, true>(row, make);
  else
    Row<kChroma, false>(row, make);
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

template <ByteChroma kChroma>
void ToUyvy(const PixelRow& row, const Matrix&) {
  const auto mix = [&](const uint8_t* a, const uint8_t* b, size_t i) {
    return static_cast<uint8_t>((a[i] * row.weightA + b[i] * row.weightB + 4) / 8);
  };
  constexpr bool kIsSwapped = kChroma == ByteChroma::SwappedPairs;
  for (size_t i = 0; 2 * i < row.count; ++i) {
    uint8_t* const pair = row.dst + 4 * i;
    if constexpr (kChroma == ByteChroma::Planes) {
      pair[0] = mix(row.u, row.uB, i), pair[2] = mix(row.v, row.vB, i);
    } else {
      pair[0] = mix(row.u, row.uB, 2 * i + (kIsSwapped ? 1 : 0));
      pair[2] = mix(row.u, row.uB, 2 * i + (kIsSwapped ? 0 : 1));
    }
    pair[1] = row.y[2 * i], pair[3] = row.y[2 * i + 1 < row.count ? 2 * i + 1 : 2 * i];
  }
}

}  // namespace
}  // namespace plain

const ByteKernels kToUyvy = {{VX_KERNEL_VARIANTS(ToUyvy<ByteChroma::Planes>),
                              VX_KERNEL_VARIANTS(ToUyvy<ByteChroma::Pairs>),
                              VX_KERNEL_VARIANTS(ToUyvy<ByteChroma::SwappedPairs>)}};

}  // namespace vexel::decode420
#endif
