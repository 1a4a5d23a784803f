#include "backends/linux/hid/hidraw_nodes.h"

#include "backends/linux/hid/hidraw_for_tests.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <filesystem>
#include <string>
#include <vector>

namespace quazor {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::SizeIs;

class HidrawNodesTest : public ::testing::Test {
 protected:
  std::vector<std::string> paths() const {
    std::vector<std::string> found;
    for (const HidrawNode& node : hidrawNodes(tree_.roots())) found.push_back(node.path.filename());
    return found;
  }

  HidrawTree tree_;
};

TEST_F(HidrawNodesTest, ANodeSaysAllThatTheKernelShowsOfItsDevice) {
  tree_.connect("hidraw3", sensorDescriptor(), "Display Sensor");
  const std::vector<HidrawNode> nodes = hidrawNodes(tree_.roots());
  ASSERT_THAT(nodes, SizeIs(1));
  const HidrawNode& node = nodes.front();
  EXPECT_EQ(node.path, tree_.path("hidraw3"));
  EXPECT_EQ(node.name, "Display Sensor");
  EXPECT_EQ(node.device.filename(), "0003:1209:0001.hidraw31");
  EXPECT_EQ(node.rawDescriptor, sensorDescriptor());
  EXPECT_THAT(node.descriptor.topLevel, ElementsAre(HidUsage{0xFF00, 0x24}));
  EXPECT_THAT(node.descriptor.inputReports, ElementsAre(testing::Pair(0x76, 792U)));
  EXPECT_EQ(node.problem, "");
  EXPECT_EQ(node.noAccess, "");
}

TEST_F(HidrawNodesTest, NodesComeInTheOrderOfTheirNumbersAndOthersAreNone) {
  for (const char* name : {"hidraw10", "hidraw2", "hidraw0", "hidraw", "hidrawx", "hidraw1x", "input1"}) {
    tree_.connect(name, sensorDescriptor());
  }
  EXPECT_THAT(paths(), ElementsAre("hidraw0", "hidraw2", "hidraw10"));
}

TEST_F(HidrawNodesTest, ADamagedDescriptorIsToldAndHidesNothing) {
  tree_.connect("hidraw0", {0x05});
  const std::vector<HidrawNode> nodes = hidrawNodes(tree_.roots());
  ASSERT_THAT(nodes, SizeIs(1));
  EXPECT_EQ(nodes.front().problem, "an item is cut off, at byte 0");
  EXPECT_THAT(nodes.front().descriptor.topLevel, IsEmpty());
  EXPECT_EQ(nodes.front().name, "Test Sensor");
}

TEST_F(HidrawNodesTest, ANodeThatCannotBeOpenedSaysWhy) {
  tree_.connect("hidraw0", sensorDescriptor());
  std::filesystem::remove(tree_.path("hidraw0"));
  const std::vector<HidrawNode> nodes = hidrawNodes(tree_.roots());
  ASSERT_THAT(nodes, SizeIs(1));
  EXPECT_EQ(nodes.front().noAccess, "No such file or directory");
}

TEST_F(HidrawNodesTest, ADeviceWithoutANameHasAnEmptyOne) {
  tree_.connect("hidraw0", sensorDescriptor());
  std::filesystem::remove(tree_.classEntry("hidraw0") / "device" / "uevent");
  const std::vector<HidrawNode> nodes = hidrawNodes(tree_.roots());
  ASSERT_THAT(nodes, SizeIs(1));
  EXPECT_EQ(nodes.front().name, "");
}

TEST_F(HidrawNodesTest, WhatGoesAwayMeanwhileIsLeftOut) {
  tree_.connect("hidraw0", sensorDescriptor());
  tree_.connect("hidraw1", sensorDescriptor());
  std::filesystem::remove(tree_.classEntry("hidraw0") / "device");
  EXPECT_THAT(paths(), ElementsAre("hidraw1"));
  std::filesystem::remove(tree_.classEntry("hidraw1") / "device" / "report_descriptor");
  EXPECT_THAT(paths(), IsEmpty());
}

TEST_F(HidrawNodesTest, ADescriptorThatCannotBeReadIsThatOfADeviceThatGoesAway) {
  tree_.connect("hidraw0", sensorDescriptor());
  tree_.connect("hidraw1", sensorDescriptor());
  const std::filesystem::path file = tree_.classEntry("hidraw0") / "device" / "report_descriptor";
  std::filesystem::remove(file);
  std::filesystem::create_directory(file);  // it can be opened, but reads fail
  EXPECT_THAT(paths(), ElementsAre("hidraw1"));
}

TEST_F(HidrawNodesTest, ALongDescriptorIsReadWhole) {
  Bytes longest = sensorDescriptor();
  while (longest.size() < 10'000) longest.insert(longest.end(), {0x15, 0x00});
  tree_.connect("hidraw0", longest);
  const std::vector<HidrawNode> nodes = hidrawNodes(tree_.roots());
  ASSERT_THAT(nodes, SizeIs(1));
  EXPECT_EQ(nodes.front().rawDescriptor, longest);
}

TEST_F(HidrawNodesTest, AKernelWithoutHidrawHasNoNodes) {
  EXPECT_TRUE(hasHidraw(tree_.roots()));
  EXPECT_THAT(paths(), IsEmpty());
  std::filesystem::remove(tree_.roots().sysfs / "class" / "hidraw");
  EXPECT_FALSE(hasHidraw(tree_.roots()));
  EXPECT_THAT(paths(), IsEmpty());
}

TEST_F(HidrawNodesTest, ADeviceThatIsConnectedAnewHasAnotherDirectory) {
  tree_.connect("hidraw0", sensorDescriptor(), "Test Sensor", 1);
  const std::filesystem::path before = hidrawDevice(tree_.roots(), tree_.path("hidraw0"));
  tree_.disconnect("hidraw0");
  EXPECT_EQ(hidrawDevice(tree_.roots(), tree_.path("hidraw0")), "");
  tree_.connect("hidraw0", sensorDescriptor(), "Test Sensor", 2);
  EXPECT_NE(hidrawDevice(tree_.roots(), tree_.path("hidraw0")), before);
}

}  // namespace
}  // namespace quazor
