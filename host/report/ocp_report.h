// The report in the output format of Open Compute Test & Validation, version 2.0: JSON lines. The format is described
// by the project opencomputeproject/ocp-diag-core; docs/ocp_output.md describes the mapping.
#pragma once

#include "host/model/run_event.h"

#include <optional>
#include <string>
#include <vector>

namespace quazor {

// One test run per record, each with its own sequence numbers, then one for an interrupted diagnostic without a record
// and one per diagnostic that never ran. `interrupted` as in RunEnded.
std::string ocpReport(const RunStarted& run, const std::vector<DiagnosticRecord>& records,
                      const std::optional<std::string>& interrupted);

}  // namespace quazor
