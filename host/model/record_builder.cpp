#include "host/model/record_builder.h"

#include "host/model/limit_check.h"

#include <utility>

namespace quazor {

void RecordBuilder::onEvent(const RunEvent& event) {
  std::visit([this](const auto& one) { fold(one); }, event);
}

std::optional<Stage> RecordBuilder::stage() const {
  if (record_.stages.empty() || record_.stages.back().end) return std::nullopt;
  return record_.stages.back().stage;
}

std::vector<RunEvent> RecordBuilder::ending(Date date) const {
  const RecordJudgement judgement = judgeRecord(record_, completed_);
  std::vector<RunEvent> events;
  if (judgement.error != nullptr && judgement.error != record_.error) {
    events.emplace_back(Failed{std::nullopt, judgement.error});
  }
  events.emplace_back(DiagnosticEnded{judgement.verdict, date});
  return events;
}

void RecordBuilder::fold(const RunStarted& event) {
  limits_ = event.limits;
  attempts_ = event.attempts;
  repetitions_ = event.repetitions;
}

void RecordBuilder::fold(const DiagnosticStarted& event) {
  record_ = DiagnosticRecord();
  record_.name = event.name;
  record_.summary = event.summary;
  record_.experimentName = event.experimentName;
  record_.analysisName = event.analysisName;
  record_.experimentOnly = event.experimentOnly;
  record_.parameters = event.parameters;
  record_.limits = limitsFor(event.name, limits_);
  record_.seed = event.seed;
  record_.trial = {event.attempt, attempts_, event.repetition, repetitions_};
  record_.begin = event.date;
  record_.end = event.date;
  open_ = true;
  completed_ = false;
}

void RecordBuilder::fold(const StageStarted& event) {
  record_.stages.push_back({event.stage, event.date, std::nullopt});
  record_.end = event.date;
}

void RecordBuilder::fold(const StageEnded& event) {
  if (stage() == event.stage) record_.stages.back().end = event.date;
  record_.end = event.date;
  StageDurations& durations = record_.durations;
  if (event.stage == Stage::kSetup) durations.setup = event.duration;
  if (event.stage == Stage::kRun) durations.run = event.duration;
  if (event.stage == Stage::kTeardown) durations.teardown = event.duration;
  if (event.stage == Stage::kAnalyze) durations.analysis = event.duration;
}

void RecordBuilder::fold(const Logged& event) { record_.log.push_back(event.line); }

void RecordBuilder::fold(const MeasurementsAdded& event) {
  for (const auto& [name, measurement] : event.measurements) record_.measurements.set(name, measurement);
}

void RecordBuilder::fold(const AuxiliaryDataAdded& event) { record_.auxiliaryData.set(event.key, event.value); }

void RecordBuilder::fold(const ResultsReported& event) {
  for (const QZMeasuredResult& result : event.results) record_.measuredResults.push_back(judgeResult(result));
}

void RecordBuilder::fold(const Failed& event) {
  if (record_.error != nullptr) return;
  record_.error = event.error;
  record_.errorStage = event.stage;
}

void RecordBuilder::fold(const FaultsCounted& event) { record_.faults = event.faults; }

void RecordBuilder::fold(const DiagnosticSkipped& event) { record_.skip = event.skip; }

void RecordBuilder::fold(const Heartbeat& /*event*/) {}

// There may be millions, and no report shows them.
void RecordBuilder::fold(const FramesTraced& /*event*/) {}

void RecordBuilder::fold(const DiagnosticCompleted& /*event*/) { completed_ = true; }

void RecordBuilder::fold(const DiagnosticEnded& event) {
  record_.verdict = event.verdict;
  if (event.verdict != Verdict::kSkip) record_.skip.reset();  // something went wrong besides
  record_.end = event.date;
  open_ = false;
}

void RecordBuilder::fold(const RunEnded& /*event*/) {}

}  // namespace quazor
