#include "backends/linux/capture/linux_stream.h"

#include "platform/capture_keys.h"

#include <utility>

namespace quazor {
namespace {

// Stores an error and is nothing.
std::nullopt_t unknown(std::string_view object, std::string_view key, DiagnosticErrorPtr* error) {
  refuseLinux(error, LinuxErrorCode::kNoSuchProperty, "%@ has no property %@ of that use.", object, key);
  return std::nullopt;
}

}  // namespace

LinuxStream::LinuxStream(std::shared_ptr<LinuxCaptureClient> user, std::size_t index)
    : user_(std::move(user)), index_(index), port_(camera().port()) {}

std::string LinuxStream::description() const { return "stream of " + port_; }

std::optional<Value> LinuxStream::valueForProperty(std::string_view key, DiagnosticErrorPtr* error) {
  return user_->perform(error, [&] { return read(key, error); });
}

bool LinuxStream::setValue(const Value& value, std::string_view key, DiagnosticErrorPtr* error) {
  return user_->perform(error, [&] { return set(value, key, error); });
}

bool LinuxStream::start(DiagnosticErrorPtr* error) { return user_->start(index_, error); }

bool LinuxStream::stop(DiagnosticErrorPtr* error) { return user_->stop(index_, error); }

std::optional<Value> LinuxStream::read(std::string_view key, DiagnosticErrorPtr* error) const {
  const CameraSettings& settings = camera().settings();
  if (key == capture_key::PortType) return Value(port_);
  if (key == capture_key::ErrorCounters) {
    if (camera().run == nullptr) return Value(errorCountersOf(camera().binding().errorCounters));
    return camera().run->errorCounters(error);
  }
  if (key == capture_key::FormatIndex) return settings.formatIndex;
  if (key == capture_key::MinimumFrameRate && settings.minimumRate) return settings.minimumRate;
  if (key == capture_key::MaximumFrameRate && settings.maximumRate) return settings.maximumRate;
  if (key == capture_key::MultipleOutputSupportEnabled) return settings.multipleOutputs;
  if (key == capture_key::SynchronizedStreamsSlaveConfiguration) return settings.slaveConfiguration;
  if (key == capture_key::AEEnabled) return settings.autoExposure;
  if (key == capture_key::InfraredLightSourceConfiguration && camera().binding().projector) {
    return settings.lightSource;
  }
  if (key == capture_key::VideoOutputConfigurations) return settings.outputConfigurations;
  if (key == capture_key::VideoOutputsEnabled) return settings.outputsEnabled;
  if (key == capture_key::VideoOutputHandlers) return settings.outputHandlers;
  return unknown(port_, key, error);
}

bool LinuxStream::set(const Value& value, std::string_view key, DiagnosticErrorPtr* error) {
  if (!user_->checkControl(camera(), error)) return false;
  if (camera().phase != CameraPhase::kStopped) {
    return refuseLinux(error, LinuxErrorCode::kWrongState, "%@: %@ cannot be set while the stream runs.", port_, key);
  }
  CameraSettings& settings = camera().settings();
  if (key == capture_key::FormatIndex) {
    return isIndex(port_, key, value, error) && camera().setFormatIndex(value, error);
  }
  if (key == capture_key::MinimumFrameRate) {
    return isRate(port_, key, value, error) && camera().setRates(value, settings.maximumRate, error);
  }
  if (key == capture_key::MaximumFrameRate) {
    return isRate(port_, key, value, error) && camera().setRates(settings.minimumRate, value, error);
  }
  if (key == capture_key::AEEnabled) {
    return isBoolean(port_, key, value, error) && camera().setAutoExposure(value, error);
  }
  if (key == capture_key::InfraredLightSourceConfiguration) {
    return isLightSource(port_, value, error) && camera().setLightSource(value, error);
  }
  return setOutput(value, key, error);
}

// What only has to be kept: there is one output, which is the camera's.
bool LinuxStream::setOutput(const Value& value, std::string_view key, DiagnosticErrorPtr* error) {
  CameraSettings& settings = camera().settings();
  const auto keep = [&](bool fits, Value& setting) {
    if (fits) user_->cameras().dropped.push_back(std::exchange(setting, value));
    return fits;
  };
  if (key == capture_key::MultipleOutputSupportEnabled) {
    return keep(isBoolean(port_, key, value, error), settings.multipleOutputs);
  }
  if (key == capture_key::SynchronizedStreamsSlaveConfiguration) {
    return keep(isSlaveConfiguration(port_, value, error), settings.slaveConfiguration);
  }
  if (key == capture_key::VideoOutputConfigurations) {
    return keep(isOutputConfigurations(port_, value, error), settings.outputConfigurations);
  }
  if (key == capture_key::VideoOutputsEnabled) {
    return keep(isOutputsEnabled(port_, value, error), settings.outputsEnabled);
  }
  if (key == capture_key::VideoOutputHandlers) {
    return keep(isOutputHandlers(port_, value, error), settings.outputHandlers);
  }
  unknown(port_, key, error);
  return false;
}

}  // namespace quazor
