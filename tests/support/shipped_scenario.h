// The simulated phones that are installed with the program, for tests.
#pragma once

#include "backends/simulated/scenario/scenario.h"

#include <string>

namespace quazor {

// The scenario in data/scenarios/NAME.json. Throws InputError when it cannot be read. Any thread.
Scenario shippedScenario(const std::string& name);

}  // namespace quazor
