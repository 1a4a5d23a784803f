#include "host/report/report_format.h"

#include "base/text/letter_case.h"
#include "base/text/nearest_name.h"
#include "contract/message_format.h"
#include "host/error/exit_code.h"
#include "host/model/incomplete_run.h"
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
#include <cstddef>
#include <iterator>
#include <sstream>
#include <stdexcept>
#include <utility>

namespace quazor {

namespace {

std::string textReport(const RunStarted& run, const std::vector<DiagnosticRecord>& records,
                       const std::optional<std::string>& interrupted, const TextContent& content) {
  std::ostringstream text;
  printRun(text, run);
  ShownFailures shown;
  for (std::size_t i = 0; i < records.size(); ++i) {
    printReport(text, run, records[i], {false, false, content.verbose}, shown);
    if (!content.verbose) printRepetitionEnd(text, records, i + 1);
  }
  printEnd(text, run, records, interrupted, content, false);
  if (interrupted && (run.analyzed || !interrupted->empty())) {
    text << capitalized(interruptionText(run, *interrupted)) << ".\n";
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
    case Format::kJunit: return "junit";
    case Format::kHtml: return "html";
    case Format::kTrace: break;
  }
  return "trace";
}

std::vector<std::string> formatNames() {
  std::vector<std::string> names;
  for (const Format format : kFormats) names.emplace_back(nameOf(format));
  return names;
}

std::optional<Format> formatNamed(std::string_view name) {
  for (const Format format : kFormats) {
    if (nameOf(format) == name) return format;
  }
  return std::nullopt;
}

namespace {

// "report.xml:junit": the format is behind the file. A file of such a name can be given as "./report.xml:junit".
void refuseSwapped(const std::string& text, Format usual) {
  const std::size_t colon = text.rfind(':');
  if (colon == std::string::npos || colon == 0 || text.starts_with("./")) return;
  const std::string format = text.substr(colon + 1);
  if (!formatNamed(format)) return;
  throw CommandError(ExitCode::kUsage,
                     formatMessage("--output '%@': the format comes first, as in --output %@:%@ (for a file of this "
                                   "name, write '%@:%@')",
                                   text, format, text.substr(0, colon), nameOf(usual), text));
}

}  // namespace

OutputRequest parseOutput(const std::string& text, Format usual) {
  const std::size_t colon = text.find(':');
  const std::string word = text.substr(0, colon);
  const bool isWord = !word.empty() && word.find_first_not_of("abcdefghijklmnopqrstuvwxyz") == std::string::npos;
  if (const std::optional<Format> format = formatNamed(word); format && colon != std::string::npos) {
    return {*format, text.substr(colon + 1)};
  }
  refuseSwapped(text, usual);
  if (colon == std::string::npos || !isWord) return {usual, text};
  throw CommandError(ExitCode::kUsage, "--output '" + text + "': unknown format '" + word +
                                           "' (for a file of this name, write './" + text + "')" +
                                           didYouMeanOf(word, "the formats", formatNames()));
}

void refuseNoFile(const std::string& text, const OutputRequest& output) {
  const std::string file = output.file.string();
  if (file.empty()) throw CommandError(ExitCode::kUsage, "--output '" + text + "': the file name is missing");
  if (file != "-") return;
  const std::string prefix = text.substr(0, text.size() - file.size());
  const std::string instead =
      prefix.empty() ? "leave --output out" : formatMessage("use --format %@ without --output", nameOf(output.format));
  throw CommandError(ExitCode::kUsage,
                     formatMessage("--output '%@': for a report on standard output, %@ (for a file of "
                                   "this name, write '%@./-')",
                                   text, instead, prefix));
}

std::optional<Format> otherFormatOfSuffix(const OutputRequest& output) {
  constexpr std::pair<std::string_view, Format> kSuffixes[] = {
      {".txt", Format::kText}, {".log", Format::kText},  {".json", Format::kJson}, {".jsonl", Format::kOcp},
      {".csv", Format::kCsv},  {".xml", Format::kJunit}, {".html", Format::kHtml}, {".htm", Format::kHtml}};
  const std::string suffix = withSmallLetters(output.file.extension().string());
  const auto* const found = std::find_if(std::begin(kSuffixes), std::end(kSuffixes),
                                         [&suffix](const auto& one) { return one.first == suffix; });
  if (found == std::end(kSuffixes) || found->second == output.format) return std::nullopt;
  // A time line is JSON, and so is each line of an OCP report.
  const bool isJson = output.format == Format::kTrace || output.format == Format::kOcp;
  if (isJson && found->second == Format::kJson) return std::nullopt;
  return found->second;
}

std::string reportText(Format format, const RunStarted& run, const std::vector<DiagnosticRecord>& records,
                       const std::optional<std::string>& interrupted, const TextContent& text,
                       const RunStreams& streams, const RunStreams& queues) {
  switch (format) {
    case Format::kText: return textReport(run, records, interrupted, text);
    case Format::kCsv: {
      std::vector<std::uint64_t> seeds;
      const std::string csv = run.ofExperiments
                                  ? experimentCsv(records, &seeds)
                                  : diagnosticCsv(withInterruptedOfAnalysis(run, records, interrupted), &seeds);
      return withRunColumns(csv, run, seeds);
    }
    case Format::kOcp: return ocpReport(run, records, interrupted);
    case Format::kJunit: return junitReport(run, records, interrupted, {text.allowSkips, run.acceptFlaky});
    case Format::kHtml: {
      const std::vector<DiagnosticRecord> all = withInterruptedOfAnalysis(run, records, interrupted);
      return text.page({run, all, streams, interrupted, true, {}, &queues});
    }
    case Format::kTrace: throw std::invalid_argument("a time line is made from events");
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

void printReport(std::ostream& out, const RunStarted& run, const DiagnosticRecord& record, TextStyle style,
                 ShownFailures& shown) {
  if (record.experimentOnly) {
    printExperiment(out, record, style);
  } else if (style.verbose) {
    printRecord(out, record, style.colour);
  } else if (!isOnlyCounted(record)) {
    std::size_t nameWidth = 0;
    for (const std::string& name : run.names) nameWidth = std::max(nameWidth, widthOf(printable(name)));
    printShortRecord(out, record, style.colour, nameWidth, shown.add(record));
  }
}

namespace {

bool hasFailureAfterError(const std::vector<DiagnosticRecord>& records) {
  return std::any_of(records.begin(), records.end(), [](const DiagnosticRecord& one) {
    return one.verdict == Verdict::kFail && one.trial.attempt > 1;  // a failure is never tried again
  });
}

}  // namespace

void printEnd(std::ostream& out, const RunStarted& run, const std::vector<DiagnosticRecord>& finished,
              const std::optional<std::string>& interrupted, const TextContent& text, bool colour) {
  const bool endsWithRepetition =
      !finished.empty() && !text.verbose && !run.ofExperiments && finished.back().trial.repetition > 0;
  if (endsWithRepetition) out << '\n';
  const std::vector<DiagnosticRecord> records = withInterruptedOfAnalysis(run, finished, interrupted);
  if (records.size() > finished.size()) {
    ShownFailures none;
    printReport(out, run, records.back(), {colour, false, text.verbose}, none);
  }
  printVariation(out, records, text.verbose);
  if (records.size() != 1 || interrupted) {
    const std::size_t notReached = interrupted ? unrecordedDiagnosticsOf(run, records, interrupted).neverRun.size() : 0;
    run.ofExperiments ? printExperimentSummary(out, records, notReached) : printSummary(out, records, notReached);
  }
  if (!run.acceptFlaky) {
    if (verdictCountsOf(records).flaky > 0)
      out << "A pass after an error counts as an error, unless --accept-flaky is given.\n";
    if (hasFailureAfterError(records))
      out << "A failure after an error counts as an error, unless --accept-flaky is given.\n";
  }
  if (!run.ofExperiments) {
    printUnlimited(out, records);
    printFailures(out, records, colour, text.isExplained);
  }
  const ExitRules rules{text.allowSkips, run.acceptFlaky};
  if (interrupted || runVerdictOf(records, run.acceptFlaky) != Verdict::kSkip) return;
  if (exitCodeOf(records, rules) == ExitCode::kAllPassed) return;
  out << (text.allowSkips ? "Nothing passed, so the exit code is 2, in spite of --allow-skips.\n"
                          : "What was skipped makes the exit code 2, unless --allow-skips is given.\n");
}

}  // namespace quazor
