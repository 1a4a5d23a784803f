#include "backends/linux/capture/linux_capture.h"

#include "backends/linux/capture/linux_capture_for_tests.h"

#include <cerrno>

namespace quazor {
namespace {

using Fake = FakeCameras;
using LinuxCaptureTest = FakeCamerasTest;

TEST_F(LinuxCaptureTest, ThereIsOneDefaultPlugInAndANewOneEachTimeElse) {
  EXPECT_EQ(fake.capture->defaultPlugIn(), fake.capture->defaultPlugIn());
  EXPECT_NE(fake.capture->createPlugIn(), fake.capture->createPlugIn());
  EXPECT_EQ(fake.capture->defaultPlugIn()->description(), "capture plug-in");
  EXPECT_EQ(fake.device->description(), "capture device");
  EXPECT_EQ(fake.wide().description(), "stream of BackFacingCamera");
  EXPECT_EQ(fake.group->description(), "group BackFacingCamera BackFacingTelephotoCamera BackFacingSuperWideCamera");
}

TEST(LinuxCaptureOwnMachineTest, AGroupOfAnUnknownPortIsLeftOut) {
  Binding binding = fakeBinding();
  binding.groups.push_back({{"BackFacingCamera", "SideFacingCamera"}, "BackFacingCamera"});
  const auto device = makeLinuxCapture(binding)->createPlugIn()->device(nullptr);
  EXPECT_EQ(device->synchronizedStreamsGroups(nullptr)->size(), 1U);
}

TEST_F(LinuxCaptureTest, ControlOpensTheNodesAndGivingBackClosesThem) {
  EXPECT_TRUE(fake.kernel->isIdle());
  EXPECT_EQ(fake.take(fake.streams), "done");
  EXPECT_EQ(fake.take(0), "done") << "what one has, one can take";
  EXPECT_EQ(fake.kernel->with(fake.nodes[3], [](auto& node) { return node.opened; }), 1);
  EXPECT_TRUE(fake.device->relinquishControlOfStreams(fake.streams, nullptr));
  EXPECT_TRUE(fake.kernel->isIdle());
}

TEST_F(LinuxCaptureTest, ControlOfSeveralIsOfAllOrNone) {
  const auto other = fake.capture->createPlugIn()->device(nullptr);
  ASSERT_TRUE(other->requestControlOfStreams({other->streams(nullptr)->at(2)}, nullptr));
  EXPECT_EQ(fake.take(fake.backStreams()), "8 BackFacingSuperWideCamera is under control of another user.");
  EXPECT_EQ(fake.kernel->with(fake.nodes[0], [](auto& node) { return node.opened; }), 0);
  EXPECT_EQ(fake.start(0), "7 BackFacingCamera is not under control; request control of it first.");
}

TEST_F(LinuxCaptureTest, ACameraThatAnotherProcessUsesIsRefused) {
  const int other = fake.kernel->open(fake.nodes[0]);
  ASSERT_EQ(fake.kernel->lock(other), 0);
  EXPECT_EQ(fake.take(0), "8 " + fake.nodes[0] + " is in use by another quazor process.");
  fake.kernel->close(other);
  EXPECT_EQ(fake.take(0), "done");
}

TEST(LinuxCaptureOwnMachineTest, WhatCannotBeOpenedOrSetIsToldAndLeftClosed) {
  struct Row {
    const char* name;
    void (*break_)(Fake&);
    const char* want;
  };
  const Row rows[] = {
      {"locks do not work", [](Fake& fake) { fake.kernel->failNext(fake.nodes[3], 0, ENOLCK); },
       "1 flock on NODE failed: No locks available (ENOLCK)"},
      {"the projector cannot be put out",
       [](Fake& fake) { fake.kernel->failNext(fake.nodes[3], VIDIOC_S_EXT_CTRLS, EIO); },
       "1 VIDIOC_S_EXT_CTRLS of \"Strobe\" on NODE failed: Input/output error (EIO)"},
      {"a control of the binding is not there",
       [](Fake& fake) {
         fake.binding.cameras[3].controls = {{"Timestamp Source", 1}};
       },
       "5 NODE has no control \"Timestamp Source\"."},
      {"there is no such metadata node",
       [](Fake& fake) {
         fake.binding.cameras[3].metadata.node = VideoNodeMatch{"uvc", {}, {}};
       },
       "2 FrontFacingInfraredCamera: no metadata node is driver uvc; there are META (driver fake, card fake camera, "
       "bus fake:3)."},
  };
  for (const Row& row : rows) {
    Fake fake;
    row.break_(fake);
    fake.open();
    EXPECT_EQ(fake.take(3), fake.withPaths(row.want)) << row.name;
    EXPECT_TRUE(fake.kernel->isIdle()) << row.name;
  }
}

TEST(LinuxCaptureOwnMachineTest, TheBindingsControlsAreSetInOrderWhenControlIsTaken) {
  Binding binding = fakeBinding();
  binding.cameras[3].controls = {{"Power", 40}, {"Power", 41}};
  Fake fake(binding);
  ASSERT_EQ(fake.take(3), "done");
  const std::vector<std::string> want{"Strobe = 0", "Power = 40", "Power = 41"};
  EXPECT_EQ(fake.kernel->with(fake.nodes[3], [](auto& node) { return node.history; }), want);
}

TEST_F(LinuxCaptureTest, InvalidatingStopsAndFreesAllAndRefusesEverythingAfter) {
  fake.prepare(0);
  fake.prepare(3);
  ASSERT_EQ(fake.set(fake.infrared(), capture_key::InfraredLightSourceConfiguration, Fake::light(2)), "done");
  ASSERT_EQ(fake.start(3), "done");
  EXPECT_EQ(fake.control(kStrobe), 1);
  EXPECT_TRUE(fake.device->invalidate(nullptr));
  EXPECT_EQ(fake.control(kStrobe), 0);
  const std::string refused = "7 The capture device has been invalidated; ask for a new one.";
  EXPECT_EQ(outcome([&](auto* error) { return fake.device->invalidate(error); }), refused);
  EXPECT_EQ(outcome([&](auto* error) { return fake.device->streams(error); }), refused);
  EXPECT_EQ(outcome([&](auto* error) { return fake.device->synchronizedStreamsGroups(error); }), refused);
  EXPECT_EQ(outcome([&](auto* error) { return fake.group->streams(error); }), refused);
  EXPECT_EQ(outcome([&](auto* error) { return fake.wide().valueForProperty(capture_key::PortType, error); }), refused);
  EXPECT_EQ(fake.start(0), refused);
  EXPECT_EQ(fake.stop(0), refused);
  EXPECT_EQ(fake.take(0), refused);
  EXPECT_EQ(fake.set(fake.wide(), capture_key::FormatIndex, 1), refused);
  const auto next = fake.capture->defaultPlugIn()->device(nullptr);
  EXPECT_TRUE(next->requestControlOfStreams(*next->streams(nullptr), nullptr));
  static_cast<void>(next->invalidate(nullptr));
  fake.release();
  EXPECT_TRUE(fake.kernel->isIdle());
}

TEST_F(LinuxCaptureTest, InvalidatingTellsThatAStreamCouldNotBeStopped) {
  fake.begin(0);
  fake.kernel->failNext(fake.nodes[0], VIDIOC_STREAMOFF, EIO);
  EXPECT_EQ(outcome([&](auto* error) { return fake.device->invalidate(error); }),
            "1 VIDIOC_STREAMOFF on " + fake.nodes[0] + " failed: Input/output error (EIO)");
}

TEST_F(LinuxCaptureTest, TheLastReferenceStopsAndFreesAll) {
  fake.prepare(0);
  fake.prepare(3);
  ASSERT_EQ(fake.set(fake.infrared(), capture_key::InfraredLightSourceConfiguration, Fake::light(2)), "done");
  ASSERT_EQ(fake.start(0), "done");
  ASSERT_EQ(fake.start(3), "done");
  fake.release();
  EXPECT_TRUE(fake.kernel->isIdle());
  EXPECT_EQ(fake.control(kStrobe), 0);
}

}  // namespace
}  // namespace quazor
