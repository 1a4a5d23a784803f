// The HID service of Linux: hidraw devices.
#pragma once

#include "backends/linux/hid/hidraw_calls.h"
#include "backends/linux/hid/hidraw_nodes.h"
#include "platform/hid.h"

#include <chrono>
#include <memory>
#include <string>

namespace quazor {

// The kernel waits five seconds for a device that does not respond to a feature report. A call that fails after at
// least this time is reported as LinuxErrorCode::kNoAnswer.
inline constexpr std::chrono::milliseconds kHidAnswerTime{4500};

// All hidraw devices of this machine. The usage page and usage of a device are those of the first top-level collection
// in its report descriptor. Each enumeration scans again and creates new objects.
//
// There is no manager if the kernel has no hidraw. Enumeration includes devices that this user may not open; opening
// them fails. Input reports and payloads of feature reports begin with their ID byte, which is 0 if a device has no
// IDs. Reports are passed on with their actual length. A device can be scheduled on run loops of makeLinuxRunLoops();
// on any other the receiver gets one error.
std::shared_ptr<HidService> makeLinuxHid();
// The same with replaced system calls. `calls` must not be null.
std::shared_ptr<HidService> makeLinuxHid(HidrawRoots roots, std::shared_ptr<HidrawCalls> calls);

// The name that a device of this service reports, for example "Acme Sensor"; its path if it reports none, and empty if
// the device does not belong to this service. Thread: any.
std::string linuxHidName(const HidDevice& device);

// The system's own calls.
std::shared_ptr<HidrawCalls> makeHidrawCalls();

}  // namespace quazor
