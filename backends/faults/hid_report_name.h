// How files and faults write the ID of a HID report.
#pragma once

#include <cstdint>
#include <optional>
#include <string_view>

namespace quazor {

// "0xAB". Valid for ever.
std::string_view hidReportName(std::uint8_t id);
// The ID that is written so; nothing for every other text.
std::optional<std::uint8_t> hidReportNamed(std::string_view text);

}  // namespace quazor
