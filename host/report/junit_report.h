// The report in the JUnit XML format, which continuous integration servers read. docs/junit_output.md is the public
// description.
#pragma once

#include "host/model/run_event.h"
#include "host/model/trials.h"

#include <optional>
#include <string>
#include <vector>

namespace quazor {

// One test suite per record, then one for an interrupted diagnostic without a record and one per diagnostic that never
// ran. `interrupted` as in RunEnded.
//
// A suite with an error has the verdict error; otherwise a suite with a failure has failed. Any other suite has passed
// unless its test case was skipped.
std::string junitReport(const RunStarted& run, const std::vector<DiagnosticRecord>& records,
                        const std::optional<std::string>& interrupted, const ExitRules& rules = {});

}  // namespace quazor
