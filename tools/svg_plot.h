// Line plots as SVG: axes, curves and a legend.
#pragma once

#include <string>
#include <utility>
#include <vector>

namespace tool {

struct Axis {
  std::string label;
  double least = 0, most = 1;
  std::vector<double> ticks;
  bool isLogarithmic = false;
};

class SvgPlot {
 public:
  using Points = std::vector<std::pair<double, double>>;

  SvgPlot(std::string title, Axis x, Axis y, int width = 760, int height = 520);

  // A curve with an entry in the legend, cut to the axes; dashed to tell neighbours apart.
  void Curve(const std::string& name, const std::string& colour, const Points& points, bool isDashed = false);
  // A closed outline; `fill` may be "none".
  void Outline(const std::string& name, const std::string& colour, const Points& points, const std::string& fill);
  // A dot with a label beside it.
  void Mark(const std::string& label, double x, double y);

  // Throws ToolError when the file cannot be written.
  void Write(const std::string& path) const;

 private:
  double X(double value) const;
  double Y(double value) const;
  std::string PathOf(const Points& points) const;
  void AddLegend(const std::string& name, const std::string& colour, bool isDashed);

  Axis mX, mY;
  std::string mTitle, mBody, mLegend;
  int mWidth, mHeight, mEntries = 0;
};

}  // namespace tool
