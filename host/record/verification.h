// Verifies that the verdicts in a record follow from its data.
#pragma once

#include "host/model/run_event.h"
#include "host/record/record_file.h"

#include <string>
#include <vector>

namespace quazor {

// Returns the problems in the events of a record, one sentence each. There are none if every verdict and every error of
// quazor follows from errors, results and limits, the events are in a valid order, and a finished run includes all
// selected diagnostics. A run that was cut off is not a problem.
std::vector<std::string> problemsOf(const std::vector<RunEvent>& events);
// The same of a whole file, with what follows the end of the run.
std::vector<std::string> problemsOfRecord(const StoredRecord& stored);

}  // namespace quazor
