// Escapes arbitrary bytes as XML 1.0 text.
#pragma once

#include <string>
#include <string_view>

namespace quazor {

// Escapes character data, in UTF-8. U+FFFD replaces each invalid sequence (Unicode, "U+FFFD Substitution of Maximal
// Subparts") and each character that XML 1.0 does not allow: the control characters except tab, line feed and carriage
// return, U+FFFE and U+FFFF.
std::string xmlText(std::string_view text);

// Escapes the value of an attribute in double quotes. A parser returns tabs and line ends unchanged.
std::string xmlAttribute(std::string_view text);

}  // namespace quazor
