// Parses numbers of a command line.
#pragma once

#include "contract/value.h"

#include <string_view>

namespace quazor {

// Parses all of `text` as a number: an integer becomes signed if it fits in 64 bits, else unsigned; everything else,
// including larger integers, becomes a double. Throws InputError, with a clause as its text, if the text is not a
// decimal number, is not finite or is out of the range of doubles. Does not depend on the locale.
Value parseNumber(std::string_view text);

}  // namespace quazor
