// The installed scenarios, for tests.
#pragma once

#include "backends/simulated/scenario/scenario.h"

#include <string>
#include <vector>

namespace quazor {

// Reads data/scenarios/NAME.json. Throws InputError if it cannot be read. Any thread.
Scenario shippedScenario(const std::string& name);

// The names of all of them, sorted.
std::vector<std::string> shippedScenarios();

}  // namespace quazor
