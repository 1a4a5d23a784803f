#include "backends/capture/capture_client.h"

#include "platform/capture_keys.h"

#include <algorithm>
#include <string>

namespace quazor {
namespace {

CaptureClientId newClient(CaptureSlots& slots) {
  const std::lock_guard lock(slots.mutex);
  return ++slots.lastClient;
}

bool checkRates(const CameraSlot& camera, const Refuser& refuse) {
  const CameraSettings& settings = camera.settings;
  const std::string& name = camera.info().name;
  const std::optional<double> ofFormat = camera.back->maxFrameRate(settings);
  const std::optional<double> maximum =
      settings.maximumRate ? std::optional(toDouble(&*settings.maximumRate)) : ofFormat;
  if (ofFormat && *maximum > *ofFormat) {
    return refuse(CaptureRefusal::kWrongState, "%@ cannot start: MaximumFrameRate is %@, and format %@ has at most %@.",
                  name, *maximum, settings.formatIndex, *ofFormat);
  }
  if (maximum && settings.minimumRate && toDouble(&*settings.minimumRate) > *maximum) {
    return refuse(CaptureRefusal::kWrongState,
                  "%@ cannot start: MinimumFrameRate is %@, above the MaximumFrameRate %@.", name,
                  *settings.minimumRate, *maximum);
  }
  return true;
}

}  // namespace

CaptureSlots::CaptureSlots(std::shared_ptr<CaptureBack> service) : back(std::move(service)) {
  for (std::shared_ptr<CameraBack>& camera : back->cameras()) cameras.emplace_back().back = std::move(camera);
  for (CaptureGroupInfo& group : back->groups()) groups.emplace_back().info = std::move(group);
}

void CaptureSlots::release(CameraSlot& camera) {
  dropped.push_back(std::exchange(camera.settings.outputHandlers, Dictionary{}));
  camera.back->close();
  camera.holder = 0;
  camera.freedByStop = false;
}

std::optional<Dictionary> CaptureSlots::sessionStatus() const {
  std::optional<Dictionary> status;
  for (const std::size_t index : configuredGroups) {
    const CaptureGroupSlot& group = groups[index];
    const std::shared_ptr<CaptureRun>& master = cameras[group.info.master].run;
    if (master == nullptr) continue;
    if (!status) status.emplace();
    for (const std::size_t member : group.active) {
      const CameraSlot& camera = cameras[member];
      const std::optional<SessionCount> count = camera.back->sessionCount(camera.run.get(), *master);
      if (!count) continue;
      status->set(camera.info().port, Dictionary{{std::string(capture_key::Offset), count->offset},
                                                 {std::string(capture_key::FrameCount), count->frameCount}});
    }
  }
  return status;
}

bool checkStopped(std::string_view object, std::string_view key, const CaptureSlots& slots,
                  const CaptureGroupSlot& group, const Refuser& refuse) {
  for (const std::size_t index : group.info.cameras) {
    const CameraSlot& camera = slots.cameras[index];
    if (camera.phase == StreamPhase::kStopped) continue;
    return refuse(CaptureRefusal::kWrongState, "%@: %@ cannot be set while %@ is running.", object, key,
                  camera.info().name);
  }
  return true;
}

HeldSlots::~HeldSlots() {
  const std::vector<Value> dropped = std::exchange(slots_.dropped, {});
  lock_.unlock();
}

CaptureClient::CaptureClient(std::shared_ptr<CaptureSlots> slots)
    : slots_(std::move(slots)), streaming_(slots_->back->makeStreaming()), id_(newClient(*slots_)) {}

CaptureClient::~CaptureClient() { release(nullptr); }

bool CaptureClient::checkControl(const CameraSlot& camera, const Refuser& refuse) const {
  if (camera.holder == id_) return true;
  if (camera.holder == 0) {
    return refuse(CaptureRefusal::kNotControlled, "%@ is not under control; request control of it first.",
                  camera.info().name);
  }
  return refuse(CaptureRefusal::kControlledByAnother, "%@ is under control of another user.", camera.info().name);
}

bool CaptureClient::start(std::size_t index, DiagnosticErrorPtr* error) {
  CameraSlot& camera = slots_->cameras[index];
  return perform(error, [&](const Refuser& refuse) { return begin(camera, refuse); });
}

bool CaptureClient::begin(CameraSlot& camera, const Refuser& refuse) {
  if (!checkControl(camera, refuse)) return false;
  if (camera.phase != StreamPhase::kStopped) {
    return refuse(CaptureRefusal::kWrongState, "%@ is already running.", camera.info().name);
  }
  if (!checkRates(camera, refuse)) return false;
  std::shared_ptr<CaptureRun> run = streaming_->start(*camera.back, camera.settings, refuse.error());
  if (run == nullptr) return false;
  camera.run = std::move(run);
  camera.phase = StreamPhase::kRunning;
  return true;
}

bool CaptureClient::stop(std::size_t index, DiagnosticErrorPtr* error) {
  CameraSlot& camera = slots_->cameras[index];
  const bool stopping = perform(error, [&](const Refuser& refuse) {
    if (!checkControl(camera, refuse)) return false;
    if (camera.phase != StreamPhase::kRunning) {
      return refuse(CaptureRefusal::kWrongState, "%@ is not running; it cannot be stopped.", camera.info().name);
    }
    camera.phase = StreamPhase::kStopping;
    return true;
  });
  return stopping && end(camera, error);
}

// Ends what this call has set to kStopping: no other call changes the camera's phase or run in the meantime.
bool CaptureClient::end(CameraSlot& camera, DiagnosticErrorPtr* error) {
  streaming_->quiesce(*camera.run);
  const bool ended = streaming_->end(*camera.run, error);
  const HeldSlots held(*slots_);
  camera.phase = StreamPhase::kStopped;
  if (camera.freedByStop) slots_->release(camera);
  return ended;
}

bool CaptureClient::invalidate(DiagnosticErrorPtr* error) {
  const bool valid = perform(error, [&](const Refuser&) { return invalidated_ = true; });
  return valid && release(error);
}

bool CaptureClient::release(DiagnosticErrorPtr* error) {
  std::vector<CameraSlot*> running;
  // The call that stops a run also frees the camera, which may then get another run.
  std::vector<std::shared_ptr<CaptureRun>> stopping;
  {
    const HeldSlots held(*slots_);
    for (CameraSlot& camera : slots_->cameras) {
      if (camera.holder != id_) continue;
      if (camera.phase == StreamPhase::kStopped) {
        slots_->release(camera);
        continue;
      }
      camera.freedByStop = true;
      if (camera.phase == StreamPhase::kStopping) {
        stopping.push_back(camera.run);
      } else {
        camera.phase = StreamPhase::kStopping;
        running.push_back(&camera);
      }
    }
  }
  // A stop by a handler is completed after the handler has returned. If another thread stops the same run, it waits for
  // this handler.
  for (const std::shared_ptr<CaptureRun>& run : stopping) streaming_->quiesce(*run);
  bool succeeded = true;
  for (CameraSlot* camera : running) {
    if (!end(*camera, succeeded ? error : nullptr)) succeeded = false;
  }
  return succeeded;
}

}  // namespace quazor
