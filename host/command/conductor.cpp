#include "host/command/conductor.h"

#include "host/text/timestamp.h"

#include <chrono>
#include <thread>
#include <utility>

namespace quazor {

std::optional<std::string> Conductor::performAll(const std::vector<Job>& jobs, StopOn stopOn,
                                                 std::chrono::nanoseconds settle) {
  std::optional<Skip> stopped;
  bool hasRun = false;
  for (const Job& job : jobs) {
    if (stopped || job.skip) {
      skip(job, stopped ? *stopped : *job.skip);
      continue;
    }
    if (std::exchange(hasRun, true) && settle.count() > 0) {
      this->settle(settle);
      if (isInterrupted()) return "";
    }
    if (std::optional<std::string> interrupted = perform(job)) return interrupted;
    stopped = stopAfterLast(stopOn);
  }
  return std::nullopt;
}

std::optional<std::string> Conductor::perform(const Job& job) {
  const auto& [diagnostic, description] = job.bound.described;
  begin(job);
  std::optional<std::string> interrupted;
  if (description.error != nullptr) {
    events_.onEvent(Failed{Stage::kDescribe, description.error});
  } else if (job.problem != nullptr) {
    events_.onEvent(Failed{Stage::kDescribe, job.problem});
  } else if (signals_ == nullptr) {
    performHere(job);
  } else if (!runIsolated(isolation_, *signals_, diagnostic, job.bound.parameters, runOptions_, job.result,
                          events_.progress(), events_)) {
    interrupted = diagnostic.name;
  }
  events_.endDiagnostic();
  if (!interrupted && isInterrupted()) interrupted = "";  // the interrupt came after the end of the diagnostic
  return interrupted;
}

void Conductor::performHere(const Job& job) {
  const Diagnostic& diagnostic = job.bound.described.diagnostic;
  if (job.result != nullptr) {
    analyzeResult(diagnostic, job.bound.parameters, *job.result, runOptions_.logLevel, events_);
  } else {
    runDiagnostic(diagnostic, job.bound.parameters, runOptions_, events_);
  }
}

void Conductor::begin(const Job& job) {
  const Diagnostic& diagnostic = job.bound.described.diagnostic;
  events_.onEvent(DiagnosticStarted{diagnostic.name, job.bound.described.summary(), diagnostic.experimentName,
                                    diagnostic.analysisName, diagnostic.experimentOnly, job.bound.parameters, job.seed,
                                    dateNow()});
}

void Conductor::skip(const Job& job, const Skip& skip) {
  begin(job);
  events_.onEvent(DiagnosticSkipped{skip});
  events_.endDiagnostic();
}

void Conductor::settle(std::chrono::nanoseconds time) const {
  if (signals_ == nullptr) {
    std::this_thread::sleep_for(time);  // an interrupt ends the process
  } else {
    signals_->wait(time);
  }
}

std::optional<Skip> Conductor::stopAfterLast(StopOn stopOn) const {
  if (stopOn == StopOn::kNothing || events_.records().empty()) return std::nullopt;
  const DiagnosticRecord& last = events_.records().back();
  const bool hasError = last.verdict == Verdict::kError;
  if (!hasError && (stopOn == StopOn::kError || last.verdict != Verdict::kFail)) return std::nullopt;
  return Skip{SkipKind::kNotReached,
              "The run stopped after " + last.name + (hasError ? " had ended in an error." : " had failed.")};
}

}  // namespace quazor
