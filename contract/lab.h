// QZLab: what plug-ins have registered.
#pragma once

#include "contract/contract.h"
#include "contract/diagnostic_contract.h"

#include <functional>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

namespace QUAZOR_CONTRACT {

// Factories make a new instance on every call.
using QZExperimentFactory = std::function<std::shared_ptr<QZExperiment>()>;
using QZAnalysisFactory = std::function<std::shared_ptr<QZAnalysis>()>;

// Names are public and permanent: they stand in scripts and records. A name that is taken is not registered again;
// the first registration stays and the refusal is kept for the host to act on.
//
// Thread: registrations come from plug-ins' initializers, on the thread that loads them; no other call at that time.
class QUAZOR_EXPORT QZLab {
 public:
  enum class Kind { kExperiment, kAnalysis, kDiagnostic };

  // One registration, in the terms in which it was made; what its kind does not have is empty.
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

  // The process-wide lab. Never released.
  static QZLab& defaultLab();

  void addExperimentWithName(std::string_view name, QZExperimentFactory block);
  void addAnalysisWithName(std::string_view name, QZAnalysisFactory block);
  void addDiagnosticWithName(std::string_view name, std::string_view summary, std::string_view experimentName,
                             std::string_view analysisName);

  // All registrations, in the order in which they were made.
  const std::vector<Registration>& registrations() const { return registrations_; }
  // The names that a registration of the same kind had already taken, in order.
  const std::vector<std::string>& refusedNames() const { return refusedNames_; }
  // The registration of that kind and name, or null; valid until the next registration.
  const Registration* find(Kind kind, std::string_view name) const;

 private:
  void add(Registration registration);

  std::vector<Registration> registrations_;
  std::vector<std::string> refusedNames_;
};

}  // namespace QUAZOR_CONTRACT
