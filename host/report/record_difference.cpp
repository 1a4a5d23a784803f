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

std::string textOf(const TracedFrame& frame) {
  const std::string returned = frame.returned ? formatMessage("returned at %@ ns", *frame.returned) : "not returned";
  return formatMessage("number %@, captured at %@ ns, delivered at %@ ns, %@", frame.number, frame.captured,
                       frame.delivered, returned);
}

const RecordedStream* streamNamed(const std::vector<RecordedStream>& streams, const std::string& name) {
  const auto found =
      std::find_if(streams.begin(), streams.end(), [&name](const RecordedStream& one) { return one.name == name; });
  return found == streams.end() ? nullptr : &*found;
}

// The sentence about the first frame that differs; empty if none does. `subject` names diagnostic and stream.
std::string frameDifference(const std::string& subject, const std::vector<TracedFrame>& before,
                            const std::vector<TracedFrame>& after) {
  const auto [one, other] = std::mismatch(before.begin(), before.end(), after.begin(), after.end());
  if (one == before.end() && other == after.end()) return {};
  const std::string begin = formatMessage("%@: frame %@, the first that differs,", subject, one - before.begin() + 1);
  if (other == after.end()) return formatMessage("%@ is only in the first: %@", begin, textOf(*one));
  if (one == before.end()) return formatMessage("%@ is only in the second: %@", begin, textOf(*other));
  return formatMessage("%@ was %@ and is %@", begin, textOf(*one), textOf(*other));
}

void compareStreams(const std::string& name, const std::vector<RecordedStream>& before,
                    const std::vector<RecordedStream>& after, std::vector<std::string>& differences) {
  const auto subjectOf = [&name](const RecordedStream& stream) {
    return formatMessage("%@: stream %@", name, stream.name);
  };
  for (const RecordedStream& stream : before) {
    const RecordedStream* const other = streamNamed(after, stream.name);
    if (other == nullptr) {
      differences.push_back(subjectOf(stream) + " is only in the first");
      continue;
    }
    std::string difference = frameDifference(subjectOf(stream), stream.frames, other->frames);
    if (!difference.empty()) differences.push_back(std::move(difference));
    if (stream.lost != other->lost) {
      differences.push_back(
          formatMessage("%@: the number of lost frames was %@ and is %@", subjectOf(stream), stream.lost, other->lost));
    }
  }
  for (const RecordedStream& stream : after) {
    if (streamNamed(before, stream.name) == nullptr)
      differences.push_back(subjectOf(stream) + " is only in the second");
  }
}

// A run and what is compared of it.
// Thread: one at a time.
class ComparedRun {
 public:
  // Borrows the run.
  explicit ComparedRun(const RecordedRun& run) : facts(factsOf(run)) {
    if (!run.began.traced) return;
    for (std::size_t i = 0; i < run.streams.size(); ++i) {
      streams_.set(run.records[i].name + trialSuffix(run.records[i]), &run.streams[i]);
    }
  }

  // The streams of the diagnostic; null if they were not recorded.
  const std::vector<RecordedStream>* streamsOf(const std::string& name) const {
    const auto* const found = streams_.find(name);
    return found == nullptr ? nullptr : *found;
  }

  const OrderedMap<Facts> facts;

 private:
  OrderedMap<const std::vector<RecordedStream>*> streams_;
};

}  // namespace

std::vector<std::string> differencesOf(const RecordedRun& before, const RecordedRun& after) {
  std::vector<std::string> differences;
  const ComparedRun first(before);
  const ComparedRun second(after);
  for (const auto& [name, facts] : first.facts) {
    const Facts* const others = second.facts.find(name);
    if (others == nullptr) {
      differences.push_back(name + " is only in the first");
      continue;
    }
    compare(name, facts, *others, differences);
    const auto* const streams = first.streamsOf(name);
    const auto* const otherStreams = second.streamsOf(name);
    if (streams != nullptr && otherStreams != nullptr) compareStreams(name, *streams, *otherStreams, differences);
  }
  for (const auto& [name, facts] : second.facts) {
    if (!first.facts.contains(name)) differences.push_back(name + " is only in the second");
  }
  return differences;
}

}  // namespace quazor
