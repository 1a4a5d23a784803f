// The experiment's description, setup and lifetime.
#include "diagnostics/camera_sync/camera_sync_for_tests.h"

#include <cmath>
#include <cstdint>
#include <limits>

namespace quazor {
namespace {

using CameraSyncExperimentSetup = ScriptedCameraSyncTest;

constexpr double kNaN = std::numeric_limits<double>::quiet_NaN();
constexpr double kInfinity = std::numeric_limits<double>::infinity();

TEST_F(CameraSyncExperimentSetup, DescribesItselfAndItsOneParameter) {
  const QZDescription description = QZCameraSyncExperiment({kWidePort}, {16}, 30, platform()).experimentDescription();
  EXPECT_EQ(description.summary(), "Synchronize the cameras and collect statistics from the session.");
  ASSERT_EQ(description.parameters().size(), 1U);
  const auto& [name, parameter] = *description.parameters().begin();
  EXPECT_EQ(name, "duration");
  EXPECT_EQ(parameter.summary(), "The stream duraiton. Anything less than 2s may not generate any data.");
  EXPECT_TRUE(parameter.required());
}

TEST_F(CameraSyncExperimentSetup, HasNoTeardown) {
  QZCameraSyncExperiment experiment({kWidePort}, {16}, 30, platform());
  EXPECT_EQ(dynamic_cast<QZTeardown*>(static_cast<QZExperiment*>(&experiment)), nullptr);
}

TEST_F(CameraSyncExperimentSetup, RefusesADurationBelowTwoSeconds) {
  const struct {
    const char* name;
    Dictionary parameters;
    bool accepted;
  } rows[] = {
      {"two seconds", {{"duration", 2.0}}, true},
      {"an integer", {{"duration", 2}}, true},
      {"an unsigned integer", {{"duration", 2U}}, true},
      {"a 32-bit float", {{"duration", 2.0F}}, true},
      {"a long time", {{"duration", 1e300}}, true},
      {"for ever", {{"duration", kInfinity}}, true},
      {"not a number", {{"duration", kNaN}}, true},
      {"among others", {{"other", 1}, {"duration", 3}}, true},
      {"just below", {{"duration", 1.99}}, false},
      {"the double below two", {{"duration", std::nextafter(2.0, 0.0)}}, false},
      {"one", {{"duration", 1}}, false},
      {"true reads as one", {{"duration", true}}, false},
      {"zero", {{"duration", 0}}, false},
      {"a negative one", {{"duration", -2}}, false},
      {"minus infinity", {{"duration", -kInfinity}}, false},
      {"none reads as 0", {}, false},
      {"a misspelt name", {{"Duration", 2}}, false},
      {"a string reads as 0", {{"duration", "2"}}, false},
  };
  for (const auto& row : rows) {
    SCOPED_TRACE(row.name);
    QZCameraSyncExperiment experiment({kWidePort}, {16}, 30, platform());
    QZDiagnosticHost host;
    DiagnosticErrorPtr error = callersOwnError();
    EXPECT_EQ(experiment.setupWithParameters(row.parameters, &host, &error), row.accepted);
    EXPECT_EQ(experiment.setupWithParameters(row.parameters, nullptr, nullptr), row.accepted);
    ASSERT_NE(error, nullptr);
    EXPECT_EQ(errorChain(error), row.accepted ? "CallerErrorDomain code 1: Here before the run."
                                              : "QZErrorDomain code 5: duration must be at least 2s!");
    EXPECT_EQ(transcript.text(), "");  // no service was called and nothing was logged
  }
}

TEST_F(CameraSyncExperimentSetup, StreamsForTheDurationThatItWasLastGiven) {
  const struct {
    const char* name;
    std::vector<Value> durations;
    std::int64_t nanoseconds;
  } rows[] = {
      {"none", {}, 0},
      {"seconds", {3}, 3'000'000'000},
      {"a fraction", {2.25}, 2'250'000'000},
      {"the last one", {5, 2}, 2'000'000'000},
      {"one that was refused", {5, 1}, 1'000'000'000},
      {"not a number is no time", {kNaN}, 0},
      {"more than the clock can count", {1e300}, std::numeric_limits<std::int64_t>::max()},
      {"for ever", {kInfinity}, std::numeric_limits<std::int64_t>::max()},
  };
  for (const auto& row : rows) {
    QZCameraSyncExperiment experiment({kWidePort}, {16}, 30, platform());
    for (const Value& duration : row.durations) {
      (void)experiment.setupWithParameters({{"duration", duration}}, nullptr, nullptr);
    }
    EXPECT_EQ(between(runAndTell(experiment, ErrorPlace::kGiven, transcript), "wide start", "device get"),
              "wide start\nclock sleep " + std::to_string(row.nanoseconds) + " ns\n")
        << row.name;
  }
}

TEST_F(CameraSyncExperimentSetup, KeepsWhatItWasMadeWith) {
  const QZCameraSyncExperiment experiment({kWidePort, kTelePort}, {16, 14}, 29.97, platform());
  EXPECT_EQ(experiment.ports(), (std::vector<std::string>{kWidePort, kTelePort}));
  EXPECT_EQ(experiment.formatIndexes(), (Array{16, 14}));
  EXPECT_EQ(experiment.frameRate(), Value(29.97));
}

TEST_F(CameraSyncExperimentSetup, RunsWithThePropertiesThatItWasGivenLast) {
  QZCameraSyncExperiment experiment({kWidePort, kTelePort, kSuperPort}, {16, 14, 9}, 30, platform());
  experiment.setPorts({kWidePort, kSuperPort});
  experiment.setFormatIndexes({4, 5U});
  experiment.setFrameRate(29.97);
  EXPECT_EQ(experiment.ports(), (std::vector<std::string>{kWidePort, kSuperPort}));
  EXPECT_EQ(experiment.formatIndexes(), (Array{4, 5U}));
  EXPECT_EQ(experiment.frameRate(), Value(29.97));

  EXPECT_EQ(between(runAndTell(experiment, ErrorPlace::kGiven, transcript), "wide set FormatIndex", "clock sleep"),
            "wide set FormatIndex = 4\nwide set MinimumFrameRate = 29.97\nwide set MaximumFrameRate = 29.97\n"
            "super set FormatIndex = 5\nsuper set MinimumFrameRate = 29.97\nsuper set MaximumFrameRate = 29.97\n"
            "wide start\nsuper start\n");
}

TEST_F(CameraSyncExperimentSetup, UsesTheInstalledPlatformWhenItIsHandedNone) {
  const Platform before = installedPlatform();
  installPlatform(platform());
  QZCameraSyncExperiment experiment({kWidePort}, {16}, 30);
  installPlatform(before);
  EXPECT_EQ(from(runAndTell(experiment, ErrorPlace::kGiven, transcript), "returned"),
            "returned a result\nerror untouched\n"
            "BackWide.FrameOffset = 0 frames\nBackWide.Frames = 60 frames\n"
            "ErrorCounters = {BackWide = {Count = 0}}\n");
}

TEST_F(CameraSyncExperimentSetup, KeepsNothingOfTheCaptureServiceAfterItsRun) {
  const std::vector<std::weak_ptr<Object>> objects{device, group, wide, tele, super};
  QZCameraSyncExperiment experiment({kWidePort, kTelePort, kSuperPort}, {16, 14, 9}, 30, platform());
  ASSERT_NE(experiment.run(nullptr), nullptr);
  EXPECT_TRUE(service->lastPlugIn.expired());

  // Breaks the reference cycle of the fakes first, while the experiment and its platform still exist.
  service->device.reset();
  device->groups.clear();
  device->properties = {};
  group->properties = {};
  group->members.reset();
  device.reset();
  group.reset();
  wide.reset();
  tele.reset();
  super.reset();
  for (const auto& object : objects) EXPECT_TRUE(object.expired());
}

}  // namespace
}  // namespace quazor
