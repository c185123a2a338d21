/* One-dimensional resampling filters as tables of fixed-point weights. */
#ifndef VEXEL_RESAMPLE_KERNEL_H
#define VEXEL_RESAMPLE_KERNEL_H

#include <cstdint>
#include <vector>

#include "vexel/vexel.h"

namespace VX {

/* Weights for 128 sub-pixel phases: phase p serves the fractional source offset p / 128. A row holds Width() signed Q14
 * weights (16384 = 1.0) for the source samples i + k, i the integer part of the source position and k from
 * -(Width() / 2 - 1) to Width() / 2. Weights are truncated toward zero, so a row sums to slightly less than 16384 or to
 * it.
 *
 * Cubics are those of Keys (1981) with coefficient a; Spline36 and Lanczos are the usual windows of 6 and 16 taps.
 *
 * One table is held at a time, for the scale asked for last; asking again within 0.01 of that scale keeps it, whichever
 * of the two calls made it. A broken contract (see the calls) is reported to the host, which throws
 * zovcore::config::Error. Not thread-safe while a table is made; read-only afterwards. */
class VX_API ResampleKernel {
 public:
  enum Type : int32_t {
    kBilinear = 1,    /* 2 taps; no down-sampling */
    kCubic = 2,       /* 4 taps, a = -0.75 */
    kCubicMedium = 3, /* 6 taps, a = -0.625 (-1 at a quarter), stretched by 1.15 */
    kCubicSharp = 4,  /* 6 taps, a = -1 (-2.2 at a quarter), stretched by 1.05 */
    kCubicSoft = 5,   /* 6 taps, a = -0.5, stretched by 1.2 */
    kSpline36 = 6,    /* 6 taps; no down-sampling */
    kLanczos8 = 7     /* 16 taps; down-sampling to 0.4 at most */
  };

  /* Any value is stored; an unknown type breaks a contract in every later call. Allocates nothing. */
  explicit ResampleKernel(int32_t kernelType);

  /* Makes the cubic table for an output / input size ratio of at most 1 ("decimatedScale <= 1.0" is a contract; 0.25 is
   * the least that is served). `scale` is the key of the table and sets its sharpness; callers pass the ratio twice. */
  void ScaleForDownSample(float decimatedScale, float scale);

  /* Makes the type's own table, for ratios of at least 1 ("scaleFactor >= 1.0" is a contract). */
  void ScaleForUpSample(float scaleFactor);

  /* Taps per phase; 0 before the first table. */
  int32_t Width() const { return fWidth; }
  /* The Width() weights of a phase, 0 to 127; the pointer holds until the next table. */
  const int16_t* Weights(int32_t phase) const { return fWeights.data() + static_cast<ptrdiff_t>(phase) * fWidth; }

 protected:
  void ScaleCubicKernel(float s, float a);
  void CalculateDefaultKernel();

 private:
  void AllocateOnFirstUse();
  void TrimZeroTaps(int lowest, int highest);

  int16_t fWidth = 0;
  std::vector<int16_t> fWeights;
  int16_t fAllocatedWidth = 0;
  int32_t fKernelType;
  float fCachedScale = -10.0f;
  float fSupportScale = 1.0f;
  float fSharpnessAtFullScale = -0.75f;
  float fSharpnessAtQuarterScale = -0.75f;
};

}  // namespace VX

#endif
