#include "tests/kernel/usb/usbip_protocol.h"

#include "tests/kernel/usb/usb_host_for_tests.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cerrno>
#include <cstddef>
#include <span>

namespace quazor {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using testing::SizeIs;

UsbipSubmit nextSubmit(UsbipReader& reader) {
  const std::optional<UsbipCommand> command = reader.next();
  const auto* const submit = command ? std::get_if<UsbipSubmit>(&*command) : nullptr;
  EXPECT_NE(submit, nullptr);
  return submit == nullptr ? UsbipSubmit() : *submit;
}

TEST(UsbipProtocolTest, ReadsControlTransfersOfBothDirections) {
  UsbipReader reader;
  reader.feed(submitBytes(controlTransfer(7, request(0x80, 6, 0x0302, 0x0409, 255))));
  reader.feed(submitBytes(controlTransfer(8, request(0x21, 1, 0x0100, 0x0001, 3), {1, 2, 3})));
  const UsbipSubmit read = nextSubmit(reader);
  EXPECT_EQ(read.sequence, 7U);
  EXPECT_EQ(read.endpoint, 0x80);
  EXPECT_EQ(read.length, 255U);
  EXPECT_EQ(read.setup.type, 0x80);
  EXPECT_EQ(read.setup.request, 6);
  EXPECT_EQ(read.setup.value, 0x0302);
  EXPECT_EQ(read.setup.index, 0x0409);
  EXPECT_EQ(read.setup.length, 255);
  EXPECT_THAT(read.data, IsEmpty());
  const UsbipSubmit written = nextSubmit(reader);
  EXPECT_EQ(written.endpoint, 0);
  EXPECT_THAT(written.data, ElementsAre(1, 2, 3));
  EXPECT_FALSE(reader.next());
  EXPECT_FALSE(reader.isBroken());
}

TEST(UsbipProtocolTest, WaitsForTheRestOfACommand) {
  const Bytes bytes = submitBytes(controlTransfer(8, request(0x21, 1, 0x0100, 0x0001, 3), {1, 2, 3}));
  UsbipReader reader;
  for (std::size_t i = 0; i + 1 < bytes.size(); ++i) {
    reader.feed(std::span(bytes).subspan(i, 1));
    EXPECT_FALSE(reader.next()) << i;
  }
  reader.feed(std::span(bytes).last(1));
  EXPECT_THAT(nextSubmit(reader).data, ElementsAre(1, 2, 3));
}

TEST(UsbipProtocolTest, ReadsIsochronousPacketsAndUnlinks) {
  UsbipReader reader;
  reader.feed(submitBytes(inputTransfer(9, 0x81, 3072, {1024, 1024, 1024})));
  reader.feed(unlinkBytes({10, 9}));
  const UsbipSubmit submit = nextSubmit(reader);
  EXPECT_EQ(submit.endpoint, 0x81);
  EXPECT_THAT(submit.packets, ElementsAre(1024, 1024, 1024));
  const std::optional<UsbipCommand> command = reader.next();
  ASSERT_TRUE(command && std::holds_alternative<UsbipUnlink>(*command));
  EXPECT_EQ(std::get<UsbipUnlink>(*command).sequence, 10U);
  EXPECT_EQ(std::get<UsbipUnlink>(*command).unlinked, 9U);
}

TEST(UsbipProtocolTest, TakesTheMarkOfOtherTransfersForNoPackets) {
  Bytes bytes = submitBytes(inputTransfer(9, 0x81, 64));
  for (std::size_t i = 32; i < 36; ++i) bytes[i] = 0xFF;
  UsbipReader reader;
  reader.feed(bytes);
  EXPECT_THAT(nextSubmit(reader).packets, IsEmpty());
}

TEST(UsbipProtocolTest, RefusesWhatIsNotOfTheProtocol) {
  for (const auto& [offset, what] :
       {std::pair(0, "the command"), std::pair(24, "the length"), std::pair(32, "packets")}) {
    Bytes bytes = submitBytes(inputTransfer(9, 0x81, 64));
    bytes[static_cast<std::size_t>(offset)] = 0x7F;
    UsbipReader reader;
    reader.feed(bytes);
    EXPECT_FALSE(reader.next()) << what;
    EXPECT_TRUE(reader.isBroken()) << what;
    reader.feed(submitBytes(inputTransfer(9, 0x81, 64)));
    EXPECT_FALSE(reader.next()) << what;
  }
}

TEST(UsbipProtocolTest, RepliesWithDataOrAStatus) {
  const UsbipSubmit read = controlTransfer(7, request(0x80, 6, 0x0100, 0, 18));
  const Bytes reply = replyTo(read, 0, {{5, 6}, {}});
  ASSERT_THAT(reply, SizeIs(50));
  EXPECT_EQ(bigAt(reply, 0, 4), 3U);
  EXPECT_EQ(bigAt(reply, 4, 4), 7U);
  EXPECT_EQ(bigAt(reply, 20, 4), 0U);
  EXPECT_EQ(bigAt(reply, 24, 4), 2U);
  EXPECT_THAT(std::span(reply).last(2), ElementsAre(5, 6));

  const Bytes stalled = replyTo(read, -EPIPE, {});
  EXPECT_EQ(static_cast<std::int32_t>(bigAt(stalled, 20, 4)), -EPIPE);
  EXPECT_EQ(bigAt(stalled, 24, 4), 0U);

  const Bytes taken = replyTo(controlTransfer(8, request(0x21, 1, 0, 0, 3), {1, 2, 3}), 0, {});
  EXPECT_THAT(taken, SizeIs(48));
  EXPECT_EQ(bigAt(taken, 24, 4), 3U) << "all was taken";
}

TEST(UsbipProtocolTest, RepliesWithPacketsWithoutGaps) {
  const Bytes reply = replyTo(inputTransfer(9, 0x81, 3072, {1024, 1024, 1024}), 0, {{1, 2, 3}, {2, 0, 1}});
  ASSERT_THAT(reply, SizeIs(48 + 3 + 3 * 16));
  EXPECT_EQ(bigAt(reply, 24, 4), 3U);
  EXPECT_EQ(bigAt(reply, 32, 4), 3U);
  const std::size_t packets = 48 + 3;
  for (std::size_t i = 0; i < 3; ++i) {
    EXPECT_EQ(bigAt(reply, packets + i * 16, 4), i * 1024);
    EXPECT_EQ(bigAt(reply, packets + i * 16 + 4, 4), 1024U);
    EXPECT_EQ(bigAt(reply, packets + i * 16 + 8, 4), (std::array<std::uint64_t, 3>{2, 0, 1}[i]));
    EXPECT_EQ(bigAt(reply, packets + i * 16 + 12, 4), 0U);
  }
}

TEST(UsbipProtocolTest, RepliesToAnUnlink) {
  const Bytes reply = replyTo(UsbipUnlink{10, 9}, -ECONNRESET);
  ASSERT_THAT(reply, SizeIs(48));
  EXPECT_EQ(bigAt(reply, 0, 4), 4U);
  EXPECT_EQ(bigAt(reply, 4, 4), 10U);
  EXPECT_EQ(static_cast<std::int32_t>(bigAt(reply, 20, 4)), -ECONNRESET);
}

}  // namespace
}  // namespace quazor
