// The report facility on the kernel's counters.
#pragma once

#include "backends/linux/binding/binding.h"
#include "backends/linux/counters/counter_system.h"
#include "platform/report_facility.h"

#include <memory>

namespace quazor {

// Every call of reportWithOnlySimpleChannels() searches for the channels again; docs/linux.md describes them.
//
// A channel has no count if its file was removed or does not contain an integer of at most 64 bits. Differences are
// those of makeCounterReports(). A tracepoint is counted from the first snapshot of a set that includes it; its count
// in that snapshot is about 0.
//
// Errors: LinuxErrorDomain. A missing permission (kNoAccess) fails the call.
// Thread: any.
std::shared_ptr<ReportFacility> makeLinuxReports(const Binding& binding);
// The same, on another system than the running one.
std::shared_ptr<ReportFacility> makeLinuxReports(const Binding& binding, std::shared_ptr<CounterSystem> system);

}  // namespace quazor
