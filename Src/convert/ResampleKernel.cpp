#include "vexel/resample_kernel.h"

#include <algorithm>
#include <cmath>
#include <cstring>
#include <emmintrin.h>

#include "zovcore/Config.h"
#include "zovcore/Debug.h"

namespace VX {
namespace {

constexpr int kPhases = 128;
constexpr double kUnit = 16384;
constexpr double kPi = 3.14159265358979323846;

[[noreturn]] void ContractBroken(const char* condition, const char* function, int line) {
  if (zovcore::debug::BreakAfterContractDialog(condition, "ResampleKernel.cpp", function, line) &&
      zovcore::debug::IsDebuggerAttached())
    __asm__ volatile("int3");  // the debugger may let it go on
  zovcore::config::ThrowError(
      0, "$$$/zovcore/utility/Error/Contract/InputContractViolation=An input contract violation has occurred!", 105, 25,
      true, {}, {}, {}, {});
}

#define VX_CONTRACT(condition, function) \
  if (!(condition)) ContractBroken(#condition, "VX::ResampleKernel::" function, __LINE__)

struct TypeTraits {
  int16_t allocatedWidth;
  float supportScale, sharpnessAtFull, sharpnessAtQuarter;
};
constexpr TypeTraits kTypes[] = {
    {0, 1.0f, -0.75f, -0.75f},    // unknown
    {2, 1.0f, -0.75f, -0.75f},    // kBilinear
    {20, 1.0f, -0.75f, -0.75f},   // kCubic
    {20, 1.15f, -0.625f, -1.0f},  // kCubicMedium
    {20, 1.05f, -1.0f, -2.2f},    // kCubicSharp
    {20, 1.2f, -0.5f, -0.5f},     // kCubicSoft
    {6, 1.0f, -0.75f, -0.75f},    // kSpline36
    {16, 1.0f, -0.75f, -0.75f},   // kLanczos8
};

const TypeTraits& TraitsOf(int32_t type) { return kTypes[type >= 1 && type <= 7 ? type : 0]; }

double Cubic(double argument, double a) {
  const double x = std::abs(argument);
  if (x < 1) return ((a + 2) * x - (a + 3)) * x * x + 1;
  if (x < 2) return ((x - 5) * a * x + 8 * a) * x - 4 * a;
  return 0;
}

double Spline36(double argument) {
  const double x = std::abs(argument);
  if (x < 1) return ((13.0 / 11 * x - 453.0 / 209) * x - 3.0 / 209) * x + 1;
  if (x < 2) return ((-6.0 / 11 * (x - 1) + 270.0 / 209) * (x - 1) - 156.0 / 209) * (x - 1);
  if (x < 3) return ((1.0 / 11 * (x - 2) - 45.0 / 209) * (x - 2) + 26.0 / 209) * (x - 2);
  return 0;
}

double Lanczos8(double d) {
  if (d == 0) return 1;
  if (std::abs(d) >= 8) return 0;
  return std::sin(kPi * d) / (kPi * d) * (8 * std::sin(kPi * d / 8) / (kPi * d));
}

// Sharpness from a scale that is no number, or far beyond 1, makes weights that are none either: they give 0.
int16_t Truncate(double weight) { return static_cast<int16_t>(_mm_cvttsd_si32(_mm_set_sd(weight))); }

// Fills all phases of `width` taps from filter(tap distance), each row scaled to sum to 1 before truncation.
template <class Filter>
void FillPhases(int16_t* weights, int width, const Filter& filter) {
  for (int phase = 0; phase < kPhases; ++phase, weights += width) {
    double row[20];
    double sum = 0;
    for (int tap = 0; tap < width; ++tap) {
      row[tap] = filter(tap - (width / 2 - 1) - phase / static_cast<double>(kPhases));
      sum += row[tap];
    }
    const double factor = kUnit / sum;
    for (int tap = 0; tap < width; ++tap) weights[tap] = Truncate(row[tap] * factor);
  }
}

// The window is even, so 1,025 evaluations serve all 2,048 taps.
void FillLanczos8(int16_t* weights) {
  constexpr int kReach = 8;
  double half[kReach * kPhases + 1];
  for (int i = 0; i <= kReach * kPhases; ++i) half[i] = Lanczos8(i / static_cast<double>(kPhases));
  FillPhases(weights, 2 * kReach, [&](double d) { return half[static_cast<int>(std::abs(d) * kPhases)]; });
}

}  // namespace

ResampleKernel::ResampleKernel(int32_t kernelType)
    : fKernelType(kernelType),
      fSupportScale(TraitsOf(kernelType).supportScale),
      fSharpnessAtFullScale(TraitsOf(kernelType).sharpnessAtFull),
      fSharpnessAtQuarterScale(TraitsOf(kernelType).sharpnessAtQuarter) {}

void ResampleKernel::AllocateOnFirstUse() {
  if (fAllocatedWidth != 0) return;
  const int16_t width = TraitsOf(fKernelType).allocatedWidth;
  fWeights.resize(static_cast<size_t>(width) * kPhases);
  fAllocatedWidth = width;
}

void ResampleKernel::ScaleForDownSample(float decimatedScale, float scale) {
  VX_CONTRACT(decimatedScale <= 1.0, "ScaleForDownSample");
  AllocateOnFirstUse();
  if (std::abs(fCachedScale - scale) < 0.01f) return;
  const float served = decimatedScale < 0.25f ? 0.25f : decimatedScale;
  // The key is the scale as given and moves before the table does: a request that fails below is not tried again.
  fCachedScale = scale;
  const float s = served == 1.0f ? 1.0f : served / fSupportScale;
  float a = fSharpnessAtFullScale;
  if (fSharpnessAtQuarterScale != fSharpnessAtFullScale) {
    // In double precision like the weights; in single a last bit would tip some of them.
    const double full = fSharpnessAtFullScale, quarter = fSharpnessAtQuarterScale;
    const double q = std::max(scale, 0.25f);
    a = static_cast<float>(full + (1 - (q - 0.25) / 0.75) * (quarter - full));
  }
  ScaleCubicKernel(s, a);
}

void ResampleKernel::ScaleForUpSample(float scaleFactor) {
  VX_CONTRACT(scaleFactor >= 1.0, "ScaleForUpSample");
  AllocateOnFirstUse();
  if (std::abs(fCachedScale - 1.0f) >= 0.01f) {
    fCachedScale = 1.0f;
    CalculateDefaultKernel();
  }
}

void ResampleKernel::ScaleCubicKernel(float s, float a) {
  if (static_cast<int>(std::ceil(4.0 / s)) <= 10) {
    VX_CONTRACT(fAllocatedWidth >= 10, "ScaleCubicKernel");
    fWidth = 10;
  } else {
    VX_CONTRACT(fAllocatedWidth >= 20, "ScaleCubicKernel");
    fWidth = 20;
  }
  const double scale = s, coefficient = a;
  FillPhases(fWeights.data(), fWidth, [=](double d) { return Cubic(d * scale, coefficient); });
  if (s == 1.0f) {
    std::fill_n(fWeights.begin(), fWidth, int16_t{0});
    fWeights[fWidth / 2 - 1] = static_cast<int16_t>(kUnit);
    return;
  }
  int lowest = 1000, highest = -1000;
  for (int i = 0; i < fWidth * kPhases; ++i) {
    if (fWeights[i] == 0) continue;
    lowest = std::min(lowest, i % fWidth);
    highest = std::max(highest, i % fWidth);
  }
  if (lowest <= highest) TrimZeroTaps(lowest, highest);
}

// Drops the columns outside lowest..highest, keeping the width even so that the taps stay centred.
void ResampleKernel::TrimZeroTaps(int lowest, int highest) {
  if ((highest - lowest + 1) % 2 != 0) {
    if (highest < fWidth - 1)
      ++highest;
    else if (lowest > 0)
      --lowest;
  }
  const int span = highest - lowest + 1;
  if (span >= fWidth) return;
  for (int phase = 0; phase < kPhases; ++phase)
    std::memmove(&fWeights[static_cast<size_t>(phase) * span], &fWeights[static_cast<size_t>(phase) * fWidth + lowest],
                 static_cast<size_t>(span) * sizeof(int16_t));
  fWidth = static_cast<int16_t>(span);
}

void ResampleKernel::CalculateDefaultKernel() {
  AllocateOnFirstUse();
  fCachedScale = 1.0f;
  int16_t* const weights = fWeights.data();
  const double a = fSharpnessAtFullScale, stretch = fSupportScale;
  switch (fKernelType) {
    case kBilinear:
      fWidth = 2;
      for (int phase = 0; phase < kPhases; ++phase) {
        weights[2 * phase] = static_cast<int16_t>(16384 - 128 * phase);
        weights[2 * phase + 1] = static_cast<int16_t>(128 * phase);
      }
      break;
    case kCubic:
      fWidth = 4;
      FillPhases(weights, fWidth, [](double d) { return Cubic(d, -0.75); });
      break;
    case kCubicMedium:
    case kCubicSharp:
    case kCubicSoft:
      fWidth = 6;
      FillPhases(weights, fWidth, [=](double d) { return Cubic(d / stretch, a); });
      break;
    case kSpline36:
      fWidth = 6;
      FillPhases(weights, fWidth, Spline36);
      break;
    case kLanczos8:
      fWidth = 16;
      FillLanczos8(weights);
      break;
    default:
      VX_CONTRACT(false, "CalculateDefaultKernel");
  }
}

}  // namespace VX
