#include "host/command/selftest.h"

#include "base/text/letter_case.h"
#include "base/text/name_list.h"
#include "contract/message_format.h"
#include "contract/ordered_map.h"
#include "host/error/host_error.h"
#include "host/report/sample_images.h"
#include "host/text/table.h"

#include <algorithm>
#include <cstddef>
#include <string_view>

namespace quazor {

using Json = nlohmann::ordered_json;

namespace {

std::string errorText(const std::optional<ExpectedError>& error) {
  return error ? formatMessage("%@ code %@: %@", error->domain, error->code, error->message) : std::string("no error");
}

std::optional<ExpectedError> partsOf(const DiagnosticErrorPtr& error) {
  if (error == nullptr) return std::nullopt;
  return ExpectedError{error->domain(), error->code(), error->localizedDescription()};
}

std::string namesText(const std::vector<std::string>& names) { return names.empty() ? "none" : listText(names); }

std::vector<std::string> failedResultsOf(const DiagnosticRecord& record) {
  std::vector<std::string> names;
  for (const auto& [result, verdict, ignored] : record.measuredResults) {
    if (verdict == ResultVerdict::kFail) names.push_back(result.name());
  }
  return names;
}

std::size_t imagesIn(const DiagnosticRecord& record) {
  const Value* const images = record.auxiliaryData.find("images");
  return images == nullptr || images->array() == nullptr ? 0 : images->array()->size();
}

// A part of the outcome: expected and actual.
struct Comparison {
  std::string_view what;
  std::string expected;
  std::string outcome;
};

// The counts of one diagnostic in the summary table.
struct Counts {
  std::size_t faulty = 0;
  std::size_t byDefault = 0;  // detected with every seed
  std::optional<std::size_t> byStrict;
  std::size_t healthy = 0;
  std::size_t falseAlarms = 0;
  std::size_t invalid = 0;
};

// For each phone whose own file says nothing of a run that did not pass: what to add to the file.
void printNotSaid(std::ostream& out, const std::vector<SelftestRow>& rows,
                  const std::vector<SelftestVerdict>& verdicts) {
  OrderedMap<Json> entries;
  for (std::size_t i = 0; i < rows.size(); ++i) {
    if (verdicts[i] != SelftestVerdict::kNotSaid) continue;
    const SelftestRow& row = rows[i];
    if (!entries.contains(row.scenario)) entries.set(row.scenario, Json::object());
    (*entries.find(row.scenario))[row.expected.key] = row.outcome;
  }
  for (const auto& [phone, expect] : entries) {
    printWrapped(out, phone + " does not say what these runs must find. If it is meant to have this fault, add to it:",
                 "\n  ", "  ");
    std::string_view before = "    \"expect\": {\n";
    for (const auto& [key, outcome] : expect.items()) {
      out << before << "      " << Json(key).dump() << ": " << outcome.dump();
      before = ",\n";
    }
    out << "\n    }\n";
  }
}

OrderedMap<Counts> countsOf(const std::vector<SelftestRow>& rows, const std::vector<SelftestVerdict>& verdicts) {
  OrderedMap<Counts> all;
  for (std::size_t i = 0; i < rows.size(); ++i) {
    const std::string& name = rows[i].expected.name;
    if (!all.contains(name)) all.set(name, {});
    Counts& counts = *all.find(name);
    const SelftestRow& row = rows[i];
    const bool isFault = row.concernsFault && verdicts[i] != SelftestVerdict::kFalseAlarm;
    ++(isFault ? counts.faulty : counts.healthy);
    if (isFault && row.runs > 0 && row.foundByDefault == row.runs) ++counts.byDefault;
    if (row.foundByStrict) {
      counts.byStrict = counts.byStrict.value_or(0) + (isFault && *row.foundByStrict == row.runs ? 1 : 0);
    }
    if (verdicts[i] == SelftestVerdict::kFalseAlarm) ++counts.falseAlarms;
    if (verdicts[i] == SelftestVerdict::kInvalid) ++counts.invalid;
  }
  return all;
}

}  // namespace

std::string_view nameOf(SelftestVerdict verdict) {
  switch (verdict) {
    case SelftestVerdict::kPassed: return "passed";
    case SelftestVerdict::kDetected: return "detected";
    case SelftestVerdict::kMissed: return "MISSED";
    case SelftestVerdict::kFalseAlarm: return "FALSE ALARM";
    case SelftestVerdict::kNotSaid: return "NOT SAID";
    case SelftestVerdict::kDifferent: return "DIFFERENT";
    case SelftestVerdict::kInvalid: break;
  }
  return "INVALID";
}

std::string differenceOf(const ExpectedOutcome& expected, const DiagnosticRecord& record) {
  // The host's own error for a run that reported none says nothing about the phone.
  const bool hostsWord = isHostError(record.error) && !expected.error;
  const DiagnosticErrorPtr error = hostsWord ? nullptr : record.error;
  std::vector<Comparison> comparisons = {
      {"the verdict", expected.verdict, std::string(nameOf(record.verdict))},
      {"the failed results", namesText(expected.failedResults), namesText(failedResultsOf(record))}};
  if (!expected.mayBeAnyError) {
    comparisons.insert(comparisons.begin() + 1, {"the error", errorText(expected.error), errorText(partsOf(error))});
  }
  if (expected.underlying) {
    const DiagnosticErrorPtr underlying = error == nullptr ? nullptr : error->underlyingError();
    comparisons.push_back({"the underlying error", errorText(expected.underlying), errorText(partsOf(underlying))});
  }
  if (expected.images) {
    comparisons.push_back({"the images", std::to_string(*expected.images), std::to_string(imagesIn(record))});
  }
  for (const auto& [what, wanted, outcome] : comparisons) {
    if (wanted != outcome) return formatMessage("%@: expected %@, got %@", what, wanted, outcome);
  }
  return {};
}

Json expectationOf(const ExpectedOutcome& expected, const DiagnosticRecord& record) {
  Json outcome = Json::object();
  if (expected.experimentOnly) {
    outcome["experiment"] = expected.name;
    for (const auto& [name, value] : expected.parameters) outcome["parameters"][name] = value;
  }
  outcome["verdict"] = nameOf(record.verdict);
  if (const std::optional<ExpectedError> error = partsOf(record.error)) {
    outcome["error"] = {{"domain", error->domain}, {"code", error->code}, {"message", error->message}};
  }
  if (record.verdict == Verdict::kFail) outcome["failedResults"] = failedResultsOf(record);
  return outcome;
}

std::vector<SelftestVerdict> verdictsOf(const std::vector<SelftestRow>& rows) {
  OrderedMap<std::vector<std::uint64_t>> fired;
  for (const SelftestRow& row : rows) {
    if (!fired.contains(row.scenario)) fired.set(row.scenario, {});
    std::vector<std::uint64_t>& counts = *fired.find(row.scenario);
    counts.resize(std::max(counts.size(), row.faultsFired.size()));
    for (std::size_t i = 0; i < row.faultsFired.size(); ++i) counts[i] += row.faultsFired[i];
  }
  std::vector<SelftestVerdict> verdicts;
  for (const SelftestRow& row : rows) {
    const std::vector<std::uint64_t>& counts = *fired.find(row.scenario);
    const bool healthy = row.expected.mustPass();
    if (row.runs == 0 || std::find(counts.begin(), counts.end(), 0U) != counts.end()) {
      verdicts.push_back(SelftestVerdict::kInvalid);
    } else if (!healthy && row.passes > 0) {
      verdicts.push_back(SelftestVerdict::kMissed);
    } else if (healthy && row.passes < row.runs) {
      verdicts.push_back(row.isInherited ? SelftestVerdict::kNotSaid : SelftestVerdict::kFalseAlarm);
    } else if (row.asExpected < row.runs) {
      verdicts.push_back(SelftestVerdict::kDifferent);
    } else {
      verdicts.push_back(healthy ? SelftestVerdict::kPassed : SelftestVerdict::kDetected);
    }
  }
  return verdicts;
}

bool allPassed(const std::vector<SelftestVerdict>& verdicts) {
  return std::all_of(verdicts.begin(), verdicts.end(), [](SelftestVerdict one) {
    return one == SelftestVerdict::kPassed || one == SelftestVerdict::kDetected;
  });
}

void printSelftest(std::ostream& out, const SelftestOutcome& outcome) {
  using Align = Table::Align;
  const std::vector<SelftestRow>& rows = outcome.rows;
  const std::vector<SelftestVerdict> verdicts = verdictsOf(rows);
  printDetections(out, outcome.phones);
  out << '\n';
  Table others({Align::kLeft, Align::kLeft, Align::kLeft, Align::kRight, Align::kLeft});
  others.addHeader({"Phone", "Run", "Expected", "As expected", "Outcome"});
  std::size_t differing = 0;
  for (std::size_t i = 0; i < rows.size(); ++i) {
    if (allPassed({verdicts[i]})) continue;
    ++differing;
    const SelftestRow& row = rows[i];
    const bool isNotSaid = verdicts[i] == SelftestVerdict::kNotSaid;
    others.addRow({printable(row.scenario), printable(row.expected.name),
                   isNotSaid ? "nothing; its base: pass" : row.expected.verdict,
                   formatMessage("%@ of %@", row.asExpected, row.runs), std::string(nameOf(verdicts[i]))});
  }
  if (differing > 0) {
    out << "Not as the phone expects:\n";
    others.print(out, "  ");
    for (const SelftestRow& row : rows) {
      if (row.difference.empty()) continue;
      out << "  " << printable(row.scenario) << ", " << printable(row.expected.name) << ": "
          << printable(row.difference) << '\n';
    }
    printNotSaid(out, rows, verdicts);
    out << '\n';
  }
  Table matrix({Align::kLeft, Align::kRight, Align::kRight, Align::kRight, Align::kRight, Align::kRight, Align::kRight,
                Align::kRight});
  matrix.addHeader(
      {"Run", "Faults", "By default", "Not detected", "By strict", "Not detected", "False alarms", "Invalid"});
  for (const auto& [name, counts] : countsOf(rows, verdicts)) {
    const std::optional<std::size_t>& strict = counts.byStrict;
    matrix.addRow({printable(name), std::to_string(counts.faulty), std::to_string(counts.byDefault),
                   std::to_string(counts.faulty - counts.byDefault), strict ? std::to_string(*strict) : "-",
                   strict ? std::to_string(counts.faulty - *strict) : "-",
                   formatMessage("%@ of %@", counts.falseAlarms, counts.healthy), std::to_string(counts.invalid)});
  }
  matrix.print(out, "");
  const DetectionTotals totals = totalsOf(outcome.phones);
  const std::string changed =
      totals.changed == 0 ? "" : formatMessage("%@ with a change that must pass, ", totals.changed);
  out << formatMessage("\nPhones: %@ with a fault, %@%@ healthy; runs: %@, seeds of each: %@\n", totals.faulty, changed,
                       totals.healthy, rows.size(), outcome.seeds);
  printTotals(out, totals);
  for (const UnusedLimit& one : outcome.unusedLimits)
    printWrapped(out, "By " + one.profile + ": " + one.problem, "", "  ");
  if (differing == 0) {
    out << "Every run ended as its phone expects.\n";
  } else {
    out << formatMessage("NOT as the phone expects: %@ of %@ runs\n", differing, rows.size());
  }
  for (const RefusedPhone& one : outcome.notJudged)
    printWrapped(out, "Not judged: " + one.name + ": " + one.reason, "", "  ");
  if (!outcome.refused.empty()) {
    const std::size_t refused = outcome.refused.size();
    out << formatMessage("Refused: %@ of %@ phones\n", refused, outcome.wanted + refused);
  }
  if (!outcome.isComplete()) {
    out << formatMessage("Interrupted: %@ of %@ phones were run.\n", outcome.phones.size(), outcome.wanted);
  }
}

Json selftestDocument(const SelftestOutcome& outcome) {
  const std::vector<SelftestRow>& rows = outcome.rows;
  const std::vector<SelftestVerdict> verdicts = verdictsOf(rows);
  Json json = Json::array();
  for (std::size_t i = 0; i < rows.size(); ++i) {
    const SelftestRow& row = rows[i];
    json.push_back({{"phone", row.scenario},
                    {"name", row.expected.name},
                    {"expected", row.expected.verdict},
                    {"inherited", row.isInherited},
                    {"concernsFault", row.concernsFault},
                    {"foundByDefault", row.foundByDefault},
                    {"foundByStrict", row.foundByStrict ? Json(*row.foundByStrict) : Json()},
                    {"runs", row.runs},
                    {"asExpected", row.asExpected},
                    {"outcome", withSmallLetters(nameOf(verdicts[i]))},
                    {"difference", row.difference.empty() ? Json() : Json(row.difference)},
                    {"faultsFired", row.faultsFired}});
  }
  Json refused = Json::array();
  for (const RefusedPhone& one : outcome.refused) refused.push_back({{"phone", one.name}, {"reason", one.reason}});
  Json notJudged = Json::array();
  for (const RefusedPhone& one : outcome.notJudged) notJudged.push_back({{"phone", one.name}, {"reason", one.reason}});
  Json unusedLimits = Json::array();
  for (const UnusedLimit& one : outcome.unusedLimits) {
    unusedLimits.push_back({{"profile", one.profile}, {"problem", one.problem}});
  }
  return {{"schema", 1},
          {"seeds", outcome.seeds},
          {"allAsExpected", allPassed(verdicts)},
          {"interrupted", !outcome.isComplete()},
          {"phonesWanted", outcome.wanted},
          {"totals", totalsJson(totalsOf(outcome.phones))},
          {"phones", detectionsJson(outcome.phones)},
          {"refused", std::move(refused)},
          {"notJudged", std::move(notJudged)},
          {"unusedLimits", std::move(unusedLimits)},
          {"rows", std::move(json)}};
}

}  // namespace quazor
