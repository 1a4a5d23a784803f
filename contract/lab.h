// QZLab: the registry of experiments, analyses and diagnostics.
#pragma once

#include "contract/contract.h"
#include "contract/diagnostic_contract.h"

#include <functional>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

namespace QUAZOR_CONTRACT {

// Factories return a new instance on every call.
using QZExperimentFactory = std::function<std::shared_ptr<QZExperiment>()>;
using QZAnalysisFactory = std::function<std::shared_ptr<QZAnalysis>()>;

// Names are public and permanent, because scripts and records use them. A name can be registered only once: the first
// registration stays, and later ones are listed in refusedNames() for the host.
//
// Thread: registrations come from plug-ins' initializers, on the thread that loads them; no other call at that time.
class QUAZOR_EXPORT QZLab {
 public:
  enum class Kind { kExperiment, kAnalysis, kDiagnostic };

  // One registration. Members that do not apply to its kind are empty.
  struct Registration {
    Kind kind;
    std::string name;
    std::string summary;
    std::string experimentName;
    std::string analysisName;
    QZExperimentFactory makeExperiment;
    QZAnalysisFactory makeAnalysis;
  };

  QZLab() = default;
  QZLab(const QZLab&) = delete;
  QZLab& operator=(const QZLab&) = delete;

  // The process-wide lab; never destroyed.
  static QZLab& defaultLab();

  void addExperimentWithName(std::string_view name, QZExperimentFactory block);
  void addAnalysisWithName(std::string_view name, QZAnalysisFactory block);
  void addDiagnosticWithName(std::string_view name, std::string_view summary, std::string_view experimentName,
                             std::string_view analysisName);

  // All registrations, in order.
  const std::vector<Registration>& registrations() const { return registrations_; }
  // The names whose registration was refused because the same kind already had that name, in order.
  const std::vector<std::string>& refusedNames() const { return refusedNames_; }
  // Returns the registration with that kind and name, or null. The pointer is valid until the next registration.
  const Registration* find(Kind kind, std::string_view name) const;

 private:
  void add(Registration registration);

  std::vector<Registration> registrations_;
  std::vector<std::string> refusedNames_;
};

}  // namespace QUAZOR_CONTRACT
