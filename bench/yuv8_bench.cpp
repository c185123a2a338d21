// Row kernels of 8-bit Y'CbCr: rows that stay in the second-level cache, and whole frames, beside libyuv and swscale.
#include <memory>
#include <string>

#include "convert/RowKernel.h"
#include "convert/YuvKernels.h"
#include "frame/StreamCopy.h"
#include "support/Bench.h"
#include "support/Swscale.h"

#ifdef VEXEL_PEER_YUV
#include <libyuv.h>
#endif

namespace {

using namespace vexel;
using namespace vexel::bench;

constexpr Size kSizes[] = {{"8 rows of 1080p", 1920, 8}, kHd, kUhd};

// An image with all that its contenders need. Four-byte sources get random alpha, or 255.
struct Work {
  Work(const char* kernelName, const RowKernelSet& kernelSet, Size imageSize, int srcPixelBytes, int dstPixelBytes,
       bool opaque = true)
      : size(imageSize),
        srcRow(size.width * srcPixelBytes),
        dstRow(size.width * dstPixelBytes),
        src(std::make_shared<Memory>(size.Pixels() * static_cast<size_t>(srcPixelBytes))),
        dst(std::make_shared<Memory>(size.Pixels() * static_cast<size_t>(dstPixelBytes))),
        report(std::string(kernelName) + " " + size.name, size.Pixels()) {
    src->FillBytes();
    if (opaque && srcPixelBytes == 4)
      for (size_t i = 3; i < src->size(); i += 4) src->data()[i] = 255;
    AddRows("vexel", kernelSet, false);
    if (size.height > 8) AddRows("vexel streamed", kernelSet, true);
    report.AddFloor(src->size(), dst->size());
  }

  // Row by row into the image, or through a row in the cache and past it from there.
  void AddRows(const char* name, const RowKernelSet& kernelSet, bool stream) {
    const KernelVariant variant = ActiveKernelVariant();
    const RowKernel kernel = kernelSet[variant];
    report.Add(name, [=, from = src, to = dst, s = size, srcBytes = srcRow, dstBytes = dstRow] {
      alignas(64) uint8_t row[3840 * 4];
      for (int y = 0; y < s.height; ++y) {
        uint8_t* out = to->data() + ptrdiff_t{y} * dstBytes;
        kernel(from->data() + ptrdiff_t{y} * srcBytes, stream ? row : out, static_cast<size_t>(s.width));
        if (stream) StreamCopy(out, row, static_cast<size_t>(dstBytes), variant);
      }
      if (stream) StreamFence();
    });
  }
  // A libyuv function of two packed images.
  template <class Function>
  void AddPacked(const char* name, Function function) {
    report.Add(name, [=, from = src, to = dst, s = size, srcBytes = srcRow, dstBytes = dstRow] {
      function(from->data(), srcBytes, to->data(), dstBytes, s.width, s.height);
    });
  }
  void AddSwscale(const char* srcName, const char* dstName) {
    const auto run = [from = src, to = dst, srcBytes = srcRow, dstBytes = dstRow](auto& swscale) {
      swscale.Run(from->data(), srcBytes, to->data(), dstBytes);
    };
    bench::AddSwscale(report, srcName, dstName, size, run, std::string(" to ") + dstName);
  }

  Size size;
  int srcRow, dstRow;
  std::shared_ptr<Memory> src, dst;
  BenchCase report;
};

#ifdef VEXEL_PEER_YUV
// libyuv has no packed 4:4:4 destination; planes are the nearest it has.
void AddPlanes(Work& work) {
  const Size size = work.size;
  auto planes = std::make_shared<Memory>(3 * size.Pixels());
  work.report.Add("libyuv (planes)", [=, from = work.src, srcRow = work.srcRow] {
    uint8_t* y = planes->data();
    libyuv::ARGBToI444(from->data(), srcRow, y, size.width, y + size.Pixels(), size.width, y + 2 * size.Pixels(),
                       size.width, size.width, size.height);
  });
}
#endif

void Cases(Size size) {
  Work decode("UYVY8 to BGRX8", kUyvy8ToBgrx8_601, size, 2, 4);
  Work encode("BGRA8 to UYVY8, opaque", kBgra8ToUyvy8_601, size, 4, 2);
  Work encodeAlpha("BGRA8 to UYVY8, translucent", kBgra8ToUyvy8_601, size, 4, 2, false);
  Work encodeX("BGRX8 to UYVY8", kBgrx8ToUyvy8_601, size, 4, 2);
  Work matrix("BGRA8 to VUYA8", kBgra8ToVuya8_601, size, 4, 4);
  Work back("VUYA8 to BGRA8", kVuya8ToBgra8_601, size, 4, 4);
  Work yuyv("YUYV8 to BGRX8", kYuyv8ToBgrx8_709, size, 2, 4);
#ifdef VEXEL_PEER_YUV
  decode.AddPacked("libyuv", libyuv::UYVYToARGB);
  yuyv.AddPacked("libyuv (601)", libyuv::YUY2ToARGB);
  encode.AddPacked("libyuv", libyuv::ARGBToUYVY);
  encodeX.AddPacked("libyuv", libyuv::ARGBToUYVY);
  AddPlanes(matrix);
#endif
  decode.AddSwscale("uyvy422", "bgra");
  encode.AddSwscale("bgra", "uyvy422");
  matrix.AddSwscale("bgra", "yuva444p");

  Work("VUYA8 601 to 709", kVuya8_601To709, size, 4, 4);
  Work("UYVY8 601 to 709", kUyvy8_601To709, size, 2, 2);
  Work("UYVY8 to VUYX8", kUyvy8ToVuyx8, size, 2, 4);
  Work("VUYX8 to UYVY8", kVuyx8ToUyvy8, size, 4, 2);
  Work("UYVY8 to YUYV8", kSwap422_8u, size, 2, 2);
}

}  // namespace

void RegisterBenchmarks() {
  for (const Size& size : kSizes) Cases(size);
}
