#include "backends/simulated/capture/simulated_camera.h"

#include "backends/simulated/errors/capture_error.h"
#include "platform/capture_keys.h"

#include <utility>

namespace quazor {
namespace {

CameraInfo infoOf(const Camera& camera) {
  CameraInfo info;
  info.name = camera.id;
  info.port = camera.port;
  info.description = "stream " + camera.id + " (" + camera.port + ")";
  info.hasProjector = camera.projector.has_value();
  info.hasMultipleOutputs = camera.multipleOutputs;
  info.isSlaveOfAnyConfiguration = true;
  return info;
}

}  // namespace

SimulatedCamera::SimulatedCamera(std::shared_ptr<CaptureHardware> hardware, std::size_t index)
    : hardware_(std::move(hardware)), index_(index), info_(infoOf(state().camera)) {}

std::optional<Dictionary> SimulatedCamera::errorCounters(const CaptureRun* run, DiagnosticErrorPtr* error) const {
  const std::lock_guard lock(hardware_->mutex);
  const auto* own = static_cast<const SimulatedRun*>(run);
  std::optional<Dictionary> counters =
      state().errorCounters(own == nullptr ? nullptr : &own->times, hardware_->clock->now());
  if (!counters) {
    failSimulatedCapture(error, CaptureErrorCode::kUnreadableProperty,
                         formatMessage("%@: %@ cannot be read.", info_.name, capture_key::ErrorCounters));
  }
  return counters;
}

std::optional<SessionCount> SimulatedCamera::sessionCount(const CaptureRun* run, const CaptureRun& master) const {
  const std::lock_guard lock(hardware_->mutex);
  const Camera& camera = state().camera;
  if (!camera.inSessionStatus) return std::nullopt;
  if (run == nullptr) return SessionCount{0, -1};
  return countSession(camera, static_cast<const SimulatedRun*>(run)->times,
                      static_cast<const SimulatedRun&>(master).times, hardware_->clock->now());
}

std::shared_ptr<CaptureRun> SimulatedStreaming::start(CameraBack& camera, const CameraSettings& settings,
                                                      DiagnosticErrorPtr*) {
  const std::lock_guard lock(hardware_->mutex);
  return hardware_->start(static_cast<SimulatedCamera&>(camera).index(), settings);
}

void SimulatedStreaming::quiesce(CaptureRun& run) {
  auto& own = static_cast<SimulatedRun&>(run);
  std::shared_ptr<FrameDelivery> delivery;
  {
    const std::lock_guard lock(hardware_->mutex);
    hardware_->stop(own);
    delivery = own.delivery;
  }
  if (delivery != nullptr) delivery->quiesce();
}

bool SimulatedStreaming::end(CaptureRun& run, DiagnosticErrorPtr*) {
  std::shared_ptr<FrameDelivery> delivery;
  {
    const std::lock_guard lock(hardware_->mutex);
    delivery = std::exchange(static_cast<SimulatedRun&>(run).delivery, nullptr);
  }
  if (delivery != nullptr) delivery->finish();
  return true;
}

}  // namespace quazor
