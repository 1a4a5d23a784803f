#include "backends/linux/capture/linux_capture.h"

#include "backends/linux/capture/linux_group.h"
#include "platform/capture_keys.h"

#include <algorithm>
#include <string>
#include <utility>
#include <vector>

namespace quazor {
namespace {

constexpr std::string_view kDeviceName = "capture device";

class LinuxDevice final : public CaptureDevice {
 public:
  explicit LinuxDevice(std::shared_ptr<LinuxCaptureClient> user) : user_(std::move(user)) {
    const LinuxCameras& cameras = user_->cameras();
    for (std::size_t i = 0; i < cameras.cameras.size(); ++i)
      streams_.push_back(std::make_shared<LinuxStream>(user_, i));
    for (std::size_t i = 0; i < cameras.groups.size(); ++i) {
      groups_.push_back(std::make_shared<LinuxGroup>(user_, i, streams_));
    }
  }

  std::string description() const override { return std::string(kDeviceName); }

  std::optional<CaptureStreams> streams(DiagnosticErrorPtr* error) override {
    return user_->perform(
        error, [&] { return std::optional<CaptureStreams>(std::in_place, streams_.begin(), streams_.end()); });
  }

  std::optional<SynchronizedStreamsGroups> synchronizedStreamsGroups(DiagnosticErrorPtr* error) override {
    return user_->perform(
        error, [&] { return std::optional<SynchronizedStreamsGroups>(std::in_place, groups_.begin(), groups_.end()); });
  }

  bool requestControlOfStreams(const CaptureStreams& streams, DiagnosticErrorPtr* error) override {
    return user_->perform(error, [&] { return takeAll(streams, error); });
  }

  bool relinquishControlOfStreams(const CaptureStreams& streams, DiagnosticErrorPtr* error) override {
    return user_->perform(error, [&] { return releaseAll(streams, error); });
  }

  bool invalidate(DiagnosticErrorPtr* error) override { return user_->invalidate(error); }

  std::optional<Value> valueForProperty(std::string_view key, DiagnosticErrorPtr* error) override {
    return user_->perform(error, [&] { return read(key, error); });
  }

  bool setValue(const Value& value, std::string_view key, DiagnosticErrorPtr* error) override {
    return user_->perform(error, [&] { return set(value, key, error); });
  }

 private:
  LinuxCamera* cameraOf(const std::shared_ptr<CaptureStream>& stream, DiagnosticErrorPtr* error) const {
    const auto own = std::dynamic_pointer_cast<LinuxStream>(stream);
    if (own != nullptr && std::ranges::find(streams_, own) != streams_.end()) {
      return user_->cameras().cameras[own->index()].get();
    }
    refuseLinux(error, LinuxErrorCode::kBadValue, "%@ is no stream of this device.", stream);
    return nullptr;
  }

  bool takeAll(const CaptureStreams& streams, DiagnosticErrorPtr* error);
  bool releaseAll(const CaptureStreams& streams, DiagnosticErrorPtr* error);
  std::optional<Value> read(std::string_view key, DiagnosticErrorPtr* error) const;
  bool set(const Value& value, std::string_view key, DiagnosticErrorPtr* error);
  bool readGroups(const Value& value, std::vector<std::size_t>& groups, DiagnosticErrorPtr* error) const;
  bool checkGroup(const LinuxGroupState& group, DiagnosticErrorPtr* error) const;

  const std::shared_ptr<LinuxCaptureClient> user_;
  std::vector<std::shared_ptr<LinuxStream>> streams_;  // by the camera's index
  std::vector<std::shared_ptr<LinuxGroup>> groups_;    // by the group's index
};

bool LinuxDevice::takeAll(const CaptureStreams& streams, DiagnosticErrorPtr* error) {
  LinuxCameras& cameras = user_->cameras();
  const std::vector<V4l2DeviceInfo> nodes = videoNodes(cameras.kernel, cameras.roots);
  std::vector<LinuxCamera*> taken;
  for (const std::shared_ptr<CaptureStream>& stream : streams) {
    LinuxCamera* const camera = cameraOf(stream, error);
    if (camera != nullptr && camera->holder == user_->id()) continue;
    const bool isFree = camera != nullptr && (camera->holder == 0 || user_->checkControl(*camera, error));
    if (isFree && camera->open(cameras.kernel, nodes, error)) {
      camera->holder = user_->id();
      taken.push_back(camera);
      continue;
    }
    for (LinuxCamera* one : taken) cameras.release(*one);
    return false;
  }
  return true;
}

bool LinuxDevice::releaseAll(const CaptureStreams& streams, DiagnosticErrorPtr* error) {
  std::vector<LinuxCamera*> given;
  for (const std::shared_ptr<CaptureStream>& stream : streams) {
    LinuxCamera* const camera = cameraOf(stream, error);
    if (camera == nullptr || !user_->checkControl(*camera, error)) return false;
    if (camera->phase != CameraPhase::kStopped) {
      return refuseLinux(error, LinuxErrorCode::kWrongState, "%@ runs; stop it before giving it back.", camera->port());
    }
    given.push_back(camera);
  }
  for (LinuxCamera* camera : given) user_->cameras().release(*camera);
  return true;
}

std::optional<Value> LinuxDevice::read(std::string_view key, DiagnosticErrorPtr* error) const {
  const LinuxCameras& cameras = user_->cameras();
  if (key == capture_key::MultiCamConfiguration) {
    Array groups;
    for (const std::size_t index : cameras.configuredGroups) groups.emplace_back(groups_[index]);
    return Value(Dictionary{{std::string(capture_key::ActiveSynchronizedStreamsGroups), std::move(groups)}});
  }
  if (key != capture_key::MulticamSessionStatus) {
    refuseLinux(error, LinuxErrorCode::kNoSuchProperty, "The %@ has no property %@ of that use.", kDeviceName, key);
    return std::nullopt;
  }
  if (std::optional<Dictionary> status = cameras.sessionStatus()) return Value(*std::move(status));
  refuseLinux(error, LinuxErrorCode::kWrongState,
              "There is no %@ before a synchronised session has begun: set %@, then start the master.", key,
              capture_key::MultiCamConfiguration);
  return std::nullopt;
}

bool LinuxDevice::set(const Value& value, std::string_view key, DiagnosticErrorPtr* error) {
  if (key != capture_key::MultiCamConfiguration) {
    return refuseLinux(error, LinuxErrorCode::kNoSuchProperty, "The %@ has no property %@ of that use.", kDeviceName,
                       key);
  }
  std::vector<std::size_t> groups;
  if (!readGroups(value, groups, error)) return false;
  LinuxCameras& cameras = user_->cameras();
  for (const std::size_t index : groups) {
    if (!checkGroup(cameras.groups[index], error)) return false;
  }
  for (const std::size_t index : groups) {  // a new session: what was streamed before is not part of it
    for (const std::size_t camera : cameras.groups[index].cameras) cameras.cameras[camera]->run.reset();
  }
  cameras.configuredGroups = std::move(groups);
  return true;
}

bool LinuxDevice::readGroups(const Value& value, std::vector<std::size_t>& groups, DiagnosticErrorPtr* error) const {
  const Value* const list = entryOf(&value, capture_key::ActiveSynchronizedStreamsGroups);
  if (list == nullptr || list->array() == nullptr || value.dictionary()->size() != 1) {
    return refuseLinux(error, LinuxErrorCode::kBadValue, "%@ takes a dictionary with the one entry %@, an array.",
                       capture_key::MultiCamConfiguration, capture_key::ActiveSynchronizedStreamsGroups);
  }
  for (const Value& element : *list->array()) {
    const auto group = std::dynamic_pointer_cast<LinuxGroup>(element.object());
    const bool isOurs = group != nullptr && std::ranges::find(groups_, group) != groups_.end();
    if (!isOurs || std::ranges::find(groups, group->index()) != groups.end()) {
      return refuseLinux(error, LinuxErrorCode::kBadValue, "%@ takes groups of this device, each once; %@ is not.",
                         capture_key::ActiveSynchronizedStreamsGroups, element);
    }
    groups.push_back(group->index());
  }
  return true;
}

bool LinuxDevice::checkGroup(const LinuxGroupState& group, DiagnosticErrorPtr* error) const {
  const LinuxCameras& cameras = user_->cameras();
  if (std::ranges::find(group.active, group.master) == group.active.end()) {
    return refuseLinux(error, LinuxErrorCode::kWrongState, "The master %@ is not active; set %@ of its group first.",
                       group.binding.master, capture_key::ActiveStreams);
  }
  for (const std::size_t index : group.cameras) {
    const LinuxCamera& camera = *cameras.cameras[index];
    if (camera.phase == CameraPhase::kStopped) continue;
    return refuseLinux(error, LinuxErrorCode::kWrongState, "%@ cannot be set while %@ runs.",
                       capture_key::MultiCamConfiguration, camera.port());
  }
  return std::ranges::all_of(group.active,
                             [&](std::size_t index) { return user_->checkControl(*cameras.cameras[index], error); });
}

class LinuxPlugIn final : public CapturePlugIn {
 public:
  explicit LinuxPlugIn(std::shared_ptr<LinuxCameras> cameras) : cameras_(std::move(cameras)) {}

  std::string description() const override { return "capture plug-in"; }

  std::shared_ptr<CaptureDevice> device(DiagnosticErrorPtr* error) override {
    if (!cameras_->cameras.empty())
      return std::make_shared<LinuxDevice>(std::make_shared<LinuxCaptureClient>(cameras_));
    refuseLinux(error, LinuxErrorCode::kNoDevice, "The binding names no camera, so there is no %@.", kDeviceName);
    return nullptr;
  }

 private:
  const std::shared_ptr<LinuxCameras> cameras_;
};

class LinuxCaptureService final : public LinuxCapture {
 public:
  explicit LinuxCaptureService(std::shared_ptr<LinuxCameras> cameras)
      : cameras_(std::move(cameras)), defaultPlugIn_(std::make_shared<LinuxPlugIn>(cameras_)) {}

  std::shared_ptr<CapturePlugIn> createPlugIn() override { return std::make_shared<LinuxPlugIn>(cameras_); }
  std::shared_ptr<CapturePlugIn> defaultPlugIn() override { return defaultPlugIn_; }
  std::uint64_t framesDelivered() const override { return cameras_->delivered->load(std::memory_order_relaxed); }

 private:
  const std::shared_ptr<LinuxCameras> cameras_;
  const std::shared_ptr<CapturePlugIn> defaultPlugIn_;
};

}  // namespace

std::shared_ptr<LinuxCapture> makeLinuxCapture(const Binding& binding) {
  return makeLinuxCapture(binding, systemVideoKernel(), DeviceRoots());
}

std::shared_ptr<LinuxCapture> makeLinuxCapture(const Binding& binding, std::shared_ptr<V4l2Api> kernel,
                                               DeviceRoots roots) {
  return std::make_shared<LinuxCaptureService>(
      std::make_shared<LinuxCameras>(binding, std::move(kernel), std::move(roots)));
}

}  // namespace quazor
