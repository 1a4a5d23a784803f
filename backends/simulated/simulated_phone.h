// SimulatedPhone: a whole phone behind the platform's services, as a scenario describes it.
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

enum class PhoneTime {
  kVirtual,  // one thread; sleeping costs nothing, and one seed is one order of events
  kReal      // real threads and the real clock; the seed is not used
};

// What plug-ins see is platform(); everything else here is the bench's side, for the host and for tests.
//
// Errors: the service refuses what a real one would, with errors of its own (capture_error.h). In virtual time a call
//   that can never return throws SimulationStall, the only exception that comes out of the platform.
// Thread: in virtual time one thread for the phone and all that came from it; in real time as the platform's services
//   say. The bench's side: any.
class SimulatedPhone final {
 public:
  // Throws std::invalid_argument when the scenario is not consistent; one that readScenario has read is.
  SimulatedPhone(const Scenario& scenario, PhoneTime time, std::uint64_t seed);
  // In virtual time, on a scheduler of the caller's choice, so that a test can hand in its own Chooser.
  SimulatedPhone(const Scenario& scenario, std::shared_ptr<VirtualScheduler> scheduler);
  // On a clock and queues of the caller's choice; run loops keep real time. A hang sleeps by that clock, for ever.
  SimulatedPhone(const Scenario& scenario, const std::shared_ptr<Clock>& clock,
                 std::shared_ptr<Concurrency> concurrency);
  SimulatedPhone(const SimulatedPhone&) = delete;
  SimulatedPhone& operator=(const SimulatedPhone&) = delete;
  // The phone's services go on working for those who hold them; tasks that are pending in virtual time are destroyed,
  // since nothing runs them any more.
  ~SimulatedPhone();

  // The same services at every call; they keep alive what they need.
  Platform platform() const { return platform_; }

  // In the order of the scenario, then of addFault.
  std::vector<FaultStatus> faultStatus() const;
  // Another fault, from the next call on.
  void addFault(Fault fault);
  // Hands every call on the platform to `observer`, in order, as it returns, on the thread that made it. A call that
  // never returns is not handed on. Replaces an earlier observer.
  void observeCalls(std::function<void(const PlatformCall&)> observer);
  // The frames whose pixel buffers have not been given back, by camera and number. A buffer may be used as long as the
  // phone or a device of it lives.
  struct HeldBuffer {
    std::string camera;
    std::uint64_t frame = 0;

    friend bool operator==(const HeldBuffer&, const HeldBuffer&) = default;
  };
  std::vector<HeldBuffer> buffersHeld() const;
  // How many frames have been handed to handlers, of all cameras; one that is being handled counts.
  std::uint64_t framesDelivered() const { return hardware_->pool->taken(); }
  // How often a pixel buffer was released that nobody held.
  std::uint64_t strayReleases() const { return hardware_->pool->strayReleases(); }
  // Hands the next `count` frames of the camera's running stream to its handler at once, on this thread, whatever time
  // it is; these count from 0, apart from the frames that come by themselves. Returns how many were delivered: 0 when
  // the stream does not run or has no handler. Throws std::invalid_argument when there is no such camera.
  std::uint64_t deliverFrames(std::string_view camera, std::uint64_t count);
  // What runs the phone in virtual time; null in real time.
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
