// Platform: the bundle of services that a plug-in uses.
#pragma once

#include "contract/contract.h"
#include "contract/log_channel.h"
#include "platform/capture_service.h"
#include "platform/clock.h"
#include "platform/concurrency.h"
#include "platform/framebuffer_service.h"
#include "platform/hid.h"
#include "platform/report_facility.h"
#include "platform/run_loop.h"

#include <memory>

namespace QUAZOR_CONTRACT {

// Each service is a separate, narrow interface; a class takes the bundle and uses the services it needs. No member is
// null while plug-ins run.
struct Platform {
  std::shared_ptr<CaptureService> capture;
  std::shared_ptr<Clock> clock;
  std::shared_ptr<Concurrency> concurrency;
  std::shared_ptr<ReportFacility> reports;
  std::shared_ptr<HidService> hid{};
  std::shared_ptr<FramebufferService> framebuffer{};
  std::shared_ptr<RunLoops> runLoops{};
};

// The platform that plug-ins use by default. The host installs it before it creates experiments, on the thread that
// runs them. The log's back end is installed separately (LogChannel::setBackend).
QUAZOR_EXPORT void installPlatform(Platform platform);
QUAZOR_EXPORT const Platform& installedPlatform();

}  // namespace QUAZOR_CONTRACT
