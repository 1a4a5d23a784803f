// Runs one diagnostic, from the creation of its experiment to its measured results, or an experiment on its own.
#pragma once

#include "contract/results.h"
#include "host/device/phone.h"
#include "host/model/run_event.h"
#include "host/plugin/diagnostic_registry.h"
#include "host/plugin/parameters.h"
#include "host/run/frame_teller.h"
#include "host/run/log_limit.h"

#include <functional>
#include <memory>

namespace quazor {

struct RunOptions {
  PhoneMaker makePhone;
  LogLevel logLevel = LogLevel::kDefault;
  // True if the user has interrupted the run; may be empty. Asked between the stages, on the thread of the run: no
  // setup, run or analysis begins then, but the teardown of a successful setup does.
  std::function<bool()> isInterrupted;
  LogLimit logLimit;  // of a run in a separate process, which then does not send what would not be kept
  // Called with the phone of each run before it is used, and may keep it; may be empty.
  std::function<void(const std::shared_ptr<const Phone>&)> watchPhone;
  TraceSetting trace;  // what becomes events of a run in a separate process, or of runDiagnosticHere()
  // Receives the frames of the phone, in the time of the log; may be null. runIsolated() and runDiagnosticHere() set
  // it.
  std::shared_ptr<FrameRings> frames;
};

// Runs the diagnostic on a new phone and sends its events to `events`, from the first stage to DiagnosticCompleted.
// Calls the plug-in on the calling thread and blocks until the run is over. Log lines are sent on any thread, other
// events on this one; `events` receives one at a time.
//
// A stage that fails, returns nothing or throws ends the run. Teardown follows every successful setup, and a failed
// teardown does not prevent the analysis, because its results may be useful. An experiment on its own ends with its
// teardown.
void runDiagnostic(const Diagnostic& diagnostic, const ResolvedParameters& parameters, const RunOptions& options,
                   RunEventSink& events);

// Like runDiagnostic, but starts with the analysis. `result` contains the measurements of an earlier run, which are
// sent as events first. There is no phone.
void analyzeResult(const Diagnostic& diagnostic, const ResolvedParameters& parameters, const QZExperimentResult& result,
                   LogLevel logLevel, RunEventSink& events);

}  // namespace quazor
