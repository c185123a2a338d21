// The scaffold of the blend kernels in vectors: pixels brought into one vector per channel, blended, brought back.
#if defined(VEXEL_COMPOSITE_BLENDVECTORS_INL_H_) == defined(HWY_TARGET_TOGGLE)
#ifdef VEXEL_COMPOSITE_BLENDVECTORS_INL_H_
#undef VEXEL_COMPOSITE_BLENDVECTORS_INL_H_
#else
#define VEXEL_COMPOSITE_BLENDVECTORS_INL_H_
#endif

#include <cstddef>
#include <cstdint>
#include <cstring>

#include <hwy/highway.h>

#include "composite/BlendKernels.h"
#include "composite/Opacity.h"
#include "convert/PixelVectors-inl.h"
#include "frame/FloatTranspose-inl.h"

#if HWY_TARGET != HWY_SCALAR
HWY_BEFORE_NAMESPACE();
namespace vexel {
namespace HWY_NAMESPACE {
namespace hn = hwy::HWY_NAMESPACE;

// As many pixels as a vector has floats, in an order of the pixel type's own. Members instead of arrays, which
// compilers keep in memory.
struct Colour {
  F32 blue, green, red;
};
struct Planes {
  Colour colour;
  F32 alpha;
};

// f of each channel of one colour or several.
template <class F, class... Colours>
HWY_INLINE Colour PerChannel(const F& f, const Colours&... c) {
  return {f(c.blue...), f(c.green...), f(c.red...)};
}

HWY_INLINE F32 SetFloat(float value) { return hn::Set(hn::ScalableTag<float>(), value); }
// NaN gives `least`.
HWY_INLINE F32 Limit(F32 x, float least = 0.0f, float most = 1.0f) {
  return hn::Min(hn::Max(x, SetFloat(least)), SetFloat(most));
}

// BGRA_4444_32f. Each 128-bit block of the four channels is the transposed block of four vectors, there and back.
class FloatPixels {
 public:
  static constexpr size_t kBytes = 16;
  explicit HWY_INLINE FloatPixels(const BytePixels&) {}

  HWY_INLINE Planes Load(const uint8_t* p) const {
    Planes planes{{LoadVector<float>(p, 0), LoadVector<float>(p, 1), LoadVector<float>(p, 2)}, LoadVector<float>(p, 3)};
    Transpose4(planes.colour.blue, planes.colour.green, planes.colour.red, planes.alpha);
    return planes;
  }
  HWY_INLINE void Store(const Planes& planes, uint8_t* p) const {
    F32 v0 = planes.colour.blue, v1 = planes.colour.green, v2 = planes.colour.red, v3 = planes.alpha;
    Transpose4(v0, v1, v2, v3);
    StoreVector(v0, p, 0);
    StoreVector(v1, p, 1);
    StoreVector(v2, p, 2);
    StoreVector(v3, p, 3);
  }
};

// Pixels of four bytes, in memory order. They are widened and narrowed as the row conversions do it.
class BytePixelsIn {
 public:
  static constexpr size_t kBytes = 4;
  explicit HWY_INLINE BytePixelsIn(const BytePixels& kind)
      : mOrder(Order(kind.reversed)), mOpaque(OpaqueBits(kind.opaque)) {}

  HWY_INLINE Planes Load(const uint8_t* p) const {
    const hn::ScalableTag<uint32_t> d;
    const auto pixels =
        hn::Or(hn::BitCast(d, hn::TableLookupBytes(LoadVector<uint8_t>(p), mOrder)), hn::BitCast(d, mOpaque));
    const auto byte = hn::Set(d, 255);
    return {{Widen(hn::And(pixels, byte)), Widen(hn::And(hn::ShiftRight<8>(pixels), byte)),
             Widen(hn::And(hn::ShiftRight<16>(pixels), byte))},
            Widen(hn::ShiftRight<24>(pixels))};
  }

 protected:
  static HWY_INLINE U8 Order(bool reversed) {
    alignas(16) static constexpr uint8_t kOrders[2][16] = {{0, 1, 2, 3, 4, 5, 6, 7, 8, 9, 10, 11, 12, 13, 14, 15},
                                                           {3, 2, 1, 0, 7, 6, 5, 4, 11, 10, 9, 8, 15, 14, 13, 12}};
    return hn::LoadDup128(hn::ScalableTag<uint8_t>(), kOrders[reversed]);
  }
  static HWY_INLINE U8 OpaqueBits(bool opaque) {
    return hn::BitCast(hn::ScalableTag<uint8_t>(), hn::Set(hn::ScalableTag<uint32_t>(), opaque ? 0xFF000000u : 0));
  }

  U8 mOrder, mOpaque;

 private:
  static HWY_INLINE F32 Widen(U32 bytes) {
    const hn::ScalableTag<float> d;
    return hn::Mul(hn::ConvertTo(d, hn::BitCast(hn::ScalableTag<int32_t>(), bytes)), SetFloat(k8uTo32f));
  }
};

class BytePixelsOut : BytePixelsIn {
 public:
  explicit HWY_INLINE BytePixelsOut(const BytePixels& kind)
      : BytePixelsIn(kind),
        mPremultiplied(hn::Set(hn::ScalableTag<uint32_t>(), kind.premultiplied ? 0xFFFFFFFFu : 0)) {}

  HWY_INLINE void Store(const Planes& planes, uint8_t* p) const {
    const hn::ScalableTag<float> d;
    const hn::ScalableTag<int16_t> d16;
    const auto factor = hn::IfVecThenElse(hn::BitCast(d, mPremultiplied), planes.alpha, SetFloat(1.0f));
    const auto b = Narrow(hn::Mul(planes.colour.blue, factor)), g = Narrow(hn::Mul(planes.colour.green, factor)),
               r = Narrow(hn::Mul(planes.colour.red, factor)), a = Narrow(planes.alpha);
    // In each block four bytes of every channel, then in the order of the pixels.
    alignas(16) static constexpr uint8_t kInterleave[16] = {0, 4, 8, 12, 1, 5, 9, 13, 2, 6, 10, 14, 3, 7, 11, 15};
    const auto packed = PackBlocks(hn::ReorderDemote2To(d16, b, g), hn::ReorderDemote2To(d16, r, a));
    const auto pixels = hn::TableLookupBytes(packed, hn::LoadDup128(hn::ScalableTag<uint8_t>(), kInterleave));
    StoreVector(hn::TableLookupBytes(hn::Or(pixels, mOpaque), mOrder), p);
  }

 private:
  static HWY_INLINE I32 Narrow(F32 v) { return ConvertNearest(hn::Mul(v, SetFloat(255.0f))); }

  U32 mPremultiplied;
};

// The common form: `blended` takes part as far as the background is there.
HWY_INLINE Planes Composite(const Planes& s, const Planes& d, F32 as, const Colour& blended) {
  const auto one = SetFloat(1.0f);
  const auto ab = d.alpha, ao = hn::Sub(hn::Add(ab, as), hn::Mul(ab, as));
  const auto isClear = hn::Lt(hn::Abs(ao), SetFloat(kAlphaGuard));
  const auto t = hn::Mul(as, hn::Div(one, hn::IfThenElse(isClear, one, ao)));
  const auto rest = hn::Sub(one, t), uncovered = hn::Sub(one, ab);
  const auto channel = [&](F32 sc, F32 dc, F32 bc) HWY_ATTR {
    const auto top = hn::Add(hn::Mul(uncovered, sc), hn::Mul(ab, bc));
    return hn::IfThenZeroElse(isClear, hn::Add(hn::Mul(rest, dc), hn::Mul(t, top)));
  };
  return {PerChannel(channel, s.colour, d.colour, blended), ao};
}

// Blends whole blocks. A function of its own, so that rows and their tails share one copy.
template <class In, class Out, class Mode>
HWY_ATTR HWY_NOINLINE void BlendBlocks(const uint8_t* src, const uint8_t* background, uint8_t* dst, size_t blocks,
                                       const BlendArguments& arguments) {
  constexpr size_t kStep = kLanes<float> * In::kBytes;
  const In srcPixels(arguments.src), backgroundPixels(arguments.background);
  const Out dstPixels(arguments.dst);
  const Mode mode(arguments);
  for (size_t at = 0; at < blocks * kStep; at += kStep)
    dstPixels.Store(mode(srcPixels.Load(src + at), backgroundPixels.Load(background + at)), dst + at);
}

template <class In, class Out, class Mode>
HWY_ATTR void BlendRow(const uint8_t* src, const uint8_t* background, uint8_t* dst, size_t count,
                       const BlendArguments& arguments) {
  constexpr size_t kBlock = kLanes<float>, kPixel = In::kBytes;
  if (const size_t blocks = count / kBlock) BlendBlocks<In, Out, Mode>(src, background, dst, blocks, arguments);
  if (const size_t rest = count % kBlock) {
    alignas(64) uint8_t in[2][kBlock * kPixel] = {};
    alignas(64) uint8_t out[kBlock * kPixel];
    const size_t done = (count - rest) * kPixel;
    std::memcpy(in[0], src + done, (Has(SeededBug::TailOverread) ? kBlock : rest) * kPixel);
    std::memcpy(in[1], background + done, rest * kPixel);
    BlendBlocks<In, Out, Mode>(in[0], in[1], out, 1, arguments);
    std::memcpy(dst + done, out, (Has(SeededBug::TailOverwrite) ? kBlock : rest) * kPixel);
  }
}

}  // namespace HWY_NAMESPACE
}  // namespace vexel
HWY_AFTER_NAMESPACE();
#endif  // HWY_TARGET

#endif

// In the target's namespace of a file that defines `Mode<mode>`, made from the arguments and called with two Planes.
#ifndef VX_DEFINE_BLEND_ROWS
#define VX_DEFINE_BLEND_ROWS                                                                           \
  template <VX_BlendMode kMode>                                                                        \
  HWY_ATTR void BlendFloats(const uint8_t* src, const uint8_t* background, uint8_t* dst, size_t count, \
                            const BlendArguments& arguments) {                                         \
    BlendRow<FloatPixels, FloatPixels, Mode<kMode>>(src, background, dst, count, arguments);           \
  }                                                                                                    \
  template <VX_BlendMode kMode>                                                                        \
  HWY_ATTR void BlendBytes(const uint8_t* src, const uint8_t* background, uint8_t* dst, size_t count,  \
                           const BlendArguments& arguments) {                                          \
    BlendRow<BytePixelsIn, BytePixelsOut, Mode<kMode>>(src, background, dst, count, arguments);        \
  }
#endif
