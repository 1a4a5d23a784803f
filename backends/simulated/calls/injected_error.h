// The errors of calls that a fault makes fail.
#pragma once

#include "backends/faults/call_interceptor.h"

#include <string>

namespace quazor {

// The error of the service that the operation belongs to, with `sentence` as its message. Any thread.
DiagnosticErrorPtr simulatedInjectedError(const CallSite& site, std::string sentence);

}  // namespace quazor
