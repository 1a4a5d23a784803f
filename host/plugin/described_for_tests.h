// Described diagnostics and profiles for the tests of parameters.
#pragma once

#include "host/error/host_error.h"
#include "host/plugin/parameters.h"

#include <string>
#include <utility>
#include <vector>

namespace quazor {

inline QZDescription descriptionWith(const std::vector<std::pair<std::string, bool>>& parameters) {
  QZDescription description("Summary.");
  for (const auto& [name, required] : parameters) {
    description.addParameter(QZNumberParameter("About it.", required), name);
  }
  return description;
}

inline DescribedDiagnostic diagnosticWith(const std::string& name,
                                          const std::vector<std::pair<std::string, bool>>& experiment,
                                          const std::vector<std::pair<std::string, bool>>& analysis) {
  DescribedDiagnostic described;
  described.diagnostic.name = name;
  described.description.experiment = descriptionWith(experiment);
  described.description.analysis = descriptionWith(analysis);
  return described;
}

inline DescribedDiagnostic fault() {
  return diagnosticWith("Fault", {{"frameCount", true}, {"timeout", true}}, {{"frameCount", true}});
}
inline DescribedDiagnostic sync() { return diagnosticWith("Sync.Back", {{"duration", true}}, {}); }
inline DescribedDiagnostic relaxed() { return diagnosticWith("Relaxed", {{"gain", false}}, {}); }

inline DescribedDiagnostic undescribed() {
  DescribedDiagnostic described = diagnosticWith("Broken", {}, {});
  described.description.error = hostError(HostErrorCode::kException, "it threw");
  return described;
}

inline DescribedDiagnostic imagesAlone() {
  DescribedDiagnostic described = diagnosticWith("Images", {{"images", true}, {"timeout", true}}, {});
  described.diagnostic.experimentOnly = true;
  described.diagnostic.usedBy = {"Fault", "Sync.Back"};
  return described;
}

inline Profile profileWith(const std::string& diagnostics) {
  return parseProfile("dir/some.json", R"({"schema": 1, "diagnostics": )" + diagnostics + "}");
}

}  // namespace quazor
