// The bytes that a USB/IP host sends, for tests.
#pragma once

#include "tests/kernel/usb/byte_order.h"
#include "tests/kernel/usb/usbip_protocol.h"

#include <cstdint>
#include <span>
#include <vector>

namespace quazor {

// A transfer as the host writes it; its packets lie one after the other in the host's buffer.
inline Bytes submitBytes(const UsbipSubmit& submit) {
  Bytes bytes;
  addBig(bytes, 1, 4);
  addBig(bytes, submit.sequence, 4);
  addBig(bytes, 0x00010002, 4);  // bus and device
  addBig(bytes, submit.isToHost() ? 1 : 0, 4);
  addBig(bytes, submit.endpoint & 0x0FU, 4);
  addBig(bytes, 0x200, 4);  // flags
  addBig(bytes, submit.length, 4);
  addZeros(bytes, 4);
  addBig(bytes, submit.packets.size(), 4);
  addBig(bytes, 1, 4);
  append(bytes, Bytes{submit.setup.type, submit.setup.request});
  for (const std::uint16_t number : {submit.setup.value, submit.setup.index, submit.setup.length}) {
    addLittle(bytes, number, 2);
  }
  append(bytes, submit.data);
  std::uint32_t offset = 0;
  for (const std::uint32_t length : submit.packets) {
    addBig(bytes, offset, 4);
    addBig(bytes, length, 4);
    addZeros(bytes, 8);
    offset += length;
  }
  return bytes;
}

inline Bytes unlinkBytes(const UsbipUnlink& unlink) {
  Bytes bytes;
  addBig(bytes, 2, 4);
  addBig(bytes, unlink.sequence, 4);
  addZeros(bytes, 12);
  addBig(bytes, unlink.unlinked, 4);
  bytes.resize(48, 0);
  return bytes;
}

// A request to the host.
inline SetupPacket request(std::uint8_t type, std::uint8_t request, std::uint16_t value, std::uint16_t index,
                           std::uint16_t length = 0) {
  return {type, request, value, index, length};
}

// A transfer of endpoint 0; `length` is that of what is sent or asked for.
inline UsbipSubmit controlTransfer(std::uint32_t sequence, const SetupPacket& setup, Bytes data = {}) {
  UsbipSubmit submit;
  submit.sequence = sequence;
  submit.endpoint = (setup.type & 0x80) != 0 ? 0x80 : 0;
  submit.length = setup.length;
  submit.setup = setup;
  submit.data = std::move(data);
  return submit;
}

inline UsbipSubmit inputTransfer(std::uint32_t sequence, std::uint8_t endpoint, std::uint32_t length,
                                 std::vector<std::uint32_t> packets = {}) {
  UsbipSubmit submit;
  submit.sequence = sequence;
  submit.endpoint = endpoint;
  submit.length = length;
  submit.packets = std::move(packets);
  return submit;
}

// A descriptor as the bytes that follow its length.
struct PartOfDescriptors {
  std::uint8_t type = 0;
  std::uint8_t subtype = 0;
  std::span<const std::uint8_t> bytes;  // the whole
};

// Takes descriptors apart, which must outlive the result. Empty if the lengths do not add up.
inline std::vector<PartOfDescriptors> partsOf(std::span<const std::uint8_t> descriptors) {
  std::vector<PartOfDescriptors> parts;
  while (descriptors.size() >= 3 && descriptors[0] >= 3 && descriptors[0] <= descriptors.size()) {
    parts.push_back({descriptors[1], descriptors[2], descriptors.first(descriptors[0])});
    descriptors = descriptors.subspan(descriptors[0]);
  }
  if (!descriptors.empty()) parts.clear();
  return parts;
}

}  // namespace quazor
