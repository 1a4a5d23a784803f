#include "host/record/run_event_json.h"

#include "base/text/input_error.h"
#include "host/plugin/parameter_range.h"
#include "host/record/frames_json.h"
#include "host/record/json_members.h"
#include "host/record/lossless_json.h"
#include "host/record/parameters_json.h"
#include "host/text/timestamp.h"

#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace quazor {

using Json = nlohmann::ordered_json;

namespace {

Date dateAt(const Json& json, const char* key) {
  const std::optional<Date> date = parseTimestamp(get<std::string>(json, key));
  if (!date) throw InputError(std::string("\"") + key + "\" is not a timestamp of the years 1678 to 2261");
  return *date;
}

Stage stageAt(const Json& json, const char* key) {
  const std::string name = get<std::string>(json, key);
  const std::optional<Stage> stage = stageNamed(name);
  if (!stage) throw InputError("unknown stage '" + name + "'");
  return *stage;
}

Json textsJson(const std::vector<std::string>& texts) {
  Json json = Json::array();
  for (const std::string& text : texts) json.push_back(losslessText(text));
  return json;
}

std::vector<std::string> textsAt(const Json& json, const char* key) {
  std::vector<std::string> texts;
  for (const Json& one : arrayAt(json, key)) texts.push_back(textFrom(one));
  return texts;
}

std::string_view kindName(QZLab::Kind kind) {
  switch (kind) {
    case QZLab::Kind::kExperiment: return "experiment";
    case QZLab::Kind::kAnalysis: return "analysis";
    case QZLab::Kind::kDiagnostic: break;
  }
  return "diagnostic";
}

QZLab::Kind kindAt(const Json& json, const char* key) {
  const std::string name = get<std::string>(json, key);
  for (const QZLab::Kind kind : {QZLab::Kind::kExperiment, QZLab::Kind::kAnalysis, QZLab::Kind::kDiagnostic}) {
    if (kindName(kind) == name) return kind;
  }
  throw InputError("unknown kind of registration '" + name + "'");
}

Json limitsJson(const std::vector<UserLimit>& limits) {
  Json json = Json::array();
  for (const UserLimit& one : limits) {
    Json limit = {{"limit", losslessText(canonicalText(one))},
                  {"severity", nameOf(one.severity)},
                  {"source", losslessText(one.source)},
                  {"onlyIfSelected", one.onlyIfSelected}};
    if (!one.name.empty()) limit["name"] = losslessText(one.name);
    json.push_back(std::move(limit));
  }
  return json;
}

std::vector<UserLimit> limitsAt(const Json& json, const char* key) {
  std::vector<UserLimit> limits;
  for (const Json& one : arrayAt(json, key)) {
    UserLimit limit;
    try {
      limit = parseUserLimit(textAt(one, "limit"));
    } catch (const InputError& problem) {
      throw InputError("the limit " + memberOf(one, "limit").dump(-1, ' ', true, Json::error_handler_t::replace) +
                       " cannot be read: " + problem.what());
    }
    const std::string severity = get<std::string>(one, "severity");
    const std::optional<LimitSeverity> known = limitSeverityNamed(severity);
    if (!known) throw InputError("unknown severity '" + severity + "'");
    limit.severity = *known;
    limit.source = textAt(one, "source");
    limit.onlyIfSelected = get<bool>(one, "onlyIfSelected");
    if (one.contains("name")) limit.name = textAt(one, "name");
    limits.push_back(std::move(limit));
  }
  return limits;
}

Json tagsJson(const OrderedMap<std::string>& tags) {
  Json json = Json::array();
  for (const auto& [key, value] : tags) json.push_back(Json::array({losslessText(key), losslessText(value)}));
  return json;
}

OrderedMap<std::string> tagsAt(const Json& json, const char* key) {
  OrderedMap<std::string> tags;
  for (const Json& one : arrayAt(json, key)) {
    if (!one.is_array() || one.size() != 2) throw InputError("expected a tag: a key and a value");
    tags.set(textFrom(one[0]), textFrom(one[1]));
  }
  return tags;
}

LogLevel levelAt(const Json& json, const char* key) {
  const std::string name = get<std::string>(json, key);
  for (const LogLevel level : {LogLevel::kError, LogLevel::kDefault, LogLevel::kDebug}) {
    if (nameOf(level) == name) return level;
  }
  throw InputError("unknown log level '" + name + "'");
}

Verdict verdictAt(const Json& json, const char* key) {
  const std::string name = get<std::string>(json, key);
  for (const Verdict verdict : {Verdict::kPass, Verdict::kFail, Verdict::kError, Verdict::kSkip}) {
    if (nameOf(verdict) == name) return verdict;
  }
  throw InputError("unknown verdict '" + name + "'");
}

std::chrono::nanoseconds nanosecondsAt(const Json& json, const char* key) {
  return std::chrono::nanoseconds(get<std::int64_t>(json, key));
}

// One overload per event, each the reverse of its read function below.

// A count that only some events have: 0 is not written.
void addCount(Json& json, const char* key, std::uint64_t count) {
  if (count > 0) json[key] = count;
}

std::optional<AnalyzedRun> analyzedAt(const Json& json, const char* key) {
  if (!json.contains(key)) return std::nullopt;
  const Json& run = json[key];
  return AnalyzedRun{textAt(run, "id"), dateAt(run, "date"), textAt(run, "host")};
}

Json jsonOf(const RunStarted& event) {
  Json json = {{"event", "runBegan"},
               {"program", losslessText(event.program)},
               {"contract", event.contract},
               {"date", timestampText(event.date)},
               {"plugins", textsJson(event.plugins)},
               {"phone", losslessText(event.phone)},
               {"seed", event.seed},
               {"ofExperiments", event.ofExperiments},
               {"names", textsJson(event.names)},
               {"limits", limitsJson(event.limits)},
               {"id", losslessText(event.id)},
               {"host", losslessText(event.host)},
               {"tags", tagsJson(event.tags)}};
  addCount(json, "attempts", event.attempts);
  addCount(json, "repetitions", event.repetitions);
  if (event.acceptFlaky) json["acceptFlaky"] = true;
  if (event.analyzed) {
    json["analyzed"] = {{"id", losslessText(event.analyzed->id)},
                        {"date", timestampText(event.analyzed->date)},
                        {"host", losslessText(event.analyzed->host)}};
  }
  if (!event.planned.empty()) json["planned"] = plannedJson(event.planned);
  return json;
}

RunEvent readRunBegan(const Json& json) {
  return RunStarted{textAt(json, "program"),
                    get<int>(json, "contract"),
                    dateAt(json, "date"),
                    textsAt(json, "plugins"),
                    textAt(json, "phone"),
                    get<std::uint64_t>(json, "seed"),
                    get<bool>(json, "ofExperiments"),
                    textsAt(json, "names"),
                    limitsAt(json, "limits"),
                    textAt(json, "id"),
                    textAt(json, "host"),
                    tagsAt(json, "tags"),
                    countAt(json, "attempts"),
                    countAt(json, "repetitions"),
                    json.contains("acceptFlaky") && get<bool>(json, "acceptFlaky"),
                    json.contains("record") && json["record"] >= kRecordFormatWithFrames,
                    json.contains("record") && json["record"] == kRecordFormatWithTasks,
                    analyzedAt(json, "analyzed"),
                    plannedAt(json, "planned")};
}

Json jsonOf(const DiagnosticStarted& event) {
  Json json = {{"event", "diagnosticBegan"},
               {"name", losslessText(event.name)},
               {"summary", losslessText(event.summary)},
               {"experiment", losslessText(event.experimentName)},
               {"analysis", losslessText(event.analysisName)},
               {"experimentOnly", event.experimentOnly},
               {"parameters", parametersJson(event.parameters)},
               {"seed", event.seed},
               {"date", timestampText(event.date)}};
  addCount(json, "attempt", event.attempt);
  addCount(json, "repetition", event.repetition);
  return json;
}

RunEvent readDiagnosticBegan(const Json& json) {
  return DiagnosticStarted{textAt(json, "name"),
                           textAt(json, "summary"),
                           textAt(json, "experiment"),
                           textAt(json, "analysis"),
                           get<bool>(json, "experimentOnly"),
                           parametersAt(json, "parameters"),
                           get<std::uint64_t>(json, "seed"),
                           dateAt(json, "date"),
                           countAt(json, "attempt"),
                           countAt(json, "repetition")};
}

Json jsonOf(const StageStarted& event) {
  return {{"event", "stageBegan"}, {"stage", nameOf(event.stage)}, {"date", timestampText(event.date)}};
}

RunEvent readStageBegan(const Json& json) { return StageStarted{stageAt(json, "stage"), dateAt(json, "date")}; }

Json jsonOf(const StageEnded& event) {
  Json json = {{"event", "stageEnded"}, {"stage", nameOf(event.stage)}};
  if (event.duration) json["nanoseconds"] = event.duration->count();
  json["date"] = timestampText(event.date);
  return json;
}

RunEvent readStageEnded(const Json& json) {
  StageEnded event{stageAt(json, "stage"), std::nullopt, dateAt(json, "date")};
  if (json.contains("nanoseconds")) event.duration = nanosecondsAt(json, "nanoseconds");
  return event;
}

Json jsonOf(const Logged& event) {
  return {{"event", "log"},
          {"date", timestampText(event.line.date)},
          {"nanoseconds", event.line.time.count()},
          {"level", nameOf(event.line.level)},
          {"text", losslessText(event.line.text)}};
}

RunEvent readLogged(const Json& json) {
  return Logged{
      {nanosecondsAt(json, "nanoseconds"), levelAt(json, "level"), textAt(json, "text"), dateAt(json, "date")}};
}

Json jsonOf(const MeasurementsAdded& event) {
  Json measurements = Json::array();
  for (const auto& [name, measurement] : event.measurements) {
    measurements.push_back(Json::array({losslessText(name), losslessMeasurement(measurement)}));
  }
  return {{"event", "measured"}, {"measurements", std::move(measurements)}};
}

RunEvent readMeasured(const Json& json) {
  MeasurementsAdded event;
  for (const Json& one : arrayAt(json, "measurements")) {
    if (!one.is_array() || one.size() != 2) throw InputError("expected a measurement: a name and a value");
    event.measurements.emplace_back(textFrom(one[0]), measurementFrom(one[1]));
  }
  return event;
}

Json jsonOf(const AuxiliaryDataAdded& event) {
  return {{"event", "collected"}, {"key", losslessText(event.key)}, {"value", losslessValue(event.value)}};
}

RunEvent readCollected(const Json& json) {
  return AuxiliaryDataAdded{textAt(json, "key"), valueFrom(memberOf(json, "value"))};
}

Json jsonOf(const ResultsReported& event) {
  Json results = Json::array();
  for (const QZMeasuredResult& result : event.results) results.push_back(losslessResult(result));
  return {{"event", "found"}, {"results", std::move(results)}};
}

RunEvent readFound(const Json& json) {
  ResultsReported event;
  for (const Json& one : arrayAt(json, "results")) event.results.push_back(resultFrom(one));
  return event;
}

Json jsonOf(const Failed& event) {
  Json json = {{"event", "failed"}};
  if (event.stage) json["stage"] = nameOf(*event.stage);
  json["error"] = losslessError(event.error);
  return json;
}

RunEvent readFailed(const Json& json) {
  Failed event{std::nullopt, errorFrom(memberOf(json, "error"))};
  if (event.error == nullptr) throw InputError("a failure has no error");
  if (json.contains("stage")) event.stage = stageAt(json, "stage");
  return event;
}

Json jsonOf(const FaultsCounted& event) {
  Json faults = Json::array();
  for (const DeclaredFault& one : event.faults) faults.push_back({{"fault", one.fault}, {"fired", one.fired}});
  return {{"event", "faultsCounted"}, {"faults", std::move(faults)}};
}

RunEvent readFaultsCounted(const Json& json) {
  FaultsCounted event;
  for (const Json& one : arrayAt(json, "faults")) {
    const Json& fault = memberOf(one, "fault");
    if (!fault.is_object()) throw InputError("\"fault\" is not an object");
    event.faults.push_back({fault, get<std::uint64_t>(one, "fired")});
  }
  return event;
}

Json jsonOf(const DiagnosticSkipped& event) {
  return {{"event", "skipped"}, {"kind", nameOf(event.skip.kind)}, {"reason", losslessText(event.skip.reason)}};
}

RunEvent readSkipped(const Json& json) {
  const std::string name = get<std::string>(json, "kind");
  const std::optional<SkipKind> kind = skipKindNamed(name);
  if (!kind) throw InputError("unknown kind of skip '" + name + "'");
  return DiagnosticSkipped{{*kind, textAt(json, "reason")}};
}

Json jsonOf(const Heartbeat& event) {
  Json json = jsonOf(StageEnded{event.stage, event.elapsed, event.date});
  json["event"] = "heartbeat";
  return json;
}

RunEvent readHeartbeat(const Json& json) {
  return Heartbeat{stageAt(json, "stage"), nanosecondsAt(json, "nanoseconds"), dateAt(json, "date")};
}

Json jsonOf(const FramesTraced& event) { return framesJson(event); }

RunEvent readFrames(const Json& json) { return framesFrom(json, TracedKind::kFrames); }
RunEvent readTasks(const Json& json) { return framesFrom(json, TracedKind::kTasks); }

Json jsonOf(const DiagnosticCompleted& /*event*/) { return {{"event", "diagnosticCompleted"}}; }

RunEvent readDiagnosticCompleted(const Json& /*json*/) { return DiagnosticCompleted{}; }

Json jsonOf(const DiagnosticEnded& event) {
  return {{"event", "diagnosticEnded"}, {"verdict", nameOf(event.verdict)}, {"date", timestampText(event.date)}};
}

RunEvent readDiagnosticEnded(const Json& json) {
  return DiagnosticEnded{verdictAt(json, "verdict"), dateAt(json, "date")};
}

Json jsonOf(const RunEnded& event) {
  Json json = {{"event", "runEnded"}};
  if (event.interrupted) json["interrupted"] = losslessText(*event.interrupted);
  json["date"] = timestampText(event.date);
  if (event.verdict) json["verdict"] = nameOf(*event.verdict);
  return json;
}

RunEvent readRunEnded(const Json& json) {
  RunEnded event{std::nullopt, dateAt(json, "date")};
  if (json.contains("interrupted")) event.interrupted = textAt(json, "interrupted");
  if (json.contains("verdict")) event.verdict = verdictAt(json, "verdict");
  return event;
}

struct Reader {
  std::string_view name;
  RunEvent (*read)(const Json& json);
};

constexpr Reader kReaders[] = {{"runBegan", readRunBegan},
                               {"diagnosticBegan", readDiagnosticBegan},
                               {"stageBegan", readStageBegan},
                               {"stageEnded", readStageEnded},
                               {"log", readLogged},
                               {"measured", readMeasured},
                               {"collected", readCollected},
                               {"found", readFound},
                               {"failed", readFailed},
                               {"faultsCounted", readFaultsCounted},
                               {"skipped", readSkipped},
                               {"heartbeat", readHeartbeat},
                               {"frames", readFrames},
                               {"tasks", readTasks},
                               {"diagnosticCompleted", readDiagnosticCompleted},
                               {"diagnosticEnded", readDiagnosticEnded},
                               {"runEnded", readRunEnded}};

Json halfJson(const QZDescription& description, const OrderedMap<QZParameterRange>& ranges) {
  Json parameters = Json::array();
  for (const auto& [name, parameter] : description.parameters()) {
    const std::string& summary = parameter.summary();
    parameters.push_back(
        {{"name", losslessText(name)}, {"summary", losslessText(summary)}, {"required", parameter.required()}});
    if (const QZParameterRange* const range = ranges.find(name)) parameters.back()["range"] = rangeJson(*range);
  }
  return {{"summary", losslessText(description.summary())}, {"parameters", std::move(parameters)}};
}

QZDescription halfFrom(const Json& json) {
  QZDescription description(textAt(json, "summary"));
  for (const Json& one : arrayAt(json, "parameters")) {
    description.addParameter({textAt(one, "summary"), get<bool>(one, "required")}, textAt(one, "name"));
  }
  return description;
}

OrderedMap<QZParameterRange> rangesFrom(const Json& json) {
  OrderedMap<QZParameterRange> ranges;
  for (const Json& one : arrayAt(json, "parameters")) {
    if (one.contains("range")) ranges.set(textAt(one, "name"), rangeFrom(JsonCursor(one["range"])));
  }
  return ranges;
}

}  // namespace

Json eventJson(const RunEvent& event) {
  return std::visit([](const auto& one) { return jsonOf(one); }, event);
}

RunEvent eventFrom(const Json& json) {
  const std::string name = get<std::string>(json, "event");
  for (const Reader& reader : kReaders) {
    if (reader.name == name) return reader.read(json);
  }
  throw InputError("unknown event '" + name + "'");
}

Json registrationJson(const QZLab::Registration& registration) {
  return {{"kind", kindName(registration.kind)},
          {"name", losslessText(registration.name)},
          {"summary", losslessText(registration.summary)},
          {"experiment", losslessText(registration.experimentName)},
          {"analysis", losslessText(registration.analysisName)}};
}

QZLab::Registration registrationFrom(const Json& json) {
  return {kindAt(json, "kind"),
          textAt(json, "name"),
          textAt(json, "summary"),
          textAt(json, "experiment"),
          textAt(json, "analysis"),
          nullptr,
          nullptr};
}

Json descriptionJson(const DiagnosticDescription& description) {
  return {{"experiment", halfJson(description.experiment, description.experimentRanges)},
          {"analysis", halfJson(description.analysis, description.analysisRanges)},
          {"error", losslessError(description.error)},
          {"isAsked", description.isAsked}};
}

DiagnosticDescription descriptionFrom(const Json& json) {
  const Json& experiment = memberOf(json, "experiment");
  const Json& analysis = memberOf(json, "analysis");
  return {halfFrom(experiment),       halfFrom(analysis),     errorFrom(memberOf(json, "error")),
          get<bool>(json, "isAsked"), rangesFrom(experiment), rangesFrom(analysis)};
}

}  // namespace quazor
