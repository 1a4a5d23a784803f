// Results as a table of comma-separated values. docs/csv_output.md is the public description.
#pragma once

#include "host/model/diagnostic_record.h"

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace quazor {

// A text cell; a cell with a number needs no change.
std::string textCell(std::string_view text);

// Formats one field according to RFC 4180: a field with a comma, a quote or a line end is quoted, and its quotes are
// doubled.
std::string csvField(std::string_view text);

// A header line, then one line per sample of each image and one per measurement, in the order of the records. Adds the
// seed of the record of each line after the header to `seeds`, unless that is null.
std::string experimentCsv(const std::vector<DiagnosticRecord>& records, std::vector<std::uint64_t>* seeds = nullptr);

// A header line, then one line per measured result. A diagnostic without results has one line. `seeds` as above.
std::string diagnosticCsv(const std::vector<DiagnosticRecord>& records, std::vector<std::uint64_t>* seeds = nullptr);

}  // namespace quazor
