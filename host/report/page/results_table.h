// The results of a diagnostic as a table, and a sentence for each that failed.
#pragma once

#include "host/model/diagnostic_record.h"

#include <string>
#include <vector>

namespace quazor {

// A word on a ground of its colour: "pass", "fail", "error", "skip", "warn" or "none", which is shown as a dash.
std::string verdictBadge(std::string_view verdict);

// Every measured result with all its limits: what failed first, then errors, warnings, what is in its limits and what
// has none, each in the order of the record. Empty without results.
std::string resultsTable(const DiagnosticRecord& record);

// "A is 86 frames, 4 below the limit (Enough: >= 90)" for each result that failed or cannot be judged, as HTML.
std::vector<std::string> failureSentences(const DiagnosticRecord& record);

}  // namespace quazor
