// The page that compares two runs.
#pragma once

#include "host/record/record_file.h"

#include <string>

namespace quazor {

// A run to compare, with the file of its record. Borrows the run.
struct ComparedRecord {
  const RecordedRun& run;
  std::string file;
};

// What differs between two runs, with both values, and the intervals between the frames of both over each other;
// without these plots if `frames` is false.
std::string comparisonPage(const ComparedRecord& before, const ComparedRecord& after, bool frames);

}  // namespace quazor
