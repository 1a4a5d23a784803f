// RecordBuilder: builds diagnostic records from the events of a run.
#pragma once

#include "host/model/run_event.h"

#include <cstdint>
#include <optional>
#include <vector>

namespace quazor {

// Processes the events of one diagnostic after the other. Ignores events outside of DiagnosticStarted to
// DiagnosticEnded.
// Thread: one at a time.
class RecordBuilder final : public RunEventSink {
 public:
  void onEvent(const RunEvent& event) override;

  // True from DiagnosticStarted to DiagnosticEnded.
  bool isOpen() const { return open_; }
  // True after DiagnosticCompleted.
  bool isCompleted() const { return completed_; }
  // The current stage; nothing between two stages.
  std::optional<Stage> stage() const;
  // The record, so far, of the diagnostic that started last.
  const DiagnosticRecord& record() const { return record_; }
  // Moves the record out. The next diagnostic starts a new one.
  DiagnosticRecord takeRecord() { return std::move(record_); }

  // The events that end the diagnostic: the failure to judge, if any, and the verdict. The verdict is derived only from
  // errors, results and limits; verdicts in earlier events are ignored.
  std::vector<RunEvent> ending(Date date) const;

 private:
  void fold(const RunStarted& event);
  void fold(const DiagnosticStarted& event);
  void fold(const StageStarted& event);
  void fold(const StageEnded& event);
  void fold(const Logged& event);
  void fold(const MeasurementsAdded& event);
  void fold(const AuxiliaryDataAdded& event);
  void fold(const ResultsReported& event);
  void fold(const Failed& event);
  void fold(const FaultsCounted& event);
  void fold(const DiagnosticSkipped& event);
  void fold(const Heartbeat& event);
  void fold(const FramesTraced& event);
  void fold(const DiagnosticCompleted& event);
  void fold(const DiagnosticEnded& event);
  void fold(const RunEnded& event);

  std::vector<UserLimit> limits_;  // of the run
  std::uint64_t attempts_ = 0;     // as in RunStarted
  std::uint64_t repetitions_ = 0;
  DiagnosticRecord record_;
  bool open_ = false;
  bool completed_ = false;
};

}  // namespace quazor
