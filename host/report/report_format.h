// The report formats.
#pragma once

#include "host/model/run_event.h"
#include "host/record/record_file.h"
#include "host/report/short_report.h"
#include "host/report/text_report.h"

#include <filesystem>
#include <functional>
#include <iterator>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

namespace quazor {

enum class Format { kText, kJson, kCsv, kOcp, kJunit, kHtml, kTrace };

inline constexpr Format kFormats[] = {Format::kText,  Format::kJson, Format::kCsv,  Format::kOcp,
                                      Format::kJunit, Format::kHtml, Format::kTrace};
// Those of reportText(). A time line is made from events (timeline.h).
inline constexpr std::span kRecordFormats = std::span(kFormats).first(std::size(kFormats) - 1);

std::string_view nameOf(Format format);  // "text", "json", "csv", "ocp", "junit", "html", "trace"

// Of all formats, in their order.
std::vector<std::string> formatNames();

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

// Throws a CommandError (kUsage) if `output`, which was given as `text`, has no file or "-" for one.
void refuseNoFile(const std::string& text, const OutputRequest& output);

// The format that the suffix of the file suggests, if the report has another; nothing for other suffixes.
std::optional<Format> otherFormatOfSuffix(const OutputRequest& output);

// The frames of each record of a run, or the tasks; empty if they are not known.
using RunStreams = std::vector<std::vector<RecordedStream>>;

// A run as a page shows it. Borrows all but its last members.
struct ShownRun {
  const RunStarted& began;
  const std::vector<DiagnosticRecord>& records;
  const RunStreams& streams;
  std::optional<std::string> interrupted{};  // as in RunEnded; without an end, the diagnostic that was running
  bool hasEnded = true;
  std::string file{};                  // of the record; empty: none
  const RunStreams* queues = nullptr;  // null: none
};

// What the text reports of a run show.
struct TextContent {
  bool verbose = false;  // every result of a diagnostic
  // True for what `quazor explain` explains; without the function, nothing is.
  std::function<bool(const std::string& topic)> isExplained{};
  bool allowSkips = false;                                 // a skipped diagnostic does not make the exit code 2
  std::function<std::string(const ShownRun& run)> page{};  // writes the HTML page (page/page.h)
};

// The complete report of a run in one of kRecordFormats. `interrupted` as in RunEnded. `text` only matters for kText,
// but `allowSkips` also for kJunit, and `page`, which is then required, for kHtml, as `streams` and
// `queues` do.
std::string reportText(Format format, const RunStarted& run, const std::vector<DiagnosticRecord>& records,
                       const std::optional<std::string>& interrupted, const TextContent& text = {},
                       const RunStreams& streams = {}, const RunStreams& queues = {});

// Prints the text report of one record of the run; nothing if that report only counts it (variation_report.h). `shown`
// is about the records before.
void printReport(std::ostream& out, const RunStarted& run, const DiagnosticRecord& record, TextStyle style,
                 ShownFailures& shown);

// Prints the end of the text report: of an analysis, the diagnostic in which the recorded run stopped; the number of
// records per verdict, unless there is only one and the run was not interrupted, what passed without any
// limit, and what did not pass (short_report.h).
void printEnd(std::ostream& out, const RunStarted& run, const std::vector<DiagnosticRecord>& finished,
              const std::optional<std::string>& interrupted, const TextContent& text, bool colour);

}  // namespace quazor
