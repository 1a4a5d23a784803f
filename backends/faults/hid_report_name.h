// The IDs of HID reports as text.
#pragma once

#include <cstdint>
#include <optional>
#include <string_view>

namespace quazor {

// "0xAB". The text is static.
std::string_view hidReportName(std::uint8_t id);
// The ID with that text; nothing for any other text.
std::optional<std::uint8_t> hidReportNamed(std::string_view text);

}  // namespace quazor
