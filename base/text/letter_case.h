// The case of English letters, whatever the locale is. All other characters stay as they are.
#pragma once

#include <string>
#include <string_view>

namespace quazor {

std::string withSmallLetters(std::string_view text);

// With a capital at the beginning, for a clause that becomes a sentence.
std::string capitalized(std::string_view text);

}  // namespace quazor
