// The differences between two records.
#pragma once

#include "host/record/record_file.h"

#include <optional>
#include <string>
#include <vector>

namespace quazor {

// What differs. At least one of the values is set; it is empty for what has none, such as a diagnostic.
struct Difference {
  std::string name;  // of the diagnostic
  std::string what;  // in it; empty: all of it
  std::optional<std::string> before;
  std::optional<std::string> after;
};

// The differences, in the order of `before` first. Diagnostics in both records are compared by
// verdict, parameters, error, results (by name, with value, unit, limit and verdict) and measurements. If both records
// have frames, the first one of each stream that differs is told.
std::vector<Difference> listedDifferences(const RecordedRun& before, const RecordedRun& after);

// "NAME: ... was ... and is ...".
std::string sentenceOf(const Difference& difference);

// The sentences of listedDifferences().
std::vector<std::string> differencesOf(const RecordedRun& before, const RecordedRun& after);

}  // namespace quazor
