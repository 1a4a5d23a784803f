// Which report channels the diagnostics look at.
#pragma once

#include "platform/report_facility.h"

namespace quazor {

// The image signal processor's event channels: the group's name contains "K42ISP" and the subgroup's name contains
// "K42ISP Events".
bool isInPresenceReport(const ReportChannelDescription& channel);

// The channels whose subgroup is exactly "K42ISP Events", in whatever group. On purpose narrower than the presence
// report in the subgroup, and wider in the group.
bool isInFaultReport(const ReportChannelDescription& channel);

}  // namespace quazor
