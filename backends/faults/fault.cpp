#include "backends/faults/fault.h"

#include <nlohmann/json.hpp>

namespace quazor {

std::string_view faultActionName(FaultAction action) {
  switch (action) {
    case FaultAction::kFail: return "fail";
    case FaultAction::kNothing: return "nothing";
    case FaultAction::kHang: return "hang";
    case FaultAction::kDelay: return "delay";
  }
  return "";
}

nlohmann::ordered_json faultJson(const Fault& fault) {
  nlohmann::ordered_json json;
  json["operation"] = fault.operation;
  if (fault.object) json["object"] = *fault.object;
  if (fault.property) json["property"] = *fault.property;
  if (fault.occurrence) json["occurrence"] = *fault.occurrence;
  json["action"] = faultActionName(fault.action);
  if (fault.error) {
    json["error"] = {{"domain", fault.error->domain}, {"code", fault.error->code}, {"message", fault.error->message}};
  }
  if (fault.action == FaultAction::kDelay) json["seconds"] = fault.seconds;
  return json;
}

}  // namespace quazor
