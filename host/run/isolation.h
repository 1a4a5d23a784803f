// Runs plug-ins in separate processes.
#pragma once

#include "host/model/run_event.h"
#include "host/plugin/diagnostic_registry.h"
#include "host/plugin/parameters.h"
#include "host/report/progress.h"
#include "host/run/deadlines.h"
#include "host/run/diagnostic_run.h"
#include "host/system/child_process.h"

#include <chrono>
#include <cstdint>
#include <filesystem>
#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <vector>

namespace quazor {

struct IsolationOptions {
  std::vector<std::filesystem::path> plugins;
  std::optional<std::uint64_t> memory;  // limit of a process's address space in bytes; nothing: the system's limit
  std::vector<DeadlineSetting> deadlines;
  std::chrono::nanoseconds grace = kDefaultGrace;
};

// A plug-in that could not be loaded because loading it ended the process.
struct FailedPlugin {
  std::filesystem::path file;
  DiagnosticErrorPtr error;
};

// Returns the options without the failed plug-ins, which would end every process that loads them.
IsolationOptions withoutFailed(IsolationOptions options, const std::vector<FailedPlugin>& failed);

// The diagnostics of the plug-ins, without factories, and the plug-ins that could not be loaded.
struct PluginScan {
  std::vector<DescribedDiagnostic> catalogue;
  std::vector<FailedPlugin> failed;
  bool interrupted = false;
};

// Selects diagnostics from a registry.
using DiagnosticChoice = std::function<std::vector<Diagnostic>(const std::vector<Diagnostic>& catalogue)>;

// Loads the plug-ins in a separate process and lists their diagnostics. Only those selected by `described` are asked
// for their descriptions. A plug-in that ends the process while it is loaded is listed in `failed`; if a description
// ends the process, that is the error of the description. Throws the CommandErrors of loadPlugins and of `described`,
// which is called in the separate process.
PluginScan scanPlugins(const IsolationOptions& options, WatchedSignals& signals, const DiagnosticChoice& described);

// Like runDiagnostic, but in a separate process, which loads only the plug-ins that the diagnostic needs, if they are
// known. If the process ends early, a Failed event for the current stage gives the reason, and DiagnosticCompleted is
// missing. Standard output and standard error of the process become log lines. Returns false if the user interrupted
// the run: a setup or run that has begun then has the time `grace` to return, and its teardown follows.
//
// If `result` is not null, it is analyzed instead of running an experiment.
bool runIsolated(const IsolationOptions& options, WatchedSignals& signals, const Diagnostic& diagnostic,
                 const ResolvedParameters& parameters, const RunOptions& runOptions, const QZExperimentResult* result,
                 Progress& progress, RunEventSink& events);

}  // namespace quazor
