// The differences between two records.
#pragma once

#include "host/record/record_file.h"

#include <string>
#include <vector>

namespace quazor {

// One sentence per difference, "NAME: ...", in the order of `before` first. Diagnostics in both records are compared by
// verdict, parameters, error, results (by name, with value, unit, limit and verdict) and measurements. If both records
// have frames, the first one of each stream that differs is told.
std::vector<std::string> differencesOf(const RecordedRun& before, const RecordedRun& after);

}  // namespace quazor
