#include "host/model/incomplete_run.h"

#include "host/error/host_error.h"

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <map>
#include <utility>

namespace quazor {

std::vector<PlannedDiagnostic> missingOf(const RunStarted& run, const std::vector<DiagnosticRecord>& records) {
  std::map<std::pair<std::string, std::uint64_t>, std::size_t> begun;
  for (const DiagnosticRecord& record : records) {
    const bool isTriedAgain = run.attempts > 0 && record.trial.attempt > 1;
    if (!isTriedAgain) ++begun[{record.name, run.repetitions > 0 ? record.trial.repetition : 0}];
  }
  std::vector<PlannedDiagnostic> missing;
  for (std::uint64_t repetition = run.repetitions == 0 ? 0 : 1; repetition <= run.repetitions; ++repetition) {
    for (const std::string& name : run.names) {
      // What could not be loaded is not repeated.
      if (repetition > 0 && begun.contains({name, 0})) continue;
      std::size_t& left = begun[{name, repetition}];
      if (left == 0) {
        missing.push_back({name, repetition});
      } else {
        --left;
      }
    }
  }
  return missing;
}

std::vector<DiagnosticRecord> neverBegun(const RunStarted& run, const std::vector<DiagnosticRecord>& records) {
  std::vector<DiagnosticRecord> never;
  for (const PlannedParameters& planned : run.planned) {
    const bool hasBegun = std::any_of(records.begin(), records.end(),
                                      [&planned](const DiagnosticRecord& one) { return one.name == planned.name; });
    if (hasBegun) continue;
    DiagnosticRecord& record = never.emplace_back();
    record.name = planned.name;
    record.parameters = planned.parameters;
    record.seed = run.seed;
  }
  return never;
}

UnrecordedDiagnostics unrecordedDiagnosticsOf(const RunStarted& run, const std::vector<DiagnosticRecord>& records,
                                              const std::optional<std::string>& interrupted) {
  UnrecordedDiagnostics unrecorded;
  unrecorded.neverRun = missingOf(run, records);
  const bool isRecorded = !records.empty() && isHostError(records.back().error, HostErrorCode::kInterrupted);
  if (!interrupted || isRecorded) return unrecorded;
  unrecorded.interrupted = *interrupted;
  const auto running = std::find_if(unrecorded.neverRun.begin(), unrecorded.neverRun.end(),
                                    [&interrupted](const PlannedDiagnostic& one) { return one.name == *interrupted; });
  if (running != unrecorded.neverRun.end()) unrecorded.neverRun.erase(running);
  return unrecorded;
}

std::vector<DiagnosticRecord> withInterruptedOfAnalysis(const RunStarted& run, std::vector<DiagnosticRecord> records,
                                                        const std::optional<std::string>& interrupted) {
  if (!run.analyzed || run.ofExperiments) return records;
  const std::optional<std::string> name = unrecordedDiagnosticsOf(run, records, interrupted).interrupted;
  if (!name || name->empty()) return records;
  DiagnosticRecord record;
  record.name = *name;
  record.summary = "The recorded run stopped while this was running.";
  record.seed = run.seed;
  record.verdict = Verdict::kError;
  record.error = interruptionOf(run, *name);
  records.push_back(std::move(record));
  return records;
}

std::string nameOfRunning(const RunStarted& run, const std::string& interrupted) {
  if (!interrupted.empty()) return interrupted;
  return run.ofExperiments ? "no experiment" : "no diagnostic";
}

DiagnosticErrorPtr interruptionOf(const RunStarted& run, const std::string& interrupted) {
  return hostError(HostErrorCode::kInterrupted,
                   interrupted.empty() ? "interrupted while " + nameOfRunning(run, interrupted) + " was running"
                                       : interrupted + " was interrupted");
}

}  // namespace quazor
