// Pixels of four floats as one vector per channel, and the linear-light steps on them. Scalar forms: PlainPixels.h.
#if defined(VEXEL_COLOR_COLORVECTORS_INL_H_) == defined(HWY_TARGET_TOGGLE)
#ifdef VEXEL_COLOR_COLORVECTORS_INL_H_
#undef VEXEL_COLOR_COLORVECTORS_INL_H_
#else
#define VEXEL_COLOR_COLORVECTORS_INL_H_
#endif

#include <cstddef>
#include <cstdint>
#include <cstring>

#include <hwy/highway.h>

#include "color/PixelKernels.h"
#include "frame/Power-inl.h"

HWY_BEFORE_NAMESPACE();
namespace vexel {
namespace HWY_NAMESPACE {
namespace hn = hwy::HWY_NAMESPACE;

#ifndef VX_COLOR_STAGE
// Stages are inlined into their loops, where constants stay in registers.
#define VX_COLOR_STAGE HWY_ATTR __attribute__((always_inline))
#endif

using ColorTag = hn::ScalableTag<float>;
using ColorVector = hn::Vec<ColorTag>;

struct RgbVectors {
  ColorVector r, g, b;
};

// A block of pixels in whole vectors, all reds, then all greens, then all blues, so that what happens to each channel
// alike is one loop. Blocks hold their pixels in the order that costs least to produce; only the way back to memory has
// to know it.
struct PixelBlock {
  static constexpr size_t kVectors = 16;
  static constexpr size_t kPixels = kVectors * hn::MaxLanes(ColorTag());
  size_t pixels;
  bool negative;  // A minus sign has been met, in this block or an earlier one.
  HWY_ALIGN float colors[3 * kPixels];
  HWY_ALIGN float alpha[kPixels];
  HWY_ALIGN float scratch[6 * kPixels];
};

#if HWY_TARGET == HWY_SCALAR
HWY_INLINE void LoadPixels(const float* from, ColorVector& v0, ColorVector& v1, ColorVector& v2, ColorVector& v3) {
  hn::LoadInterleaved4(ColorTag(), from, v0, v1, v2, v3);
}
HWY_INLINE void StorePixels(ColorVector v0, ColorVector v1, ColorVector v2, ColorVector v3, float* to) {
  hn::StoreInterleaved4(v0, v1, v2, v3, ColorTag(), to);
}
#else
// 4 x 4 transposition within each 128 bits of four vectors.
HWY_INLINE void Transpose4(ColorVector& v0, ColorVector& v1, ColorVector& v2, ColorVector& v3) {
  const ColorTag d;
  const hn::Repartition<double, ColorTag> d64;
  const auto low01 = hn::BitCast(d64, hn::InterleaveLower(d, v0, v1));
  const auto high01 = hn::BitCast(d64, hn::InterleaveUpper(d, v0, v1));
  const auto low23 = hn::BitCast(d64, hn::InterleaveLower(d, v2, v3));
  const auto high23 = hn::BitCast(d64, hn::InterleaveUpper(d, v2, v3));
  v0 = hn::BitCast(d, hn::InterleaveLower(d64, low01, low23));
  v1 = hn::BitCast(d, hn::InterleaveUpper(d64, low01, low23));
  v2 = hn::BitCast(d, hn::InterleaveLower(d64, high01, high23));
  v3 = hn::BitCast(d, hn::InterleaveUpper(d64, high01, high23));
}
HWY_INLINE void LoadPixels(const float* from, ColorVector& v0, ColorVector& v1, ColorVector& v2, ColorVector& v3) {
  const ColorTag d;
  const size_t lanes = hn::Lanes(d);
  v0 = hn::LoadU(d, from);
  v1 = hn::LoadU(d, from + lanes);
  v2 = hn::LoadU(d, from + 2 * lanes);
  v3 = hn::LoadU(d, from + 3 * lanes);
  Transpose4(v0, v1, v2, v3);
}
HWY_INLINE void StorePixels(ColorVector v0, ColorVector v1, ColorVector v2, ColorVector v3, float* to) {
  const ColorTag d;
  const size_t lanes = hn::Lanes(d);
  Transpose4(v0, v1, v2, v3);
  hn::StoreU(v0, d, to);
  hn::StoreU(v1, d, to + lanes);
  hn::StoreU(v2, d, to + 2 * lanes);
  hn::StoreU(v3, d, to + 3 * lanes);
}
#endif

HWY_INLINE RgbVectors LoadColors(const PixelBlock& block, size_t i) {
  const ColorTag d;
  const float* from = block.colors + i;
  return {hn::Load(d, from), hn::Load(d, from + block.pixels), hn::Load(d, from + 2 * block.pixels)};
}
HWY_INLINE void StoreColors(const RgbVectors& c, PixelBlock& block, size_t i) {
  const ColorTag d;
  float* to = block.colors + i;
  hn::Store(c.r, d, to);
  hn::Store(c.g, d, to + block.pixels);
  hn::Store(c.b, d, to + 2 * block.pixels);
}

// stage(RgbVectors&) changes the colours of a block.
template <class Stage>
HWY_INLINE void ForEachColor(PixelBlock& block, const Stage& stage) {
  const size_t lanes = hn::Lanes(ColorTag());
  for (size_t i = 0; i < block.pixels; i += lanes) {
    RgbVectors c = LoadColors(block, i);
    stage(c);
    StoreColors(c, block, i);
  }
}

// Asks for the pixels that stand one block further on: processors do not fetch them by themselves while a block is
// worked on. Addresses past the pixels do no harm.
HWY_INLINE void FetchNextBlock(const float* pixels) {
  const auto address = reinterpret_cast<uintptr_t>(pixels) + PixelBlock::kPixels * 4 * sizeof(float);
  for (size_t offset = 0; offset < 4 * sizeof(ColorVector); offset += 64)
    __builtin_prefetch(reinterpret_cast<const void*>(address + offset));
}

HWY_INLINE void LoadBlock(const float* src, PixelBlock& block) {
  const ColorTag d;
  const size_t lanes = hn::Lanes(d);
  for (size_t i = 0; i < block.pixels; i += lanes) {
    FetchNextBlock(src + 4 * i);
    RgbVectors c;
    ColorVector a;
    LoadPixels(src + 4 * i, c.b, c.g, c.r, a);
    StoreColors(c, block, i);
    hn::Store(a, d, block.alpha + i);
  }
}
HWY_INLINE void StoreBlock(const PixelBlock& block, float* dst) {
  const ColorTag d;
  const size_t lanes = hn::Lanes(d);
  for (size_t i = 0; i < block.pixels; i += lanes) {
    FetchNextBlock(dst + 4 * i);
    const RgbVectors c = LoadColors(block, i);
    StorePixels(c.b, c.g, c.r, hn::Load(d, block.alpha + i), dst + 4 * i);
  }
}

// Calls change(source, destination, pixels) for runs of whole vectors of pixels, at most `most`; the last pixels go
// through the same code on a copy padded with zeros.
template <class Change>
HWY_INLINE void ForEachRun(const float* src, float* dst, size_t count, size_t most, const Change& change) {
  const size_t lanes = hn::Lanes(ColorTag());
  while (count >= lanes) {
    const size_t pixels = HWY_MIN(count / lanes * lanes, most);
    change(src, dst, pixels);
    src += 4 * pixels;
    dst += 4 * pixels;
    count -= pixels;
  }
  if (count != 0) {
    HWY_ALIGN float padded[4 * hn::MaxLanes(ColorTag())] = {};
    std::memcpy(padded, src, count * 4 * sizeof(float));
    change(padded, padded, lanes);
    std::memcpy(dst, padded, count * 4 * sizeof(float));
  }
}

// change(PixelBlock&) for pixels in blocks that stay in the cache.
template <class Change>
HWY_INLINE void ForEachBlock(const float* src, float* dst, size_t count, const Change& change) {
  PixelBlock block;
  block.negative = false;
  ForEachRun(src, dst, count, PixelBlock::kPixels, [&](const float* from, float* to, size_t pixels) VX_COLOR_STAGE {
    block.pixels = pixels;
    LoadBlock(from, block);
    change(block);
    StoreBlock(block, to);
  });
}

// change(RgbVectors&) for pixels, in one pass.
template <class Change>
HWY_INLINE void ForEachPixel(const float* src, float* dst, size_t count, const Change& change) {
  const size_t lanes = hn::Lanes(ColorTag());
  ForEachRun(src, dst, count, SIZE_MAX, [&](const float* from, float* to, size_t pixels) VX_COLOR_STAGE {
    for (size_t i = 0; i < pixels; i += lanes) {
      RgbVectors c;
      ColorVector a;
      LoadPixels(from + 4 * i, c.b, c.g, c.r, a);
      change(c);
      StorePixels(c.b, c.g, c.r, a, to + 4 * i);
    }
  });
}

// Powers of all channels of a block, and the same between two changes of single values.
template <PowerCore kCore>
HWY_INLINE void SignedPowers(PixelBlock& block, const PowerExponent& y) {
  SignedPowers<kCore>(block.colors, 3 * block.pixels, block.scratch, y, block.negative);
}
template <PowerCore kCore, class Prepare, class Finish>
HWY_INLINE void Powers(PixelBlock& block, const PowerExponent& y, const Prepare& prepare, const Finish& finish) {
  Powers<kCore>(block.colors, 3 * block.pixels, block.scratch, y, prepare, finish);
}

// A matrix spread over vectors once per call.
struct MatrixVectors {
  HWY_INLINE explicit MatrixVectors(const Matrix3& matrix) {
    for (int i = 0; i < 9; ++i) m[i] = matrix.m[i];
  }
  HWY_INLINE ColorVector Row(int row, const RgbVectors& c) const {
    const ColorTag d;
    const float* w = m + 3 * row;
    return hn::Add(hn::Add(hn::Mul(hn::Set(d, w[0]), c.r), hn::Mul(hn::Set(d, w[1]), c.g)),
                   hn::Mul(hn::Set(d, w[2]), c.b));
  }
  HWY_INLINE void operator()(RgbVectors& c) const {
    const RgbVectors in = c;
    c.r = Row(0, in);
    c.g = Row(1, in);
    c.b = Row(2, in);
  }
  float m[9];
};

HWY_INLINE ColorVector WithSignOf(ColorVector magnitude, ColorVector c) {
  const ColorTag d;
  const auto negative = hn::VecFromMask(d, hn::Lt(c, hn::Zero(d)));
  return hn::Xor(magnitude, hn::And(negative, hn::SignBit(d)));
}

HWY_INLINE ColorVector Luma(const RgbVectors& c, const LumaWeights& luma) {
  const ColorTag d;
  return hn::Add(hn::Add(hn::Mul(hn::Set(d, luma.r), c.r), hn::Mul(hn::Set(d, luma.g), c.g)),
                 hn::Mul(hn::Set(d, luma.b), c.b));
}

HWY_INLINE ColorVector LookupUnit(ColorVector v, const float* table, int size) {
  const ColorTag d;
  const hn::RebindToSigned<ColorTag> di;
  const auto unit = hn::Min(hn::Max(v, hn::Zero(d)), hn::Set(d, 1.0f));
  const auto index = hn::ConvertTo(di, hn::Mul(unit, hn::Set(d, static_cast<float>(size - 1))));
  return hn::GatherIndex(d, table, index);
}

HWY_NOINLINE inline void PullNegatives(RgbVectors& c, const LumaWeights& luma) {
  const ColorTag d;
  const auto zero = hn::Zero(d);
  const auto one = hn::Set(d, 1.0f);
  const ColorVector y = Luma(c, luma);
  const auto negR = hn::Lt(c.r, zero), negG = hn::Lt(c.g, zero), negB = hn::Lt(c.b, zero);
  const ColorVector downR = hn::Sub(y, c.r), downG = hn::Sub(y, c.g), downB = hn::Sub(y, c.b);
  const auto stuck = hn::Or(hn::Or(hn::And(negR, hn::Eq(downR, zero)), hn::And(negG, hn::Eq(downG, zero))),
                            hn::And(negB, hn::Eq(downB, zero)));
  const auto pull = hn::AndNot(stuck, hn::Or(hn::Or(negR, negG), negB));
  const ColorVector t =
      hn::Min(hn::Min(hn::IfThenElse(negR, hn::Div(y, downR), one), hn::IfThenElse(negG, hn::Div(y, downG), one)),
              hn::IfThenElse(negB, hn::Div(y, downB), one));
  const auto holds = hn::Ge(y, zero);
  const auto move = [&](ColorVector v) HWY_ATTR {
    const ColorVector pulled = hn::Add(y, hn::Mul(hn::Sub(v, y), t));
    return hn::IfThenElse(pull, hn::IfThenElse(holds, hn::Max(pulled, zero), pulled), v);
  };
  c = {move(c.r), move(c.g), move(c.b)};
}

HWY_NOINLINE inline void ScaleOver(RgbVectors& c, const LumaWeights& luma) {
  const ColorTag d;
  const auto one = hn::Set(d, 1.0f);
  const auto over = hn::Or(hn::Or(hn::Gt(c.r, one), hn::Gt(c.g, one)), hn::Gt(c.b, one));
  const ColorVector least = hn::Min(hn::Min(c.r, c.g), c.b);
  const ColorVector most = hn::Max(hn::Max(c.r, c.g), c.b);
  const ColorVector s = hn::Div(one, hn::Sub(most, least));
  const auto part = [&](float weight, ColorVector v)
                        HWY_ATTR { return hn::Mul(hn::Mul(hn::Set(d, weight), hn::Sub(v, least)), s); };
  const ColorVector weighted = hn::Add(hn::Add(part(luma.r, c.r), part(luma.g, c.g)), part(luma.b, c.b));
  const ColorVector pivot = hn::Min(hn::Max(weighted, hn::Set(d, 0.15f)), hn::Set(d, 0.9f));
  const ColorVector k = hn::Div(hn::Sub(one, pivot), hn::Sub(most, pivot));
  const auto move = [&](ColorVector v) HWY_ATTR {
    const ColorVector scaled = hn::Min(one, hn::Add(hn::Mul(hn::Sub(v, pivot), k), pivot));
    return hn::IfThenElse(over, hn::IfThenElse(hn::Eq(v, most), one, scaled), v);
  };
  c = {move(c.r), move(c.g), move(c.b)};
}

// Most pixels lie inside the gamut: the divisions wait for one that does not.
HWY_INLINE void CompressGamut(RgbVectors& c, const LumaWeights& luma) {
  const ColorTag d;
  const auto zero = hn::Zero(d);
  const auto one = hn::Set(d, 1.0f);
  const auto negative = hn::Or(hn::Or(hn::Lt(c.r, zero), hn::Lt(c.g, zero)), hn::Lt(c.b, zero));
  if (!hn::AllFalse(d, negative)) PullNegatives(c, luma);
  const auto over = hn::Or(hn::Or(hn::Gt(c.r, one), hn::Gt(c.g, one)), hn::Gt(c.b, one));
  if (!hn::AllFalse(d, over)) ScaleOver(c, luma);
}

}  // namespace HWY_NAMESPACE
}  // namespace vexel
HWY_AFTER_NAMESPACE();

#endif
