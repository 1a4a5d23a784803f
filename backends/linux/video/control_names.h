// The ids of controls that a binding names.
#pragma once

#include <cstdint>
#include <optional>
#include <string_view>

namespace quazor {

// The id (V4L2_CID_...) of a control: "0x009A0901" is its own id, and a name that the kernel's driver for USB cameras
// used before or since Linux 5.14 is that of its standard control. Nothing for any other name.
std::optional<std::uint32_t> controlIdOf(std::string_view name);

}  // namespace quazor
