// What must hold for every event that was read.
#pragma once

#include "host/model/run_event.h"

#include <cstdint>
#include <vector>

namespace quazor {

// Requires the event to be the same after it was written on a line of a record and read again.
void requireSameWhenWritten(const RunEvent& event, std::uint64_t sequence);

// A run with the same data, in the order and with the endings that the host writes.
std::vector<RunEvent> completed(const std::vector<RunEvent>& events);

}  // namespace quazor
