// The names of the formats between the parts of a camera.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

namespace quazor {

// The code MEDIA_BUS_FMT_NAME; "0x3007" is its own code. Nothing for any other text.
std::optional<std::uint32_t> mediaBusCodeOf(std::string_view name);

// The name without MEDIA_BUS_FMT_; the number of a code without a name, as "0x3007".
std::string mediaBusCodeText(std::uint32_t code);

}  // namespace quazor
