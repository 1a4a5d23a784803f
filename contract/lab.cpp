#include "contract/lab.h"

#include <utility>

namespace QUAZOR_CONTRACT {

QZLab& QZLab::defaultLab() {
  static auto* const lab = new QZLab;
  return *lab;
}

void QZLab::addExperimentWithName(std::string_view name, QZExperimentFactory block) {
  add({Kind::kExperiment, std::string(name), {}, {}, {}, std::move(block), {}});
}

void QZLab::addAnalysisWithName(std::string_view name, QZAnalysisFactory block) {
  add({Kind::kAnalysis, std::string(name), {}, {}, {}, {}, std::move(block)});
}

void QZLab::addDiagnosticWithName(std::string_view name, std::string_view summary, std::string_view experimentName,
                                  std::string_view analysisName) {
  add({Kind::kDiagnostic,
       std::string(name),
       std::string(summary),
       std::string(experimentName),
       std::string(analysisName),
       {},
       {}});
}

const QZLab::Registration* QZLab::find(Kind kind, std::string_view name) const {
  for (const Registration& registration : registrations_) {
    if (registration.kind == kind && registration.name == name) return &registration;
  }
  return nullptr;
}

void QZLab::add(Registration registration) {
  if (find(registration.kind, registration.name) != nullptr) {
    refusedNames_.push_back(std::move(registration.name));
  } else {
    registrations_.push_back(std::move(registration));
  }
}

}  // namespace QUAZOR_CONTRACT
