#include "tests/kernel/usb/usb_gadget.h"

#include "tests/kernel/usb/byte_order.h"

#include <cstddef>

namespace quazor {
namespace {

constexpr std::uint16_t kUsb2 = 0x0200;
constexpr std::uint16_t kEnglish = 0x0409;
constexpr std::uint8_t kControlPacket = 64;  // the packet size of endpoint 0 at high speed

ControlAnswer stringDescriptor(const std::vector<std::string>& strings, std::size_t index) {
  if (index > strings.size()) return stall();
  Bytes contents{usb::kString};
  if (index == 0) {
    addLittle(contents, kEnglish, 2);
  } else {
    for (const char one : strings[index - 1]) addLittle(contents, static_cast<unsigned char>(one), 2);
  }
  ControlAnswer answer;
  addDescriptor(answer.data, contents);
  return answer;
}

ControlAnswer descriptorOf(const UsbDescriptors& descriptors, const SetupPacket& setup) {
  const std::size_t index = setup.value & 0xFF;
  switch (setup.value >> 8) {
    case usb::kDevice: return {ControlOutcome::kDone, descriptors.device};
    case usb::kConfiguration:
      return index == 0 ? ControlAnswer{ControlOutcome::kDone, descriptors.configuration} : stall();
    case usb::kString: return stringDescriptor(descriptors.strings, index);
    default: return stall();
  }
}

}  // namespace

void addDescriptor(Bytes& to, const Bytes& contents) {
  to.push_back(static_cast<std::uint8_t>(contents.size() + 1));
  append(to, contents);
}

Bytes deviceDescriptor(std::uint16_t product, bool hasFunctions) {
  Bytes contents{usb::kDevice};
  addLittle(contents, kUsb2, 2);
  // "Miscellaneous, common class" says that interface associations group the interfaces.
  append(contents, hasFunctions ? Bytes{0xEF, 2, 1} : Bytes{0, 0, 0});
  contents.push_back(kControlPacket);
  addLittle(contents, usb::kVendor, 2);
  addLittle(contents, product, 2);
  addLittle(contents, 0x0100, 2);       // the device's release
  append(contents, Bytes{1, 2, 3, 1});  // strings of manufacturer, product and serial number; one configuration
  Bytes descriptor;
  addDescriptor(descriptor, contents);
  return descriptor;
}

Bytes configurationDescriptor(std::uint8_t interfaces, const Bytes& rest) {
  constexpr std::size_t kLength = 9;
  Bytes contents{usb::kConfiguration};
  addLittle(contents, kLength + rest.size(), 2);
  append(contents, Bytes{interfaces, 1, 0, 0x80, 50});  // configuration 1, powered by the bus with up to 100 mA
  Bytes descriptor;
  addDescriptor(descriptor, contents);
  append(descriptor, rest);
  return descriptor;
}

std::optional<ControlAnswer> answerStandard(const UsbDescriptors& descriptors, const SetupPacket& setup) {
  if ((setup.type & usb::kTypeMask) != usb::kStandard) return std::nullopt;
  const bool isToDevice = (setup.type & usb::kRecipientMask) == 0;
  switch (setup.request) {
    case usb::kGetStatus: return ControlAnswer{ControlOutcome::kDone, Bytes{0, 0}};
    case usb::kGetConfiguration: return ControlAnswer{ControlOutcome::kDone, Bytes{1}};
    case usb::kSetConfiguration:
    case usb::kSetFeature:
    case usb::kClearFeature: return ControlAnswer();
    case usb::kGetDescriptor: return isToDevice ? std::optional(descriptorOf(descriptors, setup)) : std::nullopt;
    default: return std::nullopt;
  }
}

}  // namespace quazor
