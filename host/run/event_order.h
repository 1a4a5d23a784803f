// The order in which a plug-in's process sends the events of its run.
#pragma once

#include "host/model/run_event.h"

namespace quazor {

// Accepts events in the order in which runDiagnostic() and analyzeResult() send them after the stage of loading: each
// stage at most once and never an earlier one. So the deadlines of the stages limit the whole run.
// Thread: one at a time.
class EventOrder {
 public:
  // Returns false if the event may not follow those accepted before.
  bool accepts(const RunEvent& event);

  // The current stage or, between two stages and after all of them, the one that ended last.
  Stage stage() const { return stage_; }
  // True from the beginning of the first stage.
  bool hasBegun() const { return began_; }
  // True between two stages and after the last one.
  bool isBetweenStages() const { return began_ && !open_; }
  bool isCompleted() const { return completed_; }

 private:
  bool accept(const StageStarted& event);
  bool accept(const StageEnded& event);
  bool accept(const Failed& event) const;
  bool accept(const ResultsReported& event) const;
  bool accept(const FaultsCounted& event);
  bool accept(const DiagnosticCompleted& event);
  bool acceptsMeasured() const;

  Stage stage_ = Stage::kLoad;
  bool began_ = false;
  bool open_ = false;
  bool counted_ = false;
  bool completed_ = false;
};

}  // namespace quazor
