// The report as JUnit's XML, which servers of continuous integration read. docs/junit_output.md is the public
// description.
#pragma once

#include "host/model/run_event.h"

#include <optional>
#include <string>
#include <vector>

namespace quazor {

// One test suite for each record, then one for what was interrupted without a record and for each that was never run.
// `interrupted` is that of RunEnded.
//
// In a suite an error counts more than a failure, and a failure more than a pass; one that has neither an error nor a
// failure has passed, unless all it has was skipped.
std::string junitReport(const RunStarted& run, const std::vector<DiagnosticRecord>& records,
                        const std::optional<std::string>& interrupted);

}  // namespace quazor
