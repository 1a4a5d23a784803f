// The report facility of the simulated phone.
#pragma once

#include "backends/simulated/capture/capture_hardware.h"
#include "backends/simulated/scenario/report_config.h"
#include "platform/report_facility.h"

#include <memory>
#include <vector>

namespace quazor {

// The scenario's channels, in order. Counts wrap at 64 bits and grow only while a stream of the phone runs. Differences
// are those of makeCounterReports(). `hardware` must not be null.
//
// Thread: any.
std::shared_ptr<ReportFacility> makeSimulatedReports(std::vector<ReportChannelConfig> channels,
                                                     std::shared_ptr<CaptureHardware> hardware);

}  // namespace quazor
