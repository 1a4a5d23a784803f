// Conductor: performs the diagnostics of a run, one after the other.
#pragma once

#include "host/cli/choice_options.h"
#include "host/limits/user_limit.h"
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
  // Of the recorded entry that is analyzed again; 0 otherwise.
  std::uint64_t attempt = 0;
  std::uint64_t repetition = 0;
};

// How the jobs of a run follow each other.
struct Plan {
  StopOn stopOn = StopOn::kNothing;
  std::chrono::nanoseconds settle{};  // the real time to wait between two jobs
  std::uint64_t attempts = 1;         // of a job that ends in an error, at most
  std::uint64_t repetitions = 1;      // of all jobs, one round after the other
  SeededPhoneMaker phones{};          // of the attempts; empty: all use the phone of the run
  std::vector<UserLimit> limits{};    // that are told as soon as all their diagnostics ended without a result for them
};

// Performs jobs in order, each in a separate process or all in this one.
// Thread: one at a time.
class Conductor {
 public:
  // `signals` is null if the jobs are performed in this process. All are borrowed.
  Conductor(IsolationOptions isolation, RunOptions runOptions, WatchedSignals* signals, EventPipeline& events)
      : isolation_(std::move(isolation)), runOptions_(std::move(runOptions)), signals_(signals), events_(events) {}

  bool isInterrupted() const { return signals_ != nullptr && signals_->requestsToEnd() > 0; }

  // Returns the diagnostic that the user interrupted, as in RunEnded; nothing if the run continues.
  std::optional<std::string> performAll(const std::vector<Job>& jobs, const Plan& plan);

 private:
  std::optional<std::string> performRound(const std::vector<Job>& jobs, const Plan& plan, std::uint64_t repetition);
  std::optional<std::string> performAttempts(Job job, const Plan& plan);
  std::optional<std::string> perform(const Job& job);
  void performHere(const Job& job);
  void begin(const Job& job);
  void skip(const Job& job, const Skip& skip);
  // Tells the limits that fit no result, if the job at `ended` is the last one for which they are meant.
  void tellMissedLimits(const std::vector<Job>& jobs, std::size_t ended, const Plan& plan) const;
  // Waits before every job but the first.
  void settleBefore(const Plan& plan);
  // Waits, or until the user interrupts.
  void settle(std::chrono::nanoseconds time) const;
  // Why the run stops after the diagnostic that has just ended; nothing if it goes on.
  std::optional<Skip> stopAfterLast(StopOn stopOn) const;

  const IsolationOptions isolation_;
  RunOptions runOptions_;  // the phone is that of the attempt
  WatchedSignals* const signals_;
  EventPipeline& events_;
  std::optional<Skip> stopped_;
  bool hasRun_ = false;
};

}  // namespace quazor
