#include "backends/linux/video/v4l2_device_info.h"

#include "backends/linux/capture/linux_capture_for_tests.h"
#include "backends/linux/video/v4l2_device.h"

#include <cerrno>

namespace quazor {
namespace {

using Kernel = std::shared_ptr<FakeV4l2Api>;

std::vector<std::string> namesOf(const std::vector<V4l2DeviceInfo>& nodes) {
  std::vector<std::string> names;
  for (const V4l2DeviceInfo& node : nodes) names.push_back(node.path.filename().string());
  return names;
}

TEST(VideoNodesTest, AMachineWithoutCamerasHasNone) {
  const Kernel kernel = std::make_shared<FakeV4l2Api>();
  EXPECT_TRUE(videoNodes(kernel, kernel->roots()).empty());
}

TEST(VideoNodesTest, NodesComeByTheirNumbersAndOtherThingsAreNone) {
  const Kernel kernel = std::make_shared<FakeV4l2Api>();
  for (const int number : {10, 2, 0}) kernel->add(number, fakeCamera("fake:0"));
  for (const char* name : {"v4l-subdev0", "radio0", "videoX", "video1b", "video"}) {
    std::filesystem::create_directories(kernel->roots().sysfs / "class" / "video4linux" / name);
  }
  EXPECT_EQ(namesOf(videoNodes(kernel, kernel->roots())), (std::vector<std::string>{"video0", "video2", "video10"}));
}

TEST(VideoNodesTest, ANodeIsOpenedForQueriesOnceUnlessItWasReplacedOrUnusable) {
  const Kernel kernel = std::make_shared<FakeV4l2Api>();
  const std::string first = kernel->add(0, fakeCamera("fake:0"));
  FakeNode closed = fakeCamera("fake:1");
  closed.openProblem = EACCES;
  const std::string second = kernel->add(1, closed);
  const auto queried = [&](const std::string& path) {
    return kernel->with(path, [](FakeNode& node) { return node.queried; });
  };
  std::vector<V4l2DeviceInfo> nodes = videoNodes(kernel, kernel->roots());
  kernel->with(second, [](FakeNode& node) { return node.openProblem = 0; });
  nodes = videoNodes(kernel, kernel->roots(), nodes);
  nodes = videoNodes(kernel, kernel->roots(), nodes);
  EXPECT_EQ(queried(first), 1);
  EXPECT_EQ(queried(second), 1) << "as soon as it can be opened";
  EXPECT_EQ(nodes.at(1).busInfo, "fake:1");
  std::filesystem::create_directories(kernel->roots().sysfs / "class" / "video4linux" / "video9");  // takes its inode
  kernel->add(0, fakeCamera("fake:7"));
  nodes = videoNodes(kernel, kernel->roots(), nodes);
  EXPECT_EQ(nodes.at(0).busInfo, "fake:7");
}

// So it is at most as long as a text of a binding.
TEST(VideoNodesTest, ATextWithoutItsEndLosesItsLastCharacter) {
  const Kernel kernel = std::make_shared<FakeV4l2Api>();
  FakeNode camera = fakeCamera(std::string(40, 'b'));
  camera.driver = std::string(40, 'd');
  camera.card = std::string(40, 'c');
  kernel->add(0, camera);
  const V4l2DeviceInfo node = videoNodes(kernel, kernel->roots()).at(0);
  EXPECT_EQ(node.driver, std::string(15, 'd'));
  EXPECT_EQ(node.card, std::string(31, 'c'));
  EXPECT_EQ(node.busInfo, std::string(31, 'b'));
}

TEST(VideoNodesTest, ADriverThatRepeatsAControlEndsItsList) {
  const Kernel kernel = std::make_shared<FakeV4l2Api>();
  FakeNode camera = fakeCamera("fake:0");
  camera.controls = {{V4L2_CID_BRIGHTNESS, "Brightness"}, {V4L2_CID_CONTRAST, "Contrast"}};
  const std::string path = kernel->add(0, camera);
  kernel->afterCall = [](unsigned long request, void* argument) {
    if (request == VIDIOC_QUERY_EXT_CTRL) static_cast<v4l2_query_ext_ctrl*>(argument)->id = V4L2_CID_BRIGHTNESS;
  };
  const auto device = V4l2Device::open(kernel, path, nullptr);
  ASSERT_NE(device, nullptr);
  EXPECT_EQ(device->controls().size(), 1U);
}

TEST(VideoNodesTest, ADriverThatNeverEndsItsListsIsAskedALimitedNumberOfTimes) {
  constexpr std::size_t kMany = 200'000;
  class Endless final : public FakeV4l2Api {
   public:
    int ioctl(int descriptor, unsigned long request, void* argument) override {
      const bool isList =
          request == VIDIOC_ENUM_FMT || request == VIDIOC_ENUM_FRAMESIZES || request == VIDIOC_ENUM_FRAMEINTERVALS;
      if (!isList || calls == kMany) return FakeV4l2Api::ioctl(descriptor, request, argument);
      ++calls;
      if (request == VIDIOC_ENUM_FRAMESIZES)
        static_cast<v4l2_frmsizeenum*>(argument)->type = V4L2_FRMSIZE_TYPE_DISCRETE;
      if (request != VIDIOC_ENUM_FRAMEINTERVALS) return 0;
      static_cast<v4l2_frmivalenum*>(argument)->type = V4L2_FRMIVAL_TYPE_DISCRETE;
      return 0;
    }
    std::size_t calls = 0;
  };
  const auto kernel = std::make_shared<Endless>();
  const auto device = V4l2Device::open(kernel, kernel->add(0, fakeCamera("fake:0")), nullptr);
  ASSERT_NE(device, nullptr);
  EXPECT_FALSE(device->formats().empty());
  EXPECT_LT(kernel->calls, kMany);
}

TEST(VideoNodesTest, ANodeThatWasReplacedBeforeItIsOpenedIsRefused) {
  const Kernel kernel = std::make_shared<FakeV4l2Api>();
  const std::string path = kernel->add(0, fakeCamera("fake:0"));
  const std::vector<V4l2DeviceInfo> nodes = videoNodes(kernel, kernel->roots());
  EXPECT_EQ(outcome([&](auto* error) { return V4l2Device::open(kernel, nodes.at(0), error); }), "done");
  kernel->with(path, [](FakeNode& node) { return node.bus = "fake:1"; });
  EXPECT_EQ(outcome([&](auto* error) { return V4l2Device::open(kernel, nodes.at(0), error); }),
            "9 " + path +
                " (driver fake, card fake camera, bus fake:0) was replaced by another device before it was "
                "opened.");
  EXPECT_TRUE(kernel->isIdle());
}

// Twins that were unplugged and plugged in the other way round differ in nothing else.
TEST(VideoNodesTest, ATwinThatTookTheNumberOfANodeIsRefused) {
  const Kernel kernel = std::make_shared<FakeV4l2Api>();
  const std::string path = kernel->add(0, fakeCamera("fake:0"));
  kernel->add(1, fakeCamera("fake:0"));
  const std::vector<V4l2DeviceInfo> nodes = videoNodes(kernel, kernel->roots());
  const std::filesystem::path entries = kernel->roots().sysfs / "class" / "video4linux";
  std::filesystem::rename(entries / "video0", entries / "unplugged");
  std::filesystem::rename(entries / "video1", entries / "video0");
  EXPECT_EQ(outcome([&](auto* error) { return V4l2Device::open(kernel, nodes.at(0), error); }),
            "9 " + path +
                " (driver fake, card fake camera, bus fake:0) was replaced by another device before it was "
                "opened.");
  EXPECT_TRUE(kernel->isIdle());
}

TEST(VideoNodesTest, ANodeTellsWhatItIsOrWhyItCannotBeOpened) {
  const Kernel kernel = std::make_shared<FakeV4l2Api>();
  kernel->add(0, fakeCamera("fake:0"));
  kernel->add(1, fakeMetadata("fake:0"));
  FakeNode output = fakeCamera("fake:0");
  output.capabilities = V4L2_CAP_VIDEO_OUTPUT | V4L2_CAP_STREAMING;
  kernel->add(2, output);
  FakeNode reading = fakeCamera("fake:0");
  reading.capabilities = V4L2_CAP_VIDEO_CAPTURE | V4L2_CAP_READWRITE;
  kernel->add(3, reading);
  FakeNode closed = fakeCamera("fake:0");
  closed.openProblem = EACCES;
  const std::string path = kernel->add(4, closed);
  kernel->add(5, fakeMultiplanarCamera("fake:0"));
  const std::vector<V4l2DeviceInfo> nodes = videoNodes(kernel, kernel->roots());
  ASSERT_EQ(nodes.size(), 6U);
  EXPECT_EQ(nodes[0].kind, VideoNodeKind::kCamera);
  EXPECT_EQ(nodes[0].capabilities, std::uint32_t{V4L2_CAP_VIDEO_CAPTURE | V4L2_CAP_STREAMING});
  EXPECT_EQ(nodes[0].systemName, "fake camera node");
  EXPECT_EQ(nodes[1].kind, VideoNodeKind::kMetadata);
  EXPECT_EQ(nodes[2].kind, VideoNodeKind::kOther);
  EXPECT_EQ(nodes[3].kind, VideoNodeKind::kOther);
  ASSERT_NE(nodes[4].problem, nullptr);
  EXPECT_EQ(textOf(nodes[4]), path + " (open on " + path + " failed: Permission denied (EACCES))");
  EXPECT_FALSE(detailsOf(kernel, nodes[4], nullptr));
  EXPECT_EQ(nodes[5].kind, VideoNodeKind::kCamera);
  EXPECT_EQ(detailsOf(kernel, nodes[5], nullptr)->formats.at(0).fourcc, "NM12");
  EXPECT_TRUE(kernel->isIdle());
}

TEST(VideoNodesTest, ADriverThatDoesNotAnswerIsToldAndClosed) {
  const Kernel kernel = std::make_shared<FakeV4l2Api>();
  const std::string path = kernel->add(0, fakeCamera("fake:0"));
  kernel->failNext(path, VIDIOC_QUERYCAP, ENOTTY);
  EXPECT_EQ(videoNodes(kernel, kernel->roots())[0].problem->localizedDescription(),
            "VIDIOC_QUERYCAP on " + path + " failed: Inappropriate ioctl for device (ENOTTY)");
  EXPECT_TRUE(kernel->isIdle());
}

TEST(VideoNodesTest, DetailsAreFormatsWithSizesAndIntervalsAndControls) {
  const Kernel kernel = std::make_shared<FakeV4l2Api>();
  FakeNode camera = fakeCamera("fake:0");
  camera.controls = {{V4L2_CID_USER_CLASS, "User Controls", 0, 0, 0, V4L2_CTRL_TYPE_CTRL_CLASS},
                     {V4L2_CID_BRIGHTNESS, "Brightness", -64, 64, 12},
                     {V4L2_CID_CONTRAST, "Contrast", 0, 9, 1, V4L2_CTRL_TYPE_INTEGER, V4L2_CTRL_FLAG_DISABLED}};
  kernel->add(0, camera);
  const auto details = detailsOf(kernel, videoNodes(kernel, kernel->roots())[0], nullptr);
  ASSERT_TRUE(details);
  ASSERT_EQ(details->formats.size(), 2U);
  const VideoFormat& grey = details->formats[1];
  EXPECT_EQ(grey.index, 1U);
  EXPECT_EQ(grey.fourcc, "GREY");
  EXPECT_EQ(grey.description, "8-bit grey");
  ASSERT_EQ(grey.sizes.size(), 2U);
  EXPECT_EQ(grey.sizes[1].width, 640U);
  EXPECT_EQ(grey.sizes[1].maximumHeight, 480U);
  EXPECT_EQ(grey.sizes[1].intervals, (std::vector<FrameInterval>{{1, 5}, {1, 25}}));
  EXPECT_FALSE(grey.sizes[1].anyIntervalBetween);
  ASSERT_EQ(details->controls.size(), 1U);
  EXPECT_EQ(details->controls[0].name, "Brightness");
  EXPECT_EQ(details->controls[0].minimum, -64);
  EXPECT_EQ(details->controls[0].maximum, 64);
  EXPECT_EQ(details->controls[0].defaultValue, 12);
}

// A driver that reports ranges.
class RangesKernel final : public FakeV4l2Api {
 public:
  int ioctl(int descriptor, unsigned long request, void* argument) override {
    if (request == VIDIOC_ENUM_FRAMESIZES) {
      auto& entry = *static_cast<v4l2_frmsizeenum*>(argument);
      entry.type = V4L2_FRMSIZE_TYPE_STEPWISE;
      entry.stepwise = {16, 1920, 2, 8, 1080, 4};
      return entry.index == 0 ? 0 : -EINVAL;
    }
    if (request == VIDIOC_ENUM_FRAMEINTERVALS) {
      auto& entry = *static_cast<v4l2_frmivalenum*>(argument);
      entry.type = V4L2_FRMIVAL_TYPE_CONTINUOUS;
      entry.stepwise = {{1, 60}, {1, 1}, {1, 1}};
      return 0;
    }
    return FakeV4l2Api::ioctl(descriptor, request, argument);
  }
};

TEST(VideoNodesTest, RangesOfSizesAndIntervalsAreToldByTheirEnds) {
  const auto kernel = std::make_shared<RangesKernel>();
  kernel->add(0, fakeCamera("fake:0"));
  const auto details = detailsOf(kernel, videoNodes(kernel, kernel->roots())[0], nullptr);
  ASSERT_TRUE(details);
  ASSERT_EQ(details->formats[0].sizes.size(), 1U);
  const FrameSize& size = details->formats[0].sizes[0];
  EXPECT_EQ(size.width, 16U);
  EXPECT_EQ(size.maximumWidth, 1920U);
  EXPECT_EQ(size.height, 8U);
  EXPECT_EQ(size.maximumHeight, 1080U);
  EXPECT_EQ(size.intervals, (std::vector<FrameInterval>{{1, 60}, {1, 1}}));
  EXPECT_TRUE(size.anyIntervalBetween);
}

class FindingTest : public testing::Test {
 protected:
  FindingTest() {
    kernel_->add(0, fakeCamera("fake:0"));
    kernel_->add(1, fakeCamera("fake:1"));
    kernel_->add(2, fakeMetadata("fake:0"));
    nodes_ = videoNodes(kernel_, kernel_->roots());
  }
  std::string find(const VideoNodeMatch& match) {
    std::string text = outcome([&](auto* error) {
      found_ = findVideoNode(nodes_, VideoNodeKind::kCamera, match, "Port", error);
      return found_;
    });
    const std::string dev = kernel_->roots().dev.string();
    for (std::size_t at = text.find(dev); at != std::string::npos; at = text.find(dev)) {
      text.replace(at, dev.size(), "/dev");
    }
    return text;
  }

  const Kernel kernel_ = std::make_shared<FakeV4l2Api>();
  std::vector<V4l2DeviceInfo> nodes_;
  std::optional<V4l2DeviceInfo> found_;
};

TEST_F(FindingTest, OneIsFoundByAnyOfWhatItsDriverSays) {
  EXPECT_EQ(find({"fake", "fake camera", "fake:1"}), "done");
  EXPECT_EQ(found_->path.filename(), "video1");
  EXPECT_EQ(find({{}, {}, "fake:0"}), "done") << "the metadata node at the same place is no camera";
}

TEST_F(FindingTest, NoneOrSeveralAreToldWithWhatThereIs) {
  const std::string all =
      "/dev/video0 (driver fake, card fake camera, bus fake:0), /dev/video1 (driver fake, card fake camera, bus "
      "fake:1)";
  EXPECT_EQ(find({"uvc", {}, "fake:1"}), "2 Port: no camera is driver uvc, bus fake:1; there are " + all + ".");
  EXPECT_EQ(find({{}, "fake camera", {}}), "3 Port: more than one camera is card fake camera; there are " + all + ".");
  EXPECT_EQ(find({}), "3 Port: more than one camera is any; there are " + all + ".");
  nodes_.clear();
  EXPECT_EQ(find({}), "2 Port: no camera is any; there is none.");
}

TEST_F(FindingTest, WhatCannotBeOpenedIsNamedForItMayBeTheOne) {
  FakeNode closed = fakeCamera("fake:3");
  closed.openProblem = EACCES;
  kernel_->add(3, closed);
  nodes_ = videoNodes(kernel_, kernel_->roots());
  nodes_.erase(nodes_.begin(), nodes_.begin() + 3);
  EXPECT_EQ(find({"uvc", {}, {}}),
            "4 Port: no camera is driver uvc; there is none; these could not be opened: /dev/video3 "
            "(open on /dev/video3 failed: Permission denied (EACCES)).");
  closed.openProblem = ENXIO;
  kernel_->add(3, closed);
  nodes_ = videoNodes(kernel_, kernel_->roots());
  EXPECT_EQ(find({"uvc", {}, {}}).substr(0, 2), "2 ");
}

TEST(OpenedVideoNodeTest, ControlsKeepTheirRangesAndTheirWidth) {
  const Kernel kernel = std::make_shared<FakeV4l2Api>();
  FakeNode camera = fakeCamera("fake:0");
  camera.controls = {{1, "Narrow", -5, 5, 0},
                     {2, "Wide", 0, INT64_MAX, 0, V4L2_CTRL_TYPE_INTEGER64},
                     {3, "Button", 0, 0, 0, V4L2_CTRL_TYPE_BUTTON}};
  const std::string path = kernel->add(0, camera);
  const auto node = V4l2Device::open(kernel, path, nullptr);
  const auto set = [&](const char* name, std::int64_t value) {
    return outcome([&](auto* error) { return node->set(*node->control(name, nullptr), value, error); });
  };
  EXPECT_EQ(set("Narrow", -5), "done");
  EXPECT_EQ(node->read(*node->control("Narrow", nullptr), nullptr), -5);
  EXPECT_EQ(set("Narrow", 6), "6 " + path + ": the control \"Narrow\" accepts -5 to 5, not 6.");
  EXPECT_EQ(set("Narrow", -6), "6 " + path + ": the control \"Narrow\" accepts -5 to 5, not -6.");
  EXPECT_EQ(set("Wide", 1LL << 40), "done");
  EXPECT_EQ(node->read(*node->control("Wide", nullptr), nullptr), 1LL << 40);
  EXPECT_EQ(set("Button", 1), "done") << "a button has no range";
  EXPECT_TRUE(valueFor(*node->control("Wide", nullptr), 1).is64Bit);
  EXPECT_FALSE(valueFor(*node->control("Narrow", nullptr), 1).is64Bit);
}

TEST(OpenedVideoNodeTest, AControlThatCannotBeDescribedDoesNotEndTheList) {
  const Kernel kernel = std::make_shared<FakeV4l2Api>();
  FakeNode camera = fakeCamera("fake:0");
  camera.controls = {{V4L2_CID_BRIGHTNESS, "Brightness"},
                     {V4L2_CID_CONTRAST, "Contrast"},
                     {V4L2_CID_SATURATION, "Saturation"},
                     {V4L2_CID_HUE, "Hue"},
                     {V4L2_CID_GAIN, "Gain"},
                     {V4L2_CID_EXPOSURE_AUTO, "Auto Exposure", 0, 3, 1, V4L2_CTRL_TYPE_MENU},
                     {V4L2_CID_PRIVACY, "Privacy"}};
  camera.controls[1].describeProblem = EPIPE;
  camera.controls[3].describeProblem = EIO;
  camera.controls[6].describeProblem = EIO;
  const std::string path = kernel->add(0, camera);
  const auto node = V4l2Device::open(kernel, path, nullptr);
  ASSERT_NE(node, nullptr);
  std::string names;
  for (const VideoControl& control : node->controls()) names += control.name + " ";
  EXPECT_EQ(names, "Brightness Saturation Gain Auto Exposure ");
  const std::string undescribed = "0x00980901 (EPIPE), 0x00980903 (EIO), 0x009A0910 (EIO)";
  EXPECT_EQ(node->undescribedControls(), undescribed);
  EXPECT_EQ(
      outcome([&](auto* error) { return node->control("Contrast", error); }),
      "5 " + path + " has no control \"Contrast\"; its driver does not describe the controls " + undescribed + ".");
  EXPECT_TRUE(node->mayHaveControl(V4L2_CID_CONTRAST));
  EXPECT_FALSE(node->mayHaveControl(V4L2_CID_BACKLIGHT_COMPENSATION));
}

// A driver may say that there is no further control where there is one that it cannot describe.
TEST(OpenedVideoNodeTest, AListThatEndsBeforeANeededControlGoesOn) {
  const Kernel kernel = std::make_shared<FakeV4l2Api>();
  FakeNode camera = fakeCamera("fake:0");
  camera.controls = {{V4L2_CID_BRIGHTNESS, "Brightness"},
                     {V4L2_CID_CONTRAST, "Contrast"},
                     {V4L2_CID_GAIN, "Gain"},
                     {V4L2_CID_EXPOSURE_AUTO, "Auto Exposure", 0, 3, 1, V4L2_CTRL_TYPE_MENU},
                     {V4L2_CID_PRIVACY, "Privacy"}};
  camera.controls[1].describeProblem = EINVAL;
  const std::string path = kernel->add(0, camera);
  const auto namesOf = [&] {
    std::string names;
    const auto node = V4l2Device::open(kernel, path, nullptr);
    for (const VideoControl& control : node->controls()) names += control.name + " ";
    return names + "(" + node->undescribedControls() + ")";
  };
  EXPECT_EQ(namesOf(), "Brightness Gain Auto Exposure Privacy (after 0x00980900 (EINVAL))");
  kernel->with(path, [](FakeNode& node) {
    node.controls[1].describeProblem = 0;
    return 0;
  });
  EXPECT_EQ(namesOf(), "Brightness Contrast Gain Auto Exposure Privacy ()");
  kernel->with(path, [](FakeNode& node) {
    node.controls.erase(node.controls.begin() + 3, node.controls.end());
    return 0;
  });
  EXPECT_EQ(namesOf(), "Brightness Contrast Gain ()");
}

TEST(OpenedVideoNodeTest, AListThatCannotBeReadMayHaveAnyControl) {
  const Kernel kernel = std::make_shared<FakeV4l2Api>();
  FakeNode camera = fakeCamera("fake:0");
  camera.controls = {{V4L2_CID_BRIGHTNESS, "Brightness"}, {0x0f000000, "of no known class"}};
  camera.controls[1].describeProblem = EIO;
  const auto node = V4l2Device::open(kernel, kernel->add(0, camera), nullptr);
  EXPECT_EQ(node->controls().size(), 1U);
  EXPECT_EQ(node->undescribedControls(), "after 0x00980900 (EIO)");
  EXPECT_TRUE(node->mayHaveControl(V4L2_CID_EXPOSURE_AUTO));
}

TEST(OpenedVideoNodeTest, AControlThatTheDriverSetsToAnotherValueIsRefused) {
  const Kernel kernel = std::make_shared<FakeV4l2Api>();
  FakeNode camera = fakeCamera("fake:0");
  camera.controls = {
      {1, "Narrow", 0, 100, 5}, {2, "Wide", 0, 1LL << 40, 5, V4L2_CTRL_TYPE_INTEGER64}, {3, "Volatile", 0, 100, 5}};
  camera.controls[0].stuck = 98;
  camera.controls[1].stuck = 1LL << 33;
  camera.controls[2].stuck = 7;
  camera.controls[2].flags = V4L2_CTRL_FLAG_VOLATILE;
  const std::string path = kernel->add(0, camera);
  const auto node = V4l2Device::open(kernel, path, nullptr);
  const auto set = [&](const char* name, std::int64_t value) {
    return outcome([&](auto* error) { return node->set(*node->control(name, nullptr), value, error); });
  };
  EXPECT_EQ(set("Narrow", 99), "6 " + path + ": the driver set the control \"Narrow\" to 98 instead of 99.");
  EXPECT_EQ(set("Narrow", 98), "done");
  EXPECT_EQ(set("Wide", 1), "6 " + path + ": the driver set the control \"Wide\" to 8589934592 instead of 1.");
  EXPECT_EQ(set("Volatile", 99), "done") << "the device changes it itself";
}

TEST(OpenedVideoNodeTest, AControlIsFoundByItsNumberAndByItsNameInOtherKernels) {
  const Kernel kernel = std::make_shared<FakeV4l2Api>();
  FakeNode camera = fakeCamera("fake:0");
  camera.controls = {{V4L2_CID_EXPOSURE_AUTO, "Auto Exposure"},
                     {V4L2_CID_EXPOSURE_ABSOLUTE, "Exposure (Absolute)"},
                     {V4L2_CID_FOCUS_AUTO, "Focus, Auto"}};
  const std::string path = kernel->add(0, camera);
  const auto node = V4l2Device::open(kernel, path, nullptr);
  const auto idOf = [&](std::string_view name) {
    const VideoControl* const control = node->control(name, nullptr);
    return control == nullptr ? 0 : control->id;
  };
  EXPECT_EQ(idOf("0x009A0901"), std::uint32_t{V4L2_CID_EXPOSURE_AUTO});
  EXPECT_EQ(idOf("0x9a0901"), std::uint32_t{V4L2_CID_EXPOSURE_AUTO});
  EXPECT_EQ(idOf("0x009A0902 "), 0U);
  EXPECT_EQ(idOf("Auto Exposure"), std::uint32_t{V4L2_CID_EXPOSURE_AUTO});
  EXPECT_EQ(idOf("Exposure, Auto"), std::uint32_t{V4L2_CID_EXPOSURE_AUTO}) << "the name before Linux 5.14";
  EXPECT_EQ(idOf("Exposure Time, Absolute"), std::uint32_t{V4L2_CID_EXPOSURE_ABSOLUTE}) << "the name since then";
  EXPECT_EQ(idOf("Focus, Automatic Continuous"), std::uint32_t{V4L2_CID_FOCUS_AUTO});
  EXPECT_EQ(idOf("Zoom, Absolute"), 0U) << "the camera has no zoom";
  EXPECT_EQ(outcome([&](auto* error) { return node->control("0x009A0999", error); }),
            "5 " + path + " has no control \"0x009A0999\".");
}

TEST(OpenedVideoNodeTest, AFormatThatTheDriverChangesAsItIsSetIsRefused) {
  class ChangingKernel final : public FakeV4l2Api {
   public:
    int ioctl(int descriptor, unsigned long request, void* argument) override {
      const int result = FakeV4l2Api::ioctl(descriptor, request, argument);
      if (request == VIDIOC_S_FMT) static_cast<v4l2_format*>(argument)->fmt.pix.height = 352;
      return result;
    }
  };
  const auto kernel = std::make_shared<ChangingKernel>();
  const std::string path = kernel->add(0, fakeCamera("fake:0"));
  const auto node = V4l2Device::open(kernel, path, nullptr);
  EXPECT_EQ(outcome([&](auto* error) {
              return node->setFormat({1, {}, 640, 360}, error);
            }),
            "5 " + path + ": format 1 (GREY) of 640 x 360 is not available; the driver offers GREY of 640 x 352.");
}

TEST(OpenedVideoNodeTest, ADriverWithoutCapabilitiesOfItsNodesIsTakenByTheDevices) {
  class OldKernel final : public FakeV4l2Api {
   public:
    int ioctl(int descriptor, unsigned long request, void* argument) override {
      const int result = FakeV4l2Api::ioctl(descriptor, request, argument);
      if (request != VIDIOC_QUERYCAP) return result;
      auto& capability = *static_cast<v4l2_capability*>(argument);
      capability.capabilities = V4L2_CAP_META_CAPTURE | V4L2_CAP_STREAMING;
      return result;
    }
  };
  const auto kernel = std::make_shared<OldKernel>();
  const auto node = V4l2Device::open(kernel, kernel->add(0, fakeCamera("fake:0")), nullptr);
  EXPECT_EQ(node->kind(), VideoNodeKind::kMetadata);
}

}  // namespace
}  // namespace quazor
