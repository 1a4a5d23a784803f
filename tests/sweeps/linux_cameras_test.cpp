// The plug-in's camera experiments with the V4L2 capture service and a fake video driver.
#include "tests/sweeps/linux_cameras.h"
#include "diagnostics/projector_fault/tessel_fault_experiment.h"
#include "tests/support/fake_camera.h"

#include <atomic>
#include <cerrno>
#include <thread>

namespace quazor {
namespace {

using Fake = FakeCameras;
using namespace std::chrono_literals;

// The parameter makes the node of a camera.
using CameraNodesTest = testing::TestWithParam<FakeNode (*)(const std::string& bus)>;

constexpr auto kNodes = [] { return testing::Values(&fakeCamera, &fakeMultiplanarCamera); };

class CameraSyncOnLinuxTest : public CameraNodesTest {
 protected:
  Platform platform() {
    Platform platform;
    platform.capture = fake_.capture;
    platform.clock = clock_;
    platform.concurrency = std::make_shared<ThreadConcurrency>();
    return platform;
  }
  Outcome run(Array formats = {1, 0, 1}, Value rate = 30) {
    QZCameraSyncExperiment experiment({text(port_type::BackFacingCamera), text(port_type::BackFacingTelephotoCamera),
                                       text(port_type::BackFacingSuperWideCamera)},
                                      std::move(formats), std::move(rate), platform());
    return outcomeOf(experiment, Dictionary{{"duration", 2.99}});
  }
  // A healthy run, which shows that earlier runs left nothing in use.
  void expectHealthyRun() {
    const Outcome outcome = run();
    ASSERT_NE(outcome.result, nullptr) << outcome.error;
    for (const char* camera : {"BackWide", "BackTele", "BackSuperWide"}) {
      EXPECT_EQ(outcome.measured(std::string(camera) + ".Frames"), 90) << camera;
      EXPECT_EQ(outcome.measured(std::string(camera) + ".FrameOffset"), 0) << camera;
      EXPECT_EQ(outcome.counter(camera, "SequenceGapCount"), 0) << camera;
    }
    EXPECT_TRUE(fake_.kernel->isIdle());
  }

  Fake fake_ = [] {
    Fake fake(fakeBinding(), GetParam());
    fake.release();
    return fake;
  }();
  const std::shared_ptr<FakeClock> clock_ = std::make_shared<FakeClock>(fake_.kernel);
};

TEST_P(CameraSyncOnLinuxTest, HealthyCamerasDeliverTheirFramesRunAfterRun) {
  expectHealthyRun();
  expectHealthyRun();
}

TEST_P(CameraSyncOnLinuxTest, EveryRefusedStartEndsInItsErrorAndTheNextRunIsHealthy) {
  const struct {
    const char* name;
    unsigned long request;
    int number;
    const char* want;
  } rows[] = {
      {"VIDIOC_REQBUFS", VIDIOC_REQBUFS, EINVAL, "Invalid argument (EINVAL)"},
      {"VIDIOC_QBUF", VIDIOC_QBUF, EINVAL, "Invalid argument (EINVAL)"},
      {"VIDIOC_STREAMON", VIDIOC_STREAMON, EINVAL, "Invalid argument (EINVAL)"},
  };
  for (const auto& row : rows) {
    fake_.kernel->failNext(fake_.nodes[1], row.request, row.number);
    const std::string underlying =
        "LinuxErrorDomain code 1: " + std::string(row.name) + " on " + fake_.nodes[1] + " failed: " + row.want;
    EXPECT_EQ(run().error,
              "QZCapturePlugInErrorDomain code 204: Failed to start steam at BackFacingTelephotoCamera "
              "port! " +
                  underlying);
    EXPECT_TRUE(fake_.kernel->isIdle()) << row.name;
    expectHealthyRun();
  }
}

TEST_P(CameraSyncOnLinuxTest, WhatHappensInMidStreamIsInTheCountersAndTheNextRunIsHealthy) {
  const struct {
    const char* name;
    std::function<void(FakeV4l2Api&, const std::string&)> happens;
    const char* counter;
    std::int64_t count;
    double frames;
  } rows[] = {
      {"dropped frames", [](auto& kernel, auto& path) { kernel.skip(path, 3); }, "SequenceGapCount", 3, 90},
      {"a damaged buffer", [](auto& kernel, auto& path) { kernel.produce(path, V4L2_BUF_FLAG_ERROR); },
       "BufferErrorCount", 1, 90},
      {"a fatal error", [](auto& kernel, auto& path) { kernel.breakStream(path); }, "StreamErrorCount", 1, 45},
      {"a disconnect", [](auto& kernel, auto& path) { kernel.disconnect(path); }, "DisconnectCount", 1, 45},
  };
  for (const auto& row : rows) {
    clock_->during = [&] { row.happens(*fake_.kernel, fake_.nodes[2]); };
    const Outcome outcome = run();
    ASSERT_NE(outcome.result, nullptr) << row.name << outcome.error;
    EXPECT_EQ(outcome.counter("BackSuperWide", row.counter), row.count) << row.name;
    EXPECT_EQ(outcome.measured("BackSuperWide.Frames"), row.frames) << row.name;
    EXPECT_EQ(outcome.measured("BackWide.Frames"), 90) << row.name;
    EXPECT_EQ(outcome.counter("BackWide", row.counter), 0) << row.name;
    EXPECT_TRUE(fake_.kernel->isIdle()) << row.name;
    clock_->during = nullptr;
    expectHealthyRun();
  }
}

TEST_P(CameraSyncOnLinuxTest, NoFramesAtAllGiveNoResult) {
  fake_.kernel->with(fake_.nodes[0], [](FakeNode& node) { return node.delivers = false; });
  const Outcome outcome = run();
  EXPECT_EQ(outcome.result, nullptr);
  EXPECT_EQ(outcome.error, "");
  EXPECT_TRUE(fake_.kernel->isIdle());
}

TEST_P(CameraSyncOnLinuxTest, ARateThatTheDriverDoesNotHaveGivesNoResult) {
  EXPECT_EQ(run({0, 0, 0}, 50).result, nullptr);
  EXPECT_TRUE(fake_.kernel->isIdle());
}

TEST_P(CameraSyncOnLinuxTest, AFormatThatIsNotThereIsItsError) {
  EXPECT_EQ(run({0, 16, 0}).error, "QZCapturePlugInErrorDomain code 209: Failed to set format index to 16");
  EXPECT_TRUE(fake_.kernel->isIdle());
}

TEST_P(CameraSyncOnLinuxTest, ACameraInUseElsewhereCannotBeSynchronised) {
  const int other = fake_.kernel->open(fake_.nodes[1]);
  ASSERT_EQ(fake_.kernel->lock(other), 0);
  EXPECT_EQ(run().error, "QZCapturePlugInErrorDomain code 214: Failed to synchronize cameras!");
  fake_.kernel->close(other);
  expectHealthyRun();
}

// Constants for all metadata of a frame's record that does not come from the metadata buffer.
Binding projectorBinding() {
  Binding binding = fakeBinding();
  MetadataBinding& metadata = binding.cameras[3].metadata;
  for (const char* key :
       {"MetaDataProjectorMode", "MetaDataProjectorIndex", "MetaDataProjectorPowerLow", "MetaDataProjectorPowerHigh",
        "MetaDataProjectorPowerFlood", "MetaDataProjectorProbeMode", "MetaDataProjectorPowerProbeA",
        "MetaDataProjectorPowerProbeB", "MetaDataProjectorPulseWidth", "NTCTemperatureIdle", "NTCTemperatureStandby",
        "NTCTemperatureActive", "DIETemperatureIdle", "DIETemperatureStandby", "DIETemperatureActive"}) {
    metadata.constants.set(key, 1);
  }
  metadata.fields = {{text(capture_key::InfraredLightSource), 0, 1, 0, {}}, {"HardwareEvents", 2, 2, 0, {}}};
  return binding;
}

INSTANTIATE_TEST_SUITE_P(Nodes, CameraSyncOnLinuxTest, kNodes(), nodesName<FakeNode (*)(const std::string& bus)>);

class ProjectorFaultOnLinuxTest : public CameraNodesTest {
 protected:
  ProjectorFaultOnLinuxTest() {
    setMetadata({1, 0, 0, 0});
    fake_.release();
  }
  void setMetadata(std::vector<std::uint8_t> metadata) {
    fake_.kernel->with(fake_.nodes[3], [&](FakeNode& node) { return (node.metadata = std::move(metadata)).size(); });
  }
  // Calls `during` after some frames. Repeats a run that ended before, as may happen on a busy machine.
  Outcome run(const std::function<void()>& during = nullptr) {
    for (int i = 0; i < 10; ++i) {
      std::atomic<bool> happened = during == nullptr;
      Outcome outcome = runOnce([&] {
        if (happened || !fake_.kernel->with(fake_.nodes[3], [](auto& node) { return node.streaming; })) return;
        happened = true;
        during();
      });
      if (happened) return outcome;
    }
    return {"No run was long enough.", nullptr};
  }

  // Calls `later` repeatedly after some frames have arrived.
  Outcome runOnce(const std::function<void()>& later) {
    Platform platform;
    platform.capture = fake_.capture;
    platform.clock = std::make_shared<FakeClock>(fake_.kernel);
    platform.concurrency = std::make_shared<ThreadConcurrency>();
    platform.reports = std::make_shared<FakeReports>(fakeChannels(1), 0);
    const auto experiment = std::make_shared<QZTesselFaultExperiment>(std::move(platform));
    std::atomic<bool> ended = false;
    const std::uint64_t begin = fake_.capture->framesDelivered();
    std::thread time([&] {
      while (!ended) {
        fake_.kernel->passTime(33ms);
        if (fake_.capture->framesDelivered() >= begin + 10) later();
      }
    });
    Outcome outcome = outcomeOf(*experiment, Dictionary{{"frameCount", 30}, {"timeout", 0.5}});
    ended = true;
    time.join();
    EXPECT_EQ(fake_.control(kStrobe), 0);
    EXPECT_EQ(fake_.kernel->guards(), 0);
    EXPECT_TRUE(experiment->teardown(nullptr));
    return outcome;
  }

  Fake fake_{projectorBinding(), GetParam()};
};

INSTANTIATE_TEST_SUITE_P(Nodes, ProjectorFaultOnLinuxTest, kNodes(), nodesName<FakeNode (*)(const std::string& bus)>);

TEST_P(ProjectorFaultOnLinuxTest, LitFramesGiveAResultWithoutErrors) {
  const Outcome outcome = run();
  ASSERT_NE(outcome.result, nullptr) << outcome.error;
  EXPECT_GE(outcome.measured("FrameCount"), 30);
  for (const char* name : {"I2C", "MIPI", "LPDP", "UART", "SIF", "Projector"}) EXPECT_EQ(outcome.measured(name), 0);
}

TEST_P(ProjectorFaultOnLinuxTest, DarkFramesEndInTheirErrors) {
  setMetadata({0, 0, 0, 0});
  EXPECT_EQ(run().error, "QZCapturePlugInErrorDomain code 206: Frame 1 is not illuminated for unknown reason!");
  setMetadata({0, 0, 0, 0x20});
  EXPECT_EQ(run().error, "QZCapturePlugInErrorDomain code 213: Frame 1 is not illuminated for safety reason!");
  setMetadata({1});
  EXPECT_EQ(run().error, "QZCapturePlugInErrorDomain code 206: Could not create a frame description of frame 1!");
}

TEST_P(ProjectorFaultOnLinuxTest, AFatalErrorLeavesTooFewFramesAndADisconnectIsAStopThatFailed) {
  const Outcome fatal = run([this] { fake_.kernel->breakStream(fake_.nodes[3]); });
  ASSERT_NE(fatal.result, nullptr) << fatal.error;
  EXPECT_LT(fatal.measured("FrameCount"), 30);
  const Outcome disconnected = run([this] { fake_.kernel->disconnect(fake_.nodes[3]); });
  EXPECT_EQ(disconnected.error, "QZCapturePlugInErrorDomain code 205: Failed to stop stream!");
  EXPECT_NE(run().result, nullptr) << "it is back";
}

}  // namespace
}  // namespace quazor
