// The report formats.
#pragma once

#include "host/model/run_event.h"
#include "host/report/text_report.h"

#include <filesystem>
#include <functional>
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
// format, or for FILE:FORMAT.
OutputRequest parseOutput(const std::string& text, Format usual);

// The format that the suffix of the file suggests, if the report has another; nothing for other suffixes.
std::optional<Format> otherFormatOfSuffix(const OutputRequest& output);

// What the text reports of a run show.
struct TextContent {
  bool verbose = false;  // every result of a diagnostic
  // True for what `quazor explain` explains; without the function, nothing is.
  std::function<bool(const std::string& topic)> isExplained{};
  bool allowSkips = false;  // a skipped diagnostic does not make the exit code 2
};

// The complete report of a run. `interrupted` as in RunEnded. `text` only matters for kText, but
// `allowSkips` also for kJunit.
std::string reportText(Format format, const RunStarted& run, const std::vector<DiagnosticRecord>& records,
                       const std::optional<std::string>& interrupted, const TextContent& text = {});

// Prints the text report of one record of the run; nothing if that report only counts it (variation_report.h).
void printReport(std::ostream& out, const RunStarted& run, const DiagnosticRecord& record, TextStyle style);

// Prints the end of the text report: of an analysis, the diagnostic in which the recorded run stopped; the number of records per verdict, unless there is only one and the run was not
// interrupted, and what did not pass (short_report.h).
void printEnd(std::ostream& out, const RunStarted& run, const std::vector<DiagnosticRecord>& finished,
              const std::optional<std::string>& interrupted, const TextContent& text, bool colour);

}  // namespace quazor
