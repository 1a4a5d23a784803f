// Complete runs on a simulated phone: a healthy one, and one for every call that can fail.
#include "diagnostics/projector_fault/tessel_fault_experiment.h"

#include "tests/sweeps/projector_bench.h"

#include <gtest/gtest.h>

#include <optional>
#include <ostream>
#include <string>
#include <string_view>

namespace quazor {
namespace {

const std::string kHealthyRun = R"(service defaultPlugIn
plug-in get device
device get streams
front get PortType
front-infrared get PortType
device request control (front-infrared)
front-infrared set InfraredLightSourceConfiguration = {Mode = 2; StructuredLightCurrent = 0; StructuredLightPattern = 1}
front-infrared set MultipleOutputSupportEnabled = 1
front-infrared set FormatIndex = 0
front-infrared set MinimumFrameRate = 30
front-infrared set MaximumFrameRate = 30
front-infrared set VideoOutputConfigurations = {PrimaryScaler = {AttachRaw = 1}}
front-infrared set VideoOutputsEnabled = {PrimaryScaler = 1}
front-infrared set AEEnabled = 0
front-infrared set VideoOutputHandlers = {PrimaryScaler = {PixelBufferHandler = <PixelBufferHandler>; EventHandler = <EventHandler>}}
ReportFacility reportWithOnlySimpleChannels
ReportChannelSet reportByFilteringChannels 4
ReportChannelSet snapshot
front-infrared start
log debug: Processing event 1 at 0.010000.
log debug: Received frame 1.
log debug: Processing frame 1.
log debug: Received frame 2.
log debug: Processing frame 2.
log debug: Received frame 3.
log debug: Processing frame 3.
log debug: Frame 3 is the last frame.
)" + toldResult(3, 2, 5) + "afterwards\nlog error: Timeout has been reached.\n" +
                                toldEnd();

constexpr const char* kTimeoutLater = "log error: Timeout has been reached.\n";
// A stream whose stop failed continues until the device is invalidated.
constexpr const char* kFramesAndTimeoutLater = R"(log default: Received frame that won't be counted at time: 0.133333334
log default: Received frame that won't be counted at time: 0.166666667
log default: Received frame that won't be counted at time: 0.2
log error: Timeout has been reached.
log default: Received frame that won't be counted at time: 0.233333334
)";

// A failing call that ends the run.
struct FailingStep {
  const char* name;
  const char* operation;
  std::optional<std::string> property;
  std::uint64_t occurrence;
  const char* line;   // the call in the healthy run
  const char* error;  // the resulting error; {cause} is replaced by the error of the call
  const char* underway = "";
  const char* afterwards = "";
  const char* teardown = kTornDown;
  const char* held = "none";
};
void PrintTo(const FailingStep& step, std::ostream* out) { *out << step.name; }

constexpr const char* kSet = "CaptureStream.setValue";
constexpr const char* kNoDevice =
    "not torn down\nerror QZCapturePlugInErrorDomain code 200: Failed to invalidate the capture device.\n";

const FailingStep kSteps[] = {
    {"ThePlugInIsNotLoaded", "CaptureService.defaultPlugIn", std::nullopt, 1, "service defaultPlugIn",
     "QZCapturePlugInErrorDomain code 200: Failed to get the capture plugin!", "", "", kNoDevice},
    {"ThereIsNoDevice", "CapturePlugIn.device", std::nullopt, 1, "plug-in get device",
     "QZCapturePlugInErrorDomain code 200: Failed to get the capture plugin!{cause}", "", "", kNoDevice},
    {"TheDeviceTellsNoStreams", "CaptureDevice.streams", std::nullopt, 1, "device get streams",
     "QZCapturePlugInErrorDomain code 202: Failed to get streams!{cause}"},
    {"TheInfraredStreamTellsNoPort", "CaptureStream.valueForProperty", "PortType", 2, "front-infrared get PortType",
     "QZCapturePlugInErrorDomain code 202: Failed to find stream!"},
    {"ControlIsRefused", "CaptureDevice.requestControlOfStreams", std::nullopt, 1,
     "device request control (front-infrared)",
     "QZCapturePlugInErrorDomain code 203: Failed to request the ferrin stream!{cause}"},
    {"TheLightIsRefused", kSet, "InfraredLightSourceConfiguration", 1,
     "front-infrared set InfraredLightSourceConfiguration = {Mode = 2; StructuredLightCurrent = 0; "
     "StructuredLightPattern = 1}",
     "QZCapturePlugInErrorDomain code 212: Failed to configure structured light!{cause}"},
    {"MultipleOutputsAreRefused", kSet, "MultipleOutputSupportEnabled", 1,
     "front-infrared set MultipleOutputSupportEnabled = 1",
     "QZCapturePlugInErrorDomain code 208: Failed to enable multiple outputs.{cause}"},
    {"TheFormatIsRefused", kSet, "FormatIndex", 1, "front-infrared set FormatIndex = 0",
     "QZCapturePlugInErrorDomain code 209: Failed to set format index 0.{cause}"},
    {"TheMinimumFrameRateIsRefused", kSet, "MinimumFrameRate", 1, "front-infrared set MinimumFrameRate = 30",
     "QZCapturePlugInErrorDomain code 207: Failed to set min frame rate.{cause}"},
    {"TheMaximumFrameRateIsRefused", kSet, "MaximumFrameRate", 1, "front-infrared set MaximumFrameRate = 30",
     "QZCapturePlugInErrorDomain code 207: Failed to set max frame rate.{cause}"},
    {"TheOutputIsNotConfigured", kSet, "VideoOutputConfigurations", 1,
     "front-infrared set VideoOutputConfigurations = {PrimaryScaler = {AttachRaw = 1}}",
     "QZCapturePlugInErrorDomain code 208: Failed to configure primary scalar.{cause}"},
    {"TheOutputIsNotEnabled", kSet, "VideoOutputsEnabled", 1,
     "front-infrared set VideoOutputsEnabled = {PrimaryScaler = 1}",
     "QZCapturePlugInErrorDomain code 208: Failed to enable primary scalar.{cause}"},
    {"AutomaticExposureStaysOn", kSet, "AEEnabled", 1, "front-infrared set AEEnabled = 0",
     "QZCapturePlugInErrorDomain code 211: Failed to diable AE.{cause}"},
    {"TheHandlersAreRefused", kSet, "VideoOutputHandlers", 1,
     "front-infrared set VideoOutputHandlers = {PrimaryScaler = {PixelBufferHandler = <PixelBufferHandler>; "
     "EventHandler = <EventHandler>}}",
     "QZCapturePlugInErrorDomain code 208: Failed to set callback handlers.{cause}"},
    {"ThereAreNoChannels", "ReportFacility.reportWithOnlySimpleChannels", std::nullopt, 1,
     "ReportFacility reportWithOnlySimpleChannels",
     "QZTelemonErrorDomain code 100: Cannot get Telemon before streaming.{cause}"},
    {"ThereIsNoSnapshotBefore", "ReportChannelSet.snapshot", std::nullopt, 1, "ReportChannelSet snapshot",
     "QZTelemonErrorDomain code 100: Cannot get Telemon before streaming.{cause}"},
    {"TheStreamDoesNotStart", "CaptureStream.start", std::nullopt, 1, "front-infrared start",
     "QZCapturePlugInErrorDomain code 204: Failed to start streaming ferrin.{cause}"},
    {"TheErrorCountersAreNotTold", "CaptureStream.valueForProperty", "ErrorCounters", 1,
     "front-infrared get ErrorCounters",
     "QZCapturePlugInErrorDomain code 210: Failed to get error counters from ferrin.", "front-infrared stop\n",
     kTimeoutLater},
    {"TheStreamDoesNotStop", "CaptureStream.stop", std::nullopt, 1, "front-infrared stop",
     "QZCapturePlugInErrorDomain code 205: Failed to stop stream!",
     "log debug: There was an error stopping the stream.\n", kFramesAndTimeoutLater, kTornDown,
     "front-infrared 4, 5, 6, 7"},
    {"ThereIsNoSnapshotAfter", "ReportChannelSet.snapshot", std::nullopt, 2, "ReportChannelSet snapshot",
     "QZTelemonErrorDomain code 100: Cannot get Telemon delta after streaming.{cause}", "", kTimeoutLater},
    {"ThereIsNoDelta", "ReportSnapshot.snapshotWithBaseline", std::nullopt, 1, "ReportSnapshot snapshotWithBaseline",
     "QZTelemonErrorDomain code 100: Cannot get Telemon delta after streaming.{cause}", "", kTimeoutLater},
};

// The healthy run before the line stands for the nth time.
std::string healthyUpTo(std::string_view line, std::uint64_t occurrence = 1) {
  const std::string wanted = '\n' + std::string(line) + '\n';
  const std::string run = '\n' + kHealthyRun;
  std::size_t at = run.find(wanted);
  while (--occurrence != 0) at = run.find(wanted, at + 1);
  EXPECT_NE(at, std::string::npos) << line;
  return run.substr(1, at);
}

Fault faultOn(const char* operation, std::optional<std::string> property, std::uint64_t occurrence, bool hasError) {
  Fault fault;
  fault.operation = operation;
  fault.property = std::move(property);
  fault.occurrence = occurrence;
  return failing(fault, hasError);
}

// Checks the trace with and without an error variable and for several seeds.
void expectTold(const std::string& told, const Scenario& scenario, const std::vector<Fault>& faults) {
  for (const std::uint64_t seed : {1U, 2U, 3U}) {
    ProjectorRequest request;
    request.seed = seed;
    const ProjectorRun withPlace = runProjector(scenario, request, faults, ErrorPlace::kGiven);
    EXPECT_EQ(withPlace.told, told);
    EXPECT_EQ(withPlace.fired, std::vector<std::uint64_t>(faults.size(), 1));
    const ProjectorRun withoutPlace = runProjector(scenario, request, faults, ErrorPlace::kNone);
    EXPECT_EQ(withoutPlace.told, toldWithoutPlace(told));
    EXPECT_EQ(withoutPlace.fired, std::vector<std::uint64_t>(faults.size(), 1));
  }
}

TEST(TesselFaultRun, StreamsCountsAndTakesTheDelta) { expectTold(kHealthyRun, projectorScenario(), {}); }

class FailingTesselFaultRun : public testing::TestWithParam<FailingStep> {};

TEST_P(FailingTesselFaultRun, IsToldExactly) {
  const FailingStep& step = GetParam();
  const bool isSecondSnapshot = std::string_view(step.line) == "ReportChannelSet snapshot" && step.occurrence == 2;
  for (const bool hasError : {true, false}) {
    SCOPED_TRACE(hasError ? "with an error of its own" : "without an error of its own");
    std::string told = healthyUpTo(step.line, isSecondSnapshot ? 2 : 1);
    told += step.line + std::string(" -> failed\n") + step.underway + "returned nothing\nerror " + step.error;
    told += std::string("\nafterwards\n") + step.afterwards + step.teardown + "buffers held: " + step.held + '\n';
    replaceAll(told, "{cause}", benchCause(hasError));
    expectTold(told, projectorScenario(), {faultOn(step.operation, step.property, step.occurrence, hasError)});
  }
}

INSTANTIATE_TEST_SUITE_P(Steps, FailingTesselFaultRun, testing::ValuesIn(kSteps),
                         [](const testing::TestParamInfo<FailingStep>& step) { return step.param.name; });

// The error of the failed call remains stored.
TEST(TesselFaultRun, GoesOnBehindAStreamThatTellsNoPort) {
  for (const bool hasError : {true, false}) {
    std::string told = kHealthyRun;
    replaceAll(told, "front get PortType\n", "front get PortType -> failed\n");
    told.replace(told.find("error untouched"), std::string_view("error untouched").size(),
                 std::string("error QZCapturePlugInErrorDomain code 202: Failed to get stream port type!") +
                     benchCause(hasError));
    expectTold(told, projectorScenario(), {faultOn("CaptureStream.valueForProperty", "PortType", 1, hasError)});
  }
}

TEST(TesselFaultRun, FindsNoStreamWhenNoneTellsItsPort) {
  expectTold(healthyUpTo("front get PortType") + R"(front get PortType -> failed
front-infrared get PortType -> failed
returned nothing
error QZCapturePlugInErrorDomain code 202: Failed to find stream!
afterwards
)" + toldEnd(),
             projectorScenario(),
             {faultOn("CaptureStream.valueForProperty", "PortType", 1, true),
              faultOn("CaptureStream.valueForProperty", "PortType", 2, true)});
}

TEST(TesselFaultRun, FindsNoStreamOnADeviceWithoutAny) {
  Scenario scenario = projectorScenario();
  scenario.cameras.clear();
  expectTold(healthyUpTo("front get PortType") + R"(returned nothing
error QZCapturePlugInErrorDomain code 202: Failed to find stream!
afterwards
)" + toldEnd(),
             scenario, {});
}

TEST(TesselFaultRun, LooksNoFurtherThanTheStreamOfItsPort) {
  Scenario scenario = projectorScenario();
  std::swap(scenario.cameras[0], scenario.cameras[1]);
  std::string told = kHealthyRun;
  replaceAll(told, "front get PortType\n", "");
  expectTold(told, scenario, {});
}

TEST(TesselFaultRun, StopsEvenIfNothingCanBeReadAnymoreAndNothingStops) {
  std::string told = healthyUpTo("front-infrared get ErrorCounters") + R"(front-infrared get ErrorCounters -> failed
front-infrared stop -> failed
log debug: There was an error stopping the stream.
returned nothing
error QZCapturePlugInErrorDomain code 205: Failed to stop stream!
afterwards
)" + kFramesAndTimeoutLater +
                     toldEnd("front-infrared 4, 5, 6, 7");
  expectTold(told, projectorScenario(),
             {faultOn("CaptureStream.valueForProperty", "ErrorCounters", 1, true),
              faultOn("CaptureStream.stop", std::nullopt, 1, true)});
}

TEST(TesselFaultRun, TellsWhenTheDeviceIsNotInvalidated) {
  for (const bool hasError : {true, false}) {
    std::string told = kHealthyRun;
    told.replace(told.find("device invalidate"), std::string::npos,
                 std::string("device invalidate -> failed\nnot torn down\nerror QZCapturePlugInErrorDomain code 200: "
                             "Failed to invalidate the capture device.") +
                     benchCause(hasError) + "\nbuffers held: none\n");
    expectTold(told, projectorScenario(), {faultOn("CaptureDevice.invalidate", std::nullopt, 1, hasError)});
  }
}

}  // namespace
}  // namespace quazor
