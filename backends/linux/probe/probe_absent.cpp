#include "backends/linux/probe/probe_absent.h"

#include <algorithm>
#include <cstddef>
#include <string>

namespace quazor {
namespace {

using Json = nlohmann::ordered_json;

// Whether a group has as many cameras as that side of a phone.
bool hasGroupOf(const Json& binding, std::size_t cameras, const std::string& name) {
  return binding.contains("groups") && binding["groups"].contains(name) &&
         binding["groups"][name]["cameras"].size() >= cameras;
}

bool hasProjector(const Json& binding) {
  if (!binding.contains("cameras")) return false;
  const Json& cameras = binding["cameras"];
  return std::any_of(cameras.begin(), cameras.end(), [](const Json& camera) { return camera.contains("projector"); });
}

}  // namespace

Json absentDiagnostics(const Json& binding, bool forbidden) {
  Json absent = Json::object();
  const auto add = [&](const char* diagnostic, const std::string& reason) {
    absent[diagnostic] =
        reason + (forbidden ? " A camera could not be opened without permission: get it and probe again." : "");
  };
  if (!binding.contains("cameras")) add("SingleCameraDiagnostic", "No camera is bound.");
  if (!hasGroupOf(binding, 3, "back")) add("CameraSyncDiagnostic.Back", "Fewer than three back cameras are bound.");
  if (!hasGroupOf(binding, 2, "front")) add("CameraSyncDiagnostic.Front", "Fewer than two front cameras are bound.");
  if (!hasProjector(binding)) absent["TesselFaultDiagnostic"] = "No camera with a projector is bound.";
  // The probe cannot know which counters of a machine are those of a depth module.
  absent["TesselTelemonDiagnostic"] = "The report channels of a depth module are not bound.";
  return absent;
}

}  // namespace quazor
