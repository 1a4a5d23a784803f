// The parts of a scenario's document that describe frames and report channels.
#pragma once

#include "backends/simulated/scenario/frame_traits.h"
#include "backends/simulated/scenario/report_traits.h"
#include "base/json/json_cursor.h"

#include <vector>

namespace quazor {

// All throw JsonProblem, "PATH: ...".
Projector readProjector(const JsonCursor& cursor);
DeliveryTraits readDelivery(const JsonCursor& cursor);
// Errors per second of streaming, by counter; unsigned integers.
Dictionary readErrorCounterGrowth(const JsonCursor& cursor);
// Groups of subgroups of channels.
std::vector<ReportChannelTraits> readReports(const JsonCursor& cursor);

}  // namespace quazor
