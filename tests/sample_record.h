// The record of a generated run.
#pragma once

#include "host/model/run_event.h"

#include <optional>
#include <string>
#include <vector>

namespace quazor {

// The lines of the record of such a run. `interrupted` as in RunEnded.
std::string recordOf(const RunStarted& run, const std::vector<DiagnosticRecord>& records,
                     const std::optional<std::string>& interrupted);

}  // namespace quazor
