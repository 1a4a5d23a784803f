// The diagnostics of a run that have no record because the run ended early.
#pragma once

#include "host/model/run_event.h"

#include <optional>
#include <string>
#include <vector>

namespace quazor {

struct UnrecordedDiagnostics {
  // The diagnostic that was running at the interruption, unless its record already says so. Empty text: none was
  // running.
  std::optional<std::string> interrupted;
  std::vector<std::string> neverRun;  // in the planned order
};

// `interrupted` as in RunEnded.
UnrecordedDiagnostics unrecordedDiagnosticsOf(const RunStarted& run, const std::vector<DiagnosticRecord>& records,
                                              const std::optional<std::string>& interrupted);

// The error to report for an interruption that no record shows. `interrupted` is the diagnostic that was running, or
// empty.
DiagnosticErrorPtr interruptionOf(const RunStarted& run, const std::string& interrupted);

}  // namespace quazor
