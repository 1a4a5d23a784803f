// The parameters of diagnostics in JSON, as records have them.
#pragma once

#include "host/model/run_event.h"
#include "host/plugin/parameters.h"

#include <nlohmann/json.hpp>

#include <vector>

namespace quazor {

nlohmann::ordered_json parametersJson(const ResolvedParameters& parameters);
// Reads that member. Throws InputError. The ranges of parameters are not kept.
ResolvedParameters parametersAt(const nlohmann::ordered_json& json, const char* key);

nlohmann::ordered_json plannedJson(const std::vector<PlannedParameters>& planned);
// Reads that member; nothing if there is none. Throws InputError.
std::vector<PlannedParameters> plannedAt(const nlohmann::ordered_json& json, const char* key);

}  // namespace quazor
