// The control characters: U+0000 to U+001F and U+007F to U+009F. Terminals interpret all of them.
#pragma once

#include <string_view>

namespace quazor {

// Of one character; false for a byte that is not well-formed UTF-8.
bool isControlCharacter(std::string_view character);

bool hasControlCharacter(std::string_view text);

}  // namespace quazor
