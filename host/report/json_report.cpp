#include "host/report/json_report.h"

#include "host/plugin/parameter_range.h"
#include "host/record/value_json.h"

#include <cstddef>
#include <utility>

namespace quazor {

using Json = nlohmann::ordered_json;

namespace {

constexpr int kSchema = 1;

Json documentOf(const char* key, Json records) { return {{"schema", kSchema}, {key, std::move(records)}}; }

Json runDocumentOf(const char* key, Json records, const std::optional<std::string>& interrupted) {
  Json document = documentOf(key, std::move(records));
  if (interrupted) document["interrupted"] = *interrupted;
  return document;
}

Json boundJson(const std::shared_ptr<const QZBound>& bound) {
  if (bound == nullptr) return {};
  return {{"value", numberJson(bound->value().value())}, {"open", bound->open()}};
}

Json resultsJson(const DiagnosticRecord& record) {
  Json json = Json::array();
  const std::vector<LimitCheck> checks = limitChecksOf(record);
  for (std::size_t i = 0; i < record.measuredResults.size(); ++i) {
    const auto& [result, verdict, ignored] = record.measuredResults[i];
    Json one = {{"name", result.name()},
                {"value", numberJson(result.measurement().value())},
                {"unit", result.measurement().unit().symbol()},
                {"limit", limitJson(result.limit())},
                {"verdict", nameOf(verdict)}};
    for (const LimitCheck& check : checksOfResult(checks, i)) one["userLimits"].push_back(checkJson(check));
    json.push_back(std::move(one));
  }
  return json;
}

Json measurementsJson(const OrderedMap<Measurement>& measurements) {
  return objectJson(measurements, [](const Measurement& measurement) {
    return Json{{"value", numberJson(measurement.value())}, {"unit", measurement.unit().symbol()}};
  });
}

Json parametersJson(const ResolvedParameters& parameters) {
  return {{"experiment", dictionaryJson(dictionaryOf(parameters.experiment))},
          {"analysis", dictionaryJson(dictionaryOf(parameters.analysis))}};
}

Json logJson(const std::vector<LogLine>& lines) {
  Json json = Json::array();
  for (const LogLine& line : lines) {
    json.push_back({{"time", secondsJson(line.time)}, {"level", nameOf(line.level)}, {"text", line.text}});
  }
  return json;
}

Json faultsJson(const std::vector<DeclaredFault>& faults) {
  Json json = Json::array();
  for (const DeclaredFault& fault : faults) {
    Json one = fault.fault;
    one["fired"] = fault.fired;
    json.push_back(std::move(one));
  }
  return json;
}

Json durationJson(const std::optional<std::chrono::nanoseconds>& duration) {
  return duration ? secondsJson(*duration) : Json();
}

// The declared parameters of an experiment or analysis, with the values of a run.
Json declarationJson(const std::string& name, const QZDescription& description,
                     const std::vector<ResolvedParameter>& parameters) {
  Json json = Json::array();
  for (const ResolvedParameter& one : parameters) {
    json.push_back({{"name", one.name},
                    {"summary", one.declaration.summary()},
                    {"required", one.declaration.required()},
                    {"range", one.range ? rangeJson(*one.range) : Json()},
                    {"value", one.value ? valueJson(*one.value) : Json()},
                    {"source", one.value ? Json(one.source) : Json()}});
  }
  return {{"name", name}, {"summary", description.summary()}, {"parameters", std::move(json)}};
}

// A record with its results and its analysis, or what an experiment alone has of it.
Json recordJson(const DiagnosticRecord& record, Json parameters, bool hasAnalysis) {
  Json json = {{"name", record.name}, {"summary", record.summary}, {"verdict", nameOf(record.verdict)}};
  if (record.trial.attempt > 0) json["attempt"] = record.trial.attempt;
  if (record.trial.repetition > 0) json["repetition"] = record.trial.repetition;
  if (record.skip) json["skip"] = {{"kind", nameOf(record.skip->kind)}, {"reason", record.skip->reason}};
  json["parameters"] = std::move(parameters);
  if (hasAnalysis) json["measuredResults"] = resultsJson(record);
  json["measurements"] = measurementsJson(record.measurements);
  json["auxiliaryData"] = dictionaryJson(record.auxiliaryData);
  json["error"] = errorJson(record.error);
  json["log"] = logJson(record.log);
  json["faults"] = faultsJson(record.faults);
  json["seed"] = record.seed;
  Json& durations = json["durations"];
  durations["setup"] = durationJson(record.durations.setup);
  durations["run"] = durationJson(record.durations.run);
  durations["teardown"] = durationJson(record.durations.teardown);
  if (hasAnalysis) durations["analysis"] = durationJson(record.durations.analysis);
  return json;
}

}  // namespace

Json userLimitJson(const UserLimit& limit) {
  return {{"limit", canonicalText(limit)},
          {"name", limit.name},
          {"severity", nameOf(limit.severity)},
          {"source", limit.source}};
}

Json checkJson(const LimitCheck& check) {
  Json json = userLimitJson(check.limit);
  json["verdict"] = check.verdictName();
  if (!check.problem.empty()) json["problem"] = check.problem;
  return json;
}

Json limitJson(const std::optional<QZLimit>& limit) {
  if (!limit) return {};
  return {
      {"name", limit->name()}, {"lower", boundJson(limit->lowerBound())}, {"upper", boundJson(limit->upperBound())}};
}

Json recordJson(const DiagnosticRecord& record) { return recordJson(record, parametersJson(record.parameters), true); }

Json experimentJson(const DiagnosticRecord& record) {
  return recordJson(record, dictionaryJson(dictionaryOf(record.parameters.experiment)), false);
}

Json runDocument(const std::vector<DiagnosticRecord>& records, const std::optional<std::string>& interrupted) {
  Json diagnostics = Json::array();
  for (const DiagnosticRecord& record : records) diagnostics.push_back(recordJson(record));
  return runDocumentOf("diagnostics", std::move(diagnostics), interrupted);
}

Json experimentDocument(const std::vector<DiagnosticRecord>& records, const std::optional<std::string>& interrupted) {
  Json experiments = Json::array();
  for (const DiagnosticRecord& record : records) experiments.push_back(experimentJson(record));
  return runDocumentOf("experiments", std::move(experiments), interrupted);
}

Json listDocument(const std::vector<DescribedDiagnostic>& diagnostics) {
  Json document = documentOf("diagnostics", Json::array());
  document["experiments"] = Json::array();
  for (const DescribedDiagnostic& described : diagnostics) {
    const Diagnostic& one = described.diagnostic;
    if (one.experimentOnly) {
      document["experiments"].push_back(
          {{"name", one.name}, {"summary", described.description.error ? Json() : Json(described.summary())}});
      continue;
    }
    document["diagnostics"].push_back({{"name", one.name},
                                       {"summary", one.summary},
                                       {"experiment", one.experimentName},
                                       {"analysis", one.analysisName}});
  }
  return document;
}

Json descriptionDocument(const std::vector<ResolvedDiagnostic>& diagnostics) {
  Json document = documentOf("diagnostics", Json::array());
  document["experiments"] = Json::array();
  for (const auto& [described, parameters] : diagnostics) {
    const auto& [diagnostic, description] = described;
    Json experiment = declarationJson(diagnostic.experimentName, description.experiment, parameters.experiment);
    if (diagnostic.experimentOnly) {
      experiment["error"] = errorJson(description.error);
      document["experiments"].push_back(std::move(experiment));
      continue;
    }
    document["diagnostics"].push_back(
        {{"name", diagnostic.name},
         {"summary", diagnostic.summary},
         {"experiment", std::move(experiment)},
         {"analysis", declarationJson(diagnostic.analysisName, description.analysis, parameters.analysis)},
         {"error", errorJson(description.error)}});
  }
  return document;
}

}  // namespace quazor
