// The descriptors of a USB camera.
#pragma once

#include "tests/kernel/usb/usb_gadget.h"
#include "tests/kernel/usb/uvc_config.h"

#include <cstdint>

namespace quazor {

// Each function has a control interface and after it a streaming interface; the functions follow one another.
constexpr std::uint8_t controlInterfaceOf(std::size_t function) { return static_cast<std::uint8_t>(2 * function); }
constexpr std::uint8_t streamingInterfaceOf(std::size_t function) {
  return static_cast<std::uint8_t>(2 * function + 1);
}
constexpr std::uint8_t endpointOf(std::size_t function) { return static_cast<std::uint8_t>(0x81 + function); }

UsbDescriptors uvcDescriptors(const UvcCameraConfig& config);

}  // namespace quazor
