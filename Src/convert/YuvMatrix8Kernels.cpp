// Matrices of 8-bit 4:4:4 pixels in fixed point: RGB to Y'CbCr, back, and from one colorimetry to the other.
#include <cstddef>
#include <cstdint>

#include "convert/PlainPixels.h"
#include "convert/Vnni.h"
#include "convert/YuvFixed8.h"
#include "convert/YuvKernels.h"

#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "convert/YuvMatrix8Kernels.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

#include "convert/YuvVectors8-inl.h"
#include "frame/KernelTable.h"

// X(kernel, family, coefficients, alpha): all kernels of this file.
#ifndef VEXEL_CONVERT_YUVMATRIX8_KERNELS
#define VEXEL_CONVERT_YUVMATRIX8_KERNELS(X)                             \
  X(Bgra8ToVuya8_601, RgbToYuv, kRgbToYuv8_601, AlphaWrite::Keep)       \
  X(Bgra8ToVuya8_709, RgbToYuv, kRgbToYuv8_709, AlphaWrite::Keep)       \
  X(Bgrx8ToVuyx8_601, RgbToYuv, kRgbToYuv8_601, AlphaWrite::OpaqueLast) \
  X(Bgrx8ToVuyx8_709, RgbToYuv, kRgbToYuv8_709, AlphaWrite::OpaqueLast) \
  X(Vuya8ToBgra8_601, YuvToRgb, kYuvToRgb8_601, AlphaWrite::Keep)       \
  X(Vuya8ToBgra8_709, YuvToRgb, kYuvToRgb8_709, AlphaWrite::Keep)       \
  X(Vuyx8ToBgrx8_601, YuvToRgb, kYuvToRgb8_601, AlphaWrite::OpaqueLast) \
  X(Vuyx8ToBgrx8_709, YuvToRgb, kYuvToRgb8_709, AlphaWrite::OpaqueLast) \
  X(Vuya8_601To709, YuvToYuv, kYuv8_601To709, AlphaWrite::Keep)         \
  X(Vuya8_709To601, YuvToYuv, kYuv8_709To601, AlphaWrite::Keep)         \
  X(Vuyx8_601To709, YuvToYuv, kYuv8_601To709, AlphaWrite::OpaqueLast)   \
  X(Vuyx8_709To601, YuvToYuv, kYuv8_709To601, AlphaWrite::OpaqueLast)
#endif

#if HWY_TARGET != HWY_SCALAR
HWY_BEFORE_NAMESPACE();
namespace vexel {
namespace HWY_NAMESPACE {
namespace {

// No result leaves 0..255, so the sums' third bytes are the results.
template <AlphaWrite kAlpha, bool kVnni>
struct RgbToYuvOp {
  HWY_INLINE U8 operator()(U8 bgra) const {
    const auto pixels = matrix.Split(bgra);
    const I32 v = matrix.V(pixels, matrix.chromaBias), u = matrix.U(pixels, matrix.chromaBias), y = matrix.Y(pixels);
    const U8 alpha = kAlpha == AlphaWrite::Keep ? bgra : Dwords(0xFF000000);
#if HWY_TARGET == HWY_AVX3
    const __m512i third = ByteOrder<0x2222>().raw;
    __m512i out = _mm512_mask_mov_epi8(alpha.raw, ByteMask(0x00FF0000), y.raw);
    out = _mm512_mask_shuffle_epi8(out, ByteMask(0x000000FF), v.raw, third);
    return U8{_mm512_mask_shuffle_epi8(out, ByteMask(0x0000FF00), u.raw, third)};
#else
    const auto vy = hn::OddEven(AsU16(y), AsU16(hn::ShiftRight<16>(v)));
    const auto ua = hn::OddEven(AsU16(alpha), AsU16(hn::ShiftRight<8>(u)));
    return SelectBytes(Dwords(0xFF00FF00), AsU8(ua), AsU8(vy));
#endif
  }
  VectorRgbToYuv8<kVnni> matrix;
};

template <AlphaWrite kAlpha>
struct YuvToYuvOp {
  HWY_INLINE U8 operator()(U8 vuya) const {
    const I16 outer = VectorMatrix8::OuterChannels(vuya), inner = matrix.InnerChannel(vuya);
    const I32 v = hn::ShiftRight<14>(matrix.Sum(0, outer, inner));
    const I32 u = hn::ShiftLeft<2>(matrix.Sum(1, outer, inner));
    const I32 y = hn::ShiftLeft<2>(matrix.Sum(2, outer, inner));
    return PackPixels<kAlpha>(hn::OddEven(AsI16(y), AsI16(v)), AsI16(u), vuya);
  }
  VectorMatrix8 matrix;
};

template <AlphaWrite kAlpha>
struct YuvToRgbOp {
  HWY_INLINE U8 operator()(U8 vuya) const {
    const auto uv = AsI16(hn::Xor(hn::TableLookupBytes(vuya, ByteOrder<0x0818>()), Dwords(0x80008000)));
    const I16 y = matrix.Luma(AsU16(hn::TableLookupBytes(vuya, ByteOrder<0x2828>())));
    return PackPixels<kAlpha>(matrix.AddChroma(y, uv, matrix.blueRed), matrix.Integers(y, matrix.GreenChroma(uv)),
                              vuya);
  }
  VectorYuvToRgb8 matrix;
};

template <class Op, class Matrix>
HWY_INLINE void MapPixels(const uint8_t* src, uint8_t* dst, size_t count, const Matrix& matrix) {
  MapRow<uint8_t>(src, dst, count, EachVector<uint8_t, Op>{Op{decltype(Op::matrix)(matrix)}});
}
template <AlphaWrite kAlpha>
HWY_ATTR void RgbToYuv(const uint8_t* src, uint8_t* dst, size_t count, const FixedMatrix8& matrix) {
  if (HWY_TARGET == HWY_AVX3 && HasVnni())
    MapPixels<RgbToYuvOp<kAlpha, true>>(src, dst, count, matrix);
  else
    MapPixels<RgbToYuvOp<kAlpha, false>>(src, dst, count, matrix);
}
template <AlphaWrite kAlpha>
HWY_ATTR void YuvToYuv(const uint8_t* src, uint8_t* dst, size_t count, const FixedMatrix8& matrix) {
  MapPixels<YuvToYuvOp<kAlpha>>(src, dst, count, matrix);
}
template <AlphaWrite kAlpha>
HWY_ATTR void YuvToRgb(const uint8_t* src, uint8_t* dst, size_t count, const FixedYuvToRgb8& matrix) {
  MapPixels<YuvToRgbOp<kAlpha>>(src, dst, count, matrix);
}

#define VX_KERNEL(Name, Family, kCoefficients, kAlpha) \
  HWY_ATTR void Name(const uint8_t* src, uint8_t* dst, size_t count) { Family<kAlpha>(src, dst, count, kCoefficients); }
VEXEL_CONVERT_YUVMATRIX8_KERNELS(VX_KERNEL)
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

struct Multiply {
  const FixedMatrix8& matrix;
  void operator()(const uint8_t* in, uint8_t* out) const { MultiplyMatrix8(matrix, in, out); }
};
using RgbToYuv = Multiply;
using YuvToYuv = Multiply;

struct YuvToRgb {
  const FixedYuvToRgb8& matrix;
  void operator()(const uint8_t* vuya, uint8_t* bgra) const {
    Yuv8ToBgr8(matrix, vuya[2], 256 * (vuya[1] - 128), 256 * (vuya[0] - 128), bgra);
  }
};

#define VX_KERNEL(Name, Family, kCoefficients, kAlpha)                                 \
  void Name(const uint8_t* src, uint8_t* dst, size_t count) {                          \
    MapPixels<uint8_t, uint8_t>(src, dst, count, [](const uint8_t* in, uint8_t* out) { \
      Family{kCoefficients}(in, out);                                                  \
      out[3] = kAlpha == AlphaWrite::Keep ? in[3] : 255;                               \
    });                                                                                \
  }
VEXEL_CONVERT_YUVMATRIX8_KERNELS(VX_KERNEL)
#undef VX_KERNEL

}  // namespace
}  // namespace plain

#define VX_KERNEL(Name, Family, kCoefficients, kAlpha) const RowKernelSet k##Name = VX_KERNEL_VARIANTS(Name);
VEXEL_CONVERT_YUVMATRIX8_KERNELS(VX_KERNEL)
#undef VX_KERNEL

}  // namespace vexel
#endif  // HWY_ONCE
