#include "backends/linux/capture/linux_group.h"

#include "platform/capture_keys.h"

#include <algorithm>
#include <utility>

namespace quazor {
namespace {

std::string nameOf(const GroupBinding& group) {
  std::string name = "group";
  for (const std::string& port : group.ports) name += " " + port;
  return name;
}

}  // namespace

LinuxGroup::LinuxGroup(std::shared_ptr<LinuxCaptureClient> user, std::size_t index,
                       const std::vector<std::shared_ptr<LinuxStream>>& streams)
    : user_(std::move(user)), index_(index), name_(nameOf(state().binding)) {
  for (const std::size_t camera : state().cameras) streams_.push_back(streams[camera]);
}

std::string LinuxGroup::description() const { return name_; }

std::optional<CaptureStreams> LinuxGroup::streams(DiagnosticErrorPtr* error) {
  return user_->perform(error,
                        [&] { return std::optional<CaptureStreams>(std::in_place, streams_.begin(), streams_.end()); });
}

std::optional<Value> LinuxGroup::valueForProperty(std::string_view key, DiagnosticErrorPtr* error) {
  return user_->perform(error, [&] { return read(key, error); });
}

bool LinuxGroup::setValue(const Value& value, std::string_view key, DiagnosticErrorPtr* error) {
  return user_->perform(error, [&] { return set(value, key, error); });
}

Value LinuxGroup::streamOf(std::size_t camera) const {
  return *std::ranges::find(streams_, camera, [](const auto& stream) { return stream->index(); });
}

std::optional<Value> LinuxGroup::read(std::string_view key, DiagnosticErrorPtr* error) const {
  if (key == capture_key::SynchronizationMaster) return streamOf(state().master);
  if (key == capture_key::MasterConfiguration) return state().masterConfiguration;
  if (key == capture_key::MasterConfigurationSupportedKeys) {
    return Value(Array{capture_key::SlaveConfigurationByPortType});
  }
  if (key == capture_key::ActiveStreams) {
    Array active;
    for (const std::size_t camera : state().active) active.push_back(streamOf(camera));
    return Value(std::move(active));
  }
  refuseLinux(error, LinuxErrorCode::kNoSuchProperty, "%@ has no property %@ of that use.", name_, key);
  return std::nullopt;
}

bool LinuxGroup::set(const Value& value, std::string_view key, DiagnosticErrorPtr* error) {
  const bool setsStreams = key == capture_key::ActiveStreams;
  if (!setsStreams && key != capture_key::MasterConfiguration) {
    return refuseLinux(error, LinuxErrorCode::kNoSuchProperty, "%@ has no property %@ of that use.", name_, key);
  }
  for (const std::size_t index : state().cameras) {
    const LinuxCamera& camera = *user_->cameras().cameras[index];
    if (camera.phase == CameraPhase::kStopped) continue;
    return refuseLinux(error, LinuxErrorCode::kWrongState, "%@: %@ cannot be set while %@ runs.", name_, key,
                       camera.port());
  }
  return setsStreams ? setActiveStreams(value, error) : setMasterConfiguration(value, error);
}

bool LinuxGroup::setActiveStreams(const Value& value, DiagnosticErrorPtr* error) {
  if (value.array() == nullptr) {
    return refuseLinux(error, LinuxErrorCode::kBadValue, "%@: %@ takes an array of streams, not %@.", name_,
                       capture_key::ActiveStreams, value);
  }
  std::vector<std::size_t> active;
  for (const Value& element : *value.array()) {
    const auto stream = std::dynamic_pointer_cast<LinuxStream>(element.object());
    const bool isOurs = stream != nullptr && std::ranges::find(streams_, stream) != streams_.end();
    if (!isOurs || std::ranges::find(active, stream->index()) != active.end()) {
      return refuseLinux(error, LinuxErrorCode::kBadValue, "%@: %@ takes streams of the group, each once; %@ is not.",
                         name_, capture_key::ActiveStreams, element);
    }
    if (!user_->checkControl(*user_->cameras().cameras[stream->index()], error)) return false;
    active.push_back(stream->index());
  }
  state().active = std::move(active);
  return true;
}

bool LinuxGroup::setMasterConfiguration(const Value& value, DiagnosticErrorPtr* error) {
  const LinuxCameras& cameras = user_->cameras();
  if (state().active.empty()) {
    return refuseLinux(error, LinuxErrorCode::kWrongState, "%@ has no active streams; set %@ first.", name_,
                       capture_key::ActiveStreams);
  }
  for (const std::size_t index : state().active) {
    if (!user_->checkControl(*cameras.cameras[index], error)) return false;
  }
  const Value* const slaves = entryOf(&value, capture_key::SlaveConfigurationByPortType);
  if (slaves == nullptr || slaves->dictionary() == nullptr || value.dictionary()->size() != 1) {
    return refuseLinux(error, LinuxErrorCode::kBadValue, "%@: %@ takes a dictionary with the one entry %@, not %@.",
                       name_, capture_key::MasterConfiguration, capture_key::SlaveConfigurationByPortType, value);
  }
  for (const auto& [port, configuration] : *slaves->dictionary()) {
    const bool isSlave =
        std::ranges::find(state().binding.ports, port) != state().binding.ports.end() && port != state().binding.master;
    if (!isSlave) {
      return refuseLinux(error, LinuxErrorCode::kBadValue, "%@: %@ is no port of a slave.", name_, port);
    }
    if (!isSlaveConfiguration(name_ + ", " + port, configuration, error)) return false;
  }
  state().masterConfiguration = value;
  return true;
}

}  // namespace quazor
