// Examples and exit codes for the help.
#pragma once

#include <string>
#include <string_view>

namespace quazor {

// The examples and exit codes of the program.
std::string helpFooter();

// Those of the command with that name.
std::string helpFooter(std::string_view command);

}  // namespace quazor
