#include "host/report/variation_report.h"

#include "contract/message_format.h"
#include "host/model/limit_check.h"
#include "host/model/trials.h"
#include "host/model/variation.h"
#include "host/record/value_json.h"
#include "host/report/json_report.h"
#include "host/report/text_report.h"
#include "host/text/number_text.h"
#include "host/text/table.h"

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <functional>
#include <string_view>
#include <utility>
#include <variant>

namespace quazor {

using Json = nlohmann::ordered_json;

namespace {

std::string numberOf(std::string_view what, std::uint64_t number, std::uint64_t most) {
  return most == 0 ? formatMessage("%@ %@", what, number) : formatMessage("%@ %@ of %@", what, number, most);
}

std::string countsText(const VerdictCounts& counts, bool ofExperiment) {
  const std::pair<std::size_t, std::string_view> parts[] = {
      {counts.passed, ofExperiment ? "returned a result" : "passed"},
      {counts.flaky, "flaky"},
      {counts.failed, "failed"},
      {counts.errors, "ended in an error"},
      {counts.skipped, "skipped"}};
  std::string text;
  for (const auto& [number, what] : parts) {
    if (number > 0) text += formatMessage("%@%@ %@", text.empty() ? "" : ", ", number, what);
  }
  return text;
}

Json countsJson(const VerdictCounts& counts) {
  return {{"pass", counts.passed},
          {"flaky", counts.flaky},
          {"fail", counts.failed},
          {"error", counts.errors},
          {"skip", counts.skipped}};
}

Json repetitionJson(std::uint64_t repetition) { return repetition == 0 ? Json() : Json(repetition); }

std::string repetitionText(std::uint64_t repetition) { return repetition == 0 ? "-" : std::to_string(repetition); }

// The rule for a number of the result: rounded for people, but on the same side of its limits. What a limit compares
// with another result is shown whole.
std::function<std::string(double)> numberTextOf(const VaryingResult& one, bool whole) {
  std::vector<double> thresholds;
  addBounds(one.limit, thresholds);
  for (const UserLimit& limit : one.userLimits) {
    const LimitCheck check{limit,
                           QZMeasuredResult(one.name, Measurement(one.median, QZUnit::unitWithSymbol(one.unit)))};
    whole = whole || std::holds_alternative<RelationCondition>(limit.condition);
    addBounds(boundsOf(check), thresholds);
  }
  if (whole) return [](double value) { return defaultText(value); };
  return [thresholds = std::move(thresholds)](double value) { return shownNumber(value, thresholds); };
}

void printVarying(std::ostream& out, const std::vector<VaryingResult>& results, bool whole) {
  using Align = Table::Align;
  Table table({Align::kLeft, Align::kRight, Align::kRight, Align::kRight, Align::kRight, Align::kRight, Align::kRight,
               Align::kRight, Align::kRight, Align::kLeft, Align::kLeft});
  table.addHeader({"Result", "Count", "Minimum", "#", "Median", "Maximum", "#", "Outlier", "Seed", "Unit", "Limit"});
  for (const VaryingResult& one : results) {
    const auto addRow = [&table, &one, text = numberTextOf(one, whole)](const std::string& limit) {
      table.addRow({printable(one.name), std::to_string(one.values), text(one.minimum),
                    repetitionText(one.minimumRepetition), text(one.median), text(one.maximum),
                    repetitionText(one.maximumRepetition), repetitionText(one.outlierRepetition),
                    one.outlierRepetition == 0 ? "-" : std::to_string(one.outlierSeed), printable(one.unit), limit});
    };
    addRow(limitText(one.limit));
    for (const UserLimit& limit : one.userLimits) addRow(printable(labelOf(limit)));
  }
  table.print(out, "  ");
}

}  // namespace

std::string trialText(const DiagnosticRecord& record) {
  const auto& [attempt, attempts, repetition, repetitions] = record.trial;
  std::string text;
  if (repetition > 0) text = numberOf("repetition", repetition, repetitions);
  const bool passed = record.verdict == Verdict::kPass;
  if (attempt == 0 || (attempt == 1 && record.verdict != Verdict::kError)) return text;
  if (!text.empty()) text += ", ";
  return text + (passed ? "pass in " : "") + numberOf("attempt", attempt, attempts);
}

std::string trialTextWithSeed(const DiagnosticRecord& record) {
  const std::string text = trialText(record);
  const bool isNoted = record.verdict == Verdict::kFail || record.verdict == Verdict::kError;
  return record.trial.repetition > 0 && isNoted ? formatMessage("%@, seed %@", text, record.seed) : text;
}

bool isOnlyCounted(const DiagnosticRecord& record) {
  if (record.trial.repetition == 0 || record.experimentOnly) return false;
  if (record.skip) return true;
  const std::vector<LimitCheck> checks = limitChecksOf(record);
  const bool isWarned = std::any_of(checks.begin(), checks.end(), [](const LimitCheck& one) { return !one.passed; });
  return record.verdict == Verdict::kPass && !isFlaky(record) && !isWarned;
}

void printRepetitionEnd(std::ostream& out, const std::vector<DiagnosticRecord>& records, std::size_t end) {
  if (end == 0 || records[end - 1].experimentOnly) return;
  const Trial& last = records[end - 1].trial;
  if (last.repetition == 0 || (end < records.size() && records[end].trial.repetition == last.repetition)) return;
  out << numberOf("Repetition", last.repetition, last.repetitions) << ": "
      << countsText(verdictCountsOf(records, last.repetition), false) << '\n';
}

void printVariation(std::ostream& out, const std::vector<DiagnosticRecord>& records, bool whole) {
  const std::vector<DiagnosticVariation> variations = variationOf(records);
  if (variations.empty()) return;
  const bool ofExperiments = records.back().experimentOnly;
  const bool isAnyVarying = std::any_of(variations.begin(), variations.end(),
                                        [](const DiagnosticVariation& one) { return !one.varying.empty(); });
  out << "What varied between the repetitions"
      << (isAnyVarying ? " (#: the first repetition with that value; Outlier: the one whose rare "
                         "value differs most, and its seed):\n"
                       : ":\n");
  for (const DiagnosticVariation& one : variations) {
    out << printable(one.name) << ": " << countsText(one.verdicts, ofExperiments) << '\n';
    if (!one.varying.empty()) printVarying(out, one.varying, whole);
    const std::size_t all = one.varying.size() + one.constant;
    if (one.constant > 0) {
      const std::string what = ofExperiments ? "measurement" : "result";
      out << "  " << countText(one.constant, one.constant == all ? what : "other " + what) << " never varied\n";
    }
  }
  out << '\n';
}

Json variationJson(const std::vector<DiagnosticRecord>& records) {
  Json json = Json::array();
  for (const DiagnosticVariation& one : variationOf(records)) {
    Json varying = Json::array();
    for (const VaryingResult& result : one.varying) {
      varying.push_back({{"name", result.name},
                         {"unit", result.unit},
                         {"values", result.values},
                         {"minimum", numberJson(result.minimum)},
                         {"median", numberJson(result.median)},
                         {"maximum", numberJson(result.maximum)},
                         {"minimumRepetition", repetitionJson(result.minimumRepetition)},
                         {"maximumRepetition", repetitionJson(result.maximumRepetition)},
                         {"outlierRepetition", repetitionJson(result.outlierRepetition)},
                         {"outlierSeed", result.outlierRepetition == 0 ? Json() : Json(result.outlierSeed)},
                         {"limit", limitJson(result.limit)}});
      for (const UserLimit& limit : result.userLimits) varying.back()["userLimits"].push_back(userLimitJson(limit));
    }
    json.push_back({{"name", one.name},
                    {"verdicts", countsJson(one.verdicts)},
                    {"varying", std::move(varying)},
                    {"constant", one.constant}});
  }
  return json;
}

}  // namespace quazor
