// Filters for the report channels of the diagnostics.
#pragma once

#include "platform/report_facility.h"

namespace quazor {

// The image signal processor's event channels: the group's name contains "K42ISP" and the subgroup's name contains
// "K42ISP Events".
bool isInPresenceReport(const ReportChannelDescription& channel);

// The channels whose subgroup is exactly "K42ISP Events", in any group. Deliberately stricter on the subgroup than the
// presence report, and less strict on the group.
bool isInFaultReport(const ReportChannelDescription& channel);

}  // namespace quazor
