// HidGadget: a display sensor as a USB device.
#pragma once

#include "tests/kernel/display_sensor.h"
#include "tests/kernel/usb/usb_gadget.h"

#include <cstdint>
#include <optional>
#include <span>
#include <string>

namespace quazor {

UsbDescriptors hidDescriptors(const DisplaySensorConfig& config, const std::string& serial);

// The sensor is open while the host waits for its reports. Thread: one.
class HidGadget final : public UsbGadget {
 public:
  HidGadget(DisplaySensorConfig config, const std::string& serial);

  ControlAnswer control(const SetupPacket& setup, std::span<const std::uint8_t> sent, Time now) override;
  std::optional<TransferData> transfer(const UsbipSubmit& submit, Time now) override;
  std::optional<Time> due(std::uint8_t endpoint) const override;
  void cancel(std::uint8_t endpoint, Time now) override;
  bool isUnplugged() const override { return sensor_.isGone(); }

  const DisplaySensor& sensor() const { return sensor_; }

 private:
  ControlAnswer answerClass(const SetupPacket& setup, std::span<const std::uint8_t> sent, Time now);

  const UsbDescriptors descriptors_;
  DisplaySensor sensor_;
};

}  // namespace quazor
