#include "host/statistics/capability.h"

#include "contract/message_format.h"
#include "host/statistics/control_rules.h"

#include <algorithm>
#include <cmath>
#include <map>

namespace quazor {

namespace {

// What rule of control charts the daily means of a station break; empty if none does.
std::string instabilityOf(const std::vector<CapabilityGroup>& groups) {
  std::map<std::string, std::vector<const CapabilityGroup*>> stations;
  for (const CapabilityGroup& one : groups) {
    if (one.values.count() > 0) stations[one.station].push_back(&one);
  }
  for (const auto& [station, days] : stations) {
    std::vector<Moments> values;
    for (const CapabilityGroup* const day : days) values.push_back(day->values);
    const std::optional<ControlChart> chart = controlChart(values);
    if (!chart) continue;
    const std::vector<BrokenRule> broken = brokenRules(chart->distances);
    if (broken.empty()) continue;
    const BrokenRule& first = broken.front();
    return formatMessage("the process is not stable: %@ (rule %@%@, %@)", textOfRule(first.rule), first.rule,
                         station.empty() ? "" : ", station " + station, days[first.point]->day);
  }
  return {};
}

double room(double mean, double deviation, std::optional<double> lower, std::optional<double> upper) {
  double nearest = INFINITY;
  if (lower) nearest = std::min(nearest, mean - *lower);
  if (upper) nearest = std::min(nearest, *upper - mean);
  return nearest / (3 * deviation);
}

}  // namespace

Capability capabilityOf(const std::vector<CapabilityGroup>& groups, std::optional<double> lower,
                        std::optional<double> upper) {
  Capability found;
  std::uint64_t runs = 0;
  std::uint64_t fractional = 0;
  double squares = 0;
  double freedom = 0;
  for (const CapabilityGroup& one : groups) {
    if (one.values.count() == 0) continue;
    found.values.merge(one.values);
    runs += one.runs;
    fractional += one.fractional;
    squares += one.values.squares();
    freedom += static_cast<double>(one.values.count() - 1);
  }
  if (freedom > 0) found.within = std::sqrt(squares / freedom);
  const double overall = found.values.deviation();
  const auto refuse = [&found](std::string why) {
    found.refusal = std::move(why);
    return found;
  };
  if (!lower && !upper) return refuse("it has no limit with a bound");
  if (lower && upper && *lower == *upper) return refuse("only one value meets its limit");
  if (runs < kMinCapabilityRuns) {
    return refuse(formatMessage("%@ of the %@ runs that it takes", runs, kMinCapabilityRuns));
  }
  if (!(overall > 0)) return refuse("all values are the same");
  if (fractional == 0) return refuse("all values are whole numbers, as those of a count are; its rate says more");
  if (!(found.within > 0)) return refuse("there is no spread within any station and day");
  if (std::string why = instabilityOf(groups); !why.empty()) return refuse(std::move(why));
  found.cpk = room(found.values.mean(), found.within, lower, upper);
  found.ppk = room(found.values.mean(), overall, lower, upper);
  return found;
}

}  // namespace quazor
