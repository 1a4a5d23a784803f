#include "host/device/phone.h"

#include "backends/linux/linux_phone.h"
#include "backends/linux/probe/probe.h"
#include "backends/linux/system/journal_log.h"
#include "backends/linux/video/projector_guard.h"
#include "backends/simulated/scenario/scenario.h"
#include "backends/simulated/simulated_phone.h"
#include "backends/threads/system_log.h"
#include "base/text/input_error.h"

#include <optional>
#include <string>
#include <string_view>
#include <utility>

namespace quazor {

namespace {

std::vector<DeclaredFault> declared(const std::vector<FaultStatus>& statuses) {
  std::vector<DeclaredFault> faults;
  for (const FaultStatus& status : statuses) faults.push_back({faultJson(status.fault), status.fired});
  return faults;
}

class PhoneOfScenario final : public Phone {
 public:
  PhoneOfScenario(const Scenario& scenario, PhoneTime time, std::uint64_t seed) : phone_(scenario, time, seed) {}

  Platform platform() const override { return phone_.platform(); }

  std::vector<DeclaredFault> faults() const override { return declared(phone_.faultStatus()); }

  std::uint64_t framesDelivered() const override { return phone_.framesDelivered(); }

 private:
  SimulatedPhone phone_;
};

class PhoneOfBinding final : public Phone {
 public:
  explicit PhoneOfBinding(const Binding& binding) : phone_(binding) {}

  Platform platform() const override { return phone_.platform(); }
  std::vector<DeclaredFault> faults() const override { return declared(phone_.faultStatus()); }
  std::uint64_t framesDelivered() const override { return phone_.framesDelivered(); }

 private:
  LinuxPhone phone_;
};

template <class Content>
Content read(Content (*readFile)(const std::filesystem::path&), const std::filesystem::path& file) {
  try {
    return readFile(file);
  } catch (const InputError& problem) {
    throw InputError(std::string("the simulated phone cannot be created: ") + problem.what());
  }
}

std::string_view nameOf(Expectation::Verdict verdict) {
  switch (verdict) {
    case Expectation::Verdict::kPass: return "pass";
    case Expectation::Verdict::kFail: return "fail";
    case Expectation::Verdict::kError: break;
  }
  return "error";
}

std::optional<ExpectedError> expected(const std::optional<FaultError>& error) {
  if (!error) return std::nullopt;
  return ExpectedError{error->domain, error->code, error->message};
}

}  // namespace

PhoneMaker phonesOfScenario(const std::filesystem::path& file, bool realTime, std::uint64_t seed) {
  const PhoneTime time = realTime ? PhoneTime::kReal : PhoneTime::kVirtual;
  return [scenario = read(readScenario, file), time, seed] {
    return std::make_unique<PhoneOfScenario>(scenario, time, seed);
  };
}

std::optional<std::filesystem::path> bindingNamed(const std::filesystem::path& phone) {
  const std::string text = phone.string();
  if (!text.starts_with(kLinuxPrefix)) return std::nullopt;
  return text.substr(kLinuxPrefix.size());
}

PhoneMaker phonesOfBinding(const std::filesystem::path& file) {
  return [binding = read(readBinding, file)] { return std::make_unique<PhoneOfBinding>(binding); };
}

PhoneProbe probeThisMachine() {
  MachineProbe probe = probeMachine(sourcesOfRunningSystem());
  return {std::move(probe.lines), std::move(probe.binding)};
}

bool isCleanupProcess(std::string_view processName) { return processName == kProjectorGuardName; }

std::shared_ptr<LogBackend> systemLogOfThisMachine() {
  return std::make_shared<JournalLog>(std::make_shared<SystemLog>());
}

ScenarioSummary summaryOfScenario(const std::filesystem::path& file) {
  const Scenario scenario = read(readScenario, file);
  ScenarioSummary summary{scenario.title, {}, !scenario.faults.empty()};
  for (const auto& [name, one] : scenario.expectations) {
    ExpectedOutcome outcome{one.experiment ? one.experiment->name : name,
                            one.experiment.has_value(),
                            {},
                            std::string(nameOf(one.verdict)),
                            expected(one.error),
                            expected(one.underlying),
                            one.failedResults,
                            std::nullopt};
    if (one.experiment) {
      outcome.parameters = one.experiment->parameters;
      outcome.images = one.experiment->images;
    }
    summary.expected.push_back(std::move(outcome));
  }
  return summary;
}

}  // namespace quazor
