// What a scenario says of a report channel.
#pragma once

#include <chrono>
#include <cstdint>
#include <optional>
#include <string>
#include <vector>

namespace quazor {

// At some moment a channel counts on.
struct ReportStep {
  std::chrono::nanoseconds at{0};  // of streaming: only the time counts during which any stream runs
  std::uint64_t by = 0;
};

struct ReportChannelConfig {
  std::string group;
  std::string subGroup;
  std::string name;
  std::optional<std::uint64_t> count = 0;  // when the phone is made; nothing: the channel has no simple count
  std::uint64_t growth = 0;                // per second of streaming
  std::vector<ReportStep> steps;
};

}  // namespace quazor
