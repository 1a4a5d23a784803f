#include "backends/simulated/capture/capture_hardware.h"

#include "backends/simulated/capture/growth.h"
#include "platform/capture_keys.h"

#include <stdexcept>
#include <utility>

namespace quazor {
namespace {

// Returns null if no output with a handler is enabled.
std::shared_ptr<FrameDelivery> makeDelivery(const CaptureHardware& hardware, std::size_t index, const StreamRun& times,
                                            const CameraSettings& settings) {
  FrameDelivery::Source source;
  source.frames = settings.frameHandler();
  source.events = settings.eventHandler();
  if (source.frames == nullptr && source.events == nullptr) return nullptr;
  source.index = index;
  source.camera = hardware.cameras[index].camera;
  source.run = times;
  source.traced = hardware.cameras[index].traced;
  source.lit = toUnsigned(entryOf(&settings.lightSource, capture_key::Mode)) != 0;
  return std::make_shared<FrameDelivery>(std::move(source), hardware.pool, hardware.clock);
}

}  // namespace

double CameraState::formatMaximum(const CameraSettings& settings) const {
  return camera.formats[static_cast<std::size_t>(toUnsigned(&settings.formatIndex))].maximumFrameRate;
}

double CameraState::deliveredRate(const CameraSettings& settings) const {
  if (camera.actualFrameRate) return *camera.actualFrameRate;
  return settings.maximumRate ? toDouble(&*settings.maximumRate) : formatMaximum(settings);
}

std::optional<Dictionary> CameraState::errorCounters(const StreamRun* run, std::chrono::nanoseconds now) const {
  std::optional<Dictionary> counters = camera.errorCounters;
  if (!counters || run == nullptr) return counters;
  const std::chrono::nanoseconds streamed = run->stopped.value_or(now) - run->started;
  for (const auto& [name, perSecond] : camera.errorCounterGrowth) {
    counters->set(name, toUnsigned(counters->find(name)) + grownBy(toUnsigned(&perSecond), streamed));
  }
  return counters;
}

CaptureHardware::CaptureHardware(const Scenario& scenario, std::shared_ptr<Clock> time,
                                 std::shared_ptr<Concurrency> queues)
    : device(scenario.device),
      clock(std::move(time)),
      concurrency(std::move(queues)),
      pool(std::make_shared<PixelBufferPool>()) {
  for (const Camera& camera : scenario.cameras) {
    if (camera.formats.empty()) throw std::invalid_argument("Camera " + camera.id + " has no format.");
    CameraState state;
    state.camera = camera;
    cameras.push_back(std::move(state));
  }
}

std::shared_ptr<SimulatedRun> CaptureHardware::start(std::size_t camera, const CameraSettings& settings) {
  CameraState& state = cameras[camera];
  if (runningStreams++ == 0) streamingSince = clock->now();
  auto run = std::make_shared<SimulatedRun>();
  run->times = StreamRun{clock->now(), std::nullopt, microFrameRate(state.deliveredRate(settings))};
  run->delivery = makeDelivery(*this, camera, run->times, settings);
  if (run->delivery != nullptr) run->delivery->begin(*concurrency);
  state.running = run;
  return run;
}

void CaptureHardware::stop(SimulatedRun& run) {
  if (run.times.stopped) return;
  run.times.stopped = clock->now();
  if (--runningStreams == 0) streamedBefore += clock->now() - streamingSince;
  if (run.delivery != nullptr) run.delivery->close();
  for (CameraState& camera : cameras) {
    if (camera.running.get() == &run) camera.running.reset();
  }
}

void CaptureHardware::traceFrames(FrameTrace& trace, WhenTraceIsFull whenFull) {
  const std::lock_guard lock(mutex);
  for (CameraState& state : cameras) state.traced = trace.addStream(state.camera.id, clock, whenFull);
}

std::chrono::nanoseconds CaptureHardware::streamedTime() const {
  return runningStreams == 0 ? streamedBefore : streamedBefore + (clock->now() - streamingSince);
}

}  // namespace quazor
