// A plot of values over time as SVG.
#pragma once

#include <cstddef>
#include <string>
#include <vector>

namespace quazor {

struct PlotPoint {
  double x = 0;
  double y = 0;
};

struct Plot {
  std::string label;                // for those who do not see it
  std::string unit;                 // of y; x is in seconds
  std::vector<PlotPoint> points;    // finite, ascending in x
  std::vector<double> marks{};      // x of what is marked
  double median = 0;                // of y, shown by a line
  std::vector<PlotPoint> others{};  // a second curve to compare with
  double leastSpan = 0;             // of y: smaller differences are not stretched to the height of the plot
};

// The greatest number of points of a curve that a plot shows one by one.
inline constexpr std::size_t kMaxPlotPoints = 640;

// The size of the SVG is bounded: of more than kMaxPlotPoints points, it has the minimum and the maximum of each of its
// columns. Empty for fewer than two points.
std::string plotSvg(const Plot& plot);

// Samples without a time, as curves over each other; at most 2 of them. Those that are not finite are left out.
std::string samplesSvg(const std::string& label, const std::vector<std::vector<double>>& curves);

}  // namespace quazor
