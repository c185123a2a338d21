// Matrices between R'G'B' and Y'CbCr and between the colorimetries of Y'CbCr, in single precision. Products are added
// in the order of their formula, so every variant gives the same bits.
#include <cstddef>
#include <cstdint>

#include "convert/PlainYuv.h"
#include "convert/StudioScale.h"
#include "convert/YuvKernels.h"
#include "convert/YuvMatrices.h"

#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "convert/YuvMatrix32fKernels.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

#include "convert/FloatPixels-inl.h"
#include "frame/KernelTable.h"

// name, source unit, matrix step, destination unit, alpha written opaque
#ifndef VX_YUV_MATRIX_KERNELS
#define VX_YUV_MATRIX_KERNELS(KERNEL)                                 \
  KERNEL(Bgra32fToVuya32f_601, Float, ToYuv<kBt601>, Float, false)    \
  KERNEL(Bgra32fToVuya32f_709, Float, ToYuv<kBt709>, Float, false)    \
  KERNEL(Bgrx32fToVuyx32f_601, Float, ToYuv<kBt601>, Float, true)     \
  KERNEL(Bgrx32fToVuyx32f_709, Float, ToYuv<kBt709>, Float, true)     \
  KERNEL(Vuya32fToBgra32f_601, Float, ToBgr<kBt601>, Float, false)    \
  KERNEL(Vuya32fToBgra32f_709, Float, ToBgr<kBt709>, Float, false)    \
  KERNEL(Vuyx32fToBgrx32f_601, Float, ToBgr<kBt601>, Float, true)     \
  KERNEL(Vuyx32fToBgrx32f_709, Float, ToBgr<kBt709>, Float, true)     \
  KERNEL(Vuya32f_601To709, Float, RecodeYuv<k601To709>, Float, false) \
  KERNEL(Vuya32f_709To601, Float, RecodeYuv<k709To601>, Float, false) \
  KERNEL(Vuyx32f_601To709, Float, RecodeYuv<k601To709>, Float, true)  \
  KERNEL(Vuyx32f_709To601, Float, RecodeYuv<k709To601>, Float, true)  \
  KERNEL(Vuya8ToBgra32f_601, Vuya8, ToBgr<kBt601>, Float, false)      \
  KERNEL(Vuya8ToBgra32f_709, Vuya8, ToBgr<kBt709>, Float, false)      \
  KERNEL(Vuyx8ToBgrx32f_601, Vuya8, ToBgr<kBt601>, Float, true)       \
  KERNEL(Vuyx8ToBgrx32f_709, Vuya8, ToBgr<kBt709>, Float, true)       \
  KERNEL(Bgra32fToVuya8_601, Float, ToYuv<kBt601>, Vuya8, false)      \
  KERNEL(Bgra32fToVuya8_709, Float, ToYuv<kBt709>, Vuya8, false)
#endif

#if HWY_TARGET != HWY_BASELINE_SCALAR
HWY_BEFORE_NAMESPACE();
namespace vexel {
namespace HWY_NAMESPACE {
namespace {

struct Float {
  static constexpr size_t kBytes = 16;
  static HWY_INLINE F32 Load(const uint8_t* HWY_RESTRICT src, size_t index) { return LoadVector<float>(src, index); }
  static HWY_INLINE void Store(F32 a, F32 b, F32 c, F32 d, uint8_t* HWY_RESTRICT dst) {
    StoreVector(a, dst, 0);
    StoreVector(b, dst, 1);
    StoreVector(c, dst, 2);
    StoreVector(d, dst, 3);
  }
};

struct Vuya8 {
  static constexpr size_t kBytes = 4;
  static HWY_INLINE F32 Load(const uint8_t* HWY_RESTRICT src, size_t index) {
    return WidenCodes<kVuya8Scale>(src + index * kLanes<float>);
  }
  static HWY_INLINE void Store(F32 a, F32 b, F32 c, F32 d, uint8_t* HWY_RESTRICT dst) {
    StoreVector(PackTo8(ScaleToCodes<kVuya8Scale>(a), ScaleToCodes<kVuya8Scale>(b), ScaleToCodes<kVuya8Scale>(c),
                        ScaleToCodes<kVuya8Scale>(d)),
                dst);
  }
};

constexpr Channels MakeChannels(double c0, double c1, double c2) {
  return {{static_cast<float>(c0), static_cast<float>(c1), static_cast<float>(c2), 0.0f}};
}

// The matrix steps leave the fourth channel undefined. They broadcast each source channel over its pixel and multiply
// it with its column of the matrix, which costs fewer shuffles than transposing pixels to planes and back. Subtracting
// a product is adding that of the negated coefficient.
template <const YuvMatrix& kM>
struct ToYuv {
  static HWY_INLINE F32 Apply(F32 bgra) {
    static constexpr Channels kR = MakeChannels(kM.vR, kM.uR, kM.yR);
    static constexpr Channels kG = MakeChannels(kM.vG, kM.uG, kM.yG);
    static constexpr Channels kB = MakeChannels(kM.vB, kM.uB, kM.yB);
    const auto r = hn::Mul(hn::Broadcast<2>(bgra), kR.Vector());
    const auto g = hn::Mul(hn::Broadcast<1>(bgra), kG.Vector());
    const auto b = hn::Mul(hn::Broadcast<0>(bgra), kB.Vector());
    return hn::Add(hn::Add(r, g), b);
  }
};

// No zero coefficients here: zero times infinity would leak NaN into channels that do not use the factor.
template <const YuvMatrix& kM>
struct ToBgr {
  static HWY_INLINE F32 Apply(F32 vuya) {
    static constexpr Channels kFirst = MakeChannels(kM.bU, kM.gU, kM.rV);
    static constexpr Channels kSecond = MakeChannels(0, kM.gV, 0);
    const auto uuv = PermuteChannels<1, 1, 0, 3>(vuya);
    const auto oneTerm = hn::Add(hn::Broadcast<2>(vuya), hn::Mul(uuv, kFirst.Vector()));
    const auto twoTerms = hn::Add(oneTerm, hn::Mul(hn::Broadcast<0>(vuya), kSecond.Vector()));
    return TakeChannels<2>(oneTerm, twoTerms);
  }
};

template <const YuvRecoding& kR>
struct RecodeYuv {
  static HWY_INLINE F32 Apply(F32 vuya) {
    static constexpr Channels kU = MakeChannels(kR.vU, kR.uU, kR.yU);
    static constexpr Channels kV = MakeChannels(kR.vV, kR.uV, kR.yV);
    const auto chroma =
        hn::Add(hn::Mul(hn::Broadcast<1>(vuya), kU.Vector()), hn::Mul(hn::Broadcast<0>(vuya), kV.Vector()));
    return TakeChannels<4>(chroma, hn::Add(chroma, vuya));
  }
};

template <class Source, class Step, class Destination, bool kOpaque>
struct MatrixBlock {
  static constexpr size_t kPixels = 4 * kVectorPixels;
  HWY_INLINE void operator()(const uint8_t* HWY_RESTRICT in, uint8_t* HWY_RESTRICT out) const {
    const F32 a = Source::Load(in, 0), b = Source::Load(in, 1), c = Source::Load(in, 2), d = Source::Load(in, 3);
    Destination::Store(FinishAlpha<kOpaque>(Step::Apply(a), a), FinishAlpha<kOpaque>(Step::Apply(b), b),
                       FinishAlpha<kOpaque>(Step::Apply(c), c), FinishAlpha<kOpaque>(Step::Apply(d), d), out);
  }
};

#define VX_VECTOR_KERNEL(name, Source, Step, Destination, opaque)                           \
  void name(const uint8_t* src, uint8_t* dst, size_t count) {                               \
    using Block = MatrixBlock<Source, Step, Destination, opaque>;                           \
    RowLoop<Block::kPixels, Source::kBytes, Destination::kBytes>(src, dst, count, Block()); \
  }
VX_YUV_MATRIX_KERNELS(VX_VECTOR_KERNEL)
#undef VX_VECTOR_KERNEL

}  // namespace
}  // namespace HWY_NAMESPACE
}  // namespace vexel
HWY_AFTER_NAMESPACE();
#endif  // HWY_TARGET

#if HWY_ONCE
namespace vexel {
namespace plain {
namespace {

struct Float {
  static constexpr size_t kBytes = 16;
  static Quad Load(const uint8_t* p) { return LoadQuad(p); }
  static void Store(const Quad& quad, uint8_t* p) { StoreQuad(quad, p); }
};

struct Vuya8 {
  static constexpr size_t kBytes = 4;
  static Quad Load(const uint8_t* p) { return Vuya8ToFloat(p); }
  static void Store(const Quad& quad, uint8_t* p) { FloatToVuya8(quad, p); }
};

float Times(double coefficient, float v) { return static_cast<float>(coefficient) * v; }

template <const YuvMatrix& kM>
struct ToYuv {
  static Quad Apply(const Quad& bgra) {
    const float b = bgra.c[0], g = bgra.c[1], r = bgra.c[2];
    return {{Times(kM.vR, r) + Times(kM.vG, g) + Times(kM.vB, b), Times(kM.uR, r) + Times(kM.uG, g) + Times(kM.uB, b),
             Times(kM.yR, r) + Times(kM.yG, g) + Times(kM.yB, b), bgra.c[3]}};
  }
};

template <const YuvMatrix& kM>
struct ToBgr {
  static Quad Apply(const Quad& vuya) {
    const float v = vuya.c[0], u = vuya.c[1], y = vuya.c[2];
    return {{y + Times(kM.bU, u), y + Times(kM.gU, u) + Times(kM.gV, v), y + Times(kM.rV, v), vuya.c[3]}};
  }
};

template <const YuvRecoding& kR>
struct RecodeYuv {
  static Quad Apply(const Quad& vuya) {
    const float v = vuya.c[0], u = vuya.c[1], y = vuya.c[2];
    return {{Times(kR.vU, u) + Times(kR.vV, v), Times(kR.uU, u) + Times(kR.uV, v),
             Times(kR.yU, u) + Times(kR.yV, v) + y, vuya.c[3]}};
  }
};

template <class Source, class Step, class Destination, bool kOpaque>
void MatrixRow(const uint8_t* src, uint8_t* dst, size_t count) {
  for (size_t i = 0; i < count; ++i) {
    Quad pixel = Step::Apply(Source::Load(src + i * Source::kBytes));
    if (kOpaque) pixel.c[3] = 1.0f;
    Destination::Store(pixel, dst + i * Destination::kBytes);
  }
}

#define VX_PLAIN_KERNEL(name, Source, Step, Destination, opaque)   \
  void name(const uint8_t* src, uint8_t* dst, size_t count) {      \
    MatrixRow<Source, Step, Destination, opaque>(src, dst, count); \
  }
VX_YUV_MATRIX_KERNELS(VX_PLAIN_KERNEL)
#undef VX_PLAIN_KERNEL

}  // namespace
}  // namespace plain

#define VX_KERNEL_SET(name, ...) const RowKernelSet k##name = VX_KERNEL_VARIANTS(name);
VX_YUV_MATRIX_KERNELS(VX_KERNEL_SET)
#undef VX_KERNEL_SET

}  // namespace vexel
#endif
