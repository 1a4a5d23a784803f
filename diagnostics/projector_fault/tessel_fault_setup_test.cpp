// Creation, description, setup and teardown of the projector fault experiment, without a run.
#include "diagnostics/projector_fault/tessel_fault_experiment.h"

#include "diagnostics/projector_fault/fixed_clock_for_tests.h"
#include "diagnostics/report_channels/expectations_for_tests.h"
#include "tests/support/scripted_capture.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <chrono>
#include <cstdint>
#include <limits>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace quazor {
namespace {

using testing::ElementsAre;

// All calls to the services, in order.
using Calls = std::vector<std::string>;

class FakeQueue final : public SerialQueue {
 public:
  explicit FakeQueue(std::shared_ptr<Calls> calls) : calls_(std::move(calls)) {}

  void async(Task /*task*/) override { calls_->push_back("async"); }
  void asyncAfter(std::chrono::nanoseconds /*delay*/, Task /*task*/) override { calls_->push_back("asyncAfter"); }

 private:
  std::shared_ptr<Calls> calls_;
};

class FakeSemaphore final : public Semaphore {
 public:
  explicit FakeSemaphore(std::shared_ptr<Calls> calls) : calls_(std::move(calls)) {}

  void signal() override { calls_->push_back("signal"); }
  void wait() override { calls_->push_back("wait"); }

 private:
  std::shared_ptr<Calls> calls_;
};

class FakeConcurrency final : public Concurrency {
 public:
  explicit FakeConcurrency(std::shared_ptr<Calls> calls) : calls_(std::move(calls)) {}

  std::shared_ptr<SerialQueue> makeSerialQueue(std::string_view label, QualityOfService quality) override {
    std::string call = "queue " + std::string(label);
    switch (quality) {
      case QualityOfService::kUserInteractive: call += ", user-interactive"; break;
      case QualityOfService::kDefault: call += ", default"; break;
      case QualityOfService::kBackground: call += ", background"; break;
    }
    calls_->push_back(call);
    auto queue = std::make_shared<FakeQueue>(calls_);
    made.push_back(queue);
    return queue;
  }
  std::shared_ptr<Semaphore> makeSemaphore(long count) override {
    calls_->push_back("semaphore " + std::to_string(count));
    auto semaphore = std::make_shared<FakeSemaphore>(calls_);
    made.push_back(semaphore);
    return semaphore;
  }

  std::vector<std::weak_ptr<void>> made;

 private:
  std::shared_ptr<Calls> calls_;
};

class FakeReportFacility final : public ReportFacility {
 public:
  explicit FakeReportFacility(std::shared_ptr<Calls> calls) : calls_(std::move(calls)) {}

  std::shared_ptr<const ReportChannelSet> reportWithOnlySimpleChannels(DiagnosticErrorPtr* /*error*/) override {
    calls_->push_back("reportWithOnlySimpleChannels");
    return nullptr;
  }

 private:
  std::shared_ptr<Calls> calls_;
};

class TesselFaultExperimentSetup : public testing::Test {
 protected:
  std::shared_ptr<QZTesselFaultExperiment> makeExperiment() const {
    return std::make_shared<QZTesselFaultExperiment>(platform);
  }
  // An experiment with `device` and a stream; `calls` is empty afterwards.
  std::shared_ptr<QZTesselFaultExperiment> makeOpenExperiment() const {
    auto experiment = makeExperiment();
    experiment->setDevice(device);
    experiment->setStream(std::make_shared<ScriptedStream>("stream", script));
    calls->clear();
    return experiment;
  }

  const std::shared_ptr<Calls> calls = std::make_shared<Calls>();
  bool invalidates = true;
  DiagnosticErrorPtr invalidateError;  // stored by invalidate() whether it succeeds or fails
  const CaptureScript script = [this](const ScriptedCall& call) {
    calls->push_back(std::string(call.operation));
    if (call.operation != "invalidate") return false;
    if (invalidateError != nullptr) storeError(call.error, invalidateError);
    return invalidates;
  };
  const std::shared_ptr<FakeConcurrency> concurrency = std::make_shared<FakeConcurrency>(calls);
  const Platform platform{std::make_shared<ScriptedCapture>(nullptr, script), std::make_shared<FixedClock>(),
                          concurrency, std::make_shared<FakeReportFacility>(calls)};
  const std::shared_ptr<ScriptedDevice> device = std::make_shared<ScriptedDevice>("device", script);
  const DiagnosticErrorPtr earlier = earlierError();
  const DiagnosticErrorPtr deviceError = makeError("DeviceErrorDomain", -3, "The device is gone.");
};

TEST_F(TesselFaultExperimentSetup, IsMadeForTheFrontInfraredCamera) {
  const auto experiment = makeExperiment();
  EXPECT_EQ(experiment->port(), "FrontFacingInfraredCamera");
  EXPECT_EQ(experiment->formatIndex(), 0U);
  EXPECT_EQ(experiment->device(), nullptr);
  EXPECT_EQ(experiment->stream(), nullptr);
}

TEST_F(TesselFaultExperimentSetup, IsMadeForAnotherPortWhenAsked) {
  const auto experiment = std::make_shared<QZTesselFaultExperiment>("FrontFacingCamera", platform);
  EXPECT_EQ(experiment->port(), "FrontFacingCamera");
  EXPECT_EQ(experiment->formatIndex(), 0U);
  EXPECT_EQ(experiment->device(), nullptr);
  EXPECT_EQ(experiment->stream(), nullptr);
}

TEST_F(TesselFaultExperimentSetup, MakesASemaphoreAndThenTwoQueuesAndTouchesNoHardware) {
  const auto experiment = makeExperiment();
  ASSERT_EQ(calls->size(), 3U);
  EXPECT_EQ(calls->front(), "semaphore 0");
  EXPECT_THAT(Calls(calls->begin() + 1, calls->end()),
              testing::UnorderedElementsAre("queue QZTesselFaultExperiment.primaryScalar, user-interactive",
                                            "queue QZTesselFaultExperiment, background"));
}

TEST_F(TesselFaultExperimentSetup, UsesTheInstalledPlatformUnlessHandedAnother) {
  const Platform before = installedPlatform();
  installPlatform(platform);
  const auto plain = std::make_shared<QZTesselFaultExperiment>();
  const auto withPort = std::make_shared<QZTesselFaultExperiment>(std::string("FrontFacingCamera"));
  installPlatform(before);
  EXPECT_EQ(calls->size(), 6U);
  EXPECT_EQ(plain->port(), "FrontFacingInfraredCamera");
  EXPECT_EQ(withPort->port(), "FrontFacingCamera");
}

TEST_F(TesselFaultExperimentSetup, SetsItsProperties) {
  const auto experiment = makeExperiment();
  const auto stream = std::make_shared<ScriptedStream>("stream", script);
  experiment->setPort("BackFacingCamera");
  EXPECT_EQ(experiment->port(), "BackFacingCamera");
  experiment->setFormatIndex(std::numeric_limits<std::uint64_t>::max());
  EXPECT_EQ(experiment->formatIndex(), std::numeric_limits<std::uint64_t>::max());
  experiment->setDevice(device);
  EXPECT_EQ(experiment->device(), device);
  experiment->setStream(stream);
  EXPECT_EQ(experiment->stream(), stream);
  experiment->setDevice(nullptr);
  EXPECT_EQ(experiment->device(), nullptr);
  experiment->setStream(nullptr);
  EXPECT_EQ(experiment->stream(), nullptr);
}

TEST_F(TesselFaultExperimentSetup, OwnsWhatItHoldsUntilItGoes) {
  auto experiment = makeExperiment();
  auto heldDevice = std::make_shared<ScriptedDevice>("device", script);
  auto heldStream = std::make_shared<ScriptedStream>("stream", script);
  const std::weak_ptr<ScriptedDevice> weakDevice = heldDevice;
  const std::weak_ptr<ScriptedStream> weakStream = heldStream;
  experiment->setDevice(std::move(heldDevice));
  experiment->setStream(std::move(heldStream));
  ASSERT_EQ(concurrency->made.size(), 3U);
  EXPECT_FALSE(weakDevice.expired());
  EXPECT_FALSE(weakStream.expired());
  for (const auto& made : concurrency->made) EXPECT_FALSE(made.expired());
  calls->clear();
  experiment.reset();
  EXPECT_TRUE(weakDevice.expired());
  EXPECT_TRUE(weakStream.expired());
  for (const auto& made : concurrency->made) EXPECT_TRUE(made.expired());
  EXPECT_THAT(*calls, testing::IsEmpty());
}

TEST_F(TesselFaultExperimentSetup, DescribesItselfWithTwoRequiredParameters) {
  const QZDescription description = makeExperiment()->experimentDescription();
  EXPECT_EQ(description.summary(), "Stream the tessel camera in dense interleave for the requested duration.");
  std::vector<std::string> parameters;
  for (const auto& [name, parameter] : description.parameters()) {
    parameters.push_back(name + ": " + parameter.summary() + (parameter.required() ? " required" : " optional"));
  }
  EXPECT_THAT(parameters, ElementsAre("frameCount: The number of frames to capture. required",
                                      "timeout: The max time to wait for frameCount, in seconds. required"));
}

TEST_F(TesselFaultExperimentSetup, RefusesNegativeParametersAndNoOthers) {
  constexpr double kNotANumber = std::numeric_limits<double>::quiet_NaN();
  constexpr double kInfinity = std::numeric_limits<double>::infinity();
  constexpr const char* kBadFrameCount = "QZErrorDomain 5 frameCount cannot be negative!";
  constexpr const char* kBadTimeout = "QZErrorDomain 5 timeout cannot be negative!";
  const struct {
    const char* name;
    Dictionary parameters;
    const char* want;  // null if they are valid
  } rows[] = {
      {"usual values", {{"frameCount", 100}, {"timeout", 10.5}}, nullptr},
      {"zeros", {{"frameCount", 0}, {"timeout", 0}}, nullptr},
      {"none at all", {}, nullptr},
      {"no frame count", {{"timeout", 1}}, nullptr},
      {"no timeout", {{"frameCount", 1}}, nullptr},
      {"others are ignored", {{"FrameCount", -1}, {"Timeout", -1}, {"duration", -1}}, nullptr},
      {"a negative frame count", {{"frameCount", -1}, {"timeout", 1}}, kBadFrameCount},
      {"a negative frame count alone", {{"frameCount", -1}}, kBadFrameCount},
      {"the lowest frame count", {{"frameCount", std::numeric_limits<std::int64_t>::min()}}, kBadFrameCount},
      {"the highest frame count", {{"frameCount", std::numeric_limits<std::int64_t>::max()}}, nullptr},
      {"an unsigned frame count", {{"frameCount", std::uint64_t{0x7FFFFFFF'FFFFFFFF}}}, nullptr},
      {"one beyond the signed range", {{"frameCount", std::uint64_t{0x80000000'00000000}}}, kBadFrameCount},
      {"the highest unsigned", {{"frameCount", std::numeric_limits<std::uint64_t>::max()}}, kBadFrameCount},
      {"a frame count truncated to zero", {{"frameCount", -0.5}}, nullptr},
      {"a frame count truncated to minus one", {{"frameCount", -1.5}}, kBadFrameCount},
      {"a frame count as a float", {{"frameCount", -1.0F}}, kBadFrameCount},
      {"an endless frame count", {{"frameCount", kInfinity}}, nullptr},
      {"an endlessly negative frame count", {{"frameCount", -kInfinity}}, kBadFrameCount},
      {"a frame count that is not a number", {{"frameCount", kNotANumber}}, nullptr},
      {"a boolean frame count", {{"frameCount", true}}, nullptr},
      {"a frame count in words", {{"frameCount", "-1"}}, nullptr},
      {"a timeout just below zero", {{"frameCount", 1}, {"timeout", -0.5}}, kBadTimeout},
      {"a timeout barely below zero", {{"timeout", -std::numeric_limits<double>::denorm_min()}}, kBadTimeout},
      {"a negative timeout alone", {{"timeout", -1}}, kBadTimeout},
      {"a negative timeout as a float", {{"timeout", -0.5F}}, kBadTimeout},
      {"a timeout of minus zero", {{"timeout", -0.0}}, nullptr},
      {"an endless timeout", {{"timeout", kInfinity}}, nullptr},
      {"an endlessly negative timeout", {{"timeout", -kInfinity}}, kBadTimeout},
      {"a timeout that is not a number", {{"timeout", kNotANumber}}, nullptr},
      {"the highest unsigned timeout", {{"timeout", std::numeric_limits<std::uint64_t>::max()}}, nullptr},
      {"a timeout in words", {{"timeout", "-1"}}, nullptr},
      {"both negative", {{"timeout", -1}, {"frameCount", -1}}, kBadFrameCount},
  };
  for (const auto& row : rows) {
    SCOPED_TRACE(row.name);
    const auto experiment = makeExperiment();
    DiagnosticErrorPtr error = earlier;
    EXPECT_EQ(experiment->setupWithParameters(row.parameters, nullptr, &error), row.want == nullptr);
    if (row.want == nullptr) {
      EXPECT_EQ(error, earlier);
    } else {
      EXPECT_EQ(told(error), row.want);
      EXPECT_EQ(error->userInfo().size(), 1U);
    }
    EXPECT_EQ(makeExperiment()->setupWithParameters(row.parameters, nullptr, nullptr), row.want == nullptr);
  }
}

TEST_F(TesselFaultExperimentSetup, CanBeSetUpAgainAfterARefusal) {
  const auto experiment = makeExperiment();
  ASSERT_FALSE(experiment->setupWithParameters({{"frameCount", -1}}, nullptr, nullptr));
  EXPECT_TRUE(experiment->setupWithParameters({{"frameCount", 1}}, nullptr, nullptr));
}

TEST_F(TesselFaultExperimentSetup, IsSetUpWithoutTouchingAnythingWithOrWithoutAHost) {
  const auto experiment = makeOpenExperiment();
  QZDiagnosticHost host;
  EXPECT_TRUE(experiment->setupWithParameters({{"frameCount", 30}, {"timeout", 2}}, &host, nullptr));
  EXPECT_TRUE(experiment->setupWithParameters({{"frameCount", 30}, {"timeout", 2}}, nullptr, nullptr));
  EXPECT_FALSE(experiment->setupWithParameters({{"frameCount", -30}}, &host, nullptr));
  EXPECT_THAT(*calls, testing::IsEmpty());
}

TEST_F(TesselFaultExperimentSetup, HasATeardownForTheHostToFind) {
  const std::shared_ptr<QZExperiment> experiment = makeExperiment();
  EXPECT_NE(dynamic_cast<QZTeardown*>(experiment.get()), nullptr);
}

TEST_F(TesselFaultExperimentSetup, InvalidatesTheDeviceInItsTeardownAndDoesNothingElse) {
  const auto experiment = makeOpenExperiment();
  const auto stream = experiment->stream();
  DiagnosticErrorPtr error = earlier;
  EXPECT_TRUE(experiment->teardown(&error));
  EXPECT_EQ(error, earlier);
  EXPECT_THAT(*calls, ElementsAre("invalidate"));
  EXPECT_EQ(experiment->device(), device);
  EXPECT_EQ(experiment->stream(), stream);
}

TEST_F(TesselFaultExperimentSetup, FailsItsTeardownWithTheDevicesErrorWhereItGaveOne) {
  invalidates = false;
  invalidateError = deviceError;
  DiagnosticErrorPtr error = earlier;
  EXPECT_FALSE(makeOpenExperiment()->teardown(&error));
  EXPECT_EQ(told(error),
            "QZCapturePlugInErrorDomain 200 Failed to invalidate the capture device. "
            "{underlying-error: DeviceErrorDomain code -3: The device is gone.}");
  EXPECT_EQ(error->underlyingError(), deviceError);
  EXPECT_THAT(*calls, ElementsAre("invalidate"));
}

// An error that the caller's variable contained before is not the cause.
TEST_F(TesselFaultExperimentSetup, FailsItsTeardownWithoutAnUnderlyingErrorWhereTheDeviceGaveNone) {
  invalidates = false;
  DiagnosticErrorPtr error = earlier;
  EXPECT_FALSE(makeOpenExperiment()->teardown(&error));
  EXPECT_EQ(told(error), "QZCapturePlugInErrorDomain 200 Failed to invalidate the capture device.");
}

TEST_F(TesselFaultExperimentSetup, FailsItsTeardownWithoutADevice) {
  DiagnosticErrorPtr error = earlier;
  const auto experiment = makeExperiment();
  EXPECT_FALSE(experiment->teardown(&error));
  EXPECT_EQ(told(error), "QZCapturePlugInErrorDomain 200 Failed to invalidate the capture device.");
  EXPECT_FALSE(experiment->teardown(nullptr));
}

TEST_F(TesselFaultExperimentSetup, FailsItsTeardownJustSoForACallerThatWantsNoError) {
  invalidates = false;
  invalidateError = deviceError;
  EXPECT_FALSE(makeOpenExperiment()->teardown(nullptr));
  EXPECT_THAT(*calls, ElementsAre("invalidate"));
  invalidates = true;
  EXPECT_TRUE(makeOpenExperiment()->teardown(nullptr));
}

TEST_F(TesselFaultExperimentSetup, SucceedsInItsTeardownWhenTheDeviceGaveAnErrorAndSuccess) {
  invalidateError = deviceError;
  DiagnosticErrorPtr error = earlier;
  EXPECT_TRUE(makeOpenExperiment()->teardown(&error));
  EXPECT_EQ(error, earlier);
}

}  // namespace
}  // namespace quazor
