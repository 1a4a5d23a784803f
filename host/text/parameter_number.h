// Numbers as they stand on a command line.
#pragma once

#include "contract/value.h"

#include <string_view>

namespace quazor {

// The number that `text` is, all of it: an integer stays one, signed where that holds it and unsigned above; anything
// else is a double, an integer beyond 64 bits too. Throws InputError, one clause, for a text that is not a decimal
// number, is not finite, or lies outside the range of doubles. No locale has any influence.
Value parseNumber(std::string_view text);

}  // namespace quazor
