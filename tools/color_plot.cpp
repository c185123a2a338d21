#include "color_plot.h"

#include <cmath>

#include "color_spaces.h"
#include "svg_plot.h"

namespace tool {
namespace {

const char* ColourOf(size_t i) {
  static const char* const kColours[] = {"#d62728", "#1f77b4", "#2ca02c", "#9467bd",
                                         "#ff7f0e", "#17becf", "#8c564b", "#e377c2"};
  return kColours[i % std::size(kColours)];
}

// A grey of the Rec.709 working space as a signal of `space`. `light`: in units of 100 cd/m2.
double SignalOf(const VX::ColorSpace& space, double light) {
  const float value = static_cast<float>(std::pow(light, 1 / 2.4));
  float pixel[4] = {value, value, value, 1};
  space.ConvertPixelsFromRec709(pixel, pixel, 1, false);
  return pixel[1];
}

void PlotTransfer(const std::string& path) {
  SvgPlot plot("Signal of a grey", {"light, cd/m²", 0.01, 10000, {0.01, 0.1, 1, 10, 100, 1000, 10000}, true},
               {"signal", 0, 1.2, {0, 0.2, 0.4, 0.6, 0.8, 1, 1.2}});
  size_t i = 0;
  for (const char* name : {"srgb", "rec709", "p3-d65", "pq", "hlg"}) {
    const NamedColorSpace& space = ParseColorSpace(name);
    const double most = std::string(name) == "hlg" ? 1000 : 10000;  // where HLG's display ends
    SvgPlot::Points points;
    for (double light = 0.01; light <= most * 1.0001; light *= std::pow(10, 0.02))
      points.emplace_back(light, SignalOf(space.space, light / 100));
    plot.Curve(name, ColourOf(i++), points);
  }
  plot.Write(path);
}

// CIE 1931 2 degree observer, 380 nm and on.
constexpr double kSpectrum[][2] = {
    {0.1741, 0.0050}, {0.1733, 0.0048}, {0.1726, 0.0048}, {0.1714, 0.0051}, {0.1689, 0.0069}, {0.1644, 0.0109},
    {0.1566, 0.0177}, {0.1440, 0.0297}, {0.1241, 0.0578}, {0.0913, 0.1327}, {0.0687, 0.2007}, {0.0454, 0.2950},
    {0.0235, 0.4127}, {0.0082, 0.5384}, {0.0039, 0.6548}, {0.0139, 0.7502}, {0.0389, 0.8120}, {0.0743, 0.8338},
    {0.1142, 0.8262}, {0.1547, 0.8059}, {0.2296, 0.7543}, {0.3016, 0.6923}, {0.3731, 0.6245}, {0.4441, 0.5547},
    {0.5125, 0.4866}, {0.5752, 0.4242}, {0.6270, 0.3725}, {0.6658, 0.3340}, {0.6915, 0.3083}, {0.7079, 0.2920},
    {0.7190, 0.2809}, {0.7260, 0.2740}, {0.7300, 0.2700}, {0.7334, 0.2666}, {0.7347, 0.2653}};

void PlotPrimaries(const std::string& path) {
  const std::vector<double> ticks = {0, 0.1, 0.2, 0.3, 0.4, 0.5, 0.6, 0.7, 0.8};
  SvgPlot plot("Primaries and white points", {"x", 0, 0.8, ticks}, {"y", 0, 0.9, ticks}, 740, 700);
  SvgPlot::Points locus;
  for (const auto& [x, y] : kSpectrum) locus.emplace_back(x, y);
  plot.Outline("visible colours", "#888", locus, "#f6f6f6");
  size_t i = 0;
  for (const char* name : {"rec709", "rec2020", "p3-d65"}) {
    const float* p = ParseColorSpace(name).space.Primaries();
    plot.Outline(name, ColourOf(i++), {{p[0], p[1]}, {p[2], p[3]}, {p[4], p[5]}}, "none");
  }
  constexpr std::pair<const char*, VX_Illuminant> kWhites[] = {{"D65", VX_IlluminantD65}, {"DCI", VX_IlluminantDCI}};
  for (const auto& [name, illuminant] : kWhites) {
    const float* white = VX::ColorSpace::Illuminant(illuminant);
    plot.Mark(name, white[0], white[1]);
  }
  plot.Write(path);
}

void PlotTones(const std::string& path) {
  SvgPlot plot("Tone compression of a grey", {"light before, cd/m²", 0.1, 10000, {0.1, 1, 10, 100, 1000, 10000}, true},
               {"light after, cd/m²", 0, 120, {0, 20, 40, 60, 80, 100, 120}});
  const VX::ColorSpace& rec709 = ParseColorSpace("rec709").space;
  constexpr float kCurves[][3] = {{1, 1.2f, 0.6f}, {1, 1.05f, 0.9f}, {0.25f, 1.2f, 0.6f}, {4, 1.2f, 0.6f}};
  size_t i = 0;
  for (const auto& [a, b, c] : kCurves) {
    SvgPlot::Points points;
    for (double light = 0.1; light <= 10001; light *= std::pow(10, 0.02)) {
      const float value = static_cast<float>(std::pow(light / 100, 1 / 2.4));
      float pixel[4] = {value, value, value, 1};
      rec709.CompressPixelsToSDR(pixel, pixel, 1, a, b, c);
      points.emplace_back(light, 100 * std::pow(static_cast<double>(pixel[1]), 2.4));
    }
    char name[64];
    std::snprintf(name, sizeof name, "%g, %g, %g", a, b, c);
    plot.Curve(name, ColourOf(i), points, i != 0);
    ++i;
  }
  plot.Write(path);
}

}  // namespace

void PlotColorSpaces(const std::string& directory) {
  PlotTransfer(directory + "/transfer.svg");
  PlotPrimaries(directory + "/primaries.svg");
  PlotTones(directory + "/tone.svg");
}

}  // namespace tool
