#include "tests/kernel/usb/uvc_camera.h"

#include "tests/kernel/usb/usb_host_for_tests.h"
#include "tests/kernel/usb/uvc_constants.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <chrono>
#include <numeric>
#include <optional>

namespace quazor {
namespace {

using namespace std::chrono_literals;
using testing::HasSubstr;
using testing::SizeIs;

class UvcCameraTest : public ::testing::Test {
 protected:
  UvcCameraTest() { config_.formats = {{"GREY", {{160, 120, {30}}}}}; }

  UvcCamera& make() { return camera_.emplace(config_); }
  ControlOutcome ask(const SetupPacket& setup, const Bytes& sent = {}, UsbGadget::Time now = 0s) {
    return camera_->control(setup, sent, now).outcome;
  }
  void commit(std::uint16_t interface, UsbGadget::Time now = 0s) {
    Bytes text(uvc::kProbeBytes, 0);
    EXPECT_EQ(ask(request(0x21, uvc::kSetCur, uvc::kCommitValue, interface, uvc::kProbeBytes), text, now),
              ControlOutcome::kDone);
  }
  ControlOutcome setInterface(std::uint16_t interface, std::uint16_t alternate, UsbGadget::Time now = 0s) {
    return ask(request(0x01, usb::kSetInterface, alternate, interface), {}, now);
  }
  std::optional<TransferData> packets(UsbGadget::Time now, std::size_t count = 8) {
    return camera_->transfer(inputTransfer(1, 0x81, 4096, std::vector<std::uint32_t>(count, 512)), now);
  }

  UvcCameraConfig config_;
  std::optional<UvcCamera> camera_;
};

TEST_F(UvcCameraTest, GivesItsDescriptors) {
  make();
  const auto length = [&](std::uint16_t value) {
    return camera_->control(request(0x80, usb::kGetDescriptor, value, 0, 4096), {}, 0s).data.size();
  };
  EXPECT_EQ(length(0x0100), 18U);
  EXPECT_GT(length(0x0200), 100U);
  EXPECT_EQ(length(0x0300), 4U) << "the languages";
  EXPECT_EQ(length(0x0302), 2 + 2 * config_.name.size());
  EXPECT_EQ(ask(request(0x80, usb::kGetDescriptor, 0x0304, 0)), ControlOutcome::kStall);
  EXPECT_EQ(ask(request(0x80, usb::kGetDescriptor, 0x0600, 0)), ControlOutcome::kStall) << "it has one speed only";
  EXPECT_EQ(ask(request(0x80, usb::kGetDescriptor, 0x0201, 0)), ControlOutcome::kStall);
  EXPECT_EQ(ask(request(0x00, usb::kSetConfiguration, 1, 0)), ControlOutcome::kDone);
  EXPECT_EQ(ask(request(0x80, usb::kGetStatus, 0, 0)), ControlOutcome::kDone);
  EXPECT_EQ(ask(request(0x40, 1, 0, 0)), ControlOutcome::kStall) << "a request of a vendor";
}

TEST_F(UvcCameraTest, StreamsInTheTimeOfTheBus) {
  make();
  commit(1);
  EXPECT_FALSE(camera_->due(0x81));
  EXPECT_EQ(setInterface(1, 1, 1s), ControlOutcome::kDone);
  EXPECT_FALSE(packets(1s)) << "the packets take a millisecond";
  EXPECT_EQ(camera_->due(0x81), 1001ms);
  std::optional<TransferData> given = packets(1001ms);
  ASSERT_TRUE(given);
  EXPECT_THAT(given->packets, SizeIs(8));
  EXPECT_TRUE(given->data.empty()) << "the first frame comes after its interval";
  std::size_t bytes = 0;
  for (int i = 2; i <= 100; ++i) {
    given = packets(1s + std::chrono::milliseconds(i));
    ASSERT_TRUE(given);
    EXPECT_EQ(given->data.size(), std::accumulate(given->packets.begin(), given->packets.end(), 0U));
    bytes += given->data.size();
  }
  EXPECT_GT(bytes, 2 * 19'200U);
  EXPECT_LT(bytes, 3 * 19'200U);
  EXPECT_THAT(camera_->activity(), HasSubstr("{\"streams\": 1, \"frames\": 2}"));
  EXPECT_EQ(setInterface(1, 0), ControlOutcome::kDone);
  EXPECT_FALSE(packets(2s));
  EXPECT_FALSE(camera_->due(0x81));
}

TEST_F(UvcCameraTest, StreamsInBulkFromTheCommitToTheClearedHalt) {
  config_.isBulk = true;
  make();
  commit(1, 1s);
  const auto transfer = [&](UsbGadget::Time now) { return camera_->transfer(inputTransfer(1, 0x81, 16'384), now); };
  EXPECT_FALSE(transfer(1s));
  EXPECT_EQ(camera_->due(0x81), 1s + std::chrono::nanoseconds(1s) / 30);
  const std::optional<TransferData> given = transfer(1034ms);
  ASSERT_TRUE(given);
  EXPECT_EQ(given->data.size(), 16'384U);
  EXPECT_EQ(setInterface(1, 1), ControlOutcome::kStall) << "it has no other setting";
  EXPECT_EQ(ask(request(0x02, usb::kClearFeature, 0, 0x81)), ControlOutcome::kDone);
  EXPECT_FALSE(transfer(2s));
}

TEST_F(UvcCameraTest, TwinsHaveControlsAndStreamsOfTheirOwn) {
  config_.functions = 2;
  make();
  commit(3);
  EXPECT_EQ(setInterface(3, 1, 1s), ControlOutcome::kDone);
  EXPECT_FALSE(camera_->due(0x81));
  EXPECT_TRUE(camera_->due(0x82));
  const auto contrast = [](std::uint16_t interface, std::uint8_t what) {
    return request(what == uvc::kSetCur ? 0x21 : 0xA1, what, 0x0300,
                   static_cast<std::uint16_t>(uvc::kProcessing << 8 | interface), 2);
  };
  EXPECT_EQ(ask(contrast(2, uvc::kSetCur), {9, 0}), ControlOutcome::kDone);
  EXPECT_EQ(camera_->control(contrast(2, uvc::kGetCur), {}, 0s).data.at(0), 9);
  EXPECT_EQ(camera_->control(contrast(0, uvc::kGetCur), {}, 0s).data.at(0), 32);
  EXPECT_EQ(ask(contrast(4, uvc::kGetCur)), ControlOutcome::kStall);
  EXPECT_EQ(setInterface(4, 0), ControlOutcome::kStall);
  EXPECT_FALSE(camera_->transfer(inputTransfer(1, 0x83, 512), 2s));
}

TEST_F(UvcCameraTest, IsUnpluggedAtTheMomentThatIsChosen) {
  const auto at = [&](UvcMoment moment) {
    config_.faults.unpluggedAt = moment;
    make();
  };
  at(UvcMoment::kCommit);
  commit(1);
  EXPECT_TRUE(camera_->isUnplugged());
  at(UvcMoment::kStart);
  commit(1);
  EXPECT_FALSE(camera_->isUnplugged());
  setInterface(1, 1);
  EXPECT_TRUE(camera_->isUnplugged());
  at(UvcMoment::kStop);
  setInterface(1, 0);
  EXPECT_FALSE(camera_->isUnplugged()) << "nothing was streaming";
  setInterface(1, 1);
  EXPECT_FALSE(camera_->isUnplugged());
  setInterface(1, 0);
  EXPECT_TRUE(camera_->isUnplugged());
}

TEST_F(UvcCameraTest, IsUnpluggedAfterSomeFrames) {
  config_.faults.unpluggedAfter = 1;
  make();
  commit(1);
  setInterface(1, 1, 0s);
  EXPECT_TRUE(packets(100ms, 500));
  EXPECT_FALSE(camera_->isUnplugged()) << "what was asked for is given";
  EXPECT_FALSE(packets(200ms, 500));
  EXPECT_TRUE(camera_->isUnplugged());
  EXPECT_THAT(camera_->activity(), HasSubstr("\"unplugged\": true"));
}

}  // namespace
}  // namespace quazor
