// Runs with unusual ports, formats and parameters, and with errors stored by successful calls.
#include "diagnostics/projector_fault/tessel_fault_experiment.h"

#include "backends/simulated/simulated_phone.h"
#include "platform/capture_keys.h"
#include "tests/support/scripted_capture.h"
#include "tests/sweeps/projector_bench.h"

#include <gtest/gtest.h>

#include <limits>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <utility>

namespace quazor {
namespace {

class TesselFaultRunEdges : public testing::Test {
 protected:
  std::shared_ptr<QZTesselFaultExperiment> makeExperiment(std::string_view port) {
    phone.observeCalls(addingTo(transcript));
    return std::make_shared<QZTesselFaultExperiment>(std::string(port), phone.platform());
  }
  std::string run(QZTesselFaultExperiment& experiment) {
    return runAndTell(experiment, ErrorPlace::kGiven, transcript);
  }

  RunTranscript transcript;
  SimulatedPhone phone{projectorScenario(), PhoneTime::kVirtual, 1};
};

void expectContains(const std::string& told, std::string_view part) {
  EXPECT_NE(told.find(part), std::string::npos) << told;
}

TEST_F(TesselFaultRunEdges, StreamsThePortItWasMadeFor) {
  const auto experiment = makeExperiment(port_type::FrontFacingCamera);
  ASSERT_TRUE(experiment->setupWithParameters({{"frameCount", 2}, {"timeout", 0.01}}, nullptr, nullptr));
  const std::string told = run(*experiment);
  EXPECT_TRUE(
      told.starts_with("service defaultPlugIn\nplug-in get device\ndevice get streams\nfront get PortType\n"
                       "device request control (front)\n"))
      << told;
  // This camera has no projector.
  expectContains(told,
                 "front set InfraredLightSourceConfiguration = {Mode = 2; StructuredLightCurrent = 0; "
                 "StructuredLightPattern = 1} -> failed\n");
}

TEST_F(TesselFaultRunEdges, FindsNoStreamOfAnUnknownPort) {
  for (const std::string_view port : {"", "FrontFacing", "FrontFacingInfraredCamera ", "frontFacingInfraredCamera"}) {
    const std::string told = run(*makeExperiment(port));
    EXPECT_TRUE(
        told.ends_with("front get PortType\nfront-infrared get PortType\nreturned nothing\n"
                       "error QZCapturePlugInErrorDomain code 202: Failed to find stream!\n"))
        << told;
  }
}

TEST_F(TesselFaultRunEdges, SetsTheFormatIndexItWasGiven) {
  const auto experiment = makeExperiment(port_type::FrontFacingInfraredCamera);
  experiment->setFormatIndex(1);
  expectContains(run(*experiment), "front-infrared set FormatIndex = 1\nfront-infrared set MinimumFrameRate = 30\n");
}

TEST_F(TesselFaultRunEdges, TellsTheFormatIndexThatWasRefused) {
  const auto experiment = makeExperiment(port_type::FrontFacingInfraredCamera);
  experiment->setFormatIndex(std::numeric_limits<std::uint64_t>::max());
  const std::string told = run(*experiment);
  expectContains(told, "front-infrared set FormatIndex = 18446744073709551615 -> failed\nreturned nothing\n");
  expectContains(told,
                 "error QZCapturePlugInErrorDomain code 209: Failed to set format index 18446744073709551615., "
                 "caused by SimulatedCaptureErrorDomain code 6: ");
}

TEST_F(TesselFaultRunEdges, KeepsWhatARefusedSetupDidNotReach) {
  const auto experiment = makeExperiment(port_type::FrontFacingInfraredCamera);
  ASSERT_TRUE(experiment->setupWithParameters({{"frameCount", 2}, {"timeout", 0.2}}, nullptr, nullptr));
  ASSERT_FALSE(experiment->setupWithParameters({{"frameCount", -1}, {"timeout", 0.01}}, nullptr, nullptr));
  const std::string told = run(*experiment);
  expectContains(told, "log debug: Frame 2 is the last frame.\n");
  expectContains(told, "FrameCount = 2 frames\n");
}

TEST_F(TesselFaultRunEdges, KeepsTheFrameCountOfASetupWithABadTimeout) {
  const auto experiment = makeExperiment(port_type::FrontFacingInfraredCamera);
  ASSERT_TRUE(experiment->setupWithParameters({{"frameCount", 2}, {"timeout", 0.2}}, nullptr, nullptr));
  ASSERT_FALSE(experiment->setupWithParameters({{"frameCount", 4}, {"timeout", -1}}, nullptr, nullptr));
  const std::string told = run(*experiment);
  expectContains(told, "log debug: Frame 4 is the last frame.\n");
  expectContains(told, "FrameCount = 4 frames\n");
}

TEST_F(TesselFaultRunEdges, ReplacesTheErrorOfAStreamWithoutAPortWhenItFails) {
  Fault port;
  port.operation = "CaptureStream.valueForProperty";
  port.property = "PortType";
  port.occurrence = 1;
  phone.addFault(port);
  Fault control;
  control.operation = "CaptureDevice.requestControlOfStreams";
  control.action = FaultAction::kNothing;
  phone.addFault(control);
  const std::string told = run(*makeExperiment(port_type::FrontFacingInfraredCamera));
  EXPECT_TRUE(told.ends_with("error QZCapturePlugInErrorDomain code 203: Failed to request the ferrin stream!\n"))
      << told;
}

// A service that stores an error on every success and none on a failure; its stream rejects a property, or start().
std::shared_ptr<CaptureService> makeMisleadingCapture(const std::string& refused) {
  const CaptureScript mislead = [](const ScriptedCall& call) {
    if (call.operation == "stop") {
      EXPECT_EQ(call.error, nullptr);
    }
    if (call.error != nullptr) {
      EXPECT_EQ(*call.error, nullptr) << "a call was given a place that still holds an error";
    }
    if (call.succeeds) storeError(call.error, makeError("MisleadingDomain", 1, "All went well."));
    return call.succeeds;
  };
  auto stream = std::make_shared<ScriptedStream>("stream", mislead);
  stream->properties.set(capture_key::PortType, port_type::FrontFacingInfraredCamera);
  stream->properties.set(capture_key::ErrorCounters, Dictionary());
  stream->refused = {refused};
  auto device = std::make_shared<ScriptedDevice>("device", mislead);
  device->members = CaptureStreams{std::move(stream)};
  return std::make_shared<ScriptedCapture>(std::move(device), mislead);
}

TEST_F(TesselFaultRunEdges, BlamesNoErrorOfACallThatWentWell) {
  const struct {
    const char* refused;
    const char* told;
  } rows[] = {
      {"nothing", "returned a result\nerror untouched\nFrameCount = 0 frames\n"},
      {"InfraredLightSourceConfiguration",
       "error QZCapturePlugInErrorDomain code 212: Failed to configure structured light!\n"},
      {"MultipleOutputSupportEnabled",
       "error QZCapturePlugInErrorDomain code 208: Failed to enable multiple outputs.\n"},
      {"FormatIndex", "error QZCapturePlugInErrorDomain code 209: Failed to set format index 0.\n"},
      {"MinimumFrameRate", "error QZCapturePlugInErrorDomain code 207: Failed to set min frame rate.\n"},
      {"MaximumFrameRate", "error QZCapturePlugInErrorDomain code 207: Failed to set max frame rate.\n"},
      {"VideoOutputConfigurations", "error QZCapturePlugInErrorDomain code 208: Failed to configure primary scalar.\n"},
      {"VideoOutputsEnabled", "error QZCapturePlugInErrorDomain code 208: Failed to enable primary scalar.\n"},
      {"AEEnabled", "error QZCapturePlugInErrorDomain code 211: Failed to diable AE.\n"},
      {"VideoOutputHandlers", "error QZCapturePlugInErrorDomain code 208: Failed to set callback handlers.\n"},
      {"start", "error QZCapturePlugInErrorDomain code 204: Failed to start streaming ferrin.\n"},
  };
  for (const auto& row : rows) {
    SCOPED_TRACE(row.refused);
    Platform platform = phone.platform();
    platform.capture = makeMisleadingCapture(row.refused);
    const auto experiment = std::make_shared<QZTesselFaultExperiment>(platform);
    expectContains(run(*experiment), row.told);
  }
}

}  // namespace
}  // namespace quazor
