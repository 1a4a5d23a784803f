#include "contract/diagnostic_contract.h"

namespace QUAZOR_CONTRACT {

QZDiagnosticHost::~QZDiagnosticHost() = default;
QZExperiment::~QZExperiment() = default;
QZTeardown::~QZTeardown() = default;
QZAnalysis::~QZAnalysis() = default;
QZAnalysisSetup::~QZAnalysisSetup() = default;

bool QZExperiment::setupWithParameters(const Dictionary& /*parameters*/, QZDiagnosticHost* /*host*/,
                                       DiagnosticErrorPtr* /*error*/) {
  return true;
}

}  // namespace QUAZOR_CONTRACT
