// SimulatedPhone: a complete phone that implements the platform's services as a scenario describes.
#pragma once

#include "backends/faults/call_interceptor.h"
#include "backends/faults/fault.h"
#include "backends/simulated/capture/capture_hardware.h"
#include "backends/simulated/scenario/scenario.h"
#include "backends/simulated/time/virtual_scheduler.h"
#include "platform/platform.h"

#include <cstdint>
#include <functional>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

namespace quazor {

class FrameTrace;

enum class PhoneTime {
  kVirtual,  // one thread; sleeping takes no real time, and a seed determines the order of events
  kReal      // real threads and the real clock; the seed has no effect
};

// Plug-ins only see platform(); the other functions are for the host and for tests.
//
// Errors: the service rejects what a real one would, with errors of its own (capture_error.h). In virtual time a call
//   that can never return throws SimulationStall, the only exception of the platform.
// Thread: in virtual time one thread for the phone and everything that it created; in real time the rules of the
//   platform's services. All other functions: any.
class SimulatedPhone final {
 public:
  // Throws std::invalid_argument if the scenario is inconsistent, which readScenario() rules out.
  SimulatedPhone(const Scenario& scenario, PhoneTime time, std::uint64_t seed);
  // In virtual time on the caller's scheduler, which may have any ScheduleStrategy.
  SimulatedPhone(const Scenario& scenario, std::shared_ptr<VirtualScheduler> scheduler);
  // On the caller's clock and queues; run loops use real time. A hang sleeps forever on that clock.
  SimulatedPhone(const Scenario& scenario, const std::shared_ptr<Clock>& clock,
                 std::shared_ptr<Concurrency> concurrency);
  SimulatedPhone(const SimulatedPhone&) = delete;
  SimulatedPhone& operator=(const SimulatedPhone&) = delete;
  // The services keep working for those who hold them. Pending tasks in virtual time are destroyed, because nothing
  // would run them.
  ~SimulatedPhone();

  // Returns the same services in every call; they own what they need.
  Platform platform() const { return platform_; }

  // In the order of the scenario, then of addFault().
  std::vector<FaultStatus> faultStatus() const;
  // Adds a fault, which takes effect with the next call.
  void addFault(Fault fault);
  // Calls `observer` after every call on the platform, in order and on the calling thread. A call that never returns is
  // not observed. Replaces an earlier observer.
  void observeCalls(std::function<void(const PlatformCall&)> observer);
  // The frames whose pixel buffers have not been released, by camera and number. A buffer is valid as long as the phone
  // or a device of it exists.
  struct HeldBuffer {
    std::string camera;
    std::uint64_t frame = 0;

    friend bool operator==(const HeldBuffer&, const HeldBuffer&) = default;
  };
  std::vector<HeldBuffer> buffersHeld() const;
  // The number of frames passed to handlers, for all cameras, including those that are being handled.
  std::uint64_t framesDelivered() const { return hardware_->pool->taken(); }
  // Tells the trace each frame that is delivered from now on; in virtual time it waits for room. No stream may run.
  void traceFrames(FrameTrace& trace);
  // In virtual time what is traced waits for room.
  WhenTraceIsFull whenTraceIsFull() const;
  // The number of releases of a pixel buffer without a matching reference.
  std::uint64_t strayReleases() const { return hardware_->pool->strayReleases(); }
  // Passes the next `count` frames of the camera's running stream to its handler immediately, on this thread. These
  // frames are numbered from 0, independently of the regular frames. Returns the number of delivered frames: 0 if the
  // stream does not run or has no handler. Throws std::invalid_argument if there is no such camera.
  std::uint64_t deliverFrames(std::string_view camera, std::uint64_t count);
  // The scheduler of virtual time; null in real time.
  VirtualScheduler* scheduler() const { return scheduler_.get(); }

 private:
  void buildVirtual(const Scenario& scenario, std::shared_ptr<VirtualScheduler> scheduler);
  void build(const Scenario& scenario, const std::shared_ptr<Clock>& clock, std::shared_ptr<Concurrency> concurrency,
             std::shared_ptr<RunLoops> runLoops, CallInterceptor::Hang hang);

  std::shared_ptr<VirtualScheduler> scheduler_;
  std::shared_ptr<CallInterceptor> calls_;
  std::shared_ptr<CaptureHardware> hardware_;
  Platform platform_;
};

}  // namespace quazor
