#include "tests/support/shipped_scenario.h"

#include <algorithm>
#include <filesystem>

namespace quazor {

Scenario shippedScenario(const std::string& name) { return readScenario(QUAZOR_SCENARIOS "/" + name + ".json"); }

std::vector<std::string> shippedScenarios() {
  const std::filesystem::path folder = QUAZOR_SCENARIOS;
  std::vector<std::string> names;
  for (const auto& entry : std::filesystem::recursive_directory_iterator(folder)) {
    const std::filesystem::path file = std::filesystem::relative(entry.path(), folder);
    if (file.extension() != ".json" || file.stem().extension() == ".schema") continue;
    names.push_back((file.parent_path() / file.stem()).string());
  }
  std::sort(names.begin(), names.end());
  return names;
}

}  // namespace quazor
