// Text in XML 1.0, whatever bytes it holds.
#pragma once

#include <string>
#include <string_view>

namespace quazor {

// The text between tags, in UTF-8. U+FFFD stands for what is not UTF-8, once for each sequence that no character begins
// with (Unicode, "U+FFFD Substitution of Maximal Subparts"), and for each character that XML 1.0 does not allow: the
// control characters but tab, line feed and carriage return, U+FFFE and U+FFFF.
std::string xmlText(std::string_view text);

// The same for the value of an attribute in double quotes. Tabs and line ends read back as they were.
std::string xmlAttribute(std::string_view text);

}  // namespace quazor
