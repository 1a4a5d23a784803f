// The Linux machine as a phone: all its services in one bundle.
#pragma once

#include "backends/linux/binding/binding.h"
#include "backends/linux/capture/linux_capture.h"
#include "platform/platform.h"

#include <memory>

namespace quazor {

// The services of this machine by the binding, in real time. Devices are looked for when they are used, so that what is
// not there is an error of the call that needs it, not of this one. `capture` is the binding's capture service.
Platform linuxPlatform(const Binding& binding, std::shared_ptr<LinuxCapture> capture);

}  // namespace quazor
