// Makes every call and every pair of calls of a camera synchronisation fail, and compares the complete trace of each
// run with the oracle's prediction.
#include "backends/simulated/scenario/scenario.h"
#include "backends/simulated/simulated_phone.h"
#include "contract/message_format.h"
#include "diagnostics/camera_sync/camera_sync_experiment.h"
#include "tests/support/run_transcript.h"
#include "tests/support/shipped_scenario.h"
#include "tests/sweeps/camera_sync_oracle.h"

#include <gtest/gtest.h>

#include <array>
#include <iostream>
#include <optional>
#include <string>
#include <utility>
#include <vector>

namespace quazor {
namespace {

// A run on one phone, of the experiment as registered for the diagnostic of that name.
struct Sweep {
  const char* name;
  bool masterConfiguration;
  oracle::Request request;
};
void PrintTo(const Sweep& sweep, std::ostream* out) { *out << sweep.name; }

const oracle::Request kBack{
    {"BackFacingCamera", "BackFacingTelephotoCamera", "BackFacingSuperWideCamera"}, {16, 14, 9}, 30, 2};
const oracle::Request kFront{{"FrontFacingCamera", "FrontFacingInfraredCamera"}, {1, 0}, 30, 2};

const Sweep kSweeps[] = {
    {"Back", true, kBack},
    {"BackWithoutMasterConfiguration", false, kBack},
    {"Front", true, kFront},
    {"FrontWithoutMasterConfiguration", false, kFront},
};

std::size_t positionOf(const Scenario& scenario, const std::string& id) {
  for (std::size_t i = 0; i < scenario.cameras.size(); ++i) {
    if (scenario.cameras[i].id == id) return i;
  }
  ADD_FAILURE() << "no camera " << id;
  return 0;
}

oracle::Phone phoneOf(const Scenario& scenario) {
  oracle::Phone phone;
  for (const Camera& camera : scenario.cameras) {
    phone.cameras.push_back({camera.id, camera.port, camera.firstFrameOffset, defaultText(*camera.errorCounters)});
  }
  for (const CameraGroup& group : scenario.groups) {
    oracle::PhoneGroup copy{group.id, {}, positionOf(scenario, group.master), group.masterConfiguration};
    for (const std::string& id : group.cameras) copy.cameras.push_back(positionOf(scenario, id));
    phone.groups.push_back(copy);
  }
  return phone;
}

// A call that is made to fail: the nth of the run.
struct Failure {
  std::size_t call;
  bool hasError;
};

std::string messageOf(std::size_t call) { return "Call " + std::to_string(call) + " was made to fail."; }

Fault faultOf(const Failure& failure) {
  Fault fault;
  fault.operation = "*";
  fault.occurrence = failure.call;
  fault.action = failure.hasError ? FaultAction::kFail : FaultAction::kNothing;
  if (failure.hasError) fault.error = FaultError{"SweepErrorDomain", -3, messageOf(failure.call)};
  return fault;
}

oracle::Failures failuresOf(const std::vector<Failure>& failures) {
  oracle::Failures predicted;
  for (const Failure& failure : failures) {
    predicted[failure.call] =
        failure.hasError ? std::optional("SweepErrorDomain code -3: " + messageOf(failure.call)) : std::nullopt;
  }
  return predicted;
}

struct Outcome {
  std::string told;
  std::size_t calls = 0;
  std::vector<std::uint64_t> fired;  // how often each of the failures happened
};

class CameraSyncSweep : public testing::TestWithParam<Sweep> {
 protected:
  void SetUp() override {
    scenario_ = shippedScenario("healthy");
    for (CameraGroup& group : scenario_.groups) group.masterConfiguration = GetParam().masterConfiguration;
    phone_ = phoneOf(scenario_);
  }
  void TearDown() override { std::cout << "[sweep] " << GetParam().name << ": " << cases_ << " cases\n"; }

  Outcome run(const std::vector<Failure>& failures, ErrorPlace place) const {
    RunTranscript transcript;
    SimulatedPhone phone(scenario_, PhoneTime::kVirtual, 1);
    phone.observeCalls([&](const PlatformCall& call) {
      transcript.addCall(call.operation, call.object, call.detail, call.succeeded);
    });
    for (const Failure& failure : failures) phone.addFault(faultOf(failure));
    const oracle::Request& request = GetParam().request;
    QZCameraSyncExperiment experiment(request.ports, Array(request.formatIndexes.begin(), request.formatIndexes.end()),
                                      request.frameRate, phone.platform());
    EXPECT_TRUE(experiment.setupWithParameters({{"duration", request.seconds}}, nullptr, nullptr));
    Outcome outcome;
    outcome.told = runAndTell(experiment, place, transcript);
    outcome.calls = transcript.fallibleCalls();
    for (const FaultStatus& status : phone.faultStatus()) outcome.fired.push_back(status.fired);
    return outcome;
  }

  // Runs with the failures and compares with the oracle; returns what happened.
  Outcome check(const std::vector<Failure>& failures, ErrorPlace place) {
    ++cases_;
    Outcome outcome = run(failures, place);
    const oracle::Prediction prediction =
        oracle::predictRun(phone_, GetParam().request, failuresOf(failures), place == ErrorPlace::kGiven);
    EXPECT_EQ(outcome.told, prediction.told);
    EXPECT_EQ(outcome.calls, prediction.calls);
    return outcome;
  }

  // Lets each call behind the first failure fail too, in the run that the first failure leads to, and one call more,
  // which is never reached.
  void checkWithEveryLaterFailure(const Failure& first, bool hasError, ErrorPlace place) {
    const Outcome alone = run({first}, place);
    for (std::size_t second = first.call + 1; second <= alone.calls + 1; ++second) {
      const bool isReached = second <= alone.calls;
      const Outcome outcome = check({first, {second, hasError}}, place);
      EXPECT_EQ(outcome.fired, (std::vector<std::uint64_t>{1, isReached ? 1U : 0U}));
      if (!isReached) {
        EXPECT_EQ(outcome.told, alone.told);
      }
      ASSERT_FALSE(HasFailure()) << "calls " << first.call << " and " << second;
    }
  }

  Scenario scenario_;
  oracle::Phone phone_;
  std::size_t cases_ = 0;
};

constexpr std::array kPlaces{ErrorPlace::kGiven, ErrorPlace::kNone};
constexpr std::array kHasError{true, false};

TEST_P(CameraSyncSweep, AHealthyRunIsAsPredicted) {
  for (const ErrorPlace place : kPlaces) {
    const Outcome outcome = check({}, place);
    EXPECT_NE(outcome.told.find("returned a result\n"), std::string::npos) << outcome.told;
  }
}

TEST_P(CameraSyncSweep, EveryCallMayFail) {
  const std::size_t calls = run({}, ErrorPlace::kGiven).calls;
  ASSERT_GT(calls, 20U);
  for (std::size_t call = 1; call <= calls; ++call) {
    for (const bool hasError : kHasError) {
      for (const ErrorPlace place : kPlaces) {
        const Outcome outcome = check({{call, hasError}}, place);
        ASSERT_EQ(outcome.fired, std::vector<std::uint64_t>{1}) << "call " << call;
        ASSERT_FALSE(HasFailure()) << "call " << call << (hasError ? " with" : " without") << " an error";
      }
    }
  }
  // One more than there are does nothing.
  const Outcome beyond = check({{calls + 1, true}}, ErrorPlace::kGiven);
  EXPECT_EQ(beyond.fired, std::vector<std::uint64_t>{0});
  EXPECT_EQ(beyond.told, run({}, ErrorPlace::kGiven).told);
}

// Covers the pairs of failing calls in which an error could be confused with another one, or stored where none is
// allowed.
TEST_P(CameraSyncSweep, EveryTwoCallsMayFail) {
  const std::size_t healthyCalls = run({}, ErrorPlace::kGiven).calls;
  ASSERT_GT(healthyCalls, 20U);
  for (std::size_t first = 1; first <= healthyCalls; ++first) {
    checkWithEveryLaterFailure({first, true}, false, ErrorPlace::kGiven);
    checkWithEveryLaterFailure({first, false}, true, ErrorPlace::kGiven);
    checkWithEveryLaterFailure({first, true}, true, ErrorPlace::kNone);
    ASSERT_FALSE(HasFailure()) << "call " << first;
  }
}

INSTANTIATE_TEST_SUITE_P(Phones, CameraSyncSweep, testing::ValuesIn(kSweeps),
                         [](const testing::TestParamInfo<Sweep>& sweep) { return sweep.param.name; });

}  // namespace
}  // namespace quazor
