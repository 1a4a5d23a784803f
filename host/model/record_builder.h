// RecordBuilder: from a run's events to what is known of its diagnostics.
#pragma once

#include "host/model/run_event.h"

#include <optional>
#include <vector>

namespace quazor {

// Folds the events of one diagnostic after the other. Events that belong to no diagnostic, and those of a diagnostic
// before its DiagnosticStarted, change nothing.
// Thread: one at a time.
class RecordBuilder final : public RunEventSink {
 public:
  void onEvent(const RunEvent& event) override;

  // True from DiagnosticStarted to DiagnosticEnded.
  bool isOpen() const { return open_; }
  // True when the plug-in's part is over.
  bool isCompleted() const { return completed_; }
  // The stage that has begun last and not ended; nothing between two.
  std::optional<Stage> stage() const;
  // The diagnostic that began last, as far as it has come.
  const DiagnosticRecord& record() const { return record_; }
  // Gives the record away; a new one begins with the next diagnostic.
  DiagnosticRecord takeRecord() { return std::move(record_); }

  // What closes the diagnostic: the judge's failure if it has one, then the verdict. Nothing that the events say of a
  // verdict counts: it follows from errors, results and limits alone.
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
  void fold(const DiagnosticCompleted& event);
  void fold(const DiagnosticEnded& event);
  void fold(const RunEnded& event);

  DiagnosticRecord record_;
  bool open_ = false;
  bool completed_ = false;
};

}  // namespace quazor
