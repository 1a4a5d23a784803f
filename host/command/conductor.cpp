#include "host/command/conductor.h"

#include "host/model/limit_check.h"
#include "host/model/trials.h"
#include "host/run/traced_run.h"
#include "host/text/timestamp.h"

#include <algorithm>
#include <chrono>
#include <thread>
#include <utility>

namespace quazor {

std::optional<std::string> Conductor::performAll(const std::vector<Job>& jobs, const Plan& plan) {
  for (std::uint64_t repetition = 1; repetition <= plan.repetitions; ++repetition) {
    if (std::optional<std::string> interrupted = performRound(jobs, plan, repetition)) return interrupted;
  }
  return std::nullopt;
}

std::optional<std::string> Conductor::performRound(const std::vector<Job>& jobs, const Plan& plan,
                                                   std::uint64_t repetition) {
  for (std::size_t i = 0; i < jobs.size(); ++i) {
    const Job& one = jobs[i];
    Job job = one;
    if (plan.repetitions > 1) job.repetition = repetition;
    if (plan.attempts > 1) job.attempt = 1;
    if (stopped_ || job.skip) {
      job.seed = seedOf(one.seed, job.repetition, 1);
      skip(job, stopped_ ? *stopped_ : *job.skip);
    } else {
      if (std::optional<std::string> interrupted = performAttempts(std::move(job), plan)) return interrupted;
      stopped_ = stopAfterLast(plan.stopOn);
    }
    if (repetition == 1 && !stopped_) tellMissedLimits(jobs, i, plan);
  }
  return std::nullopt;
}

void Conductor::tellMissedLimits(const std::vector<Job>& jobs, std::size_t ended, const Plan& plan) const {
  const bool isLastJob = ended + 1 == jobs.size();
  if (isLastJob && plan.repetitions == 1) return;  // the report tells it at once
  for (const UserLimit& limit : plan.limits) {
    const auto isMeant = [&limit](const Job& job) { return appliesTo(limit, job.bound.described.diagnostic.name); };
    const auto next = jobs.begin() + static_cast<std::ptrdiff_t>(ended);
    if (!isMeant(*next) || std::any_of(next + 1, jobs.end(), isMeant)) continue;
    if (limitsWithoutResult({limit}, events_.records()).empty()) continue;
    const DiagnosticErrorPtr error = errorOfLimitWithoutResult(limit, events_.records());
    events_.tellRemark((plan.repetitions > 1 ? "so far, " : "") + error->localizedDescription());
  }
}

std::optional<std::string> Conductor::performAttempts(Job job, const Plan& plan) {
  const std::uint64_t seed = job.seed;
  for (std::uint64_t attempt = 1; attempt <= plan.attempts; ++attempt) {
    settleBefore(plan);
    if (isInterrupted()) return "";
    if (plan.attempts > 1) job.attempt = attempt;
    if (plan.phones) {
      job.seed = seedOf(seed, job.repetition, attempt);
      runOptions_.makePhone = plan.phones(job.seed);
    }
    if (std::optional<std::string> interrupted = perform(job)) return interrupted;
    if (!mayTryAgain(events_.records().back())) break;
  }
  return std::nullopt;
}

void Conductor::settleBefore(const Plan& plan) {
  if (std::exchange(hasRun_, true) && plan.settle.count() > 0) settle(plan.settle);
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
    runDiagnosticHere(diagnostic, job.bound.parameters, runOptions_, events_);
  }
}

void Conductor::begin(const Job& job) {
  const Diagnostic& diagnostic = job.bound.described.diagnostic;
  events_.onEvent(DiagnosticStarted{diagnostic.name, job.bound.described.summary(), diagnostic.experimentName,
                                    diagnostic.analysisName, diagnostic.experimentOnly, job.bound.parameters, job.seed,
                                    dateNow(), job.attempt, job.repetition});
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
