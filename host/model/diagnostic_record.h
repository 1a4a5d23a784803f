// DiagnosticRecord: all data of one run of a diagnostic, or of an experiment on its own.
#pragma once

#include "contract/results.h"
#include "host/device/phone.h"
#include "host/limits/user_limit.h"
#include "host/model/judge.h"
#include "host/model/run_log.h"
#include "host/model/stage.h"
#include "host/plugin/parameters.h"

#include <chrono>
#include <cstdint>
#include <optional>
#include <string>
#include <vector>

namespace quazor {

// The duration of each stage, by the phone's clock; nothing for a stage that did not take place or did not end.
struct StageDurations {
  std::optional<std::chrono::nanoseconds> setup;
  std::optional<std::chrono::nanoseconds> run;
  std::optional<std::chrono::nanoseconds> teardown;
  std::optional<std::chrono::nanoseconds> analysis;  // including the setup of the analysis
};

// A stage that took place, by the wall clock.
struct StagePeriod {
  Stage stage;
  Date begin{};
  std::optional<Date> end;  // nothing when it did not end
};

// Which run of a diagnostic an entry is, if the run has several. 0 means that the run does not try again or repeat, or
// that it is not known how often it may.
struct Trial {
  std::uint64_t attempt = 0;   // from 1
  std::uint64_t attempts = 0;  // at most
  std::uint64_t repetition = 0;
  std::uint64_t repetitions = 0;
};

// An experiment on its own is not judged: it has no measured results, and kPass means that it returned a result.
struct DiagnosticRecord {
  bool experimentOnly = false;
  std::string name;
  std::string summary;
  std::string experimentName;
  std::string analysisName;  // empty for an experiment on its own
  Verdict verdict = Verdict::kError;
  ResolvedParameters parameters;
  std::vector<UserLimit> limits;  // those that the user set for this diagnostic
  std::vector<JudgedResult> measuredResults;
  OrderedMap<Measurement> measurements;
  Dictionary auxiliaryData;
  std::optional<Skip> skip;         // why it was not run; set exactly when the verdict is kSkip
  DiagnosticErrorPtr error;         // the first one; set exactly when the verdict is kError
  std::optional<Stage> errorStage;  // the stage that failed; nothing if the results could not be judged
  std::vector<LogLine> log;
  std::vector<DeclaredFault> faults;
  std::uint64_t seed = 0;
  Trial trial;
  StageDurations durations;
  std::vector<StagePeriod> stages;
  Date begin{};  // by the wall clock, as is `end`
  Date end{};
};

}  // namespace quazor
