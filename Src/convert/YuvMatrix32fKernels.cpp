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

#if HWY_TARGET != HWY_SCALAR
HWY_BEFORE_NAMESPACE();
namespace vexel {
namespace HWY_NAMESPACE {
namespace {

// Four vectors of pixels as planes, one vector per channel in memory order. Lane k of block i is pixel i of vector k,
// which is what transposing every block by itself gives.
struct Planes {
  F32 c0, c1, c2, c3;
};

HWY_INLINE F32 JoinLower(F32 a, F32 b) {
  const hn::ScalableTag<double> d;
  return hn::BitCast(FloatTag(), hn::InterleaveLower(d, hn::BitCast(d, a), hn::BitCast(d, b)));
}
HWY_INLINE F32 JoinUpper(F32 a, F32 b) {
  const hn::ScalableTag<double> d;
  return hn::BitCast(FloatTag(), hn::InterleaveUpper(d, hn::BitCast(d, a), hn::BitCast(d, b)));
}

// Its own inverse.
HWY_INLINE Planes Transpose(const Planes& v) {
  const FloatTag d;
  const auto lower01 = hn::InterleaveLower(d, v.c0, v.c1), upper01 = hn::InterleaveUpper(d, v.c0, v.c1);
  const auto lower23 = hn::InterleaveLower(d, v.c2, v.c3), upper23 = hn::InterleaveUpper(d, v.c2, v.c3);
  return {JoinLower(lower01, lower23), JoinUpper(lower01, lower23), JoinLower(upper01, upper23),
          JoinUpper(upper01, upper23)};
}

struct Float {
  static constexpr size_t kBytes = 16;
  static HWY_INLINE Planes Load(const uint8_t* HWY_RESTRICT src) {
    return Transpose(
        {LoadVector<float>(src, 0), LoadVector<float>(src, 1), LoadVector<float>(src, 2), LoadVector<float>(src, 3)});
  }
  static HWY_INLINE void Store(const Planes& planes, uint8_t* HWY_RESTRICT dst) {
    const Planes pixels = Transpose(planes);
    StoreVector(pixels.c0, dst, 0);
    StoreVector(pixels.c1, dst, 1);
    StoreVector(pixels.c2, dst, 2);
    StoreVector(pixels.c3, dst, 3);
  }
};

struct Vuya8 {
  static constexpr size_t kBytes = 4;

  template <int kChannel>
  static HWY_INLINE F32 ToFloat(I32 codes) {
    const hn::RebindToSigned<FloatTag> di;
    const auto zeroBased = hn::Sub(codes, hn::Set(di, kVuya8Scale.zero[kChannel]));
    return hn::Mul(hn::ConvertTo(FloatTag(), zeroBased), hn::Set(FloatTag(), kVuya8Scale.toFloat[kChannel]));
  }
  template <int kChannel>
  static HWY_INLINE I32 ToCodes(F32 v) {
    const FloatTag d;
    return ConvertNearest(
        hn::Add(hn::Mul(v, hn::Set(d, kVuya8Scale.fromFloat[kChannel])), hn::Set(d, kVuya8Scale.offset[kChannel])));
  }

  static HWY_INLINE Planes Load(const uint8_t* HWY_RESTRICT src) {
    const hn::ScalableTag<uint32_t> du;
    const hn::RebindToSigned<FloatTag> di;
    const auto pixels = UnorderPacked4(LoadVector<uint32_t>(src));
    const auto byte = hn::Set(du, 0xFF);
    return {ToFloat<0>(hn::BitCast(di, hn::And(pixels, byte))),
            ToFloat<1>(hn::BitCast(di, hn::And(hn::ShiftRight<8>(pixels), byte))),
            ToFloat<2>(hn::BitCast(di, hn::And(hn::ShiftRight<16>(pixels), byte))),
            ToFloat<3>(hn::BitCast(di, hn::ShiftRight<24>(pixels)))};
  }
  static HWY_INLINE void Store(const Planes& planes, uint8_t* HWY_RESTRICT dst) {
    alignas(16) static constexpr uint8_t kByPixel[16] = {0, 4, 8, 12, 1, 5, 9, 13, 2, 6, 10, 14, 3, 7, 11, 15};
    const hn::ScalableTag<int16_t> d16;
    const auto channels = PackBlocks(hn::ReorderDemote2To(d16, ToCodes<0>(planes.c0), ToCodes<1>(planes.c1)),
                                     hn::ReorderDemote2To(d16, ToCodes<2>(planes.c2), ToCodes<3>(planes.c3)));
    const hn::ScalableTag<uint8_t> d8;
    StoreVector(OrderPacked4(hn::TableLookupBytes(channels, hn::LoadDup128(d8, kByPixel))), dst);
  }

 private:
  // The inverse of OrderPacked4.
  static HWY_INLINE U32 UnorderPacked4(U32 v) {
#if HWY_TARGET == HWY_AVX2
    return U32{_mm256_permutevar8x32_epi32(v.raw, _mm256_setr_epi32(0, 2, 4, 6, 1, 3, 5, 7))};
#else
    const hn::ScalableTag<uint8_t> d8;
    return hn::BitCast(hn::ScalableTag<uint32_t>(), OrderPacked4(hn::BitCast(d8, v)));  // a square, or nothing
#endif
  }
};

HWY_INLINE F32 Times(double coefficient, F32 v) {
  return hn::Mul(hn::Set(FloatTag(), static_cast<float>(coefficient)), v);
}

// The steps leave the fourth channel alone.
template <const YuvMatrix& kM>
struct ToYuv {
  static HWY_INLINE Planes Apply(const Planes& bgra) {
    const F32 b = bgra.c0, g = bgra.c1, r = bgra.c2;
    return {hn::Add(hn::Add(Times(kM.vR, r), Times(kM.vG, g)), Times(kM.vB, b)),
            hn::Add(hn::Add(Times(kM.uR, r), Times(kM.uG, g)), Times(kM.uB, b)),
            hn::Add(hn::Add(Times(kM.yR, r), Times(kM.yG, g)), Times(kM.yB, b)), bgra.c3};
  }
};

template <const YuvMatrix& kM>
struct ToBgr {
  static HWY_INLINE Planes Apply(const Planes& vuya) {
    const F32 v = vuya.c0, u = vuya.c1, y = vuya.c2;
    return {hn::Add(y, Times(kM.bU, u)), hn::Add(hn::Add(y, Times(kM.gU, u)), Times(kM.gV, v)),
            hn::Add(y, Times(kM.rV, v)), vuya.c3};
  }
};

template <const YuvRecoding& kR>
struct RecodeYuv {
  static HWY_INLINE Planes Apply(const Planes& vuya) {
    const F32 v = vuya.c0, u = vuya.c1, y = vuya.c2;
    return {hn::Add(Times(kR.vU, u), Times(kR.vV, v)), hn::Add(Times(kR.uU, u), Times(kR.uV, v)),
            hn::Add(hn::Add(Times(kR.yU, u), Times(kR.yV, v)), y), vuya.c3};
  }
};

template <class Source, class Step, class Destination, bool kOpaque>
struct MatrixBlock {
  HWY_INLINE void operator()(const uint8_t* HWY_RESTRICT in, uint8_t* HWY_RESTRICT out) const {
    Planes pixels = Step::Apply(Source::Load(in));
    if (kOpaque) pixels.c3 = hn::Set(FloatTag(), 1.0f);
    Destination::Store(pixels, out);
  }
};

#define VX_VECTOR_KERNEL(name, Source, Step, Destination, opaque)                              \
  void name(const uint8_t* src, uint8_t* dst, size_t count) {                                  \
    using Block = MatrixBlock<Source, Step, Destination, opaque>;                              \
    RowLoop<4 * kVectorPixels, Source::kBytes, Destination::kBytes>(src, dst, count, Block()); \
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
