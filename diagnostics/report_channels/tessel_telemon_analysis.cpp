#include "diagnostics/report_channels/tessel_telemon_analysis.h"

#include "diagnostics/report_channels/expected_telemon_names.h"

#include <cstdint>
#include <string_view>
#include <utility>

namespace quazor {

namespace {

constexpr std::int64_t kMissingMeasurement = 6;

}  // namespace

QZDescription QZTesselTelemonAnalysis::analysisDescription() const {
  return QZDescription("Make sure all the Tessel Telemons were measured.");
}

std::unique_ptr<QZAnalysisResult> QZTesselTelemonAnalysis::analyzeExperimentResult(const QZExperimentResult& result,
                                                                                   DiagnosticErrorPtr* error) {
  auto analysis = std::make_unique<QZAnalysisResult>();
  for (const std::string_view name : expectedTelemonNames()) {
    const Measurement* measurement = result.measurements().find(name);
    if (measurement == nullptr) {
      fail(error, QZErrorDomain, kMissingMeasurement, nullptr, "Missing measurement for %@", name);
      return nullptr;
    }
    const Measurement zero(0.0, QZDimensionlessUnit::events());
    QZLimit limit("Max Reports");
    limit.setLowerBound(std::make_shared<const QZBound>(zero, false));
    limit.setUpperBound(std::make_shared<const QZBound>(zero, false));
    analysis->measuredResults().emplace_back(name, *measurement).setLimit(std::move(limit));
  }
  return analysis;
}

}  // namespace quazor
