#include "host/report/report_format.h"

#include "base/text/nearest_name.h"
#include "host/error/exit_code.h"
#include "host/model/trials.h"
#include "host/model/variation.h"
#include "host/record/value_json.h"
#include "host/report/csv_report.h"
#include "host/report/experiment_report.h"
#include "host/report/json_report.h"
#include "host/report/junit_report.h"
#include "host/report/ocp_report.h"
#include "host/report/run_identity.h"
#include "host/report/short_report.h"
#include "host/report/variation_report.h"
#include "host/text/display_width.h"
#include "host/text/table.h"

#include <algorithm>
#include <sstream>

namespace quazor {

namespace {

std::string textReport(const RunStarted& run, const std::vector<DiagnosticRecord>& records,
                       const std::optional<std::string>& interrupted, const TextContent& content) {
  std::ostringstream text;
  for (const DiagnosticRecord& record : records) printReport(text, run, record, {false, false, content.verbose});
  printEnd(text, run, records, interrupted, content, false);
  if (interrupted && !interrupted->empty()) {
    text << "Interrupted while " << printable(*interrupted) << " was running.\n";
  }
  return text.str();
}

}  // namespace

std::string_view nameOf(Format format) {
  switch (format) {
    case Format::kText: return "text";
    case Format::kJson: return "json";
    case Format::kCsv: return "csv";
    case Format::kOcp: return "ocp";
    case Format::kJunit: break;
  }
  return "junit";
}

std::optional<Format> formatNamed(std::string_view name) {
  for (const Format format : kFormats) {
    if (nameOf(format) == name) return format;
  }
  return std::nullopt;
}

OutputRequest parseOutput(const std::string& text, Format usual) {
  const std::size_t colon = text.find(':');
  const std::string word = text.substr(0, colon);
  const bool isWord = !word.empty() && word.find_first_not_of("abcdefghijklmnopqrstuvwxyz") == std::string::npos;
  if (colon == std::string::npos || !isWord) return {usual, text};
  if (const std::optional<Format> format = formatNamed(word)) return {*format, text.substr(colon + 1)};
  std::vector<std::string> names;
  for (const Format format : kFormats) names.emplace_back(nameOf(format));
  throw CommandError(ExitCode::kUsage, "--output '" + text + "': unknown format '" + word +
                                           "' (for a file of this name, write './" + text + "')" +
                                           didYouMean(word, names));
}

std::string reportText(Format format, const RunStarted& run, const std::vector<DiagnosticRecord>& records,
                       const std::optional<std::string>& interrupted, const TextContent& text) {
  switch (format) {
    case Format::kText: return textReport(run, records, interrupted, text);
    case Format::kCsv: return withRunColumns(run.ofExperiments ? experimentCsv(records) : diagnosticCsv(records), run);
    case Format::kOcp: return ocpReport(run, records, interrupted);
    case Format::kJunit: return junitReport(run, records, interrupted);
    case Format::kJson: break;
  }
  nlohmann::ordered_json document =
      run.ofExperiments ? experimentDocument(records, interrupted) : runDocument(records, interrupted);
  if (run.attempts > 0 || run.repetitions > 0 || hasTrials(records)) {
    document["verdict"] = nameOf(runVerdictOf(records, run.acceptFlaky));
    if (const nlohmann::ordered_json variation = variationJson(records); !variation.empty()) {
      document["variation"] = variation;
    }
  }
  document["run"] = runJson(run);
  return documentText(document);
}

void printReport(std::ostream& out, const RunStarted& run, const DiagnosticRecord& record, TextStyle style) {
  if (record.experimentOnly) {
    printExperiment(out, record, style);
  } else if (style.verbose) {
    printRecord(out, record, style.colour);
  } else {
    std::size_t nameWidth = 0;
    for (const std::string& name : run.names) nameWidth = std::max(nameWidth, widthOf(printable(name)));
    printShortRecord(out, record, style.colour, nameWidth);
  }
}

void printEnd(std::ostream& out, const RunStarted& run, const std::vector<DiagnosticRecord>& records,
              const std::optional<std::string>& interrupted, const TextContent& text, bool colour) {
  printVariation(out, records);
  if (records.size() != 1 || interrupted) {
    run.ofExperiments ? printExperimentSummary(out, records) : printSummary(out, records);
  }
  const bool hasFlaky = verdictCountsOf(records).flaky > 0;
  if (hasFlaky && !run.acceptFlaky)
    out << "A pass after an error counts as an error, unless --accept-flaky is given.\n";
  if (!run.ofExperiments) printFailures(out, records, colour, text.isExplained);
}

}  // namespace quazor
