// The simulated capture service: the scenario's cameras, behind the front that all backends share.
#pragma once

#include "backends/simulated/capture/capture_hardware.h"
#include "platform/capture_service.h"

#include <memory>

namespace quazor {

// Throws std::invalid_argument when a group names a camera that the scenario does not have.
std::shared_ptr<CaptureService> makeSimulatedCapture(const Scenario& scenario,
                                                     std::shared_ptr<CaptureHardware> hardware);

}  // namespace quazor
