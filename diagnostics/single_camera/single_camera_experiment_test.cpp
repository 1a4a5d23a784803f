// Runs on simulated phones with small faults.
#include "diagnostics/single_camera/single_camera_experiment.h"

#include "backends/simulated/simulated_phone.h"
#include "diagnostics/single_camera/single_camera_names.h"
#include "tests/support/run_transcript.h"
#include "tests/support/shipped_scenario.h"

#include <gtest/gtest.h>

#include <cmath>
#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace quazor {
namespace {

using namespace single_camera;

// A call that fails.
Fault failing(std::string operation, std::optional<std::string> property = {},
              std::optional<std::uint64_t> occurrence = {}) {
  Fault fault;
  fault.operation = std::move(operation);
  fault.property = std::move(property);
  fault.occurrence = occurrence;
  return fault;
}

class SingleCameraExperimentTest : public testing::Test {
 protected:
  Camera& camera() { return scenario.cameras.front(); }

  // The experiment is set up, run and torn down; its errors are left in `failure`.
  std::unique_ptr<QZExperimentResult> run(const Dictionary& parameters = {}) {
    phone = std::make_unique<SimulatedPhone>(scenario, PhoneTime::kVirtual, 1);
    QZSingleCameraExperiment experiment(phone->platform());
    EXPECT_TRUE(experiment.setupWithParameters(parameters, nullptr, nullptr));
    auto result = experiment.run(&failure);
    EXPECT_TRUE(experiment.teardown(nullptr));
    EXPECT_TRUE(phone->buffersHeld().empty());
    return result;
  }

  double measured(std::string_view name, const Dictionary& parameters = {}) {
    const auto result = run(parameters);
    if (result == nullptr) {
      ADD_FAILURE() << errorChain(failure);
      return -1;
    }
    const Measurement* const measurement = result->measurements().find(name);
    if (measurement != nullptr) return measurement->value();
    ADD_FAILURE() << "no measurement " << name;
    return -1;
  }

  std::string refusal(Fault fault) {
    scenario.faults = {std::move(fault)};
    EXPECT_EQ(run(), nullptr);
    return errorChain(failure);
  }

  Scenario scenario = shippedScenario("healthy");
  std::unique_ptr<SimulatedPhone> phone;
  DiagnosticErrorPtr failure;
};

TEST_F(SingleCameraExperimentTest, MeasuresAHealthyCamera) {
  const auto result = run();
  ASSERT_NE(result, nullptr) << errorChain(failure);
  const auto& measurements = result->measurements();
  EXPECT_EQ(*measurements.find(kFrames), Measurement(90, QZDimensionlessUnit::frames()));
  EXPECT_EQ(measurements.find(kRequestedFrameRate)->value(), 30);
  EXPECT_NEAR(measurements.find(kFrameRate)->value(), 30, 1e-6);
  EXPECT_EQ(measurements.find(kFrameRate)->unit().symbol(), "frames/s");
  EXPECT_EQ(measurements.find(kMissingFrames)->value(), 0);
  EXPECT_EQ(measurements.find(kUntimedFrames)->value(), 0);
  EXPECT_EQ(measurements.find(kBackwardTimeStamps)->value(), 0);
  EXPECT_NEAR(measurements.find(kJitter)->value(), 0, 1e-3);
  EXPECT_LT(measurements.find(kSilenceAtEnd)->value(), 34);
  EXPECT_EQ(measurements.find("Errors.I2CErrorCount")->value(), 0);
}

TEST_F(SingleCameraExperimentTest, StreamsForTheDuration) { EXPECT_EQ(measured(kFrames, {{"duration", 10}}), 300); }

TEST_F(SingleCameraExperimentTest, AsksForTheFrameRate) {
  EXPECT_NEAR(measured(kFrameRate, {{"frameRate", 15}}), 15, 1e-6);
  EXPECT_NEAR(measured(kFrameRate, {{"frameRate", 60}, {"formatIndex", 3}}), 60, 1e-3);
}

TEST_F(SingleCameraExperimentTest, StreamsTheCameraAtThePosition) {
  scenario.cameras[1].deliversFrames = false;
  EXPECT_EQ(measured(kFrames, {{"camera", 1}}), 0);
  EXPECT_EQ(measured(kFrames, {{"camera", 2}}), 90);
}

TEST_F(SingleCameraExperimentTest, SaysWhichCameraItWas) {
  const auto said = [this](const Dictionary& parameters) {
    const auto result = run(parameters);
    const Value* const text = result == nullptr ? nullptr : result->auxiliaryData().find(kCamera);
    return text == nullptr ? "nothing" : defaultText(*text);
  };
  EXPECT_EQ(said({}), "0, BackFacingCamera, back-wide");
  EXPECT_EQ(said({{"camera", 3}}), "3, FrontFacingCamera, front");
  // It is judged nevertheless.
  scenario.faults = {failing("CaptureStream.valueForProperty", "CameraName")};
  EXPECT_EQ(said({}), "0, BackFacingCamera");
  scenario.faults = {failing("CaptureStream.valueForProperty", "PortType")};
  EXPECT_EQ(said({}), "0, back-wide");
}

TEST_F(SingleCameraExperimentTest, MeasuresARateOfTheCamerasOwn) {
  camera().actualFrameRate = 20;
  EXPECT_NEAR(measured(kFrameRate), 20, 1e-6);
}

TEST_F(SingleCameraExperimentTest, CountsMissingFrames) {
  camera().droppedFrames = {3, 4, 17};
  EXPECT_EQ(measured(kMissingFrames), 3);
}

TEST_F(SingleCameraExperimentTest, MeasuresTheSilenceOfACameraThatDeliversNothing) {
  camera().deliversFrames = false;
  EXPECT_EQ(measured(kSilenceAtStart), 3000);
  EXPECT_EQ(measured(kSilenceAtEnd), 3000);
  EXPECT_EQ(measured(kFrameRate), 0);
}

TEST_F(SingleCameraExperimentTest, MeasuresTheSilenceBeforeTheFirstFrameAndAfterTheLast) {
  for (std::uint64_t frame = 0; frame < 30; ++frame) camera().droppedFrames.insert(frame);
  for (std::uint64_t frame = 60; frame < 90; ++frame) camera().droppedFrames.insert(frame);
  EXPECT_NEAR(measured(kSilenceAtStart), 1000, 34);
  EXPECT_NEAR(measured(kSilenceAtEnd), 1000, 34);
  EXPECT_EQ(measured(kMissingFrames), 0);
}

TEST_F(SingleCameraExperimentTest, MeasuresTheGrowthOfErrorCounters) {
  camera().errorCounters->set("MIPIErrorCount", 7);
  EXPECT_EQ(measured("Errors.MIPIErrorCount"), 0);
  camera().errorCounterGrowth.set("MIPIErrorCount", 2);
  EXPECT_EQ(measured("Errors.MIPIErrorCount"), 6);
}

TEST_F(SingleCameraExperimentTest, TakesOneCameraOnly) {
  scenario.cameras.resize(1);
  scenario.groups.clear();
  EXPECT_EQ(measured(kFrames), 90);
}

TEST_F(SingleCameraExperimentTest, NamesWhatFails) {
  scenario.device.plugInLoads = false;
  EXPECT_EQ(run(), nullptr);
  EXPECT_EQ(errorChain(failure), "SingleCameraErrorDomain code 1: There is no capture device.");
  scenario.device = {};
  const auto begins = [](const std::string& text, std::string_view beginning) { return text.starts_with(beginning); };
  const std::vector<std::pair<Fault, std::string_view>> rows = {
      {failing("CapturePlugIn.device"), "SingleCameraErrorDomain code 1: There is no capture device., caused by "},
      {failing("CaptureDevice.streams"),
       "SingleCameraErrorDomain code 2: There is no camera at position 0: the device has 0., caused by "},
      {failing("CaptureDevice.requestControlOfStreams"),
       "SingleCameraErrorDomain code 3: The camera cannot be controlled., caused by "},
      {failing("CaptureStream.setValue", "MinimumFrameRate"),
       "SingleCameraErrorDomain code 4: The camera does not accept MinimumFrameRate = 30., caused by "},
      {failing("CaptureStream.setValue", "MaximumFrameRate"),
       "SingleCameraErrorDomain code 4: The camera does not accept MaximumFrameRate = 30., caused by "},
      {failing("CaptureStream.setValue", "VideoOutputsEnabled"),
       "SingleCameraErrorDomain code 4: The camera does not accept VideoOutputsEnabled = "},
      {failing("CaptureStream.setValue", "VideoOutputHandlers"),
       "SingleCameraErrorDomain code 4: The camera does not accept VideoOutputHandlers = "},
      {failing("CaptureStream.start"), "SingleCameraErrorDomain code 5: The camera does not start., caused by "},
      {failing("CaptureStream.stop"), "SingleCameraErrorDomain code 6: The camera does not stop., caused by "},
      {failing("CaptureStream.valueForProperty", "ErrorCounters", 1),
       "SingleCameraErrorDomain code 7: The camera's error counters cannot be read., caused by "},
      {failing("CaptureStream.valueForProperty", "ErrorCounters", 2),
       "SingleCameraErrorDomain code 7: The camera's error counters cannot be read., caused by "},
  };
  for (const auto& [fault, beginning] : rows) {
    EXPECT_PRED2(begins, refusal(fault), beginning) << fault.operation;
  }
}

TEST_F(SingleCameraExperimentTest, RefusesACameraThatIsNotThere) {
  EXPECT_EQ(run({{"camera", 5}}), nullptr);
  EXPECT_EQ(errorChain(failure), "SingleCameraErrorDomain code 2: There is no camera at position 5: the device has 5.");
}

TEST_F(SingleCameraExperimentTest, TellsThatTheDeviceIsNotReleased) {
  scenario.faults = {failing("CaptureDevice.invalidate")};
  phone = std::make_unique<SimulatedPhone>(scenario, PhoneTime::kVirtual, 1);
  QZSingleCameraExperiment experiment(phone->platform());
  EXPECT_NE(experiment.run(nullptr), nullptr);
  EXPECT_FALSE(experiment.teardown(&failure));
  EXPECT_TRUE(errorChain(failure).starts_with(
      "SingleCameraErrorDomain code 1: The capture device cannot be released., caused by "));
}

TEST_F(SingleCameraExperimentTest, RefusesParametersOutOfRange) {
  const std::pair<Dictionary, std::string_view> rows[] = {
      {{{"duration", 0.5}}, "duration must be from 1 s to 86400 s, not 0.5"},
      {{{"duration", std::nan("")}}, "duration must be from 1 s to 86400 s, not nan"},
      {{{"duration", 86401}}, "duration must be from 1 s to 86400 s, not 86401"},
      {{{"frameRate", 0}}, "frameRate must be above 0 and at most 10000, not 0"},
      {{{"frameRate", 10001}}, "frameRate must be above 0 and at most 10000, not 10001"},
      {{{"camera", -1}}, "camera must be a whole number from 0, not -1"},
      {{{"camera", 0.5}}, "camera must be a whole number from 0, not 0.5"},
      {{{"formatIndex", 1.5}}, "formatIndex must be a whole number from 0, not 1.5"},
  };
  for (const auto& [parameters, message] : rows) {
    phone = std::make_unique<SimulatedPhone>(scenario, PhoneTime::kVirtual, 1);
    QZSingleCameraExperiment experiment(phone->platform());
    EXPECT_FALSE(experiment.setupWithParameters(parameters, nullptr, &failure));
    EXPECT_EQ(failure->domain(), QZErrorDomain);
    EXPECT_EQ(failure->code(), 5);
    EXPECT_EQ(failure->localizedDescription(), message);
  }
}

}  // namespace
}  // namespace quazor
