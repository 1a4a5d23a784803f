// Formats and parses dates according to RFC 3339.
#pragma once

#include "contract/value.h"

#include <optional>
#include <string>
#include <string_view>

namespace quazor {

// The current date by the system's clock.
Date dateNow();

// "2026-11-21T01:08:00.123456789Z": always UTC with nine decimals, so that the order of texts is the order of dates.
std::string timestampText(Date date);

// Parses such a text; nothing for any other.
std::optional<Date> parseTimestamp(std::string_view text);

}  // namespace quazor
