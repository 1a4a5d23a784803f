#include "backends/simulated/capture/simulated_group.h"

#include "backends/simulated/capture/property_checks.h"

#include <algorithm>

namespace quazor {

SimulatedGroup::SimulatedGroup(std::shared_ptr<const SimulatedCaptureClient> user, std::size_t index,
                               const std::vector<std::shared_ptr<SimulatedStream>>& streams)
    : user_(std::move(user)), index_(index), id_(state().id) {
  for (const std::size_t camera : state().cameras) streams_.push_back(streams[camera]);
}

std::string SimulatedGroup::description() const { return "group " + id_; }

std::optional<CaptureStreams> SimulatedGroup::streams(DiagnosticErrorPtr* error) {
  return user_->perform(
      {capture_operation::kGroupStreams, id_, {}}, error, [] { return std::string(); },
      [&] { return std::optional<CaptureStreams>(std::in_place, streams_.begin(), streams_.end()); });
}

std::optional<Value> SimulatedGroup::valueForProperty(std::string_view key, DiagnosticErrorPtr* error) {
  return user_->perform(
      {capture_operation::kReadGroup, id_, key}, error, [&] { return std::string(key); },
      [&] { return read(key, error); });
}

bool SimulatedGroup::setValue(const Value& value, std::string_view key, DiagnosticErrorPtr* error) {
  return user_->perform(
      {capture_operation::kSetGroup, id_, key}, error, [&] { return formatMessage("%@ = %@", key, value); },
      [&] { return set(value, key, error); });
}

Value SimulatedGroup::streamOf(std::size_t camera) const {
  return *std::ranges::find(streams_, camera, [](const auto& stream) { return stream->index(); });
}

std::optional<Value> SimulatedGroup::read(std::string_view key, DiagnosticErrorPtr* error) const {
  if (!checkKnown(CaptureObjectKind::kGroup, id_, key, error)) return std::nullopt;
  if (key == capture_key::SynchronizationMaster) return streamOf(state().master);
  if (key == capture_key::MasterConfiguration) return state().masterConfiguration;
  Array elements;
  if (key == capture_key::ActiveStreams) {
    for (const std::size_t camera : state().active) elements.push_back(streamOf(camera));
  } else if (state().masterConfigurationSupported) {
    elements.emplace_back(capture_key::SlaveConfigurationByPortType);
  }
  return Value(std::move(elements));
}

bool SimulatedGroup::set(const Value& value, std::string_view key, DiagnosticErrorPtr* error) {
  if (!checkWritable(CaptureObjectKind::kGroup, id_, key, error)) return false;
  if (!checkStopped(key, error)) return false;
  return key == capture_key::ActiveStreams ? setActiveStreams(value, error) : setMasterConfiguration(value, error);
}

bool SimulatedGroup::checkStopped(std::string_view key, DiagnosticErrorPtr* error) const {
  for (const std::size_t index : state().cameras) {
    const CameraState& camera = user_->hardware().cameras[index];
    if (camera.running) {
      return refuse(error, CaptureErrorCode::kWrongState, "%@: %@ cannot be set while %@ is running.", id_, key,
                    camera.camera.id);
    }
  }
  return true;
}

bool SimulatedGroup::setActiveStreams(const Value& value, DiagnosticErrorPtr* error) {
  const Array* elements = value.array();
  if (elements == nullptr) {
    return refuse(error, CaptureErrorCode::kWrongType, "%@: %@ must be an array of streams, not %@.", id_,
                  capture_key::ActiveStreams, described(value));
  }
  std::vector<std::size_t> active;
  for (const Value& element : *elements) {
    const auto stream = std::dynamic_pointer_cast<SimulatedStream>(element.object());
    if (stream == nullptr) {
      return refuse(error, CaptureErrorCode::kWrongType, "%@: %@ must hold streams, not %@.", id_,
                    capture_key::ActiveStreams, described(element));
    }
    if (std::ranges::find(streams_, stream) == streams_.end()) {
      return refuse(error, CaptureErrorCode::kForeignObject, "%@: %@ must hold streams of the group, not %@.", id_,
                    capture_key::ActiveStreams, stream);
    }
    if (std::ranges::find(active, stream->index()) != active.end()) {
      return refuse(error, CaptureErrorCode::kOutOfRange, "%@: %@ must hold a stream once, not %@ twice.", id_,
                    capture_key::ActiveStreams, stream);
    }
    if (!user_->checkControl(user_->hardware().cameras[stream->index()], error)) return false;
    active.push_back(stream->index());
  }
  state().active = std::move(active);
  return true;
}

bool SimulatedGroup::setMasterConfiguration(const Value& value, DiagnosticErrorPtr* error) {
  for (const std::size_t camera : state().active) {
    if (!user_->checkControl(user_->hardware().cameras[camera], error)) return false;
  }
  if (state().active.empty()) {
    return refuse(error, CaptureErrorCode::kWrongState, "%@ has no active streams; set %@ first.", id_,
                  capture_key::ActiveStreams);
  }
  if (!state().masterConfigurationSupported) {
    return refuse(error, CaptureErrorCode::kUnsupported, "%@ does not support %@ in %@.", id_,
                  capture_key::SlaveConfigurationByPortType, capture_key::MasterConfiguration);
  }
  const Dictionary* entries = value.dictionary();
  if (entries == nullptr) {
    return refuse(error, CaptureErrorCode::kWrongType, "%@: %@ must be a dictionary, not %@.", id_,
                  capture_key::MasterConfiguration, described(value));
  }
  for (const auto& [key, entry] : *entries) {
    if (key != capture_key::SlaveConfigurationByPortType) {
      return refuse(error, CaptureErrorCode::kOutOfRange, "%@: %@ must hold only %@, not %@.", id_,
                    capture_key::MasterConfiguration, capture_key::SlaveConfigurationByPortType, key);
    }
    if (!checkSlaves(entry, error)) return false;
  }
  state().masterConfiguration = value;
  return true;
}

bool SimulatedGroup::checkSlaves(const Value& value, DiagnosticErrorPtr* error) const {
  const Dictionary* slaves = value.dictionary();
  if (slaves == nullptr) {
    return refuse(error, CaptureErrorCode::kWrongType, "%@: %@ must be a dictionary, not %@.", id_,
                  capture_key::SlaveConfigurationByPortType, described(value));
  }
  for (const auto& [port, configuration] : *slaves) {
    const bool isSlave = std::ranges::any_of(state().cameras, [&, &name = port](std::size_t camera) {
      return camera != state().master && user_->hardware().cameras[camera].camera.port == name;
    });
    if (!isSlave) {
      return refuse(error, CaptureErrorCode::kOutOfRange, "%@: %@ must name ports of the group's slaves, not %@.", id_,
                    capture_key::SlaveConfigurationByPortType, port);
    }
    if (!checkSlaveConfiguration(id_ + " for " + port, configuration, error)) return false;
  }
  return true;
}

}  // namespace quazor
