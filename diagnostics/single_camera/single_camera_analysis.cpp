#include "diagnostics/single_camera/single_camera_analysis.h"

#include "diagnostics/single_camera/single_camera_names.h"

#include <optional>
#include <string>
#include <string_view>

namespace quazor {

namespace {

using Bound = std::optional<double>;

QZLimit limitOf(std::string_view name, const Bound& lower, const Bound& upper, const QZUnit& unit) {
  QZLimit limit(std::string(name) + "Limit");
  if (lower) limit.setLowerBound(std::make_shared<const QZBound>(Measurement(*lower, unit), false));
  if (upper) limit.setUpperBound(std::make_shared<const QZBound>(Measurement(*upper, unit), false));
  return limit;
}

}  // namespace

QZDescription QZSingleCameraAnalysis::analysisDescription() const {
  QZDescription description("Ensure the camera delivers its frames on time and without errors.");
  const auto add = [&](std::string_view name, std::string_view summary) {
    description.addParameter(QZNumberParameter(summary, false), name);
  };
  add("frameRateTolerance", "How far the frame rate may be from the one asked for.");
  add("maximumMissingFrames", "The largest number of missing frames that passes.");
  add("maximumJitter", "The largest jitter of the time stamps that passes.");
  add("maximumErrors", "The largest growth of an error counter that passes.");
  add("maximumSilenceAtStart", "The longest wait for the first frame that passes.");
  add("maximumSilenceAtEnd", "The longest time without a frame at the end that passes.");
  return description;
}

OrderedMap<QZParameterRange> QZSingleCameraAnalysis::parameterRanges() const {
  OrderedMap<QZParameterRange> ranges;
  const auto add = [&](std::string_view name, double usual, std::string_view unit) {
    QZParameterRange range;
    range.setMinimum(0);
    range.setUnit(unit);
    range.setDefault(usual);
    ranges.set(name, range);
  };
  add("frameRateTolerance", frameRateTolerance_, "%");
  add("maximumMissingFrames", maximumMissingFrames_, "frames");
  add("maximumJitter", maximumJitter_, "ms");
  add("maximumErrors", maximumErrors_, "errors");
  add("maximumSilenceAtStart", maximumSilenceAtStart_, "ms");
  add("maximumSilenceAtEnd", maximumSilenceAtEnd_, "ms");
  return ranges;
}

bool QZSingleCameraAnalysis::setupWithParameters(const Dictionary& parameters, QZDiagnosticHost* /*host*/,
                                                 DiagnosticErrorPtr* error) {
  const auto read = [&](std::string_view name, double& target) {
    const Value* const given = parameters.find(name);
    if (given == nullptr) return true;
    const double value = toDouble(given);
    if (!(value >= 0)) {  // also refuses not-a-number
      fail(error, QZErrorDomain, single_camera::kBadParameterValue, nullptr, "%@ must be at least 0, not %@", name,
           value);
      return false;
    }
    target = value;
    return true;
  };
  return read("frameRateTolerance", frameRateTolerance_) && read("maximumMissingFrames", maximumMissingFrames_) &&
         read("maximumJitter", maximumJitter_) && read("maximumErrors", maximumErrors_) &&
         read("maximumSilenceAtStart", maximumSilenceAtStart_) && read("maximumSilenceAtEnd", maximumSilenceAtEnd_);
}

std::unique_ptr<QZAnalysisResult> QZSingleCameraAnalysis::analyzeExperimentResult(const QZExperimentResult& result,
                                                                                  DiagnosticErrorPtr* error) {
  using namespace single_camera;
  const auto find = [&](std::string_view name) {
    const Measurement* const measurement = result.measurements().find(name);
    if (measurement == nullptr) {
      fail(error, QZErrorDomain, single_camera::kMissingMeasurement, nullptr, "Missing measurement for %@", name);
    }
    return measurement;
  };
  const Measurement* const requested = find(kRequestedFrameRate);
  if (requested == nullptr) return nullptr;
  const double tolerance = requested->value() * frameRateTolerance_ / 100;
  const struct {
    std::string_view name;
    Bound lower, upper;
  } rows[] = {
      {kFrames, {}, {}},
      {kFrameRate, requested->value() - tolerance, requested->value() + tolerance},
      {kMissingFrames, {}, maximumMissingFrames_},
      {kUntimedFrames, {}, 0},
      {kBackwardTimeStamps, {}, 0},
      {kJitter, {}, maximumJitter_},
      {kSilenceAtStart, {}, maximumSilenceAtStart_},
      {kSilenceAtEnd, {}, maximumSilenceAtEnd_},
  };
  auto analysis = std::make_unique<QZAnalysisResult>();
  std::vector<QZMeasuredResult>& results = analysis->measuredResults();
  for (const auto& [name, lower, upper] : rows) {
    const Measurement* const measurement = find(name);
    if (measurement == nullptr) return nullptr;
    QZMeasuredResult& measured = results.emplace_back(name, *measurement);
    if (lower || upper) measured.setLimit(limitOf(name, lower, upper, measurement->unit()));
  }
  for (const auto& [name, measurement] : result.measurements()) {
    if (!name.starts_with(kErrorsPrefix)) continue;
    results.emplace_back(name, measurement).setLimit(limitOf("Errors", 0, maximumErrors_, measurement.unit()));
  }
  return analysis;
}

}  // namespace quazor
