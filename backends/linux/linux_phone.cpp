#include "backends/linux/linux_phone.h"

#include "backends/linux/counters/linux_reports.h"
#include "backends/linux/display/linux_framebuffer.h"
#include "backends/linux/hid/linux_hid.h"
#include "backends/linux/system/descriptor_run_loop.h"
#include "backends/threads/real_clock.h"
#include "backends/threads/thread_concurrency.h"

#include <utility>

namespace quazor {

Platform linuxPlatform(const Binding& binding, std::shared_ptr<LinuxCapture> capture) {
  return {std::move(capture),
          std::make_shared<RealClock>(),
          std::make_shared<ThreadConcurrency>(),
          makeLinuxReports(binding),
          makeLinuxHid(),
          makeLinuxFramebuffer(binding),
          makeLinuxRunLoops()};
}

}  // namespace quazor
