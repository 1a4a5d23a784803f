// What a command line selects of the loaded plug-ins, with parameters.
#pragma once

#include "host/cli/command_line.h"
#include "host/cli/installation.h"
#include "host/run/isolation.h"

#include <vector>

namespace quazor {

struct Selection {
  std::vector<ResolvedDiagnostic> diagnostics;
  std::vector<FailedPlugin> failed;  // what could not be loaded
};

// The plug-ins that the options name, or the installed one, with the limits of their processes.
IsolationOptions isolationOf(const Options& options, const Installation& installation);

// What the plug-ins have, found out in a process of its own, or in this one with --in-process. `described` chooses what
// is asked for its description. Throws a CommandError for what cannot be loaded, and kInterrupted for an interrupt.
PluginScan surveyOf(const Options& options, const Installation& installation, const DiagnosticChoice& described);

// What the plug-ins have; only what the options select is asked for its description. Throws as surveyOf, and for names
// of something else than what the command is for; names that nothing has are passed over.
PluginScan surveyForSelection(const Options& options, const Installation& installation);

// The selected diagnostics or experiments with their parameters; everything that can be wrong with them has been
// checked, but for required parameters without a value. Nothing else is asked for its description, unless a profile's
// entry fits more than what is selected and sets a parameter that nothing selected declares: then the rest of what it
// fits is asked. A name that nothing has is no mistake while a plug-in could not be loaded: it may have been that
// one's.
Selection select(const Options& options, const Installation& installation);

}  // namespace quazor
