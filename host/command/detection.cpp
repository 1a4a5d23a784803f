#include "host/command/detection.h"

#include "base/text/name_list.h"
#include "contract/message_format.h"
#include "host/model/limit_check.h"
#include "host/report/text_report.h"
#include "host/text/table.h"

#include <algorithm>
#include <string_view>

namespace quazor {

using Json = nlohmann::ordered_json;

namespace {

constexpr std::size_t kMaxReasons = 3;  // of one run

const JudgedResult* resultNamed(const DiagnosticRecord& record, const std::string& name) {
  const auto found = std::find_if(record.measuredResults.begin(), record.measuredResults.end(),
                                  [&name](const JudgedResult& one) { return one.result.name() == name; });
  return found == record.measuredResults.end() ? nullptr : &*found;
}

// Why a result that differs from that of the healthy phone does not fail. `checks` compare it with the user's limits.
std::string whyItPasses(const JudgedResult& before, const JudgedResult& after, const std::vector<LimitCheck>& checks) {
  std::vector<std::string> reasons;
  if (after.verdict != ResultVerdict::kNone) {
    const std::string limit = limitText(after.result.limit());
    const bool isSame = limitText(before.result.limit()) == limit;
    reasons.push_back((isSame ? "it is within its limit (" : "its limit changes with it (") + limit + ")");
  }
  for (const LimitCheck& check : checks) {
    reasons.push_back((check.passed ? "it is within the limit " : "this limit only warns: ") + labelOf(check.limit));
  }
  if (reasons.empty()) return "it has no limit";
  std::string text = reasons.front();
  for (std::size_t i = 1; i < reasons.size(); ++i) text += ", and " + reasons[i];
  return text;
}

void addResults(std::vector<std::string>& changes, const DiagnosticRecord& healthy, const DiagnosticRecord& record) {
  const std::vector<LimitCheck> checks = limitChecksOf(record);
  for (std::size_t i = 0; i < record.measuredResults.size(); ++i) {
    const JudgedResult& one = record.measuredResults[i];
    const std::vector<LimitCheck> own = checksOfResult(checks, i);
    const std::string& name = one.result.name();
    const JudgedResult* const before = resultNamed(healthy, name);
    if (before == nullptr) {
      changes.push_back(name + " is new, and " + whyItPasses(one, one, own));
      continue;
    }
    const std::string now = valueText(one.result.measurement());
    const std::string then = valueText(before->result.measurement());
    if (now == then) continue;
    changes.push_back(formatMessage("%@ is %@ instead of %@: %@", name, now, then, whyItPasses(*before, one, own)));
  }
  for (const JudgedResult& one : healthy.measuredResults) {
    if (resultNamed(record, one.result.name()) == nullptr) {
      changes.push_back(one.result.name() + " is missing, and nothing requires it");
    }
  }
}

void addMeasurements(std::vector<std::string>& changes, const DiagnosticRecord& healthy,
                     const DiagnosticRecord& record) {
  const std::string_view why =
      record.experimentOnly ? "an experiment on its own is not judged" : "no result is made of it";
  for (const auto& [name, measurement] : record.measurements) {
    const Measurement* const before = healthy.measurements.find(name);
    const std::string now = valueText(measurement);
    const std::string then = before == nullptr ? "nothing" : valueText(*before);
    if (now != then)
      changes.push_back(formatMessage("the measurement %@ is %@ instead of %@: %@", name, now, then, why));
  }
  for (const auto& [name, measurement] : healthy.measurements) {
    if (record.measurements.find(name) == nullptr) {
      changes.push_back(formatMessage("the measurement %@ is missing: %@", name, why));
    }
  }
}

void addAuxiliaryData(std::vector<std::string>& changes, const DiagnosticRecord& healthy,
                      const DiagnosticRecord& record) {
  const std::string_view why =
      record.experimentOnly ? "an experiment on its own is not judged" : "auxiliary data are not judged";
  for (const auto& [name, value] : record.auxiliaryData) {
    const Value* const before = healthy.auxiliaryData.find(name);
    if (before == nullptr || defaultText(*before) != defaultText(value)) {
      changes.push_back(formatMessage("the auxiliary data '%@' differ: %@", name, why));
    }
  }
  for (const auto& [name, value] : healthy.auxiliaryData) {
    if (record.auxiliaryData.find(name) == nullptr) {
      changes.push_back(formatMessage("the auxiliary data '%@' are missing: %@", name, why));
    }
  }
}

void addLog(std::vector<std::string>& changes, const DiagnosticRecord& healthy, const DiagnosticRecord& record) {
  for (const LogLine& line : record.log) {
    const bool isKnown = std::any_of(healthy.log.begin(), healthy.log.end(),
                                     [&line](const LogLine& other) { return other.text == line.text; });
    if (!isKnown) changes.push_back("a log line is new, and log lines are not judged: " + line.text);
  }
}

std::string detectionText(PhoneKind kind, const Detection& detection) {
  if (kind != PhoneKind::kFaulty) return detection.found == 0 ? "passed" : "FALSE ALARM";
  if (detection.found == 0) return "not detected";
  if (detection.isComplete()) return "detected";
  return formatMessage("in %@ of %@ seeds", detection.found, detection.seeds);
}

std::string strictText(const PhoneDetection& one) {
  return one.byStrict ? detectionText(one.kind, *one.byStrict) : "not installed";
}

std::string_view expectationText(const PhoneDetection& one) {
  if (one.kind != PhoneKind::kFaulty) return "passed";
  if (one.saysNothing && !one.isExpected && one.byDefault.found > 0) return "nothing said";
  return one.isExpected ? "detected" : "not detected";
}

void printReasons(std::ostream& out, const std::string& heading, const std::vector<std::string>& reasons) {
  printWrapped(out, heading, "    ", "      ");
  for (const std::string& reason : reasons) printWrapped(out, reason, "    - ", "      ");
}

void printPhone(std::ostream& out, const PhoneDetection& one) {
  out << '\n';
  const bool isAsExpected = one.kind == PhoneKind::kFaulty && !one.isExpected && one.byDefault.found == 0;
  printWrapped(out, one.phone + (isAsExpected ? " (by default as its file expects)" : ""), "  ", "    ");
  if (!one.title.empty()) printWrapped(out, one.title, "    ", "    ");
  const std::string byDefault = detectionText(one.kind, one.byDefault);
  const bool isSame = one.byStrict && strictText(one) == byDefault && one.byStrict->reasons == one.byDefault.reasons;
  printReasons(out, (isSame ? "By default and by strict: " : "By default: ") + byDefault, one.byDefault.reasons);
  if (one.byStrict && !isSame) printReasons(out, "By strict: " + strictText(one), one.byStrict->reasons);
}

bool isIncomplete(const Detection& detection) { return !detection.isComplete(); }

bool hasFound(const Detection& detection) { return detection.found > 0; }

// True if the predicate holds for a profile.
bool holdsForAny(const PhoneDetection& one, bool (*predicate)(const Detection&)) {
  return predicate(one.byDefault) || (one.byStrict && predicate(*one.byStrict));
}

bool isBlindSpot(const PhoneDetection& one) { return one.kind == PhoneKind::kFaulty && holdsForAny(one, isIncomplete); }

bool isFalseAlarm(const PhoneDetection& one) { return one.kind != PhoneKind::kFaulty && holdsForAny(one, hasFound); }

bool isPassedChange(const PhoneDetection& one) {
  return one.kind == PhoneKind::kChanged && !holdsForAny(one, hasFound);
}

void printThose(std::ostream& out, const std::vector<PhoneDetection>& phones, bool (*isMeant)(const PhoneDetection&),
                std::string_view heading) {
  for (const PhoneDetection& one : phones) {
    if (!isMeant(one)) continue;
    out << heading;
    heading = "";
    printPhone(out, one);
  }
}

void count(ProfileTotals& totals, PhoneKind kind, const Detection& detection) {
  if (kind == PhoneKind::kFaulty) {
    ++(detection.isComplete() ? totals.detected : totals.blindSpots);
  } else if (detection.found > 0) {
    ++totals.falseAlarms;
  } else if (kind == PhoneKind::kChanged) {
    ++totals.changesPassed;
  }
}

std::string countsText(std::string_view by, const DetectionTotals& all, const ProfileTotals& totals) {
  std::string text =
      formatMessage("By %@: %@ of %@ detected, %@, %@", by, totals.detected, countText(all.faulty, "fault"),
                    countText(totals.blindSpots, "blind spot"), countText(totals.falseAlarms, "false alarm"));
  if (all.changed > 0)
    text += formatMessage(", %@ of %@ passed", totals.changesPassed, countText(all.changed, "change"));
  return text + "\n";
}

Json detectionJson(const Detection& detection) {
  return {{"seeds", detection.seeds}, {"detected", detection.found}, {"reasons", detection.reasons}};
}

std::string_view nameOf(PhoneKind kind) {
  switch (kind) {
    case PhoneKind::kHealthy: return "healthy";
    case PhoneKind::kFaulty: return "faulty";
    case PhoneKind::kChanged: break;
  }
  return "changed";
}

Json totalsOfProfileJson(const ProfileTotals& totals) {
  return {{"detected", totals.detected},
          {"blindSpots", totals.blindSpots},
          {"falseAlarms", totals.falseAlarms},
          {"changesPassed", totals.changesPassed}};
}

}  // namespace

DetectionTotals totalsOf(const std::vector<PhoneDetection>& phones) {
  DetectionTotals totals;
  for (const PhoneDetection& one : phones) {
    switch (one.kind) {
      case PhoneKind::kFaulty: ++totals.faulty; break;
      case PhoneKind::kChanged: ++totals.changed; break;
      case PhoneKind::kHealthy: ++totals.healthy; break;
    }
    count(totals.byDefault, one.kind, one.byDefault);
    if (!one.byStrict) continue;
    if (!totals.byStrict) totals.byStrict.emplace();
    count(*totals.byStrict, one.kind, *one.byStrict);
  }
  return totals;
}

std::vector<std::string> undetectedChanges(const DiagnosticRecord& healthy, const DiagnosticRecord& record) {
  std::vector<std::string> changes;
  addResults(changes, healthy, record);
  // Results are made of measurements: those only count where no result shows the change.
  if (changes.empty()) addMeasurements(changes, healthy, record);
  if (changes.empty()) addAuxiliaryData(changes, healthy, record);
  if (changes.empty()) addLog(changes, healthy, record);
  if (changes.size() > kMaxReasons) {
    const std::size_t more = changes.size() - kMaxReasons;
    changes.resize(kMaxReasons);
    changes.push_back(formatMessage("and %@ more", more));
  }
  for (std::string& change : changes) change.insert(0, record.name + ": ");
  return changes;
}

std::string alarmText(const DiagnosticRecord& record) {
  if (record.verdict == Verdict::kError) {
    return record.name + " ends in an error: " + record.error->localizedDescription();
  }
  std::vector<std::string> failed;
  for (const JudgedResult& one : record.measuredResults) {
    if (one.verdict == ResultVerdict::kFail) failed.push_back(one.result.name());
  }
  for (const LimitCheck& check : limitChecksOf(record)) {
    if (check.verdict() != ResultVerdict::kPass)
      failed.push_back(check.result.name() + " by the limit " + labelOf(check.limit));
  }
  return record.name + " fails: " + listText(failed, kMaxReasons);
}

void printDetections(std::ostream& out, const std::vector<PhoneDetection>& phones) {
  using Align = Table::Align;
  Table table({Align::kLeft, Align::kLeft, Align::kLeft, Align::kLeft});
  table.addHeader({"Phone", "Expected", "By default", "By strict"});
  for (const PhoneDetection& one : phones) {
    table.addRow({printable(one.phone), std::string(expectationText(one)), detectionText(one.kind, one.byDefault),
                  strictText(one)});
  }
  table.print(out, "");
  printThose(out, phones, isBlindSpot, "\nNot detected, and why:\n");
  printThose(out, phones, isFalseAlarm, "\nFalse alarms:\n");
  printThose(out, phones, isPassedChange, "\nPassed as the phone expects, and what differs:\n");
}

void printTotals(std::ostream& out, const DetectionTotals& totals) {
  out << countsText("default", totals, totals.byDefault);
  if (totals.byStrict) out << countsText("strict", totals, *totals.byStrict);
}

Json detectionsJson(const std::vector<PhoneDetection>& phones) {
  Json json = Json::array();
  for (const PhoneDetection& one : phones) {
    json.push_back({{"phone", one.phone},
                    {"title", one.title},
                    {"kind", nameOf(one.kind)},
                    {"expectsDetection", one.isExpected},
                    {"saysNothing", one.saysNothing},
                    {"default", detectionJson(one.byDefault)},
                    {"strict", one.byStrict ? detectionJson(*one.byStrict) : Json()}});
  }
  return json;
}

Json totalsJson(const DetectionTotals& totals) {
  return {{"faulty", totals.faulty},
          {"changed", totals.changed},
          {"healthy", totals.healthy},
          {"default", totalsOfProfileJson(totals.byDefault)},
          {"strict", totals.byStrict ? totalsOfProfileJson(*totals.byStrict) : Json()}};
}

}  // namespace quazor
