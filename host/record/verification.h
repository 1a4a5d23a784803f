// Verifying a record: do the verdicts that it holds follow from the rest of it?
#pragma once

#include "host/model/run_event.h"

#include <string>
#include <vector>

namespace quazor {

// What is wrong with the events of a record, one sentence each; none when every verdict and every failure of quazor's
// own follow from errors, results and limits, the events stand in the order in which runs tell them, and a run that
// came to its end ran all that it was to run. A run that was cut off is not wrong.
std::vector<std::string> problemsOf(const std::vector<RunEvent>& events);

}  // namespace quazor
