#include "diagnostics/camera_sync/camera_session.h"

#include "contract/log_channel.h"
#include "platform/capture_keys.h"

#include <algorithm>
#include <string_view>
#include <utility>

namespace quazor {

namespace {

bool hasPortType(CaptureStream& stream, std::string_view port) {
  const std::optional<Value> portType = stream.valueForProperty(capture_key::PortType, nullptr);
  return portType && portType->string() != nullptr && *portType->string() == port;
}

// The group's streams for the ports, in the order of the ports; shorter than `ports` if one is missing.
CaptureStreams streamsForPorts(const CaptureStreams& groupStreams, const std::vector<std::string>& ports) {
  CaptureStreams selected;
  for (const std::string& port : ports) {
    const auto found = std::find_if(groupStreams.begin(), groupStreams.end(),
                                    [&](const auto& stream) { return hasPortType(*stream, port); });
    if (found != groupStreams.end()) selected.push_back(*found);
  }
  return selected;
}

Array arrayOf(const CaptureStreams& streams) { return Array(streams.begin(), streams.end()); }

// Every slave delivers its own frames, one per frame of the master.
Dictionary slaveConfiguration() {
  Dictionary configuration;
  configuration.set(capture_key::StreamingOutputsEnabled, true);
  configuration.set(capture_key::FrameSkippingEnabled, false);
  configuration.set(capture_key::TimeMachineEnabled, false);
  configuration.set(capture_key::MasterToSlaveFrameRateRatio, 1);
  return configuration;
}

bool holdsString(const std::optional<Value>& list, std::string_view text) {
  const Array* elements = list ? list->array() : nullptr;
  return elements != nullptr && std::any_of(elements->begin(), elements->end(), [&](const Value& element) {
           return element.string() != nullptr && *element.string() == text;
         });
}

// An entry of a status: nothing if it is absent, 0 if it is not a number.
std::optional<Value> numberIn(const Dictionary& status, std::string_view key) {
  const Value* number = status.find(key);
  if (number == nullptr) return std::nullopt;
  return number->isNumber() ? *number : Value(0);
}

}  // namespace

CameraSession::CameraSession(std::shared_ptr<CaptureDevice> device, std::vector<std::string> ports)
    : device_(std::move(device)), ports_(std::move(ports)) {}

std::optional<CameraSession> CameraSession::synchronize(std::shared_ptr<CaptureDevice> device,
                                                        const std::vector<std::string>& ports) {
  CameraSession session(std::move(device), ports);
  DiagnosticErrorPtr underlying;
  const std::optional<SynchronizedStreamsGroups> groups = session.device_->synchronizedStreamsGroups(&underlying);
  if (!groups) {
    logError("Failed to copy groups from device! %@", underlying);
    return std::nullopt;
  }
  if (!session.chooseGroup(*groups) || !session.takeStreams() || !session.activate()) return std::nullopt;
  if (!session.configureSlaves(session.enableMultipleOutputs())) return std::nullopt;
  return session;
}

bool CameraSession::chooseGroup(const SynchronizedStreamsGroups& groups) {
  for (const std::shared_ptr<SynchronizedStreamsGroup>& group : groups) {
    const CaptureStreams groupStreams = group->streams(nullptr).value_or(CaptureStreams{});
    if (groupStreams.size() < ports_.size()) continue;
    streams_ = streamsForPorts(groupStreams, ports_);
    if (streams_.size() == ports_.size()) {
      group_ = group;
      return true;
    }
  }
  logError("Failed to find appropriate group for ports %@!", ports_);
  return false;
}

bool CameraSession::takeStreams() {
  DiagnosticErrorPtr underlying;
  if (device_->requestControlOfStreams(streams_, &underlying)) return true;
  logError("Failed to request control streams %@! %@", ports_, underlying);
  return false;
}

bool CameraSession::activate() {
  DiagnosticErrorPtr activeStreamsError;
  if (!group_->setValue(arrayOf(streams_), capture_key::ActiveStreams, &activeStreamsError)) {
    logError("Failed to set the active streams %@!", activeStreamsError);
    return false;
  }
  const std::optional<Value> master = group_->valueForProperty(capture_key::SynchronizationMaster, nullptr);
  if (!master || streams_.empty() || master->object() != streams_.front()) {
    logError("The sync master port must be provided first!");
    return false;
  }
  const Dictionary configuration{{std::string(capture_key::ActiveSynchronizedStreamsGroups), Array{group_}}};
  DiagnosticErrorPtr configurationError;
  if (!device_->setValue(configuration, capture_key::MultiCamConfiguration, &configurationError)) {
    logError("Failed to set the multicam config! %@", configurationError);
    return false;
  }
  return true;
}

// Sets all streams, including the master's. Returns the configurations, by port, of the slaves that accepted it.
Dictionary CameraSession::enableMultipleOutputs() {
  Dictionary configurations;
  for (std::size_t i = 0; i < streams_.size(); ++i) {
    DiagnosticErrorPtr underlying;
    if (!streams_[i]->setValue(true, capture_key::MultipleOutputSupportEnabled, &underlying)) {
      logError("Failed to configure %@ for multiple output support! %@", ports_[i], underlying);
    } else if (i > 0) {
      configurations.set(ports_[i], slaveConfiguration());
    }
  }
  return configurations;
}

bool CameraSession::configureSlaves(const Dictionary& configurations) {
  const std::optional<Value> supportedKeys =
      group_->valueForProperty(capture_key::MasterConfigurationSupportedKeys, nullptr);
  if (!holdsString(supportedKeys, capture_key::SlaveConfigurationByPortType)) {
    logDefault("Device does not support %@, using %@ instead.", capture_key::SlaveConfigurationByPortType,
               capture_key::SynchronizedStreamsSlaveConfiguration);
    return configureSlavesByPort(configurations);
  }
  logDefault("Device supports %@", capture_key::SlaveConfigurationByPortType);
  const Dictionary configuration{{std::string(capture_key::SlaveConfigurationByPortType), configurations}};
  DiagnosticErrorPtr underlying;
  if (group_->setValue(configuration, capture_key::MasterConfiguration, &underlying)) return true;
  logError("Failed to set the slave config! %@", underlying);
  return false;
}

bool CameraSession::configureSlavesByPort(const Dictionary& configurations) {
  for (const auto& [port, configuration] : configurations) {
    for (const std::shared_ptr<CaptureStream>& stream : streams_) {
      if (!hasPortType(*stream, port)) continue;
      DiagnosticErrorPtr underlying;
      if (!stream->setValue(configuration, capture_key::SynchronizedStreamsSlaveConfiguration, &underlying)) {
        logError("Failed to set the slave config! %@", underlying);
        return false;
      }
    }
  }
  return true;
}

bool CameraSession::configure(const Array& formatIndexes, const Value& frameRate, DiagnosticErrorPtr& error) {
  for (std::size_t i = 0; i < streams_.size(); ++i) {
    const Value* formatIndex = i < formatIndexes.size() ? &formatIndexes[i] : nullptr;
    if (!configureStream(i, formatIndex, frameRate, error)) return false;
  }
  return true;
}

bool CameraSession::configureStream(std::size_t position, const Value* formatIndex, const Value& frameRate,
                                    DiagnosticErrorPtr& error) {
  CaptureStream& stream = *streams_[position];
  const std::string& port = ports_[position];
  error = nullptr;
  DiagnosticErrorPtr formatError;
  if (formatIndex == nullptr || !stream.setValue(*formatIndex, capture_key::FormatIndex, &formatError)) {
    logError("Failed to set the format index to %@ on %@! %@", formatIndex, port, formatError);
    fail(&error, QZCapturePlugInErrorDomain, camera_sync_error::kFormatRefused, formatError,
         "Failed to set format index to %@", formatIndex);
    return false;
  }
  DiagnosticErrorPtr minimumError;
  if (!stream.setValue(frameRate, capture_key::MinimumFrameRate, &minimumError)) {
    logError("Failed to set the min frame rate to %@ on %@! %@", frameRate, port, minimumError);
    return false;
  }
  DiagnosticErrorPtr maximumError;
  if (!stream.setValue(frameRate, capture_key::MaximumFrameRate, &maximumError)) {
    logError("Failed to set the max frame rate to %@ on %@! %@", frameRate, port, maximumError);
    return false;
  }
  return true;
}

bool CameraSession::start(DiagnosticErrorPtr& error) {
  for (std::size_t i = 0; i < streams_.size(); ++i) {
    DiagnosticErrorPtr underlying;
    if (streams_[i]->start(&underlying)) continue;
    logError("Failed to start steam at %@ port! %@", ports_[i], underlying);
    fail(&error, QZCapturePlugInErrorDomain, camera_sync_error::kStartRefused, underlying,
         "Failed to start steam at %@ port! %@", ports_[i], underlying);
    return false;
  }
  return true;
}

std::optional<Value> CameraSession::status(DiagnosticErrorPtr& error) {
  DiagnosticErrorPtr underlying;
  std::optional<Value> status = device_->valueForProperty(capture_key::MulticamSessionStatus, &underlying);
  if (!status) {
    abandon();
    logError("Failed to copy session status! %@", underlying);
    fail(&error, QZCapturePlugInErrorDomain, camera_sync_error::kNoSessionStatus, underlying,
         "Failed to copy sesison status!");
  }
  return status;
}

std::optional<std::vector<CameraReport>> CameraSession::reports(const Value& status, DiagnosticErrorPtr& error) {
  std::vector<CameraReport> reports;
  bool countsAreValid = true;
  error = nullptr;
  for (std::size_t i = 0; i < streams_.size(); ++i) {
    std::optional<CameraReport> report = this->report(i, status, error, countsAreValid);
    if (!report) return std::nullopt;
    reports.push_back(std::move(*report));
  }
  if (!countsAreValid) return std::nullopt;
  return reports;
}

std::optional<CameraReport> CameraSession::report(std::size_t position, const Value& status, DiagnosticErrorPtr& error,
                                                  bool& countsAreValid) {
  const std::string& port = ports_[position];
  const Value* entry = entryOf(&status, port);
  const Dictionary* portStatus = entry == nullptr ? nullptr : entry->dictionary();
  if (portStatus == nullptr) {
    logError("No status available for port %@", port);
    fail(&error, QZCapturePlugInErrorDomain, camera_sync_error::kNoSessionStatus, nullptr,
         "Status for port %@ not available!", port);
    return std::nullopt;
  }
  DiagnosticErrorPtr underlying;
  std::optional<Value> counters = streams_[position]->valueForProperty(capture_key::ErrorCounters, &underlying);
  if (!counters) {
    logError("Failed to get error counters of steam at %@ port! %@", port, underlying);
    fail(&error, QZCapturePlugInErrorDomain, camera_sync_error::kNoErrorCounters, underlying,
         "No error counters for port %@!", port);
    return std::nullopt;
  }
  std::optional<Value> offset = numberIn(*portStatus, capture_key::Offset);
  std::optional<Value> frames = numberIn(*portStatus, capture_key::FrameCount);
  if (toSigned(pointerTo(frames)) < 0) {
    logError("%@ did not record any frames!", port);
    countsAreValid = false;
    frames = Value(0);
  }
  const std::uint64_t total = toUnsigned(pointerTo(offset)) + toUnsigned(pointerTo(frames));
  logDefault("%@%@\n  Offset: %@\n  Frames: %@\n  Total: %@\n  ErrorCounters: %@\n", port,
             std::string_view(position == 0 ? " <-- sync master" : ""), offset, frames, total, *counters);
  return CameraReport{std::move(offset), std::move(frames), std::move(*counters)};
}

void CameraSession::finish() {
  for (auto stream = streams_.rbegin(); stream != streams_.rend(); ++stream) {
    DiagnosticErrorPtr underlying;
    if (!(*stream)->stop(&underlying)) logError("Failed to stop steam! %@", underlying);
  }
  DiagnosticErrorPtr underlying;
  if (!device_->relinquishControlOfStreams(streams_, &underlying)) {
    logError("Failed to relinquish steam! %@", underlying);
  }
}

void CameraSession::abandon() {
  for (auto stream = streams_.rbegin(); stream != streams_.rend(); ++stream)
    static_cast<void>((*stream)->stop(nullptr));
  relinquish();
}

void CameraSession::relinquish() { static_cast<void>(device_->relinquishControlOfStreams(streams_, nullptr)); }

}  // namespace quazor
