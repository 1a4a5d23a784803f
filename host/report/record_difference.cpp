#include "host/report/record_difference.h"

#include "contract/message_format.h"
#include "host/model/limit_check.h"
#include "host/model/trials.h"
#include "host/report/text_report.h"

#include <algorithm>
#include <string_view>
#include <utility>

namespace quazor {

namespace {

// The facts to compare: user-readable text by user-readable name.
using Facts = OrderedMap<std::string>;

std::string measurementText(const Measurement& measurement) {
  return formatMessage("%@ %@", measurement.value(), measurement.unit().symbol());
}

std::string oneLine(const DiagnosticErrorPtr& error) {
  std::string text = error == nullptr ? std::string("none") : errorText(error, "");
  if (text.ends_with('\n')) text.pop_back();
  std::replace(text.begin(), text.end(), '\n', ' ');
  return text;
}

// Numbers facts of the same name.
void setFact(Facts& facts, const std::string& name, std::string fact) {
  std::string unique = name;
  for (std::size_t number = 2; facts.contains(unique); ++number) unique = formatMessage("%@ (%@)", name, number);
  facts.set(unique, std::move(fact));
}

Facts factsOf(const DiagnosticRecord& record) {
  Facts facts;
  facts.set("verdict", std::string(nameOf(record.verdict)));
  facts.set("error", oneLine(record.error));
  if (record.skip) facts.set("skip", textOf(*record.skip));
  for (const Part part : {Part::kExperiment, Part::kAnalysis}) {
    for (const ResolvedParameter& one : record.parameters.of(part)) {
      setFact(facts, formatMessage("parameter %@.%@", nameOf(part), one.name),
              one.value ? defaultText(*one.value) : "not set");
    }
  }
  for (const auto& [name, measurement] : record.measurements) {
    setFact(facts, "measurement " + name, measurementText(measurement));
  }
  for (const auto& [result, verdict, ignored] : record.measuredResults) {
    setFact(
        facts, "result " + result.name(),
        formatMessage("%@, %@, %@", measurementText(result.measurement()), limitText(result.limit()), nameOf(verdict)));
  }
  for (const LimitCheck& check : limitChecksOf(record)) {
    setFact(facts, formatMessage("limit '%@' of %@", canonicalText(check.limit), check.result.name()),
            std::string(check.verdictName()));
  }
  for (const auto& [key, value] : record.auxiliaryData) setFact(facts, "auxiliary data " + key, defaultText(value));
  return facts;
}

OrderedMap<Facts> factsOf(const RecordedRun& run) {
  OrderedMap<Facts> facts;
  for (const DiagnosticRecord& record : run.records) facts.set(record.name + trialSuffix(record), factsOf(record));
  return facts;
}

void compare(const std::string& name, const Facts& before, const Facts& after, std::vector<std::string>& differences) {
  for (const auto& [what, fact] : before) {
    const std::string* const other = after.find(what);
    if (other != nullptr && *other == fact) continue;
    differences.push_back(other == nullptr ? formatMessage("%@: %@ is only in the first: %@", name, what, fact)
                                           : formatMessage("%@: %@ was %@ and is %@", name, what, fact, *other));
  }
  for (const auto& [what, fact] : after) {
    if (!before.contains(what)) {
      differences.push_back(formatMessage("%@: %@ is only in the second: %@", name, what, fact));
    }
  }
}

}  // namespace

std::vector<std::string> differencesOf(const RecordedRun& before, const RecordedRun& after) {
  std::vector<std::string> differences;
  const OrderedMap<Facts> first = factsOf(before);
  const OrderedMap<Facts> second = factsOf(after);
  for (const auto& [name, facts] : first) {
    if (const Facts* const others = second.find(name)) {
      compare(name, facts, *others, differences);
    } else {
      differences.push_back(name + " is only in the first");
    }
  }
  for (const auto& [name, facts] : second) {
    if (!first.contains(name)) differences.push_back(name + " is only in the second");
  }
  return differences;
}

}  // namespace quazor
