// Conductor: performs the diagnostics of a run, one after the other.
#pragma once

#include "host/cli/choice_options.h"
#include "host/plugin/parameters.h"
#include "host/run/diagnostic_run.h"
#include "host/run/event_pipeline.h"
#include "host/run/isolation.h"

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <vector>

namespace quazor {

// A diagnostic to run or analyze.
struct Job {
  ResolvedDiagnostic bound;
  const QZExperimentResult* result = nullptr;  // the result to analyze; null: run the experiment
  std::uint64_t seed = 0;
  std::optional<Skip> skip{};    // why it is not run
  DiagnosticErrorPtr problem{};  // why it cannot be run
};

// Performs jobs in order, each in a separate process or all in this one.
// Thread: one at a time.
class Conductor {
 public:
  // `signals` is null if the jobs are performed in this process. All are borrowed.
  Conductor(IsolationOptions isolation, RunOptions runOptions, WatchedSignals* signals, EventPipeline& events)
      : isolation_(std::move(isolation)), runOptions_(std::move(runOptions)), signals_(signals), events_(events) {}

  bool isInterrupted() const { return signals_ != nullptr && signals_->requestsToEnd() > 0; }

  // `settle` is the real time to wait between two jobs. Returns the diagnostic that the user interrupted, as in
  // RunEnded; nothing if the run continues.
  std::optional<std::string> performAll(const std::vector<Job>& jobs, StopOn stopOn, std::chrono::nanoseconds settle);

 private:
  std::optional<std::string> perform(const Job& job);
  void performHere(const Job& job);
  void begin(const Job& job);
  void skip(const Job& job, const Skip& skip);
  // Waits, or until the user interrupts.
  void settle(std::chrono::nanoseconds time) const;
  // Why the run stops after the diagnostic that has just ended; nothing if it goes on.
  std::optional<Skip> stopAfterLast(StopOn stopOn) const;

  const IsolationOptions isolation_;
  const RunOptions runOptions_;
  WatchedSignals* const signals_;
  EventPipeline& events_;
};

}  // namespace quazor
