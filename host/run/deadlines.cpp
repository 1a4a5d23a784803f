#include "host/run/deadlines.h"

#include "base/text/input_error.h"
#include "host/error/exit_code.h"
#include "host/report/progress.h"
#include "host/text/parameter_number.h"
#include "platform/clock.h"

#include <algorithm>
#include <cmath>

namespace quazor {

namespace {

constexpr std::chrono::minutes kDefault{1};
// Adding this to a time point does not overflow.
constexpr std::chrono::hours kMaxLength{24 * 365};

// Throws a CommandError that begins with `what`.
std::chrono::nanoseconds parseSeconds(const std::string& what, const std::string& seconds) {
  try {
    const Value number = parseNumber(seconds);
    return std::min<std::chrono::nanoseconds>(nanosecondsFromSeconds(toDouble(&number)), kMaxLength);
  } catch (const InputError& problem) {
    throw CommandError(ExitCode::kUsage, what + problem.what());
  }
}

}  // namespace

DeadlineSetting parseDeadline(const std::string& text) {
  const std::string what = "--deadline '" + text + "': ";
  DeadlineSetting setting;
  std::string seconds = text;
  if (const std::size_t equals = text.find('='); equals != std::string::npos) {
    const std::string name = text.substr(0, equals);
    setting.stage = stageNamed(name);
    if (!setting.stage) {
      throw CommandError(ExitCode::kUsage, what + "unknown stage '" + name +
                                               "'; the stages are load, describe, setup, run, teardown and analyze");
    }
    seconds = text.substr(equals + 1);
  }
  setting.time = parseSeconds(what, seconds);
  if (setting.time.count() <= 0) throw CommandError(ExitCode::kUsage, what + "the time must be greater than zero");
  return setting;
}

std::chrono::nanoseconds parseGrace(const std::string& text) {
  const std::string what = "--grace '" + text + "': ";
  const std::chrono::nanoseconds grace = parseSeconds(what, text);
  if (grace.count() < 0) throw CommandError(ExitCode::kUsage, what + "the time must not be less than zero");
  return grace;
}

std::chrono::nanoseconds parseTime(const std::string& option, const std::string& text) {
  const std::string what = option + " '" + text + "': ";
  const std::chrono::nanoseconds time = parseSeconds(what, text);
  if (time.count() < 0) throw CommandError(ExitCode::kUsage, what + "the time must not be less than zero");
  if (time >= kMaxLength) throw CommandError(ExitCode::kUsage, what + "the time must be less than a year");
  return time;
}

std::chrono::nanoseconds parseHeartbeat(const std::string& text) {
  const std::string what = "--heartbeat '" + text + "': ";
  const std::chrono::nanoseconds period = parseSeconds(what, text);
  if (period.count() != 0 && period < std::chrono::seconds(1)) {
    throw CommandError(ExitCode::kUsage, what + "the time must be at least 1 second, or 0 for no heartbeat");
  }
  return period;
}

Deadlines::Deadlines(const ResolvedParameters& parameters, const std::vector<DeadlineSetting>& settings) {
  times_.fill(kDefault);
  if (const std::optional<double> seconds = expectedProgressOf(parameters).seconds) {
    const double longest = std::chrono::duration<double>(kMaxLength).count();
    times_[static_cast<std::size_t>(Stage::kRun)] =
        kDefault + nanosecondsFromSeconds(std::isfinite(*seconds) ? std::min(2 * *seconds, longest) : longest);
  }
  // A setting for one stage takes precedence over a setting for all.
  for (const DeadlineSetting& one : settings) {
    if (!one.stage) times_.fill(one.time);
  }
  for (const DeadlineSetting& one : settings) {
    if (one.stage) times_[static_cast<std::size_t>(*one.stage)] = one.time;
  }
}

}  // namespace quazor
