// LinuxPhone: this Linux machine as a phone.
#pragma once

#include "backends/faults/call_interceptor.h"
#include "backends/linux/binding/binding.h"
#include "backends/linux/capture/linux_capture.h"
#include "platform/platform.h"

#include <cstdint>
#include <memory>
#include <vector>

namespace quazor {

// All services of this machine, as configured by a binding, in real time. Devices are looked up when they are used, so
// a missing device is an error of the call that needs it. The binding's faults apply to all services; a hang never
// returns.
//
// Thread: any; platform services have their own rules.
class LinuxPhone final {
 public:
  explicit LinuxPhone(const Binding& binding);
  // The same; `capture` is the binding's capture service.
  LinuxPhone(const Binding& binding, std::shared_ptr<LinuxCapture> capture);
  LinuxPhone(const LinuxPhone&) = delete;
  LinuxPhone& operator=(const LinuxPhone&) = delete;

  // Returns the same services in every call. They may outlive the phone.
  Platform platform() const { return platform_; }
  // In the order of the binding.
  std::vector<FaultStatus> faultStatus() const;
  // The number of frames that its cameras have passed to handlers.
  std::uint64_t framesDelivered() const { return capture_->framesDelivered(); }
  // Tells the trace each frame that is delivered from now on. No device may have been made.
  void traceFrames(FrameTrace& trace) { capture_->traceFrames(trace, platform_.clock); }

 private:
  const std::shared_ptr<LinuxCapture> capture_;
  std::shared_ptr<CallInterceptor> calls_;  // null if there are no faults
  Platform platform_;
};

}  // namespace quazor
