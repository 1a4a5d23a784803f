#include "host/statistics/control_rules.h"

#include <algorithm>
#include <cmath>

namespace quazor {

namespace {

struct Rule {
  int number;
  std::size_t needed;  // points beyond the distance, on the same side
  std::size_t among;   // successive points, of which the last is one of them
  double distance;
  const char* text;
};

constexpr Rule kRules[] = {
    {1, 1, 1, 3, "one day is more than 3 standard errors from the mean"},
    {2, 2, 3, 2, "two of three days are more than 2 standard errors from the mean, on the same side"},
    {3, 4, 5, 1, "four of five days are more than 1 standard error from the mean, on the same side"},
    {4, 8, 8, 0, "eight days one after the other are on the same side of the mean"}};

// The mean range of two values of a normal distribution, in deviations.
constexpr double kMeanRangeOfTwo = 1.1283791670955126;

bool breaks(const Rule& rule, const std::vector<double>& distances, std::size_t last, double side) {
  const auto isBeyond = [&](double distance) { return side * distance > rule.distance; };
  if (!isBeyond(distances[last])) return false;
  const std::size_t first = last + 1 < rule.among ? 0 : last + 1 - rule.among;
  const auto begin = distances.begin();
  const auto beyond = std::count_if(begin + static_cast<std::ptrdiff_t>(first),
                                    begin + static_cast<std::ptrdiff_t>(last) + 1, isBeyond);
  return static_cast<std::size_t>(beyond) >= rule.needed;
}

// The deviation of single values: within the groups, or else between neighbours.
double deviationOf(const std::vector<Moments>& groups) {
  double squares = 0;
  double freedom = 0;
  for (const Moments& one : groups) {
    squares += one.squares();
    freedom += static_cast<double>(one.count() - 1);
  }
  if (freedom > 0) return std::sqrt(squares / freedom);
  double ranges = 0;
  for (std::size_t i = 1; i < groups.size(); ++i) ranges += std::abs(groups[i].mean() - groups[i - 1].mean());
  return ranges / static_cast<double>(groups.size() - 1) / kMeanRangeOfTwo;
}

}  // namespace

std::optional<ControlChart> controlChart(const std::vector<Moments>& groups) {
  if (groups.size() < 2) return std::nullopt;
  const double deviation = deviationOf(groups);
  if (!(deviation > 0)) return std::nullopt;
  Moments all;
  for (const Moments& one : groups) all.merge(one);
  ControlChart chart{all.mean(), {}};
  for (const Moments& one : groups) {
    chart.distances.push_back((one.mean() - all.mean()) / (deviation / std::sqrt(static_cast<double>(one.count()))));
  }
  return chart;
}

std::vector<BrokenRule> brokenRules(const std::vector<double>& distances) {
  std::vector<BrokenRule> broken;
  for (const Rule& rule : kRules) {
    for (std::size_t last = 0; last < distances.size(); ++last) {
      if (!breaks(rule, distances, last, 1) && !breaks(rule, distances, last, -1)) continue;
      broken.push_back({rule.number, last});
      break;
    }
  }
  return broken;
}

std::string textOfRule(int rule) { return kRules[rule - 1].text; }

}  // namespace quazor
