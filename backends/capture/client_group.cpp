#include "backends/capture/client_group.h"

#include "backends/capture/property_checks.h"

#include <algorithm>
#include <utility>

namespace quazor {

ClientGroup::ClientGroup(std::shared_ptr<CaptureClient> client, std::size_t index, const ClientStreams& streams)
    : client_(std::move(client)), index_(index) {
  for (const std::size_t camera : slot().info.cameras) streams_.push_back(streams[camera]);
}

std::string ClientGroup::description() const { return slot().info.description; }

std::optional<CaptureStreams> ClientGroup::streams(DiagnosticErrorPtr* error) {
  return client_->perform(error, [&](const Refuser&) {
    return std::optional<CaptureStreams>(std::in_place, streams_.begin(), streams_.end());
  });
}

std::optional<Value> ClientGroup::valueForProperty(std::string_view key, DiagnosticErrorPtr* error) {
  return client_->perform(error, [&](const Refuser& refuse) { return read(key, refuse); });
}

bool ClientGroup::setValue(const Value& value, std::string_view key, DiagnosticErrorPtr* error) {
  return client_->perform(error, [&](const Refuser& refuse) { return set(value, key, refuse); });
}

Value ClientGroup::streamOf(std::size_t camera) const {
  return *std::ranges::find(streams_, camera, [](const auto& stream) { return stream->index(); });
}

std::optional<Value> ClientGroup::read(std::string_view key, const Refuser& refuse) const {
  if (!checkKnown(CaptureObjectKind::kGroup, name(), key, refuse)) return std::nullopt;
  if (key == capture_key::SynchronizationMaster) return streamOf(slot().info.master);
  if (key == capture_key::MasterConfiguration) return slot().masterConfiguration;
  Array elements;
  if (key == capture_key::ActiveStreams) {
    for (const std::size_t camera : slot().active) elements.push_back(streamOf(camera));
  } else if (slot().info.takesMasterConfiguration) {
    elements.emplace_back(capture_key::SlaveConfigurationByPortType);
  }
  return Value(std::move(elements));
}

bool ClientGroup::set(const Value& value, std::string_view key, const Refuser& refuse) {
  if (!checkWritable(CaptureObjectKind::kGroup, name(), key, refuse)) return false;
  if (!checkStopped(name(), key, client_->slots(), slot(), refuse)) return false;
  return key == capture_key::ActiveStreams ? setActiveStreams(value, refuse) : setMasterConfiguration(value, refuse);
}

bool ClientGroup::setActiveStreams(const Value& value, const Refuser& refuse) {
  constexpr std::string_view kKey = capture_key::ActiveStreams;
  if (value.array() == nullptr) {
    return refuse(CaptureRefusal::kWrongType, "%@: %@ must be an array of streams, not %@.", name(), kKey,
                  described(value));
  }
  std::vector<std::size_t> active;
  for (const Value& element : *value.array()) {
    const auto stream = std::dynamic_pointer_cast<ClientStream>(element.object());
    if (stream == nullptr) {
      return refuse(CaptureRefusal::kWrongType, "%@: %@ must contain streams, not %@.", name(), kKey,
                    described(element));
    }
    if (std::ranges::find(streams_, stream) == streams_.end()) {
      return refuse(CaptureRefusal::kForeignObject, "%@: %@ must contain streams of the group, not %@.", name(), kKey,
                    stream);
    }
    if (std::ranges::find(active, stream->index()) != active.end()) {
      return refuse(CaptureRefusal::kOutOfRange, "%@: %@ must contain a stream once, not %@ twice.", name(), kKey,
                    stream);
    }
    if (!client_->checkControl(client_->slots().cameras[stream->index()], refuse)) return false;
    active.push_back(stream->index());
  }
  slot().active = std::move(active);
  return true;
}

bool ClientGroup::setMasterConfiguration(const Value& value, const Refuser& refuse) {
  constexpr std::string_view kKey = capture_key::MasterConfiguration;
  constexpr std::string_view kSlaves = capture_key::SlaveConfigurationByPortType;
  if (slot().active.empty()) {
    return refuse(CaptureRefusal::kWrongState, "%@ has no active streams; set %@ first.", name(),
                  capture_key::ActiveStreams);
  }
  for (const std::size_t camera : slot().active) {
    if (!client_->checkControl(client_->slots().cameras[camera], refuse)) return false;
  }
  if (!slot().info.takesMasterConfiguration) {
    return refuse(CaptureRefusal::kUnsupported, "%@ does not support %@ in %@.", name(), kSlaves, kKey);
  }
  if (value.dictionary() == nullptr) {
    return refuse(CaptureRefusal::kWrongType, "%@: %@ must be a dictionary, not %@.", name(), kKey, described(value));
  }
  const Value* const slaves = value.dictionary()->find(kSlaves);
  if (slaves == nullptr || value.dictionary()->size() != 1) {
    return refuse(CaptureRefusal::kOutOfRange, "%@: %@ must have exactly one entry, %@.", name(), kKey, kSlaves);
  }
  if (!checkSlaves(*slaves, refuse)) return false;
  slot().masterConfiguration = value;
  return true;
}

bool ClientGroup::checkSlaves(const Value& value, const Refuser& refuse) const {
  constexpr std::string_view kKey = capture_key::SlaveConfigurationByPortType;
  if (value.dictionary() == nullptr) {
    return refuse(CaptureRefusal::kWrongType, "%@: %@ must be a dictionary, not %@.", name(), kKey, described(value));
  }
  for (const auto& [port, configuration] : *value.dictionary()) {
    const CameraInfo* slave = nullptr;
    for (const std::size_t camera : slot().info.cameras) {
      const CameraInfo& info = client_->slots().cameras[camera].info();
      if (camera != slot().info.master && info.port == port) slave = &info;
    }
    if (slave == nullptr) {
      return refuse(CaptureRefusal::kOutOfRange, "%@: %@ must name ports of the group's slaves, not %@.", name(), kKey,
                    port);
    }
    if (!checkSlaveConfiguration(name() + " for " + port, *slave, configuration, refuse)) return false;
  }
  return true;
}

}  // namespace quazor
