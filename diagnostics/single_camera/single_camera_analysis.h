// QZSingleCameraAnalysis: limits for the frames of one camera.
#pragma once

#include "contract/diagnostic_contract.h"
#include "contract/parameter_range.h"

#include <memory>

namespace quazor {

// Reports every measurement of QZSingleCameraExperiment. All have limits except "Frames", which depends on the duration
// only, and the frame rate that was asked for.
// Thread: the host's, as QZAnalysis.
class QZSingleCameraAnalysis final : public QZAnalysis, public QZAnalysisSetup, public QZParameterRanges {
 public:
  QZDescription analysisDescription() const override;
  OrderedMap<QZParameterRange> parameterRanges() const override;
  // Parameters, all optional: "frameRateTolerance" in percent of the rate that was asked for, 5;
  // "maximumMissingFrames", 0; "maximumJitter" in milliseconds, 5; "maximumErrors" of each counter, 0;
  // "maximumSilenceAtStart", 2000, and "maximumSilenceAtEnd", 500, in milliseconds. Fails with QZErrorDomain code 5 if
  // one is negative or not a number.
  bool setupWithParameters(const Dictionary& parameters, QZDiagnosticHost* host, DiagnosticErrorPtr* error) override;
  // Fails with QZErrorDomain code 6 if the experiment left out a measurement.
  std::unique_ptr<QZAnalysisResult> analyzeExperimentResult(const QZExperimentResult& result,
                                                            DiagnosticErrorPtr* error) override;

 private:
  double frameRateTolerance_ = 5;  // percent
  double maximumMissingFrames_ = 0;
  double maximumJitter_ = 5;  // ms
  double maximumErrors_ = 0;
  double maximumSilenceAtStart_ = 2'000;  // ms
  double maximumSilenceAtEnd_ = 500;      // ms
};

}  // namespace quazor
