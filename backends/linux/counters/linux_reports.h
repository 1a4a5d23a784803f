// The report facility on the kernel's counters.
#pragma once

#include "backends/linux/binding/binding.h"
#include "backends/linux/counters/counter_system.h"
#include "platform/report_facility.h"

#include <memory>

namespace quazor {

// Every call of reportWithOnlySimpleChannels() looks for the channels again; docs/linux.md describes them.
//
// A channel whose file has gone, or holds no whole number of at most 64 bits, has no count; differences are those of
// makeCounterReports(). A tracepoint counts from the first snapshot of a set that it is in; its count there is of the
// time since it was opened, about 0.
//
// Errors: LinuxErrorDomain. What may not be looked at or read (kNoAccess) fails the call.
// Thread: any.
std::shared_ptr<ReportFacility> makeLinuxReports(const Binding& binding);
// The same, on another system than the running one.
std::shared_ptr<ReportFacility> makeLinuxReports(const Binding& binding, std::shared_ptr<CounterSystem> system);

}  // namespace quazor
