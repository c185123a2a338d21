// Exact moves: copies, BGRA <-> ARGB, alpha written opaque.
#include <cstddef>
#include <cstdint>
#include <cstring>

#include "convert/PlainPixels.h"
#include "convert/RgbKernels.h"

#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "convert/ReorderKernels.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

#include "convert/PixelVectors-inl.h"
#include "frame/KernelTable.h"

#ifndef VEXEL_CONVERT_REORDERKERNELS_CHANNELS
#define VEXEL_CONVERT_REORDERKERNELS_CHANNELS
namespace vexel {
namespace {

// What a destination pixel is: its channel type and what becomes of its alpha.
template <class T, AlphaWrite kAlphaWrite>
struct Channels {
  using Type = T;
  static constexpr AlphaWrite kAlpha = kAlphaWrite;
};
using Kept8u = Channels<uint8_t, AlphaWrite::Keep>;
using Kept15u = Channels<uint16_t, AlphaWrite::Keep>;
using Kept32f = Channels<float, AlphaWrite::Keep>;
using OpaqueLast8u = Channels<uint8_t, AlphaWrite::OpaqueLast>;
using OpaqueLast15u = Channels<uint16_t, AlphaWrite::OpaqueLast>;
using OpaqueLast32f = Channels<float, AlphaWrite::OpaqueLast>;
using OpaqueFirst8u = Channels<uint8_t, AlphaWrite::OpaqueFirst>;
using OpaqueFirst15u = Channels<uint16_t, AlphaWrite::OpaqueFirst>;
using OpaqueFirst32f = Channels<float, AlphaWrite::OpaqueFirst>;

}  // namespace
}  // namespace vexel
#endif

#if HWY_TARGET != HWY_SCALAR
HWY_BEFORE_NAMESPACE();
namespace vexel {
namespace HWY_NAMESPACE {
namespace {

HWY_INLINE U8 ReverseChannels(U8 v) {
  alignas(16) static constexpr uint8_t kOrder[16] = {3, 2, 1, 0, 7, 6, 5, 4, 11, 10, 9, 8, 15, 14, 13, 12};
  return hn::TableLookupBytes(v, hn::LoadDup128(hn::ScalableTag<uint8_t>(), kOrder));
}
HWY_INLINE U16 ReverseChannels(U16 v) { return hn::Reverse4(hn::ScalableTag<uint16_t>(), v); }
HWY_INLINE F32 ReverseChannels(F32 v) { return hn::Shuffle0123(v); }

template <class To>
struct ReversePixels {
  using V = Full<typename To::Type>;
  HWY_INLINE V operator()(V v) const { return WriteAlpha<To::kAlpha, typename To::Type>(ReverseChannels(v)); }
};

template <class To>
struct OpaquePixels {
  using V = Full<typename To::Type>;
  HWY_INLINE V operator()(V v) const { return WriteAlpha<To::kAlpha, typename To::Type>(v); }
};

template <class To>
HWY_ATTR void Reverse(const uint8_t* src, uint8_t* dst, size_t count) {
  MapRow<typename To::Type>(src, dst, count, EachVector<typename To::Type, ReversePixels<To>>());
}

template <class To>
HWY_ATTR void Opaque(const uint8_t* src, uint8_t* dst, size_t count) {
  MapRow<typename To::Type>(src, dst, count, EachVector<typename To::Type, OpaquePixels<To>>());
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

template <class To>
void Reverse(const uint8_t* src, uint8_t* dst, size_t count) {
  using T = typename To::Type;
  MapPixels<T, T>(src, dst, count, [](const T* in, T* out) {
    ForChannels([&](size_t k) { out[k] = in[3 - k]; });
    if constexpr (To::kAlpha != AlphaWrite::Keep) out[AlphaIndex(To::kAlpha)] = kFullScale<T>;
  });
}

template <class To>
void Opaque(const uint8_t* src, uint8_t* dst, size_t count) {
  using T = typename To::Type;
  MapChannels<T, T, To::kAlpha>(src, dst, count, [](T c) { return c; });
}

template <size_t kUnitPixels, size_t kUnitBytes>
void Copy(const uint8_t* src, uint8_t* dst, size_t count) {
  if (count != 0 && src != dst) std::memcpy(dst, src, (count + kUnitPixels - 1) / kUnitPixels * kUnitBytes);
}

}  // namespace
}  // namespace plain

namespace {

// The C library's copy is as fast as memory allows on every processor, so copies have no variants of their own.
template <size_t kUnitPixels, size_t kUnitBytes>
constexpr RowKernelSet kCopy = {&plain::Copy<kUnitPixels, kUnitBytes>, nullptr, nullptr, nullptr, nullptr};

}  // namespace

const RowKernelSet kCopy4 = kCopy<1, 4>;
const RowKernelSet kCopy8 = kCopy<1, 8>;
const RowKernelSet kCopy16 = kCopy<1, 16>;
const RowKernelSet kCopy422_8u = kCopy<2, 4>;
const RowKernelSet kCopy422_32f = kCopy<2, 16>;
const RowKernelSet kCopyV210 = kCopy<6, 16>;

const RowKernelSet kReverse8u = VX_KERNEL_VARIANTS(Reverse<Kept8u>);
const RowKernelSet kReverse15u = VX_KERNEL_VARIANTS(Reverse<Kept15u>);
const RowKernelSet kReverse32f = VX_KERNEL_VARIANTS(Reverse<Kept32f>);
const RowKernelSet kBgrx8ToXrgb8 = VX_KERNEL_VARIANTS(Reverse<OpaqueFirst8u>);
const RowKernelSet kXrgb8ToBgrx8 = VX_KERNEL_VARIANTS(Reverse<OpaqueLast8u>);
const RowKernelSet kBgrx15ToXrgb15 = VX_KERNEL_VARIANTS(Reverse<OpaqueFirst15u>);
const RowKernelSet kXrgb15ToBgrx15 = VX_KERNEL_VARIANTS(Reverse<OpaqueLast15u>);
const RowKernelSet kBgrx32fToXrgb32f = VX_KERNEL_VARIANTS(Reverse<OpaqueFirst32f>);
const RowKernelSet kXrgb32fToBgrx32f = VX_KERNEL_VARIANTS(Reverse<OpaqueLast32f>);

const RowKernelSet kOpaqueLast8u = VX_KERNEL_VARIANTS(Opaque<OpaqueLast8u>);
const RowKernelSet kOpaqueLast15u = VX_KERNEL_VARIANTS(Opaque<OpaqueLast15u>);
const RowKernelSet kOpaqueLast32f = VX_KERNEL_VARIANTS(Opaque<OpaqueLast32f>);
const RowKernelSet kOpaqueFirst8u = VX_KERNEL_VARIANTS(Opaque<OpaqueFirst8u>);
const RowKernelSet kOpaqueFirst15u = VX_KERNEL_VARIANTS(Opaque<OpaqueFirst15u>);
const RowKernelSet kOpaqueFirst32f = VX_KERNEL_VARIANTS(Opaque<OpaqueFirst32f>);

}  // namespace vexel
#endif  // HWY_ONCE
