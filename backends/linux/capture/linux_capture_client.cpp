#include "backends/linux/capture/linux_capture_client.h"

#include "platform/capture_keys.h"

#include <algorithm>
#include <utility>

namespace quazor {
namespace {

LinuxUserId newUser(LinuxCameras& cameras) {
  const std::lock_guard lock(cameras.mutex);
  return ++cameras.lastUser;
}

}  // namespace

LinuxCameras::LinuxCameras(const Binding& binding, std::shared_ptr<V4l2Api> system, DeviceRoots deviceRoots)
    : kernel(std::move(system)), roots(std::move(deviceRoots)) {
  for (const CameraBinding& camera : binding.cameras) cameras.push_back(std::make_unique<LinuxCamera>(camera));
  const auto indexOf = [this](const std::string& port) {
    return static_cast<std::size_t>(std::ranges::find(cameras, port, [](const auto& one) { return one->port(); }) -
                                    cameras.begin());
  };
  for (const GroupBinding& group : binding.groups) {
    LinuxGroupState state;
    state.binding = group;
    for (const std::string& port : group.ports) state.cameras.push_back(indexOf(port));
    state.master = indexOf(group.master);
    const bool known = std::ranges::find(state.cameras, cameras.size()) == state.cameras.end();
    if (known && state.master < cameras.size()) groups.push_back(std::move(state));
  }
}

std::optional<Dictionary> LinuxCameras::sessionStatus() const {
  std::optional<Dictionary> status;
  for (const std::size_t index : configuredGroups) {
    const LinuxGroupState& group = groups[index];
    const std::shared_ptr<CameraRun>& master = cameras[group.master]->run;
    if (master == nullptr) continue;
    if (!status) status.emplace();
    for (const std::size_t member : group.active) {
      const LinuxCamera& camera = *cameras[member];
      const FrameCounts counts = camera.run == nullptr ? FrameCounts() : camera.run->counts();
      const std::int64_t frames = counts.frames == 0 ? -1 : static_cast<std::int64_t>(counts.frames);
      const std::int64_t offset = frameOffset(counts, master->counts(), master->interval());
      status->set(camera.port(), Dictionary{{std::string(capture_key::Offset), offset},
                                            {std::string(capture_key::FrameCount), frames}});
    }
  }
  return status;
}

void LinuxCameras::release(LinuxCamera& camera) {
  dropped.push_back(std::exchange(camera.settings().outputHandlers, Dictionary{}));
  camera.close();
  camera.holder = 0;
  camera.freedByStop = false;
}

HeldCameras::~HeldCameras() {
  const std::vector<Value> dropped = std::exchange(cameras_.dropped, {});
  lock_.unlock();
}

LinuxCaptureClient::LinuxCaptureClient(std::shared_ptr<LinuxCameras> cameras)
    : cameras_(std::move(cameras)), id_(newUser(*cameras_)), poller_(cameras_->kernel) {}

LinuxCaptureClient::~LinuxCaptureClient() { release(nullptr); }

bool LinuxCaptureClient::checkControl(const LinuxCamera& camera, DiagnosticErrorPtr* error) const {
  if (camera.holder == id_) return true;
  if (camera.holder == 0) {
    return refuseLinux(error, LinuxErrorCode::kWrongState, "%@ is not under control; request control of it first.",
                       camera.port());
  }
  return refuseLinux(error, LinuxErrorCode::kBusy, "%@ is under control of another user.", camera.port());
}

bool LinuxCaptureClient::start(std::size_t index, DiagnosticErrorPtr* error) {
  return perform(error, [&] {
    LinuxCamera& camera = *cameras_->cameras[index];
    if (!checkControl(camera, error)) return false;
    if (camera.phase != CameraPhase::kStopped) {
      return refuseLinux(error, LinuxErrorCode::kWrongState, "%@ is running already.", camera.port());
    }
    const CameraSettings& settings = camera.settings();
    if (settings.minimumRate && settings.maximumRate &&
        toDouble(&*settings.minimumRate) > toDouble(&*settings.maximumRate)) {
      return refuseLinux(error, LinuxErrorCode::kWrongState, "%@: MinimumFrameRate %@ is above MaximumFrameRate %@.",
                         camera.port(), settings.minimumRate, settings.maximumRate);
    }
    std::shared_ptr<CameraRun> run = camera.begin(cameras_->delivered, error);
    if (run == nullptr) return false;
    if (!poller_.add(run, error)) {
      run->end(nullptr);
      return false;
    }
    camera.run = std::move(run);
    camera.phase = CameraPhase::kRunning;
    return true;
  });
}

bool LinuxCaptureClient::stop(std::size_t index, DiagnosticErrorPtr* error) {
  LinuxCamera& camera = *cameras_->cameras[index];
  const bool stopping = perform(error, [&] {
    if (!checkControl(camera, error)) return false;
    if (camera.phase != CameraPhase::kRunning) {
      return refuseLinux(error, LinuxErrorCode::kWrongState, "%@ is not running.", camera.port());
    }
    camera.phase = CameraPhase::kStopping;
    return true;
  });
  if (!stopping) return false;
  poller_.remove(*camera.run);
  const bool stopped = camera.run->end(error);
  const HeldCameras held(*cameras_);
  camera.phase = CameraPhase::kStopped;
  if (camera.freedByStop) cameras_->release(camera);
  return stopped;
}

bool LinuxCaptureClient::invalidate(DiagnosticErrorPtr* error) {
  const bool valid = perform(error, [&] { return invalidated_ = true; });
  return valid && release(error);
}

bool LinuxCaptureClient::release(DiagnosticErrorPtr* error) {
  std::vector<LinuxCamera*> running;
  std::vector<std::shared_ptr<CameraRun>> stopping;  // who stops it frees the camera, whose next run is another
  {
    const HeldCameras held(*cameras_);
    for (const auto& camera : cameras_->cameras) {
      if (camera->holder != id_) continue;
      switch (camera->phase) {
        case CameraPhase::kStopped: cameras_->release(*camera); break;
        case CameraPhase::kRunning:
          camera->phase = CameraPhase::kStopping;
          running.push_back(camera.get());
          break;
        case CameraPhase::kStopping:
          camera->freedByStop = true;
          stopping.push_back(camera->run);
          break;
      }
    }
  }
  // One that a handler stops is done when the handler is; one that is stopped on another thread waits for this one,
  // which then is the handler's.
  for (const std::shared_ptr<CameraRun>& run : stopping) poller_.remove(*run);
  bool succeeded = true;
  for (LinuxCamera* camera : running) {
    poller_.remove(*camera->run);
    if (!camera->run->end(succeeded ? error : nullptr)) succeeded = false;
    const HeldCameras held(*cameras_);
    camera->phase = CameraPhase::kStopped;
    cameras_->release(*camera);
  }
  return succeeded;
}

}  // namespace quazor
