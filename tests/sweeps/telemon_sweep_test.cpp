// Makes every call of a report channel presence run fail, removes the count from every subset of its channels, and
// compares the complete trace of each run with the oracle's prediction.
#include "backends/simulated/scenario/scenario.h"
#include "backends/simulated/simulated_phone.h"
#include "diagnostics/report_channels/tessel_telemon_experiment.h"
#include "tests/support/run_transcript.h"
#include "tests/support/shipped_scenario.h"
#include "tests/sweeps/call_sweep.h"
#include "tests/sweeps/projector_bench.h"
#include "tests/sweeps/projector_oracle.h"

#include <gtest/gtest.h>

#include <iostream>
#include <optional>
#include <string>
#include <utility>
#include <vector>

namespace quazor {
namespace {

class TelemonSweep : public testing::Test {
 protected:
  void TearDown() override { std::cout << "[sweep] " << cases_ << " cases\n"; }

  // Without a failure when the call is 0.
  void check(const Scenario& scenario, const CallFailure& failure, ErrorPlace place) {
    ++cases_;
    RunTranscript transcript;
    SimulatedPhone phone(scenario, PhoneTime::kVirtual, cases_);
    if (failure.call != 0) phone.addFault(faultOf(failure));
    phone.observeCalls(addingTo(transcript));
    std::vector<projector_oracle::PhoneChannel> channels;
    for (const ReportChannelConfig& channel : scenario.reports) {
      channels.push_back({channel.group, channel.subGroup, channel.name, channel.count});
    }
    const auto prediction = projector_oracle::predictPresenceRun(
        channels, failure.call == 0 ? projector_oracle::Failures() : failuresOf({failure}),
        place == ErrorPlace::kGiven);
    QZTesselTelemonExperiment experiment(phone.platform());
    EXPECT_EQ(runAndTell(experiment, place, transcript), prediction.told);
    if (failure.call != 0) {
      EXPECT_EQ(phone.faultStatus().front().fired, failure.call <= prediction.calls ? 1U : 0U);
    }
  }

  // All possible failures, no failure, and one after the last call.
  void checkEveryFailure(const Scenario& scenario) {
    for (const ErrorPlace place : {ErrorPlace::kGiven, ErrorPlace::kNone}) {
      for (std::size_t call = 0; call <= 3; ++call) {
        for (const bool hasError : {true, false}) check(scenario, {call, hasError}, place);
      }
    }
  }

  std::uint64_t cases_ = 0;
};

TEST_F(TelemonSweep, EveryCallMayFailOnAHealthyPhone) {
  const Scenario scenario = shippedScenario("healthy");
  ASSERT_GE(scenario.reports.size(), 60U);
  checkEveryFailure(scenario);
}

TEST_F(TelemonSweep, EveryCallMayFailWhicheverChannelsHaveACount) {
  Scenario scenario = projectorScenario();
  const std::size_t channels = scenario.reports.size();
  for (unsigned counted = 0; counted < 1U << channels; ++counted) {
    for (std::size_t i = 0; i < channels; ++i) {
      scenario.reports[i].count = (counted >> i & 1U) != 0 ? std::optional<std::uint64_t>(i * 11) : std::nullopt;
    }
    checkEveryFailure(scenario);
    ASSERT_FALSE(HasFailure()) << "counted " << counted;
  }
}

// Names of groups and subgroups that almost match.
TEST_F(TelemonSweep, EveryCallMayFailWhateverTheGroupsAreCalled) {
  for (const char* const group : {"", "K42ISP", "K42IS", "42ISP", "xK42ISPx", "k42isp", "K42 ISP", "K42ISP Events"}) {
    for (const char* const subGroup :
         {"", "K42ISP Events", "K42ISP Event", "42ISP Events", "a K42ISP Events b", "K42ISP events", "K42ISPEvents"}) {
      Scenario scenario = projectorScenario();
      scenario.reports.resize(1);
      scenario.reports.front().group = group;
      scenario.reports.front().subGroup = subGroup;
      checkEveryFailure(scenario);
      ASSERT_FALSE(HasFailure()) << group << " / " << subGroup;
    }
  }
}

}  // namespace
}  // namespace quazor
