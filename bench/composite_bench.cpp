// Normal compositing beside pixman and libyuv, which composite premultiplied pixels, and on one thread and two.
#include <map>
#include <memory>
#include <string>
#include <tuple>

#include "formats/FormatBits.h"
#include "support/Bench.h"
#include "support/Pixman.h"
#include "vexel/compositing.h"
#include "zovcore/Threads.h"

#ifdef VEXEL_PEER_YUV
#include <libyuv.h>
#endif

namespace {

using F = VX_PixelFormat;
using namespace vexel::bench;

enum class Alpha { Opaque, Soft };

// A frame of noise. Equal ones share their memory.
class Frame {
 public:
  Frame(F format, Size size, Alpha alpha, uint64_t seed, bool premultiply = false)
      : mFormat(format), mRowBytes(static_cast<int32_t>(vexel::UnpaddedRowBytes(format, size.width))) {
    static std::map<std::tuple<F, int, Alpha, uint64_t, bool>, std::shared_ptr<Memory>> frames;
    std::shared_ptr<Memory>& known = frames[{format, size.width, alpha, seed, premultiply}];
    if (!known) {
      known = std::make_shared<Memory>(static_cast<size_t>(mRowBytes) * static_cast<size_t>(size.height));
      Fill(*known, alpha, seed, premultiply);
    }
    mMemory = known;
  }
  uint8_t* data() const { return mMemory->data(); }
  F format() const { return mFormat; }
  int32_t rowBytes() const { return mRowBytes; }
  size_t size() const { return mMemory->size(); }

 private:
  void Fill(Memory& memory, Alpha alpha, uint64_t seed, bool premultiply) {
    const bool wide = vexel::Depth(mFormat) == vexel::kDepth32f;
    uint8_t* const bytes = memory.data();
    wide ? memory.FillFloats(seed) : memory.FillBytes(seed);
    const bool opaque = alpha == Alpha::Opaque && vexel::AlphaKind(mFormat) != vexel::kAlphaNone;
    for (size_t i = 3; opaque && i < memory.size() / (wide ? 4 : 1); i += 4)
      if (wide)
        reinterpret_cast<float*>(bytes)[i] = 1;
      else
        bytes[i] = 255;
    // No colour above its alpha, for peers that need it.
    for (size_t i = 0; premultiply && i < memory.size(); ++i)
      if (i % 4 != 3) bytes[i] = static_cast<uint8_t>(bytes[i] * bytes[i | 3] / 255);
  }

  F mFormat;
  int32_t mRowBytes;
  std::shared_ptr<Memory> mMemory;
};

// What the memory itself gains by a second thread: both sources read and the destination written, half by half.
void AddMemoryOnTwoThreads(BenchCase& report, const Frame& src, const Frame& background, const Frame& dst) {
  report.AddThreaded("memory, two threads", 2, [=] {
    zovcore::threads::ExecuteCPUBoundTaskOnAllProcessors(
        [&](int half) {
          const auto part = [half](const Frame& frame) { return frame.data() + frame.size() / 2 * half; };
          const size_t dstBytes = dst.size() / 4;
          FloorStreamed(part(src), src.size() / 2, part(dst), dstBytes);
          FloorStreamed(part(background), background.size() / 2, part(dst) + dstBytes, dstBytes);
        },
        2);
  });
}

struct Over {
  F src, background, dst;
  Alpha sourceAlpha, backgroundAlpha;
  float opacity;
};

void CompositeCase(const char* name, const Over& over, Size size) {
  const Frame src(over.src, size, over.sourceAlpha, 1), background(over.background, size, over.backgroundAlpha, 2),
      dst(over.dst, size, Alpha::Soft, 3);
  BenchCase report(std::string(name) + (over.opacity == 1 ? " " : " at 0.6 ") + size.name, size.Pixels());
  const auto work = [=] {
    VX_Composite(src.data(), src.rowBytes(), src.format(), background.data(), background.rowBytes(),
                 background.format(), dst.data(), dst.rowBytes(), dst.format(), size.width, size.height, over.opacity,
                 3, false);
  };
  report.Add("vexel", work);
  report.AddFloor(src.size() + background.size(), dst.size());
  report.AddThreaded("vexel, wall clock", 1, work).AddThreaded("vexel, two threads", 2, work);
  AddMemoryOnTwoThreads(report, src, background, dst);
  if (vexel::IsYuv(over.dst) || vexel::IsReversed(over.dst) || vexel::Depth(over.dst) != vexel::kDepth8u) return;
  if (over.opacity != 1) return;
  const Frame from(F::BGRP_4444_8u, size, over.sourceAlpha, 1, true);
  const Frame onto(F::BGRP_4444_8u, size, over.backgroundAlpha, 2, true);
#ifdef VEXEL_PEER_PIXMAN
  // In place, since it knows no third picture; what accumulates there costs the same.
  const auto image = [size](const Frame& frame) {
    return PixmanImage(PIXMAN_a8r8g8b8, size, frame.data(), frame.rowBytes());
  };
  report.Add("pixman OVER in place, premultiplied", [=, fromImage = image(from), dstImage = image(dst)] {
    pixman_image_composite32(PIXMAN_OP_OVER, fromImage.get(), nullptr, dstImage.get(), 0, 0, 0, 0, 0, 0, size.width,
                             size.height);
  });
#endif
#ifdef VEXEL_PEER_YUV
  report.Add("libyuv ARGBBlend, premultiplied", [=] {
    libyuv::ARGBBlend(from.data(), from.rowBytes(), onto.data(), onto.rowBytes(), dst.data(), dst.rowBytes(),
                      size.width, size.height);
  });
#endif
}

void ToBlackCase(F format, float opacity, Size size, bool tested) {
  const Frame src(format, size, Alpha::Soft, 1), dst(format, size, Alpha::Soft, 3);
  BenchCase report(std::string(tested ? "tested to black " : "to black ") + VX_PixelFormatName(format) +
                       (opacity == 1 ? " " : " at 0.6 ") + size.name,
                   size.Pixels());
  report.Add("vexel", [=] {
    int32_t state;
    if (tested)
      VX_CompositeToBlackAndTestSourceAlpha(src.data(), src.rowBytes(), format, dst.data(), dst.rowBytes(), format,
                                            size.width, size.height, &state, 0);
    else
      VX_CompositeToBlack(src.data(), src.rowBytes(), format, dst.data(), dst.rowBytes(), format, size.width,
                          size.height, opacity, 0);
  });
  report.AddFloor(src.size(), dst.size());
}

}  // namespace

void RegisterBenchmarks() {
  const F bgra = F::BGRA_4444_8u;
  for (const Size size : {kHd, kUhd}) {
    for (const float opacity : {1.0f, 0.6f}) {
      CompositeCase("over opaque BGRA8", {bgra, bgra, bgra, Alpha::Soft, Alpha::Opaque, opacity}, size);
      CompositeCase("over BGRX8 in BGRX8",
                    {bgra, F::BGRX_4444_8u, F::BGRX_4444_8u, Alpha::Soft, Alpha::Opaque, opacity}, size);
      CompositeCase("over soft BGRA8", {bgra, bgra, bgra, Alpha::Soft, Alpha::Soft, opacity}, size);
    }
    CompositeCase("over soft BGRA8 in BGRP8", {bgra, bgra, F::BGRP_4444_8u, Alpha::Soft, Alpha::Soft, 1}, size);
    CompositeCase("BGRP8 over BGRP8 in BGRP8",
                  {F::BGRP_4444_8u, F::BGRP_4444_8u, F::BGRP_4444_8u, Alpha::Soft, Alpha::Soft, 1}, size);
    CompositeCase("BGRP8 over BGRX8 in BGRX8",
                  {F::BGRP_4444_8u, F::BGRX_4444_8u, F::BGRX_4444_8u, Alpha::Soft, Alpha::Opaque, 1}, size);
    CompositeCase("opaque over opaque BGRA8", {F::BGRX_4444_8u, bgra, bgra, Alpha::Opaque, Alpha::Opaque, 0.6f}, size);
    CompositeCase("over soft VUYA8", {F::VUYA_4444_8u, F::VUYA_4444_8u, F::VUYA_4444_8u, Alpha::Soft, Alpha::Soft, 1},
                  size);
    CompositeCase("over soft ARGB8", {F::ARGB_4444_8u, F::ARGB_4444_8u, F::ARGB_4444_8u, Alpha::Soft, Alpha::Soft, 1},
                  size);
    CompositeCase("over UYVY8 in UYVY8", {bgra, F::UYVY_422_8u, F::UYVY_422_8u, Alpha::Soft, Alpha::Opaque, 1}, size);
    CompositeCase("BGRA32f over soft BGRA32f",
                  {F::BGRA_4444_32f, F::BGRA_4444_32f, F::BGRA_4444_32f, Alpha::Soft, Alpha::Soft, 1}, size);
    CompositeCase("BGRA32f over V210 in V210",
                  {F::BGRA_4444_32f, F::V210_422_10u, F::V210_422_10u, Alpha::Soft, Alpha::Opaque, 1}, size);
    for (const F format : {bgra, F::VUYA_4444_8u, F::BGRA_4444_32f}) {
      ToBlackCase(format, 1, size, false);
      ToBlackCase(format, 0.6f, size, false);
      ToBlackCase(format, 1, size, true);
    }
  }
}
