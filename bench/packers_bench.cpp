// Codec packers and camera converters beside the memory floor.
#include <cmath>
#include <cstring>
#include <memory>
#include <string>

#include "support/Bench.h"
#include "vexel/vexel.h"

namespace {

using namespace vexel::bench;

// One picture on each side, or one for both where destination bytes are 0.
struct Packer {
  const char* name;
  int srcBytes, dstBytes;  // of six pixels
  void (*run)(const uint8_t* src, uint8_t* dst, int width, int height);
};

constexpr Packer kPackers[] = {
    {"15u to 16u", 48, 0,
     [](const uint8_t*, uint8_t* p, int w, int h) { VX_Convert_15u_To_16u_InPlace(p, w * 8, w, h); }},
    {"15u to 16u big-endian", 48, 0,
     [](const uint8_t*, uint8_t* p, int w, int h) { VX_Convert_15u_To_16u_BigEndian_InPlace(p, w * 8, w, h); }},
    {"byte swap of words", 24, 0,
     [](const uint8_t*, uint8_t* p, int w, int h) { VX_Convert_Uint32_BigEndian_InPlace(p, w * 4, w, h); }},
    {"UYVY10 to V210", 24, 16,
     [](const uint8_t* s, uint8_t* d, int w, int h) {
       VX_ConvertUYVY_422_10uToV210_422_10u(s, w * 4, d, w / 6 * 16, w, h);
     }},
    {"V210 to UYVY10", 16, 24,
     [](const uint8_t* s, uint8_t* d, int w, int h) {
       VX_Convert_j2k_V210_To_10_Bits_Within_UYVY16u(s, w / 6 * 16, d, w * 4, w, h);
     }},
    {"RGB10 to DNxHD 16u", 24, 48,
     [](const uint8_t* s, uint8_t* d, int w, int h) { VX_Convert_RGB_444_10u_To_DNxHD16u(s, w * 4, d, w, h); }},
    {"DNxHD 16u to RGB10", 48, 24,
     [](const uint8_t* s, uint8_t* d, int w, int h) { VX_Convert_DNxHD16u_To_RGB_444_10u(s, d, w * 4, w, h); }},
    {"RGB8 to BGRA8", 18, 24,
     [](const uint8_t* s, uint8_t* d, int w, int h) { VX_ConvertRGB_444_8uToBGRA_4444_8u(s, w * 3, d, w * 4, w, h); }},
    {"RGB16 to XRGB15", 36, 48,
     [](const uint8_t* s, uint8_t* d, int w, int h) {
       VX_ConvertRGB_444_16u_To_XRGB_4444_15u(s, w * 6, d, w * 8, w, h);
     }},
    {"S-Gamut3 to S-Gamut3.Cine", 48, 0,
     [](const uint8_t*, uint8_t* p, int w, int h) { VX_Convert_SGamut3_16u_To_SGamut3Cine_16u(p, w * 8, w, h); }},
    {"Canon Log 3 to float", 48, 96, [](const uint8_t* s, uint8_t* d, int w, int h) {
       VX_Convert_16uARGB_To_32fBGRX_Remove_CanonLog3_Apply_709(s, w * 8, d, w * 16, w, h, 0);
     }}};

void PackerCase(const Packer& packer, Size size) {
  const size_t pixels = size.Pixels();
  const bool inPlace = packer.dstBytes == 0;
  const size_t srcBytes = pixels * static_cast<size_t>(packer.srcBytes) / 6;
  auto src = std::make_shared<Memory>(srcBytes);
  src->FillBytes();
  auto dst = inPlace ? src : std::make_shared<Memory>(pixels * static_cast<size_t>(packer.dstBytes) / 6);
  BenchCase report(std::string(packer.name) + " " + size.name, pixels);
  report.Add("vexel", [=] { packer.run(src->data(), dst->data(), size.width, size.height); });
  if (inPlace)
    report.AddFloor(src->data(), src->size(), src->data(), src->size(), false);
  else
    report.AddFloor(src->size(), dst->size());
}

// The definition of Canon Log 3, one pixel after the other over the C library.
void CanonLog3Loop(const uint8_t* src, float* dst, size_t pixels) {
  const auto display = [](uint16_t sample) {
    const double x = static_cast<float>(sample) / 65535.0f;
    const double light = x < 0.04076162     ? -(std::pow(10.0, (0.07623209 - x) / 0.42889912) - 1) / 14.98325
                         : x <= 0.105357102 ? (x - 0.073059361) / 2.3069815
                                            : (std::pow(10.0, (x - 0.069886632) / 0.42889912) - 1) / 14.98325;
    const auto stored = static_cast<float>(light);
    return std::copysign(std::pow(std::fabs(stored), 0.41666666f), stored);
  };
  for (size_t i = 0; i < pixels; ++i) {
    uint16_t argb[4];
    std::memcpy(argb, src + 8 * i, sizeof argb);
    for (int k = 0; k < 3; ++k) dst[4 * i + k] = display(argb[3 - k]);
    dst[4 * i + 3] = 1.0f;
  }
}

void CanonLog3LoopCase() {
  constexpr int kWidth = 1920, kHeight = 108;
  constexpr size_t kPixels = size_t{kWidth} * kHeight;
  auto src = std::make_shared<Memory>(kPixels * 8), dst = std::make_shared<Memory>(kPixels * 16);
  src->FillBytes();
  BenchCase report("Canon Log 3 to float, a tenth of 1080p", kPixels);
  report.Add("vexel", [=] {
    VX_Convert_16uARGB_To_32fBGRX_Remove_CanonLog3_Apply_709(src->data(), kWidth * 8, dst->data(), kWidth * 16, kWidth,
                                                             kHeight, 0);
  });
  report.Add("C library", [=] { CanonLog3Loop(src->data(), reinterpret_cast<float*>(dst->data()), kPixels); });
}

}  // namespace

void RegisterBenchmarks() {
  for (const Packer& packer : kPackers)
    for (const Size size : {kHd, kUhd}) PackerCase(packer, size);
  CanonLog3LoopCase();
}
