// The rules of control charts that tell a process that changes from one that only varies.
#pragma once

#include "host/statistics/moments.h"

#include <cstddef>
#include <optional>
#include <string>
#include <vector>

namespace quazor {

// The centre of a chart, and how far each of its points usually is from it.
struct ControlChart {
  double centre = 0;
  std::vector<double> distances;  // of the points from the centre, in standard errors of each point
};

// The chart of the means of groups of values, such as those of a day, in their order. The centre is the mean of all
// values. The standard error of a mean follows from the spread within the groups; if no group has two values, from the
// ranges between neighbours. Nothing for fewer than two groups, or if there is no spread.
std::optional<ControlChart> controlChart(const std::vector<Moments>& groups);

// A rule that a point breaks, together with those before it.
struct BrokenRule {
  int rule = 0;           // 1 to 4
  std::size_t point = 0;  // the first that breaks it
};

// The rules of Western Electric, each with the first point that breaks it, in the order of the rules:
//   1  one point is more than 3 standard errors from the centre
//   2  two of three successive points are more than 2 on the same side, the last of them too
//   3  four of five successive points are more than 1 on the same side, the last of them too
//   4  eight successive points are on the same side
std::vector<BrokenRule> brokenRules(const std::vector<double>& distances);

// What the rule says, for example "one day is more than 3 standard errors from the mean".
std::string textOfRule(int rule);

}  // namespace quazor
