#include "host/model/trials.h"

#include "contract/message_format.h"
#include "host/error/host_error.h"
#include "host/model/limit_check.h"

#include <algorithm>

namespace quazor {

namespace {

// SplitMix64: neighbouring numbers give unrelated ones.
std::uint64_t mixed(std::uint64_t number) {
  number += 0x9E3779B97F4A7C15U;
  number = (number ^ (number >> 30)) * 0xBF58476D1CE4E5B9U;
  number = (number ^ (number >> 27)) * 0x94D049BB133111EBU;
  return number ^ (number >> 31);
}

bool isAnswer(Verdict verdict) { return verdict == Verdict::kPass || verdict == Verdict::kFail; }

}  // namespace

std::uint64_t seedOf(std::uint64_t seed, std::uint64_t repetition, std::uint64_t attempt) {
  if (repetition <= 1 && attempt <= 1) return seed;
  constexpr int kUnusedBits = 11;  // the rest is exact in every JSON reader, also one that reads numbers as doubles
  return mixed(mixed(mixed(seed) + repetition) + attempt) >> kUnusedBits;
}

bool hasTrials(const std::vector<DiagnosticRecord>& records) {
  return std::any_of(records.begin(), records.end(),
                     [](const DiagnosticRecord& one) { return one.trial.attempt > 0 || one.trial.repetition > 0; });
}

bool mayTryAgain(const DiagnosticRecord& record) {
  if (record.verdict != Verdict::kError || record.error == nullptr) return false;
  const bool wasNotBegun = record.errorStage == Stage::kDescribe && record.stages.empty();
  return !wasNotBegun && !isHostError(record.error, HostErrorCode::kInterrupted) &&
         !isHostError(record.error, HostErrorCode::kNotRecorded) && !hasFailedResult(record);
}

bool isSuperseded(const std::vector<DiagnosticRecord>& records, std::size_t index) {
  const DiagnosticRecord& record = records[index];
  if (record.verdict != Verdict::kError || record.trial.attempt == 0 || hasFailedResult(record)) return false;
  for (std::size_t i = index + 1; i < records.size() && records[i].name == record.name; ++i) {
    const Trial& later = records[i].trial;
    if (later.repetition != record.trial.repetition || later.attempt <= record.trial.attempt) return false;
    if (isAnswer(records[i].verdict)) return true;
  }
  return false;
}

bool hasLaterAttempt(const std::vector<DiagnosticRecord>& records, std::size_t index) {
  if (index + 1 == records.size()) return false;
  const DiagnosticRecord& record = records[index];
  const DiagnosticRecord& next = records[index + 1];
  return record.trial.attempt > 0 && next.name == record.name && next.trial.repetition == record.trial.repetition &&
         next.trial.attempt > record.trial.attempt;
}

bool isFlaky(const DiagnosticRecord& record) { return isAnswer(record.verdict) && record.trial.attempt > 1; }

std::string trialSuffix(const DiagnosticRecord& record) {
  const auto& [attempt, attempts, repetition, repetitions] = record.trial;
  if (repetition <= 1 && attempt <= 1) return {};
  if (attempt <= 1) return formatMessage(" (repetition %@)", repetition);
  if (repetition == 0) return formatMessage(" (attempt %@)", attempt);
  return formatMessage(" (repetition %@, attempt %@)", repetition, attempt);
}

Verdict runVerdictOf(const std::vector<DiagnosticRecord>& records, bool acceptFlaky) {
  bool failed = false;
  bool skipped = false;
  for (std::size_t i = 0; i < records.size(); ++i) {
    const DiagnosticRecord& record = records[i];
    if (record.verdict == Verdict::kError && !isSuperseded(records, i)) return Verdict::kError;
    if (isFlaky(record) && !acceptFlaky) return Verdict::kError;
    failed = failed || record.verdict == Verdict::kFail;
    skipped = skipped || record.verdict == Verdict::kSkip;
  }
  return failed ? Verdict::kFail : skipped ? Verdict::kSkip : Verdict::kPass;
}

ExitCode exitCodeOf(const std::vector<DiagnosticRecord>& records, const ExitRules& rules) {
  switch (runVerdictOf(records, rules.acceptFlaky)) {
    case Verdict::kPass: return ExitCode::kAllPassed;
    case Verdict::kFail: return ExitCode::kFailed;
    case Verdict::kError: return ExitCode::kError;
    case Verdict::kSkip: break;
  }
  const bool onePassed = std::any_of(records.begin(), records.end(),
                                     [](const DiagnosticRecord& one) { return one.verdict == Verdict::kPass; });
  return rules.allowSkips && onePassed ? ExitCode::kAllPassed : ExitCode::kError;
}

}  // namespace quazor
