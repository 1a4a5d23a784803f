#include "host/device/phone.h"

#include "backends/linux/linux_phone.h"
#include "backends/linux/probe/probe.h"
#include "backends/linux/system/journal_log.h"
#include "backends/linux/video/projector_guard.h"
#include "backends/log/system_log.h"
#include "backends/simulated/scenario/scenario.h"
#include "backends/simulated/simulated_phone.h"
#include "base/json/json_cursor.h"
#include "base/text/input_error.h"

#include <optional>
#include <string>
#include <string_view>
#include <utility>

namespace quazor {

namespace {

std::vector<DeclaredFault> declared(const std::vector<FaultStatus>& statuses) {
  std::vector<DeclaredFault> faults;
  faults.reserve(statuses.size());
  for (const FaultStatus& status : statuses) faults.push_back({faultJson(status.fault), status.fired});
  return faults;
}

class PhoneOfScenario final : public Phone {
 public:
  PhoneOfScenario(const Scenario& scenario, PhoneTime time, std::uint64_t seed) : phone_(scenario, time, seed) {}

  Platform platform() const override { return phone_.platform(); }

  std::vector<DeclaredFault> faults() const override { return declared(phone_.faultStatus()); }

  std::uint64_t framesDelivered() const override { return phone_.framesDelivered(); }
  void traceFrames(FrameTrace& trace) override { phone_.traceFrames(trace); }
  WhenTraceIsFull whenTraceIsFull() const override { return phone_.whenTraceIsFull(); }

 private:
  SimulatedPhone phone_;
};

class PhoneOfBinding final : public Phone {
 public:
  explicit PhoneOfBinding(const Binding& binding) : phone_(binding) {}

  Platform platform() const override { return phone_.platform(); }
  std::vector<DeclaredFault> faults() const override { return declared(phone_.faultStatus()); }
  std::uint64_t framesDelivered() const override { return phone_.framesDelivered(); }
  void traceFrames(FrameTrace& trace) override { phone_.traceFrames(trace); }

 private:
  LinuxPhone phone_;
};

constexpr const char* kOfBinding = "the phone of the binding";

// Reads the file with `readIt` and adds to an InputError what cannot be created.
template <class Read>
auto read(Read&& readIt, const std::filesystem::path& file, const char* what = "the simulated phone") {
  try {
    return readIt(file);
  } catch (const InputError& problem) {
    throw InputError(std::string(what) + " cannot be created: " + problem.what());
  }
}

// The contents of a scenario file: the phone, the expected outcomes and what cannot run.
struct ScenarioFile {
  Scenario scenario;
  std::vector<ExpectedOutcome> expected;
  std::vector<SkipRule> absent;
};

ScenarioFile readScenarioFile(const std::filesystem::path& file, const ScenarioSource& find) {
  Scenario scenario = readScenario(file, find);
  std::vector<ExpectedOutcome> expected = readExpectedOutcomes(JsonCursor(*scenario.document));
  std::vector<SkipRule> absent = readAbsent(JsonCursor(*scenario.document));
  return {std::move(scenario), std::move(expected), std::move(absent)};
}

struct BindingFile {
  Binding binding;
  std::vector<ExpectedOutcome> expected;
  std::vector<SkipRule> absent;
};

BindingFile readBindingFile(const std::filesystem::path& file) {
  Binding binding = readBinding(file);
  const JsonDocument document = JsonDocument::read(file);
  return {std::move(binding), readExpectedOutcomes(JsonCursor(document)), readAbsent(JsonCursor(document))};
}

}  // namespace

SeededPhoneMaker seededPhonesOfScenario(const std::filesystem::path& file, bool realTime, const ScenarioSource& find) {
  const PhoneTime time = realTime ? PhoneTime::kReal : PhoneTime::kVirtual;
  const auto readIt = [&find](const std::filesystem::path& one) { return readScenarioFile(one, find); };
  const auto scenario = std::make_shared<const Scenario>(read(readIt, file).scenario);
  return [scenario, time](std::uint64_t seed) {
    return [scenario, time, seed] { return std::make_unique<PhoneOfScenario>(*scenario, time, seed); };
  };
}

PhoneMaker phonesOfScenario(const std::filesystem::path& file, bool realTime, std::uint64_t seed,
                            const ScenarioSource& find) {
  return seededPhonesOfScenario(file, realTime, find)(seed);
}

std::optional<std::filesystem::path> bindingNamed(const std::filesystem::path& phone) {
  const std::string text = phone.string();
  if (!text.starts_with(kLinuxPrefix)) return std::nullopt;
  return text.substr(kLinuxPrefix.size());
}

PhoneMaker phonesOfBinding(const std::filesystem::path& file) {
  return
      [binding = read(readBindingFile, file, kOfBinding).binding] { return std::make_unique<PhoneOfBinding>(binding); };
}

PhoneProbe probeThisMachine() {
  MachineProbe probe = probeMachine(sourcesOfRunningSystem());
  return {std::move(probe.lines), std::move(probe.binding)};
}

bool isCleanupProcess(std::string_view processName) { return processName == kProjectorGuardName; }

std::shared_ptr<LogBackend> systemLogOfThisMachine() {
  return std::make_shared<JournalLog>(std::make_shared<SystemLog>());
}

ScenarioSummary summaryOfScenario(const std::filesystem::path& file, const ScenarioSource& find) {
  const auto readIt = [&find](const std::filesystem::path& one) { return readScenarioFile(one, find); };
  ScenarioFile read = quazor::read(readIt, file);
  return {read.scenario.title, std::move(read.expected), !read.scenario.faults.empty(), std::move(read.absent),
          std::move(read.scenario.bases)};
}

ScenarioSummary summaryOfBinding(const std::filesystem::path& file) {
  BindingFile read = quazor::read(readBindingFile, file, kOfBinding);
  return {read.binding.title, std::move(read.expected), !read.binding.faults.empty(), std::move(read.absent)};
}

}  // namespace quazor
