// vexel kernels: the resampling kernels, in numbers and in pictures.
#include <cstdio>
#include <iostream>
#include <memory>
#include <string>

#include "commands.h"
#include "resample_filters.h"

namespace tool {
namespace {

// The frequency, in cycles per source sample, at which half of a wave is left.
double HalfResponse(const Filter& filter) {
  double least = 0, most = 1;
  for (int i = 0; i < 30; ++i) {
    const double middle = (least + most) / 2;
    (Response(filter, middle) > 0.5 ? least : most) = middle;
  }
  return least;
}

std::string TapsAt(const NamedKernel& kernel, double ratio) {
  return ratio < kernel.leastRatio ? "-" : std::to_string(MakeFilter(kernel, ratio).taps);
}

void ListKernels() {
  std::cout << "name          type  taps: enlarging   1/2   1/4  overshoot  half response at\n";
  for (const NamedKernel& kernel : Kernels()) {
    const Filter filter = MakeFilter(kernel, 1);
    char line[128];
    std::snprintf(line, sizeof line, "%-13s %4d  %15d  %4s  %4s  %8.1f%%  %.3f cycles per sample\n", kernel.name,
                  kernel.type, filter.taps, TapsAt(kernel, 0.5).c_str(), TapsAt(kernel, 0.25).c_str(),
                  100 * StepOvershoot(filter), HalfResponse(filter));
    std::cout << line;
  }
}

}  // namespace

void AddKernelsCommand(CLI::App& app) {
  CLI::App* command = app.add_subcommand("kernels", "List the resampling kernels, or draw them");
  const auto directory = std::make_shared<std::string>();
  command->add_option("--plot", *directory,
                      "Draw weights and frequency responses as kernel_NAME_weights.svg, kernel_NAME_response.svg and "
                      "kernels_response.svg into this directory");
  command->callback([directory] {
    if (directory->empty())
      ListKernels();
    else
      PlotKernels(*directory);
  });
}

}  // namespace tool
