#include "backends/linux/linux_phone.h"

#include "backends/faults/intercepted_platform.h"
#include "backends/linux/counters/linux_reports.h"
#include "backends/linux/display/linux_framebuffer.h"
#include "backends/linux/hid/linux_hid.h"
#include "backends/linux/system/descriptor_run_loop.h"
#include "backends/linux/system/linux_error.h"
#include "backends/threads/real_clock.h"
#include "backends/threads/thread_concurrency.h"

#include <string>
#include <utility>

namespace quazor {
namespace {

DiagnosticErrorPtr injectedError(const CallSite& /*site*/, std::string sentence) {
  return errorWithMessage(LinuxErrorDomain, static_cast<std::int64_t>(LinuxErrorCode::kInjected), std::move(sentence),
                          nullptr);
}

// The names by which faults select objects. The device has its streams and groups in the binding's order.
ObjectNames namesOf(const Binding& binding) {
  ObjectNames names;
  for (const CameraBinding& camera : binding.cameras) names.streams.push_back(camera.port);
  for (const GroupBinding& group : binding.groups) names.groups.push_back(group.name);
  names.hidDevice = linuxHidName;
  return names;
}

}  // namespace

LinuxPhone::LinuxPhone(const Binding& binding) : LinuxPhone(binding, makeLinuxCapture(binding)) {}

LinuxPhone::LinuxPhone(const Binding& binding, std::shared_ptr<LinuxCapture> capture)
    : capture_(std::move(capture)),
      platform_{capture_,
                std::make_shared<RealClock>(),
                std::make_shared<ThreadConcurrency>(),
                makeLinuxReports(binding),
                makeLinuxHid(),
                makeLinuxFramebuffer(binding),
                makeLinuxRunLoops()} {
  if (binding.faults.empty()) return;
  calls_ =
      std::make_shared<CallInterceptor>(binding.faults, platform_.clock, sleepForEver(platform_.clock), injectedError);
  platform_ = interceptedPlatform(platform_, calls_, namesOf(binding));
}

std::vector<FaultStatus> LinuxPhone::faultStatus() const {
  return calls_ == nullptr ? std::vector<FaultStatus>{} : calls_->faultStatus();
}

}  // namespace quazor
