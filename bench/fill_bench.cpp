// Fills beside memset and OpenCV, cross-dissolves beside OpenCV's addWeighted, products and sums. On one thread but for
// the contenders that say otherwise.
#include <cstring>
#include <functional>
#include <memory>
#include <string>
#include <vector>

#include "formats/FormatBits.h"
#include "support/Bench.h"
#include "vexel/compositing.h"

#ifdef VEXEL_PEER_OPENCV
#include <opencv2/core.hpp>
#endif

namespace {

using F = VX_PixelFormat;
using namespace vexel::bench;

// 640 x 60 stays in the cache, and on one thread.
constexpr Size kSmall = {"640 x 60", 640, 60};
constexpr Size kSizes[] = {kSmall, kHd, kUhd};

struct Frame {
  Frame(F f, Size s) : format(f), size(s), rowBytes(static_cast<int32_t>(vexel::UnpaddedRowBytes(f, s.width))) {
    memory = std::make_shared<Memory>(
        static_cast<size_t>(vexel::Is420(f) ? VX_PixelFormatSize(f, s.width, s.height) : int64_t{rowBytes} * s.height));
    vexel::Depth(f) == vexel::kDepth32f ? memory->FillFloats() : memory->FillBytes();
  }
  uint8_t* data() const { return memory->data(); }
  F format;
  Size size;
  int32_t rowBytes;
  std::shared_ptr<Memory> memory;
};

void AddOurs(BenchCase& report, Size size, const std::function<void()>& call) {
  report.Add("vexel", call);
  if (size.height != kSmall.height) report.AddThreaded("vexel, 2 threads", 2, call);
}

#ifdef VEXEL_PEER_OPENCV
// The samples as OpenCV has types for them.
cv::Mat Samples(const Frame& frame) {
  const int depth = vexel::Depth(frame.format) == vexel::kDepth32f   ? CV_32F
                    : vexel::Depth(frame.format) == vexel::kDepth15u ? CV_16U
                                                                     : CV_8U;
  const int samples = frame.rowBytes / (depth == CV_32F ? 4 : depth == CV_16U ? 2 : 1);
  return cv::Mat(frame.size.height, samples / 4, CV_MAKETYPE(depth, 4), frame.data(),
                 static_cast<size_t>(frame.rowBytes));
}
#endif

void FillCase(const char* name, F format, Size size) {
  const Frame dst(format, size);
  const size_t bytes = vexel::Is420(format) ? size.Pixels() * 3 / 2 : dst.memory->size();
  BenchCase report(std::string("black ") + name + " " + size.name, size.Pixels());
  AddOurs(report, size, [=] { VX_FillWithOpaqueBlack(dst.data(), dst.rowBytes, size.width, size.height, format); });
  report.AddFloor(0, bytes);
  report.Add("memset", [=] { std::memset(dst.data(), 0x5A, bytes); });
#ifdef VEXEL_PEER_OPENCV
  if (vexel::Layout(format) == vexel::kLayout4444)
    report.Add("OpenCV", [=] {
      cv::setNumThreads(1);
      Samples(dst).setTo(cv::Scalar(0, 0, 0, 255));
    });
#endif
}

void DvCase() {
  auto dst = std::make_shared<Memory>(144000);
  BenchCase report("black DV25 PAL", 720 * 576);
  report.Add("vexel", [=] { VX_FillWithOpaqueBlack(dst->data(), 0, 720, 576, F::PALDV25); });
  report.AddFloor(0, 144000);
  report.Add("memset", [=] { std::memset(dst->data(), 0x5A, 144000); });
}

void DissolveCase(const char* name, F format, Size size) {
  const Frame a(format, size), b(format, size), dst(format, size);
  BenchCase report(std::string("dissolve ") + name + " " + size.name, size.Pixels());
  AddOurs(report, size, [=] {
    VX_CrossDissolve(a.data(), a.rowBytes, format, b.data(), b.rowBytes, format, dst.data(), dst.rowBytes, format,
                     size.width, size.height, 0.3f, 3);
  });
  report.AddFloor(2 * a.memory->size(), a.memory->size());
#ifdef VEXEL_PEER_OPENCV
  if (vexel::AlphaKind(format) != vexel::kAlphaStraight && vexel::Depth(format) != vexel::kDepth10u)
    for (const int threads : {1, 2}) {
      const auto work = [=] {
        cv::setNumThreads(threads);
        cv::Mat out = Samples(dst);
        cv::addWeighted(Samples(a), 0.7, Samples(b), 0.3, 0, out);
      };
      threads == 1 ? report.Add("OpenCV", work) : report.AddThreaded("OpenCV, 2 threads", threads, work);
    }
#endif
}

void MultiplyCase(Size size) {
  const F format = F::BGRA_4444_8u;
  const Frame src(format, size), dst(format, size);
  static constexpr uint8_t kFactors[4] = {200, 100, 50, 255};
  BenchCase report(std::string("multiply BGRA8 ") + size.name, size.Pixels());
  AddOurs(report, size, [=] {
    VX_MultiplyByConstant(size.width, size.height, src.data(), src.rowBytes, dst.data(), dst.rowBytes, kFactors, 8);
  });
  report.AddFloor(src.memory->size(), src.memory->size());
#ifdef VEXEL_PEER_OPENCV
  report.Add("OpenCV", [=] {
    cv::setNumThreads(1);
    cv::Mat out = Samples(dst);
    cv::multiply(Samples(src), cv::Scalar(200, 100, 50, 255), out, 1.0 / 256);
  });
#endif
}

// Four images into one, beside four additions of OpenCV's into a float image and the way back.
void AccumulateCase(F format, const char* name, Size size) {
  const std::vector<Frame> srcs = {{format, size}, {format, size}, {format, size}, {format, size}};
  const Frame dst(format, size);
  BenchCase report(std::string("mean of four ") + name + " " + size.name, size.Pixels());
  AddOurs(report, size, [=] {
    const void* bases[4];
    int32_t rowBytes[4];
    F formats[4];
    const float weights[] = {0.25f, 0.25f, 0.25f, 0.25f};
    for (size_t i = 0; i < 4; ++i) bases[i] = srcs[i].data(), rowBytes[i] = srcs[i].rowBytes, formats[i] = format;
    VX_Accumulate(bases, rowBytes, formats, 4, dst.data(), dst.rowBytes, format, size.width, size.height, weights, 3);
  });
  report.AddFloor(4 * dst.memory->size(), dst.memory->size());
#ifdef VEXEL_PEER_OPENCV
  auto sum = std::make_shared<Memory>(size.Pixels() * 16);
  report.Add("OpenCV", [=] {
    cv::setNumThreads(1);
    cv::Mat total(size.height, size.width, CV_32FC4, sum->data()), out = Samples(dst);
    cv::add(Samples(srcs[0]), Samples(srcs[1]), total, cv::noArray(), CV_32F);
    for (size_t i = 2; i < 4; ++i) cv::add(Samples(srcs[i]), total, total, cv::noArray(), CV_32F);
    total.convertTo(out, out.type(), 0.25);
  });
#endif
}

}  // namespace

void RegisterBenchmarks() {
  for (const Size size : kSizes) {
    FillCase("BGRA8", F::BGRA_4444_8u, size);
    FillCase("UYVY8", F::UYVY_422_8u, size);
    FillCase("V210", F::V210_422_10u, size);
    FillCase("BGRA15", F::BGRA_4444_15u, size);
    FillCase("BGRA32f", F::BGRA_4444_32f, size);
    FillCase("4:2:0", F::YUV_420_MPEG4_FRAME, size);
    DissolveCase("BGRX8", F::BGRX_4444_8u, size);
    DissolveCase("BGRP8", F::BGRP_4444_8u, size);
    DissolveCase("UYVY8", F::UYVY_422_8u, size);
    DissolveCase("BGRA8", F::BGRA_4444_8u, size);
    DissolveCase("V210", F::V210_422_10u, size);
    DissolveCase("BGRP15", F::BGRP_4444_15u, size);
    DissolveCase("BGRA15", F::BGRA_4444_15u, size);
    DissolveCase("BGRP32f", F::BGRP_4444_32f, size);
    DissolveCase("BGRA32f", F::BGRA_4444_32f, size);
    MultiplyCase(size);
    AccumulateCase(F::BGRA_4444_32f, "BGRA32f", size);
  }
  AccumulateCase(F::BGRA_4444_8u, "BGRA8", kHd);
  DvCase();
}
