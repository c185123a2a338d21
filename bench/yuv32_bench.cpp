// Row kernels of float Y'CbCr and V210 beside zimg and swscale, which work on planes: the same picture and depths, with
// no alpha. "vexel" writes the way VX_Convert does at that size, and the other way has a name of its own: "vexel
// ordinary stores" writes rows to the destination directly, "vexel streamed" goes through the cache and past it in the
// blocks of VX_Convert. The cases named "row" stay in the cache.
#include <algorithm>
#include <memory>
#include <string>
#include <vector>

#include "convert/RowConverter.h"
#include "convert/YuvKernels.h"
#include "frame/FpModeGuard.h"
#include "frame/StreamCopy.h"
#include "support/Bench.h"
#include "vexel/vexel.h"

#ifdef VEXEL_PEER_ZIMG
#include <zimg.h>
#endif
#ifdef VEXEL_PEER_SWSCALE
extern "C" {
#include <libswscale/swscale.h>
}
#endif

namespace {

using vexel::KernelVariant;
using vexel::RowKernelSet;
using namespace vexel::bench;

constexpr Size kSizes[] = {{"row", 1920, 1}, kHd, kUhd};

// A picture of three planes, as the peers know it.
struct Planes {
  int bits = 8;
  bool isFloat = false, isRgb = false, isHalf = false;  // half: 4:2:2

  size_t SampleBytes() const { return isFloat ? 4 : bits > 8 ? 2 : 1; }
  size_t RowBytes(Size size, int plane) const {
    const int width = isHalf && plane > 0 ? size.width / 2 : size.width;
    return (static_cast<size_t>(width) * SampleBytes() + 63) / 64 * 64;
  }
  size_t Bytes(Size size, int plane) const { return RowBytes(size, plane) * static_cast<size_t>(size.height); }
};
constexpr Planes kRgb8{8, false, true, false}, kYuv8{8, false, false, false}, k422_8{8, false, false, true},
    k422_10{10, false, false, true}, kRgbFloat{32, true, true, false}, kYuvFloat{32, true, false, false};

struct Case {
  const char* name;
  const RowKernelSet* kernels;
  size_t srcBits, dstBits;  // per pixel
  bool isFloatSource;
  const Planes *from, *to;  // what zimg does instead; null if it has no like
  bool needsRow = false;
};
const Case kCases[] = {
    {"BGRA32f to VUYA32f", &vexel::kBgra32fToVuya32f_709, 128, 128, true, &kRgbFloat, &kYuvFloat},
    {"VUYA32f to BGRA32f", &vexel::kVuya32fToBgra32f_709, 128, 128, true, &kYuvFloat, &kRgbFloat},
    {"VUYA32f 601 to 709", &vexel::kVuya32f_601To709, 128, 128, true, nullptr, nullptr},
    {"VUYA8 to BGRA32f", &vexel::kVuya8ToBgra32f_709, 32, 128, false, &kYuv8, &kRgbFloat},
    {"BGRA32f to VUYA8", &vexel::kBgra32fToVuya8_709, 128, 32, true, &kRgbFloat, &kYuv8},
    {"VUYA8 to VUYA32f", &vexel::kVuya8To32f, 32, 128, false, &kYuv8, &kYuvFloat},
    {"VUYA32f to VUYA8", &vexel::kVuya32fTo8, 128, 32, true, &kYuvFloat, &kYuv8},
    {"UYVY8 to UYVY32f", &vexel::kUyvy8To32f, 16, 64, false, nullptr, nullptr},
    {"UYVY32f to UYVY8", &vexel::kUyvy32fTo8, 64, 16, true, nullptr, nullptr},
    {"UYVY32f to VUYX32f", &vexel::kUyvy32fToVuyx32f, 64, 128, true, nullptr, nullptr, true},
    {"VUYX32f to UYVY32f", &vexel::kVuyx32fToUyvy32f, 128, 64, true, nullptr, nullptr, true},
    {"UYVY8 to V210", &vexel::kUyvy8ToV210, 16, 0, false, &k422_8, &k422_10},
    {"V210 to UYVY8", &vexel::kV210ToUyvy8, 0, 16, false, &k422_10, &k422_8},
    {"UYVY32f to V210", &vexel::kUyvy32fToV210, 64, 0, true, nullptr, nullptr},
    {"V210 to UYVY32f", &vexel::kV210ToUyvy32f, 0, 64, false, nullptr, nullptr},
    {"V210 to BGRX8", &vexel::kV210ToBgrx8_709, 0, 32, false, &k422_10, &kRgb8, true},
    {"V210 to VUYX8", &vexel::kV210ToVuyx8, 0, 32, false, &k422_10, &kYuv8, true},
    {"V210 709 to VUYX8 601", &vexel::kV210_709ToVuyx8_601, 0, 32, false, nullptr, nullptr, true},
};

// 0 bits per pixel stand for V210.
size_t RowBytes(size_t bits, size_t width) { return bits == 0 ? (width + 5) / 6 * 16 : width * bits / 8; }

#ifdef VEXEL_PEER_ZIMG
class ZimgPeer {
 public:
  ZimgPeer(const Planes& from, const Planes& to, Size size)
      : mSource(MakePlanes(from, size)), mDestination(MakePlanes(to, size)) {
    const zimg_image_format source = Format(from, size), destination = Format(to, size);
    mGraph.reset(zimg_filter_graph_build(&source, &destination, nullptr));
    size_t bytes = 0;
    if (mGraph) zimg_filter_graph_get_tmp_size(mGraph.get(), &bytes);
    mScratch = std::make_unique<Memory>(bytes);
  }
  explicit operator bool() const { return mGraph != nullptr; }

  void Run() {
    zimg_image_buffer_const in = {};
    zimg_image_buffer out = {};
    in.version = out.version = ZIMG_API_VERSION;
    for (size_t i = 0; i < 3; ++i) {
      in.plane[i] = {mSource[i].memory->data(), mSource[i].stride, ZIMG_BUFFER_MAX};
      out.plane[i] = {mDestination[i].memory->data(), mDestination[i].stride, ZIMG_BUFFER_MAX};
    }
    zimg_filter_graph_process(mGraph.get(), &in, &out, mScratch->data(), nullptr, nullptr, nullptr, nullptr);
  }

 private:
  struct Plane {
    std::unique_ptr<Memory> memory;
    ptrdiff_t stride;
  };
  struct Free {
    void operator()(zimg_filter_graph* graph) const { zimg_filter_graph_free(graph); }
  };
  static std::vector<Plane> MakePlanes(const Planes& planes, Size size) {
    std::vector<Plane> result;
    for (int i = 0; i < 3; ++i) {
      result.push_back(
          {std::make_unique<Memory>(planes.Bytes(size, i)), static_cast<ptrdiff_t>(planes.RowBytes(size, i))});
      if (planes.isFloat) result.back().memory->FillFloats();
    }
    return result;
  }
  static zimg_image_format Format(const Planes& planes, Size size) {
    zimg_image_format format;
    zimg_image_format_default(&format, ZIMG_API_VERSION);
    format.width = static_cast<unsigned>(size.width);
    format.height = static_cast<unsigned>(size.height);
    format.pixel_type = planes.isFloat ? ZIMG_PIXEL_FLOAT : planes.bits > 8 ? ZIMG_PIXEL_WORD : ZIMG_PIXEL_BYTE;
    format.subsample_w = planes.isHalf;
    format.color_family = planes.isRgb ? ZIMG_COLOR_RGB : ZIMG_COLOR_YUV;
    format.matrix_coefficients = planes.isRgb ? ZIMG_MATRIX_RGB : ZIMG_MATRIX_709;
    format.depth = static_cast<unsigned>(planes.bits);
    format.pixel_range = planes.isRgb ? ZIMG_RANGE_FULL : ZIMG_RANGE_LIMITED;
    return format;
  }

  std::vector<Plane> mSource, mDestination;
  std::unique_ptr<zimg_filter_graph, Free> mGraph;
  std::unique_ptr<Memory> mScratch;
};
#endif

#ifdef VEXEL_PEER_SWSCALE
// Planar 4:2:2 of 10 bits to BGRA, swscale's nearest to V210; its default flags and its accurate ones.
void AddSwscale(BenchCase& report, Size size, const char* name, int flags) {
  const auto context =
      std::shared_ptr<SwsContext>(sws_getContext(size.width, size.height, AV_PIX_FMT_YUV422P10LE, size.width,
                                                 size.height, AV_PIX_FMT_BGRA, flags, nullptr, nullptr, nullptr),
                                  sws_freeContext);
  if (!context) return;
  std::shared_ptr<Memory> planes[3];
  for (int i = 0; i < 3; ++i) planes[i] = std::make_shared<Memory>(k422_10.Bytes(size, i));
  const auto dst = std::make_shared<Memory>(4 * size.Pixels());
  report.Add(name, [=] {
    const uint8_t* in[4] = {planes[0]->data(), planes[1]->data(), planes[2]->data(), nullptr};
    const int inStride[4] = {static_cast<int>(k422_10.RowBytes(size, 0)), static_cast<int>(k422_10.RowBytes(size, 1)),
                             static_cast<int>(k422_10.RowBytes(size, 2)), 0};
    uint8_t* out[4] = {dst->data()};
    const int outStride[4] = {4 * size.width};
    sws_scale(context.get(), in, inStride, 0, size.height, out, outStride);
  });
}
#endif

void AddCase(const Case& c, Size size) {
  const size_t width = static_cast<size_t>(size.width), height = static_cast<size_t>(size.height);
  const size_t srcRow = RowBytes(c.srcBits, width), dstRow = RowBytes(c.dstBits, width);
  const size_t block = c.needsRow ? vexel::kStreamBlock : vexel::kChainBlock, reach = c.needsRow ? vexel::kReach : 0;
  const auto src = std::make_shared<Memory>(srcRow * height), dst = std::make_shared<Memory>(dstRow * height),
             scratch = std::make_shared<Memory>(RowBytes(c.dstBits, block + 2 * reach));
  if (c.isFloatSource)
    src->FillFloats();
  else
    src->FillBytes();
  BenchCase report(std::string(c.name) + " " + size.name, size.Pixels());
  const KernelVariant variant = vexel::ActiveKernelVariant();
  const auto kernel = (*c.kernels)[variant];
  const bool streams = VX_GetCacheSize() != 0 && src->size() + dst->size() >= VX_GetCacheSize() / 2;
  report.Add(streams ? "vexel ordinary stores" : "vexel", [=] {
    const vexel::FpModeGuard guard;
    for (size_t row = 0; row < height; ++row) kernel(src->data() + row * srcRow, dst->data() + row * dstRow, width);
  });
  if (height > 1)
    report.Add(streams ? "vexel" : "vexel streamed", [=, srcBits = c.srcBits, dstBits = c.dstBits] {
      const vexel::FpModeGuard guard;
      for (size_t row = 0; row < height; ++row)
        for (size_t x = 0; x < width; x += block) {
          const size_t first = x - std::min(x, reach), end = std::min(width, x + block + reach);
          kernel(src->data() + row * srcRow + RowBytes(srcBits, first), scratch->data(), end - first);
          vexel::StreamCopy(dst->data() + row * dstRow + RowBytes(dstBits, x),
                            scratch->data() + RowBytes(dstBits, x - first),
                            RowBytes(dstBits, std::min(block, width - x)), variant);
        }
      vexel::StreamFence();
    });
  report.AddFloor(src->size(), dst->size());
#ifdef VEXEL_PEER_ZIMG
  if (c.from && height > 1)
    if (const auto peer = std::make_shared<ZimgPeer>(*c.from, *c.to, size); *peer)
      report.Add("zimg (planes)", [peer] { peer->Run(); });
#endif
#ifdef VEXEL_PEER_SWSCALE
  if (c.kernels == &vexel::kV210ToBgrx8_709 && height > 1) {
    AddSwscale(report, size, "swscale (planes, bilinear)", SWS_BILINEAR);
    AddSwscale(report, size, "swscale (planes, accurate)",
               SWS_BILINEAR | SWS_ACCURATE_RND | SWS_FULL_CHR_H_INT | SWS_FULL_CHR_H_INP);
  }
#endif
}

}  // namespace

void RegisterBenchmarks() {
  for (const Size size : kSizes)
    for (const Case& c : kCases) AddCase(c, size);
}
