#include "diagnostics/single_camera/single_camera_experiment.h"

#include "contract/log_channel.h"
#include "contract/message_format.h"
#include "diagnostics/single_camera/frame_times.h"
#include "diagnostics/single_camera/single_camera_names.h"
#include "platform/capture_keys.h"
#include "platform/pixel_buffer.h"

#include <algorithm>
#include <chrono>
#include <cmath>
#include <limits>
#include <mutex>
#include <utility>

namespace quazor {

namespace {

using std::chrono::nanoseconds;

constexpr double kShortestDuration = 1;      // seconds
constexpr double kLongestDuration = 86'400;  // seconds: a day
constexpr double kHighestFrameRate = 10'000;
constexpr double kHighestPosition = std::numeric_limits<std::int32_t>::max();

double millisecondsIn(nanoseconds time) { return std::chrono::duration<double, std::milli>(time).count(); }

Dictionary forPrimaryScaler(Value value) {
  return Dictionary{{std::string(capture_key::PrimaryScaler), std::move(value)}};
}

bool isWholeNumber(double number) { return number >= 0 && number <= kHighestPosition && number == std::floor(number); }

}  // namespace

// Receives the frames of one stream. It outlives the experiment if the capture service does.
// Thread: any.
class FrameRecorder {
 public:
  explicit FrameRecorder(std::shared_ptr<Clock> clock) : clock_(std::move(clock)) {}

  void add(const MediaTime& time) {
    const nanoseconds now = clock_->now();
    const std::lock_guard lock(mutex_);
    if (times_.frames() == 0) firstArrival_ = now;
    lastArrival_ = now;
    times_.add(time);
  }

  // Adds what it recorded of a stream that ran from `began` to `ended`.
  void addTo(OrderedMap<Measurement>& measurements, nanoseconds began, nanoseconds ended) const;

 private:
  const std::shared_ptr<Clock> clock_;
  mutable std::mutex mutex_;
  FrameTimes times_;
  nanoseconds firstArrival_{};
  nanoseconds lastArrival_{};
};

void FrameRecorder::addTo(OrderedMap<Measurement>& measurements, nanoseconds began, nanoseconds ended) const {
  using namespace single_camera;
  const std::lock_guard lock(mutex_);
  const bool silent = times_.frames() == 0;
  const auto count = [&](std::string_view name, std::size_t number, const QZUnit& unit) {
    measurements.set(name, Measurement(static_cast<double>(number), unit));
  };
  // The first frame may arrive before the call that starts the stream returns.
  const nanoseconds untilFirst = std::max(nanoseconds(0), (silent ? ended : firstArrival_) - began);
  const nanoseconds sinceLast = std::max(nanoseconds(0), ended - (silent ? began : lastArrival_));
  count(kFrames, times_.frames(), QZDimensionlessUnit::frames());
  measurements.set(kFrameRate, Measurement(times_.rate(), framesPerSecond()));
  measurements.set(kMissingFrames, Measurement(times_.missing(), QZDimensionlessUnit::frames()));
  count(kUntimedFrames, times_.untimed(), QZDimensionlessUnit::frames());
  count(kBackwardTimeStamps, times_.backward(), QZDimensionlessUnit::events());
  measurements.set(kJitter, Measurement(times_.jitter() * 1e3, milliseconds()));
  measurements.set(kSilenceAtStart, Measurement(millisecondsIn(untilFirst), milliseconds()));
  measurements.set(kSilenceAtEnd, Measurement(millisecondsIn(sinceLast), milliseconds()));
}

QZSingleCameraExperiment::QZSingleCameraExperiment(Platform platform) : platform_(std::move(platform)) {}

QZDescription QZSingleCameraExperiment::experimentDescription() const {
  QZDescription description("Stream one camera and measure its frames.");
  const auto add = [&](std::string_view name, std::string_view summary) {
    description.addParameter(QZNumberParameter(summary, false), name);
  };
  add("duration", "How long to stream.");
  add("camera", "The position of the camera among those of the device, from 0.");
  add("frameRate", "The frame rate to ask for.");
  add("formatIndex", "The index of the format to ask for.");
  return description;
}

OrderedMap<QZParameterRange> QZSingleCameraExperiment::parameterRanges() const {
  QZParameterRange duration;
  duration.setMinimum(kShortestDuration);
  duration.setMaximum(kLongestDuration);
  duration.setUnit("s");
  duration.setDefault(duration_);
  QZParameterRange frameRate;
  frameRate.setMinimum(0, true);
  frameRate.setMaximum(kHighestFrameRate);
  frameRate.setUnit("frames/s");
  frameRate.setDefault(frameRate_);
  QZParameterRange position;
  position.setMinimum(0);
  position.setMaximum(kHighestPosition);
  position.setInteger();
  position.setDefault(0);
  OrderedMap<QZParameterRange> ranges;
  ranges.set("duration", duration);
  ranges.set("camera", position);
  ranges.set("frameRate", frameRate);
  ranges.set("formatIndex", position);
  return ranges;
}

bool QZSingleCameraExperiment::setupWithParameters(const Dictionary& parameters, QZDiagnosticHost* /*host*/,
                                                   DiagnosticErrorPtr* error) {
  const auto number = [&](std::string_view name, double usual) {
    const Value* const given = parameters.find(name);
    return given == nullptr ? usual : toDouble(given);
  };
  const auto refuse = [&](std::string_view name, std::string_view rule, double value) {
    fail(error, QZErrorDomain, single_camera::kBadParameterValue, nullptr, "%@ must be %@, not %@", name, rule, value);
    return false;
  };
  // Comparisons that NaN fails, too.
  const double duration = number("duration", duration_);
  if (!(duration >= kShortestDuration && duration <= kLongestDuration)) {
    return refuse("duration", "from 1 s to 86400 s", duration);
  }
  const double frameRate = number("frameRate", frameRate_);
  if (!(frameRate > 0 && frameRate <= kHighestFrameRate))
    return refuse("frameRate", "above 0 and at most 10000", frameRate);
  const double camera = number("camera", 0);
  if (!isWholeNumber(camera)) return refuse("camera", "a whole number from 0", camera);
  const double formatIndex = number("formatIndex", 0);
  if (!isWholeNumber(formatIndex)) return refuse("formatIndex", "a whole number from 0", formatIndex);
  duration_ = duration;
  frameRate_ = frameRate;
  camera_ = static_cast<std::uint64_t>(camera);
  formatIndex_ = static_cast<std::uint64_t>(formatIndex);
  return true;
}

std::unique_ptr<QZExperimentResult> QZSingleCameraExperiment::run(DiagnosticErrorPtr* error) {
  if (!openStream(error)) return nullptr;
  cameraText_ = cameraText();
  logDefault("Streaming camera %@.", cameraText_);
  const auto recorder = std::make_shared<FrameRecorder>(platform_.clock);
  if (!configureStream(recorder, error)) return nullptr;
  return stream(*recorder, error);
}

bool QZSingleCameraExperiment::openStream(DiagnosticErrorPtr* error) {
  DiagnosticErrorPtr reason;
  const std::shared_ptr<CapturePlugIn> plugIn = platform_.capture->createPlugIn();
  device_ = plugIn == nullptr ? nullptr : plugIn->device(&reason);
  if (device_ == nullptr) {
    fail(error, SingleCameraErrorDomain, single_camera_error::kNoDevice, reason, "There is no capture device.");
    return false;
  }
  const std::optional<CaptureStreams> streams = device_->streams(&reason);
  if (!streams || camera_ >= streams->size()) {
    fail(error, SingleCameraErrorDomain, single_camera_error::kNoCamera, streams ? nullptr : reason,
         "There is no camera at position %@: the device has %@.", camera_,
         static_cast<std::uint64_t>(streams ? streams->size() : 0));
    return false;
  }
  stream_ = (*streams)[static_cast<std::size_t>(camera_)];
  if (device_->requestControlOfStreams({stream_}, &reason)) return true;
  fail(error, SingleCameraErrorDomain, single_camera_error::kControlRefused, reason,
       "The camera cannot be controlled.");
  return false;
}

// A machine may have several cameras, and a verdict means nothing to people who do not know of which. What cannot be
// read is left out: the camera may be in order nevertheless.
std::string QZSingleCameraExperiment::cameraText() const {
  std::string text = formatMessage("%@", camera_);
  for (const std::string_view key : {capture_key::PortType, capture_key::CameraName}) {
    const std::optional<Value> value = stream_->valueForProperty(key, nullptr);
    if (value && value->string() != nullptr) text += ", " + *value->string();
  }
  return text;
}

bool QZSingleCameraExperiment::configureStream(const std::shared_ptr<FrameRecorder>& recorder,
                                               DiagnosticErrorPtr* error) {
  const auto set = [&](std::string_view key, const Value& value) {
    DiagnosticErrorPtr reason;
    if (stream_->setValue(value, key, &reason)) return true;
    fail(error, SingleCameraErrorDomain, single_camera_error::kSettingRefused, reason,
         "The camera does not accept %@ = %@.", key, value);
    return false;
  };
  const auto add = [recorder](PixelBuffer& /*buffer*/, MediaTime presentationTime) { recorder->add(presentationTime); };
  Dictionary handlers;
  handlers.set(capture_key::PixelBufferHandler, Value(std::make_shared<PixelBufferHandler>(add)));
  return set(capture_key::FormatIndex, formatIndex_) && set(capture_key::MinimumFrameRate, frameRate_) &&
         set(capture_key::MaximumFrameRate, frameRate_) &&
         set(capture_key::VideoOutputsEnabled, forPrimaryScaler(true)) &&
         set(capture_key::VideoOutputHandlers, forPrimaryScaler(handlers));
}

std::optional<Value> QZSingleCameraExperiment::errorCounters(DiagnosticErrorPtr* error) {
  DiagnosticErrorPtr reason;
  std::optional<Value> counters = stream_->valueForProperty(capture_key::ErrorCounters, &reason);
  if (counters && counters->dictionary() != nullptr) return counters;
  fail(error, SingleCameraErrorDomain, single_camera_error::kNoErrorCounters, reason,
       "The camera's error counters cannot be read.");
  return std::nullopt;
}

std::unique_ptr<QZExperimentResult> QZSingleCameraExperiment::stream(FrameRecorder& recorder,
                                                                     DiagnosticErrorPtr* error) {
  DiagnosticErrorPtr reason;
  const std::optional<Value> before = errorCounters(error);
  if (!before) return nullptr;
  if (!stream_->start(&reason)) {
    fail(error, SingleCameraErrorDomain, single_camera_error::kStartRefused, reason, "The camera does not start.");
    return nullptr;
  }
  const nanoseconds began = platform_.clock->now();
  platform_.clock->sleep(nanosecondsFromSeconds(duration_));
  const nanoseconds ended = platform_.clock->now();
  const std::optional<Value> after = errorCounters(error);
  if (!after) return nullptr;
  if (!stream_->stop(&reason)) {
    fail(error, SingleCameraErrorDomain, single_camera_error::kStopRefused, reason, "The camera does not stop.");
    return nullptr;
  }
  auto result = std::make_unique<QZExperimentResult>();
  OrderedMap<Measurement>& measurements = result->measurements();
  measurements.set(single_camera::kRequestedFrameRate, Measurement(frameRate_, single_camera::framesPerSecond()));
  recorder.addTo(measurements, began, ended);
  for (const auto& [name, count] : *after->dictionary()) {
    const double grown = toDouble(&count) - toDouble(before->dictionary()->find(name));
    measurements.set(std::string(single_camera::kErrorsPrefix) + name,
                     Measurement(grown, QZDimensionlessUnit::errors()));
  }
  result->auxiliaryData().set(single_camera::kCamera, cameraText_);
  return result;
}

bool QZSingleCameraExperiment::teardown(DiagnosticErrorPtr* error) {
  DiagnosticErrorPtr reason;
  stream_ = nullptr;
  const std::shared_ptr<CaptureDevice> device = std::exchange(device_, nullptr);
  // Without a device the run has told why.
  if (device == nullptr || device->invalidate(&reason)) return true;
  fail(error, SingleCameraErrorDomain, single_camera_error::kNoDevice, reason,
       "The capture device cannot be released.");
  return false;
}

}  // namespace quazor
