// UvcCamera: a USB device with one or several cameras.
#pragma once

#include "tests/kernel/usb/usb_gadget.h"
#include "tests/kernel/usb/uvc_config.h"
#include "tests/kernel/usb/uvc_controls.h"
#include "tests/kernel/usb/uvc_stream.h"

#include <cstdint>
#include <optional>
#include <span>
#include <vector>

namespace quazor {

// Thread: one.
class UvcCamera final : public UsbGadget {
 public:
  explicit UvcCamera(const UvcCameraConfig& config);

  ControlAnswer control(const SetupPacket& setup, std::span<const std::uint8_t> sent, Time now) override;
  std::optional<TransferData> transfer(const UsbipSubmit& submit, Time now) override;
  std::optional<Time> due(std::uint8_t endpoint) const override;
  bool isUnplugged() const override { return unplugged_; }

  // One line of JSON: for each function the frames of its last stream, and the number of its streams.
  std::string activity() const;

 private:
  // One camera of the device.
  struct Function {
    UvcControls controls;
    UvcStream stream;
    std::uint64_t streams = 0;  // how many have been started
    Time busTime{0};            // isochronous: the end of the last transfer
    Time span{0};               // and the length of the next one
  };

  // The function of an endpoint or an interface; null if there is none.
  Function* ofEndpoint(std::uint8_t endpoint);
  const Function* ofEndpoint(std::uint8_t endpoint) const;
  Function* ofInterface(std::uint8_t interface);

  ControlAnswer setInterface(const SetupPacket& setup, Time now);
  ControlAnswer answerClass(const SetupPacket& setup, std::span<const std::uint8_t> sent, Time now);
  void start(Function& function, Time now);
  void stop(Function& function);
  void reach(UvcMoment moment);
  TransferData packetsOf(Function& function, const UsbipSubmit& submit);

  const UvcFaults faults_;
  const bool isBulk_;
  const UsbDescriptors descriptors_;
  std::vector<Function> functions_;
  bool unplugged_ = false;
};

}  // namespace quazor
