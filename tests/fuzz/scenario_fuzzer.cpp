// Arbitrary JSON as a scenario file: parsing gives a scenario from which a phone can be created and whose summary can
// be read, or a sentence.
#include "backends/simulated/scenario/scenario.h"
#include "backends/simulated/simulated_phone.h"
#include "host/device/phone.h"
#include "tests/fuzz/fuzzing.h"

#include <optional>

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  using namespace quazor;
  static const MemoryFile file("scenario.json");
  file.write(data, size);
  const std::optional<Scenario> scenario = acceptedDocument([] { return readScenario(file.path()); });
  const std::optional<ScenarioSummary> summary = acceptedDocument([] { return summaryOfScenario(file.path()); });
  if (!scenario) {
    require(!summary, "a scenario that cannot be read has no summary");
    return 0;
  }
  const SimulatedPhone phone(*scenario, PhoneTime::kVirtual, 0);
  require(phone.faultStatus().size() == scenario->faults.size(), "a phone has the faults of its scenario");
  if (summary) {
    require(summary->title == scenario->title && summary->hasFaults == !scenario->faults.empty(),
            "a summary agrees with its scenario");
  }
  return 0;
}
