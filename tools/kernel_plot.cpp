// Plots of the resampling kernels for the documentation, from the library's own tables.
#include <algorithm>
#include <cmath>
#include <string>

#include "resample_filters.h"
#include "svg_plot.h"

namespace tool {
namespace {

const char* ColourOf(size_t i) {
  static const char* const kColours[] = {"#1f77b4", "#d62728", "#2ca02c", "#9467bd", "#ff7f0e", "#17becf", "#8c564b"};
  return kColours[i % std::size(kColours)];
}

struct Use {
  const char* name;
  double ratio;
};
constexpr Use kUses[] = {{"enlarging", 1}, {"to 1/2", 0.5}, {"to 1/4", 0.25}};

constexpr double kFloorDecibels = -80;

SvgPlot::Points ResponseCurve(const Filter& filter, double most) {
  SvgPlot::Points points;
  for (double f = 0; f <= most + 1e-9; f += most / 400)
    points.emplace_back(f, std::max(20 * std::log10(std::max(Response(filter, f), 1e-9)), kFloorDecibels - 20));
  return points;
}

Axis Frequencies(double most) {
  Axis axis{"cycles per source sample (0.5 is the finest detail of the source)", 0, most, {}};
  for (double tick = 0; tick <= most; tick += 0.25) axis.ticks.push_back(tick);
  return axis;
}

Axis Decibels() { return {"response, dB", kFloorDecibels, 10, {-80, -60, -40, -20, -6, 0}}; }

void PlotWeights(const NamedKernel& kernel, const std::string& path) {
  double reach = 2;
  for (const Use& use : kUses)
    if (use.ratio >= kernel.leastRatio) reach = std::max(reach, MakeFilter(kernel, use.ratio).taps / 2.0);
  Axis distance{"distance in source samples", -reach, reach, {}};
  const int step = reach > 4 ? 2 : 1, outermost = static_cast<int>(reach) / step * step;
  for (int tick = -outermost; tick <= outermost; tick += step) distance.ticks.push_back(tick);
  SvgPlot plot(std::string(kernel.name) + ": weights", distance,
               {"weight", -0.3, 1.1, {-0.2, 0, 0.2, 0.4, 0.6, 0.8, 1}}, 620, 400);
  size_t i = 0;
  for (const Use& use : kUses) {
    if (use.ratio < kernel.leastRatio) continue;
    SvgPlot::Points points;
    const Filter filter = MakeFilter(kernel, use.ratio);
    for (size_t at = 0; at < filter.weights.size(); at += 4) points.push_back(filter.weights[at]);
    points.push_back(filter.weights.back());
    plot.Curve(use.name, ColourOf(i++), points);
  }
  plot.Write(path);
}

void PlotResponse(const NamedKernel& kernel, const std::string& path) {
  SvgPlot plot(std::string(kernel.name) + ": frequency response", Frequencies(2), Decibels(), 620, 400);
  size_t i = 0;
  for (const Use& use : kUses)
    if (use.ratio >= kernel.leastRatio)
      plot.Curve(use.name, ColourOf(i++), ResponseCurve(MakeFilter(kernel, use.ratio), 2));
  plot.Write(path);
}

}  // namespace

void PlotKernels(const std::string& directory) {
  SvgPlot all("Frequency response when enlarging", Frequencies(2), Decibels());
  size_t i = 0;
  for (const NamedKernel& kernel : Kernels()) {
    const std::string path = directory + "/kernel_" + kernel.name;
    PlotWeights(kernel, path + "_weights.svg");
    PlotResponse(kernel, path + "_response.svg");
    all.Curve(kernel.name, ColourOf(i++), ResponseCurve(MakeFilter(kernel, 1), 2));
  }
  all.Write(directory + "/kernels_response.svg");
}

}  // namespace tool
