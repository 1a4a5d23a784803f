// The handling of frames and events during a run.
#include "backends/simulated/simulated_phone.h"
#include "backends/simulated/time/simulation_stall.h"
#include "diagnostics/projector_fault/tessel_fault_experiment.h"
#include "platform/capture_keys.h"
#include "tests/support/fake_camera.h"
#include "tests/sweeps/projector_bench.h"

#include <gtest/gtest.h>

#include <chrono>
#include <cstdint>
#include <limits>
#include <memory>
#include <ostream>
#include <string>
#include <string_view>
#include <utility>

namespace quazor {
namespace {

// Moves the log lines of frames after the stop to the section "afterwards": whether the run has already returned when
// such a frame arrives depends on the order of events.
std::string withLateFramesAfterwards(std::string told) {
  constexpr std::string_view kLate = "log default: Received frame that won't be counted";
  std::string late;
  for (std::size_t at = told.find(kLate); at != std::string::npos; at = told.find(kLate)) {
    const std::size_t end = told.find('\n', at) + 1;
    late += told.substr(at, end - at);
    told.erase(at, end - at);
  }
  constexpr std::string_view kAfterwards = "afterwards\n";
  return told.insert(told.find(kAfterwards) + kAfterwards.size(), late);
}

// The trace of the run from the start of the stream, which must be equal for all seeds.
std::string toldOfFrames(const Scenario& scenario, ProjectorRequest request = {}) {
  constexpr std::string_view kStart = "front-infrared start\n";
  std::string first;
  for (const std::uint64_t seed : {1U, 2U, 3U}) {
    request.seed = seed;
    std::string told = runProjector(scenario, request, {}, ErrorPlace::kGiven).told;
    const std::size_t at = told.find(kStart);
    EXPECT_NE(at, std::string::npos) << told;
    told = withLateFramesAfterwards(told.substr(at + kStart.size()));
    if (seed == 1U) first = told;
    EXPECT_EQ(told, first) << "with seed " << seed;
  }
  return first;
}

Scenario withFrame(std::uint64_t number, FrameMetadata metadata) {
  Scenario scenario = projectorScenario();
  setFrame(scenario, number, std::move(metadata));
  return scenario;
}

FrameMetadata attached(FrameAttachment attachment) {
  FrameMetadata metadata;
  metadata.attachment = attachment;
  return metadata;
}

FrameMetadata withEntry(std::string_view key, Value value) {
  FrameMetadata metadata;
  metadata.overrides.set(key, std::move(value));
  return metadata;
}

constexpr const char* kFirstFrame = R"(log debug: Processing event 1 at 0.010000.
log debug: Received frame 1.
log debug: Processing frame 1.
log debug: Received frame 2.
)";

constexpr const char* kCsvHeader =
    "Frame,Date,MediaTime(s),MetaDataProjectorMode,InfraredLightSource,MetaDataProjectorIndex,"
    "MetaDataProjectorPowerLow,MetaDataProjectorPowerHigh,MetaDataProjectorPowerFlood,MetaDataProjectorProbeMode,"
    "MetaDataProjectorPowerProbeA,MetaDataProjectorPowerProbeB,MetaDataProjectorPulseWidth,FloodActiveTemperature,"
    "NTCTemperatureIdle,NTCTemperatureStandby,NTCTemperatureActive,DIETemperatureIdle,DIETemperatureStandby,"
    "DIETemperatureActive\n";

constexpr const char* kFrameError =
    "log debug: We are stopping because there was an error. If stopping the stream fails, it will be ignored.\n";

std::string endAfterTimeout(const std::string& held = "none") {
  return "afterwards\nlog error: Timeout has been reached.\n" + toldEnd(held);
}

TEST(TesselFaultPipeline, EndsWithAFrameThatIsDark) {
  const struct {
    FrameMetadata metadata;
    const char* hardwareEvents;
    const char* error;
  } rows[] = {
      {unlitFrameForSafety(), "8192", "code 213: Frame 2 is not illuminated for safety reason!\n"},
      {unlitFrame(), "0", "code 206: Frame 2 is not illuminated for unknown reason!\n"},
  };
  for (const auto& row : rows) {
    EXPECT_EQ(toldOfFrames(withFrame(2, row.metadata)),
              std::string(kFirstFrame) + "log debug: Processing frame 2.\nlog debug: " + kCsvHeader +
                  "\n2,2026-01-01 00:00:00 +0000,0.066667,2,0,0,210,640,0,1,205,207,1.5,33.5,31.25,32,36.5,32.5,33.25,"
                  "41," +
                  row.hardwareEvents +
                  "\n\nlog error: Frame 2 failed projection validation.\n"
                  "front-infrared get ErrorCounters\nfront-infrared stop\n" +
                  kFrameError + "returned nothing\nerror QZCapturePlugInErrorDomain " + row.error + endAfterTimeout());
  }
}

// The last frame is examined like every other, and its error takes precedence over its number.
TEST(TesselFaultPipeline, EndsWithAnErrorWhenTheLastFrameIsDark) {
  const std::string told = toldOfFrames(withFrame(3, unlitFrame()));
  EXPECT_NE(told.find("error QZCapturePlugInErrorDomain code 206: Frame 3 is not illuminated for unknown reason!\n"),
            std::string::npos)
      << told;
  EXPECT_EQ(told.find("is the last frame."), std::string::npos) << told;
}

// The frame is counted and its buffer is never released.
struct BadMetadata {
  const char* name;
  FrameMetadata metadata;
  const char* message;
};
void PrintTo(const BadMetadata& bad, std::ostream* out) { *out << bad.name; }

FrameMetadata withoutEntry(std::string key) {
  FrameMetadata metadata;
  metadata.without.push_back(std::move(key));
  return metadata;
}

class BadFrame : public testing::TestWithParam<BadMetadata> {};

TEST_P(BadFrame, EndsTheRun) {
  EXPECT_EQ(toldOfFrames(withFrame(2, GetParam().metadata)),
            std::string(kFirstFrame) + "front-infrared get ErrorCounters\nfront-infrared stop\n" + kFrameError +
                "returned nothing\nerror QZCapturePlugInErrorDomain code 206: " + GetParam().message + '\n' +
                endAfterTimeout("front-infrared 2"));
}

INSTANTIATE_TEST_SUITE_P(
    TesselFaultPipeline, BadFrame,
    testing::Values(BadMetadata{"Missing", attached(FrameAttachment::kMissing), "Frame metadata is missing!"},
                    BadMetadata{"Text", attached(FrameAttachment::kText), "Frame metadata is not a dictionary!"},
                    BadMetadata{"Number", attached(FrameAttachment::kNumber), "Frame metadata is not a dictionary!"},
                    BadMetadata{"WithoutLightSource", withoutEntry("InfraredLightSource"),
                                "Could not create a frame description of frame 2!"},
                    BadMetadata{"WithoutHardwareEvents", withoutEntry("HardwareEvents"),
                                "Could not create a frame description of frame 2!"},
                    BadMetadata{"ModeInWords", withEntry("MetaDataProjectorMode", "2"),
                                "Could not create a frame description of frame 2!"}),
    [](const testing::TestParamInfo<BadMetadata>& bad) { return bad.param.name; });

TEST(TesselFaultPipeline, DoesWithoutTheFloodTemperature) {
  Scenario scenario = projectorScenario();
  infraredCamera(scenario).projector->metadata = withoutEntry("FloodActiveTemperature");
  EXPECT_EQ(toldOfFrames(scenario), toldOfFrames(projectorScenario()));
  setFrame(scenario, 2, unlitFrame());
  const std::string told = toldOfFrames(scenario);
  EXPECT_NE(told.find(",207,1.5,(null),31.25,"), std::string::npos) << told;
}

TEST(TesselFaultPipeline, TakesAFrameForLitWhenItsLightSourceIsOneOrTwo) {
  constexpr double kInfinity = std::numeric_limits<double>::infinity();
  const struct {
    const char* name;
    Value source;
    bool lit;
  } rows[] = {
      {"none", 0, false},
      {"one", 1, true},
      {"two", 2, true},
      {"three", 3, false},
      {"minus one", -1, false},
      {"just below one", 0.999, false},
      {"a little more than one", 1.5, true},
      {"just below three", 2.999, true},
      {"three as a double", 3.0, false},
      {"one as a float", 1.0F, true},
      {"true", true, true},
      {"false", false, false},
      {"one in the low bits", std::int64_t{0x1'0000'0001}, true},
      {"two in the low bits of an unsigned", std::uint64_t{0xFFFFFFFF'00000002}, true},
      {"three in the low bits", std::int64_t{0x1'0000'0003}, false},
      {"a double beyond the range", 4294967297.0, false},
      {"endless", kInfinity, false},
      {"endlessly negative", -kInfinity, false},
      {"not a number", std::numeric_limits<double>::quiet_NaN(), false},
  };
  for (const auto& row : rows) {
    SCOPED_TRACE(row.name);
    const std::string told = toldOfFrames(withFrame(2, withEntry("InfraredLightSource", row.source)));
    EXPECT_EQ(told.find("returned a result\n") != std::string::npos, row.lit) << told;
    EXPECT_EQ(told.find("code 206: Frame 2 is not illuminated for unknown reason!\n") == std::string::npos, row.lit)
        << told;
  }
}

TEST(TesselFaultPipeline, LooksAtOneBitOfTheHardwareEventsToKnowWhyAFrameIsDark) {
  const struct {
    const char* name;
    Value events;
    bool safety;
  } rows[] = {
      {"none", 0, false},         {"the safety bit", 0x2000, true},     {"all others", 0xDFFF, false},
      {"all", 0xFFFF, true},      {"more than 16 bits", 0x12000, true}, {"only beyond 16 bits", 0x20000000, false},
      {"a double", 8192.9, true},
  };
  for (const auto& row : rows) {
    SCOPED_TRACE(row.name);
    FrameMetadata metadata = unlitFrame();
    metadata.overrides.set("HardwareEvents", row.events);
    const std::string told = toldOfFrames(withFrame(2, metadata));
    EXPECT_EQ(told.find("code 213: Frame 2 is not illuminated for safety reason!\n") != std::string::npos, row.safety)
        << told;
    EXPECT_EQ(told.find("code 206: Frame 2 is not illuminated for unknown reason!\n") == std::string::npos, row.safety)
        << told;
  }
}

TEST(TesselFaultPipeline, KeepsTheSafetyBitOfALitFrameToItself) {
  EXPECT_EQ(toldOfFrames(withFrame(2, withEntry("HardwareEvents", 0x2000))), toldOfFrames(projectorScenario()));
}

TEST(TesselFaultPipeline, EndsWithTheFirstFrameWhenAskedForNone) {
  for (const int frames : {0, 1}) {
    ProjectorRequest request;
    request.frameCount = frames;
    EXPECT_EQ(toldOfFrames(projectorScenario(), request), R"(log debug: Processing event 1 at 0.010000.
log debug: Received frame 1.
log debug: Processing frame 1.
log debug: Frame 1 is the last frame.
)" + toldResult(1, 2, 5) + endAfterTimeout());
  }
}

TEST(TesselFaultPipeline, EndsAtTheTimeoutWithTheFramesThatCame) {
  ProjectorRequest request;
  request.frameCount = 100;
  request.timeout = 0.08;
  EXPECT_EQ(toldOfFrames(projectorScenario(), request), std::string(kFirstFrame) + R"(log debug: Processing frame 2.
log error: Timeout has been reached.
)" + toldResult(2, 2, 5) + "afterwards\n" + toldEnd());
}

const std::string kEndAtOnce = R"(log error: Timeout has been reached.
)" + toldResult(0, 0, 0) + "afterwards\n" +
                               toldEnd();

TEST(TesselFaultPipeline, EndsAtOnceWithoutTimeToWait) {
  for (const Value& timeout : {Value(0), Value(-0.0), Value(0.9e-9), Value(std::numeric_limits<double>::quiet_NaN()),
                               Value("a timeout in words")}) {
    SCOPED_TRACE(defaultText(timeout));
    ProjectorRequest request;
    request.timeout = timeout;
    EXPECT_EQ(toldOfFrames(projectorScenario(), request), kEndAtOnce);
  }
}

// Fractions of a nanosecond are truncated. Frame 3 arrives 100 ms after the start, like the timeout of 0.1 s; a timeout
// one nanosecond shorter precedes the frame, one nanosecond longer follows it.
TEST(TesselFaultPipeline, CountsItsTimeoutInWholeNanoseconds) {
  const struct {
    const char* name;
    double timeout;
    bool cameFirst;
  } rows[] = {
      {"a nanosecond less", 0.0999999995, true},
      {"a nanosecond more", 0.1000000011, false},
  };
  for (const auto& row : rows) {
    SCOPED_TRACE(row.name);
    ProjectorRequest request;
    request.timeout = row.timeout;
    const std::string told = toldOfFrames(projectorScenario(), request);
    EXPECT_EQ(told.find("FrameCount = 2 frames\n") != std::string::npos, row.cameFirst) << told;
    EXPECT_EQ(told.find("FrameCount = 3 frames\n") == std::string::npos, row.cameFirst) << told;
  }
}

TEST(TesselFaultPipeline, NeverReachesATimeoutBeyondTheClock) {
  for (const Value& timeout : {Value(1e10), Value(1e300), Value(std::numeric_limits<double>::infinity()),
                               Value(std::numeric_limits<std::uint64_t>::max())}) {
    SCOPED_TRACE(defaultText(timeout));
    ProjectorRequest request;
    request.timeout = timeout;
    const std::string told = toldOfFrames(projectorScenario(), request);
    EXPECT_NE(told.find("FrameCount = 3 frames\n"), std::string::npos) << told;
    EXPECT_EQ(told.find("Timeout has been reached."), std::string::npos) << told;

    Scenario silent = projectorScenario();
    infraredCamera(silent).deliversFrames = false;
    EXPECT_THROW(runProjector(silent, request, {}, ErrorPlace::kGiven), SimulationStall);
  }
}

TEST(TesselFaultPipeline, LogsFramesThatComeAfterTheStopAndKeepsTheirBuffers) {
  Scenario scenario = projectorScenario();
  infraredCamera(scenario).delivery.framesAfterStop = 2;
  std::string want = toldOfFrames(projectorScenario());
  want.insert(want.find("afterwards\n") + std::string_view("afterwards\n").size(),
              "log default: Received frame that won't be counted at time: 0.133333334\n"
              "log default: Received frame that won't be counted at time: 0.166666667\n");
  want.replace(want.find("buffers held: none"), std::string::npos, "buffers held: front-infrared 4, 5\n");
  EXPECT_EQ(toldOfFrames(scenario), want);
}

// The first error ends the run; the other frames are no longer counted.
TEST(TesselFaultPipeline, KeepsTheFirstErrorOfMany) {
  Scenario scenario = projectorScenario();
  infraredCamera(scenario).projector->metadata = attached(FrameAttachment::kMissing);
  infraredCamera(scenario).delivery.framesAfterStop = 2;
  setFrame(scenario, 2, attached(FrameAttachment::kText));
  EXPECT_EQ(toldOfFrames(scenario), R"(log debug: Processing event 1 at 0.010000.
log debug: Received frame 1.
front-infrared get ErrorCounters
front-infrared stop
)" + std::string(kFrameError) + R"(returned nothing
error QZCapturePlugInErrorDomain code 206: Frame metadata is missing!
afterwards
log default: Received frame that won't be counted at time: 0.066666667
log default: Received frame that won't be counted at time: 0.1
log error: Timeout has been reached.
device invalidate
torn down
error untouched
buffers held: front-infrared 1, 2, 3
)");
}

TEST(TesselFaultPipeline, OnlyLogsEvents) {
  Scenario scenario = projectorScenario();
  std::string want = toldOfFrames(scenario);
  const std::string usual = "log debug: Processing event 1 at 0.010000.\n";
  want.replace(want.find(usual), usual.size(),
               "log debug: Processing event -7 at 0.000000.\n"
               "log debug: Processing event 2147483647 at 0.000002.\n"
               "log debug: Processing event -2147483648 at 0.020000.\n");
  infraredCamera(scenario).delivery.events = {
      {std::chrono::nanoseconds(400), -7},
      {std::chrono::nanoseconds(1500), 2147483647},
      {std::chrono::milliseconds(20), std::numeric_limits<std::int32_t>::min()}};
  EXPECT_EQ(toldOfFrames(scenario), want);
}

TEST(TesselFaultPipeline, EndsWithoutEventsAndFramesToo) {
  Scenario scenario = projectorScenario();
  infraredCamera(scenario).deliversFrames = false;
  infraredCamera(scenario).delivery.events.clear();
  const std::string told = toldOfFrames(scenario);
  EXPECT_TRUE(told.starts_with("log error: Timeout has been reached.\nfront-infrared get ErrorCounters\n")) << told;
  EXPECT_NE(told.find("FrameCount = 0 frames\nI2C = 1 errors\n"), std::string::npos) << told;
}

std::string measurementsOf(const std::string& told) {
  const std::size_t at = told.find("FrameCount = ");
  EXPECT_NE(at, std::string::npos) << told;
  return told.substr(at, told.find("afterwards\n") - at);
}

TEST(TesselFaultPipeline, CountsErrorsWithoutACounterAsNone) {
  Scenario scenario = projectorScenario();
  scenario.reports.clear();
  infraredCamera(scenario).errorCounters =
      Dictionary{{"ProjectorErrorCount", 9}, {"MIPIErrorCount", "many"}, {"I2CErrorCount", 0.5}, {"Other", 3}};
  EXPECT_EQ(measurementsOf(toldOfFrames(scenario)),
            "FrameCount = 3 frames\nI2C = 0.5 errors\nMIPI = 0 errors\nLPDP = 0 errors\nUART = 0 errors\n"
            "SIF = 0 errors\nProjector = 9 errors\n");
  infraredCamera(scenario).errorCounters = Dictionary{};
  EXPECT_EQ(measurementsOf(toldOfFrames(scenario)),
            "FrameCount = 3 frames\nI2C = 0 errors\nMIPI = 0 errors\nLPDP = 0 errors\nUART = 0 errors\n"
            "SIF = 0 errors\nProjector = 0 errors\n");
}

TEST(TesselFaultPipeline, CountsEveryErrorAsNoneWhenTheCountersAreNoDictionary) {
  const SimulatedPhone phone(projectorScenario(), PhoneTime::kVirtual, 1);
  const auto stream = std::make_shared<FakeStream>();
  stream->errorCounters = Value(7);
  Platform platform = phone.platform();
  platform.capture = makeFakeCapture(stream);
  const auto experiment = std::make_shared<QZTesselFaultExperiment>(platform);
  ASSERT_TRUE(experiment->setupWithParameters({{"timeout", 0}}, nullptr, nullptr));
  RunTranscript transcript;
  const std::string told = runAndTell(*experiment, ErrorPlace::kGiven, transcript);
  EXPECT_NE(told.find("FrameCount = 0 frames\nI2C = 0 errors\nMIPI = 0 errors\nLPDP = 0 errors\nUART = 0 errors\n"
                      "SIF = 0 errors\nProjector = 0 errors\n"),
            std::string::npos)
      << told;
}

TEST(TesselFaultPipeline, LetsALaterChannelOfTheSameNameWin) {
  Scenario scenario = projectorScenario();
  scenario.reports[2].name = "Number ZE FAULT_A";
  scenario.reports[3].name = "SIF";
  scenario.reports[4].name = "FrameCount";
  EXPECT_EQ(measurementsOf(toldOfFrames(scenario)),
            "FrameCount = 0 events\nI2C = 1 errors\nMIPI = 2 errors\nLPDP = 3 errors\nUART = 4 errors\n"
            "SIF = 0 events\nProjector = 6 errors\nNumber ZE FAULT_A = 5 events\n");
}

}  // namespace
}  // namespace quazor
