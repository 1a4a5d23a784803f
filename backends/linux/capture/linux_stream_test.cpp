#include "backends/linux/capture/camera_device.h"
#include "backends/linux/capture/linux_capture_for_tests.h"

#include <cerrno>

namespace quazor {
namespace {

using Fake = FakeCameras;
using LinuxStreamTest = FakeCamerasTest;

std::optional<Value> get(const Fake& fake, std::string_view key, std::size_t index = 0) {
  return fake.streams[index]->valueForProperty(key, nullptr);
}

TEST_F(LinuxStreamTest, AStreamThatWasNotTouchedHasTheUsualProperties) {
  EXPECT_EQ(get(fake, capture_key::PortType), Value("BackFacingCamera"));
  EXPECT_EQ(get(fake, capture_key::FormatIndex), Value(0U));
  EXPECT_EQ(get(fake, capture_key::MinimumFrameRate), std::nullopt);
  EXPECT_EQ(get(fake, capture_key::AEEnabled), Value(true));
  EXPECT_EQ(get(fake, capture_key::InfraredLightSourceConfiguration), std::nullopt) << "it has no projector";
  EXPECT_EQ(get(fake, capture_key::InfraredLightSourceConfiguration, 3), Value(Fake::light(0)));
  for (const std::string_view name :
       {"I2CErrorCount", "MIPIErrorCount", "LPDPErrorCount", "UARTErrorCount", "SIFErrorCount", "ProjectorErrorCount",
        "SequenceGapCount", "BufferErrorCount", "StreamErrorCount", "DisconnectCount", "MetadataErrorCount"}) {
    EXPECT_EQ(fake.counter(0, name), 0) << name;
  }
  EXPECT_EQ(outcome([&](auto* error) { return fake.wide().valueForProperty(capture_key::MaximumFrameRate, error); }),
            "7 BackFacingCamera: MaximumFrameRate cannot be read before it is set.");
}

TEST_F(LinuxStreamTest, TheNameIsWhatTheDriverCallsTheCameraAndItsBus) {
  const auto name = [&] {
    return outcome([&](auto* error) { return fake.wide().valueForProperty(capture_key::CameraName, error); });
  };
  const std::string refused = "7 BackFacingCamera: CameraName cannot be read without control of the stream.";
  EXPECT_EQ(name(), refused);
  ASSERT_EQ(fake.take(0), "done");
  EXPECT_EQ(get(fake, capture_key::CameraName), Value("fake camera (fake:0)"));
  EXPECT_TRUE(fake.device->relinquishControlOfStreams({fake.streams[0]}, nullptr));
  EXPECT_EQ(name(), refused);
}

TEST_F(LinuxStreamTest, WhatNoVideoNodeCanDoIsRefused) {
  const auto slave = [](bool outputs, bool skipping, int ratio) {
    return Value(Dictionary{{text(capture_key::StreamingOutputsEnabled), outputs},
                            {text(capture_key::FrameSkippingEnabled), skipping},
                            {text(capture_key::TimeMachineEnabled), false},
                            {text(capture_key::MasterToSlaveFrameRateRatio), ratio}});
  };
  constexpr std::string_view kSlave = capture_key::SynchronizedStreamsSlaveConfiguration;
  const std::string name = "FrontFacingInfraredCamera: ";
  ASSERT_EQ(fake.take(3), "done");
  const auto set = [&](std::string_view key, const Value& value) { return fake.set(fake.infrared(), key, value); };
  EXPECT_EQ(set(kSlave, slave(true, false, 2)),
            "5 " + name + "MasterToSlaveFrameRateRatio can only be 1 here, not the number 2.");
  EXPECT_EQ(set(kSlave, slave(true, true, 1)),
            "5 " + name + "FrameSkippingEnabled can only be 0 here, not the boolean 1.");
  EXPECT_EQ(set(kSlave, slave(false, false, 1)),
            "5 " + name + "StreamingOutputsEnabled can only be 1 here, not the boolean 0.");
  EXPECT_EQ(set(capture_key::InfraredLightSourceConfiguration, Fake::light(1, 0, 101)),
            "6 " + name + "the control \"Power\" accepts 0 to 100, not 101.");
  EXPECT_EQ(set(capture_key::MinimumFrameRate, 0.009),
            "6 " + name + "no driver supports less than 0.01 frames per second.");
  EXPECT_EQ(set(capture_key::MaximumFrameRate, 10'001),
            "6 " + name + "MaximumFrameRate must be a number above 0 and at most 10000, not the number 10001.");
}

TEST_F(LinuxStreamTest, TheLowestRateOfAllIsTaken) {
  ASSERT_EQ(fake.take(0), "done");
  EXPECT_EQ(fake.set(fake.wide(), capture_key::MinimumFrameRate, 0.01), "done");
}

TEST(LinuxStreamOwnMachineTest, AFormatThatIsNotThereOrHasAnotherSizeIsRefused) {
  Binding binding = fakeBinding();
  binding.cameras[1].width = 800;
  Fake fake(binding);
  ASSERT_EQ(fake.take(CaptureStreams{fake.streams[0], fake.streams[1]}), "done");
  EXPECT_EQ(fake.set(fake.wide(), capture_key::FormatIndex, 2),
            "5 " + fake.nodes[0] +
                " has no format with index 2; the binding can map the index to one of its formats: YUYV, GREY.");
  EXPECT_EQ(
      fake.set(fake.stream(1), capture_key::FormatIndex, 1),
      "5 " + fake.nodes[1] + ": format 1 (GREY) of 800 x 360 is not available; the driver offers GREY of 640 x 360.");
}

TEST(LinuxStreamOwnMachineTest, TheBindingMapsAFormatIndexToFormatSizeAndInterval) {
  Binding binding = fakeBinding();
  binding.cameras[0].formats = {{16, "GREY", 640, 480, FrameInterval{1, 25}},
                                {14, "NV12", 640, 360, std::nullopt},
                                {9, "YUYV", 800, 600, std::nullopt}};
  Fake fake(binding);
  ASSERT_EQ(fake.take(0), "done");
  ASSERT_EQ(fake.set(fake.wide(), capture_key::FormatIndex, 16), "done");
  const auto format = [&] { return fake.kernel->with(fake.nodes[0], [](FakeNode& node) { return node.format; }); };
  EXPECT_EQ(format().pixelformat, fakeCode('G', 'R', 'E', 'Y'));
  EXPECT_EQ(format().height, 480U);
  EXPECT_EQ(get(fake, capture_key::FormatIndex), Value(16));

  ASSERT_EQ(fake.set(fake.wide(), capture_key::MinimumFrameRate, 30), "done");
  EXPECT_EQ(
      fake.set(fake.wide(), capture_key::MaximumFrameRate, 30),
      "5 BackFacingCamera: the binding gives format index 16 an interval of 1/25 s, which is 25 frames per second, "
      "and this rate was not requested. Change the interval or remove it.");
  EXPECT_EQ(fake.set(fake.wide(), capture_key::MinimumFrameRate, 20), "done");
  EXPECT_EQ(fake.set(fake.wide(), capture_key::MaximumFrameRate, 30), "done");
  EXPECT_EQ(fake.kernel->with(fake.nodes[0], [](FakeNode& node) { return node.interval; }), (FrameInterval{1, 25}));

  EXPECT_EQ(fake.set(fake.wide(), capture_key::FormatIndex, 14),
            "5 " + fake.nodes[0] +
                " has no format \"NV12\", to which the binding maps format index 14; its formats are YUYV, GREY.");
  EXPECT_EQ(
      fake.set(fake.wide(), capture_key::FormatIndex, 9),
      "5 " + fake.nodes[0] + ": format 9 (YUYV) of 800 x 600 is not available; the driver offers YUYV of 640 x 360.");
  EXPECT_EQ(format().height, 480U) << "a refused format changes nothing";
  EXPECT_EQ(fake.set(fake.wide(), capture_key::FormatIndex, 1), "done") << "other indexes are the driver's own";
  EXPECT_EQ(format().height, 360U);
}

TEST(LinuxStreamOwnMachineTest, TheBindingsIntervalAppliesWithoutARate) {
  Binding binding = fakeBinding();
  binding.cameras[0].formats = {{0, "YUYV", 640, 360, FrameInterval{1, 25}}};
  Fake fake(binding);
  ASSERT_EQ(fake.take(0), "done");
  EXPECT_EQ(fake.start(0), "done");
  EXPECT_EQ(fake.kernel->with(fake.nodes[0], [](FakeNode& node) { return node.interval; }), (FrameInterval{1, 25}));
}

TEST(LinuxStreamOwnMachineTest, ARateThatTheDriverSilentlyChangesIsRefusedWithTheDriversOwn) {
  Binding binding = fakeBinding();
  binding.cameras[0].height = 480;
  Fake fake(binding);
  ASSERT_EQ(fake.take(0), "done");
  ASSERT_EQ(fake.set(fake.wide(), capture_key::FormatIndex, 0), "done");
  ASSERT_EQ(fake.set(fake.wide(), capture_key::MinimumFrameRate, 30), "done");
  EXPECT_EQ(fake.set(fake.wide(), capture_key::MaximumFrameRate, 30),
            "5 BackFacingCamera: " + fake.nodes[0] +
                " does not support 1/30 s between frames in this format; its driver uses 1/25 s instead, which is 25 "
                "frames per second.");
  EXPECT_EQ(get(fake, capture_key::MaximumFrameRate), std::nullopt);
}

TEST(LinuxStreamOwnMachineTest, RatesThatAreNearEnoughOrWithinTheRangeAreTaken) {
  const struct {
    const char* name;
    double lowest;
    double highest;
    bool fits;
  } rows[] = {
      {"exactly", 30, 30, true},
      {"29.97 counts as 30", 29.97, 29.97, true},
      {"within the tolerance above", 30.06, 30.06, true},
      {"beyond the tolerance", 30.1, 30.1, false},
      {"the driver's is between the two", 26, 35, true},
      {"the driver's is beyond both", 26, 29, false},
      {"a range that has the wanted highest", 10, 40, true},
  };
  for (const auto& row : rows) {
    Fake fake;
    ASSERT_EQ(fake.take(0), "done");
    ASSERT_EQ(fake.set(fake.wide(), capture_key::FormatIndex, 0), "done");
    ASSERT_EQ(fake.set(fake.wide(), capture_key::MinimumFrameRate, row.lowest), "done");
    EXPECT_EQ(fake.set(fake.wide(), capture_key::MaximumFrameRate, row.highest) == "done", row.fits) << row.name;
  }
}

TEST(LinuxStreamOwnMachineTest, RatesAreCheckedAtTheStartAnew) {
  Binding binding = fakeBinding();
  Fake fake(binding);
  fake.prepare(0);
  EXPECT_EQ(fake.set(fake.wide(), capture_key::MinimumFrameRate, 40), "done");
  EXPECT_EQ(fake.start(0), "7 BackFacingCamera cannot start: MinimumFrameRate is 40, above the MaximumFrameRate 30.");
  EXPECT_EQ(fake.set(fake.wide(), capture_key::MinimumFrameRate, 30), "done");
  fake.kernel->with(fake.nodes[0], [](FakeNode& node) { return node.formats[0].sizes[0].intervals = {{1, 5}}; });
  EXPECT_EQ(fake.start(0).substr(0, 2), "5 ");
  EXPECT_EQ(fake.kernel->with(fake.nodes[0], [](auto& node) { return node.buffers; }), 0U);
}

TEST(LinuxStreamOwnMachineTest, OneRateAloneIsABoundAndNoneLeavesTheDriversOwn) {
  const auto rateAfter = [](std::string_view key, double rate) {
    Fake fake;
    EXPECT_EQ(fake.take(0), "done");
    EXPECT_EQ(fake.set(fake.wide(), key, rate), "done");
    EXPECT_EQ(fake.start(0), "done");
    return fake.kernel->with(fake.nodes[0], [](auto& node) { return node.interval.denominator; });
  };
  EXPECT_EQ(rateAfter(capture_key::MinimumFrameRate, 30), 30U);
  EXPECT_EQ(rateAfter(capture_key::MaximumFrameRate, 40), 40U);
  Fake fake;
  ASSERT_EQ(fake.take(0), "done");
  fake.kernel->failNext(fake.nodes[0], VIDIOC_G_PARM, ENOTTY);
  EXPECT_EQ(fake.start(0), "done");
  EXPECT_EQ(fake.kernel->with(fake.nodes[0], [](auto& node) { return node.interval.denominator; }), 5U);
}

TEST(LinuxStreamOwnMachineTest, TheIntervalOfARateIsTheShortestFraction) {
  EXPECT_EQ(intervalFor(30), (FrameInterval{1, 30}));
  EXPECT_EQ(intervalFor(29.97), (FrameInterval{1000, 29970}));
  EXPECT_EQ(intervalFor(0.5), (FrameInterval{1000, 500}));
  EXPECT_EQ(intervalFor(0.01), (FrameInterval{1000, 10}));
}

TEST_F(LinuxStreamTest, AutomaticExposureIsTheControlOfThatName) {
  const auto exposure = [&](std::int64_t usual) {
    fake.kernel->with(fake.nodes[0], [usual](FakeNode& node) {
      node.controls = {{V4L2_CID_EXPOSURE_AUTO, "Auto Exposure", 0, 3, usual, V4L2_CTRL_TYPE_MENU}};
      return 0;
    });
    static_cast<void>(fake.device->relinquishControlOfStreams({fake.streams[0]}, nullptr));
    EXPECT_EQ(fake.take(0), "done");
  };
  const auto value = [&] {
    return fake.kernel->with(fake.nodes[0], [](auto& node) { return node.controls[0].value; });
  };
  exposure(V4L2_EXPOSURE_APERTURE_PRIORITY);
  EXPECT_EQ(fake.set(fake.wide(), capture_key::AEEnabled, false), "done");
  EXPECT_EQ(value(), V4L2_EXPOSURE_MANUAL);
  EXPECT_EQ(fake.set(fake.wide(), capture_key::AEEnabled, true), "done");
  EXPECT_EQ(value(), V4L2_EXPOSURE_APERTURE_PRIORITY);
  exposure(V4L2_EXPOSURE_MANUAL);
  EXPECT_EQ(fake.set(fake.wide(), capture_key::AEEnabled, true), "done");
  EXPECT_EQ(value(), V4L2_EXPOSURE_AUTO);
  fake.kernel->failNext(fake.nodes[0], VIDIOC_S_EXT_CTRLS, EBUSY);
  EXPECT_EQ(
      fake.set(fake.wide(), capture_key::AEEnabled, false),
      "8 VIDIOC_S_EXT_CTRLS of \"Auto Exposure\" on " + fake.nodes[0] + " failed: Device or resource busy (EBUSY)");
  EXPECT_EQ(get(fake, capture_key::AEEnabled), Value(true));
}

TEST(LinuxStreamOwnMachineTest, AutomaticExposureIsAsTheDriverHasItWhenControlIsTaken) {
  const struct {
    const char* name;
    std::int64_t value;
    int problem;
    bool want;
  } rows[] = {
      {"automatic", V4L2_EXPOSURE_AUTO, 0, true},
      {"in part automatic", V4L2_EXPOSURE_APERTURE_PRIORITY, 0, true},
      {"as an earlier user left it", V4L2_EXPOSURE_MANUAL, 0, false},
      {"not to be read, so nothing shows that it is off", V4L2_EXPOSURE_AUTO, EIO, true},
  };
  for (const auto& row : rows) {
    Fake fake;
    fake.kernel->with(fake.nodes[0], [&row](FakeNode& node) {
      node.controls = {{V4L2_CID_EXPOSURE_AUTO, "Auto Exposure", 0, 3, row.value, V4L2_CTRL_TYPE_MENU}};
      return 0;
    });
    if (row.problem != 0) fake.kernel->failNext(fake.nodes[0], VIDIOC_G_EXT_CTRLS, row.problem);
    ASSERT_EQ(fake.take(0), "done");
    EXPECT_EQ(get(fake, capture_key::AEEnabled), Value(row.want)) << row.name;
  }
}

TEST_F(LinuxStreamTest, AutomaticExposureThatCannotBeSwitchedIsNeverReportedAsSwitched) {
  const auto withExposure = [&](const FakeControl& control) {
    fake.kernel->with(fake.nodes[0], [&](FakeNode& node) { return (node.controls = {control}).size(); });
    static_cast<void>(fake.device->relinquishControlOfStreams({fake.streams[0]}, nullptr));
    EXPECT_EQ(fake.take(0), "done");
  };
  FakeControl exposure{V4L2_CID_EXPOSURE_AUTO, "Auto Exposure", 0, 3, V4L2_EXPOSURE_AUTO, V4L2_CTRL_TYPE_MENU};
  exposure.describeProblem = EPIPE;
  withExposure(exposure);
  EXPECT_EQ(get(fake, capture_key::AEEnabled), Value(true));
  EXPECT_EQ(fake.set(fake.wide(), capture_key::AEEnabled, false),
            "5 BackFacingCamera: automatic exposure of " + fake.nodes[0] +
                " cannot be set, because its driver does not describe the controls 0x009A0901 (EPIPE).");
  EXPECT_EQ(get(fake, capture_key::AEEnabled), Value(true));

  exposure.describeProblem = 0;
  exposure.stuck = V4L2_EXPOSURE_APERTURE_PRIORITY;
  withExposure(exposure);
  EXPECT_EQ(fake.set(fake.wide(), capture_key::AEEnabled, false),
            "6 " + fake.nodes[0] + ": the driver set the control \"Auto Exposure\" to 3 instead of 1.");
  EXPECT_EQ(get(fake, capture_key::AEEnabled), Value(true));
}

TEST_F(LinuxStreamTest, ACameraWithoutAutomaticExposureCanOnlyBeWithout) {
  ASSERT_EQ(fake.take(0), "done");
  EXPECT_EQ(get(fake, capture_key::AEEnabled), Value(false));
  EXPECT_EQ(fake.set(fake.wide(), capture_key::AEEnabled, false), "done");
  EXPECT_EQ(fake.set(fake.wide(), capture_key::AEEnabled, true),
            "5 BackFacingCamera: " + fake.nodes[0] + " has no automatic exposure.");
}

TEST_F(LinuxStreamTest, AProjectorsSetOfBitsTakesEveryNumber) {
  fake.kernel->with(fake.nodes[3], [](FakeNode& node) {
    FakeControl& power = *std::ranges::find(node.controls, kPower, &FakeControl::id);
    power.type = V4L2_CTRL_TYPE_BITMASK;
    return power.maximum = 0;
  });
  ASSERT_EQ(fake.take(3), "done");
  EXPECT_EQ(fake.set(fake.infrared(), capture_key::InfraredLightSourceConfiguration, Fake::light(2, 0, 5)), "done");
  EXPECT_EQ(fake.start(3), "done");
  EXPECT_EQ(fake.control(kPower), 5);
}

TEST(LinuxStreamOwnMachineTest, AProjectorsControlMustBeThere) {
  Binding binding = fakeBinding();
  binding.cameras[3].projector->modeControl = "Flash Mode";
  Fake fake(binding);
  ASSERT_EQ(fake.take(3), "done");
  EXPECT_EQ(fake.set(fake.infrared(), capture_key::InfraredLightSourceConfiguration, Fake::light(2)),
            "5 " + fake.nodes[3] + " has no control \"Flash Mode\".");
}

}  // namespace
}  // namespace quazor
