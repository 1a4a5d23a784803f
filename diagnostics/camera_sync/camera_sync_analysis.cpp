#include "diagnostics/camera_sync/camera_sync_analysis.h"

#include "diagnostics/camera_sync/camera_names.h"

#include <optional>
#include <string_view>

namespace quazor {

namespace {

constexpr std::int64_t kMissingMeasurement = 6;

const Measurement* findMeasurement(const QZExperimentResult& result, const std::string& key,
                                   DiagnosticErrorPtr* error) {
  const Measurement* measurement = result.measurements().find(key);
  if (measurement == nullptr)
    fail(error, QZErrorDomain, kMissingMeasurement, nullptr, "Missing measurement for %@", key);
  return measurement;
}

// Both bounds are the camera's own total, so every total that is a number passes: totals are not compared with each
// other. Only the first camera has no limit.
QZLimit frameTotalLimit(const Measurement& total) {
  QZLimit limit("FrameTotalLimit");
  limit.setLowerBound(std::make_shared<const QZBound>(total, false));
  limit.setUpperBound(std::make_shared<const QZBound>(total, false));
  return limit;
}

}  // namespace

QZCameraSyncAnalysis::QZCameraSyncAnalysis(const std::vector<std::string>& ports) {
  for (const std::string& port : ports) {
    if (const std::optional<std::string_view> name = cameraNameForPortType(port)) _cameras.emplace_back(*name);
  }
}

QZDescription QZCameraSyncAnalysis::analysisDescription() const {
  return QZDescription(
      "Analyze the measurements of a multicam sesison status.\n"
      "    Each port produces an offset and frame count. The offset represents how many frames after the previous "
      "camera was started.\n"
      "    The primary port will always have an offset of 0. The sum of the offset and frame count of all synchronized "
      "cameras should be equal.");
}

std::unique_ptr<QZAnalysisResult> QZCameraSyncAnalysis::analyzeExperimentResult(const QZExperimentResult& result,
                                                                                DiagnosticErrorPtr* error) {
  auto analysis = std::make_unique<QZAnalysisResult>();
  std::vector<QZMeasuredResult>& results = analysis->measuredResults();
  std::optional<double> firstTotal;
  for (const std::string& camera : _cameras) {
    const std::string offsetKey = cameraKey(camera, kFrameOffsetQuantity);
    const Measurement* offset = findMeasurement(result, offsetKey, error);
    if (offset == nullptr) return nullptr;
    results.emplace_back(offsetKey, *offset);

    const std::string framesKey = cameraKey(camera, kFramesQuantity);
    const Measurement* frames = findMeasurement(result, framesKey, error);
    if (frames == nullptr) return nullptr;
    results.emplace_back(framesKey, *frames);

    const Measurement total(frames->value() + offset->value(), QZDimensionlessUnit::frames());
    QZMeasuredResult& totalResult = results.emplace_back(cameraKey(camera, kTotalQuantity), total);
    if (firstTotal) {
      totalResult.setLimit(frameTotalLimit(total));
    } else {
      firstTotal = total.value();
    }
  }
  return analysis;
}

}  // namespace quazor
