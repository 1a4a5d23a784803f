#include "host/command/detection.h"

#include "contract/message_format.h"
#include "host/report/text_report.h"
#include "host/text/table.h"

#include <algorithm>
#include <string_view>

namespace quazor {

using Json = nlohmann::ordered_json;

namespace {

constexpr std::size_t kMaxReasons = 3;  // of one run

std::string valueText(const Measurement& measurement) {
  return formatMessage("%@ %@", measurement.value(), measurement.unit().symbol());
}

const JudgedResult* resultNamed(const DiagnosticRecord& record, const std::string& name) {
  const auto found = std::find_if(record.measuredResults.begin(), record.measuredResults.end(),
                                  [&name](const JudgedResult& one) { return one.result.name() == name; });
  return found == record.measuredResults.end() ? nullptr : &*found;
}

// Why a result that differs from that of the healthy phone does not fail.
std::string whyItPasses(const JudgedResult& before, const JudgedResult& after) {
  if (after.verdict == ResultVerdict::kNone) return "it has no limit";
  const std::string limit = limitText(after.result.limit());
  if (limitText(before.result.limit()) != limit) return "its limit changes with it (" + limit + ")";
  return "it is within its limit (" + limit + ")";
}

void addResults(std::vector<std::string>& changes, const DiagnosticRecord& healthy, const DiagnosticRecord& record) {
  for (const JudgedResult& one : record.measuredResults) {
    const std::string& name = one.result.name();
    const JudgedResult* const before = resultNamed(healthy, name);
    if (before == nullptr) {
      changes.push_back(name + " is new, and " + whyItPasses(one, one));
      continue;
    }
    const std::string now = valueText(one.result.measurement());
    const std::string then = valueText(before->result.measurement());
    if (now == then) continue;
    changes.push_back(formatMessage("%@ is %@ instead of %@: %@", name, now, then, whyItPasses(*before, one)));
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

std::string detectionText(const Detection& detection, std::string_view ifNothingIsFound) {
  if (detection.found == 0) return std::string(ifNothingIsFound);
  if (detection.isComplete()) return "detected";
  return formatMessage("in %@ of %@ seeds", detection.found, detection.seeds);
}

std::string byDefaultText(const PhoneDetection& one) {
  if (one.kind() == PhoneKind::kFaulty) return detectionText(one.byDefault, "not detected");
  return one.byDefault.found == 0 ? "passed" : "FALSE ALARM";
}

// Limits that are stricter may detect a change that passes otherwise.
std::string strictText(const PhoneDetection& one) {
  if (!one.byStrict) return "not installed";
  switch (one.kind()) {
    case PhoneKind::kFaulty: return detectionText(*one.byStrict, "not detected");
    case PhoneKind::kChanged: return detectionText(*one.byStrict, "passed");
    case PhoneKind::kHealthy: break;
  }
  return one.byStrict->found == 0 ? "passed" : "FALSE ALARM";
}

void printReasons(std::ostream& out, const PhoneDetection& one) {
  out << '\n';
  printWrapped(out, one.phone + " (by strict: " + strictText(one) + ")", "  ", "    ");
  if (!one.title.empty()) printWrapped(out, one.title, "    ", "    ");
  for (const std::string& reason : one.reasons) printWrapped(out, reason, "    - ", "      ");
}

bool isBlindSpot(const PhoneDetection& one) { return one.kind() == PhoneKind::kFaulty && !one.byDefault.isComplete(); }

bool isPassedChange(const PhoneDetection& one) { return one.kind() == PhoneKind::kChanged && one.byDefault.found == 0; }

void printThose(std::ostream& out, const std::vector<PhoneDetection>& phones, bool (*isMeant)(const PhoneDetection&),
                std::string_view heading) {
  for (const PhoneDetection& one : phones) {
    if (!isMeant(one)) continue;
    out << heading;
    heading = "";
    printReasons(out, one);
  }
}

void count(ProfileTotals& totals, PhoneKind kind, const Detection& detection, bool mayDetectChanges) {
  switch (kind) {
    case PhoneKind::kFaulty: ++(detection.isComplete() ? totals.detected : totals.blindSpots); return;
    case PhoneKind::kChanged:
      if (detection.found == 0) ++totals.changesPassed;
      if (mayDetectChanges) return;
      break;
    case PhoneKind::kHealthy: break;
  }
  if (detection.found > 0) ++totals.falseAlarms;
}

std::string countsText(std::string_view by, const DetectionTotals& all, const ProfileTotals& totals) {
  std::string text =
      formatMessage("By %@: %@ of %@ detected, %@, %@", by, totals.detected, countText(all.faulty, "fault"),
                    countText(totals.blindSpots, "blind spot"), countText(totals.falseAlarms, "false alarm"));
  if (all.changed > 0)
    text += formatMessage(", %@ of %@ passed", totals.changesPassed, countText(all.changed, "change"));
  return text + "\n";
}

Json detectionJson(const Detection& detection) { return {{"seeds", detection.seeds}, {"detected", detection.found}}; }

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
    switch (one.kind()) {
      case PhoneKind::kFaulty: ++totals.faulty; break;
      case PhoneKind::kChanged: ++totals.changed; break;
      case PhoneKind::kHealthy: ++totals.healthy; break;
    }
    count(totals.byDefault, one.kind(), one.byDefault, false);
    if (!one.byStrict) continue;
    if (!totals.byStrict) totals.byStrict.emplace();
    count(*totals.byStrict, one.kind(), *one.byStrict, true);
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

void printDetections(std::ostream& out, const std::vector<PhoneDetection>& phones) {
  using Align = Table::Align;
  Table table({Align::kLeft, Align::kLeft, Align::kLeft, Align::kLeft});
  table.addHeader({"Phone", "Expected", "By default", "By strict"});
  for (const PhoneDetection& one : phones) {
    const std::string_view expected = one.kind() == PhoneKind::kFaulty ? "detected" : "passed";
    table.addRow({printable(one.phone), std::string(expected), byDefaultText(one), strictText(one)});
  }
  table.print(out, "");
  printThose(out, phones, isBlindSpot, "\nNot detected by default, and why:\n");
  printThose(out, phones, isPassedChange, "\nPassed by default as the phone expects, and what differs:\n");
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
                    {"healthy", one.healthy},
                    {"expectsDetection", one.isExpected},
                    {"default", detectionJson(one.byDefault)},
                    {"strict", one.byStrict ? detectionJson(*one.byStrict) : Json()},
                    {"reasons", one.reasons}});
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
