// The report in the output format of Open Compute Test & Validation, version 2.0: JSON lines. The format is described
// by the project opencomputeproject/ocp-diag-core; docs/ocp_output.md tells what becomes what.
#pragma once

#include "host/model/run_event.h"

#include <optional>
#include <string>
#include <vector>

namespace quazor {

// One test run for each record, each with sequence numbers of its own, one after the other; then one for what was
// interrupted without a record and for each that was never run. `interrupted` is that of RunEnded.
std::string ocpReport(const RunStarted& run, const std::vector<DiagnosticRecord>& records,
                      const std::optional<std::string>& interrupted);

}  // namespace quazor
