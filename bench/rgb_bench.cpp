// The RGB row kernels on rows that stay in the cache, and on whole frames beside the memory floor.
#include <algorithm>
#include <string>

#include "convert/RgbKernels.h"
#include "frame/StreamCopy.h"
#include "support/Bench.h"
#include "vexel/vexel.h"

namespace vexel::bench {
namespace {

constexpr size_t kRowPixels = 1920, kMostPixels = 3840 * 2160;

struct KernelCase {
  const char* name;
  const RowKernelSet* kernels;
  size_t srcPixel, dstPixel;  // bytes
  bool isOpaqueRow = false;   // opaque pixels only, and no frames
};

const KernelCase kCases[] = {
    {"BGRA8 to ARGB8", &kReverse8u, 4, 4},
    {"BGRA15 to ARGB15", &kReverse15u, 8, 8},
    {"BGRA32f to ARGB32f", &kReverse32f, 16, 16},
    {"BGRX8 to XRGB8", &kBgrx8ToXrgb8, 4, 4},
    {"opaque 8u", &kOpaqueLast8u, 4, 4},
    {"opaque 15u", &kOpaqueLast15u, 8, 8},
    {"opaque 32f", &kOpaqueLast32f, 16, 16},
    {"premultiply 8u", &kPremultiplyLast8u, 4, 4},
    {"premultiply 8u, all opaque", &kPremultiplyLast8u, 4, 4, true},
    {"premultiply 15u", &kPremultiplyLast15u, 8, 8},
    {"premultiply 32f", &kPremultiplyLast32f, 16, 16},
    {"premultiply VUYA8", &kPremultiplyVuya8, 4, 4},
    {"unpremultiply 8u", &kUnpremultiplyLast8u, 4, 4},
    {"unpremultiply 8u, all opaque", &kUnpremultiplyLast8u, 4, 4, true},
    {"unpremultiply 15u", &kUnpremultiplyLast15u, 8, 8},
    {"unpremultiply 32f", &kUnpremultiplyLast32f, 16, 16},
    {"unpremultiply VUYP8", &kUnpremultiplyVuyp8, 4, 4},
    {"BGRA8 to BGRA32f", &kWiden8uTo32f, 4, 16},
    {"BGRA8 to BGRP32f", &kBgra8ToBgrp32f, 4, 16},
    {"BGRA32f to BGRA8", &kNarrow32fTo8u, 16, 4},
    {"BGRA15 to BGRA32f", &kWiden15uTo32f, 8, 16},
    {"BGRA32f to BGRA15", &kNarrow32fTo15u, 16, 8},
    {"BGRA8 to BGRA15", &kWiden8uTo15u, 4, 8},
    {"BGRA15 to BGRA8", &kNarrow15uTo8u, 8, 4},
    {"RGB10 to BGRX8", &kRgb10ToBgrx8, 4, 4},
    {"RGB10 to BGRX15", &kRgb10ToBgrx15, 4, 8},
    {"RGB10 to BGRX32f", &kRgb10ToBgrx32f, 4, 16},
    {"BGRX8 to RGB10", &kBgrx8ToRgb10, 4, 4},
    {"BGRX15 to RGB10", &kBgrx15ToRgb10, 8, 4},
    {"BGRX32f to RGB10", &kBgrx32fToRgb10, 16, 4},
    {"BGRA32f to linear", &kBgra32fToLinear, 16, 16},
    {"linear to BGRA32f", &kLinearToBgra32f, 16, 16},
    {"BGRA8 to linear", &kBgra8ToLinear, 4, 16},
    {"linear to BGRA8", &kLinearToBgra8, 16, 4},
};

// As the row converter writes frames that do not fit the cache: blocks of 384 pixels through its first level, streamed.
void StreamFrame(RowKernel kernel, KernelVariant variant, const KernelCase& kernelCase, const uint8_t* src,
                 uint8_t* dst, size_t pixels) {
  alignas(64) uint8_t block[384 * 16];
  for (size_t i = 0; i < pixels; i += 384) {
    const size_t count = std::min<size_t>(384, pixels - i);
    kernel(src + i * kernelCase.srcPixel, block, count);
    StreamCopy(dst + i * kernelCase.dstPixel, block, count * kernelCase.dstPixel, variant);
  }
  StreamFence();
}

// One set of buffers for all cases.
struct Buffers {
  Memory bytes{kMostPixels * 8}, floats{kMostPixels * 16}, opaque{kRowPixels * 16}, destination{kMostPixels * 16};
  Buffers() {
    bytes.FillBytes();
    floats.FillFloats();
    std::fill_n(opaque.data(), opaque.size(), uint8_t{255});
  }
};

void Register(const KernelCase& kernelCase, const Buffers& buffers, const std::string& size, size_t pixels) {
  const uint8_t* src = (kernelCase.isOpaqueRow      ? buffers.opaque
                        : kernelCase.srcPixel == 16 ? buffers.floats
                                                    : buffers.bytes)
                           .data();
  uint8_t* dst = buffers.destination.data();
  const size_t srcBytes = pixels * kernelCase.srcPixel, dstBytes = pixels * kernelCase.dstPixel;
  const KernelVariant variant = ActiveKernelVariant();
  const RowKernel kernel = (*kernelCase.kernels)[variant];
  BenchCase bench(std::string(kernelCase.name) + " " + size, pixels);
  bench.AddFloor(src, srcBytes, dst, dstBytes);
  const bool streams = srcBytes + dstBytes >= VX_GetCacheSize() / 2;
  bench.Add("vexel", [=, &kernelCase] {
    if (streams)
      StreamFrame(kernel, variant, kernelCase, src, dst, pixels);
    else
      for (size_t i = 0; i < pixels; i += kRowPixels)
        kernel(src + i * kernelCase.srcPixel, dst + i * kernelCase.dstPixel, kRowPixels);
  });
}

}  // namespace
}  // namespace vexel::bench

void RegisterBenchmarks() {
  using namespace vexel::bench;
  static const Buffers buffers;
  for (const KernelCase& kernelCase : kCases) {
    Register(kernelCase, buffers, "row", kRowPixels);
    if (kernelCase.isOpaqueRow) continue;
    Register(kernelCase, buffers, "1080p", 1920 * 1080);
    Register(kernelCase, buffers, "2160p", kMostPixels);
  }
}
