// The time limit of each stage of a diagnostic.
#pragma once

#include "host/model/stage.h"
#include "host/plugin/parameters.h"

#include <array>
#include <chrono>
#include <optional>
#include <string>

namespace quazor {

// One --deadline option: [STAGE=]SECONDS.
struct DeadlineSetting {
  std::optional<Stage> stage;  // nothing: every stage
  std::chrono::nanoseconds time{};
};

// Throws a CommandError (kUsage) if the text does not have that form or the time is not greater than zero.
DeadlineSetting parseDeadline(const std::string& text);

// How long a setup or run may still take after an interrupt, unless --grace says otherwise.
inline constexpr std::chrono::seconds kDefaultGrace{5};

// The time of a --grace option: SECONDS. Throws a CommandError (kUsage) if it is no number or less than zero.
std::chrono::nanoseconds parseGrace(const std::string& text);

// The time of an option such as "--settle": SECONDS. Throws a CommandError (kUsage) if it is no number, less than zero
// or a year or more.
std::chrono::nanoseconds parseTime(const std::string& option, const std::string& text);

// The time of a --heartbeat option: SECONDS. Throws a CommandError (kUsage) if it is neither 0 nor at least 1.
std::chrono::nanoseconds parseHeartbeat(const std::string& text);

// Thread: any; it is immutable.
class Deadlines {
 public:
  // The deadlines of a diagnostic with these parameters. By default, the run may take twice the parameter "duration"
  // (or else "timeout") plus one minute, and every other stage one minute.
  Deadlines(const ResolvedParameters& parameters, const std::vector<DeadlineSetting>& settings);

  std::chrono::nanoseconds of(Stage stage) const { return times_[static_cast<std::size_t>(stage)]; }

 private:
  std::array<std::chrono::nanoseconds, std::size(kStages)> times_;
};

}  // namespace quazor
