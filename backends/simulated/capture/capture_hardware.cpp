#include "backends/simulated/capture/capture_hardware.h"

#include "backends/simulated/capture/growth.h"
#include "backends/simulated/capture/output_state.h"
#include "platform/capture_keys.h"

#include <stdexcept>
#include <utility>

namespace quazor {
namespace {

std::size_t indexOf(const Scenario& scenario, const std::string& id) {
  for (std::size_t i = 0; i < scenario.cameras.size(); ++i) {
    if (scenario.cameras[i].id == id) return i;
  }
  throw std::invalid_argument("The scenario has no camera " + id + ".");
}

GroupState stateOf(const CameraGroup& group, const Scenario& scenario) {
  GroupState state;
  state.id = group.id;
  for (const std::string& camera : group.cameras) state.cameras.push_back(indexOf(scenario, camera));
  state.master = indexOf(scenario, group.master);
  state.masterConfigurationSupported = group.masterConfiguration;
  return state;
}

}  // namespace

double CameraState::formatMaximum() const {
  return camera.formats[static_cast<std::size_t>(toUnsigned(&formatIndex))].maximumFrameRate;
}

double CameraState::maximumRate() const { return maximumFrameRate ? toDouble(&*maximumFrameRate) : formatMaximum(); }

double CameraState::minimumRate() const { return minimumFrameRate ? toDouble(&*minimumFrameRate) : maximumRate(); }

Value CameraState::darkness() {
  return Dictionary{{std::string(capture_key::Mode), 0},
                    {std::string(capture_key::StructuredLightPattern), 0},
                    {std::string(capture_key::StructuredLightCurrent), 0}};
}

std::optional<Dictionary> CameraState::errorCounters(std::chrono::nanoseconds now) const {
  std::optional<Dictionary> counters = camera.errorCounters;
  if (!counters || !run) return counters;
  const std::chrono::nanoseconds streamed = run->stopped.value_or(now) - run->started;
  for (const auto& [name, perSecond] : camera.errorCounterGrowth) {
    counters->set(name, toUnsigned(counters->find(name)) + grownBy(toUnsigned(&perSecond), streamed));
  }
  return counters;
}

double CameraState::deliveredRate() const { return camera.actualFrameRate.value_or(maximumRate()); }

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
  for (const CameraGroup& group : scenario.groups) groups.push_back(stateOf(group, scenario));
}

void CaptureHardware::start(CameraState& camera) {
  camera.running = true;
  if (runningStreams++ == 0) streamingSince = clock->now();
  camera.run = StreamRun{clock->now(), std::nullopt, microFrameRate(camera.deliveredRate())};
  const auto index = static_cast<std::size_t>(&camera - cameras.data());
  camera.delivery = makeDelivery(camera, index, pool, clock);
  if (camera.delivery != nullptr) camera.delivery->begin(*concurrency);
}

std::shared_ptr<FrameDelivery> CaptureHardware::stop(CameraState& camera) {
  camera.running = false;
  camera.run->stopped = clock->now();
  if (--runningStreams == 0) streamedBefore += clock->now() - streamingSince;
  if (camera.delivery != nullptr) camera.delivery->close();
  return std::exchange(camera.delivery, nullptr);
}

std::vector<std::shared_ptr<FrameDelivery>> CaptureHardware::release(CaptureUserId user) {
  std::vector<std::shared_ptr<FrameDelivery>> stopped;
  for (CameraState& camera : cameras) {
    if (camera.holder != user) continue;
    if (camera.running) stopped.push_back(stop(camera));
    camera.holder = 0;
    camera.outputHandlers = Dictionary{};
  }
  std::erase(stopped, nullptr);
  return stopped;
}

std::chrono::nanoseconds CaptureHardware::streamedTime() const {
  return runningStreams == 0 ? streamedBefore : streamedBefore + (clock->now() - streamingSince);
}

std::optional<Dictionary> CaptureHardware::sessionStatus() const {
  const std::chrono::nanoseconds now = clock->now();
  std::optional<Dictionary> status;
  for (const std::size_t index : configuredGroups) {
    const GroupState& group = groups[index];
    const std::optional<StreamRun>& master = cameras[group.master].run;
    if (!master) continue;
    if (!status) status.emplace();
    for (const std::size_t member : group.active) {
      const CameraState& state = cameras[member];
      if (!state.camera.inSessionStatus) continue;
      const SessionCount count = state.run ? countSession(state.camera, *state.run, *master, now) : SessionCount{0, -1};
      status->set(state.camera.port, Dictionary{{std::string(capture_key::Offset), count.offset},
                                                {std::string(capture_key::FrameCount), count.frameCount}});
    }
  }
  return status;
}

}  // namespace quazor
