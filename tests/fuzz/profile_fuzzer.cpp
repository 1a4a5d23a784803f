// Arbitrary JSON as a profile: parsing gives a profile whose values are found by the names of its entries, or an error
// with a sentence.
#include "contract/results.h"
#include "host/plugin/profile.h"
#include "tests/fuzz/fuzzing.h"

#include <cmath>
#include <optional>
#include <string>

namespace quazor {
namespace {

// Of two entries for one name, the first applies.
void requireFound(const Profile& profile, const ProfileEntry& entry, Part part) {
  for (const auto& [parameter, value] : entry.values(part)) {
    require(std::isfinite(toDouble(&value)), "a value is a finite number");
    const Value* const found = profile.find(entry.name, part, parameter);
    require(found != nullptr && *found == value, "a value is found by its entry's name");
  }
}

void requireValues(const Profile& profile) {
  for (const ProfileEntry& entry : profile.entries) {
    requireFound(profile, entry, Part::kExperiment);
    requireFound(profile, entry, Part::kAnalysis);
    for (const auto& [parameter, value] : entry.experiment) {
      require(profile.findForExperiment("", {entry.name}, parameter) != nullptr, "an experiment has its user's value");
    }
  }
  for (const ProfileEntry& entry : profile.experiments) {
    require(entry.analysis.empty(), "an experiment has no analysis");
    for (const auto& [parameter, value] : entry.experiment) {
      const Value* const found = profile.findForExperiment(entry.name, {}, parameter);
      require(found != nullptr && *found == value, "a value is found by its experiment's name");
    }
  }
}

}  // namespace
}  // namespace quazor

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  using namespace quazor;
  const std::optional<Profile> profile =
      acceptedDocument([&] { return parseProfile("profile.json", std::string(asText(data, size))); });
  if (profile) requireValues(*profile);
  return 0;
}
