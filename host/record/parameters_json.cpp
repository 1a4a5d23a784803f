#include "host/record/parameters_json.h"

#include "host/record/json_members.h"
#include "host/record/lossless_json.h"

#include <optional>
#include <utility>

namespace quazor {

using Json = nlohmann::ordered_json;

namespace {

Json partJson(const std::vector<ResolvedParameter>& parameters) {
  Json json = Json::array();
  for (const ResolvedParameter& one : parameters) {
    Json parameter = {{"name", losslessText(one.name)},
                      {"summary", losslessText(one.declaration.summary())},
                      {"required", one.declaration.required()}};
    if (one.value) {
      parameter["value"] = losslessValue(*one.value);
      parameter["source"] = losslessText(one.source);
    }
    json.push_back(std::move(parameter));
  }
  return json;
}

std::vector<ResolvedParameter> partAt(const Json& json, const char* key) {
  std::vector<ResolvedParameter> parameters;
  for (const Json& one : arrayAt(json, key)) {
    ResolvedParameter parameter{
        textAt(one, "name"), QZNumberParameter(textAt(one, "summary"), get<bool>(one, "required")), std::nullopt, {}};
    if (one.contains("value")) {
      parameter.value = valueFrom(one["value"]);
      parameter.source = textAt(one, "source");
    }
    parameters.push_back(std::move(parameter));
  }
  return parameters;
}

}  // namespace

Json parametersJson(const ResolvedParameters& parameters) {
  return {{"experiment", partJson(parameters.experiment)}, {"analysis", partJson(parameters.analysis)}};
}

ResolvedParameters parametersAt(const Json& json, const char* key) {
  const Json& parameters = memberOf(json, key);
  return {partAt(parameters, "experiment"), partAt(parameters, "analysis")};
}

Json plannedJson(const std::vector<PlannedParameters>& planned) {
  Json json = Json::array();
  for (const auto& [name, parameters] : planned) {
    json.push_back({{"name", losslessText(name)}, {"parameters", parametersJson(parameters)}});
  }
  return json;
}

std::vector<PlannedParameters> plannedAt(const Json& json, const char* key) {
  std::vector<PlannedParameters> planned;
  if (!json.contains(key)) return planned;
  for (const Json& one : arrayAt(json, key)) planned.push_back({textAt(one, "name"), parametersAt(one, "parameters")});
  return planned;
}

}  // namespace quazor
