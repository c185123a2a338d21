// Canon Log 3 to display gamma. A sample has 65,536 codes, so each result is computed once and then looked up: the same
// floats in every kernel variant.
#include <array>
#include <cmath>
#include <cstring>

#include "convert/StreamedRows.h"
#include "frame/FpModeGuard.h"
#include "vexel/vexel.h"

namespace vexel {
namespace {

// Canon Log 3 as given by Canon: logarithmic on both sides of a linear piece.
double LinearFromCanonLog3(double x) {
  constexpr double kSlope = 0.42889912, kGain = 14.98325;
  if (x < 0.04076162) return -(std::pow(10.0, (0.07623209 - x) / kSlope) - 1) / kGain;
  if (x <= 0.105357102) return (x - 0.073059361) / 2.3069815;
  return (std::pow(10.0, (x - 0.069886632) / kSlope) - 1) / kGain;
}

// A power of floats rounded once, from double precision: C libraries differ in their powf.
float DisplayGamma(float linear) {
  constexpr float kExponent = 0.41666666f;
  return static_cast<float>(std::copysign(std::pow(std::fabs(double{linear}), double{kExponent}), double{linear}));
}

struct CanonLog3Table {
  std::array<float, 65536> display;
  CanonLog3Table() {
    const DefaultFpMode mode;
    for (size_t code = 0; code < display.size(); ++code) {
      const float x = static_cast<float>(code) / 65535.0f;
      display[code] = DisplayGamma(static_cast<float>(LinearFromCanonLog3(x)));
    }
  }
};

const float* CanonLog3ToDisplay() {
  static const CanonLog3Table table;
  return table.display.data();
}

// Byte-swapping a whole pixel A R G B also reverses its samples.
template <bool kSwap, bool kStream>
void CanonLog3Row(const float* table, const uint8_t* src, uint8_t* dst, size_t count) {
  for (size_t i = 0; i < count; ++i, src += 8, dst += 16) {
    uint64_t pixel;
    std::memcpy(&pixel, src, sizeof pixel);
    if (kSwap) pixel = __builtin_bswap64(pixel);
    const auto sample = [&](int shift) { return table[pixel >> shift & 0xFFFF]; };
    const __m128 bgrx = _mm_setr_ps(sample(kSwap ? 0 : 48), sample(kSwap ? 16 : 32), sample(kSwap ? 32 : 16), 1.0f);
    if (kStream)
      _mm_stream_ps(reinterpret_cast<float*>(dst), bgrx);
    else
      _mm_storeu_ps(reinterpret_cast<float*>(dst), bgrx);
  }
}

}  // namespace
}  // namespace vexel

using namespace vexel;

VX_Result VX_Convert_16uARGB_To_32fBGRX_Remove_CanonLog3_Apply_709(const void* src, int32_t srcRowBytes, void* dst,
                                                                   int32_t dstRowBytes, int32_t width, int32_t height,
                                                                   uint8_t bigEndian) noexcept {
  if (width < 1 || height < 1) return VX_Success;
  const float* table = CanonLog3ToDisplay();
  const auto store = bigEndian ? CanonLog3Row<true, false> : CanonLog3Row<false, false>;
  const auto stream = bigEndian ? CanonLog3Row<true, true> : CanonLog3Row<false, true>;
  ConvertRows(
      SourceRows(src, srcRowBytes, 8), DestinationRows(dst, dstRowBytes, 16), static_cast<size_t>(width), height,
      [=](const uint8_t* from, uint8_t* to, size_t count) { store(table, from, to, count); },
      [=](const uint8_t* from, uint8_t* to, size_t count) { stream(table, from, to, count); });
  return VX_Success;
}
