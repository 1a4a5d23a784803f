// The processing of frames in QZTesselFaultExperiment: handlers, intake, examination, timeout and stop.
#include "contract/log_channel.h"
#include "diagnostics/projector_fault/tessel_fault_errors.h"
#include "diagnostics/projector_fault/tessel_fault_experiment.h"
#include "platform/capture_keys.h"

#include <memory>
#include <optional>
#include <utility>

namespace quazor {

namespace {

// Only the infrared light sources 1 and 2 light a frame.
bool isLit(const QZTesselFrameDescription& frame) {
  const std::int32_t source = toInt32(pointerTo(frame.infraredLightSource()));
  return source == 1 || source == 2;
}

}  // namespace

// The task of a frame on the processing queue. Destroys the frame's record before the experiment, which owns the
// record's memory.
struct QZTesselFaultExperiment::Examination {
  std::shared_ptr<QZTesselFaultExperiment> self;
  std::shared_ptr<const QZTesselFrameDescription> frame;
  std::uint64_t number;

  void operator()() { self->_examine(*frame, number); }
};

Dictionary QZTesselFaultExperiment::_handlers() {
  const std::weak_ptr<QZTesselFaultExperiment> weak = weak_from_this();
  auto frames = std::make_shared<PixelBufferHandler>([weak](PixelBuffer& buffer, MediaTime time) {
    buffer.retain();
    if (const auto self = weak.lock()) self->_handlePixelBuffer(buffer, time);
  });
  auto events = std::make_shared<EventHandler>([weak](std::int32_t event, MediaTime time, const Value* info) {
    if (const auto self = weak.lock()) self->_handleEvent(event, time, info);
  });
  return Dictionary{{std::string(capture_key::PixelBufferHandler), std::move(frames)},
                    {std::string(capture_key::EventHandler), std::move(events)}};
}

void QZTesselFaultExperiment::_handlePixelBuffer(PixelBuffer& buffer, MediaTime time) {
  _receivingQueue->async([weak = weak_from_this(), &buffer, time] {
    if (auto self = weak.lock()) _takeIn(std::move(self), buffer, time);
  });
}

void QZTesselFaultExperiment::_handleEvent(std::int32_t event, MediaTime time, const Value* /*info*/) {
  _receivingQueue->async([weak = weak_from_this(), event, time] {
    if (const auto self = weak.lock()) logDebug("Processing event %d at %lf.", event, time.seconds());
  });
}

// The frame handler's reference to the buffer is released in one place, when the frame is passed on. The paths that end
// earlier keep the reference deliberately.
void QZTesselFaultExperiment::_takeIn(std::shared_ptr<QZTesselFaultExperiment> self, PixelBuffer& buffer,
                                      MediaTime time) {
  if (self->_stop) {
    logDefault("Received frame that won't be counted at time: %@", time.seconds());
    return;
  }
  const std::uint64_t number = self->_frameCount.fetch_add(1, std::memory_order_relaxed) + 1;
  logDebug("Received frame %@.", number);
  const std::optional<Value> metadata = buffer.attachment(capture_key::MetadataDictionary);
  if (!metadata) {
    self->_stopWithError(
        makeError(QZCapturePlugInErrorDomain, tessel_fault_error::kBadFrame, "Frame metadata is missing!"));
    return;
  }
  if (metadata->dictionary() == nullptr) {
    self->_stopWithError(
        makeError(QZCapturePlugInErrorDomain, tessel_fault_error::kBadFrame, "Frame metadata is not a dictionary!"));
    return;
  }
  auto frame = QZTesselFrameDescription::descriptionWithMonotonicCount(number, time, *metadata->dictionary(),
                                                                       *self->_platform.clock, self->_records);
  if (frame == nullptr) {
    self->_stopWithError(makeError(QZCapturePlugInErrorDomain, tessel_fault_error::kBadFrame,
                                   "Could not create a frame description of frame %lu!", number));
    return;
  }
  buffer.release();
  // The task may run and destroy the experiment with its queues before async() returns.
  const std::shared_ptr<SerialQueue> processing = self->_processingQueue;
  processing->async(Examination{std::move(self), std::move(frame), number});
}

void QZTesselFaultExperiment::_examine(const QZTesselFrameDescription& frame, std::uint64_t number) {
  logDebug("Processing frame %lu.", frame.monotonicCount());
  if (!isLit(frame)) {
    const DiagnosticErrorPtr error =
        frame.safetyDisabledProjection()
            ? makeError(QZCapturePlugInErrorDomain, tessel_fault_error::kUnlitForSafety,
                        "Frame %@ is not illuminated for safety reason!", frame.monotonicCount())
            : makeError(QZCapturePlugInErrorDomain, tessel_fault_error::kBadFrame,
                        "Frame %@ is not illuminated for unknown reason!", frame.monotonicCount());
    if (LogChannel::isEnabled(LogLevel::kDebug)) {
      logDebug("%@\n%@", QZTesselFrameDescription::csvRepresentationHeader(), frame.csvRepresentation());
    }
    logError("Frame %@ failed projection validation.", number);
    _stopWithError(error);
    return;
  }
  if (number < _stopCount) return;
  logDebug("Frame %@ is the last frame.", number);
  _stopWithError(nullptr);
}

void QZTesselFaultExperiment::_scheduleTimeout() {
  _processingQueue->asyncAfter(nanosecondsFromSeconds(_timeout), [self = shared_from_this()] {
    logError("Timeout has been reached.");
    self->_stopWithError(nullptr);
  });
}

void QZTesselFaultExperiment::_stopWithError(const DiagnosticErrorPtr& error) {
  const std::lock_guard lock(_mutex);
  if (_stop) return;
  _stop = true;
  std::optional<Value> counters = _stream->valueForProperty(capture_key::ErrorCounters, nullptr);
  const bool stopped = _stream->stop(nullptr);
  if (error != nullptr) {
    logDebug("We are stopping because there was an error. If stopping the stream fails, it will be ignored.");
    _error = error;
  } else if (!stopped) {
    logDebug("There was an error stopping the stream.");
    _error = makeError(QZCapturePlugInErrorDomain, tessel_fault_error::kStopRefused, "Failed to stop stream!");
  } else if (counters) {
    _errorCounters = std::move(counters);
  } else {
    _error = makeError(QZCapturePlugInErrorDomain, tessel_fault_error::kNoErrorCounters,
                       "Failed to get error counters from ferrin.");
  }
  _done_semaphore->signal();
}

}  // namespace quazor
