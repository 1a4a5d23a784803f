// The limit of nesting for what plug-ins give: values and errors beyond it could not be recorded or printed.
#pragma once

#include "contract/diagnostic_error.h"
#include "contract/value.h"

#include <string>

namespace quazor {

// True if the value can be recorded: it has at most kMaxValueLevels levels.
bool isWithinLevels(const Value& value);

// The host's error for an entry of a result that is nested more deeply.
DiagnosticErrorPtr errorOfDeepEntry(const std::string& key, const std::string& experiment);

// Returns `error` if it can be recorded. Otherwise returns an error with the same domain, code and message, whose chain
// of causes keeps these three, too, and ends after kMaxCausesKept causes with an error of the host that says so.
DiagnosticErrorPtr errorWithinLevels(DiagnosticErrorPtr error);
inline constexpr int kMaxCausesKept = 100;

// The error with more at the end of its text.
DiagnosticErrorPtr errorWithMore(const DiagnosticError& same, const std::string& more);

}  // namespace quazor
