// UsbGadget: what a USB device of the rig does.
#pragma once

#include "contract/value.h"
#include "tests/kernel/usb/usbip_protocol.h"

#include <chrono>
#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <vector>

namespace quazor {

namespace usb {

// Types of descriptors.
enum Descriptor : std::uint8_t {
  kDevice = 1,
  kConfiguration = 2,
  kString = 3,
  kInterface = 4,
  kEndpoint = 5,
  kInterfaceAssociation = 11
};
// Standard requests.
enum Request : std::uint8_t {
  kGetStatus = 0,
  kClearFeature = 1,
  kSetFeature = 3,
  kGetDescriptor = 6,
  kGetConfiguration = 8,
  kSetConfiguration = 9,
  kGetInterface = 10,
  kSetInterface = 11
};
// Types of requests: what they are for, and whom.
inline constexpr std::uint8_t kTypeMask = 0x60;
inline constexpr std::uint8_t kStandard = 0x00;
inline constexpr std::uint8_t kClass = 0x20;
inline constexpr std::uint8_t kRecipientMask = 0x1F;
inline constexpr std::uint8_t kToInterface = 0x01;
inline constexpr std::uint8_t kToEndpoint = 0x02;

// The identity that all gadgets have: numbers for tests.
inline constexpr std::uint16_t kVendor = 0x1209;

}  // namespace usb

// How a device answers a control transfer.
enum class ControlOutcome { kDone, kStall, kNone };
struct ControlAnswer {
  ControlOutcome outcome = ControlOutcome::kDone;
  Bytes data;  // for the host; it gets no more than it asked for
};
inline ControlAnswer stall() { return {ControlOutcome::kStall, {}}; }

// Thread: one. All times are from the same clock.
class UsbGadget {
 public:
  using Time = std::chrono::nanoseconds;

  virtual ~UsbGadget() = default;

  // Answers a control transfer with the bytes that the host sent.
  virtual ControlAnswer control(const SetupPacket& setup, std::span<const std::uint8_t> sent, Time now) = 0;
  // Answers a transfer of another endpoint to the host; nothing: not now.
  virtual std::optional<TransferData> transfer(const UsbipSubmit& submit, Time now) = 0;
  // When the next transfer of this endpoint can be answered; nothing: never, unless a control transfer changes that.
  virtual std::optional<Time> due(std::uint8_t endpoint) const = 0;
  // The host no longer waits for transfers of this endpoint.
  virtual void cancel(std::uint8_t /*endpoint*/, Time /*now*/) {}
  // Whether it has been unplugged.
  virtual bool isUnplugged() const = 0;
};

struct UsbDescriptors {
  Bytes device;
  Bytes configuration;               // with all interfaces and endpoints
  std::vector<std::string> strings;  // in ASCII; the first has the index 1
};

// Descriptors of a device of one configuration whose interfaces say what it is.
Bytes deviceDescriptor(std::uint16_t product, bool hasFunctions);
// Completes the descriptors of interfaces and endpoints to those of a configuration.
Bytes configurationDescriptor(std::uint8_t interfaces, const Bytes& rest);
// Appends the total length and the contents.
void addDescriptor(Bytes& to, const Bytes& contents);

// Answers the standard requests that do not depend on the gadget; nothing for other requests.
std::optional<ControlAnswer> answerStandard(const UsbDescriptors& descriptors, const SetupPacket& setup);

}  // namespace quazor
