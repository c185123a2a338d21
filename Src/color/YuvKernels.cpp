// BT.2020 non-constant-luminance Y'CbCr as floats and from P010.
#include <cstddef>
#include <cstdint>
#include <cstring>

#include "color/PixelKernels.h"
#include "color/PlainPixels.h"

#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "color/YuvKernels.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

#include "color/ColorVectors-inl.h"
#include "frame/KernelTable.h"

#ifndef VEXEL_COLOR_YUVKERNELS_CONSTANTS
#define VEXEL_COLOR_YUVKERNELS_CONSTANTS
namespace vexel {
namespace {
constexpr float kBlueFromCb = 1.8814f, kGreenFromCb = 0.1645f, kGreenFromCr = 0.5713f, kRedFromCr = 1.4746f;
// Rows Cr, Cb, Y' of R, G, B.
constexpr float kFromRgb[9] = {0.5f, 0.4598f, 0.0402f, -0.1396f, 0.3604f, 0.5f, 0.2627f, 0.6780f, 0.0593f};
constexpr int kP010Black = 4096, kP010Neutral = 32768;
constexpr float kP010LumaRange = 56065.0f, kP010ChromaRange = 57345.0f;
}  // namespace
}  // namespace vexel
#endif

#if HWY_TARGET != HWY_SCALAR
HWY_BEFORE_NAMESPACE();
namespace vexel {
namespace HWY_NAMESPACE {
namespace {

HWY_INLINE RgbVectors FromYuv(ColorVector y, ColorVector cb, ColorVector cr) {
  const ColorTag d;
  return {hn::Add(y, hn::Mul(cr, hn::Set(d, kRedFromCr))),
          hn::Sub(hn::Sub(y, hn::Mul(cb, hn::Set(d, kGreenFromCb))), hn::Mul(cr, hn::Set(d, kGreenFromCr))),
          hn::Add(y, hn::Mul(cb, hn::Set(d, kBlueFromCb)))};
}

// The pixel order V, U, Y, A stands where B, G, R, A stands otherwise.
void Yuv2020ToRgb(const float* src, float* dst, size_t count) {
  ForEachPixel(src, dst, count, [](RgbVectors& c) VX_COLOR_STAGE { c = FromYuv(c.r, c.g, c.b); });
}

void RgbToYuv2020(const float* src, float* dst, size_t count) {
  ForEachPixel(src, dst, count, [](RgbVectors& c) VX_COLOR_STAGE {
    const ColorTag d;
    const auto product = [&](int i, ColorVector v) HWY_ATTR { return hn::Mul(v, hn::Set(d, kFromRgb[i])); };
    const auto cr = hn::Sub(hn::Sub(product(0, c.r), product(1, c.g)), product(2, c.b));
    const auto cb = hn::Add(hn::Sub(product(3, c.r), product(4, c.g)), product(5, c.b));
    const auto y = hn::Add(hn::Add(product(6, c.r), product(7, c.g)), product(8, c.b));
    c = {y, cb, cr};
  });
}

// The lanes of one value per pixel pair that the pixels of a vector take, in the order of StorePixels, from the first
// (kHalf 0) or the second half of the pairs.
template <int kHalf>
HWY_INLINE auto PairLanes() {
  const ColorTag d;
  constexpr size_t kLanes = hn::MaxLanes(ColorTag()), kBlocks = HWY_MAX(kLanes / 4, 1);
  HWY_ALIGN int32_t lanes[kLanes];
  for (size_t i = 0; i < kLanes; ++i)
    lanes[i] = static_cast<int32_t>((kHalf * kLanes + i % 4 * kBlocks + i / 4) / 2 % kLanes);
  return hn::SetTableIndices(d, lanes);
}
HWY_INLINE auto PixelLanes() {
  const hn::RebindToSigned<ColorTag> di;
  constexpr size_t kLanes = hn::MaxLanes(ColorTag()), kBlocks = HWY_MAX(kLanes / 4, 1);
  HWY_ALIGN int32_t lanes[kLanes];
  for (size_t i = 0; i < kLanes; ++i) lanes[i] = static_cast<int32_t>((i % 4 * kBlocks + i / 4) % kLanes);
  return hn::SetTableIndices(di, lanes);
}

void P010ToRgb2020(const uint16_t* luma, const uint16_t* chroma, float* dst, size_t count) {
  const ColorTag d;
  const hn::RebindToSigned<ColorTag> di;
  const hn::Rebind<uint16_t, ColorTag> d16;
  const hn::RebindToUnsigned<ColorTag> pairs;
  constexpr size_t kLanes = hn::MaxLanes(ColorTag());
  const auto firstPairs = PairLanes<0>(), secondPairs = PairLanes<1>();
  const auto order = PixelLanes();
  const auto chromaOf = [&](hn::Vec<decltype(pairs)> code) HWY_ATTR {
    const auto value = hn::Div(hn::ConvertTo(d, hn::Sub(hn::BitCast(di, code), hn::Set(di, kP010Neutral))),
                               hn::Set(d, kP010ChromaRange));
    return hn::Min(hn::Max(value, hn::Set(d, -0.5f)), hn::Set(d, 0.5f));
  };
  const auto half = [&](const uint16_t* from, ColorVector cb, ColorVector cr, float* to) VX_COLOR_STAGE {
    const auto aboveBlack = hn::SaturatedSub(hn::LoadU(d16, from), hn::Set(d16, kP010Black));
    const auto inRange = hn::Min(aboveBlack, hn::Set(d16, static_cast<uint16_t>(kP010LumaRange)));
    const auto code = hn::TableLookupLanes(hn::PromoteTo(di, inRange), order);
    const auto y = hn::Div(hn::ConvertTo(d, code), hn::Set(d, kP010LumaRange));
    const RgbVectors c = FromYuv(y, cb, cr);
    StorePixels(c.b, c.g, c.r, hn::Set(d, 1.0f), to);
  };
  const auto body = [&](const uint16_t* fromLuma, const uint16_t* fromChroma, float* to) VX_COLOR_STAGE {
    // A pair U, V is the low and high half of 32 bits.
    const auto uv = hn::LoadU(pairs, reinterpret_cast<const uint32_t*>(fromChroma));
    const auto cb = chromaOf(hn::And(uv, hn::Set(pairs, 0xffff)));
    const auto cr = chromaOf(hn::ShiftRight<16>(uv));
    half(fromLuma, hn::TableLookupLanes(cb, firstPairs), hn::TableLookupLanes(cr, firstPairs), to);
    half(fromLuma + kLanes, hn::TableLookupLanes(cb, secondPairs), hn::TableLookupLanes(cr, secondPairs),
         to + 4 * kLanes);
  };
  size_t i = 0;
  for (; i + 2 * kLanes <= count; i += 2 * kLanes) {
    FetchAhead<8 * kLanes * sizeof(float)>(reinterpret_cast<const uint8_t*>(dst + 4 * i));
    body(luma + i, chroma + i, dst + 4 * i);
  }
  if (const size_t rest = count - i) {
    HWY_ALIGN uint16_t lumaBlock[2 * kLanes] = {}, chromaBlock[2 * kLanes] = {};
    HWY_ALIGN float rgbBlock[8 * kLanes];
    std::memcpy(lumaBlock, luma + i, rest * sizeof(uint16_t));
    std::memcpy(chromaBlock, chroma + i, rest * sizeof(uint16_t));
    body(lumaBlock, chromaBlock, rgbBlock);
    std::memcpy(dst + 4 * i, rgbBlock, rest * 4 * sizeof(float));
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

LinearRgb FromYuv(float y, float cb, float cr) {
  return {y + kRedFromCr * cr, y - kGreenFromCb * cb - kGreenFromCr * cr, y + kBlueFromCb * cb};
}

void Yuv2020ToRgb(const float* src, float* dst, size_t count) {
  ForEachPlainPixel(src, dst, count, [](LinearRgb& c) { c = FromYuv(c.r, c.g, c.b); });
}

void RgbToYuv2020(const float* src, float* dst, size_t count) {
  ForEachPlainPixel(src, dst, count, [](LinearRgb& c) {
    const float* m = kFromRgb;
    const float cr = m[0] * c.r - m[1] * c.g - m[2] * c.b;
    const float cb = m[3] * c.r - m[4] * c.g + m[5] * c.b;
    c = {m[6] * c.r + m[7] * c.g + m[8] * c.b, cb, cr};
  });
}

void P010ToRgb2020(const uint16_t* luma, const uint16_t* chroma, float* dst, size_t count) {
  const auto chromaOf = [](int code) {
    return Least(Most(static_cast<float>(code - kP010Neutral) / kP010ChromaRange, -0.5f), 0.5f);
  };
  for (size_t i = 0; i < count; ++i, dst += 4) {
    const size_t pair = i & ~size_t{1};
    const float y = Least(Most(static_cast<float>(luma[i] - kP010Black) / kP010LumaRange, 0.0f), 1.0f);
    const LinearRgb c = FromYuv(y, chromaOf(chroma[pair]), chromaOf(chroma[pair + 1]));
    dst[0] = c.b;
    dst[1] = c.g;
    dst[2] = c.r;
    dst[3] = 1.0f;
  }
}

}  // namespace
}  // namespace plain

const KernelVariants<PixelKernel> kYuv2020ToRgb = VX_KERNEL_VARIANTS(Yuv2020ToRgb);
const KernelVariants<PixelKernel> kRgbToYuv2020 = VX_KERNEL_VARIANTS(RgbToYuv2020);
const KernelVariants<P010Kernel> kP010ToRgb2020 = VX_KERNEL_VARIANTS(P010ToRgb2020);

}  // namespace vexel
#endif  // HWY_ONCE
