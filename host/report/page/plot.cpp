#include "host/report/page/plot.h"

#include "host/report/page/html.h"
#include "host/text/number_text.h"

#include <algorithm>
#include <cmath>
#include <cstddef>

namespace quazor {

namespace {

constexpr double kPlotWidth = 640;  // of the part with the curve
constexpr double kPlotHeight = 110;
constexpr double kPlotLeft = 70;  // of the curve, where the labels of y are
constexpr double kPlotTop = 8;
constexpr double kHeightOfCurves = 1.2;  // the height of the plot is that many times that of its curves
constexpr double kTextHeight = 12;
constexpr double kHalfText = 4;
constexpr int kLabelDigits = 4;
constexpr std::size_t kColumns = kMaxPlotPoints / 2;

// Maps a range of numbers to coordinates.
struct Scale {
  double least = 0;
  double range = 1;
  double begin = 0;
  double length = 1;

  double at(double number) const { return begin + (number - least) / range * length; }
};

Scale scaleOf(double least, double greatest, double begin, double length) {
  const double range = greatest - least;
  if (!(range > 0) || !std::isfinite(range)) return {least - 1, 2, begin, length};
  return {least, range, begin, length};
}

std::string place(double x, double y) { return coordinate(x) + " " + coordinate(y); }

// The points of the curve: all, or the extremes of each column.
std::string pathOf(const std::vector<PlotPoint>& points, const Scale& x, const Scale& y) {
  std::string path;
  const auto add = [&](const PlotPoint& point) {
    path += path.empty() ? "M" : "L";
    path += place(x.at(point.x), y.at(point.y));
  };
  if (points.size() <= kMaxPlotPoints) {
    std::for_each(points.begin(), points.end(), add);
    return path;
  }
  const auto columnOf = [&x](const PlotPoint& point) {
    return static_cast<std::size_t>((point.x - x.least) / x.range * (kColumns - 1));
  };
  for (auto begin = points.begin(); begin != points.end();) {
    const std::size_t column = columnOf(*begin);
    const auto end =
        std::find_if(begin, points.end(), [&](const PlotPoint& point) { return columnOf(point) != column; });
    const auto [least, greatest] =
        std::minmax_element(begin, end, [](const PlotPoint& one, const PlotPoint& other) { return one.y < other.y; });
    add(*std::min(least, greatest));
    if (least != greatest) add(*std::max(least, greatest));
    begin = end;
  }
  return path;
}

std::string text(const char* kind, double x, double y, const std::string& content) {
  return "<text class=\"" + std::string(kind) + "\" x=\"" + coordinate(x) + "\" y=\"" + coordinate(y) + "\">" +
         content + "</text>";
}

// What both curves of a plot span.
struct Ranges {
  double begin;
  double end;
  double least;
  double greatest;
};

Ranges rangesOf(const Plot& plot) {
  const PlotPoint& first = plot.points.front();
  Ranges ranges{first.x, first.x, first.y, first.y};
  for (const std::vector<PlotPoint>* const points : {&plot.points, &plot.others}) {
    for (const PlotPoint& point : *points) {
      ranges.begin = std::min(ranges.begin, point.x);
      ranges.end = std::max(ranges.end, point.x);
      ranges.least = std::min(ranges.least, point.y);
      ranges.greatest = std::max(ranges.greatest, point.y);
    }
  }
  return ranges;
}

// With a margin above and below the curves.
Scale heightScaleOf(const Ranges& ranges, double leastSpan) {
  const double span = std::max(ranges.greatest - ranges.least, leastSpan);
  const double middle = ranges.least + (ranges.greatest - ranges.least) / 2;
  const double half = span / 2 * kHeightOfCurves;
  return scaleOf(middle - half, middle + half, kPlotTop + kPlotHeight, -kPlotHeight);
}

// Marks at the same place are one.
std::string marksOf(const std::vector<double>& marks, const Scale& x) {
  std::string path;
  double last = -1;
  for (const double mark : marks) {
    const double at = std::round(x.at(mark));
    if (at == last) continue;
    last = at;
    path += "M" + place(at, kPlotTop) + "v" + coordinate(kPlotHeight);
  }
  return path.empty() ? path : "<path class=\"mark\" d=\"" + path + "\"/>";
}

}  // namespace

std::string plotSvg(const Plot& plot) {
  if (plot.points.size() < 2) return {};
  const Ranges ranges = rangesOf(plot);
  const Scale x = scaleOf(ranges.begin, ranges.end, kPlotLeft, kPlotWidth);
  const Scale y = heightScaleOf(ranges, plot.leastSpan);
  std::string svg = "<svg class=\"plot\" viewBox=\"0 0 720 140\" role=\"img\" aria-label=\"" + htmlText(plot.label) +
                    "\"><rect class=\"ground\" x=\"70\" y=\"8\" width=\"640\" height=\"110\"/>";
  svg += marksOf(plot.marks, x);
  svg += "<path class=\"median\" d=\"M70 " + coordinate(y.at(plot.median)) + "h640\"/>";
  svg += "<path class=\"curve\" d=\"" + pathOf(plot.points, x, y) + "\"/>";
  if (!plot.others.empty()) svg += "<path class=\"curve1\" d=\"" + pathOf(plot.others, x, y) + "\"/>";
  const double top = y.at(ranges.greatest);
  const double bottom = y.at(ranges.least);
  const std::string unit = " " + htmlText(plot.unit);
  svg += text("end", kPlotLeft - 6, top + kHalfText, significantDigits(ranges.greatest, kLabelDigits) + unit);
  if (bottom - top > kTextHeight) {
    svg += text("end", kPlotLeft - 6, bottom + kHalfText, significantDigits(ranges.least, kLabelDigits) + unit);
  }
  svg += text("start", kPlotLeft, 134, roundedText(ranges.begin) + " s");
  svg += text("end", kPlotLeft + kPlotWidth, 134, roundedText(ranges.end) + " s");
  return svg + "</svg>\n";
}

std::string samplesSvg(const std::string& label, const std::vector<std::vector<double>>& curves) {
  double least = HUGE_VAL;
  double greatest = -HUGE_VAL;
  std::size_t length = 0;
  for (const std::vector<double>& curve : curves) {
    length = std::max(length, curve.size());
    for (const double sample : curve) {
      if (!std::isfinite(sample)) continue;
      least = std::min(least, sample);
      greatest = std::max(greatest, sample);
    }
  }
  if (least > greatest) return {};
  const Scale x = scaleOf(0, static_cast<double>(length - 1), 4, 192);
  const Scale y = scaleOf(least, greatest, 56, -52);
  std::string svg = R"(<svg class="samples" viewBox="0 0 200 60" role="img" aria-label=")" + htmlText(label) + "\">";
  for (std::size_t i = 0; i < curves.size(); ++i) {
    std::vector<PlotPoint> points;
    for (std::size_t at = 0; at < curves[i].size(); ++at) {
      if (std::isfinite(curves[i][at])) points.push_back({static_cast<double>(at), curves[i][at]});
    }
    if (points.empty()) continue;
    svg += "<path class=\"curve" + std::to_string(i % 2) + "\" d=\"" + pathOf(points, x, y) + "\"/>";
  }
  return svg + "</svg>";
}

}  // namespace quazor
