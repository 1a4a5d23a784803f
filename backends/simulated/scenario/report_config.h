// The report channels in a scenario.
#pragma once

#include <chrono>
#include <cstdint>
#include <optional>
#include <string>
#include <vector>

namespace quazor {

// A single increment of a channel.
struct ReportStep {
  std::chrono::nanoseconds at{0};  // streaming time, which passes only while a stream runs
  std::uint64_t by = 0;
};

struct ReportChannelConfig {
  std::string group;
  std::string subGroup;
  std::string name;
  std::optional<std::uint64_t> count = 0;  // initial value; nothing: the channel has no simple count
  std::uint64_t growth = 0;                // per second of streaming time
  std::vector<ReportStep> steps;
};

}  // namespace quazor
