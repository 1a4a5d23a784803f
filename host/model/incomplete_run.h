// What a run was to run and has no record of.
#pragma once

#include "host/model/run_event.h"

#include <optional>
#include <string>
#include <vector>

namespace quazor {

struct Unfinished {
  // What was running when the run was interrupted, unless it has a record that says so; empty between two.
  std::optional<std::string> interrupted;
  std::vector<std::string> neverRun;  // in the order in which it was to run
};

// `interrupted` is that of RunEnded.
Unfinished unfinishedOf(const RunStarted& run, const std::vector<DiagnosticRecord>& records,
                        const std::optional<std::string>& interrupted);

// The error of what was interrupted and has no record.
DiagnosticErrorPtr interruptionOf(const std::string& interrupted);

}  // namespace quazor
