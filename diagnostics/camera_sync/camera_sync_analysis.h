// QZCameraSyncAnalysis: the frame offset, frame count and total of each camera of a synchronised session.
#pragma once

#include "contract/diagnostic_contract.h"

#include <memory>
#include <string>
#include <vector>

namespace quazor {

// Returns the frame offset, the frame count and their sum for each camera, in this order.
// Thread: the host's, as QZAnalysis.
class QZCameraSyncAnalysis final : public QZAnalysis {
 public:
  // `ports` are port types; ports without a camera name are omitted.
  explicit QZCameraSyncAnalysis(const std::vector<std::string>& ports);

  // The names of the expected cameras, in the order of their ports.
  const std::vector<std::string>& cameras() const { return _cameras; }

  QZDescription analysisDescription() const override;
  // Fails with QZErrorDomain code 6 at the first missing measurement.
  std::unique_ptr<QZAnalysisResult> analyzeExperimentResult(const QZExperimentResult& result,
                                                            DiagnosticErrorPtr* error) override;

 private:
  std::vector<std::string> _cameras;
};

}  // namespace quazor
