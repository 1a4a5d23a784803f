// How long each stage of a diagnostic may take before it is ended from outside.
#pragma once

#include "host/model/stage.h"
#include "host/plugin/parameters.h"

#include <array>
#include <chrono>
#include <optional>
#include <string>

namespace quazor {

// What one --deadline says: [STAGE=]SECONDS.
struct DeadlineSetting {
  std::optional<Stage> stage;  // nothing: every stage
  std::chrono::nanoseconds time{};
};

// Throws a CommandError (kUsage) for a text that is not of that form, or whose time is not above zero.
DeadlineSetting parseDeadline(const std::string& text);

// Thread: any; it is immutable.
class Deadlines {
 public:
  // Those of a diagnostic with these parameters: where nothing is set, a run may take a minute more than twice the
  // seconds that its parameters tell (its "duration", else its "timeout"), every other stage a minute.
  Deadlines(const ResolvedParameters& parameters, const std::vector<DeadlineSetting>& settings);

  std::chrono::nanoseconds of(Stage stage) const { return times_[static_cast<std::size_t>(stage)]; }

 private:
  std::array<std::chrono::nanoseconds, std::size(kStages)> times_;
};

}  // namespace quazor
