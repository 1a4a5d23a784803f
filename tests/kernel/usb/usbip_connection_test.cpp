#include "tests/kernel/usb/usbip_connection.h"

#include "tests/kernel/usb/usb_host_for_tests.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <sys/socket.h>

#include <array>
#include <cerrno>
#include <chrono>
#include <memory>

namespace quazor {
namespace {

using namespace std::chrono_literals;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::SizeIs;

// Answers every control transfer alike, and transfers of each endpoint from its time on.
class FakeGadget final : public UsbGadget {
 public:
  ControlAnswer control(const SetupPacket& /*setup*/, std::span<const std::uint8_t> sent, Time /*now*/) override {
    received.assign(sent.begin(), sent.end());
    return answer;
  }
  std::optional<TransferData> transfer(const UsbipSubmit& submit, Time now) override {
    const auto from = times.find(submit.endpoint);
    if (from == times.end() || now < from->second) return std::nullopt;
    times.erase(from);
    return TransferData{{submit.endpoint}, {}};
  }
  std::optional<Time> due(std::uint8_t endpoint) const override {
    const auto from = times.find(endpoint);
    return from == times.end() ? std::nullopt : std::optional(from->second);
  }
  void cancel(std::uint8_t endpoint, Time /*now*/) override { cancelled.push_back(endpoint); }
  bool isUnplugged() const override { return unplugged; }

  ControlAnswer answer;
  Bytes received;
  std::map<std::uint8_t, Time> times;
  std::vector<std::uint8_t> cancelled;
  bool unplugged = false;
};

class UsbipConnectionTest : public ::testing::Test {
 protected:
  UsbipConnectionTest() {
    std::array<int, 2> ends{-1, -1};
    EXPECT_EQ(::socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, ends.data()), 0);
    host_ = FileDescriptor(ends[0]);
    connection_.emplace(FileDescriptor(ends[1]), gadget_);
  }
  void tell(const Bytes& bytes) {
    ASSERT_EQ(::send(host_.get(), bytes.data(), bytes.size(), MSG_NOSIGNAL), static_cast<ssize_t>(bytes.size()));
  }
  // What the device has sent so far.
  Bytes received() {
    std::array<std::uint8_t, 4096> room{};
    const ssize_t size = ::recv(host_.get(), room.data(), room.size(), MSG_DONTWAIT);
    return size <= 0 ? Bytes() : Bytes(room.begin(), room.begin() + size);
  }

  std::shared_ptr<FakeGadget> gadget_ = std::make_shared<FakeGadget>();
  FileDescriptor host_;
  std::optional<UsbipConnection> connection_;
};

TEST_F(UsbipConnectionTest, AnswersControlTransfersAtOnce) {
  gadget_->answer.data = {1, 2, 3, 4};
  tell(submitBytes(controlTransfer(7, request(0x80, 6, 0x0100, 0, 3))));
  EXPECT_TRUE(connection_->receive(0s));
  const Bytes reply = received();
  ASSERT_THAT(reply, SizeIs(51)) << "no more than the host asks for";
  EXPECT_EQ(bigAt(reply, 4, 4), 7U);

  tell(submitBytes(controlTransfer(8, request(0x21, 1, 0x0100, 0, 2), {5, 6})));
  EXPECT_TRUE(connection_->receive(0s));
  EXPECT_THAT(gadget_->received, ElementsAre(5, 6));

  gadget_->answer = stall();
  received();
  tell(submitBytes(controlTransfer(9, request(0x80, 6, 0x0100, 0, 3))));
  EXPECT_TRUE(connection_->receive(0s));
  EXPECT_EQ(static_cast<std::int32_t>(bigAt(received(), 20, 4)), -EPIPE);
}

TEST_F(UsbipConnectionTest, LeavesAControlTransferWithoutAnAnswerUntilTheHostGivesUp) {
  gadget_->answer.outcome = ControlOutcome::kNone;
  tell(submitBytes(controlTransfer(7, request(0x21, 9, 0x03AB, 0, 2), {0xAB, 1})));
  EXPECT_TRUE(connection_->receive(0s));
  EXPECT_TRUE(connection_->serve(0s));
  EXPECT_THAT(received(), IsEmpty());
  tell(unlinkBytes({8, 7}));
  EXPECT_TRUE(connection_->receive(5s));
  const Bytes reply = received();
  ASSERT_THAT(reply, SizeIs(48));
  EXPECT_EQ(static_cast<std::int32_t>(bigAt(reply, 20, 4)), -ECONNRESET);
}

TEST_F(UsbipConnectionTest, AnswersTransfersWhenTheyAreDue) {
  gadget_->times = {{0x81, 2s}, {0x82, 1s}};
  EXPECT_FALSE(connection_->due()) << "the host waits for nothing";
  tell(submitBytes(inputTransfer(7, 0x81, 64)));
  EXPECT_TRUE(connection_->receive(0s));
  EXPECT_EQ(connection_->due(), 2s);
  tell(submitBytes(inputTransfer(8, 0x82, 64)));
  EXPECT_TRUE(connection_->receive(0s));
  EXPECT_EQ(connection_->due(), 1s);
  EXPECT_TRUE(connection_->serve(1500ms));
  EXPECT_EQ(bigAt(received(), 4, 4), 8U);
  EXPECT_EQ(connection_->due(), 2s);
  EXPECT_TRUE(connection_->serve(2s));
  EXPECT_EQ(bigAt(received(), 4, 4), 7U);
  EXPECT_FALSE(connection_->due());
}

TEST_F(UsbipConnectionTest, ForgetsAnUnlinkedTransfer) {
  tell(submitBytes(inputTransfer(7, 0x81, 64)));
  tell(submitBytes(inputTransfer(8, 0x81, 64)));
  tell(unlinkBytes({9, 7}));
  EXPECT_TRUE(connection_->receive(0s));
  EXPECT_EQ(static_cast<std::int32_t>(bigAt(received(), 20, 4)), -ECONNRESET);
  EXPECT_THAT(gadget_->cancelled, IsEmpty()) << "the host still waits for the other one";
  tell(unlinkBytes({10, 8}));
  EXPECT_TRUE(connection_->receive(0s));
  EXPECT_THAT(gadget_->cancelled, ElementsAre(0x81));
  received();
  tell(unlinkBytes({11, 8}));
  EXPECT_TRUE(connection_->receive(0s));
  EXPECT_EQ(bigAt(received(), 20, 4), 0U) << "it is not waiting any more";
  gadget_->times = {{0x81, 0s}};
  EXPECT_TRUE(connection_->serve(1s));
  EXPECT_THAT(received(), IsEmpty());
}

TEST_F(UsbipConnectionTest, RefusesTransfersToOtherEndpointsOfTheDevice) {
  tell(submitBytes(controlTransfer(7, request(0, 0, 0, 0, 1), {1})));
  UsbipSubmit written = inputTransfer(8, 0x01, 1);
  written.data = {1};
  tell(submitBytes(written));
  EXPECT_TRUE(connection_->receive(0s));
  const Bytes replies = received();
  ASSERT_THAT(replies, SizeIs(96));
  EXPECT_EQ(static_cast<std::int32_t>(bigAt(replies, 48 + 20, 4)), -EPIPE);
}

TEST_F(UsbipConnectionTest, EndsWhenTheDeviceIsUnplugged) {
  gadget_->unplugged = true;
  tell(submitBytes(controlTransfer(7, request(0x80, 6, 0x0100, 0, 3))));
  EXPECT_FALSE(connection_->receive(0s));
  EXPECT_FALSE(connection_->serve(0s));
  EXPECT_THAT(received(), IsEmpty());
}

TEST_F(UsbipConnectionTest, EndsWhenTheHostClosesOrSendsSomethingElse) {
  tell(Bytes(48, 0x55));
  EXPECT_FALSE(connection_->receive(0s));
  host_.reset();
  EXPECT_FALSE(connection_->receive(0s));
}

TEST_F(UsbipConnectionTest, GoesOnWhileTheHostIsSilent) { EXPECT_TRUE(connection_->receive(0s)); }

TEST_F(UsbipConnectionTest, EndsWhenTheHostTakesNoReply) {
  gadget_->times = {{0x81, 0s}};
  tell(submitBytes(inputTransfer(7, 0x81, 64)));
  EXPECT_TRUE(connection_->receive(0s));
  host_.reset();
  EXPECT_FALSE(connection_->serve(0s));
}

}  // namespace
}  // namespace quazor
