#include "tests/sample_record.h"

#include "host/record/record_file.h"

#include <cstdint>

namespace quazor {
namespace {

// Thread: one at a time.
class Lines {
 public:
  void add(const RunEvent& event) { text_ += recordLine(event, count_++); }

  void add(const DiagnosticRecord& record) {
    add(DiagnosticStarted{record.name, record.summary, record.experimentName, record.analysisName,
                          record.experimentOnly, record.parameters, record.seed, record.begin, record.trial.attempt,
                          record.trial.repetition});
    if (record.skip) add(DiagnosticSkipped{*record.skip});
    for (const StagePeriod& one : record.stages) {
      add(StageStarted{one.stage, one.begin});
      if (one.end) add(StageEnded{one.stage, std::nullopt, *one.end});
    }
    for (const LogLine& line : record.log) add(Logged{line});
    addContents(record);
    if (record.error != nullptr) add(Failed{record.errorStage, record.error});
    if (!record.faults.empty()) add(FaultsCounted{record.faults});
    if (record.error == nullptr && !record.skip) add(DiagnosticCompleted{});
    add(DiagnosticEnded{record.verdict, record.end});
  }

  const std::string& text() const { return text_; }

 private:
  void addContents(const DiagnosticRecord& record) {
    MeasurementsAdded measured;
    for (const auto& [name, measurement] : record.measurements) measured.measurements.emplace_back(name, measurement);
    if (!measured.measurements.empty()) add(measured);
    for (const auto& [key, value] : record.auxiliaryData) add(AuxiliaryDataAdded{key, value});
    ResultsReported found;
    for (const JudgedResult& one : record.measuredResults) found.results.push_back(one.result);
    if (!found.results.empty()) add(found);
  }

  std::string text_;
  std::uint64_t count_ = 0;
};

}  // namespace

std::string recordOf(const RunStarted& run, const std::vector<DiagnosticRecord>& records,
                     const std::optional<std::string>& interrupted) {
  Lines lines;
  lines.add(RunEvent(run));
  for (const DiagnosticRecord& record : records) lines.add(record);
  lines.add(RunEnded{interrupted, records.empty() ? run.date : records.back().end});
  return lines.text();
}

}  // namespace quazor
