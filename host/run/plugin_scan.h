// Finds out what plug-ins register, in separate processes.
#pragma once

#include "contract/diagnostic_error.h"
#include "host/plugin/diagnostic_registry.h"
#include "host/run/isolation.h"
#include "host/system/child_process.h"

#include <filesystem>
#include <functional>
#include <vector>

namespace quazor {

// A plug-in that could not be loaded: loading it ended its process, there was no process, or it was refused.
struct FailedPlugin {
  std::filesystem::path file;
  DiagnosticErrorPtr error;
};

// Returns the options without the failed plug-ins.
IsolationOptions withoutFailed(IsolationOptions options, const std::vector<FailedPlugin>& failed);

// The diagnostics of the plug-ins, without factories, and the plug-ins that could not be loaded.
struct PluginScan {
  std::vector<DescribedDiagnostic> catalogue;
  std::vector<FailedPlugin> failed;
  std::vector<Cost> loading;  // of each plug-in that was loaded, in their order; empty if that was not measured
  bool interrupted = false;
};

// Selects diagnostics from a registry.
using DiagnosticChoice = std::function<std::vector<Diagnostic>(const std::vector<Diagnostic>& catalogue)>;

// Loads each plug-in in a process of its own, lists the diagnostics of all, and asks those selected by `described` for
// their descriptions. What one plug-in does has no effect on another: one that cannot be loaded is listed in `failed`,
// and a diagnostic that needs a part of it is left out.
//
// Throws the CommandErrors of `described`. A plug-in is refused if others may change it, if it is no plug-in of this
// contract, registers nothing or a name that is already taken, or if a diagnostic names a part that no plug-in
// registers although all were loaded: throws a CommandError (kCannotRead), or lists it in `failed` if options.unasked.
PluginScan scanPlugins(const IsolationOptions& options, WatchedSignals& signals, const DiagnosticChoice& described);

// Asks the diagnostics of the catalogue that `wanted` contains for their descriptions. Those that need the same
// plug-ins share a process, which loads only these. If a description ends the process, that is the error of the
// description, and the rest go on in a new process. Returns false if the user interrupted it.
bool describeIsolated(const IsolationOptions& options, WatchedSignals& signals, const std::vector<Diagnostic>& wanted,
                      std::vector<DescribedDiagnostic>& catalogue);

}  // namespace quazor
