#include "diagnostics/projector_fault/tessel_fault_analysis.h"

#include "diagnostics/report_channels/expected_telemon_names.h"

#include <cstdint>
#include <string_view>
#include <utility>

namespace quazor {

namespace {

constexpr std::string_view kFrameCountMeasurement = "FrameCount";
constexpr std::int64_t kMissingMeasurement = 6;

// Appends the measurement under `key` as a result that must be zero in `unit`; returns false if it is missing.
bool appendZeroLimited(QZAnalysisResult& analysis, const QZExperimentResult& result, std::string_view key,
                       std::string_view name, const QZUnit& unit, DiagnosticErrorPtr* error) {
  const Measurement* measurement = result.measurements().find(key);
  if (measurement == nullptr) {
    fail(error, QZErrorDomain, kMissingMeasurement, nullptr, "Missing measurement named %@!", key);
    return false;
  }
  const auto zero = std::make_shared<const QZBound>(Measurement(0.0, unit), false);
  QZLimit limit("Limit");
  limit.setLowerBound(zero);
  limit.setUpperBound(zero);
  analysis.measuredResults().emplace_back(name, *measurement).setLimit(std::move(limit));
  return true;
}

}  // namespace

QZDescription QZTesselFaultAnalysis::analysisDescription() const {
  QZDescription description("Analyse the results of a Tessel Stream with Telemon capture.");
  description.addParameter(QZNumberParameter("The minimum number of frames required in this analysis.", true),
                           kFrameCountParameter);
  return description;
}

bool QZTesselFaultAnalysis::setupWithParameters(const Dictionary& parameters, QZDiagnosticHost* /*host*/,
                                                DiagnosticErrorPtr* /*error*/) {
  const Value* frameCount = parameters.find(kFrameCountParameter);
  _frameCount = frameCount == nullptr ? std::nullopt : std::optional<Value>(*frameCount);
  return true;
}

std::unique_ptr<QZAnalysisResult> QZTesselFaultAnalysis::analyzeExperimentResult(const QZExperimentResult& result,
                                                                                 DiagnosticErrorPtr* error) {
  auto analysis = std::make_unique<QZAnalysisResult>();
  for (const std::string_view name : expectedTelemonNames()) {
    if (!result.measurements().contains(name)) {
      fail(error, QZErrorDomain, kMissingMeasurement, nullptr, "Missing measurement for %@", name);
      return nullptr;
    }
    if (!appendZeroLimited(*analysis, result, name, name, QZDimensionlessUnit::events(), error)) return nullptr;
  }
  const Measurement* frameCount = result.measurements().find(kFrameCountMeasurement);
  if (frameCount == nullptr) {
    fail(error, QZErrorDomain, kMissingMeasurement, nullptr, "Missing %@ measurement!", kFrameCountMeasurement);
    return nullptr;
  }
  QZLimit minimum("Min Frame Count");
  minimum.setLowerBound(std::make_shared<const QZBound>(
      Measurement(toDouble(pointerTo(_frameCount)), QZDimensionlessUnit::frames()), false));
  analysis->measuredResults().emplace_back("Actual Frames", *frameCount).setLimit(std::move(minimum));
  const QZUnit& errors = QZDimensionlessUnit::errors();
  if (!appendZeroLimited(*analysis, result, "I2C", "I2C Errors", errors, error) ||
      !appendZeroLimited(*analysis, result, "MIPI", "MIPI Errors", errors, error) ||
      !appendZeroLimited(*analysis, result, "SIF", "SIF Errors", errors, error)) {
    return nullptr;
  }
  return analysis;
}

}  // namespace quazor
