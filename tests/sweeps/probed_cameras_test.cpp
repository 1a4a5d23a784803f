// The camera experiments with the binding that the probe writes, on cameras whose formats differ from each other.
#include "backends/linux/counters/counter_system_for_tests.h"
#include "backends/linux/media/media_for_tests.h"
#include "backends/linux/probe/probe.h"
#include "diagnostics/single_camera/single_camera_experiment.h"
#include "tests/sweeps/linux_cameras.h"

#include <filesystem>
#include <fstream>
#include <vector>

namespace quazor {
namespace {

// A webcam with four formats. The largest size of each format is different, and only some reach 30 frames a second.
FakeNode webcam(int number) {
  FakeNode node = fakeCamera("usb-" + std::to_string(number));
  node.formats = {
      {fakeCode('M', 'J', 'P', 'G'), "Motion-JPEG", {{1920, 1080, {{333333, 10000000}}}}},
      {fakeCode('Y', 'U', 'Y', 'V'), "YUYV 4:2:2", {{1280, 720, {{1, 10}}}, {640, 480, {{1, 30}, {1, 15}}}}},
      {fakeCode('N', 'V', '1', '2'), "Y/UV 4:2:0", {{320, 240, {{1, 30}, {1, 15}}}}},
      {fakeCode('G', 'R', 'E', 'Y'), "8-bit grey", {{1280, 720, {{1, 15}}}}}};
  return node;
}

// A camera of a board: the same, but its frames have two planes.
FakeNode boardCamera(int number) {
  FakeNode node = webcam(number);
  node.capabilities = V4L2_CAP_VIDEO_CAPTURE_MPLANE | V4L2_CAP_STREAMING;
  return node;
}

// A platform with the binding that the probe writes.
Platform platformOf(const std::shared_ptr<FakeV4l2Api>& kernel) {
  const std::filesystem::path file = kernel->roots().sysfs.parent_path() / "binding.json";
  std::ofstream(file) << probeMachine({kernel, kernel->roots(), {}, std::make_shared<FakeCounters>(), file}).binding;
  Platform platform;
  platform.capture = makeLinuxCapture(readBinding(file), kernel, kernel->roots());
  platform.clock = std::make_shared<FakeClock>(kernel);
  platform.concurrency = std::make_shared<ThreadConcurrency>();
  return platform;
}

// The parameter makes the node of a camera.
class ProbedCamerasTest : public testing::TestWithParam<FakeNode (*)(int number)> {
 protected:
  ProbedCamerasTest() {
    for (int i = 0; i < 5; ++i) kernel_->add(i, GetParam()(i));
  }

  Platform probedPlatform() { return platformOf(kernel_); }

  Outcome run(const std::vector<std::string>& ports, Array formats) {
    QZCameraSyncExperiment experiment(ports, std::move(formats), 30, probedPlatform());
    return outcomeOf(experiment, Dictionary{{"duration", 2.99}});
  }

  const std::shared_ptr<FakeV4l2Api> kernel_ = std::make_shared<FakeV4l2Api>();
};

INSTANTIATE_TEST_SUITE_P(Nodes, ProbedCamerasTest, testing::Values(&webcam, &boardCamera),
                         nodesName<FakeNode (*)(int number)>);

TEST_P(ProbedCamerasTest, TheBackCamerasRunAsTheyWereProbed) {
  const Outcome outcome = run({text(port_type::BackFacingCamera), text(port_type::BackFacingTelephotoCamera),
                               text(port_type::BackFacingSuperWideCamera)},
                              {16, 14, 9});
  ASSERT_NE(outcome.result, nullptr) << outcome.error;
  for (const char* camera : {"BackWide", "BackTele", "BackSuperWide"}) {
    EXPECT_EQ(outcome.measured(std::string(camera) + ".Frames"), 90) << camera;
  }
  EXPECT_TRUE(kernel_->isIdle());
}

TEST_P(ProbedCamerasTest, TheFrontCamerasRunAsTheyWereProbed) {
  const Outcome outcome = run({text(port_type::FrontFacingCamera), text(port_type::FrontFacingInfraredCamera)}, {1, 0});
  ASSERT_NE(outcome.result, nullptr) << outcome.error;
  for (const auto& [name, measurement] : outcome.result->measurements()) {
    if (!name.ends_with(".Frames")) continue;
    EXPECT_EQ(measurement.value(), 90) << name;
  }
  EXPECT_TRUE(kernel_->isIdle());
}

TEST_P(ProbedCamerasTest, OneCameraRunsAsItWasProbed) {
  QZSingleCameraExperiment experiment(probedPlatform());
  const Outcome outcome = outcomeOf(experiment, Dictionary{{"duration", 2.99}});
  ASSERT_NE(outcome.result, nullptr) << outcome.error;
  EXPECT_EQ(outcome.measured("Frames"), 90);
  EXPECT_NEAR(outcome.measured("FrameRate"), 30, 0.01);
  EXPECT_EQ(outcome.measured("MissingFrames"), 0);
  EXPECT_LT(outcome.measured("SilenceAtEnd"), 40);
  EXPECT_TRUE(experiment.teardown(nullptr));
  EXPECT_TRUE(kernel_->isIdle());
}

// Camera 1 has format indexes of the binding.
TEST_P(ProbedCamerasTest, OneCameraRunsAtAnotherRateThanItWasProbedAt) {
  QZSingleCameraExperiment experiment(probedPlatform());
  const Outcome outcome = outcomeOf(experiment, Dictionary{{"camera", 1}, {"frameRate", 15.0}, {"duration", 2.99}});
  ASSERT_NE(outcome.result, nullptr) << outcome.error;
  EXPECT_NEAR(outcome.measured("FrameRate"), 15, 0.01);
  EXPECT_TRUE(experiment.teardown(nullptr));
}

TEST(ProbedBoardTest, ACameraBehindAMediaControllerRunsAsItWasProbed) {
  const FakeBoard board;
  const std::vector<FakeLink> before = board.links();
  board.kernel->with(board.camera, [](FakeNode& node) { return node.interval = {1, 30}; });
  {
    QZSingleCameraExperiment experiment(platformOf(board.kernel));
    const Outcome outcome = outcomeOf(experiment, Dictionary{{"duration", 2.99}});
    ASSERT_NE(outcome.result, nullptr) << outcome.error;
    EXPECT_EQ(outcome.measured("Frames"), 90);
    EXPECT_TRUE(experiment.teardown(nullptr));
  }
  EXPECT_EQ(board.links(), before);
  EXPECT_TRUE(board.kernel->isIdle());
}

}  // namespace
}  // namespace quazor
