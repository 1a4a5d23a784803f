// Running plug-ins in processes of their own.
#pragma once

#include "host/model/run_event.h"
#include "host/plugin/diagnostic_registry.h"
#include "host/plugin/parameters.h"
#include "host/report/progress.h"
#include "host/run/deadlines.h"
#include "host/run/diagnostic_run.h"
#include "host/system/child_process.h"

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
  std::optional<std::uint64_t> memory;  // the most address space of a process, in bytes; nothing: as the system has it
  std::vector<DeadlineSetting> deadlines;
};

// A plug-in that could not be loaded because its process did not survive it.
struct FailedPlugin {
  std::filesystem::path file;
  DiagnosticErrorPtr error;
};

// Without the plug-ins that failed, which would end every process that loads them.
IsolationOptions withoutFailed(IsolationOptions options, const std::vector<FailedPlugin>& failed);

// What the plug-ins have, without their factories, and those of them that could not be loaded.
struct PluginScan {
  std::vector<DescribedDiagnostic> catalogue;
  std::vector<FailedPlugin> failed;
  bool interrupted = false;
};

// Chooses from a catalogue.
using DiagnosticChoice = std::function<std::vector<Diagnostic>(const std::vector<Diagnostic>& catalogue)>;

// Loads the plug-ins in a process of their own and asks what is in them; only what `described` chooses is asked for its
// description. A plug-in that ends its process while it is loaded is left out and told in `failed`; what
// ends its process while it is described has that as its description's error. Throws the Refusals of loadPlugins and of
// `described`, which is called in that process.
PluginScan scanPlugins(const IsolationOptions& options, WatchedSignals& signals, const DiagnosticChoice& described);

// As runDiagnostic, in a process of its own, which loads the plug-ins that the diagnostic needs, and no others where
// they are known. Whatever ends that process before its time becomes a Failed event of the stage it was in, and there
// is no DiagnosticCompleted then. What it writes to its standard output and error stream become log lines. False when
// the user interrupted it.
//
// `result`, if it is not null, is analyzed, and no experiment is run.
bool runIsolated(const IsolationOptions& options, WatchedSignals& signals, const Diagnostic& diagnostic,
                 const ResolvedParameters& parameters, const RunOptions& runOptions, const QZExperimentResult* result,
                 Progress& progress, RunEventSink& events);

}  // namespace quazor
