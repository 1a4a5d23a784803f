// Numbers as they stand on a command line.
#pragma once

#include "contract/value.h"

#include <optional>
#include <string>
#include <string_view>

namespace quazor {

// The number that `text` is, all of it: an integer stays one, signed where that holds it and unsigned above; anything
// else is a double, an integer beyond 64 bits too. Nothing, and one clause in `problem`, for a text that is no decimal
// number, is not finite, or lies outside the range of doubles. No locale has any influence.
std::optional<Value> parseNumber(std::string_view text, std::string* problem);

}  // namespace quazor
