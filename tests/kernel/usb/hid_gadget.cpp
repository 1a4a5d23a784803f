#include "tests/kernel/usb/hid_gadget.h"

#include "tests/kernel/usb/byte_order.h"

#include <utility>

namespace quazor {
namespace {

// Numbers of the HID class, version 1.11.
constexpr std::uint8_t kHid = 3;
constexpr std::uint8_t kHidDescriptor = 0x21;
constexpr std::uint8_t kReportDescriptor = 0x22;
constexpr std::uint16_t kHidVersion = 0x0111;
constexpr std::uint8_t kSetReport = 9;
constexpr std::uint8_t kSetIdle = 10;
constexpr unsigned kFeatureReport = 3;

constexpr std::uint8_t kEndpoint = 0x81;
constexpr std::uint8_t kInterrupt = 3;
constexpr std::uint16_t kReportPacket = 1024;  // an image report is sent at once
constexpr std::uint8_t kEveryMillisecond = 4;

}  // namespace

UsbDescriptors hidDescriptors(const DisplaySensorConfig& config, const std::string& serial) {
  Bytes interface;
  addDescriptor(interface, {usb::kInterface, 0, 0, 1, kHid, 0, 0, 0});
  Bytes hid{kHidDescriptor};
  addLittle(hid, kHidVersion, 2);
  append(hid, Bytes{0, 1, kReportDescriptor});
  addLittle(hid, displaySensorDescriptor().size(), 2);
  addDescriptor(interface, hid);
  Bytes endpoint{usb::kEndpoint, kEndpoint, kInterrupt};
  addLittle(endpoint, kReportPacket, 2);
  endpoint.push_back(kEveryMillisecond);
  addDescriptor(interface, endpoint);
  return {deviceDescriptor(kDisplaySensorProduct, false),
          configurationDescriptor(1, interface),
          {"Rig", config.name, serial}};
}

HidGadget::HidGadget(DisplaySensorConfig config, const std::string& serial)
    : descriptors_(hidDescriptors(config, serial)), sensor_(std::move(config)) {}

ControlAnswer HidGadget::control(const SetupPacket& setup, std::span<const std::uint8_t> sent, Time now) {
  if ((setup.type & usb::kTypeMask) == usb::kClass) return answerClass(setup, sent, now);
  const bool isToInterface = (setup.type & usb::kRecipientMask) == usb::kToInterface;
  if (isToInterface && setup.request == usb::kGetDescriptor && setup.value >> 8 == kReportDescriptor) {
    const auto descriptor = displaySensorDescriptor();
    return {ControlOutcome::kDone, Bytes(descriptor.begin(), descriptor.end())};
  }
  if (isToInterface && setup.request == usb::kSetInterface && setup.value == 0) return {};
  return answerStandard(descriptors_, setup).value_or(stall());
}

ControlAnswer HidGadget::answerClass(const SetupPacket& setup, std::span<const std::uint8_t> sent, Time now) {
  if (setup.request == kSetIdle) return {};
  if (setup.request != kSetReport) return stall();
  const bool isFeature = setup.value >> 8 == kFeatureReport;
  switch (sensor_.takeReport(static_cast<std::uint8_t>(setup.value), isFeature, sent, now)) {
    case FeatureAnswer::kAccepted: return {};
    case FeatureAnswer::kRefused: return stall();
    case FeatureAnswer::kNone: break;
  }
  return {ControlOutcome::kNone, {}};
}

std::optional<TransferData> HidGadget::transfer(const UsbipSubmit& submit, Time now) {
  if (submit.endpoint != kEndpoint) return std::nullopt;
  sensor_.setOpen(true, now);
  if (sensor_.takeAction(now) != SensorAction::kReport) return std::nullopt;
  TransferData given{sensor_.report(now), {}};
  if (given.data.size() > submit.length) given.data.resize(submit.length);
  sensor_.countSent();
  return given;
}

std::optional<UsbGadget::Time> HidGadget::due(std::uint8_t endpoint) const {
  return endpoint == kEndpoint ? sensor_.due() : std::nullopt;
}

void HidGadget::cancel(std::uint8_t endpoint, Time now) {
  if (endpoint == kEndpoint) sensor_.setOpen(false, now);
}

}  // namespace quazor
