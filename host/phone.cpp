#include "host/phone.h"

#include "backends/simulated/scenario.h"
#include "backends/simulated/simulated_phone.h"
#include "host/exit_code.h"

#include <optional>
#include <string>
#include <utility>

namespace quazor {

namespace {

class PhoneOfScenario final : public Phone {
 public:
  PhoneOfScenario(const Scenario& scenario, PhoneTime time, std::uint64_t seed) : phone_(scenario, time, seed) {}

  Platform platform() const override { return phone_.platform(); }

  std::vector<DeclaredFault> faults() const override {
    std::vector<DeclaredFault> faults;
    for (const FaultStatus& status : phone_.faultStatus()) faults.push_back({faultJson(status.fault), status.fired});
    return faults;
  }

  std::uint64_t framesDelivered() const override { return phone_.framesDelivered(); }

 private:
  SimulatedPhone phone_;
};

}  // namespace

PhoneMaker phonesOfScenario(const std::filesystem::path& file, bool realTime, std::uint64_t seed) {
  std::string problem;
  std::optional<Scenario> scenario = readScenario(file, &problem);
  if (!scenario) throw Refusal(ExitCode::kCannotRead, "the phone cannot be made: " + problem);
  const PhoneTime time = realTime ? PhoneTime::kReal : PhoneTime::kVirtual;
  return
      [scenario = *std::move(scenario), time, seed] { return std::make_unique<PhoneOfScenario>(scenario, time, seed); };
}

}  // namespace quazor
