// The lifetime of the experiment, and frames that arrive after its end.
#include "diagnostics/projector_fault/tessel_fault_experiment.h"

#include "backends/simulated/simulated_phone.h"
#include "platform/capture_keys.h"
#include "tests/support/fake_camera.h"
#include "tests/sweeps/projector_bench.h"

#include <gtest/gtest.h>

#include <chrono>
#include <memory>
#include <string>
#include <vector>

namespace quazor {
namespace {

using std::chrono::milliseconds;

// A handler without an experiment does not release the buffers that it receives.
TEST(TesselFaultLifetime, LeavesFramesAndEventsAloneWhenItIsGone) {
  RunTranscript transcript;
  Scenario scenario = projectorScenario();
  infraredCamera(scenario).delivery.framesAfterStop = 2;
  SimulatedPhone phone(scenario, PhoneTime::kVirtual, 1);
  auto experiment = std::make_shared<QZTesselFaultExperiment>(phone.platform());
  ASSERT_TRUE(experiment->setupWithParameters({{"timeout", 0}}, nullptr, nullptr));
  ASSERT_NE(experiment->run(nullptr), nullptr);
  const std::weak_ptr<QZTesselFaultExperiment> watched = experiment;
  const std::shared_ptr<CaptureStream> stream = experiment->stream();
  const std::size_t before = transcript.text().size();
  experiment.reset();
  EXPECT_TRUE(watched.expired());
  phone.scheduler()->blockUntil(milliseconds(100), "the late frames");
  EXPECT_EQ(transcript.text().substr(before), "");
  EXPECT_EQ(phone.buffersHeld(),
            (std::vector<SimulatedPhone::HeldBuffer>{{"front-infrared", 0}, {"front-infrared", 1}}));

  // The stream still has the handlers.
  const auto handlers = stream->valueForProperty(capture_key::VideoOutputHandlers, nullptr);
  ASSERT_TRUE(handlers);
  const Dictionary& output = *handlers->dictionary()->find(capture_key::PrimaryScaler)->dictionary();
  const auto events = std::dynamic_pointer_cast<EventHandler>(output.find(capture_key::EventHandler)->object());
  ASSERT_NE(events, nullptr);
  (*events)(1, MediaTime{}, nullptr);
  phone.scheduler()->blockUntil(milliseconds(110), "the event");
  EXPECT_EQ(transcript.text().substr(before), "");
}

// A queued intake does not keep the experiment alive.
TEST(TesselFaultLifetime, IsNotKeptByFramesOnTheirWay) {
  SimulatedPhone phone(projectorScenario(), PhoneTime::kVirtual, 1);
  const auto stream = std::make_shared<FakeStream>();
  Platform platform = phone.platform();
  platform.capture = makeFakeCapture(stream);
  auto experiment = std::make_shared<QZTesselFaultExperiment>(platform);
  ASSERT_TRUE(experiment->setupWithParameters({{"timeout", 0}}, nullptr, nullptr));
  ASSERT_NE(experiment->run(nullptr), nullptr);
  phone.scheduler()->blockUntil(milliseconds(10), "all that the run has left");
  FakePixelBuffer buffer;
  stream->frameHandler()(buffer, MediaTime{});
  EXPECT_EQ(buffer.references(), 1);
  const std::weak_ptr<QZTesselFaultExperiment> watched = experiment;
  experiment.reset();
  EXPECT_TRUE(watched.expired());
  RunTranscript transcript;
  phone.scheduler()->blockUntil(milliseconds(20), "the frame");
  EXPECT_EQ(transcript.text(), "");
  EXPECT_EQ(buffer.references(), 1);
}

TEST(TesselFaultLifetime, IsKeptByItsTimeout) {
  RunTranscript transcript;
  SimulatedPhone phone(projectorScenario(), PhoneTime::kVirtual, 1);
  auto experiment = std::make_shared<QZTesselFaultExperiment>(phone.platform());
  ASSERT_TRUE(experiment->setupWithParameters({{"frameCount", 1}, {"timeout", 1}}, nullptr, nullptr));
  ASSERT_NE(experiment->run(nullptr), nullptr);
  const std::weak_ptr<QZTesselFaultExperiment> watched = experiment;
  experiment.reset();
  phone.scheduler()->blockUntil(milliseconds(999), "just before the timeout");
  EXPECT_FALSE(watched.expired());
  phone.scheduler()->blockUntil(milliseconds(1001), "the timeout");
  EXPECT_TRUE(watched.expired());
  EXPECT_TRUE(transcript.text().ends_with("log error: Timeout has been reached.\n")) << transcript.text();
}

}  // namespace
}  // namespace quazor
