// The parts of a scenario's document that describe HID devices and the display.
#pragma once

#include "backends/simulated/scenario/display_traits.h"
#include "backends/simulated/scenario/hid_traits.h"
#include "base/json/json_cursor.h"

#include <string>

namespace quazor {

// Both throw JsonProblem, "PATH: ...".
HidDeviceTraits readHidDevice(const std::string& name, const JsonCursor& cursor);
DisplayTraits readDisplay(const JsonCursor& cursor);

}  // namespace quazor
