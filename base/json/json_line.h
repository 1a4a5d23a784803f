// Reads lines of JSON that programs wrote, within the limits of json_limits.h.
#pragma once

#include <nlohmann/json.hpp>

#include <string_view>

namespace quazor {

// Parses a line without its line end. Throws InputError, one sentence without the line's place, if it is not valid
// JSON, holds a key twice, or exceeds a limit.
nlohmann::ordered_json parseJsonLine(std::string_view line);

}  // namespace quazor
