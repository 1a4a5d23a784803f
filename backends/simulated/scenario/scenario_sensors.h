// Reads the HID devices and the display of a scenario's document.
#pragma once

#include "backends/simulated/scenario/display_config.h"
#include "backends/simulated/scenario/hid_config.h"
#include "base/json/json_cursor.h"

#include <string>

namespace quazor {

// Both throw InputError: "PATH: ...".
HidDeviceConfig readHidDevice(const std::string& name, const JsonCursor& cursor);
DisplayConfig readDisplay(const JsonCursor& cursor);

}  // namespace quazor
