// QZCameraSyncAnalysis: the frame offset, frame count and total of each camera of a synchronised session.
#pragma once

#include "contract/diagnostic_contract.h"

#include <memory>
#include <string>
#include <vector>

namespace quazor {

// Per camera it gives the frame offset, the frame count and their sum, in this order.
// Thread: the host's, as QZAnalysis.
class QZCameraSyncAnalysis final : public QZAnalysis {
 public:
  // `ports` are port types; one without a camera name is left out.
  explicit QZCameraSyncAnalysis(const std::vector<std::string>& ports);

  // The names of the cameras it expects, in the order of their ports.
  const std::vector<std::string>& cameras() const { return _cameras; }

  QZDescription analysisDescription() const override;
  // Fails with QZErrorDomain code 6 at the first measurement that is missing.
  std::unique_ptr<QZAnalysisResult> analyzeExperimentResult(const QZExperimentResult& result,
                                                            DiagnosticErrorPtr* error) override;

 private:
  std::vector<std::string> _cameras;
};

}  // namespace quazor
