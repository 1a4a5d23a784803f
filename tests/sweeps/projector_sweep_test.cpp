// Makes every call and every pair of calls of a projector fault run and its teardown fail, and compares the complete
// trace of each run with the oracle's prediction.
#include "backends/simulated/scenario/scenario.h"
#include "tests/support/run_transcript.h"
#include "tests/support/shipped_scenario.h"
#include "tests/sweeps/call_sweep.h"
#include "tests/sweeps/projector_bench.h"
#include "tests/sweeps/projector_oracle.h"

#include <gtest/gtest.h>

#include <iostream>
#include <optional>
#include <ostream>
#include <string>
#include <utility>
#include <vector>

namespace quazor {
namespace {

using projector_oracle::FrameFault;
using projector_oracle::PhoneFrame;

// A run on one phone.
struct Sweep {
  const char* name;
  projector_oracle::Request request = {};
  std::optional<FrameFault> secondFrame = {};
  bool sendsFrames = true;
  bool isShipped = false;  // the shipped healthy phone instead of the bench's
};
void PrintTo(const Sweep& sweep, std::ostream* out) { *out << sweep.name; }

const Sweep kSweeps[] = {
    {.name = "Lit"},
    {.name = "HealthyPhone", .isShipped = true},
    {.name = "OneFrame", .request = {.frameCount = 1}},
    {.name = "FewerFramesThanAskedFor", .request = {.frameCount = 100, .timeout = 0.08, .watched = 0.12}},
    {.name = "NoFrames", .request = {.timeout = 0.08, .watched = 0.12}, .sendsFrames = false},
    {.name = "NoTime", .request = {.timeout = 0, .watched = 0.05}},
    {.name = "Dark", .secondFrame = FrameFault::kDark},
    {.name = "DarkForSafety", .secondFrame = FrameFault::kDarkForSafety},
    {.name = "NoMetadata", .secondFrame = FrameFault::kNoMetadata},
    {.name = "NoDictionary", .secondFrame = FrameFault::kNoDictionary},
    {.name = "Incomplete", .secondFrame = FrameFault::kIncomplete},
};

FrameMetadata metadataOf(FrameFault fault) {
  FrameMetadata metadata;
  switch (fault) {
    case FrameFault::kDark: return unlitFrame();
    case FrameFault::kDarkForSafety: return unlitFrameForSafety();
    case FrameFault::kNoMetadata: metadata.attachment = FrameAttachment::kMissing; break;
    case FrameFault::kNoDictionary: metadata.attachment = FrameAttachment::kText; break;
    case FrameFault::kIncomplete: metadata.without = {"HardwareEvents"}; break;
  }
  return metadata;
}

std::string csvFieldsOf(FrameFault fault) {
  return std::string("2,0,0,210,640,0,1,205,207,1.5,33.5,31.25,32,36.5,32.5,33.25,41,") +
         (fault == FrameFault::kDarkForSafety ? "8192" : "0");
}

Scenario scenarioOf(const Sweep& sweep) {
  Scenario scenario = sweep.isShipped ? shippedScenario("healthy") : projectorScenario();
  if (sweep.secondFrame) setFrame(scenario, 2, metadataOf(*sweep.secondFrame));
  infraredCamera(scenario).deliversFrames = sweep.sendsFrames;
  return scenario;
}

projector_oracle::Phone phoneOf(const Sweep& sweep, Scenario scenario) {
  projector_oracle::Phone phone;
  for (const Camera& camera : scenario.cameras) phone.streams.push_back({camera.id, camera.port});
  const Camera& infrared = infraredCamera(scenario);
  EXPECT_EQ(infrared.errorCounters->size(), 6U);
  const char* const counters[] = {"I2CErrorCount",  "MIPIErrorCount", "LPDPErrorCount",
                                  "UARTErrorCount", "SIFErrorCount",  "ProjectorErrorCount"};
  for (std::size_t i = 0; i < phone.errorCounters.size(); ++i) {
    phone.errorCounters[i] = static_cast<int>(toSigned(infrared.errorCounters->find(counters[i])));
  }
  for (const ReportChannelConfig& channel : scenario.reports) {
    if (channel.subGroup == "K42ISP Events") {
      EXPECT_EQ(channel.growth, 0U) << channel.name << " grows with time, which the oracle does not know";
    }
    std::uint64_t counted = 0;
    for (const ReportStep& step : channel.steps) counted += step.by;
    phone.channels.push_back({channel.group, channel.subGroup, channel.name, channel.count, counted});
  }
  if (sweep.secondFrame) phone.frames[2] = {*sweep.secondFrame, csvFieldsOf(*sweep.secondFrame)};
  phone.sendsFrames = sweep.sendsFrames;
  phone.eventAfterTenMilliseconds = 1;
  return phone;
}

class ProjectorSweep : public CallSweep, public testing::WithParamInterface<Sweep> {
 protected:
  void SetUp() override {
    scenario_ = scenarioOf(GetParam());
    phone_ = phoneOf(GetParam(), scenario_);
  }
  void TearDown() override { std::cout << "[sweep] " << GetParam().name << ": " << cases_ << " cases\n"; }

  // Runs with the failures, under a seed of its own, and compares with the oracle.
  SweptRun check(const std::vector<CallFailure>& failures, ErrorPlace place) override {
    const projector_oracle::Request& request = GetParam().request;
    ProjectorRequest made;
    made.frameCount = request.frameCount;
    made.timeout = request.timeout;
    made.watched = std::chrono::milliseconds(static_cast<std::int64_t>(request.watched * 1000 + 0.5));
    made.seed = ++cases_;
    std::vector<Fault> faults;
    for (const CallFailure& failure : failures) faults.push_back(faultOf(failure));
    SweptRun run = runProjector(scenario_, made, faults, place);
    const projector_oracle::Prediction prediction =
        projector_oracle::predictFaultRun(phone_, request, failuresOf(failures), place == ErrorPlace::kGiven);
    EXPECT_EQ(run.told, prediction.told);
    EXPECT_EQ(run.calls, prediction.calls);
    return run;
  }

  Scenario scenario_;
  projector_oracle::Phone phone_;
};

TEST_P(ProjectorSweep, ARunWithoutFailuresIsAsPredicted) {
  for (const ErrorPlace place : kPlaces) {
    const SweptRun run = check({}, place);
    const bool isGood = !GetParam().secondFrame;
    EXPECT_EQ(run.told.find("returned a result\n") != std::string::npos, isGood) << run.told;
  }
}

TEST_P(ProjectorSweep, EveryCallMayFail) { checkEveryFailure(); }

// Without an error variable both failures have errors, none of which may be stored.
TEST_P(ProjectorSweep, EveryTwoCallsMayFail) {
  const std::size_t calls = check({}, ErrorPlace::kGiven).calls;
  ASSERT_GT(calls, 20U);
  for (std::size_t first = 1; first <= calls; ++first) {
    for (const bool hasError : kHasError) {
      checkWithEveryLaterFailure({first, hasError}, true, ErrorPlace::kGiven);
      checkWithEveryLaterFailure({first, hasError}, false, ErrorPlace::kGiven);
      if (hasError) checkWithEveryLaterFailure({first, hasError}, true, ErrorPlace::kNone);
      ASSERT_FALSE(HasFailure()) << "call " << first;
    }
  }
}

INSTANTIATE_TEST_SUITE_P(Phones, ProjectorSweep, testing::ValuesIn(kSweeps),
                         [](const testing::TestParamInfo<Sweep>& sweep) { return sweep.param.name; });

}  // namespace
}  // namespace quazor
