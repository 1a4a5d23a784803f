#include "tests/kernel/usb/hid_gadget.h"

#include "tests/kernel/usb/usb_host_for_tests.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <chrono>
#include <optional>

namespace quazor {
namespace {

using namespace std::chrono_literals;
using testing::ElementsAre;
using testing::SizeIs;

class HidGadgetTest : public ::testing::Test {
 protected:
  HidGadgetTest() { config_.rate = 100; }

  HidGadget& make() { return gadget_.emplace(config_, "1"); }
  ControlOutcome set(std::uint8_t id, std::uint8_t value, UsbGadget::Time now = 0s, std::uint16_t type = 3) {
    const auto number = static_cast<std::uint16_t>(type << 8 | id);
    return gadget_->control(request(0x21, 9, number, 0, 2), Bytes{id, value}, now).outcome;
  }
  std::optional<TransferData> read(UsbGadget::Time now, std::uint32_t length = 792) {
    return gadget_->transfer(inputTransfer(1, 0x81, length), now);
  }
  void turnOn() {
    EXPECT_EQ(set(0xAB, 1), ControlOutcome::kDone);
    EXPECT_EQ(set(0xAC, 1), ControlOutcome::kDone);
    EXPECT_FALSE(read(0s));
  }

  DisplaySensorConfig config_;
  std::optional<HidGadget> gadget_;
};

TEST_F(HidGadgetTest, DescribesItselfAndItsReports) {
  const UsbDescriptors descriptors = hidDescriptors(config_, "1");
  EXPECT_EQ(littleAt(descriptors.configuration, 2, 2), descriptors.configuration.size());
  const auto parts = partsOf(descriptors.configuration);
  ASSERT_THAT(parts, SizeIs(4));
  EXPECT_EQ(parts[1].bytes[5], 3) << "the HID class";
  EXPECT_EQ(littleAt(parts[2].bytes, 7, 2), 40U) << "the length of the report descriptor";
  EXPECT_EQ(littleAt(parts[3].bytes, 4, 2), 1024U);
  make();
  const ControlAnswer report = gadget_->control(request(0x81, usb::kGetDescriptor, 0x2200, 0, 40), {}, 0s);
  EXPECT_EQ(report.data, Bytes(displaySensorDescriptor().begin(), displaySensorDescriptor().end()));
  EXPECT_EQ(gadget_->control(request(0x80, usb::kGetDescriptor, 0x0100, 0, 18), {}, 0s).data.size(), 18U);
}

TEST_F(HidGadgetTest, SendsImagesWhileItIsReadAndBothModesAreOn) {
  make();
  EXPECT_FALSE(read(0s));
  EXPECT_FALSE(gadget_->due(0x81));
  turnOn();
  EXPECT_EQ(gadget_->due(0x81), 10ms);
  const std::optional<TransferData> report = read(10ms);
  ASSERT_TRUE(report);
  EXPECT_THAT(report->data, SizeIs(792));
  EXPECT_EQ(report->data[0], 0x76);
  EXPECT_EQ(gadget_->sensor().sent(), 1U);
  gadget_->cancel(0x81, 15ms);
  EXPECT_FALSE(gadget_->due(0x81)) << "nobody reads";
  EXPECT_FALSE(read(1s));
  EXPECT_EQ(gadget_->due(0x81), 1010ms);
}

TEST_F(HidGadgetTest, GivesNoMoreThanTheHostTakes) {
  config_.length = 800;
  make();
  turnOn();
  EXPECT_THAT(read(10ms)->data, SizeIs(792));
}

TEST_F(HidGadgetTest, StallsOrIgnoresFeatureReports) {
  config_.refuses = {0xAB};
  config_.ignores = {0xAC};
  make();
  EXPECT_EQ(set(0xAB, 1), ControlOutcome::kStall);
  EXPECT_EQ(set(0xAC, 1), ControlOutcome::kNone);
  EXPECT_EQ(set(0xAD, 1, 0s, 2), ControlOutcome::kStall) << "an output report";
  ASSERT_THAT(gadget_->sensor().features(), SizeIs(3));
  EXPECT_THAT(gadget_->sensor().features()[0].data, ElementsAre(0xAB, 1));
  EXPECT_EQ(gadget_->control(request(0xA1, 1, 0x03AB, 0, 2), {}, 0s).outcome, ControlOutcome::kStall) << "a read";
  EXPECT_EQ(gadget_->control(request(0x21, 10, 0, 0), {}, 0s).outcome, ControlOutcome::kDone) << "SET_IDLE";
}

TEST_F(HidGadgetTest, IsUnpluggedAfterSomeReports) {
  config_.removedAfter = 1;
  make();
  turnOn();
  EXPECT_TRUE(read(10ms));
  EXPECT_FALSE(gadget_->isUnplugged());
  EXPECT_FALSE(read(20ms));
  EXPECT_TRUE(gadget_->isUnplugged());
}

}  // namespace
}  // namespace quazor
