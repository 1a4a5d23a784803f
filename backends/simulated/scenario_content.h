// From a scenario's document to the scenario.
#pragma once

#include "backends/json/json_cursor.h"
#include "backends/simulated/scenario.h"

namespace quazor {

// The scenario that a document describes, its "base" already merged in. Throws JsonProblem, "PATH: ...".
Scenario scenarioOf(const JsonCursor& document);

}  // namespace quazor
