// The device's side of the USB/IP protocol (Documentation/usb/usbip_protocol.rst of the kernel) after the attachment:
// the host sends commands, the device replies to each.
#pragma once

#include "contract/value.h"

#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <variant>
#include <vector>

namespace quazor {

// The first eight bytes of a control transfer.
struct SetupPacket {
  std::uint8_t type = 0;
  std::uint8_t request = 0;
  std::uint16_t value = 0;
  std::uint16_t index = 0;
  std::uint16_t length = 0;
};

// A transfer that the host requests.
struct UsbipSubmit {
  std::uint32_t sequence = 0;
  std::uint8_t endpoint = 0;           // as in descriptors: bit 7 is set if the device sends
  std::uint32_t length = 0;            // of the host's buffer
  SetupPacket setup;                   // of endpoint 0
  Bytes data;                          // what the host sends
  std::vector<std::uint32_t> packets;  // the room in each packet of an isochronous transfer

  bool isToHost() const { return (endpoint & 0x80) != 0; }
};

// The host no longer waits for a transfer.
struct UsbipUnlink {
  std::uint32_t sequence = 0;
  std::uint32_t unlinked = 0;  // the transfer's sequence number
};

using UsbipCommand = std::variant<UsbipSubmit, UsbipUnlink>;

// Takes a host's bytes apart. Thread: one at a time.
class UsbipReader {
 public:
  void feed(std::span<const std::uint8_t> bytes);
  // The next complete command, or nothing.
  std::optional<UsbipCommand> next();
  // Whether the bytes were not of the protocol; then no more commands come.
  bool isBroken() const { return broken_; }

 private:
  std::optional<UsbipCommand> submit(std::size_t* size);

  Bytes bytes_;
  std::size_t begin_ = 0;
  bool broken_ = false;
};

// What a device gives in a transfer. For an isochronous one, `packets` has the number of bytes in each packet, and
// `data` these bytes without gaps.
struct TransferData {
  Bytes data;
  std::vector<std::uint32_t> packets;
};

// The status is 0 or a negative error number: -EPIPE is a stall.
Bytes replyTo(const UsbipSubmit& submit, int status, const TransferData& given);
// The status is -ECONNRESET if the transfer was still waiting, or 0 if its reply was sent.
Bytes replyTo(const UsbipUnlink& unlink, int status);

}  // namespace quazor
