#include "backends/simulated/capture/simulated_capture_client.h"

#include "backends/simulated/calls/capture_error.h"

namespace quazor {
namespace {

CaptureUserId newUser(CaptureHardware& hardware) {
  const std::lock_guard lock(hardware.mutex);
  return ++hardware.lastUser;
}

}  // namespace

SimulatedCaptureClient::SimulatedCaptureClient(std::shared_ptr<CaptureHardware> hardware,
                                               std::shared_ptr<CallInterceptor> calls)
    : hardware_(std::move(hardware)), calls_(std::move(calls)), id_(newUser(*hardware_)) {}

SimulatedCaptureClient::~SimulatedCaptureClient() {
  std::vector<std::shared_ptr<FrameDelivery>> stopped;  // outlives the lock
  const std::lock_guard lock(hardware_->mutex);
  stopped = hardware_->release(id_);
}

bool SimulatedCaptureClient::checkControl(const CameraState& camera, DiagnosticErrorPtr* error) const {
  if (camera.holder == id_) return true;
  if (camera.holder == 0) {
    return refuse(error, CaptureErrorCode::kNotControlled, "%@ is not under control; request control of it first.",
                  camera.camera.id);
  }
  return refuse(error, CaptureErrorCode::kControlledByAnother, "%@ is under control of another user.",
                camera.camera.id);
}

std::vector<std::shared_ptr<FrameDelivery>> SimulatedCaptureClient::invalidate() {
  invalidated_ = true;
  return hardware_->release(id_);
}

bool SimulatedCaptureClient::checkValid(DiagnosticErrorPtr* error) const {
  if (!invalidated_) return true;
  return refuse(error, CaptureErrorCode::kInvalidated, "The capture device has been invalidated; ask for a new one.");
}

}  // namespace quazor
