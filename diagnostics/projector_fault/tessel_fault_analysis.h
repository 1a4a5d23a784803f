// QZTesselFaultAnalysis: requires enough frames, no errors and no fault events.
#pragma once

#include "contract/diagnostic_contract.h"

#include <memory>
#include <optional>
#include <string_view>
#include <utility>

namespace quazor {

// The required number of lit frames: a parameter of the experiment and of the analysis.
inline constexpr std::string_view kFrameCountParameter = "frameCount";

// Returns one result per expected report channel, limited to 0, the frame count with its minimum, and the I2C, MIPI and
// SIF errors, limited to 0. The LPDP, UART and projector errors are informational.
// Thread: the host's, as QZAnalysis.
class QZTesselFaultAnalysis final : public QZAnalysis, public QZAnalysisSetup {
 public:
  // The minimum number of frames that the run must have delivered; 0 if absent.
  const std::optional<Value>& frameCount() const { return _frameCount; }
  void setFrameCount(std::optional<Value> count) { _frameCount = std::move(count); }

  QZDescription analysisDescription() const override;
  // Parameter: "frameCount", used without checks. Never fails.
  bool setupWithParameters(const Dictionary& parameters, QZDiagnosticHost* host, DiagnosticErrorPtr* error) override;
  // Fails with QZErrorDomain code 6 at the first missing measurement.
  std::unique_ptr<QZAnalysisResult> analyzeExperimentResult(const QZExperimentResult& result,
                                                            DiagnosticErrorPtr* error) override;

 private:
  std::optional<Value> _frameCount;
};

}  // namespace quazor
