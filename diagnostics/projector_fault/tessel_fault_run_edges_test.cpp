// Runs for other ports, formats and parameters than the usual ones, and errors that a call left behind.
#include "diagnostics/projector_fault/tessel_fault_experiment.h"

#include "backends/simulated/simulated_phone.h"
#include "platform/capture_keys.h"
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
    phone.observeCalls([this](const PlatformCall& call) {
      transcript.addCall(call.operation, call.object, call.detail, call.succeeded);
    });
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
  // It has no projector to configure.
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

// A stream that leaves an error behind with every success, and fails without one at `refusedKey`.
class MisleadingStream final : public CaptureStream {
 public:
  explicit MisleadingStream(std::string refusedKey) : refusedKey_(std::move(refusedKey)) {}

  std::string description() const override { return "misleading stream"; }
  std::optional<Value> valueForProperty(std::string_view key, DiagnosticErrorPtr* error) override {
    mislead(error);
    if (key == capture_key::PortType) return Value(port_type::FrontFacingInfraredCamera);
    return Value(Dictionary{});
  }
  bool setValue(const Value& /*value*/, std::string_view key, DiagnosticErrorPtr* error) override {
    if (key == refusedKey_) return false;
    mislead(error);
    return true;
  }
  bool start(DiagnosticErrorPtr* error) override {
    if (refusedKey_ == "start") return false;
    mislead(error);
    return true;
  }
  bool stop(DiagnosticErrorPtr* error) override {
    EXPECT_EQ(error, nullptr);
    return true;
  }

 private:
  static void mislead(DiagnosticErrorPtr* error) {
    if (error != nullptr) {
      EXPECT_EQ(*error, nullptr) << "a call was given a place that still holds an error";
    }
    storeError(error, makeError("MisleadingDomain", 1, "All went well."));
  }

  std::string refusedKey_;
};

class MisleadingDevice final : public CaptureDevice {
 public:
  explicit MisleadingDevice(std::shared_ptr<CaptureStream> stream) : stream_(std::move(stream)) {}

  std::string description() const override { return "misleading device"; }
  std::optional<Value> valueForProperty(std::string_view, DiagnosticErrorPtr*) override { return std::nullopt; }
  bool setValue(const Value&, std::string_view, DiagnosticErrorPtr*) override { return false; }
  std::optional<CaptureStreams> streams(DiagnosticErrorPtr* error) override {
    storeError(error, makeError("MisleadingDomain", 2, "All went well."));
    return CaptureStreams{stream_};
  }
  std::optional<SynchronizedStreamsGroups> synchronizedStreamsGroups(DiagnosticErrorPtr*) override {
    return std::nullopt;
  }
  bool requestControlOfStreams(const CaptureStreams&, DiagnosticErrorPtr* error) override {
    storeError(error, makeError("MisleadingDomain", 3, "All went well."));
    return true;
  }
  bool relinquishControlOfStreams(const CaptureStreams&, DiagnosticErrorPtr*) override { return false; }
  bool invalidate(DiagnosticErrorPtr*) override { return true; }

 private:
  std::shared_ptr<CaptureStream> stream_;
};

class MisleadingCapture final : public CaptureService, public CapturePlugIn {
 public:
  explicit MisleadingCapture(std::string refusedKey)
      : device_(std::make_shared<MisleadingDevice>(std::make_shared<MisleadingStream>(std::move(refusedKey)))) {}

  std::string description() const override { return "misleading plug-in"; }
  std::shared_ptr<CapturePlugIn> createPlugIn() override { return nullptr; }
  // This very object, which the platform keeps.
  std::shared_ptr<CapturePlugIn> defaultPlugIn() override {
    return std::shared_ptr<CapturePlugIn>(std::shared_ptr<void>(), this);
  }
  std::shared_ptr<CaptureDevice> device(DiagnosticErrorPtr* error) override {
    storeError(error, makeError("MisleadingDomain", 4, "All went well."));
    return device_;
  }

 private:
  std::shared_ptr<CaptureDevice> device_;
};

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
    platform.capture = std::make_shared<MisleadingCapture>(row.refused);
    const auto experiment = std::make_shared<QZTesselFaultExperiment>(platform);
    expectContains(run(*experiment), row.told);
  }
}

}  // namespace
}  // namespace quazor
