// Tests whether a text consists only of letters, marks and numbers.
#pragma once

#include "contract/contract.h"

#include <string_view>

namespace QUAZOR_CONTRACT {

// Returns true if every character of `utf8` is a letter, a mark or a number of any script (Unicode's general categories
// L*, M* and N*), and for an empty text. Returns false if the text is not well-formed UTF-8. Any thread.
QUAZOR_EXPORT bool isAlphaNumeric(std::string_view utf8);

}  // namespace QUAZOR_CONTRACT
