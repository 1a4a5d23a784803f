// VhciPort: a port of the kernel's virtual USB controller, vhci_hcd.
#pragma once

#include "backends/linux/system/file_descriptor.h"

#include <filesystem>
#include <optional>
#include <string>

namespace quazor {

// The number of a free high-speed port in the text of a controller's file `status`.
std::optional<int> freePort(const std::string& status);

// Attaches a high-speed device to a free port of the controller with that folder of sysfs. Returns the device's end of
// the connection; none with errno on failure, ENOSPC if no port is free.
FileDescriptor attachToPort(const std::filesystem::path& controller);

}  // namespace quazor
