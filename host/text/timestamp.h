// Moments of the wall clock as text, in the form of RFC 3339.
#pragma once

#include "contract/value.h"

#include <optional>
#include <string>
#include <string_view>

namespace quazor {

// This moment, by the system's clock.
Date dateNow();

// "2026-11-21T01:08:00.123456789Z": UTC, always with nine digits after the point, so that texts sort as moments do.
std::string timestampText(Date date);

// The moment of such a text; nothing for any other.
std::optional<Date> parseTimestamp(std::string_view text);

}  // namespace quazor
