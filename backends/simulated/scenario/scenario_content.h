// From a scenario's document to the scenario.
#pragma once

#include "backends/simulated/scenario/scenario.h"
#include "base/json/json_cursor.h"

namespace quazor {

// The scenario that a document describes, its "base" already merged in; its `expect` is not read. Throws InputError,
// "PATH: ...".
Scenario scenarioOf(const JsonCursor& document);

}  // namespace quazor
