// The library's resampling kernels by name, and what can be measured of their tables.
#pragma once

#include <span>
#include <string>
#include <utility>
#include <vector>

#include "vexel/resample_kernel.h"

namespace tool {

struct NamedKernel {
  const char* name;
  VX::ResampleKernel::Type type;
  double leastRatio;  // the smallest output / input ratio that it serves; 1 if it only enlarges
};

std::span<const NamedKernel> Kernels();

// A table as an impulse response: the weight of a source sample by its distance from the position asked for, in source
// samples, from left to right. A ratio of 1 stands for all enlarging.
struct Filter {
  int taps;
  std::vector<std::pair<double, double>> weights;
};
Filter MakeFilter(const NamedKernel& kernel, double ratio);

// What is left of a wave of `frequency` cycles per source sample; 1 is all of it.
double Response(const Filter& filter, double frequency);

// How far an edge from 0 to 1 overshoots.
double StepOvershoot(const Filter& filter);

// Writes kernel_NAME_weights.svg and kernel_NAME_response.svg for each kernel, and kernels_response.svg of all, into
// `directory`, which is made where it is missing. Throws ToolError when they cannot be written.
void PlotKernels(const std::string& directory);

}  // namespace tool
