// The results of experiments as a table of comma-separated values. docs/csv_output.md is the public description.
#pragma once

#include "host/diagnostic_run.h"

#include <string>
#include <string_view>
#include <vector>

namespace quazor {

// One field as RFC 4180 has it: in quotes, and quotes in it doubled, when it has a comma, a quote or a line's end in
// it.
std::string csvField(std::string_view text);

// A header line, then a line for each sample of each image and a line for each measurement, in the order of the
// records.
std::string experimentCsv(const std::vector<DiagnosticRecord>& records);

}  // namespace quazor
