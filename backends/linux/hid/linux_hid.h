// The HID service of Linux: hidraw devices.
#pragma once

#include "backends/linux/hid/hidraw_calls.h"
#include "backends/linux/hid/hidraw_nodes.h"
#include "platform/hid.h"

#include <chrono>
#include <memory>
#include <string>

namespace quazor {

// A device that does not answer a feature report makes the kernel wait for five seconds. A call that failed after at
// least this time is told as LinuxErrorCode::kNoAnswer.
inline constexpr std::chrono::milliseconds kHidAnswerTime{4500};

// All hidraw devices of this machine. A device's usage page and usage are those of the first top-level collection of
// its report descriptor. Each enumeration scans again and creates new objects.
//
// There is no manager when the kernel has no hidraw. Devices that this user may not use are found too; they say so when
// they are opened. Input reports and payloads of feature reports begin with the byte of their ID, which is 0 where a
// device has no IDs. Reports are handed on as long or as short as they come. A device is scheduled on run loops of
// makeLinuxRunLoops(); on any other its receiver gets an error, once.
std::shared_ptr<HidService> makeLinuxHid();
// The same with another kernel. `calls` must not be null.
std::shared_ptr<HidService> makeLinuxHid(HidrawRoots roots, std::shared_ptr<HidrawCalls> calls);

// What a device of this service calls itself, as "Acme Sensor"; its path where it says nothing, and empty for a device
// that is none of this service. Any thread.
std::string linuxHidName(const HidDevice& device);

// The kernel's own calls.
std::shared_ptr<HidrawCalls> makeHidrawCalls();

}  // namespace quazor
