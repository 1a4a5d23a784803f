#include "host/report/ocp_report.h"

#include "contract/message_format.h"
#include "host/device/phone.h"
#include "host/model/incomplete_run.h"
#include "host/model/limit_check.h"
#include "host/model/trials.h"
#include "host/record/value_json.h"
#include "host/report/json_report.h"
#include "host/report/ocp_stream.h"
#include "host/report/rerun_command.h"
#include "host/report/run_identity.h"
#include "host/report/text_report.h"
#include "host/text/timestamp.h"

#include <algorithm>
#include <cstddef>
#include <iterator>
#include <set>
#include <string>
#include <string_view>
#include <utility>

namespace quazor {

using Json = nlohmann::ordered_json;

namespace {

// The IDs of the steps, which are also the prefixes of their names.
constexpr const char* kExperimentStep = "experiment";
constexpr const char* kAnalysisStep = "analysis";

// Omits the key if the text is empty.
void addText(Json& json, const char* key, const std::string& text) {
  if (!text.empty()) json[key] = text;
}

// The command that repeats exactly this run.
std::string commandOf(const RunStarted& run, const std::vector<std::string>& names,
                      const ResolvedParameters& parameters) {
  std::string line;
  for (const std::string& part : commandParts(run, names, run.seed)) line += (line.empty() ? "" : " ") + part;
  for (const std::string& part : settingParts(parameters)) line += " " + part;
  return line;
}

// The command that repeats the run of one record, with the limits of the user that decide its verdict. The record of a
// limit without a result repeats the whole run with that limit.
std::string commandOf(const RunStarted& run, const DiagnosticRecord& record) {
  if (isOfLimit(record)) {
    return commandOf(run, run.names, {}) + " " + optionPart("--limit", record.name);
  }
  std::string line = commandOf(run, {record.name}, record.parameters);
  std::set<std::string> limits;
  for (const LimitCheck& check : limitChecksOf(record)) {
    const std::string text = canonicalText(check.limit);
    if (check.counts() && limits.insert(text).second) line += " " + optionPart("--limit", text);
  }
  return line;
}

Json setParametersJson(const ResolvedParameters& parameters) {
  Json json = Json::object();
  if (!parameters.experiment.empty()) json["experiment"] = dictionaryJson(dictionaryOf(parameters.experiment));
  if (!parameters.analysis.empty()) json["analysis"] = dictionaryJson(dictionaryOf(parameters.analysis));
  return json;
}

Json startJson(const RunStarted& run, const std::string& name, std::string commandLine,
               const ResolvedParameters& parameters = {}, Json metadata = Json::object()) {
  Json dut = {{"dutInfoId", "phone"}};
  addText(dut, "name", run.phone);
  if (const std::string serial = serialNumberOf(run); !serial.empty()) {
    dut["hardwareInfos"] = {{{"hardwareInfoId", "phone"}, {"name", "phone"}, {"serialNumber", serial}}};
  }
  metadata["seed"] = run.seed;
  metadata["contract"] = run.contract;
  metadata["plugins"] = run.plugins;
  addText(metadata, "run", run.id);
  addText(metadata, "host", run.host);
  if (run.analyzed) {
    Json& analyzed = metadata["analyzed"];
    addText(analyzed, "run", run.analyzed->id);
    analyzed["date"] = timestampText(run.analyzed->date);
    addText(analyzed, "host", run.analyzed->host);
  }
  for (const auto& [key, value] : run.tags) metadata["tags"][key] = value;
  return {{"name", name},
          {"version", run.program},
          {"commandLine", std::move(commandLine)},
          {"parameters", setParametersJson(parameters)},
          {"dutInfo", std::move(dut)},
          {"metadata", std::move(metadata)}};
}

std::string symptomOf(const DiagnosticError& error) { return formatMessage("%@:%@", error.domain(), error.code()); }

// Calls `add` with an artifact for the error and for each underlying error, the nearest first.
template <class Add>
void addErrors(const DiagnosticErrorPtr& error, Add&& add) {
  for (DiagnosticErrorPtr one = error; one != nullptr; one = one->underlyingError()) {
    add(Json{{"symptom", symptomOf(*one)}, {"message", one->localizedDescription()}});
  }
}

Json measurementJson(const std::string& name, const Measurement& measurement) {
  Json json = {{"name", name}, {"value", numberJson(measurement.value())}};
  addText(json, "unit", measurement.unit().symbol());
  return json;
}

void addValidator(Json& validators, const QZLimit& limit, const std::shared_ptr<const QZBound>& bound,
                  const char* closedType, const char* openType) {
  if (bound == nullptr) return;
  validators.push_back(
      {{"name", limit.name()}, {"type", bound->open() ? openType : closedType}, {"value", bound->value().value()}});
}

void addBound(Json& limit, const char* key, const std::shared_ptr<const QZBound>& bound) {
  if (bound == nullptr) return;
  Json json = {{"value", numberJson(bound->value().value())}, {"open", bound->open()}};
  addText(json, "unit", bound->value().unit().symbol());
  limit[key] = std::move(json);
}

// Validators compare plain numbers, without units. A limit without a bound, or one that cannot judge the result, goes
// to the metadata instead.
Json resultJson(const JudgedResult& judged) {
  const QZMeasuredResult& result = judged.result;
  Json json = measurementJson(result.name(), result.measurement());
  if (!result.limit()) return json;
  const QZLimit& limit = *result.limit();
  if (judged.verdict == ResultVerdict::kPass || judged.verdict == ResultVerdict::kFail) {
    Json validators = Json::array();
    addValidator(validators, limit, limit.lowerBound(), "GREATER_THAN_OR_EQUAL", "GREATER_THAN");
    addValidator(validators, limit, limit.upperBound(), "LESS_THAN_OR_EQUAL", "LESS_THAN");
    json["validators"] = std::move(validators);
    return json;
  }
  Json unused = {{"name", limit.name()}};
  addBound(unused, "lower", limit.lowerBound());
  addBound(unused, "upper", limit.upperBound());
  json["metadata"] = {{"limit", std::move(unused)}};
  addText(json["metadata"], "problem", judged.problem);
  return json;
}

// After an error the state of the hardware is unknown: a diagnosis FAIL would claim a fault and make the run fail.
Json diagnosisJson(const JudgedResult& judged, bool known) {
  const bool passed = judged.verdict == ResultVerdict::kPass;
  const char* const type = !known ? "UNKNOWN" : passed ? "PASS" : "FAIL";
  const char* const ending = !known ? "-unknown" : passed ? "-pass" : "-fail";
  const QZMeasuredResult& result = judged.result;
  return {{"verdict", result.name() + ending},
          {"type", type},
          {"message", againstLimitText(result, limitText(result.limit()))}};
}

Json diagnosisJson(const LimitCheck& check, bool known) {
  const char* const type = !known ? "UNKNOWN" : check.passed ? "PASS" : "FAIL";
  const char* const ending = !known ? "-limit-unknown" : check.passed ? "-limit-pass" : "-limit-fail";
  return {{"verdict", check.result.name() + ending},
          {"type", type},
          {"message", againstLimitText(check.result, labelOf(check.limit))}};
}

// A limit with bounds becomes validators of the measurement if it counts and could be compared.
void addValidators(Json& measurement, const LimitCheck& check) {
  const std::optional<QZLimit> bounds = boundsOf(check);
  if (!bounds || !check.counts() || !check.problem.empty()) return;
  Json& validators = measurement["validators"];
  if (validators.is_null()) validators = Json::array();
  addValidator(validators, *bounds, bounds->lowerBound(), "GREATER_THAN_OR_EQUAL", "GREATER_THAN");
  addValidator(validators, *bounds, bounds->upperBound(), "LESS_THAN_OR_EQUAL", "LESS_THAN");
}

// Writes the test run of one record.
class OcpRecordWriter {
 public:
  OcpRecordWriter(std::string& out, const RunStarted& run, const DiagnosticRecord& record, bool isAccepted)
      : run_(run), record_(record), isAccepted_(isAccepted), stream_(out, record.log, record.begin) {}

  // Returns the date of the last line.
  Date write() {
    Json metadata = Json::object();
    addText(metadata, "summary", record_.summary);
    addText(metadata, "experiment", record_.experimentName);
    addText(metadata, "analysis", record_.analysisName);
    if (record_.skip) metadata["skip"] = {{"kind", nameOf(record_.skip->kind)}, {"reason", record_.skip->reason}};
    if (record_.trial.attempt > 0) metadata["attempt"] = record_.trial.attempt;
    if (record_.trial.repetition > 0) metadata["repetition"] = record_.trial.repetition;
    if (isAccepted_) metadata["superseded"] = true;
    RunStarted ofRecord = run_;
    ofRecord.seed = record_.seed;
    ofRecord.ofExperiments = record_.experimentOnly;
    std::string command = commandOf(ofRecord, record_);
    stream_.addToRun("testRunStart",
                     startJson(ofRecord, record_.name, std::move(command), record_.parameters, std::move(metadata)),
                     record_.begin);
    if (record_.skip) {
      stream_.addToRun("log", {{"severity", "INFO"}, {"message", textOf(*record_.skip)}}, record_.end);
    }
    writeExperiment();
    writeAnalysis();
    if (!errorIsWritten_) {
      addErrors(record_.error, [this](Json error) { stream_.addToRun("error", std::move(error), record_.end); });
    }
    writeEnd();
    return stream_.last();
  }

 private:
  // The stages of a step that took place, with their dates.
  template <class IsOfStep>
  std::vector<StagePeriod> stagesThat(IsOfStep&& isOfStep) const {
    std::vector<StagePeriod> stages;
    std::copy_if(record_.stages.begin(), record_.stages.end(), std::back_inserter(stages),
                 [&isOfStep](const StagePeriod& one) { return isOfStep(one.stage); });
    return stages;
  }

  void beginStep(const char* step, const std::string& name, const std::vector<StagePeriod>& stages) {
    const Date begin = stages.empty() ? record_.begin : stages.front().begin;
    stepEnd_ = stages.empty() ? record_.begin : stages.back().end.value_or(record_.end);
    stream_.addToStep(step, "testStepStart", {{"name", name.empty() ? step : step + (" " + name)}}, begin);
  }

  void endStep(const char* step, bool hasError, bool failed) {
    if (hasError) {
      addErrors(record_.error,
                [this, step](Json error) { stream_.addToStep(step, "error", std::move(error), stepEnd_); });
      errorIsWritten_ = true;
    }
    stream_.addToStep(step, "testStepEnd", {{"status", hasError || failed ? "ERROR" : "COMPLETE"}}, stepEnd_);
  }

  static bool isOfExperiment(Stage stage) { return stage != Stage::kLoad && stage != Stage::kAnalyze; }
  static bool isOfAnalysis(Stage stage) { return stage == Stage::kAnalyze; }

  void writeExperiment() {
    const std::vector<StagePeriod> stages = stagesThat(isOfExperiment);
    if (stages.empty() && record_.measurements.empty() && record_.auxiliaryData.empty()) return;
    beginStep(kExperimentStep, record_.experimentName, stages);
    const auto run =
        std::find_if(stages.begin(), stages.end(), [](const StagePeriod& one) { return one.stage == Stage::kRun; });
    const Date measured = run == stages.end() ? stepEnd_ : run->end.value_or(stepEnd_);
    for (const auto& [name, measurement] : record_.measurements) {
      stream_.addToStep(kExperimentStep, "measurement", measurementJson("raw." + name, measurement), measured);
    }
    addExtension("auxiliaryData", dictionaryJson(record_.auxiliaryData), measured);
    addExtension("faults", faultsJson(), stepEnd_);
    if (record_.experimentOnly && record_.verdict == Verdict::kPass) {
      stream_.addToStep(kExperimentStep, "diagnosis",
                        {{"verdict", "not-judged"},
                         {"type", "UNKNOWN"},
                         {"message", "The experiment was run on its own and returned a result; nothing was judged."}},
                        stepEnd_);
    }
    endStep(kExperimentStep, record_.errorStage && isOfExperiment(*record_.errorStage), false);
  }

  void addExtension(const char* name, Json content, Date date) {
    if (content.empty()) return;
    stream_.addToStep(kExperimentStep, "extension", {{"name", name}, {"content", std::move(content)}}, date);
  }

  Json faultsJson() const {
    Json json = Json::object();
    for (const DeclaredFault& fault : record_.faults) {
      json["faults"].push_back({{"fault", fault.fault}, {"fired", fault.fired}});
    }
    return json;
  }

  void writeResult(const JudgedResult& one, const std::vector<LimitCheck>& checks, bool known) {
    Json measurement = resultJson(one);
    for (const LimitCheck& check : checks) {
      addValidators(measurement, check);
      measurement["metadata"]["userLimits"].push_back(checkJson(check));
    }
    stream_.addToStep(kAnalysisStep, "measurement", std::move(measurement), stepEnd_);
    if (one.verdict != ResultVerdict::kNone) {
      stream_.addToStep(kAnalysisStep, "diagnosis", diagnosisJson(one, known), stepEnd_);
    }
    for (const LimitCheck& check : checks) {
      Json diagnosis = diagnosisJson(check, known);
      if (check.warns()) {  // a diagnosis FAIL would make the run fail
        stream_.addToStep(kAnalysisStep, "log", {{"severity", "WARNING"}, {"message", diagnosis["message"]}}, stepEnd_);
      } else {
        stream_.addToStep(kAnalysisStep, "diagnosis", std::move(diagnosis), stepEnd_);
      }
    }
  }

  void writeAnalysis() {
    const std::vector<StagePeriod> stages = stagesThat(isOfAnalysis);
    if (stages.empty() && record_.measuredResults.empty()) return;
    beginStep(kAnalysisStep, record_.analysisName, stages);
    const bool known = record_.verdict != Verdict::kError;
    const std::vector<LimitCheck> checks = limitChecksOf(record_);
    for (std::size_t i = 0; i < record_.measuredResults.size(); ++i) {
      writeResult(record_.measuredResults[i], checksOfResult(checks, i), known);
    }
    // An error of the judge belongs to this step. If an earlier stage failed, the analysis has no result.
    const bool hasError = !known && !errorIsWritten_ && record_.errorStage.value_or(Stage::kAnalyze) == Stage::kAnalyze;
    endStep(kAnalysisStep, hasError, !known && record_.measuredResults.empty());
  }

  void writeEnd() {
    switch (record_.verdict) {
      case Verdict::kPass: return stream_.end("COMPLETE", "PASS", record_.end);
      case Verdict::kSkip: return stream_.end("SKIP", "NOT_APPLICABLE", record_.end);
      case Verdict::kFail: return stream_.end("COMPLETE", "FAIL", record_.end);
      case Verdict::kError: break;
    }
    stream_.end("ERROR", "NOT_APPLICABLE", record_.end);
  }

  const RunStarted& run_;
  const DiagnosticRecord& record_;
  const bool isAccepted_;  // an error that does not count, because a later attempt had none
  OcpStream stream_;
  Date stepEnd_{};
  bool errorIsWritten_ = false;
};

}  // namespace

std::string ocpReport(const RunStarted& run, const std::vector<DiagnosticRecord>& records,
                      const std::optional<std::string>& interrupted) {
  std::string report;
  Date end = run.date;
  for (std::size_t i = 0; i < records.size(); ++i) {
    const bool isAccepted = run.acceptFlaky && isSuperseded(records, i);
    end = OcpRecordWriter(report, run, records[i], isAccepted).write();
  }
  const UnrecordedDiagnostics unrecorded = unrecordedDiagnosticsOf(run, records, interrupted);
  const std::vector<LogLine> noLog;
  if (unrecorded.interrupted) {
    const bool betweenTwo = unrecorded.interrupted->empty();
    const std::string name = betweenTwo ? "quazor" : *unrecorded.interrupted;
    OcpStream stream(report, noLog, end);
    stream.addToRun("testRunStart",
                    startJson(run, name, commandOf(run, betweenTwo ? run.names : std::vector{name}, {})), end);
    addErrors(interruptionOf(run, *unrecorded.interrupted),
              [&stream, end](Json error) { stream.addToRun("error", std::move(error), end); });
    stream.end("ERROR", "NOT_APPLICABLE", end);
  }
  for (const auto& [name, repetition] : unrecorded.neverRun) {
    OcpStream stream(report, noLog, end);
    Json metadata = Json::object();
    if (repetition > 0) metadata["repetition"] = repetition;
    stream.addToRun("testRunStart", startJson(run, name, commandOf(run, {name}, {}), {}, std::move(metadata)), end);
    stream.addToRun("log", {{"severity", "INFO"}, {"message", "The run ended before this was started."}}, end);
    stream.end("SKIP", "NOT_APPLICABLE", end);
  }
  return report;
}

}  // namespace quazor
