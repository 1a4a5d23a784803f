// What a binding file says of counters.
#pragma once

#include "backends/json/json_cursor.h"
#include "backends/linux/binding.h"

namespace quazor {

// Both throw JsonProblem: "PATH: ...".
CounterFilesBinding readCounterFiles(const JsonCursor& cursor);
TracepointBinding readTracepoints(const JsonCursor& cursor);

}  // namespace quazor
