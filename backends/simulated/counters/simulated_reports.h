// The report facility of the simulated phone.
#pragma once

#include "backends/simulated/calls/call_interceptor.h"
#include "backends/simulated/capture/capture_hardware.h"
#include "backends/simulated/scenario/report_config.h"
#include "platform/report_facility.h"

#include <cstdint>
#include <memory>
#include <vector>

namespace quazor {

// The scenario's channels, in its order. Counts are unsigned, wrap at 64 bits, and grow with the time during which any
// of the phone's streams runs. A delta is taken between snapshots of the same channels, whichever sets they are of; a
// channel without a count in one of the two has none in it.
//
// Thread: any.
class SimulatedReportFacility final : public ReportFacility {
 public:
  SimulatedReportFacility(const std::vector<ReportChannelConfig>& channels, std::shared_ptr<CaptureHardware> hardware,
                          std::shared_ptr<CallInterceptor> calls);

  std::shared_ptr<const ReportChannelSet> reportWithOnlySimpleChannels(DiagnosticErrorPtr* error) override;

 private:
  class Channels;
  class Set;
  class Snapshot;

  const std::shared_ptr<const Channels> channels_;
};

}  // namespace quazor
