// The report as one JSON document. docs/json_output.md is its public description.
#pragma once

#include "host/model/diagnostic_record.h"
#include "host/model/limit_check.h"
#include "host/plugin/diagnostic_registry.h"
#include "host/plugin/parameters.h"

#include <nlohmann/json.hpp>

#include <optional>
#include <string>
#include <vector>

namespace quazor {

// Null without a limit.
nlohmann::ordered_json limitJson(const std::optional<QZLimit>& limit);
// A limit of the user, with its origin.
nlohmann::ordered_json userLimitJson(const UserLimit& limit);
// The same with the verdict and, if the result could not be compared, the problem.
nlohmann::ordered_json checkJson(const LimitCheck& check);

nlohmann::ordered_json recordJson(const DiagnosticRecord& record);

// The record of an experiment on its own.
nlohmann::ordered_json experimentJson(const DiagnosticRecord& record);

// The document of a run. `interrupted` is the diagnostic that was running when the run was interrupted.
nlohmann::ordered_json runDocument(const std::vector<DiagnosticRecord>& records,
                                   const std::optional<std::string>& interrupted);

// Like runDocument, for a run of experiments on their own.
nlohmann::ordered_json experimentDocument(const std::vector<DiagnosticRecord>& records,
                                          const std::optional<std::string>& interrupted);

// The document of a listing. The descriptions of experiments on their own must be known.
nlohmann::ordered_json listDocument(const std::vector<DescribedDiagnostic>& diagnostics);

// The document of descriptions.
nlohmann::ordered_json descriptionDocument(const std::vector<ResolvedDiagnostic>& diagnostics);

}  // namespace quazor
