#include "backends/capture/checked_capture.h"

#include "backends/capture/client_group.h"
#include "backends/capture/property_checks.h"

#include <algorithm>
#include <string>
#include <utility>
#include <vector>

namespace quazor {
namespace {

constexpr std::string_view kDeviceName = "capture device";

// Thread: any.
class ClientDevice final : public CaptureDevice {
 public:
  explicit ClientDevice(std::shared_ptr<CaptureClient> client) : client_(std::move(client)) {
    const CaptureSlots& slots = client_->slots();
    for (std::size_t i = 0; i < slots.cameras.size(); ++i) {
      streams_.push_back(std::make_shared<ClientStream>(client_, i));
    }
    for (std::size_t i = 0; i < slots.groups.size(); ++i) {
      groups_.push_back(std::make_shared<ClientGroup>(client_, i, streams_));
    }
  }

  std::string description() const override { return std::string(kDeviceName); }

  std::optional<CaptureStreams> streams(DiagnosticErrorPtr* error) override {
    return client_->perform(error, [&](const Refuser&) {
      return std::optional<CaptureStreams>(std::in_place, streams_.begin(), streams_.end());
    });
  }

  std::optional<SynchronizedStreamsGroups> synchronizedStreamsGroups(DiagnosticErrorPtr* error) override {
    return client_->perform(error, [&](const Refuser&) {
      return std::optional<SynchronizedStreamsGroups>(std::in_place, groups_.begin(), groups_.end());
    });
  }

  bool requestControlOfStreams(const CaptureStreams& streams, DiagnosticErrorPtr* error) override {
    return client_->perform(error, [&](const Refuser& refuse) { return acquireAll(streams, refuse); });
  }

  bool relinquishControlOfStreams(const CaptureStreams& streams, DiagnosticErrorPtr* error) override {
    return client_->perform(error, [&](const Refuser& refuse) { return releaseAll(streams, refuse); });
  }

  bool invalidate(DiagnosticErrorPtr* error) override { return client_->invalidate(error); }

  std::optional<Value> valueForProperty(std::string_view key, DiagnosticErrorPtr* error) override {
    return client_->perform(error, [&](const Refuser& refuse) { return read(key, refuse); });
  }

  bool setValue(const Value& value, std::string_view key, DiagnosticErrorPtr* error) override {
    return client_->perform(error, [&](const Refuser& refuse) { return set(value, key, refuse); });
  }

 private:
  CameraSlot* cameraOf(const std::shared_ptr<CaptureStream>& stream, const Refuser& refuse) const;
  bool acquireAll(const CaptureStreams& streams, const Refuser& refuse);
  bool releaseAll(const CaptureStreams& streams, const Refuser& refuse);
  std::optional<Value> read(std::string_view key, const Refuser& refuse) const;
  bool set(const Value& value, std::string_view key, const Refuser& refuse);
  bool readGroups(const Value& value, std::vector<std::size_t>& groups, const Refuser& refuse) const;
  bool checkGroup(const CaptureGroupSlot& group, const Refuser& refuse) const;

  const std::shared_ptr<CaptureClient> client_;
  ClientStreams streams_;                             // by index of the camera
  std::vector<std::shared_ptr<ClientGroup>> groups_;  // by index of the group
};

// Returns null and stores the refusal if it is not a stream of this device.
CameraSlot* ClientDevice::cameraOf(const std::shared_ptr<CaptureStream>& stream, const Refuser& refuse) const {
  const auto own = std::dynamic_pointer_cast<ClientStream>(stream);
  if (own != nullptr && std::ranges::find(streams_, own) != streams_.end()) {
    return &client_->slots().cameras[own->index()];
  }
  refuse(CaptureRefusal::kForeignObject, "%@ is not a stream of this device.", stream);
  return nullptr;
}

bool ClientDevice::acquireAll(const CaptureStreams& streams, const Refuser& refuse) {
  std::vector<CameraSlot*> wanted;
  for (const std::shared_ptr<CaptureStream>& stream : streams) {
    CameraSlot* const camera = cameraOf(stream, refuse);
    if (camera == nullptr || (camera->holder != 0 && !client_->checkControl(*camera, refuse))) return false;
    if (camera->holder == 0) wanted.push_back(camera);
  }
  CaptureSlots& slots = client_->slots();
  if (!wanted.empty()) slots.back->prepareToOpen();
  std::vector<CameraSlot*> opened;
  for (CameraSlot* camera : wanted) {
    if (camera->holder == client_->id()) continue;  // the list contains it twice
    CameraSettings settings;
    if (!camera->back->open(settings, refuse.error())) {
      for (CameraSlot* one : opened) slots.release(*one);
      return false;
    }
    camera->settings = std::move(settings);
    camera->holder = client_->id();
    opened.push_back(camera);
  }
  return true;
}

bool ClientDevice::releaseAll(const CaptureStreams& streams, const Refuser& refuse) {
  std::vector<CameraSlot*> given;
  for (const std::shared_ptr<CaptureStream>& stream : streams) {
    CameraSlot* const camera = cameraOf(stream, refuse);
    if (camera == nullptr || !client_->checkControl(*camera, refuse)) return false;
    if (camera->phase != StreamPhase::kStopped) {
      return refuse(CaptureRefusal::kWrongState, "%@ is running; stop it before giving it back.", camera->info().name);
    }
    if (std::ranges::find(given, camera) == given.end()) given.push_back(camera);
  }
  for (CameraSlot* camera : given) client_->slots().release(*camera);
  return true;
}

std::optional<Value> ClientDevice::read(std::string_view key, const Refuser& refuse) const {
  if (!checkKnown(CaptureObjectKind::kDevice, kDeviceName, key, refuse)) return std::nullopt;
  const CaptureSlots& slots = client_->slots();
  if (key == capture_key::MultiCamConfiguration) {
    Array groups;
    for (const std::size_t index : slots.configuredGroups) groups.emplace_back(groups_[index]);
    return Value(Dictionary{{std::string(capture_key::ActiveSynchronizedStreamsGroups), std::move(groups)}});
  }
  if (std::optional<Dictionary> status = slots.sessionStatus()) return Value(*std::move(status));
  refuse(CaptureRefusal::kUnreadableProperty,
         "%@: %@ cannot be read before a synchronised session has begun: set %@, then start the master.", kDeviceName,
         key, capture_key::MultiCamConfiguration);
  return std::nullopt;
}

bool ClientDevice::set(const Value& value, std::string_view key, const Refuser& refuse) {
  if (!checkWritable(CaptureObjectKind::kDevice, kDeviceName, key, refuse)) return false;
  CaptureSlots& slots = client_->slots();
  std::vector<std::size_t> groups;
  if (!readGroups(value, groups, refuse)) return false;
  for (const std::size_t index : groups) {
    if (!checkGroup(slots.groups[index], refuse)) return false;
  }
  for (const std::size_t index : groups) {  // a new session, which does not include earlier runs
    for (const std::size_t camera : slots.groups[index].info.cameras) slots.cameras[camera].run.reset();
  }
  slots.configuredGroups = std::move(groups);
  return true;
}

bool ClientDevice::readGroups(const Value& value, std::vector<std::size_t>& groups, const Refuser& refuse) const {
  constexpr std::string_view kGroups = capture_key::ActiveSynchronizedStreamsGroups;
  const Value* const list = entryOf(&value, kGroups);
  if (list == nullptr || list->array() == nullptr || value.dictionary()->size() != 1) {
    return refuse(CaptureRefusal::kWrongType, "%@: %@ must be a dictionary with exactly one entry, %@, an array.",
                  kDeviceName, capture_key::MultiCamConfiguration, kGroups);
  }
  for (const Value& element : *list->array()) {
    const auto group = std::dynamic_pointer_cast<ClientGroup>(element.object());
    if (group == nullptr || std::ranges::find(groups_, group) == groups_.end()) {
      return refuse(CaptureRefusal::kForeignObject, "%@: %@ must contain groups of this device, not %@.", kDeviceName,
                    kGroups, described(element));
    }
    if (std::ranges::find(groups, group->index()) != groups.end()) {
      return refuse(CaptureRefusal::kOutOfRange, "%@: %@ must contain a group once, not %@ twice.", kDeviceName,
                    kGroups, group);
    }
    groups.push_back(group->index());
  }
  return true;
}

bool ClientDevice::checkGroup(const CaptureGroupSlot& group, const Refuser& refuse) const {
  const CaptureSlots& slots = client_->slots();
  if (std::ranges::find(group.active, group.info.master) == group.active.end()) {
    return refuse(CaptureRefusal::kWrongState, "%@: its master %@ is not active; set %@ first.", group.info.description,
                  slots.cameras[group.info.master].info().name, capture_key::ActiveStreams);
  }
  return checkStopped(kDeviceName, capture_key::MultiCamConfiguration, slots, group, refuse) &&
         std::ranges::all_of(group.active,
                             [&](std::size_t index) { return client_->checkControl(slots.cameras[index], refuse); });
}

// Thread: any.
class CheckedPlugIn final : public CapturePlugIn {
 public:
  explicit CheckedPlugIn(std::shared_ptr<CaptureSlots> slots) : slots_(std::move(slots)) {}

  std::string description() const override { return "capture plug-in"; }

  std::shared_ptr<CaptureDevice> device(DiagnosticErrorPtr* error) override {
    const std::string missing = slots_->back->missingDevice();
    if (missing.empty()) return std::make_shared<ClientDevice>(std::make_shared<CaptureClient>(slots_));
    Refuser(*slots_->back, error)(CaptureRefusal::kNoDevice, "%@", missing);
    return nullptr;
  }

 private:
  const std::shared_ptr<CaptureSlots> slots_;
};

// Thread: any.
class CheckedCapture final : public CaptureService {
 public:
  explicit CheckedCapture(std::shared_ptr<CaptureBack> back)
      : slots_(std::make_shared<CaptureSlots>(std::move(back))),
        defaultPlugIn_(std::make_shared<CheckedPlugIn>(slots_)) {}

  std::shared_ptr<CapturePlugIn> createPlugIn() override {
    return slots_->back->plugInLoads() ? std::make_shared<CheckedPlugIn>(slots_) : nullptr;
  }
  std::shared_ptr<CapturePlugIn> defaultPlugIn() override {
    return slots_->back->plugInLoads() ? defaultPlugIn_ : nullptr;
  }

 private:
  const std::shared_ptr<CaptureSlots> slots_;
  const std::shared_ptr<CapturePlugIn> defaultPlugIn_;
};

}  // namespace

std::shared_ptr<CaptureService> makeCheckedCapture(std::shared_ptr<CaptureBack> back) {
  return std::make_shared<CheckedCapture>(std::move(back));
}

}  // namespace quazor
