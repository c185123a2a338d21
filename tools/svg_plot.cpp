#include "svg_plot.h"

#include <cmath>
#include <cstdarg>
#include <cstdio>
#include <filesystem>
#include <sstream>
#include <system_error>

#include "output_file.h"

namespace tool {
namespace {

constexpr int kLeft = 70, kTop = 44, kRight = 170, kBottom = 56;

// printf into a string.
__attribute__((format(printf, 1, 2))) std::string Text(const char* format, ...) {
  char buffer[512];
  va_list arguments;
  va_start(arguments, format);
  std::vsnprintf(buffer, sizeof buffer, format, arguments);
  va_end(arguments);
  return buffer;
}

double PlaceOf(const Axis& axis, double value) {
  if (!axis.isLogarithmic) return (value - axis.least) / (axis.most - axis.least);
  return std::log(value / axis.least) / std::log(axis.most / axis.least);
}

std::string Number(double value) { return value >= 1000 ? Text("%.0f,%03d", value / 1000, 0) : Text("%g", value); }

}  // namespace

SvgPlot::SvgPlot(std::string title, Axis x, Axis y, int width, int height)
    : mX(std::move(x)), mY(std::move(y)), mTitle(std::move(title)), mWidth(width), mHeight(height) {}

double SvgPlot::X(double value) const { return kLeft + PlaceOf(mX, value) * (mWidth - kLeft - kRight); }
double SvgPlot::Y(double value) const { return mHeight - kBottom - PlaceOf(mY, value) * (mHeight - kTop - kBottom); }

std::string SvgPlot::PathOf(const Points& points) const {
  std::string path;
  for (const auto& [x, y] : points) path += Text("%s%.2f %.2f", path.empty() ? "M" : "L", X(x), Y(y));
  return path;
}

void SvgPlot::AddLegend(const std::string& name, const std::string& colour, bool isDashed) {
  const int x = mWidth - kRight + 16, y = kTop + 12 + 20 * mEntries++;
  mLegend += Text("<path d='M%d %dh24' stroke='%s' stroke-width='2'%s/><text x='%d' y='%d'>", x, y, colour.c_str(),
                  isDashed ? " stroke-dasharray='6 4'" : "", x + 30, y + 4) +
             name + "</text>\n";
}

void SvgPlot::Curve(const std::string& name, const std::string& colour, const Points& points, bool isDashed) {
  mBody += "<path clip-path='url(#area)' fill='none' stroke-width='2' stroke='" + colour + "'" +
           (isDashed ? " stroke-dasharray='6 4'" : "") + " d='" + PathOf(points) + "'/>\n";
  AddLegend(name, colour, isDashed);
}

void SvgPlot::Outline(const std::string& name, const std::string& colour, const Points& points,
                      const std::string& fill) {
  mBody += "<path stroke-width='2' stroke-linejoin='round' stroke='" + colour + "' fill='" + fill + "' d='" +
           PathOf(points) + "Z'/>\n";
  if (!name.empty()) AddLegend(name, colour, false);
}

void SvgPlot::Mark(const std::string& label, double x, double y) {
  mBody += Text("<circle cx='%.2f' cy='%.2f' r='3'/><text x='%.2f' y='%.2f'>", X(x), Y(y), X(x) + 7, Y(y) + 4) + label +
           "</text>\n";
}

void SvgPlot::Write(const std::string& path) const {
  std::ostringstream out;
  const int right = mWidth - kRight, bottom = mHeight - kBottom;
  out << Text(
             "<svg xmlns='http://www.w3.org/2000/svg' width='%d' height='%d' font-family='sans-serif' "
             "font-size='12'>\n",
             mWidth, mHeight)
      << Text("<rect width='%d' height='%d' fill='white'/>\n", mWidth, mHeight)
      << Text("<clipPath id='area'><rect x='%d' y='%d' width='%d' height='%d'/></clipPath>\n", kLeft, kTop,
              right - kLeft, bottom - kTop)
      << Text("<text x='%d' y='26' font-size='15' font-weight='bold'>", kLeft) << mTitle << "</text>\n";
  for (const double tick : mX.ticks)
    out << Text("<path d='M%.1f %dV%d' stroke='#ddd'/><text x='%.1f' y='%d' text-anchor='middle'>%s</text>\n", X(tick),
                kTop, bottom, X(tick), bottom + 18, Number(tick).c_str());
  for (const double tick : mY.ticks)
    out << Text("<path d='M%d %.1fH%d' stroke='#ddd'/><text x='%d' y='%.1f' text-anchor='end'>%s</text>\n", kLeft,
                Y(tick), right, kLeft - 8, Y(tick) + 4, Number(tick).c_str());
  out << Text("<rect x='%d' y='%d' width='%d' height='%d' fill='none' stroke='#888'/>\n", kLeft, kTop, right - kLeft,
              bottom - kTop)
      << Text("<text x='%d' y='%d' text-anchor='middle'>", (kLeft + right) / 2, mHeight - 14) << mX.label << "</text>\n"
      << Text("<text transform='translate(20 %d) rotate(-90)' text-anchor='middle'>", (kTop + bottom) / 2) << mY.label
      << "</text>\n"
      << mBody << mLegend << "</svg>\n";
  std::error_code ignored;  // shows when the file is written
  std::filesystem::create_directories(std::filesystem::path(path).parent_path(), ignored);
  OutputFile file(path);
  const std::string text = out.str();
  file.Write(text.data(), text.size());
  file.Close();
}

}  // namespace tool
