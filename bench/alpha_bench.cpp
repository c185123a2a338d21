// The alpha utilities, one thread, beside the memory floor, libyuv and pixman.
#include <algorithm>
#include <memory>
#include <string>

#include "support/Bench.h"
#include "support/Pixman.h"
#include "vexel/compositing.h"

#ifdef VEXEL_PEER_YUV
#include <libyuv/planar_functions.h>
#endif

namespace {

using namespace vexel::bench;
using F = VX_PixelFormat;

struct Picture {
  const uint8_t* src;
  const uint8_t* other;
  uint8_t* dst;
  int width, height, rowBytes;
};

struct Utility {
  const char* name;
  int pixelBytes;
  int pixelsRead;  // per pixel written; 0: one, and the destination's own
  void (*run)(const Picture& p);
};

template <F kFormat>
void Gain(const Picture& p) {
  VX_AlphaGain(p.src, p.rowBytes, kFormat, p.dst, p.rowBytes, kFormat, p.width, p.height, 0.37f, 0);
}
template <F kFormat>
void Invert(const Picture& p) {
  VX_InvertAlpha(p.src, p.rowBytes, p.dst, p.rowBytes, kFormat, p.width, p.height);
}
template <F kFormat>
void CopyAndSet(const Picture& p) {
  VX_CopyAndSetAlpha(p.src, p.rowBytes, p.dst, p.rowBytes, kFormat, p.width, p.height, 0.5f);
}
template <F kFormat>
void Matte(const Picture& p) {
  static constexpr uint8_t kGreen[4] = {40, 220, 30, 255};
  VX_UnPremultiplyAgainstMatteColor(p.src, p.rowBytes, p.dst, p.rowBytes, kFormat, p.width, p.height, kGreen,
                                    F::BGRA_4444_8u, 0);
}
// The source's own bytes are as good a mask as any.
template <F kFormat>
void Mask(const Picture& p) {
  VX_OneBitMaskComposite(p.src, p.rowBytes, kFormat, p.other, p.rowBytes, kFormat, p.src, p.width / 8 + 1, 3, p.dst,
                         p.rowBytes, kFormat, p.width, p.height, 0);
}

constexpr Utility kUtilities[] = {
    {"gain BGRA8", 4, 1, Gain<F::BGRA_4444_8u>},
    {"gain BGRP8", 4, 1, Gain<F::BGRP_4444_8u>},
    {"gain VUYP8", 4, 1, Gain<F::VUYP_4444_8u>},
    {"gain BGRA32f", 16, 1, Gain<F::BGRA_4444_32f>},
    {"gain PRGB32f", 16, 1, Gain<F::PRGB_4444_32f>},
    {"gain UYVY8 through VUYP8", 2, 1, Gain<F::UYVY_422_8u>},
    {"invert alpha BGRA8", 4, 0, Invert<F::BGRA_4444_8u>},
    {"invert alpha BGRA15", 8, 0, Invert<F::BGRA_4444_15u>},
    {"invert alpha ARGB32f", 16, 0, Invert<F::ARGB_4444_32f>},
    {"copy and set alpha BGRA8", 4, 1, CopyAndSet<F::BGRA_4444_8u>},
    {"copy and set alpha BGRA15", 8, 1, CopyAndSet<F::BGRA_4444_15u>},
    {"copy and set alpha BGRA32f", 16, 1, CopyAndSet<F::BGRA_4444_32f>},
    {"matte BGRA8", 4, 1, Matte<F::BGRA_4444_8u>},
    {"matte BGRA15", 8, 1, Matte<F::BGRA_4444_15u>},
    {"matte BGRA32f", 16, 1, Matte<F::BGRA_4444_32f>},
    {"one-bit mask BGRA8", 4, 2, Mask<F::BGRA_4444_8u>},
    {"one-bit mask BGRA15", 8, 2, Mask<F::BGRA_4444_15u>},
    {"one-bit mask BGRA32f", 16, 2, Mask<F::BGRA_4444_32f>},
};

// One set of pictures for all cases: floats, or noise.
struct Pictures {
  explicit Pictures(size_t bytes) : sources(2 * bytes), dst(bytes) {}
  Memory sources, dst;
};

void UtilityCase(const Utility& utility, Size size, const std::shared_ptr<Pictures>& pictures) {
  const int width = size.width, height = size.height;
  const size_t bytes = size.Pixels() * static_cast<size_t>(utility.pixelBytes);
  uint8_t *const src = pictures->sources.data(), *const dst = pictures->dst.data();
  const Picture picture = {src, src + bytes, dst, width, height, width * utility.pixelBytes};
  BenchCase report(std::string(utility.name) + " " + size.name, size.Pixels());
  report.Add("vexel", [=] {
    utility.run(picture);
    (void)pictures;
  });
#ifdef VEXEL_PEER_YUV
  if (utility.run == Gain<F::BGRP_4444_8u>)
    report.Add("libyuv ARGBShade", [=] {
      libyuv::ARGBShade(picture.src, picture.rowBytes, dst, picture.rowBytes, width, height, 0x5E5E5E5E);
    });
#endif
#ifdef VEXEL_PEER_PIXMAN
  if (utility.run == Mask<F::BGRA_4444_8u>) {
    const auto from = PixmanImage(PIXMAN_x8r8g8b8, size, picture.src, picture.rowBytes),
               to = PixmanImage(PIXMAN_x8r8g8b8, size, picture.dst, picture.rowBytes),
               mask = PixmanImage(PIXMAN_a1, size, src, width / 8);
    report.Add("pixman over with a1 mask", [=] {
      pixman_image_composite32(PIXMAN_OP_OVER, from.get(), mask.get(), to.get(), 0, 0, 0, 0, 0, 0, width, height);
    });
  }
#endif
  const size_t read = bytes * static_cast<size_t>(std::max(utility.pixelsRead, 1));
  report.AddFloor(src, read, dst, bytes, utility.pixelsRead != 0);
}

}  // namespace

void RegisterBenchmarks() {
  const size_t most = kHd.Pixels() * 16;
  const auto noise = std::make_shared<Pictures>(most), floats = std::make_shared<Pictures>(most);
  noise->sources.FillBytes();
  floats->sources.FillFloats();
  for (const Utility& utility : kUtilities) {
    const auto& pictures = utility.pixelBytes == 16 ? floats : noise;
    UtilityCase(utility, kHd, pictures);
    if (utility.pixelBytes <= 4) UtilityCase(utility, kUhd, pictures);
  }
}
