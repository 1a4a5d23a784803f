// Running one diagnostic, from the making of its experiment to its measured results; or an experiment on its own.
#pragma once

#include "contract/results.h"
#include "host/device/phone.h"
#include "host/model/run_event.h"
#include "host/plugin/diagnostic_registry.h"
#include "host/plugin/parameters.h"

#include <functional>
#include <memory>

namespace quazor {

struct RunOptions {
  PhoneMaker makePhone;
  LogLevel logLevel = LogLevel::kDefault;
  // Gets each run's phone before anything happens on it, and may keep it; may be empty.
  std::function<void(const std::shared_ptr<const Phone>&)> watchPhone;
};

// Runs the diagnostic on a phone of its own and tells `events` how it goes, from the first stage to
// DiagnosticCompleted. The calling thread is the one that the plug-in is called on, and it blocks until the run is
// over. Log lines come on any thread, the other events on this one; `events` gets one at a time.
//
// A stage that fails, gives nothing or throws ends the run, but for a teardown: that one follows on every setup that
// succeeded, and after one that failed the analysis still takes place, for what it shows. An experiment on its own ends
// with its teardown.
void runDiagnostic(const Diagnostic& diagnostic, const ResolvedParameters& parameters, const RunOptions& options,
                   RunEventSink& events);

// As runDiagnostic, from the analysis on: `result` is what an earlier run measured, and is told first. There is no
// phone.
void analyzeResult(const Diagnostic& diagnostic, const ResolvedParameters& parameters, const QZExperimentResult& result,
                   LogLevel logLevel, RunEventSink& events);

}  // namespace quazor
