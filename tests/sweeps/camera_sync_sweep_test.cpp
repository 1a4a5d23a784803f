// Makes every call and every pair of calls of a camera synchronisation fail, and compares the complete trace of each
// run with the oracle's prediction.
#include "backends/simulated/scenario/scenario.h"
#include "backends/simulated/simulated_phone.h"
#include "contract/message_format.h"
#include "diagnostics/camera_sync/camera_sync_experiment.h"
#include "tests/support/run_transcript.h"
#include "tests/support/shipped_scenario.h"
#include "tests/sweeps/call_sweep.h"
#include "tests/sweeps/camera_sync_oracle.h"

#include <gtest/gtest.h>

#include <iostream>
#include <string>
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

class CameraSyncSweep : public CallSweep, public testing::WithParamInterface<Sweep> {
 protected:
  void SetUp() override {
    scenario_ = shippedScenario("healthy");
    for (CameraGroup& group : scenario_.groups) group.masterConfiguration = GetParam().masterConfiguration;
    phone_ = phoneOf(scenario_);
  }
  void TearDown() override { std::cout << "[sweep] " << GetParam().name << ": " << cases_ << " cases\n"; }

  SweptRun check(const std::vector<CallFailure>& failures, ErrorPlace place) override {
    ++cases_;
    RunTranscript transcript;
    SimulatedPhone phone(scenario_, PhoneTime::kVirtual, 1);
    phone.observeCalls(addingTo(transcript));
    for (const CallFailure& failure : failures) phone.addFault(faultOf(failure));
    const oracle::Request& request = GetParam().request;
    QZCameraSyncExperiment experiment(request.ports, Array(request.formatIndexes.begin(), request.formatIndexes.end()),
                                      request.frameRate, phone.platform());
    EXPECT_TRUE(experiment.setupWithParameters({{"duration", request.seconds}}, nullptr, nullptr));
    SweptRun run;
    run.told = runAndTell(experiment, place, transcript);
    run.calls = transcript.fallibleCalls();
    for (const FaultStatus& status : phone.faultStatus()) run.fired.push_back(status.fired);
    const oracle::Prediction prediction =
        oracle::predictRun(phone_, request, failuresOf(failures), place == ErrorPlace::kGiven);
    EXPECT_EQ(run.told, prediction.told);
    EXPECT_EQ(run.calls, prediction.calls);
    return run;
  }

  Scenario scenario_;
  oracle::Phone phone_;
};

TEST_P(CameraSyncSweep, AHealthyRunIsAsPredicted) {
  for (const ErrorPlace place : kPlaces) {
    const SweptRun run = check({}, place);
    EXPECT_NE(run.told.find("returned a result\n"), std::string::npos) << run.told;
  }
}

TEST_P(CameraSyncSweep, EveryCallMayFail) { checkEveryFailure(); }

// Covers the pairs of failing calls in which an error could be confused with another one, or stored where none is
// allowed.
TEST_P(CameraSyncSweep, EveryTwoCallsMayFail) {
  const std::size_t healthyCalls = check({}, ErrorPlace::kGiven).calls;
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
