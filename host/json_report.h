// The report as one JSON document. docs/json_output.md is its public description.
#pragma once

#include "host/catalogue.h"
#include "host/diagnostic_run.h"
#include "host/parameters.h"

#include <nlohmann/json.hpp>

#include <optional>
#include <string>
#include <vector>

namespace quazor {

// A diagnostic with the values its parameters would have in a run.
struct BoundDiagnostic {
  DescribedDiagnostic described;
  BoundParameters parameters;
};

nlohmann::ordered_json recordJson(const DiagnosticRecord& record);

// The document of a run. `interrupted` is the diagnostic that was running when the run was interrupted.
nlohmann::ordered_json runDocument(const std::vector<DiagnosticRecord>& records,
                                   const std::optional<std::string>& interrupted);

// The document of a listing.
nlohmann::ordered_json listDocument(const std::vector<Diagnostic>& diagnostics);

// The document of descriptions.
nlohmann::ordered_json descriptionDocument(const std::vector<BoundDiagnostic>& diagnostics);

}  // namespace quazor
