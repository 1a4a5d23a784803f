// Reads the frames and report channels of a scenario's document.
#pragma once

#include "backends/simulated/scenario/frame_config.h"
#include "backends/simulated/scenario/report_config.h"
#include "base/json/json_cursor.h"

#include <vector>

namespace quazor {

// All of these throw InputError: "PATH: ...".
Projector readProjector(const JsonCursor& cursor);
DeliveryConfig readDelivery(const JsonCursor& cursor);
// Errors per second of streaming time by counter, as unsigned integers.
Dictionary readErrorCounterGrowth(const JsonCursor& cursor);
// Reads groups of subgroups of channels.
std::vector<ReportChannelConfig> readReports(const JsonCursor& cursor);

}  // namespace quazor
