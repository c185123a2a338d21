// 4:2:0 decoding and encoding of whole frames, one thread, beside libyuv and swscale.
#include <memory>
#include <string>

#include "convert/Planar420.h"
#include "support/Bench.h"
#include "support/Swscale.h"
#include "vexel/host_types.h"

#ifdef VEXEL_PEER_YUV
#include <libyuv.h>
#endif

namespace {

using namespace vexel;
using namespace vexel::bench;
using F = VX_PixelFormat;

// Bytes of a picture itself, without what lies between its rows and planes.
size_t PictureBytes(F format, Size size) {
  if (!Is420(format)) return static_cast<size_t>(UnpaddedRowBytes(format, size.width)) * size.height;
  return size.Pixels() * 3 / 2 * (HasWideSamples(format) ? 2 : 1);
}

struct Block {
  Block(F f, Size s) : format(f), size(s), memory(static_cast<size_t>(VX_PixelFormatSize(f, s.width, s.height))) {
    memory.FillBytes();
    VX_GetPlanarBuffers(memory.data(), f, s.width, s.height, planes, rowBytes);
  }
  const uint8_t* plane(int i) const { return static_cast<const uint8_t*>(planes[i]); }
  size_t pixelBytes() const { return PictureBytes(format, size); }
  F format;
  Size size;
  Memory memory;
  void* planes[3];
  int32_t rowBytes[3];
};

struct Job {
  std::shared_ptr<Block> src;
  std::shared_ptr<Memory> dst;
  int rowBytes;
  Size size;
  BenchCase report;
};

// Decoding to BGRA8 at a size and a field, with interpolated or with nearest chroma.
Job Decode(const std::string& name, F format, Size size, Size dstSize, bool interpolates, int field = 0) {
  const auto src = std::make_shared<Block>(format, size);
  const int rowBytes = dstSize.width * 4;
  const auto dst = std::make_shared<Memory>(static_cast<size_t>(rowBytes) * dstSize.height);
  const std::string chroma = interpolates ? " (interpolated) " : " (nearest) ";
  Job job{src, dst, rowBytes, size, BenchCase("decode " + name + " to BGRA8" + chroma + size.name, size.Pixels())};
  const auto work = [=] {
    return VX::DecompressYUV_420_8u(src->planes, src->rowBytes, size.width, size.height, format, dst->data(), rowBytes,
                                    dstSize.width, dstSize.height, F::BGRA_4444_8u,
                                    static_cast<zovmediatypes::FieldType>(field),
                                    static_cast<zovmediatypes::RenderQuality>(interpolates ? 2 : 1));
  };
  Check(work(), name);
  job.report.Add("vexel", work);
  job.report.AddFloor(src->pixelBytes(), dst->size());
  return job;
}

void AddSwscale(Job& job, const char* format) {
  const auto run = [src = job.src, dst = job.dst, rowBytes = job.rowBytes](auto& swscale) {
    const uint8_t* planes[4] = {src->plane(0), src->plane(1), src->plane(2)};
    const int rows[4] = {src->rowBytes[0], src->rowBytes[1], src->rowBytes[2]};
    swscale.RunPlanes(planes, rows, dst->data(), rowBytes);
  };
  bench::AddSwscale(job.report, format, "bgra", job.size, run);
}

#ifdef VEXEL_PEER_YUV
void AddLibyuv(Job& job, bool interpolates, bool is709) {
  const auto* matrix = is709 ? &libyuv::kYuvH709Constants : &libyuv::kYuvI601Constants;
  job.report.Add(interpolates && !IsBiplanar(job.src->format) ? "libyuv (bilinear)" : "libyuv (nearest)",
                 [=, src = job.src, dst = job.dst, rowBytes = job.rowBytes, size = job.size] {
                   const uint8_t *y = src->plane(0), *u = src->plane(1), *v = src->plane(2);
                   const int32_t* rows = src->rowBytes;
                   if (HasWideSamples(src->format))
                     libyuv::P010ToARGBMatrix(reinterpret_cast<const uint16_t*>(y), rows[0] / 2,
                                              reinterpret_cast<const uint16_t*>(u), rows[1] / 2, dst->data(), rowBytes,
                                              matrix, size.width, size.height);
                   else if (IsBiplanar(src->format))
                     libyuv::NV12ToARGBMatrix(y, rows[0], u, rows[1], dst->data(), rowBytes, matrix, size.width,
                                              size.height);
                   else if (interpolates)
                     libyuv::I420ToARGBMatrixFilter(y, rows[0], u, rows[1], v, rows[2], dst->data(), rowBytes, matrix,
                                                    size.width, size.height, libyuv::kFilterBilinear);
                   else
                     libyuv::I420ToARGBMatrix(y, rows[0], u, rows[1], v, rows[2], dst->data(), rowBytes, matrix,
                                              size.width, size.height);
                 });
}
#else
void AddLibyuv(Job&, bool, bool) {}
#endif

void FullSizeCases(Size size) {
  const struct {
    const char* name;
    F format;
    bool is709;
    const char* swscale;
  } sources[] = {{"I420 601", F::YUV_420_MPEG4_FRAME, false, "yuv420p"},
                 {"I420 709", F::YUV_420_MPEG4_FRAME_709, true, "yuv420p"},
                 {"NV12 601", FromBits(0x0E000831), false, "nv12"},
                 {"NV12 709", FromBits(0x0E000A31), true, "nv12"},
                 {"P010 709", FromBits(0x0E000A71), true, "p010le"}};
  for (const auto& source : sources)
    for (const bool interpolates : {false, true}) {
      Job job = Decode(source.name, source.format, size, size, interpolates);
      AddLibyuv(job, interpolates, source.is709);
      AddSwscale(job, source.swscale);
    }
}

void OtherSizeCases(Size size) {
  const F frame = F::YUV_420_MPEG4_FRAME_709, fields = F::YUV_420_MPEG2_FIELD_709;
  const auto reduced = [&](int across, int down) { return Size{"", size.width / across, size.height / down}; };
  Decode("I420, one field,", fields, size, reduced(1, 2), true, 1);
  Decode("I420 / 2 x 2", frame, size, reduced(2, 2), true);
  Decode("I420 / 4 x 4", frame, size, reduced(4, 4), true);
  Decode("I420 * 4/3", frame, {size.name, size.width / 4 * 3, size.height}, size, true);
}

// Conversions by way of a raster that the decoder makes or the encoder takes.
void ConvertCases(Size size) {
  const F nv12 = FromBits(0x0E000A31), p010 = FromBits(0x0E000A71), i420 = F::YUV_420_MPEG4_FRAME_709;
  const struct {
    const char* name;
    F src, dst;
  } cases[] = {{"I420 709 to UYVY8 709", i420, F::UYVY_422_8u_709},
               {"I420 709 to BGRA8", i420, F::BGRA_4444_8u},
               {"I420 709 to BGRA32f", i420, F::BGRA_4444_32f},
               {"NV12 709 to V210 709", nv12, F::V210_422_10u_709},
               {"UYVY8 709 to I420 709", F::UYVY_422_8u_709, i420},
               {"V210 709 to I420 709", F::V210_422_10u_709, i420},
               {"BGRA8 to I420 full range", F::BGRA_4444_8u, F::YUV_420_MPEG4_FRAME_FullRange},
               {"NV12 709 to I420 709", nv12, i420},
               {"P010 709 to I420 709", p010, i420},
               {"NV12 709 to I420 full range", nv12, F::YUV_420_MPEG4_FRAME_FullRange}};
  for (const auto& c : cases) {
    const auto bytes = [&](F format) {
      return static_cast<size_t>(VX_PixelFormatSize(format, size.width, size.height));
    };
    const auto src = std::make_shared<Memory>(bytes(c.src)), dst = std::make_shared<Memory>(bytes(c.dst));
    src->FillBytes();
    const auto rowBytes = [&](F format) { return static_cast<int32_t>(PaddedRowBytes(format, size.width)); };
    const auto work = [=, c = c, srcRow = rowBytes(c.src), dstRow = rowBytes(c.dst)] {
      return VX_Convert(src->data(), srcRow, c.src, dst->data(), dstRow, c.dst, size.width, size.height, 2);
    };
    Check(work(), c.name);
    BenchCase report(std::string("convert ") + c.name + " " + size.name, size.Pixels());
    report.Add("vexel", work).AddFloor(PictureBytes(c.src, size), PictureBytes(c.dst, size));
  }
}

void EncodeCases(Size size) {
  for (const F format : {F::YUV_420_MPEG4_FRAME_FullRange, F::YUV_420_MPEG4_FRAME_709}) {
    const bool video = format == F::YUV_420_MPEG4_FRAME_709;
    const F input = video ? F::VUYX_4444_8u_709 : F::BGRX_4444_8u;
    const auto src = std::make_shared<Memory>(size.Pixels() * 4);
    const auto dst = std::make_shared<Block>(format, size);
    src->FillBytes();
    const auto work = [=] {
      return Encode420(src->data(), size.width * 4, input, dst->memory.data(), format, size.width, size.height);
    };
    const std::string name = std::string("encode ") + (video ? "VUYX8 to I420 709 " : "BGRX8 to I420 full range ");
    Check(work(), name);
    BenchCase report(name + size.name, size.Pixels());
    report.Add("vexel", work).AddFloor(src->size(), dst->pixelBytes());
#ifdef VEXEL_PEER_YUV
    if (!video)
      report.Add("libyuv (ARGBToJ420)", [=] {
        libyuv::ARGBToJ420(src->data(), size.width * 4, static_cast<uint8_t*>(dst->planes[0]), dst->rowBytes[0],
                           static_cast<uint8_t*>(dst->planes[1]), dst->rowBytes[1],
                           static_cast<uint8_t*>(dst->planes[2]), dst->rowBytes[2], size.width, size.height);
      });
#endif
  }
}

}  // namespace

void RegisterBenchmarks() {
  for (const Size size : {kHd, kUhd}) {
    FullSizeCases(size);
    OtherSizeCases(size);
    EncodeCases(size);
    ConvertCases(size);
  }
}
