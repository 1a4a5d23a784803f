// Running one diagnostic, from the making of its experiment to its verdict; or an experiment on its own.
#pragma once

#include "frame/host_records.h"
#include "host/catalogue.h"
#include "host/judge.h"
#include "host/parameters.h"
#include "host/phone.h"
#include "host/run_log.h"

#include <chrono>
#include <cstdint>
#include <functional>
#include <optional>
#include <string>
#include <vector>

namespace quazor {

struct JudgedResult {
  QZMeasuredResult result;
  ResultVerdict verdict;
};

// How long each stage took, by the phone's clock; nothing for a stage that did not take place.
struct StageDurations {
  std::optional<std::chrono::nanoseconds> setup;
  std::optional<std::chrono::nanoseconds> run;
  std::optional<std::chrono::nanoseconds> teardown;
  std::optional<std::chrono::nanoseconds> analysis;  // the analysis' setup and its analyzing
};

// All that is known of one run. Of an experiment on its own nothing is judged: it has no measured results, and kPass
// says that it returned a result.
struct DiagnosticRecord {
  bool experimentOnly = false;
  std::string name;
  std::string summary;
  Verdict verdict = Verdict::kError;
  BoundParameters parameters;
  std::vector<JudgedResult> measuredResults;
  OrderedMap<Measurement> measurements;
  Dictionary auxiliaryData;
  DiagnosticErrorPtr error;  // the first one; set exactly when the verdict is kError
  std::vector<LogLine> log;
  std::vector<DeclaredFault> faults;
  std::uint64_t seed = 0;
  StageDurations durations;
};

struct RunOptions {
  PhoneMaker makePhone;
  std::uint64_t seed = 0;  // that of the phones, for the record
  LogLevel logLevel = LogLevel::kDefault;
  // The log back-ends that listen to a run, made for each run from the phone's clock; may be empty.
  std::function<std::vector<RunLog::Listener>(const std::shared_ptr<Clock>&)> makeListeners;
  // Gets each run's phone before anything happens on it, and may keep it; may be empty.
  std::function<void(const std::shared_ptr<const Phone>&)> watchPhone;
};

// Runs the diagnostic on a phone of its own. The calling thread is the one that the plug-in is called on, and it blocks
// until the run is over. A diagnostic that could not be described is not run: its record holds that error.
//
// A stage that fails, gives nothing or throws ends the run with kError, but for a teardown: that one follows on every
// setup that succeeded, and after one that failed the analysis still takes place, for what it shows. An experiment on
// its own ends with its teardown.
DiagnosticRecord runDiagnostic(const DescribedDiagnostic& diagnostic, const BoundParameters& parameters,
                               const RunOptions& options);

}  // namespace quazor
