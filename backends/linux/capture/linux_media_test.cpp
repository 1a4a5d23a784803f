// Cameras behind a media controller.
#include "backends/linux/capture/linux_capture_for_tests.h"
#include "backends/linux/media/media_for_tests.h"

#include <gmock/gmock.h>
#include <linux/v4l2-subdev.h>

#include <cerrno>
#include <filesystem>
#include <fstream>
#include <optional>

namespace quazor {
namespace {

using namespace std::chrono_literals;
using ::testing::AllOf;
using ::testing::ElementsAre;
using ::testing::EndsWith;
using ::testing::HasSubstr;
using ::testing::StartsWith;

// A user of the camera on the fake board.
struct BoardUser {
  void open() {
    Binding all;
    all.cameras = {binding};
    capture = makeLinuxCapture(all, board.kernel, board.kernel->roots());
    device = capture->defaultPlugIn()->device(nullptr);
    stream = device->streams(nullptr)->front();
  }
  std::string take() {
    if (device == nullptr) open();
    return withNames(outcome([&](auto* error) { return device->requestControlOfStreams({stream}, error); }));
  }
  std::string release() {
    return outcome([&](auto* error) { return device->relinquishControlOfStreams({stream}, error); });
  }
  std::string set(std::string_view key, const Value& value) {
    return withNames(outcome([&](auto* error) { return stream->setValue(value, key, error); }));
  }
  std::string setRate(double rate) {
    const std::string set = this->set(capture_key::MinimumFrameRate, rate);
    return set == "done" ? this->set(capture_key::MaximumFrameRate, rate) : set;
  }
  std::string start() {
    return withNames(outcome([&](auto* error) { return stream->start(error); }));
  }
  std::string stop() {
    return outcome([&](auto* error) { return stream->stop(error); });
  }
  // The text without the folder of the device files.
  std::string withNames(std::string text) const {
    const std::string dev = board.kernel->roots().dev.string() + "/";
    for (std::size_t at = text.find(dev); at != std::string::npos; at = text.find(dev)) text.erase(at, dev.size());
    return text;
  }
  void close() {
    stream.reset();
    device.reset();
    capture.reset();
  }

  FakeBoard board;
  CameraBinding binding = FakeBoard::binding();
  std::shared_ptr<LinuxCapture> capture;
  std::shared_ptr<CaptureDevice> device;
  std::shared_ptr<CaptureStream> stream;
};

class LinuxMediaTest : public testing::Test, protected BoardUser {};

TEST_F(LinuxMediaTest, FramesComeThroughTheLinksAndPadsOfTheBinding) {
  ASSERT_EQ(take(), "done");
  EXPECT_THAT(board.history(board.media),
              ElementsAre("Sensor A -> Converter off", "Sensor B -> Converter on", "Converter -> Scaler on"));
  EXPECT_EQ(board.format(board::kScaler, 0), (PadFormat{MEDIA_BUS_FMT_Y8_1X8, 1280, 720}));
  EXPECT_EQ(board.format(board::kScaler, 1), (PadFormat{MEDIA_BUS_FMT_Y8_1X8, 640, 360}));
  ASSERT_EQ(set(capture_key::FormatIndex, 0), "done");
  ASSERT_EQ(setRate(30), "done");
  ASSERT_EQ(start(), "done");
  board.kernel->passTime(990ms);
  EXPECT_EQ(board.kernel->with(board.camera, [](const FakeNode& node) { return node.sequence; }), 5U);
  EXPECT_EQ(stop(), "done");
  close();
  EXPECT_TRUE(board.kernel->isIdle());
}

TEST_F(LinuxMediaTest, WithoutItsLinksThereAreNoFrames) {
  binding.media->links.pop_back();
  binding.media->links.pop_back();
  ASSERT_EQ(take(), "done");
  EXPECT_EQ(start(),
            "1 VIDIOC_STREAMON on video0 failed: Link has been severed (ENOLINK): the links and pads on the camera's "
            "path do not fit together; \"media\" of the camera in the binding sets them.");
}

TEST_F(LinuxMediaTest, WithoutItsPadsThereAreNoFrames) {
  binding.media->pads.erase(binding.media->pads.begin() + 1);
  ASSERT_EQ(take(), "done");
  EXPECT_EQ(start(),
            "1 VIDIOC_STREAMON on video0 failed: Broken pipe (EPIPE): the links and pads on the camera's path do not "
            "fit together; \"media\" of the camera in the binding sets them.");
}

TEST_F(LinuxMediaTest, LinksAreSetBackWithTheControlAndPadsAndControlsStay) {
  const std::vector<FakeLink> before = board.links();
  binding.controls = {{"Exposure", 500}};
  ASSERT_EQ(take(), "done");
  EXPECT_NE(board.links(), before);
  ASSERT_EQ(release(), "done");
  EXPECT_EQ(board.links(), before);
  EXPECT_EQ(board.history(board.media).back(), "Sensor A -> Converter on") << "the last one that was set comes first";
  EXPECT_EQ(board.format(board::kScaler, 1).width, 640U);
  EXPECT_EQ(board.control(board.sensors[1], V4L2_CID_EXPOSURE), 500);
  EXPECT_TRUE(board.kernel->isIdle());
}

TEST_F(LinuxMediaTest, WhatIsAsTheBindingSaysIsNotSetAgain) {
  ASSERT_EQ(take(), "done");
  ASSERT_EQ(release(), "done");
  const auto sets = [this] { return board.history(board.kernel->roots().dev.string() + "/v4l-subdev3").size(); };
  const std::size_t before = sets();
  EXPECT_EQ(before, 3U) << "a format, a crop, and the other pad";
  ASSERT_EQ(take(), "done");
  ASSERT_EQ(start(), "done");
  EXPECT_EQ(sets(), before);
}

TEST_F(LinuxMediaTest, WhatAnotherProcessChangedIsSetAgainAtTheStart) {
  ASSERT_EQ(take(), "done");
  board.kernel->with(board.media, [](FakeNode& node) {
    node.media->links[2].flags = 0;
    node.media->entities[board::kConverter].pads[0].format.width = 16;
    return 0;
  });
  EXPECT_EQ(start(), "done");
}

TEST_F(LinuxMediaTest, ALinkOfTwoCamerasIsSetBackWithTheLastOfThem) {
  const std::vector<FakeLink> before = board.links();
  FakeNode other = fakeCamera("platform:fake-isp");
  other.card = "other";
  const std::string node = board.kernel->add(1, other);
  board.kernel->with(board.media, [&](FakeNode& media) {
    media.media->entities.push_back({"Other", MEDIA_ENT_F_IO_V4L, node, {}});
    return 0;
  });
  Binding all;
  all.cameras = {binding, binding};
  all.cameras[1].port = "FrontFacingCamera";
  all.cameras[1].node.name = "other node";
  const auto both = makeLinuxCapture(all, board.kernel, board.kernel->roots())->defaultPlugIn()->device(nullptr);
  const CaptureStreams streams = *both->streams(nullptr);
  ASSERT_EQ(outcome([&](auto* error) { return both->requestControlOfStreams(streams, error); }), "done");
  const std::vector<FakeLink> set = board.links();
  ASSERT_TRUE(both->relinquishControlOfStreams({streams[0]}, nullptr));
  EXPECT_EQ(board.links(), set);
  ASSERT_TRUE(both->relinquishControlOfStreams({streams[1]}, nullptr));
  EXPECT_EQ(board.links(), before);
}

TEST_F(LinuxMediaTest, WhatCannotBeSetIsToldWithEntityAndPadAndTheLinksAreSetBack) {
  struct Row {
    const char* name;
    void (*change)(BoardUser& test);
    std::string want;
  };
  const Row rows[] = {
      {"no such controller", [](BoardUser& test) { test.binding.media->device.driver = "none"; },
       "2 BackFacingCamera: no media controller is driver none, model Fake ISP; there are media0 (driver fake-isp, "
       "model Fake ISP, bus platform:fake-isp)."},
      {"a controller that cannot be opened",
       [](BoardUser& test) {
         test.board.kernel->with(test.board.media, [](FakeNode& node) { return node.openProblem = EACCES; });
       },
       "4 BackFacingCamera: no media controller is model Fake ISP; there are media0 (open on media0 failed: Permission "
       "denied (EACCES))."},
      {"two controllers", [](BoardUser& test) { test.board.kernel->addMedia(7, {}); },
       "3 BackFacingCamera: more than one media controller is model Fake ISP; there are media0 (driver fake-isp, model "
       "Fake ISP, bus platform:fake-isp), media7 (driver fake-isp, model Fake ISP, bus platform:fake-isp)."},
      {"no topology",
       [](BoardUser& test) { test.board.kernel->failNext(test.board.media, MEDIA_IOC_G_TOPOLOGY, ENOTTY, 1); },
       "1 MEDIA_IOC_G_TOPOLOGY on media0 failed: Inappropriate ioctl for device (ENOTTY)"},
      {"an entity that is not there", [](BoardUser& test) { test.binding.media->links[2].sink.entity = "Scalar"; },
       "5 BackFacingCamera: media0 has no entity \"Scalar\"; its entities are \"Sensor A\", \"Sensor B\", "
       "\"Converter\", \"Scaler\", \"Camera\", \"Flash\"."},
      {"two entities of one name",
       [](BoardUser& test) {
         test.board.kernel->with(test.board.media, [](FakeNode& node) {
           node.media->entities[board::kSensorA].name = "Sensor B";
           return 0;
         });
         test.binding.media->links.erase(test.binding.media->links.begin());
       },
       "3 BackFacingCamera: media0 has 2 entities \"Sensor B\"."},
      {"a link that is not there", [](BoardUser& test) { test.binding.media->links[2].source.pad = 0; },
       "5 BackFacingCamera: media0 has no link \"Converter:0\" -> \"Scaler:0\"; those from \"Converter\" and to "
       "\"Scaler\" are \"Converter:1\" -> \"Scaler:0\"."},
      {"a link that is always enabled", [](BoardUser& test) { test.binding.media->links[3].enabled = false; },
       "5 BackFacingCamera: the link \"Scaler:1\" -> \"Camera:0\" of media0 cannot be changed; it is always enabled."},
      {"a link that the driver refuses",
       [](BoardUser& test) { test.board.kernel->failNext(test.board.media, MEDIA_IOC_SETUP_LINK, EBUSY, 1, 1); },
       "8 BackFacingCamera: MEDIA_IOC_SETUP_LINK of \"Sensor B:0\" -> \"Converter:0\" on media0 failed: Device or "
       "resource busy (EBUSY)"},
      {"a pad that is not there", [](BoardUser& test) { test.binding.media->pads[1].pad.pad = 2; },
       "5 BackFacingCamera: the entity \"Converter\" has no pad 2; it has 2 pads."},
      {"a pad of an entity without a device file",
       [](BoardUser& test) {
         test.binding.media->pads[1].pad = {"Camera", 0};
       },
       "5 BackFacingCamera: the entity \"Camera\" is no sub-device with a device file, so it has nothing to set."},
      {"a sub-device that cannot be opened",
       [](BoardUser& test) {
         test.board.kernel->with(test.board.sensors[1], [](FakeNode& node) { return node.openProblem = EACCES; });
       },
       "4 BackFacingCamera: \"Sensor B\": open on v4l-subdev1 failed: Permission denied (EACCES)"},
      {"a format that the pad does not take",
       [](BoardUser& test) { test.binding.media->pads[0].format->code = MEDIA_BUS_FMT_Y8_1X8; },
       "5 BackFacingCamera: the pad \"Sensor B:0\" does not take the format Y8_1X8 of 1280 x 720; its driver has set "
       "RGB888_1X24 of 1280 x 720."},
      {"a format that cannot be read",
       [](BoardUser& test) { test.board.kernel->failNext(test.board.sensors[1], VIDIOC_SUBDEV_G_FMT, EIO); },
       "1 VIDIOC_SUBDEV_G_FMT of \"Sensor B:0\" on v4l-subdev1 failed: Input/output error (EIO)"},
      {"a format that cannot be set",
       [](BoardUser& test) { test.board.kernel->failNext(test.board.sensors[1], VIDIOC_SUBDEV_S_FMT, EBUSY); },
       "8 VIDIOC_SUBDEV_S_FMT of \"Sensor B:0\" on v4l-subdev1 failed: Device or resource busy (EBUSY)"},
      {"a crop that does not fit", [](BoardUser& test) { test.binding.media->pads[2].crop->width = 2000; },
       "5 BackFacingCamera: the pad \"Scaler:0\" cannot be cropped to 2000 x 712 at (8, 4); its driver has set 1280 x "
       "712 at (8, 4)."},
      {"a pad that does not crop",
       [](BoardUser& test) {
         test.binding.media->pads[3].crop = FrameArea{0, 0, 1, 1};
       },
       "1 VIDIOC_SUBDEV_G_SELECTION of \"Scaler:1\" on v4l-subdev3 failed: Invalid argument (EINVAL)"},
      {"an interval that the pad does not take",
       [](BoardUser& test) {
         test.binding.media->pads[0].interval = FrameInterval{1, 90};
       },
       "5 BackFacingCamera: the pad \"Sensor B:0\" does not take the interval 1/90 s; its driver has set 1/30 s."},
      {"a pad without intervals",
       [](BoardUser& test) {
         test.binding.media->pads[1].interval = FrameInterval{1, 30};
       },
       "1 VIDIOC_SUBDEV_S_FRAME_INTERVAL of \"Converter:0\" on v4l-subdev2 failed: Inappropriate ioctl for device "
       "(ENOTTY)"},
      {"a sub-device that is not there", [](BoardUser& test) { test.binding.media->subdevices = {"Lamp"}; },
       "5 BackFacingCamera: media0 has no entity \"Lamp\"; its entities are \"Sensor A\", \"Sensor B\", \"Converter\", "
       "\"Scaler\", \"Camera\", \"Flash\"."},
      {"a control of several",
       [](BoardUser& test) {
         test.binding.media->subdevices = {"Sensor A"};
         test.binding.controls = {{"Exposure", 3}};
       },
       "3 the control \"Exposure\" belongs to several sub-devices of video0; name it as one of \"Sensor B:Exposure\", "
       "\"Sensor A:Exposure\"."},
      {"a control of none",
       [](BoardUser& test) {
         test.binding.controls = {{"Gain", 3}};
       },
       "5 video0 and its sub-devices \"Scaler\", \"Converter\", \"Sensor B\" have no control \"Gain\"."},
  };
  for (const Row& row : rows) {
    BoardUser user;
    row.change(user);
    const std::vector<FakeLink> before = user.board.links();
    EXPECT_EQ(user.take(), row.want) << row.name;
    EXPECT_EQ(user.board.links(), before) << row.name;
    user.close();
    EXPECT_TRUE(user.board.kernel->isIdle()) << row.name;
  }
}

// After the controllers were listed and the graph was read, the kernel gives a number to another device.
TEST_F(LinuxMediaTest, ADeviceThatAnotherReplacedIsRefusedBeforeItIsSet) {
  const std::filesystem::path sysfs = board.kernel->roots().sysfs;
  const std::vector<FakeLink> links = board.links();
  int opened = 0;
  board.kernel->beforeOpen = [&](const std::string& path) {
    if (!path.ends_with("/media0") || ++opened != 2) return;  // the first is only asked what it is
    const std::filesystem::path entry = sysfs / "bus" / "media" / "devices" / "media0";
    std::filesystem::rename(entry, entry.string() + "-unplugged");
    std::filesystem::create_directory(entry);
  };
  EXPECT_THAT(take(),
              AllOf(StartsWith("9 media0 ("), EndsWith(") was replaced by another device before it was opened.")));
  EXPECT_EQ(opened, 2);
  EXPECT_EQ(board.links(), links);

  board.kernel->beforeOpen = [&](const std::string& path) {
    const std::string name = std::filesystem::path(path).filename().string();
    if (!name.starts_with("v4l-subdev")) return;
    for (const auto& entry : std::filesystem::directory_iterator(sysfs / "dev" / "char")) {
      std::ofstream(entry.path() / "uevent") << "DEVNAME=other\n";
    }
  };
  EXPECT_THAT(take(),
              AllOf(StartsWith("9 v4l-subdev"), EndsWith(" was replaced by another device before it was opened.")));
  EXPECT_EQ(board.links(), links);
  close();
  EXPECT_TRUE(board.kernel->isIdle());
}

TEST_F(LinuxMediaTest, LinksOutsideOfTheBindingAreLeftAsTheyAre) {
  // Whatever the binding sets, and wherever it fails, no other link is touched, and at the end all are as before.
  for (std::uint32_t chosen = 0; chosen < 16; ++chosen) {
    for (int failing = 0; failing <= 4; ++failing) {
      BoardUser user;
      std::vector<LinkBinding> wanted;
      const std::vector<FakeLink> before = user.board.links();
      for (std::size_t i = 0; i < 4; ++i) {
        if ((chosen >> i & 1) != 0) wanted.push_back(user.binding.media->links[i]);
      }
      user.binding.media->links = wanted;
      if (failing < 4) user.board.kernel->failNext(user.board.media, MEDIA_IOC_SETUP_LINK, EIO, 1, failing);
      const std::string taken = user.take();
      user.board.kernel->failNext(user.board.media, MEDIA_IOC_SETUP_LINK, 0, 0);  // nothing fails from here on
      const std::vector<FakeLink> during = user.board.links();
      for (std::size_t i = 0; i < 4; ++i) {
        const bool isOfBinding = (chosen >> i & 1) != 0;
        EXPECT_TRUE(isOfBinding || during[i] == before[i]) << chosen << " " << failing;
      }
      EXPECT_EQ(taken, taken == "done" ? user.release() : taken);
      EXPECT_EQ(user.board.links(), before) << chosen << " " << failing << " " << taken;
      user.close();
      EXPECT_TRUE(user.board.kernel->isIdle());
    }
  }
}

TEST_F(LinuxMediaTest, ALinkThatCannotBeSetBackIsLogged) {
  const auto log = std::make_shared<LogLines>();
  ASSERT_EQ(take(), "done");
  board.kernel->failNext(board.media, MEDIA_IOC_SETUP_LINK, EBUSY);
  sharedLog().setBackend(log, LogLevel::kDefault);
  EXPECT_EQ(release(), "done");
  sharedLog().setBackend(nullptr, LogLevel::kError);
  ASSERT_EQ(log->lines().size(), 1U);
  EXPECT_THAT(log->lines()[0], HasSubstr("setting back the link \"Converter:1\" -> \"Scaler:0\" on "));
}

TEST_F(LinuxMediaTest, ControlsAreThoseOfTheSensorOnThePath) {
  binding.controls = {{"Exposure", 500}};
  ASSERT_EQ(take(), "done");
  EXPECT_EQ(board.control(board.sensors[1], V4L2_CID_EXPOSURE), 500);
  EXPECT_EQ(board.control(board.sensors[0], V4L2_CID_EXPOSURE), 100) << "it is not on the path";
}

TEST_F(LinuxMediaTest, AControlCanBeNamedAfterItsEntity) {
  binding.media->subdevices = {"Sensor A"};
  binding.controls = {{"Sensor A:Exposure", 7}, {"Sensor B:0x00980911", 8}};
  ASSERT_EQ(take(), "done");
  EXPECT_EQ(board.control(board.sensors[0], V4L2_CID_EXPOSURE), 7);
  EXPECT_EQ(board.control(board.sensors[1], V4L2_CID_EXPOSURE), 8);
}

TEST_F(LinuxMediaTest, AutomaticExposureIsThatOfTheSensor) {
  board.kernel->with(board.sensors[1], [](FakeNode& node) {
    const FakeControl exposure{V4L2_CID_EXPOSURE_AUTO, "Auto Exposure", 0, 1, V4L2_EXPOSURE_AUTO, V4L2_CTRL_TYPE_MENU};
    node.controls.insert(node.controls.begin() + 1, exposure);  // by their ids
    return 0;
  });
  ASSERT_EQ(take(), "done");
  EXPECT_EQ(stream->valueForProperty(capture_key::AEEnabled, nullptr), Value(true));
  EXPECT_EQ(set(capture_key::AEEnabled, false), "done");
  EXPECT_EQ(board.control(board.sensors[1], V4L2_CID_EXPOSURE_AUTO), V4L2_EXPOSURE_MANUAL);
}

TEST_F(LinuxMediaTest, TheRateIsSetByTheBlankingOfTheSensor) {
  binding.formats[0].interval.reset();
  ASSERT_EQ(take(), "done");
  ASSERT_EQ(set(capture_key::FormatIndex, 0), "done");
  EXPECT_EQ(setRate(20), "done");
  EXPECT_EQ(board.control(board.sensors[1], V4L2_CID_VBLANK), 480) << "(1280 + 720) x (720 + 480) pixels, 20 times";
  EXPECT_EQ(setRate(90),
            "5 BackFacingCamera: v4l-subdev1 does not support 1/90 s between frames in this format; its blanking "
            "controls allow 8.824 to 31.579 frames per second.");
}

TEST_F(LinuxMediaTest, CountersAndMetadataMayBeControlsOfTheSensor) {
  SeenFrames seen;
  binding.errorCounters = {{"I2CErrorCount", {}, "Sensor B:Exposure"}};
  binding.metadata.controls = {{"Exposed", "Exposure"}};
  ASSERT_EQ(take(), "done");
  const Dictionary handlers{
      {text(capture_key::PixelBufferHandler), std::make_shared<PixelBufferHandler>(seen.handler())}};
  const auto output = [](Value value) { return Dictionary{{text(capture_key::PrimaryScaler), std::move(value)}}; };
  ASSERT_EQ(set(capture_key::VideoOutputsEnabled, output(true)), "done");
  ASSERT_EQ(set(capture_key::VideoOutputHandlers, output(handlers)), "done");
  ASSERT_EQ(start(), "done");
  board.kernel->with(board.sensors[1], [](FakeNode& node) { return node.controls[0].value = 104; });
  board.kernel->passTime(100ms);
  EXPECT_EQ(seen.wait(1).at(0).metadata, (Dictionary{{"Exposed", 104}}));
  const std::optional<Value> counters = stream->valueForProperty(capture_key::ErrorCounters, nullptr);
  EXPECT_EQ(toSigned(entryOf(pointerTo(counters), "I2CErrorCount")), 4);
  EXPECT_EQ(stop(), "done");
  close();
  EXPECT_TRUE(board.kernel->isIdle());
}

TEST_F(LinuxMediaTest, TheProjectorMayBeAFlashAndIsGuardedThere) {
  binding.media->subdevices = {"Flash"};
  binding.projector = ProjectorBinding{{{"LED Mode", 2}, {"Exposure", 50}},
                                       {{"LED Mode", 0}, {"Intensity, Torch Mode", 0}, {"Exposure", 100}},
                                       {},
                                       {},
                                       "Intensity, Torch Mode"};
  ASSERT_EQ(take(), "done");
  EXPECT_EQ(board.control(board.flash, V4L2_CID_FLASH_LED_MODE), 0);
  EXPECT_EQ(set(capture_key::InfraredLightSourceConfiguration, FakeCameras::light(1, 0, 70)), "done");
  ASSERT_EQ(start(), "done");
  EXPECT_EQ(board.kernel->guards(), 2) << "the flash and the sensor";
  EXPECT_EQ(board.control(board.flash, V4L2_CID_FLASH_LED_MODE), 2);
  EXPECT_EQ(board.control(board.flash, V4L2_CID_FLASH_TORCH_INTENSITY), 70);
  EXPECT_EQ(board.control(board.sensors[1], V4L2_CID_EXPOSURE), 50);
  EXPECT_EQ(stop(), "done");
  EXPECT_EQ(board.kernel->guards(), 0);
  EXPECT_EQ(board.control(board.flash, V4L2_CID_FLASH_LED_MODE), 0);
  EXPECT_EQ(board.control(board.flash, V4L2_CID_FLASH_TORCH_INTENSITY), 0);
  EXPECT_EQ(board.control(board.sensors[1], V4L2_CID_EXPOSURE), 100);
}

TEST_F(LinuxMediaTest, AFlashThatBelongsToTheSensorNeedsNoMention) {
  board.kernel->with(board.media, [](FakeNode& node) {
    node.media->ancillary = {{board::kSensorB, board::kFlash}};
    return 0;
  });
  binding.controls = {{"LED Mode", 1}};
  ASSERT_EQ(take(), "done");
  EXPECT_EQ(board.control(board.flash, V4L2_CID_FLASH_LED_MODE), 1);
}

}  // namespace
}  // namespace quazor
