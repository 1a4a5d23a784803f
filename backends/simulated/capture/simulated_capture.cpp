#include "backends/simulated/capture/simulated_capture.h"

#include "backends/simulated/capture/property_checks.h"

#include <algorithm>

namespace quazor {
namespace {

// "(a, b)": the scenario's ids; what is no stream of a simulated phone by its description.
std::string idsOf(const CaptureStreams& streams) {
  std::vector<std::string> ids;
  for (const std::shared_ptr<CaptureStream>& stream : streams) {
    const auto* own = dynamic_cast<const SimulatedStream*>(stream.get());
    ids.push_back(own == nullptr ? defaultText(stream) : own->id());
  }
  return defaultText(ids);
}

constexpr std::string_view kDeviceName = "capture device";

}  // namespace

SimulatedDevice::SimulatedDevice(std::shared_ptr<SimulatedCaptureClient> user) : user_(std::move(user)) {
  const CaptureHardware& hardware = user_->hardware();
  for (std::size_t i = 0; i < hardware.cameras.size(); ++i) {
    streams_.push_back(std::make_shared<SimulatedStream>(user_, i));
  }
  for (std::size_t i = 0; i < hardware.groups.size(); ++i) {
    groups_.push_back(std::make_shared<SimulatedGroup>(user_, i, streams_));
  }
}

std::string SimulatedDevice::description() const { return std::string(kDeviceName); }

std::optional<CaptureStreams> SimulatedDevice::streams(DiagnosticErrorPtr* error) {
  return user_->perform(
      {capture_operation::kDeviceStreams, {}, {}}, error, [] { return std::string(); },
      [&] { return std::optional<CaptureStreams>(std::in_place, streams_.begin(), streams_.end()); });
}

std::optional<SynchronizedStreamsGroups> SimulatedDevice::synchronizedStreamsGroups(DiagnosticErrorPtr* error) {
  return user_->perform(
      {capture_operation::kGroups, {}, {}}, error, [] { return std::string(); },
      [&] { return std::optional<SynchronizedStreamsGroups>(std::in_place, groups_.begin(), groups_.end()); });
}

bool SimulatedDevice::requestControlOfStreams(const CaptureStreams& streams, DiagnosticErrorPtr* error) {
  return user_->perform(
      {capture_operation::kRequestControl, {}, {}}, error, [&] { return idsOf(streams); },
      [&] { return changeControl(streams, true, error); });
}

bool SimulatedDevice::relinquishControlOfStreams(const CaptureStreams& streams, DiagnosticErrorPtr* error) {
  return user_->perform(
      {capture_operation::kRelinquishControl, {}, {}}, error, [&] { return idsOf(streams); },
      [&] { return changeControl(streams, false, error); });
}

bool SimulatedDevice::invalidate(DiagnosticErrorPtr* error) {
  std::vector<std::shared_ptr<FrameDelivery>> stopped;
  return user_->perform(
      {capture_operation::kInvalidate, {}, {}}, error, [] { return std::string(); },
      [&] {
        stopped = user_->invalidate();
        return true;
      },
      [&] {
        for (const std::shared_ptr<FrameDelivery>& delivery : stopped) delivery->finish();
      });
}

std::optional<Value> SimulatedDevice::valueForProperty(std::string_view key, DiagnosticErrorPtr* error) {
  return user_->perform(
      {capture_operation::kReadDevice, {}, key}, error, [&] { return std::string(key); },
      [&] { return read(key, error); });
}

bool SimulatedDevice::setValue(const Value& value, std::string_view key, DiagnosticErrorPtr* error) {
  return user_->perform(
      {capture_operation::kSetDevice, {}, key}, error, [&] { return formatMessage("%@ = %@", key, value); },
      [&] { return set(value, key, error); });
}

bool SimulatedDevice::changeControl(const CaptureStreams& streams, bool request, DiagnosticErrorPtr* error) {
  CaptureHardware& hardware = user_->hardware();
  for (const std::shared_ptr<CaptureStream>& stream : streams) {
    const auto own = std::dynamic_pointer_cast<SimulatedStream>(stream);
    if (own == nullptr || std::ranges::find(streams_, own) == streams_.end()) {
      return refuse(error, CaptureErrorCode::kForeignObject, "%@ is no stream of this device.", stream);
    }
    const CameraState& camera = hardware.cameras[own->index()];
    const bool free = camera.holder == 0;
    if (!(request && free) && !user_->checkControl(camera, error)) return false;
    if (!request && camera.running) {
      return refuse(error, CaptureErrorCode::kWrongState, "%@ is running; stop it before giving it back.", own->id());
    }
  }
  for (const std::shared_ptr<CaptureStream>& stream : streams) {
    const auto& own = static_cast<const SimulatedStream&>(*stream);
    CameraState& camera = hardware.cameras[own.index()];
    camera.holder = request ? user_->id() : 0;
    if (!request) camera.outputHandlers = Dictionary{};
  }
  return true;
}

std::optional<Value> SimulatedDevice::read(std::string_view key, DiagnosticErrorPtr* error) const {
  if (!checkKnown(CaptureObjectKind::kDevice, kDeviceName, key, error)) return std::nullopt;
  CaptureHardware& hardware = user_->hardware();
  if (key == capture_key::MultiCamConfiguration) {
    Array groups;
    for (const std::size_t index : hardware.configuredGroups) groups.emplace_back(groups_[index]);
    return Value(Dictionary{{std::string(capture_key::ActiveSynchronizedStreamsGroups), std::move(groups)}});
  }
  if (std::optional<Dictionary> status = hardware.sessionStatus()) return Value(*std::move(status));
  refuse(error, CaptureErrorCode::kUnreadableProperty,
         "%@: %@ cannot be read before a synchronised session has begun: set %@, then start the master.", kDeviceName,
         key, capture_key::MultiCamConfiguration);
  return std::nullopt;
}

bool SimulatedDevice::set(const Value& value, std::string_view key, DiagnosticErrorPtr* error) {
  if (!checkWritable(CaptureObjectKind::kDevice, kDeviceName, key, error)) return false;
  CaptureHardware& hardware = user_->hardware();
  std::vector<std::size_t> groups;
  if (!readGroups(value, &groups, error)) return false;
  for (const std::size_t index : groups) {
    if (!checkGroup(hardware.groups[index], error)) return false;
  }
  for (const std::size_t index : groups) {  // a new session: what was streamed before is not part of it
    for (const std::size_t camera : hardware.groups[index].cameras) hardware.cameras[camera].run.reset();
  }
  hardware.configuredGroups = std::move(groups);
  return true;
}

bool SimulatedDevice::readGroups(const Value& value, std::vector<std::size_t>* groups,
                                 DiagnosticErrorPtr* error) const {
  const Value* list = entryOf(&value, capture_key::ActiveSynchronizedStreamsGroups);
  if (list == nullptr || list->array() == nullptr || value.dictionary()->size() != 1) {
    return refuse(error, CaptureErrorCode::kWrongType, "%@: %@ must be a dictionary with the one entry %@, an array.",
                  kDeviceName, capture_key::MultiCamConfiguration, capture_key::ActiveSynchronizedStreamsGroups);
  }
  for (const Value& element : *list->array()) {
    const auto group = std::dynamic_pointer_cast<SimulatedGroup>(element.object());
    if (group == nullptr || std::ranges::find(groups_, group) == groups_.end()) {
      return refuse(error, CaptureErrorCode::kForeignObject, "%@: %@ must hold groups of this device, not %@.",
                    kDeviceName, capture_key::ActiveSynchronizedStreamsGroups, described(element));
    }
    if (std::ranges::find(*groups, group->index()) != groups->end()) {
      return refuse(error, CaptureErrorCode::kOutOfRange, "%@: %@ must hold a group once, not %@ twice.", kDeviceName,
                    capture_key::ActiveSynchronizedStreamsGroups, group);
    }
    groups->push_back(group->index());
  }
  return true;
}

bool SimulatedDevice::checkGroup(const GroupState& group, DiagnosticErrorPtr* error) const {
  const CaptureHardware& hardware = user_->hardware();
  if (std::ranges::find(group.active, group.master) == group.active.end()) {
    return refuse(error, CaptureErrorCode::kWrongState, "group %@: its master %@ is not active; set %@ first.",
                  group.id, hardware.cameras[group.master].camera.id, capture_key::ActiveStreams);
  }
  for (const std::size_t index : group.active) {
    const CameraState& camera = hardware.cameras[index];
    if (!user_->checkControl(camera, error)) return false;
    if (camera.running) {
      return refuse(error, CaptureErrorCode::kWrongState, "%@: %@ cannot be set while %@ is running.", kDeviceName,
                    capture_key::MultiCamConfiguration, camera.camera.id);
    }
  }
  return true;
}

SimulatedPlugIn::SimulatedPlugIn(std::shared_ptr<CaptureHardware> hardware, std::shared_ptr<CallInterceptor> calls)
    : hardware_(std::move(hardware)), calls_(std::move(calls)) {}

std::string SimulatedPlugIn::description() const { return "capture plug-in"; }

std::shared_ptr<CaptureDevice> SimulatedPlugIn::device(DiagnosticErrorPtr* error) {
  return calls_->perform(
      {capture_operation::kDevice, {}, {}}, error, [] { return std::string(); },
      [&]() -> std::shared_ptr<CaptureDevice> {
        if (!hardware_->device.present) {
          refuse(error, CaptureErrorCode::kNoDevice, "The phone has no %@.", kDeviceName);
          return nullptr;
        }
        return std::make_shared<SimulatedDevice>(std::make_shared<SimulatedCaptureClient>(hardware_, calls_));
      });
}

SimulatedCaptureService::SimulatedCaptureService(std::shared_ptr<CaptureHardware> hardware,
                                                 std::shared_ptr<CallInterceptor> calls)
    : hardware_(std::move(hardware)),
      calls_(std::move(calls)),
      defaultPlugIn_(std::make_shared<SimulatedPlugIn>(hardware_, calls_)) {}

std::shared_ptr<CapturePlugIn> SimulatedCaptureService::createPlugIn() {
  return calls_->perform(
      {capture_operation::kCreatePlugIn, {}, {}}, nullptr, [] { return std::string(); },
      [&]() -> std::shared_ptr<CapturePlugIn> {
        if (!hardware_->device.plugInLoads) return nullptr;
        return std::make_shared<SimulatedPlugIn>(hardware_, calls_);
      });
}

std::shared_ptr<CapturePlugIn> SimulatedCaptureService::defaultPlugIn() {
  return calls_->perform(
      {capture_operation::kDefaultPlugIn, {}, {}}, nullptr, [] { return std::string(); },
      [&]() -> std::shared_ptr<CapturePlugIn> { return hardware_->device.plugInLoads ? defaultPlugIn_ : nullptr; });
}

}  // namespace quazor
