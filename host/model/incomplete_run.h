// The diagnostics of a run that have no record because the run ended early.
#pragma once

#include "host/model/run_event.h"

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

namespace quazor {

// A diagnostic of the plan. The repetition is 0 if the run does not repeat.
struct PlannedDiagnostic {
  std::string name;
  std::uint64_t repetition = 0;
};

struct UnrecordedDiagnostics {
  // The diagnostic that was running at the interruption, unless its record already says so. Empty text: none was
  // running.
  std::optional<std::string> interrupted;
  std::vector<PlannedDiagnostic> neverRun;  // in the planned order
};

// The planned diagnostics of which no entry exists.
std::vector<PlannedDiagnostic> missingOf(const RunStarted& run, const std::vector<DiagnosticRecord>& records);

// The planned diagnostics of which no entry exists in any repetition, each once, and whose parameters are known. They
// have the seed of the run.
std::vector<DiagnosticRecord> neverBegun(const RunStarted& run, const std::vector<DiagnosticRecord>& records);

// `interrupted` as in RunEnded.
UnrecordedDiagnostics unrecordedDiagnosticsOf(const RunStarted& run, const std::vector<DiagnosticRecord>& records,
                                              const std::optional<std::string>& interrupted);

// The records, of an analysis followed by one for the diagnostic in which the recorded run stopped: it has nothing to
// analyze and so no record of its own.
std::vector<DiagnosticRecord> withInterruptedOfAnalysis(const RunStarted& run, std::vector<DiagnosticRecord> records,
                                                        const std::optional<std::string>& interrupted);

// The name of the diagnostic or experiment that was running, or "no diagnostic" or "no experiment" if it is empty.
std::string nameOfRunning(const RunStarted& run, const std::string& interrupted);

// The error to report for an interruption that no record shows. `interrupted` is the diagnostic that was running, or
// empty.
DiagnosticErrorPtr interruptionOf(const RunStarted& run, const std::string& interrupted);

}  // namespace quazor
