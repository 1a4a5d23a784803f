// What two records tell differently.
#pragma once

#include "host/record/record_file.h"

#include <string>
#include <vector>

namespace quazor {

// One sentence per difference, "NAME: ...", first by the order of `before`. Of diagnostics that both have: verdict,
// parameters, error, the results by name with value, unit, limit and verdict, and the measurements.
std::vector<std::string> differencesOf(const RecordedRun& before, const RecordedRun& after);

}  // namespace quazor
