#include "backends/simulated/simulated_phone.h"

#include "backends/capture/property_table.h"
#include "backends/simulated/calls/injected_error.h"
#include "backends/simulated/capture/simulated_capture.h"
#include "backends/simulated/counters/intercepted_reports.h"
#include "backends/simulated/counters/simulated_reports.h"
#include "backends/simulated/display/simulated_framebuffer.h"
#include "backends/simulated/hid/simulated_hid.h"
#include "backends/simulated/scenario/sensor_operations.h"
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

// Cannot fail, so faults do not reach it; observers do.
constexpr std::string_view kClockSleep = "Clock.sleep";

// The phone's clock as plug-ins have it: their sleeps are calls that observers see.
class ObservedClock final : public Clock {
 public:
  ObservedClock(std::shared_ptr<Clock> clock, std::shared_ptr<CallInterceptor> calls)
      : clock_(std::move(clock)), calls_(std::move(calls)) {}

  std::chrono::nanoseconds now() const override { return clock_->now(); }
  Date date() const override { return clock_->date(); }
  void sleep(std::chrono::nanoseconds duration) override {
    clock_->sleep(duration);
    calls_->report(
        {kClockSleep, {}, {}}, [&] { return defaultText(std::chrono::duration<double>(duration).count()); }, true);
  }

 private:
  const std::shared_ptr<Clock> clock_;
  const std::shared_ptr<CallInterceptor> calls_;
};

// The phone's run loops as plug-ins have them: a thread may be made to have none.
class InterceptedRunLoops final : public RunLoops {
 public:
  InterceptedRunLoops(std::shared_ptr<RunLoops> runLoops, std::shared_ptr<CallInterceptor> calls)
      : runLoops_(std::move(runLoops)), calls_(std::move(calls)) {}

  RunLoop* currentRunLoop() override {
    return calls_->perform(
        {sensor_operation::kCurrentRunLoop, {}, {}}, nullptr, [] { return std::string(); },
        [this] { return runLoops_->currentRunLoop(); });
  }

 private:
  const std::shared_ptr<RunLoops> runLoops_;
  const std::shared_ptr<CallInterceptor> calls_;
};

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
  platform_.capture = makeSimulatedCapture(scenario, hardware_, calls_);
  platform_.reports = interceptReports(makeSimulatedReports(scenario.reports, hardware_), calls_);
  platform_.hid = std::make_shared<SimulatedHidService>(scenario.hidDevices, clock, *concurrency, calls_);
  platform_.framebuffer = std::make_shared<SimulatedFramebufferService>(scenario.display, calls_);
  platform_.runLoops = std::make_shared<InterceptedRunLoops>(std::move(runLoops), calls_);
  platform_.clock = std::make_shared<ObservedClock>(clock, calls_);
  platform_.concurrency = std::move(concurrency);
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
