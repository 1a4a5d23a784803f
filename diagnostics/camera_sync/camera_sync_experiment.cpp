#include "diagnostics/camera_sync/camera_sync_experiment.h"

#include "contract/log_channel.h"
#include "diagnostics/camera_sync/camera_names.h"
#include "diagnostics/camera_sync/camera_session.h"
#include "platform/capture_keys.h"

#include <optional>
#include <string_view>
#include <utility>

namespace quazor {

namespace {

constexpr std::string_view kDurationParameter = "duration";
constexpr double kMinimumDuration = 2.0;  // seconds
constexpr std::int64_t kBadParameter = 5;

std::unique_ptr<QZExperimentResult> buildResult(const std::vector<std::string>& ports,
                                                const std::vector<CameraReport>& reports) {
  auto result = std::make_unique<QZExperimentResult>();
  Dictionary errorCounters;
  for (std::size_t i = 0; i < ports.size(); ++i) {
    const std::optional<std::string_view> camera = cameraNameForPortType(ports[i]);
    if (!camera) continue;
    const QZUnit& frames = QZDimensionlessUnit::frames();
    result->measurements().set(cameraKey(*camera, kFrameOffsetQuantity),
                               Measurement(toDouble(pointerTo(reports[i].offset)), frames));
    result->measurements().set(cameraKey(*camera, kFramesQuantity),
                               Measurement(toDouble(pointerTo(reports[i].frames)), frames));
    errorCounters.set(*camera, reports[i].errorCounters);
  }
  result->auxiliaryData().set(capture_key::ErrorCounters, std::move(errorCounters));
  return result;
}

}  // namespace

QZCameraSyncExperiment::QZCameraSyncExperiment(std::vector<std::string> ports, Array formatIndexes, Value frameRate,
                                               Platform platform)
    : _ports(std::move(ports)),
      _formatIndexes(std::move(formatIndexes)),
      _frameRate(std::move(frameRate)),
      _platform(std::move(platform)) {}

QZDescription QZCameraSyncExperiment::experimentDescription() const {
  QZDescription description("Synchronize the cameras and collect statistics from the session.");
  description.addParameter(
      QZNumberParameter("The stream duraiton. Anything less than 2s may not generate any data.", true),
      kDurationParameter);
  return description;
}

bool QZCameraSyncExperiment::setupWithParameters(const Dictionary& parameters, QZDiagnosticHost* /*host*/,
                                                 DiagnosticErrorPtr* error) {
  _duration = toDouble(parameters.find(kDurationParameter));
  if (_duration < kMinimumDuration) {
    fail(error, QZErrorDomain, kBadParameter, nullptr, "duration must be at least 2s!");
    return false;
  }
  return true;
}

std::unique_ptr<QZExperimentResult> QZCameraSyncExperiment::run(DiagnosticErrorPtr* error) {
  const std::shared_ptr<CapturePlugIn> plugIn = _platform.capture->createPlugIn();
  if (plugIn == nullptr) {
    logError("Failed to load capture plugin!");
    fail(error, QZCapturePlugInErrorDomain, camera_sync_error::kNoDevice, nullptr, "Failed to create capture device!");
    return nullptr;
  }
  DiagnosticErrorPtr underlying;
  std::shared_ptr<CaptureDevice> device = plugIn->device(&underlying);
  if (device == nullptr) {
    logError("Failed to create capture device! %@", underlying);
    fail(error, QZCapturePlugInErrorDomain, camera_sync_error::kNoDevice, underlying,
         "Failed to create capture device!");
    return nullptr;
  }
  std::optional<CameraSession> session = CameraSession::synchronize(std::move(device), _ports);
  if (!session) {
    fail(error, QZCapturePlugInErrorDomain, camera_sync_error::kNotSynchronized, nullptr,
         "Failed to synchronize cameras!");
    return nullptr;
  }
  return _runSession(*session, error);
}

std::unique_ptr<QZExperimentResult> QZCameraSyncExperiment::_runSession(CameraSession& session,
                                                                        DiagnosticErrorPtr* error) {
  DiagnosticErrorPtr failure;
  if (!session.configure(_formatIndexes, _frameRate, failure)) {
    session.relinquish();
    storeError(error, failure);
    return nullptr;
  }
  if (!session.start(failure)) {
    session.abandon();
    storeError(error, failure);
    return nullptr;
  }
  _platform.clock->sleep(nanosecondsFromSeconds(_duration));
  const std::optional<Value> status = session.status(failure);
  if (!status) {
    storeError(error, failure);
    return nullptr;
  }
  const std::optional<std::vector<CameraReport>> reports = session.reports(*status, failure);
  if (!reports) {
    session.abandon();
    storeError(error, failure);
    return nullptr;
  }
  session.finish();
  return buildResult(_ports, *reports);
}

}  // namespace quazor
