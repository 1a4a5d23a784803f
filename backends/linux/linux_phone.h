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

// All services of this machine by a binding, in real time. Devices are looked for when they are used, so that what is
// not there is an error of the call that needs it. The binding's faults act on the services; a hang never returns.
//
// Thread: any; the platform's services as they say.
class LinuxPhone final {
 public:
  explicit LinuxPhone(const Binding& binding);
  // The same; `capture` is the binding's capture service.
  LinuxPhone(const Binding& binding, std::shared_ptr<LinuxCapture> capture);
  LinuxPhone(const LinuxPhone&) = delete;
  LinuxPhone& operator=(const LinuxPhone&) = delete;

  // The same services at every call; they keep alive what they need and may outlive the phone.
  Platform platform() const { return platform_; }
  // In the order of the binding.
  std::vector<FaultStatus> faultStatus() const;
  // How many frames its cameras have handed to handlers.
  std::uint64_t framesDelivered() const { return capture_->framesDelivered(); }

 private:
  const std::shared_ptr<LinuxCapture> capture_;
  std::shared_ptr<CallInterceptor> calls_;  // null without faults
  Platform platform_;
};

}  // namespace quazor
