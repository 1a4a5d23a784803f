// Setup, configuration, result and teardown; tessel_fault_pipeline.cpp processes the frames.
#include "diagnostics/projector_fault/tessel_fault_experiment.h"

#include "diagnostics/projector_fault/tessel_fault_analysis.h"
#include "diagnostics/projector_fault/tessel_fault_errors.h"
#include "diagnostics/report_channels/channel_filters.h"
#include "platform/capture_keys.h"

#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace quazor {

namespace {

constexpr std::string_view kTimeoutParameter = "timeout";
constexpr std::int64_t kBadParameter = 5;

// The settings of the light source and the stream.
constexpr int kStructuredLightMode = 2;
constexpr int kStructuredLightCurrent = 0;
constexpr int kStructuredLightPattern = 1;
constexpr int kFrameRate = 30;  // per second

template <class... Arguments>
void failCapture(DiagnosticErrorPtr* error, std::int64_t code, const DiagnosticErrorPtr& underlying,
                 MessageFormat<Arguments...> format, const Arguments&... arguments) {
  fail<Arguments...>(error, QZCapturePlugInErrorDomain, code, underlying, format, arguments...);
}

Dictionary forPrimaryScaler(Value value) {
  return Dictionary{{std::string(capture_key::PrimaryScaler), std::move(value)}};
}

}  // namespace

QZTesselFaultExperiment::QZTesselFaultExperiment(Platform platform)
    : QZTesselFaultExperiment(std::string(port_type::FrontFacingInfraredCamera), std::move(platform)) {}

QZTesselFaultExperiment::QZTesselFaultExperiment(std::string port, Platform platform)
    : _platform(std::move(platform)),
      _port(std::move(port)),
      _done_semaphore(_platform.concurrency->makeSemaphore(0)),
      _receivingQueue(_platform.concurrency->makeSerialQueue("QZTesselFaultExperiment.primaryScalar",
                                                             QualityOfService::kUserInteractive)),
      _processingQueue(
          _platform.concurrency->makeSerialQueue("QZTesselFaultExperiment", QualityOfService::kBackground)) {}

QZDescription QZTesselFaultExperiment::experimentDescription() const {
  QZDescription description("Stream the tessel camera in dense interleave for the requested duration.");
  description.addParameter(QZNumberParameter("The number of frames to capture.", true), kFrameCountParameter);
  description.addParameter(
      QZNumberParameter(formatMessage("The max time to wait for %@, in seconds.", kFrameCountParameter), true),
      kTimeoutParameter);
  return description;
}

bool QZTesselFaultExperiment::setupWithParameters(const Dictionary& parameters, QZDiagnosticHost* /*host*/,
                                                  DiagnosticErrorPtr* error) {
  const Value* frameCount = parameters.find(kFrameCountParameter);
  if (toSigned(frameCount) < 0) {
    fail(error, QZErrorDomain, kBadParameter, nullptr, "%@ cannot be negative!", kFrameCountParameter);
    return false;
  }
  _stopCount = toUnsigned(frameCount);
  const double timeout = toDouble(parameters.find(kTimeoutParameter));
  if (timeout < 0.0) {
    fail(error, QZErrorDomain, kBadParameter, nullptr, "%@ cannot be negative!", kTimeoutParameter);
    return false;
  }
  _timeout = timeout;
  return true;
}

std::unique_ptr<QZExperimentResult> QZTesselFaultExperiment::run(DiagnosticErrorPtr* error) {
  if (!_openStream(error) || !_configureStream(error)) return nullptr;

  std::shared_ptr<const ReportChannelSet> channels;
  const std::shared_ptr<const ReportSnapshot> baseline = _subscribe(channels, error);
  if (baseline == nullptr) return nullptr;

  DiagnosticErrorPtr startError;
  if (!_stream->start(&startError)) {
    failCapture(error, tessel_fault_error::kStartRefused, startError, "Failed to start streaming ferrin.");
    return nullptr;
  }
  _scheduleTimeout();
  _done_semaphore->wait();
  if (_error != nullptr) {
    storeError(error, _error);
    return nullptr;
  }
  return _finish(*channels, *baseline, error);
}

bool QZTesselFaultExperiment::_openStream(DiagnosticErrorPtr* error) {
  const std::shared_ptr<CapturePlugIn> plugIn = _platform.capture->defaultPlugIn();
  DiagnosticErrorPtr deviceError;
  setDevice(plugIn == nullptr ? nullptr : plugIn->device(&deviceError));
  if (_device == nullptr) {
    failCapture(error, tessel_fault_error::kDeviceFailure, deviceError, "Failed to get the capture plugin!");
    return false;
  }
  DiagnosticErrorPtr streamsError;
  const std::optional<CaptureStreams> streams = _device->streams(&streamsError);
  if (!streams) {
    failCapture(error, tessel_fault_error::kNoStream, streamsError, "Failed to get streams!");
    return false;
  }
  if (!_findStream(*streams, error)) return false;
  DiagnosticErrorPtr controlError;
  if (!_device->requestControlOfStreams({_stream}, &controlError)) {
    failCapture(error, tessel_fault_error::kControlRefused, controlError, "Failed to request the ferrin stream!");
    return false;
  }
  return true;
}

// Skips a stream whose port type cannot be read, but reports its error: it stays in `error` even if a later stream
// serves the port.
bool QZTesselFaultExperiment::_findStream(const CaptureStreams& streams, DiagnosticErrorPtr* error) {
  for (const std::shared_ptr<CaptureStream>& stream : streams) {
    DiagnosticErrorPtr underlying;
    const std::optional<Value> portType = stream->valueForProperty(capture_key::PortType, &underlying);
    if (!portType) {
      failCapture(error, tessel_fault_error::kNoStream, underlying, "Failed to get stream port type!");
    } else if (portType->string() != nullptr && *portType->string() == _port) {
      setStream(stream);
      return true;
    }
  }
  failCapture(error, tessel_fault_error::kNoStream, nullptr, "Failed to find stream!");
  return false;
}

bool QZTesselFaultExperiment::_configureStream(DiagnosticErrorPtr* error) {
  DiagnosticErrorPtr underlying;
  const auto set = [&](std::string_view key, const Value& value) {
    underlying = nullptr;
    return _stream->setValue(value, key, &underlying);
  };
  Dictionary structuredLight;
  structuredLight.set(capture_key::Mode, kStructuredLightMode);
  structuredLight.set(capture_key::StructuredLightCurrent, kStructuredLightCurrent);
  structuredLight.set(capture_key::StructuredLightPattern, kStructuredLightPattern);
  if (!set(capture_key::InfraredLightSourceConfiguration, structuredLight)) {
    failCapture(error, tessel_fault_error::kLightRefused, underlying, "Failed to configure structured light!");
    return false;
  }
  if (!set(capture_key::MultipleOutputSupportEnabled, true)) {
    failCapture(error, tessel_fault_error::kOutputRefused, underlying, "Failed to enable multiple outputs.");
    return false;
  }
  if (!set(capture_key::FormatIndex, _formatIndex)) {
    failCapture(error, tessel_fault_error::kFormatRefused, underlying, "Failed to set format index %@.", _formatIndex);
    return false;
  }
  if (!set(capture_key::MinimumFrameRate, kFrameRate)) {
    failCapture(error, tessel_fault_error::kFrameRateRefused, underlying, "Failed to set min frame rate.");
    return false;
  }
  if (!set(capture_key::MaximumFrameRate, kFrameRate)) {
    failCapture(error, tessel_fault_error::kFrameRateRefused, underlying, "Failed to set max frame rate.");
    return false;
  }
  const Dictionary attachRaw{{std::string(capture_key::AttachRaw), true}};
  if (!set(capture_key::VideoOutputConfigurations, forPrimaryScaler(attachRaw))) {
    failCapture(error, tessel_fault_error::kOutputRefused, underlying, "Failed to configure primary scalar.");
    return false;
  }
  if (!set(capture_key::VideoOutputsEnabled, forPrimaryScaler(true))) {
    failCapture(error, tessel_fault_error::kOutputRefused, underlying, "Failed to enable primary scalar.");
    return false;
  }
  if (!set(capture_key::AEEnabled, false)) {
    failCapture(error, tessel_fault_error::kExposureRefused, underlying, "Failed to diable AE.");
    return false;
  }
  if (!set(capture_key::VideoOutputHandlers, forPrimaryScaler(_handlers()))) {
    failCapture(error, tessel_fault_error::kOutputRefused, underlying, "Failed to set callback handlers.");
    return false;
  }
  return true;
}

// Returns the first snapshot of the fault channels and stores its set in `channels`; null on failure.
std::shared_ptr<const ReportSnapshot> QZTesselFaultExperiment::_subscribe(
    std::shared_ptr<const ReportChannelSet>& channels, DiagnosticErrorPtr* error) {
  DiagnosticErrorPtr channelsError;
  DiagnosticErrorPtr snapshotError;
  const std::shared_ptr<const ReportChannelSet> simple =
      _platform.reports->reportWithOnlySimpleChannels(&channelsError);
  std::shared_ptr<const ReportSnapshot> baseline;
  if (simple != nullptr) {
    channels = simple->reportByFilteringChannels(isInFaultReport);
    baseline = channels->snapshot(&snapshotError);
  }
  if (baseline == nullptr) {
    fail(error, QZTelemonErrorDomain, tessel_fault_error::kReportFailure,
         simple == nullptr ? channelsError : snapshotError, "Cannot get Telemon before streaming.");
  }
  return baseline;
}

std::unique_ptr<QZExperimentResult> QZTesselFaultExperiment::_finish(const ReportChannelSet& channels,
                                                                     const ReportSnapshot& baseline,
                                                                     DiagnosticErrorPtr* error) {
  DiagnosticErrorPtr snapshotError;
  DiagnosticErrorPtr deltaError;
  const std::shared_ptr<const ReportSnapshot> later = channels.snapshot(&snapshotError);
  _telemonDelta = later == nullptr ? nullptr : later->snapshotWithBaseline(baseline, &deltaError);
  if (_telemonDelta == nullptr) {
    fail(error, QZTelemonErrorDomain, tessel_fault_error::kReportFailure, later == nullptr ? snapshotError : deltaError,
         "Cannot get Telemon delta after streaming.");
    return nullptr;
  }
  return _buildResult();
}

std::unique_ptr<QZExperimentResult> QZTesselFaultExperiment::_buildResult() const {
  auto result = std::make_unique<QZExperimentResult>();
  OrderedMap<Measurement>& measurements = result->measurements();
  const std::vector<ReportSample>& samples = _telemonDelta->samples();
  measurements.set("FrameCount", Measurement(static_cast<double>(_frameCount.load()), QZDimensionlessUnit::frames()));
  if (_errorCounters) {
    const auto setCounter = [&](std::string_view name, std::string_view key) {
      measurements.set(name, Measurement(toDouble(entryOf(&*_errorCounters, key)), QZDimensionlessUnit::errors()));
    };
    setCounter("I2C", capture_key::I2CErrorCount);
    setCounter("MIPI", capture_key::MIPIErrorCount);
    setCounter("LPDP", "LPDPErrorCount");
    setCounter("UART", "UARTErrorCount");
    setCounter("SIF", "SIFErrorCount");
    setCounter("Projector", "ProjectorErrorCount");
  }
  // If a channel has one of the names above, its count replaces that measurement.
  measurements.setAll(
      samples,
      [](const ReportSample& sample) -> const std::string& { return sample.channel().channelDescription().name; },
      [](const ReportSample& sample) {
        return Measurement(toDouble(pointerTo(sample.channel().count())), QZDimensionlessUnit::events());
      });
  return result;
}

bool QZTesselFaultExperiment::teardown(DiagnosticErrorPtr* error) {
  DiagnosticErrorPtr underlying;
  if (_device != nullptr && _device->invalidate(&underlying)) return true;
  failCapture(error, tessel_fault_error::kDeviceFailure, underlying, "Failed to invalidate the capture device.");
  return false;
}

}  // namespace quazor
