#include "backends/simulated/simulated_phone.h"

#include "backends/faults/intercepted_platform.h"
#include "backends/simulated/capture/simulated_capture.h"
#include "backends/simulated/counters/simulated_reports.h"
#include "backends/simulated/display/simulated_framebuffer.h"
#include "backends/simulated/errors/injected_error.h"
#include "backends/simulated/hid/simulated_hid.h"
#include "backends/simulated/time/virtual_run_loop.h"
#include "backends/simulated/time/virtual_services.h"
#include "backends/threads/real_clock.h"
#include "backends/threads/thread_concurrency.h"
#include "backends/threads/thread_run_loop.h"

#include <algorithm>
#include <chrono>
#include <mutex>
#include <stdexcept>
#include <utility>

namespace quazor {
namespace {

// The names by which faults select objects. The device has its streams and groups in the scenario's order.
ObjectNames namesOf(const Scenario& scenario) {
  ObjectNames names;
  for (const Camera& camera : scenario.cameras) names.streams.push_back(camera.id);
  for (const CameraGroup& group : scenario.groups) names.groups.push_back(group.id);
  names.hidDevice = &SimulatedHidService::nameOf;
  return names;
}

}  // namespace

SimulatedPhone::SimulatedPhone(const Scenario& scenario, PhoneTime time, std::uint64_t seed) {
  if (time == PhoneTime::kReal) {
    auto clock = std::make_shared<RealClock>();
    build(scenario, clock, std::make_shared<ThreadConcurrency>(), std::make_shared<ThreadRunLoops>(),
          sleepForEver(clock));
  } else {
    buildVirtual(scenario, std::make_shared<VirtualScheduler>(std::make_shared<RandomStrategy>(seed)));
  }
}

SimulatedPhone::SimulatedPhone(const Scenario& scenario, std::shared_ptr<VirtualScheduler> scheduler) {
  buildVirtual(scenario, std::move(scheduler));
}

SimulatedPhone::SimulatedPhone(const Scenario& scenario, const std::shared_ptr<Clock>& clock,
                               std::shared_ptr<Concurrency> concurrency) {
  build(scenario, clock, std::move(concurrency), std::make_shared<ThreadRunLoops>(), sleepForEver(clock));
}

SimulatedPhone::~SimulatedPhone() {
  if (scheduler_ != nullptr) scheduler_->discardPending();
}

void SimulatedPhone::buildVirtual(const Scenario& scenario, std::shared_ptr<VirtualScheduler> scheduler) {
  scheduler_ = std::move(scheduler);
  build(scenario, std::make_shared<VirtualClock>(scheduler_), std::make_shared<VirtualConcurrency>(scheduler_),
        std::make_shared<VirtualRunLoops>(scheduler_),
        [scheduler = scheduler_](std::string_view what) { scheduler->stall(what); });
}

void SimulatedPhone::build(const Scenario& scenario, const std::shared_ptr<Clock>& clock,
                           std::shared_ptr<Concurrency> concurrency, std::shared_ptr<RunLoops> runLoops,
                           CallInterceptor::Hang hang) {
  calls_ = std::make_shared<CallInterceptor>(scenario.faults, clock, std::move(hang), simulatedInjectedError);
  hardware_ = std::make_shared<CaptureHardware>(scenario, clock, concurrency);
  Platform inner;
  inner.capture = makeSimulatedCapture(scenario, hardware_);
  inner.clock = clock;
  inner.reports = makeSimulatedReports(scenario.reports, hardware_);
  inner.hid = std::make_shared<SimulatedHidService>(scenario.hidDevices, clock, *concurrency);
  inner.framebuffer = std::make_shared<SimulatedFramebufferService>(scenario.display);
  inner.runLoops = std::move(runLoops);
  inner.concurrency = std::move(concurrency);
  platform_ = interceptedPlatform(inner, calls_, namesOf(scenario));
}

std::vector<FaultStatus> SimulatedPhone::faultStatus() const { return calls_->faultStatus(); }

void SimulatedPhone::addFault(Fault fault) { calls_->addFault(std::move(fault)); }

void SimulatedPhone::observeCalls(std::function<void(const PlatformCall&)> observer) {
  calls_->observe(std::move(observer));
}

std::vector<SimulatedPhone::HeldBuffer> SimulatedPhone::buffersHeld() const {
  std::vector<HeldBuffer> held;
  for (const PixelBufferPool::Held& buffer : hardware_->pool->held()) {
    held.push_back({hardware_->cameras[buffer.camera].camera.id, buffer.frame});
  }
  return held;
}

void SimulatedPhone::traceFrames(FrameTrace& trace) { hardware_->traceFrames(trace, whenTraceIsFull()); }

WhenTraceIsFull SimulatedPhone::whenTraceIsFull() const {
  return scheduler_ == nullptr ? WhenTraceIsFull::kLose : WhenTraceIsFull::kWait;
}

std::uint64_t SimulatedPhone::deliverFrames(std::string_view camera, std::uint64_t count) {
  std::shared_ptr<FrameDelivery> delivery;
  {
    const std::lock_guard lock(hardware_->mutex);
    const auto state = std::ranges::find_if(
        hardware_->cameras, [camera](const CameraState& candidate) { return candidate.camera.id == camera; });
    if (state == hardware_->cameras.end()) {
      throw std::invalid_argument("The phone has no camera " + std::string(camera) + ".");
    }
    if (state->running != nullptr) delivery = state->running->delivery;
  }
  return delivery == nullptr ? 0 : delivery->push(count);
}

}  // namespace quazor
