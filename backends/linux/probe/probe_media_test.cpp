// What the probe finds behind media controllers.
#include "backends/linux/counters/counter_system_for_tests.h"
#include "backends/linux/media/media_for_tests.h"
#include "backends/linux/probe/probe.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cerrno>
#include <filesystem>
#include <fstream>
#include <string>
#include <utility>
#include <vector>

namespace quazor {
namespace {

using ::testing::Contains;
using ::testing::ElementsAre;
using ::testing::HasSubstr;

class ProbeMediaTest : public ::testing::Test {
 protected:
  // Probes the board, and reads the binding that the probe writes.
  void probe() {
    const std::filesystem::path folder = board_.kernel->roots().sysfs.parent_path();
    const MachineProbe found =
        probeMachine({board_.kernel, board_.kernel->roots(), {}, std::make_shared<FakeCounters>(), folder});
    lines_ = found.lines;
    std::ofstream(folder / "binding.json") << found.binding;
    binding_ = readBinding(folder / "binding.json");
  }
  template <class Change>
  void change(Change&& change) {
    board_.kernel->with(board_.media, [&](FakeNode& node) {
      change(*node.media);
      return 0;
    });
  }

  FakeBoard board_;
  std::vector<std::string> lines_;
  Binding binding_;
};

TEST_F(ProbeMediaTest, WritesLinksAndPadsFromTheSensorToTheNode) {
  const std::vector<FakeLink> before = board_.links();
  probe();
  EXPECT_THAT(lines_, Contains("    Its frames come through a media controller, from \"Sensor A\", \"Converter\", "
                               "\"Scaler\"; the binding below sets links and pads."));
  ASSERT_EQ(binding_.cameras.size(), 1U);
  const CameraBinding& camera = binding_.cameras[0];
  EXPECT_EQ(camera.width, 640U);
  EXPECT_EQ(camera.height, 480U);
  EXPECT_THAT(camera.formats,
              ElementsAre(FormatBinding{0, "GREY", 640, 480, {}}, FormatBinding{16, "GREY", 640, 480, {}}));
  ASSERT_TRUE(camera.media);
  EXPECT_EQ(camera.media->device, (MediaDeviceMatch{"fake-isp", "Fake ISP", "platform:fake-isp"}));
  EXPECT_THAT(camera.media->links, ElementsAre(LinkBinding{{"Sensor A", 0}, {"Converter", 0}, true},
                                               LinkBinding{{"Converter", 1}, {"Scaler", 0}, true}));
  std::vector<std::string> pads;
  for (const PadBinding& pad : camera.media->pads) pads.push_back(textOf(pad.pad));
  EXPECT_THAT(pads, ElementsAre("Sensor A:0", "Converter:0", "Converter:1", "Scaler:0", "Scaler:1"));
  EXPECT_EQ(camera.media->pads[0].format, (PadFormat{MEDIA_BUS_FMT_SBGGR8_1X8, 640, 480}))
      << "the sensor's own format is not one that the converter takes";
  EXPECT_EQ(board_.links(), before);
  EXPECT_EQ(board_.format(board::kSensorA, 0).code, MEDIA_BUS_FMT_RGB888_1X24) << "formats are only tried";
  EXPECT_TRUE(board_.kernel->isIdle());
}

TEST_F(ProbeMediaTest, WhatElseIsLinkedIsUnlinked) {
  change([](FakeMedia& media) {
    media.entities[board::kSensorA].pads[0].codes = {MEDIA_BUS_FMT_RGB888_1X24};  // no longer fits the converter
  });
  probe();
  ASSERT_TRUE(binding_.cameras.at(0).media);
  EXPECT_THAT(binding_.cameras[0].media->links, ElementsAre(LinkBinding{{"Sensor A", 0}, {"Converter", 0}, false},
                                                            LinkBinding{{"Sensor B", 0}, {"Converter", 0}, true},
                                                            LinkBinding{{"Converter", 1}, {"Scaler", 0}, true}));
}

TEST_F(ProbeMediaTest, ARateThatNothingSetsIsTold) {
  for (const std::string& sensor : board_.sensors) {
    board_.kernel->with(sensor, [](FakeNode& node) { return std::exchange(node.controls, {}).size(); });
  }
  probe();
  EXPECT_THAT(lines_, Contains("    Its driver reports no frame rate. The binding says 30 a second; correct its "
                               "\"interval\"s."));
  EXPECT_EQ(binding_.cameras.at(0).formats.at(0).interval, (FrameInterval{1, 30}));
}

TEST_F(ProbeMediaTest, ANodeWithoutASensorUpstreamIsUnsuitable) {
  change([](FakeMedia& media) { media.links.erase(media.links.begin(), media.links.begin() + 2); });
  probe();
  EXPECT_THAT(lines_, Contains("    unsuitable: no sensor is upstream of it"));
  EXPECT_TRUE(binding_.cameras.empty());
}

TEST_F(ProbeMediaTest, EntitiesThatABindingCannotNameAreTheReason) {
  change([](FakeMedia& media) { media.entities[board::kScaler].name = "Sc\xC3"; });
  probe();
  EXPECT_THAT(lines_, Contains("    unsuitable: a binding cannot name the entity \"Sc\xC3\""));
  change([](FakeMedia& media) { media.entities[board::kScaler].name = "Converter"; });
  probe();
  EXPECT_THAT(lines_,
              Contains("    unsuitable: 2 entities have the name \"Converter\", so a binding cannot distinguish "
                       "them"));
  EXPECT_TRUE(binding_.cameras.empty());
}

TEST_F(ProbeMediaTest, AFormatThatABindingCannotSetIsTheReason) {
  for (const std::uint32_t sensor : {board::kSensorA, board::kSensorB}) {
    change([&](FakeMedia& media) { media.entities[sensor].pads[0].format = {MEDIA_BUS_FMT_SBGGR8_1X8, 0, 70000}; });
  }
  probe();
  EXPECT_THAT(lines_, Contains(HasSubstr("has the format SBGGR8_1X8 of 0 x 70000, which a binding cannot set")));
}

// Without a limit, the search would try each order of the entities.
TEST_F(ProbeMediaTest, TheSearchEndsIfEverythingIsLinkedWithEverythingAndNothingIsASensor) {
  change([this](FakeMedia& media) {
    media.links.clear();
    media.entities.resize(1);
    media.entities[0] = {"Camera", MEDIA_ENT_F_IO_V4L, board_.camera, {FakePad{}}};
    constexpr std::uint32_t kMany = 24;
    for (std::uint32_t i = 1; i <= kMany; ++i) {
      media.entities.push_back({"Converter " + std::to_string(i),
                                MEDIA_ENT_F_PROC_VIDEO_PIXEL_ENC_CONV,
                                board_.flash,
                                {FakePad{}, FakePad{true, {}}}});
      for (std::uint32_t sink = 0; sink <= kMany; ++sink) {
        if (sink != i) media.links.push_back({i, 1, sink, 0, 0});
      }
    }
  });
  probe();
  EXPECT_THAT(lines_, Contains("    unsuitable: no sensor is upstream of it"));
}

TEST_F(ProbeMediaTest, APathThatDoesNotFitTogetherIsUnsuitableWithTheReason) {
  change([](FakeMedia& media) { media.entities[board::kScaler].pads[0].codes = {MEDIA_BUS_FMT_UYVY8_1X16}; });
  probe();
  EXPECT_THAT(lines_, Contains("    unsuitable: \"Scaler:0\" does not take Y8_1X8 of 640 x 480"));
}

TEST_F(ProbeMediaTest, ASubdeviceThatCannotBeOpenedIsTheReason) {
  for (const std::string& sensor : board_.sensors) {
    board_.kernel->with(sensor, [](FakeNode& node) { return node.openProblem = EACCES; });
  }
  probe();
  EXPECT_THAT(lines_, Contains(HasSubstr("unsuitable: its path: \"Sensor")));
}

TEST_F(ProbeMediaTest, ACameraWhoseLinksContradictAnotherIsNotBound) {
  FakeNode other = fakeCamera("platform:fake-isp");
  other.card = "other";
  other.hasIntervals = false;
  other.formats[0].busCode = MEDIA_BUS_FMT_SBGGR8_1X8;
  const std::string node = board_.kernel->add(1, other);
  change([&](FakeMedia& media) {
    media.entities.push_back({"Other", MEDIA_ENT_F_IO_V4L, node, {FakePad{}}});
    media.links.push_back({board::kSensorA, 0, 6, 0, 0});
  });
  probe();
  EXPECT_EQ(binding_.cameras.size(), 1U);
  EXPECT_THAT(lines_, Contains("    unsuitable: its links contradict those of another camera in the binding below"));
}

TEST_F(ProbeMediaTest, ANodeThatFramesAlwaysReachTooIsTheReason) {
  const std::string node = board_.kernel->add(1, fakeMetadata("platform:fake-isp"));
  change([&](FakeMedia& media) {
    media.entities.push_back({"Raw", MEDIA_ENT_F_IO_V4L, node, {FakePad{}}});
    for (const std::uint32_t sensor : {board::kSensorA, board::kSensorB}) {
      media.links.push_back({sensor, 0, 6, 0, MEDIA_LNK_FL_ENABLED | MEDIA_LNK_FL_IMMUTABLE});
    }
  });
  probe();
  EXPECT_THAT(lines_, Contains(HasSubstr("always go to \"Raw:0\", too, and the format of that node is not part of a "
                                         "binding")));
}

}  // namespace
}  // namespace quazor
