// Runs in this process whose frames are told.
#pragma once

#include "host/run/diagnostic_run.h"

namespace quazor {

// Like runDiagnostic(), but tells the frames of the phone, too, if `options.trace` says so. `events` may then receive
// them on another thread at any time, also while it receives another event.
void runDiagnosticHere(const Diagnostic& diagnostic, const ResolvedParameters& parameters, const RunOptions& options,
                       RunEventSink& events);

}  // namespace quazor
