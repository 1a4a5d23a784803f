// The simulated capture service: the scenario's cameras, behind the front that all backends share.
#pragma once

#include "backends/faults/call_interceptor.h"
#include "backends/simulated/capture/capture_hardware.h"
#include "platform/capture_service.h"

#include <memory>

namespace quazor {

// Every call passes `calls`. Throws std::invalid_argument when a group names a camera that there is not.
std::shared_ptr<CaptureService> makeSimulatedCapture(const Scenario& scenario,
                                                     std::shared_ptr<CaptureHardware> hardware,
                                                     std::shared_ptr<CallInterceptor> calls);

}  // namespace quazor
