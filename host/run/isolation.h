// Runs diagnostics in separate processes.
#pragma once

#include "host/model/run_event.h"
#include "host/plugin/diagnostic_registry.h"
#include "host/plugin/parameters.h"
#include "host/report/progress.h"
#include "host/run/deadlines.h"
#include "host/run/diagnostic_run.h"
#include "host/system/child_process.h"
#include "host/system/shared_counter.h"

#include <chrono>
#include <cstdint>
#include <filesystem>
#include <functional>
#include <memory>
#include <optional>
#include <vector>

namespace quazor {

struct IsolationOptions {
  std::vector<std::filesystem::path> plugins;
  std::optional<std::uint64_t> memory;  // limit of a process's address space in bytes; nothing: the system's limit
  std::vector<DeadlineSetting> deadlines;
  std::chrono::nanoseconds grace = kDefaultGrace;
  std::chrono::nanoseconds heartbeat{};      // the time between two Heartbeat events of a run; zero: none
  std::function<void(Stage)> onInterrupt{};  // called at the first interrupt of a stage that may go on
  bool unasked = false;  // nobody named the plug-ins: a refused one is an error of its own and stops no other
};

// Memory that quazor and the process of a run share.
struct SharedRunState {
  SharedCounter interrupted;             // 1 once the user has interrupted the run
  SharedCounter leftOut;                 // the number of log lines that the process did not send
  SharedCounter lost;                    // 1 if the process ended itself because its connection was gone
  std::shared_ptr<FrameRings> frames{};  // of the phone of the run; null: its frames are not told
};

// Calls `body` in a separate process and passes on the events that it sends, from the first stage to
// DiagnosticCompleted, which follows only when the process has ended by itself with exit code 0. Otherwise it is
// missing, and a Failed event for the current or last stage gives the reason. After the last stage, the process has as
// much time to end as that stage had. Standard output and standard error of the process become log lines. Returns false
// if the user interrupted the run: a setup or run that has begun then has the time `grace` to return, and its teardown
// follows. The body can use `shared`.
bool superviseRun(const IsolationOptions& options, WatchedSignals& signals, const Diagnostic& diagnostic,
                  const ResolvedParameters& parameters, const std::function<void(RunEventSink& toParent)>& body,
                  SharedRunState& shared, Progress& progress, RunEventSink& events);

// Like runDiagnostic, but in a separate process, as superviseRun, which loads only the plug-ins that the diagnostic
// needs, if they are known.
//
// If `result` is not null, it is analyzed instead of running an experiment.
bool runIsolated(const IsolationOptions& options, WatchedSignals& signals, const Diagnostic& diagnostic,
                 const ResolvedParameters& parameters, const RunOptions& runOptions, const QZExperimentResult* result,
                 Progress& progress, RunEventSink& events);

}  // namespace quazor
