// What a command line selects of the loaded plug-ins, with parameters.
#pragma once

#include "host/command_line.h"
#include "host/installation.h"
#include "host/isolation.h"
#include "host/json_report.h"

#include <vector>

namespace quazor {

struct Selection {
  std::vector<BoundDiagnostic> diagnostics;
  std::vector<FailedPlugin> failed;  // what could not be loaded
};

// The plug-ins that the options name, or the installed one, with the limits of their processes.
IsolationOptions isolationOf(const Options& options, const Installation& installation);

// What the plug-ins have, found out in a process of its own, or in this one with --in-process. `isDescribed` tells what
// is asked for its description. Throws a Refusal for what cannot be loaded, and kInterrupted for an interrupt.
Survey surveyOf(const Options& options, const Installation& installation,
                const std::function<bool(const Diagnostic&)>& isDescribed);

// The selected diagnostics or experiments with their parameters; everything that can be wrong with them has been
// checked, but for required parameters without a value. A name that nothing has is no mistake while a plug-in could not
// be loaded: it may have been that one's.
Selection select(const Options& options, const Installation& installation);

}  // namespace quazor
