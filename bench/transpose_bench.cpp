// Transpose and rotation beside OpenCV and libyuv.
#include <memory>
#include <string>

#include "support/Bench.h"
#include "vexel/vexel.h"

#ifdef VEXEL_PEER_YUV
#include <libyuv.h>
#endif
#ifdef VEXEL_PEER_OPENCV
#include <opencv2/core.hpp>
#endif

namespace {

using namespace vexel::bench;

// 2048 x 2048: row bytes of 4-byte elements are a multiple of 4,096 on both sides.
constexpr Size kSizes[] = {kHd, kUhd, {"8K", 7680, 4320}, {"2048 x 2048", 2048, 2048}};

void TransposeCase(Size size, int bytes) {
  const int srcRow = size.width * bytes, dstRow = (size.height * bytes + 63) / 64 * 64;
  auto src = std::make_shared<Memory>(static_cast<size_t>(srcRow) * size.height);
  auto dst = std::make_shared<Memory>(static_cast<size_t>(dstRow) * size.width);
  src->FillBytes();
  BenchCase report("transpose " + std::to_string(bytes) + " B " + size.name, size.Pixels());
  report.Add("vexel", [=] {
    VX_Transpose(src->data(), srcRow, dst->data(), dstRow, size.width, size.height, static_cast<uint8_t>(bytes));
  });
  report.AddFloor(src->size(), dst->size());
#ifdef VEXEL_PEER_OPENCV
  const int type = bytes == 1   ? CV_8UC1
                   : bytes == 2 ? CV_16UC1
                   : bytes == 4 ? CV_32SC1
                   : bytes == 8 ? CV_32SC2
                                : CV_32SC4;
  report.Add("OpenCV", [=] {
    cv::Mat from(size.height, size.width, type, src->data(), static_cast<size_t>(srcRow));
    cv::Mat to(size.width, size.height, type, dst->data(), static_cast<size_t>(dstRow));
    cv::transpose(from, to);
  });
#endif
#ifdef VEXEL_PEER_YUV
  if (bytes == 1)
    report.Add("libyuv",
               [=] { libyuv::TransposePlane(src->data(), srcRow, dst->data(), dstRow, size.width, size.height); });
#endif
}

void RotateCase(Size size, int angle) {
  const bool sideways = angle % 180 != 0;
  const int columns = sideways ? size.height : size.width, rows = sideways ? size.width : size.height;
  const int srcRow = size.width * 4, dstRow = (columns * 4 + 63) / 64 * 64;
  auto src = std::make_shared<Memory>(static_cast<size_t>(srcRow) * size.height);
  auto dst = std::make_shared<Memory>(static_cast<size_t>(dstRow) * rows);
  src->FillBytes();
  BenchCase report("rotate BGRA8 by " + std::to_string(angle) + " " + size.name, size.Pixels());
  report.Add("vexel", [=] {
    VX_RotateImageAndFlip(src->data(), srcRow, dst->data(), dstRow, size.width, size.height,
                          VX_PixelFormat::BGRA_4444_8u, angle, false);
  });
  report.AddFloor(src->size(), dst->size());
#ifdef VEXEL_PEER_YUV
  report.Add("libyuv", [=] {
    libyuv::ARGBRotate(src->data(), srcRow, dst->data(), dstRow, size.width, size.height,
                       static_cast<libyuv::RotationMode>(angle));
  });
#endif
#ifdef VEXEL_PEER_OPENCV
  report.Add("OpenCV", [=] {
    cv::Mat from(size.height, size.width, CV_8UC4, src->data(), static_cast<size_t>(srcRow));
    cv::Mat to(rows, columns, CV_8UC4, dst->data(), static_cast<size_t>(dstRow));
    cv::rotate(from, to,
               angle == 90    ? cv::ROTATE_90_COUNTERCLOCKWISE
               : angle == 180 ? cv::ROTATE_180
                              : cv::ROTATE_90_CLOCKWISE);
  });
#endif
}

}  // namespace

void RegisterBenchmarks() {
  for (const Size size : kSizes) {
    for (const int bytes : {1, 2, 4, 8, 16}) TransposeCase(size, bytes);
    for (const int angle : {90, 180, 270}) RotateCase(size, angle);
  }
}
