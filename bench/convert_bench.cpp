// VX_Convert on whole frames, one thread, beside the peers that know the same conversion.
#include <memory>
#include <string>
#include <vector>

#include "convert/Planner.h"
#include "formats/FormatBits.h"
#include "support/Bench.h"
#include "support/Swscale.h"
#include "vexel/vexel.h"

#ifdef VEXEL_PEER_YUV
#include <libyuv.h>
#endif
#ifdef VEXEL_PEER_OPENCV
#include <opencv2/core.hpp>
#include <opencv2/imgproc.hpp>
#endif
#ifdef VEXEL_PEER_BABL
#include <babl/babl.h>
#endif

namespace {

using namespace vexel;
using namespace vexel::bench;
using F = VX_PixelFormat;

// A frame in one format with the library's row padding.
struct Frame {
  Frame(F f, Size size, bool opaque = false)
      : format(f),
        rowBytes(static_cast<int>(PaddedRowBytes(f, size.width))),
        memory(static_cast<size_t>(rowBytes) * size.height) {
    if (Depth(f) == kDepth32f)
      memory.FillFloats();
    else
      memory.FillBytes();
    if (Layout(f) == kLayout4444 && Depth(f) == kDepth8u && opaque)
      for (size_t i = 3; i < memory.size(); i += 4) memory.data()[i] = 255;
    if (Depth(f) == kDepth15u) {  // keep to 0..32768
      auto* p = reinterpret_cast<uint16_t*>(memory.data());
      for (size_t i = 0; i < memory.size() / 2; ++i) p[i] &= 0x7FFF;
    }
  }
  uint8_t* data() const { return memory.data(); }
  F format;
  int rowBytes;
  Memory memory;
};

struct Job {
  std::shared_ptr<Frame> src, dst;
  Size size;
  BenchCase report;
};

// The frame conversion, its floor, and the job for adding peers.
Job Convert(const std::string& name, F srcFormat, F dstFormat, Size size, bool opaque = false) {
  auto src = std::make_shared<Frame>(srcFormat, size, opaque), dst = std::make_shared<Frame>(dstFormat, size);
  Job job{src, dst, size, BenchCase("VX_Convert " + name + " " + size.name, size.Pixels())};
  const auto work = [=] {
    return VX_Convert(src->data(), src->rowBytes, src->format, dst->data(), dst->rowBytes, dst->format, size.width,
                      size.height, 2);
  };
  Check(work(), name);
  job.report.Add("vexel", work);
  job.report.AddFloor(src->memory.size(), dst->memory.size());
  return job;
}

void AddSwscale(Job& job, const char* srcName, const char* dstName) {
  bench::AddSwscale(job.report, srcName, dstName, job.size, [src = job.src, dst = job.dst](auto& swscale) {
    swscale.Run(src->data(), src->rowBytes, dst->data(), dst->rowBytes);
  });
}

#ifdef VEXEL_PEER_OPENCV
cv::Mat MatOf(const Frame& frame, Size size, int type) {
  return cv::Mat(size.height, size.width, type, frame.data(), static_cast<size_t>(frame.rowBytes));
}
#endif

void Yuv8Cases(Size size) {
  Job decode = Convert("UYVY8 to BGRA8", F::UYVY_422_8u, F::BGRA_4444_8u, size);
  Job encode = Convert("BGRA8 to UYVY8 (opaque)", F::BGRA_4444_8u, F::UYVY_422_8u, size, true);
  Convert("BGRA8 to UYVY8 (alpha at random)", F::BGRA_4444_8u, F::UYVY_422_8u, size);
  Job matrix = Convert("BGRA8 to VUYA8", F::BGRA_4444_8u, F::VUYA_4444_8u, size);
  Convert("VUYA8 to BGRA8", F::VUYA_4444_8u, F::BGRA_4444_8u, size);
#ifdef VEXEL_PEER_YUV
  decode.report.Add("libyuv", [=] {
    libyuv::UYVYToARGB(decode.src->data(), decode.src->rowBytes, decode.dst->data(), decode.dst->rowBytes, size.width,
                       size.height);
  });
  encode.report.Add("libyuv", [=] {
    libyuv::ARGBToUYVY(encode.src->data(), encode.src->rowBytes, encode.dst->data(), encode.dst->rowBytes, size.width,
                       size.height);
  });
  auto planes = std::make_shared<Memory>(size.Pixels() * 3);
  matrix.report.Add("libyuv (I444)", [=] {
    uint8_t* y = planes->data();
    const size_t plane = size.Pixels();
    libyuv::ARGBToI444(matrix.src->data(), matrix.src->rowBytes, y, size.width, y + plane, size.width, y + 2 * plane,
                       size.width, size.width, size.height);
  });
#endif
  AddSwscale(decode, "uyvy422", "bgra");
  AddSwscale(encode, "bgra", "uyvy422");
}

void DepthCases(Size size) {
  Job widen = Convert("BGRA8 to BGRA32f", F::BGRA_4444_8u, F::BGRA_4444_32f, size);
  Job narrow = Convert("BGRA32f to BGRA8", F::BGRA_4444_32f, F::BGRA_4444_8u, size);
  Job up = Convert("BGRA8 to BGRA15", F::BGRA_4444_8u, F::BGRA_4444_15u, size);
  Job down = Convert("BGRA15 to BGRA8", F::BGRA_4444_15u, F::BGRA_4444_8u, size);
#ifdef VEXEL_PEER_OPENCV
  const auto convertTo = [&](Job& job, int srcType, int dstType, double scale) {
    job.report.Add("OpenCV", [=, src = job.src, dst = job.dst] {
      cv::Mat to = MatOf(*dst, size, dstType);
      MatOf(*src, size, srcType).convertTo(to, dstType, scale);
    });
  };
  convertTo(widen, CV_8UC4, CV_32FC4, 1 / 255.0);
  convertTo(narrow, CV_32FC4, CV_8UC4, 255);
  convertTo(up, CV_8UC4, CV_16UC4, 32768 / 255.0);
  convertTo(down, CV_16UC4, CV_8UC4, 255 / 32768.0);
#endif
  AddSwscale(widen, "bgra", "gbrapf32le");
}

void MoveCases(Size size) {
  Job copy = Convert("BGRA8 to BGRA8 (copy)", F::BGRA_4444_8u, F::BGRA_4444_8u, size);
  Job reorder8 = Convert("BGRA8 to ARGB8", F::BGRA_4444_8u, F::ARGB_4444_8u, size);
  Convert("BGRA32f to ARGB32f", F::BGRA_4444_32f, F::ARGB_4444_32f, size);
  Job premultiply = Convert("BGRA8 to BGRP8", F::BGRA_4444_8u, F::BGRP_4444_8u, size);
  Job unpremultiply = Convert("BGRP8 to BGRA8", F::BGRP_4444_8u, F::BGRA_4444_8u, size);
  Convert("BGRA32f to BGRP32f", F::BGRA_4444_32f, F::BGRP_4444_32f, size);
  Convert("UYVY8 to V210", F::UYVY_422_8u, F::V210_422_10u, size);
  Convert("V210 to UYVY8", F::V210_422_10u, F::UYVY_422_8u, size);
#ifdef VEXEL_PEER_YUV
  reorder8.report.Add("libyuv", [=] {
    libyuv::ARGBToBGRA(reorder8.src->data(), reorder8.src->rowBytes, reorder8.dst->data(), reorder8.dst->rowBytes,
                       size.width, size.height);
  });
  premultiply.report.Add("libyuv", [=] {
    libyuv::ARGBAttenuate(premultiply.src->data(), premultiply.src->rowBytes, premultiply.dst->data(),
                          premultiply.dst->rowBytes, size.width, size.height);
  });
  unpremultiply.report.Add("libyuv", [=] {
    libyuv::ARGBUnattenuate(unpremultiply.src->data(), unpremultiply.src->rowBytes, unpremultiply.dst->data(),
                            unpremultiply.dst->rowBytes, size.width, size.height);
  });
  copy.report.Add("libyuv", [=] {
    libyuv::ARGBCopy(copy.src->data(), copy.src->rowBytes, copy.dst->data(), copy.dst->rowBytes, size.width,
                     size.height);
  });
#endif
  AddSwscale(reorder8, "bgra", "argb");
}

void FloatCases(Size size) {
  Job matrix = Convert("BGRA32f to VUYA32f_709", F::BGRA_4444_32f, F::VUYA_4444_32f_709, size);
  Convert("VUYA32f_709 to BGRA32f", F::VUYA_4444_32f_709, F::BGRA_4444_32f, size);
  Job linear = Convert("BGRA8 to BGRA32f_Linear", F::BGRA_4444_8u, F::BGRA_4444_32f_Linear, size);
  Job coded = Convert("BGRA32f_Linear to BGRA8", F::BGRA_4444_32f_Linear, F::BGRA_4444_8u, size);
  Convert("BGRA32f to BGRA32f_Linear", F::BGRA_4444_32f, F::BGRA_4444_32f_Linear, size);
  Convert("V210 to BGRA32f", F::V210_422_10u, F::BGRA_4444_32f, size);
  Convert("BGRA32f to V210", F::BGRA_4444_32f, F::V210_422_10u, size);
#ifdef VEXEL_PEER_BABL
  babl_init();
  const auto babl = [&](Job& job, const char* from, const char* to) {
    const Babl* fish = babl_fish(babl_format(from), babl_format(to));
    job.report.Add("babl", [=, src = job.src, dst = job.dst] {
      for (int y = 0; y < size.height; ++y)
        babl_process(fish, src->data() + static_cast<size_t>(y) * src->rowBytes,
                     dst->data() + static_cast<size_t>(y) * dst->rowBytes, size.width);
    });
  };
  babl(linear, "R'G'B'A u8", "RGBA float");
  babl(coded, "RGBA float", "R'G'B'A u8");
#endif
#ifdef VEXEL_PEER_OPENCV
  auto from = std::make_shared<Memory>(size.Pixels() * 12);
  auto to = std::make_shared<Memory>(from->size());
  from->FillFloats();
  matrix.report.Add("OpenCV (3 channels)", [=] {
    cv::Mat in(size.height, size.width, CV_32FC3, from->data()), out(size.height, size.width, CV_32FC3, to->data());
    cv::cvtColor(in, out, cv::COLOR_BGR2YCrCb);
  });
#endif
}

// A chain against its steps, each run on its own over frames that stay in the cache.
void ChainCases() {
  struct Chain {
    const char* name;
    F src, dst;
  };
  const Chain chains[] = {{"BGRA8 to V210", F::BGRA_4444_8u, F::V210_422_10u},
                          {"V210 to BGRA15", F::V210_422_10u, F::BGRA_4444_15u},
                          {"XRGB8 to PRGB32f_Linear", F::XRGB_4444_8u, F::PRGB_4444_32f_Linear}};
  const Size size = {"1920 x 8", 1920, 8};
  for (const Chain& chain : chains) {
    Job job = Convert(std::string("chain ") + chain.name, chain.src, chain.dst, size);
    F formats[9];
    int32_t count = 0;
    Check(VX_ExplainConversion(chain.src, chain.dst, 2, formats, &count), chain.name);
    auto frames = std::make_shared<std::vector<std::unique_ptr<Frame>>>();
    for (int i = 0; i < count; ++i) frames->push_back(std::make_unique<Frame>(formats[i], size));
    job.report.Add("sum of its steps", [=] {
      for (size_t i = 1; i < frames->size(); ++i) {
        const Frame &from = *(*frames)[i - 1], &to = *(*frames)[i];
        VX_Convert(from.data(), from.rowBytes, from.format, to.data(), to.rowBytes, to.format, size.width, size.height,
                   2);
      }
    });
  }
  BenchCase("planning a remembered pair (ns per plan)", 1).Add("vexel", [] {
    Plan plan;
    MakePlan(F::XRGB_4444_8u, F::PRGB_4444_32f_Linear, 2, &plan);
  });
}

}  // namespace

void RegisterBenchmarks() {
  for (const Size size : {kHd, kUhd}) {
    Yuv8Cases(size);
    DepthCases(size);
    MoveCases(size);
    FloatCases(size);
  }
  ChainCases();
}
