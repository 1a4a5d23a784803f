#include "tests/kernel/usb/uvc_stream.h"

#include "tests/kernel/usb/usb_host_for_tests.h"
#include "tests/kernel/usb/uvc_constants.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <chrono>
#include <optional>
#include <vector>

namespace quazor {
namespace {

using namespace std::chrono_literals;
using testing::ElementsAre;
using testing::SizeIs;

Bytes wish(std::uint8_t format, std::uint8_t frame, std::uint32_t interval) {
  Bytes text{0, 0, format, frame};
  addLittle(text, interval, 4);
  text.resize(uvc::kProbeBytes, 0);
  return text;
}

class UvcStreamTest : public ::testing::Test {
 protected:
  UvcStreamTest() { config_.formats = {{"GREY", {{160, 120, {30, 5}}}}, {"MJPG", {{640, 480, {15}}}}}; }

  // A stream that was negotiated for 30 frames a second of 19,200 bytes.
  UvcStream& started() {
    stream_.emplace(config_);
    EXPECT_EQ(stream_->answer(request(0x21, uvc::kSetCur, uvc::kCommitValue, 1), wish(1, 1, 333'333)).outcome,
              ControlOutcome::kDone);
    stream_->start(1s);
    return *stream_;
  }
  // The payloads of a bulk camera until it has no more at that time.
  std::vector<Bytes> payloads(UvcStream::Time at) {
    std::vector<Bytes> all;
    while (const std::optional<Bytes> one = stream_->payload(at, uvc::kBulkPayload)) all.push_back(*one);
    return all;
  }
  // The header bits of the last payload at that time.
  std::uint8_t lastBits(UvcStream::Time at) {
    const std::vector<Bytes> all = payloads(at);
    return all.empty() ? std::uint8_t{0} : all.back()[1];
  }
  static UvcStream::Time frame(int number) { return 1s + std::chrono::nanoseconds(1s) * (number + 1) / 30; }

  UvcCameraConfig config_;
  std::optional<UvcStream> stream_;
};

TEST_F(UvcStreamTest, NegotiatesTheNearestMode) {
  UvcStream stream(config_);
  const auto probed = [&](std::uint8_t format, std::uint8_t frame, std::uint32_t interval) {
    EXPECT_EQ(stream.answer(request(0x21, uvc::kSetCur, uvc::kProbeValue, 1), wish(format, frame, interval)).outcome,
              ControlOutcome::kDone);
    return stream.answer(request(0xA1, uvc::kGetCur, uvc::kProbeValue, 1), {}).data;
  };
  Bytes text = probed(1, 1, 1'500'000);
  ASSERT_THAT(text, SizeIs(uvc::kProbeBytes));
  EXPECT_EQ(littleAt(text, 4, 4), 2'000'000U);
  EXPECT_EQ(littleAt(text, 18, 4), 19'200U);
  EXPECT_EQ(littleAt(text, 26, 4), uvc::kClock);
  text = probed(9, 9, 1);
  EXPECT_EQ(text[2], 2);
  EXPECT_EQ(text[3], 1);
  EXPECT_EQ(littleAt(text, 18, 4), 640U * 480 / 20);
  text = probed(0, 0, 0);
  EXPECT_EQ(text[2], 1);
  EXPECT_FALSE(stream.isCommitted());
}

TEST_F(UvcStreamTest, AsksForPacketsThatHoldTheRate) {
  config_.formats = {{"YUYV", {{640, 480, {10, 30}}, {160, 120, {30}}}}};
  UvcStream stream(config_);
  const auto size = [&](std::uint8_t frame, std::uint32_t interval) {
    stream.answer(request(0x21, uvc::kSetCur, uvc::kProbeValue, 1), wish(1, frame, interval));
    return littleAt(stream.answer(request(0xA1, uvc::kGetCur, uvc::kProbeValue, 1), {}).data, 22, 4);
  };
  EXPECT_EQ(size(1, 1'000'000), 1024U);
  EXPECT_EQ(size(1, 333'333), 3072U);
  EXPECT_EQ(size(2, 333'333), 512U);
  config_.isBulk = true;
  stream_.emplace(config_);
  EXPECT_EQ(littleAt(stream_->answer(request(0xA1, uvc::kGetDef, uvc::kProbeValue, 1), {}).data, 22, 4),
            uvc::kBulkPayload);
}

TEST_F(UvcStreamTest, RefusesOtherRequests) {
  UvcStream stream(config_);
  EXPECT_EQ(stream.answer(request(0x21, uvc::kSetCur, uvc::kProbeValue, 1), Bytes(26)).outcome, ControlOutcome::kStall);
  EXPECT_EQ(stream.answer(request(0xA1, uvc::kGetRes, uvc::kProbeValue, 1), {}).outcome, ControlOutcome::kStall);
  EXPECT_EQ(stream.answer(request(0xA1, uvc::kGetCur, 0x0300, 1), {}).outcome, ControlOutcome::kStall);
  EXPECT_THAT(stream.answer(request(0xA1, uvc::kGetLen, uvc::kProbeValue, 1), {}).data, ElementsAre(34, 0));
}

TEST_F(UvcStreamTest, SendsWholeFramesAtTheRate) {
  config_.isBulk = true;
  UvcStream& stream = started();
  EXPECT_THAT(payloads(frame(0) - 1ns), SizeIs(0));
  EXPECT_EQ(stream.nextPayload(), frame(0));
  const std::vector<Bytes> first = payloads(frame(0));
  ASSERT_THAT(first, SizeIs(2));
  EXPECT_EQ(first[0].size(), uvc::kBulkPayload);
  EXPECT_EQ(first[0].size() + first[1].size(), 19'200 + 2 * uvc::kHeaderBytes);
  EXPECT_EQ(first[0][0], uvc::kHeaderBytes);
  EXPECT_EQ(first[0][1], uvc::kHasPts | uvc::kHasScr | uvc::kEndOfHeader);
  EXPECT_EQ(first[1][1], first[0][1] | uvc::kEndOfFrame);
  EXPECT_EQ(stream.frames(), 1U);
  EXPECT_EQ(stream.nextPayload(), frame(1));
  const std::vector<Bytes> second = payloads(frame(1));
  ASSERT_THAT(second, SizeIs(2));
  EXPECT_EQ(second[0][1], first[0][1] | uvc::kFrameId) << "the frame's bit changes";
  EXPECT_NE(second[0][20], first[0][20]) << "so does the picture";
}

TEST_F(UvcStreamTest, TellsItsClockAndTheBus) {
  config_.isBulk = true;
  started();
  const Bytes payload = payloads(frame(0)).at(0);
  EXPECT_EQ(littleAt(payload, 2, 4), 49'599'984U) << "48 ticks a microsecond, 1.033333 s";
  EXPECT_EQ(littleAt(payload, 6, 4), littleAt(payload, 2, 4));
  EXPECT_EQ(littleAt(payload, 10, 2), 1033U);
}

TEST_F(UvcStreamTest, FillsNoMoreThanAPacket) {
  UvcStream& stream = started();
  const std::optional<Bytes> small = stream.payload(frame(0), 100);
  ASSERT_TRUE(small);
  EXPECT_THAT(*small, SizeIs(100));
  EXPECT_FALSE(stream.payload(frame(0), uvc::kHeaderBytes)) << "no room";
  const std::optional<Bytes> large = stream.payload(frame(0), 3072);
  ASSERT_TRUE(large);
  EXPECT_THAT(*large, SizeIs(512)) << "as negotiated";
}

TEST_F(UvcStreamTest, BeginsAgainAfterAStop) {
  config_.isBulk = true;
  UvcStream& stream = started();
  payloads(frame(0));
  stream.payload(frame(1), 100);
  stream.stop();
  EXPECT_FALSE(stream.nextPayload());
  EXPECT_FALSE(stream.isStreaming());
  stream.start(10s);
  EXPECT_EQ(stream.frames(), 0U);
  EXPECT_EQ(stream.nextPayload(), 10s + std::chrono::nanoseconds(1s) / 30);
  EXPECT_THAT(payloads(11s).size(), 60U) << "the frames of a second";
}

TEST_F(UvcStreamTest, DamagesShortensAndDelaysEveryNthFrame) {
  config_.isBulk = true;
  config_.faults.damagedEvery = 2;
  config_.faults.shortEvery = 3;
  config_.faults.lateEvery = 4;
  config_.faults.lateBy = 20ms;
  UvcStream& stream = started();
  EXPECT_EQ(lastBits(frame(0)) & uvc::kError, 0);
  EXPECT_EQ(lastBits(frame(1)) & uvc::kError, uvc::kError);
  const std::vector<Bytes> third = payloads(frame(2));
  ASSERT_THAT(third, SizeIs(1));
  EXPECT_EQ(third[0].size(), 9'600 + uvc::kHeaderBytes);
  EXPECT_EQ(third[0][1] & uvc::kEndOfFrame, uvc::kEndOfFrame);
  EXPECT_EQ(stream.nextPayload(), frame(3) + 20ms);
  EXPECT_THAT(payloads(frame(3)), SizeIs(0));
  EXPECT_EQ(lastBits(frame(3) + 20ms) & uvc::kError, uvc::kError);
  EXPECT_EQ(stream.nextPayload(), frame(4)) << "the next one is on time";
}

TEST_F(UvcStreamTest, IsMuteAfterSomeFrames) {
  config_.isBulk = true;
  config_.faults.muteAfter = 2;
  UvcStream& stream = started();
  payloads(10s);
  EXPECT_EQ(stream.frames(), 2U);
  EXPECT_FALSE(stream.nextPayload());
}

}  // namespace
}  // namespace quazor
