#include "tests/support/shipped_scenario.h"

namespace quazor {

Scenario shippedScenario(const std::string& name) { return readScenario(QUAZOR_SCENARIOS "/" + name + ".json"); }

}  // namespace quazor
