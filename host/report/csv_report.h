// Results as a table of comma-separated values. docs/csv_output.md is the public description.
#pragma once

#include "host/model/diagnostic_record.h"

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

// A header line, then a line for each measured result, and one for each diagnostic without any.
std::string diagnosticCsv(const std::vector<DiagnosticRecord>& records);

}  // namespace quazor
