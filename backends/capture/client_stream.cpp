#include "backends/capture/client_stream.h"

#include "backends/capture/output_checks.h"
#include "backends/capture/property_checks.h"

#include <limits>
#include <utility>

namespace quazor {
namespace {

constexpr std::uint64_t kMaxFormatIndex = std::numeric_limits<std::uint32_t>::max();
constexpr double kMaxRate = 10'000;

// The stored value of a settable property. Adds a missing rate.
Value& settingOf(CameraSettings& settings, std::string_view key) {
  const std::pair<std::string_view, Value*> kept[] = {
      {capture_key::FormatIndex, &settings.formatIndex},
      {capture_key::MultipleOutputSupportEnabled, &settings.multipleOutputs},
      {capture_key::SynchronizedStreamsSlaveConfiguration, &settings.slaveConfiguration},
      {capture_key::AEEnabled, &settings.autoExposure},
      {capture_key::InfraredLightSourceConfiguration, &settings.lightSource},
      {capture_key::VideoOutputConfigurations, &settings.outputConfigurations},
      {capture_key::VideoOutputsEnabled, &settings.outputsEnabled},
  };
  for (const auto& [name, value] : kept) {
    if (name == key) return *value;
  }
  if (key == capture_key::MinimumFrameRate) return settings.minimumRate.emplace(0);
  if (key == capture_key::MaximumFrameRate) return settings.maximumRate.emplace(0);
  return settings.outputHandlers;
}

bool apply(CameraBack& camera, const CameraSettings& wanted, std::string_view key, DiagnosticErrorPtr* error) {
  if (key == capture_key::FormatIndex) return camera.applyFormat(wanted, error);
  if (key == capture_key::AEEnabled) return camera.applyAutoExposure(wanted, error);
  if (key == capture_key::InfraredLightSourceConfiguration) return camera.checkLightSource(wanted, error);
  const bool isRate = key == capture_key::MinimumFrameRate || key == capture_key::MaximumFrameRate;
  return !isRate || camera.applyRates(wanted, error);
}

}  // namespace

ClientStream::ClientStream(std::shared_ptr<CaptureClient> client, std::size_t index)
    : client_(std::move(client)), index_(index) {}

std::string ClientStream::description() const { return slot().info().description; }

std::optional<Value> ClientStream::valueForProperty(std::string_view key, DiagnosticErrorPtr* error) {
  return client_->perform(error, [&](const Refuser& refuse) { return read(key, refuse); });
}

bool ClientStream::setValue(const Value& value, std::string_view key, DiagnosticErrorPtr* error) {
  return client_->perform(error, [&](const Refuser& refuse) { return set(value, key, refuse); });
}

bool ClientStream::start(DiagnosticErrorPtr* error) { return client_->start(index_, error); }

bool ClientStream::stop(DiagnosticErrorPtr* error) { return client_->stop(index_, error); }

std::optional<Value> ClientStream::read(std::string_view key, const Refuser& refuse) const {
  if (!checkKnown(CaptureObjectKind::kStream, name(), key, refuse)) return std::nullopt;
  CameraSlot& camera = slot();
  if (key == capture_key::PortType) return Value(camera.info().port);
  if (key == capture_key::CameraName) {
    const std::optional<std::string> cameraName = camera.back->cameraName();
    if (cameraName) return Value(*cameraName);
    refuse(CaptureRefusal::kUnreadableProperty, "%@: %@ cannot be read without control of the stream.", name(), key);
    return std::nullopt;
  }
  if (key == capture_key::MinimumFrameRate) {
    const CameraSettings& settings = camera.settings;
    return readRate(key, settings.minimumRate ? settings.minimumRate : settings.maximumRate, refuse);
  }
  if (key == capture_key::MaximumFrameRate) return readRate(key, camera.settings.maximumRate, refuse);
  if (key == capture_key::ErrorCounters) {
    std::optional<Dictionary> counters = camera.back->errorCounters(camera.run.get(), refuse.error());
    return counters ? std::optional<Value>(*std::move(counters)) : std::nullopt;
  }
  if (key == capture_key::InfraredLightSourceConfiguration && !checkProjector(camera.info(), refuse)) {
    return std::nullopt;
  }
  return settingOf(camera.settings, key);
}

// A rate that was not set is that of the format, if known.
std::optional<Value> ClientStream::readRate(std::string_view key, const std::optional<Value>& rate,
                                            const Refuser& refuse) const {
  if (rate) return rate;
  if (const std::optional<double> ofFormat = slot().back->maxFrameRate(slot().settings)) return Value(*ofFormat);
  refuse(CaptureRefusal::kUnreadableProperty, "%@: %@ cannot be read before it is set.", name(), key);
  return std::nullopt;
}

bool ClientStream::set(const Value& value, std::string_view key, const Refuser& refuse) {
  CameraSlot& camera = slot();
  if (!checkWritable(CaptureObjectKind::kStream, name(), key, refuse)) return false;
  if (!client_->checkControl(camera, refuse)) return false;
  if (camera.phase != StreamPhase::kStopped) {
    return refuse(CaptureRefusal::kWrongState, "%@ is running; %@ cannot be set until it is stopped.", name(), key);
  }
  if (!check(value, key, refuse)) return false;
  CameraSettings wanted = camera.settings;
  settingOf(wanted, key) = value;
  if (!apply(*camera.back, wanted, key, refuse.error())) return false;
  std::swap(camera.settings, wanted);
  client_->slots().dropped.push_back(std::move(wanted.outputHandlers));
  return true;
}

bool ClientStream::check(const Value& value, std::string_view key, const Refuser& refuse) const {
  const CameraSlot& camera = slot();
  const CameraInfo& info = camera.info();
  if (key == capture_key::FormatIndex) {
    return checkIndex(info.name, key, value, camera.back->maxFormatIndex().value_or(kMaxFormatIndex), refuse);
  }
  if (key == capture_key::MinimumFrameRate || key == capture_key::MaximumFrameRate) {
    return checkRate(info.name, key, value, camera.back->maxFrameRate(camera.settings).value_or(kMaxRate), refuse);
  }
  if (key == capture_key::MultipleOutputSupportEnabled) {
    if (!checkBoolean(info.name, key, value, refuse)) return false;
    if (!*value.boolean() || info.hasMultipleOutputs) return true;
    return refuse(CaptureRefusal::kUnsupported, "%@ does not support multiple outputs.", info.name);
  }
  if (key == capture_key::SynchronizedStreamsSlaveConfiguration) {
    return checkSlaveConfiguration(info.name, info, value, refuse);
  }
  if (key == capture_key::AEEnabled) return checkBoolean(info.name, key, value, refuse);
  if (key == capture_key::InfraredLightSourceConfiguration) {
    return checkProjector(info, refuse) && checkLightSource(info.name, value, refuse);
  }
  if (key == capture_key::VideoOutputConfigurations) return checkOutputConfigurations(info.name, value, refuse);
  if (key == capture_key::VideoOutputsEnabled) return checkOutputsEnabled(info.name, value, refuse);
  return checkOutputHandlers(info.name, value, refuse);
}

}  // namespace quazor
