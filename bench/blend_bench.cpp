// Blend modes beside pixman's operators: 8-bit pictures and float pictures, source and background with alpha.
// pixman's alpha is premultiplied; it computes the blending operators in floats whatever the pictures hold.
#include <xmmintrin.h>

#include <map>
#include <memory>
#include <string>
#include <utility>

#include "support/Bench.h"
#include "support/Pixman.h"
#include "vexel/compositing.h"

namespace {

using namespace vexel::bench;
using F = VX_PixelFormat;
using M = VX_BlendMode;

struct Mode {
  M mode;
  const char* name;
  int pixmanOperator;  // -1 where it has none
};

#ifdef VEXEL_PEER_PIXMAN
#define VX_BENCH_MODE(mode, peer) \
  { M::mode, #mode, PIXMAN_OP_##peer }
#else
#define VX_BENCH_MODE(mode, peer) \
  { M::mode, #mode, -1 }
#endif
constexpr Mode kModes[] = {
    VX_BENCH_MODE(Multiply, MULTIPLY),    VX_BENCH_MODE(Screen, SCREEN),
    VX_BENCH_MODE(Overlay, OVERLAY),      VX_BENCH_MODE(SoftLight, SOFT_LIGHT),
    VX_BENCH_MODE(HardLight, HARD_LIGHT), VX_BENCH_MODE(ColorDodge, COLOR_DODGE),
    VX_BENCH_MODE(ColorBurn, COLOR_BURN), VX_BENCH_MODE(Difference, DIFFERENCE),
    VX_BENCH_MODE(Exclusion, EXCLUSION),  VX_BENCH_MODE(Darken, DARKEN),
    VX_BENCH_MODE(Hue, HSL_HUE),          VX_BENCH_MODE(Saturation, HSL_SATURATION),
    VX_BENCH_MODE(Color, HSL_COLOR),      VX_BENCH_MODE(Luminosity, HSL_LUMINOSITY),
    {M::VividLight, "VividLight", -1},    {M::DarkerColor, "DarkerColor", -1},
    {M::Dissolve, "Dissolve", -1},
};
#undef VX_BENCH_MODE

#ifdef VEXEL_PEER_PIXMAN
constexpr unsigned kFlushDenormals = 0x8040;
#endif

// One set for all cases of a size and format: what they are called with does not depend on the mode.
struct Pictures {
  Pictures(Size s, int pixelBytes) : size(s), rowBytes(size.width * pixelBytes), sources(2 * Bytes()), dst(Bytes()) {
    pixelBytes == 4 ? sources.FillBytes() : sources.FillFloats();
  }
  size_t Bytes() const { return static_cast<size_t>(rowBytes) * static_cast<size_t>(size.height); }
  uint8_t* Src() const { return sources.data(); }
  uint8_t* Background() const { return sources.data() + Bytes(); }

  Size size;
  int rowBytes;
  Memory sources, dst;
};

std::shared_ptr<Pictures> PicturesOf(Size size, F format) {
  static std::map<std::pair<int, F>, std::shared_ptr<Pictures>> made;
  auto& pictures = made[{size.width, format}];
  if (!pictures) pictures = std::make_shared<Pictures>(size, format == F::BGRA_4444_8u ? 4 : 16);
  return pictures;
}

void Blend(Pictures& p, M mode, F format) {
  VX_CompositeWithBlendMode(p.Src(), p.rowBytes, format, p.Background(), p.rowBytes, format, p.dst.data(), p.rowBytes,
                            format, p.size.width, p.size.height, 1.0f, static_cast<int32_t>(mode), 3, false);
}

#ifdef VEXEL_PEER_PIXMAN
// pixman composes in place, again and again, so values end as denormals; those must not slow it down.
void AddPixman(BenchCase& report, const std::shared_ptr<Pictures>& p, const Mode& mode, pixman_format_code_t format) {
  if (mode.pixmanOperator < 0) return;
  const auto src = PixmanImage(format, p->size, p->Src(), p->rowBytes),
             dst = PixmanImage(format, p->size, p->dst.data(), p->rowBytes);
  report.Add("pixman", [=] {
    const unsigned before = _mm_getcsr();
    _mm_setcsr(before | kFlushDenormals);
    pixman_image_composite32(static_cast<pixman_op_t>(mode.pixmanOperator), src.get(), nullptr, dst.get(), 0, 0, 0, 0,
                             0, 0, p->size.width, p->size.height);
    _mm_setcsr(before);
  });
}
#endif

void ModeCase(const Mode& mode, Size size, F format) {
  const bool inBytes = format == F::BGRA_4444_8u;
  const auto p = PicturesOf(size, format);
  BenchCase report(std::string(mode.name) + (inBytes ? " 8u " : " 32f ") + size.name, size.Pixels());
  report.Add("vexel", [=] { Blend(*p, mode.mode, format); });
  report.AddFloor(p->Src(), 2 * p->Bytes(), p->dst.data(), p->Bytes());
#ifdef VEXEL_PEER_PIXMAN
  AddPixman(report, p, mode, inBytes ? PIXMAN_a8r8g8b8 : PIXMAN_rgba_float);
#endif
}

void TwoThreadsCase(const Mode& mode, Size size, F format) {
  const auto p = PicturesOf(size, format);
  BenchCase report(std::string(mode.name) + (format == F::BGRA_4444_8u ? " 8u " : " 32f ") + size.name + ", threads",
                   size.Pixels());
  for (const int threads : {1, 2})
    report.AddThreaded(threads == 1 ? "vexel" : "two threads", threads, [=] { Blend(*p, mode.mode, format); });
}

}  // namespace

void RegisterBenchmarks() {
  for (const F format : {F::BGRA_4444_8u, F::BGRA_4444_32f}) {
    for (const Mode& mode : kModes) ModeCase(mode, kHd, format);
    for (const Mode& mode : {kModes[0], kModes[3], kModes[10]}) ModeCase(mode, kUhd, format);
    for (const Mode& mode : {kModes[0], kModes[10]}) TwoThreadsCase(mode, kUhd, format);
  }
}
