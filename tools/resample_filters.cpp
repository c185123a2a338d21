#include "resample_filters.h"

#include <algorithm>
#include <cmath>
#include <numbers>

namespace tool {
namespace {

constexpr int kPhases = 128;
constexpr double kOne = 16384;

constexpr NamedKernel kKernels[] = {
    {"bilinear", VX::ResampleKernel::kBilinear, 1},           {"cubic", VX::ResampleKernel::kCubic, 0.25},
    {"cubic-medium", VX::ResampleKernel::kCubicMedium, 0.25}, {"cubic-sharp", VX::ResampleKernel::kCubicSharp, 0.25},
    {"cubic-soft", VX::ResampleKernel::kCubicSoft, 0.25},     {"spline36", VX::ResampleKernel::kSpline36, 1},
    {"lanczos8", VX::ResampleKernel::kLanczos8, 0.4}};

}  // namespace

std::span<const NamedKernel> Kernels() { return kKernels; }

Filter MakeFilter(const NamedKernel& kernel, double ratio) {
  VX::ResampleKernel table(kernel.type);
  const auto scale = static_cast<float>(ratio);
  if (ratio < 1)
    table.ScaleForDownSample(scale, scale);
  else
    table.ScaleForUpSample(scale);
  Filter filter{table.Width(), {}};
  for (int tap = 0; tap < filter.taps; ++tap)
    for (int phase = kPhases - 1; phase >= 0; --phase) {
      const double distance = tap - (filter.taps / 2 - 1) - static_cast<double>(phase) / kPhases;
      filter.weights.emplace_back(distance, table.Weights(phase)[tap] / kOne);
    }
  return filter;
}

double Response(const Filter& filter, double frequency) {
  double real = 0, imaginary = 0;
  for (const auto& [distance, weight] : filter.weights) {
    const double angle = 2 * std::numbers::pi * frequency * distance;
    real += weight * std::cos(angle);
    imaginary += weight * std::sin(angle);
  }
  return std::hypot(real, imaginary) / kPhases;
}

double StepOvershoot(const Filter& filter) {
  // At every phase the samples beyond the edge count in full; the edge may lie between any two of them.
  double most = 1;
  for (int phase = 0; phase < kPhases; ++phase) {
    double sum = 0;
    for (int tap = filter.taps - 1; tap >= 0; --tap) {
      sum += filter.weights[static_cast<size_t>(tap * kPhases + phase)].second;
      most = std::max(most, sum);
    }
  }
  return most - 1;
}

}  // namespace tool
