#include "host/report/junit_report.h"

#include "contract/message_format.h"
#include "host/error/host_error.h"
#include "host/model/incomplete_run.h"
#include "host/model/limit_check.h"
#include "host/model/trials.h"
#include "host/report/junit_suite.h"
#include "host/report/text_report.h"
#include "host/report/variation_report.h"
#include "host/text/timestamp.h"

#include <cstddef>
#include <string_view>

namespace quazor {

namespace {

void addParameters(JUnitProperties& properties, std::string_view part,
                   const std::vector<ResolvedParameter>& parameters) {
  for (const ResolvedParameter& one : parameters) {
    if (!one.value) continue;
    properties.add(formatMessage("parameter.%@.%@", part, one.name), defaultText(*one.value));
    properties.add(formatMessage("source.%@.%@", part, one.name), one.source);
  }
}

void addBound(JUnitProperties& properties, const std::string& which, const std::shared_ptr<const QZBound>& bound) {
  if (bound == nullptr) return;
  properties.add(which, defaultText(bound->value().value()));
  properties.add(which + "Open", bound->open() ? "true" : "false");
}

JUnitProperties propertiesOf(const JudgedResult& judged) {
  const QZMeasuredResult& result = judged.result;
  JUnitProperties properties;
  properties.add("verdict", std::string(nameOf(judged.verdict)));
  properties.add("value", defaultText(result.measurement().value()));
  properties.add("unit", result.measurement().unit().symbol());
  if (result.limit()) {
    properties.add("limit", result.limit()->name());
    addBound(properties, "lower", result.limit()->lowerBound());
    addBound(properties, "upper", result.limit()->upperBound());
  }
  return properties;
}

// A result that cannot be judged is an error; a failure would blame the hardware.
void addResult(JUnitSuite& suite, const JudgedResult& judged) {
  const QZMeasuredResult& result = judged.result;
  const JUnitProperties properties = propertiesOf(judged);
  if (judged.verdict == ResultVerdict::kError) {
    return suite.addError(result.name(), properties, hostError(HostErrorCode::kCannotBeJudged, judged.problem));
  }
  if (judged.verdict != ResultVerdict::kFail) return suite.addPass(result.name(), properties);
  suite.addFailure(result.name(), properties, againstLimitText(result, limitText(result.limit())));
}

// A failed limit that only warns is a passed case with the verdict "warn". One on a result that is an error by its own
// limit is skipped: the error has a case already.
void addCheck(JUnitSuite& suite, const LimitCheck& check) {
  const Measurement& measurement = check.result.measurement();
  const std::string name = check.result.name() + ": " + labelOf(check.limit);
  JUnitProperties properties;
  properties.add("verdict", std::string(check.verdictName()));
  properties.add("value", defaultText(measurement.value()));
  properties.add("unit", measurement.unit().symbol());
  properties.add("limit", labelOf(check.limit));
  properties.add("severity", std::string(nameOf(check.limit.severity)));
  if (const std::optional<QZLimit> bounds = boundsOf(check)) {
    addBound(properties, "lower", bounds->lowerBound());
    addBound(properties, "upper", bounds->upperBound());
  }
  if (!check.problem.empty()) properties.add("problem", check.problem);
  if (check.skipped) return suite.addSkipped(name, properties, check.problem);
  if (check.passed || check.warns()) return suite.addPass(name, properties);
  if (!check.problem.empty()) {
    return suite.addError(name, properties, hostError(HostErrorCode::kCannotBeJudged, check.problem));
  }
  suite.addFailure(name, properties, againstLimitText(check.result, labelOf(check.limit)));
}

// Adds the measurements of an experiment on its own.
void addExperiment(JUnitSuite& suite, const DiagnosticRecord& record) {
  JUnitProperties properties;
  for (const auto& [name, measurement] : record.measurements) {
    properties.add("measurement." + name, valueText(measurement));
  }
  suite.addPass("result", properties);
}

void addRun(JUnitProperties& properties, const RunStarted& run) {
  properties.add("program", run.program);
  properties.add("contract", std::to_string(run.contract));
  for (const std::string& plugin : run.plugins) properties.add("plugin", plugin);
  properties.add("phone", run.phone);
  if (!run.id.empty()) properties.add("run", run.id);
  if (!run.host.empty()) properties.add("host", run.host);
  if (run.analyzed) {
    if (!run.analyzed->id.empty()) properties.add("analyzed.run", run.analyzed->id);
    properties.add("analyzed.date", timestampText(run.analyzed->date));
    if (!run.analyzed->host.empty()) properties.add("analyzed.host", run.analyzed->host);
  }
  for (const auto& [key, value] : run.tags) properties.add("tag." + key, value);
}

void addTrial(JUnitProperties& properties, const Trial& trial) {
  if (trial.attempt > 0) properties.add("attempt", std::to_string(trial.attempt));
  if (trial.repetition > 0) properties.add("repetition", std::to_string(trial.repetition));
}

// An error that was accepted, because a later attempt had none, does not make a build fail.
JUnitSuite suiteOfSuperseded(const RunStarted& run, const DiagnosticRecord& record) {
  JUnitSuite suite(record.name, record.begin, record.end);
  suite.properties().add("verdict", std::string(nameOf(record.verdict)));
  suite.properties().add("summary", record.summary);
  suite.properties().add("seed", std::to_string(record.seed));
  addTrial(suite.properties(), record.trial);
  addParameters(suite.properties(), "experiment", record.parameters.experiment);
  addParameters(suite.properties(), "analysis", record.parameters.analysis);
  addRun(suite.properties(), run);
  suite.addSkipped("superseded", {},
                   formatMessage("%@ ended in an error, which was accepted because a later attempt had "
                                 "none:\n%@",
                                 trialText(record), errorText(record.error, "")));
  suite.addLog(record.log);
  return suite;
}

JUnitSuite suiteOf(const RunStarted& run, const DiagnosticRecord& record) {
  JUnitSuite suite(record.name, record.begin, record.end);
  JUnitProperties& properties = suite.properties();
  properties.add("verdict", std::string(nameOf(record.verdict)));
  properties.add("summary", record.summary);
  properties.add("seed", std::to_string(record.seed));
  addTrial(properties, record.trial);
  addParameters(properties, "experiment", record.parameters.experiment);
  addParameters(properties, "analysis", record.parameters.analysis);
  addRun(properties, run);
  const std::vector<LimitCheck> checks = limitChecksOf(record);
  for (std::size_t i = 0; i < record.measuredResults.size(); ++i) {
    addResult(suite, record.measuredResults[i]);
    for (const LimitCheck& check : checksOfResult(checks, i)) addCheck(suite, check);
  }
  if (record.experimentOnly && record.verdict == Verdict::kPass) addExperiment(suite, record);
  // If results cannot be judged, their own cases have the errors.
  if (record.error != nullptr && !isHostError(record.error, HostErrorCode::kCannotBeJudged)) {
    suite.addError(std::string(errorStageText(record)), {}, record.error);
  }
  if (record.skip) suite.addSkipped(std::string(nameOf(record.skip->kind)), {}, record.skip->reason);
  suite.addLog(record.log);
  return suite;
}

JUnitSuite suiteOfUnrecorded(const RunStarted& run, const std::string& name, Date date) {
  JUnitSuite suite(name, date, date);
  suite.properties().add("seed", std::to_string(run.seed));
  addRun(suite.properties(), run);
  return suite;
}

// Without what only the end of the program shows, such as a report that cannot be written.
ExitCode exitCodeOfRun(const RunStarted& run, const std::vector<DiagnosticRecord>& records,
                       const std::optional<std::string>& interrupted, const ExitRules& rules) {
  if (interrupted && !run.analyzed) return ExitCode::kInterrupted;
  const ExitCode code = exitCodeOf(records, rules);
  return interrupted && code == ExitCode::kAllPassed ? ExitCode::kIncomplete : code;
}

}  // namespace

std::string junitReport(const RunStarted& run, const std::vector<DiagnosticRecord>& records,
                        const std::optional<std::string>& interrupted, const ExitRules& rules) {
  const std::string verdict(interrupted ? nameOf(Verdict::kError) : nameOf(runVerdictOf(records, rules.acceptFlaky)));
  const std::string exitCode = std::to_string(static_cast<int>(exitCodeOfRun(run, records, interrupted, rules)));
  JUnitCounts counts;
  std::string suites;
  const auto add = [&](JUnitSuite suite) {
    suite.properties().add("run.verdict", verdict);
    suite.properties().add("run.exitCode", exitCode);
    counts += suite.counts();
    suites += suite.xml();
  };
  for (std::size_t i = 0; i < records.size(); ++i) {
    const bool isAccepted = run.acceptFlaky && isSuperseded(records, i);
    add(isAccepted ? suiteOfSuperseded(run, records[i]) : suiteOf(run, records[i]));
  }
  const Date end = records.empty() ? run.date : records.back().end;
  const UnrecordedDiagnostics unrecorded = unrecordedDiagnosticsOf(run, records, interrupted);
  if (unrecorded.interrupted) {
    const std::string& name = *unrecorded.interrupted;
    JUnitSuite suite = suiteOfUnrecorded(run, name.empty() ? "quazor" : name, end);
    suite.addError("interrupted", {}, interruptionOf(run, name));
    add(suite);
  }
  for (const PlannedDiagnostic& one : unrecorded.neverRun) {
    JUnitSuite suite = suiteOfUnrecorded(run, one.name, end);
    if (one.repetition > 0) suite.properties().add("repetition", std::to_string(one.repetition));
    suite.addSkipped("never-run", {}, "The run ended before this was started.");
    add(suite);
  }
  return "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n" + junitTag("testsuites", "quazor", counts, run.date) + suites +
         "</testsuites>\n";
}

}  // namespace quazor
