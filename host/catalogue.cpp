#include "host/catalogue.h"

#include "host/exit_code.h"
#include "host/host_error.h"
#include "host/idle_platform.h"
#include "host/nearest_name.h"

#include <fnmatch.h>

#include <algorithm>

namespace quazor {

std::vector<Diagnostic> catalogueOf(const QZLab& lab) {
  std::vector<Diagnostic> catalogue;
  for (const QZLab::Registration& one : lab.registrations()) {
    if (one.kind != QZLab::Kind::kDiagnostic) continue;
    const QZLab::Registration* experiment = lab.find(QZLab::Kind::kExperiment, one.experimentName);
    const QZLab::Registration* analysis = lab.find(QZLab::Kind::kAnalysis, one.analysisName);
    catalogue.push_back({one.name, one.summary, one.experimentName, one.analysisName, experiment->makeExperiment,
                         analysis->makeAnalysis});
  }
  return catalogue;
}

DiagnosticDescription describeDiagnostic(const Diagnostic& diagnostic) {
  DiagnosticDescription description;
  installPlatform(idlePlatform());
  callPlugin("describing " + diagnostic.experimentName, &description.error, [&](DiagnosticErrorPtr* error) {
    const std::shared_ptr<QZExperiment> experiment = diagnostic.makeExperiment();
    if (experiment == nullptr) {
      *error = hostError(HostErrorCode::kNothingMade, "the factory of " + diagnostic.experimentName + " made nothing");
      return false;
    }
    description.experiment = experiment->experimentDescription();
    return true;
  });
  if (description.error != nullptr) return description;
  callPlugin("describing " + diagnostic.analysisName, &description.error, [&](DiagnosticErrorPtr* error) {
    const std::shared_ptr<QZAnalysis> analysis = diagnostic.makeAnalysis();
    if (analysis == nullptr) {
      *error = hostError(HostErrorCode::kNothingMade, "the factory of " + diagnostic.analysisName + " made nothing");
      return false;
    }
    description.analysis = analysis->analysisDescription();
    return true;
  });
  return description;
}

std::vector<Diagnostic> selectDiagnostics(const std::vector<Diagnostic>& catalogue,
                                          const std::vector<std::string>& names) {
  std::vector<Diagnostic> selected;
  for (const std::string& name : names) {
    const bool exact =
        std::any_of(catalogue.begin(), catalogue.end(), [&name](const Diagnostic& one) { return one.name == name; });
    bool found = false;
    for (const Diagnostic& one : catalogue) {
      if (exact ? one.name != name : !matchesName(name, one.name)) continue;
      found = true;
      const bool again = std::any_of(selected.begin(), selected.end(),
                                     [&one](const Diagnostic& other) { return other.name == one.name; });
      if (!again) selected.push_back(one);
    }
    if (found) continue;
    if (isPattern(name)) throw Refusal(ExitCode::kUsage, "no diagnostic matches '" + name + "'");
    throw Refusal(ExitCode::kUsage, "there is no diagnostic '" + name + "'" + didYouMean(name, namesOf(catalogue)));
  }
  return selected;
}

bool matchesName(const std::string& pattern, const std::string& name) {
  return pattern == name || fnmatch(pattern.c_str(), name.c_str(), FNM_NOESCAPE) == 0;
}

bool isPattern(const std::string& text) { return text.find_first_of("*?[") != std::string::npos; }

std::vector<std::string> namesOf(const std::vector<Diagnostic>& diagnostics) {
  std::vector<std::string> names;
  names.reserve(diagnostics.size());
  for (const Diagnostic& diagnostic : diagnostics) names.push_back(diagnostic.name);
  return names;
}

}  // namespace quazor
