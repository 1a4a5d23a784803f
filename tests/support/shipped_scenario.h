// The installed scenarios, for tests.
#pragma once

#include "backends/simulated/scenario/scenario.h"

#include <string>

namespace quazor {

// Reads data/scenarios/NAME.json. Throws InputError if it cannot be read. Any thread.
Scenario shippedScenario(const std::string& name);

}  // namespace quazor
