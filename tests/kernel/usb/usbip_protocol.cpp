#include "tests/kernel/usb/usbip_protocol.h"

#include "tests/kernel/usb/byte_order.h"

#include <algorithm>
#include <utility>

namespace quazor {
namespace {

enum Command : std::uint32_t { kSubmit = 1, kUnlink = 2, kSubmitReply = 3, kUnlinkReply = 4 };

constexpr std::size_t kHeader = 48;
constexpr std::size_t kPacket = 16;  // offset, length, actual length and status
constexpr std::uint32_t kToHost = 1;
constexpr std::uint32_t kNotIsochronous = 0xFFFFFFFF;
constexpr std::uint32_t kMaxPackets = 1024;
constexpr std::uint32_t kMaxTransfer = 1U << 24;

// The first 20 bytes of a reply, in which the device, direction and endpoint are not used.
Bytes beginReply(Command command, std::uint32_t sequence, int status) {
  Bytes reply;
  reply.reserve(kHeader);
  addBig(reply, command, 4);
  addBig(reply, sequence, 4);
  addZeros(reply, 12);
  addBig(reply, static_cast<std::uint32_t>(status), 4);
  return reply;
}

}  // namespace

void UsbipReader::feed(std::span<const std::uint8_t> bytes) {
  bytes_.erase(bytes_.begin(), bytes_.begin() + static_cast<std::ptrdiff_t>(std::exchange(begin_, 0)));
  append(bytes_, bytes);
}

std::optional<UsbipCommand> UsbipReader::next() {
  const std::span rest = std::span(bytes_).subspan(begin_);
  if (broken_ || rest.size() < kHeader) return std::nullopt;
  std::optional<UsbipCommand> command;
  std::size_t size = kHeader;
  switch (bigAt(rest, 0, 4)) {
    case kSubmit: command = submit(&size); break;
    case kUnlink:
      command =
          UsbipUnlink{static_cast<std::uint32_t>(bigAt(rest, 4, 4)), static_cast<std::uint32_t>(bigAt(rest, 20, 4))};
      break;
    default: broken_ = true;
  }
  if (command) begin_ += size;
  return command;
}

// Nothing if it is not complete, or broken.
std::optional<UsbipCommand> UsbipReader::submit(std::size_t* size) {
  const std::span rest = std::span(bytes_).subspan(begin_);
  const auto number = [&](std::size_t offset) { return static_cast<std::uint32_t>(bigAt(rest, offset, 4)); };
  const bool isToHost = number(12) == kToHost;
  const std::uint32_t packets = number(32) == kNotIsochronous ? 0 : number(32);
  UsbipSubmit submit;
  submit.sequence = number(4);
  submit.endpoint = static_cast<std::uint8_t>((number(16) & 0x0F) | (isToHost ? 0x80U : 0U));
  submit.length = number(24);
  const auto setup = rest.subspan(40, 8);
  submit.setup = {setup[0], setup[1], static_cast<std::uint16_t>(littleAt(setup, 2, 2)),
                  static_cast<std::uint16_t>(littleAt(setup, 4, 2)), static_cast<std::uint16_t>(littleAt(setup, 6, 2))};
  broken_ = submit.length > kMaxTransfer || packets > kMaxPackets;
  const std::size_t sent = isToHost ? 0 : submit.length;
  *size = kHeader + sent + packets * kPacket;
  if (broken_ || rest.size() < *size) return std::nullopt;
  const auto data = rest.subspan(kHeader, sent);
  submit.data.assign(data.begin(), data.end());
  for (std::size_t i = 0; i < packets; ++i) submit.packets.push_back(number(kHeader + sent + i * kPacket + 4));
  return submit;
}

Bytes replyTo(const UsbipSubmit& submit, int status, const TransferData& given) {
  Bytes reply = beginReply(kSubmitReply, submit.sequence, status);
  const bool isToHost = submit.isToHost();
  addBig(reply, isToHost ? given.data.size() : submit.data.size(), 4);
  addZeros(reply, 4);  // the first frame
  addBig(reply, submit.packets.size(), 4);
  addZeros(reply, 12);  // the number of errors, and padding
  if (isToHost) append(reply, given.data);
  std::uint32_t offset = 0;
  for (std::size_t i = 0; i < submit.packets.size(); ++i) {
    const std::uint32_t length = submit.packets[i];
    addBig(reply, offset, 4);
    addBig(reply, length, 4);
    addBig(reply, isToHost ? (i < given.packets.size() ? given.packets[i] : 0) : length, 4);
    addZeros(reply, 4);  // the status
    offset += length;
  }
  return reply;
}

Bytes replyTo(const UsbipUnlink& unlink, int status) {
  Bytes reply = beginReply(kUnlinkReply, unlink.sequence, status);
  reply.resize(kHeader, 0);
  return reply;
}

}  // namespace quazor
