// Depths of four-channel RGB: 8u (255), 15u (32768) and 32f (1.0).
#include <cstddef>
#include <cstdint>

#include "convert/PlainPixels.h"
#include "convert/RgbKernels.h"

#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "convert/DepthKernels.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

#include "convert/PixelVectors-inl.h"
#include "frame/KernelTable.h"

#if HWY_TARGET != HWY_SCALAR
HWY_BEFORE_NAMESPACE();
namespace vexel {
namespace HWY_NAMESPACE {
namespace {

// Lanes of From (uint8_t or uint16_t) at `in`, times `factor`.
template <class From>
HWY_INLINE F32 LoadScaled(const uint8_t* in, float factor) {
  const hn::ScalableTag<float> df;
  return hn::Mul(hn::ConvertTo(df, LoadPromoted<int32_t, From>(in)), hn::Set(df, factor));
}

HWY_INLINE I32 LoadConverted(const uint8_t* in, size_t index, float factor) {
  return ConvertNearest(hn::Mul(LoadVector<float>(in, index), hn::Set(hn::ScalableTag<float>(), factor)));
}

template <class From, AlphaWrite kAlpha>
struct WidenTo32f {
  float factor;
  HWY_INLINE void operator()(const uint8_t* in, uint8_t* out) const {
    constexpr size_t kStep = kLanes<float> * sizeof(From);
    const auto v0 = LoadScaled<From>(in, factor), v1 = LoadScaled<From>(in + kStep, factor);
    const auto v2 = LoadScaled<From>(in + 2 * kStep, factor), v3 = LoadScaled<From>(in + 3 * kStep, factor);
    StoreVector(WriteAlpha<kAlpha, float>(v0), out, 0);
    StoreVector(WriteAlpha<kAlpha, float>(v1), out, 1);
    StoreVector(WriteAlpha<kAlpha, float>(v2), out, 2);
    StoreVector(WriteAlpha<kAlpha, float>(v3), out, 3);
  }
};

// 128 x + round(128 x / 255), and the second term is x / 2 rounded up.
template <AlphaWrite kAlpha>
struct Widen8uTo15uBody {
  HWY_INLINE U16 Widen(const uint8_t* in) const {
    const auto v = LoadPromoted<uint16_t, uint8_t>(in);
    const auto wide = hn::Add(hn::ShiftLeft<7>(v), hn::AverageRound(v, hn::Zero(hn::ScalableTag<uint16_t>())));
    return WriteAlpha<kAlpha, uint16_t>(wide);
  }
  HWY_INLINE void operator()(const uint8_t* in, uint8_t* out) const {
    const auto v0 = Widen(in), v1 = Widen(in + kLanes<uint16_t>);
    StoreVector(v0, out, 0);
    StoreVector(v1, out, 1);
  }
};

template <AlphaWrite kAlpha>
struct Narrow32fTo8uBody {
  HWY_INLINE void operator()(const uint8_t* in, uint8_t* out) const {
    const auto v0 = LoadConverted(in, 0, 255.0f), v1 = LoadConverted(in, 1, 255.0f);
    const auto v2 = LoadConverted(in, 2, 255.0f), v3 = LoadConverted(in, 3, 255.0f);
    StoreVector(WriteAlpha<kAlpha, uint8_t>(PackTo8(v0, v1, v2, v3)), out);
  }
};

template <AlphaWrite kAlpha>
struct Narrow32fTo15uBody {
  HWY_INLINE U16 Narrow(const uint8_t* in, size_t index) const {
    const auto v = PackToU16(LoadConverted(in, index, 32768.0f), LoadConverted(in, index + 1, 32768.0f));
    return WriteAlpha<kAlpha, uint16_t>(hn::Min(v, hn::Set(hn::ScalableTag<uint16_t>(), 32768)));
  }
  HWY_INLINE void operator()(const uint8_t* in, uint8_t* out) const {
    const auto v0 = Narrow(in, 0), v1 = Narrow(in, 2);
    StoreVector(v0, out, 0);
    StoreVector(v1, out, 1);
  }
};

// The rounding signed multiply sees 32768 as -32768 and gives -255; every other result is positive.
template <AlphaWrite kAlpha>
struct Narrow15uTo8uBody {
  HWY_INLINE I16 Narrow(const uint8_t* in, size_t index) const {
    const hn::ScalableTag<int16_t> d;
    const auto v = hn::Min(LoadVector<uint16_t>(in, index), hn::Set(hn::ScalableTag<uint16_t>(), 32768));
    return hn::Abs(hn::MulFixedPoint15(hn::BitCast(d, v), hn::Set(d, 255)));
  }
  HWY_INLINE void operator()(const uint8_t* in, uint8_t* out) const {
    const auto v0 = PackTo8(Narrow(in, 0), Narrow(in, 1)), v1 = PackTo8(Narrow(in, 2), Narrow(in, 3));
    StoreVector(WriteAlpha<kAlpha, uint8_t>(v0), out, 0);
    StoreVector(WriteAlpha<kAlpha, uint8_t>(v1), out, 1);
  }
};

struct Bgra8ToBgrp32fBody {
  HWY_INLINE F32 Load(const uint8_t* in) const {
    const auto v = LoadScaled<uint8_t>(in, k8uTo32f);
    const auto opaque = WriteAlpha<AlphaWrite::OpaqueLast, float>(hn::Broadcast<3>(v));
    return hn::Mul(v, opaque);
  }
  HWY_INLINE void operator()(const uint8_t* in, uint8_t* out) const {
    constexpr size_t kStep = kLanes<float>;
    const auto v0 = Load(in), v1 = Load(in + kStep), v2 = Load(in + 2 * kStep), v3 = Load(in + 3 * kStep);
    StoreVector(v0, out, 0);
    StoreVector(v1, out, 1);
    StoreVector(v2, out, 2);
    StoreVector(v3, out, 3);
  }
};

template <AlphaWrite kAlpha>
HWY_ATTR void Widen8uTo32f(const uint8_t* src, uint8_t* dst, size_t count) {
  RowLoop<HWY_MAX_BYTES / 4, 4, 16>(src, dst, count, WidenTo32f<uint8_t, kAlpha>{k8uTo32f});
}
template <AlphaWrite kAlpha>
HWY_ATTR void Widen15uTo32f(const uint8_t* src, uint8_t* dst, size_t count) {
  RowLoop<HWY_MAX_BYTES / 4, 8, 16>(src, dst, count, WidenTo32f<uint16_t, kAlpha>{k15uTo32f});
}
template <AlphaWrite kAlpha>
HWY_ATTR void Widen8uTo15u(const uint8_t* src, uint8_t* dst, size_t count) {
  RowLoop<HWY_MAX_BYTES / 4, 4, 8>(src, dst, count, Widen8uTo15uBody<kAlpha>());
}
template <AlphaWrite kAlpha>
HWY_ATTR void Narrow32fTo8u(const uint8_t* src, uint8_t* dst, size_t count) {
  RowLoop<HWY_MAX_BYTES / 4, 16, 4>(src, dst, count, Narrow32fTo8uBody<kAlpha>());
}
template <AlphaWrite kAlpha>
HWY_ATTR void Narrow32fTo15u(const uint8_t* src, uint8_t* dst, size_t count) {
  RowLoop<HWY_MAX_BYTES / 4, 16, 8>(src, dst, count, Narrow32fTo15uBody<kAlpha>());
}
template <AlphaWrite kAlpha>
HWY_ATTR void Narrow15uTo8u(const uint8_t* src, uint8_t* dst, size_t count) {
  RowLoop<HWY_MAX_BYTES / 2, 8, 4>(src, dst, count, Narrow15uTo8uBody<kAlpha>());
}
HWY_ATTR void Bgra8ToBgrp32f(const uint8_t* src, uint8_t* dst, size_t count) {
  RowLoop<HWY_MAX_BYTES / 4, 4, 16>(src, dst, count, Bgra8ToBgrp32fBody());
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

template <AlphaWrite kAlpha>
void Widen8uTo32f(const uint8_t* src, uint8_t* dst, size_t count) {
  MapChannels<uint8_t, float, kAlpha>(src, dst, count, [](uint8_t c) { return c * k8uTo32f; });
}

template <AlphaWrite kAlpha>
void Widen15uTo32f(const uint8_t* src, uint8_t* dst, size_t count) {
  MapChannels<uint16_t, float, kAlpha>(src, dst, count, [](uint16_t c) { return c * k15uTo32f; });
}

template <AlphaWrite kAlpha>
void Widen8uTo15u(const uint8_t* src, uint8_t* dst, size_t count) {
  MapChannels<uint8_t, uint16_t, kAlpha>(src, dst, count,
                                         [](uint8_t c) { return static_cast<uint16_t>((c * 32768 + 127) / 255); });
}

template <AlphaWrite kAlpha>
void Narrow32fTo8u(const uint8_t* src, uint8_t* dst, size_t count) {
  MapChannels<float, uint8_t, kAlpha>(
      src, dst, count, [](float c) { return static_cast<uint8_t>(Clamp(ConvertNearest(c * 255.0f), 0, 255)); });
}

template <AlphaWrite kAlpha>
void Narrow32fTo15u(const uint8_t* src, uint8_t* dst, size_t count) {
  MapChannels<float, uint16_t, kAlpha>(
      src, dst, count, [](float c) { return static_cast<uint16_t>(Clamp(ConvertNearest(c * 32768.0f), 0, 32768)); });
}

template <AlphaWrite kAlpha>
void Narrow15uTo8u(const uint8_t* src, uint8_t* dst, size_t count) {
  MapChannels<uint16_t, uint8_t, kAlpha>(
      src, dst, count, [](uint16_t c) { return static_cast<uint8_t>((Clamp(c, 0, 32768) * 255 + 16384) / 32768); });
}

void Bgra8ToBgrp32f(const uint8_t* src, uint8_t* dst, size_t count) {
  MapPixels<uint8_t, float>(src, dst, count, [](const uint8_t* in, float* out) {
    out[3] = in[3] * k8uTo32f;
    ForChannels<3>([&](size_t k) { out[k] = in[k] * k8uTo32f * out[3]; });
  });
}

}  // namespace
}  // namespace plain

#define VX_DEPTH_KERNELS(name)                                                               \
  const RowKernelSet k##name = VX_KERNEL_VARIANTS(name<AlphaWrite::Keep>);                   \
  const RowKernelSet k##name##OpaqueLast = VX_KERNEL_VARIANTS(name<AlphaWrite::OpaqueLast>); \
  const RowKernelSet k##name##OpaqueFirst = VX_KERNEL_VARIANTS(name<AlphaWrite::OpaqueFirst>)

VX_DEPTH_KERNELS(Widen8uTo32f);
VX_DEPTH_KERNELS(Widen15uTo32f);
VX_DEPTH_KERNELS(Widen8uTo15u);
VX_DEPTH_KERNELS(Narrow32fTo8u);
VX_DEPTH_KERNELS(Narrow32fTo15u);
VX_DEPTH_KERNELS(Narrow15uTo8u);

#undef VX_DEPTH_KERNELS

const RowKernelSet kBgra8ToBgrp32f = VX_KERNEL_VARIANTS(Bgra8ToBgrp32f);

}  // namespace vexel
#endif  // HWY_ONCE
