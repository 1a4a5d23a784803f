// Runs one diagnostic once, without a report.
#pragma once

#include "host/model/diagnostic_record.h"
#include "host/run/isolation.h"

#include <cstdint>

namespace quazor {

// Runs the diagnostic or experiment in a process of its own or, if `signals` is null, in this one, and returns the
// record of the run. If it was interrupted, the record ends there.
DiagnosticRecord recordOfRun(const DescribedDiagnostic& described, const ResolvedParameters& parameters,
                             const RunOptions& runOptions, std::uint64_t seed, const IsolationOptions& isolation,
                             WatchedSignals* signals);

}  // namespace quazor
