#include "host/report/text_report.h"

#include "base/text/name_list.h"
#include "contract/message_format.h"
#include "host/error/host_error.h"
#include "host/model/limit_check.h"
#include "host/model/variation.h"
#include "host/plugin/parameter_range.h"
#include "host/report/variation_report.h"
#include "host/text/display_width.h"
#include "host/text/table.h"

#include <algorithm>
#include <string_view>
#include <utility>

namespace quazor {

namespace {

constexpr std::string_view kGreen = "\033[32m";
constexpr std::string_view kRed = "\033[31m";
constexpr std::string_view kYellow = "\033[33m";
constexpr std::size_t kMaxAuxiliaryText = 240;  // columns; the record has all of it
constexpr std::string_view kPlain = "\033[0m";

std::string_view wordOf(const DiagnosticRecord& record) {
  switch (record.verdict) {
    case Verdict::kPass: return record.experimentOnly ? "DONE" : "PASS";
    case Verdict::kFail: return "FAIL";
    case Verdict::kSkip: return "SKIP";
    case Verdict::kError: break;
  }
  return "ERROR";
}

std::string_view colourOf(Verdict verdict) {
  switch (verdict) {
    case Verdict::kPass: return kGreen;
    case Verdict::kFail: return kRed;
    case Verdict::kSkip:
    case Verdict::kError: break;
  }
  return kYellow;
}

std::string rangeText(const QZLimit& limit) {
  const QZBound* lower = limit.lowerBound().get();
  const QZBound* upper = limit.upperBound().get();
  if (lower == nullptr && upper == nullptr) return "no bounds";
  const bool one =
      lower != nullptr && upper != nullptr && !lower->open() && !upper->open() && lower->value() == upper->value();
  if (one) return formatMessage("= %@", lower->value().value());
  std::string text;
  if (lower != nullptr) text += formatMessage("%@ %@", lower->open() ? ">" : ">=", lower->value().value());
  if (lower != nullptr && upper != nullptr) text += ", ";
  if (upper != nullptr) text += formatMessage("%@ %@", upper->open() ? "<" : "<=", upper->value().value());
  return text;
}

std::string_view colourOfRow(std::string_view verdict) {
  if (verdict == nameOf(ResultVerdict::kPass)) return kGreen;
  if (verdict == nameOf(ResultVerdict::kFail)) return kRed;
  return verdict == nameOf(ResultVerdict::kNone) ? std::string_view() : kYellow;
}

// The results of a record and the limits of the user, of which some only warn.
// Thread: one at a time.
class ResultTable {
 public:
  ResultTable(bool showsSeverity, bool colour)
      : showsSeverity_(showsSeverity), colour_(colour), table_(alignments(showsSeverity)) {
    std::vector<std::string> header{"Result", "Value", "Unit", "Limit", "Verdict"};
    if (showsSeverity_) header.insert(header.end() - 1, "Severity");
    table_.addHeader(std::move(header));
  }

  void add(const JudgedResult& one) { addRow(one.result, limitText(one.result.limit()), "-", nameOf(one.verdict)); }

  void add(const LimitCheck& check) {
    addRow(check.result, printable(labelOf(check.limit)), nameOf(check.limit.severity), check.verdictName());
  }

  // Prints nothing if there is no row.
  void print(std::ostream& out) const {
    if (!isEmpty_) table_.print(out, "  ");
  }

 private:
  static std::vector<Table::Align> alignments(bool showsSeverity) {
    std::vector<Table::Align> columns(showsSeverity ? 6 : 5, Table::Align::kLeft);
    columns[1] = Table::Align::kRight;
    return columns;
  }

  void addRow(const QZMeasuredResult& result, const std::string& limit, std::string_view severity,
              std::string_view verdict) {
    const Measurement& measurement = result.measurement();
    std::vector<std::string> cells{printable(result.name()), defaultText(measurement.value()),
                                   printable(measurement.unit().symbol()), limit,
                                   verdict == nameOf(ResultVerdict::kNone) ? "-" : std::string(verdict)};
    if (showsSeverity_) cells.insert(cells.end() - 1, std::string(severity));
    const std::string_view before = colour_ ? colourOfRow(verdict) : std::string_view();
    table_.addRow(std::move(cells), std::string(before), std::string(before.empty() ? std::string_view() : kPlain));
    isEmpty_ = false;
  }

  const bool showsSeverity_;
  const bool colour_;
  Table table_;
  bool isEmpty_ = true;
};

std::size_t warningsOf(const std::vector<DiagnosticRecord>& records) {
  std::size_t warnings = 0;
  for (const DiagnosticRecord& record : records) {
    warnings += warningsIn(limitChecksOf(record));
  }
  return warnings;
}

// What the parameter accepts, and its default.
std::string acceptedText(const ResolvedParameter& parameter) {
  if (!parameter.range) return "-";
  const std::optional<double>& usual = parameter.range->defaultValue();
  return printable(rangeText(*parameter.range) + (usual ? formatMessage(", default %@", *usual) : ""));
}

void printHalf(std::ostream& out, std::string_view title, const std::string& name, const QZDescription& description,
               const std::vector<ResolvedParameter>& parameters) {
  out << "\n  " << title << ' ' << printable(name) << '\n' << indentedLines(description.summary(), "    ");
  if (parameters.empty()) {
    out << "    It takes no parameters.\n";
    return;
  }
  const bool isAnyKnown = std::any_of(parameters.begin(), parameters.end(),
                                      [](const ResolvedParameter& one) { return one.range.has_value(); });
  std::vector<Table::Align> columns(isAnyKnown ? 5 : 4, Table::Align::kLeft);
  columns[1] = Table::Align::kRight;
  Table table(columns);
  const auto withAccepted = [isAnyKnown](std::vector<std::string> cells, const std::string& accepted) {
    if (isAnyKnown) cells.insert(cells.end() - 1, accepted);
    return cells;
  };
  table.addHeader(withAccepted({"Parameter", "Value", "From", "Meaning"}, "Accepts"));
  for (const ResolvedParameter& one : parameters) {
    const std::string unset = one.declaration.required() ? "not set, required" : "not set";
    table.addRow(withAccepted({printable(one.name), one.value ? defaultText(*one.value) : "-",
                               one.value ? printable(one.source) : unset, printable(one.declaration.summary())},
                              acceptedText(one)));
  }
  table.print(out, "    ");
}

std::string count(std::size_t number, std::string_view what) {
  return std::to_string(number) + " " + std::string(what);
}

// The lines below the name in a description.
std::string headline(const Diagnostic& diagnostic) {
  if (!diagnostic.experimentOnly) return diagnostic.summary;
  if (diagnostic.usedBy.empty()) return "An experiment. No diagnostic uses it.";
  return "An experiment, used by " + listText(diagnostic.usedBy) + ".";
}

// The text next to the name of an experiment in a list.
std::string listedSummary(const DescribedDiagnostic& one) {
  const DiagnosticErrorPtr& error = one.description.error;
  if (error != nullptr) return "could not be described: " + printable(error->localizedDescription());
  return printable(one.summary());
}

}  // namespace

std::string limitText(const std::optional<QZLimit>& limit) {
  return limit ? printable(limit->name()) + ": " + rangeText(*limit) : "-";
}

std::string valueText(const Measurement& measurement) {
  const std::string& unit = measurement.unit().symbol();
  return defaultText(measurement.value()) + (unit.empty() ? "" : " " + unit);
}

std::string againstLimitText(const QZMeasuredResult& result, const std::string& limit) {
  return formatMessage("%@ is %@, limit %@", result.name(), valueText(result.measurement()), limit);
}

std::string errorText(const DiagnosticErrorPtr& error, std::string_view indent) {
  std::string text;
  std::string_view link;
  for (DiagnosticErrorPtr one = error; one != nullptr; one = one->underlyingError()) {
    text += indent;
    text += link;
    text += printable(formatMessage("%@ code %@: %@", one->domain(), one->code(), one->localizedDescription()));
    text += '\n';
    link = "caused by ";
  }
  return text;
}

void printAuxiliaryTexts(std::ostream& out, const DiagnosticRecord& record) {
  for (const auto& [name, value] : record.auxiliaryData) {
    const std::string* const text = value.string();
    if (text == nullptr) continue;
    printWrapped(out, shortened(printable(formatMessage("%@: %@", name, *text)), kMaxAuxiliaryText), "  ", "    ");
  }
}

std::string_view errorStageText(const DiagnosticRecord& record) {
  if (record.error == nullptr) return {};
  if (record.errorStage) return nameOf(*record.errorStage);
  if (isHostError(record.error, HostErrorCode::kNotRecorded)) return "record";
  return isHostError(record.error, HostErrorCode::kInterrupted) ? std::string_view() : nameOf(Stage::kAnalyze);
}

void printResults(std::ostream& out, const DiagnosticRecord& record, ResultRows rows, bool colour) {
  const std::vector<LimitCheck> checks = limitChecksOf(record);
  ResultTable table(rows == ResultRows::kAll && !checks.empty(), colour);
  for (std::size_t i = 0; i < record.measuredResults.size(); ++i) {
    const JudgedResult& one = record.measuredResults[i];
    const bool isNoteworthy = one.verdict == ResultVerdict::kFail || one.verdict == ResultVerdict::kError;
    if (rows == ResultRows::kAll || isNoteworthy) table.add(one);
    for (const LimitCheck& check : checksOfResult(checks, i)) table.add(check);
  }
  table.print(out);
}

std::string verdictText(const DiagnosticRecord& record, bool colour) {
  const std::string word(wordOf(record));
  return colour ? std::string(colourOf(record.verdict)) + word + std::string(kPlain) : word;
}

std::string flakyColumn(bool colour) {
  return colour ? std::string(kYellow) + "FLAKY" + std::string(kPlain) + " " : "FLAKY ";
}

std::string verdictColumn(const DiagnosticRecord& record, bool colour) {
  return verdictText(record, colour) + std::string(std::string_view("ERROR ").size() - wordOf(record).size(), ' ');
}

void printRecord(std::ostream& out, const DiagnosticRecord& record, bool colour) {
  out << printable(record.name) << '\n' << indentedLines(record.summary, "  ");
  printAuxiliaryTexts(out, record);
  if (!record.measuredResults.empty()) {
    out << '\n';
    printResults(out, record, ResultRows::kAll, colour);
  }
  out << "\n  " << verdictText(record, colour) << '\n';
  if (const std::string trial = trialTextWithSeed(record); !trial.empty()) out << "    " << trial << '\n';
  if (record.verdict == Verdict::kError) out << errorText(record.error, "    ");
  if (record.skip) out << "    " << printable(textOf(*record.skip)) << '\n';
  out << '\n';
}

void printVerdict(std::ostream& out, const DiagnosticRecord& record, bool colour, const std::string& more,
                  std::size_t nameWidth) {
  const std::string name = printable(record.name);
  out << verdictColumn(record, colour) << name;
  if (!more.empty()) out << std::string(nameWidth > widthOf(name) ? nameWidth - widthOf(name) : 0, ' ') << "  " << more;
  out << '\n';
}

void printSummary(std::ostream& out, const std::vector<DiagnosticRecord>& records, std::size_t notReached) {
  VerdictCounts counts = verdictCountsOf(records);
  const auto limits = static_cast<std::size_t>(std::count_if(records.begin(), records.end(), isOfLimit));
  counts.errors -= limits;  // they are no diagnostics
  const bool isRepeated =
      std::any_of(records.begin(), records.end(), [](const DiagnosticRecord& one) { return one.trial.repetition > 0; });
  out << countText(counts.all(), isRepeated ? "run" : "diagnostic") << ": " << count(counts.passed, "passed") << ", "
      << count(counts.failed, "failed") << ", " << count(counts.errors, "ended in an error");
  if (counts.skipped > 0) out << ", " << count(counts.skipped, "skipped");
  if (counts.flaky > 0) out << ", " << count(counts.flaky, "flaky");
  if (notReached > 0) out << ", " << count(notReached, "not reached");
  if (limits > 0) out << ", " << countText(limits, "limit") << " without a result";
  if (const std::size_t warnings = warningsOf(records); warnings > 0) {
    out << ", " << countText(warnings, "warning");
  }
  out << '\n';
}

void printUnfiredFaults(std::ostream& out, const DiagnosticRecord& record) {
  for (const DeclaredFault& fault : record.faults) {
    if (fault.fired > 0) continue;
    out << "quazor: " << printable(record.name) << ": a fault of the simulated phone never fired: "
        << fault.fault.dump(-1, ' ', true, nlohmann::ordered_json::error_handler_t::replace) << '\n';
  }
}

void printList(std::ostream& out, const std::vector<DescribedDiagnostic>& diagnostics) {
  Table ofDiagnostics({Table::Align::kLeft, Table::Align::kLeft});
  Table ofExperiments({Table::Align::kLeft, Table::Align::kLeft});
  bool hasDiagnostics = false;
  bool hasExperiments = false;
  for (const DescribedDiagnostic& one : diagnostics) {
    const bool alone = one.diagnostic.experimentOnly;
    (alone ? hasExperiments : hasDiagnostics) = true;
    (alone ? ofExperiments : ofDiagnostics).addRow({printable(one.diagnostic.name), listedSummary(one)});
  }
  ofDiagnostics.print(out, "");
  if (!hasExperiments) return;
  if (hasDiagnostics) out << '\n';
  out << "Experiments that no diagnostic uses (run one with 'quazor experiment NAME'):\n";
  ofExperiments.print(out, "  ");
}

void printDescriptions(std::ostream& out, const std::vector<ResolvedDiagnostic>& diagnostics) {
  std::string_view separator;
  for (const auto& [described, parameters] : diagnostics) {
    const auto& [diagnostic, description] = described;
    out << separator << printable(diagnostic.name) << '\n' << indentedLines(headline(diagnostic), "  ");
    separator = "\n";
    if (description.error != nullptr) {
      out << "\n  It could not be described.\n" << errorText(description.error, "    ");
      continue;
    }
    printHalf(out, "Experiment", diagnostic.experimentName, description.experiment, parameters.experiment);
    if (diagnostic.experimentOnly) continue;
    printHalf(out, "Analysis", diagnostic.analysisName, description.analysis, parameters.analysis);
  }
}

}  // namespace quazor
