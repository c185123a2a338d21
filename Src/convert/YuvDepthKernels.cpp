// Depth of 4:4:4:4 Y'CbCr: studio codes of 8 bits <-> floats with luma in 0..1 and chroma about 0.
#include <cstddef>
#include <cstdint>

#include "convert/PlainYuv.h"
#include "convert/StudioScale.h"
#include "convert/YuvKernels.h"

#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "convert/YuvDepthKernels.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

#include "convert/FloatPixels-inl.h"
#include "frame/KernelTable.h"

#if HWY_TARGET != HWY_SCALAR
HWY_BEFORE_NAMESPACE();
namespace vexel {
namespace HWY_NAMESPACE {
namespace {

struct Kept {
  static HWY_INLINE F32 Apply(F32 v) { return v; }
};
struct Opaque {
  static HWY_INLINE F32 Apply(F32 v) { return FinishAlpha<true>(v, v); }
};
struct Premultiplied {
  static HWY_INLINE F32 Apply(F32 v) { return FinishAlpha<false>(hn::Mul(v, hn::Broadcast<3>(v)), v); }
};

constexpr size_t kBlockPixels = 4 * kVectorPixels;

template <class Alpha>
struct WidenBlock {
  HWY_INLINE void operator()(const uint8_t* HWY_RESTRICT in, uint8_t* HWY_RESTRICT out) const {
    for (size_t i = 0; i < 4; ++i) StoreVector(Alpha::Apply(WidenCodes<kVuya8Scale>(in + i * kLanes<float>)), out, i);
  }
};

void Vuya8To32f(const uint8_t* src, uint8_t* dst, size_t count) {
  RowLoop<kBlockPixels, 4, 16>(src, dst, count, WidenBlock<Kept>());
}
void Vuyx8To32f(const uint8_t* src, uint8_t* dst, size_t count) {
  RowLoop<kBlockPixels, 4, 16>(src, dst, count, WidenBlock<Opaque>());
}
void Vuya8ToVuyp32f(const uint8_t* src, uint8_t* dst, size_t count) {
  RowLoop<kBlockPixels, 4, 16>(src, dst, count, WidenBlock<Premultiplied>());
}

template <class Alpha>
struct NarrowBlock {
  static HWY_INLINE I32 Codes(const uint8_t* HWY_RESTRICT in, size_t index) {
    return ScaleToCodes<kVuya8Scale>(Alpha::Apply(LoadVector<float>(in, index)));
  }
  HWY_INLINE void operator()(const uint8_t* HWY_RESTRICT in, uint8_t* HWY_RESTRICT out) const {
    StoreVector(PackTo8(Codes(in, 0), Codes(in, 1), Codes(in, 2), Codes(in, 3)), out);
  }
};

void Vuya32fTo8(const uint8_t* src, uint8_t* dst, size_t count) {
  RowLoop<kBlockPixels, 16, 4>(src, dst, count, NarrowBlock<Kept>());
}
void Vuyx32fTo8(const uint8_t* src, uint8_t* dst, size_t count) {
  RowLoop<kBlockPixels, 16, 4>(src, dst, count, NarrowBlock<Opaque>());
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

void Vuya8To32f(const uint8_t* src, uint8_t* dst, size_t count) {
  for (; count > 0; --count, src += 4, dst += 16) StoreQuad(Vuya8ToFloat(src), dst);
}

void Vuyx8To32f(const uint8_t* src, uint8_t* dst, size_t count) {
  for (; count > 0; --count, src += 4, dst += 16) {
    Quad pixel = Vuya8ToFloat(src);
    pixel.c[3] = 1.0f;
    StoreQuad(pixel, dst);
  }
}

void Vuya8ToVuyp32f(const uint8_t* src, uint8_t* dst, size_t count) {
  for (; count > 0; --count, src += 4, dst += 16) {
    Quad pixel = Vuya8ToFloat(src);
    for (int i = 0; i < 3; ++i) pixel.c[i] *= pixel.c[3];
    StoreQuad(pixel, dst);
  }
}

void Vuya32fTo8(const uint8_t* src, uint8_t* dst, size_t count) {
  for (; count > 0; --count, src += 16, dst += 4) FloatToVuya8(LoadQuad(src), dst);
}

void Vuyx32fTo8(const uint8_t* src, uint8_t* dst, size_t count) {
  for (; count > 0; --count, src += 16, dst += 4) {
    FloatToVuya8(LoadQuad(src), dst);
    dst[3] = 255;
  }
}

}  // namespace
}  // namespace plain

const RowKernelSet kVuya8To32f = VX_KERNEL_VARIANTS(Vuya8To32f);
const RowKernelSet kVuyx8To32f = VX_KERNEL_VARIANTS(Vuyx8To32f);
const RowKernelSet kVuya8ToVuyp32f = VX_KERNEL_VARIANTS(Vuya8ToVuyp32f);
const RowKernelSet kVuya32fTo8 = VX_KERNEL_VARIANTS(Vuya32fTo8);
const RowKernelSet kVuyx32fTo8 = VX_KERNEL_VARIANTS(Vuyx32fTo8);

}  // namespace vexel
#endif
