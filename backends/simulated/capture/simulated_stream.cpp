#include "backends/simulated/capture/simulated_stream.h"

#include "backends/simulated/capture/output_state.h"
#include "backends/simulated/capture/property_checks.h"

namespace quazor {
namespace {

const Camera& cameraAt(const SimulatedCaptureClient& user, std::size_t index) {
  return user.hardware().cameras[index].camera;
}

}  // namespace

SimulatedStream::SimulatedStream(std::shared_ptr<const SimulatedCaptureClient> user, std::size_t index)
    : user_(std::move(user)), index_(index), id_(cameraAt(*user_, index).id), port_(cameraAt(*user_, index).port) {}

std::string SimulatedStream::description() const { return "stream " + id_ + " (" + port_ + ")"; }

std::optional<Value> SimulatedStream::valueForProperty(std::string_view key, DiagnosticErrorPtr* error) {
  return user_->perform(
      {capture_operation::kReadStream, id_, key}, error, [&] { return std::string(key); },
      [&] { return read(key, error); });
}

bool SimulatedStream::setValue(const Value& value, std::string_view key, DiagnosticErrorPtr* error) {
  return user_->perform(
      {capture_operation::kSetStream, id_, key}, error, [&] { return formatMessage("%@ = %@", key, value); },
      [&] { return set(value, key, error); });
}

bool SimulatedStream::start(DiagnosticErrorPtr* error) {
  return user_->perform(
      {capture_operation::kStart, id_, {}}, error, [] { return std::string(); },
      [&] {
        CaptureHardware& hardware = user_->hardware();
        CameraState& camera = hardware.cameras[index_];
        if (!checkStart(camera, error)) return false;
        hardware.start(camera);
        return true;
      });
}

bool SimulatedStream::stop(DiagnosticErrorPtr* error) {
  std::shared_ptr<FrameDelivery> stopped;
  return user_->perform(
      {capture_operation::kStop, id_, {}}, error, [] { return std::string(); },
      [&] {
        CaptureHardware& hardware = user_->hardware();
        CameraState& camera = hardware.cameras[index_];
        if (!user_->checkControl(camera, error)) return false;
        if (!camera.running) {
          return refuse(error, CaptureErrorCode::kWrongState, "%@ is not running; it cannot be stopped.", id_);
        }
        stopped = hardware.stop(camera);
        return true;
      },
      [&] {
        if (stopped != nullptr) stopped->finish();
      });
}

std::optional<Value> SimulatedStream::read(std::string_view key, DiagnosticErrorPtr* error) const {
  if (!checkKnown(CaptureObjectKind::kStream, id_, key, error)) return std::nullopt;
  const CameraState& state = user_->hardware().cameras[index_];
  if (key == capture_key::PortType) return Value(port_);
  if (key == capture_key::FormatIndex) return state.formatIndex;
  if (key == capture_key::MinimumFrameRate) return state.minimumFrameRate.value_or(Value(state.minimumRate()));
  if (key == capture_key::MaximumFrameRate) return state.maximumFrameRate.value_or(Value(state.maximumRate()));
  if (key == capture_key::MultipleOutputSupportEnabled) return state.multipleOutputs;
  if (key == capture_key::SynchronizedStreamsSlaveConfiguration) return state.slaveConfiguration;
  if (isOutputProperty(key)) return readOutput(state, key, error);
  if (auto counters = state.errorCounters(user_->hardware().clock->now())) return Value(*std::move(counters));
  refuse(error, CaptureErrorCode::kUnreadableProperty, "%@: %@ cannot be read.", id_, key);
  return std::nullopt;
}

bool SimulatedStream::set(const Value& value, std::string_view key, DiagnosticErrorPtr* error) {
  if (!checkWritable(CaptureObjectKind::kStream, id_, key, error)) return false;
  CameraState& state = user_->hardware().cameras[index_];
  if (!user_->checkControl(state, error)) return false;
  if (state.running) {
    return refuse(error, CaptureErrorCode::kWrongState, "%@ is running; %@ cannot be set until it is stopped.", id_,
                  key);
  }
  if (key == capture_key::FormatIndex) {
    if (!checkIndex(id_, key, value, state.camera.formats.size() - 1, error)) return false;
    state.formatIndex = value;
  } else if (key == capture_key::MinimumFrameRate) {
    if (!checkRate(id_, key, value, state.formatMaximum(), error)) return false;
    state.minimumFrameRate = value;
  } else if (key == capture_key::MaximumFrameRate) {
    if (!checkRate(id_, key, value, state.formatMaximum(), error)) return false;
    state.maximumFrameRate = value;
  } else if (key == capture_key::MultipleOutputSupportEnabled) {
    if (!checkBoolean(id_, key, value, error)) return false;
    if (*value.boolean() && !state.camera.multipleOutputs) {
      return refuse(error, CaptureErrorCode::kUnsupported, "%@ does not support multiple outputs.", id_);
    }
    state.multipleOutputs = value;
  } else if (isOutputProperty(key)) {
    return setOutput(state, value, key, error);
  } else {
    if (!checkSlaveConfiguration(id_, value, error)) return false;
    state.slaveConfiguration = value;
  }
  return true;
}

bool SimulatedStream::checkStart(const CameraState& camera, DiagnosticErrorPtr* error) const {
  if (!user_->checkControl(camera, error)) return false;
  if (camera.running) return refuse(error, CaptureErrorCode::kWrongState, "%@ is running already.", id_);
  if (camera.maximumRate() > camera.formatMaximum()) {
    return refuse(error, CaptureErrorCode::kWrongState,
                  "%@ cannot start: MaximumFrameRate is %@, and format %@ has at most %@.", id_, camera.maximumRate(),
                  camera.formatIndex, camera.formatMaximum());
  }
  if (camera.minimumRate() > camera.maximumRate()) {
    return refuse(error, CaptureErrorCode::kWrongState,
                  "%@ cannot start: MinimumFrameRate is %@, above the MaximumFrameRate %@.", id_, camera.minimumRate(),
                  camera.maximumRate());
  }
  return true;
}

}  // namespace quazor
