// Words of shell commands that quazor suggests.
#pragma once

#include <string>
#include <string_view>

namespace quazor {

// The text as one word of a shell command, in single quotes if the shell would read it otherwise.
std::string shellWord(std::string_view text);

}  // namespace quazor
