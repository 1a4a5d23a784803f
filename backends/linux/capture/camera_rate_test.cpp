#include "backends/linux/capture/camera_rate.h"

#include "backends/linux/capture/linux_capture_for_tests.h"

#include <cerrno>

namespace quazor {
namespace {

using Fake = FakeCameras;

// A camera like those of the media controller: no VIDIOC_S_PARM, and 1000 x 800 pixels with blanking at 24 MHz.
void removeIntervals(const Fake& fake, bool hasBlanking = true) {
  fake.kernel->failNext(fake.nodes[0], VIDIOC_S_PARM, ENOTTY, 1000);
  if (!hasBlanking) return;
  fake.kernel->with(fake.nodes[0], [](FakeNode& node) {
    node.controls = {{V4L2_CID_VBLANK, "Vertical Blanking", 40, 2000, 440},
                     {V4L2_CID_HBLANK, "Horizontal Blanking", 360, 360, 360},
                     {V4L2_CID_PIXEL_RATE, "Pixel Rate", 24'000'000, 24'000'000, 24'000'000, V4L2_CTRL_TYPE_INTEGER64}};
    return 0;
  });
}

std::string setRates(const Fake& fake, double rate) {
  if (const std::string taken = fake.take(0); taken != "done") return taken;
  if (const std::string set = fake.set(fake.wide(), capture_key::MinimumFrameRate, rate); set != "done") return set;
  return fake.set(fake.wide(), capture_key::MaximumFrameRate, rate);
}

std::int64_t verticalBlanking(const Fake& fake) {
  return fake.kernel->with(fake.nodes[0], [](const FakeNode& node) { return node.controls[0].value; });
}

TEST(CameraRateTest, ADriverWithoutIntervalsIsSetByItsBlanking) {
  Fake fake;
  removeIntervals(fake);
  EXPECT_EQ(setRates(fake, 30), "done");
  EXPECT_EQ(verticalBlanking(fake), 440) << "(640 + 360) x (360 + 440) pixels 30 times a second";
  EXPECT_EQ(fake.set(fake.wide(), capture_key::MinimumFrameRate, 20), "done");
  EXPECT_EQ(fake.set(fake.wide(), capture_key::MaximumFrameRate, 20), "done");
  EXPECT_EQ(verticalBlanking(fake), 840);
  EXPECT_EQ(fake.start(0), "done");
}

TEST(CameraRateTest, ARateThatNoBlankingGivesIsRefusedWithTheRange) {
  Fake fake;
  removeIntervals(fake);
  EXPECT_EQ(setRates(fake, 100),
            "5 BackFacingCamera: " + fake.nodes[0] +
                " does not support 1/100 s between frames in this format; its blanking controls allow 10.169 to 60 "
                "frames per second.");
}

TEST(CameraRateTest, WithoutBlankingTheErrorNamesTheWayOut) {
  Fake fake;
  removeIntervals(fake, false);
  EXPECT_EQ(setRates(fake, 30),
            "5 BackFacingCamera: the frame rate of " + fake.nodes[0] +
                " cannot be set: its driver has neither VIDIOC_S_PARM nor controls for blanking and pixel rate. If "
                "its rate is fixed or set by other controls, give the \"interval\" of format index 0 in the binding.");
}

TEST(CameraRateTest, TheBindingsIntervalIsBelievedWithoutIntervalsOfTheDriver) {
  Binding binding = fakeBinding();
  binding.cameras[0].formats = {{0, "YUYV", 640, 360, FrameInterval{1, 30}}};
  Fake fake(binding);
  removeIntervals(fake);
  EXPECT_EQ(setRates(fake, 30), "done");
  EXPECT_EQ(verticalBlanking(fake), 440) << "which the binding may set with its controls";
  EXPECT_EQ(fake.start(0), "done");
  EXPECT_EQ(fake.stop(0), "done");
  EXPECT_EQ(setRates(fake, 25).substr(0, 35), "5 BackFacingCamera: the binding giv");
}

TEST(CameraRateTest, ADriverThatRefusesAnIntervalIsQuoted) {
  Fake fake;
  fake.kernel->failNext(fake.nodes[0], VIDIOC_S_PARM, EBUSY);
  EXPECT_EQ(setRates(fake, 30), "8 VIDIOC_S_PARM on " + fake.nodes[0] + " failed: Device or resource busy (EBUSY)");
}

TEST(CameraRateTest, BlankingThatCannotBeReadIsQuoted) {
  Fake fake;
  removeIntervals(fake);
  fake.kernel->failNext(fake.nodes[0], VIDIOC_G_EXT_CTRLS, EIO, 10);
  EXPECT_EQ(setRates(fake, 30),
            "1 VIDIOC_G_EXT_CTRLS of \"Pixel Rate\" on " + fake.nodes[0] + " failed: Input/output error (EIO)");
}

}  // namespace
}  // namespace quazor
