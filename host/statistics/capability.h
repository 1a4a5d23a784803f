// Process capability: how much room the limits of a result leave.
#pragma once

#include "host/statistics/moments.h"

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

namespace quazor {

inline constexpr std::uint64_t kMinCapabilityRuns = 25;

// The values of one group in which nothing should change: of one station on one day.
struct CapabilityGroup {
  std::string station;
  std::string day;
  Moments values;
  std::uint64_t runs = 0;        // that gave these values
  std::uint64_t fractional = 0;  // how many of the values are not whole numbers
};

struct Capability {
  Moments values{};             // all of them
  double within = 0;            // the deviation within station and day
  std::optional<double> cpk{};  // from the deviation within station and day
  std::optional<double> ppk{};  // from the deviation of all values
  std::string refusal{};        // why there is no figure, as a sentence without its full stop; empty if there is one
};

// The groups are those of one result with one limit; those of a station are in the order of their days. Both figures
// are the distance of the mean from the nearer limit in units of three deviations. They are refused for a result
// without a limit, with a limit that only one value meets, of which all values are whole numbers, of fewer than
// kMinCapabilityRuns runs, without spread, and if the daily means of a station break a rule of control charts.
Capability capabilityOf(const std::vector<CapabilityGroup>& groups, std::optional<double> lower,
                        std::optional<double> upper);

}  // namespace quazor
