// The report formats.
#pragma once

#include "host/model/run_event.h"

#include <filesystem>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace quazor {

enum class Format { kText, kJson, kCsv, kOcp, kJunit };

inline constexpr Format kFormats[] = {Format::kText, Format::kJson, Format::kCsv, Format::kOcp, Format::kJunit};

std::string_view nameOf(Format format);  // "text", "json", "csv", "ocp", "junit"

// The format with that name, or nothing.
std::optional<Format> formatNamed(std::string_view name);

// A requested report.
struct OutputRequest {
  Format format = Format::kText;
  std::filesystem::path file;
};

// [FORMAT:]FILE; the default format is `usual`. Throws a CommandError (kUsage) if the word before a colon is not a
// format.
OutputRequest parseOutput(const std::string& text, Format usual);

// The complete report of a run. `interrupted` as in RunEnded.
std::string reportText(Format format, const RunStarted& run, const std::vector<DiagnosticRecord>& records,
                       const std::optional<std::string>& interrupted);

// Prints the text report of one record.
void printReport(std::ostream& out, const DiagnosticRecord& record, bool colour, bool blocks);

// Prints one line with the number of records per verdict.
void printCounts(std::ostream& out, const std::vector<DiagnosticRecord>& records, bool ofExperiments);

}  // namespace quazor
