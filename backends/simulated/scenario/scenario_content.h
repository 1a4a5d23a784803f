// Converts a scenario's document to a scenario.
#pragma once

#include "backends/simulated/scenario/scenario.h"
#include "base/json/json_cursor.h"

namespace quazor {

// The scenario in a document whose "base" has been merged in; ignores `expect`. Throws InputError: "PATH: ...".
Scenario scenarioOf(const JsonCursor& document);

}  // namespace quazor
