// Results and errors that are hard to judge, to write or to read back.
#pragma once

#include "contract/diagnostic_contract.h"
#include "contract/results.h"

#include <memory>
#include <string_view>

namespace quazor::attacks {

// Fills the result of an analysis; `kind` is one of those in the source.
void findNumber(std::string_view kind, QZAnalysisResult& result);

// Returns the error of a run that fails; null if it fails without one. `kind` is one of those in the source.
DiagnosticErrorPtr errorToGive(std::string_view kind);

// Puts the odd text `kind` (ways.h) on the surface: "measurement", "unit", "data", "result" or "limit".
void measureText(std::string_view surface, std::string_view kind, QZExperimentResult& result);
void findText(std::string_view surface, std::string_view kind, QZAnalysisResult& result);

}  // namespace quazor::attacks
