// DiagnosticRecord: all that is known of one run of a diagnostic, or of an experiment on its own.
#pragma once

#include "contract/results.h"
#include "host/device/phone.h"
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

// How long each stage took, by the phone's clock; nothing for a stage that did not take place or did not end.
struct StageDurations {
  std::optional<std::chrono::nanoseconds> setup;
  std::optional<std::chrono::nanoseconds> run;
  std::optional<std::chrono::nanoseconds> teardown;
  std::optional<std::chrono::nanoseconds> analysis;  // the analysis' setup and its analyzing
};

// A stage that took place, by the wall clock.
struct StagePeriod {
  Stage stage;
  Date begin{};
  std::optional<Date> end;  // nothing when it did not end
};

// Of an experiment on its own nothing is judged: it has no measured results, and kPass says that it returned a result.
struct DiagnosticRecord {
  bool experimentOnly = false;
  std::string name;
  std::string summary;
  std::string experimentName;
  std::string analysisName;  // empty for an experiment on its own
  Verdict verdict = Verdict::kError;
  ResolvedParameters parameters;
  std::vector<JudgedResult> measuredResults;
  OrderedMap<Measurement> measurements;
  Dictionary auxiliaryData;
  DiagnosticErrorPtr error;         // the first one; set exactly when the verdict is kError
  std::optional<Stage> errorStage;  // where it came from; nothing when it is the judge's
  std::vector<LogLine> log;
  std::vector<DeclaredFault> faults;
  std::uint64_t seed = 0;
  StageDurations durations;
  std::vector<StagePeriod> stages;
  Date begin{};  // by the wall clock, as is `end`
  Date end{};
};

}  // namespace quazor
