// Errors of calls that a fault makes fail.
#pragma once

#include "backends/faults/call_interceptor.h"

#include <string>

namespace quazor {

// An error of the operation's service with the message `sentence`. Thread: any.
DiagnosticErrorPtr simulatedInjectedError(const CallSite& site, std::string sentence);

}  // namespace quazor
