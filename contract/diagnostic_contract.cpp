#include "contract/diagnostic_contract.h"

#include "contract/parameter_range.h"

namespace QUAZOR_CONTRACT {

QZDiagnosticHost::~QZDiagnosticHost() = default;
QZExperiment::~QZExperiment() = default;
QZTeardown::~QZTeardown() = default;
QZAnalysis::~QZAnalysis() = default;
QZAnalysisSetup::~QZAnalysisSetup() = default;
QZParameterRanges::~QZParameterRanges() = default;

bool QZExperiment::setupWithParameters(const Dictionary& /*parameters*/, QZDiagnosticHost* /*host*/,
                                       DiagnosticErrorPtr* /*error*/) {
  return true;
}

}  // namespace QUAZOR_CONTRACT
