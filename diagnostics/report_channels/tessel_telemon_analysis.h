// QZTesselTelemonAnalysis: requires every expected channel of the depth camera module to be present and 0.
#pragma once

#include "contract/diagnostic_contract.h"

#include <memory>

namespace quazor {

// Returns one result per expected name, in the order of expectedTelemonNames(), limited to 0. Ignores other
// measurements.
// Thread: the host's, as QZAnalysis.
class QZTesselTelemonAnalysis final : public QZAnalysis {
 public:
  QZDescription analysisDescription() const override;
  // Fails with QZErrorDomain code 6 at the first name without a measurement.
  std::unique_ptr<QZAnalysisResult> analyzeExperimentResult(const QZExperimentResult& result,
                                                            DiagnosticErrorPtr* error) override;
};

}  // namespace quazor
