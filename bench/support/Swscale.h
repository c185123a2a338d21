// swscale as a peer: one conversion without scaling, with its fast flags and with its accurate ones. They differ
// thirtyfold.
#pragma once

#include <cstdint>
#include <memory>
#include <string>

#include "support/Bench.h"

#ifdef VEXEL_PEER_SWSCALE
extern "C" {
#include <libavutil/log.h>
#include <libavutil/pixdesc.h>
#include <libswscale/swscale.h>
}
#include <vector>
#endif

namespace vexel::bench {

#ifdef VEXEL_PEER_SWSCALE
class Swscale {
 public:
  Swscale(const char* srcFormat, const char* dstFormat, int width, int height, bool accurate)
      : mHeight(height), mAccurate(accurate) {
    av_log_set_level(AV_LOG_ERROR);
    const int flags = accurate ? SWS_ACCURATE_RND | SWS_BITEXACT | SWS_FULL_CHR_H_INT | SWS_FULL_CHR_H_INP | SWS_BICUBIC
                               : SWS_FAST_BILINEAR;
    const AVPixelFormat to = av_get_pix_fmt(dstFormat);
    mContext =
        sws_getContext(width, height, av_get_pix_fmt(srcFormat), width, height, to, flags, nullptr, nullptr, nullptr);
    // Planar destinations get planes of their own.
    const int planes = av_pix_fmt_count_planes(to);
    for (int i = 0; planes > 1 && i < planes; ++i) mPlanes.emplace_back(static_cast<size_t>(width) * height * 4);
    mPlaneRowBytes = width * 4;
  }
  ~Swscale() { sws_freeContext(mContext); }
  Swscale(const Swscale&) = delete;
  Swscale& operator=(const Swscale&) = delete;

  bool valid() const { return mContext != nullptr; }
  std::string name() const {
    return mAccurate ? "swscale accurate_rnd+bitexact+full_chroma_int" : "swscale fast_bilinear";
  }
  void Run(const uint8_t* src, int srcRowBytes, uint8_t* dst, int dstRowBytes) {
    const uint8_t* from[4] = {src};
    const int fromRow[4] = {srcRowBytes};
    RunPlanes(from, fromRow, dst, dstRowBytes);
  }
  void RunPlanes(const uint8_t* const* src, const int* srcRowBytes, uint8_t* dst, int dstRowBytes) {
    uint8_t* to[4] = {dst};
    int toRow[4] = {dstRowBytes};
    for (size_t i = 0; i < mPlanes.size(); ++i) {
      to[i] = mPlanes[i].data();
      toRow[i] = mPlaneRowBytes;
    }
    sws_scale(mContext, src, srcRowBytes, 0, mHeight, to, toRow);
  }

 private:
  SwsContext* mContext = nullptr;
  int mHeight, mPlaneRowBytes = 0;
  bool mAccurate;
  std::vector<std::vector<uint8_t>> mPlanes;
};
#endif

// Both settings, where swscale knows the formats; run(swscale) converts once. `note` is added to its name.
template <class Run>
void AddSwscale([[maybe_unused]] BenchCase& report, [[maybe_unused]] const char* srcFormat,
                [[maybe_unused]] const char* dstFormat, [[maybe_unused]] Size size, [[maybe_unused]] const Run& run,
                [[maybe_unused]] const std::string& note = "") {
#ifdef VEXEL_PEER_SWSCALE
  for (const bool accurate : {false, true}) {
    const auto swscale = std::make_shared<Swscale>(srcFormat, dstFormat, size.width, size.height, accurate);
    if (swscale->valid()) report.Add(swscale->name() + note, [=] { run(*swscale); });
  }
#endif
}

}  // namespace vexel::bench
