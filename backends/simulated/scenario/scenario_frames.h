// The parts of a scenario's document that describe frames and report channels.
#pragma once

#include "backends/simulated/scenario/frame_config.h"
#include "backends/simulated/scenario/report_config.h"
#include "base/json/json_cursor.h"

#include <vector>

namespace quazor {

// All throw InputError, "PATH: ...".
Projector readProjector(const JsonCursor& cursor);
DeliveryConfig readDelivery(const JsonCursor& cursor);
// Errors per second of streaming, by counter; unsigned integers.
Dictionary readErrorCounterGrowth(const JsonCursor& cursor);
// Groups of subgroups of channels.
std::vector<ReportChannelConfig> readReports(const JsonCursor& cursor);

}  // namespace quazor
