#include "host/report/record_difference.h"

#include "contract/message_format.h"
#include "host/model/limit_check.h"
#include "host/model/trials.h"
#include "host/report/text_report.h"

#include <algorithm>
#include <optional>
#include <string_view>
#include <utility>

namespace quazor {

namespace {

// The facts to compare: user-readable text by user-readable name.
using Facts = OrderedMap<std::string>;

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
    setFact(facts, "measurement " + name, valueText(measurement));
  }
  for (const auto& [result, verdict, ignored] : record.measuredResults) {
    setFact(facts, "result " + result.name(),
            formatMessage("%@, %@, %@", valueText(result.measurement()), limitText(result.limit()), nameOf(verdict)));
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

void compare(const std::string& name, const Facts& before, const Facts& after, std::vector<Difference>& differences) {
  for (const auto& [what, fact] : before) {
    const std::string* const other = after.find(what);
    if (other != nullptr && *other == fact) continue;
    differences.push_back({name, what, fact, other == nullptr ? std::nullopt : std::optional(*other)});
  }
  for (const auto& [what, fact] : after) {
    if (!before.contains(what)) differences.push_back({name, what, std::nullopt, fact});
  }
}

std::string textOf(const TracedFrame& frame, TracedKind kind) {
  if (kind == TracedKind::kTasks) {
    const std::string ended = frame.returned ? formatMessage("ended at %@ ns", *frame.returned) : "not ended";
    return formatMessage("thread %@, posted at %@ ns, begun at %@ ns, %@", frame.number, frame.captured,
                         frame.delivered, ended);
  }
  const std::string returned = frame.returned ? formatMessage("returned at %@ ns", *frame.returned) : "not returned";
  return formatMessage("number %@, captured at %@ ns, delivered at %@ ns, %@", frame.number, frame.captured,
                       frame.delivered, returned);
}

// What the sentences call a stream, and what it has.
std::string nameOf(const RecordedStream& stream) {
  return (stream.kind == TracedKind::kFrames ? "stream " : "queue ") + stream.name;
}
const char* rowsOf(const RecordedStream& stream) { return stream.kind == TracedKind::kFrames ? "frame" : "task"; }

const RecordedStream* streamNamed(const std::vector<RecordedStream>& streams, const std::string& name) {
  const auto found =
      std::find_if(streams.begin(), streams.end(), [&name](const RecordedStream& one) { return one.name == name; });
  return found == streams.end() ? nullptr : &*found;
}

// Adds the first frame or task that differs.
void compareFrames(const std::string& name, const RecordedStream& before, const RecordedStream& after,
                   std::vector<Difference>& differences) {
  const auto [one, other] =
      std::mismatch(before.frames.begin(), before.frames.end(), after.frames.begin(), after.frames.end());
  const bool isInFirst = one != before.frames.end();
  const bool isInSecond = other != after.frames.end();
  if (!isInFirst && !isInSecond) return;
  differences.push_back({name,
                         formatMessage("%@: %@ %@, the first that differs,", nameOf(before), rowsOf(before),
                                       one - before.frames.begin() + 1),
                         isInFirst ? std::optional(textOf(*one, before.kind)) : std::nullopt,
                         isInSecond ? std::optional(textOf(*other, before.kind)) : std::nullopt});
}

void compareStreams(const std::string& name, const std::vector<RecordedStream>& before,
                    const std::vector<RecordedStream>& after, std::vector<Difference>& differences) {
  for (const RecordedStream& stream : before) {
    const RecordedStream* const other = streamNamed(after, stream.name);
    if (other == nullptr) {
      differences.push_back({name, nameOf(stream), "", std::nullopt});
      continue;
    }
    compareFrames(name, stream, *other, differences);
    if (stream.lost != other->lost) {
      differences.push_back({name, formatMessage("%@: the number of lost %@s", nameOf(stream), rowsOf(stream)),
                             std::to_string(stream.lost), std::to_string(other->lost)});
    }
  }
  for (const RecordedStream& stream : after) {
    if (streamNamed(before, stream.name) == nullptr) {
      differences.push_back({name, nameOf(stream), std::nullopt, ""});
    }
  }
}

// A run and what is compared of it.
// Thread: one at a time.
class ComparedRun {
 public:
  // Borrows the run.
  explicit ComparedRun(const RecordedRun& run) : facts(factsOf(run)) {
    for (std::size_t i = 0; i < run.records.size(); ++i) {
      const std::string name = run.records[i].name + trialSuffix(run.records[i]);
      if (run.began.traced && i < run.streams.size()) streams.set(name, &run.streams[i]);
      if (run.began.tracesTasks && i < run.queues.size()) queues.set(name, &run.queues[i]);
    }
  }

  using Streams = OrderedMap<const std::vector<RecordedStream>*>;

  const OrderedMap<Facts> facts;
  Streams streams;  // of each diagnostic; nothing if they were not recorded
  Streams queues;   // likewise
};

// Compares what both runs recorded of the diagnostic.
void compareRecorded(const std::string& name, const ComparedRun::Streams& before, const ComparedRun::Streams& after,
                     std::vector<Difference>& differences) {
  const auto* const one = before.find(name);
  const auto* const other = after.find(name);
  if (one != nullptr && other != nullptr) compareStreams(name, **one, **other, differences);
}

}  // namespace

std::vector<Difference> listedDifferences(const RecordedRun& before, const RecordedRun& after) {
  std::vector<Difference> differences;
  const ComparedRun first(before);
  const ComparedRun second(after);
  for (const auto& [name, facts] : first.facts) {
    const Facts* const others = second.facts.find(name);
    if (others == nullptr) {
      differences.push_back({name, "", "", std::nullopt});
      continue;
    }
    compare(name, facts, *others, differences);
    compareRecorded(name, first.streams, second.streams, differences);
    compareRecorded(name, first.queues, second.queues, differences);
  }
  for (const auto& [name, facts] : second.facts) {
    if (!first.facts.contains(name)) differences.push_back({name, "", std::nullopt, ""});
  }
  return differences;
}

std::string sentenceOf(const Difference& difference) {
  const std::string subject = difference.name + (difference.what.empty() ? "" : ": " + difference.what);
  if (difference.before && difference.after) {
    return formatMessage("%@ was %@ and is %@", subject, *difference.before, *difference.after);
  }
  const std::string& value = difference.before ? *difference.before : *difference.after;
  return formatMessage("%@ is only in the %@%@", subject, difference.before ? "first" : "second",
                       value.empty() ? value : ": " + value);
}

std::vector<std::string> differencesOf(const RecordedRun& before, const RecordedRun& after) {
  std::vector<std::string> sentences;
  for (const Difference& one : listedDifferences(before, after)) sentences.push_back(sentenceOf(one));
  return sentences;
}

}  // namespace quazor
